// pose_check MODEL GLTF: compares the vertices of a model with those of its export, uncompressed,
// at ten of the times at which the export is sampled (or as the nodes stand, without animation).
// Prints JSON: the times, the largest distance from a vertex of either to the nearest of the other,
// in parts of the model's size, and how many are further off than the limit. Exit code 2 if a file
// can't be read.

#include "model_pose.h"
#include "model_world.h"

#include "support/gltf_pose.h"

#include <assimp/Importer.hpp>
#include <rapidjson/stringbuffer.h>
#include <rapidjson/writer.h>

#include <cstdio>
#include <unordered_map>

using namespace test_support;

namespace {

constexpr double limit = 1e-4; // of the model's size
constexpr size_t timeCount = 10;

/// Points, to look up the nearest one that is not further off than the limit.
class PointGrid {
public:
    PointGrid(const std::vector<Vector>& points, double cell) : points_(points), cell_(cell) {
        for (size_t i = 0; i < points.size(); ++i) {
            cells_[keyOf(points[i], {0, 0, 0})].push_back(i);
        }
    }

    /// The distance to the nearest point; infinite if that is further off than the cell's size.
    double distanceTo(const Vector& point) const {
        double least = Box::infinity;
        for (int x = -1; x <= 1; ++x) {
            for (int y = -1; y <= 1; ++y) {
                for (int z = -1; z <= 1; ++z) {
                    const auto cell = cells_.find(keyOf(point, {x, y, z}));
                    if (cell == cells_.end()) {
                        continue;
                    }
                    for (const size_t i : cell->second) {
                        least = std::min(least, length(points_[i] - point));
                    }
                }
            }
        }
        return least <= cell_ ? least : Box::infinity;
    }

private:
    uint64_t keyOf(const Vector& point, const std::array<int, 3>& step) const {
        uint64_t key = 0;
        for (size_t axis = 0; axis < 3; ++axis) {
            const auto cell = static_cast<int64_t>(std::floor(point[axis] / cell_)) + step[axis];
            key = (key ^ static_cast<uint64_t>(cell)) * 0x9E3779B97F4A7C15u;
            key ^= key >> 29;
        }
        return key;
    }

    const std::vector<Vector>& points_;
    double cell_;
    std::unordered_map<uint64_t, std::vector<size_t>> cells_;
};

std::vector<Vector> verticesOf(const GltfFile& file, double seconds) {
    const GltfPose pose(file, seconds);
    std::vector<Vector> vertices;
    for (const NodeInstance& instance : pose.instances()) {
        if (instance.mesh < 0) {
            continue;
        }
        const auto mesh = static_cast<size_t>(instance.mesh);
        const auto primitives = file.element("meshes", mesh)["primitives"].Size();
        for (size_t i = 0; i < primitives; ++i) {
            const Primitive primitive = file.primitive(mesh, i);
            if (primitive.mode < 4) {
                continue;
            }
            const std::vector<Vector> drawn = pose.positions(instance, primitive);
            vertices.insert(vertices.end(), drawn.begin(), drawn.end());
        }
    }
    return vertices;
}

struct Comparison {
    std::vector<double> times;
    size_t vertices = 0; ///< of the export, at one time
    double largestDistance = 0;
    size_t farOff = 0;
};

void compareAt(const aiScene& scene, const Matrix& worldFromFile, const GltfFile& file,
               double seconds, Comparison& result) {
    const ModelPose model = poseOf(scene, worldFromFile, seconds);
    const std::vector<Vector> drawn = verticesOf(file, seconds);
    result.times.push_back(seconds);
    result.vertices = drawn.size();
    Box bounds;
    for (const Vector& vertex : model.vertices) {
        bounds.add(vertex);
    }
    if (model.vertices.empty() || drawn.empty()) {
        result.farOff += drawn.size();
        return;
    }
    const double size = length(bounds.max - bounds.min);
    const auto compare = [&](double distance) {
        if (distance > limit * size) {
            ++result.farOff;
        } else {
            result.largestDistance = std::max(result.largestDistance, distance / size);
        }
    };
    const PointGrid modelPoints(model.vertices, limit * size), drawnPoints(drawn, limit * size);
    for (const Vector& vertex : drawn) {
        compare(modelPoints.distanceTo(vertex));
    }
    for (size_t v = 0; v < model.vertices.size(); ++v) {
        if (model.isNeeded[v]) {
            compare(drawnPoints.distanceTo(model.vertices[v]));
        }
    }
}

/// Ten of the times at which the export has samples and the first animation of the model is heard.
std::vector<double> chooseTimes(const GltfFile& file, const KeyRange& range) {
    std::vector<double> times;
    for (const double time : keyTimes(file)) {
        if (time >= range.first - 1e-6 && time <= range.last + 1e-6) {
            times.push_back(time);
        }
    }
    if (times.empty()) {
        return {range.isEmpty ? 0 : range.first};
    }
    std::vector<double> chosen;
    for (size_t i = 0; i < timeCount; ++i) {
        const double time = times[i * (times.size() - 1) / (timeCount - 1)];
        if (chosen.empty() || chosen.back() != time) {
            chosen.push_back(time);
        }
    }
    return chosen;
}

void print(const Comparison& result, const GltfFile& file) {
    rapidjson::StringBuffer buffer;
    rapidjson::Writer<rapidjson::StringBuffer> writer(buffer);
    writer.StartObject();
    writer.Key("skins");
    writer.Uint64(file.count("skins"));
    writer.Key("animations");
    writer.Uint64(file.count("animations"));
    writer.Key("vertices");
    writer.Uint64(result.vertices);
    writer.Key("times");
    writer.StartArray();
    for (const double time : result.times) {
        writer.Double(time);
    }
    writer.EndArray();
    writer.Key("largestDistance");
    writer.Double(result.largestDistance);
    writer.Key("farOff");
    writer.Uint64(result.farOff);
    writer.EndObject();
    std::puts(buffer.GetString());
}

} // namespace

int main(int argc, char** argv) {
    if (argc != 3) {
        std::fprintf(stderr, "usage: pose_check MODEL GLTF\n");
        return 1;
    }
    Assimp::Importer importer;
    const aiScene* scene = importer.ReadFile(argv[1], 0);
    if (!scene || !scene->mRootNode) {
        std::fprintf(stderr, "pose_check: %s: %s\n", argv[1], importer.GetErrorString());
        return 2;
    }
    try {
        const GltfFile file = GltfFile::read(argv[2]);
        const Matrix world = worldFromFile(*scene, lowerExtension(argv[1]));
        Comparison result;
        for (const double time : chooseTimes(file, keyRange(*scene))) {
            compareAt(*scene, world, file, time, result);
        }
        print(result, file);
        return 0;
    } catch (const std::exception& error) {
        std::fprintf(stderr, "pose_check: %s\n", error.what());
        return 2;
    }
}
