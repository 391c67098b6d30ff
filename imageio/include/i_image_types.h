#pragma once

#include "b_containers.h"
#include "b_refcnt.h"
#include "b_types.h"

/// Pictures: in memory, converted, resampled, sampled, read from and written to files.
namespace iio {

using base::i16;
using base::i32;
using base::i64;
using base::i8;
using base::ref;
using base::string;
using base::string_view;
using base::u16;
using base::u32;
using base::u64;
using base::u8;
using base::vector;

/// What a pixel is made of. Enumerators are the values that are stored.
struct ImageTypes {
    /// Type of a component.
    enum Type : u8 {
        IT_IMPLICIT = 0, ///< of block compressed formats alone
        IT_UNSIGNED_BYTE = 1,
        IT_BYTE = 2,
        IT_UNSIGNED_SHORT = 3,
        IT_SHORT = 4,
        IT_UNSIGNED_INT = 5,
        IT_INT = 6,
        kHalf = 7,
        kFloat = 8,
        kDouble = 9,
    };

    /// Components of a pixel in their order; from `kDXT1` on, the way a block of 4 x 4 is packed.
    enum Format : u8 {
        kRGB = 0,
        kRGBA = 1,
        kBGR = 2,
        kBGRA = 3,
        kRG = 4,
        kRed = 5,
        kGreen = 6,
        kBlue = 7,
        kAlpha = 8,
        kLuminance = 9,
        kLuminanceAlpha = 10,
        kDXT1 = 11,
        kDXT1A = 12, ///< with one bit of alpha
        kDXT3 = 13,
        kDXT5 = 14,
        kLATC1 = 15,
        kLATC2 = 16,
        kRGTC1 = 17,
        kRGTC2 = 18,
        kBC6HSigned = 19,
        kBC6HUnsigned = 20,
        kBC7 = 21,
        kETC1 = 22,
        kETC2RGB = 23,
        kETC2RGBM = 24, ///< with one bit of alpha
        kETC2RGBA = 25,
        kETC2R = 26,
        kETC2RG = 27,
    };

    static constexpr u32 typeCount = 10;
    static constexpr u32 formatCount = 28;
};

/// What is known of a format. Alpha and the sizes of "etc2 r" and "etc2 rg" stand as the files
/// of the framework have always taken them.
struct FormatInfo {
    const char* name;
    u8 channelCount;
    bool hasAlpha;
    u8 blockBits;     ///< bits a pixel of a block compressed format, else 0
    u8 leastByteSize; ///< of one level
    i8 alphaIndex;    ///< component that holds alpha; -1 for none and for compressed formats
    u8 alphaBits;     ///< of a compressed format; else those of the component
};

/// For a format below `ImageTypes::formatCount`; beyond it, a row named "invalid" without content.
const FormatInfo& formatInfo(u8 format) noexcept;
/// "invalid" beyond the known types.
const char* typeName(u8 type) noexcept;
/// Bits of a component; 0 for `IT_IMPLICIT` and unknown types.
u32 componentBits(u8 type) noexcept;
u32 bitsPerPixel(u8 type, u8 format) noexcept;
constexpr bool isCompressed(u8 format) noexcept {
    return format > ImageTypes::kLuminanceAlpha;
}

/// Bytes of a row: whole bytes, rounded up to `alignment`.
u64 rowByteSize(u32 width, u32 alignment, u8 format, u8 type) noexcept;
/// Bytes of one level. Block compressed formats are sized in whole blocks; six faces for a cube
/// map. An alignment other than 1, 2, 4 or 8 counts as 4. More than 2^64 - 1 gives 2^64 - 1.
u64 memorySize(u32 width, u32 height, u32 depth, u32 alignment, u8 format, u8 type,
               bool isCube) noexcept;

} // namespace iio
