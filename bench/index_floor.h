#pragma once

#include "b_containers.h"
#include "b_types.h"

namespace bench {

/// The floor of the single-index step: one pass of open addressing that numbers the pairs of
/// indices by first appearance.
struct PairNumbering {
    PairNumbering(const base::vector<base::u32>& first, const base::vector<base::u32>& second);

    base::vector<base::u32> numberOfPair;
    base::vector<base::u32> firstPair; ///< for each number where it came first
};

} // namespace bench
