#pragma once

#include "b_containers.h"
#include "b_types.h"

#include <algorithm>
#include <cmath>
#include <cstring>

namespace assimp {

/// Replaces values that are not finite by zero in elements made of floats and returns how many
/// there were.
template <class T>
base::u64 repairValues(base::vector<T>& elements) {
    auto* values = reinterpret_cast<float*>(elements.data());
    base::u64 count = 0;
    for (std::size_t i = 0; i < elements.byteLength() / sizeof(float); ++i) {
        if (std::isfinite(values[i]))
            continue;
        values[i] = 0;
        ++count;
    }
    return count;
}

/// Vertices of an assimp mesh that stand behind the elements of a scene array.
struct VertexSelection {
    base::vector<base::u32> vertices;
    bool isWhole = false; ///< all vertices in order

    VertexSelection() = default;
    VertexSelection(base::vector<base::u32> selected, base::u32 vertexCount)
        : vertices(std::move(selected)) {
        base::u32 next = 0;
        isWhole =
            vertices.size() == vertexCount &&
            std::ranges::all_of(std::as_const(vertices), [&](base::u32 v) { return v == next++; });
    }

    /// The first bytes of each selected vertex's element, as T.
    template <class T, class Source>
    base::vector<T> read(const Source* elements) const {
        static_assert(sizeof(T) <= sizeof(Source) && std::is_trivially_copyable_v<Source>);
        base::vector<T> result;
        if (vertices.empty())
            return result;
        result.resizeUninitialized(vertices.size());
        void* to = result.data();
        if (isWhole && sizeof(T) == sizeof(Source)) {
            std::memcpy(to, elements, result.byteLength());
            return result;
        }
        for (const base::u32 v : vertices) {
            std::memcpy(to, elements + v, sizeof(T));
            to = static_cast<T*>(to) + 1;
        }
        return result;
    }
};

} // namespace assimp
