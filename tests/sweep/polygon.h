#pragma once

#include "support/geometry.h"

#include <vector>

/// A polygon's surface, as far as it does not depend on how it is cut into triangles.
struct PolygonMeasure {
    /// Triangles of a full triangulation, and how many of them may be missing because corners are
    /// repeated, the polygon has no area or it crosses itself.
    size_t triangles = 0;
    size_t removableTriangles = 0;
    /// The length of the polygon's area vector: its area, if it is planar, and else the lower limit
    /// for that of all triangulations.
    double area = 0;
    /// The range for the triangles that are there: 0 if all may be missing, and the largest area of
    /// the triangulations whose triangles all face the polygon's side.
    double leastArea = 0;
    double largestArea = 0;
    /// The volume between origin and polygon, and how far triangulations may lie from it.
    double volume = 0;
    double volumeError = 0;
};

/// `corners` has at least three.
PolygonMeasure measurePolygon(const std::vector<test_support::Vector>& corners);
