#include "host/options.h"

#include "host/exit_code.h"

#include "b_attribute_map.h"
#include "b_format.h"
#include "b_string_convert.h"
#include "scene_options.h"

#include <algorithm>
#include <numeric>
#include <variant>

namespace host {

using base::CmdLineOption;
using base::CmdLineOptions;
using base::string;
using base::string_view;
using base::u32;
using base::vector;

namespace {

/// An option of the program: a switch that is counted, a text, or a list with one text for each
/// time that it is given.
struct HostOption {
    string_view name;
    string_view value; ///< what the value is called in the help; empty for a switch
    std::variant<u32 HostOptions::*, string HostOptions::*, vector<string> HostOptions::*> target;
    string_view help;
};

constexpr HostOption hostOptions[] = {
    {"--help", "", &HostOptions::help, "Prints this text."},
    {"--version", "", &HostOptions::version,
     "Prints the versions of the program, of the plugins and of the libraries they run on."},
    {"--formats", "", &HostOptions::formats,
     "Prints the file extensions that can be read and written."},
    {"--dry-run", "", &HostOptions::dryRun,
     "Reads INPUT, checks its meshes and tells what would be written, but writes nothing."},
    {"--dump", "", &HostOptions::dump,
     "Reads INPUT and prints its scene as a tree of objects. There is no OUTPUT then."},
    {"--strict", "", &HostOptions::strict,
     "Ends with exit code 5 if there was any warning or error. The files are written all the "
     "same."},
    {"--quiet", "", &HostOptions::quiet,
     "Prints errors alone: no warnings, no progress, no summary."},
    {"--verbose", "", &HostOptions::verbose,
     "Prints information too; given twice, also what helps to find faults in the program."},
    {"--log", "FILE", &HostOptions::logFile,
     "Writes all messages to FILE, as HTML if its name ends with .html."},
    {"--report", "FILE", &HostOptions::reportFile,
     "Writes a JSON report to FILE: options, counts, sizes, pictures, times, messages, and what "
     "the scene holds that was not exported."},
    {"--plugins", "DIR", &HostOptions::pluginFolder,
     "Loads the plugins from DIR in place of the program's folder."},
    {"--resources", "DIR", &HostOptions::resourceFolders,
     "Looks for picture files in DIR as well; given several times, in that order."},
};

const HostOption* findHostOption(string_view name) {
    const auto* found = std::ranges::find(hostOptions, name, &HostOption::name);
    return found == std::end(hostOptions) ? nullptr : found;
}

void setHostOption(HostOptions& options, const HostOption& option, const char* value) {
    if (const auto* count = std::get_if<u32 HostOptions::*>(&option.target)) {
        ++(options.**count);
        return;
    }
    if (!value || !*value)
        throw Failure(ExitCode::usage, base::format("option '{}': expected {} behind it.",
                                                    option.name, option.value));
    if (const auto* list = std::get_if<vector<string> HostOptions::*>(&option.target)) {
        (options.**list).push_back(value);
        return;
    }
    string& text = options.*std::get<string HostOptions::*>(option.target);
    if (!text.empty())
        throw Failure(ExitCode::usage, base::format("option '{}' given twice.", option.name));
    text = value;
}

// What is wrong with the other options

/// Insertions, deletions and replacements that lead from one name to the other, in which dashes
/// and capitals do not count.
std::size_t distanceOf(string_view from, string_view to) {
    const auto bare = [](string_view name) {
        return base::toLower(name.substr(std::min(name.find_first_not_of('-'), name.size())));
    };
    const string a = bare(from), b = bare(to);
    vector<std::size_t> row(b.size() + 1); // distances of the beginning of `a` to those of `b`
    std::iota(row.begin(), row.end(), std::size_t(0));
    for (std::size_t i = 0; i < a.size(); ++i) {
        std::size_t diagonal = row[0]++;
        for (std::size_t j = 0; j < b.size(); ++j) {
            const std::size_t replaced = diagonal + (a[i] != b[j]);
            diagonal = row[j + 1];
            row[j + 1] = std::min({replaced, diagonal + 1, row[j] + 1});
        }
    }
    return row[b.size()];
}

/// The known name that is most like `name`, empty if none is much like it.
string_view nearestName(string_view name, const CmdLineOptions& registered) {
    string_view nearest;
    std::size_t least = 2 + name.size() / 4;
    const auto consider = [&](string_view candidate) {
        const std::size_t distance = distanceOf(name, candidate);
        if (distance < least) {
            least = distance;
            nearest = candidate;
        }
    };
    for (const base::CmdLineGroup& group : registered.groups())
        for (const base::ref<CmdLineOption>& option : group.options)
            consider(option->name);
    for (const HostOption& option : hostOptions)
        consider(option.name);
    return nearest;
}

string unknownOption(const string& name, const CmdLineOptions& registered) {
    const string_view nearest = nearestName(name, registered);
    return nearest.empty()
               ? base::format("option '{}' is unknown.", name)
               : base::format("option '{}' is unknown, did you mean '{}'?", name, nearest);
}

/// What values the option takes; empty where its own messages tell it.
string_view expectedValue(const CmdLineOption& option) {
    if (dynamic_cast<const base::CmdLineValue<bool>*>(&option))
        return "true or false";
    if (dynamic_cast<const base::CmdLineValue<u32>*>(&option))
        return "a whole number from 0 to 4294967295";
    if (dynamic_cast<const base::CmdLineValue<base::u8>*>(&option))
        return "a whole number from 0 to 255";
    if (dynamic_cast<const base::CmdLineValue<float>*>(&option))
        return "a number";
    return {};
}

void parseOption(const GivenOption& given, const CmdLineOptions& registered,
                 vector<string>& errors) {
    CmdLineOption* option = registered.find(given.name);
    if (!option || given.name.starts_with("--")) {
        errors.push_back(unknownOption(given.name, registered));
        return;
    }
    vector<string> found;
    const bool isRepeated = option->seen;
    option->parse(given.name, given.values, found);
    for (const string& error : std::as_const(found)) {
        string text(base::trimmed(error));
        const string_view expected = expectedValue(*option);
        if (!isRepeated && !expected.empty())
            text += given.values.empty() ? base::format(" Expected {}.", expected)
                                         : base::format(" Expected {}, got '{}'.", expected,
                                                        std::as_const(given.values)[0]);
        errors.push_back(std::move(text));
    }
}

/// What can be told of values only by those who use them: words of settings.
void checkValues(const CmdLineOptions& registered, vector<string>& errors) {
    vector<string> found;
    for (const char* group : {"importer", "exporter"}) {
        base::AttribMap scratch;
        scene::applyOptions(registered, group, scratch, found);
    }
    for (const string& error : std::as_const(found))
        errors.push_back(string(base::trimmed(error)));
}

void appendOption(string& text, string_view line, string_view help) {
    text.append("  ").append(line).append("\n");
    text.append("      ").append(help).append("\n");
}

} // namespace

CommandLine readCommandLine(std::span<const char* const> arguments) {
    CommandLine line;
    bool filesOnly = false;
    for (std::size_t i = 0; i < arguments.size(); ++i) {
        const string_view argument = arguments[i];
        const char* next = i + 1 < arguments.size() ? arguments[i + 1] : nullptr;
        if (filesOnly || !argument.starts_with('-')) {
            line.files.push_back(string(argument));
        } else if (argument == "--") {
            filesOnly = true;
        } else if (const HostOption* option = findHostOption(argument)) {
            setHostOption(line.host, *option, next);
            i += option->value.empty() ? 0 : 1;
        } else {
            GivenOption given{string(argument), {}};
            if (next && !argument.starts_with("--")) {
                given.values.push_back(next);
                ++i;
            }
            line.options.push_back(std::move(given));
        }
    }
    return line;
}

void parseOptions(const CommandLine& line, CmdLineOptions& registered) {
    vector<string> errors;
    for (const GivenOption& given : line.options)
        parseOption(given, registered, errors);
    checkValues(registered, errors);
    if (line.host.quiet && line.host.verbose)
        errors.push_back("options '--quiet' and '--verbose' exclude each other.");
    if (line.files.size() != (line.host.dump ? 1 : 2))
        errors.push_back(base::format(
            "expected {}, found {} {}.", line.host.dump ? "INPUT alone" : "INPUT and OUTPUT",
            line.files.size(), line.files.size() == 1 ? "path" : "paths"));
    if (errors.empty())
        return;
    errors.push_back("the command line is wrong, 'scene_export --help' tells what is right.");
    throw Failure(ExitCode::usage, std::move(errors));
}

string helpText(const CmdLineOptions& registered) {
    string text = "Usage: scene_export [options] INPUT OUTPUT\n"
                  "       scene_export --dump [options] INPUT\n\n"
                  "Reads the model or scene document INPUT and writes it as OUTPUT. The extensions "
                  "of the names\ntell the formats; .scene and .scene.json are scene documents.\n\n"
                  "Options of the program:\n";
    for (const HostOption& option : hostOptions) {
        string line(option.name);
        if (!option.value.empty())
            line.append(" ").append(option.value);
        appendOption(text, line, option.help);
    }
    appendOption(text, "--", "Ends the options: what follows are INPUT and OUTPUT.");
    for (const base::CmdLineGroup& group : registered.groups()) {
        text += base::format("\nOptions of the {}, each with a value behind it:\n", group.name);
        for (const base::ref<CmdLineOption>& option : group.options) {
            const string lines = option->help();
            for (const string_view line : base::split(lines, '\n'))
                if (!line.empty())
                    text.append("  ").append(line).append("\n");
        }
    }
    return text += "\nExit codes: 0 done, 1 wrong command line, 2 INPUT could not be read, 3 "
                   "nothing could export it,\n4 a file could not be written, 5 warnings or errors "
                   "with --strict.\n";
}

} // namespace host
