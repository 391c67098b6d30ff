#include "scene_corner_numbering.h"

#include "b_log.h"

#include <algorithm>
#include <array>
#include <bit>
#include <numeric>
#include <utility>

namespace scene {

using base::u32;
using base::u64;

namespace {

constexpr u32 none = 0xffffffff;
/// Vertices at one position at which positions are given up as buckets: a mesh of few positions
/// and many normals would be searched in quadratic time.
constexpr u32 longestChain = 64;
/// Corners between two reports, and the least number of corners that is worth one.
constexpr u32 reportInterval = 100000;

u64 mix(u64 hash, u64 word) {
    hash = (hash ^ word) * 0x9e3779b97f4a7c15u;
    return hash ^ (hash >> 32);
}

/// The vertices made so far, chained by bucket. As long as that does, the buckets are the entries
/// of the first column: neighbouring faces then touch neighbouring memory, which no scattering
/// hash can offer. The key of a vertex is read at its first corner.
class VertexChains {
public:
    VertexChains(std::span<const u32* const> columns, u32 cornerCount, u32 bound)
        : columns_(columns), heads_(bound, none) {
        // As many as there can be; memory that no vertex needs is never touched.
        next_.resizeUninitialized(cornerCount);
        firstCorner_.resizeUninitialized(cornerCount);
    }

    /// Numbers corners [begin, end), which follow those numbered before.
    void number(u32 begin, u32 end, u32* numbers) {
        u32 c = begin;
        const std::span<const u32* const> others = columns_.subspan(1);
        for (; !hashed_ && c < end; ++c)
            numbers[c] = findOrAdd(columns_[0][c], c, others);
        for (; c < end; ++c)
            numbers[c] = findOrAdd(hashBucket(c), c, columns_);
    }

    base::vector<u32> takeFirstCorners() {
        firstCorner_.resize(count_);
        return std::move(firstCorner_);
    }

private:
    u32 findOrAdd(u32 bucket, u32 corner, std::span<const u32* const> columns) {
        u32* heads = heads_.data();
        u32* next = next_.data();
        u32* firstCorner = firstCorner_.data();
        u32 steps = 0;
        for (u32 v = heads[bucket]; v != none; v = next[v], ++steps)
            if (areEqual(firstCorner[v], corner, columns))
                return v;
        next[count_] = std::exchange(heads[bucket], count_);
        firstCorner[count_] = corner;
        ++count_;
        if (steps > longestChain && !hashed_)
            rehash();
        return count_ - 1;
    }

    static bool areEqual(u32 a, u32 b, std::span<const u32* const> columns) {
        for (const u32* column : columns)
            if (column[a] != column[b])
                return false;
        return true;
    }

    u32 hashBucket(u32 corner) const {
        u64 hash = 0;
        for (const u32* column : columns_)
            hash = mix(hash, column[corner]);
        return static_cast<u32>(hash) & (static_cast<u32>(heads_.size()) - 1);
    }

    void rehash() {
        hashed_ = true;
        heads_ = base::vector<u32>(std::bit_ceil(next_.size()), none);
        for (u32 v = 0; v < count_; ++v)
            next_[v] = std::exchange(heads_[hashBucket(firstCorner_[v])], v);
    }

    std::span<const u32* const> columns_;
    base::vector<u32> heads_;
    base::vector<u32> next_;
    base::vector<u32> firstCorner_;
    u32 count_ = 0;
    bool hashed_ = false;
};

} // namespace

CornerNumbering numberCorners(std::span<const u32* const> columns, u32 cornerCount,
                              u32 firstColumnBound, const base::string& name) {
    const bool reporting = cornerCount > reportInterval;
    const base::string text =
        reporting ? base::format("Generating master index array for {}...", name) : base::string();
    VertexChains chains(columns, cornerCount, firstColumnBound);
    CornerNumbering result;
    result.vertexOfCorner.resizeUninitialized(cornerCount);
    for (u32 begin = 0, end = 0; begin < cornerCount; begin = end) {
        if (reporting)
            base::log().progress(static_cast<u32>(u64(begin) * 100 / cornerCount), text);
        end = begin + std::min(reportInterval, cornerCount - begin);
        chains.number(begin, end, result.vertexOfCorner.data());
    }
    if (reporting)
        base::log().progressEnd();
    result.firstCorner = chains.takeFirstCorners();
    return result;
}

namespace {

template <std::size_t WordCount>
using Element = std::array<u32, WordCount>;

/// Open addressing over the bytes of elements. The slots are asked for some elements ahead, since
/// nearly each lies in memory that is not at hand.
template <std::size_t WordCount>
class ElementTable {
public:
    ElementTable(const Element<WordCount>* elements, u32 count)
        : elements_(elements), count_(count),
          slots_(std::bit_ceil(2 * (std::size_t(count) + 1)), none) {}

    base::vector<u32> findFirst() {
        base::vector<u32> first; // made at the first repetition
        std::array<u64, ahead> hashes{};
        u32* slots = slots_.data();
        const std::size_t mask = slots_.size() - 1;
        for (u64 i = 0; i < count_ + u64(1) + ahead; ++i) {
            if (i >= ahead) {
                const u32 index = static_cast<u32>(i - ahead);
                const u32 found = findOrAdd(index, hashes[i % ahead], slots, mask);
                if (found != index && first.empty())
                    first = identity(index);
                if (!first.empty())
                    first.data()[index] = found;
            }
            if (i <= count_) {
                hashes[i % ahead] = hashOf(at(static_cast<u32>(i)));
                __builtin_prefetch(slots + (hashes[i % ahead] & mask), 1);
            }
        }
        return first;
    }

private:
    static constexpr u64 ahead = 16;

    Element<WordCount> at(u32 i) const { return i < count_ ? elements_[i] : Element<WordCount>{}; }

    static u64 hashOf(const Element<WordCount>& element) {
        u64 hash = 0;
        for (const u32 word : element)
            hash = mix(hash, word);
        return hash;
    }

    u32 findOrAdd(u32 index, u64 hash, u32* slots, std::size_t mask) const {
        const Element<WordCount> element = at(index);
        std::size_t slot = hash & mask;
        while (slots[slot] != none) {
            if (at(slots[slot]) == element)
                return slots[slot];
            slot = (slot + 1) & mask;
        }
        return slots[slot] = index;
    }

    base::vector<u32> identity(u32 filled) const {
        base::vector<u32> result;
        result.resizeUninitialized(std::size_t(count_) + 1);
        std::iota(result.data(), result.data() + filled, 0u);
        return result;
    }

    const Element<WordCount>* elements_;
    u32 count_;
    base::vector<u32> slots_;
};

template <std::size_t WordCount>
base::vector<u32> findFirstEqualOf(const void* elements, u32 count) {
    return ElementTable(static_cast<const Element<WordCount>*>(elements), count).findFirst();
}

} // namespace

base::vector<u32> findFirstEqual(const void* elements, u32 wordCount, u32 count) {
    switch (wordCount) {
    case 1:
        return findFirstEqualOf<1>(elements, count);
    case 2:
        return findFirstEqualOf<2>(elements, count);
    case 3:
        return findFirstEqualOf<3>(elements, count);
    default:
        return findFirstEqualOf<4>(elements, count);
    }
}

} // namespace scene
