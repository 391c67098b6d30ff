#include "i_jpeg.h"

#include "i_fitting.h"
#include "i_formats.h"
#include "i_operation.h"

#include "b_log.h"

#include <algorithm>

namespace iio {

namespace {

constexpr u8 signature[] = {0xFF, 0xD8, 0xFF};

constexpr JpegSubsampling subsamplings[] = {
    {"4:4:4", 1, 1}, {"4:2:2", 2, 1}, {"4:2:0", 2, 2}, {"4:1:1", 4, 1}};

void formatMessage(j_common_ptr codec, char (&text)[JMSG_LENGTH_MAX]) {
    codec->err->format_message(codec, text);
}

void jumpBack(j_common_ptr codec) {
    char text[JMSG_LENGTH_MAX];
    formatMessage(codec, text);
    static_cast<JpegErrors*>(codec->err)->fail(text);
}

/// Levels below zero are warnings, the others trace what is read.
void noteMessage(j_common_ptr codec, int level) {
    if (level >= 0)
        return;
    char text[JMSG_LENGTH_MAX];
    formatMessage(codec, text);
    ++codec->err->num_warnings;
    static_cast<JpegErrors*>(codec->err)->messages.addWarning(text);
}

/// The library's own prints to the standard error stream.
void dropMessage(j_common_ptr) {}

} // namespace

JpegErrors::JpegErrors() : jpeg_error_mgr{} {
    jpeg_std_error(this);
    error_exit = jumpBack;
    emit_message = noteMessage;
    output_message = dropMessage;
}

void JpegErrors::fail(const char* text) {
    messages.setFault(text);
    std::longjmp(back, 1);
}

namespace {

class ImageioJPG final : public ImageFormat {
public:
    using ImageFormat::ImageFormat;

    bool checkSignature(base::Stream& stream) override { return startsWith(stream, signature); }

    bool readInfo(base::Stream& stream, ImageInfo& info) override {
        return readJpegInfo(stream, info);
    }

    ref<Image> load(base::Stream& stream, i32 level) override {
        return level > 0 ? ref<Image>() : readJpeg(stream);
    }

    /// A cube map goes in with its first face, a volume with its first slice.
    bool canSave(base::Stream&, const ImageInfo& info) override {
        return (info.level0.flags & ImageLevelInfo::tiled) == 0 && !isCompressed(info.format);
    }

    bool save(base::Stream& stream, Image& image) override {
        Fitting fitting(image, stream);
        if (image.width() < 1 || image.height() < 1) {
            base::log().log(base::logIO, base::logError,
                            "jpeg save |{}| attempt to save image with zero size!", fitting.name());
            return false;
        }
        return requirePixels(image, base::format("jpeg save |{}|", fitting.name())) &&
               convert(fitting) && writeJpeg(stream, *fitting, makeSettings(image.attributes()));
    }

private:
    /// To what a file can hold, but for alpha.
    static bool convert(Fitting& fitting) {
        if (!fitting.toType(ImageTypes::IT_UNSIGNED_BYTE,
                            "jpeg save |{}| could not convert image to unsidned byte."))
            return false;
        // The compressor takes the other formats of three and four components as they are.
        if (fitting->format() == ImageTypes::kLuminanceAlpha)
            return fitting.toFormat(ImageTypes::kLuminance,
                                    "jpeg save |{}| could not convert image to greyscale.");
        if (fitting->format() == ImageTypes::kRG)
            return fitting.toFormat(ImageTypes::kRGB,
                                    "jpeg save |{}| could not convert image to RGB.");
        return true;
    }

    JpegWriteSettings makeSettings(const base::AttribMap& attributes) const {
        const ImageAttributes& names = imageAttributes();
        JpegWriteSettings settings;
        if (const i32* quality = findSetting<i32>(names.n_CompressionLevel, attributes))
            settings.quality = *quality;
        if (const string* name = findSetting<string>(names.n_jpegSubsampling, attributes)) {
            for (const JpegSubsampling& row : subsamplings) {
                if (*name == row.name)
                    settings.subsampling = &row;
            }
        }
        settings.comment = findSetting<string>(names.n_Comment, attributes);
        addDensity(settings, attributes);
        return settings;
    }

    /// Only a density in pixels a metre comes out as more than 0.
    void addDensity(JpegWriteSettings& settings, const base::AttribMap& attributes) const {
        constexpr u16 metre = 4;
        const ImageAttributes& names = imageAttributes();
        const u16* unit = findSetting<u16>(names.n_ResolutionUnit, attributes);
        const float factor = unit && *unit == metre ? 100.0f : 0.0f;
        settings.densityUnit = unit ? static_cast<u8>(std::min<u16>(*unit, 2)) : u8(0);
        if (const float* x = findSetting<float>(names.n_XResolution, attributes))
            settings.densityX = base::saturate<u8>(*x * factor);
        if (const float* y = findSetting<float>(names.n_YResolution, attributes))
            settings.densityY = base::saturate<u8>(*y * factor);
    }
};

} // namespace

ref<IImageIODesc> describeJPG() {
    return makeFormat<ImageioJPG>("jpeg", "JPEG Image", "jpeg;jpg;jpe;jfif;jif;jfi", 12291);
}

} // namespace iio
