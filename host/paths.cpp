#include "host/paths.h"

#include "host/exit_code.h"

#include "b_format.h"
#include "stream/b_fs.h"

#include <filesystem>

namespace host {

using base::string;

namespace {

namespace stdfs = std::filesystem;

/// The path as the operating system sees it.
stdfs::path systemPath(const string& path) {
    return base::fs::master().resolve(path);
}

bool isSameFile(const stdfs::path& a, const stdfs::path& b) {
    std::error_code error;
    if (stdfs::equivalent(a, b, error))
        return true;
    // Files that are not there yet.
    const stdfs::path first = stdfs::weakly_canonical(a, error);
    return !error && first == stdfs::weakly_canonical(b, error) && !error;
}

} // namespace

void checkFilesDiffer(const CommandLine& line) {
    struct NamedFile {
        const char* role;
        string path;
    };
    base::vector<NamedFile> files;
    if (line.files.size() == 2)
        files = {{"INPUT", line.files[0]}, {"OUTPUT", line.files[1]}};
    files.push_back({"the log", line.host.logFile});
    files.push_back({"the report", line.host.reportFile});

    for (const NamedFile* a = files.cbegin(); a != files.cend(); ++a) {
        for (const NamedFile* b = a + 1; b != files.cend(); ++b) {
            if (!a->path.empty() && !b->path.empty() &&
                isSameFile(systemPath(a->path), systemPath(b->path)))
                throw Failure(ExitCode::usage,
                              base::format("{}: {} and {} are the same file, expected two.",
                                           b->path, a->role, b->role));
        }
    }
}

void checkInput(const string& path) {
    std::error_code error;
    const stdfs::file_status status = stdfs::status(systemPath(path), error);
    // Opening a pipe or a device could wait for ever.
    if (stdfs::exists(status) && !stdfs::is_regular_file(status))
        throw Failure(ExitCode::input,
                      base::format("{}: is no regular file, expected a model file.", path));
    try {
        base::Stream stream;
        base::fs::master().open(stream, path, base::fs::openRead | base::fs::openShareRead);
    } catch (const base::api_exception& e) {
        throw Failure(ExitCode::input,
                      base::format("{}: {}: {}, expected a file that can be read.", path, e.what(),
                                   std::generic_category().message(e.code())));
    } catch (const base::exception& e) {
        throw Failure(ExitCode::input,
                      base::format("{}: {} Expected a file that can be read.", path, e.what()));
    }
}

void checkOutput(const string& path) {
    std::error_code error;
    const stdfs::path output = systemPath(path);
    if (stdfs::is_directory(output, error))
        throw Failure(ExitCode::output,
                      base::format("{}: is a folder, expected the name of a file.", path));
    const stdfs::path folder = output.has_parent_path() ? output.parent_path() : stdfs::path(".");
    if (!stdfs::is_directory(folder, error))
        throw Failure(ExitCode::output,
                      base::format("{}: its folder does not exist, expected one that does.", path));
}

} // namespace host
