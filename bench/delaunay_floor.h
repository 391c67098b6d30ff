#pragma once

#include "polygons.h"

namespace bench {

/// The floor of the triangulation: the constrained Delaunay triangulation of the GEOS library on
/// the outlines in their planes, one by one. Returns the number of triangles, which are not read.
std::size_t triangulateBare(const Outlines& outlines);

} // namespace bench
