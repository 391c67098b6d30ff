#include "stream/b_temporary_folder.h"

#include "b_log.h"
#include "stream/b_fs.h"

#include <cerrno>
#include <cstdlib>
#include <filesystem>

namespace base::fs {

TemporaryFolder::TemporaryFolder(const string& prefix) : path_(tmpPath() + prefix + "XXXXXX") {
    if (!mkdtemp(path_.data()))
        throw api_exception("Can't make a folder in '" + tmpPath() + "'", errno,
                            "b_temporary_folder", "base::fs::TemporaryFolder", __LINE__);
    path_ += '/';
}

TemporaryFolder::~TemporaryFolder() {
    std::error_code error;
    std::filesystem::remove_all(path_, error);
    if (error)
        log().log(logSystem, logWarning, "file system |{}| Can't remove the folder: {}", path_,
                  error.message());
}

} // namespace base::fs
