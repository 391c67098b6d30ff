#pragma once

#include "scene_plane.h"

/// The constrained Delaunay triangulation of an outline, by the GEOS library.
namespace scene {

/// One GEOS context. The library is opened at the first use in the process: most scenes have no
/// polygon that needs it, and opening it costs the process some milliseconds and megabytes.
class DelaunayTriangulator {
public:
    DelaunayTriangulator() = default;
    DelaunayTriangulator(const DelaunayTriangulator&) = delete;
    DelaunayTriangulator& operator=(const DelaunayTriangulator&) = delete;
    ~DelaunayTriangulator();

    /// Appends the triangles, all turning to the left, of an outline without crossings and
    /// repeated points to `triangles`. False if the library is missing or can't do it; `error`
    /// tells why, and `triangles` is as it was.
    bool triangulate(std::span<const base::vec2d> outline, base::vector<Triangle>& triangles);
    /// Why the last call failed.
    const base::string& error() const noexcept { return error_; }

private:
    bool openContext();

    void* context_ = nullptr;
    base::vector<base::vec3d> ring_; ///< the outline as it is handed over
    base::string error_;
};

} // namespace scene
