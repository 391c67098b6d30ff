#include "assimp/picture_decoding.h"

#include "b_exception.h"
#include "i_file.h"

#include <algorithm>
#include <climits>
#include <cstdlib>
#include <cstring>
#include <memory>

#define STB_IMAGE_IMPLEMENTATION
#define STB_IMAGE_STATIC
#define STBI_ONLY_BMP
#define STBI_ONLY_GIF
#define STBI_ONLY_PNM
#define STBI_ONLY_PSD
#define STBI_ONLY_TGA
#define STBI_NO_STDIO
#include <stb/stb_image.h>

namespace assimp {

using base::string_view;
using base::u64;
using base::u8;
using iio::Image;

namespace {

constexpr u64 mostPixels = u64(1) << 26;

struct Release {
    void operator()(u8* bytes) const { std::free(bytes); } // how stb has allocated them
};
using Buffer = std::unique_ptr<u8, Release>;

/// True if the last chunk of a PNG file is there.
bool hasEnd(base::Stream& png) {
    constexpr string_view lastChunk("\0\0\0\0IEND\xAE\x42\x60\x82", 12);
    char end[lastChunk.size()] = {};
    if (png.size() < sizeof end)
        return false;
    png.setPosition(static_cast<base::i64>(png.size() - sizeof end));
    return string_view(end, png.read(end, sizeof end)) == lastChunk;
}

} // namespace

base::ref<Image> decodePicture(std::span<const u8> bytes) {
    if (bytes.size() > INT_MAX)
        return nullptr;
    const int length = static_cast<int>(bytes.size());
    int width = 0, height = 0, channels = 0;
    if (!stbi_info_from_memory(bytes.data(), length, &width, &height, &channels) || width <= 0 ||
        height <= 0 || u64(width) * u64(height) > mostPixels)
        return nullptr;
    const Buffer pixels(stbi_load_from_memory(bytes.data(), length, &width, &height, &channels, 0));
    if (!pixels)
        return nullptr;
    constexpr u8 formats[] = {Image::kLuminance, Image::kLuminanceAlpha, Image::kRGB, Image::kRGBA};
    auto image = base::makeRef<Image>();
    image->create(base::u32(width), base::u32(height), 1, 1, formats[channels - 1],
                  Image::IT_UNSIGNED_BYTE);
    if (!image->data())
        return nullptr;
    std::memcpy(image->data(), pixels.get(), image->memorySize());
    return image;
}

void checkPicture(base::Stream& file, PictureKind kind) {
    file.setPosition(0);
    iio::ImageInfo info;
    bool isWhole = iio::readImageInfo(file, info);
    if (isWhole && kind == PictureKind::png && !hasEnd(file)) {
        file.setPosition(0);
        isWhole = iio::loadImage(file).get() != nullptr;
    }
    if (!isWhole)
        throw base::exception("It can't be read.", "picture_decoding", "assimp::checkPicture",
                              __LINE__);
}

} // namespace assimp
