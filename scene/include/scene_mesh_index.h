#pragma once

#include "b_attribute_map.h"

/// Conversion of meshes with separate index arrays per channel to one index per vertex.
namespace scene {

/// Rewrites `mesh` in place so that "indices" alone addresses all its vertex arrays, which are
/// parallel then. A mesh without separate index arrays is left untouched. Vertices are numbered
/// by first appearance among the face corners; the corner that comes first gives the data.
///
/// Two corners become one vertex if all their separate indices are equal, or, where some channel
/// has none, if the bytes of all their data are. In that mode the position index takes part when
/// the mesh has joint sets or `isMorphBase` is set, so that equal values do not join vertices
/// that move apart.
///
/// A morph base keeps, in transient attributes, where each vertex came from (`findVertexOrigins`).
///
/// False if the mesh can't be converted: that is logged and the mesh stays as it was.
bool convertToSingleIndex(base::AttribMap& mesh, bool isMorphBase = false);

/// Where the vertices of a converted morph base came from: for each its first corner and its
/// index in the former positions. Null vectors for a mesh that was not converted.
struct VertexOrigins {
    const base::vector<base::u32>* corners = nullptr;
    const base::vector<base::u32>* positions = nullptr;
};
VertexOrigins findVertexOrigins(const base::AttribMap& mesh);

} // namespace scene
