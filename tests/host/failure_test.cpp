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
        {"@/missing.script", "@/missing.script: File '@/missing.script' cannot be found!"},
        {"@/folder.script", "@/folder.script: is no regular file"},
        {"@/pipe.script", "@/pipe.script: is no regular file"},
        {"@/a.unknown", "@/a.unknown: no plugin reads files of this kind, expected .script."},
        {"@/none", "@/none: mesh factory: Can't load meshes without an extension!"},
        {"@/a.script", "@/a.script: could not be read"},
    };
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
        {"import fpe", 2, "@/a.script: the reader crashed (signal 8), expected a file"},
        {"import overflow", 2, "@/a.script: the reader crashed (signal 11), expected a file"},
        {"import throw-framework", 2, "@/a.script: thrown on purpose"},
        {"import throw-standard", 2, "@/a.script: thrown on purpose"},
        {"import throw-number", 2, "@/a.script: an unknown exception was thrown."},
        {"import throw-memory", 2, "@/a.script: there is not enough memory"},
        {"export throw-framework", 3, "@/a.out: thrown on purpose"},
        {"export throw-number", 3, "@/a.out: an unknown exception was thrown."},
        {"export throw-memory", 3, "@/a.out: there is not enough memory"},
        {"export nothing", 3, "@/a.out: there is nothing to write"},
        // A writer that crashes is a fault of this program and stays visible as one.
        {"export abort", -6, ""},
    };
    for (const auto& row : rows) {
        expectFailure(runScript(row.script), row.exitCode, row.error);
        EXPECT_FALSE(exists("@/a.out")) << row.script;
    }
}

TEST_F(FailureTest, OutputsThatCannotBeMade) {
    file("@/a.script", "---\n");
    file("@/a.obj", "v 0 0 0\nv 1 0 0\nv 0 1 0\nf 1 2 3\n");
    std::filesystem::create_directory(path("@/folder.glb"));
    for (const char* name : {"@/full.glb", "@/full.gltf"})
        std::filesystem::create_symlink("/dev/full", path(name));
    const struct {
        std::vector<std::string> arguments;
        int exitCode;
        const char* error;
    } rows[] = {
        {{"@/a.obj", "@/a.foo"}, 3, "@/a.foo: no plugin writes files of this kind, expected .gltf"},
        {{"@/a.obj", "@/a"}, 3, "without an extension!, expected .gltf, .glb."},
        {{"@/a.obj", "@/none/a.glb"}, 4, "@/none/a.glb: its folder does not exist"},
        {{"@/a.obj", "@/folder.glb"}, 4, "@/folder.glb: is a folder"},
        {{"@/a.obj", "/proc/a.glb"}, 4, "Can't open '/proc/a.glb'"},
        {{"@/a.obj", "@/full.glb"}, 4, "trying to write 4 bytes, written 0 bytes"},
        {{"@/a.obj", "@/full.gltf", "--strict"}, 4, "@/full.gltf: not all files could be written"},
    };
    for (const auto& row : rows)
        expectFailure(runReal(row.arguments), row.exitCode, row.error);
    // The report is a file like the others.
    const Outcome outcome = runReal({"--report", "/dev/full", "@/a.obj", "@/a.glb"});
    expectFailure(outcome, 4, "/dev/full: stream '/dev/full': trying to write");
    EXPECT_TRUE(exists("@/a.glb"));
}

TEST_F(FailureTest, TheLogDecidesTheExitCode) {
    const struct {
        const char* script;
        int exitCode, strictExitCode;
    } rows[] = {
        {"log 4 told", 0, 0},
        {"log 3 odd", 0, 5},
        {"log 2 bad", 0, 5},
        {"log 1 worst", 0, 5},
        {"log 2 Unable to delete temporary file!", 0, 0},
        {"log 2 Unable to write the GLTF file!", 4, 4},
        {"log 2 Couldn't write the image to external file!", 4, 4},
        {"log 2 Couldn't write the binary buffer to external file!", 4, 4},
        {"log 2 Unable to write the GLTF file! Unhandled exception has occurred!", 4, 4},
        {"log 3 odd\nimport throw-number", 2, 2},
    };
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
}

} // namespace
} // namespace host_test
