#pragma once

#include "scene_animation.h"
#include "scene_factory.h"
#include "scene_keyframe.h"
#include "scene_schema.h"

#include <cmath>
#include <stdexcept>

namespace test_support {

/// A document with a scene and its root node, to which tests add objects.
class SceneBuilder {
public:
    SceneBuilder() {
        scene::register_scene_schema(*factory);
        scene = &add<scene::IScene>();
        root = &add<scene::INode>();
        write(*scene, scene::scene_schema::n_root) = scene::Object(root);
    }

    /// A new object that nothing refers to yet. The factory owns it.
    template <class T>
    T& add(const char* name = "") {
        T* object = dynamic_cast<T*>(factory->create(T::Schema::n_kind).get());
        if (!object)
            throw std::logic_error("the factory made another class");
        if (*name)
            write(*object, scene::node_schema::n_name) = base::string(name);
        return *object;
    }
    /// A new object among the children of `parent`.
    template <class T>
    T& addTo(scene::INode& parent, const char* name = "") {
        T& object = add<T>(name);
        append(parent, object);
        return object;
    }
    static void append(scene::INode& parent, base::IPlugin& child) {
        write(parent, scene::node_schema::n_children).push_back(scene::Object(&child));
    }

    base::ref<scene::SceneFactory> factory = base::makeRef<scene::SceneFactory>();
    scene::IScene* scene;
    scene::INode* root;
};

/// Appends a map to one of the lists of a mesh or morph.
inline base::AttribMap& appendItem(base::AttribMap& object,
                                   const scene::SchemaAttribute<scene::Items>& list) {
    auto* item = new base::AttribMap;
    write(object, list).append(item);
    return *item;
}

/// The nearest tick.
inline base::TimeCode secondsToTime(double seconds) {
    return {std::llround(seconds * static_cast<double>(base::TimeCode::ticksPerSecond))};
}

/// The first curve of `channel`, made where it has none.
inline base::AttribMap& curveOf(scene::IKeyframeChannel& channel) {
    return *channel.attribute(1, scene::keyframeChannel_schema::n_curves);
}

/// Gives `channel` a curve with keys at so many seconds.
template <class T>
base::AttribMap& setKeys(scene::IKeyframeChannel& channel, std::initializer_list<double> seconds,
                         base::vector<T> values) {
    base::AttribMap& curve = curveOf(channel);
    auto& times = write(curve, scene::keyframeChannelCurve_schema::n_times);
    times.clear();
    for (const double second : seconds)
        times.push_back(secondsToTime(second));
    curve.vecAttribute<T>(scene::keyframeChannelCurve_schema::n_values) = std::move(values);
    return curve;
}

/// Appends a primitive of faces with `corners` corners each: all of the index array, or `count`
/// entries of it from `start` on.
inline base::AttribMap& appendPrimitive(scene::IMesh& mesh, base::u16 corners, base::i64 start = -1,
                                        base::u32 count = 0) {
    using scene::meshPrimitive_schema;
    base::AttribMap& primitive = appendItem(mesh, scene::mesh_schema::n_primitives);
    write(primitive, meshPrimitive_schema::n_vcounts) = {corners};
    if (start >= 0) {
        write(primitive, meshPrimitive_schema::n_indexStart) = static_cast<base::u32>(start);
        write(primitive, meshPrimitive_schema::n_indexCount) = count;
    }
    return primitive;
}

/// The array of a new set of texture coordinates, and of colours.
inline base::vector<base::vec2f>& appendUVs(scene::IMesh& mesh) {
    return write(appendItem(mesh, scene::mesh_schema::n_uvSets), scene::meshUVSet_schema::n_UV);
}
inline base::vector<base::vec3f>& appendColors(scene::IMesh& mesh) {
    return write(appendItem(mesh, scene::mesh_schema::n_colorSets),
                 scene::meshColorSet_schema::n_RGB);
}

/// Makes `mesh` the triangle (0, 0, 0), (1, 0, 0), (0, 1, 0), without indices.
inline scene::IMesh& makeTriangle(scene::IMesh& mesh) {
    write(mesh, scene::mesh_schema::n_positions) = {{0, 0, 0}, {1, 0, 0}, {0, 1, 0}};
    appendPrimitive(mesh, 3);
    return mesh;
}

/// Makes `mesh` a grid of `size` by `size` unit squares in the XY plane, each of two triangles,
/// with normals and texture coordinates.
inline scene::IMesh& makeGrid(scene::IMesh& mesh, base::u32 size) {
    auto& uvs = appendUVs(mesh);
    auto& indices = write(mesh, scene::mesh_schema::n_indices);
    for (base::u32 i = 0; i < (size + 1) * (size + 1); ++i) {
        const base::u32 x = i % (size + 1), y = i / (size + 1), above = i + size + 1;
        const auto fx = static_cast<float>(x), fy = static_cast<float>(y);
        write(mesh, scene::mesh_schema::n_positions).push_back({fx, fy, 0});
        write(mesh, scene::mesh_schema::n_normals).push_back({0, 0, 1});
        uvs.push_back({fx / static_cast<float>(size), fy / static_cast<float>(size)});
        if (x < size && y < size)
            for (const base::u32 index : {i, i + 1, above + 1, i, above + 1, above})
                indices.push_back(index);
    }
    appendPrimitive(mesh, 3);
    return mesh;
}

} // namespace test_support
