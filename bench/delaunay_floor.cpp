#include "delaunay_floor.h"

#include <geos_c.h>

#include <stdexcept>

namespace bench {

namespace {

struct Context {
    GEOSContextHandle_t handle = GEOS_init_r();
    Context() = default;
    Context(const Context&) = delete;
    Context& operator=(const Context&) = delete;
    ~Context() { GEOS_finish_r(handle); }
};

std::size_t triangulateRing(GEOSContextHandle_t geos, const base::vector<base::vec2d>& ring) {
    GEOSCoordSequence* points = GEOSCoordSeq_copyFromBuffer_r(
        geos, &ring.data()->x, static_cast<unsigned>(ring.size()), 0, 0);
    GEOSGeometry* shell = points ? GEOSGeom_createLinearRing_r(geos, points) : nullptr;
    GEOSGeometry* polygon = shell ? GEOSGeom_createPolygon_r(geos, shell, nullptr, 0) : nullptr;
    GEOSGeometry* triangles =
        polygon ? GEOSConstrainedDelaunayTriangulation_r(geos, polygon) : nullptr;
    if (!triangles)
        throw std::runtime_error("the library could not triangulate an outline");
    const int count = GEOSGetNumGeometries_r(geos, triangles);
    GEOSGeom_destroy_r(geos, triangles);
    GEOSGeom_destroy_r(geos, polygon);
    return static_cast<std::size_t>(count);
}

} // namespace

std::size_t triangulateBare(const Outlines& outlines) {
    const Context context;
    std::size_t triangleCount = 0;
    const base::vec2d* points = outlines.points.begin();
    base::vector<base::vec2d> ring;
    for (const base::u16 size : outlines.sizes) {
        ring.assign(points, points + size);
        ring.push_back(*points);
        triangleCount += triangulateRing(context.handle, ring);
        points += size;
    }
    return triangleCount;
}

} // namespace bench
