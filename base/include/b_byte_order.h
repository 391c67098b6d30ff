#pragma once

#include "b_types.h"

/// Unsigned numbers as bytes of a file, wherever they stand and whatever this machine's own order.
namespace base {

/// The first `byteCount` bytes, the low one first.
template <class T>
constexpr T readLittleEndian(const u8* bytes, u32 byteCount = sizeof(T)) noexcept {
    static_assert(std::is_unsigned_v<T>);
    T value = 0;
    for (u32 i = 0; i < byteCount; ++i)
        value = static_cast<T>(value | T(bytes[i]) << i * 8);
    return value;
}

/// The high byte first.
template <class T>
constexpr T readBigEndian(const u8* bytes) noexcept {
    static_assert(std::is_unsigned_v<T>);
    T value = 0;
    for (u32 i = 0; i < sizeof(T); ++i)
        value = static_cast<T>(value | T(bytes[i]) << (sizeof(T) - 1 - i) * 8);
    return value;
}

} // namespace base
