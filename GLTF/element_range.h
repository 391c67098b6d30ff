#pragma once

#include "GLTF/document.h"

#include <algorithm>

namespace GLTF {

/// Where the elements of an accessor lie in their buffer, found once for a run over them. What
/// lies outside the buffer can't be read, component by component. Valid as long as the buffer.
class ElementRange {
public:
    explicit ElementRange(const Accessor& accessor) {
        componentLength_ = accessor.getComponentByteLength();
        elementLength_ = componentLength_ * accessor.getNumberOfComponents();
        stride_ = accessor.getByteStride();
        const BufferView* view = accessor.bufferView.get();
        const Buffer* buffer = view ? view->buffer.get() : nullptr;
        const i64 start = view ? i64(view->byteOffset) + accessor.byteOffset : 0;
        if (!buffer || !buffer->data || start < 0 || start >= buffer->byteLength || stride_ <= 0 ||
            elementLength_ == 0)
            return;
        data_ = buffer->data + start;
        byteLength_ = buffer->byteLength - start;
    }

    i64 componentLength() const noexcept { return componentLength_; }
    i64 elementLength() const noexcept { return elementLength_; }
    i64 stride() const noexcept { return stride_; }
    bool isTight() const noexcept { return stride_ == elementLength_; }

    /// Bytes from the given element on whose components lie wholly in the buffer, at most an
    /// element.
    i64 readableBytes(i64 index) const noexcept {
        if (!data_ || index < 0)
            return 0;
        const i64 left = std::clamp(byteLength_ - index * stride_, i64(0), elementLength_);
        return left - left % componentLength_;
    }
    /// How many of the first `count` elements lie wholly in the buffer, in one run.
    i64 wholeElements(i64 count) const noexcept {
        if (!data_ || byteLength_ < elementLength_)
            return 0;
        return std::clamp((byteLength_ - elementLength_) / stride_ + 1, i64(0),
                          std::max(count, i64(0)));
    }
    /// Behind this element none has a readable byte.
    i64 partialEnd(i64 count) const noexcept {
        return data_ ? std::clamp((byteLength_ - 1) / stride_ + 1, i64(0), std::max(count, i64(0)))
                     : 0;
    }

    u8* element(i64 index) const noexcept { return data_ + index * stride_; }

private:
    u8* data_ = nullptr; ///< first element; null if nothing can be read
    i64 byteLength_ = 0; ///< from there to the end of the buffer
    i64 stride_ = 0;
    i64 elementLength_ = 0;
    i64 componentLength_ = 0;
};

} // namespace GLTF
