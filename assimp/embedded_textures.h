#pragma once

#include "b_containers.h"

struct aiScene;
struct aiTexture;

namespace assimp {

class PictureFolder;

/// The texture inside the file that `path`, a name or "*" and a number, stands for: that of this
/// name, else one with this file name in another folder. Null if there is none.
const aiTexture* findEmbedded(const aiScene& scene, base::string_view path);

/// Makes a file of the texture, named after it or, if it has no name, after the number in `path`,
/// and returns its path. Pictures in a format of their own are kept as they are unless only this
/// plugin reads them; all else becomes a PNG. Throws `base::exception` if that fails.
base::string writeEmbedded(const aiTexture& texture, base::string_view path, PictureFolder& folder);

} // namespace assimp
