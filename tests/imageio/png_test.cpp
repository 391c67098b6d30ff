#include "codec_support.h"

#include <cmath>
#include <zlib.h>

namespace iio {
namespace {

using namespace std::string_view_literals;
using test_support::LogCapture;
using test_support::problems;

const ImageAttributes& names = imageAttributes();

TEST(PngLoad, PixelsAreThoseOfOtherReaders) {
    struct Row {
        const char* file;
        u8 format, type;
        u32 at;                    ///< of the components
        vector<double> components; ///< as another program shows them
    };
    const u8 byte = Image::IT_UNSIGNED_BYTE, twoBytes = Image::IT_UNSIGNED_SHORT;
    const Row rows[] = {
        {"png/colour-0-8-adam7.png",
         Image::kLuminance,
         byte,
         5,
         {0, 29, 58, 87, 116, 0, 17, 29, 63, 58, 17, 63, 138, 242, 119}},
        {"png/colour-0-16-adam7.png",
         Image::kLuminance,
         twoBytes,
         3,
         {14935, 29, 29, 14935, 29841, 44747}},
        {"png/transparent-0.png",
         Image::kLuminanceAlpha,
         byte,
         0,
         {0, 255, 29, 0, 58, 255, 87, 255}},
        {"png/transparent-2.png",
         Image::kRGBA,
         twoBytes,
         0,
         {29, 14935, 29841, 65535, 44747, 59397, 8767, 65535}},
        {"png/transparent-3.png",
         Image::kRGBA,
         byte,
         28,
         {0, 1, 2, 128, 3, 4, 5, 255, 0, 1, 2, 128}},
    };
    for (const Row& row : rows) {
        SCOPED_TRACE(row.file);
        const Bytes file = readSeed(row.file);
        LogCapture log;
        ImageInfo info;
        ASSERT_TRUE(readInfoOf(file, "a.png", info));
        EXPECT_EQ(info.format, row.format);
        EXPECT_EQ(info.type, row.type);
        EXPECT_EQ(info.level0.width * info.level0.height, 25u);
        const ref<Image> image = loadBytes(file, "a.png");
        ASSERT_TRUE(image) << problems(log);
        EXPECT_EQ(problems(log), "");
        ASSERT_EQ(image->format(), row.format);
        ASSERT_EQ(image->type(), row.type);
        for (u32 i = 0; i < row.components.size(); ++i)
            EXPECT_EQ(componentAt(*image, row.at + i), row.components[i]) << row.at + i;
    }
}

/// Adds a chunk in front of what stands at `at`.
void insertChunk(Bytes& file, u64 at, string_view type, string_view content) {
    Bytes chunk = {0, 0, 0, static_cast<u8>(content.size())};
    chunk.append(type.begin(), type.end());
    chunk.append(content.begin(), content.end());
    const auto sum =
        static_cast<u32>(crc32(0, chunk.data() + 4, static_cast<u32>(chunk.size() - 4)));
    for (const u32 shift : {24, 16, 8, 0})
        chunk.push_back(static_cast<u8>(sum >> shift));
    chunk.append(file.cbegin() + at, file.cend());
    file.resize(at);
    file.append(chunk.cbegin(), chunk.cend());
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

/// All that the chunks of `makeWithChunks` say.
constexpr char chunkTexts[] = "4 3000 2000|2021-12-31 23:59:60|gamma 2|J\xC3\xBCrg|of words|"
                              "\xE2\x82\xAC|of us|none|first|late|-5 6 -1 10|";

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

constexpr u64 headerEnd = 33;

/// A file of 5 x 5 pixels with chunks in front of them and one behind.
Bytes makeWithChunks() {
    Bytes file = saveBytes(*makeCounting(5, 5, Image::kRGB), "a.png");
    insertChunk(file, file.size() - 12, "tEXt", "Source\0late"sv);
    // The last comes first.
    for (const auto& [type, content] : std::initializer_list<std::pair<string_view, string_view>>{
             {"tEXt", "Unheard\0of"sv},
             {"tEXt", "Comment\0second"sv},
             {"tEXt", "Comment\0first"sv},
             {"tEXt", "Comment\0"sv},
             {"tEXt", "Copyright\0none"sv},
             {"tEXt", "Software\0of us"sv},
             {"iTXt", "Description\0\0\0\0\0\xE2\x82\xAC"sv},
             {"tEXt", "Title\0of words"sv},
             {"tEXt", "Author\0J\xFCrg"sv},
             {"tIME", "\x07\xE5\x0C\x1F\x17\x3B\x3C"sv},
             {"pHYs", "\0\0\x0B\xB8\0\0\x07\xD0\1"sv}, // 3000, 2000
             {"oFFs", "\xFF\xFF\xFF\xFB\0\0\0\6\0"sv},
             {"gAMA", "\0\0\xC3\x50"sv}}) // 50000
        insertChunk(file, headerEnd, type, content);
    return file;
}

/// The chunks of a file but its pixels: "type content " each, of those that can be read as such.
string chunksOf(const Bytes& file) {
    string text;
    for (u64 at = 8, length = 0; at < file.size(); at += 12 + length) {
        const auto* chunk = reinterpret_cast<const char*>(file.data() + at);
        length = file[at + 1] << 16 | file[at + 2] << 8 | file[at + 3];
        text.append(chunk + 4, 4).append(" ");
        if (string_view(chunk + 4, 4) == "tEXt" || string_view(chunk + 4, 4) == "iTXt")
            text.append(chunk + 8).append(" ");
    }
    return text;
}

/// The content of the first chunk of that type, as numbers of four bytes each and single ones
/// behind them; empty if there is none.
string numbersOf(const Bytes& file, string_view type) {
    const u64 found =
        string_view(reinterpret_cast<const char*>(file.data()), file.size()).find(type);
    string text;
    if (found == string_view::npos)
        return text;
    const u8* at = file.data() + found + 4;
    for (const u8* end = at + at[-5]; at < end;) {
        const u32 count = end - at >= 4 ? 4 : 1;
        u32 value = 0;
        for (u32 i = 0; i < count; ++i)
            value = value << 8 | *at++;
        text += base::format("{} ", value);
    }
    return text;
}

TEST(PngLoad, ChunksBecomeAttributesAndChunksAgain) {
    LogCapture log;
    const ref<Image> image = loadBytes(makeWithChunks(), "a.png");
    ASSERT_TRUE(image);
    EXPECT_EQ(textsOf(*image), chunkTexts);
    image->attributes().vecAttribute<u8>(names.n_ICCProfile) = makeProfile();
    const Bytes saved = saveBytes(*image, "a.png");
    const ref<Image> again = loadBytes(saved, "a.png");
    ASSERT_TRUE(again);
    EXPECT_EQ(problems(log), "");
    EXPECT_EQ(textsOf(*again), chunkTexts);
    const Bytes* profile = again->attributes().findVecAttribute<u8>(names.n_ICCProfile);
    ASSERT_NE(profile, nullptr);
    EXPECT_EQ(*profile, makeProfile());
    EXPECT_NE(chunksOf(saved).find("iTXt Author tEXt Title iTXt Description tEXt Software "
                                   "tEXt Copyright tEXt Comment tEXt Source IDAT"),
              string::npos)
        << chunksOf(saved);

    EXPECT_EQ(valueOf<string>(loadBytes(readSeed("png/chunks.png"), "a.png")->attributes(),
                              names.n_Comment),
              "a comment"); // which is packed

    Bytes unclear = saveBytes(*makeCounting(5, 5, Image::kRGB), "a.png");
    insertChunk(unclear, headerEnd, "pHYs", "\0\0\0\3\0\0\0\2\0"sv);
    insertChunk(unclear, headerEnd, "gAMA", "\0\0\xB1\x8F"sv);
    insertChunk(unclear, headerEnd, "sRGB", "\0"sv);
    const ref<Image> loaded = loadBytes(unclear, "a.png");
    EXPECT_EQ(valueOf<string>(loaded->attributes(), names.n_ColorSpace), "srgb");
    EXPECT_EQ(loaded->attributes().size(), 1u);
}

TEST(PngSave, FormatsAndTypes) {
    struct Row {
        const char* name;
        u8 format, type;
        Bytes source;
        int colourType, bitDepth;
        vector<double> expected; ///< a pixel in the file
    };
    const u8 byte = Image::IT_UNSIGNED_BYTE, twoBytes = Image::IT_UNSIGNED_SHORT;
    const int grey = 0, rgb = 2, greyAlpha = 4, rgba = 6;
    const Row rows[] = {
        {"rgb", Image::kRGB, byte, {1, 2, 3}, rgb, 8, {1, 2, 3}},
        {"bgr", Image::kBGR, byte, {1, 2, 3}, rgb, 8, {3, 2, 1}},
        {"bgra", Image::kBGRA, byte, {1, 2, 3, 4}, rgba, 8, {3, 2, 1, 4}},
        {"rg", Image::kRG, byte, {1, 2}, rgb, 8, {1, 2, 0}},
        {"alpha", Image::kAlpha, byte, {7}, grey, 8, {7}},
        {"luminance alpha", Image::kLuminanceAlpha, byte, {7, 8}, greyAlpha, 8, {7, 8}},
        {"short bgr", Image::kBGR, twoBytes, {1, 0, 2, 1, 3, 0}, rgb, 16, {3, 258, 1}},
        {"signed byte", Image::kRed, Image::IT_BYTE, {127}, grey, 8, {255}},
        // sRGB of one half is 0.73536: 48191.8 of 65535.
        {"float", Image::kRed, Image::kFloat, {0, 0, 0, 0x3F}, grey, 16, {48191}},
        {"float in bytes", Image::kRed, Image::kFloat, {0, 0, 0, 0x3F}, grey, 8, {187}},
        // A block whose two colours are white, all indices 0.
        {"dxt1", Image::kDXT1, 0, {255, 255, 255, 255, 0, 0, 0, 0}, rgb, 8, {255, 255, 255}},
    };
    for (const Row& row : rows) {
        for (bool isInterlaced : {false, true}) {
            SCOPED_TRACE(testing::Message() << row.name << ' ' << isInterlaced);
            const ref<Image> image = makeImage(4, 4, row.format, row.type);
            image->attributes().attribute<bool>(names.n_interlace) = isInterlaced;
            if (row.bitDepth == 8)
                image->attributes().attribute<u16>(names.n_requestBits) = 15;
            for (u64 i = 0; i < image->memorySize(); ++i)
                image->data()[i] = row.source[i % row.source.size()];
            LogCapture log;
            const Bytes file = saveBytes(*image, "a.png");
            EXPECT_EQ(problems(log), "");
            // Width, height, depth and colour type, packing, filter, interlacing
            EXPECT_EQ(numbersOf(file, "IHDR"),
                      base::format("4 4 {} {} ", (row.bitDepth << 24) + (row.colourType << 16),
                                   isInterlaced ? 1 : 0));
            const vector<double> read = componentsOf(*loadBytes(file, "a.png"));
            ASSERT_EQ(read.size(), 16 * row.expected.size());
            for (u64 i = 0; i < read.size(); ++i)
                ASSERT_EQ(read[i], row.expected[i % row.expected.size()]) << i;
        }
    }
}

TEST(PngSave, DensityIsPerMetre) {
    struct Row {
        u16 unit;
        float x, y;
        const char* expected;
    };
    for (const Row& row : {Row{2, 300, 72, "11811 2835 1 "}, Row{3, 100, 50, "10000 5000 1 "},
                           Row{4, 1e20f, 1, "2147483647 1 1 "}, Row{9, 4, 3, "4 3 0 "},
                           Row{4, NAN, 1, ""}, Row{4, -1, 1, ""}}) {
        const ref<Image> image = makeCounting(2, 2, Image::kRGB);
        image->attributes().attribute<u16>(names.n_ResolutionUnit) = row.unit;
        image->attributes().attribute<float>(names.n_XResolution) = row.x;
        image->attributes().attribute<float>(names.n_YResolution) = row.y;
        EXPECT_EQ(numbersOf(saveBytes(*image, "a.png"), "pHYs"), row.expected)
            << row.unit << ' ' << row.x;
    }
}

TEST(PngSave, ColourSpaceAndWhatCannotBeWritten) {
    struct Row {
        u8 type;
        const char* space;
        float gamma;
        const char* expectedGamma;
        bool isSrgb;
        u32 warningCount;
    };
    const u8 byte = Image::IT_UNSIGNED_BYTE;
    const Row rows[] = {
        {byte, "", 0.0f, "", false, 0},
        {byte, "linear", 2.0f, "100000 ", false, 0},
        {byte, "gamma", 2.0f, "50000 ", false, 0},
        {byte, "gamma", -1.0f, "45455 ", false, 0}, // 2.2 where none is said
        {byte, "gamma", 0.0f, "", false, 1},        // outside the range of the chunk
        {byte, "gamma", NAN, "", false, 1},
        {byte, "srgb", 0.0f, "45455 ", true, 0},
        {Image::kFloat, "linear", 0.0f, "45455 ", true, 0}, // went through the curve
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
        EXPECT_EQ(numbersOf(file, "gAMA"), row.expectedGamma);
        EXPECT_EQ(numbersOf(file, "sRGB"), row.isSrgb ? "3 " : "");
    }

    const ref<Image> image = makeCounting(2, 2, Image::kRGB);
    image->attributes().vecAttribute<u8>(names.n_ICCProfile) = {1, 2, 3};
    image->attributes().attribute<base::DateTime>(names.n_DateCreated) = {2000, 13, 1, 0, 0, 0, 0};
    image->attributes().attribute<i32>(names.n_CompressionLevel) = 95;
    LogCapture log;
    const Bytes file = saveBytes(*image, "a.png");
    ASSERT_EQ(log.entries().size(), 1u) << problems(log);
    EXPECT_EQ(log.entries()[0].level, base::logWarning);
    EXPECT_EQ(chunksOf(file), "IHDR IDAT IEND ");
    EXPECT_EQ(bytesOf(*loadBytes(file, "a.png")), bytesOf(*image));
}

} // namespace
} // namespace iio
