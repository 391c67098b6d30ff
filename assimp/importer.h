#pragma once

#include "scene_factory.h"

/// Import plugin for the model formats that the assimp library reads.
namespace assimp {

/// The plugin's description, of type "AssimpImporter". It reads everything that the library does
/// but glTF, which this system never reads, the library's own format, and formats that hold
/// animation only.
class AssimpImporterDesc final : public scene::IScenePluginDesc {
public:
    AssimpImporterDesc();
    base::IPlugin* create(base::PluginFactory& factory, base::u32 id) override;
    const base::string& importExtensions() const override;
    const base::string& exportExtensions() const override;
};

/// A bool attribute of this importer that is no setting of importers in general, so that it has no
/// default: if it is there and true, only the first of a file's animations is read.
inline constexpr char firstAnimationSetting[] = "importFirstAnimation";

/// Reads one file. Its settings do the following; those not listed have no effect:
///
/// | setting | effect |
/// |---|---|
/// | `importMeshes`, `importHair`, `importPoints` | polygons, line faces and points are read |
/// | `importTriangulateMeshes` | polygons are cut into triangles |
/// | `importColors`, `importTextureCoordinates` | the sets of meshes and lines are read |
/// | `importMultiIndex` | never: one index per vertex at once; else each array has its own |
/// | `importNormals` | never; present: those of the file; always: computed where it has none |
/// | `computeNormalsMethod`, `computeNormalsAngle` | how they are computed |
/// | `importTangents` | the same; they need normals, and texture coordinates to be computed |
/// | `flipNormals` | faces are wound the other way, normals negated |
/// | `importMaterials` | materials and their textures are read |
/// | `importSkeletons` | meshes with bones are bound to their joints |
/// | `importAnimations` | animations and morph targets' weights become one layer of clips |
/// | `importBakedAnimations` | keys on every frame in place of the file's |
/// | `importFirstAnimation` | see `firstAnimationSetting` |
/// | `importLights`, `importCameras` | the nodes' lights and cameras are read |
/// | `resourcePaths` | an array of folders in which textures are looked for too |
///
/// No format of the library's gives edges apart from line faces, surfaces or subdivision as such,
/// or velocities, so `importEdges`, `importSurfaces`, `importTriangulateSurfaces`,
/// `importSubdivision`, `importTessellation` and `importVelocities` mean nothing here, and there is
/// one `computeTangentsMethod`.
class AssimpImporter final : public scene::SceneImportPlugin {
public:
    using scene::SceneImportPlugin::SceneImportPlugin;

    /// True if the file exists and its extension is among those of the description.
    bool canLoad(const base::string& path) override;
    /// Adds a `scene` object with the file's tree of nodes. What the library can't read is logged
    /// as one error; nothing is added then. Pictures inside the file, and those of formats that
    /// exporters can't read, become files in a private folder that goes when the scene does.
    bool load(base::PluginFactory& scene, const base::string& path) override;
};

/// Registers the schemas and the description with `factory`.
void registerPlugin(base::PluginFactory& factory);

} // namespace assimp
