#include "b_lock.h"

#include <chrono>
#include <thread>

namespace base {

namespace {

/// Waits longer the more tries have failed: spins, then yields, then sleeps.
class Backoff {
public:
    void wait() noexcept {
        using std::chrono::milliseconds;
        ++failedTries_;
        if (failedTries_ < 60)
            return;
        if (failedTries_ < 90) {
            std::this_thread::yield();
        } else if (failedTries_ < 105) {
            std::this_thread::sleep_for(milliseconds(0));
        } else {
            std::this_thread::sleep_for(milliseconds(1));
            failedTries_ = 0;
        }
    }

private:
    int failedTries_ = 0;
};

} // namespace

void SpinLock::lock() noexcept {
    Backoff backoff;
    while (word_.exchange(1, std::memory_order_acquire) != 0)
        backoff.wait();
}

void ReadWriteSpinLock::lock_shared() noexcept {
    Backoff backoff;
    for (;;) {
        u32 word = word_.load(std::memory_order_relaxed);
        if ((word & writer) == 0 &&
            word_.compare_exchange_weak(word, word + 1, std::memory_order_acquire,
                                        std::memory_order_relaxed))
            return;
        backoff.wait();
    }
}

void ReadWriteSpinLock::lock() noexcept {
    Backoff backoff;
    while ((word_.fetch_or(writer, std::memory_order_acquire) & writer) != 0)
        backoff.wait();
    while (word_.load(std::memory_order_acquire) != writer)
        backoff.wait();
}

} // namespace base
