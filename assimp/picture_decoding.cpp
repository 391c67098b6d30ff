#include "assimp/picture_decoding.h"

#include "b_string_convert.h"

#include <algorithm>
#include <climits>
#include <cstdlib>
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
#define STB_IMAGE_WRITE_IMPLEMENTATION
#define STB_IMAGE_WRITE_STATIC
#define STBI_WRITE_NO_STDIO
#include <stb/stb_image_write.h>

namespace assimp {

using base::string_view;
using base::u32;
using base::u64;
using base::u8;

namespace {

constexpr u64 mostPixels = u64(1) << 26;

struct Release {
    void operator()(u8* bytes) const { std::free(bytes); } // how stb has allocated them
};
using Buffer = std::unique_ptr<u8, Release>;

bool startsWith(std::span<const u8> bytes, string_view mark) {
    return bytes.size() >= mark.size() && std::equal(mark.begin(), mark.end(), bytes.begin(),
                                                     [](char a, u8 b) { return u8(a) == b; });
}

/// True for a header with a known type of picture, a size and a known number of bits a pixel.
bool looksLikeTga(std::span<const u8> bytes) {
    constexpr std::size_t headerLength = 18;
    if (bytes.size() < headerLength)
        return false;
    constexpr u8 types[] = {1, 2, 3, 9, 10, 11}, depths[] = {8, 15, 16, 24, 32};
    const auto isAmong = [](const auto& values, u8 value) {
        return std::ranges::find(values, value) != std::end(values);
    };
    return bytes[1] <= 1 && isAmong(types, bytes[2]) && isAmong(depths, bytes[16]) &&
           (bytes[12] | bytes[13]) != 0 && (bytes[14] | bytes[15]) != 0;
}

/// Keeps of each pixel the channels but the last one.
void dropLastChannel(u8* pixels, std::size_t pixelCount, std::size_t channels) {
    for (std::size_t i = 1; i < pixelCount; ++i)
        std::copy_n(pixels + i * channels, channels - 1, pixels + i * (channels - 1));
}

/// `pixels` are changed if the alpha channel goes.
Bytes encode(u8* pixels, u32 width, u32 height, std::size_t channels, bool dropsAlpha) {
    const std::size_t pixelCount = std::size_t(width) * height;
    if (dropsAlpha)
        dropLastChannel(pixels, pixelCount, channels--);
    int length = 0;
    const Buffer png(
        stbi_write_png_to_mem(pixels, 0, int(width), int(height), int(channels), &length));
    return png ? Bytes(png.get(), png.get() + length) : Bytes();
}

/// True if the last of the channels has the value `alpha` everywhere.
bool hasAlphaEverywhere(const u8* pixels, std::size_t pixelCount, std::size_t channels, u8 alpha) {
    for (std::size_t i = 0; i < pixelCount; ++i)
        if (pixels[i * channels + channels - 1] != alpha)
            return false;
    return true;
}

} // namespace

PictureKind kindOf(std::span<const u8> start, string_view extension) {
    if (startsWith(start, "\x89PNG\r\n\x1a\n"))
        return PictureKind::png;
    if (startsWith(start, "\xff\xd8\xff"))
        return PictureKind::jpeg;
    for (const char* mark : {"BM", "GIF87a", "GIF89a", "8BPS", "P5", "P6"})
        if (startsWith(start, mark))
            return PictureKind::convertible;
    if (!looksLikeTga(start))
        return PictureKind::unknown;
    return base::toLower(extension) == "tga" ? PictureKind::tga : PictureKind::convertible;
}

Bytes convertToPng(std::span<const u8> bytes) {
    if (bytes.size() > INT_MAX)
        return {};
    const int length = static_cast<int>(bytes.size());
    int width = 0, height = 0, channels = 0;
    if (!stbi_info_from_memory(bytes.data(), length, &width, &height, &channels) || width <= 0 ||
        height <= 0 || u64(width) * u64(height) > mostPixels)
        return {};
    const Buffer pixels(stbi_load_from_memory(bytes.data(), length, &width, &height, &channels, 0));
    if (!pixels)
        return {};
    const auto channelCount = static_cast<std::size_t>(channels);
    const bool isOpaque =
        channelCount % 2 == 0 &&
        hasAlphaEverywhere(pixels.get(), std::size_t(width) * height, channelCount, 255);
    return encode(pixels.get(), u32(width), u32(height), channelCount, isOpaque);
}

/// Of formats that know no alpha, texels come with one of 0 as well as of 255.
Bytes encodePng(std::span<const u8> texels, u32 width, u32 height) {
    const u64 pixelCount = u64(width) * height;
    if (pixelCount == 0 || pixelCount > mostPixels || texels.size() < pixelCount * 4)
        return {};
    Bytes pixels(texels.begin(), texels.begin() + static_cast<std::ptrdiff_t>(pixelCount) * 4);
    const bool isPlain = hasAlphaEverywhere(pixels.data(), pixelCount, 4, 0) ||
                         hasAlphaEverywhere(pixels.data(), pixelCount, 4, 255);
    return encode(pixels.data(), width, height, 4, isPlain);
}

} // namespace assimp
