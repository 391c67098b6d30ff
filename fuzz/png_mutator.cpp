#include <cstddef>
#include <cstdint>
#include <zlib.h>

/// Puts right the check sums of the chunks of a PNG that was changed: a reader would drop nearly
/// every changed chunk else, and never look into it.

extern "C" std::size_t LLVMFuzzerMutate(std::uint8_t* data, std::size_t size, std::size_t maxSize);

namespace {

constexpr std::size_t signatureBytes = 8;
constexpr std::size_t frameBytes = 12; ///< length, name and check sum
constexpr unsigned keptOneIn = 16;     ///< share of inputs whose sums stay as they come

std::uint32_t readNumber(const std::uint8_t* bytes) {
    return std::uint32_t(bytes[0]) << 24 | std::uint32_t(bytes[1]) << 16 |
           std::uint32_t(bytes[2]) << 8 | bytes[3];
}

void writeNumber(std::uint8_t* bytes, std::uint32_t number) {
    for (int i = 0; i < 4; ++i)
        bytes[i] = static_cast<std::uint8_t>(number >> (24 - 8 * i));
}

} // namespace

extern "C" std::size_t LLVMFuzzerCustomMutator(std::uint8_t* data, std::size_t size,
                                               std::size_t maxSize, unsigned seed) {
    size = LLVMFuzzerMutate(data, size, maxSize);
    if (seed % keptOneIn == 0)
        return size;
    std::size_t at = signatureBytes;
    while (at + frameBytes <= size) {
        const std::size_t length = readNumber(data + at);
        if (length > size - at - frameBytes)
            break;
        const auto summedBytes = static_cast<uInt>(length + 4);
        writeNumber(data + at + 8 + length,
                    static_cast<std::uint32_t>(crc32(0, data + at + 4, summedBytes)));
        at += frameBytes + length;
    }
    return size;
}
