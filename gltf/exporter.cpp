#include "gltf/exporter.h"

#include "gltf/output_files.h"
#include "gltf/scene_clock.h"
#include "gltf/scene_kind.h"

#include "b_log.h"
#include "b_string_convert.h"
#include "scene_schema.h"
#include "stream/b_fs.h"

#include <mutex>

namespace gltf {

using base::IPlugin;
using base::name_id;
using base::PluginFactory;
using base::ref;
using base::string;
using base::u32;

namespace {

/// Calls a function at the end of the scope, however it is left.
template <class Function>
class AtExit {
public:
    explicit AtExit(Function function) : function_(std::move(function)) {}
    AtExit(const AtExit&) = delete;
    AtExit& operator=(const AtExit&) = delete;
    ~AtExit() { function_(); }

private:
    Function function_;
};

/// The root of the scene, null if it is missing or no node.
const scene::INode* findRoot(const IPlugin& sceneObject) {
    IPlugin* root = findObject(sceneObject, scene::scene_schema::n_root);
    if (!root || root->typeName() != scene::node_schema::n_kind)
        return nullptr;
    return findClass<const scene::INode>(*root);
}

ref<GLTF::Buffer> runPasses(GLTF::Asset& asset, const GLTF::Options& options,
                            const ref<GLTF::Node>& gltfRoot) {
    asset.mergeAnimations();
    asset.removeUnusedNodes(options);
    // A document has a node, even where the scene has nothing to show.
    if (auto& roots = asset.getDefaultScene().nodes; roots.empty())
        roots.push_back(gltfRoot);
    if (options.useDraco) {
        asset.compressPrimitives(options);
        asset.removeUncompressedBufferViews();
    }
    return asset.packAccessors();
}

} // namespace

GLTFScenePlugin::GLTFScenePlugin(ref<base::IPluginDesc> desc, PluginFactory* factory, u32 id)
    : SceneExportPlugin(std::move(desc), factory, id) {}

GLTFScenePlugin::~GLTFScenePlugin() = default;

bool GLTFScenePlugin::exportScene(PluginFactory& sceneObjects, const string& path) {
    // The table of images is one per process.
    static std::mutex exports;
    const std::lock_guard lock(exports);
    const AtExit clear([this] { clearTables(); });

    bindSettings(*this);
    exportBinary = base::toLower(base::fs::extension(path)) == "glb";
    linesIndex = 0;

    const ref<IPlugin> sceneObject = sceneObjects.firstOfType(scene::scene_schema::n_kind);
    const scene::INode* root = sceneObject ? findRoot(*sceneObject) : nullptr;
    if (!root)
        return false;

    prepareObjects(sceneObjects);
    SceneClock(*sceneObject).tellLayers();
    const ref<GLTF::Asset> asset = makeAsset();
    convertRoot(*root, scene::read(*sceneObject, scene::scene_schema::n_upAxis));
    bakeAnimations(*asset, *sceneObject);
    const GLTF::Options options = makeOptions(path);
    const ref<GLTF::Buffer> buffer = runPasses(*asset, options, gltfRoot_);
    writeOutputFiles(*asset, options, *buffer,
                     textures.findPictureFiles(sceneObjects, *sceneObject), path);
    scene::storeImageRecords(*sceneObject, textures.makeRecords(*asset));
    return true;
}

/// Brings the objects into the state that the conversions rely on, and gathers what has to be
/// known of all of them beforehand.
void GLTFScenePlugin::prepareObjects(PluginFactory& sceneObjects) {
    std::size_t meshCount = 0;
    for (u32 id = 0; id < sceneObjects.pluginCount(); ++id) {
        const ref<IPlugin> object = sceneObjects.plugin(id);
        if (!object)
            continue;
        const name_id kind = object->typeName();
        if (kind == scene::mesh_schema::n_kind) {
            ++meshCount;
        } else if (kind == scene::morph_schema::n_kind) {
            if (const IPlugin* baseMesh = findObject(*object, scene::morph_schema::n_baseMesh))
                morphBases_.insert(baseMesh);
        } else if (kind == scene::skin_schema::n_kind) {
            gatherJoints(*object);
        } else if (kind == scene::bufferAdapter_schema::n_kind) {
            // One made in memory has not filled its outputs yet.
            object->afterLoad(object->desc()->version);
        }
    }
    meshMap.reserve(meshCount);
}

GLTF::Options GLTFScenePlugin::makeOptions(const string& path) const {
    GLTF::Options options;
    options.name = base::fs::stem(path);
    options.binary = exportBinary;
    options.keepMaterialsCommon = true;
    options.doubleSidedMaterials = true;
    options.version = "2.0";
    options.useDraco = exportCompress;
    options.embedTextures = exportEmbedded;
    options.embedShaders = exportEmbedded;
    options.embedBuffers = exportEmbedded || exportBinary;
    return options;
}

/// A document with a root node that is empty as yet.
ref<GLTF::Asset> GLTFScenePlugin::makeAsset() {
    auto asset = base::makeRef<GLTF::Asset>();
    asset->metadata->copyright = exportCopyright;
    gltfRoot_ = base::makeRef<GLTF::Node>();
    asset->getDefaultScene().nodes.push_back(gltfRoot_);
    return asset;
}

void GLTFScenePlugin::clearTables() {
    GLTF::Image::clearCache();
    gltfRoot_.reset();
    nodeMap.clear();
    expectedJoints_.clear();
    meshMap.clear();
    linesMap.clear();
    nodeAnimations.clear();
    samples_ = {};
    morphAnimations.clear();
    morphTargets_.clear();
    morphBases_.clear();
    walkedNodes_.clear();
    nodeCount_ = 0;
    faults_.clear();
    edgeMaterial_.reset();
    materialMap.clear();
    textures.clear();
}

} // namespace gltf
