#include "i_png.h"

#include "i_fitting.h"
#include "i_formats.h"
#include "i_operation.h"

#include "b_log.h"

#include <algorithm>
#include <limits>

namespace iio {

void pngErrorCallback(png_structp png, png_const_charp text) {
    static_cast<CodecMessages*>(png_get_error_ptr(png))->setFault(text);
    png_longjmp(png, 1);
}

void pngWarningCallback(png_structp png, png_const_charp text) {
    static_cast<CodecMessages*>(png_get_error_ptr(png))->addWarning(text);
}

void failPng(png_structp png, const char* text) {
    png_error(png, text);
}

std::span<const PngKeyword> pngKeywords() {
    static const ImageAttributes& names = imageAttributes();
    static const PngKeyword rows[] = {
        {"Author", names.n_Author},           {"Title", names.n_DocumentName},
        {"Description", names.n_Description}, {"Software", names.n_Software},
        {"Copyright", names.n_Copyright},     {"Comment", names.n_Comment},
        {"Source", names.n_DeviceModel},
    };
    return rows;
}

namespace {

constexpr u8 signature[] = {0x89, 'P', 'N', 'G', '\r', '\n', 0x1A, '\n'};

/// What the blocks of a compressed picture with that many channels are unpacked to.
constexpr u8 plainFormatOf(u32 channelCount) {
    return channelCount == 1   ? ImageTypes::kRed
           : channelCount == 4 ? ImageTypes::kRGBA
                               : ImageTypes::kRGB;
}

/// The value rounded to what a chunk may hold.
u32 toChunkNumber(double value) {
    return std::min(base::saturate<u32>(value + 0.5), u32(PNG_UINT_31_MAX));
}

/// Pixels a unit of `ResolutionUnit`, in what the chunk knows: pixels a metre, or a mere ratio.
std::optional<PngWriteSettings::Density> makeDensity(u16 unit, double x, double y) {
    struct Row {
        u16 unit;
        double unitsPerMetre;
    };
    constexpr Row rows[] = {{2, 1 / 0.0254}, {3, 100}, {4, 1}};
    PngWriteSettings::Density density = {PNG_RESOLUTION_UNKNOWN, toChunkNumber(x),
                                         toChunkNumber(y)};
    for (const Row& row : rows) {
        if (row.unit == unit)
            density = {PNG_RESOLUTION_METER, toChunkNumber(x * row.unitsPerMetre),
                       toChunkNumber(y * row.unitsPerMetre)};
    }
    if (density.x == 0 || density.y == 0)
        return {};
    return density;
}

class ImageioPNG final : public ImageFormat {
public:
    using ImageFormat::ImageFormat;

    bool checkSignature(base::Stream& stream) override { return startsWith(stream, signature); }

    bool readInfo(base::Stream& stream, ImageInfo& info) override {
        return readPngInfo(stream, info);
    }

    ref<Image> load(base::Stream& stream, i32 level) override {
        return level > 0 ? ref<Image>() : readPng(stream);
    }

    /// A cube map goes in with its first face, a volume with its first slice.
    bool canSave(base::Stream&, const ImageInfo& info) override {
        const i32* level = findSetting<i32>(imageAttributes().n_CompressionLevel, info.attributes);
        if (level)
            settings_.packingLevel = std::clamp(*level, -1, 9);
        if (!info.bounds.isEmpty())
            settings_.offset = {info.bounds.min.x, info.bounds.min.y};
        return (info.level0.flags & ImageLevelInfo::tiled) == 0;
    }

    bool save(base::Stream& stream, Image& image) override {
        Fitting fitting(image, stream);
        if (!requirePixels(image, base::format("png save |{}|", fitting.name())) ||
            !convert(fitting))
            return false;
        addColour(fitting->attributes());
        addDescription(image.attributes());
        return writePng(stream, *fitting, settings_);
    }

private:
    u8 targetTypeOf(const Image& image) const {
        const u16* bits = findSetting<u16>(imageAttributes().n_requestBits, image.attributes());
        const bool wantsShort = (bits ? *bits : 16) >= 16 && image.type() != ImageTypes::IT_BYTE;
        return wantsShort ? ImageTypes::IT_UNSIGNED_SHORT : ImageTypes::IT_UNSIGNED_BYTE;
    }

    /// To a format and type that a file can hold.
    bool convert(Fitting& fitting) const {
        constexpr const char* formatFault =
            "png save |{}| could not convert image to supported format.";
        if (fitting->isCompressed() &&
            !fitting.toFormat(plainFormatOf(fitting->channelCount()), formatFault))
            return false;
        if (fitting->type() != ImageTypes::IT_UNSIGNED_BYTE &&
            fitting->type() != ImageTypes::IT_UNSIGNED_SHORT &&
            !fitting.toType(targetTypeOf(*fitting),
                            "png save |{}| could not convert image to supported color type.\n"))
            return false;
        return fitting->format() != ImageTypes::kRG ||
               fitting.toFormat(ImageTypes::kRGB, formatFault);
    }

    void addColour(const base::AttribMap& attributes) {
        const ImageAttributes& names = imageAttributes();
        const string* space = findSetting<string>(names.n_ColorSpace, attributes);
        if (space && *space == "gamma") {
            const float* gamma = findSetting<float>(names.n_Gamma, attributes);
            settings_.gamma =
                base::saturate<png_fixed_point>(PNG_FP_1 / double(gamma ? *gamma : 2.2f) + 0.5);
        } else if (space && *space == "linear") {
            settings_.gamma = PNG_FP_1;
        } else if (space && *space == "srgb") {
            settings_.isSrgb = true;
        }
        settings_.colourProfile = findVecSetting<u8>(names.n_ICCProfile, attributes);
    }

    void addDescription(const base::AttribMap& attributes) {
        const ImageAttributes& names = imageAttributes();
        const bool* isInterlaced = findSetting<bool>(names.n_interlace, attributes);
        settings_.isInterlaced = isInterlaced && *isInterlaced;

        const auto* date = findSetting<base::DateTime>(names.n_DateCreated, attributes);
        if (date && *date != base::DateTime() && date->year >= 0)
            settings_.created = {static_cast<u16>(date->year),
                                 date->month,
                                 date->day,
                                 date->hour,
                                 date->minute,
                                 date->second};

        const float* x = findSetting<float>(names.n_XResolution, attributes);
        const float* y = findSetting<float>(names.n_YResolution, attributes);
        const u16* unit = findSetting<u16>(names.n_ResolutionUnit, attributes);
        if (x || y)
            settings_.density =
                makeDensity(unit ? *unit : u16(0), double(x ? *x : *y), double(y ? *y : *x));

        for (const PngKeyword& row : pngKeywords()) {
            const string* text = findSetting<string>(row.attribute, attributes);
            if (text && !text->empty())
                settings_.texts.push_back({row.keyword, text});
        }
    }

    PngWriteSettings settings_; ///< an object serves one file
};

} // namespace

ref<IImageIODesc> describePNG() {
    return makeFormat<ImageioPNG>("png", "Portable Network Graphics", "png", 43027);
}

} // namespace iio
