#include "assimp/import_nodes.h"

#include "assimp/library_matrix.h"
#include "assimp/library_text.h"

#include "b_log.h"
#include "scene_schema.h"
#include "scene_transform.h"

#include <assimp/ColladaMetaData.h>
#include <assimp/scene.h>

namespace assimp {

using base::mat43;
using base::string_view;
using base::u32;
using scene::node_schema;

namespace {

/// A node of the file that waits to be made.
struct Pending {
    const aiNode* source;
    base::IPlugin* parent; ///< null for the root
    mat43 parentFromChain; ///< what comes in front of the source's own transform
};

/// The name in the file; empty where assimp made one up.
base::string nameOf(const aiNode& node) {
    const string_view name = viewOf(node.mName);
    if (name.starts_with('<') && name.ends_with('>')) // such as "<3DSRoot>"
        return {};
    if (!name.starts_with("$ColladaAutoName$"))
        return base::string(name);
    aiString id;
    if (node.mMetaData && node.mMetaData->Get(AI_METADATA_COLLADA_ID, id))
        return base::string(viewOf(id));
    return {};
}

/// Tells of what `readTransform` leaves out.
void reportTransform(const aiNode& node) {
    const auto warn = [&](const char* text) {
        base::log().log(base::logScene, base::logWarning, text, nameOf(node));
    };
    const aiMatrix4x4& m = node.mTransformation;
    if (mat43 matrix; !readMatrix(m, matrix))
        warn("assimp |{}| The transform has numbers that are not finite, the identity is taken!");
    else if (m.d1 != 0 || m.d2 != 0 || m.d3 != 0 || m.d4 != 1)
        warn("assimp |{}| The transform is not affine, its last row is left out!");
}

base::ref<base::IPlugin> importNode(const aiNode& source, const mat43& transform,
                                    const base::vector<GeometryObjects>& geometry,
                                    base::PluginFactory& factory) {
    base::ref<base::IPlugin> node = factory.create(node_schema::n_kind);
    if (base::string name = nameOf(source); !name.empty())
        write(*node, node_schema::n_name) = std::move(name);
    scene::storeTransform(*node, transform);
    if (source.mNumMeshes + source.mNumChildren == 0)
        return node;
    auto& children = write(*node, node_schema::n_children);
    children.reserve(source.mNumMeshes + source.mNumChildren);
    for (u32 i = 0; i < source.mNumMeshes; ++i)
        if (source.mMeshes[i] < geometry.size())
            children.append(geometry[source.mMeshes[i]].begin(), geometry[source.mMeshes[i]].end());
    return node;
}

} // namespace

mat43 readTransform(const aiNode& node) {
    mat43 matrix;
    readMatrix(node.mTransformation, matrix);
    return matrix;
}

base::ref<base::IPlugin> importNodes(const aiNode& root, const mat43& rootTransform,
                                     const base::vector<GeometryObjects>& geometry,
                                     base::PluginFactory& factory, NodeTable& nodes) {
    base::ref<base::IPlugin> result;
    // Not by recursion: files may nest nodes very deep.
    base::vector<Pending> pending{{&root, nullptr, rootTransform}};
    while (!pending.empty()) {
        auto [source, parent, transform] = std::as_const(pending).back();
        pending.pop_back();
        reportTransform(*source);
        transform = scene::multiply(transform, readTransform(*source));
        if (nodes.isFactor(*source)) {
            for (u32 i = source->mNumChildren; i-- > 0;)
                pending.push_back({source->mChildren[i], parent, transform});
            continue;
        }
        base::ref<base::IPlugin> node = importNode(*source, transform, geometry, factory);
        nodes.add(*source, *node);
        if (parent)
            write(*parent, node_schema::n_children).push_back(node);
        else
            result = node;
        for (u32 i = source->mNumChildren; i-- > 0;)
            pending.push_back({source->mChildren[i], node.get(), {}});
    }
    return result;
}

} // namespace assimp
