#include "assimp/import_textures.h"

#include "assimp/embedded_textures.h"
#include "assimp/import_polygons.h"
#include "assimp/picture_decoding.h"

#include "b_exception.h"
#include "b_log.h"
#include "scene_image_record.h"
#include "stream/b_fs.h"

#include <assimp/material.h>

#include <algorithm>
#include <array>

namespace assimp {

namespace fs = base::fs;
using base::string;
using base::string_view;
using base::u64;
using base::vector;
using scene::Enumeration;

namespace {

/// Codes of `wrapModeU` and `wrapModeV`.
enum Wrap : Enumeration { wrapRepeat, wrapMirror, wrapClamp, wrapBorder };

Enumeration readWrap(const MaterialProperties& material, const PropertyKey& key) {
    switch (material.readInt(key, aiTextureMapMode_Wrap)) {
    case aiTextureMapMode_Mirror:
        return wrapMirror;
    case aiTextureMapMode_Clamp:
        return wrapClamp;
    case aiTextureMapMode_Decal:
        return wrapBorder;
    default:
        return wrapRepeat;
    }
}

/// True if the texture is not laid out by texture coordinates as they are.
bool isTransformed(const MaterialProperties& material, unsigned type) {
    constexpr std::array<float, 5> identity = {0, 0, 1, 1, 0}; // translation, scale, angle
    std::array<float, 5> transform = identity;
    material.read({AI_MATKEY_UVTRANSFORM(type, 0)}, transform);
    return transform != identity || material.readInt({AI_MATKEY_MAPPING(type, 0)},
                                                     aiTextureMapping_UV) != aiTextureMapping_UV;
}

string joinedList(const vector<string>& texts) {
    string list;
    for (const string& text : texts)
        list.append(list.empty() ? "" : ", ").append(text);
    return list;
}

using Bytes = vector<base::u8>;

constexpr u64 greatestFile = u64(1) << 29;

/// The bytes from the start of a file, at most `count`.
Bytes readBytes(base::Stream& file, u64 count) {
    Bytes bytes;
    bytes.resizeUninitialized(std::min(count, file.size()));
    file.setPosition(0);
    bytes.resize(file.read(bytes.data(), bytes.size()));
    return bytes;
}

} // namespace

TextureImport::TextureImport(const aiScene& source, const string& path,
                             vector<string> resourcePaths, base::PluginFactory& factory)
    : source_(source), factory_(factory), modelPath_(path),
      search_(path, std::move(resourcePaths)) {}

TextureSlot TextureImport::read(const MaterialProperties& material, unsigned type) {
    TextureSlot slot;
    slot.path = material.readText({AI_MATKEY_TEXTURE(type, 0)});
    if (slot.path.empty())
        return slot;
    static_cast<PictureFile&>(slot) = findFile(slot.path, material.readText({AI_MATKEY_NAME}));
    slot.wrapU = readWrap(material, {AI_MATKEY_MAPPINGMODE_U(type, 0)});
    slot.wrapV = readWrap(material, {AI_MATKEY_MAPPINGMODE_V(type, 0)});
    slot.channel =
        static_cast<base::u32>(std::max(material.readInt({AI_MATKEY_UVWSRC(type, 0)}, 0), 0));
    transformedCount_ += slot && isTransformed(material, type);
    return slot;
}

const PictureFile& TextureImport::findFile(const string& path, string_view material) {
    const auto [at, isNew] = files_.try_emplace(path);
    if (isNew)
        at->second = searchFile(path, material);
    return at->second;
}

PictureFile TextureImport::searchFile(const string& path, string_view material) {
    vector<string> tried;
    try {
        if (const aiTexture* embedded = findEmbedded(source_, path)) {
            const auto [at, isNew] = embeddedFiles_.try_emplace(embedded);
            if (isNew)
                at->second = writeEmbedded(*embedded, path, *pictures_);
            return {at->second, modelPath_};
        }
        if (const string file = findPicture(path, tried); !file.empty()) {
            const auto [at, isNew] = readableFiles_.try_emplace(file);
            if (isNew)
                at->second = readableFile(file);
            return {at->second, file};
        }
        base::log().log(base::logScene, base::logWarning,
                        "assimp |{}| Unable to find the texture '{}', it is left out! Tried: {}",
                        material, path, joinedList(tried));
    } catch (const std::exception& e) {
        base::log().log(base::logScene, base::logWarning,
                        "assimp |{}| The texture '{}' is left out! {}", material, path, e.what());
    }
    return {};
}

/// The absolute path of a picture file, empty if it is not found: exporters look for relative ones
/// elsewhere first.
string TextureImport::findPicture(const string& path, vector<string>& tried) {
    const string file = search_.find(path, tried);
    return file.empty() ? file : fs::normalized(fs::joined(fs::master().curdir(), file));
}

void TextureImport::mention(const string& path) {
    vector<string> tried;
    if (const string file = findPicture(path, tried); !file.empty())
        mentionedFiles_.push_back(file);
}

vector<string> TextureImport::foundFiles() const {
    vector<string> files = mentionedFiles_;
    for (const auto& [file, readable] : readableFiles_)
        files.push_back(file);
    return files;
}

/// The file, or one of what exporters should read in its place: what they can't read, or not under
/// its name, would make the document invalid. Throws `base::exception` for what nobody can read.
string TextureImport::readableFile(const string& file) {
    base::Stream stream;
    fs::master().open(stream, file, base::fs::openRead);
    const Bytes start = readBytes(stream, headerLength);
    const PictureKind kind = kindOf({start.data(), start.size()}, fs::extension(file));
    if (mayHaveExtension(kind, fs::extension(file))) {
        checkPicture(stream, kind);
        return file;
    }
    const Bytes bytes = readBytes(stream, greatestFile);
    return pictures_->addReadable(fs::stem(file), {bytes.data(), bytes.size()}, kind);
}

base::ref<base::IPlugin> TextureImport::create(const TextureSlot& slot, Enumeration channels,
                                               const aiMesh& mesh) {
    using Schema = scene::fileTexture_schema;
    const string set = slot.channel == 0 ? string() : textureSetName(mesh, slot.channel);
    base::ref<base::IPlugin>& texture =
        textures_[Key(slot.file, slot.wrapU, slot.wrapV, set, channels)];
    if (texture)
        return texture;
    texture = factory_.create(Schema::n_kind);
    write(*texture, scene::texture_schema::n_name) = fs::stem(slot.file);
    write(*texture, Schema::n_file) = slot.file;
    scene::setIgnoresOpaqueAlpha(*texture);
    if (slot.source != slot.file)
        scene::setPictureSource(*texture, slot.source);
    if (!set.empty())
        write(*texture, scene::texture_schema::n_uvSet) = set;
    if (slot.wrapU != wrapRepeat)
        write(*texture, scene::texture_schema::n_wrapModeU) = slot.wrapU;
    if (slot.wrapV != wrapRepeat)
        write(*texture, scene::texture_schema::n_wrapModeV) = slot.wrapV;
    if (channels != 0)
        write(*texture, scene::bitmapTexture_schema::n_colorChannels) = channels;
    return texture;
}

} // namespace assimp
