#include "i_grid_sampler.h"

#include "i_component.h"

#include "b_exception.h"

#include <algorithm>
#include <cmath>
#include <span>

namespace iio {

namespace {

/// Instead of the index of a component: what a channel is that the format lacks.
enum Missing : i8 { isZero = -1, isOne = -2 };

/// The component that holds red, green, blue or alpha.
i8 componentOf(u8 format, u32 channel) {
    static constexpr i8 grey[] = {0, 0, 0, 0}, greyAlpha[] = {0, 0, 0, 1};
    static constexpr i8 pair[] = {0, 1, isZero, isOne};
    static constexpr i8 forward[] = {0, 1, 2, 3}, backward[] = {2, 1, 0, 3};
    switch (format) {
    case Image::kRG:
        return pair[channel];
    case Image::kLuminanceAlpha:
        return greyAlpha[channel];
    case Image::kRGB:
    case Image::kBGR:
        if (channel == 3)
            return isOne;
        [[fallthrough]];
    case Image::kRGBA:
    case Image::kBGRA:
        return (format == Image::kRGB || format == Image::kRGBA ? forward : backward)[channel];
    default:
        return grey[channel];
    }
}

template <class C>
void readComponents(const u8* row, u32 step, i8 component, std::span<float> out) {
    const C* source = reinterpret_cast<const C*>(row) + component;
    for (float& value : out) {
        value = toUnit(*source);
        source += step;
    }
}

/// The picture, if it can be sampled.
const Image& checked(const Image& image) {
    if (!GridSampler::canSample(image))
        throw base::switch_exception("i_grid_sampler", "iio::GridSampler", __LINE__);
    return image;
}

} // namespace

GridSampler::Axis::Axis(u32 gridSize, u32 pictureSize) {
    first.resize(gridSize);
    second.resize(gridSize);
    fraction.resize(gridSize);
    const auto size = static_cast<float>(pictureSize);
    const i64 count = pictureSize;
    const auto wrapped = [&](i64 i) { return static_cast<u32>((i % count + count) % count); };
    for (u32 i = 0; i < gridSize; ++i) {
        // In the steps and the precision of a single lookup, for the same numbers.
        const float coordinate = (static_cast<float>(i) + 0.5f) / static_cast<float>(gridSize);
        const float position = coordinate * size - 0.5f;
        const float left = std::floor(position);
        const i64 pixel = base::saturate<i32>(left);
        first[i] = wrapped(pixel);
        second[i] = wrapped(pixel + 1);
        fraction[i] = position - left;
        isOnPixels &= fraction[i] == 0 && first[i] == i;
    }
    isOnPixels &= gridSize == pictureSize;
}

bool GridSampler::canSample(const Image& image) {
    if (!image.hasPixels() || image.isCube() || image.isCompressed())
        return false;
    switch (image.type()) {
    case Image::IT_UNSIGNED_BYTE:
    case Image::IT_BYTE:
    case Image::IT_UNSIGNED_SHORT:
    case Image::kHalf:
    case Image::kFloat:
        return true;
    default:
        return false;
    }
}

GridSampler::GridSampler(const Image& image, u32 width, u32 height)
    : image_(checked(image)), columns_(width, image.width()), rows_(height, image.height()),
      isInteger_(image.type() != Image::kHalf && image.type() != Image::kFloat) {
    pixels_.resize(image.width());
}

const float* GridSampler::row(u32 channel, u32 y) {
    Channel& state = channels_[channel];
    const u32 first = rows_.first[y], second = rows_.second[y];
    const float fraction = rows_.fraction[y];
    const float* upper = mixedRow(state, channel, first, second);
    // A fraction of 0 takes the first alone, but for real numbers, which may be infinite.
    if (fraction == 0 && isInteger_)
        return upper;
    const float* lower = mixedRow(state, channel, second, first);
    state.result.resize(columns_.first.size());
    for (std::size_t x = 0; x < state.result.size(); ++x)
        state.result.data()[x] = upper[x] + (lower[x] - upper[x]) * fraction;
    return state.result.data();
}

/// Row `sourceRow` of the picture at the columns of the grid; `keptRow` stays if it is there.
const float* GridSampler::mixedRow(Channel& state, u32 channel, u32 sourceRow, u32 keptRow) {
    for (int i = 0; i < 2; ++i) {
        if (state.source[i] == sourceRow)
            return state.mixed[i].data();
    }
    const int slot = state.source[0] == keptRow ? 1 : 0;
    state.source[slot] = sourceRow;
    vector<float>& mixed = state.mixed[slot];
    mixed.resize(columns_.first.size());
    float* out = mixed.data();
    if (columns_.isOnPixels && isInteger_) {
        readRow(channel, sourceRow, out);
        return out;
    }
    float* pixels = pixels_.data();
    readRow(channel, sourceRow, pixels);
    const u32* first = columns_.first.data();
    const u32* second = columns_.second.data();
    const float* fraction = columns_.fraction.data();
    for (std::size_t x = 0; x < mixed.size(); ++x)
        out[x] = pixels[first[x]] + (pixels[second[x]] - pixels[first[x]]) * fraction[x];
    return out;
}

void GridSampler::readRow(u32 channel, u32 sourceRow, float* out) const {
    const std::span values(out, image_.width());
    const i8 component = componentOf(image_.format(), channel);
    if (component < 0) {
        std::ranges::fill(values, component == isOne ? 1.0f : 0.0f);
        return;
    }
    const u8* row = image_.row(sourceRow);
    const u32 step = image_.channelCount();
    switch (image_.type()) {
    case Image::IT_UNSIGNED_BYTE:
        return readComponents<u8>(row, step, component, values);
    case Image::IT_BYTE:
        return readComponents<i8>(row, step, component, values);
    case Image::IT_UNSIGNED_SHORT:
        return readComponents<u16>(row, step, component, values);
    case Image::kHalf:
        return readComponents<half>(row, step, component, values);
    default:
        return readComponents<float>(row, step, component, values);
    }
}

GridSampler::StoredRow GridSampler::storedRow(u32 channel, u32 y) const {
    const i8 component = componentOf(image_.format(), channel);
    if (component < 0 || image_.type() != Image::IT_UNSIGNED_BYTE || !columns_.isOnPixels ||
        !rows_.isOnPixels)
        return {};
    return {image_.row(y) + component, image_.channelCount()};
}

} // namespace iio
