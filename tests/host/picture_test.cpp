// Pictures of a model on their way into real files.
#include "program.h"

namespace host_test {
namespace {

/// 4 x 2 pixels in RGB, and 1 x 3 in RGBA.
constexpr unsigned char opaquePng[] = {
    0x89, 'P',  'N',  'G',  0x0D, 0x0A, 0x1A, 0x0A, 0x00, 0x00, 0x00, 0x0D, 'I',  'H',  'D',
    'R',  0x00, 0x00, 0x00, 0x04, 0x00, 0x00, 0x00, 0x02, 0x08, 0x02, 0x00, 0x00, 0x00, 0xF0,
    0xCA, 0xEA, 0x34, 0x00, 0x00, 0x00, 0x10, 'I',  'D',  'A',  'T',  'x',  0xDA, 0x63, 0x38,
    0xA1, 0x21, 0x02, 0x47, 0x0C, 0xC8, 0x1C, 0x00, 0x6F, 0x5A, 0x08, 0x21, 0xEC, 0x43, 0x3D,
    0xAE, 0x00, 0x00, 0x00, 0x00, 'I',  'E',  'N',  'D',  0xAE, 'B',  0x60, 0x82};
constexpr unsigned char clearPng[] = {
    0x89, 'P',  'N',  'G',  0x0D, 0x0A, 0x1A, 0x0A, 0x00, 0x00, 0x00, 0x0D, 'I',  'H',  'D',
    'R',  0x00, 0x00, 0x00, 0x01, 0x00, 0x00, 0x00, 0x03, 0x08, 0x06, 0x00, 0x00, 0x00, 0x52,
    0xDD, 0x65, 0x82, 0x00, 0x00, 0x00, 0x0F, 'I',  'D',  'A',  'T',  'x',  0xDA, 0x63, 0xE0,
    ':',  0x21, 0xD7, 0xC0, 0x00, 0x27, 0x00, 0x1F, 'S',  0x04, 'Q',  0x1E, 'k',  '>',  'f',
    0x00, 0x00, 0x00, 0x00, 'I',  'E',  'N',  'D',  0xAE, 'B',  0x60, 0x82};

template <std::size_t Count>
std::string textOf(const unsigned char (&bytes)[Count]) {
    return {reinterpret_cast<const char*>(bytes), Count};
}

class PictureTest : public ProgramTest {
protected:
    /// Two triangles: one with a picture beside the model, one with a picture that lies in two
    /// other folders.
    PictureTest() {
        for (const char* folder : {"@/model", "@/pictures", "@/more"})
            std::filesystem::create_directory(path(folder));
        file("@/model/brick.png", textOf(opaquePng));
        file("@/more/glass.png", textOf(opaquePng));
        file("@/pictures/glass.png", textOf(clearPng));
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
        const char* output;
        std::vector<std::string> options;
        unsigned files;
        bool isEncoded; ///< as base64 text
    } rows[] = {{"@/a.glb", {}, 1, false},
                {"@/a.gltf", {}, 1, true},
                {"@/a.gltf", {"-exportEmbedded", "false"}, 4, false}};
    for (const auto& row : rows) {
        std::vector<std::string> options = row.options;
        options.insert(options.end(), {"--strict", "--resources", "@/model", "--resources",
                                       "@/pictures", "--resources", "@/more"});
        const Outcome outcome = exportModel(row.output, options);
        EXPECT_EQ(outcome.exitCode, 0);
        EXPECT_EQ(outcome.err, "");
        EXPECT_NE(outcome.out.find(", 2 materials, 2 images, "), std::string::npos) << outcome.out;

        rapidjson::Document document = report();
        EXPECT_EQ(document["files"].Size(), row.files);
        auto& images = document["images"];
        ASSERT_EQ(images.Size(), 2u);
        const auto jpegBytes = images[0]["bytes"].GetUint64();
        EXPECT_GT(jpegBytes, 100u);
        images[0].RemoveMember("bytes");
        expectJson(images, path(R"([
            {"name": "brick.jpg", "sources": ["@/model/brick.png"], "work": "converted",
             "width": 4, "height": 2},
            {"name": "glass.png", "sources": ["@/pictures/glass.png"], "work": "kept",
             "width": 1, "height": 3, "bytes": 72}])")
                               .c_str());
        const auto encoded = [](std::uint64_t bytes, std::size_t headLength) {
            return headLength + (bytes + 2) / 3 * 4;
        };
        EXPECT_EQ(document["bytes"]["images"].GetUint64(),
                  row.isEncoded ? encoded(jpegBytes, sizeof "data:image/jpeg;base64," - 1) +
                                      encoded(72, sizeof "data:image/png;base64," - 1)
                                : jpegBytes + 72);
    }
    EXPECT_EQ(readFile(path("@/glass.png")), textOf(clearPng));
    EXPECT_TRUE(readFile(path("@/brick.jpg")).starts_with("\xFF\xD8\xFF"));

    const Outcome outcome = exportModel("@/b.glb", {"--strict"});
    EXPECT_EQ(outcome.exitCode, 5);
    EXPECT_NE(outcome.err.find("'glass.png'"), std::string::npos) << outcome.err;
    EXPECT_EQ(report()["images"].Size(), 1u);
}

} // namespace
} // namespace host_test
