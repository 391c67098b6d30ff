#include "fbx_text.h"
#include "material_fixture.h"

#include "assimp/embedded_textures.h"
#include "assimp/picture_folder.h"
#include "b_base64.h"
#include "b_exception.h"

#include <assimp/texture.h>

namespace {

using namespace scene;
using namespace test_support;
using base::string;
using Schema = principalMaterial_schema;

class Textures : public MaterialFixture {};

TEST_F(Textures, AreSearchedForInOrder) {
    std::filesystem::create_directories(folder_ / "models");
    std::filesystem::create_directories(folder_ / "models/folder.png");
    const string elsewhere = (folder_ / "far/abs.png").string();
    const struct {
        string path;
        const char* expected;              ///< the file that is found
        std::vector<const char*> others{}; ///< that come later
    } cases[] = {
        {"a.png", "models/a.png", {"models/textures/a.png", "far/a.png", "models/A.PNG"}},
        {"b.png", "models/textures/b.png", {"models/images/b.png", "textures/b.png"}},
        {"c.png", "textures/c.png", {"far/c.png"}},
        {"d.png", "far/d.png", {"models/D.png"}},
        {"sub/e.png", "models/sub/e.png", {"models/e.png"}},
        {"sub/f.png", "models/f.png", {"far/sub/f.png"}},
        {"sub/g.png", "far/sub/g.png", {"far/g.png"}},
        {"..\\sib\\h.png", "sib/h.png", {"models/h.png"}},
        {".\\i.png  ", "models/i.png"},
        {elsewhere, "far/abs.png", {"models/abs.png"}},
        {"C:\\Users\\me\\j k.png", "models/j k.png"},
        {"\"k.png\"", "models/k.png"},
        {"file://l.png", "models/l.png"},
        {"m%20n%.png", "models/m n%.png"},
        {"o%20p.png", "models/o%20p.png", {"models/o p.png"}},
        {"Q.Jpg", "models/q.JPG"},
        {"folder.png", "models/textures/folder.png"},
    };
    for (const auto& c : cases) {
        touch(c.expected);
        for (const char* other : c.others)
            touch(other);
    }
    settings_.vecAttribute<string>(sceneExporter_schema::n_resourcePaths) = {
        (folder_ / "none").string(), (folder_ / "far").string()};
    for (const auto& c : cases) {
        SCOPED_TRACE(c.path);
        write("models/m.mtl", "newmtl m\nmap_Kd " + c.path + "\n");
        LogCapture log;
        ASSERT_TRUE(load("models/m.obj", "mtllib m.mtl\nv 0 0 0\nv 1 0 0\nv 0 1 0\nvt 0 0\no part\n"
                                         "usemtl m\nf 1/1 2/1 3/1\n"));
        EXPECT_EQ(fileOf(Schema::n_colorMap), c.expected);
        EXPECT_EQ(problems(log), "");
    }
}

TEST_F(Textures, MissingOnesAreWarnedOfOnceAndLeftOut) {
    write("two.mtl", "newmtl a\nKd 1 0 0\nmap_Kd x\\gone.png\nmap_Ke x\\gone.png\n"
                     "newmtl b\nmap_Kd x\\gone.png\n");
    LogCapture log;
    ASSERT_TRUE(load("two.obj", "mtllib two.mtl\nv 0 0 0\nv 1 0 0\nv 0 1 0\nvt 0 0\no part\n"
                                "usemtl a\nf 1/1 2/1 3/1\nusemtl b\nf 3/1 2/1 1/1\n"));
    EXPECT_TRUE(objects(fileTexture_schema::n_kind).empty());
    const string text = problems(log), at = folder_.string();
    EXPECT_EQ(std::ranges::count(text, '\n'), 1) << text;
    EXPECT_TRUE(
        text.starts_with("3 assimp |a| Unable to find the texture 'x\\gone.png', it is left "
                         "out! Tried: " +
                         at + "/x/gone.png, " + at + "/gone.png, " + at + "/textures/gone.png, "))
        << text;
}

TEST_F(Textures, EqualOnesAreOneObject) {
    touch("c.png");
    write("four.mtl", "newmtl a\nmap_Kd c.png\nmap_Ke ./c.png\nnewmtl b\nmap_Kd c.png\n"
                      "newmtl c\nmap_Kd -clamp on c.png\nnewmtl d\nmap_Kd c.png\nmap_Pr c.png\n");
    ASSERT_TRUE(load("four.obj", "mtllib four.mtl\nv 0 0 0\nv 1 0 0\nv 0 1 0\nvt 0 0\n"
                                 "o a\nusemtl a\nf 1/1 2/1 3/1\no b\nusemtl b\nf 1/1 2/1 3/1\n"
                                 "o c\nusemtl c\nf 1/1 2/1 3/1\no d\nusemtl d\nf 1/1 2/1 3/1\n"));
    const auto materials = objects(Schema::n_kind);
    ASSERT_EQ(materials.size(), 4u);
    const auto map = [&](std::size_t i, const SchemaAttribute<Object>& attribute) {
        return findObject(*materials[i], attribute);
    };
    const base::IPlugin* shared = map(0, Schema::n_colorMap);
    ASSERT_TRUE(shared);
    EXPECT_EQ(map(0, Schema::n_emissionMap), shared);
    EXPECT_EQ(map(1, Schema::n_colorMap), shared);
    EXPECT_EQ(map(3, Schema::n_colorMap), shared);
    EXPECT_EQ(objects(fileTexture_schema::n_kind).size(), 3u); // that, clamped, one channel
    EXPECT_EQ(read(*map(2, Schema::n_colorMap), texture_schema::n_wrapModeU), 2);
    EXPECT_EQ(read(*map(2, Schema::n_colorMap), texture_schema::n_wrapModeV), 2);
}

TEST_F(Textures, EmbeddedOnesAreFilesAsLongAsTheScene) {
    FbxText fbx;
    fbx.addMaterial("");
    touch("brick.jpg");
    const string jpeg = textOf(folder_ / "brick.jpg");
    string text(base::base64Length(jpeg.size()), '\0');
    base::base64Encode(reinterpret_cast<const base::u8*>(jpeg.data()), jpeg.size(), text.data());
    fbx.addTexture(50, "C:\\\\art\\\\brick.bin", "DiffuseColor", "", text);
    const string path = write("m.fbx", fbx.text());
    // As programs do it: one document for plugins and scene.
    document_ = std::make_unique<SceneFactory>();
    assimp::registerPlugin(*document_);
    ASSERT_TRUE(document_->load(*document_, path, settings_));
    const base::IPlugin* map = texture(Schema::n_colorMap);
    ASSERT_TRUE(map);
    const std::filesystem::path file = *find(*map, fileTexture_schema::n_file);
    EXPECT_EQ(file.filename(), "brick.jpg");
    EXPECT_EQ(textOf(file), jpeg);
    document_.reset();
    EXPECT_FALSE(std::filesystem::exists(file.parent_path()));
}

TEST_F(Textures, EmbeddedOnesGiveTheirFilesNames) {
    touch("a.jpg");
    const string jpeg = textOf(folder_ / "a.jpg");
    const struct {
        const char* name;
        const char* path;
        const char* hint;
        const char* expected;
    } cases[] = {
        {"", "*3", "jpg", "texture3.jpg"},
        {"", "*4", "", "texture4.jpg"},
        {"../..\\evil\x01.png", "*0", "", "evil.jpg"},
        {"evil.jpg", "*0", "", "evil_2.jpg"},
        {"EVIL.JPG", "*0", "png", "EVIL_3.jpg"},
        {"..", "*0", "../x", "..jpg"},
    };
    const base::ref<assimp::PictureFolder> folder = base::makeRef<assimp::PictureFolder>();
    for (const auto& c : cases) {
        SCOPED_TRACE(c.expected);
        aiTexture texture;
        texture.mFilename = c.name;
        std::strcpy(texture.achFormatHint, c.hint);
        texture.mWidth = static_cast<unsigned>(jpeg.size());
        texture.pcData = new aiTexel[jpeg.size() / sizeof(aiTexel) + 1];
        std::memcpy(static_cast<void*>(texture.pcData), jpeg.data(), jpeg.size());
        const std::filesystem::path path = assimp::writeEmbedded(texture, c.path, *folder);
        EXPECT_EQ(textOf(path), jpeg);
        EXPECT_EQ(path.filename(), c.expected);
    }
}

TEST(EmbeddedTextures, BrokenOnesThrow) {
    const base::ref<assimp::PictureFolder> folder = base::makeRef<assimp::PictureFolder>();
    const struct {
        unsigned width, height;
        bool hasData;
    } cases[] = {{5, 0, false}, {0, 0, true}, {2, 2, false}, {0x80000000u, 0x80000000u, true}};
    for (const auto& c : cases) {
        SCOPED_TRACE(&c - cases);
        aiTexture texture;
        texture.mWidth = c.width;
        texture.mHeight = c.height;
        texture.pcData = c.hasData ? new aiTexel[1]() : nullptr;
        EXPECT_THROW(assimp::writeEmbedded(texture, "*0", *folder), base::exception);
    }
    EXPECT_TRUE(folder->isEmpty());
}

} // namespace
