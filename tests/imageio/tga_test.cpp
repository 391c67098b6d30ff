#include "i_plugin.h"
#include "log_capture.h"

#include "stream/b_stream_workers.h"

#include <charconv>
#include <gtest/gtest.h>
#include <random>

namespace iio {
namespace {

using test_support::LogCapture;
using Bytes = vector<u8>;

/// Bytes from hexadecimal digits, of which blanks part groups.
Bytes hex(string_view text) {
    Bytes bytes;
    for (std::size_t at = 0; at + 1 < text.size(); at += text[at] == ' ' ? 1 : 2) {
        u8 byte = 0;
        if (std::from_chars(text.data() + at, text.data() + at + 2, byte, 16).ec == std::errc())
            bytes.push_back(byte);
    }
    return bytes;
}

struct Palette {
    u8 first = 0, count = 0, entryBits = 0;
    const char* entries = "";
};

/// A file of 2 x 2 pixels.
Bytes makeFile(u8 type, u8 depth, u8 descriptor, string_view pixels, const Palette& palette = {},
               const Bytes& id = {}) {
    Bytes file(18);
    file[0] = static_cast<u8>(id.size());
    file[1] = palette.entryBits != 0;
    file[2] = type;
    file[3] = palette.first;
    file[5] = palette.count;
    file[7] = palette.entryBits;
    file[12] = file[14] = 2;
    file[16] = depth;
    file[17] = descriptor;
    for (const Bytes& part : {id, hex(palette.entries), hex(pixels)})
        file.append(part.cbegin(), part.cend());
    return file;
}

ref<Image> loadBytes(const Bytes& bytes) {
    const Bytes exact(bytes.cbegin(), bytes.cend()); // so that reading beyond it shows
    base::Stream stream = base::memStreamView(exact.data(), exact.size(), "folder/x.tga");
    return loadImage(stream);
}

Bytes pixelsOf(const Image& image) {
    Bytes all;
    for (u64 y = 0; y < image.rowCount(); ++y)
        all.append(image.row(y), image.row(y) + image.width() * image.channelCount());
    return all;
}

const Palette colours = {3, 2, 24, "0A141E 28323C"}; // indices 3 and 4

struct Kind {
    const char* name;
    Bytes file;
    u8 format;
    const char* pixels; ///< expected, from the top left
};

vector<Kind> kinds() {
    const u8 grey = Image::kLuminance, greyAlpha = Image::kLuminanceAlpha;
    const u8 bgr = Image::kBGR, bgra = Image::kBGRA;
    const char* const four = "A1A2A3 B1B2B3 C1C2C3 D1D2D3"; // a, b over c, d
    const char* const words = "007C E003 1F80 630C";        // red, green, blue, 3/31 of each
    const char* const colourOfWords = "0000FF 00FF00 FF0000 191919";
    const char* const alphaOfWords = "0000FF00 00FF0000 FF0000FF 19191900";
    const char* const clear = "01020300 04050600 07080900 01010100";
    const char* const opaque = "010203FF 040506FF 070809FF 010101FF";
    const char* const mixed = "01020300 04050600 07080901 01010100";
    return {
        {"bottom left", makeFile(2, 24, 0x00, "C1C2C3 D1D2D3 A1A2A3 B1B2B3"), bgr, four},
        {"bottom right", makeFile(2, 24, 0x10, "D1D2D3 C1C2C3 B1B2B3 A1A2A3"), bgr, four},
        {"top left", makeFile(2, 24, 0x20, four), bgr, four},
        {"top right", makeFile(2, 24, 0x30, "B1B2B3 A1A2A3 D1D2D3 C1C2C3"), bgr, four},
        {"id, unused palette", makeFile(2, 24, 0x20, four, colours, {'i', 'd'}), bgr, four},
        {"15 bits", makeFile(2, 15, 0x20, words), bgr, colourOfWords},
        {"16 bits", makeFile(2, 16, 0x20, words), bgr, colourOfWords},
        {"16 bits with alpha", makeFile(2, 16, 0x21, words), bgra, alphaOfWords},
        {"32 bits", makeFile(2, 32, 0x28, clear), bgra, clear},
        {"32 bits, alpha not counted", makeFile(2, 32, 0x20, mixed), bgra, mixed},
        {"32 bits, padding", makeFile(2, 32, 0x20, clear), bgra, opaque},
        {"grey", makeFile(3, 8, 0x20, "01 02 03 04"), grey, "01 02 03 04"},
        {"grey, alpha", makeFile(3, 16, 0x28, "0109 0208 0307 0400"), greyAlpha,
         "0109 0208 0307 0400"},
        {"indexed", makeFile(1, 8, 0x20, "03 04 04 03", colours), bgr,
         "0A141E 28323C 28323C 0A141E"},
        {"indexed, 32 bits", makeFile(1, 8, 0x20, "01000000", {0, 2, 32, "01020304 05060708"}),
         bgra, "05060708 01020304 01020304 01020304"},
        {"indexed, padding", makeFile(1, 8, 0x20, "01000000", {0, 2, 32, "01020300 05060700"}),
         bgra, "050607FF 010203FF 010203FF 010203FF"},
        {"indexed, 16 bits", makeFile(1, 8, 0x21, "00010203", {0, 4, 16, words}), bgra,
         alphaOfWords},
        {"indexed, 15 bits", makeFile(1, 8, 0x20, "FEFFFFFF", {254, 4, 15, words}), bgr,
         "0000FF 00FF00 00FF00 00FF00"},
        {"packed, run over the rows", makeFile(10, 24, 0x20, "82 010203 00 040506"), bgr,
         "010203 010203 010203 040506"},
        {"packed, run beyond the end", makeFile(10, 24, 0x00, "FF 010203"), bgr,
         "010203 010203 010203 010203"},
        {"packed, unlike pixels over the rows",
         makeFile(10, 32, 0x08, "80 09090909 02 01020304 05060708 00000001"), bgra,
         "05060708 00000001 09090909 01020304"},
        {"packed 16 bits", makeFile(10, 16, 0x20, "01 007C E003 81 1F00"), bgr,
         "0000FF 00FF00 FF0000 FF0000"},
        {"packed indices", makeFile(9, 8, 0x20, "82 04 00 03", colours), bgr,
         "28323C 28323C 28323C 0A141E"},
        {"packed grey, alpha", makeFile(11, 16, 0x28, "03 0102 0304 0506 0708"), greyAlpha,
         "0102 0304 0506 0708"},
    };
}

TEST(Tga, ReadsEveryKind) {
    for (const Kind& kind : kinds()) {
        SCOPED_TRACE(kind.name);
        LogCapture log;
        const ref<Image> image = loadBytes(kind.file);
        ASSERT_TRUE(image) << linesOf(log);
        EXPECT_EQ(image->format(), kind.format);
        EXPECT_EQ(image->type(), Image::IT_UNSIGNED_BYTE);
        EXPECT_EQ(image->width(), 2U);
        EXPECT_EQ(image->height(), 2U);
        EXPECT_EQ(pixelsOf(*image), hex(kind.pixels));
        EXPECT_EQ(linesOf(log), "");

        ImageInfo info;
        base::Stream stream = base::memStreamView(kind.file.data(), kind.file.size(), "x.tga");
        EXPECT_TRUE(readImageInfo(stream, info));
        EXPECT_EQ(info.format, image->format());
        EXPECT_EQ(info.level0.width * 100 + info.level0.height * 10 + info.level0.depth, 221U);
    }
}

/// No picture, and every message names the file.
void expectRefused(const Bytes& file) {
    LogCapture log;
    EXPECT_FALSE(loadBytes(file));
    EXPECT_FALSE(log.entries().empty());
    for (const LogCapture::Entry& entry : log.entries()) {
        EXPECT_EQ(entry.level, base::logError);
        EXPECT_NE(entry.text.find("folder/x.tga"), string::npos) << entry.text;
    }
}

TEST(Tga, RefusesEveryShorterFile) {
    for (const Kind& kind : kinds()) {
        for (std::size_t length = 0; length < kind.file.size(); ++length) {
            SCOPED_TRACE(base::format("{}, {} bytes", kind.name, length));
            expectRefused(Bytes(kind.file.cbegin(), kind.file.cbegin() + length));
        }
    }
}

TEST(Tga, RefusesWhatDoesNotFit) {
    const Bytes colour = makeFile(2, 24, 0, "000000 000000 000000 000000");
    const Bytes packed = makeFile(11, 8, 0, "FF00 FF00 FF00 FF00");
    const Bytes indexed = makeFile(1, 8, 0, "03 04 04 03", colours);
    struct Row {
        const char* name;
        const Bytes& file;
        vector<std::pair<u32, u8>> changes; ///< offset and byte
    };
    const Row rows[] = {
        {"no picture", colour, {{2, 0}}},
        {"type 4", colour, {{2, 4}}},
        {"packed type with a further bit", colour, {{2, 0x82}}},
        {"palette type 2", colour, {{1, 2}}},
        {"indexed without palette", indexed, {{1, 0}}},
        {"palette without entries", indexed, {{5, 0}}},
        {"entries of 23 bits", indexed, {{7, 23}}},
        {"more entries than bytes", indexed, {{6, 255}}},
        {"indices of 16 bits", indexed, {{16, 16}}},
        {"index beyond the palette", indexed, {{18 + 6 + 2, 5}}},
        {"index before the palette", indexed, {{18 + 6 + 2, 2}}},
        {"palette beyond all indices", indexed, {{4, 1}}},
        {"depth 8", colour, {{16, 8}}},
        {"depth 25", colour, {{16, 25}}},
        {"grey of 24 bits", colour, {{2, 3}}},
        {"width 0", colour, {{12, 0}}},
        {"height 0", colour, {{14, 0}}},
        {"interleaved", colour, {{17, 0x40}}},
        {"nine bits of alpha", colour, {{17, 9}}},
        {"longer id", colour, {{0, 1}}},
        {"one row more", colour, {{14, 3}}},
        {"greatest size", colour, {{12, 255}, {13, 255}, {14, 255}, {15, 255}, {16, 32}}},
        // Four packets of at most 128 pixels.
        {"more pixels than packets", packed, {{12, 1}, {13, 2}, {14, 1}}},
        {"greatest packed size", packed, {{12, 255}, {13, 255}, {14, 255}, {15, 255}}},
    };
    for (const Row& row : rows) {
        SCOPED_TRACE(row.name);
        Bytes file(row.file.cbegin(), row.file.cend());
        for (const auto& [offset, byte] : row.changes)
            file[offset] = byte;
        expectRefused(file);
    }
}

/// Rows of runs and of noise, of all lengths around that of a packet.
void fillPixels(Image& image) {
    std::mt19937 random(7);
    const u32 channels = image.channelCount();
    for (u64 y = 0; y < image.rowCount(); ++y) {
        u8* row = image.row(y);
        for (u32 x = 0; x < image.width(); ++x) {
            const bool repeats = x > 0 && (y % 2 == 0 ? x % 129 != 0 : random() % 3 == 0);
            for (u32 c = 0; c < channels; ++c)
                row[x * channels + c] =
                    repeats ? row[(x - 1) * channels + c] : static_cast<u8>(random());
        }
    }
}

TEST(Tga, ReadsWhatItWrites) {
    struct Row {
        u8 format, target;
        u8 from[4]; ///< by component of the target, that of the source
    };
    const Row rows[] = {
        {Image::kLuminance, Image::kLuminance, {0}},
        {Image::kRed, Image::kLuminance, {0}},
        {Image::kAlpha, Image::kLuminance, {0}},
        {Image::kLuminanceAlpha, Image::kBGRA, {0, 0, 0, 1}},
        {Image::kBGR, Image::kBGR, {0, 1, 2}},
        {Image::kRGB, Image::kBGR, {2, 1, 0}},
        {Image::kBGRA, Image::kBGRA, {0, 1, 2, 3}},
        {Image::kRGBA, Image::kBGRA, {2, 1, 0, 3}},
    };
    for (const Row& row : rows) {
        for (const char* packing : {"none", "rle"}) {
            for (u32 width : {1u, 2u, 128u, 700u}) {
                SCOPED_TRACE(base::format("{} {} {}", formatInfo(row.format).name, packing, width));
                Image image(width, 5, 1, 4, row.format, Image::IT_UNSIGNED_BYTE);
                fillPixels(image);
                base::AttribMap settings;
                settings.attribute<string>(imageAttributes().n_Compression) = packing;
                Bytes file;
                base::Stream stream = base::vectorStream(file, "x.tga");
                ASSERT_TRUE(saveImage(image, stream, settings));
                // A packet of noise is one byte longer than its pixels.
                const u32 pixelBytes = 5 * width * formatInfo(row.target).channelCount;
                EXPECT_LE(file.size(), 18 + 26 + pixelBytes + 5 * ((width + 127) / 128));

                const ref<Image> read = loadBytes(file);
                ASSERT_TRUE(read);
                ASSERT_EQ(read->format(), row.target);
                EXPECT_EQ(file[17], row.target == Image::kBGRA ? 8 : 0); // bits of alpha
                const u32 channels = read->channelCount(), from = image.channelCount();
                for (u32 y = 0; y < 5; ++y)
                    for (u32 i = 0; i < width * channels; ++i)
                        ASSERT_EQ(read->row(y)[i],
                                  image.row(y)[i / channels * from + row.from[i % channels]])
                            << i << " of row " << y;
            }
        }
    }
}

TEST(Tga, WritesBytesOfTheFormat) {
    Image image(9, 2, 1, 1, Image::kLuminance, Image::IT_UNSIGNED_BYTE);
    const Bytes pixels = hex("050505010202090909 010203040506070809");
    std::copy(pixels.cbegin(), pixels.cend(), image.data());
    const Bytes footer = hex("00000000 00000000 54525545564953494F4E2D5846494C452E 00");
    Bytes plain = hex("00 00 03 0000000000 00000000 0900 0200 08 00 010203040506070809 "
                      "050505010202090909");
    plain.append(footer.cbegin(), footer.cend());
    Bytes packed = hex("00 00 0B 0000000000 00000000 0900 0200 08 00 08010203040506070809 "
                       "8205 02010202 8209");
    packed.append(footer.cbegin(), footer.cend());
    Bytes file;
    base::Stream stream = base::vectorStream(file, "x.tga");
    ASSERT_TRUE(saveImage(image, stream));
    EXPECT_EQ(file, plain);
    file.clear();
    base::Stream second = base::vectorStream(file, "x.tga");
    image.attributes().attribute<string>(imageAttributes().n_Compression) = "rle";
    ASSERT_TRUE(saveImage(image, second));
    EXPECT_EQ(file, packed);
    // The picture that comes back asks for the same packing.
    EXPECT_EQ(*loadBytes(file)->attributes().findAttribute<string>(imageAttributes().n_Compression),
              "rle");
}

TEST(Tga, ConvertsAndRefusesPictures) {
    Image floats(1, 1, 1, 1, Image::kRG, Image::kFloat);
    const float values[] = {0.5f, 2.0f};
    floats.setRow(values, 0, 0);
    Bytes file;
    base::Stream stream = base::vectorStream(file, "x.tga");
    ASSERT_TRUE(saveImage(floats, stream));
    // The sRGB curve takes 0.5 to 0.735.
    EXPECT_EQ(pixelsOf(*loadBytes(file)), (Bytes{0, 255, 187}));

    Image cube;
    cube.createCube(1, 1, 1, Image::kRGB, Image::IT_UNSIGNED_BYTE);
    Image empty;
    Image small(4, 4, 1, 1, Image::kRGB, Image::IT_UNSIGNED_BYTE);
    Image volume(2, 2, 2, 1, Image::kRGB, Image::IT_UNSIGNED_BYTE);
    Image wide(65536, 1, 1, 1, Image::kLuminance, Image::IT_UNSIGNED_BYTE);
    for (Image* image : {&cube, &empty, &small, &volume, &wide}) {
        LogCapture log;
        u8 room[70]; // enough for the cube and the volume
        base::MemBlock block = {room, sizeof room, nullptr};
        base::Stream full = base::memBlockStream(&block, "folder/x.tga");
        EXPECT_FALSE(saveImage(*image, full)) << image->description();
        ASSERT_EQ(log.entries().size(), 1U) << linesOf(log);
        EXPECT_EQ(log.entries()[0].text.find("tga save |folder/x.tga| "), 0U) << linesOf(log);
    }
}

} // namespace
} // namespace iio
