#include "program.h"

#include <rapidjson/document.h>

#include <set>

namespace host_test {
namespace {

class ReportTest : public ProgramTest {
protected:
    rapidjson::Document report() {
        rapidjson::Document document;
        document.Parse(readFile(path("@/report.json")).c_str());
        EXPECT_FALSE(document.HasParseError());
        return document;
    }
    /// A square of two triangles and a triangle, in two objects.
    std::string modelFile() {
        return file("@/model.obj", "o Floor\nv 0 0 0\nv 1 0 0\nv 1 1 0\nv 0 1 0\nf 1 2 3 4\n"
                                   "o Flag\nv 5 0 0\nv 6 0 0\nv 5 1 0\nf 5 6 7\n");
    }
};

TEST_F(ReportTest, TellsOptionsMessagesAndWhatWasLeftOut) {
    const std::string script = "object camera\nobject noiseTexture\nobject node\nobject hair\n"
                               "log 3 gltf |Left|Right| Odd | thing!\nlog 2 Sail| Torn \xff\n"
                               "log 1 no object here\nlog 4 told\n"
                               "log 2 Unable to delete temporary file!\n---\n{}";
    const Outcome outcome =
        runScript(script, {"--report", "@/report.json", "-exportImageMaxDim", "77", "-upAxis", "2",
                           "-importNormals", "NEVER", "-importTessellation", "0.1", "--strict"});
    EXPECT_EQ(outcome.exitCode, 5) << outcome.err;
    const rapidjson::Document document = report();
    EXPECT_STREQ(document["tool"].GetString(), "scene_export");
    EXPECT_STREQ(document["version"].GetString(), PROGRAM_VERSION);
    EXPECT_EQ(document["input"].GetString(), path("@/a.script"));
    EXPECT_EQ(document["output"].GetString(), path("@/a.out"));
    EXPECT_EQ(document["exitCode"].GetInt(), 5);
    EXPECT_FALSE(document["dryRun"].GetBool());

    const auto& options = document["options"];
    EXPECT_EQ(options["scene"]["upAxis"].GetInt(), 2);
    EXPECT_EQ(options["exporter"]["exportImageMaxDim"].GetInt(), 77);
    EXPECT_TRUE(options["exporter"]["exportCompress"].GetBool()); // a default
    EXPECT_STREQ(options["importer"]["importNormals"].GetString(), "never");
    EXPECT_STREQ(options["importer"]["importTangents"].GetString(), "present");
    EXPECT_EQ(options["importer"]["importTessellation"].GetDouble(), 0.1);
    EXPECT_EQ(options["importer"]["compressionLevel"].GetInt(), 5);

    const char* messages[][4] = {
        {"warning", "Scene", "Left|Right", "gltf |Left|Right| Odd | thing!"},
        {"error", "Scene", "Sail", "Sail| Torn \xEF\xBF\xBD"},
        {"critical", "Scene", "", "no object here"},
    };
    ASSERT_EQ(document["messages"].Size(), std::size(messages));
    for (rapidjson::SizeType i = 0; i < std::size(messages); ++i) {
        const auto& message = document["messages"][i];
        EXPECT_STREQ(message["level"].GetString(), messages[i][0]);
        EXPECT_STREQ(message["channel"].GetString(), messages[i][1]);
        EXPECT_STREQ(message["object"].GetString(), messages[i][2]);
        EXPECT_STREQ(message["text"].GetString(), messages[i][3]);
    }
    const auto& lost = document["notExported"];
    ASSERT_EQ(lost.Size(), 3u);
    EXPECT_STREQ(lost[0]["type"].GetString(), "camera");
    EXPECT_STREQ(lost[0]["name"].GetString(), "The camera");
    EXPECT_STREQ(lost[1]["type"].GetString(), "noiseTexture");
    EXPECT_STREQ(lost[2]["type"].GetString(), "hair");

    double sum = 0;
    std::set<std::string> stages;
    for (const auto& stage : document["seconds"].GetObject())
        if (stages.insert(stage.name.GetString()).second && stage.name != "total")
            sum += stage.value.GetDouble();
    EXPECT_EQ(stages, (std::set<std::string>{"discovery", "import", "export", "report", "total"}));
    EXPECT_LE(sum, document["seconds"]["total"].GetDouble());
}

TEST_F(ReportTest, IsWrittenForFailuresToo) {
    EXPECT_EQ(runScript("import throw-standard", {"--report", "@/report.json"}).exitCode, 2);
    const rapidjson::Document document = report();
    EXPECT_EQ(document["exitCode"].GetInt(), 2);
    ASSERT_EQ(document["messages"].Size(), 1u);
    EXPECT_EQ(document["messages"][0]["text"].GetString(), path("@/a.script: thrown on purpose"));
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
    EXPECT_FALSE(exists("@/a.out"));
    EXPECT_EQ(report()["scene"]["triangles"].GetInt(), 2);
    EXPECT_TRUE(report()["dryRun"].GetBool());

    const Outcome faulty = runScript("mesh whole\nmesh broken\n", {"--dry-run", "--strict"});
    EXPECT_EQ(faulty.exitCode, 5);
    EXPECT_NE(faulty.out.find("2 meshes (1 with faults)"), std::string::npos) << faulty.out;
    EXPECT_NE(faulty.err.find("|Sail|"), std::string::npos) << faulty.err;
    EXPECT_FALSE(exists("@/a.out"));
}

TEST_F(ReportTest, RealModelsBecomeRealFiles) {
    modelFile();
    const struct {
        std::vector<std::string> arguments;
        int files;
        const char* scene; ///< how the summary begins behind the sizes
    } rows[] = {
        {{"@/model.obj", "@/a.glb"}, 1, ", 2 meshes, 3 triangles, "},
        {{"@/model.obj", "@/a.GLTF"}, 1, ", 2 meshes, 3 triangles, "},
        {{"@/model.obj", "@/b.gltf", "-exportEmbedded", "false"}, 2, ", 2 meshes, 3 triangles, "},
        {{"@/model.obj", "@/c.gltf", "-exportCompress", "false"}, 1, ", 2 meshes, 3 triangles, "},
        {{"@/model.obj", "@/d.glb", "-importMeshes", "false"}, 1, ", 0 meshes, 0 triangles, "},
    };
    for (const auto& row : rows) {
        std::vector<std::string> arguments = row.arguments;
        arguments.insert(arguments.end(), {"--report", "@/report.json"});
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
    // A turned axis shows in the root's matrix.
    EXPECT_EQ(runReal({"@/model.obj", "@/e.gltf", "-upAxis", "2"}).exitCode, 0);
    EXPECT_NE(readFile(path("@/e.gltf")), readFile(path("@/a.GLTF")));
}

} // namespace
} // namespace host_test
