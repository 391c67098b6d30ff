// The examples that the README shows do what it says of them.
#include "program.h"

#include "support/gltf_pose.h"

#include <map>

namespace host_test {
namespace {

using ExamplesTest = ProgramTest;

/// The positions of the only primitive of a file.
std::vector<double> positionsOf(const std::string& path) {
    const auto file = test_support::GltfFile::read(path);
    const test_support::Primitive primitive = file.primitive(0, 0);
    EXPECT_FALSE(primitive.compressed);
    return primitive.attributes.at("POSITION").values;
}

/// What a picture shows, whatever compressed it.
std::string pixelsOf(const std::filesystem::path& picture) {
    const Outcome outcome = runProgram(IMAGE_TOOL, {"--info", picture});
    EXPECT_EQ(outcome.exitCode, 0) << outcome.err;
    return outcome.out;
}

TEST_F(ExamplesTest, LighthouseHasMaterialsAndPictures) {
    const std::string model = SOURCE_FOLDER "/examples/lighthouse.dae";
    EXPECT_EQ(runReal({"--strict", model, "@/a.glb"}).err, "");
    const auto file = test_support::GltfFile::read(path("@/a.glb"));
    std::map<std::string, int> images;
    for (const auto& image : file.json()["images"].GetArray())
        ++images[image["mimeType"].GetString()];
    // Only the signboard has alpha.
    EXPECT_EQ(images, (std::map<std::string, int>{{"image/jpeg", 4}, {"image/png", 1}}));
    EXPECT_EQ(file.count("materials"), 8u);
}

TEST_F(ExamplesTest, LighthouseMoves) {
    const std::string model = SOURCE_FOLDER "/examples/lighthouse.dae";
    EXPECT_EQ(runReal({model, "@/a.glb", "-exportCompress", "false"}).err, "");
    const auto file = test_support::GltfFile::read(path("@/a.glb"));
    EXPECT_EQ(file.count("skins"), 1u);
    // The beams go round once in 8 seconds: a quarter turn in 2 moves +X to -Z.
    for (const test_support::NodeInstance& node : file.instances()) {
        const auto& object = file.element("nodes", node.node);
        if (!object.HasMember("name") || object["name"].GetString() != std::string("Beam_1"))
            continue;
        // The first column is where the X axis points.
        const auto start = test_support::GltfPose(file, 0).worldFromNode(node.node);
        const auto turned = test_support::GltfPose(file, 2).worldFromNode(node.node);
        EXPECT_NEAR(turned[0], start[2], 1e-5);
        EXPECT_NEAR(turned[2], -start[0], 1e-5);
        return;
    }
    FAIL() << "there is no beam";
}

TEST_F(ExamplesTest, LighthouseIsWhatItsScriptWrites) {
    namespace fs = std::filesystem;
    const fs::path examples = SOURCE_FOLDER "/examples";
    const Outcome outcome =
        runProgram("/usr/bin/env", {"python3", examples / "make_lighthouse.py", path("@/written")});
    if (outcome.exitCode == 127)
        GTEST_SKIP() << "no Python";
    EXPECT_EQ(outcome.exitCode, 0) << outcome.err;
    EXPECT_EQ(readFile(path("@/written/lighthouse.dae")), readFile(examples / "lighthouse.dae"));
    std::size_t count = 0;
    for (const auto& entry : fs::directory_iterator(examples / "textures")) {
        const fs::path written = path("@/written/textures") / entry.path().filename();
        EXPECT_EQ(pixelsOf(written), pixelsOf(entry.path())) << written;
        ++count;
    }
    EXPECT_EQ(count, 5u);
}

TEST_F(ExamplesTest, HostWritesItsTriangle) {
    const std::string plugins = std::filesystem::path(SCENE_EXPORT).parent_path();
    const std::string output = path("@/triangle.gltf");
    EXPECT_EQ(runProgram(MINIMAL_HOST, {plugins, output}).exitCode, 0);
    EXPECT_EQ(positionsOf(output), (std::vector<double>{0, 0, 0, 1, 0, 0, 0, 1, 0}));
    EXPECT_EQ(runProgram(MINIMAL_HOST, {plugins, path("@/none/triangle.gltf")}).exitCode, 4);
    EXPECT_EQ(runProgram(MINIMAL_HOST, {plugins, path("@/triangle.x")}).exitCode, 3);
}

TEST_F(ExamplesTest, ImporterReadsTriangles) {
    // A folder with this importer and the exporter.
    namespace fs = std::filesystem;
    fs::create_directory(path("@/plugins"));
    for (const fs::path plugin : {MINIMAL_IMPORTER, SCENE_GLTF})
        fs::create_symlink(plugin, path("@/plugins") / plugin.filename());
    file("@/plugins/importers.txt", "TriangleImporter\nGLTFImporter\n");
    file("@/two.tri", "0 0 0  1 0 0  0 1 0\n2 0 -1.5  3 0 0  2 1 0\n7 8");

    const Outcome outcome =
        runReal({"--plugins", "@/plugins", "-exportCompress", "false", "@/two.tri", "@/two.glb"});
    EXPECT_EQ(outcome.err, "");
    EXPECT_NE(outcome.out.find(", 1 mesh, 2 triangles, "), std::string::npos) << outcome.out;
    EXPECT_EQ(positionsOf(path("@/two.glb")),
              (std::vector<double>{0, 0, 0, 1, 0, 0, 0, 1, 0, 2, 0, -1.5, 3, 0, 0, 2, 1, 0}));
}

TEST_F(ExamplesTest, TextsShowTheExamples) {
    const struct {
        const char* text;
        const char* language;
        std::size_t listings;
    } rows[] = {{"README.md", "cpp", 1},
                {"docs/scene-document.md", "json", 11},
                {"docs/writing_plugins.md", "cpp", 1}};
    for (const auto& [shown, language, listings] : rows) {
        const std::filesystem::path source = SOURCE_FOLDER;
        const std::string text = readFile(source / shown);
        std::size_t blocks = 0;
        // Each listing stands behind a line that names its file.
        const std::string mark = "\n<!-- listing: ";
        for (std::size_t at = text.find(mark); at != std::string::npos; at = text.find(mark, at)) {
            at += mark.size();
            const std::string name = text.substr(at, text.find(' ', at) - at);
            const std::string listing =
                std::string(" -->\n```") + language + "\n" + readFile(source / name) + "```\n";
            EXPECT_EQ(text.substr(at + name.size(), listing.size()), listing) << shown << name;
            ++blocks;
        }
        EXPECT_EQ(blocks, listings) << shown;
    }
}

} // namespace
} // namespace host_test
