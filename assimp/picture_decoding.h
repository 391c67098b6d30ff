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

/// Tells the kind by the first bytes (`headerLength` are enough). TGA files have no mark of their
/// own: what looks like one is `tga` if its name says so too and `foreign` else. `extension` is
/// without dot.
constexpr base::u64 headerLength = 26;
PictureKind kindOf(std::span<const base::u8> start, base::string_view extension);

/// The picture in a file of a foreign format, of an animated one its first frame. Null if it can't
/// be read or has more than 2^26 pixels.
base::ref<iio::Image> decodePicture(std::span<const base::u8> bytes);

/// `image`, without its alpha if that is opaque everywhere. No format of models reads transparency
/// out of such a picture, but whoever shows a material with alpha blends it.
base::ref<iio::Image> withoutOpaqueAlpha(base::ref<iio::Image> image);

/// The extension of files of a kind that exporters read, empty for other kinds.
base::string_view extensionOf(PictureKind kind);
/// Whether a file of that kind may have the extension.
bool isNamed(PictureKind kind, base::string_view extension);

/// Whether only its pixels tell if exporters can read the file, which is of a kind that they do, as
/// it is: it has an alpha channel, or its end is missing.
bool isDoubtful(base::Stream& file, PictureKind kind);

/// The picture that exporters should read in the place of `bytes`: one of a foreign format, or
/// without alpha that is opaque everywhere. Null if these can stay. Throws `base::exception` if
/// they can't be read. `name` is what messages call them.
base::ref<iio::Image> makeReadable(std::span<const base::u8> bytes, PictureKind kind,
                                   const base::string& name);

} // namespace assimp
