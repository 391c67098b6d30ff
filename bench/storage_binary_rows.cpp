#include "b_attribute_binary.h"

#include "measure.h"
#include "storage_scene.h"
#include "stream/b_stream_workers.h"

#include <cstdlib>
#include <cstring>
#include <memory>

/// The binary form of documents in memory. The floor of large arrays copies the same bytes, array
/// by array, into fresh memory.
namespace bench {

namespace {

using namespace base;

void copyToFreshMemory(const vector<u8>& bytes, std::size_t pieces) {
    const std::size_t length = bytes.size() / pieces;
    vector<std::unique_ptr<u8[]>> copies;
    for (std::size_t i = 0; i < pieces; ++i) {
        copies.push_back(std::unique_ptr<u8[]>(new u8[length]));
        std::memcpy(copies.back().get(), bytes.data() + i * length, length);
        benchmark::DoNotOptimize(copies.back().get());
    }
}

vector<u8> written(const PluginFactory& document) {
    vector<u8> bytes;
    Stream stream = vectorStream(bytes);
    document.write(stream);
    return bytes;
}

void requireSameSize(const PluginFactory& a, const PluginFactory& b) {
    if (a.pluginCount() != b.pluginCount() || a.memorySize() != b.memorySize())
        std::abort();
}

void writeArrays(benchmark::State& state) {
    const ref<PluginFactory> document = makeArrayDocument();
    const vector<u8> bytes = written(*document);
    for (auto _ : state) {
        const double seconds = secondsOf([&] { benchmark::DoNotOptimize(written(*document)); });
        reportTimes(state, seconds, secondsOf([&] { copyToFreshMemory(bytes, 1); }));
    }
}

void readArrays(benchmark::State& state) {
    const ref<PluginFactory> document = makeArrayDocument();
    const vector<u8> bytes = written(*document);
    const std::size_t arrayCount = document->pluginCount() * 3;
    for (auto _ : state) {
        const auto read = makeRef<PluginFactory>();
        const double seconds = secondsOf([&] {
            Stream stream = memStreamView(bytes.data(), bytes.size(), "arrays");
            read->read(stream);
        });
        requireSameSize(*document, *read);
        reportTimes(state, seconds, secondsOf([&] { copyToFreshMemory(bytes, arrayCount); }));
    }
}

/// The time of a row without a floor, for one object.
template <class Work>
void reportEach(benchmark::State& state, const PluginFactory& document, const Work& work) {
    for (auto _ : state) {
        const double seconds = secondsOf(work);
        state.SetIterationTime(seconds);
        state.counters["seconds"] = seconds;
        state.counters["items"] = document.pluginCount();
    }
}

void writeNodes(benchmark::State& state) {
    const ref<PluginFactory> document = makeNodeDocument();
    reportEach(state, *document, [&] { benchmark::DoNotOptimize(written(*document)); });
}

void readNodes(benchmark::State& state) {
    const ref<PluginFactory> document = makeNodeDocument();
    const vector<u8> bytes = written(*document);
    const auto read = makeRef<PluginFactory>();
    reportEach(state, *document, [&] {
        Stream stream = memStreamView(bytes.data(), bytes.size(), "nodes");
        read->read(stream);
    });
}

BENCH_ROW(writeArrays, "storage/binary-write");
BENCH_ROW(readArrays, "storage/binary-read");
BENCH_ROW(writeNodes, "storage/binary-write-nodes");
BENCH_ROW(readNodes, "storage/binary-read-nodes");

} // namespace

} // namespace bench
