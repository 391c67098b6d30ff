#pragma once

#include <cstddef>

/// Memory of the document's objects. A document has a dozen of them for every mesh and frees them
/// together, so they come from large slabs: a block is the next one of its size that was freed,
/// else the next piece of the slab. All slabs go back when the last object has gone.
namespace GLTF::object_pool {

void* allocate(std::size_t byteCount);
void free(void* block, std::size_t byteCount) noexcept; ///< `byteCount` as it was asked for

} // namespace GLTF::object_pool
