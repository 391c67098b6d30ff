#include "measure.h"
#include "plain_floor.h"

#include <filesystem>

/// Exports without compression.
namespace bench {

namespace {

/// Seconds of one export. The file of the run before is gone by then: to empty one takes time too.
double exportSeconds(test_support::SceneBuilder& scene, const std::string& path) {
    std::filesystem::remove(path);
    return secondsOf([&] { exportScene(scene, path, false); });
}

using ReadFrame = FileFrame (*)(const std::string& path, std::size_t byteCount);
using WriteFloor = void (*)(const base::vector<MeshArrays>& meshes, const FileFrame& frame,
                            const std::string& path);

void compareWithFloor(benchmark::State& state, const ScenePtr& scene, const std::string& fileName,
                      ReadFrame readFrame, WriteFloor writeFloor) {
    const OutputFolder folder;
    const std::string path = folder / fileName;
    const double seconds = exportSeconds(*scene, path);

    const base::vector<MeshArrays> meshes = findArrays(*scene);
    const FileFrame frame = readFrame(path, byteCountOf(meshes));
    std::filesystem::remove(path);
    reportTimes(state, seconds, secondsOf([&] { writeFloor(meshes, frame, path); }));
}

void largePlain(benchmark::State& state) {
    for (auto _ : state)
        compareWithFloor(state, makeLargeMesh(), "large.glb", readContainerFrame, writePlain);
}

void largeEmbedded(benchmark::State& state) {
    for (auto _ : state)
        compareWithFloor(state, makeLargeMesh(), "large.gltf", readTextFrame, writeEmbedded);
}

void nodesPlain(benchmark::State& state) {
    for (auto _ : state)
        compareWithFloor(state, makeManyNodes(20000), "nodes.glb", readContainerFrame, writePlain);
}

/// How the time grows: five times the nodes.
void nodesGrowth(benchmark::State& state) {
    const OutputFolder folder;
    for (auto _ : state) {
        const double few = exportSeconds(*makeManyNodes(20000), folder / "nodes.glb");
        const double many = exportSeconds(*makeManyNodes(100000), folder / "nodes.glb");
        reportTimes(state, many, few);
    }
}

BENCH_ROW(largePlain, "large/plain");
BENCH_ROW(largeEmbedded, "large/embedded");
BENCH_ROW(nodesPlain, "nodes/plain");
BENCH_ROW(nodesGrowth, "nodes/growth");

} // namespace

} // namespace bench
