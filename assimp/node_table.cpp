#include "assimp/node_table.h"

#include "assimp/library_text.h"

#include "b_log.h"

#include <assimp/scene.h>

namespace assimp {

namespace {

/// A part of the names that the library gives to its helpers.
constexpr base::string_view helperMark = "_$AssimpFbx$_";

} // namespace

NodeTable::NodeTable(const aiNode& root, bool hasHelpers) : root_(root) {
    if (hasHelpers)
        findFactors();
}

/// Not by recursion: files may nest nodes very deep. A helper behind too many others is a node, so
/// no chain of transforms costs much.
void NodeTable::findFactors() {
    constexpr int mostFactors = 32;
    struct Pending {
        const aiNode* node;
        int factorsAbove;
    };
    base::vector<Pending> pending{{&root_, 0}};
    while (!pending.empty()) {
        const auto [node, factorsAbove] = std::as_const(pending).back();
        pending.pop_back();
        const bool isFactor = node != &root_ && node->mNumChildren != 0 && node->mNumMeshes == 0 &&
                              factorsAbove < mostFactors &&
                              viewOf(node->mName).find(helperMark) != base::string_view::npos;
        for (base::u32 i = 0; i < node->mNumChildren; ++i) {
            pending.push_back({node->mChildren[i], isFactor ? factorsAbove + 1 : 0});
            if (isFactor)
                factors_.emplace(node->mChildren[i], node);
        }
    }
}

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

bool NodeTable::isFactor(const aiNode& node) const {
    return node.mNumChildren != 0 && factorAbove(*node.mChildren[0]) == &node;
}

const aiNode* NodeTable::factorAbove(const aiNode& node) const {
    const auto found = factors_.find(&node);
    return found == factors_.end() ? nullptr : found->second;
}

} // namespace assimp
