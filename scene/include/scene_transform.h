#pragma once

#include "b_attribute_map.h"
#include "scene_schema_document.h"

/// Transforms of nodes. A `base::mat43` acts on column vectors: its rows are those of the linear
/// part, its translation is added after it.
namespace scene {

/// `a` times `b`: what `b` and then `a` do.
base::mat43 multiply(const base::mat43& a, const base::mat43& b);
/// False, with `inverse` untouched, if `matrix` has none: where its columns lie in a plane within
/// the precision of floats.
bool invert(const base::mat43& matrix, base::mat43& inverse);

/// The transform that the attributes of `node` describe by themselves, whatever it inherits.
///
/// A placed node (`transformation` 0):
///
///     T(translate) T(rotatePivot) R T(-rotatePivot) T(scalePivot) Sh S T(-scalePivot)
///
/// with R by `rotateMode` and Sh the rows (1, xy, xz), (0, 1, yz), (0, 0, 1) of `shear`
/// (xy, xz, yz). A node aimed at a point (`transformation` 1), -Z towards it and Y up:
///
///     T(targetPosition + distance * d) Ry(azimuth) Rx(-altitude) E S
///
/// with d the direction of azimuth (from Z to X) and altitude, and E the Euler angles
/// `rotationAxes`. Angles in degrees; a rotation of zero length is the identity. Values may have
/// either precision.
///
/// All twelve numbers of the result are finite as floats: an attribute with a value that is not
/// counts as its default, a result beyond the range as the identity. `repaired` is set to true
/// then and left alone otherwise.
base::mat43 composeTransform(const base::AttribMap& node, bool& repaired);

/// The values of a node's attributes that its transform is composed of.
struct TransformValues {
    base::u8 transformation = node_schema::n_transformation.defaultValue;
    base::u8 rotateMode = node_schema::n_rotateMode.defaultValue;
    base::u8 rotateOrder = node_schema::n_rotateOrder.defaultValue;
    base::vec3d translate = node_schema::n_translate.defaultValue;
    base::quatd rotate = widened(node_schema::n_rotate.defaultValue);
    base::vec3d rotateEuler = widened(node_schema::n_rotateEuler.defaultValue);
    base::vec4d rotateAxisAngle = widened(node_schema::n_rotateAxisAngle.defaultValue);
    base::vec3d scale = widened(node_schema::n_scale.defaultValue);
    base::vec3d shear = widened(node_schema::n_shear.defaultValue);
    base::vec3d rotatePivot, scalePivot;
    base::vec3d targetPosition = node_schema::n_targetPosition.defaultValue;
    base::vec3d rotationAxes = widened(node_schema::n_rotationAxes.defaultValue);
    double distance = node_schema::n_distance.defaultValue;
    double azimuth = node_schema::n_azimuth.defaultValue;
    double altitude = node_schema::n_altitude.defaultValue;
};
// The two steps of `composeTransform`, for who composes the same node many times. Only values
// that matter are read.
TransformValues readTransform(const base::AttribMap& node, bool& repaired);
base::mat43 composeTransform(const TransformValues& values, bool& repaired);

/// What a matrix without shear is made of.
struct TransformParts {
    base::vec3f translation;
    base::quatf rotation;
    base::vec3f scale;
};
/// Splits `matrix` into scale, then rotation, then translation, in floats. Shear is lost. A
/// mirrored matrix gets three negative scales.
TransformParts decomposeTransform(const base::mat43& matrix);

/// Makes `node` a placed one whose attributes compose to `matrix`: translation, quaternion, scale
/// and shear, without pivots. Plain values take the place of whatever was stored, links too;
/// defaults are not stored. A mirrored matrix gets one negative scale, the one that needs the least
/// rotation.
///
/// The translation is exact; each column of the product differs from that of the matrix by less
/// than 5e-7 of its length, which is what a rotation in single precision leaves.
void storeTransform(base::AttribMap& node, const base::mat43& matrix);

} // namespace scene
