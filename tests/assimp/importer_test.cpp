#include "import_fixture.h"

#include "b_string_convert.h"

namespace {

using namespace scene;
using namespace test_support;
using base::string;

const char* const triangle = "v 0 0 0\nv 1 0 0\nv 0 1 0\nf 1 2 3\n";

class Importer : public Import {
protected:
    ISceneImporter& importer() {
        object_ = importers_.create(base::nameServer().id("AssimpImporter"));
        return *findInterface<ISceneImporter>(*object_);
    }
    base::ref<base::IPlugin> object_;
};

TEST_F(Importer, ListsTheLibrarysFormatsButGltf) {
    const string list = importers_.getImporterExtensions();
    for (const auto extension : base::split(list, ';')) {
        EXPECT_FALSE(extension.empty());
        EXPECT_EQ(extension.find_first_of("* "), string::npos) << extension;
    }
    for (const char* extension : {"obj", "fbx", "dae", "ply", "stl", "3ds", "x", "off", "blend"})
        EXPECT_TRUE(importers_.hasImporter(extension)) << extension;
    for (const char* extension : {"gltf", "glb", "assbin", "bvh", "", "png"})
        EXPECT_FALSE(importers_.hasImporter(extension)) << extension;
    EXPECT_EQ(importers_.getExporterExtensions(), "");
}

TEST_F(Importer, LoadsFilesThatExistAndHaveAReader) {
    EXPECT_TRUE(importer().canLoad(write("A b.OBJ", triangle)));
    EXPECT_TRUE(importer().canLoad(write("v1.2.mesh.xml", "")));
    EXPECT_FALSE(importer().canLoad(write("notes.txt", triangle)));
    EXPECT_FALSE(importer().canLoad(write("obj", triangle)));
    EXPECT_FALSE(importer().canLoad((folder_ / "missing.obj").string()));
}

TEST_F(Importer, UnicodeAndBlanksInNames) {
    std::filesystem::create_directory(folder_ / "ein Ordner ü");
    ASSERT_TRUE(load("ein Ordner ü/Größe 1 модель 😀.obj",
                     "mtllib Stoffe à la carte.mtl\no Würfel_1\n" + string(triangle)));
    EXPECT_EQ(only(scene_schema::n_kind).getName(), "Größe 1 модель 😀");
    EXPECT_EQ(mesh().getName(), "Würfel_1");
}

TEST_F(Importer, FilesThatCannotBeReadGiveOneErrorAndNothingElse) {
    const struct {
        const char* name;
        string text;
    } cases[] = {
        {"empty.stl", ""},
        {"empty.obj", ""},
        {"cut.dae", "<COLLADA"},
        {"cut.fbx", string("Kaydara FBX Binary  \0\x1a\0\xff\x1c\0\0", 27)},
        {"text.ply", "This is no model, but some text that is long enough for a header."},
        {"cut.ply", "ply\nformat ascii 1.0\ncomment end_header\nelement vertex 3\nprop"},
        {"old.fbx", "; FBX 6.1.0 project file\nFBXHeaderExtension:  {\nFBXVersion: 6100\n}\n"},
        {"text.3ds", "This is no model."},
        {"text.x3d", "hello\n"}};
    for (const auto& c : cases) {
        SCOPED_TRACE(c.name);
        const string path = write(c.name, c.text);
        LogCapture log;
        testing::internal::CaptureStdout();
        testing::internal::CaptureStderr();
        const bool loaded = loadPath(path);
        EXPECT_EQ(testing::internal::GetCapturedStdout(), "");
        EXPECT_EQ(testing::internal::GetCapturedStderr(), "");
        EXPECT_FALSE(loaded);
        EXPECT_EQ(document_->pluginCount(), 0u);
        const string start = "2 assimp |" + path + "| Unable to read the file: ";
        EXPECT_TRUE(problems(log).starts_with(start)) << problems(log);
        EXPECT_GT(problems(log).size(), start.size() + 1);
        EXPECT_EQ(std::ranges::count(problems(log), '\n'), 1);
    }
}

TEST_F(Importer, MessagesOfTheLibraryAreForDebugging) {
    const string path = write("model.obj", "mtllib missing.mtl\n" + string(triangle));
    set(Settings::n_importMaterials, false);
    LogCapture log;
    ASSERT_TRUE(loadPath(path));
    bool found = false;
    for (const auto& entry : log.entries()) {
        EXPECT_EQ(entry.level, base::logDebug) << entry.text;
        found |= entry.text.find("missing.mtl") != string::npos;
    }
    EXPECT_TRUE(found);
    log.take();
    base::log().setLevelLimit(base::logInformation);
    ASSERT_TRUE(loadPath(path));
    EXPECT_TRUE(log.entries().empty());
}

TEST_F(Importer, MissingMaterialFilesAreWarnedOfOnce) {
    const string path =
        write("model.obj", "mtllib missing.mtl\nv 0 0 0\nv 1 0 0\nv 0 1 0\nusemtl a\nf 1 2 3\n");
    LogCapture log;
    ASSERT_TRUE(loadPath(path));
    const string start = "3 assimp |" + path + "| OBJ: ";
    EXPECT_EQ(problems(log), start + "Unable to locate material file missing.mtl\n" + start +
                                 "failed to locate material a, creating new material\n");
}

TEST_F(Importer, ErrorsThatTheLibraryGoesOnAfterAreWarnings) {
    const string path = write("model.off", "OFF\n3 2 0\n0 0 0\n1 0 0\n0 1 0\n3 0 1 2\n3 0 1 77\n");
    LogCapture log;
    base::log().setLevelLimit(base::logWarning);
    ASSERT_TRUE(loadPath(path));
    ASSERT_EQ(log.entries().size(), 1u);
    const string& text = log.entries()[0].text;
    EXPECT_TRUE(text.starts_with("assimp |" + path + "| ")) << text;
    EXPECT_NE(text.find("index is out of range"), string::npos) << text;
}

} // namespace
