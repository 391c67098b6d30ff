#include "draco_floor.h"
#include "measure.h"
#include "plain_floor.h"

#include <filesystem>

/// Compressed exports.
namespace bench {

namespace {

void compareWithFloor(benchmark::State& state, const ScenePtr& scene) {
    const OutputFolder folder;
    const std::string path = folder / "scene.glb";
    const double seconds = secondsOf([&] { exportScene(*scene, path, true); });

    const DracoFloor floor(findArrays(*scene));
    std::size_t byteCount = 0;
    const double floorSeconds = secondsOf([&] { byteCount = floor.encode(); });
    readContainerFrame(path, byteCount);
    reportTimes(state, seconds, floorSeconds);
}

void largeDraco(benchmark::State& state) {
    for (auto _ : state)
        compareWithFloor(state, makeLargeMesh());
}

void nodesDraco(benchmark::State& state) {
    for (auto _ : state)
        compareWithFloor(state, makeManyNodes(20000));
}

BENCH_ROW(largeDraco, "large/draco");
BENCH_ROW(nodesDraco, "nodes/draco");

} // namespace

} // namespace bench
