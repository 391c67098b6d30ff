#pragma once

#include "b_vector_math.h"
#include "scene_attribute.h"

#include <cfloat>
#include <cmath>

/// Matrices of three rows in double precision, which act on column vectors.
namespace scene {

using Matrix = base::base_mat33<double>;

inline base::vec3d operator*(const Matrix& m, const base::vec3d& v) {
    return {dot(m.r0, v), dot(m.r1, v), dot(m.r2, v)};
}

inline Matrix transposed(const Matrix& m) {
    return {{m.r0.x, m.r1.x, m.r2.x}, {m.r0.y, m.r1.y, m.r2.y}, {m.r0.z, m.r1.z, m.r2.z}};
}

inline Matrix operator*(const Matrix& a, const Matrix& b) {
    const Matrix columns = transposed(b);
    return transposed({a * columns.r0, a * columns.r1, a * columns.r2});
}

inline Matrix widened(const base::mat33f& m) {
    return {widened(m.r0), widened(m.r1), widened(m.r2)};
}

inline base::vec3f narrowed(const base::vec3d& v) {
    return {static_cast<float>(v.x), static_cast<float>(v.y), static_cast<float>(v.z)};
}
inline base::mat33f narrowed(const Matrix& m) {
    return {narrowed(m.r0), narrowed(m.r1), narrowed(m.r2)};
}

inline bool fitsFloat(double value) {
    return std::abs(value) <= static_cast<double>(FLT_MAX);
}
inline bool fitsFloat(const base::vec3d& v) {
    return fitsFloat(v.x) && fitsFloat(v.y) && fitsFloat(v.z);
}
inline bool fitsFloat(const Matrix& m) {
    return fitsFloat(m.r0) && fitsFloat(m.r1) && fitsFloat(m.r2);
}
/// True if all twelve numbers are finite as floats.
inline bool fitsFloat(const base::mat43& matrix) {
    return fitsFloat(widened(matrix.m)) && fitsFloat(matrix.t);
}

/// The rotation of a quaternion of any length.
inline Matrix quaternionRotation(const base::quatd& q) {
    const double length = std::sqrt(q.x * q.x + q.y * q.y + q.z * q.z + q.w * q.w);
    if (!(length > 0))
        return {};
    const double x = q.x / length, y = q.y / length, z = q.z / length, w = q.w / length;
    return {{1 - 2 * (y * y + z * z), 2 * (x * y - z * w), 2 * (x * z + y * w)},
            {2 * (x * y + z * w), 1 - 2 * (x * x + z * z), 2 * (y * z - x * w)},
            {2 * (x * z - y * w), 2 * (y * z + x * w), 1 - 2 * (x * x + y * y)}};
}

} // namespace scene
