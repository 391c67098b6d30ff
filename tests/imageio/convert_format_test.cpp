#include "i_half.h"
#include "i_image.h"
#include "log_capture.h"

#include <algorithm>
#include <cstring>
#include <gtest/gtest.h>

namespace iio {
namespace {

using test_support::LogCapture;

/// The components of the plain formats in the order of their pixels.
constexpr string_view layouts[] = {"rgb", "rgba", "bgr", "bgra", "rg", "r",
                                   "g",   "b",    "a",   "l",    "la"};

/// The letter of the component that becomes `wanted`; '0' and '1' for none and the full value, '?'
/// for a mixture.
char originOf(char wanted, string_view source) {
    if (source.find(wanted) != string_view::npos)
        return wanted;
    if (wanted == 'a')
        return '1';
    if (wanted != 'l')
        return source[0] == 'l' ? 'l' : '0';
    if (source.substr(0, 3) == "rgb" || source.substr(0, 3) == "bgr")
        return '?';
    return source.size() == 1 && source != "a" ? source[0] : '0';
}

/// The full value of the types as little endian bytes.
string fullBytes(u8 type) {
    const string_view last[] = {"",     "\xFF", "\x7F", "\xFF",     "\x7F",
                                "\xFF", "\x7F", "\x3C", "\x80\x3F", "\xF0\x3F"};
    const bool isReal = type >= Image::kHalf;
    const string_view end = last[type];
    return string(componentBits(type) / 8 - end.size(), isReal ? '\0' : '\xFF').append(end);
}

/// Every byte differs from its neighbours, and high bits are set as often as not.
ref<Image> patternImage(u32 width, u32 height, u32 alignment, u8 format, u8 type) {
    const ref<Image> image = base::makeRef<Image>(width, height, 1, alignment, format, type);
    for (u64 i = 0; i < image->memorySize(); ++i)
        image->data()[i] = static_cast<u8>(i * 167 + 41);
    return image;
}

string componentBytes(const Image& image, u32 x, u32 y, size_t index) {
    const u32 size = componentBits(image.type()) / 8;
    const u8* at = image.row(y) + (x * image.channelCount() + index) * size;
    return string(reinterpret_cast<const char*>(at), size);
}

void expectCopies(const Image& source, const Image& target) {
    const string_view from = layouts[source.format()], to = layouts[target.format()];
    for (u32 i = 0; i < source.width() * source.height(); ++i) {
        const u32 x = i % source.width(), y = i / source.width();
        for (size_t c = 0; c < to.size(); ++c) {
            const char origin = originOf(to[c], from);
            if (origin == '?')
                continue;
            string expected(componentBits(source.type()) / 8, '\0');
            if (origin == '1')
                expected = fullBytes(source.type());
            else if (origin != '0')
                expected = componentBytes(source, x, y, from.find(origin));
            ASSERT_EQ(componentBytes(target, x, y, c), expected)
                << from << " to " << to << " of " << typeName(source.type()) << ", component " << c
                << " of pixel " << x << ", " << y;
        }
    }
}

TEST(ConvertFormat, CopiesComponentsOfAllPairs) {
    for (u8 from = 0; from < 11; ++from) {
        for (u8 to = 0; to < 11; ++to) {
            for (u8 type = 1; type < 10; ++type) {
                const ref<Image> source = patternImage(11, 2, 4, from, type);
                const ref<Image> target = source->convertFormat(to);
                ASSERT_TRUE(target);
                ASSERT_EQ(target->format(), to);
                ASSERT_EQ(target->type(), type);
                ASSERT_EQ(target->byteAlignment(), 4U);
                expectCopies(*source, *target);
            }
        }
    }
}

TEST(ConvertFormat, ReordersRowsOfAnyLength) {
    // No padding, so a step too far shows in the next row or beyond the buffer.
    for (u32 width = 1; width <= 21; ++width) {
        for (u32 pair = 0; pair < 16; ++pair) {
            const auto from = static_cast<u8>(pair % 4), to = static_cast<u8>(pair / 4);
            for (const u8 type : {Image::IT_UNSIGNED_BYTE, Image::IT_BYTE}) {
                const ref<Image> source = patternImage(width, 3, 1, from, type);
                const ref<Image> target = source->convertFormat(to);
                ASSERT_TRUE(target);
                expectCopies(*source, *target);
            }
        }
    }
}

template <class T>
T greyOf(std::initializer_list<T> pixel, u8 format, u8 type, bool weighted) {
    const ref<Image> image = base::makeRef<Image>(1, 1, 1, 1, format, type);
    std::copy(pixel.begin(), pixel.end(), reinterpret_cast<T*>(image->data()));
    const ref<Image> grey = image->toGreyscale(weighted);
    T value;
    std::memcpy(&value, grey->data(), sizeof(T));
    return value;
}

TEST(ConvertFormat, MixesLuminance) {
    using Types = ImageTypes;
    // 0.299 * 10 + 0.587 * 20 + 0.114 * 32 = 18.378
    EXPECT_EQ(greyOf<u8>({10, 20, 32}, Types::kRGB, Types::IT_UNSIGNED_BYTE, true), 18);
    EXPECT_EQ(greyOf<u8>({32, 20, 10}, Types::kBGR, Types::IT_UNSIGNED_BYTE, true), 18);
    EXPECT_EQ(greyOf<u8>({10, 20, 32, 7}, Types::kRGBA, Types::IT_UNSIGNED_BYTE, false), 20);
    EXPECT_EQ(greyOf<u8>({255, 255, 255}, Types::kRGB, Types::IT_UNSIGNED_BYTE, false), 255);
    EXPECT_EQ(greyOf<i8>({-100, -50, -1}, Types::kRGB, Types::IT_BYTE, false), -50);
    EXPECT_EQ(greyOf<u16>({1000, 2000, 60001}, Types::kRGB, Types::IT_UNSIGNED_SHORT, true), 8313);
    EXPECT_EQ(greyOf<u32>({~0u, ~0u, ~0u}, Types::kRGB, Types::IT_UNSIGNED_INT, false), ~0u);
    EXPECT_FLOAT_EQ(greyOf<float>({-1, 2.5f, 9}, Types::kRGB, Types::kFloat, false), 3.5f);
    EXPECT_FLOAT_EQ(greyOf<float>({1, 2, 4}, Types::kRGB, Types::kFloat, true), 1.929f);
    EXPECT_NEAR(greyOf<double>({0.25, 0.5, 0.75}, Types::kBGRA, Types::kDouble, false), 0.5, 1e-7);

    u32 meanLoses = 0, weightedLoses = 0;
    for (u32 i = 0; i < 256; ++i) {
        const auto v = static_cast<u8>(i);
        const auto lossOf = [v](bool weighted) {
            return u32(v - greyOf<u8>({v, v, v}, Types::kRGB, Types::IT_UNSIGNED_BYTE, weighted));
        };
        meanLoses += lossOf(false);
        weightedLoses += lossOf(true);
    }
    // The weights' sum in single precision is just below one.
    EXPECT_EQ(meanLoses, 0U);
    EXPECT_EQ(weightedLoses, 13U);
}

TEST(ConvertFormat, TurnsToTheGreyThatKeepsAlpha) {
    const u8 greyFormats[] = {9, 10, 9, 10, 9, 9, 9, 9, 8, 9, 10, 9, 10, 10, 10, 15, 9, 17, 10};
    for (u8 format = 0; format < std::size(greyFormats); ++format) {
        const u8 type = format > 10 ? 0 : 1;
        const ref<Image> source = patternImage(4, 4, 1, format, type);
        const ref<Image> grey = source->toGreyscale();
        ASSERT_TRUE(grey) << formatInfo(format).name;
        EXPECT_EQ(grey->format(), greyFormats[format]) << formatInfo(format).name;
        EXPECT_EQ(grey.get() == source.get(), format == greyFormats[format]);
    }
}

TEST(ConvertFormat, SaysWhatItCannotConvert) {
    using Types = ImageTypes;
    struct Row {
        u8 format, type, target;
        const char* what;
    };
    const Row rows[] = {
        {Types::kRGB, 10, Types::kRGBA, "source image type"},
        {Types::kRGB, 0, Types::kRGBA, "source image type"},
        {Types::kRGB, 1, Types::kDXT1, "destination image format"},
        {Types::kRGB, 1, 28, "destination image format"},
        {Types::kDXT5, 0, Types::kDXT1, "destination image format"},
        {Types::kBC7, 0, Types::kRGBA, "source image format"},
        {Types::kETC1, 0, Types::kRGB, "source image format"},
    };
    for (const Row& row : rows) {
        const ref<Image> image = base::makeRef<Image>(4, 4, 1, 1, row.format, row.type);
        LogCapture log;
        EXPECT_FALSE(image->convertFormat(row.target));
        ASSERT_EQ(log.entries().size(), 1U);
        EXPECT_EQ(log.entries()[0].level, base::logError);
        EXPECT_EQ(log.entries()[0].text,
                  base::format("Image::convertFormat(): unsupported {}.", row.what));
    }
    LogCapture log;
    const ref<Image> empty = base::makeRef<Image>();
    EXPECT_EQ(empty->convertFormat(Types::kRGBA).get(), empty.get());
    EXPECT_FALSE(empty->convertFormat(Types::kRGB));
    EXPECT_EQ(test_support::linesOf(log), "2 Image::convertFormat(): the image has no pixels.\n");
}

} // namespace
} // namespace iio
