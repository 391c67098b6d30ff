#include "host/report.h"

#include "host/printing.h"
#include "host/version.h"

#include "b_cmdline.h"
#include "b_format.h"
#include "b_string_convert.h"
#include "scene_options.h"

#include <rapidjson/prettywriter.h>
#include <rapidjson/stringbuffer.h>

#include <algorithm>
#include <charconv>

namespace host {

using base::string;
using base::string_view;
using base::u64;

namespace {

using Writer = rapidjson::PrettyWriter<rapidjson::StringBuffer>;

void writeText(Writer& writer, string_view text) {
    const string valid = base::toValidUtf8(text);
    writer.String(valid.data(), static_cast<rapidjson::SizeType>(valid.size()));
}

void writeTexts(Writer& writer, const base::vector<string>& texts) {
    writer.StartArray();
    for (const string& text : texts)
        writeText(writer, text);
    writer.EndArray();
}

void writeMember(Writer& writer, const char* name, string_view value) {
    writer.Key(name);
    writeText(writer, value);
}

void writeMember(Writer& writer, const char* name, u64 value) {
    writer.Key(name);
    writer.Uint64(value);
}

/// The word for value `number` of the option, empty if it has no words.
string wordFor(const base::CmdLineOption* option, base::u8 number) {
    if (!option || option->syntax.empty())
        return {};
    const base::vector<string_view> words = base::split(option->syntax, '|');
    return number < words.size() ? string(words[number]) : string();
}

void writeSetting(Writer& writer, const base::Attribute& value, const base::CmdLineOption* option) {
    const base::name_id type = value.type();
    const void* data = value.data(-1);
    if (type == base::TypeTraits<bool>::n_name) {
        writer.Bool(*static_cast<const bool*>(data));
    } else if (type == base::TypeTraits<base::u32>::n_name) {
        writer.Uint(*static_cast<const base::u32*>(data));
    } else if (type == base::TypeTraits<base::i32>::n_name) {
        writer.Int(*static_cast<const base::i32*>(data));
    } else if (type == base::TypeTraits<base::u8>::n_name) {
        const base::u8 number = *static_cast<const base::u8*>(data);
        const string word = wordFor(option, number);
        if (word.empty())
            writer.Uint(number);
        else
            writeText(writer, word);
    } else if (type == base::TypeTraits<float>::n_name) {
        // The shortest text of the float, which is not that of the same number as a double.
        char text[32];
        const auto end = std::to_chars(text, std::end(text), *static_cast<const float*>(data)).ptr;
        writer.RawValue(text, static_cast<std::size_t>(end - text), rapidjson::kNumberType);
    } else if (type == base::TypeTraits<string>::n_array_name) {
        writeTexts(writer, *static_cast<const base::vector<string>*>(data));
    } else {
        writeText(writer, value.toString());
    }
}

void writeSettings(Writer& writer, const char* group, const base::AttribMap& settings,
                   const base::CmdLineOptions& registered) {
    // In the order of the names: that of the map has no meaning.
    base::vector<std::pair<string_view, const base::Attribute*>> sorted;
    for (const auto& [name, value] : settings.entries())
        sorted.push_back({name.view(), value});
    std::sort(sorted.begin(), sorted.end());
    writer.Key(group);
    writer.StartObject();
    for (const auto& [name, value] : sorted) {
        writer.Key(name.data(), static_cast<rapidjson::SizeType>(name.size()));
        writeSetting(writer, *value, registered.find(name));
    }
    writer.EndObject();
}

void writeWritten(Writer& writer, const Output& written) {
    writer.Key("files");
    writer.StartArray();
    for (const WrittenFile& file : written.files) {
        writer.StartObject();
        writeMember(writer, "path", file.path);
        writeMember(writer, "bytes", file.bytes);
        writer.EndObject();
    }
    writer.EndArray();
    if (written.objects)
        writeMember(writer, "objects", *written.objects);
    if (!written.document)
        return;
    const DocumentCounts& counts = *written.document;
    writer.Key("counts");
    writer.StartObject();
    writeMember(writer, "nodes", counts.nodes);
    writeMember(writer, "meshes", counts.meshes);
    writeMember(writer, "triangles", counts.triangles);
    writeMember(writer, "materials", counts.materials);
    writeMember(writer, "images", counts.images);
    writeMember(writer, "skins", counts.skins);
    writeMember(writer, "joints", counts.joints);
    writeMember(writer, "targets", counts.targets);
    writeMember(writer, "animations", counts.animations);
    writeMember(writer, "samples", counts.samples);
    writeMember(writer, "lights", counts.lights);
    writer.EndObject();
    writer.Key("bytes");
    writer.StartObject();
    writeMember(writer, "total", written.totalBytes());
    writeMember(writer, "json", counts.jsonBytes);
    writeMember(writer, "geometry", counts.geometryBytes);
    writeMember(writer, "images", counts.imageBytes);
    writer.EndObject();
}

string_view wordFor(scene::ImageRecord::Work work) {
    using Work = scene::ImageRecord::Work;
    switch (work) {
    case Work::kept:
        return "kept";
    case Work::converted:
        return "converted";
    case Work::resized:
        return "resized";
    case Work::packed:
        return "packed";
    case Work::normalMap:
        return "made from a bump map";
    }
    return "unknown"; // of an exporter that knows more
}

/// A side of a picture, null if it is not known.
void writeSide(Writer& writer, const char* name, base::i32 pixels) {
    writer.Key(name);
    if (pixels < 0)
        writer.Null();
    else
        writer.Int(pixels);
}

void writeImages(Writer& writer, const base::vector<scene::ImageRecord>& images) {
    writer.Key("images");
    writer.StartArray();
    for (const scene::ImageRecord& image : images) {
        writer.StartObject();
        writeMember(writer, "name", image.name);
        writer.Key("sources");
        writeTexts(writer, image.sources);
        writeMember(writer, "work", wordFor(image.work));
        writeSide(writer, "width", image.width);
        writeSide(writer, "height", image.height);
        writeMember(writer, "bytes", u64(image.byteLength));
        writer.EndObject();
    }
    writer.EndArray();
}

void writeScene(Writer& writer, const SceneCounts& counts) {
    writer.Key("scene");
    writer.StartObject();
    writeMember(writer, "nodes", counts.nodes);
    writeMember(writer, "meshes", counts.meshes);
    writeMember(writer, "triangles", counts.triangles);
    writeMember(writer, "faultyMeshes", counts.faultyMeshes);
    writer.EndObject();
}

void writeSeconds(Writer& writer, const StageClock& clock) {
    writer.Key("seconds");
    writer.StartObject();
    for (const StageClock::Stage& stage : clock.stages()) {
        writer.Key(stage.name);
        writer.Double(stage.seconds);
    }
    writer.Key("total");
    writer.Double(clock.totalSeconds());
    writer.EndObject();
}

void writeMessages(Writer& writer, const base::vector<Message>& messages) {
    static constexpr const char* levels[] = {"text", "critical", "error", "warning"};
    writer.Key("messages");
    writer.StartArray();
    for (const Message& message : messages) {
        writer.StartObject();
        writeMember(writer, "level", levels[message.level]);
        writeMember(writer, "channel", message.channel.view());
        writeMember(writer, "object", message.object);
        writeMember(writer, "text", message.text);
        writer.EndObject();
    }
    writer.EndArray();
}

void writeUnexported(Writer& writer, const base::vector<ObjectName>& objects) {
    writer.Key("notExported");
    writer.StartArray();
    for (const ObjectName& object : objects) {
        writer.StartObject();
        writeMember(writer, "type", object.type);
        writeMember(writer, "name", object.name);
        writer.EndObject();
    }
    writer.EndArray();
}

} // namespace

string reportText(const RunRecord& record, const base::vector<Message>& messages,
                  const base::CmdLineOptions& registered) {
    rapidjson::StringBuffer buffer;
    Writer writer(buffer);
    writer.SetIndent(' ', 2);
    writer.StartObject();
    writeMember(writer, "tool", programName);
    writeMember(writer, "version", programVersion);
    writeMember(writer, "input", record.input);
    writeMember(writer, "output", record.output);
    writer.Key("dryRun");
    writer.Bool(record.isDryRun);
    writeMember(writer, "exitCode", static_cast<u64>(record.exitCode));

    writer.Key("options");
    writer.StartObject();
    writeSettings(writer, "scene", record.settings.scene, registered);
    writeSettings(writer, "importer", record.settings.importer, registered);
    writeSettings(writer, "exporter", record.settings.exporter, registered);
    writer.EndObject();

    if (record.isDryRun) {
        writeScene(writer, record.scene);
    } else {
        writeWritten(writer, record.written);
        writeImages(writer, record.images);
    }
    writeSeconds(writer, record.clock);
    writeMessages(writer, messages);
    writeUnexported(writer, record.unexported);
    writer.EndObject();
    return string(buffer.GetString(), buffer.GetSize()) + "\n";
}

} // namespace host
