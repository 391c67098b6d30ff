#pragma once

#include "geometry.h"
#include "gltf_reader.h"

namespace test_support {

/// What is drawn: triangles, single lines and points.
struct Totals {
    size_t triangles = 0;
    size_t lines = 0;
    size_t points = 0;
    double area = 0;
    /// The signed volume between the triangles and the origin: for closed surfaces wound
    /// counter-clockwise seen from outside, the volume inside.
    double volume = 0;
    /// Around all that is drawn, and around the triangles alone.
    Box bounds;
    Box triangleBounds;
};

struct Statistics {
    size_t nodes = 0;
    size_t meshes = 0;
    size_t primitives = 0;
    size_t compressedPrimitives = 0;
    /// Each vertex array once, though several primitives may share it.
    size_t vertices = 0;
    /// Every primitive once, in mesh space.
    Totals stored;
    /// Every primitive once for each node of the scene that has its mesh, in the world. Skins and
    /// morph targets are not applied.
    Totals drawn;
    /// How far the positions of compressed primitives may lie from the original ones along each
    /// axis of the world, and what that may change in the drawn area.
    Vector positionError{};
    double areaError = 0;
};

Statistics statisticsOf(const GltfFile& file);

/// The step to which positions of a compressed primitive are rounded: 14 bits for the longest
/// side of the box that the document declares for them. `primitive` is its object in the document.
double positionStep(const GltfFile& file, const rapidjson::Value& primitive);

} // namespace test_support
