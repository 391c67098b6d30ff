#pragma once

#include "GLTF/document.h"
#include "scene.h"

namespace gltf {

/// The index array that the primitives of a mesh share; a mesh may have none.
class MeshIndices {
public:
    explicit MeshIndices(const scene::IMesh& mesh);

    const base::u32* data() const { return data_; }
    base::u64 count() const { return count_; }
    base::u32 vertexCount() const { return vertexCount_; }
    bool isTriangulated() const { return isTriangulated_; }
    /// Entries that ranges may address: without an array, the vertices in their order.
    base::u64 rangeEnd() const { return data_ ? count_ : vertexCount_; }

    /// Makes the array that lists all vertices in their order.
    void number();
    /// A view of the whole array, which the document borrows if it lasts, else copies.
    base::ref<GLTF::BufferView> makeView(const scene::IMesh& mesh) const;
    /// Position of the first index in the array that leads past the vertices; `count` if none does.
    base::u64 findOutOfRange() const;

private:
    const base::u32* data_ = nullptr;
    base::u64 count_ = 0;
    base::u32 vertexCount_ = 0;
    bool isTriangulated_ = false;
    bool mustCopy_ = false;
    base::vector<base::u32> own_;
};

} // namespace gltf
