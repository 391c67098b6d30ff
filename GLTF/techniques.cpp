#include "GLTF/document.h"

#include "GLTF/json_writer.h"

namespace GLTF {

namespace {

template <std::size_t N>
void writeTexts(JsonWriter& writer, const char (&name)[N], const flat_map<string, string>& texts) {
    if (texts.empty())
        return;
    writer.startObject(name);
    for (const auto& [key, text] : texts) {
        writer.keyText(key);
        writer.textValue(text);
    }
    writer.endObject();
}

template <std::size_t N>
void writeInts(JsonWriter& writer, const char (&name)[N], const vector<i32>& values) {
    if (values.empty())
        return;
    writer.startArray(name);
    for (const i32 value : values)
        writer.intValue(value);
    writer.endArray();
}

template <std::size_t N>
void writeSlot(JsonWriter& writer, const char (&name)[N], const Material::Values::Slot& slot) {
    if (slot.texture)
        writer.intMember(name, slot.texture->id);
    else if (slot.color)
        writer.floatsMember(name, *slot.color);
}

void writeParameter(JsonWriter& writer, const Technique::Parameter& parameter) {
    writer.startObject();
    if (!parameter.semantic.empty())
        writer.textMember("semantic", parameter.semantic);
    if (parameter.node)
        writer.intMember("node", parameter.node->id);
    if (parameter.value.size() == 1)
        writer.floatMember("value", parameter.value[0]);
    else if (!parameter.value.empty())
        writer.floatsMember("value", std::span(parameter.value.data(), parameter.value.size()));
    if (parameter.count != 0)
        writer.intMember("count", parameter.count);
    writer.intMember("type", parameter.type);
    writer.endObject();
}

void writeStates(JsonWriter& writer, const Technique::States& states) {
    const bool hasFunctions = states.depthMask || !states.blendEquationSeparate.empty() ||
                              !states.blendFuncSeparate.empty();
    if (states.enable.empty() && !hasFunctions)
        return;
    writer.startObject("states");
    writeInts(writer, "enable", states.enable);
    if (hasFunctions) {
        writer.startObject("functions");
        if (states.depthMask) {
            // Functions are called with a list of arguments, this one with a single flag.
            writer.startArray("depthMask");
            writer.boolValue(*states.depthMask);
            writer.endArray();
        }
        writeInts(writer, "blendEquationSeparate", states.blendEquationSeparate);
        writeInts(writer, "blendFuncSeparate", states.blendFuncSeparate);
        writer.endObject();
    }
    writer.endObject();
}

bool isSet(const Material::Values::Slot& slot) {
    return slot.texture || slot.color;
}

} // namespace

Shader::~Shader() = default;

string Shader::typeName() const {
    return "shader";
}

void Shader::writeJSON(JsonWriter& writer, const Options& options) {
    writer.intMember("type", type);
    if (options.embedShaders) {
        writer.key("uri");
        uri = writer.dataUriValue("text/plain", reinterpret_cast<const u8*>(source.data()),
                                  source.size());
    } else {
        uri = options.name + std::to_string(id) + (type == vertexShader ? ".vert" : ".frag");
        writer.textMember("uri", uri);
    }
    Object::writeJSON(writer, options);
}

Program::~Program() = default;

string Program::typeName() const {
    return "program";
}

void Program::writeJSON(JsonWriter& writer, const Options& options) {
    if (!attributes.empty()) {
        writer.startArray("attributes");
        for (const string& attribute : attributes)
            writer.textValue(attribute);
        writer.endArray();
    }
    if (fragmentShader)
        writer.intMember("fragmentShader", fragmentShader->id);
    if (vertexShader)
        writer.intMember("vertexShader", vertexShader->id);
    Object::writeJSON(writer, options);
}

Technique::~Technique() = default;

string Technique::typeName() const {
    return "technique";
}

void Technique::writeJSON(JsonWriter& writer, const Options& options) {
    writeTexts(writer, "attributes", attributes);
    if (!parameters.empty()) {
        writer.startObject("parameters");
        for (const auto& [key, parameter] : std::as_const(parameters)) {
            writer.keyText(key);
            writeParameter(writer, parameter);
        }
        writer.endObject();
    }
    if (program)
        writer.intMember("program", program->id);
    writeStates(writer, states);
    writeTexts(writer, "uniforms", uniforms);
    Object::writeJSON(writer, options);
}

void Material::Values::writeJSON(JsonWriter& writer) const {
    writeSlot(writer, "ambient", ambient);
    writeSlot(writer, "diffuse", diffuse);
    writeSlot(writer, "emission", emission);
    writeSlot(writer, "specular", specular);
    if (shininess)
        writer.floatMember("shininess", *shininess);
    if (transparency)
        writer.floatMember("transparency", *transparency);
}

Material::Material() = default;
Material::~Material() = default;

string Material::typeName() const {
    return "material";
}

void Material::writeJSON(JsonWriter& writer, const Options& options) {
    if (values) {
        writer.startObject("values");
        values->writeJSON(writer);
        writer.endObject();
    }
    if (technique)
        writer.intMember("technique", technique->id);
    Object::writeJSON(writer, options);
}

MaterialCommon::~MaterialCommon() = default;

void MaterialCommon::writeJSON(JsonWriter& writer, const Options& options) {
    static constexpr string_view kinds[] = {"BLINN", "PHONG", "LAMBERT", "CONSTANT"};
    writer.startObject("extensions");
    writer.startObject("KHR_materials_common");
    writer.boolMember("doubleSided", options.doubleSidedMaterials || doubleSided);
    writer.intMember("jointCount", jointCount);
    writer.textMember("technique", kinds[static_cast<std::size_t>(technique)]);
    writer.boolMember("transparent", transparent);
    if (values) {
        writer.startObject("values");
        values->writeJSON(writer);
        writer.endObject();
    }
    writer.endObject();
    writer.endObject();
    Object::writeJSON(writer, options);
}

string MaterialCommon::techniqueKey() const {
    static const Values none;
    const Values& inputs = values ? *values : none;
    const std::pair<bool, string_view> features[] = {
        {isSet(inputs.ambient), "AMBIENT;"},
        {inputs.diffuse.color.has_value(), "DIFFUSE;"},
        {bool(inputs.diffuse.texture), "DIFFUSETEXTURE;"},
        {isSet(inputs.emission), "EMISSION;"},
        {isSet(inputs.specular), "SPECULAR;"},
        {inputs.shininess.has_value(), "SHININESS;"},
        {inputs.transparency.has_value(), "TRANSPARENCY;"},
        {doubleSided, "DOUBLESIDED;"},
        {transparent, "TRANSPARENT;"},
        {jointCount > 0, "SKINNED;"},
    };
    string key;
    for (const auto& [has, text] : features)
        if (has)
            key += text;
    return key;
}

} // namespace GLTF
