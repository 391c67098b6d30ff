#include "assimp/import_axes.h"

#include "b_vector_math.h"

#include <assimp/scene.h>

#include <algorithm>
#include <cmath>
#include <optional>

namespace assimp {

using base::mat33f;
using base::vec3f;

namespace {

/// A real number stored in any of the types that occur.
std::optional<double> findNumber(const aiMetadata& data, const char* key) {
    if (double value; data.Get(key, value))
        return value;
    if (float value; data.Get(key, value))
        return value;
    if (int value; data.Get(key, value))
        return value;
    return {};
}

/// One axis of the file with its sign as a row; zero if the entries are not there or no axis.
vec3f findAxis(const aiMetadata& data, const char* key, const char* signKey) {
    const double sign = findNumber(data, signKey).value_or(1) < 0 ? -1 : 1;
    const double axis = findNumber(data, key).value_or(-1);
    const auto along = [&](double number) { return static_cast<float>(axis == number ? sign : 0); };
    return {along(0), along(1), along(2)};
}

/// Metres per unit; the file counts in centimetres.
float findScale(const aiMetadata& data) {
    const double factor = findNumber(data, "UnitScaleFactor").value_or(100);
    return std::isfinite(factor) && factor > 0 ? static_cast<float>(factor * 0.01) : 1.0f;
}

// The usual frames with X or Z up, which the exporter knows.
constexpr mat33f xUp{{0, -1, 0}, {1, 0, 0}, {0, 0, 1}};
constexpr mat33f zUp{{1, 0, 0}, {0, 0, 1}, {0, -1, 0}};

/// True if `matrix` is `turn` at some scale, which is returned, and nothing else.
bool isScaledTurn(const aiMatrix4x4& matrix, const mat33f& turn, float& scale) {
    const aiMatrix4x4 wanted(turn.r0.x, turn.r0.y, turn.r0.z, 0, turn.r1.x, turn.r1.y, turn.r1.z, 0,
                             turn.r2.x, turn.r2.y, turn.r2.z, 0, 0, 0, 0, 1);
    scale = std::max({std::abs(matrix.a1), std::abs(matrix.a2), std::abs(matrix.a3)});
    aiMatrix4x4 scaling;
    aiMatrix4x4::Scaling(aiVector3D(scale), scaling);
    return scale > 0 && (wanted * scaling).Equal(matrix, 1e-6f * scale);
}

void takeTurnOfRoot(aiMatrix4x4& root, SceneAxes& axes) {
    float scale = 1;
    if (isScaledTurn(root, xUp, scale))
        axes.upAxis = 0;
    else if (isScaledTurn(root, zUp, scale))
        axes.upAxis = 2;
    else
        return;
    aiMatrix4x4::Scaling(aiVector3D(scale), root);
}

} // namespace

SceneAxes readAxes(aiScene& source, bool withTurnedRoot) {
    SceneAxes result;
    if (withTurnedRoot)
        takeTurnOfRoot(source.mRootNode->mTransformation, result);
    if (!source.mMetaData || withTurnedRoot)
        return result;
    const aiMetadata& data = *source.mMetaData;
    const float scale = findScale(data);
    result.transform.m = {{scale, 0, 0}, {0, scale, 0}, {0, 0, scale}};

    // To the right, up and to the viewer: the directions that become X, Y and Z.
    const mat33f turn{findAxis(data, "CoordAxis", "CoordAxisSign"),
                      findAxis(data, "UpAxis", "UpAxisSign"),
                      findAxis(data, "FrontAxis", "FrontAxisSign")};
    // Three axes, each once; else the entries are no frame.
    const vec3f normal = cross(turn.r0, turn.r1);
    if (normal == vec3f{} || (normal != turn.r2 && normal != -turn.r2))
        return result;

    if (turn == xUp)
        result.upAxis = 0;
    else if (turn == zUp)
        result.upAxis = 2;
    else
        result.transform.m = {turn.r0 * scale, turn.r1 * scale, turn.r2 * scale};
    return result;
}

} // namespace assimp
