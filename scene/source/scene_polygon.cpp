#include "scene_mesh_triangulate.h"

#include "b_log.h"
#include "scene_ear_cutting.h"
#include "scene_geos.h"
#include "scene_plane.h"

#include <algorithm>
#include <cmath>

namespace scene {

using base::log;
using base::logError;
using base::logScene;
using base::logWarning;
using base::u32;
using base::vec2d;
using base::vec3f;

namespace {

/// Corners up to which a polygon gets a Delaunay triangulation. The library's own time grows with
/// the square for long straight sides and combs (measured: 0.3 s at this count, 4 s at five times
/// of it), and so does that of the test for crossing edges.
constexpr std::size_t maxDelaunayCorners = 4096;
/// Triangles of less than this area, in square units of the scene, are dropped.
constexpr double leastArea = 9.99999993922529e-09;

} // namespace

struct PolygonTriangulator::Impl {
    Impl(const base::vector<vec3f>& meshPositions, base::string meshName)
        : positions(meshPositions), name(std::move(meshName)) {}

    bool areValid(std::span<const u32> corners) const;
    void cutQuad(const u32* corners, base::vector<u32>& output) const;
    bool cutPolygon(std::span<const u32> corners, base::vector<u32>& output);
    bool cutByDelaunay();
    void failDelaunay(const base::string& reason);
    void cutByEars(double precision);
    bool cutSimply();
    void outputTriangles(const u32* corners, base::vector<u32>& output) const;

    const base::vector<vec3f>& positions;
    const base::string name;
    base::vector<vec2d> outline;
    base::vector<vec2d> scratch;
    base::vector<Triangle> triangles; ///< of the present polygon, in corners of the outline
    DelaunayTriangulator delaunay;
    EarCutter ears;
};

PolygonTriangulator::PolygonTriangulator(const base::vector<vec3f>& positions, base::string name)
    : impl_(std::make_unique<Impl>(positions, std::move(name))) {}

PolygonTriangulator::~PolygonTriangulator() = default;

bool PolygonTriangulator::triangulatePolygon(const u32* corners, u32 cornerCount,
                                             base::vector<u32>& output) {
    if (cornerCount < 3)
        return true;
    if (cornerCount == 3) {
        output.append(corners, corners + 3);
        return true;
    }
    if (!impl_->areValid({corners, cornerCount})) {
        log().log(logScene, logError,
                  "triangulate |{}| Dropping invalid quad [{,10},{,10},{,10},{,10}]!", impl_->name,
                  corners[0], corners[1], corners[2], corners[3]);
        return false;
    }
    if (cornerCount > 4)
        return impl_->cutPolygon({corners, cornerCount}, output);
    impl_->cutQuad(corners, output);
    return true;
}

bool PolygonTriangulator::Impl::areValid(std::span<const u32> corners) const {
    return std::ranges::all_of(corners, [&](u32 i) { return i < positions.size(); });
}

void PolygonTriangulator::Impl::cutQuad(const u32* corners, base::vector<u32>& output) const {
    const u32 c0 = corners[0], c1 = corners[1], c2 = corners[2], c3 = corners[3];
    const QuadDiagonal diagonal =
        chooseDiagonal(positions[c0], positions[c1], positions[c2], positions[c3]);
    if (diagonal == QuadDiagonal::from0) {
        const u32 cut[] = {c0, c1, c2, c0, c2, c3};
        output.append(std::begin(cut), std::end(cut));
    } else {
        const u32 cut[] = {c0, c1, c3, c1, c2, c3};
        output.append(std::begin(cut), std::end(cut));
    }
}

bool PolygonTriangulator::Impl::cutPolygon(std::span<const u32> corners,
                                           base::vector<u32>& output) {
    const std::optional<PolygonPlane> plane = findPlane(positions, corners);
    if (!plane) {
        log().log(logScene, logError,
                  "triangulate| {}| Can't calculate the polygon normal for plane projection, "
                  "skipping!",
                  name);
        return false;
    }
    projectPolygon(positions, corners, plane->normal, outline);
    triangles.clear();
    const bool isRegular = cutByDelaunay();
    if (!isRegular)
        cutByEars(plane->precision);
    outputTriangles(corners.data(), output);
    return isRegular;
}

/// False, with a message, if the outline is nothing for a Delaunay triangulation.
bool PolygonTriangulator::Impl::cutByDelaunay() {
    if (outline.size() > maxDelaunayCorners) {
        failDelaunay(base::format("more than {} corners", maxDelaunayCorners));
        return false;
    }
    switch (findFault(outline, scratch)) {
    case OutlineFault::crossing:
        log().log(logScene, logWarning,
                  "triangulate |{}| Polygon self intersection detected, falling back to earcut!",
                  name);
        return false;
    case OutlineFault::contact:
        // The library never comes to an end with some of these.
        failDelaunay("the outline touches itself");
        return false;
    case OutlineFault::none:
        break;
    }
    if (!delaunay.triangulate(outline, triangles)) {
        failDelaunay(delaunay.error());
        return false;
    }
    return true;
}

void PolygonTriangulator::Impl::failDelaunay(const base::string& reason) {
    log().log(logScene, logWarning,
              "triangulate |{}| Error detected - '{}', falling back to earcut!", name, reason);
}

void PolygonTriangulator::Impl::cutByEars(double precision) {
    if (ears.cut(outline, precision, triangles))
        return;
    log().log(logScene, logWarning,
              "triangulate |{}| Error detected - falling back to simple triangulation!", name);
    if (!cutSimply())
        log().log(logScene, logWarning,
                  "triangulate |{}| Found errors, may result in missing triangles!", name);
}

/// Cuts what the ears left over into a fan. False if some of its triangles have no area.
bool PolygonTriangulator::Impl::cutSimply() {
    const base::vector<u32> rest = ears.remainingCorners();
    bool complete = true;
    for (std::size_t i = 2; i < rest.size(); ++i) {
        const double turned = turn(outline[rest[0]], outline[rest[i - 1]], outline[rest[i]]);
        if (turned > 0)
            triangles.push_back({rest[0], rest[i - 1], rest[i]});
        else if (turned < 0)
            triangles.push_back({rest[0], rest[i], rest[i - 1]});
        else
            complete = false;
    }
    return complete;
}

void PolygonTriangulator::Impl::outputTriangles(const u32* corners,
                                                base::vector<u32>& output) const {
    for (const Triangle& t : triangles) {
        const double area = std::abs(turn(outline[t[0]], outline[t[1]], outline[t[2]])) / 2;
        if (!(area >= leastArea)) {
            log().log(logScene, base::logDebug, "triangulate {}| Dropping triangle with zero area!",
                      name);
            continue;
        }
        const u32 cut[] = {corners[t[0]], corners[t[1]], corners[t[2]]};
        output.append(std::begin(cut), std::end(cut));
    }
}

} // namespace scene
