#include "i_fitting.h"

#include "b_log.h"

namespace iio {

bool Fitting::toType(u8 type, const char* message) {
    return image_->type() == type || replace(image_->convertType(type), message);
}

bool Fitting::toFormat(u8 format, const char* message) {
    return image_->format() == format || replace(image_->convertFormat(format), message);
}

bool Fitting::replace(const ref<Image>& made, const char* message) {
    if (!made)
        base::log().log(base::logIO, base::logError, message, name_);
    converted_ = made;
    image_ = converted_.get();
    return made != nullptr;
}

} // namespace iio
