#include "gltf/exporter.h"
#include "gltf/guarded.h"
#include "gltf/scene_kind.h"
#include "gltf/vertex_array.h"

#include "b_attribute_desc.h"
#include "scene_schema.h"
#include "stream/b_fs.h"

#include <algorithm>

namespace gltf {

using base::log;
using base::logScene;
using base::ref;
using base::string;
using base::u32;
using base::u8;
using base::vec3f;
using scene::fileTexture_schema;
using scene::ImageRecord;
using scene::IMaterial;
using scene::ITexture;
using scene::material_schema;
using scene::principalMaterial_schema;

namespace {

constexpr float leastTransparency = 0.0001f, leastAlpha = 0.05f;

// Codes of `colorChannels`.
constexpr u8 greenChannel = 4, blueChannel = 5;

/// The texture under `name`; null for an object of another kind too.
const ITexture* findTexture(const IMaterial& material,
                            const scene::SchemaAttribute<scene::Object>& name) {
    base::IPlugin* object = findObject(material, name);
    if (!object ||
        !base::attribDescManager().derivesFrom(object->typeName(), scene::texture_schema::n_kind))
        return nullptr;
    return findClass<const ITexture>(*object);
}

u8 readColorChannels(const ITexture& texture) {
    return read(texture, scene::bitmapTexture_schema::n_colorChannels);
}

/// True for the layout in which glTF reads both: metal in blue and roughness in green.
bool sameFileMetalRoughness(const ITexture& metal, const ITexture& rough) {
    if (metal.typeName() != fileTexture_schema::n_kind ||
        rough.typeName() != fileTexture_schema::n_kind)
        return false;
    const string* metalFile = find(metal, fileTexture_schema::n_file);
    const string* roughFile = find(rough, fileTexture_schema::n_file);
    return (metalFile ? *metalFile : string()) == (roughFile ? *roughFile : string()) &&
           readColorChannels(metal) == blueChannel && readColorChannels(rough) == greenChannel;
}

/// Removes a file whose image the document has, or which nothing came of.
void removeTemporary(const string& path) {
    constexpr const char* message = "Unable to delete temporary file!";
    guarded(message, [&] {
        if (!base::fs::master().remove(path))
            log().log(base::logSystem, base::logError, message);
    });
}

/// Turns one principal material into one of the document.
class MaterialConversion {
public:
    MaterialConversion(TextureExport& textures, const IMaterial& material, const scene::IMesh* mesh)
        : textures_(textures), material_(material), mesh_(mesh),
          ambient_(findTexture(material, principalMaterial_schema::n_ambientMap)),
          rough_(findTexture(material, principalMaterial_schema::n_roughnessMap)) {}

    ref<GLTF::MaterialPBR> convert() {
        if (const string* name = find(material_, material_schema::n_name))
            result_->name = *name;
        setBaseColor();
        setTransparency();
        setMetalRoughness();
        setNormalMap();
        if (usesOcclusion_)
            result_->occlusionTexture = textures_.buildTextureSlot(*ambient_, mesh_);
        if (model_ == 0 || model_ == 5)
            setEmission();
        if (!isFinite_)
            log().log(logScene, base::logWarning,
                      "gltf |{}| The material has values that are not finite, the defaults are "
                      "taken!",
                      material_.getName());
        return result_;
    }

private:
    using Slot = ref<GLTF::MaterialPBR::Texture>;

    vec3f readColor(const scene::DefaultedAttribute<vec3f>& attribute) {
        const vec3f color = read(material_, attribute);
        if (isFinite(&color.x, 3))
            return color;
        isFinite_ = false;
        return attribute.defaultValue;
    }

    void setBaseColor() {
        const vec3f color = readColor(principalMaterial_schema::n_color);
        result_->metallicRoughness->baseColorFactor = {color.x, color.y, color.z, 1};
        const ITexture* map = findTexture(material_, principalMaterial_schema::n_colorMap);
        if (!map)
            return;
        bool hasAlpha = false;
        result_->metallicRoughness->baseColorTexture =
            textures_.buildTextureSlot(*map, mesh_, &hasAlpha);
        if (hasAlpha)
            result_->alphaMode = "BLEND";
    }

    void setTransparency() {
        const vec3f color = readColor(principalMaterial_schema::n_transparency);
        const float transparency = (color.x + color.y + color.z) * 0.33333334f;
        if (!(transparency > leastTransparency))
            return;
        result_->alphaMode = "BLEND";
        result_->metallicRoughness->baseColorFactor[3] = std::max(1 - transparency, leastAlpha);
    }

    void setMetalRoughness() {
        GLTF::MaterialPBR::MetallicRoughness& target = *result_->metallicRoughness;
        usesOcclusion_ = ambient_ && read(material_, principalMaterial_schema::n_ambientType) == 1;
        target.roughnessFactor = read(material_, principalMaterial_schema::n_roughness);
        if (!isFinite(&target.roughnessFactor, 1)) {
            isFinite_ = false;
            target.roughnessFactor = principalMaterial_schema::n_roughness.defaultValue;
        }

        const ITexture* metal = nullptr;
        if (model_ == 0) {
            metal = findTexture(material_, principalMaterial_schema::n_metalMap);
            target.metallicFactor = metal ? 1.0f : 0.0f;
        } else {
            target.metallicFactor = model_ == 4 ? 1.0f : 0.0f;
        }
        const bool isReady = metal ? rough_ && sameFileMetalRoughness(*metal, *rough_)
                                   : rough_ && readColorChannels(*rough_) == greenChannel;
        if (isReady)
            target.metallicRoughnessTexture = textures_.buildTextureSlot(*rough_, mesh_);
        else if (metal || rough_)
            target.metallicRoughnessTexture = buildPacked(metal);
    }

    /// The slot of a picture made of the maps, which stands for occlusion too.
    Slot buildPacked(const ITexture* metal) {
        const string path =
            textures_.packOcclusionRoughnessMetal(result_->name, ambient_, metal, rough_);
        if (path.empty())
            return nullptr;
        const ITexture& texture = metal ? *metal : rough_ ? *rough_ : *ambient_;
        Slot slot = textures_.buildTextureSlot(texture, mesh_, nullptr, path);
        if (usesOcclusion_)
            result_->occlusionTexture = slot;
        usesOcclusion_ = false;
        if (slot)
            textures_.describeImage(*slot->texture->source, filesOf({ambient_, metal, rough_}),
                                    ImageRecord::Work::packed);
        removeTemporary(path);
        return slot;
    }

    void setNormalMap() {
        const ITexture* map = findTexture(material_, material_schema::n_bumpMap);
        if (!map)
            return;
        if (read(material_, material_schema::n_bumpSpace) != 0)
            log().log(logScene, base::logWarning, "{}|Bump space is not supported by GLTF!",
                      material_.getName());
        const string path =
            textures_.isHeightMap(*map) ? textures_.makeNormalMapFile(*map, material_) : string();
        result_->normalTexture = textures_.buildTextureSlot(*map, mesh_, nullptr, path);
        if (path.empty())
            return;
        if (result_->normalTexture)
            textures_.describeImage(*result_->normalTexture->texture->source, filesOf({map}),
                                    ImageRecord::Work::normalMap);
        removeTemporary(path);
    }

    void setEmission() {
        const vec3f color = readColor(principalMaterial_schema::n_emission);
        result_->emissiveFactor = {color.x, color.y, color.z, 1};
        if (const ITexture* map = findTexture(material_, principalMaterial_schema::n_emissionMap))
            result_->emissiveTexture = textures_.buildTextureSlot(*map, mesh_);
    }

    base::vector<string> filesOf(std::initializer_list<const ITexture*> textures) const {
        base::vector<string> files;
        for (const ITexture* texture : textures) {
            string path = texture ? textures_.sourceOf(*texture) : string();
            if (!path.empty() && std::ranges::find(files, path) == files.end())
                files.push_back(std::move(path));
        }
        return files;
    }

    TextureExport& textures_;
    const IMaterial& material_;
    const scene::IMesh* mesh_;
    const ITexture* ambient_;
    const ITexture* rough_;
    bool usesOcclusion_ = false;
    bool isFinite_ = true;
    /// Every model is converted as the default one, whatever the material says.
    const u8 model_ = principalMaterial_schema::n_model.defaultValue;
    ref<GLTF::MaterialPBR> result_ = base::makeRef<GLTF::MaterialPBR>();
};

} // namespace

void GLTFScenePlugin::assignMaterial(GLTF::Primitive& primitive,
                                     const base::vector<scene::Object>& materials, u32 index,
                                     const scene::IMesh* mesh) {
    if (materials.empty())
        return;
    base::IPlugin* object = materials[std::min<std::size_t>(index, materials.size() - 1)].get();
    if (!object)
        return;
    const auto [entry, isNew] = materialMap.try_emplace(object);
    if (isNew)
        entry->second = buildMaterial(*object, mesh);
    if (primitive.material != entry->second)
        primitive.material = entry->second;
}

ref<GLTF::Material> GLTFScenePlugin::buildMaterial(base::IPlugin& object,
                                                   const scene::IMesh* mesh) {
    if (object.typeName() != principalMaterial_schema::n_kind)
        return nullptr;
    const auto* material = findClass<const IMaterial>(object);
    if (!material)
        return nullptr;
    return MaterialConversion(textures, *material, mesh).convert();
}

} // namespace gltf
