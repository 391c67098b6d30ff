#include "assimp/picture_kind.h"

#include "b_string_convert.h"

#include <algorithm>

namespace assimp {

using base::string_view;
using base::u8;

namespace {

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

bool mayHaveExtension(PictureKind kind, string_view extension) {
    const base::string lowerCase = base::toLower(extension);
    const string_view expected = extensionOf(kind);
    return !expected.empty() &&
           (lowerCase == expected || (kind == PictureKind::jpeg && lowerCase == "jpeg"));
}

} // namespace assimp
