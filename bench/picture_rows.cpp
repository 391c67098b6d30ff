#include "measure.h"
#include "picture_floor.h"

#include "b_filter.h"
#include "i_file.h"
#include "i_normal_map.h"
#include "stream/b_stream_workers.h"

#include <algorithm>
#include <cstring>
#include <stdexcept>

/// Pictures: files, resampling, conversion.
namespace bench {

namespace {

using base::u32;
using base::u64;
using base::u8;
using base::vector;
using iio::Image;
using Picture = base::ref<Image>;

constexpr u32 fileSide = 2048, pixelSide = 4096;
constexpr u64 pixelCount = u64(pixelSide) * pixelSide;
constexpr int jpegQuality = 95;

void require(bool holds) {
    if (!holds)
        throw std::runtime_error("the floor has another result");
}

vector<u8> saved(Image& image, const char* name) {
    vector<u8> bytes;
    base::Stream stream = base::vectorStream(bytes, name);
    require(iio::saveImage(image, stream));
    return bytes;
}

/// Reads a file in memory, against `decode` of its bytes.
template <class Decode>
void loadFile(benchmark::State& state, const char* name, const Decode& decode) {
    vector<u8> file = saved(*makePhotograph(fileSide, fileSide, Image::kRGB), name);
    for (auto _ : state) {
        Picture image;
        const double seconds = secondsOf([&] {
            base::Stream stream = base::vectorStream(file, name);
            image = iio::loadImage(stream);
        });
        vector<u8> pixels;
        const double floorSeconds = secondsOf([&] { pixels = decode(file); });
        require(image && std::memcmp(image->data(), pixels.data(), pixels.size()) == 0);
        reportTimes(state, seconds, floorSeconds);
    }
}

void loadPng(benchmark::State& state) {
    loadFile(state, "picture.png", decodePng);
}

void loadJpeg(benchmark::State& state) {
    loadFile(state, "picture.jpg", decodeJpeg);
}

void saveJpeg(benchmark::State& state) {
    const Picture image = makePhotograph(fileSide, fileSide, Image::kRGB);
    for (auto _ : state) {
        vector<u8> file, floorFile;
        const double seconds = secondsOf([&] { file = saved(*image, "picture.jpg"); });
        const double floorSeconds = secondsOf(
            [&] { floorFile = encodeJpeg(image->data(), fileSide, fileSide, jpegQuality); });
        require(file.size() / 64 == floorFile.size() / 64);
        reportTimes(state, seconds, floorSeconds);
    }
}

void resize(benchmark::State& state) {
    const Picture source = makePhotograph(pixelSide, pixelSide, Image::kRGB);
    const base::KaiserFilter filter(1.5f);
    Image floorTarget(pixelSide / 2, pixelSide / 2, 1, 1, Image::kRGB, Image::IT_UNSIGNED_BYTE);
    for (auto _ : state) {
        Picture target;
        const double seconds =
            secondsOf([&] { target = source->resize(filter, pixelSide / 2, pixelSide / 2); });
        const double floorSeconds =
            secondsOf([&] { halveBare(source->data(), pixelSide, pixelSide, floorTarget.data()); });
        require(target && target->memorySize() == floorTarget.memorySize());
        reportTimes(state, seconds, floorSeconds);
        state.counters["items"] = static_cast<double>(pixelCount);
    }
}

void resizeMemory(benchmark::State& state) {
    for (auto _ : state) {
        const Picture source = makePhotograph(pixelSide, pixelSide, Image::kRGB);
        const Picture target =
            source->resize(base::KaiserFilter(1.5f), pixelSide / 2, pixelSide / 2);
        state.SetIterationTime(1);
        state.counters["peak"] = static_cast<double>(peakMemory());
        // The source, the target and a picture of the target's width and the source's height.
        state.counters["bytes"] = static_cast<double>(source->memorySize() * 7 / 4);
    }
}

/// Equal but for the one that truncation takes.
bool isClose(const Image& image, const Image& other) {
    return std::equal(image.data(), image.data() + image.memorySize(), other.data(),
                      [](u8 a, u8 b) { return a == b || a + 1 == b; });
}

/// A conversion there and back, against copies of as many bytes as are read and written.
template <class There, class Back>
void convert(benchmark::State& state, const There& there, const Back& back) {
    const Picture source = makePhotograph(pixelSide, pixelSide, Image::kRGB);
    const u64 targetSize = there(*source)->memorySize();
    for (auto _ : state) {
        Picture converted, restored;
        const double seconds = secondsOf([&] {
            converted = there(*source);
            restored = back(*converted);
        });
        require(isClose(*restored, *source));
        const u64 byteCount = source->memorySize() + targetSize;
        const vector<u8> bytes(byteCount, u8(1));
        double floorSeconds = 0;
        for (int i = 0; i < 2; ++i) {
            floorSeconds += secondsOf([&] {
                vector<u8> copy;
                copy.resizeUninitialized(byteCount);
                std::memcpy(copy.data(), bytes.data(), byteCount);
                benchmark::DoNotOptimize(copy.data());
            });
        }
        reportTimes(state, seconds, floorSeconds);
    }
}

void convertFormat(benchmark::State& state) {
    convert(
        state, [](Image& image) { return image.convertFormat(Image::kRGBA); },
        [](Image& image) { return image.convertFormat(Image::kRGB); });
}

void convertType(benchmark::State& state) {
    convert(
        state, [](Image& image) { return image.convertType(Image::IT_UNSIGNED_SHORT); },
        [](Image& image) { return image.convertType(Image::IT_UNSIGNED_BYTE); });
}

void normalMap(benchmark::State& state) {
    const Picture source = makePhotograph(pixelSide, pixelSide, Image::kLuminance);
    for (auto _ : state) {
        Picture map;
        const double seconds = secondsOf([&] { map = iio::makeNormalMap(*source, 0, 1, false); });
        require(map != nullptr);
        reportTimes(state, seconds, seconds);
        state.counters["items"] = static_cast<double>(pixelCount);
    }
}

BENCH_ROW(loadPng, "picture/png-load");
BENCH_ROW(loadJpeg, "picture/jpeg-load");
BENCH_ROW(saveJpeg, "picture/jpeg-save");
BENCH_ROW(resize, "picture/resize");
BENCH_ROW(resizeMemory, "picture/resize-memory");
BENCH_ROW(convertFormat, "picture/convert-format");
BENCH_ROW(convertType, "picture/convert-type");
BENCH_ROW(normalMap, "picture/normal-map");

} // namespace

} // namespace bench
