#pragma once

#include "b_types.h"

struct aiScene;

namespace assimp {

/// How the coordinates of a file relate to metres with Y up.
struct SceneAxes {
    base::u8 upAxis = 1;   ///< `upAxis` of the scene object, whose turn the exporter makes
    base::mat43 transform; ///< what goes in front of the root's own transform
};

/// Reads what the file says of its unit and axes. That of FBX assimp has not applied. For formats
/// `withTurnedRoot` (COLLADA and 3DS) it has put unit and turn into the root: a root that does
/// nothing else keeps the unit alone, and the turn becomes `upAxis`. Everything else counts as
/// metres with Y up.
SceneAxes readAxes(aiScene& source, bool withTurnedRoot);

} // namespace assimp
