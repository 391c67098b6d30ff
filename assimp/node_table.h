#pragma once

#include "b_factory.h"

struct aiNode;

namespace assimp {

/// The nodes of a file by their names, and the scene's nodes that are made of them.
class NodeTable {
public:
    /// A node of the file and the one that stands for it.
    struct MadeNode {
        const aiNode* source;
        base::IPlugin* object;
    };

    /// `root` is borrowed and must outlive the table. `hasHelpers`: nodes with the names of the
    /// library's helpers are helpers, as in FBX files.
    NodeTable(const aiNode& root, bool hasHelpers);

    /// The node called `name`, helpers too; the first from the root down if there are several.
    /// Null if there is none.
    const aiNode* find(base::string_view name);
    /// Logs how many of the names that were asked for belong to several nodes.
    void reportSharedNames(const base::string& path) const;

    void add(const aiNode& source, base::IPlugin& object);
    /// The object made of `source`; null for a helper node.
    base::IPlugin* objectOf(const aiNode& source) const;
    /// True for a helper: a node that stands for one factor of its children's transforms. No more
    /// than 32 come one below the other, which is more than the library makes.
    bool isFactor(const aiNode& node) const;
    /// The helper that is the parent of `node`; null if the parent is none.
    const aiNode* factorAbove(const aiNode& node) const;
    /// All that were made, in the order of the tree.
    const base::vector<MadeNode>& made() const { return made_; }

private:
    struct Entry {
        const aiNode* node;
        bool isShared = false;
    };
    void gatherNames();
    void findFactors();

    const aiNode& root_;
    base::hash_map<base::string_view, Entry> byName_;
    base::hash_map<const aiNode*, base::IPlugin*> objects_;
    base::hash_map<const aiNode*, const aiNode*> factors_; ///< by their children
    base::vector<MadeNode> made_;
    base::map<base::string_view, const aiNode*> askedShared_;
};

} // namespace assimp
