#pragma once

#include "b_config.h"
#include "b_containers.h"
#include "b_memory.h"

namespace base::fs {

/// A new folder below `tmpPath()` that only this user may read, removed with the files in it when
/// the object dies. Files in it have names that nobody else can take.
class BASE1_API TemporaryFolder : NonCopyable {
public:
    /// Throws `api_exception` if it can't be made.
    explicit TemporaryFolder(const string& prefix = "tmp");
    /// What can't be removed is logged, level 3.
    ~TemporaryFolder();

    /// With a separator at its end.
    const string& path() const noexcept { return path_; }

private:
    string path_;
};

} // namespace base::fs
