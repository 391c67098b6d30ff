// gltf_stats FILE: what a glTF file draws, as JSON. Exit code 2 if it can't be read.

#include "stats_json.h"

#include "support/gltf_faults.h"

#include <cstdio>

using namespace test_support;

namespace {

void print(const GltfFile& file) {
    const Statistics statistics = statisticsOf(file);
    rapidjson::StringBuffer buffer;
    StatsWriter writer(buffer);
    beginStats(writer, statistics.stored, statistics.drawn);
    writeCount(writer, "nodes", statistics.nodes);
    writeCount(writer, "meshes", statistics.meshes);
    writeCount(writer, "primitives", statistics.primitives);
    writeCount(writer, "compressedPrimitives", statistics.compressedPrimitives);
    writeCount(writer, "vertices", statistics.vertices);
    writeVector(writer, "positionError", statistics.positionError);
    writeNumber(writer, "areaError", statistics.areaError);
    writer.Key("faults");
    writer.StartArray();
    for (const Fault& fault : findFaults(file)) {
        writer.StartObject();
        writer.Key("kind");
        writer.String(fault.kind.c_str());
        writer.Key("text");
        writer.String(fault.text.c_str());
        writer.EndObject();
    }
    writer.EndArray();
    writer.EndObject();
    std::puts(buffer.GetString());
}

} // namespace

int main(int argc, char** argv) {
    if (argc != 2) {
        std::fprintf(stderr, "usage: gltf_stats FILE\n");
        return 1;
    }
    try {
        print(GltfFile::read(argv[1]));
        return 0;
    } catch (const std::exception& error) {
        std::fprintf(stderr, "gltf_stats: %s\n", error.what());
        return 2;
    }
}
