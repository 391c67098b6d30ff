#include "scene_transform.h"

#include "scene_matrix.h"
#include "scene_schema.h"

#include <algorithm>
#include <cfloat>
#include <cmath>
#include <limits>
#include <memory>

namespace scene {

using base::mat33f;
using base::mat43;
using base::vec3d;
using base::vec3f;

namespace {

/// Lengths up to this are zero when a matrix is taken apart.
constexpr float zeroLength = 1e-12f;

/// Divides `v` by its length, which is returned; a vector without length stays.
float normalize(vec3f& v) {
    float length = std::sqrt(dot(v, v));
    if (!(length <= std::numeric_limits<float>::max())) { // the squares are beyond floats
        const double x = v.x, y = v.y, z = v.z;
        length = static_cast<float>(
            std::min<double>(std::sqrt(x * x + y * y + z * z), std::numeric_limits<float>::max()));
    }
    if (length > zeroLength)
        v = {v.x / length, v.y / length, v.z / length};
    return length;
}

/// Takes the component along the unit vector `axis` from `v`.
void removeAlong(vec3f& v, const vec3f& axis) {
    const float d = dot(v, axis);
    v = {v.x - d * axis.x, v.y - d * axis.y, v.z - d * axis.z};
}

/// The quaternion of the rotation with columns c0, c1, c2, not normalised.
base::quatf quaternionOf(const vec3f& c0, const vec3f& c1, const vec3f& c2) {
    const float t = c0.x + c1.y + c2.z + 1;
    if (t > 0.0001f) {
        const float s = 0.5f / std::sqrt(t);
        return {(c1.z - c2.y) * s, (c2.x - c0.z) * s, (c0.y - c1.x) * s, 0.25f / s};
    }
    // A half turn or nearly so: begin with the largest component.
    if (c0.x > c1.y && c0.x > c2.z) {
        const float root = std::sqrt(1 + c0.x - c1.y - c2.z), s = 0.5f / root;
        return {root / 2, (c1.x + c0.y) * s, (c2.x + c0.z) * s, (c1.z - c2.y) * s};
    }
    if (c1.y > c2.z) {
        const float root = std::sqrt(1 + c1.y - c0.x - c2.z), s = 0.5f / root;
        return {(c1.x + c0.y) * s, root / 2, (c2.y + c1.z) * s, (c2.x - c0.z) * s};
    }
    const float root = std::sqrt(1 + c2.z - c0.x - c1.y), s = 0.5f / root;
    return {(c2.x + c0.z) * s, (c2.y + c1.z) * s, root / 2, (c0.y - c1.x) * s};
}

base::quatf normalized(const base::quatf& q) {
    const float n = q.x * q.x + q.y * q.y + q.z * q.z + q.w * q.w;
    if (!(n > zeroLength))
        return {};
    if (std::abs(n - 1) < 1e-8f)
        return q;
    const float f = 1 / std::sqrt(n);
    return {q.x * f, q.y * f, q.z * f, q.w * f};
}

} // namespace

TransformParts decomposeTransform(const mat43& matrix) {
    const mat33f& m = matrix.m;
    vec3f c0{m.r0.x, m.r1.x, m.r2.x}, c1{m.r0.y, m.r1.y, m.r2.y}, c2{m.r0.z, m.r1.z, m.r2.z};
    TransformParts parts;
    parts.translation = narrowed(matrix.t);
    parts.scale.x = normalize(c0);
    removeAlong(c1, c0);
    parts.scale.y = normalize(c1);
    removeAlong(c2, c0);
    removeAlong(c2, c1);
    parts.scale.z = normalize(c2);
    if (dot(c0, cross(c1, c2)) < 0) {
        c0 = -c0, c1 = -c1, c2 = -c2;
        parts.scale = -parts.scale;
    }
    parts.rotation = normalized(quaternionOf(c0, c1, c2));
    return parts;
}

namespace {

/// Share of a column's length below which what is left of it, or a shear, is rounding noise.
constexpr double noise = 2e-7;

/// Three directions, the columns of a rotation. Those not found yet are zero.
struct Frame {
    vec3d axes[3];

    /// `v` without its components along the axes, which are taken off twice: once leaves rounding
    /// errors where `v` is nearly along one.
    vec3d without(vec3d v) const {
        for (int pass = 0; pass < 2; ++pass)
            for (const vec3d& axis : axes)
                v = v - axis * dot(v, axis);
        return v;
    }
};

const vec3d unitAxes[3] = {{1, 0, 0}, {0, 1, 0}, {0, 0, 1}};

/// Directions of the columns, each at right angles to those before it. A column that has none of
/// its own gets one that completes the others.
Frame orthogonalize(const vec3d (&columns)[3]) {
    Frame frame;
    for (int i = 0; i < 3; ++i) {
        const vec3d rest = frame.without(columns[i]);
        const double size = length(rest);
        if (size > noise * length(columns[i]))
            frame.axes[i] = rest * (1 / size);
    }
    for (int i = 0; i < 3; ++i) {
        // One of the three unit axes is far enough from any plane.
        for (int k = 0; frame.axes[i] == vec3d{} && k < 3; ++k) {
            const vec3d rest = frame.without(unitAxes[(i + k) % 3]);
            if (length(rest) > 0.5)
                frame.axes[i] = rest * (1 / length(rest));
        }
    }
    return frame;
}

/// Makes a rotation of a mirrored frame by turning the axis round that lies least along its own.
void unmirror(Frame& frame) {
    vec3d(&axes)[3] = frame.axes;
    if (dot(axes[0], cross(axes[1], axes[2])) >= 0)
        return;
    int least = 0;
    for (int i = 1; i < 3; ++i)
        if (dot(axes[i], unitAxes[i]) < dot(axes[least], unitAxes[least]))
            least = i;
    axes[least] = -axes[least];
}

base::quatf rotationOf(const Frame& frame) {
    const vec3d &a = frame.axes[0], &b = frame.axes[1], &c = frame.axes[2];
    // Squares of the components, four times; the largest one is safe to divide by.
    const double squares[4] = {1 + a.x - b.y - c.z, 1 - a.x + b.y - c.z, 1 - a.x - b.y + c.z,
                               1 + a.x + b.y + c.z};
    int largest = 3;
    for (int i = 0; i < 3; ++i)
        if (squares[i] > squares[largest])
            largest = i;
    const double yz = b.z + c.y, zx = c.x + a.z, xy = a.y + b.x;
    const double wx = b.z - c.y, wy = c.x - a.z, wz = a.y - b.x;
    const base::quatd multiples[4] = {{squares[0], xy, zx, wx},
                                      {xy, squares[1], yz, wy},
                                      {zx, yz, squares[2], wz},
                                      {wx, wy, wz, squares[3]}};
    const base::quatd& q = multiples[largest];
    const double f = 0.5 / std::sqrt(squares[largest]);
    return {static_cast<float>(q.x * f), static_cast<float>(q.y * f), static_cast<float>(q.z * f),
            static_cast<float>(q.w * f)};
}

/// A scale that is not lost against the shear of its column. A column along those before it would
/// need an endless shear; a sliver of scale makes it a long one.
float scaleOf(double scale, double sheared) {
    const double least = noise / 2 * sheared;
    const double kept = std::abs(scale) < least ? std::copysign(least, scale) : scale;
    return static_cast<float>(std::clamp<double>(kept, -FLT_MAX, FLT_MAX));
}

float shearOf(double value, float scale, double columnLength) {
    if (std::abs(value) <= noise * columnLength || scale == 0)
        return 0;
    return static_cast<float>(value / static_cast<double>(scale));
}

/// Puts `value` in the place of whatever is stored. A default need not be, unless the parent map
/// would supply something else.
template <class T>
void replace(base::AttribMap& node, const DefaultedAttribute<T>& attribute, const T& value) {
    node.removeAttribute(attribute);
    if (value == attribute.defaultValue && !node.findAttribute(attribute, false))
        return;
    auto made = std::make_unique<base::TypedAttribute<T>>(value);
    node.attribute(attribute, made.get());
    made.release();
}

} // namespace

void storeTransform(base::AttribMap& node, const mat43& matrix) {
    const Matrix m = transposed(widened(matrix.m));
    const vec3d columns[3] = {m.r0, m.r1, m.r2};
    Frame frame = orthogonalize(columns);
    unmirror(frame);
    const base::quatf rotation = rotationOf(frame);

    // What the rotation as it will be stored leaves of the matrix: shear times scale, the entries
    // on and above the diagonal.
    const Matrix rest =
        transposed(quaternionRotation(scene::widened(rotation))) * widened(matrix.m);
    const double xy = rest.r0.y, xz = rest.r0.z, yz = rest.r1.z;
    const vec3f scale{scaleOf(rest.r0.x, 0), scaleOf(rest.r1.y, std::abs(xy)),
                      scaleOf(rest.r2.z, std::hypot(xz, yz))};
    const double lengthY = length(columns[1]), lengthZ = length(columns[2]);
    const vec3f shear{shearOf(xy, scale.y, lengthY), shearOf(xz, scale.z, lengthZ),
                      shearOf(yz, scale.z, lengthZ)};

    replace(node, node_schema::n_transformation, Enumeration{0});
    replace(node, node_schema::n_rotateMode, Enumeration{2});
    replace(node, node_schema::n_translate, matrix.t);
    replace(node, node_schema::n_rotate, rotation);
    replace(node, node_schema::n_scale, scale);
    replace(node, node_schema::n_shear, shear);
    node.removeAttribute(node_schema::n_rotatePivot);
    node.removeAttribute(node_schema::n_scalePivot);
}

} // namespace scene
