#pragma once

#include <cfloat>
#include <compare>
#include <cstddef>
#include <cstdint>
#include <limits>
#include <type_traits>

/// Plain value types of the framework: integers, small vectors, matrices, boxes, time and date.
/// All are trivially copyable, hold their components in declaration order without padding
/// (except where stated) and compare component by component.
namespace base {

using i8 = std::int8_t;
using u8 = std::uint8_t;
using i16 = std::int16_t;
using u16 = std::uint16_t;
using i32 = std::int32_t;
using u32 = std::uint32_t;
using i64 = std::int64_t;
using u64 = std::uint64_t;

template <class T>
struct base_vec2 {
    T x{}, y{};
    auto operator<=>(const base_vec2&) const = default;
};

template <class T>
struct base_vec3 {
    T x{}, y{}, z{};
    auto operator<=>(const base_vec3&) const = default;
};

template <class T>
struct base_vec4 {
    T x{}, y{}, z{}, w{};
    auto operator<=>(const base_vec4&) const = default;
};

/// Rotation as x, y, z (imaginary parts) and w; a new one is the identity.
template <class T>
struct base_quat {
    T x{}, y{}, z{}, w{1};
    auto operator<=>(const base_quat&) const = default;
};

template <class T>
struct base_color4 {
    T r{}, g{}, b{}, a{1};
    auto operator<=>(const base_color4&) const = default;
};

/// Square matrices as rows; they act on column vectors. A new one is the identity.
template <class T>
struct base_mat22 {
    base_vec2<T> r0{1, 0}, r1{0, 1};
    auto operator<=>(const base_mat22&) const = default;
};

template <class T>
struct base_mat33 {
    base_vec3<T> r0{1, 0, 0}, r1{0, 1, 0}, r2{0, 0, 1};
    auto operator<=>(const base_mat33&) const = default;
};

template <class T>
struct base_mat44 {
    base_vec4<T> r0{1, 0, 0, 0}, r1{0, 1, 0, 0}, r2{0, 0, 1, 0}, r3{0, 0, 0, 1};
    auto operator<=>(const base_mat44&) const = default;
};

/// Affine transform: a linear part `m` of three rows and a translation `t` of its own precision.
/// 60 bytes of content; `sizeof` is 64 for the float/double form because of alignment.
template <class T = float, class Translation = double, class Linear = base_mat33<T>>
struct base_mat43 {
    Linear m{};
    base_vec3<Translation> t{};
    auto operator<=>(const base_mat43&) const = default;
};

/// Axis-aligned box. A new box is empty: each `min` is the greatest finite value of the
/// component type and each `max` the least, so that the first point included sets both.
template <class V>
struct base_box {
    using Component = decltype(V::x);
    static constexpr V filled(Component value) {
        V v;
        v.x = value;
        v.y = value;
        if constexpr (requires { v.z; })
            v.z = value;
        return v;
    }

    V min = filled(std::numeric_limits<Component>::max());
    V max = filled(std::numeric_limits<Component>::lowest());
    auto operator<=>(const base_box&) const = default;

    /// True if any axis has no extent, not even a point.
    constexpr bool isEmpty() const {
        bool empty = min.x > max.x || min.y > max.y;
        if constexpr (requires { min.z; })
            empty = empty || min.z > max.z;
        return empty;
    }
};

/// Direction of unit length: three tightly packed floats, 12 bytes. A type of its own, so that
/// an attribute tells normals from positions.
struct normal {
    float x = 0, y = 0, z = 0;
    auto operator<=>(const normal&) const = default;
};

/// Signed count of ticks, 46186158000 to the second.
struct TimeCode {
    static constexpr i64 ticksPerSecond = 46186158000;
    static constexpr double secondsPerTick = 2.165150866196751e-11;

    i64 ticks = 0;
    auto operator<=>(const TimeCode&) const = default;

    constexpr double seconds() const { return static_cast<double>(ticks) * secondsPerTick; }
};

/// Calendar date and time in UTC; all zero means none.
struct DateTime {
    i16 year = 0;
    u8 month = 0, day = 0, hour = 0, minute = 0, second = 0, reserved = 0;
    auto operator<=>(const DateTime&) const = default;
};

struct rational {
    i32 numerator = 0, denominator = 0;
    auto operator<=>(const rational&) const = default;
};

/// Marks objects whose lengths have a unit; holds nothing.
struct Distance {};

using vec2f = base_vec2<float>;
using vec3f = base_vec3<float>;
using vec4f = base_vec4<float>;
using vec2d = base_vec2<double>;
using vec3d = base_vec3<double>;
using vec4d = base_vec4<double>;
using quatf = base_quat<float>;
using quatd = base_quat<double>;
using color4f = base_color4<float>;
using mat33f = base_mat33<float>;
using mat43 = base_mat43<float, double, base_mat33<float>>;
using box3f = base_box<vec3f>;

/// Conversion of a real number to an integer type: NaN gives 0, everything else is clamped to
/// the range of `T` and truncated towards zero. Defined for every input, unlike the cast.
template <class T, class Real>
constexpr T saturate(Real x) {
    static_assert(std::is_integral_v<T> && std::is_floating_point_v<Real>);
    // The upper bound may round up on conversion; then it is itself out of range.
    constexpr Real low = static_cast<Real>(std::numeric_limits<T>::min());
    constexpr Real high = static_cast<Real>(std::numeric_limits<T>::max());
    if (!(x == x))
        return 0;
    if (x <= low)
        return std::numeric_limits<T>::min();
    if (x >= high)
        return std::numeric_limits<T>::max();
    return static_cast<T>(x);
}

} // namespace base
