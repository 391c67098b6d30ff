#include "codec_support.h"

#include <cstdio>
#include <cstdlib>

#include <jpeglib.h>

namespace iio {
namespace {

using test_support::linesOf;
using test_support::LogCapture;

const ImageAttributes& names = imageAttributes();

constexpr u32 width = 35, height = 21;

/// A second writer: a file by libjpeg alone; `configure` changes the defaults.
template <class Configure>
Bytes makeJpeg(const Bytes& samples, int components, J_COLOR_SPACE space,
               const Configure& configure, u32 w = width, u32 h = height) {
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

/// Where the JFIF segment, the first one, ends.
constexpr u32 headEnd = 20;

/// A grey file with such a density and further segments of that marker behind it.
Bytes makeWith(std::initializer_list<u8> density, u8 marker, const vector<Bytes>& segments) {
    Bytes file = saveBytes(*makeCounting(8, 8, Image::kLuminance), "a.jpg");
    std::copy(density.begin(), density.end(), file.data() + 13);
    Bytes whole(file.data(), file.data() + headEnd);
    for (const Bytes& segment : segments) {
        const auto length = static_cast<u8>(segment.size() + 2);
        for (const u8 byte : {u8(0xFF), marker, u8(0), length})
            whole.push_back(byte);
        whole.append(segment.cbegin(), segment.cend());
    }
    whole.append(file.cbegin() + headEnd, file.cend());
    return whole;
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
        {"Adobe", withAdobeMark, {200, 100, 50, 128}, {100, 50, 25}},
        {"Adobe YCCK", asYcck, {200, 100, 50, 128}, {100, 50, 25}},
        // 255 is full ink.
        {"plain", withoutMark, {55, 155, 205, 127}, {100, 50, 25}},
    };
    for (const Row& row : rows) {
        Bytes samples;
        for (u32 i = 0; i < width * height; ++i)
            samples.append(row.inks.cbegin(), row.inks.cend());
        const ref<Image> image = loadBytes(makeJpeg(samples, 4, JCS_CMYK, row.configure), "a.jpg");
        ASSERT_TRUE(image) << row.name;
        ASSERT_EQ(image->format(), Image::kRGB);
        for (u64 i = 0; i < image->memorySize(); ++i) // 3: what packing at quality 95 changes
            ASSERT_NEAR(image->data()[i], row.expected[i % 3], 3) << row.name << ' ' << i;
    }
}

TEST(JpegLoad, MarkersBecomeAttributes) {
    struct Row {
        std::initializer_list<u8> density; ///< unit, x, y
        u16 unit;                          ///< 0 for no attribute
        float x, y;
    };
    const Row rows[] = {{{1, 1, 44, 0, 72}, 2, 300, 72},
                        {{2, 0, 118, 0, 28}, 3, 118, 28},
                        {{0, 0, 72, 0, 72}, 0, 0, 0},
                        {{2, 0, 0, 0, 72}, 0, 0, 0},
                        {{9, 0, 72, 0, 72}, 0, 0, 0}};
    for (const Row& row : rows) {
        const vector<Bytes> comments = {
            {0}, {'f', 'i', 'r', 's', 't', 0xFF, 0, 'r'}, {'r', 'e', 's', 't'}};
        const ref<Image> image = loadBytes(makeWith(row.density, JPEG_COM, comments), "a.jpg");
        ASSERT_TRUE(image);
        const base::AttribMap& found = image->attributes();
        EXPECT_EQ(valueOf<u16>(found, names.n_ResolutionUnit), row.unit);
        EXPECT_EQ(valueOf<float>(found, names.n_XResolution), row.x);
        EXPECT_EQ(valueOf<float>(found, names.n_YResolution), row.y);
        EXPECT_EQ(valueOf<string>(found, names.n_Comment), "first\xEF\xBF\xBD");
        EXPECT_EQ(found.size(), row.unit ? 4u : 1u);
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
        vector<Bytes> segments;
        for (const Bytes& part : row.parts) {
            segments.push_back({'I', 'C', 'C', '_', 'P', 'R', 'O', 'F', 'I', 'L', 'E', 0});
            segments.back().append(part.cbegin(), part.cend());
        }
        LogCapture log;
        const ref<Image> image =
            loadBytes(makeWith({0, 0, 1, 0, 1}, JPEG_APP0 + 2, segments), "a.jpg");
        ASSERT_TRUE(image) << row.name;
        const Bytes* found = image->attributes().findVecAttribute<u8>(names.n_ICCProfile);
        EXPECT_EQ(found ? *found : Bytes(), row.expected) << row.name;
        string expected;
        for (const char* complaint : row.complaints)
            expected += base::format("2 jpeg load |a.jpg| {}, ignoring...\n", complaint);
        EXPECT_EQ(linesOf(log), expected) << row.name;
    }
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
        8, 8);
}

TEST(JpegLoad, WhatIsRefused) {
    EXPECT_TRUE(loadBytes(makeScans(500), "a.jpg"));
    const std::pair<Bytes, const char*> rows[] = {
        {makeScans(501), "too many scans"},
        {makeJpeg(Bytes(width * height * 2, 9), 2, JCS_UNKNOWN, [](auto&) {}),
         "pictures of 2 components are not supported"},
    };
    for (const auto& [file, message] : rows) {
        LogCapture log;
        EXPECT_FALSE(loadBytes(file, "a.jpg"));
        EXPECT_EQ(linesOf(log),
                  base::format("2 jpeg load |a.jpg| {}\n2 Unable to load a.jpg\n", message));
    }
}

TEST(JpegSave, LayoutAndSettings) {
    const ref<Image> image = noiseImage(width, height, Image::kRGB, 1);
    const auto save = [&](u8 format, int quality, int ownQuality, const char* subsampling) {
        const ref<Image> laidOut = base::makeRef<Image>(*image->convertFormat(format));
        base::AttribMap attributes;
        attributes.attribute<string>(names.n_jpegSubsampling) = subsampling;
        attributes.attribute<i32>(names.n_CompressionLevel) = quality; // comes first
        laidOut->attributes().attribute<i32>(names.n_CompressionLevel) = ownQuality;
        return saveBytes(*laidOut, "a.jpg", attributes);
    };
    const Bytes file = save(Image::kRGB, 100, 100, "4:2:0");
    for (const u8 format : {Image::kBGR, Image::kRGBA, Image::kBGRA})
        EXPECT_EQ(save(format, 100, 100, "4:2:0"), file) << formatInfo(format).name;
    EXPECT_EQ(save(Image::kRGB, 1000, 100, "4:2:0"), file) << "quality beyond the range";
    EXPECT_EQ(save(Image::kRGB, 100, 20, "4:2:0"), file) << "order of the settings";
    EXPECT_EQ(save(Image::kRGB, 100, 100, "4:2:1"), file) << "unknown subsampling";
    EXPECT_NE(save(Image::kRGB, 20, 100, "4:2:0"), file);
    EXPECT_NE(save(Image::kRGB, 100, 100, "4:4:4"), file);
    // What is converted: grey is kept, and numbers go to bytes.
    const ref<Image> greyAlpha = noiseImage(width, height, Image::kLuminanceAlpha, 1);
    EXPECT_EQ(saveBytes(*greyAlpha, "a.jpg"),
              saveBytes(*greyAlpha->convertFormat(Image::kLuminance), "a.jpg"));
    const ref<Image> shorts = noiseImage(width, height, Image::kRG, Image::IT_UNSIGNED_SHORT);
    EXPECT_EQ(saveBytes(*shorts, "a.jpg"),
              saveBytes(*shorts->convertType(1)->convertFormat(Image::kRGB), "a.jpg"));
    // Single components count as grey.
    const ref<Image> green = noiseImage(width, height, Image::kGreen, 1);
    const ref<Image> grey = noiseImage(width, height, Image::kLuminance, 1);
    EXPECT_EQ(saveBytes(*green, "a.jpg"), saveBytes(*grey, "a.jpg"));
}

TEST(JpegSave, Density) {
    struct Row {
        int unit;       ///< -1 for none
        float x;        ///< -1 for none
        Bytes expected; ///< unit, x, y
    };
    const Row rows[] = {{-1, -1, {0, 0, 72, 0, 72}}, {-1, 300, {0, 0, 0, 0, 72}},
                        {2, 300, {2, 0, 0, 0, 72}},  {3, 300, {2, 0, 0, 0, 72}},
                        {4, -1, {2, 0, 72, 0, 72}},  {4, 1.239f, {2, 0, 123, 0, 72}},
                        {4, 3, {2, 0, 255, 0, 72}},  {4, 1e30f, {2, 0, 255, 0, 72}},
                        {4, -2, {2, 0, 0, 0, 72}},   {1, 300, {1, 0, 0, 0, 72}}};
    for (const Row& row : rows) {
        const ref<Image> image = makeCounting(8, 8, Image::kRGB);
        if (row.unit >= 0)
            image->attributes().attribute<u16>(names.n_ResolutionUnit) = static_cast<u16>(row.unit);
        if (row.x != -1)
            image->attributes().attribute<float>(names.n_XResolution) = row.x;
        const Bytes file = saveBytes(*image, "a.jpg");
        EXPECT_EQ(Bytes(file.data() + 13, file.data() + 18), row.expected) << row.unit << row.x;
    }
}

TEST(JpegSave, LongCommentsAreCut) {
    for (u32 length : {65532u, 65533u, 100000u}) {
        const ref<Image> image = makeCounting(8, 8, Image::kRGB);
        image->attributes().attribute<string>(names.n_Comment) = string(length, 'x');
        const Bytes file = saveBytes(*image, "a.jpg");
        Bytes expected = {0xFF, JPEG_COM, 0xFF, 0xFF}; // with the length and the end of the text
        expected.resize(4 + 65532, 'x');
        expected.push_back(0);
        ASSERT_GT(file.size(), expected.size());
        EXPECT_EQ(Bytes(file.data() + headEnd, file.data() + headEnd + expected.size()), expected);
    }
    LogCapture log;
    EXPECT_TRUE(saveBytes(*makeCounting(65501, 1, Image::kLuminance), "a.jpg").empty());
    ASSERT_EQ(log.entries().size(), 1u);
    EXPECT_EQ(log.entries()[0].text.find("jpeg save |a.jpg| "), 0u);
}

} // namespace
} // namespace iio
