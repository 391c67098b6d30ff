#include "i_tga.h"

#include "i_formats.h"

#include "b_log.h"

namespace iio {

namespace {

constexpr char packedName[] = "rle"; ///< value of `Compression` for run-length packing

void fillInfo(const TgaHeader& header, ImageInfo& info) {
    info.level0.width = header.width;
    info.level0.height = header.height;
    info.level0.depth = 1;
    info.format = header.format();
    info.type = ImageTypes::IT_UNSIGNED_BYTE;
    if (header.isPacked)
        info.attributes.attribute<string>(imageAttributes().n_Compression) = packedName;
}

class ImageioTGA final : public ImageFormat {
public:
    using ImageFormat::ImageFormat;

    bool checkSignature(base::Stream& stream) override {
        u8 bytes[TgaHeader::byteSize];
        TgaHeader header;
        return stream.size() >= stream.position() + sizeof bytes &&
               stream.read(bytes, sizeof bytes) == sizeof bytes &&
               parseTgaHeader(bytes, header) == nullptr;
    }

    bool readInfo(base::Stream& stream, ImageInfo& info) override {
        TgaHeader header;
        if (!readTgaHeader(stream, header))
            return false;
        fillInfo(header, info);
        return true;
    }

    ref<Image> load(base::Stream& stream, i32 level) override {
        TgaHeader header;
        if (!readTgaHeader(stream, header))
            return {};
        if (level > 0) {
            logTgaFault(stream, "the format holds one level");
            return {};
        }
        const ref<Image> image = readTgaPixels(stream, header);
        if (image)
            fillInfo(header, image->info);
        return image;
    }

    bool canSave(base::Stream& stream, const ImageInfo& info) override {
        const ImageLevelInfo& size = info.level0;
        const bool isCube = (info.flags & ImageInfo::cubeMap) != 0;
        return checkTgaSize(stream, size.width, size.height, size.depth, isCube);
    }

    bool save(base::Stream& stream, Image& image) override {
        const auto* packing =
            findSetting<string>(imageAttributes().n_Compression, image.attributes());
        return writeTga(stream, image, packing && *packing == packedName);
    }
};

} // namespace

ref<IImageIODesc> describeTGA() {
    return makeFormat<ImageioTGA>("tga", "Truevision Targa", "tga", 32771);
}

} // namespace iio
