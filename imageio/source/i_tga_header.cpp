#include "i_tga.h"

#include "b_byte_order.h"
#include "b_log.h"

namespace iio {

namespace {

constexpr u32 greatestAlphaBits = 8;

// Bits of the descriptor, the last byte of the header.
constexpr u32 alphaBitsMask = 0x0F;
constexpr u32 startsAtRightBit = 0x10;
constexpr u32 startsAtTopBit = 0x20;
constexpr u32 interleavedMask = 0xC0;

constexpr u32 packedBit = 8; ///< of the picture type

bool isColourDepth(u32 bits) {
    return bits == 15 || bits == 16 || bits == 24 || bits == 32;
}

u32 bytesOf(u32 bits) {
    return (bits + 7) / 8;
}

const char* paletteFault(const TgaHeader& header, u32 mapType, u32 entryBits) {
    if (mapType > 1)
        return "unknown type of palette";
    if (header.kind == TgaHeader::Kind::indexed && (mapType == 0 || header.paletteCount == 0))
        return "an indexed picture without palette";
    if (mapType == 1 && !isColourDepth(entryBits))
        return "unknown depth of the palette";
    return nullptr;
}

const char* depthFault(const TgaHeader& header, u32 depth) {
    switch (header.kind) {
    case TgaHeader::Kind::indexed:
        return depth == 8 ? nullptr : "indices of other than 8 bits";
    case TgaHeader::Kind::colour:
        return isColourDepth(depth) ? nullptr : "unknown depth of colour";
    case TgaHeader::Kind::grey:
        return depth == 8 || depth == 16 ? nullptr : "unknown depth of grey";
    }
    return "unknown type of picture";
}

} // namespace

u8 TgaHeader::format() const noexcept {
    if (kind == Kind::grey)
        return pixelBits == 16 ? ImageTypes::kLuminanceAlpha : ImageTypes::kLuminance;
    // Of 16 bits the last one is alpha if the header counts it; 32 bits have alpha anyway.
    const bool hasAlpha = colourBits == 32 || (colourBits == 16 && alphaBits == 1);
    return hasAlpha ? ImageTypes::kBGRA : ImageTypes::kBGR;
}

const char* parseTgaHeader(const u8 (&bytes)[TgaHeader::byteSize], TgaHeader& header) {
    const u32 mapType = bytes[1];
    const u32 type = bytes[2] & ~packedBit;
    const u32 entryBits = bytes[7];
    const u32 depth = bytes[16];
    const u32 descriptor = bytes[17];
    if (type < 1 || type > 3)
        return "unknown type of picture";
    header.kind = static_cast<TgaHeader::Kind>(type);
    header.isPacked = (bytes[2] & packedBit) != 0;
    header.startsAtTop = (descriptor & startsAtTopBit) != 0;
    header.startsAtRight = (descriptor & startsAtRightBit) != 0;
    header.width = base::readLittleEndian<u16>(bytes + 12);
    header.height = base::readLittleEndian<u16>(bytes + 14);
    header.alphaBits = descriptor & alphaBitsMask;
    header.pixelBits = bytesOf(depth) * 8;
    header.colourBits = header.kind == TgaHeader::Kind::indexed ? entryBits : depth;
    header.idBytes = bytes[0];
    header.paletteFirst = mapType == 1 ? base::readLittleEndian<u16>(bytes + 3) : 0;
    header.paletteCount = mapType == 1 ? base::readLittleEndian<u16>(bytes + 5) : 0;
    header.paletteEntryBytes = bytesOf(entryBits);

    if (const char* fault = paletteFault(header, mapType, entryBits))
        return fault;
    if (const char* fault = depthFault(header, depth))
        return fault;
    if (header.width == 0 || header.height == 0)
        return "no pixels";
    if (header.alphaBits > greatestAlphaBits || (descriptor & interleavedMask) != 0)
        return "unknown descriptor";
    return nullptr;
}

void logTgaFault(const base::Stream& stream, string_view fault) {
    base::log().log(base::logIO, base::logError, "tga load |{}| {}", stream.name(), fault);
}

bool readTgaHeader(base::Stream& stream, TgaHeader& header) {
    u8 bytes[TgaHeader::byteSize];
    u64 remaining = tgaBytesLeft(stream);
    if (remaining < sizeof bytes || stream.read(bytes, sizeof bytes) != sizeof bytes) {
        logTgaFault(stream, "the file is shorter than a header");
        return false;
    }
    if (const char* fault = parseTgaHeader(bytes, header)) {
        logTgaFault(stream, fault);
        return false;
    }
    // The fewest bytes that the pixels can take: a packet makes up to 128 of them from one.
    const u64 units = header.isPacked
                          ? (header.pixelCount() + TgaHeader::greatestPacketPixels - 1) /
                                TgaHeader::greatestPacketPixels * (1 + header.pixelBytes())
                          : header.pixelCount() * header.pixelBytes();
    const u64 wanted = header.idBytes + u64(header.paletteCount) * header.paletteEntryBytes + units;
    remaining -= sizeof bytes;
    if (remaining < wanted) {
        base::log().log(base::logIO, base::logError,
                        "tga load |{}| the file holds {} bytes where {} x {} pixels take {}",
                        stream.name(), remaining, header.width, header.height, wanted);
        return false;
    }
    stream.setPosition(header.idBytes, base::StreamOrigin::current);
    return true;
}

} // namespace iio
