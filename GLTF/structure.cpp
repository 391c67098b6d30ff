#include "GLTF/document.h"

#include "GLTF/json_writer.h"

#include <algorithm>

namespace GLTF {

namespace {

void writeAttributes(JsonWriter& writer, const AttributeMap& attributes) {
    writer.startObject();
    for (const auto& [name, accessor] : attributes) {
        if (!accessor)
            continue;
        writer.keyText(name);
        writer.intValue(accessor->id);
    }
    writer.endObject();
}

template <std::size_t N>
void writeNodeIds(JsonWriter& writer, const char (&name)[N], const vector<ref<Node>>& nodes) {
    writer.startArray(name);
    for (const ref<Node>& node : nodes) {
        if (node)
            writer.intValue(node->id);
    }
    writer.endArray();
}

void writeTRS(JsonWriter& writer, const Node::TransformTRS& trs) {
    static constexpr std::array<float, 3> noTranslation{0, 0, 0};
    static constexpr std::array<float, 4> noRotation{0, 0, 0, 1};
    static constexpr std::array<float, 3> noScale{1, 1, 1};
    if (trs.translation != noTranslation)
        writer.floatsMember("translation", trs.translation);
    if (trs.rotation != noRotation)
        writer.floatsMember("rotation", trs.rotation);
    if (trs.scale != noScale)
        writer.floatsMember("scale", trs.scale);
}

void writeTransform(JsonWriter& writer, const Node::Transform& transform) {
    static const std::array<float, 16> identity = Node::TransformMatrix().matrix;
    if (transform.type == Node::Transform::Type::trs) {
        writeTRS(writer, static_cast<const Node::TransformTRS&>(transform));
    } else if (transform.type == Node::Transform::Type::matrix) {
        const auto& matrix = static_cast<const Node::TransformMatrix&>(transform).matrix;
        if (matrix != identity)
            writer.floatsMember("matrix", matrix);
    }
}

string_view pathText(i32 path) {
    switch (path) {
    case Animation::Channel::translation:
        return "translation";
    case Animation::Channel::rotation:
        return "rotation";
    case Animation::Channel::scale:
        return "scale";
    case Animation::Channel::weights:
        return "weights";
    default:
        return "unknown";
    }
}

} // namespace

Primitive::~Primitive() = default;
Primitive::Target::~Target() = default;

Object* Primitive::clone(Object* target) const {
    auto* copy = static_cast<Primitive*>(target);
    copy->attributes = attributes;
    copy->indices = indices;
    copy->material = material;
    copy->mode = mode;
    copy->targets = targets;
    return Object::clone(target);
}

void Primitive::writeJSON(JsonWriter& writer, const Options& options) {
    writer.key("attributes");
    writeAttributes(writer, attributes);
    if (indices)
        writer.intMember("indices", indices->id);
    writer.intMember("mode", mode);
    if (material)
        writer.intMember("material", material->id);
    if (!targets.empty()) {
        writer.startArray("targets");
        for (const ref<Target>& target : std::as_const(targets))
            writeAttributes(writer, target->attributes);
        writer.endArray();
    }
    Object::writeJSON(writer, options);
}

DracoExtension* Primitive::draco() const {
    const ref<Extension>* extension = extensions.get(dracoExtensionName);
    return extension ? dynamic_cast<DracoExtension*>(extension->get()) : nullptr;
}

Mesh::~Mesh() = default;

string Mesh::typeName() const {
    return "mesh";
}

Object* Mesh::clone(Object* target) const {
    auto* copy = static_cast<Mesh*>(target);
    for (const ref<Primitive>& primitive : primitives) {
        copy->primitives.push_back(base::makeRef<Primitive>());
        primitive->clone(copy->primitives.back().get());
    }
    copy->weights = weights;
    return Object::clone(target);
}

void Mesh::writeJSON(JsonWriter& writer, const Options& options) {
    writer.startArray("primitives");
    for (const ref<Primitive>& primitive : std::as_const(primitives)) {
        writer.startObject();
        primitive->writeJSON(writer, options);
        writer.endObject();
    }
    writer.endArray();
    if (!weights.empty())
        writer.floatsMember("weights", {std::as_const(weights).data(), weights.size()});
    Object::writeJSON(writer, options);
}

Skin::~Skin() = default;

string Skin::typeName() const {
    return "skin";
}

void Skin::writeJSON(JsonWriter& writer, const Options& options) {
    if (inverseBindMatrices)
        writer.intMember("inverseBindMatrices", inverseBindMatrices->id);
    if (skeleton)
        writer.intMember("skeleton", skeleton->id);
    writeNodeIds(writer, "joints", joints);
    Object::writeJSON(writer, options);
}

Node::Transform::~Transform() = default;

Node::TransformMatrix::TransformMatrix() : matrix{1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1} {
    type = Type::matrix;
}

Node::TransformMatrix::TransformMatrix(const float* sixteen, bool isColumnOrder) {
    type = Type::matrix;
    for (std::size_t row = 0; row < 4; ++row) {
        for (std::size_t column = 0; column < 4; ++column)
            matrix[column * 4 + row] = sixteen[isColumnOrder ? column * 4 + row : row * 4 + column];
    }
}

Node::TransformMatrix::~TransformMatrix() = default;

Node::TransformTRS::TransformTRS() {
    type = Type::trs;
}

Node::TransformTRS::~TransformTRS() = default;

Node::~Node() = default;

string Node::typeName() const {
    return "node";
}

Object* Node::clone(Object* target) const {
    auto* copy = static_cast<Node*>(target);
    copy->camera = camera;
    for (const ref<Node>& child : children) {
        copy->children.push_back(base::makeRef<Node>());
        child->clone(copy->children.back().get());
    }
    copy->skin = skin;
    copy->mesh = mesh;
    copy->light = light;
    copy->transform = transform;
    return Object::clone(target);
}

void Node::writeJSON(JsonWriter& writer, const Options& options) {
    if (mesh)
        writer.intMember("mesh", mesh->id);
    if (!children.empty())
        writeNodeIds(writer, "children", children);
    if (options.keepMaterialsCommon && light) {
        writer.startObject("extensions");
        writer.startObject("KHR_materials_common");
        writer.intMember("light", light->id);
        writer.endObject();
        writer.endObject();
    }
    if (transform)
        writeTransform(writer, *transform);
    if (skin)
        writer.intMember("skin", skin->id);
    if (camera)
        writer.intMember("camera", camera->id);
    Object::writeJSON(writer, options);
}

Scene::~Scene() = default;

string Scene::typeName() const {
    return "scene";
}

void Scene::writeJSON(JsonWriter& writer, const Options& options) {
    writeNodeIds(writer, "nodes", nodes);
    Object::writeJSON(writer, options);
}

Animation::~Animation() = default;

string Animation::typeName() const {
    return "animation";
}

void Animation::writeJSON(JsonWriter& writer, const Options& options) {
    vector<Sampler*> samplers;
    writer.startArray("channels");
    for (const ref<Channel>& channel : std::as_const(channels)) {
        if (!channel->isWritable())
            continue;
        Sampler& sampler = channel->sampler;
        if (sampler.id < 0) {
            sampler.id = static_cast<i32>(samplers.size());
            sampler.path = channel->target.path;
            samplers.push_back(&sampler);
        }
        writer.startObject();
        channel->writeJSON(writer, options);
        writer.endObject();
    }
    writer.endArray();

    writer.startArray("samplers");
    for (Sampler* sampler : samplers) {
        writer.startObject();
        sampler->writeJSON(writer, options);
        writer.endObject();
    }
    writer.endArray();
    Object::writeJSON(writer, options);
}

// A channel's two members are counted once by the channel itself, so that no `ref` to them can
// take their count to zero.
Animation::Channel::Channel() {
    sampler.addRef();
    target.addRef();
}

Animation::Channel::~Channel() = default;

bool Animation::Channel::isWritable() const {
    return target.node && target.node->id >= 0 && sampler.input && sampler.output;
}

void Animation::Channel::writeJSON(JsonWriter& writer, const Options& options) {
    writer.intMember("sampler", sampler.id);
    writer.startObject("target");
    target.writeJSON(writer, options);
    writer.endObject();
    Object::writeJSON(writer, options);
}

Animation::Channel::Target::Target() = default;
Animation::Channel::Target::~Target() = default;

void Animation::Channel::Target::writeJSON(JsonWriter& writer, const Options& options) {
    writer.intMember("node", node->id);
    writer.textMember("path", pathText(path));
    Object::writeJSON(writer, options);
}

Animation::Sampler::~Sampler() = default;

string Animation::Sampler::typeName() const {
    return "sampler";
}

void Animation::Sampler::writeJSON(JsonWriter& writer, const Options& options) {
    writer.intMember("input", input->id);
    writer.textMember("interpolation", interpolation);
    writer.intMember("output", output->id);
    Object::writeJSON(writer, options);
}

} // namespace GLTF
