#pragma once

#include "support/gltf_statistics.h"

#include <rapidjson/stringbuffer.h>
#include <rapidjson/writer.h>

/// The members that `model_stats` and `gltf_stats` have in common, so that they can be compared.
using StatsWriter = rapidjson::Writer<rapidjson::StringBuffer>;

/// Opens the object and writes the common members. Triangles, area, volume, bounds, lines and
/// points are those drawn in the world; "storedTriangles" counts each mesh once.
void beginStats(StatsWriter& writer, const test_support::Totals& stored,
                const test_support::Totals& drawn);
/// Writes an object with "min" and "max", or null for an empty box.
void writeBox(StatsWriter& writer, const char* name, const test_support::Box& box);
void writeVector(StatsWriter& writer, const char* name, const test_support::Vector& vector);
void writeNumber(StatsWriter& writer, const char* name, double number);
void writeCount(StatsWriter& writer, const char* name, size_t count);
