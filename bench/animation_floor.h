#pragma once

#include "b_types.h"

#include <vector>

/// The floor of evaluation: a search and a linear interpolation in plain arrays.
namespace bench {

struct PlainCurve {
    std::vector<base::i64> times; ///< ticks, ascending, two at least
    std::vector<float> values;
};

/// `time` lies within the keys.
float evaluatePlain(const PlainCurve& curve, base::i64 time);

} // namespace bench
