#pragma once

#include "i_image.h"

#include "stream/b_stream.h"

namespace iio {

/// A picture on its way into a file: itself, or what it had to be converted to.
class Fitting {
public:
    /// Both are borrowed. Messages name where the picture came from or, if that is nowhere, the
    /// stream.
    Fitting(Image& image, const base::Stream& stream)
        : image_(&image), name_(image.path().empty() ? stream.name() : image.path()) {}

    const Image& operator*() const noexcept { return *image_; }
    const Image* operator->() const noexcept { return image_; }
    const string& name() const noexcept { return name_; }

    /// Converts the picture if it is of another type or format. If it can't be, false, and
    /// `message` is logged with the name at its placeholder; there is no picture any more then.
    bool toType(u8 type, const char* message);
    bool toFormat(u8 format, const char* message);

private:
    bool replace(const ref<Image>& made, const char* message);

    Image* image_;
    ref<Image> converted_; ///< owns `image_` unless that is the source itself
    const string& name_;
};

} // namespace iio
