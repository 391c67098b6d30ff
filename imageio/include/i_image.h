#pragma once

#include "i_image_info.h"

#include "b_buffer.h"

namespace base {
class Filter;
}

namespace iio {

/// Turns rows of components that a `ColorTransform`'s table made into values to calculate with,
/// and back.
class ColorConverter : public base::RefCntAtomic {
public:
    /// `values` are `pixelCount` pixels of `channelCount` components.
    virtual void toWorking(float* values, u32 pixelCount, u32 channelCount) const = 0;
    virtual void fromWorking(float* values, u32 pixelCount, u32 channelCount) const = 0;
};

/// How the colour components of a picture are to be understood when pictures are resampled.
class ColorTransform final : public base::RefCntAtomic {
public:
    vector<float> table; ///< working value by component value, for integer types
    ref<ColorConverter> converter;
};

/// A picture in memory: pixels, their layout, further levels, and what a file told of it.
///
/// Pixels lie in rows from the top, each starting a multiple of the byte alignment after the one
/// before; the slices of a volume and the faces of a cube map follow one another. A picture may be
/// without pixels: every operation on them says so in the log and answers null or false.
///
/// Operations that make a picture leave their source as it is, and may return the source itself
/// where nothing changes. They take along attributes, path and info, but not the further levels.
/// Failures are one line of level 2 on the IO channel, and null or false.
///
/// A picture is not locked; different ones may be used on different threads.
class Image : public virtual base::RefCntAtomic, public ImageTypes {
public:
    enum Kind : u32 {
        kind1D = 0,
        kind2D = 1,
        kindVolume = 3,
        kindCube = 4,
        kindInvalid = 5,
    };

    /// No pixels: size 0, `kRGBA`, `IT_UNSIGNED_BYTE`, alignment 1.
    Image();
    /// As `create`.
    Image(u32 width, u32 height, u32 depth, u32 byteAlignment, u8 format, u8 type);
    /// A deep copy of all but the colour transform, which is shared.
    Image(const Image& other);
    /// A target that owns a buffer gets a copy of the bytes; any other shares the source's buffer.
    Image& operator=(const Image& other);
    ~Image() override;

    /// Gives this picture new pixels, which are not cleared, and drops its levels. Height and depth
    /// 0 count as 1; rows of a picture of one row are not aligned; an alignment other than 1, 2, 4
    /// or 8 counts as 4. Throws `std::runtime_error` for width 0. A level of 4 GiB or more, or of
    /// no byte, or more than memory holds, is logged and leaves the picture without pixels.
    void create(u32 width, u32 height, u32 depth, u32 byteAlignment, u8 format, u8 type);
    /// The same for six faces of width x height, in the order +x, -x, +y, -y, +z, -z.
    void createCube(u32 width, u32 height, u32 byteAlignment, u8 format, u8 type);
    /// Drops pixels and levels; size and layout become those of a default picture.
    void clear();

    u32 width() const noexcept { return width_; }
    u32 height() const noexcept { return height_; } ///< of one face, for a cube map
    u32 depth() const noexcept { return depth_; }
    u32 pitch() const noexcept { return pitch_; } ///< bytes from one row to the next
    u32 byteAlignment() const noexcept { return byteAlignment_; }
    u8 format() const noexcept { return format_; }
    u8 type() const noexcept { return type_; }
    bool isCube() const noexcept { return cubeFlag_ != 0; }
    Kind kind() const noexcept;
    bool isCompressed() const noexcept { return iio::isCompressed(format_); }
    u32 channelCount() const noexcept { return formatInfo(format_).channelCount; }
    bool hasAlpha() const noexcept { return formatInfo(format_).hasAlpha; }
    u32 alphaBits() const noexcept;
    i32 alphaIndex() const noexcept { return formatInfo(format_).alphaIndex; }
    /// Bytes of level `level` by the sizes of this picture, whether or not it has that level.
    u64 memorySize(u32 level = 0) const noexcept;
    /// Whether size, alignment, format and type fit together; logs what does not, level 5.
    bool isValid() const;
    string description() const;

    const string& path() const noexcept { return path_; }
    void setPath(string path) { path_ = std::move(path); }
    bool isFromFile() const noexcept { return fromFile_; }
    void setFromFile(bool value) noexcept { fromFile_ = value; }
    base::AttribMap& attributes() noexcept { return info.attributes; }
    const base::AttribMap& attributes() const noexcept { return info.attributes; }

    /// Null without pixels.
    u8* data() noexcept { return data_ ? data_->data() : nullptr; }
    const u8* data() const noexcept { return data_ ? data_->data() : nullptr; }
    /// Whether there is data for all that size and alignment ask for. A changed alignment may ask
    /// for more.
    bool hasPixels() const noexcept { return data_ && data_->size() >= memorySize(); }
    /// Rows that lie in the data one after the other: of all slices or of all faces.
    u64 rowCount() const noexcept { return u64(height_) * (isCube() ? 6 : depth_); }
    /// Row `y` of them. For formats that are not compressed, and y below `rowCount()`.
    u8* row(u64 y) noexcept { return data() + pitch_ * y; }
    const u8* row(u64 y) const noexcept { return data() + pitch_ * y; }
    /// The first row of slice `z`; null for a cube map or without pixels.
    u8* slice(u32 z) noexcept;
    /// Face `n` of 0..5; null for all but a cube map with pixels.
    u8* face(u32 n) noexcept;
    const u8* face(u32 n) const noexcept;
    /// Copies row `y` of slice (or face) `z` as numbers, in the range that `convertType` gives to
    /// floats; `values` has width x channels of them. False for a row outside the picture.
    bool getRow(float* values, u32 y, u32 z) const;
    bool setRow(const float* values, u32 y, u32 z);

    /// 0 for the picture itself. A further level that is not there is null, or is made, empty, with
    /// `create`.
    Image* level(u32 n, bool create = false);
    const Image* level(u32 n) const noexcept;
    /// Further levels, empty places included.
    u32 levelCount() const noexcept { return static_cast<u32>(levels_.size()); }
    void clearLevels() { levels_.clear(); }

    /// Sets what the pitch is computed with and moves no pixel. 0 counts as 1; throws
    /// `base::exception` for all but 1, 2, 4 and 8.
    void setByteAlignment(u32 alignment);
    /// Of this picture and its levels; null removes it.
    void setColorTransform(const ref<ColorTransform>& transform);
    ColorTransform* colorTransform() const noexcept { return colorTransform_.get(); }

    /// True if a pixel is not wholly opaque. Formats without alpha are opaque; compressed ones
    /// with alpha are taken to be transparent without a look.
    bool checkTransparency() const;
    /// False for unsigned types, true for signed integers without a look, and for real numbers true
    /// if there is a component below zero.
    bool hasNegativeValues() const;

    /// Gamma modes of `convertType`.
    enum GammaMode : i32 { gammaAutomatic = -1, gammaNone = 0, gammaEncode = 1, gammaDecode = 2 };
    /// Another component type. Numbers pass through float, in 0..1 for unsigned and -1..1 for
    /// signed integers; to an integer they are clamped and truncated. The sRGB curve (IEC
    /// 61966-2-1) is applied to all but alpha by `gammaMode`: automatic encodes on the way from
    /// linear to non-linear and decodes on the way back. Real types are linear, except a double
    /// source with an integer target; the attributes `ColorSpace` and `Gamma` say otherwise.
    /// `reserved` has no effect.
    ref<Image> convertType(u8 targetType, i32 reserved = 0, i32 gammaMode = gammaAutomatic);
    /// Another format. Luminance is 0.299 r + 0.587 g + 0.114 b if `weighted`, else the mean.
    /// BC1 to BC5 blocks can be a source; no block format can be a target. `options` were those of
    /// a block compressor and have no effect.
    ref<Image> convertFormat(u8 targetFormat, bool weighted = false, u32 options = 0);
    /// To `kLuminanceAlpha` or `kLuminance`; grey and alpha pictures stay as they are.
    ref<Image> toGreyscale(bool weighted = false);
    /// Another size, by `filter` in both directions. Edges: with `wrap` the picture repeats; with
    /// `extend` its edge pixels do; else the filter is cut there. Silently null for a compressed
    /// picture or one without pixels, and for target size 0. The depth can't change.
    ///
    /// Sums of 8 and 16 bits are truncated and not clamped above: an overshoot of a filter with
    /// negative lobes keeps its low bits alone.
    ref<Image> resize(const base::Filter& filter, u32 width, u32 height, u32 depth = 1,
                      bool wrap = false, bool extend = false);

    // In place; further levels are left alone. What has nothing to change answers true.

    /// Turns a 2D picture or each face upside down, and leaves pictures of one row and volumes.
    /// Blocks of BC1 to BC5 are turned too, if the height is a power of two; other block formats
    /// are not, with a message. `flag` has no effect.
    void flipVertical(u32 flag = 0);
    /// The same from left to right, where the width is to be a power of two.
    void flipHorizontal(u32 flag = 0);
    /// The full value less the component, for unsigned integers and real types.
    bool invertColor();
    bool invertAlpha();
    /// Multiplies colour by the last component of the pixel. Products of integers keep their low
    /// bits, unscaled. False, without a message, for block formats with alpha.
    bool premultiplyAlpha();
    /// Stretches the colours to the full range of the type, truncated; a range that is 0, 1 or
    /// not finite stays as it is. For unsigned integers, float and double.
    bool equalize();
    /// The same from the range (`value` - `centre`) / `scale` -+ `range` / (2 `scale`), in numbers
    /// of 0..1. What lies outside of it is clamped in integers alone.
    bool equalize(float value, float range, float centre, float scale);
    /// Sets negative components to 0, alpha included.
    bool clampNegative();
    /// Unit normals in `kRGB` or `kBGR` bytes; anything else is left alone and answers false,
    /// without a message.
    bool renormalizeNormals();
    /// Replaces pixels of colour `from`, whatever their alpha, by `to`; alpha is replaced where
    /// both `to` and the picture have it.
    bool substituteColorRGB_RGBA(const u8 (&from)[3], const u8 (&to)[4]);
    bool substituteColorRGB_RGB(const u8 (&from)[3], const u8 (&to)[3]);

    ImageInfo info; ///< the file's own description

private:
    void setSize(u32 width, u32 height, u32 depth, u32 byteAlignment, u8 format, u8 type,
                 bool isCube);
    void allocate();
    void copy(const Image& other, bool copiesPixels);
    void createAny(u32 width, u32 height, u32 depth, u32 byteAlignment, u8 format, u8 type,
                   bool isCube);
    void updatePitch() noexcept;

    bool fromFile_ = false;
    ref<base::Buffer> data_;
    ref<ColorTransform> colorTransform_;
    vector<ref<Image>> levels_; ///< level 1 first; may hold nulls
    string path_;
    u32 width_ = 0, height_ = 0, depth_ = 0;
    u32 pitch_ = 0;
    u32 byteAlignment_ = 1;
    u8 format_ = kRGBA;
    u8 type_ = IT_UNSIGNED_BYTE;
    u8 state_[2] = {0, 0}; ///< 1 once created
    u32 cubeFlag_ = 0;
};

} // namespace iio
