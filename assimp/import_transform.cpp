#include "assimp/import_transform.h"

#include "scene_schema.h"

#include <assimp/scene.h>

#include <cmath>

namespace assimp {

using base::mat43;
using base::quatd;
using base::quatf;
using base::vec3d;
using base::vec3f;
using scene::node_schema;

namespace {

/// Share of a column's length below which what is left of it, or a shear, is rounding noise.
constexpr double noise = 2e-7;

double dot(const vec3d& a, const vec3d& b) {
    return a.x * b.x + a.y * b.y + a.z * b.z;
}
double length(const vec3d& v) {
    return std::sqrt(dot(v, v));
}
vec3d operator*(const vec3d& v, double f) {
    return {v.x * f, v.y * f, v.z * f};
}
vec3d operator-(const vec3d& a, const vec3d& b) {
    return {a.x - b.x, a.y - b.y, a.z - b.z};
}
vec3d cross(const vec3d& a, const vec3d& b) {
    return {a.y * b.z - a.z * b.y, a.z * b.x - a.x * b.z, a.x * b.y - a.y * b.x};
}

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

double component(const vec3d& v, int i) {
    return i == 0 ? v.x : i == 1 ? v.y : v.z;
}

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
        if (component(axes[i], i) < component(axes[least], least))
            least = i;
    axes[least] = axes[least] * -1;
}

quatf rotationOf(const Frame& frame) {
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
    const quatd multiples[4] = {{squares[0], xy, zx, wx},
                                {xy, squares[1], yz, wy},
                                {zx, yz, squares[2], wz},
                                {wx, wy, wz, squares[3]}};
    const quatd& q = multiples[largest];
    const double f = 0.5 / std::sqrt(squares[largest]);
    return {static_cast<float>(q.x * f), static_cast<float>(q.y * f), static_cast<float>(q.z * f),
            static_cast<float>(q.w * f)};
}

Frame frameOf(const quatf& rotation) {
    const double x = rotation.x, y = rotation.y, z = rotation.z, w = rotation.w;
    const double s = 2 / (x * x + y * y + z * z + w * w);
    return {{{1 - s * (y * y + z * z), s * (x * y + z * w), s * (x * z - y * w)},
             {s * (x * y - z * w), 1 - s * (x * x + z * z), s * (y * z + x * w)},
             {s * (x * z + y * w), s * (y * z - x * w), 1 - s * (x * x + y * y)}}};
}

/// A scale that is not lost against the shear of its column. A column along those before it would
/// need an endless shear; a sliver of scale makes it a long one.
float scaleOf(double scale, double sheared) {
    const double least = noise / 2 * sheared;
    return static_cast<float>(std::abs(scale) < least ? std::copysign(least, scale) : scale);
}

float shearOf(double value, float scale, double columnLength) {
    if (std::abs(value) <= noise * columnLength)
        return 0;
    return static_cast<float>(value / static_cast<double>(scale));
}

template <class T>
void writeUnlessDefault(base::AttribMap& node, const scene::DefaultedAttribute<T>& attribute,
                        const T& value) {
    if (value != attribute.defaultValue)
        write(node, attribute) = value;
}

} // namespace

void writeTransform(base::AttribMap& node, const mat43& matrix) {
    const base::mat33f& m = matrix.m;
    const vec3d columns[3] = {
        {m.r0.x, m.r1.x, m.r2.x}, {m.r0.y, m.r1.y, m.r2.y}, {m.r0.z, m.r1.z, m.r2.z}};
    Frame frame = orthogonalize(columns);
    unmirror(frame);
    const quatf rotation = rotationOf(frame);

    // What the rotation as it will be stored leaves of the matrix: shear times scale, the entries
    // on and above the diagonal.
    const auto [x, y, z] = frameOf(rotation).axes;
    const double xy = dot(x, columns[1]), xz = dot(x, columns[2]), yz = dot(y, columns[2]);
    const vec3f scale{static_cast<float>(dot(x, columns[0])),
                      scaleOf(dot(y, columns[1]), std::abs(xy)),
                      scaleOf(dot(z, columns[2]), std::hypot(xz, yz))};
    const double lengthY = length(columns[1]), lengthZ = length(columns[2]);
    const vec3f shear{shearOf(xy, scale.y, lengthY), shearOf(xz, scale.z, lengthZ),
                      shearOf(yz, scale.z, lengthZ)};

    writeUnlessDefault(node, node_schema::n_translate, matrix.t);
    writeUnlessDefault(node, node_schema::n_rotate, rotation);
    writeUnlessDefault(node, node_schema::n_scale, scale);
    writeUnlessDefault(node, node_schema::n_shear, shear);
}

mat43 readTransform(const aiNode& node) {
    const aiMatrix4x4& m = node.mTransformation;
    const float* values = &m.a1;
    for (int i = 0; i < 12; ++i)
        if (!std::isfinite(values[i]))
            return {};
    return {{{m.a1, m.a2, m.a3}, {m.b1, m.b2, m.b3}, {m.c1, m.c2, m.c3}}, {m.a4, m.b4, m.c4}};
}

} // namespace assimp
