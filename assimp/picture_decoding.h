#pragma once

#include "i_image.h"
#include "stream/b_stream.h"

#include <span>

namespace assimp {

/// What can be done with the bytes of a picture.
enum class PictureKind {
    unknown,
    png,
    jpeg,
    tga,
    foreign, ///< of a format that only `decodePicture` reads: BMP, GIF, PSD, PNM
};

/// Tells the kind by the first bytes (18 are enough). TGA files have no mark of their own: what
/// looks like one is `tga` if its name says so too and `foreign` else. `extension` is without
/// dot.
PictureKind kindOf(std::span<const base::u8> start, base::string_view extension);

/// The picture in a file of a foreign format, of an animated one its first frame. Null if it can't
/// be read or has more than 2^26 pixels.
base::ref<iio::Image> decodePicture(std::span<const base::u8> bytes);

/// `image`, without its alpha if that is opaque everywhere. No format of models reads transparency
/// out of such a picture, but whoever shows a material with alpha blends it.
base::ref<iio::Image> withoutOpaqueAlpha(base::ref<iio::Image> image);

/// The picture that exporters should read in the place of the one in `file`, which is named like
/// it: one of a foreign format, or without alpha that is opaque everywhere. Null if it can stay, or
/// can't be read, of which exporters tell.
base::ref<iio::Image> makeReadable(base::Stream& file);

} // namespace assimp
