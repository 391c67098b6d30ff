#pragma once

#include "host/options.h"

namespace host {

/// Throws `Failure` if two of the files that the command line names are one and the same: input,
/// output, log and report. Links and other spellings do not hide that.
void checkFilesDiffer(const CommandLine& line);

/// Throws `Failure` unless `path` is a regular file that can be opened for reading.
void checkInput(const base::string& path);

/// Throws `Failure` unless `path` could be a file: its folder is there and it is none itself.
void checkOutput(const base::string& path);

} // namespace host
