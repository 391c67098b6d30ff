#include "gltf/texture_export.h"
#include "gltf/guarded.h"
#include "gltf/prepare_image.h"
#include "gltf/texture_coordinates.h"

#include "b_log.h"
#include "b_string_convert.h"
#include "scene_schema.h"
#include "stream/b_fs.h"

namespace gltf {

using base::i32;
using base::ref;
using base::string;
using base::u32;
using base::u8;
using scene::bitmapTexture_schema;
using scene::fileTexture_schema;
using scene::ImageRecord;
using scene::texture_schema;

namespace {

// OpenGL's numbers, which glTF takes over.
constexpr i32 linear = 9729, linearMipmapLinear = 9987;
constexpr i32 repeat = 10497, mirroredRepeat = 33648, clampToEdge = 33071;

i32 wrapOf(u8 mode) {
    switch (mode) {
    case 1:
        return mirroredRepeat;
    case 3:
        base::log().log(base::logScene, base::logWarning,
                        "GLTF doesn't support the border wrap texture mode. Replacing with clamp!");
        [[fallthrough]];
    case 2:
        return clampToEdge;
    default:
        return repeat;
    }
}

ref<GLTF::Sampler> makeSampler(const scene::ITexture& texture) {
    const u8 filter = read(texture, bitmapTexture_schema::n_filter);
    const bool hasLevels = filter != 1 && filter != 2;
    const i32 wrapS = wrapOf(read(texture, texture_schema::n_wrapModeU));
    const i32 wrapT = wrapOf(read(texture, texture_schema::n_wrapModeV));
    return base::makeRef<GLTF::Sampler>(linear, hasLevels ? linearMipmapLinear : linear, wrapS,
                                        wrapT);
}

/// The name of an image in the document: that of `path` with the extension of the file it was
/// made into.
string makeUri(const string& path, const string& madeFile) {
    // Valid, as the document can hold nothing else and the file must be called the same.
    return base::toValidUtf8(base::fs::stem(path, 1) + "." + base::fs::extension(madeFile));
}

/// A new unique file, with and without an extension, removed at the end.
class TemporaryFile : base::NonCopyable {
public:
    TemporaryFile(const string& folder, const char* extension)
        : unique_(base::fs::tmpFilename(folder)), path_(unique_ + extension) {}
    ~TemporaryFile() {
        base::fs::master().remove(path_);
        base::fs::master().remove(unique_);
    }
    const string& path() const { return path_; }

private:
    string unique_; ///< made empty, so that nobody else gets the name
    string path_;
};

} // namespace

const string& TextureExport::temporaryFolder() {
    if (!temporaryFolder_)
        temporaryFolder_.emplace("gltf");
    return temporaryFolder_->path();
}

string TextureExport::resolveTexturePath(const scene::ITexture& texture) const {
    const string* file = find(texture, fileTexture_schema::n_file);
    if (!file || file->empty() || base::fs::isAbsolute(*file))
        return file ? *file : string();
    for (const string& folder : settings_.resourcePaths) {
        for (const string& joined : {folder + *file, folder + "/" + *file}) {
            const string path = base::fs::normalized(joined);
            if (base::fs::master().exists(path))
                return path;
        }
    }
    return *file;
}

ref<GLTF::MaterialPBR::Texture> TextureExport::buildTextureSlot(const scene::ITexture& texture,
                                                                const scene::IMesh* mesh,
                                                                bool* hasAlpha,
                                                                const string& overridePath) {
    ref<GLTF::Texture> gltfTexture = buildTexture(texture, hasAlpha, overridePath);
    if (!gltfTexture)
        return nullptr;
    auto slot = base::makeRef<GLTF::MaterialPBR::Texture>();
    slot->texture = std::move(gltfTexture);
    slot->texCoord = 0;
    const string* uvSet = find(texture, texture_schema::n_uvSet);
    if (mesh && uvSet && !uvSet->empty() && settings_.exportTextureCoordinates)
        slot->texCoord = findTexCoord(*mesh, *uvSet);
    return slot;
}

ref<GLTF::Texture> TextureExport::buildTexture(const scene::ITexture& texture, bool* hasAlpha,
                                               const string& overridePath) {
    if (overridePath.empty()) {
        if (const auto known = textureMap.find(&texture); known != textureMap.end())
            return known->second;
    }
    if (texture.typeName() != fileTexture_schema::n_kind)
        return nullptr;
    ref<GLTF::Sampler> sampler = makeSampler(texture);
    ref<GLTF::Image> image = overridePath.empty() ? buildImage(texture, hasAlpha)
                                                  : takeImage(overridePath, overridePath);
    if (!image)
        return nullptr;
    auto gltfTexture = base::makeRef<GLTF::Texture>();
    gltfTexture->sampler = std::move(sampler);
    gltfTexture->source = std::move(image);
    if (overridePath.empty())
        textureMap[&texture] = gltfTexture;
    return gltfTexture;
}

/// The image of the texture's file, read and written again where that is asked for. Null without
/// a file. Files are prepared once, whatever the number of textures that show them.
ref<GLTF::Image> TextureExport::buildImage(const scene::ITexture& texture, bool* hasAlpha) {
    const string path = resolveTexturePath(texture);
    if (path.empty())
        return nullptr;
    const bool ignoresOpaqueAlpha = scene::ignoresOpaqueAlpha(texture);
    const auto [entry, isNew] = preparedImages_.try_emplace(std::pair(path, ignoresOpaqueAlpha));
    if (isNew)
        entry->second = prepareImage(path, ignoresOpaqueAlpha, sourceOf(texture));
    if (hasAlpha)
        *hasAlpha = entry->second.hasAlpha;
    return entry->second.image;
}

TextureExport::PreparedImage
TextureExport::prepareImage(const string& path, bool ignoresOpaqueAlpha, const string& source) {
    PictureHeader header = readPictureHeader(path);
    ref<iio::Image> picture;
    if (header.hasAlpha && ignoresOpaqueAlpha) {
        picture = loadOpaque(path, header.size);
        header.hasAlpha = !picture;
    }
    const PicturePlan plan =
        planPicture(path, header, settings_.exportCompressImages, settings_.exportImageMaxDim);
    PreparedImage prepared{nullptr, header.hasAlpha};
    if (plan.converts)
        guarded("Unable to convert the image to supported format!", [&] {
            const TemporaryFile file(temporaryFolder(), plan.extension);
            convertPicture(path, std::move(picture), file.path(), plan, header.hasAlpha,
                           settings_.exportImageMaxDim);
            prepared.image = takeImage(file.path(), path);
        });
    const bool isMade = prepared.image.get() != nullptr;
    if (!isMade)
        prepared.image = loadImage(path);
    describeImage(*prepared.image, {source},
                  !isMade        ? ImageRecord::Work::kept
                  : plan.resizes ? ImageRecord::Work::resized
                                 : ImageRecord::Work::converted);
    return prepared;
}

/// The image of a file that passes as it is.
ref<GLTF::Image> TextureExport::loadImage(const string& path) {
    ref<GLTF::Image> image = GLTF::Image::load(path);
    image->uri = makeUri(path, path);
    if (!image->data)
        base::log().log(base::logScene, base::logWarning,
                        "gltf |{}| The image can't be read, the document has its name alone!",
                        path);
    return image;
}

/// The image of a temporary file, called after `path`; the file is removed. Null if it can't be
/// read.
ref<GLTF::Image> TextureExport::takeImage(const string& file, const string& path) {
    ref<GLTF::Image> image = GLTF::Image::loadUncached(file);
    base::fs::master().remove(file);
    if (!image->data)
        return nullptr;
    image->uri = makeUri(path, file);
    return image;
}

string TextureExport::sourceOf(const scene::ITexture& texture) const {
    const string* source = scene::findPictureSource(texture);
    return source ? *source : resolveTexturePath(texture);
}

void TextureExport::describeImage(const GLTF::Image& image, base::vector<string> sources,
                                  ImageRecord::Work work) {
    ImageRecord& record = imageRecords_[&image];
    record.sources = std::move(sources);
    record.work = work;
}

SourceFiles TextureExport::findPictureFiles(const base::PluginFactory& sceneObjects,
                                            const base::IPlugin& sceneObject) const {
    SourceFiles files;
    if (settings_.exportEmbedded)
        return files;
    for (const ref<base::IPlugin>& object : sceneObjects.plugins()) {
        if (!object || object->typeName() != fileTexture_schema::n_kind)
            continue;
        const auto* texture = dynamic_cast<const scene::IFileTexture*>(object.get());
        if (!texture)
            continue;
        files.add(resolveTexturePath(*texture));
        files.add(sourceOf(*texture));
    }
    if (const auto* others = scene::findPictureFiles(sceneObject))
        for (const string& path : *others)
            files.add(path);
    return files;
}

base::vector<ImageRecord> TextureExport::makeRecords(GLTF::Asset& asset) const {
    base::vector<ImageRecord> records;
    for (const GLTF::Image* image : asset.getAllImages()) {
        const auto known = imageRecords_.find(image);
        if (known == imageRecords_.end())
            continue;
        ImageRecord& record = records.emplace_back(known->second);
        const GLTF::Image::Dimensions size = image->getDimensions();
        record.name = image->uri;
        record.width = size.width;
        record.height = size.height;
        record.byteLength = static_cast<u32>(image->byteLength);
    }
    return records;
}

void TextureExport::clear() {
    textureMap.clear();
    preparedImages_.clear();
    imageRecords_.clear();
    temporaryFolder_.reset();
}

} // namespace gltf
