#include "gltf/node_transform.h"

#include "gltf/vertex_array.h"

namespace gltf {

using base::mat43;
using base::ref;
using base::vec3f;
using scene::TransformParts;

namespace {

vec3f negated(const vec3f& v) {
    return {-v.x, -v.y, -v.z};
}

} // namespace

mat43 turnedUp(const mat43& matrix, base::u8 upAxis) {
    const auto& [m, t] = matrix;
    switch (upAxis) {
    case 0:
        return {{negated(m.r1), m.r0, m.r2}, {-t.y, t.x, t.z}};
    case 2:
        return {{m.r0, m.r2, negated(m.r1)}, {t.x, t.z, -t.y}};
    default:
        return matrix;
    }
}

bool splitTransform(const mat43& matrix, TransformParts& parts) {
    parts = scene::decomposeTransform(matrix);
    static_assert(sizeof parts == 10 * sizeof(float));
    if (isFinite(&parts.translation.x, 10))
        return true;
    parts = {{}, {}, {1, 1, 1}};
    return false;
}

std::array<float, 16> columnsOf(const mat43& matrix) {
    const auto& [m, t] = matrix;
    std::array<float, 16> columns{};
    const vec3f rows[] = {m.r0, m.r1, m.r2};
    for (std::size_t row = 0; row < 3; ++row) {
        columns[row] = rows[row].x;
        columns[4 + row] = rows[row].y;
        columns[8 + row] = rows[row].z;
    }
    columns[12] = static_cast<float>(t.x);
    columns[13] = static_cast<float>(t.y);
    columns[14] = static_cast<float>(t.z);
    columns[15] = 1;
    return columns;
}

ref<GLTF::Node::Transform> makeTransform(const mat43& matrix) {
    return base::makeRef<GLTF::Node::TransformMatrix>(columnsOf(matrix).data(), true);
}

ref<GLTF::Node::Transform> makeTransform(const TransformParts& source) {
    const auto& [translation, rotation, scale] = source;
    auto parts = base::makeRef<GLTF::Node::TransformTRS>();
    parts->translation = {translation.x, translation.y, translation.z};
    parts->rotation = {rotation.x, rotation.y, rotation.z, rotation.w};
    parts->scale = {scale.x, scale.y, scale.z};
    return parts;
}

} // namespace gltf
