#pragma once

#include "b_containers.h"
#include "b_types.h"

#include <array>
#include <bit>
#include <cstring>

namespace assimp {

/// Which elements of an array are equal.
struct Welding {
    /// For each element its number: from 0 by first appearance, equal elements share one.
    base::vector<base::u32> numbers;
    /// For each number the element that had it first.
    base::vector<base::u32> firsts;
};

/// Welds elements whose bytes are equal; T has no padding.
template <class T>
Welding weld(const base::vector<T>& elements) {
    using Words = std::array<base::u32, sizeof(T) / sizeof(base::u32)>;
    static_assert(sizeof(Words) == sizeof(T));
    const auto wordsOf = [&](base::u32 i) {
        Words words;
        std::memcpy(words.data(), &elements[i], sizeof(T));
        return words;
    };
    const auto hashOf = [](const Words& words) {
        base::u64 hash = 0;
        for (const base::u32 word : words) {
            hash = (hash ^ word) * 0x9e3779b97f4a7c15u;
            hash ^= hash >> 32;
        }
        return hash;
    };

    constexpr base::u32 empty = 0xffffffff;
    const auto count = static_cast<base::u32>(elements.size());
    base::vector<base::u32> table(std::bit_ceil(2 * std::size_t(count) + 1), empty);
    const std::size_t mask = table.size() - 1;
    base::u32* slots = table.data();
    Welding result;
    result.numbers.resizeUninitialized(count);
    base::u32* numbers = result.numbers.data();
    for (base::u32 i = 0; i < count; ++i) {
        const Words words = wordsOf(i);
        std::size_t slot = hashOf(words) & mask;
        while (slots[slot] != empty && wordsOf(result.firsts[slots[slot]]) != words)
            slot = (slot + 1) & mask;
        if (slots[slot] == empty) {
            slots[slot] = static_cast<base::u32>(result.firsts.size());
            result.firsts.push_back(i);
        }
        numbers[i] = slots[slot];
    }
    return result;
}

} // namespace assimp
