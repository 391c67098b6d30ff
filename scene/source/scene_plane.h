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

double distance(const base::vec2d& a, const base::vec2d& b);

/// The plane of a polygon, through its first corner.
struct PolygonPlane {
    base::vec3d normal;   ///< of unit length; against it the outline is seen to turn to the left
    double precision = 0; ///< how far from their true places corners may lie, being rounded
};

/// The plane of the polygon whose corners are `corners` (indices of `positions`). None for corners
/// that lie on a line within their precision, or that are not finite.
std::optional<PolygonPlane> findPlane(const base::vector<base::vec3f>& positions,
                                      std::span<const base::u32> corners);

/// The corners in a plane with that normal, the first at the origin, in units of the positions.
void projectPolygon(const base::vector<base::vec3f>& positions, std::span<const base::u32> corners,
                    const base::vec3d& normal, base::vector<base::vec2d>& outline);

/// What keeps an outline from being simple.
enum class OutlineFault {
    none,
    contact, ///< a corner lies on an edge or on another corner
    crossing ///< two edges cross; it outweighs contacts
};
/// Takes quadratic time. `scratch` is memory that is kept between calls.
OutlineFault findFault(std::span<const base::vec2d> outline, base::vector<base::vec2d>& scratch);

/// Where the two triangles of a quad meet.
enum class QuadDiagonal { from0, from1 };
/// The shorter diagonal, the first where they are equal; in a concave quad the one that starts
/// at the reflex corner.
QuadDiagonal chooseDiagonal(const base::vec3f& p0, const base::vec3f& p1, const base::vec3f& p2,
                            const base::vec3f& p3);

} // namespace scene
