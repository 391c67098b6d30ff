#pragma once

#include "b_containers.h"

namespace assimp {

/// False if the file at `path` is a PLY file whose header has no end: no line "end_header" in the
/// first mebibyte. The library's reader looks for that line for ever.
bool isPlyHeaderWhole(const base::string& path);

} // namespace assimp
