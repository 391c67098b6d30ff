#include "i_component.h"
#include "i_operation.h"

#include "b_log.h"

#include <algorithm>
#include <cmath>
#include <cstring>

/// Operations that change the pixels of a picture where they lie.
namespace iio {

namespace {

void logUnsupportedType(const char* operation) {
    base::log().log(base::logIO, base::logError, "{}: unsupported image type().", operation);
}

/// Calls `action` with the first component of every pixel.
template <class T, class Action>
void forEachPixel(Image& image, Action action) {
    const u32 channels = image.channelCount();
    for (u64 y = 0; y < image.rowCount(); ++y) {
        T* pixel = reinterpret_cast<T*>(image.row(y));
        for (u32 x = 0; x < image.width(); ++x, pixel += channels)
            action(pixel);
    }
}

template <class T>
inline constexpr bool isSignedInteger = isIntegerComponent<T>&& std::is_signed_v<T>;

/// Full value less a component is in the range of the type, which it is not for signed integers.
template <class T>
inline constexpr bool isInverted = !isSignedInteger<T>;
template <class T>
inline constexpr bool isEqualized = !isSignedInteger<T> && !std::is_same_v<T, half>;

bool isInvertedType(u8 type) {
    bool result = false;
    dispatchType(type, [&](auto component) { result = isInverted<decltype(component)>; });
    return result;
}

bool isEqualizedType(u8 type) {
    bool result = false;
    dispatchType(type, [&](auto component) { result = isEqualized<decltype(component)>; });
    return result;
}

/// Components `first` to `first` + `count` of each pixel.
bool invertComponents(Image& image, const char* operation, u32 first, u32 count) {
    if (!isInvertedType(image.type()) || image.isCompressed()) {
        logUnsupportedType(operation);
        return false;
    }
    if (!requirePixels(image, operation))
        return false;
    return dispatchType(image.type(), [&](auto component) {
        using T = decltype(component);
        forEachPixel<T>(image, [=](T* pixel) {
            for (u32 c = first; c < first + count; ++c) {
                if constexpr (isIntegerComponent<T>)
                    pixel[c] = static_cast<T>(std::numeric_limits<T>::max() - pixel[c]);
                else if constexpr (std::is_same_v<T, half>)
                    pixel[c] = half(1.0f - static_cast<float>(pixel[c]));
                else
                    pixel[c] = 1 - pixel[c];
            }
        });
    });
}

template <class T>
T product(T a, T b) {
    if constexpr (isIntegerComponent<T>)
        return static_cast<T>(static_cast<u64>(a) * static_cast<u64>(b));
    else if constexpr (std::is_same_v<T, half>)
        return half(static_cast<float>(a) * static_cast<float>(b));
    else
        return a * b;
}

/// The values that become 0 and the full value.
struct Limits {
    double low, high;

    /// Not what is of full extent already, nor what no quotient can stretch.
    bool canStretch(double full) const {
        const double extent = high - low;
        return std::isfinite(extent) && extent != 0 && extent != full;
    }
};

template <class T>
inline constexpr double fullNumber = isIntegerComponent<T> ? double(std::numeric_limits<T>::max())
                                                           : 1.0;

/// Of the colours; values that are not numbers don't count.
template <class T>
Limits findLimits(Image& image) {
    constexpr double infinity = std::numeric_limits<double>::infinity();
    const u32 colorCount = colorCountOf(image);
    Limits limits = {infinity, -infinity};
    forEachPixel<T>(image, [&](const T* pixel) {
        for (u32 c = 0; c < colorCount; ++c) {
            const auto value = static_cast<double>(pixel[c]);
            if (value < limits.low)
                limits.low = value;
            if (value > limits.high)
                limits.high = value;
        }
    });
    return limits;
}

/// `limits` are on the component's own scale. The product comes first: up to 16 bits it is exact,
/// and so a quotient that is a whole number is not truncated to the one below.
template <class T>
void stretch(Image& image, const Limits& limits) {
    const u32 colorCount = colorCountOf(image);
    const double extent = limits.high - limits.low;
    forEachPixel<T>(image, [&](T* pixel) {
        for (u32 c = 0; c < colorCount; ++c) {
            const double value = static_cast<double>(pixel[c]) - limits.low;
            if constexpr (isIntegerComponent<T>)
                pixel[c] = base::saturate<T>(value * fullNumber<T> / extent);
            else
                pixel[c] = static_cast<T>(value / extent);
        }
    });
}

bool checkEqualizedFormat(const Image& image) {
    if (!image.isCompressed())
        return true;
    base::log().log(base::logIO, base::logError, "Image::equalize(): unsupported image format().");
    return false;
}

/// `findLimitsOf` gives the limits for a component, on its own scale.
template <class FindLimits>
void equalizeBy(Image& image, FindLimits findLimitsOf) {
    dispatchType(image.type(), [&](auto component) {
        using T = decltype(component);
        if constexpr (isEqualized<T>) {
            const Limits limits = findLimitsOf(component);
            if (limits.canStretch(fullNumber<T>))
                stretch<T>(image, limits);
        }
    });
}

u8 toNormalByte(float scaled) {
    return base::saturate<u8>(scaled + (scaled <= -127.5f ? 127.0f : 128.0f));
}

/// Direction components are 0..255 for -1..1. No byte stands for 0, so the length is not 0 either.
void renormalize(u8* pixel) {
    const float x = static_cast<float>(pixel[0]) * 0.007843138f - 1.0f;
    const float y = static_cast<float>(pixel[1]) * 0.007843138f - 1.0f;
    const float z = static_cast<float>(pixel[2]) * 0.007843138f - 1.0f;
    const float length = std::sqrt(x * x + y * y + z * z);
    pixel[0] = toNormalByte(x / length * 127.5f);
    pixel[1] = toNormalByte(y / length * 127.5f);
    pixel[2] = toNormalByte(z / length * 0.5f * 255.0f);
}

bool substitute(Image& image, const char* operation, const u8 (&from)[3], const u8* to,
                u32 toChannels) {
    const auto reject = [&](const char* requirement) {
        base::log().log(base::logIO, base::logError,
                        "{}: this function can be called only on images whose {}", operation,
                        requirement);
        return false;
    };
    if (image.type() != ImageTypes::IT_UNSIGNED_BYTE)
        return reject("type() is IT_UNSIGNED_BYTE");
    if (image.format() != ImageTypes::kRGB && image.format() != ImageTypes::kRGBA)
        return reject("format() is either kRGBA or kRGB");
    if (!requirePixels(image, operation))
        return false;
    const u32 count = std::min(toChannels, image.channelCount());
    forEachPixel<u8>(image, [&](u8* pixel) {
        if (std::memcmp(pixel, from, 3) == 0)
            std::memcpy(pixel, to, count);
    });
    return true;
}

} // namespace

bool Image::invertColor() {
    return invertComponents(*this, "Image::invertColor()", 0, colorCountOf(*this));
}

bool Image::invertAlpha() {
    if (!hasAlpha())
        return true;
    const i32 index = alphaIndex();
    return invertComponents(*this, "Image::invertAlpha()", static_cast<u32>(std::max(index, 0)), 1);
}

bool Image::premultiplyAlpha() {
    if (!hasAlpha())
        return true;
    if (isCompressed())
        return false;
    if (type_ == IT_IMPLICIT || type_ >= typeCount) {
        logUnsupportedType("Image::premultiplyAlpha()");
        return false;
    }
    if (!requirePixels(*this, "Image::premultiplyAlpha()"))
        return false;
    const u32 last = channelCount() - 1;
    return dispatchType(type_, [&](auto component) {
        using T = decltype(component);
        forEachPixel<T>(*this, [=](T* pixel) {
            for (u32 c = 0; c < last; ++c)
                pixel[c] = product(pixel[c], pixel[last]);
        });
    });
}

bool Image::equalize() {
    if (!checkEqualizedFormat(*this))
        return false;
    if (!isEqualizedType(type_)) {
        base::log().log(base::logIO, base::logError,
                        "Image::equalize(): unsupported image type(). Types supported are "
                        "IT_UNSIGNED_BYTE, IT_UNSIGNED_SHORT, IT_UNSIGNED_INT, kFloat.");
        return false;
    }
    if (!requirePixels(*this, "Image::equalize()"))
        return false;
    equalizeBy(*this, [&](auto component) { return findLimits<decltype(component)>(*this); });
    return true;
}

bool Image::equalize(float value, float range, float centre, float scale) {
    if (!checkEqualizedFormat(*this))
        return false;
    if (!isEqualizedType(type_)) {
        base::log().log(base::logIO, base::logError,
                        "Image::equalize(): unsupported image type - '{}'.", typeName(type_));
        return false;
    }
    if (!requirePixels(*this, "Image::equalize()"))
        return false;
    const double middle = (double(value) - centre) / scale;
    const double reach = double(range) / (2 * double(scale));
    const Limits limits = {middle - reach, middle + reach};
    if (!limits.canStretch(1))
        return true;
    equalizeBy(*this, [&](auto component) {
        const double full = fullNumber<decltype(component)>;
        return Limits{limits.low * full, limits.high * full};
    });
    return true;
}

bool Image::clampNegative() {
    if (type_ == IT_UNSIGNED_BYTE || type_ == IT_UNSIGNED_SHORT || type_ == IT_UNSIGNED_INT ||
        isCompressed())
        return true;
    if (!requirePixels(*this, "Image::clampNegative()"))
        return false;
    const u32 channels = channelCount();
    return dispatchType(type_, [&](auto component) {
        using T = decltype(component);
        forEachPixel<T>(*this, [=](T* pixel) {
            std::replace_if(
                pixel, pixel + channels, [](T value) { return value < T(); }, T());
        });
    });
}

bool Image::renormalizeNormals() {
    if (type_ != IT_UNSIGNED_BYTE || (format_ != kRGB && format_ != kBGR))
        return false;
    if (!requirePixels(*this, "Image::renormalizeNormals()"))
        return false;
    forEachPixel<u8>(*this, renormalize);
    return true;
}

bool Image::substituteColorRGB_RGBA(const u8 (&from)[3], const u8 (&to)[4]) {
    return substitute(*this, "Image::substituteColorRGB_RGBA()", from, to, 4);
}

bool Image::substituteColorRGB_RGB(const u8 (&from)[3], const u8 (&to)[3]) {
    return substitute(*this, "Image::substituteColorRGB_RGB()", from, to, 3);
}

} // namespace iio
