#include "host/exit_code.h"
#include "host/paths.h"
#include "host/printing.h"
#include "host/run.h"
#include "host/version.h"

#include "b_format.h"
#include "scene_document.h"

#include <cerrno>
#include <cstring>

namespace host {

namespace {

void loadPlugins(scene::SceneFactory& factory, const base::string& folder) {
    if (!folder.empty())
        checkFolder(folder, "plugins");
    factory.loadPlugins(folder);
}

/// One line for what can be read and one for what can be written.
base::string formatsText(const scene::SceneFactory& factory) {
    const auto list = [](base::string text) {
        for (const base::string_view extension : scene::sceneDocumentExtensions)
            text.append(text.empty() ? "" : ";").append(extension);
        for (char& c : text)
            c = c == ';' ? ' ' : c;
        return text;
    };
    return base::format("input: {}\noutput: {}\n", list(factory.getImporterExtensions()),
                        list(factory.getExporterExtensions()));
}

ExitCode runLogged(const CommandLine& line, Messages& messages, StageClock clock) {
    const auto factory = base::makeRef<scene::SceneFactory>("scene");
    loadPlugins(*factory, line.host.pluginFolder);
    base::CmdLineOptions registered;
    factory->registerOptions(registered);
    clock.end();

    if (line.host.help || line.host.version || line.host.formats) {
        messages.openLogFile();
        print(stdout, line.host.help      ? helpText(registered)
                      : line.host.version ? versionText(*factory)
                                          : formatsText(*factory));
        return ExitCode::done;
    }
    parseOptions(line, registered);
    checkFilesDiffer(line, findSideFile(line, registered));
    for (const base::string& folder : line.host.resourceFolders)
        checkFolder(folder, "pictures");
    messages.openLogFile();
    return Run(*factory, line, registered, messages, std::move(clock)).execute();
}

/// Tells of an output that failed. Returns the exit code of the run, which would end with `code`.
ExitCode withFailedOutput(ExitCode code, const base::string& text) {
    printError(text);
    return code == ExitCode::done || code == ExitCode::strict ? ExitCode::output : code;
}

ExitCode runCommand(const CommandLine& line) {
    StageClock clock;
    clock.begin("discovery");
    checkFilesDiffer(line, "");
    Messages messages(line.host);
    const ExitCode code = runLogged(line, messages, std::move(clock));
    return messages.close()
               ? code
               : withFailedOutput(code, line.host.logFile + ": the log could not be written "
                                                            "whole, expected room for it.");
}

/// `code`, unless what was printed did not get through.
ExitCode flushed(ExitCode code) {
    if (std::fflush(stdout) == 0 && std::ferror(stdout) == 0)
        return code;
    return withFailedOutput(code, base::format("standard output: {}, expected that it takes the "
                                               "text.",
                                               std::strerror(errno)));
}

ExitCode runGuarded(std::span<const char* const> arguments) {
    try {
        return flushed(runCommand(readCommandLine(arguments)));
    } catch (const Failure& e) {
        for (const base::string& text : std::as_const(e.texts))
            printError(text);
        return e.code;
    } catch (const std::bad_alloc&) {
        printError("there is not enough memory.");
    } catch (const std::exception& e) {
        printError(e.what());
    } catch (...) {
        printError("an unknown exception was thrown.");
    }
    return ExitCode::noExport;
}

} // namespace

} // namespace host

int main(int argumentCount, char** arguments) {
    const std::size_t count = argumentCount < 1 ? 0 : static_cast<std::size_t>(argumentCount) - 1;
    return static_cast<int>(host::runGuarded({arguments + 1, count}));
}
