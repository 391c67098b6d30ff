#pragma once

#include "assimp/import_textures.h"
#include "assimp/material_format.h"

struct aiMaterial;

namespace assimp {

/// What of the materials of a file is left out or put right, counted for one report.
struct MaterialFaults {
    base::u64 nonFiniteValues = 0;
    base::u64 opacityMaps = 0;
    base::u64 glossMaps = 0;
    base::u64 metalWithoutMap = 0;
    base::u64 transformedTextures = 0;

    /// Logs one line for each kind that occurred.
    void report(const base::string& path) const;
};

/// Fills `object`, an empty `principalMaterial`, with what `source` says. Without `isMapped` it
/// gets no maps; `mesh` is one that shows it, whose sets of texture coordinates the maps name.
void makeMaterial(const aiMaterial& source, const aiMesh& mesh, bool isMapped,
                  const MaterialFormat& format, TextureImport& textures, MaterialFaults& faults,
                  base::IPlugin& object);

} // namespace assimp
