#pragma once

#include "b_types.h"

#include <assimp/matrix4x4.h>

#include <algorithm>
#include <cmath>

namespace assimp {

/// Sets `matrix` to the first three rows of one of the library's. False, with `matrix` untouched,
/// if they are not finite.
inline bool readMatrix(const aiMatrix4x4& m, base::mat43& matrix) {
    if (!std::all_of(&m.a1, &m.a1 + 12, [](float v) { return std::isfinite(v); }))
        return false;
    matrix = {{{m.a1, m.a2, m.a3}, {m.b1, m.b2, m.b3}, {m.c1, m.c2, m.c3}}, {m.a4, m.b4, m.c4}};
    return true;
}

} // namespace assimp
