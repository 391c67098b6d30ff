#pragma once

#include "b_containers.h"

namespace assimp {

/// Finds the files that a model names as textures, which seldom lie where they lay when it was
/// made.
class TextureSearch {
public:
    /// `resourcePaths` are further folders to look in.
    TextureSearch(const base::string& modelPath, base::vector<base::string> resourcePaths);

    /// The first regular file among these places, relative to the current folder if the model's
    /// path is:
    /// - the path as the model has it, relative to the model's folder unless it is absolute,
    /// - its file name in that folder and in the usual folders for textures inside and beside it,
    /// - the path and the file name in each resource folder,
    /// - the file name in the model's folder with other capital letters.
    ///
    /// Each also with the escapes of a URI ("%20") resolved. Empty if there is none; `tried` then
    /// has the paths that were looked for.
    base::string find(base::string_view texturePath, base::vector<base::string>& tried);

private:
    base::vector<base::string> listPlaces(const base::string& path) const;
    base::string findIgnoringCase(const base::string& name);

    base::string folder_;
    base::vector<base::string> resourcePaths_;
    base::vector<base::string> entries_; ///< names of files in the folder, once they are needed
    bool hasEntries_ = false;
};

} // namespace assimp
