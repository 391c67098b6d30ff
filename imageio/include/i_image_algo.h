#pragma once

#include "i_image.h"

namespace iio {

/// Directions of the surface of a height map, `kRGB` in bytes: x grows to the right and y down.
/// Heights are component `channel` of 0..3, scaled to 0..1; slopes are multiplied by `strength`
/// and, with `invert`, change sign. The picture is taken to tile. Null, with a message, for a
/// picture without pixels. Throws as `createSampler`.
ref<Image> makeNormalMap(const Image& source, u32 channel, float strength, bool invert);

/// A cube map of six square pictures that are alike in all but their pixels, with their levels.
/// Null, with a message of level 2, for what does not fit.
ref<Image> createCubemap(const ref<Image>& posX, const ref<Image>& negX, const ref<Image>& posY,
                         const ref<Image>& negY, const ref<Image>& posZ, const ref<Image>& negZ);

/// A cube map of the file at `path`, whose name marks it as one face ("posx", "left", "_up."...),
/// and of the files beside it that are named for the other five. Null, with a message, if the name
/// has no mark or a face is missing.
ref<Image> loadCubemap(const string& path);

} // namespace iio
