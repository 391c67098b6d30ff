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
