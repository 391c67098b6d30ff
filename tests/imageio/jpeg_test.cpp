#include "codec_support.h"

#include <cstdio>
#include <cstdlib>

#include <jpeglib.h>

namespace iio {
namespace {

using test_support::linesOf;
using test_support::LogCapture;
using test_support::problems;

const ImageAttributes& names = imageAttributes();

constexpr u32 width = 35, height = 21;

// A second writer and reader: libjpeg without the library.

/// A picture of `components`, smooth, so that packing changes it little.
Bytes makeSamples(u32 components) {
    Bytes samples;
    for (u32 i = 0; i < width * height; ++i) {
        for (u32 c = 0; c < components; ++c)
            samples.push_back(static_cast<u8>(i % width * 3 + i / width * (c + 2) + c * 20));
    }
    return samples;
}

/// A file; `configure` changes the defaults, `decorate` adds markers.
template <class Configure, class Decorate>
Bytes makeJpeg(const Bytes& samples, int components, J_COLOR_SPACE space,
               const Configure& configure, const Decorate& decorate, u32 w = width,
               u32 h = height) {
    jpeg_compress_struct codec = {};
    jpeg_error_mgr errors;
    codec.err = jpeg_std_error(&errors);
    jpeg_create_compress(&codec);
    unsigned char* bytes = nullptr;
    unsigned long byteCount = 0;
    jpeg_mem_dest(&codec, &bytes, &byteCount);
    codec.image_width = w;
    codec.image_height = h;
    codec.input_components = components;
    codec.in_color_space = space;
    jpeg_set_defaults(&codec);
    jpeg_set_quality(&codec, 95, TRUE);
    configure(codec);
    jpeg_start_compress(&codec, TRUE);
    decorate(codec);
    while (codec.next_scanline < h) {
        JSAMPROW row = const_cast<u8*>(samples.data()) +
                       u64(codec.next_scanline) * w * static_cast<u32>(components);
        jpeg_write_scanlines(&codec, &row, 1);
    }
    jpeg_finish_compress(&codec);
    jpeg_destroy_compress(&codec);
    Bytes file(bytes, bytes + byteCount);
    std::free(bytes);
    return file;
}

void nothing(jpeg_compress_struct&) {}

template <class Decorate>
Bytes makeDecorated(const Decorate& decorate) {
    return makeJpeg(makeSamples(1), 1, JCS_GRAYSCALE, nothing, decorate);
}

Bytes makeSmooth(u32 components, J_COLOR_SPACE space, bool isProgressive) {
    const auto configure = [&](jpeg_compress_struct& codec) {
        if (isProgressive)
            jpeg_simple_progression(&codec);
    };
    return makeJpeg(makeSamples(components), static_cast<int>(components), space, configure,
                    nothing);
}

/// What libjpeg makes of a file in the colours of its choice.
struct BareJpeg {
    explicit BareJpeg(const Bytes& file) {
        codec.err = jpeg_std_error(&errors);
        jpeg_create_decompress(&codec);
        jpeg_save_markers(&codec, JPEG_COM, 0xFFFF);
        jpeg_mem_src(&codec, file.data(), file.size());
        jpeg_read_header(&codec, TRUE);
        jpeg_start_decompress(&codec);
        const u64 pitch = u64(codec.output_width) * static_cast<u32>(codec.output_components);
        pixels = Bytes(pitch * codec.output_height, 0);
        while (codec.output_scanline < codec.output_height) {
            JSAMPROW row = pixels.data() + codec.output_scanline * pitch;
            jpeg_read_scanlines(&codec, &row, 1);
        }
    }
    ~BareJpeg() { jpeg_destroy_decompress(&codec); }

    jpeg_decompress_struct codec = {};
    jpeg_error_mgr errors;
    Bytes pixels;
};

TEST(JpegLoad, EveryKindOfFileGivesItsPixels) {
    struct Row {
        const char* name;
        int components;
        J_COLOR_SPACE space;
        void (*configure)(jpeg_compress_struct&);
        u8 format;
    };
    const Row rows[] = {
        {"grey", 1, JCS_GRAYSCALE, nothing, Image::kLuminance},
        {"4:2:0", 3, JCS_RGB, nothing, Image::kRGB},
        {"4:4:4", 3, JCS_RGB, [](auto& c) { c.comp_info[0].h_samp_factor = 1; }, Image::kRGB},
        {"4:4:0", 3, JCS_RGB, [](auto& c) { c.comp_info[0].v_samp_factor = 1; }, Image::kRGB},
        {"rgb", 3, JCS_RGB, [](auto& c) { jpeg_set_colorspace(&c, JCS_RGB); }, Image::kRGB},
        {"progressive", 3, JCS_RGB, [](auto& c) { jpeg_simple_progression(&c); }, Image::kRGB},
        {"arithmetic", 3, JCS_RGB, [](auto& c) { c.arith_code = TRUE; }, Image::kRGB},
        {"restarts", 3, JCS_RGB, [](auto& c) { c.restart_interval = 2; }, Image::kRGB},
    };
    for (const Row& row : rows) {
        SCOPED_TRACE(row.name);
        const Bytes file = makeJpeg(makeSamples(static_cast<u32>(row.components)), row.components,
                                    row.space, row.configure, nothing);
        LogCapture log;
        ImageInfo info;
        ASSERT_TRUE(readInfoOf(file, "a.jpg", info));
        const ref<Image> image = loadBytes(file, "a.jpg");
        ASSERT_TRUE(image);
        EXPECT_EQ(linesOf(log), "");
        EXPECT_EQ(info.level0.width, width);
        EXPECT_EQ(info.level0.height, height);
        EXPECT_EQ(info.format, row.format);
        EXPECT_EQ(info.type, Image::IT_UNSIGNED_BYTE);
        EXPECT_EQ(image->format(), row.format);
        EXPECT_EQ(image->attributes().size(), 0u);
        EXPECT_EQ(pixelsOf(*image), BareJpeg(file).pixels);
    }
}

TEST(JpegLoad, InksBecomeLight) {
    const auto withAdobeMark = [](jpeg_compress_struct& codec) { codec.write_Adobe_marker = TRUE; };
    const auto withoutMark = [](jpeg_compress_struct& codec) { codec.write_Adobe_marker = FALSE; };
    const auto asYcck = [](jpeg_compress_struct& codec) { jpeg_set_colorspace(&codec, JCS_YCCK); };
    struct Row {
        const char* name;
        void (*configure)(jpeg_compress_struct&);
        Bytes inks;
        u8 expected[3];
    };
    const Row rows[] = {
        // 255 is no ink: what is left is c * k / 255.
        {"Adobe", withAdobeMark, {255, 100, 0, 255}, {255, 100, 0}},
        {"Adobe, grey", withAdobeMark, {255, 255, 255, 60}, {60, 60, 60}},
        {"Adobe, both", withAdobeMark, {200, 100, 50, 128}, {100, 50, 25}},
        {"Adobe YCCK", asYcck, {200, 100, 50, 128}, {100, 50, 25}},
        // 255 is full ink.
        {"plain", withoutMark, {0, 155, 255, 0}, {255, 100, 0}},
        {"plain, both", withoutMark, {55, 155, 205, 127}, {100, 50, 25}},
    };
    for (const Row& row : rows) {
        Bytes samples;
        for (u32 i = 0; i < width * height; ++i)
            samples.append(row.inks.cbegin(), row.inks.cend());
        const ref<Image> image =
            loadBytes(makeJpeg(samples, 4, JCS_CMYK, row.configure, nothing), "a.jpg");
        ASSERT_TRUE(image) << row.name;
        ASSERT_EQ(image->format(), Image::kRGB);
        for (u64 i = 0; i < image->memorySize(); ++i) // 3: what packing at quality 95 changes
            ASSERT_NEAR(image->data()[i], row.expected[i % 3], 3) << row.name << ' ' << i;
    }
}

TEST(JpegLoad, MarkersBecomeAttributes) {
    struct Row {
        u8 unit;
        u16 x, y;
        u16 expectedUnit; ///< 0 for no attribute
    };
    for (const Row& row : {Row{1, 300, 72, 2}, Row{2, 118, 28, 3}, Row{0, 72, 72, 0},
                           Row{2, 0, 72, 0}, Row{9, 72, 72, 0}}) {
        const auto configure = [&](jpeg_compress_struct& codec) {
            codec.density_unit = row.unit;
            codec.X_density = row.x;
            codec.Y_density = row.y;
        };
        const auto decorate = [](jpeg_compress_struct& codec) {
            const auto* text = reinterpret_cast<const JOCTET*>("\0first\xFF\0rest");
            jpeg_write_marker(&codec, JPEG_COM, text, 1);
            jpeg_write_marker(&codec, JPEG_COM, text + 1, 11);
            jpeg_write_marker(&codec, JPEG_COM, text + 8, 4);
        };
        const ref<Image> image =
            loadBytes(makeJpeg(makeSamples(1), 1, JCS_GRAYSCALE, configure, decorate), "a.jpg");
        ASSERT_TRUE(image);
        const bool isKnown = row.expectedUnit != 0;
        const base::AttribMap& found = image->attributes();
        EXPECT_EQ(valueOf<u16>(found, names.n_ResolutionUnit), row.expectedUnit);
        EXPECT_EQ(valueOf<float>(found, names.n_XResolution), isKnown ? row.x : 0);
        EXPECT_EQ(valueOf<float>(found, names.n_YResolution), isKnown ? row.y : 0);
        EXPECT_EQ(valueOf<string>(found, names.n_Comment), "first\xEF\xBF\xBD");
        EXPECT_EQ(found.size(), isKnown ? 4u : 1u);
    }
}

TEST(JpegLoad, ProfilesAreJoined) {
    struct Row {
        const char* name;
        vector<Bytes> parts; ///< number, count, bytes
        Bytes expected;
        vector<const char*> complaints;
    };
    const char* count = "inconsistent ICC profile markers count";
    const char* bogus = "bogus id in the ICC profile marker";
    const char* twice = "duplicated ICC profile marker";
    const char* empty = "empty ICC profile markers";
    const Row rows[] = {
        {"one", {{1, 1, 7, 8}}, {7, 8}, {}},
        {"any order", {{3, 3, 5}, {1, 3, 1, 2}, {2, 3, 3, 4}}, {1, 2, 3, 4, 5}, {}},
        {"twice", {{1, 2, 1}, {1, 2, 9}, {2, 2, 2}}, {1, 2}, {twice}},
        {"other count", {{1, 2, 1}, {2, 3, 9}, {2, 2, 2}}, {1, 2}, {count}},
        {"missing", {{1, 2, 1}}, {}, {count}},
        {"number 0", {{0, 1, 1}, {1, 1, 2}}, {2}, {bogus}},
        {"number too high", {{2, 1, 1}, {1, 1, 2}}, {2}, {bogus}},
        {"no part", {{0, 0}}, {}, {bogus, empty}},
        {"empty", {{1, 2}, {2, 2}}, {}, {empty}},
        {"too short", {{1}}, {}, {}},
    };
    for (const Row& row : rows) {
        const Bytes file = makeDecorated([&](jpeg_compress_struct& codec) {
            for (const Bytes& part : row.parts) {
                Bytes marker = {'I', 'C', 'C', '_', 'P', 'R', 'O', 'F', 'I', 'L', 'E', 0};
                marker.append(part.cbegin(), part.cend());
                jpeg_write_marker(&codec, JPEG_APP0 + 2, marker.data(),
                                  static_cast<unsigned>(marker.size()));
            }
        });
        LogCapture log;
        const ref<Image> image = loadBytes(file, "a.jpg");
        ASSERT_TRUE(image) << row.name;
        const Bytes* found = image->attributes().findVecAttribute<u8>(names.n_ICCProfile);
        EXPECT_EQ(found ? *found : Bytes(), row.expected) << row.name;
        string expected;
        for (const char* complaint : row.complaints)
            expected += base::format("2 jpeg load |a.jpg| {}, ignoring...\n", complaint);
        EXPECT_EQ(linesOf(log), expected) << row.name;
    }
}

/// Where the first scan starts.
u64 findScan(const Bytes& file) {
    for (u64 at = 2;; at += 2u + file[at + 2] * 256u + file[at + 3]) {
        if (file[at + 1] == 0xDA)
            return at + 2u + file[at + 2] * 256u + file[at + 3];
    }
}

TEST(JpegLoad, ShorterFilesGiveWhatIsThere) {
    for (bool isProgressive : {false, true}) {
        const Bytes whole = makeSmooth(3, JCS_RGB, isProgressive);
        const u64 scan = findScan(whole);
        for (u64 length = 0; length < whole.size(); ++length) {
            LogCapture log;
            const bool isLoaded = !!loadBytes(Bytes(whole.data(), whole.data() + length), "a.jpg");
            // The last three bytes of the scan's header mean nothing to a plain picture.
            if (length >= scan || length + 3 < scan) {
                ASSERT_EQ(isLoaded, length >= scan) << length << isProgressive << linesOf(log);
            }
            ASSERT_EQ(log.entries().back().level, isLoaded ? 3 : 2) << length;
            ASSERT_EQ(log.entries().size() == 1, isLoaded || length < 3) << linesOf(log);
        }
    }
}

TEST(JpegLoad, DamagedFilesGiveAPictureOrNull) {
    for (bool isProgressive : {false, true})
        EXPECT_GT(countLost(makeSmooth(4, JCS_CMYK, isProgressive), "a.jpg", 2), 100u);
}

TEST(JpegLoad, ClaimsAreTestedFirst) {
    const auto load = [](u32 claimedWidth, u32 claimedHeight) {
        Bytes file = makeJpeg(makeSamples(3), 3, JCS_RGB, nothing, nothing);
        u64 at = 2; // of the frame header: length, precision, height, width
        while (file[at + 1] != 0xC0)
            at += 2u + file[at + 2] * 256u + file[at + 3];
        file[at + 5] = static_cast<u8>(claimedHeight >> 8);
        file[at + 6] = static_cast<u8>(claimedHeight);
        file[at + 7] = static_cast<u8>(claimedWidth >> 8);
        file[at + 8] = static_cast<u8>(claimedWidth);
        LogCapture log;
        EXPECT_FALSE(loadBytes(file, "a.jpg"));
        return linesOf(log);
    };
    EXPECT_EQ(load(65500, 20000),
              "2 jpeg load |a.jpg| the file is too short for 65500 x 20000 pixels\n"
              "2 Unable to load a.jpg\n");
    EXPECT_NE(load(0, 5).find("bad file header"), string::npos);
    EXPECT_NE(load(65501, 5).find("bad file header"), string::npos);
}

/// A grey progressive picture of one block with that many scans.
Bytes makeScans(int scanCount) {
    vector<jpeg_scan_info> scans = {{1, {0, 0, 0, 0}, 0, 0, 0, 0}};
    for (int k = 1; k < 64; ++k) {
        for (int bit = 10; bit >= 0 && static_cast<int>(scans.size()) < scanCount; --bit)
            scans.push_back({1, {0, 0, 0, 0}, k, k, bit == 10 ? 0 : bit + 1, bit});
    }
    return makeJpeg(
        Bytes(64, 90), 1, JCS_GRAYSCALE,
        [&](jpeg_compress_struct& codec) {
            codec.scan_info = scans.data();
            codec.num_scans = static_cast<int>(scans.size());
        },
        nothing, 8, 8);
}

TEST(JpegLoad, WhatIsRefused) {
    EXPECT_TRUE(loadBytes(makeScans(500), "a.jpg"));
    const std::pair<Bytes, const char*> rows[] = {
        {makeScans(501), "too many scans"},
        {makeJpeg(makeSamples(2), 2, JCS_UNKNOWN, nothing, nothing),
         "pictures of 2 components are not supported"},
    };
    for (const auto& [file, message] : rows) {
        LogCapture log;
        EXPECT_FALSE(loadBytes(file, "a.jpg"));
        EXPECT_EQ(linesOf(log),
                  base::format("2 jpeg load |a.jpg| {}\n2 Unable to load a.jpg\n", message));
    }
}

TEST(JpegSave, BytesAreThoseOfTheLibrary) {
    struct Row {
        const char* name;
        u8 format;
        const char* subsampling;
        int quality, horizontal, vertical;
    };
    const Row rows[] = {
        {"rgb", Image::kRGB, "", 95, 2, 2},
        {"bgr", Image::kBGR, "4:4:4", 95, 1, 1},
        {"rgba", Image::kRGBA, "4:2:2", 95, 2, 1},
        {"bgra", Image::kBGRA, "4:1:1", 95, 4, 1},
        {"rgb, low quality", Image::kRGB, "4:2:0", 20, 2, 2},
        {"rgb, quality beyond the range", Image::kRGB, "4:2:1", 1000, 2, 2},
        {"luminance", Image::kLuminance, "4:2:0", 50, 1, 1},
        {"green", Image::kGreen, "", 95, 1, 1},
    };
    for (const Row& row : rows) {
        const ref<Image> image = makeImage(width, height, row.format);
        const u32 channels = image->channelCount();
        const u32 colours = channels == 1 ? 1 : 3;
        const Bytes samples = makeSamples(colours);
        const bool isSwapped = row.format == Image::kBGR || row.format == Image::kBGRA;
        for (u32 i = 0; i < samples.size(); ++i) {
            const u32 c = isSwapped ? 2 - i % colours : i % colours;
            image->data()[i / colours * channels + c] = samples[i];
        }
        const Bytes expected = makeJpeg(
            samples, static_cast<int>(colours), colours == 1 ? JCS_GRAYSCALE : JCS_RGB,
            [&](jpeg_compress_struct& codec) {
                codec.X_density = codec.Y_density = 72;
                jpeg_set_quality(&codec, row.quality, TRUE);
                codec.comp_info[0].h_samp_factor = row.horizontal;
                codec.comp_info[0].v_samp_factor = row.vertical;
            },
            [](jpeg_compress_struct& codec) {
                jpeg_write_marker(&codec, JPEG_COM, reinterpret_cast<const JOCTET*>("hi"), 3);
            });
        base::AttribMap attributes;
        attributes.attribute<string>(names.n_jpegSubsampling) = row.subsampling;
        attributes.attribute<string>(names.n_Comment) = "hi";
        if (row.quality != 95) {
            image->attributes().attribute<i32>(names.n_CompressionLevel) = 1;
            attributes.attribute<i32>(names.n_CompressionLevel) = row.quality; // comes first
        }
        LogCapture log;
        EXPECT_EQ(saveBytes(*image, "a.jpg", attributes), expected) << row.name;
        EXPECT_EQ(linesOf(log), "") << row.name;
    }
}

TEST(JpegSave, OtherPicturesAreConverted) {
    struct Row {
        const char* name;
        u8 format, type;
        Bytes source;
        Bytes expected;
    };
    const Row rows[] = {
        {"luminance alpha", Image::kLuminanceAlpha, Image::IT_UNSIGNED_BYTE, {80, 3}, {80}},
        {"rg", Image::kRG, Image::IT_UNSIGNED_BYTE, {200, 100}, {200, 100, 0}},
        {"short", Image::kRed, Image::IT_UNSIGNED_SHORT, {0, 100}, {99}},
        // sRGB of one half is 187.5; what is above 1 clips.
        {"float", Image::kRed, Image::kFloat, {0, 0, 0, 0x3F}, {187}},
        {"bright float", Image::kRed, Image::kFloat, {0, 0, 0, 0x41}, {255}},
    };
    for (const Row& row : rows) {
        const ref<Image> image = makeImage(16, 16, row.format, row.type);
        for (u64 i = 0; i < image->memorySize(); ++i)
            image->data()[i] = row.source[i % row.source.size()];
        const BareJpeg read(saveBytes(*image, "a.jpg"));
        ASSERT_EQ(read.pixels.size(), 256 * row.expected.size()) << row.name;
        for (u64 i = 0; i < read.pixels.size(); ++i)
            ASSERT_NEAR(read.pixels[i], row.expected[i % row.expected.size()], 2) << row.name;
    }
}

TEST(JpegSave, Density) {
    struct Row {
        int unit; ///< -1 for none
        float x;  ///< -1 for none
        int expectedUnit, expectedX;
    };
    const float huge = 1e30f;
    const Row rows[] = {{-1, -1, 0, 72}, {-1, 300, 0, 0},     {2, 300, 2, 0}, {3, 300, 2, 0},
                        {4, -1, 2, 72},  {4, 1.239f, 2, 123}, {4, 3, 2, 255}, {4, huge, 2, 255},
                        {4, -2, 2, 0},   {1, 300, 1, 0}};
    for (const Row& row : rows) {
        const ref<Image> image = makeCounting(8, 8, Image::kRGB);
        if (row.unit >= 0)
            image->attributes().attribute<u16>(names.n_ResolutionUnit) = static_cast<u16>(row.unit);
        if (row.x != -1)
            image->attributes().attribute<float>(names.n_XResolution) = row.x;
        const BareJpeg read(saveBytes(*image, "a.jpg"));
        EXPECT_EQ(read.codec.density_unit, row.expectedUnit) << row.unit << ' ' << row.x;
        EXPECT_EQ(read.codec.X_density, row.expectedX) << row.unit << ' ' << row.x;
        EXPECT_EQ(read.codec.Y_density, 72);
    }
}

TEST(JpegSave, LongCommentsAreCut) {
    for (u32 length : {65532u, 65533u, 100000u}) {
        const ref<Image> image = makeCounting(8, 8, Image::kRGB);
        const string text(length, 'x');
        image->attributes().attribute<string>(names.n_Comment) = text;
        const BareJpeg read(saveBytes(*image, "a.jpg"));
        ASSERT_NE(read.codec.marker_list, nullptr);
        ASSERT_EQ(read.codec.marker_list->data_length, 65533u);
        EXPECT_EQ(
            text.compare(0, 65532, reinterpret_cast<const char*>(read.codec.marker_list->data)), 0);
    }
}

TEST(JpegSave, WhatCannotBeWritten) {
    Image empty;
    LogCapture log;
    EXPECT_TRUE(saveBytes(empty, "a.jpg").empty());
    EXPECT_EQ(linesOf(log), "2 jpeg save |a.jpg| attempt to save image with zero size!\n");
    log.take();

    const ref<Image> tooWide = makeCounting(65501, 1, Image::kLuminance);
    EXPECT_TRUE(saveBytes(*tooWide, "a.jpg").empty());
    ASSERT_EQ(log.entries().size(), 1u);
    EXPECT_EQ(log.entries()[0].text.find("jpeg save |a.jpg| "), 0u);

    expectFullDiskTold("full.jpg", "jpeg save |{}| the file could not be written whole");
}

} // namespace
} // namespace iio
