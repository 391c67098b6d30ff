#include "i_block_decode.h"
#include "i_half.h"
#include "i_image.h"
#include "log_capture.h"

#include <cmath>
#include <cstring>
#include <gtest/gtest.h>

namespace iio {
namespace {

using test_support::linesOf;
using test_support::LogCapture;

template <class T>
ref<Image> imageOf(u8 format, u8 type, std::initializer_list<T> components) {
    const u32 channels = formatInfo(format).channelCount;
    const auto width = static_cast<u32>(components.size()) / channels;
    const ref<Image> image = base::makeRef<Image>(width, 1, 1, 1, format, type);
    std::copy(components.begin(), components.end(), reinterpret_cast<T*>(image->data()));
    return image;
}

template <class T>
vector<T> componentsOf(const Image& image) {
    const T* first = reinterpret_cast<const T*>(image.data());
    return {first, first + image.memorySize() / sizeof(T)};
}

void fillWithNoise(Image& image) {
    u32 state = 12345;
    for (u64 i = 0; i < image.memorySize(); ++i) {
        state = state * 1664525 + 1013904223;
        image.data()[i] = static_cast<u8>(state >> 24);
    }
}

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

ref<Image> noiseImage(u32 width, u32 height, bool isCube, u8 format, u8 type) {
    const ref<Image> image = base::makeRef<Image>();
    if (isCube)
        image->createCube(width, height, 4, format, type);
    else
        image->create(width, height, 1, 4, format, type);
    fillWithNoise(*image);
    return image;
}

TEST(Flip, MovesPixelsOfPlainFormats) {
    for (u8 format = 0; format < 11; ++format) {
        for (u8 type = 1; type < 10; ++type) {
            for (const u32 size : {2u, 5u}) {
                const ref<Image> before = noiseImage(size + 1, size, size == 2, format, type);
                for (const bool isVertical : {false, true}) {
                    Image image(*before);
                    isVertical ? image.flipVertical() : image.flipHorizontal();
                    EXPECT_TRUE(isFlipped(image, *before, isVertical))
                        << formatInfo(format).name << ' ' << typeName(type) << ' ' << isVertical;
                }
            }
        }
    }
}

TEST(Flip, MovesPixelsOfBlocks) {
    struct Row {
        u32 width, height;
        bool isCube;
    };
    // Blocks in rows and columns, cut along the other axis, and not filled along this one.
    const Row rows[] = {{8, 8, false}, {16, 4, false}, {2, 16, false}, {8, 2, false}, {4, 4, true}};
    for (const Row& row : rows) {
        for (u8 format = Image::kDXT1; format <= Image::kRGTC2; ++format) {
            const ref<Image> before = noiseImage(row.width, row.height, row.isCube, format, 0);
            const u8 plain = findBlockFormat(format)->plainFormat;
            for (const bool isVertical : {false, true}) {
                Image image(*before);
                isVertical ? image.flipVertical() : image.flipHorizontal();
                EXPECT_TRUE(isFlipped(*image.convertFormat(plain), *before->convertFormat(plain),
                                      isVertical))
                    << formatInfo(format).name << ' ' << row.width << " x " << row.height;
            }
        }
    }
}

TEST(Flip, LeavesWhatItCannotFlip) {
    struct Row {
        u32 width, height, depth;
        u8 format, type;
        const char* vertical;
        const char* horizontal;
    };
    const Row rows[] = {
        {5, 1, 1, Image::kRGB, 1, "", ""}, // one-dimensional
        {5, 3, 2, Image::kRGB, 1, "", ""}, // a volume
        {12, 12, 1, Image::kDXT5, 0,
         "3 a.dds| Unable to flip DXT since the height is not power of two!\n",
         "3 a.dds| Unable to flip DXT since the width is not power of two!\n"},
        {8, 8, 1, Image::kBC7, 0, "2 Image::flipVertical(): unsupported image format.\n",
         "2 Image::flipHorizontal(): unsupported image format.\n"},
    };
    for (const Row& row : rows) {
        const ref<Image> image =
            base::makeRef<Image>(row.width, row.height, row.depth, 1, row.format, row.type);
        image->setPath("a.dds");
        fillWithNoise(*image);
        const vector<u8> before = componentsOf<u8>(*image);
        LogCapture verticalLog;
        image->flipVertical();
        EXPECT_EQ(linesOf(verticalLog), row.vertical);
        LogCapture horizontalLog;
        image->flipHorizontal();
        EXPECT_EQ(linesOf(horizontalLog), row.horizontal);
        EXPECT_EQ(componentsOf<u8>(*image), before);
    }
}

TEST(ImageAlgo, Inverts) {
    using Types = ImageTypes;
    const auto bytes = imageOf<u8>(Types::kBGRA, Types::IT_UNSIGNED_BYTE, {0, 100, 255, 30});
    EXPECT_TRUE(bytes->invertColor());
    EXPECT_EQ(componentsOf<u8>(*bytes), (vector<u8>{255, 155, 0, 30}));
    EXPECT_TRUE(bytes->invertAlpha());
    EXPECT_EQ(componentsOf<u8>(*bytes), (vector<u8>{255, 155, 0, 225}));

    const auto words = imageOf<u32>(Types::kLuminanceAlpha, Types::IT_UNSIGNED_INT, {1, 2, 3, 4});
    EXPECT_TRUE(words->invertColor());
    EXPECT_EQ(componentsOf<u32>(*words), (vector<u32>{~1u, 2, ~3u, 4}));

    const auto alpha = imageOf<float>(Types::kAlpha, Types::kFloat, {0.25f, 3});
    EXPECT_TRUE(alpha->invertColor());
    EXPECT_EQ(componentsOf<float>(*alpha), (vector<float>{0.25f, 3}));
    EXPECT_TRUE(alpha->invertAlpha());
    EXPECT_EQ(componentsOf<float>(*alpha), (vector<float>{0.75f, -2}));

    const auto halves = imageOf<half>(Types::kRed, Types::kHalf, {half(0.25f)});
    EXPECT_TRUE(halves->invertColor());
    EXPECT_EQ(componentsOf<u16>(*halves), vector<u16>{0x3A00}); // 0.75
}

TEST(ImageAlgo, PremultipliesInTheComponentsOwnBits) {
    using Types = ImageTypes;
    const auto bytes = imageOf<u8>(Types::kRGBA, Types::IT_UNSIGNED_BYTE, //
                                   {255, 10, 16, 255, 3, 2, 1, 4});
    EXPECT_TRUE(bytes->premultiplyAlpha());
    // 65025, 2550 and 4080 less multiples of 256
    EXPECT_EQ(componentsOf<u8>(*bytes), (vector<u8>{1, 246, 240, 255, 12, 8, 4, 4}));

    const auto shorts = imageOf<i16>(Types::kLuminanceAlpha, Types::IT_SHORT, {-3, 7, 300, 300});
    EXPECT_TRUE(shorts->premultiplyAlpha());
    EXPECT_EQ(componentsOf<i16>(*shorts), (vector<i16>{-21, 7, 24464, 300}));

    const auto floats = imageOf<float>(Types::kBGRA, Types::kFloat, {4, -2, 0, 0.5f});
    EXPECT_TRUE(floats->premultiplyAlpha());
    EXPECT_EQ(componentsOf<float>(*floats), (vector<float>{2, -1, 0, 0.5f}));
}

TEST(ImageAlgo, Equalizes) {
    using Types = ImageTypes;
    const auto bytes = imageOf<u8>(Types::kRGBA, Types::IT_UNSIGNED_BYTE, //
                                   {50, 101, 71, 0, 60, 152, 50, 255});
    EXPECT_TRUE(bytes->equalize());
    // 2.5 times what is above 50, truncated
    EXPECT_EQ(componentsOf<u8>(*bytes), (vector<u8>{0, 127, 52, 0, 25, 255, 0, 255}));

    const auto constant = imageOf<u8>(Types::kRGB, Types::IT_UNSIGNED_BYTE, {9, 9, 9});
    EXPECT_TRUE(constant->equalize());
    EXPECT_EQ(componentsOf<u8>(*constant), (vector<u8>{9, 9, 9}));

    const float nan = std::nanf("");
    const auto floats = imageOf<float>(Types::kRGB, Types::kFloat, {nan, -2, 6, 0, 2, 4});
    EXPECT_TRUE(floats->equalize());
    const vector<float> stretched = componentsOf<float>(*floats);
    EXPECT_EQ(vector<float>(stretched.begin() + 1, stretched.end()),
              (vector<float>{0, 1, 0.25f, 0.5f, 0.75f}));

    const auto unit = imageOf<float>(Types::kRed, Types::kFloat, {3, 4});
    EXPECT_TRUE(unit->equalize());
    EXPECT_EQ(componentsOf<float>(*unit), (vector<float>{3, 4})) << "a range of 1 stays";
}

TEST(ImageAlgo, EqualizesByExposure) {
    using Types = ImageTypes;
    // (0.75 - 0.25) / 2 and half of 1 / 2 on both sides: 0 to 0.5
    const auto shorts = imageOf<u16>(Types::kRed, Types::IT_UNSIGNED_SHORT, {0, 100, 40000});
    EXPECT_TRUE(shorts->equalize(0.75f, 1, 0.25f, 2));
    EXPECT_EQ(componentsOf<u16>(*shorts), (vector<u16>{0, 200, 65535}));
    const auto doubles = imageOf<double>(Types::kLuminanceAlpha, Types::kDouble, {-1, 5, 2, 5});
    EXPECT_TRUE(doubles->equalize(0.75f, 1, 0.25f, 2));
    EXPECT_EQ(componentsOf<double>(*doubles), (vector<double>{-2, 5, 4, 5}));
    for (const float scale : {1.0f, 0.0f}) { // a range of 1, and none
        EXPECT_TRUE(doubles->equalize(0.75f, 1, 0.25f, scale));
        EXPECT_EQ(componentsOf<double>(*doubles), (vector<double>{-2, 5, 4, 5}));
    }
}

TEST(ImageAlgo, ClampsNegativeComponents) {
    using Types = ImageTypes;
    const auto shorts = imageOf<i16>(Types::kRGBA, Types::IT_SHORT, {-1, 5, -32768, -7});
    EXPECT_TRUE(shorts->clampNegative());
    EXPECT_EQ(componentsOf<i16>(*shorts), (vector<i16>{0, 5, 0, 0}));
    const auto halves = imageOf<u16>(Types::kRG, Types::kHalf, {0xBC00, 0x3C00, 0xFE00, 0xFC00});
    EXPECT_TRUE(halves->clampNegative()); // -1, 1, not a number, -infinity
    EXPECT_EQ(componentsOf<u16>(*halves), (vector<u16>{0, 0x3C00, 0xFE00, 0}));
    const auto bytes = imageOf<u8>(Types::kRed, Types::IT_UNSIGNED_BYTE, {200});
    EXPECT_TRUE(bytes->clampNegative());
    EXPECT_EQ(bytes->data()[0], 200);
}

TEST(ImageAlgo, RenormalizesNormals) {
    using Types = ImageTypes;
    // Along z but too short; a direction that is of unit length already; the opposite of x.
    for (const u8 format : {Types::kRGB, Types::kBGR}) {
        const auto image = imageOf<u8>(format, Types::IT_UNSIGNED_BYTE, //
                                       {128, 128, 200, 204, 128, 230, 0, 128, 128});
        EXPECT_TRUE(image->renormalizeNormals());
        const vector<u8> bytes = componentsOf<u8>(*image);
        const u8 expected[] = {128, 128, 255, 204, 128, 230, 0, 128, 128};
        for (u32 i = 0; i < 9; ++i)
            EXPECT_NEAR(bytes[i], expected[i], 1) << i;
        EXPECT_EQ(bytes[2], 255);
        EXPECT_EQ(bytes[6], 0);
    }
    const auto colors = imageOf<u8>(Types::kRGBA, Types::IT_UNSIGNED_BYTE, {128, 128, 200, 9});
    EXPECT_FALSE(colors->renormalizeNormals());
    EXPECT_EQ(colors->data()[2], 200);
}

TEST(ImageAlgo, SubstitutesColors) {
    using Types = ImageTypes;
    const std::initializer_list<u8> pixels = {1, 2, 3, 50, 1, 2, 4, 60};
    const auto rgba = imageOf<u8>(Types::kRGBA, Types::IT_UNSIGNED_BYTE, pixels);
    EXPECT_TRUE(rgba->substituteColorRGB_RGB({1, 2, 3}, {7, 8, 9}));
    EXPECT_EQ(componentsOf<u8>(*rgba), (vector<u8>{7, 8, 9, 50, 1, 2, 4, 60}));
    EXPECT_TRUE(rgba->substituteColorRGB_RGBA({1, 2, 4}, {5, 6, 7, 8}));
    EXPECT_EQ(componentsOf<u8>(*rgba), (vector<u8>{7, 8, 9, 50, 5, 6, 7, 8}));
    const auto rgb = imageOf<u8>(Types::kRGB, Types::IT_UNSIGNED_BYTE, {1, 2, 3, 1, 2, 3, 9, 9, 9});
    EXPECT_TRUE(rgb->substituteColorRGB_RGBA({1, 2, 3}, {5, 6, 7, 8}));
    EXPECT_EQ(componentsOf<u8>(*rgb), (vector<u8>{5, 6, 7, 5, 6, 7, 9, 9, 9}));
}

TEST(ImageAlgo, SaysWhatItCannotChange) {
    using Types = ImageTypes;
    struct Row {
        const char* name;
        bool (*act)(Image&);
        u8 format, type;
        bool answer;
        const char* message;
    };
    const auto invertColor = [](Image& i) { return i.invertColor(); };
    const auto invertAlpha = [](Image& i) { return i.invertAlpha(); };
    const auto premultiply = [](Image& i) { return i.premultiplyAlpha(); };
    const auto equalize = [](Image& i) { return i.equalize(); };
    const auto expose = [](Image& i) { return i.equalize(1, 1, 0, 2); };
    const auto toRGBA = [](Image& i) { return i.substituteColorRGB_RGBA({}, {}); };
    const auto toRGB = [](Image& i) { return i.substituteColorRGB_RGB({}, {}); };
    const Row rows[] = {
        {"invertColor", invertColor, Types::kRGB, Types::IT_SHORT, false,
         "unsupported image type()."},
        {"invertColor", invertColor, Types::kDXT1, 1, false, "unsupported image type()."},
        {"invertAlpha", invertAlpha, Types::kRGBA, Types::IT_BYTE, false,
         "unsupported image type()."},
        {"invertAlpha", invertAlpha, Types::kRGB, Types::IT_BYTE, true, ""},
        {"premultiplyAlpha", premultiply, Types::kRGBA, 0, false, "unsupported image type()."},
        {"premultiplyAlpha", premultiply, Types::kRGB, 0, true, ""},
        {"premultiplyAlpha", premultiply, Types::kDXT5, 0, false, ""},
        {"equalize", equalize, Types::kRGB, Types::kHalf, false,
         "unsupported image type(). Types supported are IT_UNSIGNED_BYTE, IT_UNSIGNED_SHORT, "
         "IT_UNSIGNED_INT, kFloat."},
        {"equalize", expose, Types::kRGB, Types::IT_BYTE, false,
         "unsupported image type - 'byte'."},
        {"equalize", equalize, Types::kDXT1, 0, false, "unsupported image format()."},
        {"equalize", expose, Types::kDXT1, 0, false, "unsupported image format()."},
        {"substituteColorRGB_RGBA", toRGBA, Types::kRGB, Types::IT_BYTE, false,
         "this function can be called only on images whose type() is IT_UNSIGNED_BYTE"},
        {"substituteColorRGB_RGBA", toRGBA, Types::kBGR, 1, false,
         "this function can be called only on images whose format() is either kRGBA or kRGB"},
        {"substituteColorRGB_RGB", toRGB, Types::kRGB, Types::kFloat, false,
         "this function can be called only on images whose type() is IT_UNSIGNED_BYTE"},
        {"substituteColorRGB_RGB", toRGB, Types::kRed, 1, false,
         "this function can be called only on images whose format() is either kRGBA or kRGB"},
    };
    for (const Row& row : rows) {
        const ref<Image> image = base::makeRef<Image>(4, 4, 1, 1, row.format, row.type);
        LogCapture log;
        EXPECT_EQ(row.act(*image), row.answer) << row.name;
        EXPECT_EQ(linesOf(log), *row.message
                                    ? base::format("2 Image::{}(): {}\n", row.name, row.message)
                                    : string());
    }
    const auto clampNegative = [](Image& i) { return i.clampNegative(); };
    for (bool (*act)(Image&) : {+invertColor, +invertAlpha, +premultiply, +equalize, +expose,
                                +toRGBA, +toRGB, +clampNegative}) {
        Image image;
        if (act == +clampNegative) {
            image.create(~0u, ~0u, 1, 1, Types::kRGB, Types::kFloat); // more than can be had
        }
        LogCapture log;
        EXPECT_FALSE(act(image));
        ASSERT_EQ(log.entries().size(), 1U);
        EXPECT_TRUE(log.entries()[0].text.ends_with("(): the image has no pixels."));
    }
}

} // namespace
} // namespace iio
