#include "gltf/prepare_image.h"

#include "gltf/guarded.h"

#include "b_filter.h"
#include "b_log.h"
#include "b_string_convert.h"
#include "i_file.h"
#include "stream/b_fs.h"

#include <algorithm>
#include <sys/stat.h>

namespace gltf {

using base::string;
using base::u32;
using base::u64;

namespace {

bool exceeds(PictureSize size, u32 greatestSide) {
    return greatestSide != 0 && std::max(size.width, size.height) > greatestSide;
}

[[noreturn]] void fail(const string& text, int line) {
    throw base::exception(text, "prepare_image", "gltf::convertPicture", line);
}

base::ref<iio::Image> resized(iio::Image& image, bool hasAlpha, PictureSize size) {
    base::ref<iio::Image> source(&image);
    if (image.isCompressed())
        source = image.convertFormat(hasAlpha ? iio::Image::kRGBA : iio::Image::kRGB);
    const base::KaiserFilter filter(1.5f);
    return source ? source->resize(filter, size.width, size.height) : nullptr;
}

} // namespace

void requireRegularFile(const string& path) {
    struct stat status {};
    if (::stat(base::fs::master().resolve(path).c_str(), &status) == 0 && !S_ISREG(status.st_mode))
        throw base::exception("'" + path + "' is no regular file", "prepare_image",
                              "gltf::requireRegularFile", __LINE__);
}

PictureHeader readPictureHeader(const string& path) {
    PictureHeader header;
    guarded("Unable to get image information!", [&] {
        requireRegularFile(path);
        iio::ImageInfo info;
        if (iio::readImageInfo(path, info))
            header = {{info.level0.width, info.level0.height},
                      iio::formatInfo(info.format).hasAlpha};
    });
    return header;
}

PictureSize limitedSize(PictureSize size, u32 greatestSide, const string& path) {
    if (!exceeds(size, greatestSide))
        return size;
    const float scale =
        static_cast<float>(greatestSide) / static_cast<float>(std::min(size.width, size.height));
    const auto scaled = [&](u32 side) {
        return base::saturate<u32>(static_cast<float>(side) * scale + 0.5f);
    };
    const PictureSize target{scaled(size.width), scaled(size.height)};
    if (std::max(target.width, target.height) <= greatestImageSide &&
        u64(target.width) * target.height <= greatestPixelCount)
        return target;
    base::log().log(base::logScene, base::logWarning,
                    "gltf |{}| The image would have {} x {} pixels with the shorter side at the "
                    "limit of {}, it keeps its size!",
                    path, target.width, target.height, greatestSide);
    return size;
}

PicturePlan planPicture(const string& path, const PictureHeader& header, bool isCompressing,
                        u32 greatestSide) {
    // With the part between the last two dots: such a name tells of no kind that may pass.
    const string extension = base::toLower(base::fs::extension(path, 1));
    const bool isPng = extension == "png";
    PicturePlan plan;
    plan.converts = !isPng && extension != "jpg" && extension != "jpeg";
    if (isCompressing && isPng && !header.hasAlpha)
        plan.converts = true;
    // A picture whose shorter side has the limit's length keeps its size, but is written again.
    if (exceeds(header.size, greatestSide) &&
        (limitedSize(header.size, greatestSide, path) != header.size ||
         std::min(header.size.width, header.size.height) == greatestSide))
        plan.converts = plan.resizes = true;
    if (plan.converts)
        plan.extension = !header.hasAlpha && (!isPng || isCompressing) ? ".jpg" : ".png";
    return plan;
}

base::ref<iio::Image> loadOpaque(const string& path, PictureSize size) {
    base::ref<iio::Image> image;
    if (u64(size.width) * size.height > u64(1) << 26)
        return image;
    guarded("Unable to load the image!", [&] { image = iio::loadImage(path); });
    return image && !image->checkTransparency() ? image : nullptr;
}

void convertPicture(const string& path, base::ref<iio::Image> image, const string& target,
                    const PicturePlan& plan, bool hasAlpha, u32 greatestSide) {
    base::log().log(base::logScene, base::logInformation, "Processing image {} for export!", path);
    if (!image) {
        requireRegularFile(path);
        image = iio::loadImage(path);
    }
    if (!image)
        fail("'" + path + "' can't be read, it goes into the document as it is", __LINE__);
    if (plan.resizes)
        image = resized(*image, hasAlpha,
                        limitedSize({image->width(), image->height()}, greatestSide, path));
    if (!image)
        fail("'" + path + "' can't be resized", __LINE__);
    if (!iio::saveImage(*image, target))
        fail("'" + target + "' could not be written", __LINE__);
}

} // namespace gltf
