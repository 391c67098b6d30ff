#include "program.h"

#include <algorithm>
#include <sstream>

namespace host_test {
namespace {

using Arguments = std::vector<std::string>;

using CommandLineTest = ProgramTest;

/// The options of the scene, an importer or the exporter in the help, each with its default.
Arguments registeredOptions(const std::string& help) {
    Arguments found;
    std::istringstream lines(help);
    for (std::string line; std::getline(lines, line);) {
        const std::size_t begin = line.find("(default: ");
        if (!line.starts_with("  -") || begin == std::string::npos)
            continue;
        found.push_back(line.substr(2, line.find(' ', 2) - 2));
        found.push_back(line.substr(begin + 10, line.rfind(')') - begin - 10));
    }
    return found;
}

TEST_F(CommandLineTest, WrongOnesAreRefusedByName) {
    file("@/a.script", "");
    file("@/a.out", "old");
    std::filesystem::create_symlink(path("@/a.script"), path("@/link.out"));
    const struct {
        Arguments arguments;
        const char* error;
    } rows[] = {
        {{}, "expected INPUT and OUTPUT, found 0 paths."},
        {{"@/a.script"}, "found 1 path."},
        {{"@/a.script", "@/a.out", "@/b.out"}, "found 3 paths."},
        {{"-exportCompres", "false", "@/a.script", "@/a.out"},
         "option '-exportCompres' is unknown, did you mean '-exportCompress'?"},
        {{"--exportCompress", "@/a.script", "@/a.out"}, "did you mean '-exportCompress'?"},
        {{"--Dryrun", "@/a.script", "@/a.out"}, "did you mean '--dry-run'?"},
        {{"--rhinoceros", "@/a.script", "@/a.out"}, "option '--rhinoceros' is unknown.\n"},
        {{"-exportCompress", "perhaps", "@/a.script", "@/a.out"},
         "option '-exportCompress': type mismatch. Expected true or false, got 'perhaps'."},
        {{"-exportImageMaxDim", "-5", "@/a.script", "@/a.out"}, "'-exportImageMaxDim': type"},
        {{"-importTessellation", "0,5", "@/a.script", "@/a.out"}, "'-importTessellation': type"},
        {{"-importNormals", "sometimes", "@/a.script", "@/a.out"}, "never|present|always"},
        {{"-upAxis", "256", "@/a.script", "@/a.out"}, "number from 0 to 255, got '256'."},
        {{"-upAxis", "1", "-upAxis", "2", "@/a.script", "@/a.out"}, "already specified"},
        {{"@/a.script", "@/a.out", "-exportCompress"}, "wrong number of values."},
        {{"@/a.script", "@/a.out", "--log"}, "option '--log': expected FILE"},
        {{"--log", "@/l", "--log", "@/m", "@/a.script", "@/a.out"}, "'--log' given twice"},
        {{"@/a.script", "@/a.out", "--resources", ""}, "option '--resources': expected DIR"},
        {{"--resources", "@", "--resources", "@/x", "@/a.script", "@/a.out"},
         "@/x: does not exist, expected a folder with pictures."},
        {{"--resources", "@/a.out", "@/a.script", "@/a.out"}, "@/a.out: is no folder"},
        {{"--quiet", "--verbose", "@/a.script", "@/a.out"}, "exclude each other"},
        {{"@/a.script", "@/a.script"}, "INPUT and OUTPUT are the same file"},
        {{"@/a.script", "@/link.out"}, "INPUT and OUTPUT are the same file"},
        {{"file://@/a.script", "@/./x/../a.script"}, "INPUT and OUTPUT are the same file"},
        {{"--log", "@/a.script", "@/a.script", "@/a.out"}, "INPUT and the log are the same"},
        {{"--report", "@/./a.out", "@/a.script", "@/a.out"}, "OUTPUT and the report are the same"},
        {{"--report", "@/new", "--log", "@/new", "@/a.script", "@/a.out"}, "are the same file"},
        // All that is wrong is told at once.
        {{"-exportHair", "x", "-nonsense", "1"}, "option '-exportHair': type mismatch."},
        {{"-exportHair", "x", "-nonsense", "1"}, "option '-nonsense' is unknown"},
        {{"-exportHair", "x", "-nonsense", "1"}, "found 0 paths"}};
    for (const auto& row : rows) {
        const Outcome outcome = run(row.arguments);
        EXPECT_EQ(outcome.exitCode, 1) << row.error;
        EXPECT_NE(outcome.err.find(path(row.error)), std::string::npos) << outcome.err;
        EXPECT_TRUE(outcome.err.starts_with("scene_export: error: ")) << outcome.err;
        EXPECT_EQ(outcome.out, "") << row.error;
    }
    EXPECT_EQ(readFile(path("@/a.out")), "old");
    EXPECT_EQ(readFile(path("@/a.script")), "");
}

TEST_F(CommandLineTest, HelpListsOptionsWithDefaultsThatParse) {
    const Outcome help = run({"--help", "--nonsense"});
    EXPECT_EQ(help.exitCode, 0);
    EXPECT_EQ(help.err, "");
    const char* parts[] = {"Usage: scene_export [options] INPUT OUTPUT", "  --report FILE\n",
                           "  -upAxis (default: 1)\n      Set the up axis.\n",
                           "  -exportImageMaxDim (default: 4096)\n      Maximum dimension",
                           "  -importNormals never|present|always (default: always)\n"};
    for (const char* part : parts)
        EXPECT_NE(help.out.find(part), std::string::npos) << part;

    const Arguments options = registeredOptions(help.out);
    EXPECT_EQ(options.size(), 2 * 40u); // 1 of the scene, 25 of importers, 14 of exporters
    const Outcome outcome = runScript("---\nx", options);
    EXPECT_EQ(outcome.exitCode, 0) << outcome.err;
}

TEST_F(CommandLineTest, TakesUnusualValues) {
    EXPECT_EQ(runScript("---\nx", {"-importTessellation", "-2.5", "-upAxis", "255"}).exitCode, 0);
    // Behind "--" everything is a path, and "-" alone is one.
    const Outcome outcome = run({"--quiet", "--", "--help", "-"});
    EXPECT_EQ(outcome.exitCode, 2);
    EXPECT_NE(outcome.err.find("--help"), std::string::npos) << outcome.err;
}

TEST_F(CommandLineTest, TellsFormatsAndVersions) {
    EXPECT_EQ(run({"--formats"}).out, "input: script scene scene.json\n"
                                      "output: out Result|words scene scene.json\n");
    const Outcome real = runReal({"--formats"});
    EXPECT_NE(real.out.find(" obj "), std::string::npos) << real.out;
    EXPECT_TRUE(real.out.ends_with("\noutput: gltf glb scene scene.json\n")) << real.out;
    const Outcome version = run({"--version"});
    EXPECT_EQ(version.exitCode, 0);
    EXPECT_TRUE(version.out.starts_with("scene_export " PROGRAM_VERSION "\n")) << version.out;
    for (const char* part : {"ScriptImporter: acts on command", "/libbase1.so.1.", "/libxxhash.so",
                             "/libgeos_c.so.1.", ", GEOS 3."})
        EXPECT_NE(version.out.find(part), std::string::npos) << version.out;
    EXPECT_EQ(runProgram(SCENE_EXPORT, {"--version"}, "/dev/full").exitCode, 4);
}

TEST_F(CommandLineTest, MessagesGoWhereTheyAreWanted) {
    const std::string script = "log 1 worst\nlog 2 bad\x1b[2J\nlog 3 odd\nlog 4 told\nlog 5 deep\n"
                               "log 2 Unable to delete temporary file!\n---\nx";
    const struct {
        Arguments options;
        std::string shown; ///< last letters of the messages that must be shown
        bool hasSummary;
    } rows[] = {{{}, "wbo", true},
                {{"--quiet"}, "wb", false},
                {{"--verbose"}, "wbot", true},
                {{"--verbose", "--verbose"}, "wbotd", true}};
    for (const auto& row : rows) {
        const Outcome outcome = runScript(script, row.options);
        std::string shown;
        for (const char* text : {"worst", "bad?[2J", "odd", "told", "deep"})
            if (outcome.err.find(text) != std::string::npos)
                shown += text[0];
        EXPECT_EQ(shown, row.shown) << outcome.err;
        EXPECT_EQ(outcome.err.find("delete"), std::string::npos) << outcome.err;
        // Nothing of a bar without a terminal.
        EXPECT_EQ(outcome.err.find('\r'), std::string::npos);
        EXPECT_EQ(outcome.out.starts_with(path("@/a.out: 1 file, 1 byte, ")), row.hasSummary);
        EXPECT_EQ(std::count(outcome.out.begin(), outcome.out.end(), '\n'), row.hasSummary);
        EXPECT_EQ(outcome.exitCode, 0);
    }
}

TEST_F(CommandLineTest, LogFilesTakeAllMessages) {
    const std::string script = "log 2 <bad>\nlog 4 told\nlog 5 deep\n"
                               "log 2 Unable to delete temporary file!\n---\nx";
    EXPECT_EQ(runScript(script, {"--quiet", "--log", "@/run.txt"}).exitCode, 0);
    const std::string text = readFile(path("@/run.txt"));
    EXPECT_NE(text.find("[erro] <bad>\n"), std::string::npos) << text;
    EXPECT_NE(text.find("[info] told\n"), std::string::npos) << text;
    EXPECT_NE(text.find("temporary file!\n"), std::string::npos) << text;
    EXPECT_EQ(text.find("deep"), std::string::npos) << text;

    EXPECT_EQ(runScript(script, {"--verbose", "--verbose", "--log", "@/run.html"}).exitCode, 0);
    const std::string html = readFile(path("@/run.html"));
    EXPECT_NE(html.find("<td class=\"err\"><pre>&lt;bad&gt;</pre></td>"), std::string::npos);
    EXPECT_NE(html.find("deep"), std::string::npos);
    EXPECT_NE(html.find("Terminated at"), std::string::npos);

    // A slip in the command line must not cost the file that was taken for the log.
    for (const Arguments& options : {Arguments{}, Arguments{"-scriptNothing", "1", "@/a.script"}}) {
        Arguments arguments{"--log", "@/run.txt"};
        arguments.insert(arguments.end(), options.begin(), options.end());
        arguments.push_back("@/a.out");
        EXPECT_EQ(run(arguments).exitCode, 1);
        EXPECT_EQ(readFile(path("@/run.txt")), text);
    }
}

} // namespace
} // namespace host_test
