#pragma once

#include "assimp/picture_kind.h"
#include "i_image.h"

namespace assimp {

/// The picture in a file of a foreign format, of an animated one its first frame. Null if it can't
/// be read or has more than 2^26 pixels.
base::ref<iio::Image> decodePicture(std::span<const base::u8> bytes);

/// Throws `base::exception` if `file`, of a kind that exporters read and named so, is evidently
/// broken: its header can't be read, or it is a PNG without its end that can't be decoded.
void checkPicture(base::Stream& file, PictureKind kind);

} // namespace assimp
