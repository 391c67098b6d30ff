#pragma once

#include "i_image.h"

namespace iio {

/// Directions of the surface of a height map, `kRGB` in bytes: x grows to the right and y down.
/// Heights are component `channel` of 0..3, scaled to 0..1; slopes are multiplied by `strength`
/// and, with `invert`, change sign. The picture is taken to tile. Null, with a message, for a
/// picture without pixels. Throws as `createSampler`.
ref<Image> makeNormalMap(const Image& source, u32 channel, float strength, bool invert);

} // namespace iio
