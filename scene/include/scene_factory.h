#pragma once

#include "b_factory.h"
#include "scene_config.h"
#include "scene_options.h"

/// The scene document, the plugins that read and write it as files, and their discovery.
///
/// A plugin is a library called "scene_*" with the system's suffix that exports, with C linkage,
///
///     i32 loadScenePlugin(base::PluginFactory& factory);  // registers its descriptions
///     u32 unloadScenePlugin();
///
/// Its code stays in memory to the end of the process, since objects and descriptions that it
/// made may outlive any unloading. Classes here are told across libraries by the names of their
/// types, which works however each library hides its symbols.
namespace scene {

/// Describes a plugin for scene files.
class SCENE_API IScenePluginDesc : public base::IPluginDesc {
public:
    /// What the plugin reads and writes: entries separated by ";", each an extension without
    /// dot, perhaps with "|" and a label behind. Case and blanks around an entry do not count.
    /// Empty for nothing. The text lives as long as the description.
    virtual const base::string& importExtensions() const = 0;
    virtual const base::string& exportExtensions() const = 0;
};

/// Reads files. An object serves one import; its settings are its attributes.
class SCENE_API ISceneImporter : public base::IPluginInterface {
public:
    static base::name_id interfaceName(); ///< "ISceneImporter"
    base::name_id name() const override { return interfaceName(); }

    /// Whether the file, whose extension fits, is of a kind that this importer reads.
    virtual bool canLoad(const base::string& path) = 0;
    /// Sets the settings that this importer knows to their defaults in `parameters`.
    virtual void getParameters(base::AttribMap& parameters) = 0;
    /// Adds what the file holds to `scene`. False if that failed; may throw `base::exception`.
    virtual bool load(base::PluginFactory& scene, const base::string& path) = 0;
};

/// Writes files. An object serves one export; its settings are its attributes.
class SCENE_API ISceneExporter : public base::IPluginInterface, public sceneExporter_schema {
public:
    static base::name_id interfaceName(); ///< "ISceneExporter"
    base::name_id name() const override { return interfaceName(); }

    /// Sets the settings to their defaults in `parameters`; leaves the exporter as it is.
    virtual void fillDefaults(base::AttribMap& parameters) = 0;
    /// Writes the scene among `sceneObjects` to `path`. False if there is nothing to write.
    virtual bool exportScene(base::PluginFactory& sceneObjects, const base::string& path) = 0;
};

/// Base of importers.
class SCENE_API SceneImportPlugin : public base::IPlugin,
                                    public ISceneImporter,
                                    public sceneImporter_schema {
public:
    using base::IPlugin::IPlugin;
    base::IPluginInterface* queryInterface(base::name_id name) override;
    void getParameters(base::AttribMap& parameters) override;
};

/// Base of exporters.
class SCENE_API SceneExportPlugin : public base::IPlugin, public ISceneExporter {
public:
    using base::IPlugin::IPlugin;
    base::IPluginInterface* queryInterface(base::name_id name) override;
    void fillDefaults(base::AttribMap& parameters) override;
};

/// A document with the scene schema registered, and the plugins that read and write files.
///
/// A file belongs to the first plugin that lists its extension. The extension from the first dot
/// of the file name is tried before that from the last dot ("tar.gz" before "gz"); capitals count
/// as small letters. Plugins that "importers.txt" names come first, in its order, then the other
/// registered ones, discovered or not. Objects made for a call are removed again however it ends.
/// What plugins throw reaches the caller.
class SceneFactory : public base::PluginFactory {
public:
    explicit SceneFactory(base::string name = {});
    ~SceneFactory() override;

    /// Unloads all plugins, loads those in `directory` (empty: the folder of the running
    /// program), and orders them by the file "importers.txt" there: one type name a line, "//"
    /// begins a comment. Faults are logged.
    void loadPlugins(const base::string& directory = {});
    /// Loads the plugins in `directory`, sorted by file name. Faults are logged.
    void loadFrom(const base::string& directory);
    /// Forgets the loaded plugins. One whose objects are still alive is not told.
    void unloadPlugins();

    /// The lists of all plugins, joined with ";".
    base::string getImporterExtensions() const;
    base::string getExporterExtensions() const;
    /// Whether a plugin lists the extension, given without dot.
    bool hasImporter(base::string_view extension) const;
    bool hasExporter(base::string_view extension) const;

    /// Sets the settings of the plugin for `path` to their defaults in `parameters`. False if
    /// there is no plugin. The file need not exist; an importer is asked about one that does.
    /// Throws `base::exception` for a path without extension, as do the two below.
    bool getImporterParameters(const base::string& path, base::AttribMap& parameters);
    bool getExporterParameters(const base::string& path, base::AttribMap& parameters);

    /// Reads the file into `scene` with `parameters` as settings. False if no plugin takes the
    /// file or the one that does fails.
    bool load(base::PluginFactory& scene, const base::string& path,
              const base::AttribMap& parameters);
    /// Writes the scene among `sceneObjects`. False if no plugin writes such files or the first
    /// one that does finds nothing to write.
    bool save(base::PluginFactory& sceneObjects, const base::string& path,
              const base::AttribMap& parameters);

    /// Settings of the factory itself.
    base::AttribMap& settings() noexcept { return settings_; }

private:
    using Descs = base::vector<base::ref<IScenePluginDesc>>;
    using ExtensionList = const base::string& (IScenePluginDesc::*)() const;
    struct Library {
        void* handle;
        base::vector<base::ref<base::IPluginDesc>> descs; ///< what it registered
    };

    Descs searchOrder() const;
    Descs findPlugins(ExtensionList list, base::string_view extension) const;
    base::string joinedExtensions(ExtensionList list) const;
    template <class Interface, class Use>
    bool withPlugin(ExtensionList list, const base::string& path, const base::string& complaint,
                    const char* function, Use use);
    void loadLibrary(const base::string& path);
    void orderHandlers(const base::string& listPath);

    base::AttribMap settings_;
    base::vector<Library> libraries_;
    Descs handlers_; ///< those that the order file names
};

} // namespace scene
