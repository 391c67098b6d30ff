#pragma once

#include "b_types.h"

#include <span>
#include <string>

/// The floors of the texture rows: from files on disk to JPEG files in memory, by nothing but the
/// libraries of the formats and bare loops. Each answers the bytes of the file that it made.
namespace bench {

/// An RGB picture of `side` by `side` pixels, as it is.
base::u64 convertBare(const std::string& path, base::u32 side);
/// The same in half the size.
base::u64 convertHalvedBare(const std::string& path, base::u32 side);
/// Two grey pictures as green and blue of one in the size of the first one. The side of the second
/// one is that of the first or half of it; its pixels then stand twice in both directions.
base::u64 packBare(const std::string& roughness, base::u32 side, const std::string& metal,
                   base::u32 metalSide);

struct PictureSize {
    base::u32 width = 0, height = 0;
};
/// What the header of a JPEG file tells. Ends the process if the bytes are none.
PictureSize readJpegSize(std::span<const base::u8> file);

} // namespace bench
