#include "i_image_types.h"

namespace iio {

namespace {

constexpr FormatInfo formats[ImageTypes::formatCount] = {
    {"rgb", 3, false, 0, 0, -1, 0},
    {"rgba", 4, true, 0, 0, 3, 0},
    {"bgr", 3, false, 0, 0, -1, 0},
    {"bgra", 4, true, 0, 0, 3, 0},
    {"rg", 2, false, 0, 0, -1, 0},
    {"red", 1, false, 0, 0, -1, 0},
    {"green", 1, false, 0, 0, -1, 0},
    {"blue", 1, false, 0, 0, -1, 0},
    {"alpha", 1, true, 0, 0, 0, 0},
    {"luminance", 1, false, 0, 0, -1, 0},
    {"luminance_alpha", 2, true, 0, 0, 1, 0},
    {"dxt1", 3, false, 4, 8, -1, 0},
    {"dxt1", 4, true, 4, 8, -1, 1},
    {"dxt3", 4, true, 8, 16, -1, 4},
    {"dxt5", 4, true, 8, 16, -1, 8},
    {"latc", 1, false, 4, 8, -1, 0},
    {"latc", 2, false, 8, 16, -1, 0},
    {"rgtc", 1, false, 4, 8, -1, 0},
    {"rgtc", 2, true, 8, 16, -1, 8},
    {"bc6h_signed", 3, false, 8, 16, -1, 0},
    {"bc6h_unsigned", 3, false, 8, 16, -1, 0},
    {"bc7", 4, true, 8, 16, -1, 8},
    {"etc1", 3, false, 4, 0, -1, 0},
    {"etc2 rgb", 3, false, 4, 8, -1, 0},
    {"etc2 rgbm", 4, true, 4, 8, -1, 1},
    {"etc2 rgba", 4, true, 8, 16, -1, 8},
    {"etc2 r", 1, false, 8, 8, -1, 0},
    {"etc2 rg", 2, false, 16, 16, -1, 0},
};
constexpr FormatInfo invalidFormat = {"invalid", 0, false, 0, 0, -1, 0};

struct TypeRow {
    const char* name;
    u32 bits;
};
constexpr TypeRow types[ImageTypes::typeCount] = {
    {"Implicit", 0}, {"ubyte", 8}, {"byte", 8},  {"ushort", 16}, {"short", 16},
    {"uint", 32},    {"int", 32},  {"half", 16}, {"float", 32},  {"double", 64},
};

/// The product, or the greatest number where it is beyond that.
u64 saturatingProduct(u64 a, u64 b) noexcept {
    u64 product;
    return __builtin_mul_overflow(a, b, &product) ? ~u64(0) : product;
}

} // namespace

const FormatInfo& formatInfo(u8 format) noexcept {
    return format < ImageTypes::formatCount ? formats[format] : invalidFormat;
}

const char* typeName(u8 type) noexcept {
    return type < ImageTypes::typeCount ? types[type].name : "invalid";
}

u32 componentBits(u8 type) noexcept {
    return type < ImageTypes::typeCount ? types[type].bits : 0;
}

u32 bitsPerPixel(u8 type, u8 format) noexcept {
    const FormatInfo& info = formatInfo(format);
    return isCompressed(format) ? info.blockBits : componentBits(type) * info.channelCount;
}

u64 rowByteSize(u32 width, u32 alignment, u8 format, u8 type) noexcept {
    const u64 bytes = (u64(bitsPerPixel(type, format)) * width + 7) / 8;
    return (bytes + alignment - 1) / alignment * alignment;
}

u64 memorySize(u32 width, u32 height, u32 depth, u32 alignment, u8 format, u8 type,
               bool isCube) noexcept {
    if (alignment != 1 && alignment != 2 && alignment != 8)
        alignment = 4;
    u64 rows = height;
    u64 rowBytes = rowByteSize(width, alignment, format, type);
    if (isCompressed(format)) {
        const u64 columns = (u64(width) + 3) / 4 * 4;
        rows = (rows + 3) / 4 * 4;
        const u64 bytes = (bitsPerPixel(type, format) * columns + 7) / 8;
        rowBytes = (bytes + alignment - 1) / alignment * alignment;
    }
    u64 bytes = saturatingProduct(saturatingProduct(rowBytes, rows), depth);
    if (bytes < formatInfo(format).leastByteSize)
        bytes = formatInfo(format).leastByteSize;
    return isCube ? saturatingProduct(bytes, 6) : bytes;
}

} // namespace iio
