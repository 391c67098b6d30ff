#include "i_png.h"

#include "b_byte_order.h"
#include "b_log.h"
#include "b_string_convert.h"

#include <bit>
#include <cstdlib>
#include <limits>

namespace iio {

namespace {

constexpr char operation[] = "png load";

// libpng merely warns of a chunk beyond its limit of 8 MB, then allocates and clears what it
// claims. This suffices for that limit and for a row of the longest pictures.
constexpr std::size_t greatestAllocation = std::size_t(1) << 24;

// Of chunks that are kept, such as texts. Each may unpack to 8 MB, and no picture needs more.
constexpr u32 greatestChunkCount = 32;

png_voidp allocate(png_structp, std::size_t byteCount) {
    return byteCount <= greatestAllocation ? std::malloc(byteCount) : nullptr;
}

void release(png_structp, png_voidp block) {
    std::free(block);
}

/// An open file, and what libpng holds of it.
struct PngReadFile : base::NonCopyable {
    explicit PngReadFile(base::Stream& from) : stream(from), source(from) {
        png = png_create_read_struct_2(PNG_LIBPNG_VER_STRING, &messages, pngErrorCallback,
                                       pngWarningCallback, nullptr, allocate, release);
        info = png ? png_create_info_struct(png) : nullptr;
        if (!info) {
            png_destroy_read_struct(&png, &info, nullptr);
            throw std::bad_alloc();
        }
    }
    ~PngReadFile() { png_destroy_read_struct(&png, &info, nullptr); }

    base::Stream& stream;
    StreamReader source;
    CodecMessages messages;
    png_structp png = nullptr;
    png_infop info = nullptr;
    int passCount = 1;
};

void readBytes(png_structp png, png_bytep target, std::size_t byteCount) {
    auto& source = *static_cast<StreamReader*>(png_get_io_ptr(png));
    if (!source.read(target, byteCount))
        failPng(png, source.fault().empty() ? "the file ends too early" : source.fault().c_str());
}

/// Looks at the sides before libpng does, which has no message of its own for each.
bool checkSides(PngReadFile& file) {
    constexpr std::size_t sidesAt = 16; // Signature, chunk length and chunk name come first.
    file.source.fill();
    if (file.source.size() < sidesAt + 8)
        return true;
    const u32 width = base::readBigEndian<u32>(file.source.data() + sidesAt);
    const u32 height = base::readBigEndian<u32>(file.source.data() + sidesAt + 4);
    const auto check = [&](u32 side, u32 limit, const char* message) {
        if (side != 0 && side <= limit)
            return true;
        base::log().log(base::logIO, base::logError, message, file.stream.name(), side);
        return false;
    };
    return check(width, PNG_USER_WIDTH_MAX, "png load |{}| invalid image width reported {}") &&
           check(height, PNG_USER_HEIGHT_MAX, "png load |{}| invalid image height reported {}");
}

/// Reads up to the pixels and chooses how these come: in whole bytes, the palette resolved,
/// transparency as alpha.
bool open(PngReadFile& file) {
    if (!checkSides(file))
        return false;
    const bool isOpen = attemptPng(file.png, [&] {
        png_set_chunk_cache_max(file.png, greatestChunkCount);
        png_set_read_fn(file.png, &file.source, readBytes);
        png_read_info(file.png, file.info);
        png_set_expand(file.png);
        png_set_packing(file.png);
        if constexpr (std::endian::native == std::endian::little)
            png_set_swap(file.png);
        file.passCount = png_set_interlace_handling(file.png);
        png_read_update_info(file.png, file.info);
    });
    if (!isOpen)
        file.messages.logFault(operation, file.stream);
    return isOpen;
}

u8 formatOf(const PngReadFile& file) {
    constexpr u8 formats[] = {ImageTypes::kLuminance, ImageTypes::kLuminanceAlpha, ImageTypes::kRGB,
                              ImageTypes::kRGBA};
    return formats[png_get_channels(file.png, file.info) - 1];
}

u8 typeOf(const PngReadFile& file) {
    const bool isShort = png_get_bit_depth(file.png, file.info) == 16;
    return isShort ? ImageTypes::IT_UNSIGNED_SHORT : ImageTypes::IT_UNSIGNED_BYTE;
}

/// Text of ISO 8859-1, whose characters are the first 256 of Unicode.
string fromLatin1(string_view text) {
    string utf8;
    for (char character : text) {
        const auto code = static_cast<u8>(character);
        if (code < 0x80) {
            utf8 += character;
        } else {
            utf8 += static_cast<char>(0xC0 | code >> 6);
            utf8 += static_cast<char>(0x80 | (code & 0x3F));
        }
    }
    return utf8;
}

void describeTexts(const PngReadFile& file, base::AttribMap& attributes) {
    png_textp texts = nullptr;
    int count = 0;
    png_get_text(file.png, file.info, &texts, &count);
    for (const png_text& text : std::span(texts, static_cast<std::size_t>(count))) {
        for (const PngKeyword& row : pngKeywords()) {
            if (string_view(text.key) != row.keyword || !text.text || text.text[0] == 0 ||
                attributes.findAttribute<string>(row.attribute))
                continue;
            const bool isUtf8 = text.compression >= PNG_ITXT_COMPRESSION_NONE;
            attributes.attribute<string>(row.attribute) =
                isUtf8 ? base::toValidUtf8(text.text) : fromLatin1(text.text);
        }
    }
}

void describeColour(const PngReadFile& file, base::AttribMap& attributes) {
    const ImageAttributes& names = imageAttributes();
    int intent;
    png_fixed_point gamma;
    if (png_get_sRGB(file.png, file.info, &intent) != 0) {
        attributes.attribute<string>(names.n_ColorSpace) = "srgb";
    } else if (png_get_gAMA_fixed(file.png, file.info, &gamma) != 0 && gamma > 0) {
        // Even a file gamma of 1 is not "linear": that would be taken to ask for the sRGB curve
        // on the way to bytes.
        attributes.attribute<string>(names.n_ColorSpace) = "gamma";
        attributes.attribute<float>(names.n_Gamma) = PNG_FP_1 / static_cast<float>(gamma);
    }

    png_charp name;
    int compression;
    png_bytep profile;
    png_uint_32 byteCount;
    if (png_get_iCCP(file.png, file.info, &name, &compression, &profile, &byteCount) != 0)
        attributes.vecAttribute<u8>(names.n_ICCProfile).assign(profile, profile + byteCount);
}

void describeDensity(const PngReadFile& file, base::AttribMap& attributes) {
    constexpr u16 metre = 4;
    const ImageAttributes& names = imageAttributes();
    png_uint_32 x, y;
    int unit;
    if (png_get_pHYs(file.png, file.info, &x, &y, &unit) == 0 || unit != PNG_RESOLUTION_METER)
        return;
    attributes.attribute<u16>(names.n_ResolutionUnit) = metre;
    attributes.attribute<float>(names.n_XResolution) = static_cast<float>(x);
    attributes.attribute<float>(names.n_YResolution) = static_cast<float>(y);
}

void describeDate(const PngReadFile& file, base::AttribMap& attributes) {
    png_timep time;
    if (png_get_tIME(file.png, file.info, &time) == 0 ||
        time->year > std::numeric_limits<i16>::max())
        return;
    auto& date = attributes.attribute<base::DateTime>(imageAttributes().n_DateCreated);
    date.year = static_cast<i16>(time->year);
    date.month = time->month;
    date.day = time->day;
    date.hour = time->hour;
    date.minute = time->minute;
    date.second = time->second;
}

/// The place of the picture on a larger canvas; the edges belong to it.
void describeBounds(const PngReadFile& file, ImageInfo& info) {
    png_int_32 x, y;
    int unit;
    if (png_get_oFFs(file.png, file.info, &x, &y, &unit) == 0 || unit != PNG_OFFSET_PIXEL)
        return;
    const auto lastOf = [](i32 first, u32 count) {
        constexpr i64 greatest = std::numeric_limits<i32>::max();
        return static_cast<i32>(std::min(i64(first) + count - 1, greatest));
    };
    info.bounds.min = {x, y, 0};
    info.bounds.max = {lastOf(x, info.level0.width), lastOf(y, info.level0.height), 0};
}

void describe(const PngReadFile& file, ImageInfo& info) {
    info.level0.width = png_get_image_width(file.png, file.info);
    info.level0.height = png_get_image_height(file.png, file.info);
    info.level0.depth = 1;
    info.format = formatOf(file);
    info.type = typeOf(file);
    describeTexts(file, info.attributes);
    describeColour(file, info.attributes);
    describeDensity(file, info.attributes);
    describeDate(file, info.attributes);
    describeBounds(file, info);
}

/// Reads the pixels, each pass over an interlaced picture filling in its own, and what follows.
bool readPixels(PngReadFile& file, Image& image) {
    const bool isWhole = attemptPng(file.png, [&] {
        for (int pass = 0; pass < file.passCount; ++pass) {
            for (u32 y = 0; y < image.height(); ++y)
                png_read_row(file.png, image.row(y), nullptr);
        }
        png_read_end(file.png, file.info);
    });
    if (!isWhole)
        file.messages.logFault(operation, file.stream);
    return isWhole;
}

} // namespace

bool readPngInfo(base::Stream& stream, ImageInfo& info) {
    PngReadFile file(stream);
    if (!open(file))
        return false;
    describe(file, info);
    return true;
}

ref<Image> readPng(base::Stream& stream) {
    PngReadFile file(stream);
    if (!open(file))
        return {};
    auto image = base::makeRef<Image>();
    image->create(png_get_image_width(file.png, file.info),
                  png_get_image_height(file.png, file.info), 1, 1, formatOf(file), typeOf(file));
    if (!image->data() || !readPixels(file, *image))
        return {};
    // Only now, for texts and date may follow the pixels.
    describe(file, image->info);
    file.messages.logWarnings(operation, stream);
    return image;
}

} // namespace iio
