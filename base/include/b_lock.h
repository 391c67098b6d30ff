#pragma once

#include "b_config.h"
#include "b_memory.h"
#include "b_types.h"

#include <atomic>

/// Lock words for sections of a few instructions. Both have the standard's names for locking, so
/// `std::lock_guard` and `std::shared_lock` take them. Neither may be taken twice by one thread.
namespace base {

class BASE1_API SpinLock : public NonCopyable {
public:
    void lock() noexcept;
    void unlock() noexcept { word_.store(0, std::memory_order_release); }

private:
    std::atomic<u32> word_{0};
};

/// Many readers or one writer. The low 30 bits count readers, bit 30 belongs to a writer: set
/// while readers are left, it keeps new ones out; with no readers it is the writer's hold.
class BASE1_API ReadWriteSpinLock : public NonCopyable {
public:
    void lock_shared() noexcept;
    void unlock_shared() noexcept { word_.fetch_sub(1, std::memory_order_release); }
    void lock() noexcept;
    void unlock() noexcept { word_.fetch_and(~writer, std::memory_order_release); }

private:
    static constexpr u32 writer = 1u << 30;
    std::atomic<u32> word_{0};
};

} // namespace base
