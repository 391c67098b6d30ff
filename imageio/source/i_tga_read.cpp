#include "i_tga.h"

#include "b_byte_order.h"
#include "b_log.h"
#include "stream/b_stream_workers.h"

#include <algorithm>
#include <cstring>

namespace iio {

namespace {

constexpr u64 readBlockBytes = 64 * 1024;

/// 5 bits scaled to 8, to the nearest.
constexpr u8 widen(u32 fiveBits) {
    return static_cast<u8>((fiveBits * 255 + 15) / 31);
}

/// Blue, green, red and, for 4 channels, alpha of `count` colours of 16 bits.
void expandWords(const u8* source, u8* target, u32 count, u32 channels) {
    for (; count > 0; --count, source += 2, target += channels) {
        const u32 value = base::readLittleEndian<u16>(source);
        target[0] = widen(value & 31);
        target[1] = widen(value >> 5 & 31);
        target[2] = widen(value >> 10 & 31);
        if (channels == 4)
            target[3] = value >> 15 != 0 ? 255 : 0;
    }
}

/// Makes a picture opaque that is transparent throughout by a header that counts no alpha: the
/// bytes there are padding. Where they differ, the writer forgot the count.
void fillForgottenAlpha(const TgaHeader& header, u8* pixels, u64 count, u32 channels) {
    if (header.alphaBits != 0)
        return;
    u8* const alpha = pixels + channels - 1;
    for (u64 at = 0; at < count; ++at) {
        if (alpha[at * channels] != 0)
            return;
    }
    for (u64 at = 0; at < count; ++at)
        alpha[at * channels] = 255;
}

/// The colours by index.
class Palette {
public:
    /// Reads as many entries as 8 bits reach. False, with a message, if the file ends.
    bool read(base::Stream& stream, const TgaHeader& header, u32 channels) {
        const u64 end = stream.position() + u64(header.paletteCount) * header.paletteEntryBytes;
        if (header.kind == TgaHeader::Kind::indexed && header.paletteFirst < indexCount) {
            first_ = header.paletteFirst;
            count_ = std::min(header.paletteCount, indexCount - first_);
            u8 entries[indexCount * 4];
            const u32 byteCount = count_ * header.paletteEntryBytes;
            if (stream.read(entries, byteCount) != byteCount) {
                logTgaFault(stream, "the file ends in the palette");
                return false;
            }
            if (header.paletteEntryBytes == 2)
                expandWords(entries, colours_, count_, channels);
            else
                std::memcpy(colours_, entries, byteCount);
            if (channels == 4)
                fillForgottenAlpha(header, colours_, count_, channels);
        }
        stream.setPosition(static_cast<base::i64>(end));
        return true;
    }

    /// False if an index has no colour.
    template <u32 channels>
    bool expand(const u8* indices, u8* target, u32 count) const {
        bool isKnown = true;
        for (u32 x = 0; x < count; ++x) {
            const u32 entry = indices[x] - first_; // wraps to beyond the count below `first_`
            isKnown &= entry < count_;
            std::memcpy(target + u64(x) * channels,
                        colours_ + (entry < count_ ? entry : 0) * channels, channels);
        }
        return isKnown;
    }

private:
    static constexpr u32 indexCount = 256;
    u32 first_ = 0, count_ = 0;
    u8 colours_[indexCount * 4] = {};
};

/// Unpacks run-length packets, which may go on from row to row.
class Unpacker {
public:
    Unpacker(const u8* bytes, u64 byteCount) : at_(bytes), end_(bytes + byteCount) {}

    /// False if the bytes end before `count` pixels.
    template <u32 pixelBytes>
    bool read(u8* out, u32 count) {
        while (count > 0) {
            if (left_ == 0 && !nextPacket(pixelBytes))
                return false;
            const u32 part = std::min(left_, count);
            if (isRun_) {
                for (u32 pixel = 0; pixel < part; ++pixel)
                    std::memcpy(out + pixel * pixelBytes, value_, pixelBytes);
            } else {
                if (bytesLeft() < part * pixelBytes)
                    return false;
                std::memcpy(out, at_, part * pixelBytes);
                at_ += part * pixelBytes;
            }
            out += part * pixelBytes;
            left_ -= part;
            count -= part;
        }
        return true;
    }

private:
    u64 bytesLeft() const { return static_cast<u64>(end_ - at_); }

    bool nextPacket(u32 pixelBytes) {
        if (bytesLeft() < 1 + pixelBytes)
            return false;
        isRun_ = (*at_ & 0x80) != 0;
        left_ = (*at_++ & 0x7Fu) + 1;
        if (isRun_) {
            std::memcpy(value_, at_, pixelBytes);
            at_ += pixelBytes;
        }
        return true;
    }

    const u8* at_;
    const u8* end_;
    u32 left_ = 0; ///< pixels of the packet
    bool isRun_ = false;
    u8 value_[4];
};

/// One row of the file after the other.
class RowSource {
public:
    RowSource(base::Stream& stream, const TgaHeader& header)
        : width_(header.width), pixelBytes_(header.pixelBytes()), isPacked_(header.isPacked) {
        if (!isPacked_) {
            stream_ = base::bufferedStream(stream, readBlockBytes, base::BufferMode::read);
            return;
        }
        // No packet holds less than a pixel, so more bytes than these can't belong to them.
        const u64 mostBytes = header.pixelCount() * (1 + pixelBytes_);
        packed_.resizeUninitialized(std::min(tgaBytesLeft(stream), mostBytes));
        const u64 got = stream.read(packed_.data(), packed_.size());
        unpacker_ = Unpacker(packed_.data(), got);
    }

    bool read(u8* row) {
        if (!isPacked_)
            return stream_.read(row, u64(width_) * pixelBytes_) == u64(width_) * pixelBytes_;
        switch (pixelBytes_) {
        case 1:
            return unpacker_.read<1>(row, width_);
        case 2:
            return unpacker_.read<2>(row, width_);
        case 3:
            return unpacker_.read<3>(row, width_);
        default:
            return unpacker_.read<4>(row, width_);
        }
    }

private:
    u32 width_, pixelBytes_;
    bool isPacked_;
    base::Stream stream_;
    vector<u8> packed_;
    Unpacker unpacker_{nullptr, 0};
};

void reversePixels(u8* row, u32 width, u32 channels) {
    u8* last = row + u64(width - 1) * channels;
    for (; row < last; row += channels, last -= channels)
        std::swap_ranges(row, row + channels, last);
}

/// Null once all rows are in `image`, else what is wrong.
const char* readRows(base::Stream& stream, const TgaHeader& header, const Palette& palette,
                     Image& image) {
    const u32 channels = image.channelCount();
    const bool isIndexed = header.kind == TgaHeader::Kind::indexed;
    const bool isWords = header.kind == TgaHeader::Kind::colour && header.pixelBits == 16;
    RowSource source(stream, header);
    vector<u8> fileRow;
    if (isIndexed || isWords)
        fileRow.resizeUninitialized(u64(header.width) * header.pixelBytes());
    for (u32 y = 0; y < header.height; ++y) {
        u8* const row = image.row(header.startsAtTop ? y : header.height - 1 - y);
        if (!source.read(fileRow.empty() ? row : fileRow.data()))
            return "the file ends in the pixels";
        if (isWords) {
            expandWords(fileRow.data(), row, header.width, channels);
        } else if (isIndexed) {
            const bool isKnown = channels == 4
                                     ? palette.expand<4>(fileRow.data(), row, header.width)
                                     : palette.expand<3>(fileRow.data(), row, header.width);
            if (!isKnown)
                return "an index beyond the palette";
        }
        if (header.startsAtRight)
            reversePixels(row, header.width, channels);
    }
    return nullptr;
}

} // namespace

ref<Image> readTgaPixels(base::Stream& stream, const TgaHeader& header) {
    auto image = base::makeRef<Image>(header.width, header.height, 1u, 1u, header.format(),
                                      u8(ImageTypes::IT_UNSIGNED_BYTE));
    if (!image->data())
        return {};
    Palette palette;
    if (!palette.read(stream, header, image->channelCount()))
        return {};
    if (const char* fault = readRows(stream, header, palette, *image)) {
        logTgaFault(stream, fault);
        return {};
    }
    if (image->hasAlpha() && header.kind != TgaHeader::Kind::indexed)
        fillForgottenAlpha(header, image->data(), header.pixelCount(), image->channelCount());
    return image;
}

} // namespace iio
