#pragma once

#include "b_containers.h"
#include "b_types.h"

#include <span>

namespace assimp {

using Bytes = base::vector<base::u8>;

/// What can be done with the bytes of a picture.
enum class PictureKind {
    unknown,
    png,
    jpeg,
    tga,
    convertible, ///< of a format that only `convertToPng` reads: BMP, GIF, PSD, PNM
};

/// Tells the kind by the first bytes (18 are enough). TGA files have no mark of their own: what
/// looks like one is `tga` if its name says so too and `convertible` else. `extension` is without
/// dot.
PictureKind kindOf(std::span<const base::u8> start, base::string_view extension);

/// The picture as a PNG, of an animated one its first frame, without an alpha channel that is
/// opaque everywhere. Empty if it can't be read or has more than 2^26 pixels.
Bytes convertToPng(std::span<const base::u8> bytes);

/// A PNG of `width` times `height` texels of red, green, blue and alpha, without an alpha channel
/// that is the same everywhere and 0 or 255. Empty if there are none or more than 2^26.
Bytes encodePng(std::span<const base::u8> texels, base::u32 width, base::u32 height);

} // namespace assimp
