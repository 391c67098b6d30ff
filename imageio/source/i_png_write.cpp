#include "i_png.h"

#include <bit>

namespace iio {

namespace {

constexpr char operation[] = "png save";

/// A file under way, and what libpng holds of it.
struct PngWriteFile : base::NonCopyable {
    explicit PngWriteFile(const base::Stream& to) : target(to) {
        png = png_create_write_struct(PNG_LIBPNG_VER_STRING, &messages, pngErrorCallback,
                                      pngWarningCallback);
        info = png ? png_create_info_struct(png) : nullptr;
        if (!info) {
            png_destroy_write_struct(&png, &info);
            throw std::bad_alloc();
        }
    }
    ~PngWriteFile() { png_destroy_write_struct(&png, &info); }

    StreamWriter target;
    CodecMessages messages;
    png_structp png = nullptr;
    png_infop info = nullptr;
};

void writeBytes(png_structp png, png_bytep bytes, std::size_t byteCount) {
    auto& target = *static_cast<StreamWriter*>(png_get_io_ptr(png));
    if (!target.append(bytes, byteCount))
        failPng(png, target.fault());
}

/// Blocks go out as they fill up.
void keepBytes(png_structp) {}

int colourTypeOf(u32 channelCount) {
    constexpr int types[] = {PNG_COLOR_TYPE_GRAY, PNG_COLOR_TYPE_GRAY_ALPHA, PNG_COLOR_TYPE_RGB,
                             PNG_COLOR_TYPE_RGB_ALPHA};
    return types[channelCount - 1];
}

bool isAscii(const string& text) {
    for (char character : text) {
        if (static_cast<u8>(character) >= 0x80)
            return false;
    }
    return true;
}

/// Plain text chunks are not in UTF-8, the international ones are.
vector<png_text> makeTexts(const PngWriteSettings& settings) {
    vector<png_text> texts;
    for (const PngWriteSettings::Text& source : settings.texts) {
        png_text& text = texts.emplace_back();
        text = {};
        text.compression =
            isAscii(*source.text) ? PNG_TEXT_COMPRESSION_NONE : PNG_ITXT_COMPRESSION_NONE;
        text.key = const_cast<char*>(source.keyword);
        text.text = const_cast<char*>(source.text->c_str());
    }
    return texts;
}

void setHeader(PngWriteFile& file, const Image& image, const PngWriteSettings& settings) {
    const int bitDepth = image.type() == ImageTypes::IT_UNSIGNED_SHORT ? 16 : 8;
    // What is wrong with a colour profile or a gamma must not cost the picture.
    png_set_benign_errors(file.png, 1);
    png_set_write_fn(file.png, &file.target, writeBytes, keepBytes);
    png_set_IHDR(file.png, file.info, image.width(), image.height(), bitDepth,
                 colourTypeOf(image.channelCount()),
                 settings.isInterlaced ? PNG_INTERLACE_ADAM7 : PNG_INTERLACE_NONE,
                 PNG_COMPRESSION_TYPE_DEFAULT, PNG_FILTER_TYPE_DEFAULT);
    if (settings.packingLevel)
        png_set_compression_level(file.png, *settings.packingLevel);
}

void setExtras(PngWriteFile& file, const PngWriteSettings& settings, const png_text* texts) {
    constexpr int absoluteColorimetric = 3;
    if (settings.created)
        png_set_tIME(file.png, file.info, &*settings.created);
    if (settings.isSrgb)
        png_set_sRGB_gAMA_and_cHRM(file.png, file.info, absoluteColorimetric);
    else if (settings.gamma)
        png_set_gAMA_fixed(file.png, file.info, *settings.gamma);
    if (settings.density)
        png_set_pHYs(file.png, file.info, settings.density->x, settings.density->y,
                     settings.density->unit);
    if (settings.offset)
        png_set_oFFs(file.png, file.info, settings.offset->x, settings.offset->y, PNG_OFFSET_PIXEL);
    png_set_text(file.png, file.info, texts, static_cast<int>(settings.texts.size()));
    if (settings.colourProfile)
        png_set_iCCP(file.png, file.info, "Embedded Profile", PNG_COMPRESSION_TYPE_BASE,
                     settings.colourProfile->data(),
                     static_cast<png_uint_32>(settings.colourProfile->size()));
}

/// Says how our rows lie in memory; has no effect before the header is written.
void setRowLayout(PngWriteFile& file, const Image& image) {
    if (image.format() == ImageTypes::kBGR || image.format() == ImageTypes::kBGRA)
        png_set_bgr(file.png);
    if constexpr (std::endian::native == std::endian::little)
        png_set_swap(file.png);
}

} // namespace

bool writePng(base::Stream& stream, const Image& image, const PngWriteSettings& settings) {
    const vector<png_text> texts = makeTexts(settings);
    PngWriteFile file(stream);
    const bool isWhole = attemptPng(file.png, [&] {
        setHeader(file, image, settings);
        setExtras(file, settings, texts.data());
        png_write_info(file.png, file.info);
        setRowLayout(file, image);
        const int passCount = png_set_interlace_handling(file.png);
        for (int pass = 0; pass < passCount; ++pass) {
            for (u32 y = 0; y < image.height(); ++y)
                png_write_row(file.png, image.row(y));
        }
        png_write_end(file.png, file.info);
        if (!file.target.flush())
            failPng(file.png, file.target.fault());
    });
    if (!isWhole) {
        file.messages.logFault(operation, stream);
        return false;
    }
    file.messages.logWarnings(operation, stream);
    return true;
}

} // namespace iio
