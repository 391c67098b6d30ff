#include "stats_json.h"

using namespace test_support;

void beginStats(StatsWriter& writer, const Totals& stored, const Totals& drawn) {
    writer.StartObject();
    writeCount(writer, "storedTriangles", stored.triangles);
    writeCount(writer, "triangles", drawn.triangles);
    writeNumber(writer, "area", drawn.area);
    writeNumber(writer, "volume", drawn.volume);
    writeBox(writer, "bounds", drawn.triangleBounds);
    writeCount(writer, "lines", drawn.lines);
    writeCount(writer, "points", drawn.points);
}

void writeBox(StatsWriter& writer, const char* name, const Box& box) {
    writer.Key(name);
    if (box.isEmpty()) {
        writer.Null();
        return;
    }
    writer.StartObject();
    writeVector(writer, "min", box.min);
    writeVector(writer, "max", box.max);
    writer.EndObject();
}

void writeVector(StatsWriter& writer, const char* name, const Vector& vector) {
    writer.Key(name);
    writer.StartArray();
    for (const double number : vector) {
        writer.Double(number);
    }
    writer.EndArray();
}

void writeNumber(StatsWriter& writer, const char* name, double number) {
    writer.Key(name);
    writer.Double(number);
}

void writeCount(StatsWriter& writer, const char* name, size_t count) {
    writer.Key(name);
    writer.Uint64(count);
}
