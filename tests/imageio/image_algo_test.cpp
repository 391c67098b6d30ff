#include "i_block_decode.h"
#include "picture_builder.h"

#include <cmath>
#include <limits>

namespace iio {
namespace {

string pixelAt(const Image& image, u32 x, u64 row) {
    const u32 size = bitsPerPixel(image.type(), image.format()) / 8;
    return string(reinterpret_cast<const char*>(image.row(row)) + x * size, size);
}

/// Whether the pixels of `image` are those of `before`, flipped within each face.
bool isFlipped(const Image& image, const Image& before, bool isVertical) {
    const u32 width = image.width(), height = image.height();
    for (u64 row = 0; row < image.rowCount(); ++row) {
        const u64 top = row / height * height, y = row % height;
        for (u32 x = 0; x < width; ++x) {
            const string expected = isVertical ? pixelAt(before, x, top + height - 1 - y)
                                               : pixelAt(before, width - 1 - x, row);
            if (pixelAt(image, x, row) != expected)
                return false;
        }
    }
    return true;
}

/// Flips noise both ways; what is looked at is the picture in `plainFormat`.
void expectFlips(u32 width, u32 height, bool isCube, u8 format, u8 type, u8 plainFormat) {
    const ref<Image> before = makeImage(width, height, format, type, 4);
    if (isCube)
        before->createCube(width, height, 4, format, type);
    fillWithNoise(*before);
    for (const bool isVertical : {false, true}) {
        const auto image = base::makeRef<Image>(*before);
        isVertical ? image->flipVertical() : image->flipHorizontal();
        EXPECT_TRUE(isFlipped(*image->convertFormat(plainFormat),
                              *before->convertFormat(plainFormat), isVertical))
            << formatInfo(format).name << ' ' << typeName(type) << ' ' << width << " x " << height
            << ' ' << isVertical;
    }
}

TEST(Flip, MovesPixels) {
    for (u8 format = 0; format < 11; ++format) {
        for (u8 type = 1; type < 10; ++type) {
            expectFlips(3, 2, true, format, type, format);
            expectFlips(6, 5, false, format, type, format);
        }
    }
    for (u8 format = Image::kDXT1; format <= Image::kRGTC2; ++format) {
        const u8 plain = findBlockFormat(format)->plainFormat;
        // Blocks in rows and columns, cut along the other axis, and not filled along this one.
        expectFlips(8, 8, false, format, 0, plain);
        expectFlips(16, 4, false, format, 0, plain);
        expectFlips(2, 16, false, format, 0, plain);
        expectFlips(8, 2, false, format, 0, plain);
        expectFlips(4, 4, true, format, 0, plain);
    }
}

TEST(ImageAlgo, ChangesComponents) {
    using enum ImageTypes::Format;
    using enum ImageTypes::Type;
    constexpr u8 byte = IT_UNSIGNED_BYTE;
    using Numbers = std::initializer_list<double>;
    struct Row {
        bool (*act)(Image&);
        u8 format, type;
        Numbers before, after;
    };
    const auto invertColor = [](Image& i) { return i.invertColor(); };
    const auto invertAlpha = [](Image& i) { return i.invertAlpha(); };
    const auto premultiply = [](Image& i) { return i.premultiplyAlpha(); };
    const auto equalize = [](Image& i) { return i.equalize(); };
    // (0.75 - 0.25) / 2 and half of 1 / 2 on both sides: 0 to 0.5
    const auto expose = [](Image& i) { return i.equalize(0.75f, 1, 0.25f, 2); };
    const auto exposeByOne = [](Image& i) { return i.equalize(0.75f, 1, 0.25f, 1); };
    const auto exposeByNone = [](Image& i) { return i.equalize(0.75f, 1, 0.25f, 0); };
    const auto clamp = [](Image& i) { return i.clampNegative(); };
    const auto toRGB = [](Image& i) { return i.substituteColorRGB_RGB({1, 2, 3}, {7, 8, 9}); };
    const auto toRGBA = [](Image& i) { return i.substituteColorRGB_RGBA({1, 2, 3}, {5, 6, 7, 8}); };
    constexpr double nan = std::numeric_limits<double>::quiet_NaN();
    constexpr double infinity = std::numeric_limits<double>::infinity();
    constexpr double most = 4294967295;
    const Row rows[] = {
        {invertColor, kBGRA, byte, {0, 100, 255, 30}, {255, 155, 0, 30}},
        {invertAlpha, kBGRA, byte, {0, 100, 255, 30}, {0, 100, 255, 225}},
        {invertColor, kLuminanceAlpha, IT_UNSIGNED_INT, {1, 2, 3, 4}, {most - 1, 2, most - 3, 4}},
        {invertColor, kAlpha, kFloat, {0.25, 3}, {0.25, 3}},
        {invertAlpha, kAlpha, kFloat, {0.25, 3}, {0.75, -2}},
        {invertColor, kRed, kHalf, {0.25}, {0.75}},
        // 65025, 2550 and 4080 less multiples of 256
        {premultiply, kRGBA, byte, {255, 10, 16, 255, 3, 2, 1, 4}, {1, 246, 240, 255, 12, 8, 4, 4}},
        {premultiply, kLuminanceAlpha, IT_SHORT, {-3, 7, 300, 300}, {-21, 7, 24464, 300}},
        {premultiply, kBGRA, kFloat, {4, -2, 0, 0.5}, {2, -1, 0, 0.5}},
        // 2.5 times what is above 50, truncated
        {equalize,
         kRGBA,
         byte,
         {50, 101, 71, 0, 60, 152, 50, 255},
         {0, 127, 52, 0, 25, 255, 0, 255}},
        {equalize, kRGB, byte, {9, 9, 9}, {9, 9, 9}},
        {equalize, kRGB, kFloat, {nan, -2, 6, 0, 2, 4}, {nan, 0, 1, 0.25, 0.5, 0.75}},
        {equalize, kRed, kFloat, {3, 4}, {3, 4}},
        {expose, kRed, IT_UNSIGNED_SHORT, {0, 100, 40000}, {0, 200, 65535}},
        {expose, kLuminanceAlpha, kDouble, {-1, 5, 2, 5}, {-2, 5, 4, 5}},
        {exposeByOne, kRed, kDouble, {-2, 4}, {-2, 4}},
        {exposeByNone, kRed, kDouble, {-2, 4}, {-2, 4}},
        {clamp, kRGBA, IT_SHORT, {-1, 5, -32768, -7}, {0, 5, 0, 0}},
        {clamp, kRG, kHalf, {-1, 1, nan, -infinity}, {0, 1, nan, 0}},
        {clamp, kRed, byte, {200}, {200}},
        {toRGB, kRGBA, byte, {1, 2, 3, 50, 1, 2, 4, 60}, {7, 8, 9, 50, 1, 2, 4, 60}},
        {toRGBA, kRGBA, byte, {1, 2, 4, 50, 1, 2, 3, 60}, {1, 2, 4, 50, 5, 6, 7, 8}},
        {toRGBA, kRGB, byte, {1, 2, 3, 1, 2, 3, 9, 9, 9}, {5, 6, 7, 5, 6, 7, 9, 9, 9}},
    };
    for (const Row& row : rows) {
        const ref<Image> image = rowOf(row.format, row.type, row.before);
        EXPECT_TRUE(row.act(*image));
        for (size_t i = 0; i < row.after.size(); ++i) {
            const double actual = componentAt(*image, i), expected = row.after.begin()[i];
            EXPECT_TRUE(actual == expected || (std::isnan(actual) && std::isnan(expected)))
                << &row - rows << ' ' << typeName(row.type) << ' ' << i << ": " << actual;
        }
    }
}

TEST(ImageAlgo, RenormalizesNormals) {
    // Along z but too short; a direction that is of unit length already; the opposite of x.
    for (const u8 format : {Image::kRGB, Image::kBGR}) {
        const auto image = rowOf(format, 1, {128, 128, 200, 204, 128, 230, 0, 128, 128});
        EXPECT_TRUE(image->renormalizeNormals());
        const u8 expected[] = {128, 128, 255, 204, 128, 230, 0, 128, 128};
        for (u32 i = 0; i < 9; ++i)
            EXPECT_NEAR(image->data()[i], expected[i], 1) << i;
        EXPECT_EQ(image->data()[2], 255);
        EXPECT_EQ(image->data()[6], 0);
    }
}

} // namespace
} // namespace iio
