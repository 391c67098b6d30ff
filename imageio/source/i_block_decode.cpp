#include "i_block_decode.h"

#include "i_operation.h"

#include "b_byte_order.h"

#include <algorithm>
#include <cstring>

namespace iio {

namespace {

using Color = u8[4];

/// The bits are repeated below, so the greatest value of 5 or 6 bits is 255.
void expandColor(u32 packed, Color& out) {
    const u32 red = packed >> 11, green = packed >> 5 & 63, blue = packed & 31;
    out[0] = static_cast<u8>(red << 3 | red >> 2);
    out[1] = static_cast<u8>(green << 2 | green >> 4);
    out[2] = static_cast<u8>(blue << 3 | blue >> 2);
}

/// (a * weightA + b * weightB) / sum of weights. The formats define these as real numbers and
/// leave their rounding open; here they go to the nearest byte, a half upwards.
u8 mix(u32 a, u32 weightA, u32 b, u32 weightB) {
    const u32 sum = weightA + weightB;
    return static_cast<u8>((a * weightA + b * weightB + sum / 2) / sum);
}

void mix(const Color& a, u32 weightA, const Color& b, u32 weightB, Color& out) {
    for (u32 c = 0; c < 3; ++c)
        out[c] = mix(a[c], weightA, b[c], weightB);
}

/// Two colours of 5, 6 and 5 bits, then an index of 2 bits a pixel. Where `hasThreeColorMode`, the
/// order of the two numbers tells whether there are two colours between them, or one and black.
/// Component 3 is `blackAlpha` for that black and `alpha` for all else.
void decodeColors(const u8* block, bool hasThreeColorMode, u8 alpha, u8 blackAlpha,
                  BlockPixels& out) {
    const u32 first = base::readLittleEndian<u16>(block);
    const u32 second = base::readLittleEndian<u16>(block + 2);
    Color palette[4] = {{0, 0, 0, alpha}, {0, 0, 0, alpha}, {0, 0, 0, alpha}, {0, 0, 0, alpha}};
    expandColor(first, palette[0]);
    expandColor(second, palette[1]);
    if (first > second || !hasThreeColorMode) {
        mix(palette[0], 2, palette[1], 1, palette[2]);
        mix(palette[0], 1, palette[1], 2, palette[3]);
    } else {
        mix(palette[0], 1, palette[1], 1, palette[2]);
        palette[3][3] = blackAlpha;
    }
    for (u32 i = 0; i < 16; ++i)
        std::memcpy(out.components[i], palette[block[4 + i / 4] >> i % 4 * 2 & 3], 4);
}

/// Two values, then an index of 3 bits a pixel. The order of the values tells whether there are six
/// values between them, or four and both ends of the range. Writes one component.
void decodeRamp(const u8* block, u32 component, BlockPixels& out) {
    const u32 first = block[0], second = block[1];
    u8 palette[8] = {block[0], block[1]};
    if (first > second) {
        for (u32 i = 1; i < 7; ++i)
            palette[i + 1] = mix(first, 7 - i, second, i);
    } else {
        for (u32 i = 1; i < 5; ++i)
            palette[i + 1] = mix(first, 5 - i, second, i);
        palette[6] = 0;
        palette[7] = 255;
    }
    const u64 indices = base::readLittleEndian<u64>(block + 2, 6);
    for (u32 i = 0; i < 16; ++i)
        out.components[i][component] = palette[indices >> i * 3 & 7];
}

void decodeDXT1(const u8* block, BlockPixels& out) {
    decodeColors(block, true, 0, 0, out);
}

void decodeDXT1A(const u8* block, BlockPixels& out) {
    decodeColors(block, true, 255, 0, out);
}

void decodeDXT3(const u8* block, BlockPixels& out) {
    decodeColors(block + 8, false, 0, 0, out);
    // 4 bits a pixel; times 17 makes the greatest one 255.
    for (u32 i = 0; i < 16; ++i)
        out.components[i][3] = static_cast<u8>((block[i / 2] >> i % 2 * 4 & 15) * 17);
}

void decodeDXT5(const u8* block, BlockPixels& out) {
    decodeColors(block + 8, false, 0, 0, out);
    decodeRamp(block, 3, out);
}

void decodeOneRamp(const u8* block, BlockPixels& out) {
    out = {};
    decodeRamp(block, 0, out);
}

void decodeTwoRamps(const u8* block, BlockPixels& out) {
    out = {};
    decodeRamp(block, 0, out);
    decodeRamp(block + 8, 1, out);
}

constexpr BlockFormat blockFormats[] = {
    {ImageTypes::kRGB, 8, decodeDXT1},                 // kDXT1
    {ImageTypes::kRGBA, 8, decodeDXT1A},               // kDXT1A
    {ImageTypes::kRGBA, 16, decodeDXT3},               // kDXT3
    {ImageTypes::kRGBA, 16, decodeDXT5},               // kDXT5
    {ImageTypes::kLuminance, 8, decodeOneRamp},        // kLATC1
    {ImageTypes::kLuminanceAlpha, 16, decodeTwoRamps}, // kLATC2
    {ImageTypes::kRed, 8, decodeOneRamp},              // kRGTC1
    {ImageTypes::kRG, 16, decodeTwoRamps},             // kRGTC2
};

/// Writes the part of a block that lies in the picture, `width` x `height` pixels.
void storePixels(const BlockPixels& pixels, u32 width, u32 height, u32 channels, u8* target,
                 u64 pitch) {
    for (u32 y = 0; y < height; ++y) {
        u8* out = target + pitch * y;
        for (u32 x = 0; x < width; ++x, out += channels) {
            for (u32 c = 0; c < channels; ++c)
                out[c] = pixels.components[y * 4 + x][c];
        }
    }
}

} // namespace

const BlockFormat* findBlockFormat(u8 format) noexcept {
    static_assert(std::size(blockFormats) == ImageTypes::kRGTC2 - ImageTypes::kDXT1 + 1);
    if (format < ImageTypes::kDXT1 || format > ImageTypes::kRGTC2)
        return nullptr;
    return &blockFormats[format - ImageTypes::kDXT1];
}

BlockGrid::BlockGrid(const Image& image) noexcept
    : columns(image.width() / 4 + (image.width() % 4 != 0)),
      rows(image.height() / 4 + (image.height() % 4 != 0)),
      layers(image.isCube() ? 6 : image.depth()),
      blockByteSize(findBlockFormat(image.format())->byteSize),
      layerByteSize(image.memorySize() / layers) {}

ref<Image> decodeBlocks(const Image& image) {
    const BlockFormat& format = *findBlockFormat(image.format());
    const u32 width = image.width(), height = image.height();
    ref<Image> target =
        makeLike(image, width, height, 1, format.plainFormat, ImageTypes::IT_UNSIGNED_BYTE);
    if (!target)
        return {};
    const BlockGrid grid(image);
    const u32 channels = target->channelCount();
    BlockPixels pixels;
    for (u32 layer = 0; layer < grid.layers; ++layer) {
        for (u32 row = 0; row < grid.rows; ++row) {
            u8* out = target->row(u64(height) * layer + row * 4);
            for (u32 column = 0; column < grid.columns; ++column) {
                format.decode(image.data() + grid.offset(layer, column, row), pixels);
                storePixels(pixels, std::min(4u, width - column * 4),
                            std::min(4u, height - row * 4), channels, out + column * 4 * channels,
                            target->pitch());
            }
        }
    }
    return target;
}

} // namespace iio
