#pragma once

#include <cstddef>
#include <cstdint>
#include <sys/mman.h>

namespace GLTF {

/// Has the system back a fresh block of bulk data, which will be filled, in one call. Page after
/// page at the first touch takes longer than the filling itself. Where the system can't, the
/// pages come at the first touch all the same. Small blocks are left alone.
inline void prefault(void* block, std::size_t byteCount) noexcept {
    constexpr std::size_t worthwhile = std::size_t(1) << 20, pageLength = 4096;
    if (byteCount < worthwhile)
        return;
    const auto begin = reinterpret_cast<std::uintptr_t>(block);
    const auto first = (begin + pageLength - 1) / pageLength * pageLength;
    const auto last = (begin + byteCount) / pageLength * pageLength;
    ::madvise(reinterpret_cast<void*>(first), last - first, MADV_POPULATE_WRITE);
}

} // namespace GLTF
