#pragma once

#include "gltf_reader.h"

namespace test_support {

/// A channel of a file's first animation. Its values are linear between the keys.
struct AnimationChannel {
    size_t node = 0;
    std::string path;
    int input = -1; ///< the accessor of `times`
    std::vector<double> times;
    AccessorValues values;
};

/// Throws `GltfError` for other interpolations.
std::vector<AnimationChannel> animationChannels(const GltfFile& file);

/// The times in seconds of all keys of a file's first animation, sorted, each once.
std::vector<double> keyTimes(const GltfFile& file);

/// A file's nodes and vertices at one time of its first animation, by the formulas of glTF: linear
/// channels, skins, morph targets. What is not animated stays as the file stores it. Other
/// interpolations throw `GltfError`.
class GltfPose {
public:
    GltfPose(const GltfFile& file, double seconds);

    const std::vector<NodeInstance>& instances() const { return instances_; }
    /// The transform of a node in the world; the identity for one that is not in the scene.
    const Matrix& worldFromNode(size_t node) const { return worldFromNode_.at(node); }
    /// The weights of the morph targets of a node with a mesh.
    std::vector<double> weights(const NodeInstance& instance) const;
    /// The vertices of a primitive that `instance` draws, in the world.
    std::vector<Vector> positions(const NodeInstance& instance, const Primitive& primitive) const;

private:
    void applyAnimation(std::vector<Placement>& placements, double seconds);
    std::vector<Matrix> jointMatrices(size_t skin) const;

    const GltfFile& file_;
    std::vector<bool> isPlaced_;               ///< nodes whose transform is animated
    std::vector<std::vector<double>> weights_; ///< by node; empty where not animated
    std::vector<NodeInstance> instances_;
    std::vector<Matrix> worldFromNode_;
};

} // namespace test_support
