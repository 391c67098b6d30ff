#include "gltf/output_files.h"

#include "GLTF/json_text.h"
#include "gltf/guarded.h"
#include "gltf/image_uris.h"

#include "stream/b_fs.h"

#include <limits>

namespace gltf {

using base::ref;
using base::string;
using base::string_view;
using base::u32;
using base::u64;
using base::u8;
using GLTF::Asset;
using GLTF::Buffer;
using GLTF::Image;

namespace {

constexpr const char* mainFileMessage = "Unable to write the GLTF file!";
constexpr const char* imageMessage = "Couldn't write the image to external file!";
constexpr const char* bufferMessage = "Couldn't write the binary buffer to external file!";

// Text form

/// Passes the pieces of a text on to a stream as if they were written at once: when one comes out
/// short, the rest is only counted.
class StreamSink final : public GLTF::TextSink {
public:
    explicit StreamSink(base::Stream& stream) : stream_(stream) {}

    void write(string_view piece) override {
        if (written_ == wanted_)
            written_ += stream_.write(piece.data(), piece.size());
        wanted_ += piece.size();
    }
    /// Throws if not all of the text was written.
    void finish() const {
        if (written_ != wanted_)
            throw base::exception(
                base::format("stream '{}': trying to write {} bytes, written {} bytes",
                             stream_.name(), wanted_, written_),
                "output_files", "gltf::StreamSink::finish", __LINE__);
    }

private:
    base::Stream& stream_;
    u64 wanted_ = 0;
    u64 written_ = 0;
};

void writeText(const string& path, string_view json) {
    base::Stream stream = base::fs::createFile(path);
    stream.setFlags(stream.flags() & ~u32(base::streamThrowOnShortWrite));
    StreamSink sink(stream);
    GLTF::writePretty(json, sink);
    sink.finish();
    stream.close();
}

// Container

constexpr u32 jsonChunk = 0x4E4F534A;
constexpr u32 binaryChunk = 0x004E4942;

/// Writes the fields of a container, each by one write.
class ContainerWriter {
public:
    explicit ContainerWriter(base::Stream& stream) : stream_(stream) {}

    void bytes(const void* data, u64 count) { stream_.write(data, count); }
    void number(u32 value) {
        const u8 littleEndian[] = {static_cast<u8>(value), static_cast<u8>(value >> 8),
                                   static_cast<u8>(value >> 16), static_cast<u8>(value >> 24)};
        bytes(littleEndian, sizeof littleEndian);
    }
    void padding(u64 count, char value) {
        for (; count != 0; --count)
            bytes(&value, 1);
    }

private:
    base::Stream& stream_;
};

u64 paddingOf(u64 length) {
    return -length & 3;
}

void writeContainer(const string& path, string_view json, const Buffer& buffer, bool isVersion1) {
    const u64 jsonPadding = paddingOf(json.size());
    const auto bufferLength = static_cast<u64>(buffer.byteLength);
    const u64 bufferPadding = paddingOf(bufferLength);
    const u64 total =
        json.size() + jsonPadding + bufferLength + bufferPadding + (isVersion1 ? 20 : 28);
    if (total > std::numeric_limits<u32>::max())
        throw base::exception(
            base::format("The file would have {} bytes, a container holds at most 4294967295",
                         total),
            "output_files", "gltf::writeContainer", __LINE__);

    base::Stream stream = base::fs::createFile(path);
    ContainerWriter out(stream);
    out.bytes("glTF", 4);
    out.number(isVersion1 ? 1 : 2);
    out.number(static_cast<u32>(total));
    out.number(static_cast<u32>(json.size() + jsonPadding));
    out.number(isVersion1 ? 0 : jsonChunk);
    out.bytes(json.data(), json.size());
    out.padding(jsonPadding, ' ');
    if (!isVersion1) {
        out.number(static_cast<u32>(bufferLength + bufferPadding));
        out.number(binaryChunk);
    }
    out.bytes(buffer.data, bufferLength);
    out.padding(bufferPadding, 0);
    stream.close();
}

/// Appends the files of the images to the buffer, without gaps.
void packImages(const base::vector<Image*>& images, Buffer& buffer) {
    u64 byteLength = static_cast<u64>(buffer.byteLength);
    for (const Image* image : images)
        byteLength += static_cast<u64>(image->byteLength);
    if (byteLength == static_cast<u64>(buffer.byteLength))
        return;
    if (byteLength > static_cast<u64>(std::numeric_limits<base::i32>::max()))
        throw base::exception(
            base::format("Geometry and images have {} bytes, which exceeds the 2147483647 bytes "
                         "of a buffer",
                         byteLength),
            "output_files", "gltf::packImages", __LINE__);

    auto* data = static_cast<u8*>(base::AllocPolicy::allocate(byteLength));
    if (buffer.byteLength > 0)
        std::memcpy(data, buffer.data, static_cast<std::size_t>(buffer.byteLength));
    if (buffer.ownsData)
        base::AllocPolicy::free(buffer.data);
    buffer.data = data;
    buffer.ownsData = true;
    for (Image* image : images) {
        // An image that could not be read is referred to by its uri alone.
        if (!image->data || image->byteLength <= 0)
            continue;
        image->moveInto(base::makeRef<GLTF::BufferView>(buffer.byteLength, image->byteLength,
                                                        ref<Buffer>(&buffer),
                                                        GLTF::BufferView::noTarget));
        buffer.byteLength += image->byteLength;
    }
}

// Files

void writeMainFile(Asset& asset, const GLTF::Options& options, const Buffer& buffer,
                   const string& path) {
    const GLTF::JsonText json(asset, options);
    guarded(mainFileMessage, [&] {
        if (options.binary)
            writeContainer(path, json.view(), buffer, options.version == "1.0");
        else
            writeText(path, json.view());
    });
}

/// A source may be the file of an image only if it holds the same: it stays as it is.
void writeImages(const base::vector<Image*>& images, const SourceFiles& sources,
                 const string& folder) {
    for (const Image* image : images) {
        const string path = folder + image->uri;
        if (image->data && image->byteLength > 0)
            guarded(imageMessage, [&] {
                if (!sources.contains(path))
                    base::fs::writeFile(path, image->data, static_cast<u64>(image->byteLength));
            });
        else
            base::log().log(base::logScene, base::logWarning,
                            "gltf |{}| The image has no data, its file is not written!",
                            image->uri);
    }
}

} // namespace

void writeOutputFiles(Asset& asset, const GLTF::Options& options, Buffer& buffer,
                      const SourceFiles& sources, const string& path) {
    const string folder = base::fs::folder(path);
    const base::vector<Image*> images = asset.getAllImages();
    if (!options.embedTextures)
        makeUrisUnique(images, sources, {path, folder + buffer.uri}, folder);
    if (options.binary && options.version == "1.0")
        buffer.stringId = "binary_glTF";

    const bool packsImages = options.binary && options.embedTextures;
    if (!packsImages || guarded(mainFileMessage, [&] { packImages(images, buffer); }))
        writeMainFile(asset, options, buffer, path);
    if (!options.embedTextures)
        writeImages(images, sources, folder);
    // A buffer that nothing refers to has no place in the document, and no name.
    if (!options.embedBuffers && !buffer.uri.empty())
        guarded(bufferMessage, [&] {
            base::fs::writeFile(folder + buffer.uri, buffer.data,
                                static_cast<u64>(buffer.byteLength));
        });
}

} // namespace gltf
