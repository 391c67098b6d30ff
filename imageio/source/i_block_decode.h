#pragma once

#include "i_image.h"

/// Pictures that are packed in blocks of 4 x 4 pixels: BC1 to BC5.
namespace iio {

/// The pixels of a block, row by row. A pixel's components stand in the order of the block format's
/// `plainFormat`; those beyond its channels are 0.
struct BlockPixels {
    u8 components[16][4];
};

struct BlockFormat {
    u8 plainFormat; ///< what its pixels are; components are bytes
    u32 byteSize;   ///< of a block
    void (*decode)(const u8* block, BlockPixels& out);
};

/// Null for all formats but `kDXT1` to `kRGTC2`.
const BlockFormat* findBlockFormat(u8 format) noexcept;

/// Where the blocks of a picture lie: row by row without gaps within a layer, which is a slice of a
/// volume or a face of a cube map.
struct BlockGrid {
    /// For an image in a format that `findBlockFormat` knows.
    explicit BlockGrid(const Image& image) noexcept;
    /// Bytes from the start of the data to a block.
    u64 offset(u32 layer, u32 column, u32 row) const noexcept {
        return layerByteSize * layer + (u64(columns) * row + column) * blockByteSize;
    }

    u32 columns, rows; ///< of blocks, those that the edge cuts included
    u32 layers;
    u32 blockByteSize;
    u64 layerByteSize;
};

/// The picture in the plain format of its blocks, in bytes and with byte alignment 1. The format
/// must be known and pixels be there. Null where memory is out.
ref<Image> decodeBlocks(const Image& image);

} // namespace iio
