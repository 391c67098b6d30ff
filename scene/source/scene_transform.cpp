#include "scene_transform.h"

#include "scene_schema.h"

#include <algorithm>
#include <array>
#include <cfloat>
#include <cmath>
#include <limits>
#include <numbers>

namespace scene {

namespace {

using base::mat33f;
using base::mat43;
using base::vec3d;
using base::vec3f;
using Matrix = base::base_mat33<double>;

/// Share of the product of the column lengths below which a determinant is rounding noise.
constexpr double singularRatio = 1e-7;
/// Lengths up to this are zero when a matrix is taken apart.
constexpr float zeroLength = 1e-12f;

double dot(const vec3d& a, const vec3d& b) {
    return a.x * b.x + a.y * b.y + a.z * b.z;
}
float dot(const vec3f& a, const vec3f& b) {
    return a.x * b.x + a.y * b.y + a.z * b.z;
}
vec3d operator+(const vec3d& a, const vec3d& b) {
    return {a.x + b.x, a.y + b.y, a.z + b.z};
}
vec3d operator-(const vec3d& a, const vec3d& b) {
    return {a.x - b.x, a.y - b.y, a.z - b.z};
}
vec3f operator-(const vec3f& v) {
    return {-v.x, -v.y, -v.z};
}

template <class V>
V cross(const V& a, const V& b) {
    return {a.y * b.z - a.z * b.y, a.z * b.x - a.x * b.z, a.x * b.y - a.y * b.x};
}

vec3d operator*(const Matrix& m, const vec3d& v) {
    return {dot(m.r0, v), dot(m.r1, v), dot(m.r2, v)};
}

Matrix transposed(const Matrix& m) {
    return {{m.r0.x, m.r1.x, m.r2.x}, {m.r0.y, m.r1.y, m.r2.y}, {m.r0.z, m.r1.z, m.r2.z}};
}

Matrix operator*(const Matrix& a, const Matrix& b) {
    const Matrix columns = transposed(b);
    return transposed({a * columns.r0, a * columns.r1, a * columns.r2});
}

Matrix widened(const mat33f& m) {
    return {scene::widened(m.r0), scene::widened(m.r1), scene::widened(m.r2)};
}

vec3f narrowed(const vec3d& v) {
    return {static_cast<float>(v.x), static_cast<float>(v.y), static_cast<float>(v.z)};
}
mat33f narrowed(const Matrix& m) {
    return {narrowed(m.r0), narrowed(m.r1), narrowed(m.r2)};
}

bool fitsFloat(double value) {
    return std::abs(value) <= static_cast<double>(FLT_MAX);
}
bool fitsFloat(const vec3d& v) {
    return fitsFloat(v.x) && fitsFloat(v.y) && fitsFloat(v.z);
}
bool fitsFloat(const Matrix& m) {
    return fitsFloat(m.r0) && fitsFloat(m.r1) && fitsFloat(m.r2);
}

} // namespace

mat43 multiply(const mat43& a, const mat43& b) {
    const Matrix linear = widened(a.m);
    return {narrowed(linear * widened(b.m)), linear * b.t + a.t};
}

bool invert(const mat43& matrix, mat43& inverse) {
    const Matrix columns = transposed(widened(matrix.m));
    const vec3d &a = columns.r0, &b = columns.r1, &c = columns.r2;
    const double determinant = dot(a, cross(b, c));
    const double size = std::sqrt(dot(a, a)) * std::sqrt(dot(b, b)) * std::sqrt(dot(c, c));
    if (!(std::abs(determinant) > singularRatio * size))
        return false;
    const auto row = [&](const vec3d& v) -> vec3d {
        return {v.x / determinant, v.y / determinant, v.z / determinant};
    };
    const Matrix linear{row(cross(b, c)), row(cross(c, a)), row(cross(a, b))};
    const vec3d translation = linear * (vec3d{} - matrix.t);
    if (!fitsFloat(linear) || !fitsFloat(translation))
        return false;
    inverse = {narrowed(linear), translation};
    return true;
}

namespace {

/// Sine and cosine of an angle in degrees, exact at quarter turns.
struct Turn {
    double sine, cosine;

    explicit Turn(double degrees) {
        const double angle = std::remainder(degrees, 360.0);
        const double quarters = angle / 90.0;
        if (quarters == std::trunc(quarters)) {
            sine = std::abs(quarters) == 1.0 ? quarters : 0.0;
            cosine = quarters == 0.0 ? 1.0 : std::abs(quarters) == 2.0 ? -1.0 : 0.0;
        } else {
            sine = std::sin(angle * (std::numbers::pi / 180.0));
            cosine = std::cos(angle * (std::numbers::pi / 180.0));
        }
    }
};

Matrix rotationX(double degrees) {
    const Turn a(degrees);
    return {{1, 0, 0}, {0, a.cosine, -a.sine}, {0, a.sine, a.cosine}};
}
Matrix rotationY(double degrees) {
    const Turn a(degrees);
    return {{a.cosine, 0, a.sine}, {0, 1, 0}, {-a.sine, 0, a.cosine}};
}
Matrix rotationZ(double degrees) {
    const Turn a(degrees);
    return {{a.cosine, -a.sine, 0}, {a.sine, a.cosine, 0}, {0, 0, 1}};
}

Matrix eulerRotation(const vec3d& degrees, base::u8 order) {
    const Matrix x = rotationX(degrees.x), y = rotationY(degrees.y), z = rotationZ(degrees.z);
    switch (order) {
    case 1:
        return y * z * x;
    case 2:
        return z * x * y;
    case 3:
        return x * z * y;
    case 4:
        return y * x * z;
    case 5:
        return x * y * z;
    default:
        return z * y * x;
    }
}

/// The rotation of a quaternion of any length.
Matrix quaternionRotation(const base::quatd& q) {
    const double length = std::sqrt(q.x * q.x + q.y * q.y + q.z * q.z + q.w * q.w);
    if (!(length > 0))
        return {};
    const double x = q.x / length, y = q.y / length, z = q.z / length, w = q.w / length;
    return {{1 - 2 * (y * y + z * z), 2 * (x * y - z * w), 2 * (x * z + y * w)},
            {2 * (x * y + z * w), 1 - 2 * (x * x + z * z), 2 * (y * z - x * w)},
            {2 * (x * z - y * w), 2 * (y * z + x * w), 1 - 2 * (x * x + y * y)}};
}

Matrix axisRotation(const vec3d& axis, double degrees) {
    const double length = std::sqrt(dot(axis, axis));
    if (!(length > 0))
        return {};
    const vec3d a{axis.x / length, axis.y / length, axis.z / length};
    const Turn turn(degrees);
    const double s = turn.sine, c = turn.cosine, d = 1 - c;
    return {{c + a.x * a.x * d, a.x * a.y * d - a.z * s, a.x * a.z * d + a.y * s},
            {a.y * a.x * d + a.z * s, c + a.y * a.y * d, a.y * a.z * d - a.x * s},
            {a.z * a.x * d - a.y * s, a.z * a.y * d + a.x * s, c + a.z * a.z * d}};
}

/// Reads a node's attributes; those with a number that is not finite count as their default.
class NodeReader {
public:
    NodeReader(const base::AttribMap& node, bool& repaired) : node_(node), repaired_(repaired) {}

    template <class T>
    auto real(const DefaultedAttribute<T>& attribute) {
        return checked(readReal(node_, attribute), scene::widened(attribute.defaultValue));
    }
    vec3d real(const SchemaAttribute<vec3d>& attribute) {
        return checked(readReal(node_, attribute), vec3d{});
    }
    base::u8 code(const DefaultedAttribute<Enumeration>& attribute) {
        return read(node_, attribute);
    }

private:
    static bool isFinite(double v) { return std::isfinite(v); }
    template <class T>
    static bool isFinite(const T& v) {
        if constexpr (requires { v.w; }) {
            if (!std::isfinite(v.w))
                return false;
        }
        return std::isfinite(v.x) && std::isfinite(v.y) && std::isfinite(v.z);
    }
    template <class T>
    T checked(const T& value, const T& defaultValue) {
        if (isFinite(value))
            return value;
        repaired_ = true;
        return defaultValue;
    }

    const base::AttribMap& node_;
    bool& repaired_;
};

Matrix scaling(const vec3d& s) {
    return {{s.x, 0, 0}, {0, s.y, 0}, {0, 0, s.z}};
}

Matrix readRotation(NodeReader& node) {
    switch (node.code(node_schema::n_rotateMode)) {
    case 0:
        return eulerRotation(node.real(node_schema::n_rotateEuler),
                             node.code(node_schema::n_rotateOrder));
    case 1: {
        const base::vec4d turn = node.real(node_schema::n_rotateAxisAngle);
        return axisRotation({turn.x, turn.y, turn.z}, turn.w);
    }
    default:
        return quaternionRotation(node.real(node_schema::n_rotate));
    }
}

struct Affine {
    Matrix linear;
    vec3d translation;
};

Affine composePlaced(NodeReader& node) {
    const Matrix rotation = readRotation(node);
    const vec3d shear = node.real(node_schema::n_shear);
    const Matrix deformation = Matrix{{1, shear.x, shear.y}, {0, 1, shear.z}, {0, 0, 1}} *
                               scaling(node.real(node_schema::n_scale));
    const vec3d rotatePivot = node.real(node_schema::n_rotatePivot);
    const vec3d scalePivot = node.real(node_schema::n_scalePivot);
    const vec3d turned = rotation * (scalePivot - rotatePivot - deformation * scalePivot);
    return {rotation * deformation, node.real(node_schema::n_translate) + rotatePivot + turned};
}

Affine composeAimed(NodeReader& node) {
    const double azimuth = node.real(node_schema::n_azimuth);
    const double altitude = node.real(node_schema::n_altitude);
    const double distance = node.real(node_schema::n_distance);
    const Matrix aim = rotationY(azimuth) * rotationX(-altitude);
    const Matrix own = eulerRotation(node.real(node_schema::n_rotationAxes), 0) *
                       scaling(node.real(node_schema::n_scale));
    return {aim * own, node.real(node_schema::n_targetPosition) + aim * vec3d{0, 0, distance}};
}

} // namespace

mat43 composeTransform(const base::AttribMap& node, bool& repaired) {
    NodeReader reader(node, repaired);
    const bool aimed = reader.code(node_schema::n_transformation) == 1;
    const Affine result = aimed ? composeAimed(reader) : composePlaced(reader);
    if (!fitsFloat(result.linear) || !fitsFloat(result.translation)) {
        repaired = true;
        return {};
    }
    return {narrowed(result.linear), result.translation};
}

namespace {

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

double length(const vec3d& v) {
    return std::sqrt(dot(v, v));
}
vec3d operator*(const vec3d& v, double f) {
    return {v.x * f, v.y * f, v.z * f};
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
    axes[least] = axes[least] * -1;
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
