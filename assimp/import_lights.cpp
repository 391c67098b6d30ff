#include "assimp/import_lights.h"

#include "assimp/attribute_writing.h"
#include "assimp/fault_report.h"
#include "assimp/library_text.h"
#include "assimp/placed_node.h"

#include "scene_schema.h"

#include <assimp/scene.h>

#include <algorithm>
#include <cmath>
#include <numbers>

namespace assimp {

using base::IPlugin;
using base::ref;
using base::u8;
using scene::light_schema;

namespace {

/// Stands for a light that does not fade with distance, in metres.
constexpr double endlessSize = 1e6;

constexpr u8 kindDirectional = 0, kindPoint = 1, kindSpot = 2, kindRectangle = 3, kindNone = 255;

u8 kindOf(const aiLight& light) {
    switch (light.mType) {
    case aiLightSource_DIRECTIONAL:
        return kindDirectional;
    case aiLightSource_POINT:
        return kindPoint;
    case aiLightSource_SPOT:
        return kindSpot;
    case aiLightSource_AREA:
        return kindRectangle;
    default:
        return kindNone;
    }
}

double positive(double value) {
    return std::isfinite(value) && value > 0 ? value : 0;
}

/// The size in units of the file at which the framework's fading comes closest.
double sizeOf(const aiLight& light, double metresPerUnit) {
    const double constant = positive(light.mAttenuationConstant);
    const double linear = positive(light.mAttenuationLinear);
    const double quadratic = positive(light.mAttenuationQuadratic);
    if (quadratic > 0)
        return std::sqrt(constant / quadratic);
    return linear > 0 ? 2 * constant / linear : endlessSize / metresPerUnit;
}

void writeColor(const aiLight& light, IPlugin& object) {
    const auto component = [](float v) { return static_cast<float>(positive(v)); };
    const aiColor3D& c = light.mColorDiffuse;
    base::vec3f color{component(c.r), component(c.g), component(c.b)};
    const float largest = std::max({color.x, color.y, color.z});
    if (largest > 0)
        color = {color.x / largest, color.y / largest, color.z / largest};
    writeUnlessDefault(object, light_schema::n_color, color);
    writeUnlessDefault(object, light_schema::n_intensity, largest);
}

void writeCone(const aiLight& light, IPlugin& object) {
    const auto degrees = [](double radians) {
        return std::clamp(positive(radians) * 180 / std::numbers::pi, 0.0, 360.0);
    };
    const double outer = degrees(light.mAngleOuterCone), inner = degrees(light.mAngleInnerCone);
    writeUnlessDefault(object, light_schema::n_spotConeAngle, static_cast<float>(outer));
    writeUnlessDefault(object, light_schema::n_spotPenumbraAngle,
                       static_cast<float>(std::max(0.0, outer - inner)));
}

ref<IPlugin> makeLight(const aiLight& light, u8 kind, double metresPerUnit,
                       base::PluginFactory& factory) {
    ref<IPlugin> object = factory.create(light_schema::n_kind);
    if (light.mName.length != 0)
        write(*object, light_schema::n_name) = viewOf(light.mName);
    writeUnlessDefault(*object, light_schema::n_lightType, kind);
    writeColor(light, *object);
    if (kind == kindSpot)
        writeCone(light, *object);
    double size = sizeOf(light, metresPerUnit);
    if (const double width = positive(light.mSize.x); kind == kindRectangle && width > 0) {
        size = width;
        writeUnlessDefault(*object, light_schema::n_sizeRatio,
                           static_cast<float>(positive(light.mSize.y) / width));
    }
    if (kind != kindDirectional)
        writeUnlessDefault(*object, light_schema::n_size, static_cast<float>(size * metresPerUnit));
    return object;
}

} // namespace

void importLights(const aiScene& source, double metresPerUnit, NodeTable& nodes,
                  base::PluginFactory& factory, const base::string& path) {
    base::u64 strayCount = 0, unknownCount = 0;
    for (base::u32 i = 0; i < source.mNumLights; ++i) {
        const aiLight& light = *source.mLights[i];
        const aiNode* node = nodes.find(viewOf(light.mName));
        IPlugin* object = node ? nodes.objectOf(*node) : nullptr;
        const u8 kind = kindOf(light);
        strayCount += !object;
        unknownCount += object && kind == kindNone;
        if (!object || kind == kindNone)
            continue;
        Placement placement;
        if (kind != kindDirectional)
            placement.position = light.mPosition;
        if (kind != kindPoint) {
            placement.direction = light.mDirection;
            placement.up = light.mUp;
        }
        addPlaced(*object, placement, makeLight(light, kind, metresPerUnit, factory), factory);
    }
    const FaultReport log(path);
    log.warn(strayCount, "assimp |{}| Left out {} lights without a node of their name!");
    log.warn(unknownCount, "assimp |{}| Left out {} ambient lights or lights of unknown kind!");
}

} // namespace assimp
