#include "animated_scene.h"
#include "measure.h"

#include "support/gltf_reader.h"

#include <filesystem>
#include <stdexcept>

/// Exports of movement.
namespace bench {

namespace {

constexpr base::u32 nodeCount = 1000, frameCount = 1000;

/// Seconds of an export of animation, and whether all of it arrives.
double exportSeconds(const AnimatedScene& animated, const OutputFolder& folder) {
    const std::string path = folder / "animated.glb";
    const double seconds = secondsOf([&] { exportScene(*animated.scene, path, false); });
    const auto file = test_support::GltfFile::read(path);
    const auto& samplers = file.element("animations", 0)["samplers"];
    if (samplers.Size() != 3 * animated.translations.size())
        throw std::runtime_error("the document lacks channels");
    for (const auto& sampler : samplers.GetArray())
        if (file.accessor(sampler["output"].GetUint()).count != animated.frameCount)
            throw std::runtime_error("the document lacks samples");
    std::filesystem::remove(path);
    return seconds;
}

void bake(benchmark::State& state) {
    const OutputFolder folder;
    const AnimatedScene animated(nodeCount, frameCount);
    for (auto _ : state) {
        const double seconds = exportSeconds(animated, folder);
        reportTimes(state, seconds,
                    secondsOf([&] { benchmark::DoNotOptimize(evaluateAll(animated)); }));
    }
}

/// How the time grows: with `nodes` and `frames` against the same of `bake`.
void compareSizes(benchmark::State& state, base::u32 nodes, base::u32 frames) {
    const OutputFolder folder;
    const AnimatedScene few(nodeCount, frameCount), many(nodes, frames);
    for (auto _ : state) {
        const double fewSeconds = exportSeconds(few, folder);
        reportTimes(state, exportSeconds(many, folder), fewSeconds);
    }
}

void bakeNodes(benchmark::State& state) {
    compareSizes(state, 4 * nodeCount, frameCount);
}

void bakeFrames(benchmark::State& state) {
    compareSizes(state, nodeCount, 4 * frameCount);
}

BENCH_ROW(bake, "animation/bake");
BENCH_ROW(bakeNodes, "animation/bake-nodes");
BENCH_ROW(bakeFrames, "animation/bake-frames");

} // namespace

} // namespace bench
