#pragma once

#include "GLTF/document.h"
#include "scene_transform.h"

/// Transforms of nodes on their way from the scene into the document.
namespace gltf {

/// `matrix` followed by the turn that takes the scene's up axis to Y.
base::mat43 turnedUp(const base::mat43& matrix, base::u8 upAxis);

/// Takes `matrix` apart. What is too large for that gives the identity; false then.
bool splitTransform(const base::mat43& matrix, scene::TransformParts& parts);

/// The sixteen numbers of a matrix, column by column.
std::array<float, 16> columnsOf(const base::mat43& matrix);

base::ref<GLTF::Node::Transform> makeTransform(const base::mat43& matrix);
base::ref<GLTF::Node::Transform> makeTransform(const scene::TransformParts& parts);

} // namespace gltf
