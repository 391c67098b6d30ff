#include "log_capture.h"
#include "picture_builder.h"

#include "b_filter.h"

namespace iio {
namespace {

using test_support::linesOf;
using test_support::LogCapture;
using Act = bool (*)(Image&);

/// Everything that takes a picture, with arguments that are right or wrong by the picture.
constexpr Act toRGBA = [](Image& i) { return !!i.convertFormat(Image::kRGBA); };
constexpr Act toRGB = [](Image& i) { return !!i.convertFormat(Image::kRGB); };
constexpr Act toBlocks = [](Image& i) { return !!i.convertFormat(Image::kDXT1); };
constexpr Act toUnknownFormat = [](Image& i) { return !!i.convertFormat(28); };
constexpr Act toBytes = [](Image& i) { return !!i.convertType(Image::IT_UNSIGNED_BYTE); };
constexpr Act toShorts = [](Image& i) { return !!i.convertType(Image::IT_UNSIGNED_SHORT); };
constexpr Act toUnknownType = [](Image& i) { return !!i.convertType(10); };
constexpr Act toImplicit = [](Image& i) { return !!i.convertType(0); };
constexpr Act invertColor = [](Image& i) { return i.invertColor(); };
constexpr Act invertAlpha = [](Image& i) { return i.invertAlpha(); };
constexpr Act premultiply = [](Image& i) { return i.premultiplyAlpha(); };
constexpr Act equalize = [](Image& i) { return i.equalize(); };
constexpr Act expose = [](Image& i) { return i.equalize(1, 1, 0, 2); };
constexpr Act clampNegative = [](Image& i) { return i.clampNegative(); };
constexpr Act renormalize = [](Image& i) { return i.renormalizeNormals(); };
constexpr Act substituteRGBA = [](Image& i) { return i.substituteColorRGB_RGBA({}, {}); };
constexpr Act substituteRGB = [](Image& i) { return i.substituteColorRGB_RGB({}, {}); };
constexpr Act resize = [](Image& i) { return !!i.resize(base::BoxFilter(), 2, 2); };
constexpr Act flipVertical = [](Image& i) { return i.flipVertical(), false; };
constexpr Act flipHorizontal = [](Image& i) { return i.flipHorizontal(), false; };

#define UNSUPPORTED(name, what) "2 Image::" name "(): unsupported " what ".\n"
#define BYTES_ONLY(name)                                                               \
    "2 Image::" name "(): this function can be called only on images whose type() is " \
    "IT_UNSIGNED_BYTE\n"
#define RGB_ONLY(name)                                                                          \
    "2 Image::" name "(): this function can be called only on images whose format() is either " \
    "kRGBA or kRGB\n"

TEST(ImageRefusals, SayWhatIsWrongAndLeaveThePicture) {
    using Types = ImageTypes;
    struct Row {
        Act act;
        u8 format, type;
        const char* lines;
        bool answer = false;
        u32 width = 12, height = 12, depth = 1;
    };
    const Row rows[] = {
        {toRGBA, Types::kRGB, 10, UNSUPPORTED("convertFormat", "source image type")},
        {toRGBA, Types::kRGB, 0, UNSUPPORTED("convertFormat", "source image type")},
        {toRGBA, Types::kBC7, 0, UNSUPPORTED("convertFormat", "source image format")},
        {toRGBA, Types::kETC1, 0, UNSUPPORTED("convertFormat", "source image format")},
        {toBlocks, Types::kRGB, 1, UNSUPPORTED("convertFormat", "destination image format")},
        {toBlocks, Types::kDXT5, 0, UNSUPPORTED("convertFormat", "destination image format")},
        {toUnknownFormat, Types::kRGB, 1, UNSUPPORTED("convertFormat", "destination image format")},
        {toBytes, Types::kDXT1, 0, UNSUPPORTED("convertType", "source image type")},
        {toBytes, Types::kRGB, 10, UNSUPPORTED("convertType", "source image type")},
        {toUnknownType, Types::kRGB, 1, UNSUPPORTED("convertType", "target image type")},
        {toUnknownType, Types::kRGB, 10, "", true}, // nothing to convert
        {toImplicit, Types::kRGB, 1, UNSUPPORTED("convertType", "target image type")},
        {toImplicit, Types::kDXT1, 0, "", true},
        {toShorts, Types::kDXT1, 1, UNSUPPORTED("convertType", "image format")},
        {invertColor, Types::kRGB, Types::IT_SHORT, UNSUPPORTED("invertColor", "image type()")},
        {invertColor, Types::kDXT1, 1, UNSUPPORTED("invertColor", "image type()")},
        {invertAlpha, Types::kRGBA, Types::IT_BYTE, UNSUPPORTED("invertAlpha", "image type()")},
        {invertAlpha, Types::kRGB, Types::IT_BYTE, "", true},
        {premultiply, Types::kRGBA, 0, UNSUPPORTED("premultiplyAlpha", "image type()")},
        {premultiply, Types::kRGB, 0, "", true},
        {premultiply, Types::kDXT5, 0, ""},
        {equalize, Types::kRGB, Types::kHalf,
         UNSUPPORTED("equalize",
                     "image type(). Types supported are IT_UNSIGNED_BYTE, IT_UNSIGNED_SHORT, "
                     "IT_UNSIGNED_INT, kFloat")},
        {expose, Types::kRGB, Types::IT_BYTE, UNSUPPORTED("equalize", "image type - 'byte'")},
        {equalize, Types::kDXT1, 0, UNSUPPORTED("equalize", "image format()")},
        {expose, Types::kDXT1, 0, UNSUPPORTED("equalize", "image format()")},
        {renormalize, Types::kRGBA, 1, ""},
        {substituteRGBA, Types::kRGB, Types::IT_BYTE, BYTES_ONLY("substituteColorRGB_RGBA")},
        {substituteRGBA, Types::kBGR, 1, RGB_ONLY("substituteColorRGB_RGBA")},
        {substituteRGB, Types::kRGB, Types::kFloat, BYTES_ONLY("substituteColorRGB_RGB")},
        {substituteRGB, Types::kRed, 1, RGB_ONLY("substituteColorRGB_RGB")},
        {resize, Types::kDXT1, 0, ""},
        {flipVertical, Types::kRGB, 1, "", false, 5, 1, 1}, // one-dimensional
        {flipHorizontal, Types::kRGB, 1, "", false, 5, 1, 1},
        {flipVertical, Types::kRGB, 1, "", false, 5, 3, 2}, // a volume
        {flipHorizontal, Types::kRGB, 1, "", false, 5, 3, 2},
        {flipVertical, Types::kDXT5, 0,
         "3 a.dds| Unable to flip DXT since the height is not power of two!\n"},
        {flipHorizontal, Types::kDXT5, 0,
         "3 a.dds| Unable to flip DXT since the width is not power of two!\n"},
        {flipVertical, Types::kBC7, 0, UNSUPPORTED("flipVertical", "image format")},
        {flipHorizontal, Types::kBC7, 0, UNSUPPORTED("flipHorizontal", "image format")},
    };
    for (const Row& row : rows) {
        SCOPED_TRACE(testing::Message() << &row - rows);
        const auto image =
            base::makeRef<Image>(row.width, row.height, row.depth, 1, row.format, row.type);
        image->setPath("a.dds");
        if (image->hasPixels())
            fillWithNoise(*image);
        const Image before(*image);
        LogCapture log;
        EXPECT_EQ(row.act(*image), row.answer);
        EXPECT_EQ(linesOf(log), row.lines);
        if (image->hasPixels()) {
            EXPECT_EQ(bytesOf(*image), bytesOf(before));
        }
    }
}

TEST(ImageRefusals, NothingIsDoneWithoutPixels) {
    for (const Act act : {toShorts, toRGB, invertColor, invertAlpha, premultiply, equalize, expose,
                          substituteRGBA, substituteRGB, clampNegative}) {
        const auto image = base::makeRef<Image>();
        if (act == clampNegative) // bytes have nothing to clamp
            image->create(~0u, ~0u, 1, 1, Image::kRGB, Image::kFloat); // more than can be had
        LogCapture log;
        EXPECT_FALSE(act(*image));
        ASSERT_EQ(log.entries().size(), 1U);
        EXPECT_EQ(log.entries()[0].level, base::logError);
        EXPECT_EQ(log.entries()[0].channel, base::logIO);
        EXPECT_TRUE(log.entries()[0].text.ends_with("(): the image has no pixels."))
            << linesOf(log);
    }
    const auto empty = base::makeRef<Image>();
    EXPECT_TRUE(toRGBA(*empty)); // that it is already
}

} // namespace
} // namespace iio
