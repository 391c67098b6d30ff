#pragma once

#include "support/scene_builder.h"

#include <memory>
#include <span>
#include <string>

/// The scenes that are exported.
namespace bench {

using ScenePtr = std::unique_ptr<test_support::SceneBuilder>;

/// A scene with nothing in it that can be exported.
ScenePtr makeScene();

/// One node with a wavy grid of 8 million triangles: 4 million vertices with normals and one set
/// of texture coordinates. Takes no more memory on the way than the scene has in the end.
ScenePtr makeLargeMesh();

/// So many nodes below the root, each with a mesh of its own of 50 triangles (36 vertices with
/// normals and texture coordinates). All have names and a place; every fourth is turned as well.
ScenePtr makeManyNodes(base::u32 count);

/// The arrays of one mesh.
struct MeshArrays {
    std::span<const base::vec3f> positions;
    std::span<const base::normal> normals;
    std::span<const base::vec2f> uvs;
    std::span<const base::u32> indices;
};
base::vector<MeshArrays> findArrays(const test_support::SceneBuilder& scene);
/// Bytes of all arrays together.
std::size_t byteCountOf(const base::vector<MeshArrays>& meshes);

/// The export as a host calls it. Throws if it fails.
void exportScene(test_support::SceneBuilder& scene, const std::string& path,
                 const base::AttribMap& settings);
void exportScene(test_support::SceneBuilder& scene, const std::string& path, bool compress);

} // namespace bench
