#pragma once

#include "b_types.h"

#include <cstddef>
#include <cstdint>
#include <sys/mman.h>

/// How the system backs fresh blocks of bulk data. Giving page after page of 4 KiB at the first
/// touch takes longer than filling them does. What the system can't do changes nothing but time.
namespace base {

/// Advises the system about the whole pages inside a block that is at least `worthwhile` long.
inline void advisePages(void* block, std::size_t byteCount, std::size_t worthwhile,
                        int advice) noexcept {
    constexpr std::size_t pageLength = 4096;
    if (byteCount < worthwhile)
        return;
    const auto begin = reinterpret_cast<std::uintptr_t>(block);
    const auto first = (begin + pageLength - 1) / pageLength * pageLength;
    const auto last = (begin + byteCount) / pageLength * pageLength;
    ::madvise(reinterpret_cast<void*>(first), last - first, advice);
}

/// For a block that will be filled: has all of it backed by one call.
inline void prefault(void* block, std::size_t byteCount) noexcept {
    advisePages(block, byteCount, std::size_t(1) << 20, MADV_POPULATE_WRITE);
}

/// For a block that may be filled in part: asks for large pages, still at their first touch.
inline void askForLargePages(void* block, std::size_t byteCount) noexcept {
    advisePages(block, byteCount, std::size_t(4) << 20, MADV_HUGEPAGE);
}

} // namespace base
