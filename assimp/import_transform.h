#pragma once

#include "b_attribute_map.h"

struct aiNode;

namespace assimp {

/// The transform of a node relative to its parent; the identity where the file's is not finite.
base::mat43 readTransform(const aiNode& node);

/// Sets the transform attributes of `node`, which has none yet, so that they compose to `matrix`
/// (see `scene::composeTransform`): `translate`, `rotate`, `scale` and `shear`, those that differ
/// from their defaults. A mirrored matrix gets one negative scale, the one that needs the least
/// rotation.
///
/// The translation is exact; each column of the product differs from that of the matrix by less
/// than 5e-7 of its length, which is what a rotation in single precision leaves.
void writeTransform(base::AttribMap& node, const base::mat43& matrix);

} // namespace assimp
