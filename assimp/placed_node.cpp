#include "assimp/placed_node.h"

#include "b_vector_math.h"
#include "scene_schema.h"
#include "scene_transform.h"

#include <algorithm>
#include <cmath>

namespace assimp {

using base::mat43;
using base::vec3d;
using scene::node_schema;

namespace {

/// Components by which a frame may differ from that of the node without being one of its own.
constexpr double frameSlack = 1e-6;

bool isFinite(const aiVector3D& v) {
    return std::isfinite(v.x) && std::isfinite(v.y) && std::isfinite(v.z);
}

/// `v` at unit length, `fallback` if it has none.
vec3d unit(const vec3d& v, const vec3d& fallback) {
    const double size = length(v);
    return size > 1e-12 && std::isfinite(size) ? v * (1 / size) : fallback;
}
vec3d widened(const aiVector3D& v) {
    return {v.x, v.y, v.z};
}

mat43 frameOf(const Placement& placement) {
    const vec3d z = -unit(widened(placement.direction), {0, 0, -1});
    // Any direction will do where up is along the line of sight.
    const vec3d any = std::abs(z.y) < 0.9 ? vec3d{0, 1, 0} : vec3d{0, 0, 1};
    const vec3d x = unit(cross(unit(widened(placement.up), any), z), unit(cross(any, z), {}));
    const vec3d y = cross(z, x);
    const auto row = [](double a, double b, double c) -> base::vec3f {
        return {static_cast<float>(a), static_cast<float>(b), static_cast<float>(c)};
    };
    return {{row(x.x, y.x, z.x), row(x.y, y.y, z.y), row(x.z, y.z, z.z)},
            isFinite(placement.position) ? widened(placement.position) : vec3d{}};
}

bool isIdentity(const mat43& m) {
    const base::mat33f i;
    const auto isNear = [](const auto& a, const auto& b) {
        return std::max({std::abs(a.x - b.x), std::abs(a.y - b.y), std::abs(a.z - b.z)}) <=
               frameSlack;
    };
    return isNear(m.m.r0, i.r0) && isNear(m.m.r1, i.r1) && isNear(m.m.r2, i.r2) &&
           isNear(m.t, vec3d{});
}

} // namespace

void addPlaced(base::IPlugin& node, const Placement& placement,
               const base::ref<base::IPlugin>& object, base::PluginFactory& factory) {
    const mat43 frame = frameOf(placement);
    if (isIdentity(frame)) {
        write(node, node_schema::n_children).push_back(object);
        return;
    }
    const base::ref<base::IPlugin> own = factory.create(node_schema::n_kind);
    if (base::string name = object->getName(); !name.empty())
        write(*own, node_schema::n_name) = std::move(name);
    scene::storeTransform(*own, frame);
    write(*own, node_schema::n_children).push_back(object);
    write(node, node_schema::n_children).push_back(own);
}

} // namespace assimp
