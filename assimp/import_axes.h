#pragma once

#include "b_types.h"

struct aiScene;

namespace assimp {

/// How the coordinates of a file relate to metres with Y up.
struct SceneAxes {
    base::u8 upAxis = 1;   ///< `upAxis` of the scene object, whose turn the exporter makes
    base::mat43 transform; ///< what goes in front of the root's own transform
};

/// Reads what the file says of its unit and axes and what assimp has not applied already; that is
/// the case for FBX alone (COLLADA and 3DS come with a root that is scaled and turned). Everything
/// else counts as metres with Y up.
SceneAxes readAxes(const aiScene& source);

} // namespace assimp
