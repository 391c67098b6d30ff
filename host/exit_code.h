#pragma once

#include "b_containers.h"

#include <exception>

namespace host {

/// What the process ends with. Of several reasons the one that comes first in a run is told, and
/// a file that could not be written before warnings.
enum class ExitCode {
    done = 0,
    usage = 1,    ///< the command line is wrong
    input = 2,    ///< the input could not be read
    noExport = 3, ///< nothing could export it
    output = 4,   ///< a file could not be written
    strict = 5,   ///< warnings or errors, with --strict
};

/// Ends the run with an exit code. Each text is told as an error of its own.
class Failure final : public std::exception {
public:
    Failure(ExitCode failureCode, base::vector<base::string> errorTexts)
        : code(failureCode), texts(std::move(errorTexts)) {}
    Failure(ExitCode failureCode, base::string text) : code(failureCode) {
        texts.push_back(std::move(text));
    }
    const char* what() const noexcept override { return "the run failed"; }

    ExitCode code;
    base::vector<base::string> texts; ///< "PATH: what failed, what was expected"
};

} // namespace host
