#pragma once

#include "support/temp_folder.h"

#include <filesystem>
#include <gtest/gtest.h>
#include <rapidjson/document.h>
#include <string>
#include <vector>

namespace host_test {

struct Outcome {
    int exitCode = -1; ///< negative: the number of the signal that ended it
    std::string out;   ///< what it wrote to its standard streams
    std::string err;
};

/// Runs a program without a terminal and waits for its end.
Outcome runProgram(const std::string& program, const std::vector<std::string>& arguments,
                   const std::string& standardOutput = "");

std::string readFile(const std::filesystem::path& path);
/// Checks a value by its text; the order of members does not count.
void expectJson(const rapidjson::Value& value, const char* expected);

/// The program under test in a folder of its own. In arguments and file names "@" stands for
/// that folder.
class ProgramTest : public testing::Test {
protected:
    /// Runs scene_export with the scripted plugins.
    Outcome run(std::vector<std::string> arguments);
    /// Runs it with the plugins beside it.
    Outcome runReal(std::vector<std::string> arguments);
    /// Writes a file and returns its path.
    std::string file(const std::string& name, const std::string& content);
    /// Exports a script and returns what came of it, with the output as "@/a.out".
    Outcome runScript(const std::string& script, std::vector<std::string> options = {});
    std::string path(std::string name) const;
    /// The report "@/report.json".
    rapidjson::Document report() const;
    bool exists(const std::string& name) const { return std::filesystem::exists(path(name)); }

private:
    test_support::TempFolder folder_;
};

} // namespace host_test
