#include "host/document_counts.h"

#include "host/document_stream.h"
#include "host/paths.h"

#include "b_exception.h"
#include "b_format.h"
#include "stream/b_fs.h"

#include <rapidjson/error/en.h>
#include <rapidjson/reader.h>

#include <algorithm>

namespace host {

using base::Stream;
using base::string;
using base::string_view;
using base::u32;
using base::u64;
using base::vector;

namespace {

[[noreturn]] void fail(const string& text) {
    throw base::exception(text, "document_counts", "host::readOutput", __LINE__);
}

/// The member names that lead to what is counted.
namespace member {
enum Name : u64 {
    other,
    accessors,
    animations,
    attributes,
    buffers,
    bufferView,
    bufferViews,
    byteLength,
    commonMaterials,
    count,
    extensions,
    images,
    indices,
    input,
    joints,
    light,
    materials,
    meshes,
    mode,
    nodes,
    position,
    primitives,
    samplers,
    skins,
    targets,
    uri,
    nameCount
};
} // namespace member

constexpr string_view memberNames[] = {"",
                                       "accessors",
                                       "animations",
                                       "attributes",
                                       "buffers",
                                       "bufferView",
                                       "bufferViews",
                                       "byteLength",
                                       "KHR_materials_common",
                                       "count",
                                       "extensions",
                                       "images",
                                       "indices",
                                       "input",
                                       "joints",
                                       "light",
                                       "materials",
                                       "meshes",
                                       "mode",
                                       "nodes",
                                       "POSITION",
                                       "primitives",
                                       "samplers",
                                       "skins",
                                       "targets",
                                       "uri"};
static_assert(std::size(memberNames) == member::nameCount);

/// The names of the objects that a place in the document lies in, from the root on, in one
/// number. Arrays add nothing.
constexpr u64 pathBase = 32;
static_assert(member::nameCount <= pathBase);
constexpr u64 pathOf(std::initializer_list<member::Name> names) {
    u64 path = 0;
    for (const member::Name name : names)
        path = path * pathBase + name;
    return path;
}

/// What a place is not looked at for, nor anything inside of it.
constexpr u64 noPath = ~u64(0);

struct PrimitiveCounts {
    static constexpr u64 absent = ~u64(0);
    u64 mode = 4;
    u64 indices = absent; ///< numbers of accessors
    u64 position = absent;
    u64 targets = 0;
};

/// A reference to bytes.
struct Resource {
    string uri;         ///< "data:" for embedded data, empty for none
    u64 dataLength = 0; ///< length of the text of embedded data
    u64 view = PrimitiveCounts::absent;
};

/// Collects from the events of the JSON reader what is counted.
class DocumentHandler : public rapidjson::BaseReaderHandler<rapidjson::UTF8<>, DocumentHandler> {
public:
    explicit DocumentHandler(const DocumentStream& stream) : stream_(stream) {}

    bool Key(const char* text, rapidjson::SizeType length, bool) {
        const auto* found = std::ranges::find(memberNames, string_view(text, length));
        const u64 outer = paths_.size() < 2 ? 0 : std::as_const(paths_).end()[-2];
        const bool isKnown = found != std::end(memberNames) && outer != noPath;
        paths_.back() = isKnown ? outer * pathBase + static_cast<u64>(found - memberNames) : noPath;
        return true;
    }
    bool StartObject() {
        startElement(path());
        paths_.push_back(path());
        return true;
    }
    bool EndObject(rapidjson::SizeType) {
        paths_.pop_back();
        return true;
    }
    bool String(const char* text, rapidjson::SizeType length, bool) {
        if (path() == pathOf({member::buffers, member::uri}))
            setUri(buffers_.back(), {text, length});
        else if (path() == pathOf({member::images, member::uri}))
            setUri(images_.back(), {text, length});
        return true;
    }
    bool Int(int value) { return number(static_cast<u64>(base::i64(value))); } // negative ones
    bool Uint(unsigned value) { return number(value); }
    bool Uint64(uint64_t value) { return number(value); }
    bool Default() { return true; }

    DocumentCounts counts() const;
    const vector<Resource>& bufferResources() const { return buffers_; }
    const vector<Resource>& imageResources() const { return images_; }
    u64 viewedImageBytes() const;

private:
    u64 path() const { return paths_.cend()[-1]; }
    void startElement(u64 place);
    bool number(u64 value);
    void setUri(Resource& resource, string_view text);
    u64 accessorCount(u64 accessor) const;
    u64 countTriangles(const PrimitiveCounts& primitive) const;

    const DocumentStream& stream_;
    vector<u64> paths_ = {0}; ///< of the present member of each open object, outermost first
    DocumentCounts counts_;
    vector<u64> accessorCounts_;
    vector<u64> viewLengths_;
    vector<PrimitiveCounts> primitives_;
    vector<u64> meshTargets_;   ///< by mesh
    vector<u64> samplerInputs_; ///< accessors of key times
    vector<Resource> buffers_;
    vector<Resource> images_;
};

void DocumentHandler::startElement(u64 place) {
    if (place == pathOf({member::nodes}))
        ++counts_.nodes;
    else if (place == pathOf({member::meshes}))
        meshTargets_.push_back(0);
    else if (place == pathOf({member::materials}))
        ++counts_.materials;
    else if (place == pathOf({member::animations}))
        ++counts_.animations;
    else if (place == pathOf({member::skins}))
        ++counts_.skins;
    else if (place == pathOf({member::meshes, member::primitives}))
        primitives_.emplace_back();
    else if (place == pathOf({member::meshes, member::primitives, member::targets}))
        meshTargets_.back() = std::max(meshTargets_.back(), ++primitives_.back().targets);
    else if (place == pathOf({member::accessors}))
        accessorCounts_.push_back(0);
    else if (place == pathOf({member::bufferViews}))
        viewLengths_.push_back(0);
    else if (place == pathOf({member::buffers}))
        buffers_.emplace_back();
    else if (place == pathOf({member::images}))
        images_.emplace_back();
}

bool DocumentHandler::number(u64 value) {
    const u64 place = path();
    if (place == pathOf({member::accessors, member::count}))
        accessorCounts_.back() = value;
    else if (place == pathOf({member::meshes, member::primitives, member::mode}))
        primitives_.back().mode = value;
    else if (place == pathOf({member::meshes, member::primitives, member::indices}))
        primitives_.back().indices = value;
    else if (place ==
             pathOf({member::meshes, member::primitives, member::attributes, member::position}))
        primitives_.back().position = value;
    else if (place == pathOf({member::skins, member::joints}))
        ++counts_.joints;
    else if (place == pathOf({member::animations, member::samplers, member::input}))
        samplerInputs_.push_back(value);
    else if (place ==
             pathOf({member::nodes, member::extensions, member::commonMaterials, member::light}))
        ++counts_.lights;
    else if (place == pathOf({member::bufferViews, member::byteLength}))
        viewLengths_.back() = value;
    else if (place == pathOf({member::images, member::bufferView}))
        images_.back().view = value;
    return true;
}

void DocumentHandler::setUri(Resource& resource, string_view text) {
    resource.uri = text;
    resource.dataLength = stream_.skipped() == 0 ? 0 : text.size() + stream_.skipped();
}

/// Elements of the accessor, 0 if there is none of that number.
u64 DocumentHandler::accessorCount(u64 accessor) const {
    return accessor < accessorCounts_.size() ? accessorCounts_[accessor] : 0;
}

u64 DocumentHandler::countTriangles(const PrimitiveCounts& primitive) const {
    const u64 corners = accessorCount(
        primitive.indices == PrimitiveCounts::absent ? primitive.position : primitive.indices);
    switch (primitive.mode) {
    case 4: // list
        return corners / 3;
    case 5: // strip
    case 6: // fan
        return corners < 3 ? 0 : corners - 2;
    default:
        return 0;
    }
}

DocumentCounts DocumentHandler::counts() const {
    DocumentCounts counts = counts_;
    counts.images = images_.size();
    for (const PrimitiveCounts& primitive : primitives_)
        counts.triangles += countTriangles(primitive);
    counts.meshes = meshTargets_.size();
    for (const u64 targets : meshTargets_)
        counts.targets += targets;
    for (const u64 accessor : samplerInputs_)
        counts.samples += accessorCount(accessor);
    return counts;
}

/// The bytes of all buffer views that hold an image.
u64 DocumentHandler::viewedImageBytes() const {
    vector<u64> views;
    for (const Resource& image : images_)
        if (image.view < viewLengths_.size())
            views.push_back(image.view);
    std::sort(views.begin(), views.end());
    views.erase(std::unique(views.begin(), views.end()), views.end());
    u64 sum = 0;
    for (const u64 view : views)
        sum += viewLengths_[view];
    return sum;
}

void readJson(DocumentStream& stream, DocumentHandler& handler, const string& path) {
    rapidjson::Reader reader;
    const rapidjson::ParseResult result =
        reader.Parse<rapidjson::kParseIterativeFlag>(stream, handler);
    if (!result)
        fail(base::format("'{}' is broken at byte {} of its text: {}", path, result.Offset(),
                          rapidjson::GetParseError_En(result.Code())));
}

/// Adds the size of the data that `resource` holds or refers to, to `bytes`, and the file in
/// which it lies to `files`, unless it is there already.
void addResource(const Resource& resource, const string& folder, vector<WrittenFile>& files,
                 u64& bytes) {
    if (resource.dataLength != 0) {
        bytes += resource.dataLength;
        return;
    }
    if (resource.uri.empty())
        return;
    const string path = folder + resource.uri;
    if (std::ranges::find(files, path, &WrittenFile::path) != files.end())
        return;
    std::error_code error;
    const u64 fileBytes = std::filesystem::file_size(systemPath(path), error);
    if (error) // the exporter has told that it could not write it
        return;
    files.push_back({path, fileBytes});
    bytes += fileBytes;
}

constexpr u32 containerMagic = 0x46546C67; // "glTF"
constexpr u32 jsonChunk = 0x4E4F534A;
constexpr u32 binaryChunk = 0x004E4942;

/// Little-endian numbers; fewer if the stream ends.
vector<u32> readNumbers(Stream& stream, std::size_t wanted) {
    vector<base::u8> bytes(wanted * 4);
    const std::size_t got = static_cast<std::size_t>(stream.read(bytes.data(), bytes.size())) / 4;
    vector<u32> numbers;
    for (std::size_t i = 0; i < got; ++i) {
        const base::u8* b = bytes.cbegin() + 4 * i;
        numbers.push_back(u32(b[0]) | u32(b[1]) << 8 | u32(b[2]) << 16 | u32(b[3]) << 24);
    }
    return numbers;
}

/// The length of the binary chunk, which starts behind the JSON text; 0 if there is none.
u64 readBinaryLength(Stream& stream, u64 jsonEnd) {
    stream.setPosition(static_cast<base::i64>(jsonEnd));
    const vector<u32> header = readNumbers(stream, 2);
    return header.size() == 2 && header[1] == binaryChunk ? header[0] : 0;
}

} // namespace

u64 Output::totalBytes() const {
    u64 sum = 0;
    for (const WrittenFile& file : files)
        sum += file.bytes;
    return sum;
}

Output readOutput(const string& path) {
    Output output;
    if (isSpecialFile(path))
        return output;
    Stream stream;
    base::fs::master().open(stream, path, base::fs::openRead | base::fs::openShareRead);
    const u64 fileBytes = stream.size();
    output.files.push_back({path, fileBytes});

    // A container has the length of its JSON text behind its own header.
    constexpr u64 headerBytes = 20;
    const vector<u32> header = readNumbers(stream, headerBytes / 4);
    const bool isContainer = !header.empty() && header[0] == containerMagic;
    if (isContainer && (header.size() != headerBytes / 4 || header[2] != fileBytes ||
                        header[4] != jsonChunk || headerBytes + header[3] > fileBytes))
        fail(base::format("'{}' is no whole container.", path));
    const u64 jsonBegin = isContainer ? headerBytes : 0;
    const u64 jsonLength = isContainer ? header[3] : fileBytes;
    stream.setPosition(static_cast<base::i64>(jsonBegin));
    char first = '\0';
    if (!isContainer && (stream.read(&first, 1) != 1 || first != '{'))
        return output;
    stream.setPosition(static_cast<base::i64>(jsonBegin));

    DocumentStream text(stream, jsonLength);
    DocumentHandler handler(text);
    readJson(text, handler, path);

    DocumentCounts counts = handler.counts();
    for (const Resource& image : handler.imageResources())
        addResource(image, base::fs::folder(path), output.files, counts.imageBytes);
    for (const Resource& buffer : handler.bufferResources())
        addResource(buffer, base::fs::folder(path), output.files, counts.geometryBytes);
    if (isContainer) {
        const u64 images = handler.viewedImageBytes();
        const u64 binary = readBinaryLength(stream, jsonBegin + jsonLength);
        counts.imageBytes += images;
        counts.geometryBytes += binary < images ? 0 : binary - images;
    }
    const u64 total = output.totalBytes();
    const u64 data = counts.imageBytes + counts.geometryBytes;
    counts.jsonBytes = total < data ? 0 : total - data;
    output.document = counts;
    return output;
}

Output findOutput(const vector<string>& paths, u64 objects) {
    Output output;
    for (const string& path : paths)
        if (!isSpecialFile(path))
            output.files.push_back({path, std::filesystem::file_size(systemPath(path))});
    output.objects = objects;
    return output;
}

} // namespace host
