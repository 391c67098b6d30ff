#include "allocation_size.h"

#include <atomic>
#include <cstddef>

#ifdef __SANITIZE_ADDRESS__

long test_support::allocatedBytes() {
    return 0;
}

#else

extern "C" void*
__libc_malloc(std::size_t byteCount); // behind the allocator that this one replaces

namespace {
std::atomic<long> bytes{0};
} // namespace

extern "C" __attribute__((visibility("default"))) void* malloc(std::size_t byteCount) {
    bytes += static_cast<long>(byteCount);
    return __libc_malloc(byteCount);
}

long test_support::allocatedBytes() {
    return bytes;
}

#endif
