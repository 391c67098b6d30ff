#include "scene_factory.h"

#include "log_capture.h"
#include "scene.h"
#include "temp_folder.h"

#include "b_exception.h"
#include "b_format.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>

namespace {

using base::string;
using namespace test_support;
namespace files = std::filesystem;

/// A folder with the plugins of the test.
struct PluginFolder : TempFolder {
    PluginFolder(std::initializer_list<const char*> plugins, const char* order = nullptr) {
        for (const char* plugin : plugins)
            files::create_symlink(files::path(TEST_PLUGINS) / plugin, *this / plugin);
        if (order)
            std::ofstream(*this / "importers.txt") << order;
    }
};

/// A factory with the plugins of a folder of its own.
struct LoadedPlugins : scene::SceneFactory {
    LoadedPlugins(std::initializer_list<const char*> plugins, const char* order)
        : folder(plugins, order) {
        loadPlugins(folder.path());
    }
    PluginFolder folder;
};

/// A description that lives in the program and makes no object.
class EmptyDesc final : public scene::IScenePluginDesc {
public:
    explicit EmptyDesc(const char* typeText) { type = base::nameServer().id(typeText); }
    base::IPlugin* create(base::PluginFactory&, base::u32) override { return nullptr; }
    const string& importExtensions() const override { return extensions_; }
    const string& exportExtensions() const override { return extensions_; }

private:
    string extensions_ = "tst";
};

string record(base::PluginFactory& factory, const char* name) {
    const auto* text = factory.attributes().findAttribute<string>(base::nameServer().id(name));
    return text ? *text : "";
}
base::u32 number(base::PluginFactory& factory, const char* name) {
    return factory.attributes().attribute<base::u32>(base::nameServer().id(name));
}

base::u32 livingObjects(const base::PluginFactory& factory) {
    base::u32 count = 0;
    for (const auto& object : factory.plugins())
        count += object ? 1 : 0;
    return count;
}

string thrownText(auto&& action) {
    try {
        action();
    } catch (const base::exception& e) {
        return string(e.function()) + ": " + e.what();
    }
    return "";
}

TEST(SceneFactory, LibrariesAreLoadedInOrderAndBadOnesCostALine) {
    const PluginFolder folder({"scene_mute.so", "scene_beta.so", "scene_alpha.so"});
    std::ofstream(folder.path() + "/scene_text.so") << "no library";
    std::ofstream(folder.path() + "/other.so") << "not asked for";
    scene::SceneFactory factory;
    const LogCapture log;
    factory.loadFrom(folder.path());

    EXPECT_TRUE(factory.hasDesc(base::nameServer().id("AlphaPlugin")));
    EXPECT_TRUE(factory.hasDesc(base::nameServer().id("BetaPlugin")));
    string lines;
    for (const auto& entry : log.entries()) {
        EXPECT_EQ(entry.channel, base::logScene);
        if (entry.level != base::logInformation)
            lines += base::format("{} {}\n", entry.level, entry.text);
    }
    string expected = "5 Loading scene plugins from path '@' ...\n"
                      "5 Trying to load '@/scene_alpha.so' as a scene plugin...\n"
                      "5 Trying to load '@/scene_beta.so' as a scene plugin...\n"
                      "5 Trying to load '@/scene_mute.so' as a scene plugin...\n"
                      "2 Failed to load scene plugin '@/scene_mute.so'!\n"
                      "5 Trying to load '@/scene_text.so' as a scene plugin...\n"
                      "2 Failed to load scene plugin '@/scene_text.so'!\n";
    for (std::size_t at = 0; (at = expected.find('@')) != string::npos;)
        expected.replace(at, 1, folder.path());
    EXPECT_EQ(lines, expected);
}

TEST(SceneFactory, OrderFileDecidesBetweenPluginsOfOneExtension) {
    struct Case {
        const char* order;
        const char* winner;
        std::initializer_list<const char*> warnings;
    };
    const Case cases[] = {{"AlphaPlugin\nBetaPlugin\n", "AlphaPlugin", {}},
                          {"BetaPlugin\nAlphaPlugin", "BetaPlugin", {}},
                          {"  BetaPlugin\t\r\n", "BetaPlugin", {}},
                          {"// AlphaPlugin\n\nBetaPlugin // AlphaPlugin\n", "BetaPlugin", {}},
                          {"BetaPlugin\nAlphaPlugin\nBetaPlugin\n", "BetaPlugin", {}},
                          {"Gamma\nnode\nBetaPlugin\n", "BetaPlugin", {"Gamma", "node"}}};
    for (const Case& c : cases) {
        SCOPED_TRACE(c.order);
        const PluginFolder folder({"scene_alpha.so", "scene_beta.so"}, c.order);
        scene::SceneFactory factory;
        const LogCapture log;
        factory.loadPlugins(folder.path());
        EXPECT_TRUE(factory.save(factory, "a.tst", base::AttribMap()));
        EXPECT_EQ(record(factory, "exportedBy"), c.winner);
        string warnings;
        for (const char* name : c.warnings)
            warnings += base::format("3 Can't find mesh importer called '{}'!\n", name);
        EXPECT_EQ(problems(log), warnings);
    }
}

TEST(SceneFactory, ExtensionLists) {
    LoadedPlugins factory({"scene_alpha.so", "scene_beta.so"}, "AlphaPlugin\nBetaPlugin\n");
    EXPECT_EQ(factory.getImporterExtensions(), "tst|Test files;tst;beta");
    EXPECT_EQ(factory.getExporterExtensions(), "tst;tar.gz|packed; TST | Test files ;gz");
    for (const char* extension : {"TST", "Tar.GZ", "gz"})
        EXPECT_TRUE(factory.hasExporter(extension)) << extension;
    for (const char* extension : {"", "ts", "packed", "beta", "tar"})
        EXPECT_FALSE(factory.hasExporter(extension)) << extension;
    EXPECT_TRUE(factory.hasImporter("Beta"));
    EXPECT_FALSE(factory.hasImporter("gz"));
}

TEST(SceneFactory, PathsFindTheirPlugin) {
    LoadedPlugins factory({"scene_alpha.so", "scene_beta.so"}, "BetaPlugin\nAlphaPlugin\n");
    const struct {
        const char *path, *plugin;
    } cases[] = {
        {"/some.folder/scene.tst", "BetaPlugin"},
        {"scene.TsT", "BetaPlugin"},
        {"my.scene.tst", "BetaPlugin"},
        {"scene.tar.gz", "AlphaPlugin"}, // the longer extension first, whoever is first in order
        {"scene.TAR.GZ", "AlphaPlugin"},
        {"my.scene.gz", "BetaPlugin"},
        {"my.scene.tar.gz", "BetaPlugin"}, // long is "scene.tar.gz", which nobody lists
        {"scene.beta", ""},
        {"scene.unknown", ""}};
    for (const auto& c : cases) {
        SCOPED_TRACE(c.path);
        factory.attributes().clear();
        base::AttribMap parameters;
        const bool known = c.plugin[0] != '\0';
        EXPECT_EQ(factory.getExporterParameters(c.path, parameters), known);
        EXPECT_EQ(parameters.size() != 0, known);
        EXPECT_EQ(factory.save(factory, c.path, parameters), known);
        EXPECT_EQ(record(factory, "exportedBy"), c.plugin);
        EXPECT_EQ(livingObjects(factory), 0u);
    }
}

TEST(SceneFactory, PathsWithoutExtensionThrow) {
    LoadedPlugins factory({"scene_alpha.so"}, "");
    base::AttribMap parameters;
    for (const string path : {"scene", "/a.tst/scene", "scene."}) {
        SCOPED_TRACE(path);
        EXPECT_EQ(thrownText([&] { factory.getImporterParameters(path, parameters); }),
                  "scene::SceneFactory::getImporterParameters: "
                  "mesh factory: Can't load meshes without an extension!");
        EXPECT_EQ(thrownText([&] { factory.getExporterParameters(path, parameters); }),
                  "scene::SceneFactory::getExporterParameters: "
                  "mesh factory: Can't save meshes without an extension!");
        EXPECT_EQ(thrownText([&] { factory.load(factory, path, parameters); }),
                  "scene::SceneFactory::load: mesh factory|" + path +
                      "| Can't load meshes without an extension!");
        EXPECT_EQ(thrownText([&] { factory.save(factory, path, parameters); }),
                  "scene::SceneFactory::save: "
                  "mesh factory: Can't save meshes without a provided format!");
    }
}

TEST(SceneFactory, SettingsReachThePluginAndResultsTheCaller) {
    LoadedPlugins factory({"scene_alpha.so"}, "");
    base::PluginFactory document("document");
    scene::register_scene_schema(document);
    document.create(scene::node_schema::n_kind);
    document.create(scene::light_schema::n_kind);

    base::AttribMap parameters;
    ASSERT_TRUE(factory.getExporterParameters("a.tst", parameters));
    EXPECT_TRUE(factory.save(document, "a.tst", parameters));
    EXPECT_EQ(number(document, "maxDim"), 4096u);
    EXPECT_EQ(number(document, "nodes"), 1u);
    parameters.attribute<base::u32>(scene::sceneExporter_schema::n_exportImageMaxDim) = 77;
    EXPECT_FALSE(factory.save(document, "nothing.tst", parameters));
    EXPECT_EQ(number(document, "maxDim"), 77u);
    EXPECT_THROW(factory.save(document, "throw.tst", parameters), base::exception);
    EXPECT_THROW(factory.load(document, "throw.tst", parameters), base::exception);
    EXPECT_FALSE(factory.load(document, "notalpha.tst", parameters));
    EXPECT_EQ(livingObjects(document), 2u);
}

TEST(SceneFactory, ImportersMayRefuseAFile) {
    LoadedPlugins factory({"scene_alpha.so", "scene_beta.so"}, "AlphaPlugin\nBetaPlugin\n");
    base::AttribMap parameters;
    EXPECT_TRUE(factory.load(factory, "any.tst", parameters));
    EXPECT_EQ(record(factory, "importedBy"), "AlphaPlugin");
    EXPECT_TRUE(factory.load(factory, "notalpha.tst", parameters));
    EXPECT_EQ(record(factory, "importedBy"), "BetaPlugin");
    EXPECT_FALSE(factory.load(factory, "notalpha.notbeta.tst", parameters));

    parameters.attribute<bool>(scene::sceneImporter_schema::n_importMeshes) = false;
    EXPECT_FALSE(factory.load(factory, "any.tst", parameters)) << "the plugin's own result";

    // Only a file that exists is shown to the importer.
    base::AttribMap settings;
    EXPECT_TRUE(factory.getImporterParameters("notalpha.notbeta.tst", settings));
    EXPECT_NE(settings.size(), 0u);
    const string refused = factory.folder.path() + "/notalpha.notbeta.tst";
    std::ofstream(refused) << "there";
    EXPECT_FALSE(factory.getImporterParameters(refused, settings));
}

TEST(SceneFactory, RegisteredDescriptionsNeedNoDiscovery) {
    scene::SceneFactory factory;
    factory.registerDesc(base::makeRef<EmptyDesc>("A1"));
    EXPECT_TRUE(factory.hasExporter("tst"));
    EXPECT_FALSE(factory.save(factory, "a.tst", base::AttribMap())) << "it can't export";
    EXPECT_EQ(livingObjects(factory), 0u);

    // A plugin whose object is null is passed over.
    const PluginFolder folder({"scene_alpha.so"}, "A1\nAlphaPlugin\n");
    factory.loadPlugins(folder.path());
    EXPECT_TRUE(factory.save(factory, "a.tst", base::AttribMap()));
    EXPECT_EQ(record(factory, "exportedBy"), "AlphaPlugin");
}

TEST(SceneFactory, ObjectsOutliveTheirPlugin) {
    const PluginFolder folder({"scene_alpha.so"}, "");
    const base::name_id type = base::nameServer().id("AlphaPlugin");
    base::ref<base::IPlugin> object;
    {
        scene::SceneFactory factory;
        factory.loadPlugins(folder.path());
        object = factory.create(type, base::createNoDummy);
        ASSERT_TRUE(object);
        object->attribute<string>(base::nameServer().id("note")) = "kept";

        factory.unloadPlugins();
        EXPECT_FALSE(factory.hasDesc(type));
        EXPECT_FALSE(factory.hasExporter("tst"));
        EXPECT_NE(object->queryInterface(scene::ISceneExporter::interfaceName()), nullptr);

        factory.loadPlugins(folder.path());
        EXPECT_TRUE(factory.save(factory, "a.tst", base::AttribMap()));
    }
    EXPECT_EQ(object->typeName(), type);
    EXPECT_EQ(*object->findAttribute<string>(base::nameServer().id("note")), "kept");
}

} // namespace
