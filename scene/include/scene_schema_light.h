#pragma once

#include "scene_attribute.h"

/// Schemas of lights, cameras, the surroundings and clip planes. Each table is
/// X(attribute, type[, default]).
namespace scene {

/// Angles in degrees.
#define SCENE_LIGHT_TABLE(X)                 \
    X(name, base::string)                    \
    X(lightGroup, base::string)              \
    X(lightType, Enumeration, 0)             \
    X(environmentPortal, bool, false)        \
    X(color, base::vec3f, {1, 1, 1})         \
    X(texture, Object)                       \
    X(sunColor, bool, false)                 \
    X(intensity, float, 1)                   \
    X(diffuseContrib, float, 1)              \
    X(specularContrib, float, 1)             \
    X(spotConeAngle, float, 90)              \
    X(spotPenumbraAngle, float, 5)           \
    X(spotShowCone, float, 0)                \
    X(iesFile, base::string)                 \
    X(iesUseSize, bool, true)                \
    X(visibleInCamera, bool, true)           \
    X(visibleInReflections, bool, true)      \
    X(visibleInIndirect, bool, true)         \
    X(visibleInBloom, bool, true)            \
    X(size, float, 0.1f)                     \
    X(sizeRatio, float, 1)                   \
    X(importance, float, 1)                  \
    X(shadows, bool, true)                   \
    X(customShadows, bool, false)            \
    X(shadowColor, base::vec3f, {0, 0, 0})   \
    X(penumbraColor, base::vec3f, {0, 0, 0}) \
    X(shadowBlendMode, Enumeration, 3)       \
    X(caustics, bool, true)                  \
    X(shadowMapSize, base::u8, 1)            \
    X(shadowMapBias, float, 2)
SCENE_SCHEMA(light, SCENE_LIGHT_TABLE)

#define SCENE_LIGHT_GROUP_TABLE(X)       \
    X(name, base::string)                \
    X(lightTint, base::vec3f, {1, 1, 1}) \
    X(lightIntensity, float, 1)          \
    X(enabled, bool, true)               \
    X(private, bool, false)
SCENE_SCHEMA(lightGroup, SCENE_LIGHT_GROUP_TABLE)

/// `focalLength` and `sensor` in millimetres, angles in degrees.
/// `sensorFit`: see `getFieldOfView`.
#define SCENE_CAMERA_TABLE(X)                \
    X(name, base::string)                    \
    X(lensType, Enumeration, 0)              \
    X(lensShift, base::vec2f, {0, 0})        \
    X(orthographicZoom, float, 1)            \
    X(focalLength, float, 50)                \
    X(architect, bool, false)                \
    X(aperture, float, 0)                    \
    X(focusDistance, float, 0)               \
    X(focusObject, Object)                   \
    X(apertureShape, Enumeration, 0)         \
    X(apertureBias, Enumeration, 0)          \
    X(apertureRotation, float, 0)            \
    X(sensor, base::vec2f, {36, 24})         \
    X(sensorFit, Enumeration, 3)             \
    X(cubemapType, Enumeration, 2)           \
    X(sphericalAngle, base::vec2f, {90, 90}) \
    X(motionBlur, bool, false)               \
    X(shutter, base::vec2f, {0, 0.5f})       \
    X(shutterEfficiency, float, 1)           \
    X(locked, bool, false)
SCENE_SCHEMA(camera, SCENE_CAMERA_TABLE)

#define SCENE_STEREO_CAMERA_TABLE(X) \
    X(leftCamera, Object)            \
    X(rightCamera, Object)           \
    X(cameraSeparation, float)
SCENE_SCHEMA(stereoCamera, SCENE_STEREO_CAMERA_TABLE)

/// Sky, sun and ground.
#define SCENE_ENVIRONMENT_TABLE(X)   \
    X(environmentMap, Object)        \
    X(groundColor, base::vec3f)      \
    X(zenithColor, base::vec3f)      \
    X(horizonColor, base::vec3f)     \
    X(sunGlowColor, base::vec3f)     \
    X(sunGlowSize, float)            \
    X(constantColor, base::vec3f)    \
    X(skyTurbidity, float)           \
    X(intensity, float)              \
    X(sun, Object)                   \
    X(sunDateTime, base::DateTime)   \
    X(sunLatitude, float)            \
    X(sunLongitude, float)           \
    X(volumetricEffect, Enumeration) \
    X(importance, float)             \
    X(shadows, bool)                 \
    X(caustics, bool)                \
    X(visibleInReflections, bool)    \
    X(visibleInBloom, bool)          \
    X(groundPlane, bool)             \
    X(groundHeight, float)           \
    X(matteGround, bool)             \
    X(reflectivity, float)           \
    X(reflectionAmount, float)       \
    X(roughness, float)              \
    X(transparency, base::vec3f)     \
    X(color, base::vec3f)
SCENE_SCHEMA(environment, SCENE_ENVIRONMENT_TABLE)

#define SCENE_CLIP_PLANE_TABLE(X)     \
    X(name, base::string)             \
    X(enabled, bool, true)            \
    X(normal, base::vec3f, {0, 1, 0}) \
    X(distance, float, 0)             \
    X(cameraOnly, bool, true)         \
    X(crossSection, bool, true)       \
    X(material, Object)               \
    X(faceOrientation, bool, false)   \
    X(outlineWidth, float, 0)         \
    X(outlineColor, base::vec3f, {0, 0, 0})
SCENE_SCHEMA(clipPlane, SCENE_CLIP_PLANE_TABLE)

/// All schemas of this page.
#define SCENE_LIGHT_SCHEMAS(X) \
    X(light)                   \
    X(lightGroup)              \
    X(camera)                  \
    X(stereoCamera)            \
    X(environment)             \
    X(clipPlane)

} // namespace scene
