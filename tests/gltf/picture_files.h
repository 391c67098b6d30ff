#pragma once

#include "export_fixture.h"

#include "i_file.h"
#include "scene_image_record.h"
#include "stream/b_stream_workers.h"

#include <rapidjson/pointer.h>

namespace test_support {

using iio::Image;
using ImageRef = base::ref<Image>;
using Principal = scene::principalMaterial_schema;

/// What a picture file holds. The last three are files of the fuzzers, of 5 x 5 pixels.
enum Kind { rgb, rgba, grey, greyAlpha, rgb16, rgba16, palette, clearPalette, clearGrey };

/// The pixel that fills the pictures of a kind.
inline std::vector<int> pixelOf(Kind kind) {
    static const std::vector<int> pixels[] = {{200, 100, 50}, {200, 100, 50, 128},
                                              {200},          {200, 128},
                                              {200, 100, 50}, {200, 100, 50, 128}};
    return pixels[kind];
}

/// A picture that `components`, of 0 to 255 in the order of memory, fill again and again.
inline ImageRef makePicture(base::u32 width, base::u32 height, base::u8 format,
                            const std::vector<int>& components, bool isWide = false) {
    const base::u8 type = isWide ? Image::IT_UNSIGNED_SHORT : Image::IT_UNSIGNED_BYTE;
    auto image = base::makeRef<Image>(width, height, 1u, 1u, format, type);
    for (size_t i = 0; i < size_t(width) * height * image->channelCount(); ++i) {
        const int value = components[i % components.size()];
        if (isWide)
            reinterpret_cast<base::u16*>(image->data())[i] = static_cast<base::u16>(value * 257);
        else
            image->data()[i] = static_cast<base::u8>(value);
    }
    return image;
}

/// The file in the format of `extension`.
inline Bytes encoded(Image& image, const std::string& extension) {
    base::vector<base::u8> bytes;
    base::Stream stream = base::vectorStream(bytes, "picture." + extension);
    EXPECT_TRUE(iio::saveImage(image, stream));
    return {bytes.begin(), bytes.end()};
}
inline Bytes encoded(Kind kind, const std::string& extension, base::u32 width = 4,
                     base::u32 height = 4) {
    static const char* const seeds[] = {"colour-3-8", "transparent-3", "transparent-0"};
    if (kind >= palette)
        return readBytes(std::string(IMAGE_SEEDS "/png/") + seeds[kind - palette] + ".png");
    constexpr base::u8 formats[] = {Image::kRGB,       Image::kRGBA,
                                    Image::kLuminance, Image::kLuminanceAlpha,
                                    Image::kRGB,       Image::kRGBA};
    return encoded(*makePicture(width, height, formats[kind], pixelOf(kind), kind >= rgb16),
                   extension);
}

inline bool isPng(const Bytes& bytes) {
    return bytes.size() > 1 && bytes[1] == 'P';
}
inline ImageRef readPicture(const std::string& path) {
    const Bytes bytes = readBytes(path);
    base::Stream stream =
        base::memStreamView(bytes.data(), bytes.size(), isPng(bytes) ? "a.png" : "a.jpg");
    return iio::loadImage(stream);
}

/// An export of a triangle with materials, to a text file with its pictures beside it. Whatever a
/// test does, no picture that it reads may change and no temporary file may be left.
struct MaterialExport : Exporting {
    MaterialExport() {
        write(mesh, scene::mesh_schema::n_positions) = {{0, 0, 0}, {1, 0, 0}, {0, 1, 0}};
        write(mesh, scene::mesh_schema::n_indices) = {0, 1, 2};
        set(Settings::n_exportEmbedded, false);
        std::filesystem::create_directory(folder / "out");
    }
    ~MaterialExport() {
        EXPECT_TRUE(std::filesystem::is_empty(temporary_.path()));
        for (const auto& [path, bytes] : sources_) {
            EXPECT_EQ(readBytes(path), bytes) << path;
            EXPECT_EQ(std::filesystem::last_write_time(path), longAgo_) << path;
        }
    }

    /// Writes a file that is to be read.
    void put(const std::string& name, const Bytes& bytes) {
        const std::filesystem::path path = folder / name;
        std::filesystem::create_directories(path.parent_path());
        std::ofstream(path, std::ios::binary) << std::string(bytes.begin(), bytes.end());
        std::filesystem::last_write_time(path, longAgo_);
        sources_[path.string()] = bytes;
    }
    void put(const std::string& name, Kind kind, base::u32 width = 4, base::u32 height = 4) {
        put(name, encoded(kind, name.substr(name.rfind('.') + 1), width, height));
    }

    /// A material on a primitive of the mesh.
    scene::IPrincipalMaterial& addMaterial(const std::string& name = "Mat") {
        auto& material = add<scene::IPrincipalMaterial>(name.c_str());
        write(appendPrimitive(mesh, 3, 0, 3),
              scene::meshPrimitive_schema::n_materials) = {scene::Object(&material)};
        return material;
    }
    /// Sets a map: "file" or "file:code of its channels", "checker" for a procedural texture,
    /// "node" for what is no texture, nothing for none. Returns what it is now.
    base::IPlugin& setMap(scene::IMaterial& material,
                          const scene::SchemaAttribute<scene::Object>& attribute,
                          const std::string& map) {
        base::IPlugin* object = nullptr;
        if (map == "checker") {
            object = &add<scene::ICheckerTexture>();
        } else if (map == "node") {
            object = root;
        } else if (!map.empty()) {
            const size_t colon = map.rfind(':');
            object = &add<scene::IFileTexture>();
            write(*object, scene::fileTexture_schema::n_file) = folder / map.substr(0, colon);
            if (colon != std::string::npos)
                write(*object, scene::bitmapTexture_schema::n_colorChannels) =
                    static_cast<base::u8>(map[colon + 1] - '0');
        }
        if (object)
            write(material, attribute) = scene::Object(object);
        return object ? *object : material;
    }

    GltfFile run() { return saveAndRead("out/scene.gltf"); }
    std::string outFile(const std::string& name) const { return folder / ("out/" + name); }
    /// Of the only picture.
    scene::ImageRecord record() const {
        const auto records = scene::findImageRecords(*scene);
        return records.size() == 1 ? records[0] : scene::ImageRecord();
    }

    scene::IMesh& mesh = addTo<scene::IMesh>(*root, "mesh");

private:
    TempFolder temporary_;
    TmpDirGuard tmpdir_{temporary_.path()};
    std::filesystem::file_time_type longAgo_{};
    std::map<std::string, Bytes> sources_;
};

constexpr const char* baseSlot = "pbrMetallicRoughness/baseColorTexture";
constexpr const char* roughSlot = "pbrMetallicRoughness/metallicRoughnessTexture";

/// A member of a material, such as "normalTexture"; null if it is not there.
inline const rapidjson::Value* findMember(const GltfFile& file, size_t material, const char* name) {
    const std::string pointer = "/materials/" + std::to_string(material) + "/" + name;
    return rapidjson::Pointer(pointer.c_str()).Get(file.json());
}
/// The texture of a slot, or the name of its picture; null and empty without one.
inline const rapidjson::Value* findTexture(const GltfFile& file, size_t material,
                                           const char* slot) {
    const rapidjson::Value* found = findMember(file, material, slot);
    return found ? &file.element("textures", (*found)["index"].GetUint()) : nullptr;
}
inline std::string uriOf(const GltfFile& file, size_t material, const char* slot) {
    const rapidjson::Value* texture = findTexture(file, material, slot);
    return texture ? file.element("images", (*texture)["source"].GetUint())["uri"].GetString() : "";
}

/// How often the log has `part`, with the level in front of a message.
inline size_t countIn(const LogCapture& log, const std::string& part) {
    const std::string lines = linesOf(log);
    size_t count = 0;
    for (size_t at = lines.find(part); at != std::string::npos; at = lines.find(part, at + 1))
        ++count;
    return count;
}

} // namespace test_support
