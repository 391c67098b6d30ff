#include "texture_floor.h"
#include "texture_scene.h"

#include <cmath>
#include <filesystem>
#include <stdexcept>

/// Exports of materials with maps: from picture files on disk to a container with JPEG files.
namespace bench {

namespace {

using base::u32;
using base::u64;

constexpr u32 side = 2048;
/// By how much the bytes of the pictures may differ from the floor's: what differs in the last bit
/// of a pixel, or between its neighbours, is compressed another way.
constexpr double tolerance = 0.02;
constexpr u32 noLimit = 4096; ///< of the export's sizes: above all that is here

void require(bool holds) {
    if (!holds)
        throw std::runtime_error("the exported pictures are not those of the floor");
}

double exportSeconds(const MapFiles& files, const std::string& path, u32 limit) {
    const ScenePtr scene = makeTexturedScene(files);
    base::AttribMap settings;
    write(settings, scene::sceneExporter_schema::n_exportImageMaxDim) = limit;
    std::filesystem::remove(path);
    return secondsOf([&] { exportScene(*scene, path, settings); });
}

/// What the export of the files must hold.
struct Expected {
    u32 picturesPerMaterial = 1;
    u32 side = bench::side;
    u32 limit = noLimit;
};

/// Exports the scene, and then does the floor's work for each material.
template <class Floor>
void compare(benchmark::State& state, const MapFiles& files, const Expected& expected,
             const Floor& floor) {
    const OutputFolder folder;
    const std::string path = folder / "textured.glb";
    for (auto _ : state) {
        const double seconds = exportSeconds(files, path, expected.limit);
        u64 floorBytes = 0;
        const double floorSeconds = secondsOf([&] {
            for (u32 i = 0; i < MapFiles::materialCount; ++i)
                floorBytes += floor(i);
        });
        const ExportedPictures pictures = readPictures(path, expected.side);
        const double ratio =
            static_cast<double>(pictures.byteCount) / static_cast<double>(floorBytes);
        require(pictures.count == expected.picturesPerMaterial * MapFiles::materialCount);
        require(std::abs(ratio - 1) <= tolerance);
        reportTimes(state, seconds, floorSeconds);
    }
}

void toJpeg(benchmark::State& state) {
    static const MapFiles files(side, 0, 0);
    compare(state, files, {}, [](u32 i) { return convertBare(files.colours()[i], side); });
}

void halved(benchmark::State& state) {
    static const MapFiles files(side, 0, 0);
    compare(state, files, {.side = side / 2, .limit = side / 2},
            [](u32 i) { return convertHalvedBare(files.colours()[i], side); });
}

u64 packPair(const MapFiles& files, u32 metalSide, u32 number) {
    return packBare(files.roughness()[number], side, files.metal()[number], metalSide);
}

void pack(benchmark::State& state) {
    static const MapFiles files(0, side, side);
    compare(state, files, {}, [](u32 i) { return packPair(files, side, i); });
}

void packUnequal(benchmark::State& state) {
    static const MapFiles files(0, side, side / 2);
    compare(state, files, {}, [](u32 i) { return packPair(files, side / 2, i); });
}

void allMaps(benchmark::State& state) {
    static const MapFiles files(side, side, side);
    compare(state, files, {.picturesPerMaterial = 2},
            [](u32 i) { return convertBare(files.colours()[i], side) + packPair(files, side, i); });
}

void allMapsMemory(benchmark::State& state) {
    static const MapFiles files(side, side, side);
    const OutputFolder folder;
    const std::string path = folder / "textured.glb";
    for (auto _ : state) {
        state.counters["before"] = static_cast<double>(peakMemory());
        state.SetIterationTime(exportSeconds(files, path, noLimit));
        state.counters["peak"] = static_cast<double>(peakMemory());
        require(readPictures(path, side).count == 2 * MapFiles::materialCount);
    }
}

BENCH_ROW(toJpeg, "texture/jpeg");
BENCH_ROW(pack, "texture/pack");
BENCH_ROW(packUnequal, "texture/pack-unequal");
BENCH_ROW(halved, "texture/halved");
BENCH_ROW(allMaps, "texture/all");
BENCH_ROW(allMapsMemory, "texture/memory");

} // namespace

} // namespace bench
