#include "export_fixture.h"

#include "gltf/guarded.h"
#include "gltf/output_files.h"

#include <gmock/gmock.h>

using namespace test_support;
using testing::HasSubstr;

namespace {

constexpr const char* mainMessage = "2 Unable to write the GLTF file!\n";
constexpr const char* bufferMessage = "2 Couldn't write the binary buffer to external file!\n";

std::string numbers(std::initializer_list<uint32_t> values) {
    std::string bytes;
    for (const uint32_t value : values)
        for (int shift = 0; shift < 32; shift += 8)
            bytes += static_cast<char>(value >> shift & 0xff);
    return bytes;
}

} // namespace

TEST(Container, OfOneTriangleIsWhatTheFormatAsksFor) {
    Exporting scene;
    makeTriangle(scene.addTo<scene::IMesh>(*scene.root));
    ASSERT_TRUE(scene.save(scene.folder / "a.GLB"));

    const std::string json =
        R"({"asset":{"generator":"TARNHOLD2GLTF","version":"2.0"},"scenes":[{"nodes":[0]}],)"
        R"("scene":0,"nodes":[{"mesh":0}],)"
        R"("meshes":[{"primitives":[{"attributes":{"POSITION":0},"mode":4}]}],)"
        R"("accessors":[{"bufferView":0,"byteOffset":0,"componentType":5126,"count":3,)"
        R"("max":[1.0,1.0,0],"min":[0,0,0],"type":"VEC3"}],)"
        R"("bufferViews":[{"buffer":0,"byteOffset":0,"byteLength":36,"byteStride":12,)"
        R"("target":34962}],"buffers":[{"byteLength":36}]})";
    ASSERT_EQ(json.size() % 4, 2u) << "the text has to need padding";
    const auto length = static_cast<uint32_t>(json.size() + 2);
    constexpr uint32_t one = 0x3f800000;
    EXPECT_EQ(readText(scene.folder / "a.GLB"),
              "glTF" + numbers({2, length + 36 + 28, length}) + "JSON" + json + "  " +
                  numbers({36, 0x004e4942, 0, 0, 0, one, 0, 0, 0, one, 0}));
}

TEST(Container, OfAnEmptySceneHasAnEmptyBinaryChunk) {
    Exporting scene;
    ASSERT_TRUE(scene.save(scene.folder / "a.glb"));
    EXPECT_TRUE(readText(scene.folder / "a.glb").ends_with(numbers({0, 0x004e4942})));
}

TEST(Text, OfAnEmptySceneIsLaidOutForReaders) {
    Exporting scene;
    write(*scene.root, scene::node_schema::n_name) = "top \"1\"";
    std::ofstream(scene.folder / "a.gltf") << std::string(10000, 'x'); // is replaced
    ASSERT_TRUE(scene.save(scene.folder / "a.gltf"));
    EXPECT_EQ(readText(scene.folder / "a.gltf"),
              "{\n\t\"asset\": {\n\t\t\"generator\": \"TARNHOLD2GLTF\",\n\t\t\"version\": \"2.0\""
              "\n\t},\n\t\"scenes\": [{\n\t\t\t\"nodes\": [0\n\t\t\t]\n\t\t}\n\t],\n\t\"scene\": 0,"
              "\n\t\"nodes\": [{\n\t\t\t\"name\": \"top \\\"1\\\"\"\n\t\t}\n\t]\n}");
}

TEST(SideFiles, AreNamedAfterTheMainFile) {
    Exporting scene;
    scene.set(Exporting::Settings::n_exportEmbedded, false);
    makeTriangle(scene.addTo<scene::IMesh>(*scene.root));
    // A container holds its buffer whatever the setting.
    EXPECT_FALSE(scene.saveAndRead("a.b.glb").element("buffers", 0).HasMember("uri"));
    EXPECT_FALSE(std::filesystem::exists(scene.folder / "a.b0.bin"));
    const GltfFile file = scene.saveAndRead("a.b.gltf");
    EXPECT_STREQ(file.element("buffers", 0)["uri"].GetString(), "a.b0.bin");
    EXPECT_EQ(file.primitive(0, 0).attributes.at("POSITION").values[3], 1);
}

TEST(BadTarget, IsLoggedForEachFileAndEndsNothing) {
    struct {
        const char* name;
        bool embedded;
        std::vector<std::string> expected;
    } const rows[] = {
        {"missing/a.glb", true, {mainMessage}},
        {"missing/a.gltf", false, {mainMessage, bufferMessage}},
        {"folder.gltf", false, {mainMessage}},
        {"blocked.gltf", false, {bufferMessage}},
        {"full.glb", true, {mainMessage, "trying to write 4 bytes, written 0 bytes"}},
        // The length of the whole text, though it goes out in pieces.
        {"full.gltf", true, {mainMessage, "trying to write 200715 bytes, written 0 bytes"}}};
    for (const auto& row : rows) {
        SCOPED_TRACE(row.name);
        Exporting scene;
        for (const char* name : {"folder.gltf", "blocked0.bin"})
            std::filesystem::create_directory(scene.folder / name);
        for (const char* name : {"full.glb", "full.gltf"})
            std::filesystem::create_symlink("/dev/full", scene.folder / name);
        scene.set(Exporting::Settings::n_exportEmbedded, row.embedded);
        makeTriangle(scene.addTo<scene::IMesh>(*scene.root, std::string(199985, 'n').c_str()));
        LogCapture log;
        EXPECT_TRUE(scene.save(scene.folder / row.name));
        for (const std::string& expected : row.expected)
            EXPECT_THAT(problems(log), HasSubstr(expected));
        EXPECT_EQ(problems(log).starts_with(mainMessage), row.expected[0] == mainMessage);
    }
}

TEST(Guard, LogsWhateverIsThrown) {
    const auto linesOf = [](auto thrown) {
        const LogCapture log;
        EXPECT_FALSE(gltf::guarded("It failed!", [&] { throw thrown; }));
        return problems(log);
    };
    EXPECT_EQ(linesOf(std::runtime_error("why")), "2 It failed!\n2 why\n");
    EXPECT_EQ(linesOf(1), "2 It failed! Unhandled exception has occurred!\n");
    EXPECT_THAT(linesOf(base::exception("why", "subject", "function", 7)),
                testing::AllOf(testing::StartsWith("2 It failed!\n2 why"), HasSubstr("subject")));
}

namespace {

/// A document with images, each on the material of a primitive of its own.
struct ImageDocument {
    GLTF::Image& add(const char* uri, const std::string& bytes, const std::string& source) {
        auto* data = static_cast<base::u8*>(base::AllocPolicy::allocate(bytes.size()));
        std::copy(bytes.begin(), bytes.end(), data);
        auto slot = base::makeRef<GLTF::MaterialPBR::Texture>();
        slot->texture = base::makeRef<GLTF::Texture>();
        slot->texture->sampler = asset->globalSampler;
        slot->texture->source = base::makeRef<GLTF::Image>(
            uri, data, static_cast<base::i32>(bytes.size()), "png", source);
        auto material = base::makeRef<GLTF::MaterialPBR>();
        material->normalTexture = slot;
        mesh->primitives.push_back(base::makeRef<GLTF::Primitive>());
        mesh->primitives.back()->material = material;
        sources.add(source);
        return *slot->texture->source;
    }
    void writeTo(const std::string& path) {
        auto node = base::makeRef<GLTF::Node>();
        node->mesh = mesh;
        asset->getDefaultScene().nodes.push_back(node);
        gltf::writeOutputFiles(*asset, options, *asset->packAccessors(), sources, path);
    }

    base::ref<GLTF::Asset> asset = base::makeRef<GLTF::Asset>();
    base::ref<GLTF::Mesh> mesh = base::makeRef<GLTF::Mesh>();
    gltf::SourceFiles sources;
    GLTF::Options options;
};

} // namespace

TEST(Images, FollowEachOtherInTheBinaryChunk) {
    const TempFolder folder;
    ImageDocument document;
    document.options.binary = true;
    document.add("a.png", "abcde", "");
    document.add("gone.png", "", "");
    document.add("b.png", "xyz", "");
    document.writeTo(folder / "a.glb");
    const GltfFile file = GltfFile::read(folder / "a.glb");
    EXPECT_FALSE(file.element("images", 1).HasMember("bufferView"));
    for (const auto& [image, bytes] : {std::pair<size_t, const char*>(0, "abcde"), {2, "xyz"}}) {
        const auto view = file.bufferView(file.element("images", image)["bufferView"].GetUint());
        EXPECT_EQ(std::string(view.begin(), view.end()), bytes);
    }
    EXPECT_TRUE(readText(folder / "a.glb").ends_with("abcdexyz"));
}

TEST(Images, OfEqualNamesGetFilesOfTheirOwn) {
    const TempFolder folder;
    std::filesystem::create_directory(folder / "dir.png");
    std::ofstream(folder / "wood.png") << "source"; // which the brick was read from
    std::filesystem::create_symlink("wood.png", folder / "link.png");
    struct {
        const char *uri, *bytes;
        std::string source, newUri;
    } const rows[] = {{"wood.png", "converted", folder / "x/../wood.jpg", "wood_2.png"},
                      {"Wood_2.png", "another", "/elsewhere/wood.png", "Wood_2_2.png"},
                      {"link.png", "linked", "", "link_2.png"},
                      {"A.gltf", "main", "", "A_2.gltf"},
                      {"wood.png", "converted", "", "wood_2.png"},
                      {"brick.png", "read", folder / "wood.png", "brick.png"},
                      {"gone.png", "", "", "gone.png"},
                      {"dir.png", "x", "", "dir.png"},
                      {"last.png", "last", "", "last.png"}};
    ImageDocument document;
    document.options.embedTextures = false;
    for (const auto& row : rows)
        document.add(row.uri, row.bytes, row.source);
    const LogCapture log;
    document.writeTo(folder / "a.gltf");

    const GltfFile file = GltfFile::read(folder / "a.gltf");
    for (size_t i = 0; i < std::size(rows); ++i) {
        EXPECT_EQ(file.element("images", i)["uri"].GetString(), rows[i].newUri);
        if (rows[i].uri != std::string("gone.png") && rows[i].uri != std::string("dir.png")) {
            EXPECT_EQ(readText(folder / rows[i].newUri), rows[i].bytes);
        }
    }
    EXPECT_EQ(readText(folder / "wood.png"), "source");
    EXPECT_FALSE(std::filesystem::exists(folder / "gone.png"));
    EXPECT_THAT(problems(log), HasSubstr("3 gltf |gone.png| "));
    EXPECT_THAT(problems(log), HasSubstr("2 Couldn't write the image to external file!\n"));
    EXPECT_THAT(problems(log), testing::Not(HasSubstr(mainMessage)));
}
