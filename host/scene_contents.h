#pragma once

#include "host/messages.h"

#include "b_factory.h"

namespace host {

/// An object by its type and name, which may be empty.
struct ObjectName {
    base::string type;
    base::string name;
};

/// The objects for which no glTF file has a place, in the order of the scene: cameras, hair,
/// points, textures that are computed or embedded, and the like.
base::vector<ObjectName> findUnexported(const base::PluginFactory& scene);

/// What a scene holds. Meshes and their triangles count once, however often they are placed.
struct SceneCounts {
    base::u64 nodes = 0;
    base::u64 meshes = 0;
    base::u64 triangles = 0;
    base::u64 faultyMeshes = 0; ///< of which the log tells what is wrong
};

/// Brings each mesh into the form in which it is exported, changing it in place, checks it and
/// counts. Logs the faults that an export would log; a mesh of which `messages` got one is faulty.
SceneCounts checkScene(base::PluginFactory& scene, const Messages& messages);

} // namespace host
