#pragma once

#include "b_types.h"

#include <cmath>

/// Arithmetic of vectors of three components.
namespace base {

template <class T>
constexpr base_vec3<T> operator+(const base_vec3<T>& a, const base_vec3<T>& b) {
    return {a.x + b.x, a.y + b.y, a.z + b.z};
}
template <class T>
constexpr base_vec3<T> operator-(const base_vec3<T>& a, const base_vec3<T>& b) {
    return {a.x - b.x, a.y - b.y, a.z - b.z};
}
template <class T>
constexpr base_vec3<T> operator-(const base_vec3<T>& v) {
    return {-v.x, -v.y, -v.z};
}
template <class T>
constexpr base_vec3<T> operator*(const base_vec3<T>& v, T factor) {
    return {v.x * factor, v.y * factor, v.z * factor};
}

template <class T>
constexpr T dot(const base_vec3<T>& a, const base_vec3<T>& b) {
    return a.x * b.x + a.y * b.y + a.z * b.z;
}
template <class T>
constexpr base_vec3<T> cross(const base_vec3<T>& a, const base_vec3<T>& b) {
    return {a.y * b.z - a.z * b.y, a.z * b.x - a.x * b.z, a.x * b.y - a.y * b.x};
}
template <class T>
T length(const base_vec3<T>& v) {
    return std::sqrt(dot(v, v));
}

} // namespace base
