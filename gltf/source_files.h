#pragma once

#include "b_containers.h"

#include <sys/types.h>
#include <utility>

namespace gltf {

/// The files that a scene is made of, which an export must leave as they are. They are told by what
/// they are, not by their names: links lead to the same file.
class SourceFiles {
public:
    /// What is not there is passed over.
    void add(const base::string& path);
    /// True if `path` leads to one of them.
    bool contains(const base::string& path) const;

private:
    base::set<std::pair<dev_t, ino_t>> files_;
};

/// True if both paths lead to one file.
bool isSameFile(const base::string& a, const base::string& b);

} // namespace gltf
