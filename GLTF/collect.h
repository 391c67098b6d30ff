#pragma once

#include "GLTF/walk.h"

/// The single steps of the asset's collectors, so that a pass that needs several lists walks the
/// nodes once.
namespace GLTF::collect {

/// All nodes below `roots`. A skin counts as a parent of its skeleton and joints. Children are
/// followed from the first visit alone, so the walk ends on cycles too.
vector<Node*> nodes(const vector<ref<Node>>& roots);
vector<Mesh*> meshes(const vector<Node*>& nodes);
vector<Primitive*> primitives(const vector<Mesh*>& meshes);
vector<Skin*> skins(const vector<Node*>& nodes);

/// Calls `function` for the accessors of a primitive without its indices: its attributes in key
/// order, then those of each target.
template <class Function>
void forEachAttribute(const Primitive& primitive, Function&& function) {
    for (const auto& [name, accessor] : primitive.attributes) {
        if (accessor)
            function(*accessor);
    }
    for (const ref<Primitive::Target>& target : primitive.targets) {
        for (const auto& [name, accessor] : std::as_const(target->attributes)) {
            if (accessor)
                function(*accessor);
        }
    }
}

/// Calls `function` for the textures among the values of a plain or common material, null ones
/// too. The other kind does not write its values.
template <class Function>
void forEachValueTexture(const Material& material, Function&& function) {
    const Material::Values* values = material.values.get();
    if (values && material.type != Material::Type::pbr)
        for (const auto* slot :
             {&values->ambient, &values->diffuse, &values->emission, &values->specular})
            function(slot->texture);
}

/// Calls `function` for each texture slot of a material, in the order in which textures are
/// collected, which is not the order in which they are numbered.
template <class Function>
void forEachTextureSlot(const MaterialPBR& material, Function&& function) {
    const auto call = [&](const ref<MaterialPBR::Texture>& slot) {
        if (slot)
            function(*slot);
    };
    if (material.metallicRoughness) {
        call(material.metallicRoughness->baseColorTexture);
        call(material.metallicRoughness->metallicRoughnessTexture);
    }
    call(material.emissiveTexture);
    call(material.normalTexture);
    call(material.occlusionTexture);
    if (material.specularGlossiness) {
        call(material.specularGlossiness->diffuseTexture);
        call(material.specularGlossiness->specularGlossinessTexture);
    }
}

} // namespace GLTF::collect
