#pragma once

#include "b_factory.h"

#include <assimp/vector3.h>

#include <vector>

struct aiScene;

namespace test_support {

/// The corners of one mesh's polygons below one node, in the order of the file.
using Point = aiVector3t<double>;
using Corners = std::vector<Point>;

/// Where animation `clip` puts all meshes `seconds` after the start of its clock, in the space of
/// the file's root: told from the library's own data, apart from the importer. Morph targets
/// are not looked at.
std::vector<Corners> poseFile(const aiScene& file, unsigned clip, double seconds);

/// The same for what the importer made of a file, at `seconds` on the scene's clock.
std::vector<Corners> poseScene(base::IPlugin& scene, double seconds);

/// The greatest distance between corners that should be equal, as share of the size of everything.
/// A failure if the numbers of meshes or corners differ.
double poseDifference(const std::vector<Corners>& a, const std::vector<Corners>& b);

} // namespace test_support
