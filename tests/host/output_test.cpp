#include "program.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

namespace host_test {
namespace {

class OutputTest : public ProgramTest {
protected:
    /// Lets an exporter write `content` and returns the report on it.
    rapidjson::Document reportOn(const std::string& content, int exitCode = 0) {
        const Outcome outcome = runScript("---\n" + content, {"--report", "@/report.json"});
        EXPECT_EQ(outcome.exitCode, exitCode) << outcome.err;
        summary_ = outcome.out;
        return report();
    }
    static std::string number(std::uint32_t value) {
        std::string bytes;
        for (int shift = 0; shift < 32; shift += 8)
            bytes += static_cast<char>(value >> shift);
        return bytes;
    }
    static std::string container(const std::string& json, const std::string& binary) {
        const auto length = [](const std::string& text) {
            return static_cast<std::uint32_t>(text.size());
        };
        const std::string chunks = number(length(json)) + "JSON" + json + number(length(binary)) +
                                   std::string("BIN\0", 4) + binary;
        return "glTF" + number(2) + number(12 + length(chunks)) + chunks;
    }

    std::string summary_;
};

/// With every kind of primitive, and with texts that look like what is counted.
const std::string documentHead = R"({
  "asset": {"version": "2.0", "extras": {"nodes": [{}, {}], "meshes": [{}]}},
  "scenes": [{"nodes": [0, 1]}],
  "accessors": [{"count": 12, "min": [0, 0]}, {"count": 5}, {"count": 4}, {"count": 6}],
  "meshes": [
    {"primitives": [
      {"attributes": {"POSITION": 1}, "indices": 0},
      {"attributes": {"POSITION": 1, "NORMAL": 0}, "mode": 5},
      {"attributes": {"POSITION": 1}, "indices": 2, "mode": 6},
      {"attributes": {"POSITION": 1}, "indices": 0, "mode": 1},
      {"attributes": {"POSITION": 1}, "indices": 0, "mode": -1},
      {"attributes": {"POSITION": 9}, "indices": 9}]},
    {"primitives": [
      {"mode": 1, "indices": 3, "targets": [{"POSITION": 0}]},
      {"mode": 4, "indices": 3, "attributes": {"POSITION": 1},
       "targets": [{"POSITION": 0}, {"POSITION": 1, "NORMAL": 1}],
       "extensions": {"KHR_draco_mesh_compression": {"bufferView": 0, "attributes": {"POSITION": 0}}}}]}
  ],
  "materials": [{"name": "a"}, {}], "animations": [{"channels": [{}, {}], "samplers": [
    {"input": 1, "output": 0}, {"input": 1, "output": 2}, {"input": 9}]}],
  "skins": [{"joints": [0, 2], "inverseBindMatrices": 1}, {"joints": [1]}],
  "nodes": [{"name": "data:\"}]{"}, {"name": "dat\u0061:,", "children": [2],
             "extensions": {"KHR_materials_common": {"light": 0}}},
            {"name": "\\\"data:\\", "matrix": [1, 0.5, -1e3]}])";

TEST_F(OutputTest, CountsWhatADocumentHolds) {
    const rapidjson::Document report = reportOn(documentHead + "\n}");
    // Triangles: 12 / 3 in a list, 5 - 2 in a strip, 4 - 2 in a fan, and 6 / 3 compressed ones.
    expectJson(report["counts"], R"({"nodes": 3, "meshes": 2, "triangles": 11, "materials": 2,
                                     "images": 0, "skins": 2, "joints": 3, "targets": 2,
                                     "animations": 1, "samples": 10, "lights": 1})");
    const std::string head = path("@/a.out: 1 file, ") + std::to_string(documentHead.size() + 2) +
                             " bytes, 3 nodes, 2 meshes, 11 triangles, 2 materials, 0 images, "
                             "2 skins of 3 joints, 2 morph targets, 1 animation of 10 samples, "
                             "1 light, ";
    EXPECT_TRUE(summary_.starts_with(head)) << summary_;
    EXPECT_TRUE(summary_.ends_with(" s\n")) << summary_;
}

TEST_F(OutputTest, TellsEmbeddedDataFromText) {
    // Lengths around the end of a block of the reader, and an escape in front of the data.
    for (const std::size_t length : {4u, 32000u, 32767u, 32768u, 70001u}) {
        const std::string buffer =
            "data:application/octet-stream;base64," + std::string(length, 'A');
        const std::string image = "data:image/\\\"x\\\\;base64," + std::string(length, 'B');
        const std::string content = documentHead + ", \"buffers\": [{\"uri\": \"" + buffer +
                                    "\", \"byteLength\": 3}], \"images\": [{\"uri\": \"" + image +
                                    "\"}, {\"name\": \"data:" + image.substr(5) + "\"}]}";
        const rapidjson::Document report = reportOn(content);
        const auto& bytes = report["bytes"];
        EXPECT_EQ(bytes["geometry"].GetUint64(), buffer.size()) << length;
        EXPECT_EQ(bytes["images"].GetUint64(), image.size()) << length;
        EXPECT_EQ(bytes["total"].GetUint64(), content.size()) << length;
        EXPECT_EQ(bytes["json"].GetUint64(), content.size() - buffer.size() - image.size());
        EXPECT_EQ(report["counts"]["images"].GetInt(), 2);
        EXPECT_EQ(report["counts"]["triangles"].GetInt(), 11);
    }
}

TEST_F(OutputTest, CountsSideFilesOnce) {
    file("@/a0.bin", std::string(300, 'x'));
    file("@/pic.png", std::string(20, 'x'));
    const std::string content =
        R"({"images": [{"uri": "pic.png"}, {"uri": "gone.png"}, {"uri": "pic.png"}],)"
        R"( "buffers": [{"uri": "a0.bin"}]})";
    const rapidjson::Document report = reportOn(content);
    const auto& files = report["files"];
    ASSERT_EQ(files.Size(), 3u);
    EXPECT_EQ(files[0]["path"].GetString(), path("@/a.out"));
    EXPECT_EQ(files[1]["path"].GetString(), path("@/pic.png"));
    EXPECT_EQ(files[2]["bytes"].GetInt(), 300);
    EXPECT_EQ(report["bytes"]["geometry"].GetInt(), 300);
    EXPECT_EQ(report["bytes"]["images"].GetInt(), 20);
    EXPECT_EQ(report["bytes"]["json"].GetUint64(), content.size());
}

TEST_F(OutputTest, TellsImagesInContainersFromGeometry) {
    const std::string json = R"({"bufferViews": [{"byteLength": 100}, {"byteLength": 40},)"
                             R"( {"byteLength": 8}], "images": [{"bufferView": 1},)"
                             R"( {"bufferView": 2}, {"bufferView": 1}]}  )";
    const std::string content = container(json, std::string(160, 'x'));
    const rapidjson::Document report = reportOn(content);
    EXPECT_EQ(report["bytes"]["total"].GetUint64(), content.size());
    EXPECT_EQ(report["bytes"]["images"].GetInt(), 48);
    EXPECT_EQ(report["bytes"]["geometry"].GetInt(), 112);
    EXPECT_EQ(report["bytes"]["json"].GetUint64(), json.size() + 12 + 8 + 8);
}

TEST_F(OutputTest, BrokenOnesAreFailures) {
    const std::string whole = container(documentHead + "}", "");
    std::string tooLong = whole;
    tooLong[12] = static_cast<char>(tooLong[12] + 40);
    for (const std::string& content : {documentHead, documentHead + "}}", whole.substr(0, 19),
                                       whole.substr(0, whole.size() - 1), tooLong}) {
        const rapidjson::Document report = reportOn(content, 4);
        EXPECT_FALSE(report.HasMember("counts"));
        EXPECT_EQ(summary_, "");
    }
    // What is no such document at all is only measured.
    EXPECT_FALSE(reportOn("plain text").HasMember("counts"));
    EXPECT_TRUE(summary_.starts_with(path("@/a.out: 1 file, 10 bytes, "))) << summary_;
}

TEST_F(OutputTest, PipesAreNotReadBack) {
    ASSERT_EQ(mkfifo(path("@/a.out").c_str(), 0600), 0);
    const int reader = open(path("@/a.out").c_str(), O_RDONLY | O_NONBLOCK);
    EXPECT_EQ(reportOn(documentHead + "}")["files"].Size(), 0u);
    close(reader);
    EXPECT_TRUE(summary_.starts_with(path("@/a.out: written, not counted as"))) << summary_;
}

} // namespace
} // namespace host_test
