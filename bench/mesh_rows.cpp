#include "delaunay_floor.h"
#include "index_floor.h"
#include "measure.h"
#include "polygons.h"

#include "b_factory.h"
#include "scene_mesh_index.h"
#include "scene_mesh_triangulate.h"
#include "scene_schema.h"

#include <stdexcept>

/// Mesh processing.
namespace bench {

namespace {

using scene::mesh_schema;

constexpr base::u32 polygonCount = 200000;

/// Names of attributes exist once a factory knows the schemas.
void registerSchemas() {
    base::PluginFactory factory;
    scene::register_scene_schema(factory);
}

void requireEqual(std::size_t count, std::size_t floorCount) {
    if (count != floorCount)
        throw std::runtime_error("the floor has another result");
}

void singleIndex(benchmark::State& state) {
    registerSchemas();
    const Corners corners = makeCorners(polygonCount);
    for (auto _ : state) {
        base::AttribMap mesh;
        fillMesh(mesh, corners);
        const double seconds = secondsOf([&] { scene::convertToSingleIndex(mesh); });
        std::size_t vertexCount = 0;
        const double floorSeconds = secondsOf([&] {
            vertexCount = PairNumbering(corners.positions, corners.normals).firstPair.size();
        });
        requireEqual(find(mesh, mesh_schema::n_positions)->size(), vertexCount);
        reportTimes(state, seconds, floorSeconds);
        state.counters["corners"] = static_cast<double>(corners.positions.size());
        state.counters["vertices"] = static_cast<double>(vertexCount);
    }
}

void triangulation(benchmark::State& state) {
    registerSchemas();
    const Outlines outlines = makeOutlines(polygonCount);
    for (auto _ : state) {
        base::AttribMap mesh;
        fillMesh(mesh, outlines);
        const double seconds = secondsOf([&] { scene::triangulate(mesh, false, true); });
        std::size_t triangleCount = 0;
        const double floorSeconds = secondsOf([&] { triangleCount = triangulateBare(outlines); });
        requireEqual(find(mesh, mesh_schema::n_triIndices)->size() / 3, triangleCount);
        reportTimes(state, seconds, floorSeconds);
        state.counters["corners"] = static_cast<double>(outlines.points.size());
        state.counters["triangles"] = static_cast<double>(triangleCount);
    }
}

BENCH_ROW(singleIndex, "mesh/index");
BENCH_ROW(triangulation, "mesh/triangulate");

} // namespace

} // namespace bench
