#pragma once

#include <cstddef>

namespace GLTF {

/// How many objects ahead a loop over many objects asks for their memory. The loops do little with
/// each object, so without this they wait for memory most of the time.
constexpr std::size_t prefetchDistance = 8;

/// Starts loading an object, or nothing for null.
template <class T>
void prefetch(const T* object) noexcept {
    constexpr std::size_t lineLength = 64;
    for (std::size_t offset = 0; offset < sizeof(T); offset += lineLength)
        __builtin_prefetch(reinterpret_cast<const char*>(object) + offset);
}

} // namespace GLTF
