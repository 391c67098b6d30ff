#include "codec_support.h"

#include "b_exception.h"

namespace iio {
namespace {

using test_support::linesOf;
using test_support::LogCapture;

const ImageAttributes& names = imageAttributes();

TEST(ImageRegistry, Formats) {
    struct Row {
        const char* extension;
        const char* name;
        const char* description;
        u32 capabilities;
    };
    for (const Row& row :
         {Row{"tga", "tga", "Truevision Targa", 32771},
          Row{"Png", "png", "Portable Network Graphics", 43027},
          Row{"jpeg", "jpeg", "JPEG Image", 12291}, Row{"JPG", "jpeg", "JPEG Image", 12291},
          Row{"jfi", "jpeg", "JPEG Image", 12291}}) {
        const IImageIODesc* format = findPlugin(row.extension);
        ASSERT_NE(format, nullptr) << row.extension;
        EXPECT_EQ(format->type.view(), row.name);
        EXPECT_EQ(format->info, row.description);
        EXPECT_EQ(format->capabilities(), row.capabilities);
        EXPECT_TRUE(hasCapability(row.extension, canRead | canWrite));
        EXPECT_FALSE(hasCapability(row.extension, 1u << 31));
    }
    for (const char* extension : {"", "jp", "pg", "jpgx", "jpg;jpe", ";", ".png", "bmp", "gif"}) {
        EXPECT_EQ(findPlugin(extension), nullptr) << extension;
        EXPECT_FALSE(hasCapability(extension, 0)) << extension;
    }
    EXPECT_EQ(readerExtensions(), "tga;png;jpeg;jpg;jpe;jfif;jif;jfi");
    EXPECT_EQ(writerExtensions(), readerExtensions());
}

/// The file's bytes; empty if there is none.
Bytes bytesAt(const string& path) {
    std::unique_ptr<std::FILE, int (*)(std::FILE*)> file(std::fopen(path.c_str(), "rb"),
                                                         std::fclose);
    Bytes bytes(file ? std::filesystem::file_size(path.c_str()) : 0, 0);
    bytes.resize(bytes.empty() ? 0 : std::fread(bytes.data(), 1, bytes.size(), file.get()));
    return bytes;
}

TEST(ImageRegistry, ExtensionsChooseTheFormat) {
    const TempFolder folder;
    const ref<Image> image = makeCounting(8, 8, Image::kRGB);
    struct Row {
        const char* file;
        bool isSaved;
        Bytes start;
        const char* messages;
    };
    const Bytes png = {0x89, 'P', 'N', 'G'}, jpeg = {0xFF, 0xD8, 0xFF};
    const Row rows[] = {
        {"a.png", true, png, ""},
        {"b.PNG", true, png, ""},
        {"c.x.jpe", true, jpeg, ""},
        {"d", false, {}, ""},
        {"png", false, {}, ""},
        {"e.bmp", false, {}, ""},
        {"f.png.gz", false, {}, "Unable to open the image file for writing!"},
        {"nowhere/g.png", false, {}, "Unable to open the image file for writing!"},
    };
    for (const Row& row : rows) {
        const string path = folder.file(row.file);
        LogCapture log;
        EXPECT_EQ(saveImage(*image, path), row.isSaved) << row.file;
        EXPECT_EQ(log.entries().empty() ? string() : log.entries()[0].text, row.messages);
        const Bytes bytes = bytesAt(path);
        EXPECT_EQ(Bytes(bytes.data(), bytes.data() + std::min(bytes.size(), row.start.size())),
                  row.start)
            << row.file;
        EXPECT_EQ(bytes.empty(), !row.isSaved);
    }

    std::filesystem::copy(folder.file("a.png").c_str(), folder.file("a.jpg").c_str());
    std::filesystem::copy(folder.file("a.png").c_str(), folder.file("a").c_str());
    for (const char* name : {"a.jpg", "a"}) {
        LogCapture log;
        ImageInfo info;
        EXPECT_FALSE(readImageInfo(folder.file(name), info));
        EXPECT_EQ(linesOf(log), "");
        EXPECT_FALSE(loadImage(folder.file(name)));
        EXPECT_EQ(linesOf(log), base::format("2 Unable to load {}\n", folder.file(name)));
    }
}

TEST(ImageRegistry, LoadedPicturesKnowTheirFile) {
    const TempFolder folder;
    ASSERT_TRUE(saveImage(*makeCounting(3, 2, Image::kRGB), folder.file("a.png")));
    const ref<Image> image = loadImage(folder.file("b/../a.png"));
    ASSERT_TRUE(image);
    EXPECT_EQ(image->path(), folder.file("a.png"));
    EXPECT_TRUE(image->isFromFile());
    EXPECT_EQ(pixelsOf(*image), pixelsOf(*makeCounting(3, 2, Image::kRGB)));
    EXPECT_TRUE(loadImage(folder.file("a.png"), nullptr, 0, 0));
    EXPECT_FALSE(loadImage(folder.file("a.png"), nullptr, 0, 1));

    ImageInfo info;
    info.levels.resize(3);
    info.attributes.attribute<string>(names.n_Comment) = "old";
    ASSERT_TRUE(readImageInfo(folder.file("a.png"), info));
    EXPECT_TRUE(info.levels.empty());
    EXPECT_EQ(info.attributes.size(), 0u);
}

TEST(ImageRegistry, FilesThatCannotBeOpened) {
    const TempFolder folder;
    std::filesystem::create_directory(folder.file("folder.png").c_str());
    for (const char* name : {"missing.png", "folder.png"}) {
        ImageInfo info;
        LogCapture log;
        EXPECT_FALSE(readImageInfo(folder.file(name), info));
        const auto reported = log.take();
        ASSERT_EQ(reported.size(), 1u) << name;
        EXPECT_FALSE(loadImage(folder.file(name)));
        ASSERT_EQ(log.entries().size(), 2u) << name;
        EXPECT_EQ(log.entries()[0].text, "Unable to open the image file for reading!");
        EXPECT_EQ(log.entries()[0].channel, base::logIO);
        // The exception names the line that opened the file, the same each time.
        EXPECT_EQ(log.entries()[1], reported[0]);
    }
}

/// Holds a file, of which it reads a part at a time, and fails behind `goodBytes`.
class FaultyWorker : public base::StreamWorker {
public:
    FaultyWorker(const Bytes& file, u64 goodBytes, void (*fail)())
        : StreamWorker("a.png", base::growingMemoryCapabilities), file_(file),
          goodBytes_(goodBytes), fail_(fail) {
        operations.read = [](StreamWorker& worker, void* target, u64 count) {
            auto& self = static_cast<FaultyWorker&>(worker);
            const u64 got = std::min({count, self.file_.size() - self.at_, u64(4096)});
            std::copy_n(self.file_.data() + self.at_, got, static_cast<u8*>(target));
            return self.advance(got);
        };
        operations.write = [](StreamWorker& worker, const void*, u64 count) {
            return static_cast<FaultyWorker&>(worker).advance(count);
        };
        operations.setPosition = [](StreamWorker& worker, i64 offset, base::StreamOrigin) {
            return static_cast<FaultyWorker&>(worker).at_ = static_cast<u64>(offset);
        };
        operations.getPosition = [](StreamWorker& worker) {
            return static_cast<FaultyWorker&>(worker).at_;
        };
        operations.close = [](StreamWorker&) {};
    }

private:
    u64 advance(u64 count) {
        at_ += count;
        if (at_ > goodBytes_)
            fail_();
        return count;
    }

    const Bytes& file_;
    u64 at_ = 0, goodBytes_;
    void (*fail_)();
};

TEST(ImageRegistry, WhatStreamsThrowIsTold) {
    const ref<Image> image = makeCounting(100, 100, Image::kRGB);
    image->attributes().attribute<i32>(names.n_CompressionLevel) = 0;
    const Bytes file = saveBytes(*image, "a.png");
    ASSERT_GT(file.size(), 30000u);
    struct Row {
        void (*fail)();
        const char* early; ///< while the format is looked for
        const char* text;  ///< while it is decoded
    };
    const Row rows[] = {
        {[] { throw base::exception("broken", "f", "g", 1); },
         "2 Unable to load a.png\n2 broken\n    File: f (1)\nFunction: g\n", "broken"},
        {[] { throw std::runtime_error("torn"); }, "2 Unable to load a.png\n2 torn\n", "torn"},
        {[] { throw 1; }, "2 Unable to load a.png Unhandled exception has occurred!\n",
         "unknown fault of the stream"},
    };
    for (const Row& row : rows) {
        LogCapture log;
        base::Stream early(new FaultyWorker(file, 0, row.fail));
        EXPECT_FALSE(loadImage(early));
        EXPECT_EQ(linesOf(log), row.early);
        log.take();
        base::Stream late(new FaultyWorker(file, 8000, row.fail));
        EXPECT_FALSE(loadImage(late));
        EXPECT_EQ(linesOf(log),
                  base::format("2 png load |a.png| {}\n2 Unable to load a.png\n", row.text));
        log.take();
        base::Stream target(new FaultyWorker(file, 0, row.fail));
        EXPECT_FALSE(saveImage(*image, target));
        EXPECT_EQ(linesOf(log), base::format("2 png save |a.png| {}\n", row.text));
    }
}

} // namespace
} // namespace iio
