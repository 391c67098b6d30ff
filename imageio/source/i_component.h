#pragma once

#include "i_half.h"
#include "i_image.h"

#include <array>
#include <limits>
#include <type_traits>

/// Components as numbers: 0..1 for unsigned integers, -1..1 for signed ones, real types as they
/// stand.
namespace iio {

template <class T>
inline constexpr bool isIntegerComponent = std::is_integral_v<T>;

/// What takes a component of `T` to its number.
template <class T>
inline constexpr float componentScale = 1.0f / static_cast<float>(std::numeric_limits<T>::max());

template <class T>
float toNumber(T component) noexcept {
    if constexpr (isIntegerComponent<T>)
        return static_cast<float>(component) * componentScale<T>;
    else
        return static_cast<float>(component);
}

inline constexpr auto byteUnits = [] {
    std::array<float, 256> units{};
    for (u32 i = 0; i < 256; ++i)
        units[i] = static_cast<float>(i) / 255.0f;
    return units;
}();

/// The number of a component. Unsigned ones are divided by their maximum, which a product with its
/// reciprocal, as `toNumber` takes it, does not equal in the last place.
template <class C>
float toUnit(C component) noexcept {
    if constexpr (std::is_same_v<C, u8>)
        return byteUnits[component];
    else if constexpr (std::is_same_v<C, u16>)
        return static_cast<float>(component) / 65535.0f;
    else
        return toNumber(component);
}

/// Clamped to the range of integers and truncated; not a number gives 0 there.
template <class T>
T fromNumber(float number) noexcept {
    if constexpr (isIntegerComponent<T>) {
        constexpr T max = std::numeric_limits<T>::max();
        constexpr T min = std::is_signed_v<T> ? static_cast<T>(-max) : T(0);
        if (number >= 1.0f)
            return max;
        if (std::is_signed_v<T> ? number <= -1.0f : number <= 0.0f)
            return min;
        return base::saturate<T>(number * static_cast<float>(max));
    } else {
        return static_cast<T>(number);
    }
}

/// Calls `action` with a value of the type that `type` (1..9) stands for; false for any other.
template <class Action>
bool dispatchType(u8 type, Action action) {
    switch (type) {
    case ImageTypes::IT_UNSIGNED_BYTE:
        action(u8());
        return true;
    case ImageTypes::IT_BYTE:
        action(i8());
        return true;
    case ImageTypes::IT_UNSIGNED_SHORT:
        action(u16());
        return true;
    case ImageTypes::IT_SHORT:
        action(i16());
        return true;
    case ImageTypes::IT_UNSIGNED_INT:
        action(u32());
        return true;
    case ImageTypes::IT_INT:
        action(i32());
        return true;
    case ImageTypes::kHalf:
        action(half());
        return true;
    case ImageTypes::kFloat:
        action(float());
        return true;
    case ImageTypes::kDouble:
        action(double());
        return true;
    default:
        return false;
    }
}

} // namespace iio
