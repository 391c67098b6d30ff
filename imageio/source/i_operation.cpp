#include "i_operation.h"

#include "b_log.h"

namespace iio {

bool requirePixels(const Image& image, string_view operation) {
    if (image.hasPixels())
        return true;
    base::log().log(base::logIO, base::logError, "{}: the image has no pixels.", operation);
    return false;
}

ref<Image> makeLike(const Image& source, u32 width, u32 height, u32 byteAlignment, u8 format,
                    u8 type) {
    auto image = base::makeRef<Image>();
    if (source.isCube())
        image->createCube(width, height, byteAlignment, format, type);
    else
        image->create(width, height, source.depth(), byteAlignment, format, type);
    if (!image->data())
        return {};
    image->info = source.info;
    image->setPath(source.path());
    image->setFromFile(source.isFromFile());
    return image;
}

} // namespace iio
