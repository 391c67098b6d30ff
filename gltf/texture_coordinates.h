#pragma once

#include "scene.h"

namespace gltf {

/// True if the set of a mesh of `vertexCount` vertices becomes texture coordinates of the document:
/// it has one pair of numbers for each vertex.
bool isExportedUVSet(const base::AttribMap& set, std::size_t vertexCount);

/// The number that the document gives to the set called `name`; 0 if there is no such set or it is
/// not exported.
base::i32 findTexCoord(const scene::IMesh& mesh, base::string_view name);

} // namespace gltf
