#pragma once

#include "b_factory.h"

#include <assimp/vector3.h>

namespace assimp {

/// Where a light or camera is in the space of its node, as the file has it. Directions need not
/// have unit length; one without any counts as that of the framework.
struct Placement {
    aiVector3D position;
    aiVector3D direction{0, 0, -1};
    aiVector3D up{0, 1, 0};
};

/// Adds `object` to the children of `node`. The framework's lights and cameras look along -Z from
/// the origin with Y up: one that does not gets a node of its own below `node`, with its name.
void addPlaced(base::IPlugin& node, const Placement& placement,
               const base::ref<base::IPlugin>& object, base::PluginFactory& factory);

} // namespace assimp
