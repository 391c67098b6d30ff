#include "texture_scene.h"

#include "picture_floor.h"
#include "support/gltf_reader.h"
#include "texture_floor.h"

#include "i_file.h"

#include <stdexcept>

namespace bench {

using base::u32;
using base::u8;
using iio::Image;
using test_support::SceneBuilder;

MapFiles::MapFiles(u32 colourSide, u32 roughnessSide, u32 metalSide)
    : colours_(write("colour", colourSide, Image::kRGB)),
      roughness_(write("roughness", roughnessSide, Image::kLuminance)),
      metal_(write("metal", metalSide, Image::kLuminance)) {}

MapFiles::List MapFiles::write(const char* name, u32 side, u8 format) {
    // To write slowly and small would only make a run wait for its files.
    base::AttribMap settings;
    settings.attribute<base::i32>(iio::imageAttributes().n_CompressionLevel) = 1;
    List paths;
    for (u32 i = 0; side != 0 && i < materialCount; ++i) {
        paths.push_back(folder_ / (name + std::to_string(i) + ".png"));
        const auto picture = makePhotograph(side, side, format, ++seed_);
        if (!iio::saveImage(*picture, base::string(paths.back()), settings))
            throw std::runtime_error(paths.back() + " was not written");
    }
    return paths;
}

namespace {

/// Puts a texture for `path` into the material's attribute, which is read from its red channel.
void setMap(SceneBuilder& scene, base::AttribMap& material,
            const scene::SchemaAttribute<scene::Object>& name, const std::string& path) {
    auto& texture = scene.add<scene::IFileTexture>();
    write(texture, scene::fileTexture_schema::n_file) = path.c_str();
    write(texture, scene::bitmapTexture_schema::n_colorChannels) = 1;
    write(material, name) = scene::Object(&texture);
}

base::IPlugin& addMaterial(SceneBuilder& scene, const MapFiles& files, u32 number) {
    using Material = scene::principalMaterial_schema;
    const std::string name = "material" + std::to_string(number);
    auto& material = scene.add<scene::IPrincipalMaterial>(name.c_str());
    if (!files.colours().empty())
        setMap(scene, material, Material::n_colorMap, files.colours()[number]);
    if (!files.roughness().empty()) {
        setMap(scene, material, Material::n_roughnessMap, files.roughness()[number]);
        setMap(scene, material, Material::n_metalMap, files.metal()[number]);
    }
    return material;
}

} // namespace

ScenePtr makeTexturedScene(const MapFiles& files) {
    ScenePtr scene = makeScene();
    for (u32 i = 0; i < MapFiles::materialCount; ++i) {
        auto& mesh = scene->addTo<scene::IMesh>(scene->addTo<scene::INode>(*scene->root));
        write(mesh, scene::mesh_schema::n_positions) = {{0, 0, 0}, {1, 0, 0}, {0, 1, 0}};
        test_support::appendUVs(mesh) = {{0, 0}, {1, 0}, {0, 1}};
        write(test_support::appendPrimitive(mesh, 3), scene::meshPrimitive_schema::n_materials)
            .push_back(scene::Object(&addMaterial(*scene, files, i)));
    }
    return scene;
}

ExportedPictures readPictures(const std::string& path, u32 side) {
    const auto file = test_support::GltfFile::read(path);
    ExportedPictures pictures;
    for (std::size_t i = 0; i < file.count("images"); ++i) {
        const rapidjson::Value& image = file.element("images", i);
        const auto bytes = file.bufferView(image["bufferView"].GetUint());
        const PictureSize size = readJpegSize(bytes);
        if (image["mimeType"] != "image/jpeg" || size.width != side || size.height != side)
            throw std::runtime_error("an exported picture is not what was asked for");
        ++pictures.count;
        pictures.byteCount += bytes.size();
    }
    return pictures;
}

} // namespace bench
