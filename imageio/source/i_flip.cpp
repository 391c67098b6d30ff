#include "i_block_decode.h"
#include "i_operation.h"

#include "b_byte_order.h"
#include "b_log.h"

#include <algorithm>
#include <array>
#include <bit>

namespace iio {

namespace {

enum class Axis { vertical, horizontal };

/// Which of the 16 pixels of a block goes to each place.
using BlockOrder = std::array<u8, 16>;

/// `extent` pixels of the picture along the axis; a block holds no more than 4 of them.
BlockOrder flippedOrder(Axis axis, u32 extent) {
    const u32 count = std::min(extent, 4u);
    BlockOrder order;
    for (u32 i = 0; i < 16; ++i) {
        const u32 at = axis == Axis::vertical ? i / 4 : i % 4;
        const u32 from = at < count ? count - 1 - at : at;
        order[i] = static_cast<u8>(axis == Axis::vertical ? from * 4 + i % 4 : i / 4 * 4 + from);
    }
    return order;
}

/// 16 indices or values of the same number of bits, the first pixel in the lowest ones.
struct PixelField {
    u32 byteOffset;
    u32 bitCount;
};
constexpr PixelField none = {};

/// What in a block changes when its pixels move.
struct BlockFields {
    PixelField fields[2];
};
constexpr BlockFields blockFields[] = {
    {{{4, 2}, none}},    // kDXT1
    {{{4, 2}, none}},    // kDXT1A
    {{{0, 4}, {12, 2}}}, // kDXT3
    {{{2, 3}, {12, 2}}}, // kDXT5
    {{{2, 3}, none}},    // kLATC1
    {{{2, 3}, {10, 3}}}, // kLATC2
    {{{2, 3}, none}},    // kRGTC1
    {{{2, 3}, {10, 3}}}, // kRGTC2
};

void reorderField(u8* block, const PixelField& field, const BlockOrder& order) {
    const u32 byteCount = field.bitCount * 2;
    const u64 mask = (u64(1) << field.bitCount) - 1;
    const u64 before = base::readLittleEndian<u64>(block + field.byteOffset, byteCount);
    u64 after = 0;
    for (u32 i = 0; i < 16; ++i)
        after |= (before >> order[i] * field.bitCount & mask) << i * field.bitCount;
    for (u32 i = 0; i < byteCount; ++i)
        block[field.byteOffset + i] = static_cast<u8>(after >> i * 8);
}

/// Within their blocks alone.
void flipPixelsOfBlocks(Image& image, Axis axis) {
    const u32 extent = axis == Axis::vertical ? image.height() : image.width();
    const BlockOrder order = flippedOrder(axis, extent);
    const BlockFields& parts = blockFields[image.format() - ImageTypes::kDXT1];
    const BlockGrid grid(image);
    for (u32 layer = 0; layer < grid.layers; ++layer) {
        u8* block = image.data() + grid.offset(layer, 0, 0);
        const u8* end = image.data() + grid.offset(layer, 0, grid.rows);
        for (; block != end; block += grid.blockByteSize) {
            for (const PixelField& field : parts.fields)
                reorderField(block, field, order);
        }
    }
}

/// Rows of pixels or of blocks.
void reverseRows(u8* rows, u64 rowCount, u64 rowByteSize) {
    for (u64 i = 0; i < rowCount / 2; ++i) {
        u8* first = rows + i * rowByteSize;
        std::swap_ranges(first, first + rowByteSize, rows + (rowCount - 1 - i) * rowByteSize);
    }
}

template <u32 byteSize>
void reverseItems(u8* items, u64 count) {
    using Item = std::array<u8, byteSize>;
    auto* first = reinterpret_cast<Item*>(items);
    std::reverse(first, first + count);
}

/// For the sizes of pixels and of blocks.
void (*findReverseItems(u32 byteSize))(u8*, u64) {
    switch (byteSize) {
    case 1:
        return reverseItems<1>;
    case 2:
        return reverseItems<2>;
    case 3:
        return reverseItems<3>;
    case 4:
        return reverseItems<4>;
    case 6:
        return reverseItems<6>;
    case 8:
        return reverseItems<8>;
    case 12:
        return reverseItems<12>;
    case 16:
        return reverseItems<16>;
    case 24:
        return reverseItems<24>;
    default:
        return reverseItems<32>;
    }
}

/// What is moved as a whole: the pixels of a picture or, where it has them, the blocks.
struct Items {
    explicit Items(const Image& image) {
        if (image.isCompressed()) {
            const BlockGrid grid(image);
            columns = grid.columns;
            rows = grid.rows;
            byteSize = grid.blockByteSize;
            rowByteSize = u64(columns) * byteSize;
            layerByteSize = grid.layerByteSize;
        } else {
            columns = image.width();
            rows = image.height();
            byteSize = bitsPerPixel(image.type(), image.format()) / 8;
            rowByteSize = image.pitch();
            layerByteSize = rowByteSize * rows;
        }
    }
    u32 columns, rows;
    u32 byteSize;
    u64 rowByteSize, layerByteSize;
};

void flip(Image& image, Axis axis) {
    if (image.isCompressed())
        flipPixelsOfBlocks(image, axis);
    const Items items(image);
    const auto reverse = findReverseItems(items.byteSize);
    for (u32 layer = 0; layer < (image.isCube() ? 6u : 1u); ++layer) {
        u8* first = image.data() + items.layerByteSize * layer;
        if (axis == Axis::vertical) {
            reverseRows(first, items.rows, items.rowByteSize);
            continue;
        }
        for (u32 y = 0; y < items.rows; ++y)
            reverse(first + items.rowByteSize * y, items.columns);
    }
}

/// Whether `image` can be flipped, else a message. In blocks that the edge cuts the pixels that
/// are not there would come first, so compressed pictures must have whole ones or a single one.
bool canFlip(const Image& image, const char* operation, u32 extent, const char* extentName) {
    if (image.isCompressed()) {
        if (!findBlockFormat(image.format())) {
            base::log().log(base::logIO, base::logError, "{}: unsupported image format.",
                            operation);
            return false;
        }
        if (!std::has_single_bit(extent)) {
            base::log().log(base::logIO, base::logWarning,
                            "{}| Unable to flip DXT since the {} is not power of two!",
                            image.path(), extentName);
            return false;
        }
    }
    return requirePixels(image, operation);
}

bool hasFaces(const Image& image) {
    return image.kind() == Image::kind2D || image.kind() == Image::kindCube;
}

} // namespace

void Image::flipVertical(u32) {
    if (hasFaces(*this) && height_ > 1 &&
        canFlip(*this, "Image::flipVertical()", height_, "height"))
        flip(*this, Axis::vertical);
}

void Image::flipHorizontal(u32) {
    if (hasFaces(*this) && width_ > 1 && canFlip(*this, "Image::flipHorizontal()", width_, "width"))
        flip(*this, Axis::horizontal);
}

} // namespace iio
