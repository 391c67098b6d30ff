#include "i_image.h"

#include "i_component.h"
#include "i_operation.h"

#include "b_exception.h"
#include "b_log.h"

#include <algorithm>
#include <cstring>
#include <stdexcept>

namespace iio {

namespace {

constexpr u64 greatestByteSize = 0xFFFFFFFF;

u32 halved(u32 size, u32 level) {
    return level < 32 ? std::max(size >> level, 1u) : 1u;
}

} // namespace

Image::Image() = default;

Image::Image(u32 width, u32 height, u32 depth, u32 byteAlignment, u8 format, u8 type) {
    create(width, height, depth, byteAlignment, format, type);
}

Image::Image(const Image& other) : base::RefCntAtomic(), ImageTypes(other) {
    copy(other, true);
}

Image& Image::operator=(const Image& other) {
    if (this != &other)
        copy(other, data_ && data_->ownsMemory());
    return *this;
}

/// `other` may be one of this picture's levels: nothing of this one is let go before all is copied.
void Image::copy(const Image& other, bool copiesPixels) {
    vector<ref<Image>> levels;
    levels.reserve(other.levels_.size());
    for (const ref<Image>& level : other.levels_)
        levels.push_back(level ? base::makeRef<Image>(*level) : ref<Image>());
    const ref<base::Buffer> pixels = other.data_;

    info = other.info;
    fromFile_ = other.fromFile_;
    colorTransform_ = other.colorTransform_;
    path_ = other.path_;
    width_ = other.width_;
    height_ = other.height_;
    depth_ = other.depth_;
    pitch_ = other.pitch_;
    byteAlignment_ = other.byteAlignment_;
    format_ = other.format_;
    type_ = other.type_;
    std::copy(std::begin(other.state_), std::end(other.state_), state_);
    cubeFlag_ = other.cubeFlag_;
    data_ = pixels;
    if (pixels && copiesPixels) {
        allocate();
        if (data_)
            std::memcpy(data_->data(), pixels->data(), std::min(data_->size(), pixels->size()));
    }
    levels_.swap(levels);
}

Image::~Image() = default;

void Image::create(u32 width, u32 height, u32 depth, u32 byteAlignment, u8 format, u8 type) {
    createAny(width, height, depth, byteAlignment, format, type, false);
}

void Image::createCube(u32 width, u32 height, u32 byteAlignment, u8 format, u8 type) {
    createAny(width, height, 1, byteAlignment, format, type, true);
}

void Image::createAny(u32 width, u32 height, u32 depth, u32 byteAlignment, u8 format, u8 type,
                      bool isCube) {
    if (width == 0)
        throw std::runtime_error("Can't create an empty image!");
    levels_.clear();
    setSize(width, std::max(height, 1u), std::max(depth, 1u), byteAlignment, format, type, isCube);
    allocate();
}

void Image::clear() {
    levels_.clear();
    setSize(0, 0, 0, 1, kRGBA, IT_UNSIGNED_BYTE, false);
    state_[0] = state_[1] = 0;
}

/// Sets the layout and lets go of the pixels.
void Image::setSize(u32 width, u32 height, u32 depth, u32 byteAlignment, u8 format, u8 type,
                    bool isCube) {
    data_.reset();
    width_ = width;
    height_ = height;
    depth_ = depth;
    format_ = format;
    type_ = type;
    cubeFlag_ = isCube ? 1 : 0;
    const bool isKnown = byteAlignment == 1 || byteAlignment == 2 || byteAlignment == 8;
    byteAlignment_ = isKnown ? byteAlignment : 4;
    if (kind() == kind1D)
        byteAlignment_ = 1;
    updatePitch();
    state_[0] = state_[1] = 1;
}

void Image::updatePitch() noexcept {
    const u64 bytes = rowByteSize(width_, byteAlignment_, format_, type_);
    // A row that long is never allocated.
    pitch_ = static_cast<u32>(std::min(bytes, greatestByteSize));
}

void Image::allocate() {
    data_.reset();
    const u64 byteCount = memorySize();
    if (byteCount <= greatestByteSize)
        data_ = base::Buffer::allocate(byteCount);
    if (!data_)
        base::log().log(base::logIO, base::logError,
                        "Could not allocate memory for an image! Probably invalid settings.");
}

Image::Kind Image::kind() const noexcept {
    if (width_ == 0)
        return kindInvalid;
    if (isCube())
        return height_ != 0 && depth_ <= 1 ? kindCube : kindInvalid;
    if (depth_ <= 1)
        return height_ < 2 ? kind1D : kind2D;
    return height_ >= 2 ? kindVolume : kindInvalid;
}

u32 Image::alphaBits() const noexcept {
    const FormatInfo& row = formatInfo(format_);
    return row.alphaIndex >= 0 ? componentBits(type_) : row.alphaBits;
}

u64 Image::memorySize(u32 level) const noexcept {
    return iio::memorySize(halved(width_, level), halved(height_, level), halved(depth_, level),
                           byteAlignment_, format_, type_, isCube());
}

string Image::description() const {
    return base::format("path   = {}\nwidth  = {}\nheight = {}\ndepth  = {}\nformat = {}\n"
                        "type   = {}\npitch  = {}\nbytealign = {}\n",
                        path_, width_, height_, depth_, formatInfo(format_).name, typeName(type_),
                        pitch_, byteAlignment_);
}

bool Image::isValid() const {
    const bool hasSize = width_ != 0 && (height_ != 0 || depth_ == 0);
    const bool typeFits = isCompressed() ? type_ == IT_IMPLICIT && format_ < formatCount
                                         : type_ > IT_IMPLICIT && type_ < typeCount;
    const bool isAligned = byteAlignment_ != 0 && pitch_ % byteAlignment_ == 0;
    if (hasSize && typeFits && isAligned)
        return true;
    const char* fault =
        typeFits ? "Image::isValid(): invalid dimensions or pitch/bytealign combination:\n"
                 : "Image::isValid(): invalid format/type combination:\n";
    base::log().log(base::logIO, base::logDebug, "{}{}", fault, description());
    return false;
}

u8* Image::slice(u32 z) noexcept {
    return hasPixels() && !isCube() ? data() + u64(pitch_) * height_ * z : nullptr;
}

u8* Image::face(u32 n) noexcept {
    return const_cast<u8*>(std::as_const(*this).face(n));
}

const u8* Image::face(u32 n) const noexcept {
    return hasPixels() && kind() == kindCube && n < 6 ? data() + memorySize() / 6 * n : nullptr;
}

bool Image::getRow(float* values, u32 y, u32 z) const {
    if (!hasPixels() || isCompressed() || y >= height_ || z >= rowCount() / height_)
        return false;
    const u8* source = row(u64(height_) * z + y);
    const u64 count = u64(width_) * channelCount();
    return dispatchType(type_, [&](auto component) {
        using T = decltype(component);
        const T* components = reinterpret_cast<const T*>(source);
        std::transform(components, components + count, values, toNumber<T>);
    });
}

bool Image::setRow(const float* values, u32 y, u32 z) {
    if (!hasPixels() || isCompressed() || y >= height_ || z >= rowCount() / height_)
        return false;
    u8* target = row(u64(height_) * z + y);
    const u64 count = u64(width_) * channelCount();
    return dispatchType(type_, [&](auto component) {
        using T = decltype(component);
        std::transform(values, values + count, reinterpret_cast<T*>(target), fromNumber<T>);
    });
}

Image* Image::level(u32 n, bool create) {
    if (n == 0)
        return this;
    if (create) {
        if (levels_.size() < n)
            levels_.resize(n);
        if (!levels_[n - 1])
            levels_[n - 1] = base::makeRef<Image>();
    }
    return n <= levels_.size() ? levels_[n - 1].get() : nullptr;
}

const Image* Image::level(u32 n) const noexcept {
    if (n == 0)
        return this;
    return n <= levels_.size() ? levels_[n - 1].get() : nullptr;
}

void Image::setByteAlignment(u32 alignment) {
    if (alignment == 0)
        alignment = 1;
    if (alignment > 8 || (alignment & (alignment - 1)) != 0)
        throw base::exception(base::format("Invalid byte alignment {}.", alignment), "i_image",
                              "iio::Image::setByteAlignment", __LINE__);
    byteAlignment_ = alignment;
    updatePitch();
}

void Image::setColorTransform(const ref<ColorTransform>& transform) {
    colorTransform_ = transform;
    for (const ref<Image>& level : levels_) {
        if (level)
            level->setColorTransform(transform);
    }
}

} // namespace iio
