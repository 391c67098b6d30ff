#include "assimp/import_scene.h"

#include "assimp/import_animation.h"
#include "assimp/import_axes.h"
#include "assimp/import_cameras.h"
#include "assimp/import_geometry.h"
#include "assimp/import_lights.h"
#include "assimp/import_materials.h"
#include "assimp/import_nodes.h"
#include "assimp/import_skeleton.h"
#include "assimp/library_text.h"
#include "assimp/vertex_targets.h"

#include "b_log.h"
#include "b_string_convert.h"
#include "b_vector_math.h"
#include "scene_image_record.h"
#include "scene_schema.h"
#include "scene_transform.h"
#include "stream/b_fs.h"

#include <assimp/scene.h>

#include <optional>

namespace assimp {

namespace {

/// What the meshes of a file become, by their numbers.
struct ImportedMeshes {
    base::vector<GeometryObjects> geometry;
    base::vector<MorphedMesh> morphs;
};

base::string extensionOf(const base::string& path) {
    return base::toLower(base::fs::extension(path));
}

/// The morph object among those of `mesh`, if there is one.
MorphedMesh findMorph(const aiMesh& mesh, const GeometryObjects& objects, bool inGroups) {
    MorphedMesh result{nullptr, base::string(viewOf(mesh.mName)), {}};
    for (const base::ref<base::IPlugin>& object : objects)
        if (object->typeName() == scene::morph_schema::n_kind) {
            result.morph = object.get();
            result.groups = findTargetGroups(mesh, inGroups);
        }
    return result;
}

/// The objects of every mesh of the file, with their materials unless `materials` is null, and the
/// joints of their vertices unless `skeletons` is. Each mesh is freed as soon as it has been taken
/// over.
ImportedMeshes importMeshes(aiScene& source, const GeometrySettings& settings,
                            base::PluginFactory& factory, MaterialImport* materials,
                            SkeletonImport* skeletons, const base::string& path) {
    ImportedMeshes meshes;
    GeometryFaults faults;
    const bool inGroups = extensionOf(path) == "fbx";
    for (base::u32 i = 0; i < source.mNumMeshes; ++i) {
        const aiMesh& mesh = *source.mMeshes[i];
        BoundMesh bound = skeletons ? skeletons->readJoints(mesh) : BoundMesh();
        GeometryObjects objects =
            importGeometry(mesh, settings, std::move(bound.joints), inGroups, factory, faults);
        if (materials)
            materials->assign(mesh, objects);
        if (skeletons)
            skeletons->addObjects(bound, objects);
        meshes.morphs.push_back(findMorph(mesh, objects, inGroups));
        meshes.geometry.push_back(std::move(objects));
        delete source.mMeshes[i];
        source.mMeshes[i] = nullptr;
    }
    faults.report(path);
    if (materials)
        materials->faults().report(path);
    return meshes;
}

/// A node above `root`, which takes over what comes in front of it. Exporters do not animate the
/// root of a scene.
base::ref<base::IPlugin> makeRootAbove(const base::ref<base::IPlugin>& root,
                                       const base::mat43& transform, base::PluginFactory& factory) {
    using Schema = scene::node_schema;
    base::ref<base::IPlugin> above = factory.create(Schema::n_kind);
    scene::storeTransform(*above, transform);
    write(*above, Schema::n_children).push_back(root);
    return above;
}

/// Length in the scene of a length of 1 below the root of the file.
double findScale(const base::IPlugin& root) {
    bool repaired = false;
    const base::mat33f m = scene::composeTransform(root, repaired).m;
    const double scale = base::length(base::vec3d{m.r0.x, m.r1.x, m.r2.x});
    return scale > 0 ? scale : 1;
}

base::ref<base::IPlugin> makeScene(const base::string& path, base::ref<base::IPlugin> root,
                                   base::u8 upAxis, base::PluginFactory& factory) {
    using Schema = scene::scene_schema;
    base::ref<base::IPlugin> object = factory.create(Schema::n_kind);
    write(*object, Schema::n_name) = base::fs::stem(path);
    write(*object, Schema::n_root) = std::move(root);
    if (upAxis != Schema::n_upAxis.defaultValue)
        write(*object, Schema::n_upAxis) = upAxis;
    return object;
}

/// Makes the scene keep an object of the import's as long as it lives.
void keep(base::IPlugin& scene, const base::ref<base::IPlugin>& object) {
    const base::name_id name = base::nameServer().id("importedPictures");
    scene.attribute<base::ref<base::IPlugin>>(name) = object;
    base::Attribute& attribute = *scene.findAttribute(name);
    attribute.setFlags(attribute.flags() | base::attribTransient);
}

} // namespace

void importScene(aiScene& source, const base::AttribMap& importer, const base::string& path,
                 base::PluginFactory& factory) {
    using Settings = scene::sceneImporter_schema;
    if (source.mNumMeshes == 0)
        base::log().log(base::logIO, base::logWarning, "assimp |{}| The file has no geometry!",
                        path);
    std::optional<MaterialImport> materials;
    if (read(importer, Settings::n_importMaterials))
        materials.emplace(source, path, importer, factory);
    const base::string extension = extensionOf(path);
    NodeTable nodes(*source.mRootNode, extension == "fbx");
    std::optional<SkeletonImport> skeletons;
    if (read(importer, Settings::n_importSkeletons))
        skeletons.emplace(nodes);
    const ImportedMeshes meshes =
        importMeshes(source, GeometrySettings(importer), factory, materials ? &*materials : nullptr,
                     skeletons ? &*skeletons : nullptr, path);
    const SceneAxes axes = readAxes(source, extension == "dae" || extension == "3ds");
    const AnimationSettings animation(importer);
    const bool isAnimated = animation.animations && isRootAnimated(source);
    base::ref<base::IPlugin> root =
        importNodes(*source.mRootNode, isAnimated ? base::mat43() : axes.transform, meshes.geometry,
                    factory, nodes);
    if (isAnimated)
        root = makeRootAbove(root, axes.transform, factory);
    if (skeletons) {
        skeletons->connect(factory);
        skeletons->faults().report(path);
    }
    if (read(importer, Settings::n_importLights))
        importLights(source, findScale(*root), nodes, factory, path);
    if (read(importer, Settings::n_importCameras))
        importCameras(source, nodes, factory, path);

    const base::ref<base::IPlugin> object = makeScene(path, std::move(root), axes.upAxis, factory);
    importAnimations(source, animation, nodes, meshes.morphs, *object, factory, path);
    nodes.reportSharedNames(path);
    if (materials) {
        scene::setPictureFiles(*object, materials->pictureFiles());
        if (materials->pictures())
            keep(*object, materials->pictures());
    }
}

} // namespace assimp
