#include "measure.h"
#include "scenes.h"

/// Peak memory of a process that holds a scene and exports it. Each row needs a process of its own.
namespace bench {

namespace {

void exportLarge(benchmark::State& state, const char* fileName) {
    const OutputFolder folder;
    for (auto _ : state) {
        const ScenePtr scene = makeLargeMesh();
        const std::int64_t sceneOnly = peakMemory();
        state.SetIterationTime(secondsOf([&] { exportScene(*scene, folder / fileName, false); }));
        state.counters["scene"] = static_cast<double>(sceneOnly);
        state.counters["peak"] = static_cast<double>(peakMemory());
        state.counters["bytes"] = static_cast<double>(byteCountOf(findArrays(*scene)));
    }
}

void memoryPlain(benchmark::State& state) {
    exportLarge(state, "large.glb");
}

void memoryEmbedded(benchmark::State& state) {
    exportLarge(state, "large.gltf");
}

BENCH_ROW(memoryPlain, "memory/plain");
BENCH_ROW(memoryEmbedded, "memory/embedded");

} // namespace

} // namespace bench
