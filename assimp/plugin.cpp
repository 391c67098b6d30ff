#include "assimp/importer.h"

extern "C" __attribute__((visibility("default"))) base::i32
loadScenePlugin(base::PluginFactory& factory) {
    assimp::registerPlugin(factory);
    return 0;
}

extern "C" __attribute__((visibility("default"))) base::u32 unloadScenePlugin() {
    return 0;
}
