#include "GLTF/object_pool.h"

#include "b_memory.h"

#include <array>
#include <new>
#include <utility>

namespace GLTF {

namespace {

// The sanitizer watches single blocks of the system's allocator, not pieces of them.
#ifdef __SANITIZE_ADDRESS__
constexpr std::size_t largest = 0;
#else
constexpr std::size_t largest = 512;
#endif
constexpr std::size_t unit = 16, slabLength = 1 << 16;

struct FreeBlock {
    FreeBlock* next;
};

struct Slab {
    Slab* next;
    std::byte* begin() { return reinterpret_cast<std::byte*>(this) + unit; }
};

struct Pool {
    std::array<FreeBlock*, largest / unit + 1> freeBlocks{}; ///< by units
    Slab* slabs = nullptr;
    std::byte* next = nullptr; ///< in the first slab
    std::size_t left = 0;
    std::size_t blockCount = 0;

    void addSlab() {
        auto* slab = static_cast<Slab*>(base::AllocPolicy::allocate(slabLength));
        slab->next = slabs;
        slabs = slab;
        next = slab->begin();
        left = slabLength - unit;
    }
    void clear() {
        while (slabs)
            base::AllocPolicy::free(std::exchange(slabs, slabs->next));
        *this = Pool();
    }
};

Pool pool;

} // namespace

void* object_pool::allocate(std::size_t byteCount) {
    const std::size_t units = (byteCount + unit - 1) / unit;
    if (units >= pool.freeBlocks.size())
        return base::AllocPolicy::allocate(byteCount);
    ++pool.blockCount;
    if (FreeBlock* block = pool.freeBlocks[units]) {
        pool.freeBlocks[units] = block->next;
        return block;
    }
    if (pool.left < units * unit)
        pool.addSlab();
    pool.left -= units * unit;
    return std::exchange(pool.next, pool.next + units * unit);
}

void object_pool::free(void* block, std::size_t byteCount) noexcept {
    const std::size_t units = (byteCount + unit - 1) / unit;
    if (units >= pool.freeBlocks.size()) {
        base::AllocPolicy::free(block);
        return;
    }
    pool.freeBlocks[units] = new (block) FreeBlock{pool.freeBlocks[units]};
    if (--pool.blockCount == 0)
        pool.clear();
}

} // namespace GLTF
