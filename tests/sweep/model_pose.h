#pragma once

#include "support/geometry.h"

#include <assimp/scene.h>

#include <vector>

/// The times of the keys of a model's first animation, in seconds.
struct KeyRange {
    double first = 0, last = 0;
    bool isEmpty = true;
};
KeyRange keyRange(const aiScene& scene);

struct ModelPose {
    std::vector<test_support::Vector>
        vertices;               ///< in the world, of the faces with three corners up
    std::vector<bool> isNeeded; ///< false for vertices that only faces without area use
};

/// The vertices of a model at one time of its first animation: keys linear, rotations on a sphere,
/// then morph targets, then bones. What glTF can hold counts: the four heaviest bones of a vertex,
/// with weights that add up to 1; a vertex without bones moves with the node of its mesh.
ModelPose poseOf(const aiScene& scene, const test_support::Matrix& worldFromFile, double seconds);
