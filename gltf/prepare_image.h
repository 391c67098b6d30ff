#pragma once

#include "b_containers.h"
#include "b_types.h"

/// How picture files become those of the document, which holds PNG and JPEG alone.
namespace gltf {

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

/// A file that can't be read is logged and counts as one without size and alpha.
PictureHeader readPictureHeader(const base::string& path);

/// The size in which a picture of `size` is exported. If a side exceeds `greatestSide`, the
/// picture is scaled so that its shorter side gets that length: it may grow. One that would pass
/// the 65500 pixels of a JPEG's side or 2^28 pixels keeps its size, which is logged with its
/// `path`. 0 stands for no limit.
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

/// Reads the picture at `path` and writes it to `target`. Throws `base::exception` if that fails.
void convertPicture(const base::string& path, const base::string& target, const PicturePlan& plan,
                    bool hasAlpha, base::u32 greatestSide);

} // namespace gltf
