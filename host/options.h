#pragma once

#include "b_cmdline.h"

#include <span>

/// The command line: options of the program itself, with two dashes, and the registered ones of
/// the scene, its importers and exporters, with one dash and exactly one value.
namespace host {

/// The program's own options. Switches count how often they were given.
struct HostOptions {
    base::u32 help = 0;
    base::u32 version = 0;
    base::u32 formats = 0;
    base::u32 quiet = 0;
    base::u32 verbose = 0;
    base::u32 strict = 0;
    base::u32 dryRun = 0;
    base::u32 dump = 0;
    base::string logFile; ///< these three are empty for none
    base::string pluginFolder;
    base::string reportFile;
    base::vector<base::string> resourceFolders; ///< in the order in which they are searched
};

struct GivenOption {
    base::string name;                 ///< with its dashes
    base::vector<base::string> values; ///< one, or none at the end of the line
};

struct CommandLine {
    HostOptions host;
    base::vector<GivenOption> options; ///< those that are not the program's own, in order
    base::vector<base::string> files;
};

/// Takes the arguments behind the program's name apart. "--" ends the options; what follows an
/// option with one dash is its value, whatever it looks like. Throws `Failure`.
CommandLine readCommandLine(std::span<const char* const> arguments);

/// Gives the options of `line` to those registered and checks the number of files. Throws
/// `Failure` with all that is wrong.
void parseOptions(const CommandLine& line, base::CmdLineOptions& registered);

/// The text of --help.
base::string helpText(const base::CmdLineOptions& registered);

} // namespace host
