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

    /// `root` is borrowed and must outlive the table.
    explicit NodeTable(const aiNode& root) : root_(root) {}

    /// The node called `name`, helpers too; the first from the root down if there are several.
    /// Null if there is none.
    const aiNode* find(base::string_view name);
    /// Logs how many of the names that were asked for belong to several nodes.
    void reportSharedNames(const base::string& path) const;

    void add(const aiNode& source, base::IPlugin& object);
    /// The object made of `source`; null for a helper node.
    base::IPlugin* objectOf(const aiNode& source) const;
    /// Tells that the helper `factor` is the parent of `node` and comes in front of its transform.
    void addFactorAbove(const aiNode& node, const aiNode& factor);
    /// That helper; null if the parent is none.
    const aiNode* factorAbove(const aiNode& node) const;
    /// All that were made, in the order of the tree.
    const base::vector<MadeNode>& made() const { return made_; }

private:
    struct Entry {
        const aiNode* node;
        bool isShared = false;
    };
    void gatherNames();

    const aiNode& root_;
    base::hash_map<base::string_view, Entry> byName_;
    base::hash_map<const aiNode*, base::IPlugin*> objects_;
    base::hash_map<const aiNode*, const aiNode*> factors_;
    base::vector<MadeNode> made_;
    base::map<base::string_view, const aiNode*> askedShared_;
};

} // namespace assimp
