#include "host/summary.h"

#include "host/printing.h"

#include "b_format.h"
#include "scene_document.h"
#include "scene_options.h"

#include <charconv>

namespace host {

using base::string;
using base::string_view;
using base::u64;

namespace {

string secondsText(double seconds) {
    char text[32];
    const auto end = std::to_chars(text, std::end(text), seconds, std::chars_format::fixed, 3).ptr;
    return string(text, end);
}

string counted(u64 count, string_view what, string_view plural = "s") {
    return base::format("{} {}{}", count, what, count == 1 ? "" : plural);
}

string dryRunLine(const RunRecord& record) {
    using Schema = scene::sceneExporter_schema;
    const base::AttribMap& settings = record.settings.exporter;
    string line = record.output + ": would be written";
    if (!scene::isSceneDocument(record.output)) {
        line += read(settings, Schema::n_exportEmbedded) ? " with its resources inside"
                                                         : " with resources in files beside it";
        line += read(settings, Schema::n_exportCompress) ? ", compressed" : ", not compressed";
    }
    line += "; the scene has " + counted(record.scene.nodes, "node") + ", ";
    line += counted(record.scene.meshes, "mesh", "es");
    line += base::format(" ({} with faults), ", record.scene.faultyMeshes);
    line += counted(record.scene.triangles, "triangle") + ", ";
    return line + counted(record.unexported.size(), "object") + " that can't be exported";
}

/// What the file has no place for, by type; empty if there is nothing.
string unexportedText(const base::vector<ObjectName>& objects) {
    base::map<string_view, u64> counts;
    for (const ObjectName& object : objects)
        ++counts[object.type];
    string text;
    for (const auto& [type, count] : counts)
        text += (text.empty() ? ", without " : ", ") + counted(count, type);
    return text;
}

string writtenLine(const RunRecord& record) {
    if (record.written.files.empty())
        return record.output + ": written, not counted as it is no regular file";
    string line = record.output + ": " + counted(record.written.files.size(), "file") + ", " +
                  counted(record.written.totalBytes(), "byte");
    if (record.written.objects)
        line += ", " + counted(*record.written.objects, "object");
    if (!record.written.document)
        return line;
    const DocumentCounts& counts = *record.written.document;
    line += ", " + counted(counts.nodes, "node");
    line += ", " + counted(counts.meshes, "mesh", "es");
    line += ", " + counted(counts.triangles, "triangle");
    line += ", " + counted(counts.materials, "material");
    line += ", " + counted(counts.images, "image");
    if (counts.skins != 0)
        line += base::format(", {} of {}", counted(counts.skins, "skin"),
                             counted(counts.joints, "joint"));
    if (counts.targets != 0)
        line += ", " + counted(counts.targets, "morph target");
    line += ", " + counted(counts.animations, "animation");
    if (counts.animations != 0)
        line += " of " + counted(counts.samples, "sample");
    if (counts.lights != 0)
        line += ", " + counted(counts.lights, "light");
    return line + unexportedText(record.unexported);
}

} // namespace

string summaryLine(const RunRecord& record) {
    const string line = record.isDryRun ? dryRunLine(record) : writtenLine(record);
    return printable(line + ", " + secondsText(record.clock.totalSeconds()) + " s");
}

} // namespace host
