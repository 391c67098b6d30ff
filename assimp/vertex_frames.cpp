#include "assimp/vertex_frames.h"

#include "b_vector_math.h"
#include "scene_weld.h"

#include <algorithm>
#include <cmath>
#include <numbers>
#include <span>

namespace assimp {

using base::normal;
using base::u32;
using base::u64;
using base::vec2f;
using base::vec3d;
using base::vec3f;
using base::vec4f;
using base::vector;

namespace {

/// Most corners at one position that are looked at for a normal; of more, every n-th is a fair
/// sample. Keeps the cost linear at the tip of a cone with very many faces.
constexpr u32 maxCornersAround = 256;
/// Added to the cosine of the smoothing angle, so that faces which form just that angle are smooth
/// in spite of rounding.
constexpr float cosineSlack = 1e-5f;
/// Deviation of a squared length from 1 up to which a direction stays as it is: what six decimals
/// in a text file leave.
constexpr float unitTolerance = 4e-6f;

vec3d difference(const vec3f& a, const vec3f& b) {
    return {double(a.x) - b.x, double(a.y) - b.y, double(a.z) - b.z};
}
template <class V>
void add(V& sum, const V& v, decltype(V::x) weight) {
    sum.x += v.x * weight;
    sum.y += v.y * weight;
    sum.z += v.z * weight;
}

/// `v` at unit length; zero if it has none.
vec3f normalized(const vec3d& v) {
    // A maximum first: squares of what is very small or large leave the range.
    const double largest = std::max({std::abs(v.x), std::abs(v.y), std::abs(v.z)});
    if (!(largest > 0) || !std::isfinite(largest))
        return {};
    const vec3d scaled{v.x / largest, v.y / largest, v.z / largest};
    const double f = 1 / std::sqrt(dot(scaled, scaled));
    return {static_cast<float>(scaled.x * f), static_cast<float>(scaled.y * f),
            static_cast<float>(scaled.z * f)};
}

vec3f normalized(const vec3f& v) {
    return normalized(vec3d{v.x, v.y, v.z});
}

/// A direction at right angles to the unit vector `n`.
vec3f perpendicular(const vec3f& n) {
    const vec3f axis = std::abs(n.x) < 0.7f ? vec3f{1, 0, 0} : vec3f{0, 1, 0};
    return normalized(cross(cross(n, axis), n));
}

vec3f directionOf(const normal& n) {
    return {n.x, n.y, n.z};
}
normal normalOf(const vec3f& v) {
    return {v.x, v.y, v.z};
}

/// Calls `use(face, firstCorner, cornerCount)` for every polygon.
template <class Use>
void forEachFace(const Surface& surface, const Use& use) {
    u32 corner = 0;
    for (u32 face = 0; face < surface.cornerCounts.size(); ++face) {
        const u32 count = surface.cornerCounts[face];
        use(face, corner, count);
        corner += count;
    }
}

const vec3f& positionOf(const Surface& surface, u32 corner) {
    return surface.positions[surface.positionIndices[corner]];
}

/// Unit normals of the polygons, also of concave and bent ones (Newell's method); zero for one
/// without area.
vector<vec3f> computeFaceNormals(const Surface& surface) {
    vector<vec3f> normals;
    normals.reserve(surface.cornerCounts.size());
    forEachFace(surface, [&](u32, u32 first, u32 count) {
        const vec3f& origin = positionOf(surface, first);
        vec3d sum{};
        vec3d previous = difference(positionOf(surface, first + 1), origin);
        for (u32 c = first + 2; c < first + count; ++c) {
            const vec3d next = difference(positionOf(surface, c), origin);
            add(sum, cross(previous, next), 1);
            previous = next;
        }
        normals.push_back(normalized(sum));
    });
    return normals;
}

/// Angles of the polygons at their corners, in radians.
vector<float> computeCornerAngles(const Surface& surface) {
    vector<float> angles;
    angles.reserve(surface.positionIndices.size());
    forEachFace(surface, [&](u32, u32 first, u32 count) {
        for (u32 c = 0; c < count; ++c) {
            const vec3f& corner = positionOf(surface, first + c);
            const vec3d next = difference(positionOf(surface, first + (c + 1) % count), corner);
            const vec3d previous =
                difference(positionOf(surface, first + (c + count - 1) % count), corner);
            const vec3d across = cross(next, previous);
            angles.push_back(static_cast<float>(
                std::atan2(std::sqrt(dot(across, across)), dot(next, previous))));
        }
    });
    return angles;
}

vector<u32> computeFacesOfCorners(const Surface& surface) {
    vector<u32> faces;
    faces.reserve(surface.positionIndices.size());
    forEachFace(surface, [&](u32 face, u32, u32 count) {
        for (u32 c = 0; c < count; ++c)
            faces.push_back(face);
    });
    return faces;
}

/// Lists of the corners at each position.
class CornersAround {
public:
    explicit CornersAround(const Surface& surface) : starts_(surface.positions.size() + 1) {
        const vector<u32>& indices = surface.positionIndices;
        u32* starts = starts_.data();
        for (const u32 position : indices)
            ++starts[position + 1];
        for (std::size_t i = 1; i < starts_.size(); ++i)
            starts[i] += starts[i - 1];
        vector<u32> ends = starts_;
        u32* end = ends.data();
        corners_.resizeUninitialized(indices.size());
        u32* corners = corners_.data();
        for (u32 c = 0; c < indices.size(); ++c)
            corners[end[indices[c]]++] = c;
    }

    std::span<const u32> at(u32 position) const {
        const u32* all = corners_.data();
        return {all + starts_[position], all + starts_[position + 1]};
    }

private:
    vector<u32> starts_;
    vector<u32> corners_;
};

vec3d widened(const vec3f& v) {
    return {v.x, v.y, v.z};
}

} // namespace

vector<normal> computeFlatNormals(const Surface& surface) {
    const vector<vec3f> faceNormals = computeFaceNormals(surface);
    vector<normal> normals;
    normals.reserve(surface.positionIndices.size());
    forEachFace(surface, [&](u32 face, u32, u32 count) {
        for (u32 c = 0; c < count; ++c)
            normals.push_back(normalOf(faceNormals[face]));
    });
    repairNormals(normals, surface, true);
    return normals;
}

vector<normal> computeSmoothNormals(const Surface& surface, float angleDegrees) {
    const vector<vec3f> faceNormals = computeFaceNormals(surface);
    const vector<float> angles = computeCornerAngles(surface);
    const vector<u32> faceOfCorner = computeFacesOfCorners(surface);
    const CornersAround around(surface);
    const double limit = std::clamp(double(angleDegrees), 0.0, 180.0) / 180 * std::numbers::pi;
    const float leastCosine = static_cast<float>(std::cos(limit)) - cosineSlack;

    vector<normal> normals;
    normals.reserve(surface.positionIndices.size());
    for (u32 c = 0; c < surface.positionIndices.size(); ++c) {
        const vec3f& own = faceNormals[faceOfCorner[c]];
        const std::span<const u32> neighbours = around.at(surface.positionIndices[c]);
        const std::size_t step = (neighbours.size() + maxCornersAround - 1) / maxCornersAround;
        // The sum runs in the same order for all corners here, so that equal sets of faces give
        // equal bytes, which weld.
        vec3d sum{};
        for (std::size_t i = 0; i < neighbours.size(); i += step) {
            const vec3f& other = faceNormals[faceOfCorner[neighbours[i]]];
            if (dot(own, other) >= leastCosine)
                add(sum, widened(other), double(angles[neighbours[i]]));
        }
        const vec3f mean = normalized(sum);
        normals.push_back(normalOf(mean == vec3f{} ? own : mean));
    }
    repairNormals(normals, surface, true);
    return normals;
}

namespace {

/// What decides which corners share a tangent.
struct TangentKey {
    u32 position;
    normal n;
    vec2f uv;
    float orientation;
};

/// The direction in which u grows over a polygon, and its orientation in texture space: 1, or -1
/// where it is mirrored. Without area there, the direction is zero.
struct TextureFrame {
    vec3d direction;
    float orientation = 1;
};

TextureFrame computeTextureFrame(const Surface& surface, const vector<vec2f>& uvs, u32 first,
                                 u32 count) {
    const auto edge = [&](u32 corner) {
        return difference(positionOf(surface, corner), positionOf(surface, first));
    };
    TextureFrame frame;
    double area = 0;
    for (u32 c = first + 1; c + 1 < first + count; ++c) {
        const double u1 = double(uvs[c].x) - uvs[first].x, v1 = double(uvs[c].y) - uvs[first].y;
        const double u2 = double(uvs[c + 1].x) - uvs[first].x;
        const double v2 = double(uvs[c + 1].y) - uvs[first].y;
        area += u1 * v2 - u2 * v1;
        add(frame.direction, edge(c), v2);
        add(frame.direction, edge(c + 1), -v1);
    }
    if (area < 0) {
        frame.orientation = -1;
        frame.direction = {-frame.direction.x, -frame.direction.y, -frame.direction.z};
    }
    if (area == 0)
        frame.direction = {};
    return frame;
}

} // namespace

vector<vec4f> computeTangents(const Surface& surface, const vector<normal>& normals,
                              const vector<vec2f>& uvs) {
    const vector<float> angles = computeCornerAngles(surface);
    vector<TangentKey> keys;
    vector<vec3f> directions;
    keys.reserve(normals.size());
    directions.reserve(normals.size());
    forEachFace(surface, [&](u32, u32 first, u32 count) {
        const TextureFrame frame = computeTextureFrame(surface, uvs, first, count);
        for (u32 c = first; c < first + count; ++c) {
            const vec3d n = widened(directionOf(normals[c]));
            vec3d along = frame.direction;
            add(along, n, -dot(n, along));
            keys.push_back({surface.positionIndices[c], normals[c], uvs[c], frame.orientation});
            directions.push_back(normalized(along));
        }
    });

    const scene::Welding groups = scene::weld(keys);
    vector<vec3d> sums(groups.firsts.size());
    vec3d* sum = sums.data();
    for (u32 c = 0; c < directions.size(); ++c)
        add(sum[groups.numbers[c]], widened(directions[c]), double(angles[c]));
    vector<vec4f> tangents;
    tangents.reserve(normals.size());
    for (u32 c = 0; c < directions.size(); ++c) {
        const vec3f t = normalized(sum[groups.numbers[c]]);
        tangents.push_back({t.x, t.y, t.z, keys[c].orientation});
    }
    repairTangents(tangents, normals);
    return tangents;
}

u64 repairNormals(vector<normal>& normals, const Surface& surface, bool perCorner) {
    vector<u32> broken;
    normal* elements = normals.data();
    for (u32 i = 0; i < normals.size(); ++i) {
        const vec3f n = directionOf(elements[i]);
        if (std::abs(dot(n, n) - 1) <= unitTolerance)
            continue;
        elements[i] = normalOf(normalized(n));
        if (elements[i] == normal{})
            broken.push_back(i);
    }
    if (broken.empty())
        return 0;

    // Every face at the vertex counts alike.
    vector<vec3d> sums(normals.size());
    const vector<vec3f> faceNormals = computeFaceNormals(surface);
    forEachFace(surface, [&](u32 face, u32 first, u32 count) {
        for (u32 c = first; c < first + count; ++c)
            add(sums[perCorner ? c : surface.positionIndices[c]], widened(faceNormals[face]), 1);
    });
    for (const u32 i : std::as_const(broken)) {
        const vec3f n = normalized(sums[i]);
        elements[i] = n == vec3f{} ? normal{0, 1, 0} : normalOf(n);
    }
    return broken.size();
}

u64 repairTangents(vector<vec4f>& tangents, const vector<normal>& normals) {
    u64 brokenCount = 0;
    vec4f* elements = tangents.data();
    for (std::size_t i = 0; i < tangents.size(); ++i) {
        const vec4f& old = elements[i];
        vec3f t{old.x, old.y, old.z};
        const float w = old.w < 0 ? -1.0f : 1.0f;
        if (!(std::abs(dot(t, t) - 1) <= unitTolerance))
            t = normalized(t);
        if (t == vec3f{}) {
            t = perpendicular(directionOf(normals[i]));
            ++brokenCount;
        }
        elements[i] = {t.x, t.y, t.z, w};
    }
    return brokenCount;
}

} // namespace assimp
