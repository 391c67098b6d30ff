#include "picture_floor.h"

#include "b_filter.h"

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <cstring>
#include <random>

#include <jpeglib.h>
#include <png.h>

namespace bench {

using base::u32;
using base::u64;
using base::u8;
using base::vector;

base::ref<iio::Image> makePhotograph(u32 width, u32 height, u8 format, u32 seed) {
    auto image =
        base::makeRef<iio::Image>(width, height, 1u, 1u, format, u8(iio::Image::IT_UNSIGNED_BYTE));
    std::mt19937 random(seed);
    const u32 channels = image->channelCount();
    for (u32 y = 0; y < height; ++y) {
        u8* pixel = image->row(y);
        for (u32 x = 0; x < width; ++x, pixel += channels) {
            const int ground = static_cast<int>((x + y) * 200 / (width + height));
            const int edge = (x / 97 + y / 61) % 3 == 0 ? 40 : 0;
            const int grain = static_cast<int>(random() % 8);
            for (u32 c = 0; c < channels; ++c)
                pixel[c] = static_cast<u8>(ground + edge + grain + static_cast<int>(c) * 2);
        }
    }
    return image;
}

namespace {

struct PngSource {
    const u8* next;
};

void readPng(png_structp png, png_bytep target, size_t byteCount) {
    auto* source = static_cast<PngSource*>(png_get_io_ptr(png));
    std::memcpy(target, source->next, byteCount);
    source->next += byteCount;
}

} // namespace

vector<u8> decodePng(const vector<u8>& file) {
    png_structp png = png_create_read_struct(PNG_LIBPNG_VER_STRING, nullptr, nullptr, nullptr);
    png_infop info = png_create_info_struct(png);
    PngSource source{file.data()};
    png_set_read_fn(png, &source, readPng);
    png_read_info(png, info);
    png_set_expand(png);
    png_set_packing(png);
    png_set_interlace_handling(png);
    png_read_update_info(png, info);
    const size_t rowBytes = png_get_rowbytes(png, info);
    const u32 height = png_get_image_height(png, info);
    vector<u8> pixels;
    pixels.resizeUninitialized(rowBytes * height);
    u8* row = pixels.data();
    for (u32 y = 0; y < height; ++y, row += rowBytes)
        png_read_row(png, row, nullptr);
    png_read_end(png, nullptr);
    png_destroy_read_struct(&png, &info, nullptr);
    return pixels;
}

vector<u8> decodeJpeg(const vector<u8>& file) {
    jpeg_decompress_struct jpeg;
    jpeg_error_mgr errors;
    jpeg.err = jpeg_std_error(&errors);
    jpeg_create_decompress(&jpeg);
    jpeg_mem_src(&jpeg, file.data(), file.size());
    jpeg_read_header(&jpeg, TRUE);
    jpeg_start_decompress(&jpeg);
    const size_t rowBytes =
        static_cast<size_t>(jpeg.output_width) * static_cast<size_t>(jpeg.output_components);
    vector<u8> pixels;
    pixels.resizeUninitialized(rowBytes * jpeg.output_height);
    u8* first = pixels.data();
    while (jpeg.output_scanline < jpeg.output_height) {
        JSAMPROW row = first + rowBytes * jpeg.output_scanline;
        jpeg_read_scanlines(&jpeg, &row, 1);
    }
    jpeg_finish_decompress(&jpeg);
    jpeg_destroy_decompress(&jpeg);
    return pixels;
}

vector<u8> encodeJpeg(const u8* pixels, u32 width, u32 height, int quality) {
    jpeg_compress_struct jpeg;
    jpeg_error_mgr errors;
    jpeg.err = jpeg_std_error(&errors);
    jpeg_create_compress(&jpeg);
    unsigned char* bytes = nullptr;
    unsigned long byteCount = 0;
    jpeg_mem_dest(&jpeg, &bytes, &byteCount);
    jpeg.image_width = width;
    jpeg.image_height = height;
    jpeg.input_components = 3;
    jpeg.in_color_space = JCS_RGB;
    jpeg_set_defaults(&jpeg);
    jpeg_set_quality(&jpeg, quality, TRUE);
    jpeg_start_compress(&jpeg, TRUE);
    while (jpeg.next_scanline < jpeg.image_height) {
        auto* row = const_cast<u8*>(pixels + u64(width) * 3 * jpeg.next_scanline);
        jpeg_write_scanlines(&jpeg, &row, 1);
    }
    jpeg_finish_compress(&jpeg);
    jpeg_destroy_compress(&jpeg);
    vector<u8> file(bytes, bytes + byteCount);
    std::free(bytes);
    return file;
}

void halveBare(const u8* source, u32 width, u32 height, u8* target) {
    constexpr u32 tapCount = 8;
    const base::KaiserFilter filter(1.5f);
    float weights[tapCount], sum = 0;
    for (u32 t = 0; t < tapCount; ++t) {
        weights[t] = filter.sampleBox(static_cast<float>(t) - 4, 0.5f, 32);
        sum += weights[t];
    }
    for (float& weight : weights)
        weight /= sum;

    const u64 sourceCount = u64(width) * 3, targetCount = u64(width / 2) * 3;
    vector<float> row(sourceCount), between(targetCount * height), sums(targetCount);
    for (u32 y = 0; y < height; ++y) {
        const u8* bytes = source + sourceCount * y;
        for (u64 k = 0; k < sourceCount; ++k)
            row[k] = static_cast<float>(bytes[k]) * (1.0f / 255);
        float* out = between.data() + targetCount * y;
        for (u32 x = 0; x < width / 2; ++x, out += 3) {
            const u32 first = std::clamp(2 * x, 3u, width - tapCount + 3) - 3;
            const float* taps = row.data() + u64(first) * 3;
            float red = 0, green = 0, blue = 0;
            for (u32 t = 0; t < tapCount; ++t) {
                red += weights[t] * taps[3 * t];
                green += weights[t] * taps[3 * t + 1];
                blue += weights[t] * taps[3 * t + 2];
            }
            out[0] = red;
            out[1] = green;
            out[2] = blue;
        }
    }
    for (u32 y = 0; y < height / 2; ++y) {
        const u32 first = std::clamp(2 * y, 3u, height - tapCount + 3) - 3;
        std::fill(sums.begin(), sums.end(), 0.0f);
        float* sumsOfRow = sums.data();
        for (u32 t = 0; t < tapCount; ++t) {
            const float* taps = between.data() + targetCount * (first + t);
            for (u64 k = 0; k < targetCount; ++k)
                sumsOfRow[k] += weights[t] * taps[k];
        }
        u8* bytes = target + targetCount * y;
        for (u64 k = 0; k < targetCount; ++k)
            bytes[k] = static_cast<u8>(static_cast<int>(std::max(sumsOfRow[k], 0.0f) * 255));
    }
}

} // namespace bench
