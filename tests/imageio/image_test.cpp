#include "log_capture.h"
#include "picture_builder.h"

#include "b_exception.h"

#include <cmath>
#include <cstring>
#include <stdexcept>

namespace iio {
namespace {

using test_support::linesOf;
using test_support::LogCapture;

TEST(Image, SizesLevelsByFormat) {
    struct Row {
        u32 width, height, depth, alignment;
        u8 format, type;
        bool isCube;
        u64 byteCount;
    };
    const Row rows[] = {
        {5, 3, 1, 4, Image::kRGB, Image::IT_UNSIGNED_BYTE, false, 16 * 3},
        {5, 3, 2, 1, Image::kRGB, Image::IT_UNSIGNED_BYTE, false, 15 * 3 * 2},
        {5, 3, 1, 3, Image::kRed, Image::IT_UNSIGNED_SHORT, false, 12 * 3},
        {7, 7, 1, 1, Image::kRGBA, Image::kDouble, true, 7 * 32 * 7 * 6},
        {1, 1, 1, 1, Image::kDXT1, Image::IT_IMPLICIT, false, 8},
        {1, 1, 1, 1, Image::kDXT5, Image::IT_IMPLICIT, false, 16},
        {1, 1, 1, 1, Image::kETC1, Image::IT_IMPLICIT, false, 8},
        {1, 1, 1, 4, Image::kDXT1, Image::IT_IMPLICIT, false, 16},
        {9, 5, 1, 1, Image::kDXT3, Image::IT_IMPLICIT, false, 12 * 8},
        {4, 4, 1, 1, Image::kETC2RG, Image::IT_IMPLICIT, false, 32},
        {4, 4, 1, 1, Image::kDXT1, Image::IT_IMPLICIT, true, 48},
        {0, 4, 1, 1, Image::kBC7, Image::IT_IMPLICIT, false, 16},
        {0xFFFFFFFF, 0xFFFFFFFF, 0xFFFFFFFF, 1, Image::kRGBA, Image::kDouble, true, ~u64(0)},
    };
    for (const Row& row : rows) {
        EXPECT_EQ(memorySize(row.width, row.height, row.depth, row.alignment, row.format, row.type,
                             row.isCube),
                  row.byteCount)
            << row.width << " x " << row.height << " of " << formatInfo(row.format).name;
    }
    // 13 x 6 halved once is 6 x 3, four times 1 x 1.
    const Image image(13, 6, 1, 4, Image::kRGB, Image::IT_UNSIGNED_BYTE);
    EXPECT_EQ(image.memorySize(1), 20 * 3U);
    EXPECT_EQ(image.memorySize(4), 4U);
    EXPECT_EQ(image.memorySize(40), 4U);
}

TEST(Image, CreatesByKind) {
    struct Row {
        u32 width, height, depth, alignment;
        Image::Kind kind;
        u32 pitch, storedAlignment;
    };
    const Row rows[] = {
        {1, 2, 1, 4, Image::kind2D, 4, 4},      {5, 0, 0, 4, Image::kind1D, 15, 1},
        {5, 1, 1, 8, Image::kind1D, 15, 1},     {5, 2, 0, 2, Image::kind2D, 16, 2},
        {5, 2, 3, 1, Image::kindVolume, 15, 1}, {5, 1, 3, 4, Image::kindInvalid, 16, 4},
    };
    for (const Row& row : rows) {
        Image image(row.width, row.height, row.depth, row.alignment, Image::kRGB,
                    Image::IT_UNSIGNED_BYTE);
        EXPECT_EQ(image.kind(), row.kind) << row.height << " " << row.depth;
        EXPECT_EQ(image.pitch(), row.pitch);
        EXPECT_EQ(image.byteAlignment(), row.storedAlignment);
        EXPECT_TRUE(image.isValid());
        ASSERT_NE(image.data(), nullptr);
        EXPECT_EQ(reinterpret_cast<std::uintptr_t>(image.data()) % 16, 0U);
        std::memset(image.data(), 1, image.memorySize());
    }
    EXPECT_THROW(Image(0, 5, 1, 1, Image::kRGB, Image::IT_UNSIGNED_BYTE), std::runtime_error);

    Image cube;
    cube.createCube(4, 4, 1, Image::kRed, Image::IT_UNSIGNED_SHORT);
    EXPECT_EQ(cube.kind(), Image::kindCube);
    EXPECT_EQ(cube.face(5) - cube.data(), 5 * 4 * 4 * 2);
    EXPECT_EQ(cube.face(6), nullptr);
    EXPECT_EQ(cube.slice(0), nullptr);
    cube.clear();
    EXPECT_EQ(cube.data(), nullptr);
    EXPECT_EQ(cube.width(), 0U);
}

TEST(Image, StaysWithoutPixelsWhereMemoryIsOut) {
    LogCapture log;
    // 2^32 bytes; no byte at all; more than 64 bits can count.
    const Image images[] = {
        {1 << 16, 1 << 16, 1, 1, Image::kRed, Image::IT_UNSIGNED_BYTE},
        {4, 4, 1, 1, Image::kRGB, Image::IT_IMPLICIT},
        {0xFFFFFFFF, 0xFFFFFFFF, 0xFFFFFFFF, 1, Image::kRGBA, Image::kDouble},
    };
    string lines;
    for (const Image& image : images) {
        lines += "2 Could not allocate memory for an image! Probably invalid settings.\n";
        EXPECT_EQ(image.data(), nullptr);
        float value;
        EXPECT_FALSE(image.getRow(&value, 0, 0));
    }
    EXPECT_EQ(linesOf(log), lines);
}

TEST(Image, TellsWhatIsInvalid) {
    EXPECT_TRUE(Image(8, 4, 1, 1, Image::kDXT1A, Image::IT_IMPLICIT).isValid());
    EXPECT_FALSE(Image(8, 4, 1, 1, Image::kRGBA, Image::IT_IMPLICIT).isValid());
    EXPECT_FALSE(Image(8, 4, 1, 1, 28, Image::IT_IMPLICIT).isValid());
    EXPECT_FALSE(Image(8, 4, 1, 1, Image::kRGB, 10).isValid());
    Image image(8, 4, 1, 1, Image::kBC7, Image::IT_UNSIGNED_BYTE);
    image.setPath("p.png");
    LogCapture log;
    EXPECT_FALSE(image.isValid());
    const string text =
        base::format("path   = p.png\nwidth  = 8\nheight = 4\ndepth  = 1\nformat = bc7\n"
                     "type   = ubyte\npitch  = {}\nbytealign = 1\n",
                     image.pitch());
    EXPECT_EQ(linesOf(log), "5 Image::isValid(): invalid format/type combination:\n" + text + "\n");
    EXPECT_EQ(image.description(), text);
}

TEST(Image, ChangesTheAlignmentAlone) {
    Image image(3, 2, 1, 1, Image::kRGB, Image::IT_UNSIGNED_BYTE);
    image.setByteAlignment(0);
    EXPECT_EQ(image.pitch(), 9U);
    image.setByteAlignment(8);
    EXPECT_EQ(image.pitch(), 16U);
    EXPECT_FALSE(image.hasPixels());
    for (const u32 alignment : {3U, 16U, 0x80000000U})
        EXPECT_THROW(image.setByteAlignment(alignment), base::exception);
}

TEST(Image, CopiesDeeply) {
    Image source(2, 2, 1, 1, Image::kRed, Image::IT_UNSIGNED_BYTE);
    std::memcpy(source.data(), "abcd", 4);
    source.setPath("a.png");
    source.attributes().attribute<string>(imageAttributes().n_Comment) = "text";
    source.level(2, true)->create(1, 1, 1, 1, Image::kRed, Image::IT_UNSIGNED_BYTE);
    source.level(2)->data()[0] = 'x';
    EXPECT_EQ(source.levelCount(), 2U);
    EXPECT_EQ(source.level(1), nullptr);
    EXPECT_EQ(source.level(3), nullptr);
    const auto transform = base::makeRef<ColorTransform>();
    source.setColorTransform(transform);

    const Image copy(source);
    Image owning(1, 1, 1, 1, Image::kRGB, Image::kFloat);
    owning = source;
    Image sharing;
    sharing = source;
    source.data()[0] = 'z';
    source.level(2)->data()[0] = 'z';
    EXPECT_EQ(copy.data()[0], 'a');
    EXPECT_EQ(owning.data()[0], 'a');
    EXPECT_EQ(sharing.data(), source.data());
    for (const Image* image : {&copy, const_cast<const Image*>(&owning)}) {
        EXPECT_EQ(image->path(), "a.png");
        EXPECT_EQ(image->pitch(), 2U);
        EXPECT_EQ(*image->attributes().findAttribute<string>(imageAttributes().n_Comment), "text");
        ASSERT_NE(image->level(2), nullptr);
        EXPECT_EQ(image->level(2)->data()[0], 'x');
        EXPECT_EQ(image->colorTransform(), transform.get());
        EXPECT_EQ(image->level(2)->colorTransform(), transform.get());
    }
    source.setColorTransform({});
    EXPECT_EQ(source.level(2)->colorTransform(), nullptr);
}

TEST(Image, BecomesItsOwnLevel) {
    for (const bool isHeld : {false, true}) { // by something else than the picture
        Image image(2, 2, 1, 1, Image::kRed, Image::IT_UNSIGNED_BYTE);
        image.level(1, true)->create(1, 1, 1, 1, Image::kRGB, Image::kFloat);
        fillWithNoise(*image.level(1));
        image.level(1)->setPath("small.png");
        const Image level(*image.level(1));
        const ref<Image> held(isHeld ? image.level(1) : nullptr);
        image = *image.level(1);
        EXPECT_EQ(image.description(), level.description());
        ASSERT_TRUE(image.hasPixels());
        EXPECT_EQ(bytesOf(image), bytesOf(level));
        EXPECT_EQ(image.levelCount(), 0U);
    }
}

TEST(Image, FindsTransparencyAndNegativeValues) {
    const double nan = std::nan("");
    struct Row {
        const char* name;
        ref<Image> image;
        bool isTransparent, hasNegatives;
    };
    const Row rows[] = {
        {"opaque", rowOf(Image::kRGBA, 1, {0, 0, 0, 255, 1, 2, 3, 255}), false, false},
        {"last", rowOf(Image::kBGRA, 1, {0, 0, 0, 255, 255, 255, 255, 254}), true, false},
        {"colour alone", rowOf(Image::kRGB, 1, {0, 0, 0}), false, false},
        {"alpha", rowOf(Image::kAlpha, 3, {65535, 65534}), true, false},
        {"one", rowOf(Image::kLuminanceAlpha, Image::kFloat, {-0.5, 1}), false, true},
        {"below one", rowOf(Image::kAlpha, Image::kFloat, {0.999}), true, false},
        {"signed", rowOf(Image::kRGB, Image::IT_BYTE, {0, 0, 0}), false, true},
        {"zero", rowOf(Image::kRed, Image::kDouble, {-0.0, 1}), false, false},
        {"tiny", rowOf(Image::kRed, Image::kDouble, {1, -1e-300}), false, true},
        {"nan", rowOf(Image::kRed, Image::kHalf, {-nan, 1}), false, false},
        {"half", rowOf(Image::kRed, Image::kHalf, {nan, -1}), false, true},
    };
    for (const Row& row : rows) {
        EXPECT_EQ(row.image->checkTransparency(), row.isTransparent) << row.name;
        EXPECT_EQ(row.image->hasNegativeValues(), row.hasNegatives) << row.name;
    }
    LogCapture log;
    EXPECT_FALSE(rowOf(Image::kAlpha, Image::kHalf, {0.5})->checkTransparency());
    EXPECT_EQ(log.entries().size(), 1U);
    EXPECT_TRUE(Image(4, 4, 1, 1, Image::kBC7, 0).checkTransparency());
    EXPECT_FALSE(Image(4, 4, 1, 1, Image::kLATC2, 0).checkTransparency());

    // Each face counts.
    Image cube;
    cube.createCube(1, 1, 4, Image::kRGBA, Image::IT_UNSIGNED_BYTE);
    std::memset(cube.data(), 255, cube.memorySize());
    EXPECT_FALSE(cube.checkTransparency());
    cube.face(5)[3] = 0;
    EXPECT_TRUE(cube.checkTransparency());
}

TEST(Image, ReadsAndWritesRowsAsNumbers) {
    Image volume(4, 3, 2, 4, Image::kRG, Image::IT_BYTE);
    std::memset(volume.data(), 0, volume.memorySize());
    const float written[] = {-2, -1, -0.5f, 0, 0.25f, 0.999f, 1, 2};
    ASSERT_TRUE(volume.setRow(written, 2, 1));
    const i8 stored[] = {-127, -127, -63, 0, 31, 126, 127, 127}; // truncated
    EXPECT_EQ(std::memcmp(volume.slice(1) + 2 * 8, stored, 8), 0);
    float read[8];
    ASSERT_TRUE(volume.getRow(read, 2, 1));
    for (size_t i = 0; i < 8; ++i)
        EXPECT_FLOAT_EQ(read[i], float(stored[i]) / 127);
    EXPECT_FALSE(volume.getRow(read, 3, 0));
    EXPECT_FALSE(volume.setRow(written, 0, 2));
}

TEST(Half, RoundsToNearestEven) {
    // The value of each pattern by the format's definition; each must come back, and the points
    // half way between neighbours must go to the even one.
    double previous = 0;
    for (u32 bits = 0; bits <= 0x7C00; ++bits) {
        const int exponent = static_cast<int>(bits >> 10);
        const double fraction = bits & 0x3FF;
        const double value =
            exponent == 0 ? std::ldexp(fraction, -24) : std::ldexp(1024 + fraction, exponent - 25);
        if (bits < 0x7C00) {
            half pattern;
            pattern.bits = static_cast<u16>(bits);
            ASSERT_EQ(static_cast<float>(pattern), value) << bits;
            ASSERT_EQ(half(static_cast<float>(value)).bits, bits);
            ASSERT_EQ(half(static_cast<float>(-value)).bits, bits | 0x8000);
        }
        if (bits > 0) {
            const u32 even = bits % 2 == 0 ? bits : bits - 1;
            const auto middle = static_cast<float>((previous + value) / 2);
            ASSERT_EQ(half(middle).bits, even) << bits;
            ASSERT_EQ(half(std::nextafterf(middle, 1e9f)).bits, bits);
            ASSERT_EQ(half(std::nextafterf(middle, 0.0f)).bits, bits - 1);
        }
        previous = value;
    }
    EXPECT_EQ(half(INFINITY).bits, 0x7C00);
    EXPECT_TRUE(std::isnan(static_cast<float>(half(std::nanf("")))));
}

} // namespace
} // namespace iio
