#pragma once

#include "b_containers.h"
#include "b_types.h"

#include <array>
#include <cstring>
#include <utility>

namespace scene {

/// Which elements of an array are equal.
struct Welding {
    /// For each element its number: from 0 by first appearance, equal elements share one.
    base::vector<base::u32> numbers;
    /// For each number the element that had it first.
    base::vector<base::u32> firsts;
};

/// Appends a word to a hash.
inline base::u64 mixHash(base::u64 hash, base::u32 word) {
    hash = (hash ^ word) * 0x9e3779b97f4a7c15u;
    return hash ^ (hash >> 32);
}

/// Welds elements 0 to `count` - 1 by `hashOf(i)` and `areEqual(i, j)`.
template <class HashOf, class AreEqual>
class Welder {
public:
    Welder(base::u32 count, const HashOf& hashOf, const AreEqual& areEqual)
        : count_(count), hashOf_(hashOf), areEqual_(areEqual), slots_(1024, empty) {
        result_.numbers.resizeUninitialized(count);
    }

    Welding run() {
        // Slots are asked for some elements ahead, as nearly each lies in memory not at hand.
        std::array<base::u64, 16> hashes{};
        for (base::u64 i = 0; i < count_ + hashes.size(); ++i) {
            base::u64& hash = hashes[i % hashes.size()];
            if (i >= hashes.size())
                add(static_cast<base::u32>(i - hashes.size()), hash);
            if (i < count_) {
                hash = hashOf_(static_cast<base::u32>(i));
                __builtin_prefetch(slots_.cbegin() + (hash & (slots_.size() - 1)));
            }
        }
        return std::move(result_);
    }

private:
    static constexpr base::u32 empty = 0xffffffff;

    void add(base::u32 element, base::u64 hash) {
        const base::u32* firsts = result_.firsts.cbegin();
        base::u32& slot =
            findSlot(hash, [&](base::u32 number) { return areEqual_(firsts[number], element); });
        const bool isNew = slot == empty;
        if (isNew)
            slot = static_cast<base::u32>(result_.firsts.size());
        result_.numbers.data()[element] = slot;
        if (isNew) {
            result_.firsts.push_back(element);
            if (2 * result_.firsts.size() > slots_.size())
                grow();
        }
    }

    /// The slot that holds the sought number, else a free one for it.
    template <class IsSought>
    base::u32& findSlot(base::u64 hash, const IsSought& isSought) {
        const std::size_t mask = slots_.size() - 1;
        base::u32* slots = slots_.data();
        std::size_t slot = hash & mask;
        while (slots[slot] != empty && !isSought(slots[slot]))
            slot = (slot + 1) & mask;
        return slots[slot];
    }

    /// Most elements are equal to others: a table for as many as there are at all would be far
    /// from the processor.
    void grow() {
        slots_ = base::vector<base::u32>(4 * slots_.size(), empty);
        base::u32 number = 0;
        for (const base::u32 first : std::as_const(result_.firsts))
            findSlot(hashOf_(first), [](base::u32) { return false; }) = number++;
    }

    base::u32 count_;
    const HashOf& hashOf_;
    const AreEqual& areEqual_;
    base::vector<base::u32> slots_; ///< numbers by their hashes, with open addressing
    Welding result_;
};

/// Welds elements whose bytes are equal; T has no padding.
template <class T>
Welding weld(const base::vector<T>& elements) {
    using Words = std::array<base::u32, sizeof(T) / sizeof(base::u32)>;
    static_assert(sizeof(Words) == sizeof(T));
    const T* all = elements.data();
    const auto wordsOf = [all](base::u32 i) {
        Words words;
        std::memcpy(words.data(), all + i, sizeof(T));
        return words;
    };
    const auto hashOf = [&](base::u32 i) {
        base::u64 hash = 0;
        for (const base::u32 word : wordsOf(i))
            hash = mixHash(hash, word);
        return hash;
    };
    const auto areEqual = [&](base::u32 i, base::u32 j) { return wordsOf(i) == wordsOf(j); };
    return Welder(static_cast<base::u32>(elements.size()), hashOf, areEqual).run();
}

/// Welds rows of a table of `count` rows, which is given by its columns.
inline Welding weldRows(const base::vector<const base::u32*>& columns, base::u32 count) {
    const auto hashOf = [&](base::u32 row) {
        base::u64 hash = 0;
        for (const base::u32* column : columns)
            hash = mixHash(hash, column[row]);
        return hash;
    };
    const auto areEqual = [&](base::u32 a, base::u32 b) {
        for (const base::u32* column : columns)
            if (column[a] != column[b])
                return false;
        return true;
    };
    return Welder(count, hashOf, areEqual).run();
}

/// Welds the pairs of elements of two arrays of the same length.
template <class T, class U>
Welding weld(const base::vector<T>& first, const base::vector<U>& second) {
    const Welding a = weld(first), b = weld(second);
    return weldRows({a.numbers.data(), b.numbers.data()}, static_cast<base::u32>(first.size()));
}

} // namespace scene
