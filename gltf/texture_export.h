#pragma once

#include "GLTF/document.h"
#include "gltf/source_files.h"
#include "scene.h"
#include "scene_factory.h"
#include "scene_image_record.h"
#include "stream/b_temporary_folder.h"

#include <array>
#include <optional>

namespace iio {
class Image;
}

namespace gltf {

/// The textures of one export, and the pictures that they show: as they are, written again, or made
/// of several. It reads the settings of the exporter, which must outlive it.
class TextureExport {
public:
    explicit TextureExport(const scene::sceneExporter_schema& settings) : settings_(settings) {}

    /// A new slot with the texture, null if that is null.
    base::ref<GLTF::MaterialPBR::Texture> buildTextureSlot(const scene::ITexture& texture,
                                                           const scene::IMesh* mesh,
                                                           bool* hasAlpha = nullptr,
                                                           const base::string& overridePath = {});
    /// The texture of the document, the same for the same object; null for all but exactly a
    /// `fileTexture` with a file. With `overridePath` a new one on that ready file, which is
    /// removed. `hasAlpha` is set when the file is prepared, and left alone for a known texture.
    base::ref<GLTF::Texture> buildTexture(const scene::ITexture& texture, bool* hasAlpha,
                                          const base::string& overridePath);
    /// Writes a temporary JPEG with occlusion, roughness and metal in red, green and blue, as
    /// large as the largest map under the limit, and returns its path. Null maps, and those that
    /// can't be read, are black. The caller removes it. An empty path, with a message, if that
    /// fails.
    base::string packOcclusionRoughnessMetal(const base::string& materialName,
                                             const scene::ITexture* ambient,
                                             const scene::ITexture* metal,
                                             const scene::ITexture* rough);
    /// The file of a texture, looked for in the folders of the settings if its path is relative;
    /// empty without one.
    base::string resolveTexturePath(const scene::ITexture& texture) const;
    /// Raises `width` and `height` to those in which the texture is exported.
    void largestExportSize(const scene::ITexture* texture, base::u32& width,
                           base::u32& height) const;
    /// The picture with the values of its file, null if there is none or it can't be read.
    base::ref<iio::Image> loadTextureImage(const scene::ITexture* texture) const;
    /// True for a bump map that is no ready normal map: one that picks a channel, or has just one.
    bool isHeightMap(const scene::ITexture& map) const;
    /// Writes a temporary JPEG with the normals of a height map, which the caller removes, and
    /// returns its path; an empty one, with a message, if that fails.
    base::string makeNormalMapFile(const scene::ITexture& map, const scene::IMaterial& material);

    /// Notes what `image` was made of, for `makeRecords`.
    void describeImage(const GLTF::Image& image, base::vector<base::string> sources,
                       scene::ImageRecord::Work work);
    /// The file that the texture's picture comes from; empty without one.
    base::string sourceOf(const scene::ITexture& texture) const;
    /// All picture files that the objects name, shown or not; none if no image will be written
    /// beside the document.
    SourceFiles findPictureFiles(const base::PluginFactory& sceneObjects,
                                 const base::IPlugin& sceneObject) const;
    /// What became of the pictures of the document.
    base::vector<scene::ImageRecord> makeRecords(GLTF::Asset& asset) const;
    /// Forgets everything and removes the temporary files.
    void clear();

    base::hash_map<const scene::ITexture*, base::ref<GLTF::Texture>> textureMap;

private:
    /// What became of a picture file.
    struct PreparedImage {
        base::ref<GLTF::Image> image;
        bool hasAlpha = false;
    };

    const base::string& temporaryFolder();
    base::ref<GLTF::Image> buildImage(const scene::ITexture& texture, bool* hasAlpha);
    PreparedImage prepareImage(const base::string& path, bool ignoresOpaqueAlpha,
                               const base::string& source);
    static base::ref<GLTF::Image> loadImage(const base::string& path);
    base::ref<GLTF::Image> takeImage(const base::string& file, const base::string& path);
    base::ref<iio::Image> pack(const std::array<const scene::ITexture*, 3>& maps, base::u32 width,
                               base::u32 height) const;

    const scene::sceneExporter_schema& settings_;
    /// By the path of the file, and whether its alpha is to be looked at.
    base::map<std::pair<base::string, bool>, PreparedImage> preparedImages_;
    base::hash_map<const GLTF::Image*, scene::ImageRecord> imageRecords_;
    std::optional<base::fs::TemporaryFolder> temporaryFolder_; ///< made when first needed
};

} // namespace gltf
