// Scene documents as INPUT and OUTPUT, and as examples.
#include "program.h"

#include "support/gltf_faults.h"
#include "support/gltf_pose.h"
#include "support/gltf_statistics.h"

#include <algorithm>

namespace host_test {
namespace {

using SceneDocumentTest = ProgramTest;
using test_support::GltfFile;

const std::string examples = SOURCE_FOLDER "/examples/scenes/";

/// "nodes 2, meshes 1" and so on of what there is.
std::string countsOf(const GltfFile& file) {
    std::string text;
    for (const char* array :
         {"nodes", "meshes", "materials", "textures", "images", "skins", "animations"})
        if (const std::size_t count = file.count(array); count != 0)
            text += (text.empty() ? "" : ", ") + std::string(array) + " " + std::to_string(count);
    return text;
}

TEST_F(SceneDocumentTest, ExamplesBecomeValidFiles) {
    const struct {
        const char* name;
        const char* counts;
    } rows[] = {{"node", "nodes 4, meshes 1"},
                {"mesh", "nodes 1, meshes 1"},
                {"lines", "nodes 1, meshes 1"},
                {"material", "nodes 2, meshes 2, materials 2"},
                {"textures", "nodes 1, meshes 1, materials 1, textures 2, images 2"},
                {"skin", "nodes 4, meshes 1, skins 1"},
                {"morph", "nodes 1, meshes 1"},
                {"channel", "nodes 2, meshes 1, animations 1"},
                {"clip", "nodes 2, meshes 1, animations 1"},
                {"layer", "nodes 2, meshes 1, animations 1"},
                {"light", "nodes 2, meshes 1"}};
    for (const auto& row : rows) {
        SCOPED_TRACE(row.name);
        const Outcome outcome = runReal({"--strict", "-exportCompress", "false",
                                         examples + row.name + ".scene.json", "@/a.glb"});
        EXPECT_EQ(outcome.err, "");
        EXPECT_EQ(outcome.exitCode, 0);
        const auto file = GltfFile::read(path("@/a.glb"));
        EXPECT_EQ(countsOf(file), row.counts);
        for (const test_support::Fault& fault : findFaults(file))
            ADD_FAILURE() << fault.text;
    }
    for (const auto& entry : std::filesystem::directory_iterator(examples))
        EXPECT_TRUE(std::ranges::any_of(rows, [&](const auto& row) {
            return entry.path().filename() == row.name + std::string(".scene.json");
        })) << entry.path();
}

/// What the examples say of themselves, by hand.
TEST_F(SceneDocumentTest, ExamplesHoldWhatTheyTell) {
    const auto exported = [&](const char* name) {
        runReal({"-exportCompress", "false", examples + name + ".scene.json", "@/a.glb"});
        return GltfFile::read(path("@/a.glb"));
    };
    // From the origin along each axis, and on from the third by one.
    const auto lines = exported("lines").primitive(0, 0);
    EXPECT_EQ(lines.mode, 1);
    std::vector<double> ends;
    for (const std::uint32_t index : lines.indices)
        for (int axis = 0; axis < 3; ++axis)
            ends.push_back(lines.attributes.at("POSITION").at(index)[axis]);
    EXPECT_EQ(ends, (std::vector<double>{0, 0, 0, 1, 0, 0, 0, 0, 0, 0, 1, 0,
                                         0, 0, 0, 0, 0, 1, 0, 0, 1, 0, 1, 1}));
    // A square of two triangles and four triangles.
    const auto mesh = exported("mesh");
    EXPECT_EQ(mesh.primitive(0, 0).triangles().size(), 6u);
    // The last beam vertex (-0.2, 4, 0), turned by 90 degrees about Z, moved by (2, 3, 0).
    const auto gate = exported("node");
    bool found = false;
    for (const test_support::NodeInstance& instance : gate.instances()) {
        const auto& node = gate.element("nodes", instance.node);
        if (!node.HasMember("name") || node["name"].GetString() != std::string("beam"))
            continue;
        found = true;
        const auto corner = test_support::GltfPose(gate, 0).worldFromNode(instance.node);
        EXPECT_NEAR(corner[4] * 4 + corner[0] * -0.2 + corner[12], -2, 1e-5);
        EXPECT_NEAR(corner[5] * 4 + corner[1] * -0.2 + corner[13], 2.8, 1e-5);
    }
    EXPECT_TRUE(found);
    EXPECT_DOUBLE_EQ(exported("morph").element("meshes", 0)["weights"][0].GetDouble(), 0.5);
    // The clip of a second, and again for two seconds from second 2 on.
    const auto channels = animationChannels(exported("layer"));
    ASSERT_EQ(channels.size(), 1u);
    EXPECT_EQ(channels[0].path, "translation");
    EXPECT_NEAR(channels[0].times.back(), 4, 0.05);
}

TEST_F(SceneDocumentTest, KeepsAScene) {
    const std::string model = SOURCE_FOLDER "/examples/lighthouse.dae";
    runReal({model, "@/direct.glb"});
    std::string bytes = readFile(path("@/direct.glb"));
    for (const std::string form : {".scene", ".scene.json"}) {
        const Outcome outcome = runReal({model, "@/kept" + form});
        EXPECT_EQ(outcome.err, "");
        EXPECT_NE(outcome.out.find(": 1 file, "), std::string::npos) << outcome.out;
        EXPECT_EQ(runReal({"@/kept" + form, "@/later.glb"}).err, "");
        EXPECT_TRUE(readFile(path("@/later.glb")) == bytes) << form;
        runReal({model, "@/again" + form});
        EXPECT_TRUE(readFile(path("@/again" + form)) == readFile(path("@/kept" + form))) << form;
    }
    // From one form into the other.
    runReal({"@/kept.scene", "@/other.scene.json"});
    EXPECT_TRUE(readFile(path("@/other.scene.json")) == readFile(path("@/kept.scene.json")));
}

TEST_F(SceneDocumentTest, TellsWhatIsWrongWithAnInput) {
    file("@/cut.scene.json", "{\n  \"@version\": 1,\n  \"@objects\": [\n");
    file("@/odd.scene.json", "{\"@version\": 1, \"@objects\": [\n"
                             "{\"@type\": \"scene\", \"root\": {\"@type\": \"plugin\",\n"
                             "\"@value\": \"root\"}},\n"
                             "{\"@type\": \"node\", \"name\": \"root\",\n"
                             "\"size\": {\"@type\": \"vec5f\", \"@value\": [1]}}]}");
    file("@/bytes.scene", "BPF1 and then something else");
    const struct {
        std::vector<std::string> arguments;
        int exitCode;
        const char* text;
    } rows[] = {
        {{"@/cut.scene.json", "@/a.glb"}, 2, "json parser @/cut.scene.json(4)| "},
        {{"@/cut.scene.json", "@/a.glb"},
         2,
         "error: @/cut.scene.json: is no whole scene document, expected a model that can be "
         "read.\n"},
        {{"@/odd.scene.json", "@/a.glb"},
         0,
         "json parser @/odd.scene.json| Trying to create an attribute 'root::size' from unknown "
         "type 'vec5f' at line 5!"},
        {{"--strict", "@/odd.scene.json", "@/a.glb"}, 5, "vec5f"},
        {{"-importMeshes", "false", "@/odd.scene.json", "@/a.glb"},
         0,
         "@/odd.scene.json: option '-importMeshes' has no effect on a scene document."},
        {{"-exportCompress", "false", "@/odd.scene.json", "@/b.scene"},
         0,
         "@/b.scene: option '-exportCompress' has no effect on a scene document."},
        {{"@/bytes.scene", "@/a.glb"}, 2, "error: @/bytes.scene: "},
        {{"@/odd.scene.json", "@/none/a.scene"}, 4, "its folder does not exist"},
        {{"@/odd.scene.json", "@/odd.scene.json"}, 1, "INPUT and OUTPUT are the same file"},
        {{"--dump", "@/odd.scene.json", "@/a.glb"}, 1, "expected INPUT alone, found 2 paths."}};
    for (const auto& row : rows) {
        const Outcome outcome = runReal(row.arguments);
        std::string text = row.text;
        for (std::size_t at; (at = text.find("@/")) != std::string::npos;)
            text.replace(at, 2, path("@/"));
        EXPECT_EQ(outcome.exitCode, row.exitCode) << outcome.err;
        EXPECT_NE(outcome.err.find(text), std::string::npos) << text << "\n" << outcome.err;
    }
}

TEST_F(SceneDocumentTest, DumpsATree) {
    const Outcome outcome = runReal({"--dump", examples + "skin.scene.json"});
    EXPECT_EQ(outcome.err, "");
    const char* lines[] = {"scene [0]\n",
                           "  root: node [1] \"root\"\n",
                           "      node [2] \"pole\"\n",
                           "          node [3] \"tip\"\n",
                           "            translate: vec3d 2 0 0\n",
                           "        isJoint: bool true\n",
                           "              positions: vec3f[] of 6\n",
                           "              node [2] \"pole\", above\n"};
    std::size_t at = 0;
    for (const char* line : lines) {
        const std::size_t found = outcome.out.find(line, at);
        EXPECT_NE(found, std::string::npos) << line << outcome.out;
        at = found == std::string::npos ? at : found;
    }
}

} // namespace
} // namespace host_test
