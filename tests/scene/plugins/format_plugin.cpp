// A plugin for test files. What it does shows in the attributes of the factory it works on.
#include "scene.h"
#include "scene_factory.h"

#include "b_exception.h"

namespace {

using base::string;

constexpr bool isAlpha = PLUGIN_ALPHA != 0;

bool says(const string& path, const char* word) {
    return path.find(word) != string::npos;
}

class Format final : public scene::SceneExportPlugin, public scene::ISceneImporter {
public:
    using SceneExportPlugin::SceneExportPlugin;

    base::IPluginInterface* queryInterface(base::name_id name) override {
        if (name == ISceneImporter::interfaceName())
            return static_cast<ISceneImporter*>(this);
        return SceneExportPlugin::queryInterface(name);
    }

    bool exportScene(base::PluginFactory& sceneObjects, const string& path) override {
        if (says(path, "throw"))
            throw base::exception("thrown by the plugin");
        bindSettings(*this);
        base::AttribMap& record = sceneObjects.attributes();
        record.attribute<string>(base::nameServer().id("exportedBy")) = typeName().text();
        record.attribute<base::u32>(base::nameServer().id("maxDim")) = exportImageMaxDim;
        // The scene's objects are made by the program's own copy of the classes.
        base::u32 nodes = 0;
        for (const auto& object : sceneObjects.plugins())
            nodes += dynamic_cast<scene::INode*>(object.get()) ? 1 : 0;
        record.attribute<base::u32>(base::nameServer().id("nodes")) = nodes;
        return !says(path, "nothing");
    }

    bool canLoad(const string& path) override {
        return !says(path, isAlpha ? "notalpha" : "notbeta");
    }
    void getParameters(base::AttribMap& parameters) override {
        scene::fillImporterDefaults(parameters);
    }
    bool load(base::PluginFactory& scene, const string& path) override {
        if (says(path, "throw"))
            throw base::exception("thrown by the plugin");
        scene.attributes().attribute<string>(base::nameServer().id("importedBy")) =
            typeName().text();
        return scene::read(*this, scene::sceneImporter_schema::n_importMeshes);
    }
};

class Desc final : public scene::IScenePluginDesc {
public:
    Desc() { type = base::nameServer().id(isAlpha ? "AlphaPlugin" : "BetaPlugin"); }
    base::IPlugin* create(base::PluginFactory& factory, base::u32 id) override {
        return new Format(this, &factory, id);
    }
    const string& importExtensions() const override { return imports_; }
    const string& exportExtensions() const override { return exports_; }

private:
    string imports_ = isAlpha ? "tst|Test files" : "tst;beta";
    string exports_ = isAlpha ? "tst;tar.gz|packed" : " TST | Test files ;gz";
};

} // namespace

extern "C" __attribute__((visibility("default"))) base::i32
loadScenePlugin(base::PluginFactory& factory) {
    scene::register_scene_schema(factory);
    scene::register_viewport_schema(factory);
    scene::register_importer_schema();
    scene::register_exporter_schema();
    factory.registerDesc(base::makeRef<Desc>());
    return 0;
}

extern "C" __attribute__((visibility("default"))) base::u32 unloadScenePlugin() {
    return 0;
}
