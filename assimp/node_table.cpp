#include "assimp/node_table.h"

#include "assimp/library_text.h"

#include "b_log.h"

#include <assimp/scene.h>

namespace assimp {

const aiNode* NodeTable::find(base::string_view name) {
    if (byName_.empty())
        gatherNames();
    const auto found = byName_.find(name);
    if (found == byName_.end())
        return nullptr;
    if (found->second.isShared)
        askedShared_.try_emplace(found->first, found->second.node);
    return found->second.node;
}

/// Not by recursion: files may nest nodes very deep.
void NodeTable::gatherNames() {
    base::vector<const aiNode*> pending{&root_};
    while (!pending.empty()) {
        const aiNode* node = std::as_const(pending).back();
        pending.pop_back();
        const auto [at, isNew] = byName_.try_emplace(viewOf(node->mName), Entry{node});
        at->second.isShared |= !isNew;
        for (base::u32 i = node->mNumChildren; i-- > 0;)
            pending.push_back(node->mChildren[i]);
    }
}

void NodeTable::reportSharedNames(const base::string& path) const {
    if (!askedShared_.empty())
        base::log().log(base::logScene, base::logWarning,
                        "assimp |{}| Found {} names of joints, animated nodes, lights or cameras "
                        "that several nodes have, the first one is taken!",
                        path, askedShared_.size());
}

void NodeTable::add(const aiNode& source, base::IPlugin& object) {
    objects_.emplace(&source, &object);
    made_.push_back({&source, &object});
}

base::IPlugin* NodeTable::objectOf(const aiNode& source) const {
    const auto found = objects_.find(&source);
    return found == objects_.end() ? nullptr : found->second;
}

void NodeTable::addFactorAbove(const aiNode& node, const aiNode& factor) {
    factors_.emplace(&node, &factor);
}

const aiNode* NodeTable::factorAbove(const aiNode& node) const {
    const auto found = factors_.find(&node);
    return found == factors_.end() ? nullptr : found->second;
}

} // namespace assimp
