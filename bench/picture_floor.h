#pragma once

#include "i_image.h"

/// The floors of the picture rows: what the libraries and bare loops need for the same result.
namespace bench {

/// A picture with the frequencies of a photograph: smooth ground, edges, and grain, which `seed`
/// makes another one. Its rows lie without gaps.
base::ref<iio::Image> makePhotograph(base::u32 width, base::u32 height, base::u8 format,
                                     base::u32 seed = 1);

/// Decodes all rows of a file of 8 bits a component, which must be whole, into one new block.
base::vector<base::u8> decodePng(const base::vector<base::u8>& file);
base::vector<base::u8> decodeJpeg(const base::vector<base::u8>& file);
/// Compresses the rows of an RGB picture with the library's settings for `quality`.
base::vector<base::u8> encodeJpeg(const base::u8* pixels, base::u32 width, base::u32 height,
                                  int quality);

/// Halves an RGB picture of bytes in both directions by eight taps in float, first along the rows
/// and then along the columns, with one picture of floats in between.
void halveBare(const base::u8* source, base::u32 width, base::u32 height, base::u8* target);

} // namespace bench
