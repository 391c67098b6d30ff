#include "codec_support.h"

#include <cmath>
#include <functional>
#include <png.h>
#include <zlib.h>

namespace iio {
namespace {

using test_support::LogCapture;
using test_support::problems;

const ImageAttributes& names = imageAttributes();

constexpr u32 width = 9, height = 7;

struct Kind {
    int colourType, bitDepth;
    bool isInterlaced, hasTransparency;
};
constexpr Kind plain = {PNG_COLOR_TYPE_RGB, 8, false, false};

/// A number below 2^bits, different for neighbours.
u32 sample(u32 i, u32 channel, int bits) {
    return (i % width * 7 + i / width * 13 + channel * 29) * 2777u & ((1u << bits) - 1);
}

constexpr u8 paletteComponent(u32 index, u32 channel) {
    return static_cast<u8>(index * 11 + channel * 70 + 3);
}

constexpr u32 clearPixel = 11; ///< its colour is the transparent one
constexpr u8 paletteAlpha[] = {0, 128, 255};

void setTransparency(png_structp png, png_infop info, const Kind& kind) {
    if (kind.colourType == PNG_COLOR_TYPE_PALETTE) {
        png_set_tRNS(png, info, paletteAlpha, std::min(3, 1 << kind.bitDepth), nullptr);
        return;
    }
    const auto at = [&](u32 channel) {
        return static_cast<u16>(sample(clearPixel, channel, kind.bitDepth));
    };
    const png_color_16 clear = {0, at(0), at(1), at(2), at(0)};
    png_set_tRNS(png, info, nullptr, 0, &clear);
}

using Decorate = std::function<void(png_structp, png_infop)>;

/// A second writer: a file by libpng alone; the functions add chunks before and behind the pixels.
Bytes makePng(const Kind& kind, const Decorate& decorate = {}, const Decorate& decorateLate = {}) {
    Bytes file;
    png_structp png = png_create_write_struct(PNG_LIBPNG_VER_STRING, nullptr, nullptr, nullptr);
    png_infop info = png_create_info_struct(png);
    png_set_write_fn(
        png, &file,
        [](png_structp to, png_bytep bytes, std::size_t count) {
            static_cast<Bytes*>(png_get_io_ptr(to))->append(bytes, bytes + count);
        },
        nullptr);
    png_set_IHDR(png, info, width, height, kind.bitDepth, kind.colourType,
                 kind.isInterlaced ? PNG_INTERLACE_ADAM7 : PNG_INTERLACE_NONE, 0, 0);
    png_color palette[256];
    for (u32 i = 0; i < 256; ++i)
        palette[i] = {paletteComponent(i, 0), paletteComponent(i, 1), paletteComponent(i, 2)};
    if (kind.colourType == PNG_COLOR_TYPE_PALETTE)
        png_set_PLTE(png, info, palette, 1 << kind.bitDepth);
    if (kind.hasTransparency)
        setTransparency(png, info, kind);
    if (decorate)
        decorate(png, info);
    png_write_info(png, info);
    if (decorateLate)
        decorateLate(png, info);
    png_set_packing(png);
    vector<Bytes> rows(height);
    vector<png_bytep> pointers;
    const u32 channels = png_get_channels(png, info);
    for (u32 y = 0; y < height; ++y) {
        for (u32 i = 0; i < width * channels; ++i) {
            const u32 value = sample(y * width + i / channels, i % channels, kind.bitDepth);
            if (kind.bitDepth == 16)
                rows[y].push_back(static_cast<u8>(value >> 8));
            rows[y].push_back(static_cast<u8>(value));
        }
        pointers.push_back(rows[y].data());
    }
    png_write_image(png, pointers.data());
    png_write_end(png, info);
    png_destroy_write_struct(&png, &info);
    return file;
}

/// What pixel `i` of such a file shows, alpha last if it has that.
vector<u32> expectedPixel(const Kind& kind, u32 i) {
    vector<u32> pixel;
    if (kind.colourType == PNG_COLOR_TYPE_PALETTE) {
        const u32 index = sample(i, 0, kind.bitDepth);
        for (u32 c = 0; c < 3; ++c)
            pixel.push_back(paletteComponent(index, c));
        if (kind.hasTransparency)
            pixel.push_back(index < 3 ? paletteAlpha[index] : 255);
        return pixel;
    }
    constexpr u32 channelCounts[] = {1, 0, 3, 0, 2, 0, 4}; // by colour type
    const u32 full = kind.bitDepth == 16 ? 65535 : 255;
    bool isClear = true;
    for (u32 c = 0; c < channelCounts[kind.colourType]; ++c) {
        const u32 value = sample(i, c, kind.bitDepth);
        pixel.push_back(value * full / ((1u << kind.bitDepth) - 1));
        isClear = isClear && value == sample(clearPixel, c, kind.bitDepth);
    }
    if (kind.hasTransparency)
        pixel.push_back(isClear ? 0 : full);
    return pixel;
}

void expectPixels(const Kind& kind) {
    constexpr u8 formatByChannels[] = {0, Image::kLuminance, Image::kLuminanceAlpha, Image::kRGB,
                                       Image::kRGBA};
    LogCapture log;
    const Bytes file = makePng(kind);
    ImageInfo info;
    ASSERT_TRUE(readInfoOf(file, "a.png", info));
    const ref<Image> image = loadBytes(file, "a.png");
    ASSERT_TRUE(image);
    EXPECT_EQ(problems(log), "");
    const auto channels = expectedPixel(kind, 0).size();
    const bool isShort = kind.bitDepth == 16;
    EXPECT_EQ(info.format, formatByChannels[channels]);
    EXPECT_EQ(info.type, isShort ? Image::IT_UNSIGNED_SHORT : Image::IT_UNSIGNED_BYTE);
    EXPECT_EQ(image->format(), info.format);
    EXPECT_EQ(image->type(), info.type);
    EXPECT_EQ(info.level0.width, width);
    EXPECT_EQ(info.level0.height, height);
    for (u32 i = 0; i < width * height; ++i) {
        vector<u32> found;
        for (u64 c = i * channels; found.size() < channels; ++c)
            found.push_back(isShort ? reinterpret_cast<u16*>(image->data())[c] : image->data()[c]);
        ASSERT_EQ(found, expectedPixel(kind, i)) << "pixel " << i;
    }
}

TEST(PngLoad, EveryKindOfFileGivesItsPixels) {
    for (int type : {PNG_COLOR_TYPE_GRAY, PNG_COLOR_TYPE_RGB, PNG_COLOR_TYPE_PALETTE,
                     PNG_COLOR_TYPE_GRAY_ALPHA, PNG_COLOR_TYPE_RGB_ALPHA}) {
        for (int depth : {1, 2, 4, 8, 16}) {
            const bool isPalette = type == PNG_COLOR_TYPE_PALETTE;
            if ((depth < 8 && type != PNG_COLOR_TYPE_GRAY && !isPalette) ||
                (depth == 16 && isPalette))
                continue; // The format has no such files.
            for (bool isInterlaced : {false, true}) {
                SCOPED_TRACE(testing::Message()
                             << "type " << type << ", depth " << depth << ' ' << isInterlaced);
                expectPixels({type, depth, isInterlaced, false});
                if ((type & PNG_COLOR_MASK_ALPHA) == 0)
                    expectPixels({type, depth, isInterlaced, true});
            }
        }
    }
}

/// What counts as a colour profile of red, green and blue: a header, no tag, and bytes behind that,
/// for a chunk that packs to less than 92 bytes is taken to be too short.
Bytes makeProfile() {
    Bytes profile(132, 0);
    for (u32 i = 0; i < 100; ++i)
        profile.push_back(static_cast<u8>(i * i + i / 3));
    const auto put = [&](u32 at, std::initializer_list<u8> bytes) {
        std::copy(bytes.begin(), bytes.end(), profile.data() + at);
    };
    put(3, {232});
    put(8, {2, 0x40});
    put(12, {'m', 'n', 't', 'r', 'R', 'G', 'B', ' ', 'X', 'Y', 'Z', ' '});
    put(36, {'a', 'c', 's', 'p'});
    put(68, {0, 0, 0xF6, 0xD6, 0, 1, 0, 0, 0, 0, 0xD3, 0x2D});
    return profile;
}

png_text makeText(int compression, const char* key, const char* text) {
    png_text row = {};
    row.compression = compression;
    row.key = const_cast<char*>(key);
    row.text = const_cast<char*>(text);
    return row;
}

/// A second reader: the pixels in the order of the file, and the chunks.
struct BarePng {
    explicit BarePng(const Bytes& file) : source(file) {
        png_set_read_fn(png, this, [](png_structp from, png_bytep target, std::size_t count) {
            auto& self = *static_cast<BarePng*>(png_get_io_ptr(from));
            if (self.at + count > self.source.size())
                png_error(from, "too short");
            std::copy_n(self.source.data() + self.at, count, target);
            self.at += count;
        });
        png_read_png(png, info, PNG_TRANSFORM_IDENTITY, nullptr);
        const png_bytepp rows = png_get_rows(png, info);
        for (u32 y = 0; y < png_get_image_height(png, info); ++y)
            pixels.append(rows[y], rows[y] + png_get_rowbytes(png, info));
    }
    ~BarePng() { png_destroy_read_struct(&png, &info, nullptr); }

    png_structp png = png_create_read_struct(PNG_LIBPNG_VER_STRING, nullptr, nullptr, nullptr);
    png_infop info = png_create_info_struct(png);
    const Bytes& source;
    std::size_t at = 0;
    Bytes pixels;
};

/// All that `addChunks` says, a line each.
constexpr char chunkTexts[] = "4 3000 2000|2021-12-31 23:59:60|gamma 2|J\xC3\xBCrg|squeezed|"
                              "\xE2\x82\xAC|of us|none|first|late|-5 6 3 12|";

string textsOf(const Image& image) {
    const base::AttribMap& found = image.attributes();
    const auto date = valueOf<base::DateTime>(found, names.n_DateCreated);
    string text = base::format(
        "{} {} {}|{}-{}-{} {}:{}:{}|{} {}|", valueOf<u16>(found, names.n_ResolutionUnit),
        valueOf<float>(found, names.n_XResolution), valueOf<float>(found, names.n_YResolution),
        date.year, date.month, date.day, date.hour, date.minute, date.second,
        valueOf<string>(found, names.n_ColorSpace), valueOf<float>(found, names.n_Gamma));
    for (base::name_id name :
         {names.n_Author, names.n_DocumentName, names.n_Description, names.n_Software,
          names.n_Copyright, names.n_Comment, names.n_DeviceModel})
        text += valueOf<string>(found, name) + "|";
    const auto& bounds = image.info.bounds;
    return text +
           base::format("{} {} {} {}|", bounds.min.x, bounds.min.y, bounds.max.x, bounds.max.y);
}

void addChunks(png_structp png, png_infop info) {
    const Bytes profile = makeProfile();
    const png_time time = {2021, 12, 31, 23, 59, 60};
    const png_text texts[] = {makeText(-1, "Author", "J\xFCrg"),
                              makeText(0, "Title", "squeezed"),
                              makeText(1, "Description", "\xE2\x82\xAC"),
                              makeText(2, "Software", "of us"),
                              makeText(-1, "Copyright", "none"),
                              makeText(-1, "Comment", ""),
                              makeText(-1, "Comment", "first"),
                              makeText(-1, "Comment", "second"),
                              makeText(-1, "Unheard", "of")};
    png_set_pHYs(png, info, 3000, 2000, PNG_RESOLUTION_METER);
    png_set_tIME(png, info, &time);
    png_set_gAMA_fixed(png, info, 50000);
    png_set_oFFs(png, info, -5, 6, PNG_OFFSET_PIXEL);
    png_set_iCCP(png, info, "any", 0, profile.data(), static_cast<png_uint_32>(profile.size()));
    png_set_text(png, info, texts, static_cast<int>(std::size(texts)));
}

/// These go behind the pixels.
void addLateChunks(png_structp png, png_infop info) {
    const png_text text = makeText(-1, "Source", "late");
    png_set_text(png, info, &text, 1);
}

TEST(PngLoad, ChunksBecomeAttributesAndChunksAgain) {
    LogCapture log;
    const ref<Image> image = loadBytes(makePng(plain, addChunks, addLateChunks), "a.png");
    ASSERT_TRUE(image);
    const Bytes saved = saveBytes(*image, "a.png");
    const ref<Image> again = loadBytes(saved, "a.png");
    ASSERT_TRUE(again);
    EXPECT_EQ(problems(log), "");
    for (const Image* loaded : {image.get(), again.get()}) {
        EXPECT_EQ(textsOf(*loaded), chunkTexts);
        const Bytes* profile = loaded->attributes().findVecAttribute<u8>(names.n_ICCProfile);
        ASSERT_NE(profile, nullptr);
        EXPECT_EQ(*profile, makeProfile());
    }
    const BarePng read(saved);
    png_textp found = nullptr;
    const int count = png_get_text(read.png, read.info, &found, nullptr);
    string keywords;
    for (int i = 0; i < count; ++i)
        keywords += base::format("{} {},", found[i].key, found[i].compression);
    EXPECT_EQ(keywords, "Author 1,Title -1,Description 1,Software -1,Copyright -1,Comment -1,"
                        "Source -1,");

    const ref<Image> unclear =
        loadBytes(makePng(plain,
                          [](png_structp png, png_infop info) {
                              png_set_pHYs(png, info, 3, 2, PNG_RESOLUTION_UNKNOWN);
                              png_set_sRGB_gAMA_and_cHRM(png, info, 0);
                          }),
                  "a.png");
    EXPECT_EQ(valueOf<string>(unclear->attributes(), names.n_ColorSpace), "srgb");
    EXPECT_EQ(unclear->attributes().size(), 1u);
}

/// A file of `signature` and a header alone, whose check sum is right.
Bytes makeHeaderOnly(u32 claimedWidth, u32 claimedHeight) {
    Bytes file = makePng({PNG_COLOR_TYPE_RGB_ALPHA, 16, false, false});
    const auto put = [&](u32 at, u32 value) {
        for (u32 i = 0; i < 4; ++i)
            file[at + i] = static_cast<u8>(value >> (24 - 8 * i));
    };
    put(16, claimedWidth);
    put(20, claimedHeight);
    put(29, static_cast<u32>(crc32(0, file.data() + 12, 17)));
    return file;
}

TEST(PngLoad, ClaimsAreTestedFirst) {
    struct Row {
        u32 width, height;
        const char* message;
    };
    const Row rows[] = {
        {0, 1, "png load |a.png| invalid image width reported 0"},
        {1, 0, "png load |a.png| invalid image height reported 0"},
        {1000001, 1, "png load |a.png| invalid image width reported 1000001"},
        {1, 4000000000u, "png load |a.png| invalid image height reported 4000000000"},
        {1000000, 1000000, "Could not allocate memory for an image! Probably invalid settings."},
        {30000, 10000, "png load |a.png| "}, // just has too few rows
    };
    for (const Row& row : rows) {
        LogCapture log;
        EXPECT_FALSE(loadBytes(makeHeaderOnly(row.width, row.height), "a.png"));
        ASSERT_EQ(log.entries().size(), 2u) << problems(log);
        EXPECT_EQ(log.entries()[0].text.compare(0, std::strlen(row.message), row.message), 0)
            << log.entries()[0].text;
        EXPECT_TRUE(log.has(base::logError, "Unable to load a.png"));
    }
}

TEST(PngLoad, ShorterFilesFail) {
    for (bool isInterlaced : {false, true}) {
        const Bytes whole = makePng({PNG_COLOR_TYPE_PALETTE, 4, isInterlaced, true});
        for (u32 length = 0; length < whole.size(); ++length) {
            LogCapture log;
            EXPECT_FALSE(loadBytes(Bytes(whole.data(), whole.data() + length), "a.png")) << length;
            EXPECT_TRUE(log.has(base::logError, "Unable to load a.png"));
            EXPECT_EQ(log.entries().size(), length < 8 ? 1u : 2u) << length << problems(log);
        }
    }
}

TEST(PngLoad, DamagedFilesGiveAPictureOrNull) {
    for (const Kind& kind :
         {Kind{PNG_COLOR_TYPE_PALETTE, 8, true, true}, Kind{PNG_COLOR_TYPE_RGB, 16, false, true}}) {
        const Bytes whole = makePng(kind, addChunks);
        EXPECT_GT(countLost(whole, "a.png", 8), 200u); // check sums guard header and pixels
    }
}

TEST(PngSave, FormatsAndTypes) {
    struct Row {
        const char* name;
        u8 format, type;
        Bytes source;
        int colourType, bitDepth;
        Bytes expected; ///< a pixel in the file
    };
    const u8 byte = Image::IT_UNSIGNED_BYTE, twoBytes = Image::IT_UNSIGNED_SHORT;
    const int grey = PNG_COLOR_TYPE_GRAY, greyAlpha = PNG_COLOR_TYPE_GRAY_ALPHA;
    const int rgb = PNG_COLOR_TYPE_RGB, rgba = PNG_COLOR_TYPE_RGB_ALPHA;
    const Row rows[] = {
        {"rgb", Image::kRGB, byte, {1, 2, 3}, rgb, 8, {1, 2, 3}},
        {"bgr", Image::kBGR, byte, {1, 2, 3}, rgb, 8, {3, 2, 1}},
        {"rgba", Image::kRGBA, byte, {1, 2, 3, 4}, rgba, 8, {1, 2, 3, 4}},
        {"bgra", Image::kBGRA, byte, {1, 2, 3, 4}, rgba, 8, {3, 2, 1, 4}},
        {"rg", Image::kRG, byte, {1, 2}, rgb, 8, {1, 2, 0}},
        {"red", Image::kRed, byte, {7}, grey, 8, {7}},
        {"alpha", Image::kAlpha, byte, {7}, grey, 8, {7}},
        {"luminance", Image::kLuminance, byte, {7}, grey, 8, {7}},
        {"luminance alpha", Image::kLuminanceAlpha, byte, {7, 8}, greyAlpha, 8, {7, 8}},
        // Shorts are little-endian in memory and big-endian in the file.
        {"short", Image::kRed, twoBytes, {1, 2}, grey, 16, {2, 1}},
        {"short bgr", Image::kBGR, twoBytes, {1, 0, 2, 0, 3, 0}, rgb, 16, {0, 3, 0, 2, 0, 1}},
        {"signed byte", Image::kRed, Image::IT_BYTE, {127}, grey, 8, {255}},
        {"signed short", Image::kRed, Image::IT_SHORT, {0xFF, 0x7F}, grey, 16, {255, 255}},
        // sRGB of one half is 0.73536: 48191.8 of 65535.
        {"float", Image::kRed, Image::kFloat, {0, 0, 0, 0x3F}, grey, 16, {0xBC, 0x3F}},
        {"float in bytes", Image::kRed, Image::kFloat, {0, 0, 0, 0x3F}, grey, 8, {187}},
        {"half", Image::kRed, Image::kHalf, {0, 0x38}, grey, 16, {0xBC, 0x3F}},
        // A block whose two colours are white, all indices 0.
        {"dxt1", Image::kDXT1, 0, {255, 255, 255, 255, 0, 0, 0, 0}, rgb, 8, {255, 255, 255}},
    };
    for (const Row& row : rows) {
        SCOPED_TRACE(row.name);
        for (bool isInterlaced : {false, true}) {
            const u32 side = row.type == 0 ? 4 : 3; // of a block
            const ref<Image> image = makeImage(side, side, row.format, row.type);
            image->attributes().attribute<bool>(names.n_interlace) = isInterlaced;
            if (row.bitDepth == 8)
                image->attributes().attribute<u16>(names.n_requestBits) = 15;
            for (u64 i = 0; i < image->memorySize(); ++i)
                image->data()[i] = row.source[i % row.source.size()];
            LogCapture log;
            const Bytes file = saveBytes(*image, "a.png");
            EXPECT_EQ(problems(log), "");
            ASSERT_FALSE(file.empty());
            const BarePng read(file);
            EXPECT_EQ(png_get_color_type(read.png, read.info), row.colourType);
            EXPECT_EQ(png_get_bit_depth(read.png, read.info), row.bitDepth);
            EXPECT_EQ(png_get_interlace_type(read.png, read.info), isInterlaced ? 1 : 0);
            ASSERT_EQ(read.pixels.size(), row.expected.size() * side * side);
            for (u64 i = 0; i < read.pixels.size(); ++i)
                ASSERT_EQ(read.pixels[i], row.expected[i % row.expected.size()]) << i;
        }
    }
}

TEST(PngSave, DensityIsPerMetre) {
    struct Row {
        u16 unit;
        float x, y;
        int expectedUnit; ///< -1 for no chunk
        u32 expectedX, expectedY;
    };
    const int metre = PNG_RESOLUTION_METER, unknown = PNG_RESOLUTION_UNKNOWN;
    for (const Row& row :
         {Row{2, 300, 72, metre, 11811, 2835}, Row{3, 100, 50, metre, 10000, 5000},
          Row{4, 1e20f, 1, metre, 0x7FFFFFFF, 1}, Row{0, 4, 3, unknown, 4, 3},
          Row{9, 4, 3, unknown, 4, 3}, Row{4, NAN, 1, -1, 0, 0}, Row{4, -1, 1, -1, 0, 0}}) {
        const ref<Image> image = makeCounting(2, 2, Image::kRGB);
        image->attributes().attribute<u16>(names.n_ResolutionUnit) = row.unit;
        image->attributes().attribute<float>(names.n_XResolution) = row.x;
        image->attributes().attribute<float>(names.n_YResolution) = row.y;
        const Bytes file = saveBytes(*image, "a.png");
        const BarePng read(file);
        png_uint_32 x = 0, y = 0;
        int unit = -1;
        png_get_pHYs(read.png, read.info, &x, &y, &unit);
        EXPECT_EQ(unit, row.expectedUnit) << row.unit << ' ' << row.x;
        EXPECT_EQ(x, row.expectedX) << row.unit << ' ' << row.x;
        EXPECT_EQ(y, row.expectedY) << row.unit << ' ' << row.x;
    }
}

TEST(PngSave, ColourSpaceAndWhatCannotBeWritten) {
    struct Row {
        u8 type;
        const char* space;
        float gamma;
        int expectedGamma; ///< 0 for no chunk
        bool isSrgb;
        u32 warningCount;
    };
    const u8 byte = Image::IT_UNSIGNED_BYTE;
    const Row rows[] = {
        {byte, "", 0.0f, 0, false, 0},
        {byte, "linear", 2.0f, 100000, false, 0},
        {byte, "gamma", 2.0f, 50000, false, 0},
        {byte, "gamma", -1.0f, 45455, false, 0}, // 2.2 where none is said
        {byte, "gamma", 0.0f, 0, false, 1},      // outside the range of the chunk
        {byte, "gamma", NAN, 0, false, 1},
        {byte, "srgb", 0.0f, 45455, true, 0},
        {Image::kFloat, "linear", 0.0f, 45455, true, 0}, // went through the curve
    };
    for (const Row& row : rows) {
        SCOPED_TRACE(testing::Message() << row.space << ' ' << row.gamma);
        const ref<Image> image = makeCounting(2, 2, Image::kRGB, row.type);
        image->attributes().attribute<string>(names.n_ColorSpace) = row.space;
        if (row.gamma != -1.0f)
            image->attributes().attribute<float>(names.n_Gamma) = row.gamma;
        LogCapture log;
        const Bytes file = saveBytes(*image, "a.png");
        ASSERT_FALSE(file.empty());
        EXPECT_EQ(log.entries().size(), row.warningCount) << problems(log);
        const BarePng read(file);
        png_fixed_point gamma = 0;
        int intent = 0;
        png_get_gAMA_fixed(read.png, read.info, &gamma);
        EXPECT_EQ(gamma, row.expectedGamma);
        EXPECT_EQ(png_get_sRGB(read.png, read.info, &intent) != 0, row.isSrgb);
        EXPECT_EQ(intent, row.isSrgb ? 3 : 0);
    }

    const ref<Image> image = makeCounting(2, 2, Image::kRGB);
    image->attributes().vecAttribute<u8>(names.n_ICCProfile) = {1, 2, 3};
    image->attributes().attribute<base::DateTime>(names.n_DateCreated) = {2000, 13, 1, 0, 0, 0, 0};
    image->attributes().attribute<i32>(names.n_CompressionLevel) = 95;
    LogCapture log;
    const Bytes file = saveBytes(*image, "a.png");
    ASSERT_FALSE(file.empty());
    ASSERT_EQ(log.entries().size(), 1u) << problems(log);
    EXPECT_EQ(log.entries()[0].level, base::logWarning);
    const BarePng read(file);
    EXPECT_EQ(read.pixels, pixelsOf(*image));
    EXPECT_EQ(png_get_valid(read.png, read.info, PNG_INFO_iCCP | PNG_INFO_tIME), 0u);
}

TEST(PngSave, WhatHasNoPixelsOrNoRoomFails) {
    Image empty;
    EXPECT_TRUE(saveBytes(empty, "a.png").empty());
    expectFullDiskTold("full.png", "png save |{}| the file could not be written whole");
}

} // namespace
} // namespace iio
