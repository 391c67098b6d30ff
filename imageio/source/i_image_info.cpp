#include "i_image_info.h"

namespace iio {

ImageInfo& ImageInfo::operator=(const ImageInfo& other) {
    if (this == &other)
        return *this;
    level0 = other.level0;
    format = other.format;
    type = other.type;
    flags = other.flags;
    levels = other.levels;
    attributes.clear();
    attributes.assign(other.attributes, 0);
    bounds = other.bounds;
    std::copy(std::begin(other.chromaticities), std::end(other.chromaticities), chromaticities);
    slices = other.slices;
    partCount = other.partCount;
    viewCount = other.viewCount;
    return *this;
}

const ImageAttributes& imageAttributes() {
    static const ImageAttributes names;
    return names;
}

} // namespace iio
