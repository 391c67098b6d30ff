#pragma once

#include "scene_schema_animation.h"
#include "scene_schema_document.h"
#include "scene_schema_geometry.h"
#include "scene_schema_light.h"
#include "scene_schema_material.h"

/// Registration of the scene model: every module that refers to schemas runs the registrars
/// first. The tables are in `scene_schema_*.h`, those of import and export in `scene_options.h`.
namespace base {
class PluginFactory;
}

namespace scene {

/// X(type) for every schema of scene objects and of the items they hold.
#define SCENE_SCHEMAS(X)      \
    SCENE_DOCUMENT_SCHEMAS(X) \
    SCENE_GEOMETRY_SCHEMAS(X) \
    SCENE_MATERIAL_SCHEMAS(X) \
    SCENE_LIGHT_SCHEMAS(X)    \
    SCENE_ANIMATION_SCHEMAS(X)

#define SCENE_VIEWPORT_SCHEMAS(X) \
    X(viewport)                   \
    X(popupWindow)                \
    X(viewportWindow)

/// Interns the names of a schema; harmless where they are interned already.
void internNames(std::span<SchemaName* const> names);

/// Interns the names of the scene schema (once per module) and registers the descriptions of the
/// scene's object types with `factory`. Types that it knows already stay as they are.
void register_scene_schema(base::PluginFactory& factory);
/// The same for viewports and windows.
void register_viewport_schema(base::PluginFactory& factory);

} // namespace scene
