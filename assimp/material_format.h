#pragma once

#include "b_containers.h"

namespace assimp {

/// What is known of materials by the format of their file, beyond what the library tells of them.
struct MaterialFormat {
    /// `extension` is that of the file, in lower case.
    explicit MaterialFormat(base::string_view extension);

    /// A map stands in the place of the color or number that it is a map of; else they multiply.
    bool mapsReplace;
    /// Opacity 0 is written for opaque materials.
    bool zeroIsOpaque;
    /// The diffuse color has an alpha that counts.
    bool diffuseHasAlpha;
    /// The simplest shading model stands for materials without a highlight.
    bool gouraudIsMatte;
};

} // namespace assimp
