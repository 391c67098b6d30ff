#include "codec_support.h"

#include <charconv>
#include <cstring>
#include <random>

namespace iio {
namespace {

using test_support::linesOf;
using test_support::LogCapture;

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

const Palette colours = {3, 2, 24, "0A141E 28323C"}; // indices 3 and 4

TEST(Tga, ReadsEveryKind) {
    struct Kind {
        const char* name;
        Bytes file;
        u8 format;
        const char* pixels; ///< expected, from the top left
    };
    const u8 grey = Image::kLuminance, greyAlpha = Image::kLuminanceAlpha;
    const u8 bgr = Image::kBGR, bgra = Image::kBGRA;
    const char* const four = "A1A2A3 B1B2B3 C1C2C3 D1D2D3"; // a, b over c, d
    const char* const words = "007C E003 1F80 630C";        // red, green, blue, 3/31 of each
    const char* const colourOfWords = "0000FF 00FF00 FF0000 191919";
    const char* const alphaOfWords = "0000FF00 00FF0000 FF0000FF 19191900";
    const char* const clear = "01020300 04050600 07080900 01010100";
    const char* const opaque = "010203FF 040506FF 070809FF 010101FF";
    const char* const mixed = "01020300 04050600 07080901 01010100";
    const Kind kinds[] = {
        {"bottom right", makeFile(2, 24, 0x10, "D1D2D3 C1C2C3 B1B2B3 A1A2A3"), bgr, four},
        {"top right", makeFile(2, 24, 0x30, "B1B2B3 A1A2A3 D1D2D3 C1C2C3"), bgr, four},
        {"id, unused palette", makeFile(2, 24, 0x20, four, colours, {'i', 'd'}), bgr, four},
        {"16 bits", makeFile(2, 16, 0x20, words), bgr, colourOfWords},
        {"16 bits with alpha", makeFile(2, 16, 0x21, words), bgra, alphaOfWords},
        {"32 bits", makeFile(2, 32, 0x28, clear), bgra, clear},
        {"32 bits, alpha not counted", makeFile(2, 32, 0x20, mixed), bgra, mixed},
        {"32 bits, padding", makeFile(2, 32, 0x20, clear), bgra, opaque},
        {"grey", makeFile(3, 8, 0x20, "01 02 03 04"), grey, "01 02 03 04"},
        {"indexed", makeFile(1, 8, 0x20, "03 04 04 03", colours), bgr,
         "0A141E 28323C 28323C 0A141E"},
        {"indexed, 32 bits", makeFile(1, 8, 0x20, "01000000", {0, 2, 32, "01020304 05060708"}),
         bgra, "05060708 01020304 01020304 01020304"},
        {"indexed, padding", makeFile(1, 8, 0x20, "01000000", {0, 2, 32, "01020300 05060700"}),
         bgra, "050607FF 010203FF 010203FF 010203FF"},
        {"indexed, 15 bits", makeFile(1, 8, 0x20, "FEFFFFFF", {254, 4, 15, words}), bgr,
         "0000FF 00FF00 00FF00 00FF00"},
        {"packed, run over the rows", makeFile(10, 24, 0x20, "82 010203 00 040506"), bgr,
         "010203 010203 010203 040506"},
        {"packed, run beyond the end", makeFile(10, 24, 0x00, "FF 010203"), bgr,
         "010203 010203 010203 010203"},
        {"packed, unlike pixels over the rows",
         makeFile(10, 32, 0x08, "80 09090909 02 01020304 05060708 00000001"), bgra,
         "05060708 00000001 09090909 01020304"},
        {"packed grey, alpha", makeFile(11, 16, 0x28, "03 0102 0304 0506 0708"), greyAlpha,
         "0102 0304 0506 0708"},
    };
    for (const Kind& kind : kinds) {
        SCOPED_TRACE(kind.name);
        LogCapture log;
        const ref<Image> image = loadBytes(kind.file, "x.tga");
        ASSERT_TRUE(image) << linesOf(log);
        EXPECT_EQ(image->format(), kind.format);
        EXPECT_EQ(image->type(), Image::IT_UNSIGNED_BYTE);
        EXPECT_EQ(image->width(), 2U);
        EXPECT_EQ(image->height(), 2U);
        EXPECT_EQ(bytesOf(*image), hex(kind.pixels));
        EXPECT_EQ(linesOf(log), "");
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
        {"depth 25", colour, {{16, 25}}},
        {"grey of 24 bits", colour, {{2, 3}}},
        {"interleaved", colour, {{17, 0x40}}},
        {"nine bits of alpha", colour, {{17, 9}}},
        // Four packets of at most 128 pixels.
        {"more pixels than packets", packed, {{12, 1}, {13, 2}, {14, 1}}},
    };
    for (const Row& row : rows) {
        SCOPED_TRACE(row.name);
        Bytes file(row.file.cbegin(), row.file.cend());
        for (const auto& [offset, byte] : row.changes)
            file[offset] = byte;
        LogCapture log;
        EXPECT_FALSE(loadBytes(file, "x.tga"));
        EXPECT_TRUE(log.has(base::logError, "Unable to load x.tga"));
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
    };
    for (const Row& row : {Row{Image::kRed, Image::kLuminance},
                           {Image::kRGB, Image::kBGR},
                           {Image::kLuminanceAlpha, Image::kBGRA},
                           {Image::kBGRA, Image::kBGRA}}) {
        for (const char* packing : {"none", "rle"}) {
            for (u32 width : {1u, 2u, 128u, 700u}) {
                SCOPED_TRACE(base::format("{} {} {}", formatInfo(row.format).name, packing, width));
                const ref<Image> image = makeImage(width, 5, row.format, 1, 4);
                fillPixels(*image);
                base::AttribMap settings;
                settings.attribute<string>(imageAttributes().n_Compression) = packing;
                const Bytes file = saveBytes(*image, "x.tga", settings);
                // A packet of noise is one byte longer than its pixels.
                const u32 pixelBytes = 5 * width * formatInfo(row.target).channelCount;
                EXPECT_LE(file.size(), 18 + 26 + pixelBytes + 5 * ((width + 127) / 128));
                EXPECT_EQ(file[17], row.target == Image::kBGRA ? 8 : 0); // bits of alpha

                const ref<Image> read = loadBytes(file, "x.tga");
                ASSERT_TRUE(read);
                ASSERT_EQ(read->format(), row.target);
                const ref<Image> expected = image->convertFormat(row.target);
                for (u32 y = 0; y < 5; ++y)
                    ASSERT_EQ(std::memcmp(read->row(y), expected->row(y), pixelBytes / 5), 0) << y;
            }
        }
    }
}

TEST(Tga, WritesBytesOfTheFormat) {
    const auto image =
        imageOf(9, 2, Image::kLuminance, 1, {5, 5, 5, 1, 2, 2, 9, 9, 9, 1, 2, 3, 4, 5, 6, 7, 8, 9});
    const char footer[] = "00000000 00000000 54525545564953494F4E2D5846494C452E 00";
    const string plain = "00 00 03 0000000000 00000000 0900 0200 08 00 010203040506070809 "
                         "050505010202090909 ";
    const string packed = "00 00 0B 0000000000 00000000 0900 0200 08 00 08010203040506070809 "
                          "8205 02010202 8209 ";
    EXPECT_EQ(saveBytes(*image, "x.tga"), hex(plain + footer));
    image->attributes().attribute<string>(imageAttributes().n_Compression) = "rle";
    const Bytes file = saveBytes(*image, "x.tga");
    EXPECT_EQ(file, hex(packed + footer));
    // The picture that comes back asks for the same packing.
    EXPECT_EQ(
        valueOf<string>(loadBytes(file, "x.tga")->attributes(), imageAttributes().n_Compression),
        "rle");
}

TEST(Tga, RefusesPictures) {
    Image cube;
    cube.createCube(1, 1, 1, Image::kRGB, Image::IT_UNSIGNED_BYTE);
    Image small(4, 4, 1, 1, Image::kRGB, Image::IT_UNSIGNED_BYTE);
    Image volume(2, 2, 2, 1, Image::kRGB, Image::IT_UNSIGNED_BYTE);
    Image wide(65536, 1, 1, 1, Image::kLuminance, Image::IT_UNSIGNED_BYTE);
    for (Image* image : {&cube, &small, &volume, &wide}) {
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
