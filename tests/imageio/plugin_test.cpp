#include "codec_support.h"

#include "b_exception.h"

namespace iio {
namespace {

using test_support::linesOf;
using test_support::LogCapture;
using test_support::TempFolder;

const ImageAttributes& names = imageAttributes();

TEST(ImageRegistry, Formats) {
    EXPECT_EQ(findPlugin("Png")->capabilities(), 43027u);
    EXPECT_EQ(findPlugin("tga")->capabilities(), 32771u);
    for (const char* extension : {"jpeg", "JPG", "jfi"}) {
        ASSERT_NE(findPlugin(extension), nullptr) << extension;
        EXPECT_EQ(findPlugin(extension)->type.view(), "jpeg");
        EXPECT_TRUE(hasCapability(extension, canRead | canWrite));
        EXPECT_FALSE(hasCapability(extension, 1u << 31));
    }
    for (const char* extension : {"", "jp", "pg", "jpgx", "jpg;jpe", ";", ".png", "bmp"}) {
        EXPECT_EQ(findPlugin(extension), nullptr) << extension;
        EXPECT_FALSE(hasCapability(extension, 0)) << extension;
    }
    EXPECT_EQ(readerExtensions(), "tga;png;jpeg;jpg;jpe;jfif;jif;jfi");
    EXPECT_EQ(writerExtensions(), readerExtensions());
}

TEST(ImageRegistry, ExtensionsChooseTheFormat) {
    const TempFolder folder;
    const ref<Image> image = makeCounting(8, 8, Image::kRGB);
    for (const char* name : {"a.png", "b.PNG", "c.x.jpe"}) {
        EXPECT_TRUE(saveImage(*image, folder / name));
        EXPECT_TRUE(loadImage(folder / name)) << name;
    }
    for (const char* name : {"d", "png", "e.bmp", "f.png.gz", "nowhere/g.png"}) {
        LogCapture log;
        EXPECT_FALSE(saveImage(*image, folder / name)) << name;
        EXPECT_EQ(log.has(base::logError, "Unable to open the image file for writing!"),
                  string_view(name).find(".png") != string_view::npos);
        EXPECT_FALSE(std::filesystem::exists(folder / name));
    }

    std::filesystem::copy(folder / "a.png", folder / "a.jpg");
    std::filesystem::copy(folder / "a.png", folder / "a");
    for (const char* name : {"a.jpg", "a"}) {
        LogCapture log;
        ImageInfo info;
        EXPECT_FALSE(readImageInfo(folder / name, info));
        EXPECT_EQ(linesOf(log), "");
        EXPECT_FALSE(loadImage(folder / name));
        EXPECT_EQ(linesOf(log), base::format("2 Unable to load {}\n", folder / name));
    }
}

TEST(ImageRegistry, LoadedPicturesKnowTheirFile) {
    const TempFolder folder;
    ASSERT_TRUE(saveImage(*makeCounting(3, 2, Image::kRGB), folder / "a.png"));
    const ref<Image> image = loadImage(folder / "b/../a.png");
    ASSERT_TRUE(image);
    EXPECT_EQ(image->path(), folder / "a.png");
    EXPECT_TRUE(image->isFromFile());
    EXPECT_EQ(bytesOf(*image), bytesOf(*makeCounting(3, 2, Image::kRGB)));
    EXPECT_TRUE(loadImage(folder / "a.png", nullptr, 0, 0));
    EXPECT_FALSE(loadImage(folder / "a.png", nullptr, 0, 1));

    ImageInfo info;
    info.levels.resize(3);
    info.attributes.attribute<string>(names.n_Comment) = "old";
    ASSERT_TRUE(readImageInfo(folder / "a.png", info));
    EXPECT_TRUE(info.levels.empty());
    EXPECT_EQ(info.attributes.size(), 0u);
}

TEST(ImageRegistry, FilesThatCannotBeOpened) {
    const TempFolder folder;
    std::filesystem::create_directory(folder / "folder.png");
    for (const char* name : {"missing.png", "folder.png"}) {
        ImageInfo info;
        LogCapture log;
        EXPECT_FALSE(readImageInfo(folder / name, info));
        const auto reported = log.take();
        ASSERT_EQ(reported.size(), 1u) << name;
        EXPECT_FALSE(loadImage(folder / name));
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
        using Self = FaultyWorker;
        operations.read = [](StreamWorker& worker, void* target, u64 count) {
            auto& self = static_cast<Self&>(worker);
            const u64 got = std::min({count, self.file_.size() - self.at_, u64(4096)});
            std::copy_n(self.file_.data() + self.at_, got, static_cast<u8*>(target));
            return self.advance(got);
        };
        operations.write = [](StreamWorker& worker, const void*, u64 count) {
            return static_cast<Self&>(worker).advance(count);
        };
        operations.setPosition = [](StreamWorker& worker, i64 offset, base::StreamOrigin) {
            return static_cast<Self&>(worker).at_ = static_cast<u64>(offset);
        };
        operations.getPosition = [](StreamWorker& w) { return static_cast<Self&>(w).at_; };
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
        const auto expectTold = [&](u64 goodBytes, bool saves, const string& lines) {
            LogCapture log;
            base::Stream stream(new FaultyWorker(file, goodBytes, row.fail));
            EXPECT_FALSE(saves ? saveImage(*image, stream) : !!loadImage(stream));
            EXPECT_EQ(linesOf(log), lines);
        };
        expectTold(0, false, row.early);
        expectTold(8000, false,
                   base::format("2 png load |a.png| {}\n2 Unable to load a.png\n", row.text));
        expectTold(0, true, base::format("2 png save |a.png| {}\n", row.text));
    }
}

} // namespace
} // namespace iio
