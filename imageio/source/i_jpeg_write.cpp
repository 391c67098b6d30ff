#include "i_jpeg.h"

#include <algorithm>

namespace iio {

namespace {

constexpr char operation[] = "jpeg save";

/// How the compressor takes the components of a pixel.
struct PixelLayout {
    J_COLOR_SPACE space;
    int componentCount;
};

PixelLayout layoutOf(u8 format) {
    switch (format) {
    case ImageTypes::kRGB:
        return {JCS_EXT_RGB, 3};
    case ImageTypes::kBGR:
        return {JCS_EXT_BGR, 3};
    case ImageTypes::kRGBA:
        return {JCS_EXT_RGBX, 4};
    case ImageTypes::kBGRA:
        return {JCS_EXT_BGRX, 4};
    default:
        return {JCS_GRAYSCALE, 1};
    }
}

/// What libjpeg writes to.
struct JpegTarget : jpeg_destination_mgr {
    explicit JpegTarget(const base::Stream& stream) : jpeg_destination_mgr{}, writer(stream) {
        init_destination = [](j_compress_ptr codec) { of(codec).restart(); };
        empty_output_buffer = [](j_compress_ptr codec) -> boolean {
            // By the library's rule the block is full, whatever the two members say.
            of(codec).write(codec, of(codec).writer.size());
            return TRUE;
        };
        term_destination = [](j_compress_ptr codec) {
            of(codec).write(codec, of(codec).writer.size() - of(codec).free_in_buffer);
        };
    }

    static JpegTarget& of(j_compress_ptr codec) { return *static_cast<JpegTarget*>(codec->dest); }

    void restart() noexcept {
        next_output_byte = writer.data();
        free_in_buffer = writer.size();
    }
    void write(j_compress_ptr codec, std::size_t byteCount) {
        if (!writer.writeBlock(byteCount))
            static_cast<JpegErrors*>(codec->err)->fail(writer.fault());
        restart();
    }

    StreamWriter writer;
};

/// A file under way, and what libjpeg holds of it.
struct JpegWriteFile : base::NonCopyable {
    explicit JpegWriteFile(const base::Stream& stream) : target(stream) { codec.err = &errors; }
    ~JpegWriteFile() { jpeg_destroy_compress(&codec); }

    JpegErrors errors;
    JpegTarget target;
    jpeg_compress_struct codec = {};
};

void configure(jpeg_compress_struct& codec, const Image& image, const JpegWriteSettings& settings) {
    const PixelLayout layout = layoutOf(image.format());
    codec.image_width = image.width();
    codec.image_height = image.height();
    codec.input_components = layout.componentCount;
    codec.in_color_space = layout.space;
    jpeg_set_defaults(&codec);
    codec.density_unit = settings.densityUnit;
    codec.X_density = settings.densityX;
    codec.Y_density = settings.densityY;
    jpeg_set_quality(&codec, settings.quality, TRUE);
    // A grey picture has no colour to be sampled more coarsely.
    if (settings.subsampling && codec.num_components == 3) {
        codec.comp_info[0].h_samp_factor = settings.subsampling->horizontal;
        codec.comp_info[0].v_samp_factor = settings.subsampling->vertical;
        for (int i = 1; i < 3; ++i)
            codec.comp_info[i].h_samp_factor = codec.comp_info[i].v_samp_factor = 1;
    }
}

/// The text with a zero byte behind it, as much as a marker can hold.
void writeComment(jpeg_compress_struct& codec, const string& text) {
    constexpr std::size_t greatestLength = 65532;
    const std::size_t length = std::min(text.size(), greatestLength);
    jpeg_write_m_header(&codec, JPEG_COM, static_cast<unsigned>(length + 1));
    for (std::size_t i = 0; i < length; ++i)
        jpeg_write_m_byte(&codec, static_cast<u8>(text[i]));
    jpeg_write_m_byte(&codec, 0);
}

} // namespace

bool writeJpeg(base::Stream& stream, const Image& image, const JpegWriteSettings& settings) {
    JpegWriteFile file(stream);
    jpeg_compress_struct& codec = file.codec;
    const bool isWhole = file.errors.attempt([&] {
        jpeg_create_compress(&codec);
        codec.dest = &file.target;
        configure(codec, image, settings);
        jpeg_start_compress(&codec, TRUE);
        if (settings.comment && !settings.comment->empty())
            writeComment(codec, *settings.comment);
        while (codec.next_scanline < codec.image_height) {
            // The library only reads.
            JSAMPROW row = const_cast<u8*>(image.row(codec.next_scanline));
            jpeg_write_scanlines(&codec, &row, 1);
        }
        jpeg_finish_compress(&codec);
    });
    if (!isWhole)
        file.errors.messages.logFault(operation, stream);
    else
        file.errors.messages.logWarnings(operation, stream);
    return isWhole;
}

} // namespace iio
