#pragma once

#include "assimp/node_table.h"

struct aiScene;

namespace assimp {

/// Adds the lights of a file to the nodes of their names. `metresPerUnit` is what the file's
/// lengths are multiplied with. Lights without a node, and those of a kind that a scene does not
/// know, ambient ones above all, are left out with a message.
///
/// | in the file | in the scene |
/// |---|---|
/// | diffuse color | `color`, at most 1, times `intensity` |
/// | outer cone, inner cone | `spotConeAngle`, the difference as `spotPenumbraAngle` |
/// | constant c, linear l, quadratic q | `size`, see below |
/// | width and height of an area | `size`, and `sizeRatio`: height by width |
///
/// The size s gives (1 + d / s)^2 at distance d the shape of c + l d + q d^2: the root of c / q,
/// else 2 c / l; 0 for q alone.
void importLights(const aiScene& source, double metresPerUnit, NodeTable& nodes,
                  base::PluginFactory& factory, const base::string& path);

} // namespace assimp
