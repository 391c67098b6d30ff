#pragma once

#include "support/geometry.h"

#include <assimp/scene.h>

#include <string>
#include <string_view>

test_support::Matrix toMatrix(const aiMatrix4x4& matrix);

/// From the axes and the unit of a model file of that extension (lower case) to Y up and metres.
/// COLLADA and 3DS files carry this turn in their root node already, and files of other formats
/// are taken as they are.
test_support::Matrix worldFromFile(const aiScene& scene, std::string_view extension);

/// The extension of a path in lower case.
std::string lowerExtension(std::string_view path);
