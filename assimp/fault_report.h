#pragma once

#include "b_log.h"

namespace assimp {

/// Logs counts of what was wrong with a file, one line for each kind that occurred.
class FaultReport {
public:
    /// `path` is that of the file; borrowed.
    explicit FaultReport(const base::string& path) : path_(path) {}

    /// `text` has places for the path and the count.
    void warn(base::u64 count, const char* text) const { tell(base::logWarning, count, text); }
    void inform(base::u64 count, const char* text) const {
        tell(base::logInformation, count, text);
    }

private:
    void tell(int level, base::u64 count, const char* text) const {
        if (count != 0)
            base::log().log(base::logScene, level, text, path_, count);
    }
    const base::string& path_;
};

} // namespace assimp
