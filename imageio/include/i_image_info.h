#pragma once

#include "i_image_types.h"

#include "b_attribute_map.h"

namespace iio {

struct ImageLevelInfo {
    u32 width = 0, height = 0, depth = 0;
    u32 tileCountX = 0, tileCountY = 0, tileCountZ = 0;
    u32 tileWidth = 0, tileHeight = 0, tileDepth = 0;
    u32 flags = 0;

    static constexpr u32 tiled = 1;
};

/// One part of a format that holds several.
struct ImageSliceInfo {
    string name;
    ImageLevelInfo level0;
};

/// A picture as a file describes it.
struct ImageInfo {
    ImageInfo() = default;
    ImageInfo(const ImageInfo& other) { *this = other; }
    ImageInfo& operator=(const ImageInfo& other);

    static constexpr u8 cubeMap = 4; ///< bit of `flags`

    ImageLevelInfo level0;
    u8 format = ImageTypes::kRGB;
    u8 type = ImageTypes::IT_UNSIGNED_BYTE;
    u8 flags = 0;
    vector<ImageLevelInfo> levels;               ///< from level 1 on
    base::AttribMap attributes;                  ///< what else the file said, see `ImageAttributes`
    base::base_box<base::base_vec3<i32>> bounds; ///< empty unless the file places the picture
    float chromaticities[8] = {-1, -1, -1, -1, -1, -1, -1, -1};
    vector<ImageSliceInfo> slices;
    u32 partCount = 1;
    u32 viewCount = 1;
};

/// The names of what pictures carry in `ImageInfo::attributes`; in brackets, the types of those
/// that this library reads and writes. Texts are strings.
#define IIO_IMAGE_ATTRIBUTES(X)                                                           \
    X(Author)                                                                             \
    X(AuthorEmail)                                                                        \
    X(AuthorWebsite)                                                                      \
    X(bptcData)                                                                           \
    X(ColorSpace) /* "linear", "gamma", "srgb", or "ignore" to convert without a curve */ \
    X(Comment)                                                                            \
    X(Compression)                                                                        \
    X(CompressionLevel) /* [i32] level of the PNG packing, quality of a JPEG */           \
    X(Copyright)                                                                          \
    X(DateCreated) /* [DateTime] */                                                       \
    X(DateModified)                                                                       \
    X(Description)                                                                        \
    X(DeviceMaker)                                                                        \
    X(DeviceModel)                                                                        \
    X(DocumentName)                                                                       \
    X(DocumentRevision)                                                                   \
    X(DocumentSource)                                                                     \
    X(etcData)                                                                            \
    X(ExposureTime)                                                                       \
    X(fastLoad)                                                                           \
    X(FileVersion)                                                                        \
    X(flipDDS)                                                                            \
    X(FNumber)                                                                            \
    X(Gamma) /* [float] of "gamma": the picture holds light to the power of 1 / Gamma */  \
    X(HostComputer)                                                                       \
    X(ICCProfile) /* [u8 vector] */                                                       \
    X(interlace)  /* [bool] PNG */                                                        \
    X(Keywords)                                                                           \
    X(maxValue)                                                                           \
    X(maxValueVec)                                                                        \
    X(minValue)                                                                           \
    X(minValueVec)                                                                        \
    X(Orientation)                                                                        \
    X(PageName)                                                                           \
    X(PageNumber)                                                                         \
    X(pixelAspectRatio)                                                                   \
    X(requestBits) /* [u16] bits of a component in the file */                            \
    X(requestSize)                                                                        \
    X(ResolutionUnit) /* [u16] 2 inch, 3 centimetre, 4 metre */                           \
    X(rgtcData)                                                                           \
    X(RowsPerStrip)                                                                       \
    X(s3tcData)                                                                           \
    X(sha1)                                                                               \
    X(Software)                                                                           \
    X(viewName)                                                                           \
    X(XResolution) /* [float] pixels a unit */                                            \
    X(YResolution) /* [float] */

struct ImageAttributes {
#define IIO_DECLARE_NAME(name) base::name_id n_##name = base::nameServer().id(#name);
    IIO_IMAGE_ATTRIBUTES(IIO_DECLARE_NAME)
#undef IIO_DECLARE_NAME
    /// "4:4:4", "4:2:2", "4:2:0" or "4:1:1"
    base::name_id n_jpegSubsampling = base::nameServer().id("jpeg:subsampling");
};

/// The handles, interned at the first call.
const ImageAttributes& imageAttributes();

} // namespace iio
