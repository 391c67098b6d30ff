#include "gltf/guarded.h"
#include "gltf/pack_maps.h"
#include "gltf/prepare_image.h"
#include "gltf/texture_export.h"

#include "b_format.h"
#include "b_string_convert.h"
#include "i_file.h"
#include "i_normal_map.h"
#include "scene_schema.h"
#include "stream/b_fs.h"

#include <algorithm>

/// Pictures that the document needs and the scene doesn't have, as temporary files.
namespace gltf {

using base::ref;
using base::string;
using base::string_view;
using base::u32;
using base::u64;
using base::u8;
using scene::ITexture;

namespace {

constexpr u32 sideWithoutSource = 1024;
constexpr std::size_t longestName = 200; ///< bytes in front of what a name ends with

/// `name` as the beginning of a file name: no separators, no control characters, not too long.
string fileNameOf(string_view name) {
    string result(base::cutUtf8(name, longestName));
    for (char& c : result) {
        if (c == '/' || c == '\\' || static_cast<u8>(c) < 0x20 || c == 0x7F)
            c = '_';
    }
    return result;
}

[[noreturn]] void fail(const string& text, int line) {
    throw base::exception(text, "texture_files", "gltf::TextureExport", line);
}

void save(iio::Image& image, const string& path) {
    if (iio::saveImage(image, path))
        return;
    base::fs::master().remove(path);
    fail("'" + path + "' could not be written", __LINE__);
}

} // namespace

ref<iio::Image> TextureExport::loadTextureImage(const ITexture* texture) const {
    const string path = texture ? resolveTexturePath(*texture) : string();
    ref<iio::Image> image;
    if (path.empty())
        return image;
    guarded("Unable to load the image!", [&] {
        requireRegularFile(path);
        image = iio::loadImage(path);
        if (image)
            image->setColorTransform({});
    });
    return image;
}

void TextureExport::largestExportSize(const ITexture* texture, u32& width, u32& height) const {
    const string path = texture ? resolveTexturePath(*texture) : string();
    if (path.empty())
        return;
    const PictureSize size =
        limitedSize(readPictureHeader(path).size, settings_.exportImageMaxDim, path);
    width = std::max(width, size.width);
    height = std::max(height, size.height);
}

string TextureExport::packOcclusionRoughnessMetal(const string& materialName,
                                                  const ITexture* ambient, const ITexture* metal,
                                                  const ITexture* rough) {
    string name = fileNameOf(materialName) + "_";
    std::ranges::replace(name, ' ', '_');
    name += ambient ? "Occlusion" : "";
    name += rough ? "Roughness" : "";
    name += metal ? "Metallic" : "";

    string path;
    const string message = base::format("gltf |{}| Unable to pack the maps!", materialName);
    const bool isDone = guarded(message, [&] {
        path = temporaryFolder() + name + ".jpg";
        u32 width = 0, height = 0;
        for (const ITexture* texture : {ambient, metal, rough})
            largestExportSize(texture, width, height);
        if (width == 0 || height == 0)
            width = height = sideWithoutSource;
        if (u64(width) * height > greatestPixelCount)
            fail(base::format("The picture would have {} x {} pixels", width, height), __LINE__);
        const ref<iio::Image> packed = pack({ambient, rough, metal}, width, height);
        if (!packed)
            fail("There is not enough memory", __LINE__);
        save(*packed, path);
    });
    return isDone ? path : string();
}

/// The picture of `maps` in red, green and blue. A file that is used twice is read once.
ref<iio::Image> TextureExport::pack(const std::array<const ITexture*, 3>& maps, u32 width,
                                    u32 height) const {
    std::array<PackedMap, 3> packed;
    std::array<ref<iio::Image>, 3> images;
    std::array<string, 3> paths;
    for (std::size_t i = 0; i < maps.size(); ++i) {
        if (!maps[i])
            continue;
        paths[i] = resolveTexturePath(*maps[i]);
        const auto same = std::find(paths.begin(), paths.begin() + i, paths[i]) - paths.begin();
        images[i] = same < std::ptrdiff_t(i) ? images[same] : loadTextureImage(maps[i]);
        if (images[i])
            images[i] = makeSamplable(images[i]);
        packed[i] = {images[i].get(), read(*maps[i], scene::bitmapTexture_schema::n_colorChannels)};
    }
    return packMaps(packed, width, height);
}

bool TextureExport::isHeightMap(const ITexture& map) const {
    if (read(map, scene::bitmapTexture_schema::n_colorChannels) >= 2)
        return true;
    const string path = resolveTexturePath(map);
    bool hasOneChannel = false;
    if (!path.empty())
        guarded("Unable to load the bump map!", [&] {
            requireRegularFile(path);
            iio::ImageInfo info;
            hasOneChannel =
                iio::readImageInfo(path, info) && iio::formatInfo(info.format).channelCount == 1;
        });
    return hasOneChannel;
}

string TextureExport::makeNormalMapFile(const ITexture& map, const scene::IMaterial& material) {
    const ref<iio::Image> heights = loadTextureImage(&map);
    if (!heights || !heights->isValid())
        return {};
    string path;
    const string message =
        base::format("gltf |{}| Unable to make a normal map!", material.getName());
    const bool isDone = guarded(message, [&] {
        path = temporaryFolder() + fileNameOf(base::fs::stem(heights->path(), 1)) + "_nrm.jpg";
        const ref<iio::Image> source = makeSamplable(heights);
        const ref<iio::Image> normals =
            source ? iio::makeNormalMap(*source, 0, 1.0f, false) : nullptr;
        if (!normals)
            fail("The height map has a format that can't be read", __LINE__);
        save(*normals, path);
    });
    return isDone ? path : string();
}

} // namespace gltf
