#include "assimp/import_materials.h"

#include "b_string_convert.h"
#include "scene_mesh.h"
#include "scene_schema.h"
#include "stream/b_fs.h"

#include <assimp/material.h>
#include <assimp/mesh.h>
#include <assimp/scene.h>

#include <algorithm>
#include <array>

namespace assimp {

using base::string;
using base::string_view;

namespace {

bool hasTextures(const aiMaterial& material) {
    const MaterialProperties properties(material);
    for (unsigned type = 1; type <= AI_TEXTURE_TYPE_MAX; ++type)
        if (!properties.readText({AI_MATKEY_TEXTURE(type, 0)}).empty())
            return true;
    return false;
}

/// True if the object has a set of texture coordinates that exporters take.
bool hasCoordinates(const base::AttribMap& object) {
    const base::AttribMap* set = findListItem(object, scene::mesh_schema::n_uvSets, 0);
    return set && find(*set, scene::meshUVSet_schema::n_UV);
}

/// True for the material that readers make where a file has none: without a name of its own and
/// with nothing but one of their greys.
bool isDefaultMaterial(const aiMaterial& material) {
    const MaterialProperties properties(material);
    const string_view name = properties.readText({AI_MATKEY_NAME});
    if ((!name.empty() && name != AI_DEFAULT_MATERIAL_NAME) || hasTextures(material))
        return false;
    std::array<float, 3> color = {1, 1, 1};
    properties.read({AI_MATKEY_COLOR_DIFFUSE}, color);
    std::array<float, 1> exponent = {0}, opacity = {1};
    properties.read({AI_MATKEY_SHININESS}, exponent);
    properties.read({AI_MATKEY_OPACITY}, opacity);
    constexpr float greys[] = {0.6f, 0.8f, 1};
    return color[0] == color[1] && color[1] == color[2] && exponent[0] == 0 && opacity[0] == 1 &&
           std::ranges::find(greys, color[0]) != std::end(greys);
}

} // namespace

MaterialImport::MaterialImport(const aiScene& source, const string& path,
                               const base::AttribMap& importer, base::PluginFactory& factory)
    : source_(source), factory_(factory), format_(base::toLower(base::fs::extension(path))),
      textures_(
          source, path,
          [&] {
              const auto* folders = find(importer, scene::sceneExporter_schema::n_resourcePaths);
              return folders ? *folders : base::vector<string>();
          }(),
          factory) {}

void MaterialImport::assign(const aiMesh& mesh, const GeometryObjects& objects) {
    for (const base::ref<base::IPlugin>& listed : objects) {
        base::IPlugin* base = findObject(*listed, scene::morph_schema::n_baseMesh);
        base::IPlugin* object = base ? base : listed.get();
        const base::ref<base::IPlugin> material = materialOf(mesh, hasCoordinates(*object));
        if (!material)
            continue;
        if (object->typeName() == scene::lines_schema::n_kind)
            write(*object, scene::lines_schema::n_materials).push_back(material);
        const base::AttribArray* primitives = find(*object, scene::mesh_schema::n_primitives);
        for (base::u32 i = 0; primitives && i < primitives->size(); ++i)
            write(*primitives->item(i)->asMap(), scene::meshPrimitive_schema::n_materials)
                .push_back(material);
    }
}

base::ref<base::IPlugin> MaterialImport::materialOf(const aiMesh& mesh, bool isMappable) {
    const aiMaterial* source = mesh.mMaterialIndex < source_.mNumMaterials
                                   ? source_.mMaterials[mesh.mMaterialIndex]
                                   : nullptr;
    if (!source)
        return nullptr;
    const bool isMapped = isMappable && hasTextures(*source);
    const auto [at, isNew] = materials_.try_emplace(std::pair(mesh.mMaterialIndex, isMapped));
    if (!isNew || isDefaultMaterial(*source))
        return at->second;
    at->second = factory_.create(scene::principalMaterial_schema::n_kind);
    makeMaterial(*source, mesh, isMapped, format_, textures_, faults_, *at->second);
    return at->second;
}

MaterialFaults MaterialImport::faults() const {
    MaterialFaults faults = faults_;
    faults.transformedTextures = textures_.transformedCount();
    return faults;
}

base::vector<string> MaterialImport::pictureFiles() const {
    return textures_.foundFiles();
}

base::ref<base::IPlugin> MaterialImport::pictures() const {
    return textures_.pictures()->isEmpty() ? nullptr
                                           : base::ref<base::IPlugin>(textures_.pictures().get());
}

} // namespace assimp
