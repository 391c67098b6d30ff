#pragma once

#include "scene_attribute.h"

/// Schemas of materials and textures. Each table is X(attribute, type[, default]). Colours are
/// three floats, linear, 0 to 1.
namespace scene {

/// Attributes that every material has.
#define SCENE_MATERIAL_TABLE(X)  \
    X(name, base::string)        \
    X(inherit, Object)           \
    X(smoothNormals, bool, true) \
    X(materialMask, bool, true)  \
    X(bumpMap, Object)           \
    X(bumpSpace, Enumeration, 0) \
    X(keywords, base::string)
SCENE_SCHEMA(material, SCENE_MATERIAL_TABLE)

#define SCENE_PRINCIPAL_MATERIAL_TABLE(X)       \
    X(model, Enumeration, 0)                    \
    X(color, base::vec3f, {0.8f, 0.8f, 0.8f})   \
    X(reflectivity, float, 0.2f)                \
    X(reflectionAmount, float, 1)               \
    X(anisotropy, float, 0)                     \
    X(anisotropyRotation, float, 0)             \
    X(anisotropyDirection, Enumeration, 0)      \
    X(roughness, float, 0.2f)                   \
    X(rimColor, base::vec3f, {0, 0, 0})         \
    X(rimAngle, float, 0)                       \
    X(emission, base::vec3f, {0, 0, 0})         \
    X(emissionAmount, float, 1)                 \
    X(coatTransparency, base::vec3f, {1, 1, 1}) \
    X(coatReflectivity, float, 0)               \
    X(coatRoughness, float, 0)                  \
    X(flakesScale, float, 0)                    \
    X(flakesIntensity, float, 0.5f)             \
    X(flakesContrast, float, 10)                \
    X(transparency, base::vec3f, {0, 0, 0})     \
    X(transparencyModel, Enumeration, 0)        \
    X(thickness, base::i32, 0)                  \
    X(scatterDistance, float, 1)                \
    X(scatterAmount, float, 0.7f)               \
    X(fogScatter, base::vec3f, {0, 0, 0})       \
    X(fogDistance, float, 1)                    \
    X(metalMap, Object)                         \
    X(colorMap, Object)                         \
    X(rimMap, Object)                           \
    X(reflectionAmountMap, Object)              \
    X(roughnessMap, Object)                     \
    X(anisotropyMap, Object)                    \
    X(anisotropyDirectionMap, Object)           \
    X(coatRoughnessMap, Object)                 \
    X(coatAmountMap, Object)                    \
    X(emissionMap, Object)                      \
    X(transparencyMap, Object)                  \
    X(visibilityMap, Object)                    \
    X(ambientMap, Object)                       \
    X(thicknessMap, Object)                     \
    X(visibilityFromColorMap, bool, false)      \
    X(ambientType, Enumeration, 0)
SCENE_SCHEMA(principalMaterial, SCENE_PRINCIPAL_MATERIAL_TABLE)

/// `scalesAngle` in degrees.
#define SCENE_HAIR_MATERIAL_TABLE(X)      \
    X(colorTint, base::vec3f, {1, 1, 1})  \
    X(pigmentationColor, float, 0.5f)     \
    X(pigmentationAmount, float, 0.5f)    \
    X(roughnessAzimuthal, float, 0.5f)    \
    X(roughnessLongitudinal, float, 0.4f) \
    X(scalesAngle, float, 2.5f)
SCENE_SCHEMA(hairMaterial, SCENE_HAIR_MATERIAL_TABLE)

#define SCENE_CUSTOM_MATERIAL_TABLE(X) \
    X(shaderOSL, base::string)         \
    X(shaderGLSL, base::string)
SCENE_SCHEMA(customMaterial, SCENE_CUSTOM_MATERIAL_TABLE)

#define SCENE_TOON_MATERIAL_TABLE(X)                   \
    X(toonLevels, base::i32, 1)                        \
    X(diffuseSmooth, float, 0.2f)                      \
    X(color, base::vec3f, {0.8f, 0.8f, 0.8f})          \
    X(shadowColor, base::vec3f, {0.12f, 0.02f, 0.02f}) \
    X(rimMethod, Enumeration, 0)                       \
    X(rimColor, base::vec3f, {0, 0, 0})                \
    X(rimAngle, float, 0)                              \
    X(rimSmooth, float, 0.01f)                         \
    X(rimRotation, base::vec2f, {0, 0})                \
    X(specularMethod, Enumeration, 0)                  \
    X(specularRotation, base::vec2f, {0, 0})           \
    X(specularSmooth, float, 0.01f)                    \
    X(specularColor, base::vec3f, {1, 1, 1})           \
    X(roughness, float, 0.2f)                          \
    X(anisotropy, float, 0)                            \
    X(anisotropyRotation, float, 0)                    \
    X(anisotropyDirection, Enumeration, 0)             \
    X(emissionAmount, float, 1)                        \
    X(specularAmount, float, 1)                        \
    X(rimAmount, float, 1)                             \
    X(colorMap, Object)                                \
    X(midtoneColorMap, Object)                         \
    X(shadowColorMap, Object)                          \
    X(reflectionAmountMap, Object)                     \
    X(roughnessMap, Object)                            \
    X(visibilityMap, Object)                           \
    X(emissionMap, Object)
SCENE_SCHEMA(toonMaterial, SCENE_TOON_MATERIAL_TABLE)

/// Attributes that every texture has.
#define SCENE_TEXTURE_TABLE(X)             \
    X(name, base::string)                  \
    X(colorOffset, base::vec3f, {0, 0, 0}) \
    X(colorGain, base::vec3f, {1, 1, 1})   \
    X(colorContrast, float, 1)             \
    X(colorSaturation, float, 1)           \
    X(colorInvert, bool, false)            \
    X(offsetInvert, bool, false)           \
    X(mapping, Enumeration, 0)             \
    X(uvSet, base::string)                 \
    X(wrapModeU, Enumeration, 0)           \
    X(wrapModeV, Enumeration, 0)           \
    X(borderColor, base::vec3f, {0, 0, 0}) \
    X(borderAlpha, float, 1)               \
    X(mappingSide, Enumeration, 0)         \
    X(translate, base::vec3f, {0, 0, 0})   \
    X(scale, base::vec3f, {1, 1, 1})       \
    X(rotate, base::vec3f, {0, 0, 0})      \
    X(useImageAspect, bool, false)         \
    X(worldSpace, bool, false)             \
    X(keywords, base::string)
SCENE_SCHEMA(texture, SCENE_TEXTURE_TABLE)

#define SCENE_BITMAP_TEXTURE_TABLE(X) \
    X(colorSpace, Enumeration, 0)     \
    X(gamma, float, 2.2f)             \
    X(openColorIOFile, base::string)  \
    X(openColorIOSpace, base::string) \
    X(colorChannels, Enumeration, 0)  \
    X(filter, Enumeration, 0)         \
    X(smoothing, bool, false)         \
    X(blurRadius, base::i32, 0)       \
    X(compression, Enumeration, 0)
SCENE_SCHEMA(bitmapTexture, SCENE_BITMAP_TEXTURE_TABLE)

#define SCENE_FILE_TEXTURE_TABLE(X)            \
    X(file, base::string)                      \
    X(framesPerSecond, base::rational, {0, 0}) \
    X(embeddedFile, Object)
SCENE_SCHEMA(fileTexture, SCENE_FILE_TEXTURE_TABLE)

#define SCENE_EMBEDDED_TEXTURE_TABLE(X) \
    X(pixelData, Array<base::u8>)       \
    X(alignment, base::u8, 1)           \
    X(width, base::u32)                 \
    X(height, base::u32)                \
    X(depth, base::u32, 1)              \
    X(type, base::u32)                  \
    X(format, base::u32)
SCENE_SCHEMA(embeddedTexture, SCENE_EMBEDDED_TEXTURE_TABLE)

#define SCENE_RANDOM_TEXTURE_TABLE(X) \
    X(randomMode, Enumeration, 0)     \
    X(texture, Object)                \
    X(color, base::vec3f, {1, 1, 1})  \
    X(hue, float, 0)                  \
    X(saturation, float, 0)           \
    X(value, float, 0)                \
    X(seed, float, 0)
SCENE_SCHEMA(randomTexture, SCENE_RANDOM_TEXTURE_TABLE)

#define SCENE_NOISE_TEXTURE_TABLE(X)  \
    X(color1, base::vec3f, {0, 0, 0}) \
    X(color2, base::vec3f, {1, 1, 1}) \
    X(frequency, float, 1)            \
    X(frequencyRatio, float, 2)       \
    X(amplitude, float, 0.5f)         \
    X(amplitudeRatio, float, 0.8f)    \
    X(octaves, base::u8, 4)           \
    X(ridgeOffset, float, 0)
SCENE_SCHEMA(noiseTexture, SCENE_NOISE_TEXTURE_TABLE)

#define SCENE_VERT_COLOR_TEXTURE_TABLE(X) \
    X(colorSetIndex, base::i32, 0)        \
    X(colorSetName, base::string)
SCENE_SCHEMA(vertColorTexture, SCENE_VERT_COLOR_TEXTURE_TABLE)

#define SCENE_CELLULAR_TEXTURE_TABLE(X)  \
    X(mode, Enumeration, 0)              \
    X(coreColor, base::vec3f, {0, 0, 0}) \
    X(wallColor, base::vec3f, {1, 1, 1}) \
    X(factor, float, 1)
SCENE_SCHEMA(cellularTexture, SCENE_CELLULAR_TEXTURE_TABLE)

#define SCENE_CHECKER_TEXTURE_TABLE(X)   \
    X(evenColor, base::vec3f, {1, 1, 1}) \
    X(oddColor, base::vec3f, {0, 0, 0})
SCENE_SCHEMA(checkerTexture, SCENE_CHECKER_TEXTURE_TABLE)

#define SCENE_CURVATURE_TEXTURE_TABLE(X)    \
    X(useCenterColor, bool, false)          \
    X(concaveColor, base::vec3f, {0, 0, 1}) \
    X(centerColor, base::vec3f, {1, 1, 1})  \
    X(convexColor, base::vec3f, {1, 0, 0})  \
    X(curvatureScale, float, 1)             \
    X(curvaturePower, float, 1)             \
    X(curvatureCutOff, float, 0)
SCENE_SCHEMA(curvatureTexture, SCENE_CURVATURE_TEXTURE_TABLE)

#define SCENE_CUBIST_TEXTURE_TABLE(X) \
    X(color1, base::vec3f, {0, 0, 0}) \
    X(color2, base::vec3f, {1, 1, 1}) \
    X(minimum, float, -2)             \
    X(maximum, float, 1)
SCENE_SCHEMA(cubistTexture, SCENE_CUBIST_TEXTURE_TABLE)

#define SCENE_DOTS_TEXTURE_TABLE(X)            \
    X(dotColor, base::vec3f, {1, 1, 1})        \
    X(backgroundColor, base::vec3f, {0, 0, 0}) \
    X(minimumRadius, float, 0.1f)              \
    X(maximumRadius, float, 1)                 \
    X(intensityVariation, float, 1)            \
    X(shape, Enumeration, 0)
SCENE_SCHEMA(dotsTexture, SCENE_DOTS_TEXTURE_TABLE)

#define SCENE_MIX_TEXTURE_TABLE(X) \
    X(mixMode, Enumeration, 0)     \
    X(texture1, Object)            \
    X(texture2, Object)            \
    X(factor, float, 1)            \
    X(factorTexture, Object)
SCENE_SCHEMA(mixTexture, SCENE_MIX_TEXTURE_TABLE)

/// All schemas of this page.
#define SCENE_MATERIAL_SCHEMAS(X) \
    X(material)                   \
    X(principalMaterial)          \
    X(hairMaterial)               \
    X(customMaterial)             \
    X(toonMaterial)               \
    X(texture)                    \
    X(bitmapTexture)              \
    X(fileTexture)                \
    X(embeddedTexture)            \
    X(randomTexture)              \
    X(noiseTexture)               \
    X(vertColorTexture)           \
    X(cellularTexture)            \
    X(checkerTexture)             \
    X(curvatureTexture)           \
    X(cubistTexture)              \
    X(dotsTexture)                \
    X(mixTexture)

} // namespace scene
