#include "polygons.h"

#include "b_vector_math.h"
#include "support/scene_builder.h"

#include <cmath>
#include <numbers>
#include <random>

namespace bench {

using base::u16;
using base::u32;
using base::vec2d;
using base::vec3d;
using base::vec3f;
using scene::mesh_schema;

namespace {

/// The same numbers in every run.
class Random {
public:
    double between(double low, double high) {
        return low + (high - low) * static_cast<double>(engine_()) * 0x1p-32;
    }
    u32 below(u32 end) { return static_cast<u32>(engine_() % end); }

private:
    std::mt19937 engine_{1};
};

using Points = base::vector<vec2d>;

/// Corners all around the centre: on an ellipse, or for a star at distances that differ.
Points makeRound(Random& random, bool isStar) {
    const u32 count = 5 + random.below(8);
    const double height = random.between(0.4, 1);
    Points points;
    for (u32 i = 0; i < count; ++i) {
        const double angle = 2 * std::numbers::pi * (i + random.between(0, 0.6)) / count;
        const double distance = isStar ? random.between(0.3, 1) : 1;
        points.push_back({distance * std::cos(angle), distance * height * std::sin(angle)});
    }
    return points;
}

Points makeL(Random& random) {
    const double bar = random.between(0.3, 2), width = random.between(1.5, 3);
    const double top = bar + random.between(0.3, 2);
    return {{0, 0}, {width, 0}, {width, bar}, {1, bar}, {1, top}, {0, top}};
}

/// A bar with teeth on it, one unit wide and apart; two make a U.
Points makeComb(Random& random, u32 teeth) {
    const double bar = random.between(0.3, 2);
    Points points = {{0, 0}, {2.0 * teeth - 1, 0}};
    for (u32 tooth = teeth; tooth-- > 0;) {
        const double left = 2.0 * tooth, top = bar + random.between(0.3, 2);
        points.push_back({left + 1, top});
        points.push_back({left, top});
        if (tooth == 0)
            break;
        points.push_back({left, bar});
        points.push_back({left - 1, bar});
    }
    return points;
}

Points makePlus(Random& random) {
    const double a = random.between(0.3, 2), b = a + random.between(0.3, 2);
    const double c = b + random.between(0.3, 2);
    return {{a, 0}, {b, 0}, {b, a}, {c, a}, {c, b}, {b, b},
            {b, c}, {a, c}, {a, b}, {0, b}, {0, a}, {a, a}};
}

Points makeOutline(Random& random) {
    const u32 kind = random.below(10);
    if (kind < 8)
        return makeRound(random, kind < 4);
    switch (random.below(4)) {
    case 0:
        return makeL(random);
    case 1:
        return makeComb(random, 2);
    case 2:
        return makeComb(random, 3);
    default:
        return makePlus(random);
    }
}

/// A plane in any position: its origin and two directions.
struct Plane {
    explicit Plane(Random& random)
        : origin(anywhere(random, 50)), u(anywhere(random, 1)), v(anywhere(random, 1)) {
        u = u * (1 / length(u));
        v = v - u * dot(u, v);
        v = v * (1 / length(v));
    }
    vec3f place(const vec2d& p) const {
        const vec3d at = origin + u * p.x + v * p.y;
        return {static_cast<float>(at.x), static_cast<float>(at.y), static_cast<float>(at.z)};
    }
    vec2d project(const vec3f& p) const {
        const vec3d way = vec3d{p.x, p.y, p.z} - origin;
        return {dot(way, u), dot(way, v)};
    }

    vec3d origin, u, v;

private:
    static vec3d anywhere(Random& random, double extent) {
        return {random.between(-extent, extent), random.between(-extent, extent),
                random.between(-extent, extent)};
    }
};

void appendPolygons(base::AttribMap& mesh, const base::vector<u16>& sizes) {
    base::AttribMap& primitive = test_support::appendItem(mesh, mesh_schema::n_primitives);
    write(primitive, scene::meshPrimitive_schema::n_vcounts) = sizes;
}

} // namespace

Outlines makeOutlines(u32 count) {
    Random random;
    Outlines outlines;
    for (u32 i = 0; i < count; ++i) {
        const Points outline = makeOutline(random);
        const Plane plane(random);
        outlines.sizes.push_back(static_cast<u16>(outline.size()));
        for (const vec2d& point : outline) {
            outlines.positions.push_back(plane.place(point));
            outlines.points.push_back(plane.project(outlines.positions.back()));
        }
    }
    return outlines;
}

void fillMesh(base::AttribMap& mesh, const Outlines& outlines) {
    write(mesh, mesh_schema::n_positions) = outlines.positions;
    appendPolygons(mesh, outlines.sizes);
}

Corners makeCorners(u32 polygonCount) {
    constexpr u32 lineLength = 2000;
    Random random;
    Corners corners;
    u32 line = 0, column = 0;
    for (u32 polygon = 0; polygon < polygonCount; ++polygon) {
        const u32 size = 5 + random.below(8), below = (size + 1) / 2, above = size - below;
        if (column + below > lineLength) {
            ++line;
            column = 0;
        }
        const u32 first = line * lineLength + column;
        for (u32 i = 0; i < below; ++i)
            corners.positions.push_back(first + i);
        for (u32 i = above; i-- > 0;)
            corners.positions.push_back(first + lineLength + i);
        corners.sizes.push_back(static_cast<u16>(size));
        column += below - 1;
    }
    // One normal for each position, and one for each flat polygon.
    corners.positionCount = corners.normalCount = (line + 2) * lineLength;
    const u32* position = std::as_const(corners.positions).begin();
    for (u32 polygon = 0; polygon < polygonCount; ++polygon) {
        const bool isFlat = polygon % 4 == 0;
        for (u16 i = 0; i < std::as_const(corners.sizes)[polygon]; ++i, ++position)
            corners.normals.push_back(isFlat ? corners.normalCount : *position);
        corners.normalCount += isFlat;
    }
    return corners;
}

void fillMesh(base::AttribMap& mesh, const Corners& corners) {
    write(mesh, mesh_schema::n_positions).resize(corners.positionCount, vec3f{1, 2, 3});
    write(mesh, mesh_schema::n_normals).resize(corners.normalCount, base::normal{0, 0, 1});
    write(mesh, mesh_schema::n_positionIndices) = corners.positions;
    write(mesh, mesh_schema::n_normalIndices) = corners.normals;
    appendPolygons(mesh, corners.sizes);
}

} // namespace bench
