#pragma once

#include "b_attribute_map.h"

namespace scene {

class MeshEdit;

/// Prepares the rewriting of joints set `setIndex` of the mesh `meshName` from one entry per
/// position to one per vertex; `positionOfVertex` gives each vertex's position. Counts that are
/// not one per position are logged and dropped; joint indices or weights that are too few for the
/// counts are dropped, so that readers find them missing.
void rewriteJointsSet(base::AttribMap& set, base::u32 setIndex, const base::string& meshName,
                      base::u32 positionCount, const base::vector<base::u32>& positionOfVertex,
                      MeshEdit& edit);

} // namespace scene
