#include "gltf/exporter.h"
#include "gltf/scene_kind.h"

#include "scene_schema.h"

#include <cmath>

namespace gltf {

using base::ref;
using base::u8;
using base::vec3f;
using scene::light_schema;
using Light = GLTF::MaterialCommon::Light;

namespace {

/// Components up to this are black, sizes up to this are points.
constexpr float smallest = 1e-6f;
constexpr float radiansPerDegree = 0.017453292f;
constexpr float quarterTurn = 1.5707964f;

/// What the codes of `lightType` become; others stay unknown.
constexpr Light::Type lightTypes[] = {Light::Type::directional, Light::Type::spot,
                                      Light::Type::point, Light::Type::spot};
constexpr u8 distantLight = 0, coneLight = 2, rectangleLight = 3;

/// What a light is made of, all finite: other values count as their defaults.
struct LightSource {
    u8 type;
    vec3f color; ///< with the intensity in it
    float size;
    float coneAngle; ///< degrees
};

LightSource readLight(const scene::ILight& light, bool& isRepaired) {
    const auto readFinite = [&](const scene::DefaultedAttribute<float>& attribute) {
        const float value = read(light, attribute);
        if (std::isfinite(value))
            return value;
        isRepaired = true;
        return attribute.defaultValue;
    };
    const auto isColor = [&](const vec3f& color) {
        const bool isFinite =
            std::isfinite(color.x) && std::isfinite(color.y) && std::isfinite(color.z);
        isRepaired |= !isFinite;
        return isFinite;
    };
    vec3f color = read(light, light_schema::n_color);
    if (!isColor(color))
        color = light_schema::n_color.defaultValue;
    const float intensity = readFinite(light_schema::n_intensity);
    LightSource source{read(light, light_schema::n_lightType),
                       {color.x * intensity, color.y * intensity, color.z * intensity},
                       readFinite(light_schema::n_size),
                       readFinite(light_schema::n_spotConeAngle)};
    // Each may be finite, but not their product.
    if (!isColor(source.color))
        source.color = light_schema::n_color.defaultValue;
    return source;
}

/// The fall-off of a light source of `size`.
void setAttenuation(Light& light, float size) {
    if (size > smallest) {
        const float inverse = 1 / size;
        light.constantAttenuation = 1;
        light.linearAttenuation = inverse + inverse;
        light.quadraticAttenuation = inverse * inverse;
    } else {
        light.quadraticAttenuation = 1;
    }
}

} // namespace

ref<Light> GLTFScenePlugin::convertLight(const scene::ILight& light) {
    constexpr base::u32 notFiniteFault = 1, rectangleFault = 2;
    bool isRepaired = false;
    const LightSource source = readLight(light, isRepaired);
    if (isRepaired)
        warnOnce(light, notFiniteFault,
                 "gltf |{}| The light has values that are not finite, they are ignored.");
    const vec3f& color = source.color;
    if (std::abs(color.x) <= smallest && std::abs(color.y) <= smallest &&
        std::abs(color.z) <= smallest)
        return nullptr;

    auto gltfLight = base::makeRef<Light>();
    gltfLight->color = {color.x, color.y, color.z, 1};
    if (source.type >= std::size(lightTypes))
        return gltfLight;
    gltfLight->type = lightTypes[source.type];
    if (source.type == distantLight)
        return gltfLight;
    setAttenuation(*gltfLight, source.size);
    if (source.type == coneLight) {
        gltfLight->fallOffAngle = source.coneAngle * radiansPerDegree;
    } else if (source.type == rectangleLight) {
        warnOnce(light, rectangleFault,
                 "{}| GLTF doesn't support rectangle lights, will use spot instead");
        gltfLight->fallOffAngle = quarterTurn;
    }
    return gltfLight;
}

/// Gives the light to `gltfNode` or, if that has one, to a new child of it.
void GLTFScenePlugin::convertLightChild(GLTF::Node& gltfNode, base::IPlugin& child) {
    const auto* light = findClass<const scene::ILight>(child);
    ref<Light> gltfLight = light ? convertLight(*light) : nullptr;
    if (!gltfLight)
        return;
    if (!gltfNode.light) {
        gltfNode.light = std::move(gltfLight);
        return;
    }
    const auto holder = base::makeRef<GLTF::Node>();
    holder->transform = base::makeRef<GLTF::Node::Transform>();
    holder->light = std::move(gltfLight);
    gltfNode.children.push_back(holder);
}

} // namespace gltf
