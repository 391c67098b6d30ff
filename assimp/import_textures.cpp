#include "assimp/import_textures.h"

#include "assimp/embedded_textures.h"
#include "assimp/import_polygons.h"
#include "assimp/picture_decoding.h"

#include "b_exception.h"
#include "b_log.h"
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
bool isPlaced(const MaterialProperties& material, unsigned type) {
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

/// The first bytes of the file, at most `count`.
Bytes readFile(const string& path, u64 count) {
    base::Stream stream;
    fs::master().open(stream, path, base::fs::openRead);
    Bytes bytes;
    bytes.resizeUninitialized(std::min(count, stream.size()));
    bytes.resize(stream.read(bytes.data(), bytes.size()));
    return bytes;
}

} // namespace

TextureImport::TextureImport(const aiScene& source, const string& path,
                             vector<string> resourcePaths, base::PluginFactory& factory)
    : source_(source), factory_(factory), search_(path, std::move(resourcePaths)) {}

TextureSlot TextureImport::read(const MaterialProperties& material, unsigned type) {
    TextureSlot slot;
    slot.path = material.readText({AI_MATKEY_TEXTURE(type, 0)});
    if (slot.path.empty())
        return slot;
    slot.file = findFile(slot.path, material.readText({AI_MATKEY_NAME}));
    slot.wrapU = readWrap(material, {AI_MATKEY_MAPPINGMODE_U(type, 0)});
    slot.wrapV = readWrap(material, {AI_MATKEY_MAPPINGMODE_V(type, 0)});
    slot.channel =
        static_cast<base::u32>(std::max(material.readInt({AI_MATKEY_UVWSRC(type, 0)}, 0), 0));
    placedCount_ += slot && isPlaced(material, type);
    return slot;
}

string TextureImport::findFile(const string& path, string_view material) {
    const auto [at, isNew] = files_.try_emplace(path);
    if (isNew)
        at->second = searchFile(path, material);
    return at->second;
}

string TextureImport::searchFile(const string& path, string_view material) {
    if (const aiTexture* embedded = findEmbedded(source_, path))
        return makeFile(path, material, {},
                        [&] { return writeEmbedded(*embedded, path, *pictures_); });
    vector<string> tried;
    const string file = search_.find(path, tried);
    if (!file.empty())
        return readableFile(file, material);
    base::log().log(base::logScene, base::logWarning,
                    "assimp |{}| Unable to find the texture '{}', it is left out! Tried: {}",
                    material, path, joinedList(tried));
    return {};
}

/// The file that `make` makes of a picture; `otherwise`, with a warning, if that fails.
template <class Make>
string TextureImport::makeFile(const string& path, string_view material, const string& otherwise,
                               const Make& make) {
    string reason;
    try {
        return make();
    } catch (const std::exception& e) {
        reason = e.what();
    }
    base::log().log(base::logScene, base::logWarning,
                    "assimp |{}| Unable to make a file of the texture '{}', it is {}! {}", material,
                    path, otherwise.empty() ? "left out" : "taken as it is", reason);
    return otherwise;
}

/// The file, or a PNG of it if it is in a format that exporters can't read. They report what
/// nobody can.
string TextureImport::readableFile(const string& file, string_view material) {
    constexpr u64 headerLength = 18, longest = u64(1) << 29;
    return makeFile(file, material, file, [&] {
        const Bytes start = readFile(file, headerLength);
        if (kindOf({start.data(), start.size()}, fs::extension(file)) != PictureKind::convertible)
            return file;
        const Bytes bytes = readFile(file, longest);
        const Bytes png = convertToPng({bytes.data(), bytes.size()});
        return png.empty() ? file : pictures_->add(fs::stem(file), "png", {png.data(), png.size()});
    });
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
