#pragma once

#include "assimp/import_geometry.h"
#include "assimp/node_table.h"

struct aiBone;
struct aiMesh;

namespace assimp {

/// What a mesh of the file is bound to.
struct BoundMesh {
    base::vector<const aiBone*> bones; ///< of the mesh, those with a node
    VertexJoints joints;
    bool hasFreeVertices = false;
};

/// Binds meshes to the nodes that their bones name. Used in this order: for every mesh
/// `readJoints` and, once its objects are made, `addObjects`; when the nodes are made, `connect`.
///
/// Every node that has a mesh with bones gets a `skin` object of its own in the mesh's place. Its
/// joints are the bones' nodes, followed, where some vertices have no bone, by the node itself: so
/// these vertices stay where the mesh without a skeleton has them.
class SkeletonImport {
public:
    explicit SkeletonImport(NodeTable& nodes) : nodes_(nodes) {}

    /// What moves the vertices of `mesh`; none if it has no bones.
    BoundMesh readJoints(const aiMesh& mesh);
    /// Takes note of the objects made of a mesh, and writes the bind pose of the one with a joints
    /// set. The mesh may be deleted afterwards; the joints of `bound` don't matter any more.
    void addObjects(const BoundMesh& bound, const GeometryObjects& objects);
    /// Marks the joints among the nodes and gives skins to the nodes with skinned meshes.
    void connect(base::PluginFactory& factory);

    const SkeletonFaults& faults() const { return faults_; }

private:
    struct SkinnedMesh {
        base::vector<const aiNode*> joints;
        bool hasFreeVertices;
    };
    base::ref<base::IPlugin> makeSkin(const base::ref<base::IPlugin>& mesh,
                                      const SkinnedMesh& skinned, base::IPlugin& node,
                                      base::PluginFactory& factory);

    NodeTable& nodes_;
    SkeletonFaults faults_;
    base::hash_map<const base::IPlugin*, SkinnedMesh> meshes_;
};

} // namespace assimp
