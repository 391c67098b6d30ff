#pragma once

#include "assimp/node_table.h"

struct aiScene;

namespace assimp {

/// The morph object made of a mesh of the file.
struct MorphedMesh {
    base::IPlugin* morph = nullptr; ///< null if it has no targets
    base::string meshName;
    /// Targets that the numbers in animations mean, see `findTargetGroups`.
    base::vector<base::u32> groups;
};

/// The settings of an import that concern animation.
struct AnimationSettings {
    explicit AnimationSettings(const base::AttribMap& importer);

    bool animations;
    bool everyFrame; ///< keys on every frame in place of the file's
    bool firstOnly;  ///< the first animation of the file alone
};

/// True if an animation of the file moves its root.
bool isRootAnimated(const aiScene& source);

/// Makes one layer of the animations of a file and links the attributes of nodes and morph targets
/// to it that change in some animation; those that an animation holds at another value than the
/// node's get that one. `morphs` has an entry for each mesh of the file. `scene` gets the layer,
/// its rate and its range of time.
///
/// The animations become clips one after the other: the first at the times of the file, but not
/// before 0, each of the others from the first whole frame on that lies a frame or more behind the
/// last key of the one before. How long the file says that the last one takes counts for the range
/// alone. A clip that does not move what others do holds its value at rest.
void importAnimations(const aiScene& source, const AnimationSettings& settings, NodeTable& nodes,
                      const base::vector<MorphedMesh>& morphs, base::IPlugin& scene,
                      base::PluginFactory& factory, const base::string& path);

} // namespace assimp
