#include "texture_floor.h"

#include "picture_floor.h"

#include <cstdio>
#include <fstream>
#include <stdexcept>

#include <jpeglib.h>

namespace bench {

using base::u32;
using base::u64;
using base::u8;
using base::vector;

namespace {

constexpr int jpegQuality = 95;

vector<u8> readWhole(const std::string& path) {
    std::ifstream file(path, std::ios::binary | std::ios::ate);
    vector<u8> bytes;
    bytes.resizeUninitialized(static_cast<std::size_t>(file.tellg()));
    file.seekg(0);
    if (!file.read(reinterpret_cast<char*>(bytes.data()),
                   static_cast<std::streamsize>(bytes.size())))
        throw std::runtime_error(path + " can't be read");
    return bytes;
}

vector<u8> decode(const std::string& path, u64 byteCount) {
    vector<u8> pixels = decodePng(readWhole(path));
    if (pixels.size() != byteCount)
        throw std::runtime_error(path + " is another picture");
    return pixels;
}

u64 encode(const vector<u8>& pixels, u32 side) {
    return encodeJpeg(pixels.data(), side, side, jpegQuality).size();
}

} // namespace

u64 convertBare(const std::string& path, u32 side) {
    return encode(decode(path, u64(side) * side * 3), side);
}

u64 convertHalvedBare(const std::string& path, u32 side) {
    const vector<u8> source = decode(path, u64(side) * side * 3);
    vector<u8> target;
    target.resizeUninitialized(source.size() / 4);
    halveBare(source.data(), side, side, target.data());
    return encode(target, side / 2);
}

u64 packBare(const std::string& roughness, u32 side, const std::string& metal, u32 metalSide) {
    const vector<u8> greens = decode(roughness, u64(side) * side);
    const vector<u8> blues = decode(metal, u64(metalSide) * metalSide);
    const u32 shift = side == metalSide ? 0 : 1;
    vector<u8> packed;
    packed.resizeUninitialized(greens.size() * 3);
    u8* pixel = packed.data();
    for (u32 y = 0; y < side; ++y) {
        const u8* green = greens.data() + u64(side) * y;
        const u8* blue = blues.data() + u64(metalSide) * (y >> shift);
        for (u32 x = 0; x < side; ++x, pixel += 3) {
            pixel[0] = 0;
            pixel[1] = green[x];
            pixel[2] = blue[x >> shift];
        }
    }
    return encode(packed, side);
}

PictureSize readJpegSize(std::span<const u8> file) {
    jpeg_decompress_struct jpeg;
    jpeg_error_mgr errors;
    jpeg.err = jpeg_std_error(&errors);
    jpeg_create_decompress(&jpeg);
    jpeg_mem_src(&jpeg, file.data(), file.size());
    jpeg_read_header(&jpeg, TRUE);
    const PictureSize size{jpeg.image_width, jpeg.image_height};
    jpeg_destroy_decompress(&jpeg);
    return size;
}

} // namespace bench
