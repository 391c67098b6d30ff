#pragma once

#include "assimp/import_geometry.h"
#include "assimp/import_textures.h"

struct aiMaterial;

namespace assimp {

/// What is known of materials by the format of their file, beyond what the library tells of them.
struct MaterialFormat {
    /// `extension` is that of the file, in lower case.
    explicit MaterialFormat(base::string_view extension);

    /// A map stands in the place of the color or number that it is a map of; else they multiply.
    bool mapsReplace;
    /// Opacity 0 is written for opaque materials.
    bool zeroIsOpaque;
    /// The diffuse color has an alpha that counts.
    bool diffuseHasAlpha;
    /// The simplest shading model stands for materials without a highlight.
    bool gouraudIsMatte;
};

/// What of the materials of a file is left out or put right, counted for one report.
struct MaterialFaults {
    base::u64 nonFiniteValues = 0;
    base::u64 opacityMaps = 0;
    base::u64 glossMaps = 0;
    base::u64 metalWithoutMap = 0;
    base::u64 transformedTextures = 0;

    /// Logs one line for each kind that occurred.
    void report(const base::string& path) const;
};

/// Makes the materials of a file, each when a mesh first asks for it.
class MaterialImport {
public:
    /// `source` and `factory` are borrowed. `importer` has the importer's settings; its
    /// `resourcePaths`, if there are any, are folders to look for textures in.
    MaterialImport(const aiScene& source, const base::string& path, const base::AttribMap& importer,
                   base::PluginFactory& factory);

    /// Gives the objects of `mesh` its material, if the file has one for it. Those without texture
    /// coordinates get it without maps: a document in which such geometry has maps is invalid.
    void assign(const aiMesh& mesh, const GeometryObjects& objects);

    MaterialFaults faults() const;
    /// All picture files that the materials name.
    base::vector<base::string> pictureFiles() const;
    /// The files that were made of textures; null if there are none. They must live as long as
    /// the scene.
    base::ref<base::IPlugin> pictures() const;

private:
    base::ref<base::IPlugin> materialOf(const aiMesh& mesh, bool isMappable);

    const aiScene& source_;
    base::PluginFactory& factory_;
    MaterialFormat format_;
    TextureImport textures_;
    MaterialFaults faults_;
    /// By index, with maps or without; null for none.
    base::map<std::pair<base::u32, bool>, base::ref<base::IPlugin>> materials_;
};

} // namespace assimp
