// A library that is found as a plugin but has no entry point of one.
extern "C" __attribute__((visibility("default"))) int unloadScenePlugin() {
    return 0;
}
