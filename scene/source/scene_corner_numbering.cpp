#include "scene_corner_numbering.h"

#include "b_log.h"
#include "scene_weld.h"

#include <algorithm>
#include <array>
#include <bit>
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
            hash = mixHash(hash, column[corner]);
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
base::vector<u32> numberEqualOf(const void* elements, u32 count) {
    using Element = std::array<u32, WordCount>;
    const auto at = [all = static_cast<const Element*>(elements), count](u32 i) {
        return i < count ? all[i] : Element{};
    };
    const auto hashOf = [&](u32 i) {
        u64 hash = 0;
        for (const u32 word : at(i))
            hash = mixHash(hash, word);
        return hash;
    };
    const auto areEqual = [&](u32 i, u32 j) { return at(i) == at(j); };
    Welding welding = Welder(count + 1, hashOf, areEqual).run();
    return welding.firsts.size() <= count ? std::move(welding.numbers) : base::vector<u32>();
}

} // namespace

base::vector<u32> numberEqual(const void* elements, u32 wordCount, u32 count) {
    switch (wordCount) {
    case 1:
        return numberEqualOf<1>(elements, count);
    case 2:
        return numberEqualOf<2>(elements, count);
    case 3:
        return numberEqualOf<3>(elements, count);
    default:
        return numberEqualOf<4>(elements, count);
    }
}

} // namespace scene
