#pragma once

#include "scene_mesh.h"
#include "scene_schema.h"

#include "b_factory.h"

#include <gtest/gtest.h>

/// Meshes put together attribute by attribute.
namespace test_support {

using base::AttribMap;
using base::u16;
using base::u32;
using base::vec3f;

class MeshTest : public testing::Test {
protected:
    static void SetUpTestSuite() {
        base::PluginFactory factory;
        scene::register_scene_schema(factory);
    }

    MeshTest() { scene::write(mesh_, scene::geometry_schema::n_name) = "box"; }

    /// Appends an item to one of the mesh's lists.
    AttribMap& add(const scene::SchemaAttribute<scene::Items>& list) {
        auto* item = new AttribMap;
        scene::write(mesh_, list).append(item);
        return *item;
    }
    AttribMap& addPrimitive(std::initializer_list<u16> vcounts) {
        AttribMap& primitive = add(scene::mesh_schema::n_primitives);
        scene::write(primitive, scene::meshPrimitive_schema::n_vcounts) = vcounts;
        return primitive;
    }
    void setRange(AttribMap& primitive, u32 start, u32 count) {
        scene::write(primitive, scene::meshPrimitive_schema::n_indexStart) = start;
        scene::write(primitive, scene::meshPrimitive_schema::n_indexCount) = count;
    }

    AttribMap mesh_;
};

template <class T>
std::vector<T> listOf(const base::vector<T>* values) {
    return values ? std::vector<T>(values->begin(), values->end()) : std::vector<T>();
}

} // namespace test_support
