#include "scene_geos.h"

#include <dlfcn.h>
#include <geos_c.h>

#include <algorithm>

namespace scene {

using base::u32;
using base::vec2d;
using base::vec3d;

namespace {

constexpr const char* libraryName = "libgeos_c.so.1";

/// X(name): the functions of the library that are called.
#define SCENE_GEOS_FUNCTIONS(X)               \
    X(GEOS_init_r)                            \
    X(GEOS_finish_r)                          \
    X(GEOSContext_setErrorMessageHandler_r)   \
    X(GEOSCoordSeq_copyFromBuffer_r)          \
    X(GEOSCoordSeq_copyToBuffer_r)            \
    X(GEOSGeom_createLinearRing_r)            \
    X(GEOSGeom_createPolygon_r)               \
    X(GEOSGeom_destroy_r)                     \
    X(GEOSConstrainedDelaunayTriangulation_r) \
    X(GEOSGetNumGeometries_r)                 \
    X(GEOSGetGeometryN_r)                     \
    X(GEOSGetExteriorRing_r)                  \
    X(GEOSGeom_getCoordSeq_r)

#define SCENE_GEOS_POINTER(name) decltype(&::name) name = nullptr;
#define SCENE_GEOS_LOAD(name) load(name, #name);

struct GeosLibrary {
    SCENE_GEOS_FUNCTIONS(SCENE_GEOS_POINTER)
    base::string error; ///< why the library can't be used, empty if it can

    GeosLibrary() {
        handle_ = dlopen(libraryName, RTLD_NOW | RTLD_LOCAL);
        if (!handle_)
            fail();
        SCENE_GEOS_FUNCTIONS(SCENE_GEOS_LOAD)
    }

private:
    template <class Function>
    void load(Function& function, const char* name) {
        if (!error.empty())
            return;
        function = reinterpret_cast<Function>(dlsym(handle_, name));
        if (!function)
            fail();
    }
    void fail() {
        const char* text = dlerror();
        error = text ? text : libraryName;
    }
    void* handle_ = nullptr;
};

/// Stays open to the end of the process.
const GeosLibrary& geos() {
    static const GeosLibrary library;
    return library;
}

GEOSContextHandle_t handleOf(void* context) {
    return static_cast<GEOSContextHandle_t>(context);
}

void storeMessage(const char* message, void* text) noexcept {
    try {
        *static_cast<base::string*>(text) = message;
    } catch (...) {
        // Without memory the text stays empty; the failure itself shows in the call's result.
    }
}

/// A geometry that the context owns.
class Geometry {
public:
    Geometry(GEOSContextHandle_t context, GEOSGeometry* geometry)
        : context_(context), geometry_(geometry) {}
    Geometry(const Geometry&) = delete;
    Geometry& operator=(const Geometry&) = delete;
    ~Geometry() {
        if (geometry_)
            geos().GEOSGeom_destroy_r(context_, geometry_);
    }
    GEOSGeometry* get() const { return geometry_; }
    explicit operator bool() const { return geometry_ != nullptr; }

private:
    GEOSContextHandle_t context_;
    GEOSGeometry* geometry_;
};

/// Each step takes over what the step before made; null if one fails.
GEOSGeometry* makePolygon(GEOSContextHandle_t context, const base::vector<vec3d>& ring) {
    const GeosLibrary& lib = geos();
    GEOSCoordSequence* points = lib.GEOSCoordSeq_copyFromBuffer_r(
        context, &ring.data()->x, static_cast<unsigned>(ring.size()), 1, 0);
    GEOSGeometry* shell = points ? lib.GEOSGeom_createLinearRing_r(context, points) : nullptr;
    return shell ? lib.GEOSGeom_createPolygon_r(context, shell, nullptr, 0) : nullptr;
}

/// The corner at exactly that point, whose number the third coordinate should be; the number of
/// corners where there is none.
u32 findCorner(const vec3d& point, std::span<const vec2d> outline) {
    const auto isAt = [&](const vec2d& corner) {
        return corner.x == point.x && corner.y == point.y;
    };
    const u32 noted = base::saturate<u32>(point.z);
    if (noted < outline.size() && isAt(outline[noted]))
        return noted;
    return static_cast<u32>(std::ranges::find_if(outline, isAt) - outline.begin());
}

bool readTriangle(const GeosLibrary& lib, GEOSContextHandle_t context, const GEOSGeometry* triangle,
                  std::span<const vec2d> outline, Triangle& corners) {
    const GEOSGeometry* ring = triangle ? lib.GEOSGetExteriorRing_r(context, triangle) : nullptr;
    const GEOSCoordSequence* points = ring ? lib.GEOSGeom_getCoordSeq_r(context, ring) : nullptr;
    std::array<vec3d, 4> closed; // the first point comes twice
    if (!points || !lib.GEOSCoordSeq_copyToBuffer_r(context, points, &closed[0].x, 1, 0))
        return false;
    for (std::size_t k = 0; k < corners.size(); ++k) {
        corners[k] = findCorner(closed[k], outline);
        if (corners[k] == outline.size())
            return false;
    }
    if (turn(outline[corners[0]], outline[corners[1]], outline[corners[2]]) < 0)
        std::swap(corners[1], corners[2]);
    return true;
}

} // namespace

DelaunayTriangulator::~DelaunayTriangulator() {
    if (context_)
        geos().GEOS_finish_r(handleOf(context_));
}

bool DelaunayTriangulator::openContext() {
    if (context_)
        return true;
    if (!geos().error.empty()) {
        error_ = geos().error;
        return false;
    }
    context_ = geos().GEOS_init_r();
    if (context_)
        geos().GEOSContext_setErrorMessageHandler_r(handleOf(context_), storeMessage, &error_);
    return context_ != nullptr;
}

bool DelaunayTriangulator::triangulate(std::span<const vec2d> outline,
                                       base::vector<Triangle>& triangles) {
    error_.clear();
    if (!openContext())
        return false;
    ring_.resizeUninitialized(outline.size() + 1);
    vec3d* ring = ring_.data();
    for (std::size_t i = 0; i < outline.size(); ++i)
        ring[i] = {outline[i].x, outline[i].y, static_cast<double>(i)};
    ring[outline.size()] = ring[0];

    const GeosLibrary& lib = geos();
    const GEOSContextHandle_t context = handleOf(context_);
    const Geometry polygon(context, makePolygon(context, ring_));
    if (!polygon)
        return false;
    const Geometry result(context,
                          lib.GEOSConstrainedDelaunayTriangulation_r(context, polygon.get()));
    if (!result)
        return false;
    const std::size_t before = triangles.size();
    const int count = lib.GEOSGetNumGeometries_r(context, result.get());
    bool whole = count == static_cast<int>(outline.size()) - 2;
    for (int i = 0; whole && i < count; ++i) {
        const GEOSGeometry* triangle = lib.GEOSGetGeometryN_r(context, result.get(), i);
        whole = readTriangle(lib, context, triangle, outline, triangles.emplace_back());
    }
    if (!whole) {
        error_ = "the triangles don't make up the polygon";
        triangles.resize(before);
    }
    return whole;
}

} // namespace scene
