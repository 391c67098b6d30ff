#pragma once

#include "i_plugin.h"
#include "log_capture.h"

#include "stream/b_stream_workers.h"

#include <filesystem>
#include <gtest/gtest.h>
#include <unistd.h>

/// What the tests of the formats share.
namespace iio {

using Bytes = vector<u8>;

/// Loads from a copy of exactly these bytes, so that reading beyond it shows.
inline ref<Image> loadBytes(const Bytes& bytes, const char* name) {
    const std::unique_ptr<u8[]> exact(new u8[bytes.size()]);
    std::copy(bytes.cbegin(), bytes.cend(), exact.get());
    base::Stream stream = base::memStreamView(exact.get(), bytes.size(), name);
    return loadImage(stream);
}

inline bool readInfoOf(const Bytes& bytes, const char* name, ImageInfo& info) {
    base::Stream stream = base::memStreamView(bytes.data(), bytes.size(), name);
    return readImageInfo(stream, info);
}

/// The file that saving makes; empty if it fails.
inline Bytes saveBytes(Image& image, const char* name,
                       const base::AttribMap& attributes = base::AttribMap()) {
    Bytes bytes;
    base::Stream stream = base::vectorStream(bytes, name);
    return saveImage(image, stream, attributes) ? bytes : Bytes();
}

inline ref<Image> makeImage(u32 width, u32 height, u8 format, u8 type = Image::IT_UNSIGNED_BYTE) {
    auto image = base::makeRef<Image>();
    image->create(width, height, 1, 1, format, type);
    return image;
}

/// The same with the bytes 1, 2, 3...
inline ref<Image> makeCounting(u32 width, u32 height, u8 format,
                               u8 type = Image::IT_UNSIGNED_BYTE) {
    ref<Image> image = makeImage(width, height, format, type);
    for (u64 i = 0; i < image->memorySize(); ++i)
        image->data()[i] = static_cast<u8>(i + 1);
    return image;
}

inline Bytes pixelsOf(const Image& image) {
    return Bytes(image.data(), image.data() + image.memorySize());
}

template <class T>
T valueOf(const base::AttribMap& attributes, base::name_id name) {
    const T* value = attributes.findAttribute<T>(name);
    return value ? *value : T();
}

/// Changes each byte in turn, from `first` on: all that may follow is a picture, or null and a
/// message. Returns how often it was null.
inline u32 countLost(const Bytes& whole, const char* name, u64 first) {
    u32 lostCount = 0;
    for (u64 at = first; at < whole.size(); ++at) {
        for (const u8 flip : Bytes{0x01, 0x80, 0xFF}) {
            Bytes damaged = whole;
            damaged[at] = static_cast<u8>(damaged[at] ^ flip);
            test_support::LogCapture log;
            const bool isLost = !loadBytes(damaged, name);
            lostCount += isLost ? 1 : 0;
            EXPECT_EQ(log.has(base::logError, base::format("Unable to load {}", name)), isLost)
                << at;
        }
    }
    return lostCount;
}

/// A folder of its own, gone with the object.
class TempFolder {
public:
    TempFolder() {
        string pattern = testing::TempDir() + "imageioXXXXXX";
        path_ = string(::mkdtemp(pattern.data())) + "/";
    }
    ~TempFolder() { std::filesystem::remove_all(path_.c_str()); }
    TempFolder(const TempFolder&) = delete;
    TempFolder& operator=(const TempFolder&) = delete;

    string file(const char* name) const { return path_ + name; }

private:
    string path_;
};

/// Saving to a device that is full fails with `message`, in which {} is the path.
inline void expectFullDiskTold(const char* name, const char* message) {
    const TempFolder folder;
    const string path = folder.file(name);
    std::filesystem::create_symlink("/dev/full", path.c_str());
    test_support::LogCapture log;
    EXPECT_FALSE(saveImage(*makeCounting(300, 300, Image::kRGB), path));
    EXPECT_EQ(linesOf(log), base::format("2 {}\n", base::format(message, path)));
}

} // namespace iio
