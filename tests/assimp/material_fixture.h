#pragma once

#include "import_fixture.h"

#include "i_file.h"
#include "scene_mesh.h"

#include <vector>

namespace test_support {

/// Imports models with materials.
class MaterialFixture : public Import {
protected:
    /// Writes a picture, for those that need only exist.
    void touch(const std::string& name) {
        std::filesystem::create_directories((folder_ / name).parent_path());
        writePicture(name, iio::Image::kRGB, {1, 2, 3, 4, 5, 6});
    }
    /// Writes a picture of one row.
    void writePicture(const std::string& name, base::u8 format,
                      const std::vector<base::u8>& components) {
        const base::u32 channels = iio::formatInfo(format).channelCount;
        iio::Image image(static_cast<base::u32>(components.size()) / channels, 1, 1, 1, format,
                         iio::Image::IT_UNSIGNED_BYTE);
        std::copy(components.begin(), components.end(), image.data());
        ASSERT_TRUE(iio::saveImage(image, folder_ / name));
    }

    static base::string textOf(const std::string& path) {
        std::ifstream file(path, std::ios::binary);
        return {std::istreambuf_iterator<char>(file), {}};
    }

    /// A triangle with texture coordinates and one material, "m", with these lines of MTL.
    bool loadMtl(const std::string& lines) {
        write("m.mtl", "newmtl m\n" + lines);
        return load("m.obj", "mtllib m.mtl\nv 0 0 0\nv 1 0 0\nv 0 1 0\nvt 0 0\nvt 1 0\nvt 0 1\n"
                             "o part\nusemtl m\nf 1/1 2/2 3/3\n");
    }

    base::IPlugin& material() { return only(scene::principalMaterial_schema::n_kind); }
    base::IPlugin* texture(const scene::SchemaAttribute<scene::Object>& map) {
        return findObject(material(), map);
    }
    /// The file of a map relative to the folder of the test; empty without map.
    std::string fileOf(const scene::SchemaAttribute<scene::Object>& map) {
        const base::IPlugin* object = texture(map);
        const auto* file = object ? find(*object, scene::fileTexture_schema::n_file) : nullptr;
        return file ? std::filesystem::path(*file).lexically_relative(folder_).string() : "";
    }
    int channelsOf(const scene::SchemaAttribute<scene::Object>& map) {
        const base::IPlugin* object = texture(map);
        return object ? read(*object, scene::bitmapTexture_schema::n_colorChannels) : -1;
    }

    void expectColor(const scene::DefaultedAttribute<base::vec3f>& attribute,
                     const base::vec3f& wanted) {
        const base::vec3f found = read(material(), attribute);
        EXPECT_NEAR(found.x, wanted.x, 1e-6) << attribute.text;
        EXPECT_NEAR(found.y, wanted.y, 1e-6) << attribute.text;
        EXPECT_NEAR(found.z, wanted.z, 1e-6) << attribute.text;
    }
};

} // namespace test_support
