#include "gltf_statistics.h"

#include <algorithm>
#include <cmath>
#include <set>

namespace test_support {

namespace {

using rapidjson::Value;

std::vector<Vector> positionsOf(const Primitive& primitive) {
    std::vector<Vector> positions;
    const auto found = primitive.attributes.find("POSITION");
    for (size_t i = 0; found != primitive.attributes.end() && i < found->second.count; ++i) {
        const double* p = found->second.at(i);
        positions.push_back({p[0], p[1], p[2]});
    }
    return positions;
}

size_t lineCount(const Primitive& primitive) {
    const size_t corners = primitive.indices.size();
    switch (primitive.mode) {
    case 1:
        return corners / 2;
    case 2:
        return corners;
    case 3:
        return corners > 0 ? corners - 1 : 0;
    default:
        return 0;
    }
}

std::vector<Vector> transform(const Matrix& matrix, std::vector<Vector> points) {
    for (Vector& point : points) {
        point = transformPoint(matrix, point);
    }
    return points;
}

void addPrimitive(Totals& totals, const Primitive& primitive,
                  const std::vector<Vector>& positions) {
    for (const auto& [i, j, k] : primitive.triangles()) {
        const Vector &a = positions[i], &b = positions[j], &c = positions[k];
        ++totals.triangles;
        totals.area += length(cross(b - a, c - a)) / 2;
        totals.volume += dot(a, cross(b, c)) / 6;
        totals.triangleBounds.add(a);
        totals.triangleBounds.add(b);
        totals.triangleBounds.add(c);
    }
    totals.lines += lineCount(primitive);
    totals.points += primitive.mode == 0 ? primitive.indices.size() : 0;
    for (const uint32_t index : primitive.indices) {
        totals.bounds.add(positions[index]);
    }
}

/// How far positions that are rounded to `step` may lie off along each axis of the world.
Vector errorOf(const Matrix& worldFromMesh, double step) {
    Vector error{};
    for (size_t row = 0; row < 3; ++row) {
        for (size_t column = 0; column < 3; ++column) {
            error[row] += std::abs(worldFromMesh[4 * column + row]) * step / 2;
        }
    }
    return error;
}

void addErrors(Statistics& statistics, const Primitive& primitive,
               const std::vector<Vector>& positions, const Vector& error) {
    for (size_t axis = 0; axis < 3; ++axis) {
        statistics.positionError[axis] = std::max(statistics.positionError[axis], error[axis]);
    }
    // Where corners move by d at most, the two edges that span a triangle change by 2d at most.
    const double d = length(error);
    for (const auto& [i, j, k] : primitive.triangles()) {
        const double edges =
            length(positions[j] - positions[i]) + length(positions[k] - positions[i]);
        statistics.areaError += d * edges + 2 * d * d;
    }
}

} // namespace

double positionStep(const GltfFile& file, const Value& primitive) {
    const Value& accessor =
        file.element("accessors", primitive["attributes"]["POSITION"].GetUint());
    if (!accessor.HasMember("min") || !accessor.HasMember("max")) {
        throw GltfError("compressed positions without limits");
    }
    double extent = 0;
    for (rapidjson::SizeType i = 0; i < 3; ++i) {
        extent = std::max(extent, accessor["max"][i].GetDouble() - accessor["min"][i].GetDouble());
    }
    return extent / ((1 << 14) - 1);
}

Statistics statisticsOf(const GltfFile& file) {
    Statistics result;
    result.nodes = file.count("nodes");
    result.meshes = file.count("meshes");
    const std::vector<NodeInstance> instances = file.instances();
    std::set<unsigned> vertexArrays;
    for (size_t mesh = 0; mesh < result.meshes; ++mesh) {
        const Value& objects = file.element("meshes", mesh)["primitives"];
        for (rapidjson::SizeType i = 0; i < objects.Size(); ++i) {
            const Primitive primitive = file.primitive(mesh, i);
            const std::vector<Vector> positions = positionsOf(primitive);
            if (positions.empty()) {
                continue;
            }
            ++result.primitives;
            if (vertexArrays.insert(objects[i]["attributes"]["POSITION"].GetUint()).second) {
                result.vertices += positions.size();
            }
            addPrimitive(result.stored, primitive, positions);
            const double step = primitive.compressed ? positionStep(file, objects[i]) : 0;
            result.compressedPrimitives += primitive.compressed ? 1 : 0;
            for (const NodeInstance& instance : instances) {
                if (instance.mesh != static_cast<int>(mesh)) {
                    continue;
                }
                const std::vector<Vector> moved = transform(instance.worldFromNode, positions);
                addPrimitive(result.drawn, primitive, moved);
                addErrors(result, primitive, moved, errorOf(instance.worldFromNode, step));
            }
        }
    }
    return result;
}

} // namespace test_support
