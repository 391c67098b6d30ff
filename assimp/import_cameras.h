#pragma once

#include "assimp/node_table.h"

struct aiScene;

namespace assimp {

/// Adds the cameras of a file to the nodes of their names; those without a node are left out with
/// a message. The horizontal angle of view fits the width of the sensor, which is 36 mm; its height
/// follows from the proportions of the picture where the file tells them.
void importCameras(const aiScene& source, NodeTable& nodes, base::PluginFactory& factory,
                   const base::string& path);

} // namespace assimp
