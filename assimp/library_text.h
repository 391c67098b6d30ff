#pragma once

#include "b_containers.h"

#include <assimp/types.h>

namespace assimp {

/// Text of the library's, borrowed from it.
inline base::string_view viewOf(const aiString& text) {
    return {text.data, text.length};
}

} // namespace assimp
