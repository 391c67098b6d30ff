#pragma once

#include "i_image.h"

#include "stream/b_stream.h"

#include <algorithm>

/// Truevision TGA: indexed, true colour and grey pictures, plain or run-length packed.
namespace iio {

/// What the 18 bytes at the start of a file say, checked.
struct TgaHeader {
    static constexpr u32 byteSize = 18;
    static constexpr u32 greatestPacketPixels = 128;

    enum class Kind { indexed = 1, colour = 2, grey = 3 };

    Kind kind = Kind::colour;
    bool isPacked = false;
    bool startsAtTop = false;
    bool startsAtRight = false;
    u32 width = 0, height = 0;
    u32 alphaBits = 0;    ///< "attribute bits"; 0 also where the writer forgot them
    u32 pixelBits = 0;    ///< of a pixel in the file, whole bytes
    u32 colourBits = 0;   ///< of a palette entry of an indexed picture, else of a pixel
    u32 idBytes = 0;      ///< text between header and palette
    u32 paletteFirst = 0; ///< index that the first palette entry has
    u32 paletteCount = 0; ///< entries in the file, which true colour pictures may have too
    u32 paletteEntryBytes = 0;

    u64 pixelCount() const noexcept { return u64(width) * height; }
    u32 pixelBytes() const noexcept { return pixelBits / 8; }
    /// Of the picture that the file gives: `kLuminance`, `kLuminanceAlpha`, `kBGR` or `kBGRA`,
    /// the order of the file, so that plain rows are read straight into the picture. 32-bit colour
    /// and 16-bit grey have alpha whatever the header counts, as many writers forget the count.
    u8 format() const noexcept;
};

/// From the position to the end.
inline u64 tgaBytesLeft(const base::Stream& stream) {
    const u64 size = stream.size();
    return size - std::min(size, stream.position());
}

/// Null if the bytes can be the start of a file that this library reads, else what is wrong.
const char* parseTgaHeader(const u8 (&bytes)[TgaHeader::byteSize], TgaHeader& header);

/// Reads the header, from the position on, and tests that the stream is long enough for what it
/// claims; stops behind the id text. False, with a message, for what does not fit.
bool readTgaHeader(base::Stream& stream, TgaHeader& header);

/// Logs that a file can't be loaded, and why.
void logTgaFault(const base::Stream& stream, string_view fault);

/// The picture whose header was just read from the stream; null with a message.
ref<Image> readTgaPixels(base::Stream& stream, const TgaHeader& header);

/// False, with a message, if no file can hold a picture of that size and kind.
bool checkTgaSize(const base::Stream& stream, u32 width, u32 height, u32 depth, bool isCube);

/// Writes `image`, converted to bytes of grey or of blue, green, red and maybe alpha, run-length
/// packed if `packs`. Rows are written from the bottom. False, with a message, for what fails.
bool writeTga(base::Stream& stream, Image& image, bool packs);

} // namespace iio
