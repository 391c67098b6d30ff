#include "gltf/plugin_desc.h"

#define PLUGIN_ENTRY extern "C" __attribute__((visibility("default")))

PLUGIN_ENTRY base::i32 loadScenePlugin(base::PluginFactory& factory) {
    gltf::registerPlugin(factory);
    return 0;
}

/// Nothing to do: the factory takes back what was registered with it.
PLUGIN_ENTRY base::u32 unloadScenePlugin() {
    return 0;
}
