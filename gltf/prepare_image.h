#pragma once

#include "i_image.h"

/// How picture files become those of the document, which holds PNG and JPEG alone.
namespace gltf {

/// The most that an exported picture may have: the sides of a JPEG, and pixels in all.
constexpr base::u32 greatestImageSide = 65500;
constexpr base::u64 greatestPixelCount = base::u64(1) << 28;

struct PictureSize {
    base::u32 width = 0;
    base::u32 height = 0;
    bool operator==(const PictureSize&) const = default;
};

/// What the header of a picture file tells.
struct PictureHeader {
    PictureSize size; ///< 0 x 0 if it can't be read
    bool hasAlpha = false;
};

/// Throws `base::exception` for what is there and no regular file: opening a pipe waits for ever.
void requireRegularFile(const base::string& path);

/// A file that can't be read is logged and counts as one without size and alpha.
PictureHeader readPictureHeader(const base::string& path);

/// The size in which a picture of `size` is exported. If a side exceeds `greatestSide`, the
/// picture is scaled so that its shorter side gets that length: it may grow. One that would pass
/// the greatest side or number of pixels keeps its size, which is logged with its `path`. 0 stands
/// for no limit.
PictureSize limitedSize(PictureSize size, base::u32 greatestSide, const base::string& path);

/// What has to be done with a file.
struct PicturePlan {
    bool converts = false;
    bool resizes = false;
    const char* extension = ""; ///< of the new file, with its dot; empty for none
};

/// `isCompressing` allows to make JPEGs of opaque PNGs. A JPEG or PNG that nothing asks to change
/// passes as it is.
PicturePlan planPicture(const base::string& path, const PictureHeader& header, bool isCompressing,
                        base::u32 greatestSide);

/// The picture at `path` if its alpha is opaque everywhere. Null if it is not, if the picture can't
/// be read, which is logged, or if it has more than 2^26 pixels.
base::ref<iio::Image> loadOpaque(const base::string& path, PictureSize size);

/// Writes the picture at `path` to `target`; `image` is that picture, null if it is not read yet.
/// Throws `base::exception` if that fails.
void convertPicture(const base::string& path, base::ref<iio::Image> image,
                    const base::string& target, const PicturePlan& plan, bool hasAlpha,
                    base::u32 greatestSide);

} // namespace gltf
