#include "measure.h"

#include "b_factory.h"
#include "stream/b_stream_workers.h"

#include <rapidjson/reader.h>

#include <stdexcept>

/// Whole documents as JSON text, written to memory and read from it. The floors are a copy of the
/// text and a bare parse that keeps nothing.
namespace bench {

namespace {

base::name_id nameOf(const std::string& text) {
    return base::nameServer().id(text);
}

/// About a hundred megabytes of text, most of it in a few arrays.
void buildArrays(base::PluginFactory& factory) {
    base::u32 state = 1;
    const auto next = [&state] { return state = state * 1664525u + 1013904223u; };
    for (int i = 0; i < 8; ++i) {
        base::IPlugin& mesh = *factory.create(nameOf("mesh"));
        auto& points = mesh.vecAttribute<base::vec3f>(nameOf("points"));
        auto& indices = mesh.vecAttribute<base::u32>(nameOf("indices"));
        const auto coordinate = [&] { return static_cast<float>(next() >> 8) * 1e-5f - 80.0f; };
        for (int k = 0; k < 200000; ++k)
            points.push_back({coordinate(), coordinate(), coordinate()});
        for (int k = 0; k < 600000; ++k)
            indices.push_back(next() >> 14);
    }
}

/// Objects as scenes have many of.
void buildNodes(base::PluginFactory& factory) {
    const base::name_id name = nameOf("name"), translation = nameOf("translation"),
                        rotation = nameOf("rotation"), isVisible = nameOf("visible"),
                        parent = nameOf("parent"), layer = nameOf("layer"), size = nameOf("size");
    base::ref<base::IPlugin> last;
    for (int i = 0; i < 20000; ++i) {
        base::ref<base::IPlugin> node = factory.create(nameOf("node"));
        const auto x = static_cast<float>(i) * 0.37f;
        node->attribute<base::string>(name) = "node " + std::to_string(i);
        node->attribute<base::vec3f>(translation) = {x, x * 0.5f, -x};
        node->attribute<base::quatf>(rotation) = {0, 0.6f, 0, 0.8f};
        node->attribute<bool>(isVisible) = i % 2 == 0;
        node->attribute<base::ref<base::IPlugin>>(parent) = last;
        node->attribute<base::i32>(layer) = i;
        node->attribute<float>(size) = x;
        last = node;
    }
}

using Build = void (*)(base::PluginFactory& factory);

std::string writtenText(const base::PluginFactory& factory) {
    base::string text;
    base::Stream stream = base::stringStream(text);
    factory.writeJson(stream);
    return text;
}

void report(benchmark::State& state, double seconds, double floorSeconds, std::size_t byteCount) {
    reportTimes(state, seconds, floorSeconds);
    state.counters["items"] = static_cast<double>(byteCount);
    state.counters["MB/s"] = static_cast<double>(byteCount) * 1e-6 / seconds;
}

void writeDocument(benchmark::State& state, Build build) {
    base::PluginFactory factory;
    build(factory);
    for (auto _ : state) {
        std::string text, copy;
        const double seconds = secondsOf([&] { text = writtenText(factory); });
        const double floorSeconds = secondsOf([&] { copy = text; });
        benchmark::DoNotOptimize(copy.data());
        report(state, seconds, floorSeconds, text.size());
    }
}

void readDocument(benchmark::State& state, Build build) {
    base::PluginFactory built;
    build(built);
    const std::string text = writtenText(built);
    for (auto _ : state) {
        base::PluginFactory factory;
        base::Stream stream = base::memStreamView(text.data(), text.size(), "document");
        bool isRead = false;
        const double seconds = secondsOf([&] { isRead = factory.readJson(stream); });
        if (!isRead || factory.pluginCount() != built.pluginCount())
            throw std::runtime_error("the document was not read");
        const double floorSeconds = secondsOf([&] {
            constexpr unsigned flags = rapidjson::kParseIterativeFlag |
                                       rapidjson::kParseFullPrecisionFlag |
                                       rapidjson::kParseNanAndInfFlag;
            rapidjson::MemoryStream source(text.data(), text.size());
            rapidjson::BaseReaderHandler<> nothing;
            rapidjson::Reader().Parse<flags>(source, nothing);
        });
        report(state, seconds, floorSeconds, text.size());
    }
}

void writeArrays(benchmark::State& state) {
    writeDocument(state, buildArrays);
}
void writeNodes(benchmark::State& state) {
    writeDocument(state, buildNodes);
}
void readArrays(benchmark::State& state) {
    readDocument(state, buildArrays);
}
void readNodes(benchmark::State& state) {
    readDocument(state, buildNodes);
}

BENCH_ROW(writeArrays, "storage/json-write");
BENCH_ROW(writeNodes, "storage/json-write-nodes");
BENCH_ROW(readArrays, "storage/json-read");
BENCH_ROW(readNodes, "storage/json-read-nodes");

} // namespace

} // namespace bench
