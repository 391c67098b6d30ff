#include "gltf/source_files.h"

#include "stream/b_fs.h"

#include <optional>
#include <sys/stat.h>

namespace gltf {

using base::string;

namespace {

std::optional<std::pair<dev_t, ino_t>> identityOf(const string& path) {
    struct stat status {};
    if (path.find('\0') != string::npos ||
        ::stat(base::fs::master().resolve(path).c_str(), &status) != 0)
        return {};
    return std::pair(status.st_dev, status.st_ino);
}

} // namespace

void SourceFiles::add(const string& path) {
    if (const auto identity = identityOf(path))
        files_.insert(*identity);
}

bool SourceFiles::contains(const string& path) const {
    const auto identity = identityOf(path);
    return identity && files_.contains(*identity);
}

bool isSameFile(const string& a, const string& b) {
    const auto identity = identityOf(a);
    return identity && identity == identityOf(b);
}

} // namespace gltf
