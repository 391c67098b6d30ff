#include "material_fixture.h"

#include "assimp/embedded_textures.h"
#include "assimp/picture_folder.h"
#include "gltf/plugin_desc.h"
#include "scene_image_record.h"
#include "support/gltf_reader.h"

#include <assimp/texture.h>

#include <cstring>
#include <fstream>
#include <vector>

namespace {

using namespace scene;
using namespace test_support;
using base::string;
using base::u8;
using base::vector;
using namespace std::string_literals;
using Schema = principalMaterial_schema;

/// Files by their formats' definitions: red, green over blue, white unless told otherwise.
const string ppm = "P6 2 2 255\n\xff\0\0\0\xff\0\0\0\xff\xff\xff\xff"s;
const string pgm = "P5 2 1 255\n\x10\x80"s;
/// 24 bits, the lowest row first, blue before red, rows of 8 bytes.
const string bmp = "BM\x46\0\0\0\0\0\0\0\x36\0\0\0\x28\0\0\0\2\0\0\0\2\0\0\0\1\0\x18\0\0\0\0\0"
                   "\x10\0\0\0\0\0\0\0\0\0\0\0\0\0\0\0\0\0\0\0"
                   "\xff\0\0\xff\xff\xff\0\0\0\0\xff\0\xff\0\0\0"s;
/// One red pixel that is opaque, of a palette of two colors.
const string gif = "GIF89a\1\0\1\0\x80\0\0\xff\0\0\0\0\0,\0\0\0\0\1\0\1\0\0\2\2\x44\1\0;"s;
/// 32 bits, from the top, blue first: half opaque red, opaque green.
const string tga = "\0\0\2\0\0\0\0\0\0\0\0\0\2\0\1\0\x20\x28\0\0\xff\x80\0\xff\0\xff"s;

class Pictures : public MaterialFixture {};

/// The components of a picture, row by row, as the imaging library reads it.
vector<u8> pixelsOf(const string& path) {
    const base::ref<iio::Image> image = iio::loadImage(path);
    vector<u8> pixels;
    for (base::u32 y = 0; image && y < image->height(); ++y)
        pixels.append(image->row(y), image->row(y) + image->pitch());
    return pixels;
}

TEST_F(Pictures, OfFormatsThatExportersCannotReadAreConverted) {
    const vector<u8> square = {255, 0, 0, 0, 255, 0, 0, 0, 255, 255, 255, 255};
    const struct {
        const char* name;
        string bytes;
        vector<u8> pixels; ///< none for a picture that stays as it is
    } cases[] = {
        {"a.ppm", ppm, square},
        {"a.b.png", ppm, square}, // by content, not by name
        {"a.bmp", bmp, square},
        {"a.tga", bmp, square},
        {"grey.pgm", pgm, {16, 128}},
        {"a.gif", gif, {255, 0, 0, 255}},
        {"tga.bmp", tga, {255, 0, 0, 128, 0, 255, 0, 255}},
        {"a.TGA", tga, {}},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.name);
        write(c.name, c.bytes);
        LogCapture log;
        ASSERT_TRUE(loadMtl("map_Kd "s + c.name));
        EXPECT_EQ(problems(log), "");
        if (c.pixels.empty()) {
            EXPECT_EQ(fileOf(Schema::n_colorMap), c.name);
            continue;
        }
        const string file = *find(*texture(Schema::n_colorMap), fileTexture_schema::n_file);
        EXPECT_EQ(std::filesystem::path(file).filename(),
                  std::filesystem::path(c.name).replace_extension(".png"));
        EXPECT_EQ(pixelsOf(file), c.pixels);
    }
}

TEST_F(Pictures, WithoutRoomForFilesAreLeftOut) {
    write("a.bmp", bmp);
    const char* before = std::getenv("TMPDIR");
    const string kept = before ? before : "";
    setenv("TMPDIR", (folder_ / "none").c_str(), 1);
    LogCapture log;
    const bool loaded = loadMtl("map_Kd a.bmp\nmap_Ke a.bmp");
    before ? setenv("TMPDIR", kept.c_str(), 1) : unsetenv("TMPDIR");
    ASSERT_TRUE(loaded);
    EXPECT_EQ(texture(Schema::n_colorMap), nullptr);
    EXPECT_EQ(std::ranges::count(problems(log), '\n'), 1) << problems(log);
    EXPECT_NE(problems(log).find("a.bmp' is left out! Can't"), string::npos) << problems(log);
}

TEST_F(Pictures, OfTexels) {
    const struct {
        u8 alphas[2];
        vector<u8> pixels;
    } cases[] = {{{255, 255}, {1, 2, 3, 255, 4, 5, 6, 255}},
                 {{0, 0}, {1, 2, 3, 4, 5, 6}}, // a format without alpha
                 {{0, 255}, {1, 2, 3, 0, 4, 5, 6, 255}}};
    const base::ref<assimp::PictureFolder> folder = base::makeRef<assimp::PictureFolder>();
    for (const auto& c : cases) {
        SCOPED_TRACE(int(c.alphas[1]));
        aiTexture texture;
        texture.mWidth = 2;
        texture.mHeight = 1;
        texture.pcData = new aiTexel[2]{{3, 2, 1, c.alphas[0]}, {6, 5, 4, c.alphas[1]}};
        EXPECT_EQ(pixelsOf(assimp::writeEmbedded(texture, "*0", *folder)), c.pixels);
    }
}

/// Alpha that is opaque everywhere would make exporters blend the material.
TEST_F(Pictures, WithOpaqueAlphaAreExportedAsOpaque) {
    using iio::Image;
    const struct {
        const char* name;
        u8 format;
        vector<u8> components;
        bool isBlended;
    } cases[] = {{"a.png", Image::kRGBA, {1, 2, 3, 255}, false},
                 {"b.png", Image::kRGBA, {1, 2, 3, 254}, true},
                 {"c.png", Image::kLuminanceAlpha, {1, 255}, false},
                 {"d.tga", Image::kRGBA, {1, 2, 3, 255}, false}};
    for (const auto& c : cases) {
        for (const bool compress : {true, false}) {
            SCOPED_TRACE(c.name);
            writePicture(c.name, c.format, {c.components.begin(), c.components.end()});
            ASSERT_TRUE(loadMtl("map_Kd "s + c.name));
            gltf::registerPlugin(*document_);
            base::AttribMap settings;
            settings.attribute<bool>(sceneExporter_schema::n_exportCompressImages) = compress;
            const string output = folder_ / "out.glb";
            ASSERT_TRUE(document_->save(*document_, output, settings));
            const GltfFile file = GltfFile::read(output);
            EXPECT_EQ(file.element("materials", 0).HasMember("alphaMode"), c.isBlended);
            const bool isPng = c.isBlended || (!compress && c.name[2] == 'p');
            EXPECT_STREQ(file.element("images", 0)["mimeType"].GetString(),
                         isPng ? "image/png" : "image/jpeg");
        }
    }
}

/// They would make the exported file invalid.
TEST_F(Pictures, ThatCannotBeReadAreLeftOut) {
    touch("whole.png");
    const string whole = textOf(folder_ / "whole.png");
    const struct {
        const char* name;
        string bytes;
    } cases[] = {
        {"cut.bmp", bmp.substr(0, 40)},
        {"huge.bmp", string(bmp).replace(18, 8, "\0\x40\0\0\0\x20\0\0"s)},
        {"a.tif", "II*\0\x08\0\0\0"s},
        {"empty.bmp", ""},
        {"empty.png", ""},
        {"cut.png", whole.substr(0, whole.size() - 20)},
        {"cut.jpg", "\xff\xd8\xff\xe0"},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.name);
        write(c.name, c.bytes);
        LogCapture log;
        ASSERT_TRUE(loadMtl("map_Kd "s + c.name));
        EXPECT_EQ(texture(Schema::n_colorMap), nullptr);
        EXPECT_NE(problems(log).find(c.name + "' is left out! It "s), string::npos)
            << problems(log);
    }
}

TEST_F(Pictures, UnderTheNameOfAnotherFormatGetTheirOwn) {
    for (const char* extension : {"png", "jpg"}) {
        SCOPED_TRACE(extension);
        const string right = folder_ / ("right."s + extension);
        const string name = extension == "png"s ? "wrong.JPG" : "wrong.png";
        touch("right."s + extension);
        std::filesystem::copy_file(right, folder_ / name);
        ASSERT_TRUE(loadMtl("map_Kd " + name));
        const auto& shown = *texture(Schema::n_colorMap);
        const string file = *find(shown, fileTexture_schema::n_file);
        EXPECT_EQ(std::filesystem::path(file).filename(), "wrong."s + extension);
        EXPECT_EQ(textOf(file), textOf(right));
        EXPECT_EQ(*findPictureSource(shown), folder_ / name);
    }
}

} // namespace
