#include "storage_scene.h"

namespace bench {

namespace {

using namespace base;

constexpr std::size_t arrayObjects = 8;
constexpr std::size_t vertexCount = 500'000;
constexpr u32 nodeCount = 20'000;

name_id named(string_view text) {
    return nameServer().id(text);
}

} // namespace

ref<PluginFactory> makeArrayDocument() {
    auto document = makeRef<PluginFactory>("arrays");
    for (std::size_t i = 0; i < arrayObjects; ++i) {
        const ref<IPlugin> object = document->create(named("mesh"));
        auto& positions = object->vecAttribute<vec3f>(named("positions"));
        auto& normals = object->vecAttribute<normal>(named("normals"));
        auto& indices = object->vecAttribute<u32>(named("indices"));
        positions.resize(vertexCount);
        normals.resize(vertexCount);
        indices.resize(4 * vertexCount);
        for (std::size_t v = 0; v < vertexCount; ++v) {
            const float x = static_cast<float>(v + i);
            positions[v] = {x, 2 * x, 3 * x};
            normals[v] = {x, 0, 1};
            for (std::size_t corner = 0; corner < 4; ++corner)
                indices[4 * v + corner] = static_cast<u32>(v + corner);
        }
    }
    return document;
}

ref<PluginFactory> makeNodeDocument() {
    auto document = makeRef<PluginFactory>("nodes");
    for (u32 i = 0; i < nodeCount; ++i) {
        const ref<IPlugin> object = document->create(named("node"));
        object->attribute<string>(named("name")) = "node " + std::to_string(i);
        object->attribute<vec3d>(named("translation")) = {double(i), 0, 1};
        object->attribute<quatf>(named("rotation"));
        object->attribute<vec3f>(named("scale")) = {1, 1, 1};
        object->attribute<bool>(named("visible")) = true;
        object->attribute<i32>(named("layer")) = static_cast<i32>(i % 7);
        object->attribute<ref<IPlugin>>(named("parent")) = document->plugin(i / 4);
        object->vecAttribute<ref<IPlugin>>(named("children"));
        AttribMap& settings = object->mapAttribute(named("settings"), named("node settings"));
        settings.attribute<float>(named("weight")) = 0.5f;
        settings.attribute<u32>(named("color")) = i;
    }
    return document;
}

} // namespace bench
