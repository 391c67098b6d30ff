#pragma once

#include "i_image_types.h"

#include <cstdio>

#include <jpeglib.h>

/// Colour profiles in JPEG files, which are cut into the pieces that a marker can hold.
namespace iio {

inline constexpr int jpegProfileMarker = JPEG_APP0 + 2;

/// The profile that the markers of that kind in the list hold, its parts in their own order; empty
/// if there is none. Parts that can't belong to it are left out with a message of level 2; so is
/// the whole if one is missing. `path` is for messages.
vector<u8> joinJpegProfile(jpeg_saved_marker_ptr markers, const string& path);

} // namespace iio
