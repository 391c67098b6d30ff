#pragma once

#include "assimp/import_geometry.h"
#include "assimp/node_table.h"

struct aiBone;
struct aiMesh;

namespace assimp {

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
    VertexJoints readJoints(const aiMesh& mesh);
    /// Takes note of the objects of the mesh whose joints were read last, and writes the bind pose
    /// of the one with a joints set. That mesh may be deleted afterwards.
    void addObjects(const GeometryObjects& objects);
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
    base::vector<const aiBone*> bones_; ///< of the mesh that was read last, those with a node
    bool hasFreeVertices_ = false;      ///< of that mesh
    base::hash_map<const base::IPlugin*, SkinnedMesh> meshes_;
};

} // namespace assimp
