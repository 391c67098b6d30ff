#pragma once

#include "b_attribute_map.h"

/// Triangulation of the polygons of a mesh.
namespace scene {

/// Makes "triIndices" with "triIndexStart" and "triIndexCount" of every primitive, in place, if
/// some primitive has faces of more than 3 corners (4 with `keepQuads`). A mesh that has
/// triangle indices already is left alone. Primitives of another kind (strips, fans, lines) are
/// carried over as they stand. `flag` has no effect. False if the indices are inconsistent,
/// which is logged; faults of one polygon are logged and cost only that polygon.
bool triangulate(base::AttribMap& mesh, bool keepQuads, bool flag);

/// Cuts single polygons; keeps its working memory between calls.
class PolygonTriangulator {
public:
    /// `positions` are borrowed for the life of the object; `name` is the mesh's, for messages.
    PolygonTriangulator(const base::vector<base::vec3f>& positions, base::string name);
    PolygonTriangulator(const PolygonTriangulator&) = delete;
    PolygonTriangulator& operator=(const PolygonTriangulator&) = delete;
    ~PolygonTriangulator();

    /// Appends the triangles of the polygon with `cornerCount` corners, given as indices of
    /// positions, to `output`, three indices each, in the polygon's own winding. A polygon that
    /// can't be cut in its plane adds nothing or what could be cut, with a message. Returns
    /// whether there was nothing to tell.
    bool triangulatePolygon(const base::u32* corners, base::u32 cornerCount,
                            base::vector<base::u32>& output);

private:
    struct Impl;
    std::unique_ptr<Impl> impl_;
};

} // namespace scene
