#pragma once

#include "b_refcnt.h"

namespace base {

/// A counted block of bytes. It owns its memory, which is then aligned to 16 bytes and comes from
/// `AllocPolicy`, or refers to memory of someone else, which must outlive it.
class BASE1_API Buffer final : public RefCntAtomic {
public:
    /// A new block of `byteCount` bytes, not cleared. Null for 0 bytes and where memory is out.
    static ref<Buffer> allocate(u64 byteCount);
    /// A block at `bytes`; with `ownsMemory` it is freed with the buffer.
    Buffer(u8* bytes, u64 byteCount, bool ownsMemory) noexcept
        : bytes_(bytes), byteCount_(byteCount), ownsMemory_(ownsMemory) {}
    ~Buffer() override;

    u8* data() noexcept { return bytes_; }
    const u8* data() const noexcept { return bytes_; }
    u64 size() const noexcept { return byteCount_; }
    bool ownsMemory() const noexcept { return ownsMemory_; }

private:
    u8* bytes_;
    u64 byteCount_;
    bool ownsMemory_;
};

} // namespace base
