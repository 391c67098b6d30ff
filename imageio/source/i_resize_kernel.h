#pragma once

#include "i_image_types.h"

namespace base {
class Filter;
}

namespace iio {

/// Which source positions of one axis make each target position, and with what weights.
class ResizeKernel {
public:
    /// What makes one target position: `count` source positions from `first` on. Without cutting
    /// they may lie outside the source. A count of 0 makes zero.
    struct Taps {
        i64 first = 0;
        u32 count = 0;
        u64 offset = 0; ///< of the first weight
    };

    /// For `sourceSize` positions that become `targetSize`, both at least 1. With `cutsAtEdges`
    /// positions outside the source have no part; the weights of what is left add up to 1 again.
    ResizeKernel(const base::Filter& filter, u32 sourceSize, u32 targetSize, bool cutsAtEdges);

    const Taps& taps(u32 target) const noexcept { return taps_[target]; }
    const float* weights(const Taps& taps) const noexcept { return weights_.data() + taps.offset; }
    u32 targetSize() const noexcept { return static_cast<u32>(taps_.size()); }
    i64 first() const noexcept { return first_; } ///< least source position of all
    i64 last() const noexcept { return last_; }   ///< greatest one
    u32 greatestCount() const noexcept { return greatestCount_; }

private:
    void addWeights(Taps& taps, const base::Filter& filter, const vector<float>& distances,
                    float filterScale);

    vector<Taps> taps_;
    vector<float> weights_; ///< of equal rows, the first alone
    i64 first_ = 0, last_ = -1;
    u32 greatestCount_ = 0;
};

} // namespace iio
