#include "b_lock.h"
#include "b_refcnt.h"

#include <array>
#include <gtest/gtest.h>
#include <mutex>
#include <random>
#include <shared_mutex>
#include <thread>
#include <vector>

namespace base {
namespace {

class Counted : public RefCntAtomic {
public:
    explicit Counted(int& living) : living_(living) { ++living_; }
    ~Counted() override { --living_; }

private:
    int& living_;
};

TEST(Ref, CountsThroughEveryWayOfCopying) {
    int living = 0;
    {
        ref<Counted> a = makeRef<Counted>(living);
        ref<RefCntAtomic> base = a;
        ref<Counted> b;
        b = a;
        b = std::move(a);
        EXPECT_EQ(a, nullptr);
        EXPECT_EQ(b->refCount(), 2);
        base.reset();
        ref<Counted>& same = b;
        b = same;
        EXPECT_EQ(b->refCount(), 1);
        Counted* taken = b.detach();
        EXPECT_EQ(taken->refCount(), 1);
        taken->release();
        EXPECT_EQ(living, 0);
    }
    EXPECT_EQ(living, 0);
}

TEST(WeakRef, IsNullAfterTheTargetAndLeavesInAnyOrder) {
    std::mt19937 random(3);
    for (int round = 0; round < 50; ++round) {
        int living = 0;
        ref<Counted> target = makeRef<Counted>(living), other = makeRef<Counted>(living);
        std::vector<weak_ref<Counted>> links(6, weak_ref<Counted>(target.get()));
        std::vector<Counted*> expected(6, target.get());
        for (int change = 0; change < 6; ++change) {
            const std::size_t i = random() % 6;
            expected[i] = std::array<Counted*, 3>{nullptr, other.get(), target.get()}[random() % 3];
            links[i] = expected[i];
        }
        Counted* dead = target.get();
        target.reset();
        EXPECT_EQ(living, 1);
        for (std::size_t i = 0; i < 6; ++i)
            EXPECT_EQ(links[i].get(), expected[i] == dead ? nullptr : expected[i]);
    }
}

TEST(Locks, KeepWritersApartAndReadersOut) {
    ReadWriteSpinLock lock;
    SpinLock tallyLock;
    int a = 0, b = 0, tally = 0;
    const auto work = [&] {
        for (int i = 0; i < 4000; ++i) {
            if (i % 4 == 0) {
                const std::lock_guard guard(lock);
                ++a;
                std::this_thread::yield();
                ++b;
            } else {
                const std::shared_lock guard(lock);
                const std::lock_guard tallyGuard(tallyLock);
                tally += a == b;
            }
        }
    };
    std::vector<std::thread> threads;
    for (int i = 0; i < 4; ++i)
        threads.emplace_back(work);
    for (std::thread& thread : threads)
        thread.join();
    EXPECT_EQ(a, 4000);
    EXPECT_EQ(b, 4000);
    EXPECT_EQ(tally, 12000);
}

} // namespace
} // namespace base
