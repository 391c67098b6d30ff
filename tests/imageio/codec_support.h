#pragma once

#include "i_file.h"
#include "i_plugin.h"
#include "log_capture.h"
#include "picture_builder.h"
#include "temp_folder.h"

#include "stream/b_stream_workers.h"

#include <cstdio>
#include <filesystem>

/// What the tests of the formats share.
namespace iio {

using Bytes = vector<u8>;

/// Loads from a copy of exactly these bytes, so that reading beyond it shows.
inline ref<Image> loadBytes(const Bytes& bytes, const char* name) {
    const std::unique_ptr<u8[]> exact(new u8[bytes.size()]);
    std::copy(bytes.cbegin(), bytes.cend(), exact.get());
    base::Stream stream = base::memStreamView(exact.get(), bytes.size(), name);
    return loadImage(stream);
}

/// A small file of the fuzzers, by format and name.
inline Bytes readSeed(const string& name) {
    const string path = string(IMAGE_SEEDS "/") + name;
    std::unique_ptr<std::FILE, int (*)(std::FILE*)> file(std::fopen(path.c_str(), "rb"),
                                                         std::fclose);
    Bytes bytes(std::filesystem::file_size(path.c_str()), 0);
    EXPECT_EQ(std::fread(bytes.data(), 1, bytes.size(), file.get()), bytes.size());
    return bytes;
}

inline bool readInfoOf(const Bytes& bytes, const char* name, ImageInfo& info) {
    base::Stream stream = base::memStreamView(bytes.data(), bytes.size(), name);
    return readImageInfo(stream, info);
}

/// The file that saving makes; empty if it fails.
inline Bytes saveBytes(Image& image, const char* name,
                       const base::AttribMap& attributes = base::AttribMap()) {
    Bytes bytes;
    base::Stream stream = base::vectorStream(bytes, name);
    return saveImage(image, stream, attributes) ? bytes : Bytes();
}

/// A picture of the bytes 1, 2, 3...
inline ref<Image> makeCounting(u32 width, u32 height, u8 format,
                               u8 type = Image::IT_UNSIGNED_BYTE) {
    ref<Image> image = makeImage(width, height, format, type);
    for (u64 i = 0; i < image->memorySize(); ++i)
        image->data()[i] = static_cast<u8>(i + 1);
    return image;
}

template <class T>
T valueOf(const base::AttribMap& attributes, base::name_id name) {
    const T* value = attributes.findAttribute<T>(name);
    return value ? *value : T();
}

} // namespace iio
