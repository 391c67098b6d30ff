#pragma once

#include "scene_attribute.h"

/// Schemas of geometry: what can be drawn, and what deforms it. Each table is
/// X(attribute, type[, default]).
namespace scene {

/// Attributes that every geometry has. `occlusionRadius` in scene units.
#define SCENE_GEOMETRY_TABLE(X)                \
    X(LOD, Items)                              \
    X(name, base::string)                      \
    X(bounds, base::box3f, {})                 \
    X(exactBounds, bool, false)                \
    X(visible, bool, true)                     \
    X(visibleInCamera, bool, true)             \
    X(visibleInReflections, bool, true)        \
    X(visibleInRefractions, bool, true)        \
    X(visibleInDiffuse, bool, true)            \
    X(visibleInCaustics, bool, true)           \
    X(visibleInPhotons, bool, true)            \
    X(visibleInOutline, bool, true)            \
    X(visibleInBloom, bool, true)              \
    X(castShadows, bool, true)                 \
    X(receiveShadows, bool, true)              \
    X(castOcclusion, bool, true)               \
    X(receiveOcclusion, bool, true)            \
    X(receiveGlossyOcclusion, bool, false)     \
    X(occlusionRadius, float, 0)               \
    X(environmentPortal, bool, false)          \
    X(treatAsLight, bool, false)               \
    X(lightShadows, bool, true)                \
    X(lightCaustics, bool, false)              \
    X(lightNormalize, bool, false)             \
    X(flipNormals, bool, false)                \
    X(spherizeNormals, float, 0)               \
    X(offsetNormals, base::vec3f, {0, 0, 0})   \
    X(multiplyNormals, base::vec3f, {1, 1, 1}) \
    X(sourceGeometry, Object)                  \
    X(renderGeometry, Object)                  \
    X(parentGeometry, Object)                  \
    X(instanceSlot, base::i32)
SCENE_SCHEMA(geometry, SCENE_GEOMETRY_TABLE)

/// Item of `LOD`.
#define SCENE_GEOMETRY_LOD_TABLE(X) \
    X(geometry, Object)             \
    X(distance, float)
SCENE_SCHEMA(geometryLOD, SCENE_GEOMETRY_LOD_TABLE)

#define SCENE_SUBDIVIDABLE_TABLE(X)  \
    X(subdivide, bool, false)        \
    X(displace, bool, false)         \
    X(displaceMap, Object)           \
    X(displaceSpace, Enumeration, 0) \
    X(displaceAmount, float, 1)      \
    X(tessellation, base::u8, 2)     \
    X(subdivideCorners, bool, true)  \
    X(subdivideUVs, bool, false)     \
    X(subdivideAdaptive, bool, false)
SCENE_SCHEMA(subdividable, SCENE_SUBDIVIDABLE_TABLE)

/// `computeNormalsAngle` in degrees.
#define SCENE_MESH_TABLE(X)                   \
    X(uvSets, Items)                          \
    X(colorSets, Items)                       \
    X(primitives, Items)                      \
    X(bindPoseSets, Items)                    \
    X(jointsSets, Items)                      \
    X(positions, Array<base::vec3f>)          \
    X(normals, Array<base::normal>)           \
    X(bitangents, Array<base::normal>)        \
    X(tangents, Array<base::vec4f>)           \
    X(velocities, Array<base::vec3f>)         \
    X(sharedVertexData, bool, false)          \
    X(edgeVisibility, Array<base::u32>)       \
    X(edgeSmooth, Array<base::u32>)           \
    X(edgeBevel, float, 0)                    \
    X(computeTangentsMethod, Enumeration, 0)  \
    X(computeNormalsMethod, Enumeration, 0)   \
    X(computeNormalsAngle, float, 60)         \
    X(indicesDeltaCompression, bool, false)   \
    X(indices, Array<base::u32>)              \
    X(triIndices, Array<base::u32>)           \
    X(positionIndices, Array<base::u32>)      \
    X(normalIndices, Array<base::u32>)        \
    X(tangentIndices, Array<base::u32>)       \
    X(edgeCreasesIndices, Array<base::u32>)   \
    X(vertexCreasesIndices, Array<base::u32>) \
    X(edgeCreasesWeights, Array<float>)       \
    X(vertexCreasesWeights, Array<float>)
SCENE_SCHEMA(mesh, SCENE_MESH_TABLE)

/// Item of `primitives`.
#define SCENE_MESH_PRIMITIVE_TABLE(X) \
    X(name, base::string)             \
    X(materials, Array<Object>)       \
    X(bounds, base::box3f, {})        \
    X(indexStart, base::u32)          \
    X(indexCount, base::u32)          \
    X(triIndexStart, base::u32)       \
    X(triIndexCount, base::u32)       \
    X(topology, Array<base::u16>)     \
    X(vcounts, Array<base::u16>)      \
    X(ecounts, Array<base::u16>)      \
    X(restartIndex, base::u32)        \
    X(invisible, bool, false)
SCENE_SCHEMA(meshPrimitive, SCENE_MESH_PRIMITIVE_TABLE)

/// Item of `uvSets`.
#define SCENE_MESH_UV_SET_TABLE(X) \
    X(name, base::string)          \
    X(UV, Array<base::vec2f>)      \
    X(UVW, Array<base::vec3f>)     \
    X(UVWQ, Array<base::vec4f>)    \
    X(indices, Array<base::u32>)   \
    X(invalidIndex, base::u32)
SCENE_SCHEMA(meshUVSet, SCENE_MESH_UV_SET_TABLE)

/// Item of `colorSets`.
#define SCENE_MESH_COLOR_SET_TABLE(X) \
    X(name, base::string)             \
    X(A, Array<float>)                \
    X(RGB, Array<base::vec3f>)        \
    X(RGBA, Array<base::vec4f>)       \
    X(indices, Array<base::u32>)      \
    X(invalidIndex, base::u32)
SCENE_SCHEMA(meshColorSet, SCENE_MESH_COLOR_SET_TABLE)

/// Item of `jointsSets`.
#define SCENE_MESH_JOINTS_SET_TABLE(X) \
    X(name, base::string)              \
    X(jointBounds, Array<base::box3f>) \
    X(jointCounts, Array<base::u16>)   \
    X(maxVertexJoints, base::u32)      \
    X(indices, Array<base::u32>)       \
    X(weights, Array<float>)
SCENE_SCHEMA(meshJointsSet, SCENE_MESH_JOINTS_SET_TABLE)

/// Item of `bindPoseSets`.
#define SCENE_MESH_BIND_POSE_SET_TABLE(X) \
    X(name, base::string)                 \
    X(transforms, Array<base::mat43>)
SCENE_SCHEMA(meshBindPoseSet, SCENE_MESH_BIND_POSE_SET_TABLE)

#define SCENE_LINES_TABLE(X)                \
    X(linesStart, Array<base::u32>)         \
    X(points, Array<base::vec3f>)           \
    X(velocities, Array<base::vec3f>)       \
    X(colors, Array<base::vec4f>)           \
    X(assignment, Array<base::u32>)         \
    X(indicesDeltaCompression, bool, false) \
    X(materials, Array<Object>)
SCENE_SCHEMA(lines, SCENE_LINES_TABLE)

#define SCENE_POINTS_TABLE(X)         \
    X(points, Array<base::vec3f>)     \
    X(velocities, Array<base::vec3f>) \
    X(IDs, Array<base::u32>)
SCENE_SCHEMA(points, SCENE_POINTS_TABLE)

#define SCENE_HAIR_TABLE(X)                 \
    X(curvesStart, Array<base::u32>)        \
    X(controlPoints, Array<base::vec3f>)    \
    X(velocities, Array<base::vec3f>)       \
    X(colors, Array<base::vec4f>)           \
    X(indicesDeltaCompression, bool, false) \
    X(materials, Array<Object>)             \
    X(strandGeometry, bool, false)          \
    X(strandShading, bool, false)           \
    X(tessellation, base::u8, 1)            \
    X(widthMultiplier, float, 1)
SCENE_SCHEMA(hair, SCENE_HAIR_TABLE)

#define SCENE_FUR_TABLE(X)              \
    X(density, float, 1)                \
    X(knots, base::i32, 6)              \
    X(length, float, 1)                 \
    X(lengthVariation, float, 0.5f)     \
    X(thicknessRoot, float, 0.1f)       \
    X(thicknessTip, float, 0)           \
    X(thicknessVariation, float, 0.5f)  \
    X(bend, float, 0.5f)                \
    X(bendVariation, float, 0.5f)       \
    X(curls, float, 0)                  \
    X(curlRadius, float, 0.1f)          \
    X(curlRadiusVariation, float, 0.5f) \
    X(material, Object)
SCENE_SCHEMA(fur, SCENE_FUR_TABLE)

#define SCENE_SKIN_TABLE(X)           \
    X(baseMesh, Object)               \
    X(joints, Array<Object>)          \
    X(bindPoseSetIndex, base::i32, 0) \
    X(jointsSetIndex, base::i32, 0)   \
    X(outMesh, Object)
SCENE_SCHEMA(skin, SCENE_SKIN_TABLE)

/// `method`: 0 targets hold differences to the base mesh, 1 they are whole shapes.
#define SCENE_MORPH_TABLE(X)   \
    X(targets, Items)          \
    X(baseMesh, Object)        \
    X(method, Enumeration, 0)  \
    X(targetsWeight, float, 1) \
    X(blend, bool, true)       \
    X(frame, base::TimeCode)   \
    X(outMesh, Object)
SCENE_SCHEMA(morph, SCENE_MORPH_TABLE)

/// Item of `targets`.
#define SCENE_MORPH_TARGET_TABLE(X) \
    X(targetMesh, Object)           \
    X(weight, float, 0)
SCENE_SCHEMA(morphTarget, SCENE_MORPH_TARGET_TABLE)

// Shapes of generated meshes.
SCENE_SCHEMA(sphere, SCENE_NO_ATTRIBUTES)
SCENE_SCHEMA(quad, SCENE_NO_ATTRIBUTES)
SCENE_SCHEMA(disk, SCENE_NO_ATTRIBUTES)
SCENE_SCHEMA(cube, SCENE_NO_ATTRIBUTES)

/// All schemas of this page.
#define SCENE_GEOMETRY_SCHEMAS(X) \
    X(geometry)                   \
    X(geometryLOD)                \
    X(subdividable)               \
    X(mesh)                       \
    X(meshPrimitive)              \
    X(meshUVSet)                  \
    X(meshColorSet)               \
    X(meshJointsSet)              \
    X(meshBindPoseSet)            \
    X(lines)                      \
    X(points)                     \
    X(hair)                       \
    X(fur)                        \
    X(skin)                       \
    X(morph)                      \
    X(morphTarget)                \
    X(sphere)                     \
    X(quad)                       \
    X(disk)                       \
    X(cube)

} // namespace scene
