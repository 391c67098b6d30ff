#include "b_base64.h"

#include "b_byte_order.h"

#include <array>
#include <bit>
#include <cstring>

namespace base {

namespace {

constexpr char alphabet[] = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";

/// The two characters of every 12 bits, in the order in which they are stored: 8 KiB, which stay
/// in the first-level cache.
constexpr auto pairs = [] {
    std::array<u16, 4096> table{};
    for (u32 bits = 0; bits < table.size(); ++bits) {
        const auto first = static_cast<u32>(static_cast<u8>(alphabet[bits >> 6]));
        const auto second = static_cast<u32>(static_cast<u8>(alphabet[bits & 63]));
        table[bits] = static_cast<u16>(
            std::endian::native == std::endian::little ? first | second << 8 : first << 8 | second);
    }
    return table;
}();

/// The four characters of the low 24 bits.
void putQuad(u32 bits, char* out) {
    std::memcpy(out, &pairs[bits >> 12], 2);
    std::memcpy(out + 2, &pairs[bits & 0xFFF], 2);
}

} // namespace

void base64Encode(const u8* bytes, std::size_t byteCount, char* out) {
    // Twelve bytes a turn, as three words: the compiler turns each into one swapped load.
    for (; byteCount >= 12; bytes += 12, byteCount -= 12, out += 16) {
        const u32 a = readBigEndian<u32>(bytes);
        const u32 b = readBigEndian<u32>(bytes + 4);
        const u32 c = readBigEndian<u32>(bytes + 8);
        putQuad(a >> 8, out);
        putQuad((a << 16 | b >> 16) & 0xFFFFFF, out + 4);
        putQuad((b << 8 | c >> 24) & 0xFFFFFF, out + 8);
        putQuad(c & 0xFFFFFF, out + 12);
    }
    for (; byteCount >= 3; bytes += 3, byteCount -= 3, out += 4)
        putQuad(u32{bytes[0]} << 16 | u32{bytes[1]} << 8 | bytes[2], out);
    if (byteCount == 0)
        return;
    const u32 tail = u32{bytes[0]} << 16 | (byteCount == 2 ? u32{bytes[1]} << 8 : 0);
    putQuad(tail, out);
    out[3] = '=';
    if (byteCount == 1)
        out[2] = '=';
}

} // namespace base
