#pragma once

#include "b_types.h"

#include <cmath>

namespace assimp {

/// `q` at length 1; no numbers if it has no length.
inline base::quatf normalized(const base::quatd& q) {
    const double length = std::sqrt(q.x * q.x + q.y * q.y + q.z * q.z + q.w * q.w);
    const auto share = [&](double v) { return static_cast<float>(v / length); };
    return {share(q.x), share(q.y), share(q.z), share(q.w)};
}

/// What `b` and then `a` turn, at length 1.
inline base::quatf product(const base::quatf& a, const base::quatf& b) {
    const double x = a.x, y = a.y, z = a.z, w = a.w;
    return normalized({w * b.x + x * b.w + y * b.z - z * b.y, w * b.y - x * b.z + y * b.w + z * b.x,
                       w * b.z + x * b.y - y * b.x + z * b.w,
                       w * b.w - x * b.x - y * b.y - z * b.z});
}

} // namespace assimp
