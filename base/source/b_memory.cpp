#include "b_memory.h"

#include <cstdlib>
#include <new>

namespace base {

// The system's allocator aligns to what the widest standard type needs.
static_assert(alignof(std::max_align_t) >= 16);

void* StdAllocPolicy::allocate(std::size_t byteCount) {
    if (byteCount == 0)
        return nullptr;
    if (void* block = std::malloc(byteCount))
        return block;
    throw std::bad_alloc();
}

void* StdAllocPolicy::allocateZeroed(std::size_t byteCount) {
    if (byteCount == 0)
        return nullptr;
    if (void* block = std::calloc(1, byteCount))
        return block;
    throw std::bad_alloc();
}

void StdAllocPolicy::free(void* block) noexcept {
    std::free(block);
}

} // namespace base
