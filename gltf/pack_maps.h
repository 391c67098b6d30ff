#pragma once

#include "i_image.h"

#include <array>

namespace gltf {

/// A picture of which one number per pixel counts.
struct PackedMap {
    const iio::Image* image = nullptr; ///< null for black
    /// 0 alpha x red, 1 and 3 red, 2 alpha, 4 green, 5 blue, 6 the mean of the colours; all else
    /// is black.
    base::u8 colorChannels = 0;
};

/// Occlusion, roughness and metal in the places where glTF reads them: an RGB picture of bytes,
/// each map sampled linearly, as it repeats, at the centres of the pixels. The maps must be such
/// that a `GridSampler` can sample them. Null if there is not enough memory.
base::ref<iio::Image> packMaps(const std::array<PackedMap, 3>& redGreenBlue, base::u32 width,
                               base::u32 height);

/// `image`, or 8-bit colour and alpha of it where there is no sampler for it; null where that
/// can't be made.
base::ref<iio::Image> makeSamplable(base::ref<iio::Image> image);

} // namespace gltf
