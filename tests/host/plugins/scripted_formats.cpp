// An importer and an exporter that do what the file says: each line is a command, and what
// follows the line "---" is the text that the exporter writes.
#include "scene.h"
#include "scene_factory.h"
#include "scene_image_record.h"

#include "b_cmdline.h"
#include "b_exception.h"
#include "b_log.h"
#include "b_string_convert.h"
#include "stream/b_fs.h"

#include <csignal>
#include <cstdlib>
#include <new>

namespace {

using base::string;
using base::string_view;

base::name_id nameOf(string_view text) {
    return base::nameServer().id(text);
}

string readText(const string& path) {
    base::Stream stream;
    base::fs::master().open(stream, path, base::fs::openRead);
    string text(static_cast<std::size_t>(stream.size()), '\0');
    stream.read(text.data(), text.size());
    return text;
}

/// Uses up the stack. The volatile byte keeps the calls from becoming a loop.
int recurse(int depth) {
    volatile char block[1024];
    block[0] = static_cast<char>(depth);
    return depth < 0 ? 0 : recurse(depth + 1) + block[0];
}

void fail(string_view how) {
    if (how == "abort")
        std::raise(SIGABRT);
    if (how == "segv")
        std::raise(SIGSEGV);
    if (how == "overflow")
        std::exit(recurse(1));
    if (how == "throw-text")
        throw std::runtime_error("thrown on purpose");
    if (how == "throw-number")
        throw 1;
    if (how == "throw-memory")
        throw std::bad_alloc();
}

void addMesh(base::PluginFactory& scene, base::u32 secondCorner, base::AttribMap& root) {
    using Mesh = scene::mesh_schema;
    base::ref<base::IPlugin> mesh = scene.create(Mesh::n_kind);
    write(*mesh, scene::geometry_schema::n_name) = "Sail";
    write(*mesh, Mesh::n_positions) = {{0, 0, 0}, {1, 0, 0}, {1, 1, 0}, {0, 1, 0}};
    write(*mesh, Mesh::n_indices) = {0, secondCorner, 2, 3};
    auto* primitive = new base::AttribMap;
    write(*mesh, Mesh::n_primitives).append(primitive);
    write(*primitive, scene::meshPrimitive_schema::n_vcounts) = {4};
    write(*primitive, scene::meshPrimitive_schema::n_indexStart) = 0;
    write(*primitive, scene::meshPrimitive_schema::n_indexCount) = 4;
    write(root, scene::node_schema::n_children).push_back(mesh);
}

/// Records an exported picture: "work width height bytes name source...".
void addImage(base::PluginFactory& scene, const string& argument) {
    const base::vector<string_view> words = base::split(argument, ' ');
    const auto number = [&](std::size_t i) { return std::atoi(string(words[i]).c_str()); };
    const base::ref<base::IPlugin> document = scene.firstOfType(scene::scene_schema::n_kind);
    base::vector<scene::ImageRecord> records = scene::findImageRecords(*document);
    scene::ImageRecord& record = records.emplace_back();
    record.work = static_cast<scene::ImageRecord::Work>(number(0));
    record.width = number(1);
    record.height = number(2);
    record.byteLength = static_cast<base::u32>(number(3));
    record.name = string(words[4]);
    for (std::size_t i = 5; i < words.size(); ++i)
        record.sources.push_back(string(words[i]));
    scene::storeImageRecords(*document, records);
}

class Importer final : public scene::SceneImportPlugin {
public:
    using SceneImportPlugin::SceneImportPlugin;

    bool canLoad(const string&) override { return true; }

    bool load(base::PluginFactory& scene, const string& path) override {
        const string text = readText(path);
        const std::size_t end = text.find("---\n");
        const base::ref<base::IPlugin> document = scene.create(scene::scene_schema::n_kind);
        const base::ref<base::IPlugin> root = scene.create(scene::node_schema::n_kind);
        scene::write(*document, scene::scene_schema::n_root) = root;
        scene.attributes().attribute<string>(nameOf("payload")) =
            end == string::npos ? "" : text.substr(end + 4);
        const string commands = text.substr(0, end);
        for (const string_view line : base::split(commands, '\n')) {
            const std::size_t blank = std::min(line.find(' '), line.size());
            const string argument(blank < line.size() ? line.substr(blank + 1) : "");
            if (!obey(line.substr(0, blank), argument, scene, *root))
                return false;
        }
        return true;
    }

private:
    static bool obey(string_view command, const string& argument, base::PluginFactory& scene,
                     base::AttribMap& root) {
        if (command == "import")
            fail(argument);
        else if (command == "export")
            scene.attributes().attribute<string>(nameOf("exporter")) = argument;
        else if (command == "log")
            base::log().log(base::logScene, argument[0] - '0', argument.substr(2));
        else if (command == "object")
            scene::write(*scene.create(nameOf(argument)), scene::node_schema::n_name) =
                "The " + argument;
        else if (command == "mesh")
            addMesh(scene, argument == "broken" ? 9 : 1, root);
        else if (command == "image")
            addImage(scene, argument);
        return command != "refuse";
    }
};

class Exporter final : public scene::SceneExportPlugin {
public:
    using SceneExportPlugin::SceneExportPlugin;

    bool exportScene(base::PluginFactory& scene, const string& path) override {
        base::AttribMap& record = scene.attributes();
        const string* how = record.findAttribute<string>(nameOf("exporter"));
        if (how)
            fail(*how);
        if (how && *how == "nothing")
            return false;
        base::Stream stream;
        base::fs::master().open(stream, path, base::fs::openReplace);
        const string& payload = record.attribute<string>(nameOf("payload"));
        stream.write(payload.data(), payload.size());
        return true;
    }
};

template <class Plugin>
class Desc final : public scene::IScenePluginDesc {
public:
    Desc(const char* name, const char* imports, const char* exports)
        : imports_(imports), exports_(exports) {
        type = nameOf(name);
        info = "acts on command";
    }
    base::IPlugin* create(base::PluginFactory& factory, base::u32 id) override {
        return new Plugin(this, &factory, id);
    }
    const string& importExtensions() const override { return imports_; }
    const string& exportExtensions() const override { return exports_; }

private:
    string imports_, exports_;
};

} // namespace

extern "C" __attribute__((visibility("default"))) base::i32
loadScenePlugin(base::PluginFactory& factory) {
    scene::register_scene_schema(factory);
    scene::register_importer_schema();
    scene::register_exporter_schema();
    factory.registerDesc(base::makeRef<Desc<Importer>>("ScriptImporter", "script", ""));
    factory.registerDesc(base::makeRef<Desc<Exporter>>("ScriptExporter", "", "out;Result|words"));
    return 0;
}

extern "C" __attribute__((visibility("default"))) base::u32 unloadScenePlugin() {
    return 0;
}
