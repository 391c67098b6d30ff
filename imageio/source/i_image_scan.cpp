#include "i_component.h"
#include "i_operation.h"

#include "b_log.h"

#include <algorithm>

namespace iio {

namespace {

/// True if component `index` of a pixel of the rows is below `full`.
template <class T>
bool findBelow(const Image& image, u32 index, T full) {
    const u32 channels = image.channelCount();
    for (u64 y = 0; y < image.rowCount(); ++y) {
        const T* alpha = reinterpret_cast<const T*>(image.row(y)) + index;
        for (u32 x = 0; x < image.width(); ++x, alpha += channels) {
            if (*alpha < full)
                return true;
        }
    }
    return false;
}

template <class T>
bool findNegative(const Image& image) {
    const u64 count = u64(image.width()) * image.channelCount();
    for (u64 y = 0; y < image.rowCount(); ++y) {
        const T* values = reinterpret_cast<const T*>(image.row(y));
        if (std::any_of(values, values + count, [](T value) { return value < T(); }))
            return true;
    }
    return false;
}

} // namespace

bool Image::checkTransparency() const {
    if (!hasAlpha())
        return false;
    if (isCompressed())
        return true;
    if (!requirePixels(*this, "Image::checkTransparency()"))
        return false;
    const auto index = static_cast<u32>(alphaIndex());
    switch (type_) {
    case IT_UNSIGNED_BYTE:
        return findBelow<u8>(*this, index, 255);
    case IT_UNSIGNED_SHORT:
        return findBelow<u16>(*this, index, 65535);
    case IT_UNSIGNED_INT:
        return findBelow<u32>(*this, index, 4294967295u);
    case kFloat:
        return findBelow<float>(*this, index, 1.0f);
    default:
        base::log().log(base::logIO, base::logError,
                        "Image::checkTransparency(): unsupported image type(). Types supported are "
                        "IT_UNSIGNED_BYTE, IT_UNSIGNED_SHORT, IT_UNSIGNED_INT, kFloat.");
        return false;
    }
}

bool Image::hasNegativeValues() const {
    if (isCompressed())
        return false;
    switch (type_) {
    case IT_BYTE:
    case IT_SHORT:
    case IT_INT:
        return true;
    case kHalf:
        return requirePixels(*this, "Image::hasNegativeValues()") && findNegative<half>(*this);
    case kFloat:
        return requirePixels(*this, "Image::hasNegativeValues()") && findNegative<float>(*this);
    case kDouble:
        return requirePixels(*this, "Image::hasNegativeValues()") && findNegative<double>(*this);
    default:
        return false;
    }
}

} // namespace iio
