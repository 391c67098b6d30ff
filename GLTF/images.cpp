#include "GLTF/document.h"

#include "GLTF/json_writer.h"

#include "b_byte_order.h"
#include "stream/b_fs.h"

#include <cstdio>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

namespace GLTF {

namespace {

/// The images by path. Borrowed: an image takes itself out when it dies. Never destroyed, so that
/// images may outlive the static objects.
base::map<string, Image*>& cache() {
    static auto& images = *new base::map<string, Image*>;
    return images;
}

struct FileBytes {
    u8* data = nullptr;
    i32 byteLength = 0;
};

/// Opens a regular file of a size that an image can hold, null for all else. Opening never waits,
/// as it would for a pipe without a writer.
std::FILE* openRegularFile(const string& path, std::size_t& byteCount) {
    const int descriptor = ::open(path.c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC);
    if (descriptor < 0)
        return nullptr;
    struct stat status;
    if (::fstat(descriptor, &status) == 0 && S_ISREG(status.st_mode) &&
        status.st_size <= std::numeric_limits<i32>::max()) {
        byteCount = static_cast<std::size_t>(status.st_size);
        if (std::FILE* file = ::fdopen(descriptor, "rb"))
            return file;
    }
    ::close(descriptor);
    return nullptr;
}

/// The whole file; no data if it can't be read to its end.
FileBytes readFile(const string& path) {
    FileBytes bytes;
    if (path.find('\0') != string::npos)
        return bytes;
    std::size_t byteCount = 0;
    const std::unique_ptr<std::FILE, int (*)(std::FILE*)> file(openRegularFile(path, byteCount),
                                                               &std::fclose);
    if (!file || byteCount == 0)
        return bytes;
    bytes.data = static_cast<u8*>(base::AllocPolicy::allocate(byteCount));
    bytes.byteLength = static_cast<i32>(byteCount);
    if (std::fread(bytes.data, 1, byteCount, file.get()) != byteCount) {
        base::AllocPolicy::free(bytes.data);
        return {};
    }
    return bytes;
}

string mimeTypeOf(const u8* data, i32 byteLength, const string& fileExtension) {
    if (byteLength >= 8 && std::memcmp(data + 1, "PNG\r\n\x1a\n", 7) == 0)
        return "image/png";
    if (byteLength >= 2 && data[0] == 0xff && data[1] == 0xd8)
        return "image/jpeg";
    return "image/" + fileExtension;
}

Image::Dimensions pngDimensions(const u8* data, i64 byteLength) {
    if (byteLength < 24)
        return {};
    const i64 width = base::readBigEndian<base::u32>(data + 16);
    const i64 height = base::readBigEndian<base::u32>(data + 20);
    if (std::max(width, height) > std::numeric_limits<i32>::max())
        return {};
    return {static_cast<i32>(width), static_cast<i32>(height)};
}

/// Steps from segment to segment up to the frame header, baseline (192) or progressive (194).
Image::Dimensions jpegDimensions(const u8* data, i64 byteLength) {
    i64 position = 4; // the length of the first segment
    while (position + 2 <= byteLength) {
        const i64 next = position + base::readBigEndian<base::u16>(data + position);
        if (next + 1 >= byteLength)
            break;
        if (data[next + 1] == 192 || data[next + 1] == 194) {
            if (next + 9 > byteLength)
                break;
            return {static_cast<i32>(base::readBigEndian<base::u16>(data + next + 7)),
                    static_cast<i32>(base::readBigEndian<base::u16>(data + next + 5))};
        }
        position = next + 2;
    }
    return {};
}

} // namespace

Image::Image(string imageUri, string key) : uri(std::move(imageUri)), cacheKey(std::move(key)) {}

Image::Image(string imageUri, u8* bytes, i32 length, const string& fileExtension, string key)
    : uri(std::move(imageUri)), data(bytes), byteLength(bytes ? std::max(length, 0) : 0),
      mimeType(mimeTypeOf(data, byteLength, fileExtension)), cacheKey(std::move(key)) {}

Image::~Image() {
    if (const auto entry = cache().find(cacheKey); entry != cache().end() && entry->second == this)
        cache().erase(entry);
    if (ownsData_)
        base::AllocPolicy::free(data);
}

void Image::moveInto(ref<BufferView> view) {
    u8* target = view->buffer->data + view->byteOffset;
    std::memcpy(target, data, static_cast<std::size_t>(byteLength));
    if (ownsData_)
        base::AllocPolicy::free(data);
    data = target;
    ownsData_ = false;
    bufferView = std::move(view);
}

string Image::typeName() const {
    return "image";
}

ref<Image> Image::load(const string& path) {
    if (const auto entry = cache().find(path); entry != cache().end())
        return entry->second;
    ref<Image> image = loadUncached(path);
    cache()[path] = image.get();
    return image;
}

ref<Image> Image::loadUncached(const string& path) {
    const string name = base::fs::fileName(path), extension = base::fs::extension(path);
    const FileBytes file = readFile(base::fs::master().resolve(path));
    if (!file.data)
        return base::makeRef<Image>(name, path);
    return base::makeRef<Image>(name, file.data, file.byteLength, extension, path);
}

void Image::clearCache() {
    cache().clear();
}

Image::Dimensions Image::getDimensions() const {
    if (mimeType == "image/png")
        return pngDimensions(data, byteLength);
    if (mimeType == "image/jpeg")
        return jpegDimensions(data, byteLength);
    return {};
}

void Image::writeJSON(JsonWriter& writer, const Options& options) {
    if (!options.embedTextures || !data) {
        writer.textMember("uri", uri);
    } else if (!options.binary) {
        writer.key("uri");
        writer.dataUriValue(mimeType, data, static_cast<std::size_t>(byteLength));
    } else {
        writer.intMember("bufferView", bufferView->id);
        writer.textMember("mimeType", mimeType);
    }
    Object::writeJSON(writer, options);
}

} // namespace GLTF
