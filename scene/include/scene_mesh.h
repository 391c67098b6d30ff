#pragma once

#include "scene_attribute.h"

/// The reading side of meshes: their lists, the kind and range of each primitive, bounds and
/// validity. Everything works on any attribute map that carries the mesh schema, so that an
/// object whose class is unknown is read as well.
namespace scene {

/// What `getPrimitiveType` answers.
enum PrimitiveType : base::i32 {
    primitiveNone = -1, ///< no such primitive, or nothing to tell from
    primitivePoints = 1,
    primitiveLines = 2,
    primitiveLineStrip = 4,
    primitiveTriangles = 8,
    primitiveTriangleStrip = 16,
    primitiveTriangleFan = 32,
    primitiveQuads = 64,
    primitivePolygons = 128,      ///< of one fixed size above 4
    primitiveMixedPolygons = 256, ///< of mixed size
};

/// Entries of one of a mesh's lists (primitives, UV sets, colour sets, joint sets, bind poses);
/// an array of maps or a vector of plugin references. Gaps count.
base::u32 getListCount(const base::AttribMap& mesh, const SchemaAttribute<Items>& list);
/// One entry of such a list; null for a gap and past the end.
base::AttribMap* findListItem(const base::AttribMap& mesh, const SchemaAttribute<Items>& list,
                              base::u32 index);

/// The kind of primitive `index`; with `triangulated` as it is once "triIndices" is in use.
base::i32 getPrimitiveType(const base::AttribMap& mesh, base::u32 index, bool triangulated);
/// First entry of the primitive in the index array; with `triangulated` in "triIndices".
base::u32 getPrimitiveIndexStart(const base::AttribMap& mesh, base::u32 index, bool triangulated);
/// Entries of the primitive; without a stored count the whole index array.
base::u32 getPrimitiveIndexCount(const base::AttribMap& mesh, base::u32 index, bool triangulated);

/// The object's own "bounds" if it is stored, finite and not empty (a stored box wins, even if
/// it is out of date), else the box of its finite "positions" or "points".
base::box3f getGeometryBounds(const base::AttribMap& geometry);

/// Checks array lengths, ranges and indices, logs what it finds under `name` and returns whether
/// all is well. `triangulated` looks at the triangle indices too, `perPosition` at the separate
/// position and normal indices.
bool validate(const base::AttribMap& mesh, const base::string& name, bool triangulated,
              bool perPosition);

} // namespace scene
