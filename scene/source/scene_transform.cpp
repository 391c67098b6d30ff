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

} // namespace scene
