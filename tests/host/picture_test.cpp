// Pictures of a model on their way into real files.
#include "program.h"

namespace host_test {
namespace {

/// Small files of the fuzzers, of 5 x 5 pixels.
const std::string opaquePng = readFile(SOURCE_FOLDER "/fuzz/seeds/png/colour-2-8.png");
const std::string clearPng = readFile(SOURCE_FOLDER "/fuzz/seeds/png/colour-6-8.png");

class PictureTest : public ProgramTest {
protected:
    /// Two triangles: one with a picture beside the model, one with a picture that lies in two
    /// other folders.
    PictureTest() {
        for (const char* folder : {"@/model", "@/pictures", "@/more"})
            std::filesystem::create_directory(path(folder));
        file("@/model/brick.png", opaquePng);
        file("@/more/glass.png", opaquePng);
        file("@/pictures/glass.png", clearPng);
        file("@/model/a.mtl", "newmtl wall\nmap_Kd brick.png\nnewmtl pane\nmap_Kd glass.png\n");
        file("@/model/a.obj", "mtllib a.mtl\no Room\nv 0 0 0\nv 1 0 0\nv 0 1 0\nv 0 0 1\n"
                              "vt 0 0\nvt 1 0\nvt 0 1\nusemtl wall\nf 1/1 2/2 3/3\n"
                              "usemtl pane\nf 1/1 2/2 4/3\n");
    }

    /// Exports the model with a report.
    Outcome exportModel(const std::string& output, std::vector<std::string> options) {
        options.insert(options.end(), {"--report", "@/report.json", "@/model/a.obj", output});
        return runReal(options);
    }
};

TEST_F(PictureTest, AreReportedAndCounted) {
    const struct {
        const char *output, *embeds;
        unsigned files;
    } rows[] = {{"@/a.glb", "true", 1}, {"@/a.gltf", "true", 1}, {"@/a.gltf", "false", 4}};
    for (const auto& row : rows) {
        const Outcome outcome = exportModel(row.output, {"--strict", "-exportEmbedded", row.embeds,
                                                         "--resources", "@/model", "--resources",
                                                         "@/pictures", "--resources", "@/more"});
        EXPECT_EQ(outcome.exitCode, 0);
        EXPECT_EQ(outcome.err, "");
        EXPECT_NE(outcome.out.find(", 2 materials, 2 images, "), std::string::npos) << outcome.out;
        EXPECT_EQ(report()["files"].Size(), row.files);
    }
    const std::string jpeg = readFile(path("@/brick.jpg"));
    EXPECT_TRUE(jpeg.starts_with("\xFF\xD8\xFF"));
    EXPECT_EQ(readFile(path("@/glass.png")), clearPng);
    const rapidjson::Document document = report();
    EXPECT_EQ(document["bytes"]["images"].GetUint64(), jpeg.size() + clearPng.size());
    ASSERT_EQ(document["images"].Size(), 2u);
    expectJson(document["images"][1]["sources"], path(R"(["@/pictures/glass.png"])").c_str());
}

TEST_F(PictureTest, ThatAreNotFoundAreTold) {
    const Outcome outcome = exportModel("@/b.glb", {"--strict"});
    EXPECT_EQ(outcome.exitCode, 5);
    EXPECT_NE(outcome.err.find("'glass.png'"), std::string::npos) << outcome.err;
    EXPECT_EQ(report()["images"].Size(), 1u);
}

} // namespace
} // namespace host_test
