#include "b_buffer.h"

#include "b_pages.h"

#include <new>

namespace base {

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
