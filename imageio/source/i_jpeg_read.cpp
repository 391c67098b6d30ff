#include "i_jpeg.h"
#include "i_jpeg_profile.h"

#include "b_log.h"
#include "b_string_convert.h"

#include <jerror.h>

#include <cstring>

namespace iio {

namespace {

constexpr char operation[] = "jpeg load";

// Of a progressive picture: scans beyond these cost time and show nothing. A scan goes over all
// pixels, so together they are limited too.
constexpr int greatestScanCount = 500;
constexpr u64 greatestScannedPixels = u64(1) << 33;
// Coefficients of a progressive picture are all kept, which a short file can ask for as well.
constexpr long greatestMemory = 1L << 30;

// A block of 64 pixels takes a bit or more, so a byte 512 pixels or fewer. A file that is cut short
// is read as far as it goes, but what has less than an eighth of this is not worth the memory for
// its claims, unless these are small.
constexpr u64 greatestPixelsPerByte = 8 * 512;
constexpr u64 alwaysAllowedPixels = u64(1) << 24;

/// What libjpeg reads from.
struct JpegSource : jpeg_source_mgr {
    explicit JpegSource(const base::Stream& stream) : jpeg_source_mgr{}, reader(stream) {
        init_source = [](j_decompress_ptr) {};
        fill_input_buffer = fill;
        skip_input_data = skip;
        resync_to_restart = jpeg_resync_to_restart;
        term_source = [](j_decompress_ptr) {};
    }

    /// Behind the last byte come marks of the picture's end, so that what is there is decoded. A
    /// marker that breaks off between two scans is dropped; the library gives up for once then, and
    /// finds the end when it is called again.
    static boolean fill(j_decompress_ptr codec) {
        static constexpr JOCTET end[] = {0xFF, JPEG_EOI};
        auto& source = static_cast<JpegSource&>(*codec->src);
        if (source.reader.fill()) {
            source.next_input_byte = source.reader.data();
            source.bytes_in_buffer = source.reader.size();
            return TRUE;
        }
        if (!source.reader.fault().empty())
            static_cast<JpegErrors*>(codec->err)->fail(source.reader.fault().c_str());
        WARNMS(codec, JWRN_JPEG_EOF);
        source.next_input_byte = end;
        source.bytes_in_buffer = sizeof end;
        if (codec->unread_marker == 0 || codec->input_scan_number == 0)
            return TRUE;
        codec->unread_marker = 0;
        return FALSE;
    }

    static void skip(j_decompress_ptr codec, long byteCount) {
        jpeg_source_mgr& source = *codec->src;
        auto left = byteCount > 0 ? static_cast<std::size_t>(byteCount) : 0;
        while (left > source.bytes_in_buffer) {
            left -= source.bytes_in_buffer;
            if (fill(codec) == FALSE)
                return;
        }
        source.next_input_byte += left;
        source.bytes_in_buffer -= left;
    }

    StreamReader reader;
};

void limitScans(j_common_ptr common) {
    const auto* codec = reinterpret_cast<j_decompress_ptr>(common);
    const auto scanCount = static_cast<u64>(codec->input_scan_number);
    const u64 pixelCount = u64(codec->image_width) * codec->image_height;
    if (scanCount > greatestScanCount ||
        (scanCount > 1 && scanCount * pixelCount > greatestScannedPixels))
        static_cast<JpegErrors*>(codec->err)->fail("too many scans");
}

/// An open file, and what libjpeg holds of it.
struct JpegReadFile : base::NonCopyable {
    explicit JpegReadFile(base::Stream& from) : stream(from), source(from) {
        codec.err = &errors;
        progress.progress_monitor = limitScans;
        if ((from.capabilities() & base::streamSeekable) != 0)
            byteCount = from.size() - from.position();
    }
    ~JpegReadFile() { jpeg_destroy_decompress(&codec); }

    base::Stream& stream;
    JpegErrors errors;
    JpegSource source;
    jpeg_progress_mgr progress = {};
    jpeg_decompress_struct codec = {};
    u64 byteCount = ~u64(0); ///< of the file; the greatest number where the stream can't tell
    vector<u8> inkRow;       ///< a row of cyan, magenta, yellow and black
};

template <class... Args>
bool failLoad(const JpegReadFile& file, string_view fault, const Args&... args) {
    base::log().log(base::logIO, base::logError, "jpeg load |{}| {}", file.stream.name(),
                    base::format(fault, args...));
    return false;
}

/// Reads up to the pixels.
bool open(JpegReadFile& file) {
    jpeg_decompress_struct& codec = file.codec;
    bool hasPicture = false;
    const bool isOpen = file.errors.attempt([&] {
        jpeg_create_decompress(&codec);
        codec.mem->max_memory_to_use = greatestMemory;
        codec.src = &file.source;
        codec.progress = &file.progress;
        jpeg_save_markers(&codec, JPEG_COM, 0xFFFF);
        jpeg_save_markers(&codec, jpegProfileMarker, 0xFFFF);
        hasPicture = jpeg_read_header(&codec, FALSE) == JPEG_HEADER_OK;
    });
    if (!isOpen || !hasPicture) {
        file.errors.messages.logFault(operation, file.stream);
        return failLoad(file, "bad file header");
    }
    const int channels = codec.num_components;
    if (channels != 1 && channels != 3 && channels != 4)
        return failLoad(file, "pictures of {} components are not supported", channels);
    codec.out_color_space = channels == 1 ? JCS_GRAYSCALE : channels == 3 ? JCS_RGB : JCS_CMYK;
    return true;
}

u8 formatOf(const jpeg_decompress_struct& codec) {
    return codec.num_components == 1 ? ImageTypes::kLuminance : ImageTypes::kRGB;
}

/// A picture's aspect alone is no resolution, nor is a density of nothing.
void describeDensity(const jpeg_decompress_struct& codec, base::AttribMap& attributes) {
    constexpr u16 inch = 2, centimetre = 3;
    constexpr int dotsPerInch = 1, dotsPerCentimetre = 2;
    const bool isKnown =
        codec.density_unit == dotsPerInch || codec.density_unit == dotsPerCentimetre;
    if (codec.saw_JFIF_marker == 0 || !isKnown || codec.X_density == 0 || codec.Y_density == 0)
        return;
    const ImageAttributes& names = imageAttributes();
    attributes.attribute<u16>(names.n_ResolutionUnit) =
        codec.density_unit == dotsPerInch ? inch : centimetre;
    attributes.attribute<float>(names.n_XResolution) = codec.X_density;
    attributes.attribute<float>(names.n_YResolution) = codec.Y_density;
}

/// The first comment that is not empty, up to its zero byte.
void describeComment(const jpeg_decompress_struct& codec, base::AttribMap& attributes) {
    for (jpeg_saved_marker_ptr marker = codec.marker_list; marker; marker = marker->next) {
        string_view text(reinterpret_cast<const char*>(marker->data), marker->data_length);
        text = text.substr(0, text.find('\0'));
        if (marker->marker != JPEG_COM || text.empty())
            continue;
        attributes.attribute<string>(imageAttributes().n_Comment) = base::toValidUtf8(text);
        return;
    }
}

void describe(const JpegReadFile& file, ImageInfo& info) {
    const jpeg_decompress_struct& codec = file.codec;
    info.level0.width = codec.image_width;
    info.level0.height = codec.image_height;
    info.level0.depth = 1;
    info.format = formatOf(codec);
    info.type = ImageTypes::IT_UNSIGNED_BYTE;
    describeDensity(codec, info.attributes);
    describeComment(codec, info.attributes);
    const vector<u8> profile = joinJpegProfile(codec.marker_list, file.stream.name());
    // A profile of inks says nothing about the red, green and blue that they are turned to.
    if (!profile.empty() && codec.num_components != 4)
        info.attributes.vecAttribute<u8>(imageAttributes().n_ICCProfile) = profile;
}

/// Inks to light. Files of Adobe's programs hold the paper that shines through each ink.
void convertInks(const u8* inks, u8* colours, u32 pixelCount, bool isInverted) {
    const u8 flip = isInverted ? 0 : 0xFF;
    for (u32 x = 0; x < pixelCount; ++x, inks += 4, colours += 3) {
        const u32 black = inks[3] ^ flip;
        for (u32 c = 0; c < 3; ++c)
            colours[c] = static_cast<u8>(((inks[c] ^ flip) * black + 127) / 255);
    }
}

/// Decodes the rows, straight into the picture if these are its colours.
void readRows(JpegReadFile& file, Image& image) {
    jpeg_decompress_struct& codec = file.codec;
    while (jpeg_start_decompress(&codec) == FALSE) {
        // Behind a broken marker now.
    }
    while (codec.output_scanline < codec.output_height) {
        u8* target = image.row(codec.output_scanline);
        JSAMPROW row = file.inkRow.empty() ? target : file.inkRow.data();
        jpeg_read_scanlines(&codec, &row, 1);
        if (row != target)
            convertInks(row, target, image.width(), codec.saw_Adobe_marker != 0);
    }
}

bool readPixels(JpegReadFile& file, Image& image) {
    jpeg_decompress_struct& codec = file.codec;
    if (codec.out_color_space == JCS_CMYK)
        file.inkRow.resize(u64(codec.image_width) * 4);
    if (!file.errors.attempt([&] { readRows(file, image); })) {
        file.errors.messages.logFault(operation, file.stream);
        return false;
    }
    // All pixels are there: what is wrong behind them counts as a warning.
    if (!file.errors.attempt([&] { jpeg_finish_decompress(&codec); }))
        file.errors.messages.demoteFault();
    return true;
}

} // namespace

bool readJpegInfo(base::Stream& stream, ImageInfo& info) {
    JpegReadFile file(stream);
    if (!open(file))
        return false;
    describe(file, info);
    return true;
}

ref<Image> readJpeg(base::Stream& stream) {
    JpegReadFile file(stream);
    if (!open(file))
        return {};
    const u64 pixelCount = u64(file.codec.image_width) * file.codec.image_height;
    if (pixelCount > alwaysAllowedPixels && pixelCount / greatestPixelsPerByte > file.byteCount) {
        failLoad(file, "the file is too short for {} x {} pixels", file.codec.image_width,
                 file.codec.image_height);
        return {};
    }
    auto image = base::makeRef<Image>();
    image->create(file.codec.image_width, file.codec.image_height, 1, 1, formatOf(file.codec),
                  ImageTypes::IT_UNSIGNED_BYTE);
    if (!image->data())
        return {};
    describe(file, image->info);
    if (!readPixels(file, *image))
        return {};
    file.errors.messages.logWarnings(operation, stream);
    return image;
}

} // namespace iio
