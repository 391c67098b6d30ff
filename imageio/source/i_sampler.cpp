#include "i_sampler.h"

#include "i_block_decode.h"
#include "i_component.h"
#include "i_operation.h"

#include "b_exception.h"

#include <algorithm>
#include <cmath>

namespace iio {

namespace {

using Colour = float[4];

constexpr u32 mostTapsAlongAxis = 32;

/// The coordinate inside 0..extent - 1 that stands for `i`; -1 for the border.
i64 wrapped(i64 i, i64 extent, u32 mode) {
    if (i >= 0 && i < extent)
        return i;
    const i64 remainder = i % extent;
    const i64 inside = remainder < 0 ? remainder + extent : remainder;
    switch (mode) {
    case SamplerOptions::repeat:
        return inside;
    case SamplerOptions::mirror:
        return (i / extent & 1) != 0 ? extent - inside - 1 : inside;
    case SamplerOptions::clampToEdge:
        return std::clamp<i64>(i, 0, extent - 1);
    default:
        return -1;
    }
}

void mix(const Colour& a, const Colour& b, float fraction, Colour& out) {
    for (int c = 0; c < 4; ++c)
        out[c] = a[c] + (b[c] - a[c]) * fraction;
}

float length(base::vec2f v) {
    return std::sqrt(v.x * v.x + v.y * v.y);
}

/// All but the fetching of a texel, which `Derived` does: `fetch(x, y, out)` of one inside the
/// data, where the faces of a cube map lie below each other.
template <class Derived>
class BaseSampler : public Sampler {
public:
    BaseSampler(const Image& image, const SamplerOptions& options)
        : options_(options), pixels_(image.data()), pitch_(image.pitch()), width_(image.width()),
          height_(image.height()), floatWidth_(static_cast<float>(width_)),
          floatHeight_(static_cast<float>(height_)), isCube_(image.isCube()) {
        if (isCube_)
            options_.wrapU = options_.wrapV = SamplerOptions::clampToEdge;
    }

    void sample(float (&out)[4], base::vec2f uv) const final {
        const u32 face = faceOf(uv);
        if (options_.filter == SamplerOptions::nearest)
            read(out, base::saturate<i32>(uv.x * floatWidth_),
                 base::saturate<i32>(uv.y * floatHeight_), face);
        else
            readMixed(out, uv, face);
    }

    void texel(float (&out)[4], i32 x, i32 y, u32) const final {
        const u32 face = faceOf(y);
        read(out, x, y - height_ * face, face);
    }

    void sampleArea(float (&out)[4], base::vec2f uv, base::vec2f dx, base::vec2f dy) const final;

    void readBlock(float* out, i32 x, i32 y, u32 width, u32 height) const final {
        const i64 lastX = i64(x) + width, lastY = i64(y) + height;
        for (i64 row = y; row < lastY; ++row) {
            const u32 face = faceOf(row);
            const i64 inFace = row - height_ * face;
            const bool isInside = inFace >= 0 && inFace < height_;
            for (i64 column = x; column < lastX; ++column, out += 4) {
                auto& colour = *reinterpret_cast<Colour*>(out);
                if (isInside && column >= 0 && column < width_)
                    fetch(column, row, colour);
                else
                    read(colour, column, inFace, face);
            }
        }
    }

protected:
    const u8* row(i64 y) const { return pixels_ + static_cast<u64>(pitch_) * static_cast<u64>(y); }
    const u8* pixels() const { return pixels_; }
    i64 height() const { return height_; }

private:
    /// The face of a cube map in which `uv` lies; `uv` becomes the place in it.
    u32 faceOf(base::vec2f& uv) const {
        if (!isCube_)
            return 0;
        const float scaled = uv.y * 6;
        const u32 face = std::min(base::saturate<u32>(scaled), 5u);
        uv.y = scaled - static_cast<float>(face);
        return face;
    }

    /// The face in which row `y` of the stacked faces lies.
    u32 faceOf(i64 y) const {
        return isCube_ ? static_cast<u32>(std::clamp<i64>(y / height_, 0, 5)) : 0;
    }

    void fetch(i64 x, i64 y, Colour& out) const {
        static_cast<const Derived*>(this)->fetch(x, y, out);
    }

    /// A texel of `face`, wrapped.
    void read(Colour& out, i64 x, i64 y, u32 face) const {
        x = wrapped(x, width_, options_.wrapU);
        y = wrapped(y, height_, options_.wrapV);
        if (x < 0 || y < 0)
            std::copy(std::begin(options_.borderColor), std::end(options_.borderColor), out);
        else
            fetch(x, y + height_ * face, out);
    }

    void readMixed(Colour& out, base::vec2f uv, u32 face) const {
        const float x = uv.x * floatWidth_ - 0.5f;
        const float y = uv.y * floatHeight_ - 0.5f;
        const float left = std::floor(x), top = std::floor(y);
        const i64 x0 = base::saturate<i32>(left), y0 = base::saturate<i32>(top);
        Colour texels[4] = {};
        const bool areInside = x0 >= 0 && x0 + 1 < width_ && y0 >= 0 && y0 + 1 < height_;
        for (int i = 0; i < 4; ++i) {
            if (areInside)
                fetch(x0 + i % 2, y0 + i / 2 + height_ * face, texels[i]);
            else
                read(texels[i], x0 + i % 2, y0 + i / 2, face);
        }
        const float fractionX = std::isfinite(x) ? x - left : 0;
        const float fractionY = std::isfinite(y) ? y - top : 0;
        Colour upper, lower;
        mix(texels[0], texels[1], fractionX, upper);
        mix(texels[2], texels[3], fractionX, lower);
        mix(upper, lower, fractionY, out);
    }

    SamplerOptions options_;
    const u8* pixels_;
    u32 pitch_;
    i64 width_, height_;
    float floatWidth_, floatHeight_;
    bool isCube_;
};

/// The mean of linear lookups on a grid over the footprint, one a texel. A footprint that is longer
/// than the limit of anisotropy times its breadth is sampled at that breadth's distance instead.
template <class Derived>
void BaseSampler<Derived>::sampleArea(float (&out)[4], base::vec2f uv, base::vec2f dx,
                                      base::vec2f dy) const {
    if (options_.filter != SamplerOptions::area)
        return sample(out, uv);
    const float alongX = length({dx.x * floatWidth_, dx.y * floatHeight_});
    const float alongY = length({dy.x * floatWidth_, dy.y * floatHeight_});
    const float limit = std::max(options_.anisotropyLimit, 1.0f);
    const auto tapCount = [&](float own, float other) {
        const float limited = std::min(own, std::max(other, 1.0f) * limit);
        return std::clamp(base::saturate<u32>(std::ceil(limited)), 1u, mostTapsAlongAxis);
    };
    const u32 countX = tapCount(alongX, alongY), countY = tapCount(alongY, alongX);
    Colour sum = {};
    for (u32 j = 0; j < countY; ++j) {
        const float t = (static_cast<float>(j) + 0.5f) / static_cast<float>(countY) - 0.5f;
        for (u32 i = 0; i < countX; ++i) {
            const float s = (static_cast<float>(i) + 0.5f) / static_cast<float>(countX) - 0.5f;
            base::vec2f at{uv.x + dx.x * s + dy.x * t, uv.y + dx.y * s + dy.y * t};
            Colour colour = {};
            const u32 face = faceOf(at);
            readMixed(colour, at, face);
            for (int c = 0; c < 4; ++c)
                sum[c] += colour[c];
        }
    }
    for (int c = 0; c < 4; ++c)
        out[c] = sum[c] / static_cast<float>(countX * countY);
}

template <class C>
class GreySampler final : public BaseSampler<GreySampler<C>> {
public:
    using BaseSampler<GreySampler>::BaseSampler;
    void fetch(i64 x, i64 y, Colour& out) const {
        const float grey = toUnit(reinterpret_cast<const C*>(this->row(y))[x]);
        std::fill(std::begin(out), std::end(out), grey);
    }
};

/// Of two components: red and green or, with `swap`, grey and alpha.
template <bool swap>
void setPair(float first, float second, Colour& out) {
    out[0] = first;
    out[1] = swap ? first : second;
    out[2] = swap ? first : 0.0f;
    out[3] = swap ? second : 1.0f;
}

template <class C, bool swap>
class RGSampler final : public BaseSampler<RGSampler<C, swap>> {
public:
    using BaseSampler<RGSampler>::BaseSampler;
    void fetch(i64 x, i64 y, Colour& out) const {
        const C* pixel = reinterpret_cast<const C*>(this->row(y)) + 2 * x;
        setPair<swap>(toUnit(pixel[0]), toUnit(pixel[1]), out);
    }
};

/// Three or four channels; with `swap`, blue comes first.
template <class C, int channelCount, bool swap>
class RGBSampler final : public BaseSampler<RGBSampler<C, channelCount, swap>> {
public:
    using BaseSampler<RGBSampler>::BaseSampler;
    void fetch(i64 x, i64 y, Colour& out) const {
        const C* pixel = reinterpret_cast<const C*>(this->row(y)) + channelCount * x;
        out[0] = toUnit(pixel[swap ? 2 : 0]);
        out[1] = toUnit(pixel[1]);
        out[2] = toUnit(pixel[swap ? 0 : 2]);
        out[3] = channelCount == 4 ? toUnit(pixel[3]) : 1.0f;
    }
};

/// Turns the components of a block's pixel into a colour.
using Spread = void (*)(const u8 (&pixel)[4], Colour& out);

template <bool hasAlpha>
void spreadColour(const u8 (&pixel)[4], Colour& out) {
    for (int c = 0; c < 4; ++c)
        out[c] = c < 3 || hasAlpha ? toUnit(pixel[c]) : 1.0f;
}

void spreadGrey(const u8 (&pixel)[4], Colour& out) {
    std::fill(std::begin(out), std::end(out), toUnit(pixel[0]));
}

template <bool swap>
void spreadPair(const u8 (&pixel)[4], Colour& out) {
    setPair<swap>(toUnit(pixel[0]), toUnit(pixel[1]), out);
}

/// Decodes the block that holds the texel.
template <Spread spread>
class BlockSampler final : public BaseSampler<BlockSampler<spread>> {
public:
    BlockSampler(const Image& image, const SamplerOptions& options)
        : BaseSampler<BlockSampler>(image, options), grid_(image),
          decode_(findBlockFormat(image.format())->decode) {}
    void fetch(i64 x, i64 y, Colour& out) const {
        const auto layer = static_cast<u32>(y / this->height());
        y %= this->height();
        const u64 offset = grid_.offset(layer, static_cast<u32>(x / 4), static_cast<u32>(y / 4));
        BlockPixels pixels;
        decode_(this->pixels() + offset, pixels);
        spread(pixels.components[y % 4 * 4 + x % 4], out);
    }

private:
    BlockGrid grid_;
    void (*decode_)(const u8*, BlockPixels&);
};

using DXT1Sampler = BlockSampler<spreadColour<false>>;
using DXT1ASampler = BlockSampler<spreadColour<true>>;
using DXT3Sampler = BlockSampler<spreadColour<true>>;
using DXT5Sampler = BlockSampler<spreadColour<true>>;
using BC4Sampler = BlockSampler<spreadGrey>;
template <bool swap>
using BC5Sampler = BlockSampler<spreadPair<swap>>;

using Made = std::unique_ptr<Sampler>;

[[noreturn]] void throwWithoutSampler() {
    throw base::switch_exception("i_sampler", "iio::createSampler", __LINE__);
}

/// Components of type C, by format.
template <class C>
Made makePlain(const Image& image, const SamplerOptions& options) {
    switch (image.format()) {
    case Image::kRGB:
        return std::make_unique<RGBSampler<C, 3, false>>(image, options);
    case Image::kRGBA:
        return std::make_unique<RGBSampler<C, 4, false>>(image, options);
    case Image::kBGR:
        return std::make_unique<RGBSampler<C, 3, true>>(image, options);
    case Image::kBGRA:
        return std::make_unique<RGBSampler<C, 4, true>>(image, options);
    case Image::kRG:
        return std::make_unique<RGSampler<C, false>>(image, options);
    case Image::kLuminanceAlpha:
        return std::make_unique<RGSampler<C, true>>(image, options);
    default:
        return std::make_unique<GreySampler<C>>(image, options);
    }
}

Made makeBlock(const Image& image, const SamplerOptions& options) {
    switch (image.format()) {
    case Image::kDXT1:
        return std::make_unique<DXT1Sampler>(image, options);
    case Image::kDXT1A:
        return std::make_unique<DXT1ASampler>(image, options);
    case Image::kDXT3:
        return std::make_unique<DXT3Sampler>(image, options);
    case Image::kDXT5:
        return std::make_unique<DXT5Sampler>(image, options);
    case Image::kLATC1:
    case Image::kRGTC1:
        return std::make_unique<BC4Sampler>(image, options);
    case Image::kLATC2:
        return std::make_unique<BC5Sampler<true>>(image, options);
    case Image::kRGTC2:
        return std::make_unique<BC5Sampler<false>>(image, options);
    default:
        throwWithoutSampler();
    }
}

} // namespace

Sampler::~Sampler() = default;

std::unique_ptr<Sampler> createSampler(const Image& image, const SamplerOptions& options) {
    if (!requirePixels(image, "createSampler()"))
        return nullptr;
    if (image.isCompressed())
        return makeBlock(image, options);
    switch (image.type()) {
    case Image::IT_BYTE:
        return makePlain<i8>(image, options);
    case Image::IT_UNSIGNED_BYTE:
        return makePlain<u8>(image, options);
    case Image::IT_UNSIGNED_SHORT:
        return makePlain<u16>(image, options);
    case Image::kHalf:
        return makePlain<half>(image, options);
    case Image::kFloat:
        return makePlain<float>(image, options);
    default:
        throwWithoutSampler();
    }
}

} // namespace iio
