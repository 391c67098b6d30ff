#pragma once

#include "b_containers.h"
#include "b_types.h"

#include <array>
#include <optional>
#include <span>

/// Polygons in space and their outlines in a plane.
namespace scene {

/// Three corners of an outline, by number.
using Triangle = std::array<base::u32, 3>;

/// Twice the area of the triangle a, b, c; positive if it turns to the left.
inline double turn(const base::vec2d& a, const base::vec2d& b, const base::vec2d& c) {
    return (b.x - a.x) * (c.y - a.y) - (b.y - a.y) * (c.x - a.x);
}

/// Unit normal of the polygon whose corners are `corners` (indices of `positions`), in the sense
/// that its outline turns to the left seen against the normal. None for corners that lie on a
/// line within the precision of their coordinates, or that are not finite.
std::optional<base::vec3d> findPolygonNormal(const base::vector<base::vec3f>& positions,
                                             std::span<const base::u32> corners);

/// The corners in the plane through the first one with that normal, in units of the positions.
void projectPolygon(const base::vector<base::vec3f>& positions, std::span<const base::u32> corners,
                    const base::vec3d& normal, base::vector<base::vec2d>& outline);

/// True if two corners have the same point. `scratch` is memory that is kept between calls.
bool hasRepeatedPoint(std::span<const base::vec2d> outline, base::vector<base::vec2d>& scratch);

/// True if two edges of the outline cross. Edges that only touch do not. Quadratic time.
bool crossesItself(std::span<const base::vec2d> outline);

/// Where the two triangles of a quad meet.
enum class QuadDiagonal { from0, from1 };
/// The shorter diagonal, the first where they are equal; in a concave quad the one that starts
/// at the reflex corner.
QuadDiagonal chooseDiagonal(const base::vec3f& p0, const base::vec3f& p1, const base::vec3f& p2,
                            const base::vec3f& p3);

} // namespace scene
