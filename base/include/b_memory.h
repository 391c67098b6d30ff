#pragma once

#include "b_config.h"

#include <cstddef>

/// Allocation policies of the framework. Blocks of all policies are aligned to at least 16
/// bytes, may be handed from one owner to another and are freed by `free` of any of them.
/// A failed allocation throws `std::bad_alloc`; a size of 0 gives null.
namespace base {

struct BASE1_API StdAllocPolicy {
    static void* allocate(std::size_t byteCount);
    /// Fresh zeroed bytes; large blocks are not touched before their first use.
    static void* allocateZeroed(std::size_t byteCount);
    static void free(void* block) noexcept;
};

/// The policy with a stated alignment. Only 16 exists: what the system's allocator gives.
template <std::size_t Alignment>
struct StdAlignAllocPolicy : StdAllocPolicy {
    static_assert(Alignment == 16);
};

/// The default policy of containers, strings and bulk data.
using AllocPolicy = StdAlignAllocPolicy<16>;

class NonCopyable {
public:
    NonCopyable() = default;
    NonCopyable(const NonCopyable&) = delete;
    NonCopyable& operator=(const NonCopyable&) = delete;

protected:
    ~NonCopyable() = default;
};

} // namespace base
