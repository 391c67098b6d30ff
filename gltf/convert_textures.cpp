#include "gltf/exporter.h"
#include "gltf/guarded.h"
#include "gltf/prepare_image.h"
#include "gltf/texture_coordinates.h"

#include "i_file.h"
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
    return base::fs::stem(path, 1) + "." + base::fs::extension(madeFile);
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

const string& GLTFScenePlugin::temporaryFolder() {
    if (!temporaryFolder_)
        temporaryFolder_.emplace("gltf");
    return temporaryFolder_->path();
}

string GLTFScenePlugin::resolveTexturePath(const scene::ITexture& texture) const {
    const string* file = find(texture, fileTexture_schema::n_file);
    if (!file || file->empty() || base::fs::isAbsolute(*file))
        return file ? *file : string();
    for (const string& folder : resourcePaths) {
        for (const string& joined : {folder + *file, folder + "/" + *file}) {
            const string path = base::fs::normalized(joined);
            if (base::fs::master().exists(path))
                return path;
        }
    }
    return *file;
}

ref<GLTF::MaterialPBR::Texture> GLTFScenePlugin::buildTextureSlot(const scene::ITexture& texture,
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
    if (mesh && uvSet && !uvSet->empty() && exportTextureCoordinates)
        slot->texCoord = findTexCoord(*mesh, *uvSet);
    return slot;
}

ref<GLTF::Texture> GLTFScenePlugin::buildTexture(const scene::ITexture& texture, bool* hasAlpha,
                                                 const string& overridePath) {
    if (overridePath.empty()) {
        if (const auto known = textureMap.find(&texture); known != textureMap.end())
            return known->second;
    }
    if (texture.typeName() != fileTexture_schema::n_kind)
        return nullptr;
    ref<GLTF::Image> image =
        overridePath.empty() ? buildImage(texture, hasAlpha) : takeImage(overridePath);
    if (!image)
        return nullptr;
    auto gltfTexture = base::makeRef<GLTF::Texture>();
    gltfTexture->sampler = makeSampler(texture);
    gltfTexture->source = std::move(image);
    if (overridePath.empty())
        textureMap[&texture] = gltfTexture;
    return gltfTexture;
}

/// The image of the texture's file, read and written again where that is asked for. Null without
/// a file. Files are prepared once, whatever the number of textures that show them.
ref<GLTF::Image> GLTFScenePlugin::buildImage(const scene::ITexture& texture, bool* hasAlpha) {
    const string path = resolveTexturePath(texture);
    if (path.empty())
        return nullptr;
    const auto [entry, isNew] = preparedImages_.try_emplace(path);
    PreparedImage& prepared = entry->second;
    if (isNew) {
        const PictureHeader header = readPictureHeader(path);
        const PicturePlan plan = planPicture(path, header, exportCompressImages, exportImageMaxDim);
        prepared.hasAlpha = header.hasAlpha;
        if (plan.converts)
            guarded("Unable to convert the image to supported format!", [&] {
                const TemporaryFile file(temporaryFolder(), plan.extension);
                convertPicture(path, file.path(), plan, header.hasAlpha, exportImageMaxDim);
                prepared.image = GLTF::Image::loadUncached(file.path());
                prepared.image->uri = makeUri(path, file.path());
            });
        const bool isMade = prepared.image.get() != nullptr;
        if (!isMade) {
            prepared.image = GLTF::Image::load(path);
            prepared.image->uri = makeUri(path, path);
        }
        describeImage(*prepared.image, {sourceOf(texture)},
                      !isMade        ? ImageRecord::Work::kept
                      : plan.resizes ? ImageRecord::Work::resized
                                     : ImageRecord::Work::converted);
    }
    if (hasAlpha)
        *hasAlpha = prepared.hasAlpha;
    return prepared.image;
}

/// The image of a file that was made for the document, which is removed.
ref<GLTF::Image> GLTFScenePlugin::takeImage(const string& path) {
    ref<GLTF::Image> image = GLTF::Image::loadUncached(path);
    image->uri = makeUri(path, path);
    base::fs::master().remove(path);
    return image;
}

/// The file that the texture's picture comes from.
string GLTFScenePlugin::sourceOf(const scene::ITexture& texture) const {
    const string* source = scene::findPictureSource(texture);
    return source ? *source : resolveTexturePath(texture);
}

void GLTFScenePlugin::describeImage(const GLTF::Image& image, base::vector<string> sources,
                                    ImageRecord::Work work) {
    ImageRecord& record = imageRecords_[&image];
    record.sources = std::move(sources);
    record.work = work;
}

} // namespace gltf
