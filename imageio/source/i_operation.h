#pragma once

#include "i_image.h"

/// What the operations on pictures share.
namespace iio {

/// Components of a pixel before its alpha, which is the last one.
inline u32 colorCountOf(const Image& image) noexcept {
    return image.channelCount() - (image.alphaIndex() < 0 ? 0 : 1);
}

/// True if `image` has pixels; else a message that names the operation, as "Image::resize()".
bool requirePixels(const Image& image, string_view operation);

/// A new picture of that size, format and type that takes attributes, path and info of `source`
/// along, a cube map if that is one. Null where its pixels could not be allocated.
ref<Image> makeLike(const Image& source, u32 width, u32 height, u32 byteAlignment, u8 format,
                    u8 type);

} // namespace iio
