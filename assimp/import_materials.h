#pragma once

#include "assimp/import_geometry.h"
#include "assimp/material_maker.h"

namespace assimp {

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
