#pragma once

#include "host/options.h"

#include <filesystem>

namespace host {

/// The path as the operating system sees it.
std::filesystem::path systemPath(const base::string& path);

/// True for a folder, a pipe, a device: what is there but no regular file. Opening one could wait
/// for ever.
bool isSpecialFile(const base::string& path);

/// Throws `Failure` if two of the files of a run are one and the same: input, output, log and
/// report as the command line names them, and `sideFile`, empty for none. Links and other
/// spellings do not hide that.
void checkFilesDiffer(const CommandLine& line, const base::string& sideFile);

/// The file that is written beside OUTPUT: a ".gltf" that does not embed its buffer has it there.
/// Empty for none. `registered` have been parsed.
base::string findSideFile(const CommandLine& line, const base::CmdLineOptions& registered);

/// Throws unless `path` is a regular file that can be opened for reading.
void checkInput(const base::string& path);

/// Throws `Failure` unless `path` could be a file: its folder is there and it is none itself.
void checkOutput(const base::string& path);

/// Throws `Failure` unless `path` is a folder; `content` is what it should hold.
void checkFolder(const base::string& path, const char* content);

} // namespace host
