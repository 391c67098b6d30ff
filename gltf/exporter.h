#pragma once

#include "GLTF/document.h"
#include "gltf/animation_entries.h"
#include "gltf/texture_export.h"
#include "scene.h"
#include "scene_factory.h"

/// The export plugin: turns the objects of a scene into a glTF document and writes its files.
namespace gltf {

class MeshIndices;
struct TreePosition;

/// An exporter; one object serves one export. Its settings are its attributes, and during the
/// export its members of the same names. The conversions are public so that each can be used by
/// itself; they read the settings and the tables and add to the tables.
///
/// The tables of geometry hold plain pointers: the document owns what they point at. It borrows the
/// bulk arrays of the scene's objects until the data is packed, so nothing may change these
/// meanwhile. Single-indexing and triangulation change the meshes of the scene in place.
class GLTFScenePlugin final : public scene::SceneExportPlugin {
public:
    GLTFScenePlugin(base::ref<base::IPluginDesc> desc, base::PluginFactory* factory, base::u32 id);
    ~GLTFScenePlugin() override;

    /// Writes the first object of type "scene" to `path`, as a container if its extension is
    /// "glb" and as text otherwise, with side files beside it if the settings ask for them.
    /// False, silently, if there is no scene or it has no root node. A file that could not be
    /// written is logged and does not change the result; what fails before that is thrown, and
    /// then nothing has been written. Exports of all threads run one after the other.
    bool exportScene(base::PluginFactory& sceneObjects, const base::string& path) override;

    /// Fills `gltfNode`, whose name and transform are set, from the children of the node at
    /// `position`: child nodes first, depth first, then the other objects in their order.
    void convertNode(GLTF::Node& gltfNode, const TreePosition& position);
    /// Sets the transform of `gltfNode`: a matrix, or translation, rotation and scale for a node
    /// that is animated, which is entered into `nodeAnimations` then.
    void convertTransform(const TreePosition& position, GLTF::Node& gltfNode);
    /// Gives the mesh to `gltfNode` or, if that has one, to a new child of it. Returns the node
    /// that took it.
    GLTF::Node* attachMesh(GLTF::Node& gltfNode, base::ref<GLTF::Mesh> mesh);

    /// A new mesh with one primitive per primitive of `mesh` that draws anything; null if there
    /// is none. `withTargets` is for a mesh that will get morph targets, which rule out Draco.
    /// `materialIndex` is the slot of the materials' lists that counts.
    base::ref<GLTF::Mesh> convertMesh(scene::IMesh& mesh, base::u32 materialIndex,
                                      bool withTargets);
    /// Sets the attributes of all primitives. False, with nothing done, without positions.
    bool convertMeshAttributes(GLTF::Mesh& gltfMesh, scene::IMesh& mesh);
    /// Adds one target to each primitive of `gltfMesh`, which was made of `baseMesh`. The target
    /// holds differences to the base or, with `isWholeShape`, absolute values, of which the
    /// differences are made here. False, with a message and nothing added, if the two do not fit
    /// together, and without one if the target has no positions.
    bool convertMorphTarget(GLTF::Mesh& gltfMesh, const scene::IMesh& targetMesh,
                            const scene::IMesh& baseMesh, bool isWholeShape);
    /// A new skin for a node with `gltfMesh`, made of the base mesh. Null, silently, if the skin
    /// lacks something, and with a message if the vertices have no joints. Joints that the tree
    /// does not hold yet get nodes that the walk fills.
    base::ref<GLTF::Skin> convertSkin(const scene::ISkin& skin, const GLTF::Mesh& gltfMesh);
    /// A new light as it is at the scene's time; null for a black one.
    base::ref<GLTF::MaterialCommon::Light> convertLight(const scene::ILight& light);
    /// A new mesh with one primitive of single lines; null if there are none. `hasAssignment` is
    /// for the edges of a mesh: they stand off its surface and are drawn in one colour.
    base::ref<GLTF::Mesh> convertLines(scene::ILines& lines, base::u32 materialIndex,
                                       bool hasAssignment);

    /// Sets the material of `primitive`: entry `index` of the list, the last one for an index past
    /// the end, none for an empty place. `mesh` (null for lines) has the UV sets.
    void assignMaterial(GLTF::Primitive& primitive, const base::vector<scene::Object>& materials,
                        base::u32 index, const scene::IMesh* mesh);
    /// A new material; null, silently, for all but exactly a `principalMaterial`.
    base::ref<GLTF::Material> buildMaterial(base::IPlugin& object, const scene::IMesh* mesh);

    // Take a sample at `time`, which is the scene's, if it lies in the range of the entry.
    void sampleNodeAnimation(NodeAnimation& entry, base::TimeCode time);
    void sampleMorphAnimation(MorphAnimation& entry, base::TimeCode time);

    struct Joint {
        base::ref<GLTF::Node> node; ///< null until the walk or a skin comes to the joint
        bool isPlaced = false;      ///< the walk has been there
    };
    /// The joints of all skins of the scene, and what else the walk met that is one.
    base::hash_map<const scene::INode*, Joint> nodeMap;
    // What each geometry became: shared ones are converted once. Null for what failed.
    base::hash_map<const scene::IMesh*, GLTF::Mesh*> meshMap;
    base::hash_map<const scene::ILines*, GLTF::Mesh*> linesMap;
    /// Null for what has no counterpart.
    base::hash_map<const base::IPlugin*, base::ref<GLTF::Material>> materialMap;
    TextureExport textures{*this};
    base::vector<NodeAnimation> nodeAnimations; ///< the document borrows their samples
    base::vector<MorphAnimation> morphAnimations;
    base::u32 linesIndex = 0; ///< number of lines converted so far

private:
    void prepareObjects(base::PluginFactory& sceneObjects);
    void convertRoot(const scene::INode& root, base::u8 upAxis);
    GLTF::Options makeOptions(const base::string& path) const;
    base::ref<GLTF::Asset> makeAsset();
    void bakeAnimations(GLTF::Asset& asset, base::IPlugin& scene);
    void clearTables();

    base::mat43 findParentFromNode(const scene::INode& node, const TreePosition* parent);
    void warnOnce(const base::IPlugin& object, base::u32 fault, base::string_view text);
    void logTransformFaults(const scene::INode& node, base::u32 faults);
    Joint* findJoint(const scene::INode& node);
    base::ref<GLTF::Node> placeNode(const scene::INode& node);
    void convertChildNode(GLTF::Node& gltfNode, base::IPlugin& child, const TreePosition& parent);
    bool mayPlace(const scene::INode& child, const TreePosition& parent);
    void convertObject(GLTF::Node& gltfNode, base::IPlugin& child, base::u32 materialIndex);
    GLTF::Node* convertMeshChild(GLTF::Node& gltfNode, scene::IMesh& mesh, base::u32 materialIndex,
                                 bool withTargets);
    void convertLinesChild(GLTF::Node& gltfNode, base::IPlugin& child, base::u32 materialIndex);
    void convertSkinChild(GLTF::Node& gltfNode, base::IPlugin& child, base::u32 materialIndex);
    void convertMorphChild(GLTF::Node& gltfNode, base::IPlugin& child, base::u32 materialIndex);
    void convertLightChild(GLTF::Node& gltfNode, base::IPlugin& child);

    void gatherJoints(const base::IPlugin& skin);
    void addJoints(GLTF::Skin& gltfSkin, const base::vector<scene::Object>& joints,
                   const scene::ISkin& skin);
    void reportMissingJoints();

    base::vector<base::u32> addTargets(GLTF::Mesh& gltfMesh, const scene::IMorph& morph,
                                       const scene::IMesh& baseMesh);
    void makeMorphAnimation(const scene::IMorph& morph, GLTF::Node& holder,
                            const base::vector<base::u32>& targets);
    void makeNodeAnimation(const TreePosition& position, GLTF::Node& gltfNode,
                           const base::vector<base::TimeCode>& times);

    bool convertPrimitives(GLTF::Mesh& gltfMesh, scene::IMesh& mesh, base::u32 materialIndex,
                           MeshIndices& indices);
    void compressMesh(GLTF::Mesh& gltfMesh, const scene::IMesh& mesh);
    GLTF::Material* getEdgeMaterial(const scene::ILines& lines);

    /// Meshes that morph objects deform: their vertices must stay apart where the targets' do.
    base::set<const base::IPlugin*> morphBases_;
    /// The nodes with child nodes that the walk has met; true while it is below them.
    base::hash_map<const scene::INode*, bool> walkedNodes_;
    base::u32 nodeCount_ = 0; ///< nodes placed in the tree
    base::ref<GLTF::Node> gltfRoot_;
    base::vector<float> samples_; ///< of all animated nodes
    /// The joints that skins came to before the walk, in that order.
    base::vector<const scene::INode*> expectedJoints_;
    /// The places of the targets that the document has of each morph.
    base::hash_map<const scene::IMorph*, base::vector<base::u32>> morphTargets_;
    /// What was logged of objects, each of which may be met at several places and times.
    base::hash_map<const base::IPlugin*, base::u32> faults_;
    base::ref<GLTF::MaterialPBR> edgeMaterial_;
};

/// A node of the scene at its place in the tree, which is known only during the walk.
struct TreePosition {
    const scene::INode& node;
    const TreePosition* parent = nullptr; ///< null at the root
    base::u32 level = 1;                  ///< 1 at the root
    base::u32 materialIndex = 0;          ///< the slot of materials that it and those below show
    bool isAnimated = false;              ///< its transform is linked to an animation layer
    base::mat43 parentFromNode{};
};

} // namespace gltf
