#include "i_resize_kernel.h"

#include "b_filter.h"

#include <algorithm>
#include <bit>
#include <cmath>

namespace iio {

namespace {

constexpr u32 samplesPerTap = 32;

struct Range {
    i64 first, last;
};

/// The source positions that a filter of `halfWidth` touches round `centre`.
Range touched(float centre, float halfWidth, u32 sourceSize, bool cutsAtEdges) {
    Range range{base::saturate<i32>(std::floor(centre - halfWidth)),
                base::saturate<i32>(std::ceil(centre + halfWidth))};
    const i64 window = i64(base::saturate<i32>(std::ceil(2 * halfWidth))) + 1;
    if (range.last - range.first >= window) {
        if (halfWidth - 1 > static_cast<float>(range.first))
            ++range.first;
        else
            --range.last;
    }
    if (cutsAtEdges) {
        range.first = std::max<i64>(range.first, 0);
        range.last = std::min<i64>(range.last, i64(sourceSize) - 1);
    }
    return range;
}

} // namespace

ResizeKernel::ResizeKernel(const base::Filter& filter, u32 sourceSize, u32 targetSize,
                           bool cutsAtEdges) {
    const float scale = static_cast<float>(targetSize) / static_cast<float>(sourceSize);
    const float inverse = 1 / scale;
    // Enlarging does not widen the filter.
    const float filterScale = std::min(scale, 1.0f);
    const float halfWidth = filter.width / filterScale;

    taps_.resize(targetSize);
    // Targets at the same distances from their sources share their weights: by their first
    // distance, the latest of them.
    base::hash_map<u32, std::pair<vector<float>, const Taps*>> known;
    vector<float> distances;
    for (u32 i = 0; i < targetSize; ++i) {
        const float centre = (static_cast<float>(i) + 0.5f) * inverse;
        const Range range = touched(centre, halfWidth, sourceSize, cutsAtEdges);
        Taps& taps = taps_[i];
        taps.first = range.first;
        if (range.last < range.first)
            continue;
        distances.resizeUninitialized(static_cast<std::size_t>(range.last - range.first + 1));
        for (std::size_t t = 0; t < distances.size(); ++t)
            distances[t] = static_cast<float>(range.first + static_cast<i64>(t)) - centre;
        auto& [knownDistances, same] = known[std::bit_cast<u32>(distances[0])];
        if (same && std::ranges::equal(knownDistances, distances)) {
            taps.offset = same->offset;
            taps.count = same->count;
        } else {
            addWeights(taps, filter, distances, filterScale);
            knownDistances = distances;
            same = &taps;
        }
    }

    first_ = taps_[0].first;
    for (const Taps& taps : taps_) {
        first_ = std::min(first_, taps.first);
        last_ = std::max(last_, taps.first + taps.count - 1);
        greatestCount_ = std::max(greatestCount_, taps.count);
    }
}

void ResizeKernel::addWeights(Taps& taps, const base::Filter& filter,
                              const vector<float>& distances, float filterScale) {
    taps.offset = weights_.size();
    float sum = 0;
    for (const float distance : distances) {
        const float weight = filter.sampleBox(distance, filterScale, samplesPerTap);
        weights_.push_back(weight);
        sum += weight;
    }
    if (sum == 0) {
        weights_.resize(taps.offset);
        return;
    }
    taps.count = static_cast<u32>(distances.size());
    for (std::size_t i = taps.offset; i < weights_.size(); ++i)
        weights_[i] /= sum;
}

} // namespace iio
