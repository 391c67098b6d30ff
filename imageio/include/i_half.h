#pragma once

#include "b_types.h"

#include <bit>

namespace iio {

/// A number of 16 bits: 1 sign, 5 exponent, 10 fraction (IEEE 754 binary16).
struct half {
    base::u16 bits = 0;

    half() = default;
    /// To the nearest, ties to even; beyond the range to infinity.
    explicit half(float value) noexcept : bits(encode(value)) {}
    explicit operator float() const noexcept { return decode(bits); }
    friend bool operator<(half a, half b) noexcept {
        return static_cast<float>(a) < static_cast<float>(b);
    }

private:
    static constexpr base::u32 smallestNormal = 0x38800000; ///< 2^-14, as float bits

    static base::u16 encode(float value) noexcept {
        const auto all = std::bit_cast<base::u32>(value);
        const base::u32 sign = all >> 16 & 0x8000;
        const base::u32 magnitude = all & 0x7FFFFFFF;
        base::u32 result;
        if (magnitude > 0x7F800000) {
            result = 0x7E00; // not a number
        } else if (magnitude >= 0x477FF000) {
            result = 0x7C00; // 65520 and above round to infinity
        } else if (magnitude < smallestNormal) {
            // The sum's last place is that of the subnormal numbers, so the adder rounds.
            const float sum = std::bit_cast<float>(magnitude) + 0.5f;
            result = std::bit_cast<base::u32>(sum) - std::bit_cast<base::u32>(0.5f);
        } else {
            const base::u32 isOdd = magnitude >> 13 & 1;
            result = (magnitude - smallestNormal + 0x400 * 0x2000 + 0xFFF + isOdd) >> 13;
        }
        return static_cast<base::u16>(sign | result);
    }

    static float decode(base::u16 bits) noexcept {
        const base::u32 sign = base::u32(bits & 0x8000) << 16;
        const base::u32 magnitude = bits & 0x7FFF;
        base::u32 result;
        if (magnitude >= 0x7C00) {
            result = 0x7F800000 | magnitude << 13;
        } else if (magnitude >= 0x400) {
            result = (magnitude << 13) + smallestNormal - 0x400 * 0x2000;
        } else {
            // The fraction below the last place of 1/2 is 2^-24 a unit, that of the subnormals.
            const float sum = std::bit_cast<float>(magnitude + std::bit_cast<base::u32>(0.5f));
            result = std::bit_cast<base::u32>(sum - 0.5f);
        }
        return std::bit_cast<float>(sign | result);
    }
};

} // namespace iio
