#include "assimp/material_maker.h"

#include "assimp/fault_report.h"

#include "b_string_convert.h"
#include "b_vector_math.h"
#include "stream/b_fs.h"

#include <assimp/material.h>
#include <assimp/mesh.h>
#include <assimp/scene.h>

#include <algorithm>
#include <array>
#include <cmath>
#include <optional>
#include <span>

namespace assimp {

using base::string;
using base::string_view;
using base::vec3f;
using base::vec4f;
using scene::Enumeration;

namespace {

using Material = scene::principalMaterial_schema;

/// Codes of `colorChannels`.
enum Channels : Enumeration {
    channelsWhole = 0, ///< of a bump map: a normal map or, if it is grey, a height map
    channelsRed = 1,
    channelsGreen = 4,
    channelsBlue = 5,
    channelsMean = 6, ///< of a bump map: a height map
};

constexpr Enumeration ambientIsOcclusion = 1;
constexpr vec3f white = {1, 1, 1}, black = {0, 0, 0};

vec3f clamped(const vec3f& color) {
    return {std::clamp(color.x, 0.0f, 1.0f), std::clamp(color.y, 0.0f, 1.0f),
            std::clamp(color.z, 0.0f, 1.0f)};
}
float mean(const vec3f& color) {
    return (color.x + color.y + color.z) / 3;
}

/// Whether the file name of a texture has one of these words in it.
bool isNamed(const TextureSlot& slot, std::initializer_list<string_view> words) {
    const string name = base::toLower(base::fs::fileName(slot.path));
    return std::ranges::any_of(words,
                               [&](string_view word) { return name.find(word) != string::npos; });
}

/// Fills one `principalMaterial`.
class MaterialMaker {
public:
    MaterialMaker(const aiMaterial& source, const aiMesh& mesh, bool isMapped,
                  const MaterialFormat& format, TextureImport& textures, MaterialFaults& faults,
                  base::IPlugin& object)
        : properties_(source), mesh_(mesh), format_(format), textures_(textures), faults_(faults),
          isMapped_(isMapped), object_(object) {}

    void run() {
        const string_view name = properties_.readText({AI_MATKEY_NAME});
        if (!name.empty())
            write(object_, scene::material_schema::n_name) = name;
        const TextureSlot colorMap = readColorMap();
        writeColor(colorMap);
        writeTransparency(colorMap);
        writeSurface();
        writeBump();
        writeEmission();
        writeOcclusion();
    }

private:
    std::optional<vec4f> readColor(const PropertyKey& key);
    std::optional<float> readNumber(const PropertyKey& key);
    bool isFinite(const PropertyKey& key, std::span<const float> values);

    bool isSwitchedOff(const PropertyKey& use) const { return properties_.readInt(use, 1) == 0; }
    TextureSlot firstMap(std::initializer_list<unsigned> types);
    void writeMap(const scene::SchemaAttribute<scene::Object>& attribute, const TextureSlot& slot,
                  Enumeration channels) {
        if (slot)
            write(object_, attribute) = textures_.create(slot, channels, mesh_);
    }
    vec3f mappedColor(const vec3f& color) const;

    TextureSlot readColorMap();
    void writeColor(const TextureSlot& colorMap);
    void writeTransparency(const TextureSlot& colorMap);
    float readOpacity();
    void writeSurface();
    TextureSlot readRoughnessMap();
    float mappedRoughness();
    float readRoughness();
    bool isMatte();
    void writeBump();
    void writeEmission();
    void writeOcclusion();

    MaterialProperties properties_;
    const aiMesh& mesh_;
    const MaterialFormat& format_;
    TextureImport& textures_;
    MaterialFaults& faults_;
    bool isMapped_; ///< its geometry has texture coordinates
    base::IPlugin& object_;
    base::set<string_view> broken_; ///< names of properties with numbers that are not finite
};

/// Counts the values of each property that are not, but once.
bool MaterialMaker::isFinite(const PropertyKey& key, std::span<const float> values) {
    const auto bad = std::ranges::count_if(values, [](float v) { return !std::isfinite(v); });
    if (bad != 0 && broken_.insert(key.name).second)
        faults_.nonFiniteValues += static_cast<base::u64>(bad);
    return bad == 0;
}

/// Alpha is 1 where the file has three components.
std::optional<vec4f> MaterialMaker::readColor(const PropertyKey& key) {
    std::array<float, 4> c = {0, 0, 0, 1};
    if (properties_.read(key, c) < 3 || !isFinite(key, c))
        return {};
    return vec4f{c[0], c[1], c[2], c[3]};
}

std::optional<float> MaterialMaker::readNumber(const PropertyKey& key) {
    std::array<float, 1> number = {0};
    if (properties_.read(key, number) == 0 || !isFinite(key, number))
        return {};
    return number[0];
}

/// The first map of these kinds whose file was found; else one whose file was not, if there is any.
TextureSlot MaterialMaker::firstMap(std::initializer_list<unsigned> types) {
    TextureSlot missing;
    if (!isMapped_)
        return missing;
    for (const unsigned type : types) {
        TextureSlot slot = textures_.read(properties_, type);
        if (slot)
            return slot;
        if (!slot.path.empty())
            missing = slot;
    }
    return missing;
}

/// The color beside a map of it. Where they multiply, black would hide the map: files that say so
/// mean that nothing but the map counts.
vec3f MaterialMaker::mappedColor(const vec3f& color) const {
    return format_.mapsReplace || color == black ? white : color;
}

TextureSlot MaterialMaker::readColorMap() {
    if (isSwitchedOff({AI_MATKEY_USE_COLOR_MAP}))
        return {};
    return firstMap({aiTextureType_BASE_COLOR, aiTextureType_DIFFUSE});
}

void MaterialMaker::writeColor(const TextureSlot& colorMap) {
    std::optional<vec4f> source = readColor({AI_MATKEY_BASE_COLOR});
    if (!source)
        source = readColor({AI_MATKEY_COLOR_DIFFUSE});
    vec3f color = source ? vec3f{source->x, source->y, source->z} : Material::n_color.defaultValue;
    if (colorMap) {
        // The library's grey for MTL materials that name no color, as writers leave it out beside
        // a map.
        constexpr float notGiven = 0.6f;
        color = mappedColor(color == vec3f{notGiven, notGiven, notGiven} ? white : color);
    }
    write(object_, Material::n_color) = clamped(color);
    writeMap(Material::n_colorMap, colorMap, channelsWhole);
}

/// Opacity can't be exported as a map of its own. The alpha of the color map is exported, and
/// files name one picture as both then.
void MaterialMaker::writeTransparency(const TextureSlot& colorMap) {
    float opacity = readOpacity();
    if (const TextureSlot opacityMap = firstMap({aiTextureType_OPACITY})) {
        faults_.opacityMaps += opacityMap.source != colorMap.source;
        if (format_.mapsReplace)
            opacity = 1;
    }
    if (opacity < 1)
        write(object_, Material::n_transparency) = {1 - opacity, 1 - opacity, 1 - opacity};
}

float MaterialMaker::readOpacity() {
    float opacity = 1;
    if (const auto value = readNumber({AI_MATKEY_OPACITY}))
        opacity = *value;
    else if (const auto factor = readNumber({AI_MATKEY_TRANSPARENCYFACTOR})) {
        const auto color = readColor({AI_MATKEY_COLOR_TRANSPARENT});
        opacity = 1 - *factor * (color ? mean({color->x, color->y, color->z}) : 1);
    } else if (const auto baseColor = readColor({AI_MATKEY_BASE_COLOR}))
        opacity = baseColor->w;
    else if (const auto diffuse = readColor({AI_MATKEY_COLOR_DIFFUSE}))
        opacity = format_.diffuseHasAlpha ? diffuse->w : 1;
    opacity = std::clamp(opacity, 0.0f, 1.0f);
    return opacity == 0 && format_.zeroIsOpaque ? 1 : opacity;
}

/// Roughness and metal. One picture for both has them in green and blue, as the packed textures of
/// real-time renderers do; a picture for one of them is grey and any channel does.
void MaterialMaker::writeSurface() {
    const TextureSlot rough = readRoughnessMap();
    TextureSlot metal;
    if (!isSwitchedOff({AI_MATKEY_USE_METALLIC_MAP}))
        metal = firstMap({aiTextureType_METALNESS});
    // A texture of unknown use is a packed one where the material is of the kind that has such.
    const bool isPhysical =
        properties_.readInt({AI_MATKEY_SHADING_MODEL}, 0) == aiShadingMode_PBR_BRDF;
    TextureSlot packed;
    if (!rough && !metal && isPhysical)
        packed = firstMap({aiTextureType_UNKNOWN});
    const bool isPacked = packed || (rough && rough.file == metal.file);
    const TextureSlot& roughSource = packed ? packed : rough;
    const TextureSlot& metalSource = packed ? packed : metal;

    write(object_, Material::n_roughness) = roughSource ? mappedRoughness() : readRoughness();
    writeMap(Material::n_roughnessMap, roughSource, isPacked ? channelsGreen : channelsRed);
    writeMap(Material::n_metalMap, metalSource, isPacked ? channelsBlue : channelsRed);
    if (!metalSource)
        faults_.metalWithoutMap += readNumber({AI_MATKEY_METALLIC_FACTOR}).value_or(0) > 0.5f;
}

/// Gloss maps, which are bright where roughness is dark, can't be exported. Where formats have no
/// place for roughness writers put it into that for gloss, which their file names tell.
TextureSlot MaterialMaker::readRoughnessMap() {
    if (isSwitchedOff({AI_MATKEY_USE_ROUGHNESS_MAP}))
        return {};
    const TextureSlot rough = firstMap({aiTextureType_DIFFUSE_ROUGHNESS});
    if (!rough.path.empty())
        return rough;
    TextureSlot gloss;
    gloss.path = properties_.readText({AI_MATKEY_TEXTURE(aiTextureType_SHININESS, 0)});
    if (isNamed(gloss, {"rough"}))
        return firstMap({aiTextureType_SHININESS});
    if (!gloss.path.empty()) {
        ++faults_.glossMaps;
        textures_.mention(gloss.path);
    }
    return {};
}

/// The roughness beside a map of it, by the rules for colors.
float MaterialMaker::mappedRoughness() {
    const float given = readNumber({AI_MATKEY_ROUGHNESS_FACTOR}).value_or(1);
    return format_.mapsReplace || given <= 0 || given > 1 ? 1 : given;
}

/// The exponent n of a highlight as Blinn and Phong have it is as wide as a microfacet distribution
/// of alpha = sqrt(2 / (n + 2)) (Walter et al., Microfacet Models for Refraction through Rough
/// Surfaces, 2007), and alpha is the square of roughness.
float MaterialMaker::readRoughness() {
    // Of exponents beyond 100 the library makes a roughness below 0.
    const float given = readNumber({AI_MATKEY_ROUGHNESS_FACTOR}).value_or(-1);
    if (given >= 0 && given <= 1)
        return given;
    const float exponent = readNumber({AI_MATKEY_SHININESS}).value_or(0);
    if (exponent <= 0 || isMatte())
        return 1;
    return std::sqrt(std::sqrt(2 / (exponent + 2)));
}

/// True for a material without a highlight, whatever exponent stands there.
bool MaterialMaker::isMatte() {
    switch (properties_.readInt({AI_MATKEY_SHADING_MODEL}, aiShadingMode_Phong)) {
    case aiShadingMode_Flat:
    case aiShadingMode_OrenNayar:
    case aiShadingMode_Minnaert:
    case aiShadingMode_NoShading:
        return true;
    case aiShadingMode_Gouraud:
        if (format_.gouraudIsMatte)
            return true;
        break;
    default:
        break;
    }
    const auto specular = readColor({AI_MATKEY_COLOR_SPECULAR});
    return specular && vec3f{specular->x, specular->y, specular->z} == black;
}

/// A map that the file calls a bump map is one of heights unless its name says otherwise: many
/// files put normal maps there.
void MaterialMaker::writeBump() {
    if (const TextureSlot slot = firstMap({aiTextureType_NORMALS, aiTextureType_NORMAL_CAMERA})) {
        writeMap(scene::material_schema::n_bumpMap, slot, channelsWhole);
        return;
    }
    const TextureSlot slot = firstMap({aiTextureType_HEIGHT});
    const bool isNormalMap = isNamed(slot, {"normal", "nrm", "nmap", "_n.", "-n."});
    writeMap(scene::material_schema::n_bumpMap, slot, isNormalMap ? channelsWhole : channelsMean);
}

void MaterialMaker::writeEmission() {
    TextureSlot map;
    if (!isSwitchedOff({AI_MATKEY_USE_EMISSIVE_MAP}))
        map = firstMap({aiTextureType_EMISSIVE, aiTextureType_EMISSION_COLOR});
    const vec4f source = readColor({AI_MATKEY_COLOR_EMISSIVE}).value_or(vec4f{0, 0, 0, 1});
    vec3f color = {source.x, source.y, source.z};
    if (map)
        color = mappedColor(color);
    else if (!map.path.empty() && format_.mapsReplace)
        color = black; // the color says nothing, and the surface shall not glow all over
    color = clamped(color * readNumber({AI_MATKEY_EMISSIVE_INTENSITY}).value_or(1));
    if (color != black)
        write(object_, Material::n_emission) = color;
    writeMap(Material::n_emissionMap, map, channelsWhole);
}

void MaterialMaker::writeOcclusion() {
    if (isSwitchedOff({AI_MATKEY_USE_AO_MAP}))
        return;
    const TextureSlot map = firstMap({aiTextureType_AMBIENT_OCCLUSION, aiTextureType_LIGHTMAP});
    if (!map)
        return;
    writeMap(Material::n_ambientMap, map, channelsRed);
    write(object_, Material::n_ambientType) = ambientIsOcclusion;
}

} // namespace

void MaterialFaults::report(const string& path) const {
    const FaultReport log(path);
    log.warn(
        nonFiniteValues,
        "assimp |{}| Found {} material values that are no finite numbers, defaults are taken!");
    log.inform(opacityMaps,
               "assimp |{}| Left out {} opacity maps that are not the color map as well.");
    log.inform(glossMaps, "assimp |{}| Left out {} gloss maps.");
    log.inform(
        metalWithoutMap,
        "assimp |{}| Found {} metals without a map, which can't be told from other materials.");
    log.inform(transformedTextures,
               "assimp |{}| Found {} textures with a transform or projection, which is left out.");
}

void makeMaterial(const aiMaterial& source, const aiMesh& mesh, bool isMapped,
                  const MaterialFormat& format, TextureImport& textures, MaterialFaults& faults,
                  base::IPlugin& object) {
    MaterialMaker(source, mesh, isMapped, format, textures, faults, object).run();
}

} // namespace assimp
