#include "animated_scene.h"
#include "measure.h"

#include "gltf/exporter.h"
#include "gltf/scene_clock.h"
#include "support/gltf_reader.h"

#include "b_pages.h"

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

double evaluationSeconds(const AnimatedScene& animated) {
    return secondsOf([&] { benchmark::DoNotOptimize(evaluateAll(animated)); });
}

constexpr std::size_t floatsPerNode = 10 * frameCount;

/// What the exporter samples of a node, into room for `floatsPerNode`.
gltf::NodeAnimation makeEntry(const scene::INode& node, float* room) {
    using Channel = GLTF::Animation::Channel;
    gltf::NodeAnimation entry;
    entry.node = &node;
    entry.end = frameTime(frameCount);
    entry.paths = 1u << Channel::translation | 1u << Channel::scale | 1u << Channel::rotation;
    entry.sampler = gltf::NodeSampler(node, {});
    entry.translations = reinterpret_cast<base::vec3f*>(room);
    entry.scales = reinterpret_cast<base::vec3f*>(room + 3 * frameCount);
    entry.rotations = reinterpret_cast<base::quatf*>(room + 6 * frameCount);
    return entry;
}

/// The samples alone: layers told of each frame, transforms composed and taken apart.
void sample(benchmark::State& state) {
    const AnimatedScene animated(nodeCount, frameCount);
    const auto exporter = base::makeRef<gltf::GLTFScenePlugin>(base::ref<base::IPluginDesc>(),
                                                               animated.scene->factory.get(), 0);
    for (auto _ : state) {
        gltf::SceneClock clock(*animated.scene->scene);
        clock.tellLayers();
        base::vector<float> room;
        room.resizeUninitialized(nodeCount * floatsPerNode);
        base::askForLargePages(room.data(), room.byteLength());
        base::vector<gltf::NodeAnimation> entries;
        for (const scene::INode* node : animated.nodes)
            entries.push_back(makeEntry(*node, room.data() + entries.size() * floatsPerNode));
        const double seconds = secondsOf([&] {
            for (base::u32 frame = 0; frame < frameCount; ++frame) {
                clock.set(frameTime(frame));
                for (gltf::NodeAnimation& entry : entries)
                    exporter->sampleNodeAnimation(entry, frameTime(frame));
            }
        });
        for (const gltf::NodeAnimation& entry : std::as_const(entries))
            if (entry.sampleCount != frameCount)
                throw std::runtime_error("there are samples missing");
        reportTimes(state, seconds, evaluationSeconds(animated));
    }
}

/// The whole export with its file.
void bake(benchmark::State& state) {
    const OutputFolder folder;
    const AnimatedScene animated(nodeCount, frameCount);
    for (auto _ : state) {
        const double seconds = exportSeconds(animated, folder);
        reportTimes(state, seconds, evaluationSeconds(animated));
    }
}

/// How the time of an export grows with `nodes` and `frames`.
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

BENCH_ROW(sample, "animation/bake");
BENCH_ROW(bake, "animation/export");
BENCH_ROW(bakeNodes, "animation/nodes");
BENCH_ROW(bakeFrames, "animation/frames");

} // namespace

} // namespace bench
