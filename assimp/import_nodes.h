#pragma once

#include "assimp/import_geometry.h"
#include "assimp/node_table.h"

struct aiNode;

namespace assimp {

/// Makes the tree of nodes below `root` and returns the node made of `root` itself, in front of
/// whose transform comes `rootTransform`. `geometry` holds the objects of each mesh of the file:
/// they become children of every node that uses it, before the child nodes. Every node is entered
/// into `nodes`.
///
/// The chains of helper nodes into which assimp takes an FBX node with pivots apart are put
/// together again to that one node.
base::ref<base::IPlugin> importNodes(const aiNode& root, const base::mat43& rootTransform,
                                     const base::vector<GeometryObjects>& geometry,
                                     base::PluginFactory& factory, NodeTable& nodes);

/// The transform of a node relative to its parent in the file; the identity where it is not finite.
base::mat43 readTransform(const aiNode& node);

} // namespace assimp
