#include "scene_factory.h"

#include "scene.h"

#include "b_exception.h"
#include "b_format.h"
#include "b_string_convert.h"
#include "stream/b_fs.h"

#include <algorithm>

namespace scene {

namespace {

/// An object of a plugin, listed in the factory for the time of one call.
class TemporaryObject : public base::NonCopyable {
public:
    TemporaryObject(base::PluginFactory& factory, base::IPluginDesc& desc)
        : factory_(factory), object_(desc.create(factory, factory.pluginCount())) {
        if (object_)
            factory_.addPlugin(object_);
    }
    ~TemporaryObject() {
        if (!object_)
            return;
        const base::u32 id = object_->id();
        object_.reset(); // so that the factory sees that nobody refers to it
        factory_.remove(id, false);
    }
    base::IPlugin* get() const { return object_.get(); }

private:
    base::PluginFactory& factory_;
    base::ref<base::IPlugin> object_;
};

bool listHas(const base::string& list, base::string_view lowerCaseExtension) {
    for (base::string_view entry : base::split(list, ';')) {
        entry = base::trimmed(entry.substr(0, entry.find('|')));
        if (!entry.empty() && base::toLower(entry) == lowerCaseExtension)
            return true;
    }
    return false;
}

} // namespace

base::name_id ISceneImporter::interfaceName() {
    static const base::name_id name = base::nameServer().id("ISceneImporter");
    return name;
}

base::name_id ISceneExporter::interfaceName() {
    static const base::name_id name = base::nameServer().id("ISceneExporter");
    return name;
}

base::IPluginInterface* SceneImportPlugin::queryInterface(base::name_id name) {
    return name == ISceneImporter::interfaceName() ? this : base::IPlugin::queryInterface(name);
}

void SceneImportPlugin::getParameters(base::AttribMap& parameters) {
    fillImporterDefaults(parameters);
}

base::IPluginInterface* SceneExportPlugin::queryInterface(base::name_id name) {
    return name == ISceneExporter::interfaceName() ? this : base::IPlugin::queryInterface(name);
}

void SceneExportPlugin::fillDefaults(base::AttribMap& parameters) {
    fillExporterDefaults(parameters);
}

SceneFactory::SceneFactory(base::string name) : base::PluginFactory(std::move(name)) {
    register_scene_schema(*this);
    register_importer_schema();
    register_exporter_schema();
    register_viewport_schema(*this);
}

SceneFactory::~SceneFactory() {
    unloadPlugins();
}

SceneFactory::Descs SceneFactory::searchOrder() const {
    Descs order = handlers_;
    for (const auto& [type, desc] : descs()) {
        auto* plugin = dynamic_cast<IScenePluginDesc*>(desc.get());
        if (plugin && std::find(handlers_.begin(), handlers_.end(), plugin) == handlers_.end())
            order.push_back(plugin);
    }
    return order;
}

SceneFactory::Descs SceneFactory::findPlugins(ExtensionList list,
                                              base::string_view extension) const {
    const base::string wanted = base::toLower(extension);
    Descs found;
    for (const base::ref<IScenePluginDesc>& desc : searchOrder()) {
        if (listHas((desc.get()->*list)(), wanted))
            found.push_back(desc);
    }
    return found;
}

base::string SceneFactory::joinedExtensions(ExtensionList list) const {
    base::string joined;
    for (const base::ref<IScenePluginDesc>& desc : searchOrder()) {
        const base::string& extensions = (desc.get()->*list)();
        if (!joined.empty() && !extensions.empty())
            joined += ';';
        joined += extensions;
    }
    return joined;
}

base::string SceneFactory::getImporterExtensions() const {
    return joinedExtensions(&IScenePluginDesc::importExtensions);
}

base::string SceneFactory::getExporterExtensions() const {
    return joinedExtensions(&IScenePluginDesc::exportExtensions);
}

bool SceneFactory::hasImporter(base::string_view extension) const {
    return !findPlugins(&IScenePluginDesc::importExtensions, extension).empty();
}

bool SceneFactory::hasExporter(base::string_view extension) const {
    return !findPlugins(&IScenePluginDesc::exportExtensions, extension).empty();
}

/// Calls `use(interface, object)` with an object of each plugin for `path`, the best first, until
/// one answers true, which tells that it took the job. False if none did. Throws `complaint` in
/// the name of `function` for a path without extension.
template <class Interface, class Use>
bool SceneFactory::withPlugin(ExtensionList list, const base::string& path,
                              const base::string& complaint, const char* function, Use use) {
    constexpr base::u32 fromFirstDot = 0xffffffffu, fromLastDot = 0;
    base::string previous;
    for (const base::u32 dot : {fromFirstDot, fromLastDot}) {
        const base::string extension = base::toLower(base::fs::extension(path, dot));
        if (extension.empty())
            throw base::exception(complaint, "scene_factory", function, __LINE__);
        if (extension == previous)
            continue;
        previous = extension;
        for (const base::ref<IScenePluginDesc>& desc : findPlugins(list, extension)) {
            const TemporaryObject object(*this, *desc);
            auto* interface = object.get() ? findInterface<Interface>(*object.get()) : nullptr;
            if (interface && use(*interface, *object.get()))
                return true;
        }
    }
    return false;
}

bool SceneFactory::getImporterParameters(const base::string& path, base::AttribMap& parameters) {
    const bool exists = base::fs::master().exists(path);
    const auto use = [&](ISceneImporter& importer, base::IPlugin&) {
        if (exists && !importer.canLoad(path))
            return false;
        importer.getParameters(parameters);
        return true;
    };
    return withPlugin<ISceneImporter>(&IScenePluginDesc::importExtensions, path,
                                      "mesh factory: Can't load meshes without an extension!",
                                      "scene::SceneFactory::getImporterParameters", use);
}

bool SceneFactory::getExporterParameters(const base::string& path, base::AttribMap& parameters) {
    const auto use = [&](ISceneExporter& exporter, base::IPlugin&) {
        exporter.fillDefaults(parameters);
        return true;
    };
    return withPlugin<ISceneExporter>(&IScenePluginDesc::exportExtensions, path,
                                      "mesh factory: Can't save meshes without an extension!",
                                      "scene::SceneFactory::getExporterParameters", use);
}

bool SceneFactory::load(base::PluginFactory& scene, const base::string& path,
                        const base::AttribMap& parameters) {
    bool loaded = false;
    const auto use = [&](ISceneImporter& importer, base::IPlugin& object) {
        if (!importer.canLoad(path))
            return false;
        object.assign(parameters, base::assignAdopt);
        loaded = importer.load(scene, path);
        return true;
    };
    withPlugin<ISceneImporter>(
        &IScenePluginDesc::importExtensions, path,
        base::format("mesh factory|{}| Can't load meshes without an extension!", path),
        "scene::SceneFactory::load", use);
    return loaded;
}

bool SceneFactory::save(base::PluginFactory& sceneObjects, const base::string& path,
                        const base::AttribMap& parameters) {
    bool saved = false;
    const auto use = [&](ISceneExporter& exporter, base::IPlugin& object) {
        object.assign(parameters, base::assignAdopt);
        saved = exporter.exportScene(sceneObjects, path);
        return true;
    };
    withPlugin<ISceneExporter>(&IScenePluginDesc::exportExtensions, path,
                               "mesh factory: Can't save meshes without a provided format!",
                               "scene::SceneFactory::save", use);
    return saved;
}

} // namespace scene
