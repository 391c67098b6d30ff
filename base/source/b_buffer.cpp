#include "b_buffer.h"

#include <cstdint>
#include <new>
#include <sys/mman.h>

namespace base {

namespace {

/// Has the system back a large block with large pages where it can. It still does so at the first
/// touch, but not for every 4 KiB, which takes longer than filling them.
void askForLargePages(u8* bytes, u64 byteCount) noexcept {
    constexpr u64 worthwhile = u64(4) << 20, pageLength = 4096;
    if (byteCount < worthwhile)
        return;
    const auto begin = reinterpret_cast<std::uintptr_t>(bytes);
    const auto first = (begin + pageLength - 1) / pageLength * pageLength;
    const auto last = (begin + byteCount) / pageLength * pageLength;
    ::madvise(reinterpret_cast<void*>(first), last - first, MADV_HUGEPAGE);
}

} // namespace

ref<Buffer> Buffer::allocate(u64 byteCount) {
    if (byteCount == 0)
        return {};
    try {
        auto* bytes = static_cast<u8*>(AllocPolicy::allocate(byteCount));
        askForLargePages(bytes, byteCount);
        Buffer* buffer = new (std::nothrow) Buffer(bytes, byteCount, true);
        if (!buffer)
            AllocPolicy::free(bytes);
        return ref<Buffer>(buffer);
    } catch (const std::bad_alloc&) {
        return {};
    }
}

Buffer::~Buffer() {
    if (ownsMemory_)
        AllocPolicy::free(bytes_);
}

} // namespace base
