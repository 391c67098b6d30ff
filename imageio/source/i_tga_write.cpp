#include "i_tga.h"

#include "i_codec.h"
#include "i_fitting.h"
#include "i_operation.h"

#include "b_log.h"

#include <algorithm>
#include <cstring>

namespace iio {

namespace {

constexpr u32 greatestSide = 65535;

void logFault(const base::Stream& stream, string_view fault) {
    base::log().log(base::logIO, base::logError, "tga save |{}| {}", stream.name(), fault);
}

/// The format that is written for `format`: single channels as grey, whatever they are, and grey
/// with alpha as colour, as most programs take 16 bits of grey for 5 bits of red, green and blue.
u8 fileFormat(u8 format) {
    const FormatInfo& info = formatInfo(format);
    if (info.channelCount == 1)
        return isCompressed(format) ? u8(ImageTypes::kLuminance) : format;
    return info.hasAlpha ? ImageTypes::kBGRA : ImageTypes::kBGR;
}

/// To bytes of a format that the file can hold.
bool convert(Fitting& fitting) {
    // Blocks first: they have no component type to convert.
    return fitting.toFormat(fileFormat(fitting->format()),
                            "tga save |{}| could not convert the image to a supported format") &&
           fitting.toType(ImageTypes::IT_UNSIGNED_BYTE,
                          "tga save |{}| could not convert the image to unsigned bytes");
}

bool writeHeader(StreamWriter& writer, const Image& image, bool packs) {
    const u32 bits = image.channelCount() * 8;
    const u32 kind = bits == 8 ? 3 : 2; // grey or colour
    u8 header[TgaHeader::byteSize] = {};
    header[2] = static_cast<u8>(packs ? kind | 8 : kind);
    header[12] = static_cast<u8>(image.width());
    header[13] = static_cast<u8>(image.width() >> 8);
    header[14] = static_cast<u8>(image.height());
    header[15] = static_cast<u8>(image.height() >> 8);
    header[16] = static_cast<u8>(bits);
    // The bits of the origin stay clear: rows from the bottom are what every program reads.
    header[17] = bits == 32 ? 8 : 0;
    return writer.append(header, sizeof header);
}

/// Pixels from `row` on, of `count`, that are alike; at most what a packet holds.
template <u32 pixelBytes>
u32 runLength(const u8* row, u32 count) {
    const u32 most = std::min(count, TgaHeader::greatestPacketPixels);
    u32 length = 1;
    while (length < most && std::memcmp(row, row + length * pixelBytes, pixelBytes) == 0)
        ++length;
    return length;
}

/// Appends the packets of a row of `count` pixels. A run of two bytes is not worth ending a packet
/// of differing pixels for.
template <u32 pixelBytes>
void packRow(const u8* row, u32 count, vector<u8>& out) {
    constexpr u32 leastRun = pixelBytes == 1 ? 3 : 2;
    while (count > 0) {
        const u32 run = runLength<pixelBytes>(row, count);
        u32 length = run;
        if (run < leastRun) {
            while (length < std::min(count, TgaHeader::greatestPacketPixels) &&
                   runLength<pixelBytes>(row + length * pixelBytes,
                                         std::min(count - length, leastRun)) < leastRun)
                ++length;
        }
        const bool isRun = run >= leastRun;
        out.push_back(static_cast<u8>((isRun ? 0x80 : 0) | (length - 1)));
        out.append(row, row + (isRun ? 1 : length) * pixelBytes);
        row += length * pixelBytes;
        count -= length;
    }
}

void packRow(const u8* row, const Image& image, vector<u8>& out) {
    switch (image.channelCount()) {
    case 1:
        return packRow<1>(row, image.width(), out);
    case 3:
        return packRow<3>(row, image.width(), out);
    default:
        return packRow<4>(row, image.width(), out);
    }
}

/// From the bottom.
bool writeRows(StreamWriter& writer, const Image& image, bool packs) {
    const u64 rowBytes = u64(image.width()) * image.channelCount();
    vector<u8> packets;
    for (u32 y = image.height(); y-- > 0;) {
        const u8* bytes = image.row(y);
        u64 byteCount = rowBytes;
        if (packs) {
            packets.clear();
            packRow(bytes, image, packets);
            bytes = packets.cbegin();
            byteCount = packets.size();
        }
        if (!writer.append(bytes, byteCount))
            return false;
    }
    return true;
}

bool writeFooter(StreamWriter& writer) {
    // No extension area and no developer area.
    constexpr char footer[] = "\0\0\0\0\0\0\0\0TRUEVISION-XFILE.";
    return writer.append(reinterpret_cast<const u8*>(footer), sizeof footer);
}

} // namespace

bool checkTgaSize(const base::Stream& stream, u32 width, u32 height, u32 depth, bool isCube) {
    if (depth > 1 || isCube)
        logFault(stream, "the format holds no volumes and no cube maps");
    else if (width > greatestSide || height > greatestSide)
        logFault(stream, "a side is longer than 65535 pixels");
    else
        return true;
    return false;
}

bool writeTga(base::Stream& stream, Image& image, bool packs) {
    Fitting fitting(image, stream);
    if (!requirePixels(image, base::format("tga save |{}|", fitting.name())) || !convert(fitting))
        return false;
    StreamWriter writer(stream);
    const bool isWhole = writeHeader(writer, *fitting, packs) &&
                         writeRows(writer, *fitting, packs) && writeFooter(writer) &&
                         writer.flush();
    if (!isWhole)
        logFault(stream, writer.fault());
    return isWhole;
}

} // namespace iio
