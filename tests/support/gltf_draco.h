#pragma once

#include "gltf_values.h"

#include <map>
#include <span>

namespace test_support {

/// A decoded Draco stream. The attributes stand under their unique ids, which is what the glTF
/// extension refers to.
struct DracoMesh {
    size_t points = 0;
    std::vector<uint32_t> indices;
    std::map<uint32_t, AccessorValues> attributes;
};

/// Decodes a Draco stream of a triangle mesh. Throws `GltfError` if it is broken.
DracoMesh decodeDraco(std::span<const uint8_t> stream);

} // namespace test_support
