#pragma once

#include "stream/b_stream.h"

#include <span>

namespace assimp {

/// What can be done with the bytes of a picture.
enum class PictureKind {
    unknown,
    png,
    jpeg,
    tga,
    foreign, ///< of a format that only this plugin reads: BMP, GIF, PSD, PNM
};

constexpr base::u64 headerLength = 18; ///< bytes by which `kindOf` tells all kinds

/// Tells the kind by the first bytes. TGA files have no mark of their own: what looks like one is
/// `tga` if its name says so too and `foreign` else. `extension` is without dot.
PictureKind kindOf(std::span<const base::u8> start, base::string_view extension);

/// The extension of files of a kind that exporters read, empty for other kinds.
base::string_view extensionOf(PictureKind kind);
/// Whether exporters read a file of that kind under that extension.
bool mayHaveExtension(PictureKind kind, base::string_view extension);

} // namespace assimp
