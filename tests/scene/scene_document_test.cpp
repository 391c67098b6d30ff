#include "scene_document.h"

#include "attribute_compare.h"
#include "every_value.h"
#include "log_capture.h"
#include "scene_builder.h"
#include "temp_folder.h"

#include "b_exception.h"
#include "scene_image_record.h"
#include "stream/b_fs.h"

#include <filesystem>
#include <fstream>
#include <gtest/gtest.h>

using namespace test_support;
using scene::fileTexture_schema;

namespace {

std::string readText(const std::filesystem::path& path) {
    std::ifstream file(path, std::ios::binary);
    return {std::istreambuf_iterator<char>(file), {}};
}

void writeText(const std::filesystem::path& path, const std::string& text) {
    std::filesystem::create_directories(path.parent_path());
    std::ofstream(path, std::ios::binary) << text;
}

base::ref<scene::SceneFactory> readBack(const std::string& path) {
    auto document = base::makeRef<scene::SceneFactory>();
    scene::register_scene_schema(*document);
    scene::readSceneDocument(*document, path);
    return document;
}

} // namespace

TEST(SceneDocument, KnowsItsExtensions) {
    const struct {
        const char* path;
        bool isDocument;
    } rows[] = {{"a.scene", true},
                {"dir.x/A.Scene.JSON", true},
                {"a.b.scene", true},
                {"a.json", false},
                {"scene", false},
                {"a.scene/b", false},
                {"a.scene.json.", false},
                {"a.scenes", false},
                {"", false}};
    for (const auto& row : rows)
        EXPECT_EQ(scene::isSceneDocument(row.path), row.isDocument) << row.path;
}

TEST(SceneDocument, KeepsEverythingInBothForms) {
    const TempFolder folder;
    auto document = base::makeRef<scene::SceneFactory>();
    scene::register_scene_schema(*document);
    buildEveryValue(*document);
    for (const char* name : {"a.scene", "a.scene.json"}) {
        scene::writeSceneDocument(*document, folder / name);
        const auto read = readBack(folder / name);
        EXPECT_EQ(firstDifference(*document, *read), "") << name;
        // Written again, the bytes are the same.
        const std::string again = folder / (std::string("b") + name);
        scene::writeSceneDocument(*read, again);
        EXPECT_EQ(readText(folder / name), readText(again)) << name;
    }
}

TEST(SceneDocument, LayersDriveWhatIsReadAsBefore) {
    const TempFolder folder;
    SceneBuilder builder;
    auto& layer = builder.add<scene::IAnimLayer>("layer");
    auto& clip = builder.add<scene::IAnimClip>();
    auto& channel = builder.add<scene::IKeyframeChannel>();
    setKeys<base::vec3d>(channel, {0, 1}, {{0, 0, 0}, {4, 0, 0}});
    write(clip, scene::animClip_schema::n_keyframeChannels).push_back(scene::Object(&channel));
    write(clip, scene::animClip_schema::n_endTime) = secondsToTime(1);
    base::AttribMap& action = appendItem(layer, scene::animLayer_schema::n_actions);
    write(action, scene::animLayerAction_schema::n_animClip) = scene::Object(&clip);
    write(action, scene::animLayerAction_schema::n_playAt) = base::TimeCode{0};
    write(layer, scene::animLayer_schema::n_time) = secondsToTime(0.5);
    base::AttribPath path(layer, scene::animLayer_schema::n_outputs);
    builder.root->attribute(scene::node_schema::n_translate, new base::AttribLink(path.element(0)));
    layer.update({}, -1);
    for (const char* name : {"a.scene", "a.scene.json"}) {
        scene::writeSceneDocument(*builder.factory, folder / name);
        const auto document = readBack(folder / name);
        const auto node = document->plugin(builder.root->id());
        const auto* translate = node->findAttribute<base::vec3d>(scene::node_schema::n_translate);
        ASSERT_NE(translate, nullptr) << name;
        EXPECT_EQ(*translate, (base::vec3d{2, 0, 0})) << name;
    }
}

TEST(SceneDocument, NamesPicturesFromItsFolder) {
    namespace stdfs = std::filesystem;
    const TempFolder folder;
    const auto addTexture = [](SceneBuilder& builder, const std::string& file) {
        base::IPlugin& texture = *builder.factory->create(fileTexture_schema::n_kind);
        write(texture, fileTexture_schema::n_file) = base::string(file);
        return texture.id();
    };
    // One that lies beside the document, one that is nowhere, one by a full path, and two of the
    // same name that only the model held.
    writeText(folder / "work/wood.png", "wood");
    writeText(folder / "held/a/Skin.png", "first");
    writeText(folder / "held/b/skin.png", "second");
    const stdfs::path before = stdfs::current_path();
    stdfs::current_path(folder / "work");
    SceneBuilder builder;
    const base::u32 beside = addTexture(builder, "wood.png"), gone = addTexture(builder, "no.png"),
                    full = addTexture(builder, folder / "work/wood.png"),
                    held = addTexture(builder, folder / "held/a/Skin.png"),
                    other = addTexture(builder, folder / "held/b/skin.png"),
                    shared = addTexture(builder, folder / "held/a/Skin.png");
    for (const base::u32 id : {held, other, shared})
        scene::setPictureSource(*builder.factory->plugin(id), "model.fbx");
    stdfs::create_directory(folder / "out");
    const LogCapture log;
    EXPECT_EQ(scene::writeSceneDocument(*builder.factory, "../out/box.scene.json").size(), 3u);
    stdfs::current_path(before);
    EXPECT_EQ(problems(log), "3 document |no.png| The picture is not there and keeps its name!\n");

    const auto fileOf = [](base::PluginFactory& document, base::u32 id) {
        return *find(*document.plugin(id), fileTexture_schema::n_file);
    };
    EXPECT_EQ(fileOf(*builder.factory, held), std::string(folder / "held/a/Skin.png"));
    stdfs::create_directory(folder / "moved");
    for (const char* name : {"out", "work"})
        stdfs::rename(folder / name, folder / (std::string("moved/") + name));
    stdfs::remove_all(folder / "held");
    const auto document = readBack(folder / "moved/out/box.scene.json");
    EXPECT_EQ(readText(fileOf(*document, beside)), "wood");
    EXPECT_EQ(fileOf(*document, gone), "no.png");
    EXPECT_EQ(readText(fileOf(*document, full)), "wood");
    EXPECT_EQ(readText(folder / "moved/out/box.scene.json.pictures/Skin.png"), "first");
    EXPECT_EQ(readText(fileOf(*document, held)), "first");
    EXPECT_EQ(readText(fileOf(*document, other)), "second");
    EXPECT_EQ(fileOf(*document, shared), fileOf(*document, held));
}

TEST(SceneDocument, RefusesWhatIsNone) {
    const TempFolder folder;
    writeText(folder / "empty.scene", "");
    writeText(folder / "text.scene", "{\"@version\": 1, \"@objects\": []}");
    writeText(folder / "empty.scene.json", "");
    writeText(folder / "cut.scene.json", "{\"@version\": 1, \"@objects\": [{\"@type\": \"node\"}");
    writeText(folder / "later.scene.json", "{\"@version\": 2, \"@objects\": []}");
    SceneBuilder builder;
    scene::writeSceneDocument(*builder.factory, folder / "whole.scene");
    const std::string whole = readText(folder / "whole.scene");
    writeText(folder / "cut.scene", whole.substr(0, whole.size() - 3));
    for (const char* name : {"empty.scene", "text.scene", "cut.scene", "empty.scene.json",
                             "cut.scene.json", "later.scene.json", "missing.scene"}) {
        auto document = base::makeRef<scene::SceneFactory>();
        EXPECT_THROW(scene::readSceneDocument(*document, folder / name), base::exception) << name;
        EXPECT_EQ(document->pluginCount(), 0u) << name;
    }
    EXPECT_THROW(scene::writeSceneDocument(*builder.factory, folder / "none/a.scene"),
                 base::exception);
    if (std::filesystem::exists("/dev/full")) {
        std::filesystem::create_symlink("/dev/full", std::string(folder / "full.scene.json"));
        EXPECT_THROW(scene::writeSceneDocument(*builder.factory, folder / "full.scene.json"),
                     base::exception);
    }
}
