#include "require.h"

#include "i_file.h"

#include "stream/b_stream_workers.h"

#include <algorithm>

/// Loads any bytes as a file of the format `FUZZ_FORMAT`. What loads must be whole, be what
/// `readImageInfo` tells, and come back from a file that is written from it.
namespace {

using namespace iio;

constexpr base::string_view format = FUZZ_FORMAT;
constexpr u64 greatestSavedBytes = 1 << 16; ///< of pixels; writing more is slow

base::Stream view(const vector<u8>& bytes) {
    return base::memStreamView(bytes.data(), bytes.size(), base::string("input.") + FUZZ_FORMAT);
}

bool samePixels(const Image& a, const Image& b) {
    const u64 rowBytes = rowByteSize(a.width(), 1, a.format(), a.type());
    bool isSame = a.width() == b.width() && a.height() == b.height() && a.format() == b.format() &&
                  a.type() == b.type();
    for (u64 y = 0; isSame && y < a.rowCount(); ++y)
        isSame = std::equal(a.row(y), a.row(y) + rowBytes, b.row(y));
    return isSame;
}

void checkInfo(const vector<u8>& bytes, const Image& image) {
    base::Stream stream = view(bytes);
    ImageInfo info;
    require(readImageInfo(stream, info), "a picture without info");
    require(info.level0.width == image.width() && info.level0.height == image.height(),
            "another size than the info's");
    require(info.format == image.format() && info.type == image.type(),
            "another format than the info's");
}

void checkSaving(Image& image) {
    vector<u8> saved;
    {
        base::Stream stream = base::vectorStream(saved, base::string("input.") + FUZZ_FORMAT);
        require(saveImage(image, stream), "a picture that can't be saved");
    }
    base::Stream stream = view(saved);
    const ref<Image> read = loadImage(stream);
    require(bool(read), "a saved picture that can't be loaded");
    // TGA holds grey with alpha as colour.
    const bool keepsFormat = format != "tga" || image.format() != Image::kLuminanceAlpha;
    require(format == "jpeg" || !keepsFormat || samePixels(image, *read),
            "other pixels than were saved");
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const vector<u8> bytes(data, data + size);
    base::Stream stream = view(bytes);
    const ref<Image> image = loadImage(stream);
    if (!image) {
        // What does not load may still have an info, which must not do harm.
        base::Stream again = view(bytes);
        ImageInfo info;
        readImageInfo(again, info);
        return 0;
    }
    require(image->data() && image->isValid(), "a broken picture");
    require(samePixels(*image, *image), "pixels that differ from themselves"); // reads them all
    checkInfo(bytes, *image);
    if (image->memorySize() <= greatestSavedBytes)
        checkSaving(*image);
    return 0;
}
