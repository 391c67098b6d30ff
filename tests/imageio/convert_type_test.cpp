#include "picture_builder.h"

#include <algorithm>
#include <cmath>
#include <limits>

namespace iio {
namespace {

/// Of an integer type; 0 for real ones.
double greatestOf(u8 type) {
    const double greatest[] = {0, 255, 127, 65535, 32767, 4294967295.0, 2147483647, 0, 0, 0};
    return greatest[type];
}

bool isSigned(u8 type) {
    return type == Image::IT_BYTE || type == Image::IT_SHORT || type == Image::IT_INT;
}

/// The curve as IEC 61966-2-1 writes it.
double curved(double value, i32 mode) {
    if (mode == Image::gammaEncode)
        return value <= 0           ? 0
               : value <= 0.0031308 ? value * 12.92
                                    : 1.055 * std::pow(value, 1 / 2.4) - 0.055;
    if (mode == Image::gammaDecode)
        return value <= 0.04045 ? value / 12.92 : std::pow((value + 0.055) / 1.055, 2.4);
    return value;
}

void expectNear(double expected, double actual, u8 type, const char* what, u32 index) {
    // Single precision on the way, and half's eleven bits at the end.
    double tolerance = 2e-6 * std::max(std::abs(expected), 1e-3);
    if (type == Image::kHalf)
        tolerance = std::abs(expected) / 2048 + 1e-7;
    if (const double full = greatestOf(type); full > 0) {
        const double least = isSigned(type) ? -full : 0;
        expected = std::trunc(std::clamp(expected * full, least, full));
        tolerance = 1 + full * 5e-7; // one step, and what 24 bits don't hold
    }
    EXPECT_NEAR(expected, actual, tolerance)
        << what << " to " << typeName(type) << ", component " << index;
}

TEST(ConvertType, AgreesWithSlowModel) {
    const u8 formats[] = {Image::kRGBA, Image::kRGB, Image::kLuminanceAlpha, Image::kAlpha};
    const double portions[] = {0, 0.002, 0.03, 0.05, 0.2, 0.5, 0.7, 0.999, 1, -0.4, -1, 1.75};
    for (const u8 format : formats) {
        for (u32 pair = 0; pair < 243; ++pair) {
            const u8 from = static_cast<u8>(pair % 9 + 1), to = static_cast<u8>(pair / 9 % 9 + 1);
            const auto mode = static_cast<i32>(pair / 81);
            const ref<Image> source = makeImage(1, 12, format, from);
            const u32 channels = source->channelCount();
            const double full = greatestOf(from);
            for (u32 i = 0; i < 12 * channels; ++i) {
                double value = portions[i / channels];
                if (full > 0)
                    value = std::trunc(std::clamp(value, isSigned(from) ? -1.0 : 0.0, 1.0) * full);
                setComponent(*source, i, value);
            }
            const ref<Image> target = source->convertType(to, 0, mode);
            ASSERT_TRUE(target);
            ASSERT_EQ(target->type(), to);
            for (u32 i = 0; i < 12 * channels && from != to; ++i) {
                const bool isAlpha = source->alphaIndex() == static_cast<i32>(i % channels);
                const double number = componentAt(*source, i) / (full > 0 ? full : 1);
                expectNear(isAlpha ? number : curved(number, mode), componentAt(*target, i), to,
                           typeName(from), i);
            }
        }
    }
}

TEST(ConvertType, ChoosesCurveByTypesAndAttributes) {
    constexpr double nan = std::numeric_limits<double>::quiet_NaN();
    using enum ImageTypes::Type;
    struct Row {
        u8 from;
        double value;
        const char* colorSpace;
        float gamma;
        u8 to;
        double expected;
    };
    const Row rows[] = {
        {kFloat, 0.5, "", 0, IT_UNSIGNED_BYTE, 187},
        {kFloat, 2.0, "", 0, IT_UNSIGNED_BYTE, 255},
        {kFloat, 1.0, "", 0, IT_UNSIGNED_SHORT, 65535},
        {kFloat, nan, "", 0, IT_UNSIGNED_BYTE, 0},
        {kHalf, 0.5, "ignore", 0, IT_UNSIGNED_BYTE, 127},
        {kHalf, 0.5, "", 0, IT_UNSIGNED_BYTE, 187},
        {kFloat, 0.5, "srgb", 0, IT_UNSIGNED_BYTE, 127},
        {kFloat, 0.5, "gamma", 2.2f, IT_UNSIGNED_BYTE, 127},
        {kFloat, 0.5, "gamma", 1.05f, IT_UNSIGNED_BYTE, 187},
        {kFloat, 0.5, "gamma", 0, IT_UNSIGNED_BYTE, 187},
        {kFloat, 0.5, "", 2.2f, IT_UNSIGNED_BYTE, 187},
        {kDouble, 0.5, "", 0, IT_UNSIGNED_BYTE, 127},
        {kDouble, 0.5, "linear", 0, IT_UNSIGNED_BYTE, 187},
        {kDouble, 0.04045, "", 0, kFloat, 0.04045 / 12.92},
        {IT_UNSIGNED_BYTE, 51, "", 0, kFloat, 0.033104767},
        {IT_UNSIGNED_BYTE, 51, "linear", 0, kFloat, 0.2},
        {IT_UNSIGNED_BYTE, 51, "linear", 0, IT_UNSIGNED_SHORT, 31753}, // 0.484529
        {IT_UNSIGNED_BYTE, 51, "", 0, kDouble, 0.2},
        {IT_BYTE, -128, "", 0, IT_SHORT, -32767},
        {kFloat, nan, "ignore", 0, IT_SHORT, 0},
        {kFloat, 1e6, "", 0, kHalf, std::numeric_limits<double>::infinity()},
    };
    for (const Row& row : rows) {
        const ref<Image> source = rowOf(Image::kRed, row.from, {row.value});
        if (*row.colorSpace)
            source->attributes().attribute<string>(imageAttributes().n_ColorSpace) = row.colorSpace;
        if (row.gamma > 0)
            source->attributes().attribute<float>(imageAttributes().n_Gamma) = row.gamma;
        const ref<Image> target = source->convertType(row.to);
        ASSERT_TRUE(target);
        const double actual = componentAt(*target, 0);
        const double tolerance = greatestOf(row.to) > 0 ? 0 : 1e-7;
        EXPECT_TRUE(actual == row.expected || std::abs(actual - row.expected) <= tolerance)
            << typeName(row.from) << ' ' << row.value << ' ' << row.colorSpace << ' ' << row.gamma
            << " to " << typeName(row.to) << ": " << actual;
    }
}

TEST(ConvertType, TakesAllBytesAndShortsExactly) {
    // 65536 and a remainder, so that what handles several at once and the rest both see all.
    for (const u32 width : {65536u, 65531u}) {
        const auto shorts = makeImage(width, 1, Image::kLuminance, Image::IT_UNSIGNED_SHORT);
        const auto bytes = makeImage(width, 1, Image::kAlpha);
        for (u32 i = 0; i < width; ++i) {
            reinterpret_cast<u16*>(shorts->data())[i] = static_cast<u16>(65535 - i);
            bytes->data()[i] = static_cast<u8>(i);
        }
        const ref<Image> narrow = shorts->convertType(Image::IT_UNSIGNED_BYTE);
        const ref<Image> wide = bytes->convertType(Image::IT_UNSIGNED_SHORT);
        u32 shortByOne = 0;
        for (u32 i = 0; i < width; ++i) {
            const u32 lacking = (65535 - i) / 257 - narrow->data()[i];
            ASSERT_LE(lacking, 1U) << 65535 - i;
            shortByOne += lacking;
            ASSERT_EQ(reinterpret_cast<const u16*>(wide->data())[i], i % 256 * 257);
        }
        // 257 times a power of two falls short in single precision.
        EXPECT_EQ(shortByOne, 8U);
    }
}

TEST(ConvertType, KeepsLayoutAndDescription) {
    const ref<Image> cube = base::makeRef<Image>();
    cube->createCube(3, 3, 8, Image::kRGB, Image::IT_UNSIGNED_BYTE);
    std::fill_n(cube->data(), cube->memorySize(), u8(9));
    for (u32 face = 0; face < 6; ++face)
        cube->face(face)[2 * 16 + 8] = static_cast<u8>(face);
    cube->setPath("sky.png");
    cube->attributes().attribute<string>(imageAttributes().n_Comment) = "kept";
    cube->level(1, true);
    const ref<Image> target = cube->convertType(Image::IT_UNSIGNED_SHORT);
    ASSERT_TRUE(target);
    EXPECT_EQ(target->kind(), Image::kindCube);
    EXPECT_EQ(target->pitch(), 18U);
    EXPECT_EQ(target->path(), "sky.png");
    EXPECT_EQ(*target->attributes().findAttribute<string>(imageAttributes().n_Comment), "kept");
    EXPECT_EQ(target->levelCount(), 0U);
    for (u32 face = 0; face < 6; ++face)
        EXPECT_EQ(reinterpret_cast<const u16*>(target->face(face))[2 * 9 + 8], face * 257);
}

} // namespace
} // namespace iio
