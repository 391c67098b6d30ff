#pragma once

#include "b_containers.h"
#include "b_types.h"

#include <optional>

namespace host {

struct WrittenFile {
    base::string path;
    base::u64 bytes = 0;
};

/// What stands in a glTF document. Triangles are those of the meshes, each mesh once; those of
/// compressed primitives are counted as their accessors declare them.
struct DocumentCounts {
    base::u64 nodes = 0;
    base::u64 meshes = 0;
    base::u64 triangles = 0;
    base::u64 materials = 0;
    base::u64 images = 0;
    base::u64 skins = 0;
    base::u64 joints = 0;  ///< of all skins
    base::u64 targets = 0; ///< morph targets, of each mesh once, whatever its primitives
    base::u64 animations = 0;
    base::u64 samples = 0; ///< key times of all animated properties
    base::u64 lights = 0;

    // The bytes of all files by kind, as they lie there: embedded data counts with its encoding.
    base::u64 jsonBytes = 0; ///< the text without the data, and what frames the parts
    base::u64 geometryBytes = 0;
    base::u64 imageBytes = 0;
};

/// What an export has written.
struct Output {
    /// The main file, then those that it refers to. None if the main file is a pipe or a device.
    base::vector<WrittenFile> files;
    std::optional<DocumentCounts> document; ///< none if the main file is no glTF document
    std::optional<base::u64> objects;       ///< of a scene document

    base::u64 totalBytes() const;
};

/// Reads the main file `path` and looks for the files that it refers to; only regular files are
/// opened. Throws `base::exception` if it can't be read or is broken.
Output readOutput(const base::string& path);

/// Looks up the sizes of the files of a scene document with so many objects.
Output findOutput(const base::vector<base::string>& paths, base::u64 objects);

} // namespace host
