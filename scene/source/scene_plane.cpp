#include "scene_plane.h"

#include "b_vector_math.h"

#include <algorithm>
#include <array>
#include <cfloat>
#include <cmath>

namespace scene {

using base::u32;
using base::vec2d;
using base::vec3d;
using base::vec3f;

namespace {

/// Part of the extent of an outline within which points are taken to touch: far more than
/// coordinates in double precision are uncertain, so that what passes is simple beyond doubt.
constexpr double contact = 1e-12;

vec3d subtract(const vec3f& a, const vec3f& b) {
    return {double(a.x) - b.x, double(a.y) - b.y, double(a.z) - b.z};
}

/// The cross product of the way to the farthest corner with the way to the one that lies farthest
/// from that line: a normal for outlines whose signed area vanishes, like a figure of eight.
vec3d widestCross(const base::vector<vec3f>& positions, std::span<const u32> corners,
                  const vec3d& toFarthest) {
    const vec3f origin = positions[corners[0]];
    vec3d widest;
    for (const u32 corner : corners) {
        const vec3d n = cross(toFarthest, subtract(positions[corner], origin));
        if (dot(n, n) > dot(widest, widest))
            widest = n;
    }
    return widest;
}

} // namespace

double distance(const vec2d& a, const vec2d& b) {
    return std::sqrt((b.x - a.x) * (b.x - a.x) + (b.y - a.y) * (b.y - a.y));
}

std::optional<PolygonPlane> findPlane(const base::vector<vec3f>& positions,
                                      std::span<const u32> corners) {
    const vec3f origin = positions[corners[0]];
    vec3d sum, previous, farthest;
    double greatestSquare = 0;
    for (const u32 corner : corners) {
        const vec3d p = {positions[corner].x, positions[corner].y, positions[corner].z};
        const vec3d way = {p.x - origin.x, p.y - origin.y, p.z - origin.z};
        const vec3d n = cross(previous, way);
        sum = {sum.x + n.x, sum.y + n.y, sum.z + n.z};
        previous = way;
        if (dot(way, way) > dot(farthest, farthest))
            farthest = way;
        const double square = dot(p, p);
        if (square > greatestSquare || std::isnan(square)) // NaN stays
            greatestSquare = square;
    }
    if (!std::isfinite(greatestSquare))
        return std::nullopt;
    // Coordinates are rounded to one part in 2^24, which widens a line to a sliver of this area.
    const double precision = 2 * double(FLT_EPSILON) * std::sqrt(greatestSquare);
    const double rounding = precision * length(farthest);
    if (!(length(sum) > rounding))
        sum = widestCross(positions, corners, farthest);
    const double size = length(sum);
    if (!(size > rounding))
        return std::nullopt;
    return PolygonPlane{sum * (1 / size), precision};
}

void projectPolygon(const base::vector<vec3f>& positions, std::span<const u32> corners,
                    const vec3d& normal, base::vector<vec2d>& outline) {
    // The axis that lies flattest in the plane becomes the first direction, so that polygons in
    // an axis plane keep their coordinates exactly.
    const vec3d magnitude = {std::abs(normal.x), std::abs(normal.y), std::abs(normal.z)};
    vec3d axis = {1, 0, 0};
    if (magnitude.y < magnitude.x && magnitude.y <= magnitude.z)
        axis = {0, 1, 0};
    else if (magnitude.z < magnitude.x)
        axis = {0, 0, 1};
    vec3d v = cross(normal, axis);
    v = v * (1 / length(v));
    const vec3d u = cross(v, normal);

    const vec3f origin = positions[corners[0]];
    outline.resizeUninitialized(corners.size());
    vec2d* to = outline.data();
    for (const u32 corner : corners) {
        const vec3d way = subtract(positions[corner], origin);
        *to++ = {dot(way, u), dot(way, v)};
    }
}

namespace {

struct Edge {
    vec2d from, to;
    double turn(const vec2d& p) const { return scene::turn(from, to, p); }
    /// Whether a point on the edge's line lies between its ends.
    bool spans(const vec2d& p) const {
        const double x = to.x - from.x, y = to.y - from.y;
        const double along = x * (p.x - from.x) + y * (p.y - from.y);
        return along >= 0 && along <= x * x + y * y;
    }
};

/// Compares an edge with the chain of all corners but its own.
OutlineFault findFaultOfEdge(const Edge& edge, const vec2d* chain, std::size_t count,
                             double nearTurn) {
    OutlineFault fault = OutlineFault::none;
    double before = 0;
    for (std::size_t i = 0; i < count; ++i) {
        const double turned = edge.turn(chain[i]);
        const bool passes = before * turned < 0;
        before = turned;
        if (!passes && !(std::abs(turned) <= nearTurn))
            continue;
        const Edge other = {chain[i - passes], chain[i]};
        if (passes && other.turn(edge.from) * other.turn(edge.to) < 0)
            return OutlineFault::crossing;
        if (std::abs(turned) <= nearTurn && edge.spans(chain[i]))
            fault = OutlineFault::contact;
    }
    return fault;
}

} // namespace

OutlineFault findFault(std::span<const vec2d> outline, base::vector<vec2d>& scratch) {
    const std::size_t count = outline.size();
    scratch.assign(outline.begin(), outline.end());
    scratch.append(outline.begin(), outline.end());
    const vec2d* ring = std::as_const(scratch).data();
    const vec2d& first = ring[0];
    double extent = 0;
    for (std::size_t i = 1; i < count; ++i)
        extent = std::max({extent, std::abs(ring[i].x - first.x), std::abs(ring[i].y - first.y)});

    OutlineFault fault = OutlineFault::none;
    for (std::size_t i = 0; i < count; ++i) {
        const Edge edge = {ring[i], ring[i + 1]};
        const double length = distance(edge.from, edge.to);
        const OutlineFault found =
            findFaultOfEdge(edge, ring + i + 2, count - 2, contact * extent * length);
        if (found == OutlineFault::crossing)
            return found;
        if (found == OutlineFault::contact)
            fault = found;
    }
    return fault;
}

QuadDiagonal chooseDiagonal(const vec3f& p0, const vec3f& p1, const vec3f& p2, const vec3f& p3) {
    const vec3d d02 = subtract(p2, p0);
    const vec3d d13 = subtract(p3, p1);
    const vec3d normal = cross(d02, d13);
    const std::array<vec3f, 4> p = {p0, p1, p2, p3};
    std::array<bool, 4> reflex;
    for (std::size_t i = 0; i < 4; ++i) {
        const vec3d in = subtract(p[i], p[(i + 3) % 4]);
        const vec3d out = subtract(p[(i + 1) % 4], p[i]);
        reflex[i] = dot(cross(in, out), normal) < 0;
    }
    if (std::ranges::count(reflex, true) == 1)
        return reflex[0] || reflex[2] ? QuadDiagonal::from0 : QuadDiagonal::from1;
    const auto lengthOf = [](const vec3d& v) {
        const double l = length(v);
        return l < double(FLT_EPSILON) ? 0 : l;
    };
    return lengthOf(d13) < lengthOf(d02) ? QuadDiagonal::from1 : QuadDiagonal::from0;
}

} // namespace scene
