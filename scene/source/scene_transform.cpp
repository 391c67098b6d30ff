#include "scene_transform.h"

#include "scene_matrix.h"
#include "scene_schema.h"

#include <cmath>
#include <numbers>

namespace scene {

namespace {

using base::mat33f;
using base::mat43;
using base::vec3d;
using base::vec3f;

/// Share of the product of the column lengths below which a determinant is rounding noise.
constexpr double singularRatio = 1e-7;

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

bool isFinite(double v) {
    return std::isfinite(v);
}
template <class T>
bool isFinite(const T& v) {
    if constexpr (requires { v.w; }) {
        if (!std::isfinite(v.w))
            return false;
    }
    return std::isfinite(v.x) && std::isfinite(v.y) && std::isfinite(v.z);
}

/// Reads a node's attributes; those with a number that is not finite count as their default.
class NodeReader {
public:
    NodeReader(const base::AttribMap& node, bool& repaired)
        : node_(node), entries_(node.entries()), mayInherit_(node.parent() != nullptr),
          repaired_(repaired) {}

    /// Sets `value`, which is the default, to that of the attribute.
    template <class Attribute, class T>
    void read(const Attribute& attribute, T& value) {
        const base::Attribute* own = findOwn(attribute);
        if (!own && !mayInherit_)
            return;
        T found = value;
        const std::span components(reinterpret_cast<double*>(&found),
                                   sizeof found / sizeof(double));
        if (!own || !loadReal(*own, components))
            found = readReal(node_, attribute);
        if (isFinite(found))
            value = found;
        else
            repaired_ = true;
    }
    void read(const DefaultedAttribute<Enumeration>& attribute, base::u8& value) {
        if (findOwn(attribute) || mayInherit_)
            value = scene::read(node_, attribute);
    }

private:
    /// Nodes have few attributes, so a walk beats the general look-up. A link is found as such.
    const base::Attribute* findOwn(base::name_id name) const {
        for (const auto& [key, attribute] : entries_)
            if (key == name)
                return attribute;
        return nullptr;
    }

    const base::AttribMap& node_;
    const base::vector<base::AttribMap::Entry>& entries_;
    bool mayInherit_;
    bool& repaired_;
};

Matrix scaling(const vec3d& s) {
    return {{s.x, 0, 0}, {0, s.y, 0}, {0, 0, s.z}};
}

Matrix rotationOf(const TransformValues& v) {
    switch (v.rotateMode) {
    case 0:
        return eulerRotation(v.rotateEuler, v.rotateOrder);
    case 1: {
        const base::vec4d& turn = v.rotateAxisAngle;
        return axisRotation({turn.x, turn.y, turn.z}, turn.w);
    }
    default:
        return quaternionRotation(v.rotate);
    }
}

struct Affine {
    Matrix linear;
    vec3d translation;
};

Affine composePlaced(const TransformValues& v) {
    const Matrix rotation = rotationOf(v);
    const Matrix deformation =
        Matrix{{1, v.shear.x, v.shear.y}, {0, 1, v.shear.z}, {0, 0, 1}} * scaling(v.scale);
    const vec3d turned = rotation * (v.scalePivot - v.rotatePivot - deformation * v.scalePivot);
    return {rotation * deformation, v.translate + v.rotatePivot + turned};
}

Affine composeAimed(const TransformValues& v) {
    const Matrix aim = rotationY(v.azimuth) * rotationX(-v.altitude);
    const Matrix own = eulerRotation(v.rotationAxes, 0) * scaling(v.scale);
    return {aim * own, v.targetPosition + aim * vec3d{0, 0, v.distance}};
}

/// A node aimed at a point.
bool isAimed(const TransformValues& values) {
    return values.transformation == 1;
}

void readRotation(NodeReader& node, TransformValues& values) {
    node.read(node_schema::n_rotateMode, values.rotateMode);
    switch (values.rotateMode) {
    case 0:
        node.read(node_schema::n_rotateEuler, values.rotateEuler);
        node.read(node_schema::n_rotateOrder, values.rotateOrder);
        break;
    case 1:
        node.read(node_schema::n_rotateAxisAngle, values.rotateAxisAngle);
        break;
    default:
        node.read(node_schema::n_rotate, values.rotate);
        break;
    }
}

} // namespace

TransformValues readTransform(const base::AttribMap& map, bool& repaired) {
    NodeReader node(map, repaired);
    TransformValues values;
    node.read(node_schema::n_transformation, values.transformation);
    if (isAimed(values)) {
        node.read(node_schema::n_azimuth, values.azimuth);
        node.read(node_schema::n_altitude, values.altitude);
        node.read(node_schema::n_distance, values.distance);
        node.read(node_schema::n_rotationAxes, values.rotationAxes);
        node.read(node_schema::n_targetPosition, values.targetPosition);
    } else {
        readRotation(node, values);
        node.read(node_schema::n_shear, values.shear);
        node.read(node_schema::n_rotatePivot, values.rotatePivot);
        node.read(node_schema::n_scalePivot, values.scalePivot);
        node.read(node_schema::n_translate, values.translate);
    }
    node.read(node_schema::n_scale, values.scale);
    return values;
}

mat43 composeTransform(const TransformValues& values, bool& repaired) {
    const Affine result = isAimed(values) ? composeAimed(values) : composePlaced(values);
    if (!fitsFloat(result.linear) || !fitsFloat(result.translation)) {
        repaired = true;
        return {};
    }
    return {narrowed(result.linear), result.translation};
}

mat43 composeTransform(const base::AttribMap& node, bool& repaired) {
    return composeTransform(readTransform(node, repaired), repaired);
}

} // namespace scene
