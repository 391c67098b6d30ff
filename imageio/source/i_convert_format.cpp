#include "i_block_decode.h"
#include "i_component.h"
#include "i_operation.h"

#include "b_log.h"

#if defined(__x86_64__)
#include <tmmintrin.h>
#endif

namespace iio {

namespace {

// Formats of three or four components that differ in their order and in alpha alone.

template <class T, u32 sourceChannels, u32 targetChannels, bool swaps>
void convertColors(const T* source, T* target, u32 width, T full) {
    for (u32 x = 0; x < width; ++x, source += sourceChannels, target += targetChannels) {
        target[0] = source[swaps ? 2 : 0];
        target[1] = source[1];
        target[2] = source[swaps ? 0 : 2];
        if constexpr (targetChannels == 4)
            target[3] = sourceChannels == 4 ? source[3] : full;
    }
}

#if defined(__x86_64__)

/// For `_mm_shuffle_epi8`: where the bytes of four pixels of the target come from; 128 is zero.
template <u32 sourceChannels, u32 targetChannels, bool swaps>
__attribute__((target("ssse3"))) __m128i shuffleOrder() {
    alignas(16) u8 order[16];
    for (u32 i = 0; i < 16; ++i) {
        const u32 pixel = i / targetChannels, c = i % targetChannels;
        const u32 from = swaps && c < 3 ? 2 - c : c;
        const bool exists = pixel < 4 && from < sourceChannels;
        order[i] = static_cast<u8>(exists ? pixel * sourceChannels + from : 128);
    }
    return _mm_load_si128(reinterpret_cast<const __m128i*>(order));
}

/// As `convertColors` for bytes, four pixels at a time, and returns how many it did. A step reads
/// and writes 16 bytes, which of three channels is more than four pixels; what it writes too much
/// the next one replaces, so it ends where the row would be exceeded.
template <u32 sourceChannels, u32 targetChannels, bool swaps>
__attribute__((target("ssse3"))) u32 shuffleColors(const u8* source, u8* target, u32 width,
                                                   u8 full) {
    constexpr u32 leastLeft = sourceChannels == 3 || targetChannels == 3 ? 6 : 4;
    const __m128i order = shuffleOrder<sourceChannels, targetChannels, swaps>();
    const bool addsAlpha = sourceChannels == 3 && targetChannels == 4;
    const __m128i alpha = _mm_set1_epi32(addsAlpha ? i32(u32(full) << 24) : 0);
    u32 x = 0;
    for (; width - x >= leastLeft; x += 4, source += 4 * sourceChannels) {
        const __m128i in = _mm_loadu_si128(reinterpret_cast<const __m128i*>(source));
        const __m128i out = _mm_or_si128(_mm_shuffle_epi8(in, order), alpha);
        _mm_storeu_si128(reinterpret_cast<__m128i*>(target), out);
        target += 4 * targetChannels;
    }
    return x;
}

template <u32 sourceChannels, u32 targetChannels, bool swaps>
void convertColorBytes(const u8* source, u8* target, u32 width, u8 full) {
    static const bool canShuffle = __builtin_cpu_supports("ssse3");
    u32 done = 0;
    if (canShuffle)
        done = shuffleColors<sourceChannels, targetChannels, swaps>(source, target, width, full);
    convertColors<u8, sourceChannels, targetChannels, swaps>(source + u64(done) * sourceChannels,
                                                             target + u64(done) * targetChannels,
                                                             width - done, full);
}

#else

template <u32 sourceChannels, u32 targetChannels, bool swaps>
void convertColorBytes(const u8* source, u8* target, u32 width, u8 full) {
    convertColors<u8, sourceChannels, targetChannels, swaps>(source, target, width, full);
}

#endif

template <class T>
using ColorRow = void (*)(const T*, T*, u32, T);

template <class T, u32 sourceChannels, u32 targetChannels, bool swaps>
void convertColorRow(const T* source, T* target, u32 width, T full) {
    if constexpr (sizeof(T) == 1)
        convertColorBytes<sourceChannels, targetChannels, swaps>(
            reinterpret_cast<const u8*>(source), reinterpret_cast<u8*>(target), width,
            static_cast<u8>(full));
    else
        convertColors<T, sourceChannels, targetChannels, swaps>(source, target, width, full);
}

template <class T, bool swaps>
ColorRow<T> findColorRow(u32 sourceChannels, u32 targetChannels) {
    if (sourceChannels == 3)
        return targetChannels == 3 ? convertColorRow<T, 3, 3, swaps>
                                   : convertColorRow<T, 3, 4, swaps>;
    return targetChannels == 3 ? convertColorRow<T, 4, 3, swaps> : convertColorRow<T, 4, 4, swaps>;
}

// All other pairs of formats: component by component.

enum Channel { red, green, blue, alpha, luminance, channelKinds };

/// Where the components of the plain formats stand in a pixel; -1 for none.
struct Layout {
    i8 position[channelKinds];
};
constexpr Layout layouts[] = {
    {{0, 1, 2, -1, -1}},   // kRGB
    {{0, 1, 2, 3, -1}},    // kRGBA
    {{2, 1, 0, -1, -1}},   // kBGR
    {{2, 1, 0, 3, -1}},    // kBGRA
    {{0, 1, -1, -1, -1}},  // kRG
    {{0, -1, -1, -1, -1}}, // kRed
    {{-1, 0, -1, -1, -1}}, // kGreen
    {{-1, -1, 0, -1, -1}}, // kBlue
    {{-1, -1, -1, 0, -1}}, // kAlpha
    {{-1, -1, -1, -1, 0}}, // kLuminance
    {{-1, -1, -1, 1, 0}},  // kLuminanceAlpha
};

/// What a component of the target is made of.
struct Origin {
    enum Kind { zero, full, copy, mean, weightedMean };
    Kind kind = zero;
    u32 index = 0; ///< of the component that is copied
};

Origin copyOf(i8 position) {
    return {Origin::copy, static_cast<u32>(position)};
}

Origin originOfLuminance(const Layout& source, bool weighted) {
    if (source.position[luminance] >= 0)
        return copyOf(source.position[luminance]);
    u32 colorCount = 0;
    i8 last = -1;
    for (Channel channel : {red, green, blue}) {
        if (source.position[channel] >= 0) {
            last = source.position[channel];
            ++colorCount;
        }
    }
    if (colorCount == 1)
        return copyOf(last);
    // Two colours make no grey.
    return {colorCount != 3 ? Origin::zero : weighted ? Origin::weightedMean : Origin::mean, 0};
}

Origin originOf(Channel channel, const Layout& source, bool weighted) {
    if (channel == luminance)
        return originOfLuminance(source, weighted);
    if (source.position[channel] >= 0)
        return copyOf(source.position[channel]);
    if (channel == alpha)
        return {Origin::full, 0};
    return source.position[luminance] >= 0 ? copyOf(source.position[luminance]) : Origin();
}

template <class T>
constexpr T fullValue() {
    if constexpr (isIntegerComponent<T>)
        return std::numeric_limits<T>::max();
    else
        return static_cast<T>(1.0f);
}

/// In float, on the component's own scale.
template <class T>
T greyOf(const T* pixel, const Layout& layout, bool weighted) {
    const auto r = static_cast<float>(pixel[layout.position[red]]);
    const auto g = static_cast<float>(pixel[layout.position[green]]);
    const auto b = static_cast<float>(pixel[layout.position[blue]]);
    const float grey = weighted ? 0.299f * r + 0.587f * g + 0.114f * b : (r + g + b) * 0.33333334f;
    if constexpr (isIntegerComponent<T>)
        return base::saturate<T>(grey);
    else
        return static_cast<T>(grey);
}

/// One component of the pixels of a row, from `out` on.
template <class T>
void convertComponent(const Image& source, const T* in, u32 targetChannels, T* out,
                      const Origin& origin) {
    const u32 sourceChannels = source.channelCount();
    const Layout& layout = layouts[source.format()];
    switch (origin.kind) {
    case Origin::zero:
    case Origin::full:
        for (u32 x = 0; x < source.width(); ++x, out += targetChannels)
            *out = origin.kind == Origin::full ? fullValue<T>() : T();
        break;
    case Origin::copy:
        in += origin.index;
        for (u32 x = 0; x < source.width(); ++x, in += sourceChannels, out += targetChannels)
            *out = *in;
        break;
    case Origin::mean:
    case Origin::weightedMean:
        for (u32 x = 0; x < source.width(); ++x, in += sourceChannels, out += targetChannels)
            *out = greyOf(in, layout, origin.kind == Origin::weightedMean);
        break;
    }
}

template <class T>
void convertComponents(const Image& source, Image& target, bool weighted) {
    const Layout& to = layouts[target.format()];
    const u32 channels = target.channelCount();
    Origin origins[4];
    for (Channel channel : {red, green, blue, alpha, luminance}) {
        if (to.position[channel] >= 0)
            origins[to.position[channel]] = originOf(channel, layouts[source.format()], weighted);
    }
    for (u64 y = 0; y < source.rowCount(); ++y) {
        const T* in = reinterpret_cast<const T*>(source.row(y));
        T* out = reinterpret_cast<T*>(target.row(y));
        for (u32 c = 0; c < channels; ++c)
            convertComponent(source, in, channels, out + c, origins[c]);
    }
}

bool isSwapped(u8 format) {
    return format == ImageTypes::kBGR || format == ImageTypes::kBGRA;
}

template <class T>
void convertPixels(const Image& source, Image& target, bool weighted) {
    if (source.format() > ImageTypes::kBGRA || target.format() > ImageTypes::kBGRA)
        return convertComponents<T>(source, target, weighted);
    const bool swaps = isSwapped(source.format()) != isSwapped(target.format());
    const auto findRow = swaps ? findColorRow<T, true> : findColorRow<T, false>;
    const ColorRow<T> convertRow = findRow(source.channelCount(), target.channelCount());
    for (u64 y = 0; y < source.rowCount(); ++y)
        convertRow(reinterpret_cast<const T*>(source.row(y)), reinterpret_cast<T*>(target.row(y)),
                   source.width(), fullValue<T>());
}

ref<Image> reject(const char* what) {
    base::log().log(base::logIO, base::logError, "Image::convertFormat(): unsupported {}.", what);
    return {};
}

} // namespace

ref<Image> Image::convertFormat(u8 targetFormat, bool weighted, u32) {
    if (type_ >= typeCount || (type_ == IT_IMPLICIT && !isCompressed()))
        return reject("source image type");
    if (targetFormat == format_)
        return ref<Image>(this);
    if (isCompressed() && !findBlockFormat(format_))
        return reject("source image format");
    if (iio::isCompressed(targetFormat))
        return reject("destination image format");
    if (!requirePixels(*this, "Image::convertFormat()"))
        return {};

    if (isCompressed()) {
        const ref<Image> plain = decodeBlocks(*this);
        return plain ? plain->convertFormat(targetFormat, weighted) : plain;
    }
    ref<Image> target = makeLike(*this, width_, height_, byteAlignment_, targetFormat, type_);
    if (target)
        dispatchType(type_, [&](auto component) {
            convertPixels<decltype(component)>(*this, *target, weighted);
        });
    return target;
}

ref<Image> Image::toGreyscale(bool weighted) {
    switch (format_) {
    case kAlpha:
    case kLuminance:
    case kLuminanceAlpha:
    case kLATC1:
    case kRGTC1:
        return ref<Image>(this);
    default:
        return convertFormat(hasAlpha() ? kLuminanceAlpha : kLuminance, weighted);
    }
}

} // namespace iio
