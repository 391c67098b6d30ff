#include "program.h"

#include <sys/stat.h>

namespace host_test {
namespace {

class FailureTest : public ProgramTest {
protected:
    /// Checks exit code, message and that no output was made and no summary printed.
    void expectFailure(const Outcome& outcome, int exitCode, const std::string& error) {
        EXPECT_EQ(outcome.exitCode, exitCode) << outcome.err;
        EXPECT_NE(outcome.err.find(path(error)), std::string::npos) << error << '\n' << outcome.err;
        EXPECT_EQ(outcome.out, "");
    }
};

TEST_F(FailureTest, InputsThatCannotBeRead) {
    file("@/old.out", "old");
    file("@/a.unknown", "");
    file("@/none", "");
    file("@/a.script", "refuse\n");
    std::filesystem::create_directory(path("@/folder.script"));
    ASSERT_EQ(mkfifo(path("@/pipe.script").c_str(), 0600), 0);
    const struct {
        const char* input;
        const char* error;
    } rows[] = {
        {"@/missing.script", "@/missing.script: File '@/missing.script' cannot be found, expected"},
        {"@/folder.script", "@/folder.script: is no regular file"},
        {"@/pipe.script", "@/pipe.script: is no regular file"},
        {"@/a.unknown",
         "@/a.unknown: no plugin reads files of this kind, expected .script, .scene, .scene.json."},
        {"@/none", "@/none: mesh factory: Can't load meshes without an extension, expected "
                   ".script, .scene, .scene.json."},
        {"@/a.script", "@/a.script: could not be read"}};
    for (const auto& row : rows)
        expectFailure(run({row.input, "@/old.out"}), 2, row.error);
    EXPECT_EQ(readFile(path("@/old.out")), "old");
}

TEST_F(FailureTest, ReadersAndWritersThatFail) {
    const struct {
        const char* script;
        int exitCode;
        const char* error;
    } rows[] = {
        {"import abort", 2, "@/a.script: the reader crashed (signal 6), expected a file"},
        {"import segv", 2, "@/a.script: the reader crashed (signal 11), expected a file"},
        {"import overflow", 2, "@/a.script: the reader crashed (signal 11), expected a file"},
        {"import throw-text", 2, "@/a.script: thrown on purpose, expected a model"},
        {"import throw-number", 2, "@/a.script: an unknown exception was thrown, expected a model"},
        {"import throw-memory", 2, "@/a.script: there is not enough memory"},
        {"export throw-text", 3, "@/a.out: thrown on purpose, expected a scene"},
        {"export throw-number", 3, "@/a.out: an unknown exception was thrown, expected a scene"},
        {"export throw-memory", 3, "@/a.out: there is not enough memory"},
        {"export nothing", 3, "@/a.out: there is nothing to write"},
        // A writer that crashes is a fault of this program and stays visible as one.
        {"export abort", -6, ""}};
    for (const auto& row : rows) {
        expectFailure(runScript(row.script), row.exitCode, row.error);
        EXPECT_FALSE(exists("@/a.out")) << row.script;
    }
}

TEST_F(FailureTest, OutputsThatCannotBeMade) {
    file("@/a.obj", "v 0 0 0\nv 1 0 0\nv 0 1 0\nf 1 2 3\n");
    for (const char* name : {"@/folder.glb", "@/folder.html"})
        std::filesystem::create_directory(path(name));
    std::filesystem::create_symlink(path("@/a.obj"), path("@/w0.bin"));
    for (const char* name : {"@/full.glb", "@/full.gltf", "@/full.html"})
        std::filesystem::create_symlink("/dev/full", path(name));
    const struct {
        std::vector<std::string> arguments;
        int exitCode;
        const char* error;
    } rows[] = {
        {{"@/a.obj", "@/a.foo"}, 3, "@/a.foo: no plugin writes files of this kind, expected .gltf"},
        {{"@/a.obj", "@/a"}, 3, "without an extension, expected .gltf, .glb, .scene, .scene.json."},
        {{"@/a.obj", "@/o.gltf", "-exportEmbedded", "no", "--report", "@/o0.bin"},
         1,
         "the report and the buffer of OUTPUT are"},
        {{"@/a.obj", "@/w.GLTF", "-exportEmbedded", "0"}, 1, "INPUT and the buffer of OUTPUT are"},
        {{"@/a.obj", "@/none/a.glb"}, 4, "@/none/a.glb: its folder does not exist"},
        {{"@/a.obj", "@/folder.glb"}, 4, "@/folder.glb: is a folder"},
        {{"@/a.obj", "/proc/a.glb"}, 4, "Can't open '/proc/a.glb'"},
        {{"@/a.obj", "@/full.glb"}, 4, "trying to write 4 bytes, written 0 bytes"},
        {{"@/a.obj", "@/a.glb", "--report", "/dev/full"}, 4, "written 0 bytes, expected a file"},
        {{"@/a.obj", "@/a.glb", "--log", "@/none/l"}, 4, "@/none/l: its folder does not exist"},
        {{"@/a.obj", "@/a.glb", "--log", "@/folder.html"}, 4, "@/folder.html: is a folder"},
        {{"@/a.obj", "@/a.glb", "--log", "/proc/l"}, 4, "/proc/l: can't be opened for the log"},
        {{"@/a.obj", "@/a.glb", "--log", "/proc/l.html"}, 4, "/proc/l.html: can't be opened"},
        {{"@/a.obj", "@/a.glb", "--quiet", "--log", "/dev/full"}, 4, "/dev/full: the log could"},
        {{"@/a.obj", "@/a.glb", "--quiet", "--log", "@/full.html"},
         4,
         "@/full.html: the log could"},
        {{"@/a.obj", "@/full.gltf", "--strict"}, 4, "@/full.gltf: not all files could be written"}};
    for (const auto& row : rows)
        expectFailure(runReal(row.arguments), row.exitCode, row.error);
    EXPECT_TRUE(exists("@/a.glb") && exists("@/folder.html"));
    // Embedded buffers have no file that could clash.
    EXPECT_EQ(runReal({"@/a.obj", "@/o.gltf", "--report", "@/o0.bin"}).exitCode, 0);
    EXPECT_EQ(runReal({"@/a.obj", "@/w.glb", "-exportEmbedded", "0"}).exitCode, 0);
}

TEST_F(FailureTest, TheLogDecidesTheExitCode) {
    const struct {
        const char* script;
        int exitCode, strictExitCode;
    } rows[] = {{"log 4 told", 0, 0},
                {"log 3 odd", 0, 5},
                {"log 2 bad", 0, 5},
                {"log 1 worst", 0, 5},
                {"log 2 Unable to delete temporary file!", 0, 0},
                {"log 2 Unable to write the GLTF file!", 4, 4},
                {"log 2 Couldn't write the image to external file!", 4, 4},
                {"log 2 Couldn't write the binary buffer to external file!", 4, 4},
                {"log 2 Unable to write the GLTF file! Unhandled exception has occurred!", 4, 4},
                {"log 2 Unhandled exception while closing 'a0.bin'!", 4, 4},
                {"log 3 odd\nimport throw-number", 2, 2}};
    for (const auto& row : rows) {
        const std::string script = row.script + std::string("\n---\nx");
        EXPECT_EQ(runScript(script).exitCode, row.exitCode) << row.script;
        EXPECT_EQ(runScript(script, {"--strict"}).exitCode, row.strictExitCode) << row.script;
    }
}

TEST_F(FailureTest, MissingPluginsAreTold) {
    std::filesystem::create_directory(path("@/plugins"));
    file("@/plugins/scene_text.so", "this is no library");
    file("@/a.obj", "");
    const Outcome outcome = runReal({"--plugins", "@/plugins", "@/a.obj", "@/a.glb"});
    expectFailure(outcome, 2, "expected a plugin for it in @/plugins.");
    for (const char* part : {"Can't open importers.txt!", "Failed to load scene plugin '"})
        EXPECT_NE(outcome.err.find(part), std::string::npos) << outcome.err;
    expectFailure(runReal({"--plugins", "@/nowhere", "--formats"}), 1, "@/nowhere: does not exist");
    expectFailure(runReal({"--plugins", "@/a.obj", "--formats"}), 1, "@/a.obj: is no folder");
}

} // namespace
} // namespace host_test
