#pragma once

#include "scene_mesh.h"

#include <optional>

/// How the primitives of a mesh tell their faces.
namespace scene {

/// The corner counts of a primitive's faces ("vcounts"): one for all, or one for each.
struct FaceSizes {
    bool known = false;                            ///< false where nothing is stored
    base::u32 single = 0;                          ///< of every face; valid without `list`
    const base::vector<base::u16>* list = nullptr; ///< of each face, borrowed from the primitive

    bool isSingle(base::u32 size) const { return known && !list && single == size; }
};

/// A list of one entry counts as one size for all faces, an empty one as nothing stored.
FaceSizes readFaceSizes(const base::AttribMap& primitive);

/// "topology" of the primitive: the first value of a list, or a single one.
std::optional<base::u32> readTopology(const base::AttribMap& primitive);

/// True for a list of faces, false for a strip or a fan.
inline bool isFaceList(std::optional<base::u32> topology) {
    return !topology || *topology <= 2;
}

/// The "name" of an object, for messages.
base::string objectName(const base::AttribMap& object);

} // namespace scene
