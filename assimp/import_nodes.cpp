#include "assimp/import_nodes.h"

#include "assimp/library_text.h"

#include "b_log.h"
#include "scene_schema.h"
#include "scene_transform.h"

#include <assimp/ColladaMetaData.h>
#include <assimp/scene.h>

#include <algorithm>
#include <cmath>

namespace assimp {

using base::mat43;
using base::string_view;
using base::u32;
using scene::node_schema;

namespace {

/// A node of the file that waits to be made.
struct Pending {
    const aiNode* source;
    base::IPlugin* parent;     ///< null for the root
    mat43 parentFromChain;     ///< what comes in front of the source's own transform
    const aiNode* factorAbove; ///< the last node of that chain, null if there is none
};

bool hasFiniteTransform(const aiNode& node) {
    const float* values = &node.mTransformation.a1;
    return std::all_of(values, values + 12, [](float v) { return std::isfinite(v); });
}

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
    if (!hasFiniteTransform(node))
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

bool isTransformFactor(const aiNode& node) {
    return node.mNumChildren != 0 && node.mNumMeshes == 0 &&
           viewOf(node.mName).find("_$AssimpFbx$_") != string_view::npos;
}

mat43 readTransform(const aiNode& node) {
    const aiMatrix4x4& m = node.mTransformation;
    if (!hasFiniteTransform(node))
        return {};
    return {{{m.a1, m.a2, m.a3}, {m.b1, m.b2, m.b3}, {m.c1, m.c2, m.c3}}, {m.a4, m.b4, m.c4}};
}

base::ref<base::IPlugin> importNodes(const aiNode& root, const mat43& rootTransform,
                                     const base::vector<GeometryObjects>& geometry,
                                     base::PluginFactory& factory, NodeTable& nodes) {
    base::ref<base::IPlugin> result;
    // Not by recursion: files may nest nodes very deep.
    base::vector<Pending> pending{{&root, nullptr, rootTransform, nullptr}};
    while (!pending.empty()) {
        auto [source, parent, transform, factorAbove] = std::as_const(pending).back();
        pending.pop_back();
        reportTransform(*source);
        if (factorAbove)
            nodes.addFactorAbove(*source, *factorAbove);
        transform = scene::multiply(transform, readTransform(*source));
        if (parent && isTransformFactor(*source)) {
            for (u32 i = source->mNumChildren; i-- > 0;)
                pending.push_back({source->mChildren[i], parent, transform, source});
            continue;
        }
        base::ref<base::IPlugin> node = importNode(*source, transform, geometry, factory);
        nodes.add(*source, *node);
        if (parent)
            write(*parent, node_schema::n_children).push_back(node);
        else
            result = node;
        for (u32 i = source->mNumChildren; i-- > 0;)
            pending.push_back({source->mChildren[i], node.get(), {}, nullptr});
    }
    return result;
}

} // namespace assimp
