#pragma once

#include "scene.h"

namespace gltf {

/// The number that the document gives to the set called `name`; 0 if there is no such set or it is
/// not exported.
base::i32 findTexCoord(const scene::IMesh& mesh, base::string_view name);

} // namespace gltf
