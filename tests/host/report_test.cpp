#include "program.h"

#include <set>

namespace host_test {
namespace {

using ReportTest = ProgramTest;

TEST_F(ReportTest, TellsOptionsMessagesAndWhatWasLeftOut) {
    const std::string script = "object camera\nobject noiseTexture\nobject node\nobject hair\n"
                               "log 3 gltf |Left|Right| Odd | thing!\nlog 2 Sail| Torn \xff\n"
                               "log 1 no object here\nlog 4 told\nlog 3 triangulate| Sail| Can't\n"
                               "log 3 map attribute| Invalid 'a'| or b\n"
                               "log 2 plugin factory scene| Unable to create a| b\n"
                               "log 2 Unable to delete temporary file!\n---\n{}";
    const Outcome outcome =
        runScript(script, {"--report", "@/report.json", "-exportImageMaxDim", "77", "-upAxis", "2",
                           "-importNormals", "NEVER", "-importTessellation", "0.1", "--strict"});
    EXPECT_EQ(outcome.exitCode, 5) << outcome.err;
    const rapidjson::Document document = report();
    EXPECT_STREQ(document["version"].GetString(), PROGRAM_VERSION);
    EXPECT_EQ(document["input"].GetString(), path("@/a.script"));
    EXPECT_EQ(document["output"].GetString(), path("@/a.out"));
    EXPECT_EQ(document["exitCode"].GetInt(), 5);
    EXPECT_FALSE(document["dryRun"].GetBool());

    const auto& options = document["options"];
    expectJson(options["scene"], R"({"upAxis": 2})");
    EXPECT_EQ(options["exporter"]["exportImageMaxDim"].GetInt(), 77);
    EXPECT_TRUE(options["exporter"]["exportCompress"].GetBool()); // a default
    EXPECT_STREQ(options["importer"]["importNormals"].GetString(), "never");
    EXPECT_STREQ(options["importer"]["importTangents"].GetString(), "present");
    EXPECT_EQ(options["importer"]["importTessellation"].GetDouble(), 0.1);
    EXPECT_EQ(options["importer"]["compressionLevel"].GetInt(), 5);

    expectJson(document["messages"], R"([
        {"level": "warning", "channel": "Scene", "object": "Left|Right",
         "text": "gltf |Left|Right| Odd | thing!"},
        {"level": "error", "channel": "Scene", "object": "Sail", "text": "Sail| Torn \uFFFD"},
        {"level": "critical", "channel": "Scene", "object": "", "text": "no object here"},
        {"level": "warning", "channel": "Scene", "object": "Sail",
         "text": "triangulate| Sail| Can't"},
        {"level": "warning", "channel": "Scene", "object": "",
         "text": "map attribute| Invalid 'a'| or b"},
        {"level": "error", "channel": "Scene", "object": "",
         "text": "plugin factory scene| Unable to create a| b"}])");
    expectJson(document["notExported"], R"([{"type": "camera", "name": "The camera"},
        {"type": "noiseTexture", "name": "The noiseTexture"},
        {"type": "hair", "name": "The hair"}])");

    double sum = 0;
    std::set<std::string> stages;
    for (const auto& stage : document["seconds"].GetObject())
        if (stages.insert(stage.name.GetString()).second && stage.name != "total")
            sum += stage.value.GetDouble();
    EXPECT_EQ(stages, (std::set<std::string>{"discovery", "import", "export", "report", "total"}));
    EXPECT_LE(sum, document["seconds"]["total"].GetDouble());
}

TEST_F(ReportTest, TellsWhatBecameOfPictures) {
    const std::string script = "image 0 4 2 31 a.png /p/a.png\nimage 1 -1 -1 0 b.jpg b.tga\n"
                               "image 2 1 1 9 c\\\"\xff.jpg /p/c.png\nimage 3 8 8 2 d.jpg m r o\n"
                               "image 4 8 8 2 e.jpg h\nimage 9 8 8 -1 f.jpg\n---\n{}";
    const std::vector<std::string> options = {"--report", "@/report.json"};
    EXPECT_EQ(runScript(script, options).exitCode, 0);
    expectJson(report()["images"], R"([
        {"name": "a.png", "sources": ["/p/a.png"], "work": "kept",
         "width": 4, "height": 2, "bytes": 31},
        {"name": "b.jpg", "sources": ["b.tga"], "work": "converted",
         "width": null, "height": null, "bytes": 0},
        {"name": "c\\\"\uFFFD.jpg", "sources": ["/p/c.png"], "work": "resized",
         "width": 1, "height": 1, "bytes": 9},
        {"name": "d.jpg", "sources": ["m", "r", "o"], "work": "packed",
         "width": 8, "height": 8, "bytes": 2},
        {"name": "e.jpg", "sources": ["h"], "work": "made from a bump map",
         "width": 8, "height": 8, "bytes": 2},
        {"name": "f.jpg", "sources": [], "work": "unknown",
         "width": 8, "height": 8, "bytes": 4294967295}])");
    EXPECT_EQ(runScript("---\n{}", options).exitCode, 0);
    expectJson(report()["images"], "[]");
    EXPECT_EQ(runScript(script, {"--report", "@/report.json", "--dry-run"}).exitCode, 0);
    EXPECT_FALSE(report().HasMember("images"));
}

TEST_F(ReportTest, TellsTheResourceFolders) {
    for (const char* folder : {"@/a", "@/b"})
        std::filesystem::create_directory(path(folder));
    EXPECT_EQ(runScript("---\nx", {"--resources", "@/b/", "--resources", "file://@/a",
                                   "--resources", ".", "--report", "@/report.json"})
                  .exitCode,
              0);
    const rapidjson::Document document = report();
    // Each with the separator behind it, as plugins need them.
    const std::string expected = path("[\"@/b/\", \"file://@/a/\", \"./\"]");
    for (const char* group : {"importer", "exporter"})
        expectJson(document["options"][group]["resourcePaths"], expected.c_str());
    EXPECT_EQ(runScript("---\nx", {"--report", "@/report.json"}).exitCode, 0);
    EXPECT_FALSE(report()["options"]["exporter"].HasMember("resourcePaths"));
}

TEST_F(ReportTest, IsWrittenForFailuresToo) {
    EXPECT_EQ(runScript("import throw-text", {"--report", "@/report.json"}).exitCode, 2);
    const rapidjson::Document document = report();
    EXPECT_EQ(document["exitCode"].GetInt(), 2);
    ASSERT_EQ(document["messages"].Size(), 1u);
    EXPECT_EQ(document["messages"][0]["text"].GetString(),
              path("@/a.script: thrown on purpose, expected a model that can be read."));
    EXPECT_EQ(document["files"].Size(), 0u);
}

TEST_F(ReportTest, DryRunsCheckAndWriteNothing) {
    const Outcome good =
        runScript("mesh whole\nobject camera\n",
                  {"--dry-run", "--report", "@/report.json", "-exportEmbedded", "false"});
    EXPECT_EQ(good.exitCode, 0) << good.err;
    EXPECT_EQ(good.err, "");
    const std::string expected =
        path("@/a.out: would be written with resources in files beside it, "
             "compressed; the scene has 1 node, 1 mesh (0 with faults), "
             "2 triangles, 1 object that can't be exported, ");
    EXPECT_TRUE(good.out.starts_with(expected)) << good.out;
    EXPECT_TRUE(report()["dryRun"].GetBool());
    expectJson(report()["scene"],
               R"({"nodes": 1, "meshes": 1, "triangles": 2, "faultyMeshes": 0})");

    const Outcome faulty = runScript("mesh whole\nmesh broken\n", {"--dry-run", "--strict"});
    EXPECT_EQ(faulty.exitCode, 5);
    EXPECT_NE(faulty.out.find("2 meshes (1 with faults)"), std::string::npos) << faulty.out;
    EXPECT_NE(faulty.err.find("|Sail|"), std::string::npos) << faulty.err;
    EXPECT_FALSE(exists("@/a.out"));
}

TEST_F(ReportTest, RealModelsBecomeRealFiles) {
    // A square of two triangles and a triangle, in two objects.
    file("@/model.obj", "o Floor\nv 0 0 0\nv 1 0 0\nv 1 1 0\nv 0 1 0\nf 1 2 3 4\n"
                        "o Flag\nv 5 0 0\nv 6 0 0\nv 5 1 0\nf 5 6 7\n");
    const struct {
        std::vector<std::string> arguments;
        int files;
        const char* scene; ///< how the summary begins behind the sizes
    } rows[] = {
        {{"@/model.obj", "@/a.glb"}, 1, ", 2 meshes, 3 triangles, "},
        {{"@/model.obj", "@/a.GLTF"}, 1, ", 2 meshes, 3 triangles, "},
        {{"@/model.obj", "@/b.gltf", "-exportEmbedded", "false"}, 2, ", 2 meshes, 3 triangles, "},
        {{"@/model.obj", "@/c.gltf", "-exportCompress", "false"}, 1, ", 2 meshes, 3 triangles, "},
        {{"@/model.obj", "@/d.glb", "-importMeshes", "false"}, 1, ", 0 meshes, 0 triangles, "}};
    for (const auto& row : rows) {
        std::vector<std::string> arguments = row.arguments;
        arguments.insert(arguments.end(), {"--report", "@/report.json", "--dry-run"});
        EXPECT_EQ(runReal(arguments).err, "");
        arguments.pop_back();
        const Outcome outcome = runReal(arguments);
        EXPECT_EQ(outcome.exitCode, 0) << outcome.err;
        EXPECT_EQ(outcome.err, "");
        EXPECT_NE(outcome.out.find(row.scene), std::string::npos) << outcome.out;
        const rapidjson::Document document = report();
        const auto& bytes = document["bytes"];
        EXPECT_EQ(document["files"].Size(), static_cast<unsigned>(row.files));
        std::uintmax_t sizes = 0;
        for (const auto& written : document["files"].GetArray())
            sizes += std::filesystem::file_size(written["path"].GetString());
        EXPECT_EQ(bytes["total"].GetUint64(), sizes);
        EXPECT_EQ(bytes["json"].GetUint64() + bytes["geometry"].GetUint64(), sizes);
    }
}

} // namespace
} // namespace host_test
