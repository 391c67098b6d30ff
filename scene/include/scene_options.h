#pragma once

#include "b_attribute_map.h"
#include "scene_attribute.h"

/// Settings of importers and exporters. They are attributes of the plugin object; each table is
/// the one source of their names, types, defaults and command-line options.
namespace base {
class CmdLineOptions;
}

namespace scene {

/// Settings with a word for each value; stored as their number. Options take word or number.
enum class Presence : base::u8 { never, present, always };
enum class NormalsMethod : base::u8 { smooth, flat };
enum class TangentsMethod : base::u8 { standard };

/// OPTION(attribute, type, default, help) is a setting with an option of the same name and a
/// leading "-"; SETTING(attribute, type, default) has no option. UNBOUND is an option whose value
/// exporters ignore.
#define SCENE_EXPORTER_TABLE(OPTION, UNBOUND, SETTING)                                          \
    OPTION(exportEdges, bool, false, "Whether to export mesh edges.")                           \
    OPTION(exportHair, bool, true, "Whether to export hair/curves/lines.")                      \
    OPTION(exportPoints, bool, true, "Whether to export points/particles.")                     \
    OPTION(exportColors, bool, true, "Whether to export the mesh vertex colors.")               \
    OPTION(exportTextureCoordinates, bool, true,                                                \
           "Whether to export the mesh texture coordinates. This is required for texturing to " \
           "work.")                                                                             \
    OPTION(exportTangents, bool, true,                                                          \
           "Whether to export the mesh tangents. If not present in the file, bump and normal "  \
           "mapping may not work.")                                                             \
    OPTION(exportAnimations, bool, true, "Whether to export animations.")                       \
    OPTION(exportCameras, bool, true, "Whether to export scene cameras.")                       \
    OPTION(exportLights, bool, true, "Whether to export the scene lights.")                     \
    UNBOUND(exportBinary, bool, true, "Whether to export in binary format.")                    \
    OPTION(exportCompress, bool, true, "Whether to export in compressed format.")               \
    OPTION(exportCompressImages, bool, true,                                                    \
           "Whether to compress the images to take less space when possible.")                  \
    OPTION(exportImageMaxDim, base::u32, 4096,                                                  \
           "Maximum dimension of the images. Can be used to further decrease the file size.")   \
    OPTION(exportEmbedded, bool, true, "Incorporate into the file any external resources.")     \
    SETTING(exportCopyright, base::string, "")

#define SCENE_IMPORTER_TABLE(OPTION, SETTING)                                                      \
    OPTION(keepInSync, bool, true,                                                                 \
           "If on, synchronize with the source file at startup, making sure you are working with " \
           "the last version.")                                                                    \
    OPTION(importMeshes, bool, true, "Whether to import meshes.")                                  \
    OPTION(importTriangulateMeshes, bool, false,                                                   \
           "Whether to triangulate the mesh or keep the original polygons. If not triangulated, "  \
           "this will be done on te fly which takes extra time. This should be not done for "      \
           "meshes which use subdivision/displacement however.")                                   \
    OPTION(importSurfaces, bool, true, "Whether to import NURBS and patch surfaces.")              \
    OPTION(importTriangulateSurfaces, bool, false,                                                 \
           "Whether to triangulate the surface or keep the original data.")                        \
    OPTION(importSubdivision, bool, true, "Turn on and off the import of subdivision surfaces.")   \
    OPTION(importTessellation, float, 1,                                                           \
           "Modifier for the tessellation factor chosen for converting surfaces to triangles. "    \
           "Higher value will increase the quality, but will increase the processing time, file "  \
           "size and rendering speed.")                                                            \
    OPTION(importColors, bool, true, "Whether to import the mesh vertex colors.")                  \
    OPTION(importMultiIndex, Presence, Presence::always,                                           \
           "Whether meshes keep separate indices for positions, normals and texture "              \
           "coordinates.")                                                                         \
    OPTION(importTextureCoordinates, bool, true,                                                   \
           "Whether to import the mesh texture coordinates. This is required for texturing to "    \
           "work.")                                                                                \
    OPTION(importNormals, Presence, Presence::always,                                              \
           "Whether to import the mesh normals. If not present in the file, they must be "         \
           "generated on the fly which takes extra time.")                                         \
    OPTION(computeNormalsMethod, NormalsMethod, NormalsMethod::smooth,                             \
           "Method used to generate normals if missing.")                                          \
    SETTING(computeNormalsAngle, float, 60)                                                        \
    OPTION(flipNormals, bool, false,                                                               \
           "Whether to flip the face orientation/normals. Some models may use wrong convention.")  \
    OPTION(importTangents, Presence, Presence::present,                                            \
           "Whether to import the mesh tangents. If not present in the file, they must be "        \
           "generated on the fly or use the 'Without Tangents' bump space.")                       \
    OPTION(computeTangentsMethod, TangentsMethod, TangentsMethod::standard,                        \
           "Method used to compute the tangents if missing.")                                      \
    OPTION(importVelocities, bool, true,                                                           \
           "Whether to import the vertex velocities. Velocities are used for effects like motion " \
           "blur.")                                                                                \
    OPTION(importSkeletons, bool, true,                                                            \
           "Whether to import the mesh skeletons. Skeletons are used to pose and animate the "     \
           "characters.")                                                                          \
    OPTION(importEdges, bool, true,                                                                \
           "Whether to import mesh/surface edges. Edges can be used to draw object outlines.")     \
    OPTION(importMaterials, bool, true, "Whether to import materials.")                            \
    OPTION(importLights, bool, true, "Whether to import the scene lights.")                        \
    OPTION(importCameras, bool, true, "Whether to import scene cameras.")                          \
    OPTION(importAnimations, bool, true, "Whether to import animations.")                          \
    OPTION(importBakedAnimations, bool, false,                                                     \
           "Whether to force per frame animation baking instead of importing the actual "          \
           "animation curves.")                                                                    \
    OPTION(importHair, bool, true, "Whether to import hair/curves/lines.")                         \
    OPTION(importPoints, bool, true, "Whether to import points/particles.")                        \
    SETTING(importFilename, base::string, "")                                                      \
    SETTING(hashMethod, base::string, "xx")                                                        \
    SETTING(compressionMethod, base::string, "zip")                                                \
    SETTING(compressionLevel, base::i32, 5)                                                        \
    SETTING(includeResources, bool, false)                                                         \
    SETTING(textColumns, base::i32, 180)

/// The schema attribute of a setting. Texts have no default in the schema.
template <class T, class D>
constexpr auto settingAttribute(const char* name, D defaultValue) {
    if constexpr (std::is_same_v<T, base::string>)
        return schemaAttribute<T>(name);
    else if constexpr (std::is_enum_v<T>)
        return schemaAttribute<Enumeration>(name, static_cast<Enumeration>(defaultValue));
    else
        return schemaAttribute<T>(name, static_cast<T>(defaultValue));
}

#define SCENE_SETTING_NAME(name, type, defaultValue, ...) \
    static inline constinit auto n_##name = settingAttribute<type>(#name, defaultValue);
#define SCENE_SETTING_ADDRESS(name, ...) &n_##name,
#define SCENE_SETTING_MEMBER(name, type, defaultValue, ...) type name = defaultValue;

/// Settings of exporters: beside their names the values that are in force during an export.
struct sceneExporter_schema {
    static inline constinit SchemaName n_kind{"sceneExporter"};
    SCENE_EXPORTER_TABLE(SCENE_SETTING_NAME, SCENE_SETTING_NAME, SCENE_SETTING_NAME)
    static inline constinit auto n_resourcePaths =
        schemaAttribute<Array<base::string>>("resourcePaths");

    SCENE_EXPORTER_TABLE(SCENE_SETTING_MEMBER, SCENE_SETTING_MEMBER, SCENE_SETTING_MEMBER)
    base::vector<base::string> resourcePaths;

    static std::span<SchemaName* const> names() {
        static constexpr SchemaName* all[] = {&n_kind, &n_resourcePaths,
                                              SCENE_EXPORTER_TABLE(SCENE_SETTING_ADDRESS,
                                                                   SCENE_SETTING_ADDRESS,
                                                                   SCENE_SETTING_ADDRESS)};
        return all;
    }

    /// Sets every member to its default and then binds it to the attribute of `object`: takes
    /// its value, or makes it with the default. `exportBinary` is left at its default,
    /// `resourcePaths` copied only. Throws on an attribute of another type.
    void bindSettings(base::AttribMap& object);
};

/// Settings of importers.
struct sceneImporter_schema {
    static inline constinit SchemaName n_kind{"sceneImporter"};
    SCENE_IMPORTER_TABLE(SCENE_SETTING_NAME, SCENE_SETTING_NAME)
    static inline constinit auto n_modificationDate =
        schemaAttribute<base::DateTime>("modificationDate");

    static std::span<SchemaName* const> names() {
        static constexpr SchemaName* all[] = {
            &n_kind, &n_modificationDate,
            SCENE_IMPORTER_TABLE(SCENE_SETTING_ADDRESS, SCENE_SETTING_ADDRESS)};
        return all;
    }
};

/// Intern the names of the two schemas, once per module.
void register_importer_schema();
void register_exporter_schema();

/// Set every setting to its default in `parameters`, making what is missing, and the map's type
/// name. Of an exporter's all but `exportBinary` and `resourcePaths`. Throw on an attribute of
/// another type.
void fillImporterDefaults(base::AttribMap& parameters);
void fillExporterDefaults(base::AttribMap& parameters);

/// Add the options of the tables, in the groups "importer" and "exporter".
void registerImporterOptions(base::CmdLineOptions& options);
void registerExporterOptions(base::CmdLineOptions& options);

/// Stores the values of all options of `group` that were given on the command line as attributes
/// of `parameters`, under the options' names without "-", replacing what was there. A word that
/// a setting does not know is told in `errors` and leaves the attribute as it was.
void applyOptions(const base::CmdLineOptions& options, base::string_view group,
                  base::AttribMap& parameters, base::vector<base::string>& errors);

} // namespace scene
