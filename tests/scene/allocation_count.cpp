#include "allocation_count.h"

#include <atomic>

#ifdef __SANITIZE_ADDRESS__

long test_support::allocationCount() {
    return -1;
}

#else

extern "C" {
// The names by which the system's library lets others take the place of its allocator.
void* __libc_malloc(std::size_t byteCount);
void* __libc_calloc(std::size_t count, std::size_t byteCount);
}

namespace {
std::atomic<long> calls{0};
} // namespace

extern "C" __attribute__((visibility("default"))) void* malloc(std::size_t byteCount) {
    ++calls;
    return __libc_malloc(byteCount);
}

extern "C" __attribute__((visibility("default"))) void* calloc(std::size_t count,
                                                               std::size_t byteCount) {
    ++calls;
    return __libc_calloc(count, byteCount);
}

long test_support::allocationCount() {
    return calls;
}

#endif
