#include "document_support.h"
#include "temp_folder.h"

#include "stream/b_fs.h"

#include <fstream>
#include <sys/stat.h>

namespace document_test {
namespace {

const string pngHead("\x89PNG\r\n\x1a\n\0\0\0\rIHDR\0\0\1\2\0\0\0\5", 24);
const string jpegHead("\xff\xd8\xff\xe0\0\4ab\xff\xdb\0\2\xff\xc2\0\x11\x08\0\x20\1\0", 21);

/// An image of exactly these bytes, so that a read past them is seen.
ref<Image> imageOf(string_view bytes, const string& extension) {
    u8* data = static_cast<u8*>(base::AllocPolicy::allocate(bytes.size()));
    std::copy(bytes.begin(), bytes.end(), data);
    return makeRef<Image>("i", data, static_cast<i32>(bytes.size()), extension, "");
}

class ImageFiles : public testing::Test {
protected:
    ImageFiles() { put("a.png", pngHead); }
    ~ImageFiles() override { Image::clearCache(); }
    string put(const string& name, const string& bytes) {
        std::ofstream(folder_ / name, std::ios::binary) << bytes;
        return folder_ / name;
    }
    test_support::TempFolder folder_;
};

TEST_F(ImageFiles, AreReadOnce) {
    const string path = folder_ / "a.png";
    const ref<Image> image = Image::load(path);
    EXPECT_EQ(image->uri, "a.png");
    EXPECT_EQ(image->cacheKey, path);
    EXPECT_EQ(string(reinterpret_cast<const char*>(image->data),
                     static_cast<std::size_t>(image->byteLength)),
              pngHead);
    put("a.png", jpegHead);
    EXPECT_EQ(Image::load(path), image);
    EXPECT_EQ(Image::loadUncached(path)->mimeType, "image/jpeg");
    EXPECT_EQ(Image::load(path), image);
    Image::clearCache();
    const ref<Image> fresh = Image::load(path);
    EXPECT_NE(fresh, image);
    EXPECT_EQ(fresh->mimeType, "image/jpeg");
}

TEST_F(ImageFiles, ThatAreNoFilesHaveNoData) {
    ASSERT_EQ(::mkfifo((folder_ / "pipe.png").c_str(), 0600), 0);
    const struct {
        string path, uri;
    } rows[] = {{folder_ / "missing.png", "missing.png"},
                {folder_ / "pipe.png", "pipe.png"},
                {folder_ / "", ""},
                {put("empty.png", ""), "empty.png"},
                {folder_ / "a.png" + string("\0x", 2), "a.png" + string("\0x", 2)}};
    for (const auto& row : rows) {
        const ref<Image> image = Image::load(row.path);
        EXPECT_EQ(image->data, nullptr) << row.path;
        EXPECT_EQ(image->uri, row.uri);
        EXPECT_EQ(image->byteLength, 0);
    }
}

TEST_F(ImageFiles, AreFoundUnderThePathsOfTheFileSystems) {
    EXPECT_NE(Image::load("file://" + folder_ / "a.png")->data, nullptr);
    base::fs::aliases().set("pictures", folder_ / "");
    EXPECT_NE(Image::load("pictures:/a.png")->data, nullptr);
    base::fs::aliases().remove("pictures");
}

TEST(Images, AreKnownByTheirFirstBytes) {
    const struct {
        string bytes, extension, mimeType;
        i32 width, height;
    } rows[] = {{pngHead, "jpg", "image/png", 258, 5},
                {jpegHead, "png", "image/jpeg", 256, 32},
                {"BM123456", "tga", "image/tga", -1, -1},
                {pngHead.substr(0, 7), "png", "image/png", -1, -1},
                {"\xff", "", "image/", -1, -1}};
    for (const auto& row : rows) {
        const ref<Image> image = imageOf(row.bytes, row.extension);
        EXPECT_EQ(image->mimeType, row.mimeType);
        EXPECT_EQ(image->getDimensions().width, row.width);
        EXPECT_EQ(image->getDimensions().height, row.height);
    }
}

TEST(Images, HaveNoSizeWhenTheirHeaderIsCut) {
    for (const string& whole : {pngHead, jpegHead}) {
        for (std::size_t length = 0; length < whole.size(); ++length)
            EXPECT_EQ(imageOf(whole.substr(0, length), "png")->getDimensions().width, -1) << length;
        // A segment of length 0 and one that leads behind the end must not stop or crash the scan.
        string broken = whole;
        broken[4] = broken[5] = '\xff';
        imageOf(broken, "jpg")->getDimensions();
        broken[4] = broken[5] = '\0';
        imageOf(broken, "jpg")->getDimensions();
    }
}

TEST(Images, AreWrittenByReferenceOrEmbedded) {
    const ref<Image> image = imageOf("Man", "a\"");
    image->uri = "a b\\c.tga";
    image->bufferView = makeRef<BufferView>(0, 3, nullptr, BufferView::noTarget);
    image->bufferView->id = 7;
    Options options;
    EXPECT_EQ(written(*image, options), R"({"uri":"data:image/a\";base64,TWFu"})");
    options.binary = true;
    EXPECT_EQ(written(*image, options), R"({"bufferView":7,"mimeType":"image/a\""})");
    EXPECT_EQ(written(*makeRef<Image>("n.png", ""), options), R"({"uri":"n.png"})");
    options.embedTextures = false;
    EXPECT_EQ(written(*image, options), R"({"uri":"a b\\c.tga"})");
}

} // namespace
} // namespace document_test
