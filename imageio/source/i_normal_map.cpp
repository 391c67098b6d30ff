#include "i_normal_map.h"

#include "i_operation.h"
#include "i_sampler.h"

#include <algorithm>
#include <cmath>

namespace iio {

namespace {

/// Heights of one row with the neighbours of its ends: place x + 1 holds the height at x.
using HeightRow = vector<float>;

/// Reads rows of heights; above the first and below the last one the picture repeats.
class HeightReader {
public:
    HeightReader(const Image& source, u32 channel)
        : sampler_(createSampler(source, {.filter = SamplerOptions::area})), channel_(channel),
          width_(source.width()), texels_(u64(width_) * 4) {}

    bool isReady() const { return sampler_ != nullptr; }

    void read(i32 y, HeightRow& heights) {
        sampler_->readBlock(texels_.data(), 0, y, width_, 1);
        heights.resize(u64(width_) + 2);
        const float* texel = texels_.data() + std::min(channel_, 3u);
        for (u32 x = 0; x < width_; ++x, texel += 4)
            heights[x + 1] = *texel;
        heights[0] = heights[width_];
        heights[width_ + 1] = heights[1];
    }

private:
    std::unique_ptr<Sampler> sampler_;
    u32 channel_;
    u32 width_;
    vector<float> texels_;
};

template <class Real>
u8 toByte(Real x) {
    // Not a number fails the first test.
    const Real positive = x > 0 ? x : 0;
    return static_cast<u8>(static_cast<i32>(positive < 255 ? positive : Real(255)));
}

/// One row of the map, as three rows of components. Red and green are calculated in float and blue
/// in double: flat ground is 128, 128, 254 only so.
void convertRow(const float* __restrict above, const float* __restrict row,
                const float* __restrict below, u32 width, float signedStrength, u8* __restrict red,
                u8* __restrict green, u8* __restrict blue) {
    for (u64 x = 0; x < width; ++x) {
        const float a = above[x], b = above[x + 1], c = above[x + 2];
        const float d = row[x], e = row[x + 2];
        const float f = below[x], g = below[x + 1], h = below[x + 2];
        const float dx = (c - a - 2 * d + 2 * e - f + h) * signedStrength;
        const float dy = (f + 2 * g + h - a - 2 * b - c) * signedStrength;
        const float s = dx * dx + dy * dy;
        const float k = 1 / (s + 1);
        const float lengthX = std::sqrt(dx * dx * k), lengthY = std::sqrt(dy * dy * k);
        const float nx = dx > 0 ? -lengthX : lengthX;
        const float ny = dy > 0 ? -lengthY : lengthY;
        red[x] = toByte(nx * 127 + 128);
        green[x] = toByte((ny + 1.007874f) * 127);
        // The root of slopes beyond 45 degrees is no number, and blue 0 then.
        blue[x] = toByte((std::sqrt(1.0 - double(s)) + 1.007874) * 127.0);
    }
}

void interleave(const u8* __restrict red, const u8* __restrict green, const u8* __restrict blue,
                u32 width, u8* __restrict pixels) {
    for (u64 x = 0; x < width; ++x) {
        pixels[3 * x] = red[x];
        pixels[3 * x + 1] = green[x];
        pixels[3 * x + 2] = blue[x];
    }
}

} // namespace

ref<Image> makeNormalMap(const Image& source, u32 channel, float strength, bool invert) {
    HeightReader reader(source, channel);
    if (!reader.isReady())
        return {};
    const u32 width = source.width(), height = source.height();
    auto map =
        base::makeRef<Image>(width, height, 1u, 1u, u8(Image::kRGB), u8(Image::IT_UNSIGNED_BYTE));
    if (!map->data())
        return {};
    map->setPath(source.path());

    HeightRow above, row, below;
    vector<u8> components(u64(width) * 3);
    u8* const red = components.data();
    u8* const green = red + width;
    u8* const blue = green + width;
    reader.read(-1, above);
    reader.read(0, row);
    for (u32 y = 0; y < height; ++y) {
        reader.read(static_cast<i32>(y + 1), below);
        convertRow(above.data(), row.data(), below.data(), width, invert ? -strength : strength,
                   red, green, blue);
        interleave(red, green, blue, width, map->row(y));
        above.swap(row);
        row.swap(below);
    }
    return map;
}

} // namespace iio
