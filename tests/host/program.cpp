#include "program.h"

#include <fcntl.h>
#include <fstream>
#include <rapidjson/prettywriter.h>
#include <sstream>
#include <sys/wait.h>
#include <unistd.h>

namespace host_test {

namespace fs = std::filesystem;

namespace {

int openStream(const std::string& path) {
    return open(path.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC, 0600);
}

} // namespace

std::string readFile(const fs::path& path) {
    std::ostringstream text;
    text << std::ifstream(path, std::ios::binary).rdbuf();
    return text.str();
}

void expectJson(const rapidjson::Value& value, const char* expected) {
    rapidjson::Document document;
    document.Parse(expected);
    rapidjson::StringBuffer text;
    rapidjson::PrettyWriter<rapidjson::StringBuffer> writer(text);
    value.Accept(writer);
    EXPECT_TRUE(document == value) << text.GetString();
}

Outcome runProgram(const std::string& program, const std::vector<std::string>& arguments,
                   const std::string& standardOutput) {
    const test_support::TempFolder folder;
    const std::string out = standardOutput.empty() ? folder / "out" : standardOutput;
    const std::string err = folder / "err";
    std::vector<char*> argv = {const_cast<char*>(program.c_str())};
    for (const std::string& argument : arguments)
        argv.push_back(const_cast<char*>(argument.c_str()));
    argv.push_back(nullptr);

    const pid_t child = fork();
    if (child == 0) {
        dup2(openStream(out), STDOUT_FILENO);
        dup2(openStream(err), STDERR_FILENO);
        execv(program.c_str(), argv.data());
        _exit(127);
    }
    int status = 0;
    waitpid(child, &status, 0);
    return {WIFEXITED(status) ? WEXITSTATUS(status) : -WTERMSIG(status),
            standardOutput.empty() ? readFile(out) : "", readFile(err)};
}

std::string ProgramTest::path(std::string name) const {
    for (std::size_t at = name.find('@'); at != std::string::npos; at = name.find('@', at + 1))
        name.replace(at, 1, folder_.path());
    return name;
}

std::string ProgramTest::file(const std::string& name, const std::string& content) {
    std::ofstream(path(name), std::ios::binary) << content;
    return path(name);
}

Outcome ProgramTest::runReal(std::vector<std::string> arguments) {
    for (std::string& argument : arguments)
        argument = path(argument);
    return runProgram(SCENE_EXPORT, arguments);
}

Outcome ProgramTest::run(std::vector<std::string> arguments) {
    arguments.insert(arguments.begin(), {"--plugins", TEST_PLUGINS});
    return runReal(std::move(arguments));
}

Outcome ProgramTest::runScript(const std::string& script, std::vector<std::string> options) {
    file("@/a.script", script);
    options.insert(options.end(), {"@/a.script", "@/a.out"});
    return run(std::move(options));
}

rapidjson::Document ProgramTest::report() const {
    rapidjson::Document document;
    document.Parse(readFile(path("@/report.json")).c_str());
    EXPECT_FALSE(document.HasParseError());
    return document;
}

} // namespace host_test
