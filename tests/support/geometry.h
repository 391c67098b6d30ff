#pragma once

#include <algorithm>
#include <array>
#include <cmath>
#include <cstddef>
#include <limits>

namespace test_support {

using Vector = std::array<double, 3>;

/// Column by column as in glTF: the element of row r and column c is [4 * c + r].
using Matrix = std::array<double, 16>;

inline Vector operator-(const Vector& a, const Vector& b) {
    return {a[0] - b[0], a[1] - b[1], a[2] - b[2]};
}

inline Vector cross(const Vector& a, const Vector& b) {
    return {a[1] * b[2] - a[2] * b[1], a[2] * b[0] - a[0] * b[2], a[0] * b[1] - a[1] * b[0]};
}

inline double dot(const Vector& a, const Vector& b) {
    return a[0] * b[0] + a[1] * b[1] + a[2] * b[2];
}

inline double length(const Vector& a) {
    return std::sqrt(dot(a, a));
}

inline Vector transformPoint(const Matrix& m, const Vector& p) {
    Vector result;
    for (size_t row = 0; row < 3; ++row) {
        result[row] = m[row] * p[0] + m[4 + row] * p[1] + m[8 + row] * p[2] + m[12 + row];
    }
    return result;
}

inline Matrix operator*(const Matrix& a, const Matrix& b) {
    Matrix product{};
    for (size_t column = 0; column < 4; ++column) {
        for (size_t row = 0; row < 4; ++row) {
            for (size_t k = 0; k < 4; ++k) {
                product[4 * column + row] += a[4 * k + row] * b[4 * column + k];
            }
        }
    }
    return product;
}

/// A rotation as x, y, z, w.
using Quaternion = std::array<double, 4>;

struct Placement {
    Vector translation{0, 0, 0};
    Quaternion rotation{0, 0, 0, 1};
    Vector scale{1, 1, 1};
};

inline Matrix toMatrix(const Placement& placement) {
    const auto& [x, y, z, w] = placement.rotation;
    const auto& [sx, sy, sz] = placement.scale;
    const auto& [tx, ty, tz] = placement.translation;
    return {sx * (1 - 2 * (y * y + z * z)),
            sx * 2 * (x * y + z * w),
            sx * 2 * (x * z - y * w),
            0,
            sy * 2 * (x * y - z * w),
            sy * (1 - 2 * (x * x + z * z)),
            sy * 2 * (y * z + x * w),
            0,
            sz * 2 * (x * z + y * w),
            sz * 2 * (y * z - x * w),
            sz * (1 - 2 * (x * x + y * y)),
            0,
            tx,
            ty,
            tz,
            1};
}

/// The shorter way between two unit quaternions.
inline Quaternion slerp(const Quaternion& a, Quaternion b, double u) {
    double cosine = a[0] * b[0] + a[1] * b[1] + a[2] * b[2] + a[3] * b[3];
    if (cosine < 0) {
        cosine = -cosine;
        b = {-b[0], -b[1], -b[2], -b[3]};
    }
    const double angle = std::acos(std::min(cosine, 1.0)), sine = std::sin(angle);
    const double ofA = sine < 1e-9 ? 1 - u : std::sin((1 - u) * angle) / sine;
    const double ofB = sine < 1e-9 ? u : std::sin(u * angle) / sine;
    Quaternion result;
    for (size_t i = 0; i < 4; ++i) {
        result[i] = ofA * a[i] + ofB * b[i];
    }
    return result;
}

/// An axis-aligned box; empty while the minimum is above the maximum.
struct Box {
    static constexpr double infinity = std::numeric_limits<double>::infinity();

    Vector min{infinity, infinity, infinity};
    Vector max{-infinity, -infinity, -infinity};

    bool isEmpty() const { return min[0] > max[0]; }

    void add(const Vector& point) {
        for (size_t axis = 0; axis < 3; ++axis) {
            min[axis] = std::min(min[axis], point[axis]);
            max[axis] = std::max(max[axis], point[axis]);
        }
    }
};

} // namespace test_support
