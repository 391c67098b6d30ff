#include "GLTF/document.h"

#include "GLTF/json_writer.h"

#include <cmath>

namespace GLTF {

namespace {

/// An object as a member, if there is one.
template <std::size_t N, class T>
void writeMember(JsonWriter& writer, const char (&name)[N], const ref<T>& object,
                 const Options& options) {
    if (!object)
        return;
    writer.startObject(name);
    object->writeJSON(writer, options);
    writer.endObject();
}

/// The first three of four values: the fourth is alpha or a marker.
std::span<const float> firstThree(const std::array<float, 4>& values) {
    return std::span(values).first<3>();
}

} // namespace

Sampler::Sampler(i32 magnification, i32 minification, i32 s, i32 t)
    : magFilter(magnification), minFilter(minification), wrapS(s), wrapT(t) {}

Sampler::~Sampler() = default;

string Sampler::typeName() const {
    return "sampler";
}

void Sampler::writeJSON(JsonWriter& writer, const Options& options) {
    writer.intMember("magFilter", magFilter);
    writer.intMember("minFilter", minFilter);
    writer.intMember("wrapS", wrapS);
    writer.intMember("wrapT", wrapT);
    Object::writeJSON(writer, options);
}

Texture::~Texture() = default;

string Texture::typeName() const {
    return "texture";
}

void Texture::writeJSON(JsonWriter& writer, const Options& options) {
    writer.intMember("sampler", sampler->id);
    writer.intMember("source", source->id);
    Object::writeJSON(writer, options);
}

MaterialPBR::Texture::~Texture() = default;

void MaterialPBR::Texture::writeJSON(JsonWriter& writer, const Options& options) {
    if (scale != 1)
        writer.floatMember("scale", scale);
    if (texture)
        writer.intMember("index", texture->id);
    if (texCoord >= 0)
        writer.intMember("texCoord", texCoord);
    Object::writeJSON(writer, options);
}

MaterialPBR::MetallicRoughness::~MetallicRoughness() = default;

void MaterialPBR::MetallicRoughness::writeJSON(JsonWriter& writer, const Options& options) {
    if (baseColorFactor[3] != 0)
        writer.floatsMember("baseColorFactor", baseColorFactor);
    writeMember(writer, "baseColorTexture", baseColorTexture, options);
    if (metallicFactor >= 0)
        writer.floatMember("metallicFactor", metallicFactor);
    if (roughnessFactor >= 0)
        writer.floatMember("roughnessFactor", roughnessFactor);
    writeMember(writer, "metallicRoughnessTexture", metallicRoughnessTexture, options);
    Object::writeJSON(writer, options);
}

MaterialPBR::SpecularGlossiness::~SpecularGlossiness() = default;

void MaterialPBR::SpecularGlossiness::writeJSON(JsonWriter& writer, const Options& options) {
    if (diffuseFactor)
        writer.floatsMember("diffuseFactor", *diffuseFactor);
    writeMember(writer, "diffuseTexture", diffuseTexture, options);
    if (specularFactor)
        writer.floatsMember("specularFactor", *specularFactor);
    if (glossinessFactor >= 0)
        writer.floatMember("glossinessFactor", glossinessFactor);
    writeMember(writer, "specularGlossinessTexture", specularGlossinessTexture, options);
    Object::writeJSON(writer, options);
}

MaterialPBR::MaterialPBR()
    : metallicRoughness(base::makeRef<MetallicRoughness>()),
      specularGlossiness(base::makeRef<SpecularGlossiness>()) {
    type = Type::pbr;
}

MaterialPBR::~MaterialPBR() = default;

void MaterialPBR::writeJSON(JsonWriter& writer, const Options& options) {
    writeMember(writer, "pbrMetallicRoughness", metallicRoughness, options);
    if (emissiveFactor[0] != 0 || emissiveFactor[3] != 0)
        writer.floatsMember("emissiveFactor", firstThree(emissiveFactor));
    writeMember(writer, "emissiveTexture", emissiveTexture, options);
    writeMember(writer, "normalTexture", normalTexture, options);
    writeMember(writer, "occlusionTexture", occlusionTexture, options);
    if (options.useSpecularGlossiness) {
        writer.startObject("extensions");
        writeMember(writer, "KHR_materials_pbrSpecularGlossiness", specularGlossiness, options);
        writer.endObject();
    }
    if (!alphaMode.empty())
        writer.textMember("alphaMode", alphaMode);
    if (alphaMode == "MASK" && !std::isnan(alphaCutoff))
        writer.floatMember("alphaCutoff", alphaCutoff);
    if (options.doubleSidedMaterials || doubleSided)
        writer.boolMember("doubleSided", true);
    Object::writeJSON(writer, options);
}

MaterialCommon::Light::~Light() = default;

string MaterialCommon::Light::typeName() const {
    return "light";
}

void MaterialCommon::Light::writeJSON(JsonWriter& writer, const Options& options) {
    static constexpr string_view texts[] = {"ambient", "directional", "point", "spot"};
    if (const auto index = static_cast<std::size_t>(type); index < std::size(texts)) {
        writer.textMember("type", texts[index]);
        writer.keyText(texts[index]);
        writer.startObject();
        if (type == Type::point || type == Type::spot) {
            writer.floatMember("constantAttenuation", constantAttenuation);
            writer.floatMember("linearAttenuation", linearAttenuation);
            writer.floatMember("quadraticAttenuation", quadraticAttenuation);
        }
        if (type == Type::spot) {
            writer.floatMember("fallOffAngle", fallOffAngle);
            writer.floatMember("fallOffExponent", fallOffExponent);
        }
        writer.floatsMember("color", firstThree(color));
        writer.endObject();
    }
    Object::writeJSON(writer, options);
}

} // namespace GLTF
