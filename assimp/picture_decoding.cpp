#include "assimp/picture_decoding.h"

#include "b_exception.h"
#include "b_string_convert.h"
#include "i_file.h"
#include "stream/b_fs.h"
#include "stream/b_stream_workers.h"

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
using base::u32;
using base::u64;
using base::u8;
using base::vector;
using iio::Image;

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

/// True if the header of a PNG or TGA file tells of an alpha channel.
bool hasAlphaChannel(std::span<const u8> start, PictureKind kind) {
    constexpr std::size_t pngColorTypeAt = 25, tgaDepthAt = 16;
    if (kind == PictureKind::png)
        return start.size() > pngColorTypeAt && (start[pngColorTypeAt] & 4) != 0;
    return kind == PictureKind::tga && start[tgaDepthAt] == 32;
}

/// True if the last chunk of a PNG file is there.
bool hasEnd(std::span<const u8> end) {
    constexpr string_view lastChunk("\0\0\0\0IEND\xAE\x42\x60\x82", 12);
    return end.size() == lastChunk.size() && startsWith(end, lastChunk);
}

[[noreturn]] void fail(const char* reason) {
    throw base::exception(reason, "picture_decoding", "assimp::makeReadable", __LINE__);
}

} // namespace

PictureKind kindOf(std::span<const u8> start, string_view extension) {
    if (startsWith(start, "\x89PNG\r\n\x1a\n"))
        return PictureKind::png;
    if (startsWith(start, "\xff\xd8\xff"))
        return PictureKind::jpeg;
    for (const char* mark : {"BM", "GIF87a", "GIF89a", "8BPS", "P5", "P6"})
        if (startsWith(start, mark))
            return PictureKind::foreign;
    if (!looksLikeTga(start))
        return PictureKind::unknown;
    return base::toLower(extension) == "tga" ? PictureKind::tga : PictureKind::foreign;
}

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
    image->create(u32(width), u32(height), 1, 1, formats[channels - 1], Image::IT_UNSIGNED_BYTE);
    if (!image->data())
        return nullptr;
    std::memcpy(image->data(), pixels.get(), image->memorySize());
    return image;
}

base::ref<Image> withoutOpaqueAlpha(base::ref<Image> image) {
    if (!image || !image->hasAlpha() || image->checkTransparency())
        return image;
    return image->convertFormat(image->channelCount() == 2 ? Image::kLuminance : Image::kRGB);
}

string_view extensionOf(PictureKind kind) {
    switch (kind) {
    case PictureKind::png:
        return "png";
    case PictureKind::jpeg:
        return "jpg";
    case PictureKind::tga:
        return "tga";
    default:
        return {};
    }
}

bool isNamed(PictureKind kind, string_view extension) {
    const base::string lowerCase = base::toLower(extension);
    const string_view expected = extensionOf(kind);
    return !expected.empty() &&
           (lowerCase == expected || (kind == PictureKind::jpeg && lowerCase == "jpeg"));
}

bool isDoubtful(base::Stream& file, PictureKind kind) {
    constexpr u64 endLength = 12;
    u8 start[headerLength] = {}, end[endLength] = {};
    file.setPosition(0);
    const u64 startCount = file.read(start, std::min(headerLength, file.size()));
    if (hasAlphaChannel({start, startCount}, kind))
        return true;
    if (kind != PictureKind::png || file.size() < endLength)
        return kind == PictureKind::png;
    file.setPosition(static_cast<base::i64>(file.size() - endLength));
    return !hasEnd({end, file.read(end, endLength)});
}

base::ref<Image> makeReadable(std::span<const u8> bytes, PictureKind kind,
                              const base::string& name) {
    if (kind == PictureKind::unknown)
        fail("It is in no format that can be read.");
    base::ref<Image> image;
    if (kind == PictureKind::foreign) {
        image = withoutOpaqueAlpha(decodePicture(bytes));
    } else {
        vector<u8> content(bytes.begin(), bytes.end());
        // The extension chooses the reader.
        base::string streamName = name;
        if (!isNamed(kind, base::fs::extension(name)))
            streamName.append(".").append(extensionOf(kind));
        base::Stream file = base::vectorStream(content, streamName);
        if (!isDoubtful(file, kind))
            return nullptr;
        file.setPosition(0);
        image = iio::loadImage(file);
    }
    if (!image)
        fail("It can't be read.");
    if (kind == PictureKind::foreign)
        return image;
    const base::ref<Image> opaque = withoutOpaqueAlpha(image);
    return opaque != image ? opaque : nullptr;
}

} // namespace assimp
