#pragma once

#include "b_factory.h"

struct aiScene;

namespace assimp {

/// Adds a `scene` object with everything that `source` holds, by the settings of `importer`, see
/// `AssimpImporter`. `path` is that of the file, for messages, for the rules of its format and for
/// the files beside it. The meshes of `source`, which has a root node, are freed on the way.
void importScene(aiScene& source, const base::AttribMap& importer, const base::string& path,
                 base::PluginFactory& factory);

} // namespace assimp
