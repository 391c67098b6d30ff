#include "picture_files.h"

#include "gltf/pack_maps.h"

using namespace test_support;
using scene::material_schema;
using enum scene::ImageRecord::Work;
using Numbers = std::vector<int>;

namespace {

/// JPEG rounds flat colours by its steps of 2 at quality 95, in three components.
constexpr int jpegTolerance = 3;

void expectPixel(const Image& image, base::u32 x, base::u32 y, const std::vector<double>& expected,
                 double tolerance = jpegTolerance) {
    ASSERT_EQ(image.channelCount(), expected.size());
    for (size_t c = 0; c < expected.size(); ++c)
        EXPECT_NEAR(image.row(y)[x * expected.size() + c], expected[c], tolerance)
            << "component " << c << " at " << x << ", " << y;
}

/// One component of a packed picture.
Numbers componentOf(const Image& image, size_t component) {
    Numbers values;
    for (size_t i = component; i < size_t(image.width()) * image.height() * 3; i += 3)
        values.push_back(image.data()[i]);
    return values;
}

} // namespace

TEST(PackMaps, TakesTheChannelThatTheCodeNames) {
    // Products are cut: 102 x 102 / 255 is 40.8.
    const struct {
        base::u8 format;
        bool isWide;
        Numbers pixel, byCode;
    } rows[] = {{Image::kLuminance, false, {102}, {40, 102, 102, 102, 102, 102, 102, 0, 0}},
                {Image::kLuminance, true, {102}, {40, 102, 102, 102, 102, 102, 102, 0, 0}},
                {Image::kLuminanceAlpha, false, {102, 204}, {81, 102, 204, 102, 102, 102, 102, 0}},
                {Image::kRGB, false, {50, 100, 201}, {50, 50, 255, 50, 100, 201, 117, 0, 0}},
                {Image::kBGR, false, {201, 100, 50}, {50, 50, 255, 50, 100, 201, 117, 0, 0}},
                {Image::kRGBA, false, {50, 100, 201, 158}, {30, 50, 158, 50, 100, 201, 117, 0, 0}},
                {Image::kRGBA, true, {50, 100, 201, 158}, {30, 50, 158, 50, 100, 201, 117, 0, 0}}};
    for (const auto& row : rows) {
        const ImageRef image = makePicture(3, 2, row.format, row.pixel, row.isWide);
        for (base::u8 code = 0; code < row.byCode.size(); ++code)
            for (const base::u32 width : {3u, 5u}) { // as it stands, and sampled
                const ImageRef packed = gltf::packMaps({{{}, {image.get(), code}, {}}}, width, 2);
                EXPECT_EQ(componentOf(*packed, 1), Numbers(width * 2, row.byCode[code]))
                    << "row " << &row - rows << " code " << int(code);
                EXPECT_EQ(componentOf(*packed, 0), Numbers(width * 2, 0));
            }
    }
}

TEST(PackMaps, MixesNeighboursAndRepeats) {
    Numbers all;
    for (int i = 0; i < 256; ++i)
        all.push_back(i);
    const ImageRef ramp = makePicture(256, 1, Image::kLuminance, all);
    const ImageRef column = makePicture(1, 2, Image::kLuminance, {0, 255});
    const ImageRef pair = makePicture(2, 1, Image::kRGB, {0, 9, 9, 255, 9, 9});
    const ImageRef wide =
        gltf::packMaps({{{ramp.get(), 1}, {column.get(), 1}, {pair.get(), 4}}}, 256, 1);
    EXPECT_EQ(componentOf(*wide, 0), all);
    EXPECT_EQ(componentOf(*wide, 1), Numbers(256, 127)); // half way between the rows
    EXPECT_EQ(componentOf(*wide, 2), Numbers(256, 9));
    const ImageRef small = gltf::packMaps({{{pair.get(), 1}, {column.get(), 4}, {}}}, 4, 2);
    // The points lie at -0.25, 0.25, 0.75 and 1.25 pixels.
    EXPECT_EQ(componentOf(*small, 0), (Numbers{63, 63, 191, 191, 63, 63, 191, 191}));
    EXPECT_EQ(componentOf(*small, 1), (Numbers{0, 0, 0, 0, 255, 255, 255, 255}));
}

TEST(Packing, MakesOnePictureAsLargeAsTheLargestMap) {
    const struct {
        base::u32 limit;
        const char *ambient, *metal, *rough;
        base::u32 width, height;
        std::vector<double> pixel;
        size_t missing;
    } rows[] = {{4096, "ao.png:1", "m.tga:5", "r.jpg:4", 8, 16, {200, 100, 50}, 0},
                // 8 x 2 is stretched to 16 x 4, by its shorter side; 4 x 16 is as it should be.
                {4, "ao.png:1", "m.tga:2", "r.jpg:4", 16, 16, {200, 100, 128}, 0},
                {4096, "r.jpg:1", "gone.png:5", "r.jpg:5", 2, 2, {200, 50, 0}, 1},
                {4096, "", "gone.png:5", "cut.png:1", 5, 7, {0, 0, 0}, 1},
                {4096, "checker", "gone.png:5", "", 1024, 1024, {0, 0, 0}, 1}};
    for (const auto& row : rows) {
        SCOPED_TRACE(&row - rows);
        MaterialExport scene;
        scene.put("ao.png", grey, 8, 2);
        scene.put("m.tga", rgba, 4, 16);
        scene.put("r.jpg", rgb, 2, 2);
        Bytes cut = encoded(rgb, "png", 5, 7);
        cut.resize(cut.size() - 20);
        scene.put("cut.png", cut);
        scene.set(Exporting::Settings::n_exportImageMaxDim, row.limit);
        auto& material = scene.addMaterial();
        scene.setMap(material, Principal::n_ambientMap, row.ambient);
        scene.setMap(material, Principal::n_metalMap, row.metal);
        scene.setMap(material, Principal::n_roughnessMap, row.rough);
        const LogCapture log;
        const GltfFile file = scene.run();
        EXPECT_EQ(countIn(log, "2 Unable to open the image file for reading!"), row.missing);
        const ImageRef picture = readPicture(scene.outFile(uriOf(file, 0, roughSlot)));
        ASSERT_TRUE(picture);
        EXPECT_EQ(picture->width(), row.width);
        EXPECT_EQ(picture->height(), row.height);
        expectPixel(*picture, 0, 0, row.pixel);
        expectPixel(*picture, row.width - 1, row.height - 1, row.pixel);
        EXPECT_EQ(scene.record().work, packed);
    }
}

TEST(Packing, NamesThePictureAfterTheMaterial) {
    const std::string longName(199, 'x');
    const struct {
        std::string material;
        const char *ambient, *metal, *rough;
        std::string uri;
    } rows[] = {{"Old Iron", "a.png", "a.png", "a.png", "Old_Iron_OcclusionRoughnessMetallic.jpg"},
                {"", "", "", "a.png", "_Roughness.jpg"},
                {"a/../b", "", "a.png", "", "a_..jpg"},
                {"a/b\\c\x01\x7f:", "a.png", "a.png", "", "a_b_c__:_OcclusionMetallic.jpg"},
                {"Mat.001", "", "", "a.png", "Mat.jpg"},
                {longName + "xyz", "", "", "a.png", longName + "x_Roughness.jpg"},
                {longName + "\xc3\xa4", "", "", "a.png", longName + "_Roughness.jpg"}};
    MaterialExport scene;
    scene.put("a.png", grey);
    for (const auto& row : rows) {
        auto& material = scene.addMaterial(row.material);
        scene.setMap(material, Principal::n_ambientMap, row.ambient);
        scene.setMap(material, Principal::n_metalMap, row.metal);
        scene.setMap(material, Principal::n_roughnessMap, row.rough);
    }
    const GltfFile file = scene.run();
    for (size_t i = 0; i < std::size(rows); ++i)
        EXPECT_EQ(uriOf(file, i, roughSlot), rows[i].uri);
}

TEST(NormalMap, LeansAgainstTheSlope) {
    // Red rises by 10 a column, so dx = 4 x 20 / 255 = 0.3137: the red of the normal is
    // 128 - 127 x 0.3137 / 1.0481 = 90, its blue 128 + 127 x sqrt(1 - 0.3137 x 0.3137) = 248.6.
    Numbers row;
    for (int x = 0; x < 24; ++x)
        row.insert(row.end(), {10 * x, 0, 255 - 10 * x});
    MaterialExport scene;
    scene.put("h.png", encoded(*makePicture(24, 8, Image::kRGB, row, true), "png"));
    scene.setMap(scene.addMaterial(), material_schema::n_bumpMap, "h.png:2");
    const std::string uri = uriOf(scene.run(), 0, "normalTexture");
    expectPixel(*readPicture(scene.outFile(uri)), 12, 4, {90, 128, 248});
}

TEST(NormalMap, IsMadeOfHeightsAlone) {
    const struct {
        const char* file;
        Kind kind;
        const char* code;
        const char* uri;
        scene::ImageRecord::Work work;
    } rows[] = {{"h.a.png", grey, "", "h_nrm.jpg", normalMap},
                {"h.jpg", grey, ":1", "h_nrm.jpg", normalMap},
                {"c.png", rgb, ":2", "c_nrm.jpg", normalMap},
                {"c.png", rgb, "", "c.jpg", converted},
                {"c.jpg", rgb, ":1", "c.jpg", kept},
                {"g.png", greyAlpha, "", "g.png", kept},
                {"p.png", palette, ":0", "p.jpg", converted},
                {"cut.jpg", grey, ":4", "cut.jpg", kept}};
    for (const auto& row : rows) {
        SCOPED_TRACE(&row - rows);
        MaterialExport scene;
        if (row.file == std::string("cut.jpg"))
            scene.put(row.file, Bytes{0xff, 0xd8, 0xff});
        else
            scene.put(row.file, row.kind);
        auto& material = scene.addMaterial();
        write(material, material_schema::n_bumpSpace) = row.kind == rgb;
        scene.setMap(material, material_schema::n_bumpMap, row.file + std::string(row.code));
        const LogCapture log;
        const GltfFile file = scene.run();
        EXPECT_EQ(uriOf(file, 0, "normalTexture"), row.uri);
        EXPECT_EQ(scene.record().work, row.work);
        EXPECT_EQ(scene.record().sources, base::vector<base::string>{scene.folder / row.file});
        EXPECT_EQ(countIn(log, "3 Mat|Bump space is not supported by GLTF!"), row.kind == rgb);
        // The picture is gone when it is removed for the second time.
        EXPECT_EQ(countIn(log, "2 Unable to delete temporary file!"), row.work == normalMap);
    }
}
