#include "GLTF/collect.h"

#include <algorithm>

namespace GLTF {

namespace {

/// Removes nodes that carry nothing. Children are settled before their parents, so one walk
/// reaches what repeated removal of leaves would.
class UnusedNodeRemover {
public:
    UnusedNodeRemover(Asset& asset, const Options& options)
        : asset_(asset), lightsCount_(options.keepMaterialsCommon || options.generateShaders) {
        for (const Skin* skin : asset.getAllSkins()) {
            skinNodes_.push_back(skin->skeleton.get());
            for (const ref<Node>& joint : skin->joints)
                skinNodes_.push_back(joint.get());
        }
        std::sort(skinNodes_.begin(), skinNodes_.end());
    }

    void run() {
        vector<ref<Node>>& roots = asset_.getDefaultScene().nodes;
        for (const ref<Node>& root : std::as_const(roots)) {
            if (root)
                settle(*root);
        }
        removeFrom(roots);
    }

private:
    struct Step {
        Node* node;
        std::size_t nextChild;
    };

    /// Removes what is unused below `root`, unless an earlier call came across it.
    void settle(Node& root) {
        if (!walk_.take(root))
            return;
        stack_.push_back({&root, 0});
        while (!stack_.empty()) {
            Step& step = stack_.back();
            if (step.nextChild < step.node->children.size()) {
                Node* child = step.node->children[step.nextChild++].get();
                if (child && walk_.take(*child))
                    stack_.push_back({child, 0});
            } else {
                removeFrom(step.node->children);
                stack_.pop_back();
            }
        }
    }

    void removeFrom(vector<ref<Node>>& nodes) {
        const auto isUnusedRef = [this](const ref<Node>& node) { return isUnused(node.get()); };
        const vector<ref<Node>>& list = nodes;
        if (std::none_of(list.begin(), list.end(), isUnusedRef))
            return;
        for (const ref<Node>& node : list) {
            if (isUnused(node.get()) && node->light)
                asset_.globalLights.push_back(node->light);
        }
        nodes.erase(std::remove_if(nodes.begin(), nodes.end(), isUnusedRef), nodes.end());
    }

    bool isUnused(const Node* node) const {
        if (!node || !node->children.empty() || node->mesh || node->camera || node->skin)
            return false;
        if (lightsCount_ && node->light &&
            node->light->type != MaterialCommon::Light::Type::ambient)
            return false;
        return !std::binary_search(skinNodes_.begin(), skinNodes_.end(), node);
    }

    Asset& asset_;
    const bool lightsCount_;
    vector<const Node*> skinNodes_; ///< sorted
    const Walk walk_;
    vector<Step> stack_;
};

} // namespace

void Asset::mergeAnimations() {
    if (animations.empty())
        return;
    const auto merged = base::makeRef<Animation>();
    for (const ref<Animation>& animation : std::as_const(animations)) {
        const vector<ref<Animation::Channel>>& channels = animation->channels;
        merged->channels.append(channels.begin(), channels.end());
    }
    animations.clear();
    animations.push_back(merged);
}

void Asset::removeUnusedNodes(const Options& options) {
    UnusedNodeRemover(*this, options).run();
}

void Asset::removeUncompressedBufferViews() {
    for (Primitive* primitive : getAllPrimitives()) {
        if (!primitive->draco())
            continue;
        collect::forEachAttribute(*primitive,
                                  [](Accessor& accessor) { accessor.bufferView.reset(); });
        if (primitive->indices)
            primitive->indices->bufferView.reset();
    }
}

bool Asset::compressPrimitives(const Options& options) {
    for (Primitive* primitive : getAllPrimitives()) {
        DracoExtension* draco = primitive->draco();
        if (draco && !draco->bufferView && !draco->encode(options))
            return false;
    }
    return true;
}

} // namespace GLTF
