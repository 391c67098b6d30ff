#pragma once

#include "i_image.h"

namespace iio {

/// A cube map of six square pictures that are alike in all but their pixels, with their levels.
/// Null, with a message of level 2, for what does not fit.
ref<Image> createCubemap(const ref<Image>& posX, const ref<Image>& negX, const ref<Image>& posY,
                         const ref<Image>& negY, const ref<Image>& posZ, const ref<Image>& negZ);

/// A cube map of the file at `path`, whose name marks it as one face ("posx", "left", "_up."...),
/// and of the files beside it that are named for the other five. Null, with a message, if the name
/// has no mark or a face is missing.
ref<Image> loadCubemap(const string& path);

} // namespace iio
