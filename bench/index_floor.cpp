#include "index_floor.h"

#include <bit>

namespace bench {

using base::u32;
using base::u64;

PairNumbering::PairNumbering(const base::vector<u32>& first, const base::vector<u32>& second) {
    constexpr u32 none = 0xffffffff;
    const u32 pairCount = static_cast<u32>(first.size());
    base::vector<u32> table(2 * std::bit_ceil(std::size_t(pairCount)), none);
    numberOfPair.resizeUninitialized(pairCount);
    firstPair.resizeUninitialized(pairCount);
    u32* const slots = table.data();
    u32* const numbers = numberOfPair.data();
    u32* const firsts = firstPair.data();
    const int shift = 64 - std::countr_zero(table.size());
    const std::size_t mask = table.size() - 1;

    u32 count = 0;
    for (u32 i = 0; i < pairCount; ++i) {
        const u64 key = u64{first[i]} << 32 | second[i];
        std::size_t slot = key * 0x9e3779b97f4a7c15u >> shift;
        while (slots[slot] != none &&
               (first[firsts[slots[slot]]] != first[i] || second[firsts[slots[slot]]] != second[i]))
            slot = (slot + 1) & mask;
        if (slots[slot] == none) {
            firsts[count] = i;
            slots[slot] = count++;
        }
        numbers[i] = slots[slot];
    }
    firstPair.resize(count);
}

} // namespace bench
