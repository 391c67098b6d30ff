#pragma once

#include "assimp/material_properties.h"
#include "assimp/picture_folder.h"
#include "assimp/texture_search.h"

#include "scene_schema.h"

#include <tuple>

struct aiMesh;
struct aiScene;
struct aiTexture;

namespace assimp {

/// A picture that a model names.
struct PictureFile {
    base::string file;   ///< to be read by exporters; empty if the picture was not found
    base::string source; ///< what it was made from: another file, or the model
};

/// The first texture of a kind at a material.
struct TextureSlot : PictureFile {
    base::string path; ///< as the model has it
    scene::Enumeration wrapU = 0, wrapV = 0;
    base::u32 channel = 0; ///< which of the library's sets of coordinates

    explicit operator bool() const { return !file.empty(); }
};

/// Makes the textures of a file. Those that are alike are one object, and each picture is looked
/// for once.
class TextureImport {
public:
    /// `source` and `factory` are borrowed. `path` is that of the model.
    TextureImport(const aiScene& source, const base::string& path,
                  base::vector<base::string> resourcePaths, base::PluginFactory& factory);

    /// What `material` has in its first slot of the kind `type`, an aiTextureType. A picture that
    /// is not found, or can't be made a file of, is told of by a warning with the material's name.
    TextureSlot read(const MaterialProperties& material, unsigned type);
    /// The texture for a slot that has a file. `channels` is its `colorChannels`, `mesh` one that
    /// it is used on.
    base::ref<base::IPlugin> create(const TextureSlot& slot, scene::Enumeration channels,
                                    const aiMesh& mesh);

    /// Looks for a picture that is not shown: it counts as a file of the model all the same.
    void mention(const base::string& path);

    /// The files of all pictures that were found.
    base::vector<base::string> foundFiles() const;
    /// Uses of textures with a transform or projection that textures here have not.
    base::u64 transformedCount() const { return transformedCount_; }
    /// The pictures that files were made of.
    const base::ref<PictureFolder>& pictures() const { return pictures_; }

private:
    using Key = std::tuple<base::string, scene::Enumeration, scene::Enumeration, base::string,
                           scene::Enumeration>;

    const PictureFile& findFile(const base::string& path, base::string_view material);
    PictureFile searchFile(const base::string& path, base::string_view material);
    base::string readableFile(const base::string& file);
    base::string findPicture(const base::string& path, base::vector<base::string>& tried);

    const aiScene& source_;
    base::PluginFactory& factory_;
    base::string modelPath_;
    TextureSearch search_;
    base::ref<PictureFolder> pictures_ = base::makeRef<PictureFolder>();
    base::map<base::string, PictureFile> files_; ///< by the path in the model
    /// What exporters read in the place of a picture; empty for one that nobody can read.
    base::map<base::string, base::string> readableFiles_;
    base::map<const aiTexture*, base::string> embeddedFiles_;
    base::vector<base::string> mentionedFiles_;
    base::map<Key, base::ref<base::IPlugin>> textures_;
    base::u64 transformedCount_ = 0;
};

} // namespace assimp
