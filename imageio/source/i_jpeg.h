#pragma once

#include "i_codec.h"
#include "i_image.h"

#include <csetjmp>
#include <cstdio>

#include <jpeglib.h>

/// JPEG in its JFIF and Adobe forms.
namespace iio {

/// Where libjpeg reports to. What `attempt` runs comes back here on a fault.
struct JpegErrors : jpeg_error_mgr, base::NonCopyable {
    JpegErrors();

    /// Runs `step`, which libjpeg may leave by a jump, so nothing in it may have a destructor.
    /// False if that happened.
    template <class Step>
    bool attempt(const Step& step) {
        if (setjmp(back) != 0)
            return false;
        step();
        return true;
    }
    /// Leaves the step under way for a reason of ours.
    [[noreturn]] void fail(const char* text);

    CodecMessages messages;
    std::jmp_buf back;
};

bool readJpegInfo(base::Stream& stream, ImageInfo& info);
ref<Image> readJpeg(base::Stream& stream);

/// The sampling factors of the first component; those of the others are 1.
struct JpegSubsampling {
    const char* name;
    int horizontal, vertical;
};

struct JpegWriteSettings {
    int quality = 95;
    const JpegSubsampling* subsampling = nullptr; ///< null for that of the library
    const string* comment = nullptr;
    u8 densityUnit = 0;
    u8 densityX = 72, densityY = 72;
};

/// Writes a picture of bytes with one component, or of red, green and blue in either order; a
/// fourth component is left out.
bool writeJpeg(base::Stream& stream, const Image& image, const JpegWriteSettings& settings);

} // namespace iio
