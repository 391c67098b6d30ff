#include "i_component.h"
#include "i_operation.h"

#include "b_log.h"

#include <algorithm>
#include <cmath>

namespace iio {

namespace {

// The curve of IEC 61966-2-1, on numbers of 0..1 and beyond.

float encodeSRGB(float value) {
    if (value <= 0.0f)
        return 0.0f;
    if (value <= 0.0031308f)
        return value * 12.92f;
    // In float this would take white to the number below 1, and that to 254.
    return static_cast<float>(1.055 * double(std::pow(value, 1.0f / 2.4f)) - 0.055);
}

float decodeSRGB(float value) {
    if (value <= 0.04045f)
        return value * 0.07739938f;
    return std::pow(value * 0.94786733f + 0.052132703f, 2.4f);
}

using Curve = float (*)(float);

/// What a curve makes of all components of a type of 8 or 16 bits, by their bits.
template <class S, Curve curve>
const vector<float>& curveTable() {
    static const vector<float> table = [] {
        using Bits = std::conditional_t<sizeof(S) == 1, u8, u16>;
        vector<float> numbers(size_t(1) << 8 * sizeof(S));
        for (u32 i = 0; i < numbers.size(); ++i)
            numbers[i] = curve(toNumber(std::bit_cast<S>(static_cast<Bits>(i))));
        return numbers;
    }();
    return table;
}

template <class S>
void readPlain(const u8* source, float* numbers, u32 pixelCount, u32 channels, u32) {
    const S* components = reinterpret_cast<const S*>(source);
    std::transform(components, components + pixelCount * channels, numbers, toNumber<S>);
}

/// Alpha, the components of a pixel from `colorCount` on, does not follow the curve.
template <class S, Curve curve>
void readCurved(const u8* source, float* numbers, u32 pixelCount, u32 channels, u32 colorCount) {
    const S* components = reinterpret_cast<const S*>(source);
    for (u32 i = 0; i < pixelCount; ++i, components += channels, numbers += channels) {
        for (u32 c = 0; c < colorCount; ++c)
            numbers[c] = curve(toNumber(components[c]));
        for (u32 c = colorCount; c < channels; ++c)
            numbers[c] = toNumber(components[c]);
    }
}

template <class S, Curve curve>
void readTabulated(const u8* source, float* numbers, u32 pixelCount, u32 channels, u32 colorCount) {
    using Bits = std::conditional_t<sizeof(S) == 1, u8, u16>;
    const float* table = curveTable<S, curve>().data();
    const S* components = reinterpret_cast<const S*>(source);
    for (u32 i = 0; i < pixelCount; ++i, components += channels, numbers += channels) {
        for (u32 c = 0; c < colorCount; ++c)
            numbers[c] = table[std::bit_cast<Bits>(components[c])];
        for (u32 c = colorCount; c < channels; ++c)
            numbers[c] = toNumber(components[c]);
    }
}

template <class T>
void writeNumbers(const float* numbers, u8* target, u32 count) {
    std::transform(numbers, numbers + count, reinterpret_cast<T*>(target), fromNumber<T>);
}

using Reader = void (*)(const u8*, float*, u32, u32, u32);
using Writer = void (*)(const float*, u8*, u32);

template <class S, Curve curve>
Reader curvedReader() {
    if constexpr (sizeof(S) <= 2)
        return readTabulated<S, curve>;
    else
        return readCurved<S, curve>;
}

Reader findReader(u8 type, i32 gammaMode) {
    Reader reader = nullptr;
    dispatchType(type, [&](auto component) {
        using S = decltype(component);
        if (gammaMode == Image::gammaEncode)
            reader = curvedReader<S, encodeSRGB>();
        else if (gammaMode == Image::gammaDecode)
            reader = curvedReader<S, decodeSRGB>();
        else
            reader = readPlain<S>;
    });
    return reader;
}

Writer findWriter(u8 type) {
    Writer writer = nullptr;
    dispatchType(type, [&](auto component) { writer = writeNumbers<decltype(component)>; });
    return writer;
}

/// By way of a few numbers at a time, which stay in the nearest cache.
void convertRows(const Image& source, Image& target, Reader read, Writer write) {
    constexpr u32 pixelsAtATime = 256;
    float numbers[pixelsAtATime * 4];
    const u32 channels = source.channelCount();
    const u32 colorCount = colorCountOf(source);
    const u32 sourceBytes = bitsPerPixel(source.type(), source.format()) / 8;
    const u32 targetBytes = bitsPerPixel(target.type(), target.format()) / 8;
    for (u64 y = 0; y < source.rowCount(); ++y) {
        for (u32 x = 0; x < source.width();) {
            const u32 count = std::min(pixelsAtATime, source.width() - x);
            read(source.row(y) + u64(x) * sourceBytes, numbers, count, channels, colorCount);
            write(numbers, target.row(y) + u64(x) * targetBytes, count * channels);
            x += count;
        }
    }
}

/// The numbers that pass through float, in integers: 65535 is 255 * 257.
void widenRow(const u8* source, u16* target, u64 count) {
    for (u64 i = 0; i < count; ++i)
        target[i] = static_cast<u16>(source[i] * 257);
}

/// As `fromNumber(toNumber())`, without its tests, which keep a compiler from doing several at
/// once: no product leaves 0..255. Division by 257 differs at eight components.
void narrowRow(const u16* source, u8* target, u64 count) {
    for (u64 i = 0; i < count; ++i)
        target[i] = static_cast<u8>(static_cast<i32>(toNumber(source[i]) * 255.0f));
}

/// Whether the types are two for which there is a quick way without a curve; then takes it.
bool convertBytesAndShorts(const Image& source, Image& target) {
    const u64 count = u64(source.width()) * source.channelCount();
    const bool widens = source.type() == ImageTypes::IT_UNSIGNED_BYTE &&
                        target.type() == ImageTypes::IT_UNSIGNED_SHORT;
    const bool narrows = source.type() == ImageTypes::IT_UNSIGNED_SHORT &&
                         target.type() == ImageTypes::IT_UNSIGNED_BYTE;
    for (u64 y = 0; (widens || narrows) && y < source.rowCount(); ++y) {
        if (widens)
            widenRow(source.row(y), reinterpret_cast<u16*>(target.row(y)), count);
        else
            narrowRow(reinterpret_cast<const u16*>(source.row(y)), target.row(y), count);
    }
    return widens || narrows;
}

/// A double is linear as a target, and makes its source so, but is not as a source of its own.
bool isLinearSource(const Image& source, u8 targetType, string_view colorSpace) {
    if (colorSpace == "linear")
        return true;
    if (colorSpace == "srgb")
        return false;
    if (colorSpace == "gamma") {
        const float* gamma = source.attributes().findAttribute<float>(imageAttributes().n_Gamma);
        if (gamma && std::abs(*gamma - 1.0f) > 0.1f)
            return false;
    }
    return source.type() == ImageTypes::kHalf || source.type() == ImageTypes::kFloat ||
           targetType == ImageTypes::kDouble;
}

i32 findGammaMode(const Image& source, u8 targetType) {
    const string* attribute =
        source.attributes().findAttribute<string>(imageAttributes().n_ColorSpace);
    const string_view colorSpace = attribute ? string_view(*attribute) : string_view();
    const bool fromLinear = isLinearSource(source, targetType, colorSpace);
    const bool toLinear = targetType >= ImageTypes::kHalf;
    if (colorSpace == "ignore" || fromLinear == toLinear)
        return Image::gammaNone;
    return fromLinear ? Image::gammaEncode : Image::gammaDecode;
}

/// What the picture says of itself must hold once a curve was applied, or the next conversion or
/// a file would apply it again.
void renameColorSpace(Image& image, i32 gammaMode) {
    const base::name_id name = imageAttributes().n_ColorSpace;
    const string* colorSpace = image.attributes().findAttribute<string>(name);
    if (colorSpace && *colorSpace != "ignore")
        image.attributes().attribute<string>(name) =
            gammaMode == Image::gammaEncode ? "srgb" : "linear";
}

ref<Image> reject(const char* what) {
    base::log().log(base::logIO, base::logError, "Image::convertType(): unsupported {}.", what);
    return {};
}

} // namespace

ref<Image> Image::convertType(u8 targetType, i32, i32 gammaMode) {
    if (targetType == type_)
        return ref<Image>(this);
    if (type_ == IT_IMPLICIT || type_ >= typeCount)
        return reject("source image type");
    if (targetType == IT_IMPLICIT || targetType >= typeCount)
        return reject("target image type");
    if (isCompressed())
        return reject("image format");
    if (!requirePixels(*this, "Image::convertType()"))
        return {};

    if (gammaMode == gammaAutomatic)
        gammaMode = findGammaMode(*this, targetType);
    ref<Image> target = makeLike(*this, width_, height_, 1, format_, targetType);
    if (!target)
        return {};
    const bool hasCurve = gammaMode == gammaEncode || gammaMode == gammaDecode;
    if (hasCurve || !convertBytesAndShorts(*this, *target))
        convertRows(*this, *target, findReader(type_, gammaMode), findWriter(targetType));
    if (hasCurve)
        renameColorSpace(*target, gammaMode);
    return target;
}

} // namespace iio
