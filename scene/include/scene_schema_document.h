#pragma once

#include "scene_attribute.h"

/// Schemas of the document: the scene, its nodes, what is known about the document and its
/// output, and raw buffers. Each table is X(attribute, type[, default]).
namespace scene {

/// `playSpeed` in percent. `upAxis`: 0 X, 1 Y, 2 Z.
#define SCENE_SCENE_TABLE(X)              \
    X(name, base::string)                 \
    X(root, Object)                       \
    X(components, Array<Object>)          \
    X(useLightGroups, bool, false)        \
    X(environment, Object)                \
    X(linearUnits, Enumeration, 0)        \
    X(framesPerSecond, base::u32, 30)     \
    X(snapOnFrames, bool, true)           \
    X(loopAnimation, bool, true)          \
    X(autoKey, bool, false)               \
    X(resourcePaths, Array<base::string>) \
    X(animLayers, Array<Object>)          \
    X(time, base::TimeCode)               \
    X(startTime, base::TimeCode)          \
    X(endTime, base::TimeCode)            \
    X(playSpeed, base::i32, 100)          \
    X(upAxis, Enumeration, 1)             \
    X(showConsole, bool, false)           \
    X(consoleVerbosity, base::u8, 4)      \
    X(logVerbosity, base::u8, 3)
SCENE_SCHEMA(scene, SCENE_SCENE_TABLE)

/// How the transform is made of these is told in `scene_transform.h`. Angles in degrees.
/// `transformation`: 0 placed, 1 aimed at `targetPosition`. `rotateMode`: 0 `rotateEuler`,
/// 1 `rotateAxisAngle` (axis, then angle), 2 `rotate`. `rotateOrder`: 0 XYZ (X acts first),
/// 1 XZY, 2 YXZ, 3 YZX, 4 ZXY, 5 ZYX.
#define SCENE_NODE_TABLE(X)                       \
    X(name, base::string)                         \
    X(children, Array<Object>)                    \
    X(bounds, base::box3f, {})                    \
    X(visible, bool, true)                        \
    X(animate, bool, true)                        \
    X(motionBlur, bool, true)                     \
    X(transformation, Enumeration, 0)             \
    X(inheritsTransform, bool, true)              \
    X(translate, base::vec3d, {0, 0, 0})          \
    X(translatePivot, base::vec3d)                \
    X(rotateMode, Enumeration, 2)                 \
    X(rotateOrder, Enumeration, 0)                \
    X(rotate, base::quatf, {0, 0, 0, 1})          \
    X(rotateEuler, base::vec3f, {0, 0, 0})        \
    X(rotateAxisAngle, base::vec4f, {0, 1, 0, 0}) \
    X(rotatePivot, base::vec3d)                   \
    X(scale, base::vec3f, {1, 1, 1})              \
    X(scalePivot, base::vec3d)                    \
    X(shear, base::vec3f, {0, 0, 0})              \
    X(targetPosition, base::vec3d, {0, 0, 0})     \
    X(rotationAxes, base::vec3f, {0, 0, 0})       \
    X(distance, double, 10)                       \
    X(azimuth, float, 0)                          \
    X(altitude, float, 0)                         \
    X(materialIndex, base::i32, 0)                \
    X(cameraIndex, base::i32, 0)                  \
    X(geometryIndex, base::i32, 0)                \
    X(color, base::vec3f, {1, 0, 0})              \
    X(selectable, bool, true)                     \
    X(lock, bool, false)                          \
    X(isLayer, bool, false)                       \
    X(isJoint, bool, false)
SCENE_SCHEMA(node, SCENE_NODE_TABLE)

#define SCENE_INSTANCER_TABLE(X)      \
    X(name, base::string)             \
    X(bounds, base::box3f, {})        \
    X(objects, Array<Object>)         \
    X(transforms, Array<base::mat43>) \
    X(materialIndices, Array<base::u32>)
SCENE_SCHEMA(instancer, SCENE_INSTANCER_TABLE)

#define SCENE_SCENE_REFERENCE_TABLE(X) \
    X(file, base::string)              \
    X(mode, Enumeration, 2)
SCENE_SCHEMA(sceneReference, SCENE_SCENE_REFERENCE_TABLE)

/// `rating`: 255 is none.
#define SCENE_METADATA_TABLE(X) \
    X(title, base::string)      \
    X(author, base::string)     \
    X(copyright, base::string)  \
    X(rating, base::u8, 255)
SCENE_SCHEMA(metadata, SCENE_METADATA_TABLE)

SCENE_SCHEMA(workflow, SCENE_NO_ATTRIBUTES)
SCENE_SCHEMA(scriptOutput, SCENE_NO_ATTRIBUTES)
SCENE_SCHEMA(historyEvent, SCENE_NO_ATTRIBUTES)

/// `edgeColor` is the colour of a mesh's edges where they are drawn as lines.
#define SCENE_RENDER_OUTPUT_TABLE(X)     \
    X(edgeColor, base::vec3f, {0, 0, 0}) \
    X(pngCompression, base::u8)          \
    X(jpgQuality, base::u8, 95)          \
    X(exrCodec, Enumeration)
SCENE_SCHEMA(renderOutput, SCENE_RENDER_OUTPUT_TABLE)

SCENE_SCHEMA(outputJob, SCENE_NO_ATTRIBUTES)
SCENE_SCHEMA(compositingChannel, SCENE_NO_ATTRIBUTES)

#define SCENE_BUFFER_TABLE(X) \
    X(name, base::string)     \
    X(data, Array<base::u8>)  \
    X(resourceId, base::u32)
SCENE_SCHEMA(buffer, SCENE_BUFFER_TABLE)

/// `inputOffset` and `inputLength` in bytes. Outputs are views of the buffer's bytes.
#define SCENE_BUFFER_ADAPTER_TABLE(X)      \
    X(inputBuffer, Object)                 \
    X(inputOffset, base::u32, 0)           \
    X(inputLength, base::u32, 0xffffffffu) \
    X(outputUint8, Array<base::u8>)        \
    X(outputUint16, Array<base::u16>)      \
    X(outputUint32, Array<base::u32>)      \
    X(outputFloat, Array<float>)           \
    X(outputFloat2, Array<base::vec2f>)    \
    X(outputFloat3, Array<base::vec3f>)    \
    X(outputFloat4, Array<base::vec4f>)
SCENE_SCHEMA(bufferAdapter, SCENE_BUFFER_ADAPTER_TABLE)

#define SCENE_VIEWPORT_TABLE(X) X(name, base::string)
SCENE_SCHEMA(viewport, SCENE_VIEWPORT_TABLE)
SCENE_SCHEMA(popupWindow, SCENE_VIEWPORT_TABLE)
SCENE_SCHEMA(viewportWindow, SCENE_VIEWPORT_TABLE)

/// All schemas of this page but those of the viewports.
#define SCENE_DOCUMENT_SCHEMAS(X) \
    X(scene)                      \
    X(node)                       \
    X(instancer)                  \
    X(sceneReference)             \
    X(metadata)                   \
    X(workflow)                   \
    X(scriptOutput)               \
    X(historyEvent)               \
    X(renderOutput)               \
    X(outputJob)                  \
    X(compositingChannel)         \
    X(buffer)                     \
    X(bufferAdapter)

} // namespace scene
