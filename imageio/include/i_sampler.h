#pragma once

#include "i_image.h"

namespace iio {

struct SamplerOptions {
    enum Filter : u32 { nearest = 0, linear = 1, area = 3 };
    enum Wrap : u32 { repeat = 0, mirror = 1, clampToEdge = 2, border = 3 };

    u32 filter = linear;
    u32 kernel = 0; ///< 2 x 2 taps, the one there is
    u32 wrapU = repeat, wrapV = repeat;
    float borderColor[4] = {0, 0, 0, 0};
    float anisotropyLimit = 1; ///< of `area`
};

/// Reads the top level of a picture as a function of texture coordinates: (0, 0) is the corner of
/// the first pixel and (1, 1) the far corner of the last one. Values are red, green, blue and
/// alpha, integers scaled to 0..1 or -1..1; a grey picture repeats its value in all four.
///
/// A cube map's faces are stacked: face n fills v from n / 6 to (n + 1) / 6, and texels are clamped
/// to the face.
///
/// A sampler borrows its picture, does not change and may serve several threads.
class Sampler {
public:
    virtual ~Sampler();
    virtual void destroy() { delete this; }
    /// By the filter of the options.
    virtual void sample(float (&out)[4], base::vec2f uv) const = 0;
    /// One texel, wrapped. `level` has no effect: there is the top level alone.
    virtual void texel(float (&out)[4], i32 x, i32 y, u32 level = 0) const = 0;
    /// By a footprint that is spanned by the derivatives `dx` and `dy` of the coordinates.
    virtual void sampleArea(float (&out)[4], base::vec2f uv, base::vec2f dx,
                            base::vec2f dy) const = 0;
    /// width x height texels from (x, y), wrapped, four floats each.
    virtual void readBlock(float* out, i32 x, i32 y, u32 width, u32 height) const = 0;
};

/// A sampler for `image`, which must outlive it. Null, with a message, for a picture without
/// pixels. Throws `base::switch_exception` for what has no sampler: components other than 8-bit,
/// unsigned 16-bit, half and float, and blocks other than BC1 to BC5.
std::unique_ptr<Sampler> createSampler(const Image& image, const SamplerOptions& options = {});

} // namespace iio
