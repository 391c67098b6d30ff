#include "host/exit_code.h"
#include "host/paths.h"
#include "host/printing.h"
#include "host/run.h"
#include "host/version.h"

#include "b_string_convert.h"
#include "stream/b_fs.h"

#include <cerrno>
#include <cstring>

namespace host {

namespace {

void loadPlugins(scene::SceneFactory& factory, const base::string& folder) {
    if (!folder.empty() && !base::fs::master().exists(folder))
        throw Failure(ExitCode::usage,
                      folder + ": does not exist, expected a folder with plugins.");
    factory.loadPlugins(folder);
}

/// One line for what can be read and one for what can be written.
base::string formatsText(const scene::SceneFactory& factory) {
    const auto list = [](base::string text) {
        for (char& c : text)
            c = c == ';' ? ' ' : c;
        return text;
    };
    return base::format("input: {}\noutput: {}\n", list(factory.getImporterExtensions()),
                        list(factory.getExporterExtensions()));
}

ExitCode runCommand(const CommandLine& line) {
    StageClock clock;
    clock.begin("discovery");
    checkFilesDiffer(line);
    const Messages messages(line.host);
    const auto factory = base::makeRef<scene::SceneFactory>("scene");
    loadPlugins(*factory, line.host.pluginFolder);
    base::CmdLineOptions registered;
    factory->registerOptions(registered);
    clock.end();

    if (line.host.help || line.host.version || line.host.formats) {
        print(stdout, line.host.help      ? helpText(registered)
                      : line.host.version ? versionText(*factory)
                                          : formatsText(*factory));
        return ExitCode::done;
    }
    parseOptions(line, registered);
    return Run(*factory, line, registered, messages, std::move(clock)).execute();
}

/// `code`, unless what was printed did not get through.
ExitCode flushed(ExitCode code) {
    if (std::fflush(stdout) == 0 && std::ferror(stdout) == 0)
        return code;
    printError(base::format("standard output: {}, expected that it takes the text.",
                            std::strerror(errno)));
    return code == ExitCode::done || code == ExitCode::strict ? ExitCode::output : code;
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
