#include "scenes.h"

#include "gltf/plugin_desc.h"
#include "scene_mesh.h"

#include <cmath>
#include <random>
#include <stdexcept>

namespace bench {

using base::u32;
using base::vec3f;
using scene::mesh_schema;
using scene::node_schema;
using test_support::SceneBuilder;

namespace {

/// A wave along one side of a grid: values and slopes at its lines.
struct Wave {
    Wave(u32 lineCount, float spacing, float phase) {
        for (u32 i = 0; i < lineCount; ++i) {
            const float angle = 3.7f * spacing * static_cast<float>(i) + phase;
            values.push_back(std::sin(angle));
            slopes.push_back(3.7f * std::cos(angle));
        }
    }
    base::vector<float> values, slopes;
};

void fillVertices(scene::IMesh& mesh, u32 size, float spacing, float phase) {
    const u32 lineCount = size + 1;
    const std::size_t vertexCount = std::size_t(lineCount) * lineCount;
    auto& positions = write(mesh, mesh_schema::n_positions);
    auto& normals = write(mesh, mesh_schema::n_normals);
    auto& uvs = test_support::appendUVs(mesh);
    positions.reserve(vertexCount);
    normals.reserve(vertexCount);
    uvs.reserve(vertexCount);
    const Wave across(lineCount, spacing, phase), along(lineCount, spacing, 1.7f * phase);
    for (u32 y = 0; y < lineCount; ++y) {
        for (u32 x = 0; x < lineCount; ++x) {
            const float column = static_cast<float>(x), row = static_cast<float>(y);
            const float height = 0.1f * std::as_const(across.values)[x] * along.values[y];
            const float dx = 0.1f * across.slopes[x] * along.values[y];
            const float dy = 0.1f * across.values[x] * along.slopes[y];
            const float length = std::sqrt(dx * dx + dy * dy + 1);
            positions.push_back({column * spacing, row * spacing, height});
            normals.push_back({-dx / length, -dy / length, 1 / length});
            uvs.push_back({column / static_cast<float>(size), row / static_cast<float>(size)});
        }
    }
}

/// Makes `mesh` a grid of `size` by `size` squares, each of two triangles.
void fillGrid(scene::IMesh& mesh, u32 size, float spacing, float phase) {
    fillVertices(mesh, size, spacing, phase);
    auto& indices = write(mesh, mesh_schema::n_indices);
    indices.resizeUninitialized(std::size_t(size) * size * 6);
    u32* out = indices.data();
    for (u32 y = 0; y < size; ++y) {
        for (u32 x = 0; x < size; ++x) {
            const u32 corner = y * (size + 1) + x, above = corner + size + 1;
            for (const u32 index : {corner, corner + 1, above + 1, corner, above + 1, above})
                *out++ = index;
        }
    }
    test_support::appendPrimitive(mesh, 3);
}

template <class T, class Schema>
std::span<const T> spanOf(const base::AttribMap& map, const Schema& name) {
    const base::vector<T>* array = find(map, name);
    if (!array)
        throw std::logic_error("the scene has no such array");
    return {array->data(), array->size()};
}

} // namespace

ScenePtr makeScene() {
    auto scene = std::make_unique<SceneBuilder>();
    gltf::registerPlugin(*scene->factory);
    return scene;
}

ScenePtr makeLargeMesh() {
    ScenePtr scene = makeScene();
    auto& node = scene->addTo<scene::INode>(*scene->root, "terrain");
    fillGrid(scene->addTo<scene::IMesh>(node, "terrain"), 2000, 0.01f, 0.3f);
    return scene;
}

ScenePtr makeManyNodes(u32 count) {
    ScenePtr scene = makeScene();
    std::mt19937 random(1);
    const auto next = [&] { return static_cast<float>(random() % 1000003) / 1000003; };
    for (u32 i = 0; i < count; ++i) {
        const std::string number = std::to_string(i);
        auto& node = scene->addTo<scene::INode>(*scene->root, ("node" + number).c_str());
        write(node, node_schema::n_translate) = {100.0 * next(), 100.0 * next(), 100.0 * next()};
        if (i % 4 == 0) {
            const float half = 3 * next();
            write(node, node_schema::n_rotate) = {0, std::sin(half), 0, std::cos(half)};
        }
        fillGrid(scene->addTo<scene::IMesh>(node, ("mesh" + number).c_str()), 5, 0.2f, 6 * next());
    }
    return scene;
}

base::vector<MeshArrays> findArrays(const SceneBuilder& scene) {
    base::vector<MeshArrays> all;
    for (const base::ref<base::IPlugin>& object : scene.factory->plugins()) {
        const auto* mesh = dynamic_cast<const scene::IMesh*>(object.get());
        if (!mesh)
            continue;
        const base::AttribMap* uvSet = scene::findListItem(*mesh, mesh_schema::n_uvSets, 0);
        all.push_back({spanOf<vec3f>(*mesh, mesh_schema::n_positions),
                       spanOf<base::normal>(*mesh, mesh_schema::n_normals),
                       spanOf<base::vec2f>(*uvSet, scene::meshUVSet_schema::n_UV),
                       spanOf<u32>(*mesh, mesh_schema::n_indices)});
    }
    return all;
}

std::size_t byteCountOf(const base::vector<MeshArrays>& meshes) {
    std::size_t count = 0;
    for (const MeshArrays& mesh : meshes)
        count += mesh.positions.size_bytes() + mesh.normals.size_bytes() + mesh.uvs.size_bytes() +
                 mesh.indices.size_bytes();
    return count;
}

void exportScene(SceneBuilder& scene, const std::string& path, const base::AttribMap& settings) {
    if (!scene.factory->save(*scene.factory, base::string(path), settings))
        throw std::runtime_error("the scene was not exported");
}

void exportScene(SceneBuilder& scene, const std::string& path, bool compress) {
    base::AttribMap settings;
    settings.attribute<bool>(scene::sceneExporter_schema::n_exportCompress) = compress;
    exportScene(scene, path, settings);
}

} // namespace bench
