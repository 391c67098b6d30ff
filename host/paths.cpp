#include "host/paths.h"

#include "host/exit_code.h"

#include "b_format.h"
#include "b_string_convert.h"
#include "stream/b_fs.h"

namespace host {

using base::string;

namespace {

namespace stdfs = std::filesystem;

bool isSameFile(const stdfs::path& a, const stdfs::path& b) {
    std::error_code error;
    if (stdfs::equivalent(a, b, error))
        return true;
    // Files that are not there yet.
    const stdfs::path first = stdfs::weakly_canonical(a, error);
    return !error && first == stdfs::weakly_canonical(b, error) && !error;
}

} // namespace

stdfs::path systemPath(const string& path) {
    return base::fs::master().resolve(path);
}

bool isSpecialFile(const string& path) {
    std::error_code error;
    const stdfs::file_status status = stdfs::status(systemPath(path), error);
    return stdfs::exists(status) && !stdfs::is_regular_file(status);
}

void checkFilesDiffer(const CommandLine& line, const string& sideFile) {
    struct NamedFile {
        const char* role;
        string path;
    };
    base::vector<NamedFile> files;
    if (line.files.size() == 2)
        files = {{"INPUT", line.files[0]}, {"OUTPUT", line.files[1]}};
    files.push_back({"the log", line.host.logFile});
    files.push_back({"the report", line.host.reportFile});
    files.push_back({"the buffer of OUTPUT", sideFile});

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

string findSideFile(const CommandLine& line, const base::CmdLineOptions& registered) {
    const auto* embedded =
        dynamic_cast<const base::CmdLineValue<bool>*>(registered.find("-exportEmbedded"));
    const string& output = line.files.back();
    if (line.files.size() != 2 || !embedded || !embedded->seen || embedded->values[0] ||
        base::toLower(base::fs::extension(output)) != "gltf")
        return {};
    // The only buffer of a document has the number 0.
    return base::fs::folder(output) + base::fs::stem(output) + "0.bin";
}

void checkInput(const string& path) {
    if (isSpecialFile(path))
        throw Failure(ExitCode::input,
                      base::format("{}: is no regular file, expected a model file.", path));
    base::Stream stream;
    base::fs::master().open(stream, path, base::fs::openRead | base::fs::openShareRead);
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

void checkFolder(const string& path, const char* content) {
    std::error_code error;
    const stdfs::file_status status = stdfs::status(systemPath(path), error);
    if (!stdfs::is_directory(status))
        throw Failure(ExitCode::usage,
                      base::format("{}: {}, expected a folder with {}.", path,
                                   stdfs::exists(status) ? "is no folder" : "does not exist",
                                   content));
}

} // namespace host
