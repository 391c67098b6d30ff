#include "codec_support.h"

#include <zlib.h>

/// What holds for files of every format.
namespace iio {
namespace {

using test_support::linesOf;
using test_support::LogCapture;
using test_support::TempFolder;

struct Seed {
    string name; ///< of its format, "/", and the file's
    Bytes bytes = readSeed(name);
    bool isJpeg() const { return name.ends_with(".jpeg"); }
};

/// Small whole files of every kind, named with the extension of their format.
const vector<Seed>& seeds() {
    static const vector<Seed> all = [] {
        vector<Seed> found;
        const std::filesystem::path folder = IMAGE_SEEDS;
        for (const char* format : {"jpeg", "png", "tga"})
            for (const auto& entry : std::filesystem::directory_iterator(folder / format))
                found.push_back({std::filesystem::relative(entry.path(), folder).c_str()});
        return found;
    }();
    return all;
}

/// Where the segment with that marker starts, by the lengths of those before it.
u64 findSegment(const Bytes& jpeg, u8 first, u8 last) {
    u64 at = 2;
    while (jpeg[at + 1] < first || jpeg[at + 1] > last)
        at += 2u + jpeg[at + 2] * 256u + jpeg[at + 3];
    return at;
}

TEST(FileContract, ShorterFilesGiveNullOrWhatIsThere) {
    ASSERT_GT(seeds().size(), 50u);
    for (const Seed& seed : seeds()) {
        // From where on a JPEG is a picture, and up to where it is none: what lies between is the
        // header of its scan, of which some bytes may mean nothing.
        u64 scan = seed.bytes.size(), scanHeader = scan;
        if (seed.isJpeg()) {
            scanHeader = findSegment(seed.bytes, 0xDA, 0xDA);
            scan = scanHeader + 2u + seed.bytes[scanHeader + 3];
        }
        for (u64 length = 0; length < seed.bytes.size(); ++length) {
            const Bytes part(seed.bytes.data(), seed.bytes.data() + length);
            LogCapture log;
            const bool isLoaded = !!loadBytes(part, seed.name.c_str());
            if (length >= scan || length <= scanHeader) {
                ASSERT_EQ(isLoaded, length >= scan) << seed.name << length;
            }
            ASSERT_GE(log.entries().size(), 1u) << seed.name << length;
            ASSERT_LE(log.entries().size(), isLoaded ? 1u : 3u)
                << seed.name << length << linesOf(log);
            ASSERT_EQ(log.has(base::logError, "Unable to load " + seed.name), !isLoaded);
            ASSERT_EQ(log.entries()[0].level, isLoaded ? base::logWarning : base::logError);
        }
    }
}

TEST(FileContract, DamagedFilesGiveAPictureOrNull) {
    for (const Seed& seed : seeds()) {
        u32 lostCount = 0;
        for (u64 at = 0; at < seed.bytes.size(); ++at) {
            for (const u8 flip : Bytes{0x01, 0x80, 0xFF}) {
                Bytes damaged = seed.bytes;
                damaged[at] = static_cast<u8>(damaged[at] ^ flip);
                LogCapture log;
                const bool isLost = !loadBytes(damaged, seed.name.c_str());
                lostCount += isLost ? 1 : 0;
                ASSERT_EQ(log.has(base::logError, "Unable to load " + seed.name), isLost)
                    << seed.name << at;
            }
        }
        EXPECT_GT(lostCount, 20u) << seed.name;
    }
}

/// Makes the header of a file say another size.
void claim(Seed& seed, u32 width, u32 height) {
    Bytes& bytes = seed.bytes;
    const auto put = [&](u64 at, u32 value, u32 byteCount) {
        for (u32 i = 0; i < byteCount; ++i)
            bytes[at + i] = static_cast<u8>(value >> 8 * (byteCount - 1 - i));
    };
    if (seed.isJpeg()) {
        const u64 frame = findSegment(bytes, 0xC0, 0xC2);
        put(frame + 5, height, 2);
        put(frame + 7, width, 2);
    } else if (seed.name.ends_with(".png")) {
        put(16, width, 4);
        put(20, height, 4);
        put(29, static_cast<u32>(crc32(0, bytes.data() + 12, 17)), 4);
    } else {
        put(12, width << 8 | width >> 8, 2); // low byte first
        put(14, height << 8 | height >> 8, 2);
    }
}

TEST(FileContract, ClaimsAreTestedFirst) {
    struct Row {
        const char* file;
        u32 width, height;
        const char* message;
    };
    const Row rows[] = {
        {"png/colour-6-16.png", 0, 1, "invalid image width reported 0"},
        {"png/colour-6-16.png", 1, 0, "invalid image height reported 0"},
        {"png/colour-6-16.png", 1000001, 1, "invalid image width reported 1000001"},
        {"png/colour-6-16.png", 1, 4000000000u, "invalid image height reported 4000000000"},
        {"png/colour-6-16.png", 1000000, 1000000, "Could not allocate memory for an image!"},
        {"png/colour-6-16.png", 30000, 10000, "png load |"}, // just has too few rows
        {"jpeg/rgb.jpeg", 65500, 20000, "the file is too short for 65500 x 20000 pixels"},
        {"jpeg/rgb.jpeg", 0, 5, "bad file header"},
        {"jpeg/rgb.jpeg", 65501, 5, "bad file header"},
        {"tga/colour-24-00.tga", 0, 2, ""},
        {"tga/colour-24-00.tga", 2, 0, ""},
        {"tga/colour-32-08.tga", 65535, 65535, "tga load |"},
        {"tga/grey-8-rle.tga", 65535, 65535, "tga load |"},
    };
    for (const Row& row : rows) {
        SCOPED_TRACE(testing::Message() << row.file << ' ' << row.width << " x " << row.height);
        Seed seed = {row.file};
        claim(seed, row.width, row.height);
        LogCapture log;
        EXPECT_FALSE(loadBytes(seed.bytes, seed.name.c_str()));
        EXPECT_NE(linesOf(log).find(row.message), string::npos) << linesOf(log);
        EXPECT_TRUE(log.has(base::logError, "Unable to load " + seed.name));
    }
}

TEST(FileContract, SavingSaysWhatItLacks) {
    const TempFolder folder;
    for (const char* name : {"a.png", "a.jpg", "a.tga"}) {
        SCOPED_TRACE(name);
        Image empty;
        Image tooFew(3, 2, 1, 1, Image::kRGB, Image::IT_UNSIGNED_BYTE);
        tooFew.setByteAlignment(8); // for which the rows are too short
        for (Image* image : {&empty, &tooFew}) {
            LogCapture log;
            EXPECT_TRUE(saveBytes(*image, name).empty());
            ASSERT_EQ(log.entries().size(), 1u) << linesOf(log);
            EXPECT_EQ(log.entries()[0].level, base::logError);
            EXPECT_NE(log.entries()[0].text.find(name), string::npos) << linesOf(log);
        }
        const string path = folder / name;
        std::filesystem::create_symlink("/dev/full", path.c_str());
        LogCapture log;
        EXPECT_FALSE(saveImage(*makeCounting(300, 300, Image::kRGB), path));
        ASSERT_EQ(log.entries().size(), 1u) << linesOf(log);
        EXPECT_NE(log.entries()[0].text.find("|" + path + "| "), string::npos) << linesOf(log);
    }
}

} // namespace
} // namespace iio
