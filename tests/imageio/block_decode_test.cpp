#include "i_block_decode.h"
#include "picture_builder.h"

#include <array>
#include <cstring>

namespace iio {
namespace {

using Pixel = std::array<int, 4>;
using Block = std::initializer_list<u8>;

/// Numbers 0, 1, 2... as indices of three bits, 8 in 3 bytes.
#define COUNT_OF_EIGHT 0x88, 0xC6, 0xFA

/// `expected` are the pixels in their order, each `repeat` times, then again from the first.
void expectPixels(u8 format, Block block, const char* what, std::initializer_list<Pixel> expected,
                  size_t repeat = 1) {
    const BlockFormat* blockFormat = findBlockFormat(format);
    ASSERT_TRUE(blockFormat);
    ASSERT_EQ(block.size(), blockFormat->byteSize) << what;
    BlockPixels pixels;
    std::memset(&pixels, 0xCD, sizeof pixels);
    blockFormat->decode(block.begin(), pixels);
    for (size_t i = 0; i < 16; ++i) {
        const u8* actual = pixels.components[i];
        EXPECT_EQ((Pixel{actual[0], actual[1], actual[2], actual[3]}),
                  expected.begin()[i / repeat % expected.size()])
            << what << ", pixel " << i;
    }
}

TEST(BlockDecode, FollowsPublishedFormats) {
    using Types = ImageTypes;
    // Pure red and blue; 0xE4 is the indices 0, 1, 2, 3 of a row.
    expectPixels(Types::kDXT1, {0x00, 0xF8, 0x1F, 0x00, 0xE4, 0xE4, 0xE4, 0xE4}, "four colours",
                 {{255, 0, 0, 0}, {0, 0, 255, 0}, {170, 0, 85, 0}, {85, 0, 170, 0}});
    expectPixels(Types::kDXT1, {0x1F, 0x00, 0x00, 0xF8, 0xE4, 0xE4, 0xE4, 0xE4}, "black",
                 {{0, 0, 255, 0}, {255, 0, 0, 0}, {128, 0, 128, 0}, {0, 0, 0, 0}});
    expectPixels(Types::kDXT1A, {0x1F, 0x00, 0x00, 0xF8, 0xE4, 0xE4, 0xE4, 0xE4}, "transparent",
                 {{0, 0, 255, 255}, {255, 0, 0, 255}, {128, 0, 128, 255}, {0, 0, 0, 0}});
    // 16 of 31, 32 of 63 and 1 of 31 are 131.6, 129.5 and 8.2; equal colours are of the second
    // kind.
    expectPixels(Types::kDXT1A, {0x01, 0x84, 0x01, 0x84, 0x00, 0x55, 0xAA, 0xFF}, "rows",
                 {{132, 130, 8, 255}, {132, 130, 8, 255}, {132, 130, 8, 255}, {0, 0, 0, 0}}, 4);
    // Alpha in sixteenths, and colours that BC1 would take for the kind with black.
    expectPixels(Types::kDXT3,
                 {0x10, 0xF8, 0x10, 0xF8, 0x10, 0xF8, 0x10, 0xF8, //
                  0x1F, 0x00, 0x00, 0xF8, 0xE4, 0xE4, 0xE4, 0xE4},
                 "explicit alpha",
                 {{0, 0, 255, 0}, {255, 0, 0, 17}, {85, 0, 170, 136}, {170, 0, 85, 255}});
    // Sevenths of 255 are 36.4, 72.9, 109.3, 145.7, 182.1, 218.6.
    expectPixels(Types::kDXT5,
                 {255, 0, COUNT_OF_EIGHT, COUNT_OF_EIGHT, //
                  0xFF, 0xFF, 0, 0, 0, 0, 0, 0},
                 "eight alphas",
                 {{255, 255, 255, 255},
                  {255, 255, 255, 0},
                  {255, 255, 255, 219},
                  {255, 255, 255, 182},
                  {255, 255, 255, 146},
                  {255, 255, 255, 109},
                  {255, 255, 255, 73},
                  {255, 255, 255, 36}});
    // Fifths of 101 over 100: 100.2 to 100.8 go down and up.
    for (const u8 format : {Types::kLATC1, Types::kRGTC1})
        expectPixels(format, {100, 101, COUNT_OF_EIGHT, COUNT_OF_EIGHT}, "six values and ends",
                     {{100}, {101}, {100}, {100}, {101}, {101}, {0}, {255}});
    for (const u8 format : {Types::kLATC2, Types::kRGTC2})
        expectPixels(format,
                     {10, 0, COUNT_OF_EIGHT, COUNT_OF_EIGHT, //
                      0, 50, COUNT_OF_EIGHT, COUNT_OF_EIGHT},
                     "two channels",
                     {{10, 0}, {0, 50}, {9, 10}, {7, 20}, {6, 30}, {4, 40}, {3, 0}, {1, 255}});
    EXPECT_FALSE(findBlockFormat(Types::kLuminanceAlpha));
    EXPECT_FALSE(findBlockFormat(Types::kBC6HSigned));
}

/// Every block a grey of its own: its number among all of them.
ref<Image> numberedBlocks(const ref<Image>& image) {
    const BlockFormat& format = *findBlockFormat(image->format());
    for (u64 i = 0; i < image->memorySize() / format.byteSize; ++i) {
        u8* block = image->data() + i * format.byteSize;
        std::memset(block, 0, format.byteSize);
        for (u32 half = 0; half < format.byteSize / 8; ++half)
            block[half * 8] = static_cast<u8>(i); // dxt: blue of 5 bits; latc, rgtc: the value
    }
    return image;
}

TEST(BlockDecode, PlacesBlocksOfPictures) {
    using Types = ImageTypes;
    const u8 plainFormats[] = {Types::kRGB,  Types::kRGBA,      Types::kRGBA,
                               Types::kRGBA, Types::kLuminance, Types::kLuminanceAlpha,
                               Types::kRed,  Types::kRG};
    for (u8 format = Types::kDXT1; format <= Types::kRGTC2; ++format) {
        const bool isColor = format < Types::kLATC1;
        // 3 x 2 blocks a layer, the last ones cut, without and with gaps between layers.
        for (const bool isCube : {false, true}) {
            const ref<Image> image = base::makeRef<Image>();
            if (isCube)
                image->createCube(9, 5, 1, format, 0);
            else
                image->create(9, 5, 2, 1, format, 0);
            image->setPath("blocks");
            const ref<Image> plain =
                numberedBlocks(image)->convertFormat(plainFormats[format - Types::kDXT1]);
            ASSERT_TRUE(plain);
            EXPECT_EQ(plain->type(), Types::IT_UNSIGNED_BYTE);
            EXPECT_EQ(plain->path(), "blocks");
            ASSERT_EQ(plain->rowCount(), isCube ? 30U : 10U);
            const u32 channels = plain->channelCount();
            for (u32 i = 0; i < 9 * plain->rowCount(); ++i) {
                const u32 x = i % 9, y = i / 9 % 5, layer = i / 45;
                const u32 number = (layer * 6 + y / 4 * 3 + x / 4) % (isColor ? 32 : 256);
                const u8 value = plain->row(i / 9)[x * channels + (isColor ? 2 : channels - 1)];
                ASSERT_EQ(isColor ? value >> 3 : value, static_cast<int>(number))
                    << formatInfo(format).name << " at " << x << ", " << i / 9;
            }
        }
    }
}

TEST(BlockDecode, GoesOnToOtherFormats) {
    const auto image = imageOf(4, 4, Image::kLATC2, 0, //
                               {200, 0, 0, 0, 0, 0, 0, 0, 90, 0, 0, 0, 0, 0, 0, 0});
    const ref<Image> colors = image->convertFormat(Image::kBGRA);
    ASSERT_TRUE(colors);
    const vector<double> components = componentsOf(*colors);
    for (size_t i = 0; i < 64; i += 4)
        EXPECT_EQ(vector<double>(&components[i], &components[i] + 4),
                  (vector<double>{200, 200, 200, 90}));
}

} // namespace
} // namespace iio
