#pragma once

#include "i_codec.h"
#include "i_image.h"

#include <csetjmp>
#include <optional>
#include <png.h>
#include <span>

/// Portable Network Graphics.
namespace iio {

/// A text chunk's keyword and the attribute that holds its text.
struct PngKeyword {
    const char* keyword;
    base::name_id attribute;
};

/// In the order of writing.
std::span<const PngKeyword> pngKeywords();

/// What goes into a file besides the pixels, as far as it has a value.
struct PngWriteSettings {
    struct Density {
        int unit;
        u32 x, y;
    };
    struct Text {
        const char* keyword;
        const string* text; ///< UTF-8
    };
    struct Offset {
        i32 x, y;
    };

    std::optional<int> packingLevel; ///< of zlib
    bool isInterlaced = false;
    bool isSrgb = false;
    std::optional<png_fixed_point> gamma; ///< of the file, in 1/100000
    std::optional<Density> density;
    std::optional<png_time> created;
    std::optional<Offset> offset;
    vector<Text> texts;
    const vector<u8>* colourProfile = nullptr;
};

/// Makes libpng store its messages there and jump to the enclosing `attemptPng`.
void pngErrorCallback(png_structp png, png_const_charp text);
void pngWarningCallback(png_structp png, png_const_charp text);
/// The same with a text of ours.
[[noreturn]] void failPng(png_structp png, const char* text);

/// Runs `step`, which libpng may leave by a jump, so nothing in it may have a destructor. False if
/// that happened.
template <class Step>
bool attemptPng(png_structp png, const Step& step) {
    if (setjmp(png_jmpbuf(png)) != 0)
        return false;
    step();
    return true;
}

bool readPngInfo(base::Stream& stream, ImageInfo& info);
ref<Image> readPng(base::Stream& stream);

/// Writes a picture of bytes or shorts in a format that is neither `kRG` nor compressed.
bool writePng(base::Stream& stream, const Image& image, const PngWriteSettings& settings);

} // namespace iio
