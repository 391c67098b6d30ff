#include "GLTF/collect.h"

namespace GLTF {

namespace {

template <class T>
void take(const Walk& walk, vector<T*>& list, const ref<T>& object) {
    if (object && walk.take(*object))
        list.push_back(object.get());
}

} // namespace

vector<Node*> collect::nodes(const vector<ref<Node>>& roots) {
    const Walk walk;
    vector<Node*> taken, stack;
    const auto push = [&](const ref<Node>& node) {
        if (node)
            stack.push_back(node.get());
    };
    for (const ref<Node>& root : roots)
        push(root);
    while (!stack.empty()) {
        Node* node = stack.back();
        stack.pop_back();
        if (!walk.take(*node))
            continue;
        taken.push_back(node);
        for (const ref<Node>& child : std::as_const(node->children))
            push(child);
        if (const Skin* skin = node->skin.get()) {
            push(skin->skeleton);
            for (const ref<Node>& joint : skin->joints)
                push(joint);
        }
    }
    return taken;
}

vector<Mesh*> collect::meshes(const vector<Node*>& nodes) {
    const Walk walk;
    vector<Mesh*> taken;
    for (const Node* node : nodes)
        take(walk, taken, node->mesh);
    return taken;
}

vector<Primitive*> collect::primitives(const vector<Mesh*>& meshes) {
    const Walk walk;
    vector<Primitive*> taken;
    for (const Mesh* mesh : meshes) {
        for (const ref<Primitive>& primitive : mesh->primitives)
            take(walk, taken, primitive);
    }
    return taken;
}

vector<Skin*> collect::skins(const vector<Node*>& nodes) {
    const Walk walk;
    vector<Skin*> taken;
    for (const Node* node : nodes)
        take(walk, taken, node->skin);
    return taken;
}

vector<Node*> Asset::getAllNodes() {
    return collect::nodes(getDefaultScene().nodes);
}

vector<Mesh*> Asset::getAllMeshes() {
    return collect::meshes(getAllNodes());
}

vector<Primitive*> Asset::getAllPrimitives() {
    return collect::primitives(getAllMeshes());
}

vector<Skin*> Asset::getAllSkins() {
    return collect::skins(getAllNodes());
}

vector<Material*> Asset::getAllMaterials() {
    const vector<Primitive*> primitives = getAllPrimitives();
    const Walk walk;
    vector<Material*> taken;
    for (const Primitive* primitive : primitives)
        take(walk, taken, primitive->material);
    return taken;
}

vector<Texture*> Asset::getAllTextures() {
    const vector<Material*> materials = getAllMaterials();
    const Walk walk;
    vector<Texture*> taken;
    for (const Material* material : materials) {
        collect::forEachValueTexture(
            *material, [&](const ref<Texture>& texture) { take(walk, taken, texture); });
        if (const auto* pbr = dynamic_cast<const MaterialPBR*>(material))
            collect::forEachTextureSlot(
                *pbr, [&](const MaterialPBR::Texture& slot) { take(walk, taken, slot.texture); });
    }
    return taken;
}

vector<Image*> Asset::getAllImages() {
    const vector<Texture*> textures = getAllTextures();
    const Walk walk;
    vector<Image*> taken;
    for (const Texture* texture : textures)
        take(walk, taken, texture->source);
    return taken;
}

vector<BufferView*> Asset::getAllCompressedBufferViews() {
    const vector<Primitive*> primitives = getAllPrimitives();
    const Walk walk;
    vector<BufferView*> taken;
    for (const Primitive* primitive : primitives) {
        if (const DracoExtension* draco = primitive->draco())
            take(walk, taken, draco->bufferView);
    }
    return taken;
}

vector<Accessor*> Asset::getAllPrimitiveAccessors(const Primitive& primitive) {
    vector<Accessor*> accessors;
    collect::forEachAttribute(primitive,
                              [&](Accessor& accessor) { accessors.push_back(&accessor); });
    return accessors;
}

vector<Accessor*> Asset::getAllAccessors() {
    const vector<Node*> nodes = getAllNodes();
    const vector<Skin*> skins = collect::skins(nodes);
    const vector<Primitive*> primitives = collect::primitives(collect::meshes(nodes));

    const Walk walk;
    vector<Accessor*> taken;
    taken.reserve(4 * primitives.size());
    for (const Skin* skin : skins)
        take(walk, taken, skin->inverseBindMatrices);
    for (const Primitive* primitive : primitives) {
        collect::forEachAttribute(*primitive, [&](Accessor& accessor) {
            if (walk.take(accessor))
                taken.push_back(&accessor);
        });
        take(walk, taken, primitive->indices);
    }
    for (const ref<Animation>& animation : std::as_const(animations)) {
        for (const ref<Animation::Channel>& channel : std::as_const(animation->channels)) {
            const Animation::Sampler& sampler = channel->sampler;
            take(walk, taken, sampler.input);
            // An output is never marked: shared by several channels, it stands here once for
            // each of them, and the packed data has room for each.
            if (sampler.output && !walk.hasTaken(*sampler.output))
                taken.push_back(sampler.output.get());
        }
    }
    return taken;
}

} // namespace GLTF
