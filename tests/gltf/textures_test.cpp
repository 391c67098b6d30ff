#include "picture_files.h"

#include "gltf/exporter.h"

#include "b_string_convert.h"

using namespace test_support;
using Settings = Exporting::Settings;
using scene::texture_schema;
using enum scene::ImageRecord::Work;

namespace {

struct DecisionRow {
    std::string file;
    Kind kind;
    base::u32 width, height;
    bool isCompressing;
    base::u32 limit;
    std::string uri; ///< its extension tells the format
    scene::ImageRecord::Work work;
    int newWidth, newHeight;
};

const DecisionRow decisionRows[] = {
    {"photo.JPG", rgb, 3, 2, true, 4096, "photo.JPG", kept, 3, 2},
    {"v.1/photo.jpeg", grey, 3, 2, true, 3, "photo.jpeg", kept, 3, 2},
    {"v.1\\a.jpg", rgb, 9, 2, true, 0, "a.jpg", kept, 9, 2},
    {"a.png", rgb, 3, 2, false, 4096, "a.png", kept, 3, 2},
    {"a.PNG", rgba, 3, 2, true, 4096, "a.PNG", kept, 3, 2},
    {"a.png", rgba16, 9, 2, false, 0, "a.png", kept, 9, 2},
    {"a.png", greyAlpha, 3, 2, true, 4096, "a.png", kept, 3, 2},
    {"a.png", clearPalette, 5, 5, true, 9, "a.png", kept, 5, 5},
    {"a.png", clearGrey, 5, 5, true, 9, "a.png", kept, 5, 5},
    // With the shorter side at the limit the longer one would be too long.
    {"a.jpg", rgb, 1, 500, true, 400, "a.jpg", kept, 1, 500},
    {"a.png", rgb, 1, 500, true, 400, "a.jpg", converted, 1, 500},
    {"a.png", rgb, 3, 2, true, 4096, "a.jpg", converted, 3, 2},
    {"a.png", rgb16, 3, 2, true, 0, "a.jpg", converted, 3, 2},
    {"a.png", grey, 3, 2, true, 4096, "a.jpg", converted, 3, 2},
    {"a.png", palette, 5, 5, true, 9, "a.jpg", converted, 5, 5},
    {"a.tga", rgb, 3, 2, false, 4096, "a.jpg", converted, 3, 2},
    {"a.tga", rgba, 3, 2, false, 4096, "a.png", converted, 3, 2},
    {"tex.a.png", rgb, 3, 2, false, 9, "tex.jpg", converted, 3, 2},
    {"tex.a.png", rgba, 3, 2, true, 9, "tex.png", converted, 3, 2},
    {"my.photo.jpg", rgb, 3, 2, true, 9, "my.jpg", converted, 3, 2},
    {"a.jpg", rgb, 12, 8, true, 6, "a.jpg", resized, 9, 6},
    {"a.jpg", grey, 11, 6, true, 8, "a.jpg", resized, 15, 8},
    {"a.jpg", rgb, 4, 12, true, 4, "a.jpg", resized, 4, 12},
    {"a.png", rgb, 12, 8, true, 4, "a.jpg", resized, 6, 4},
    {"a.png", rgb, 12, 8, false, 4, "a.png", resized, 6, 4},
    {"a.png", rgba16, 12, 8, true, 4, "a.png", resized, 6, 4},
    {"a.tga", rgb, 12, 3, false, 6, "a.jpg", resized, 24, 6}};

bool hasAlpha(Kind kind) {
    return kind == rgba || kind == greyAlpha || kind == rgba16 || kind >= clearPalette;
}

} // namespace

TEST(Pictures, AreKeptConvertedOrResized) {
    for (const DecisionRow& row : decisionRows) {
        SCOPED_TRACE(&row - decisionRows);
        MaterialExport scene;
        std::string onDisk = row.file;
        std::ranges::replace(onDisk, '\\', '/');
        scene.put(onDisk, row.kind, row.width, row.height);
        scene.set(Settings::n_exportCompressImages, row.isCompressing);
        scene.set(Settings::n_exportImageMaxDim, row.limit);
        scene.setMap(scene.addMaterial(), Principal::n_colorMap, row.file);
        const LogCapture log;
        const GltfFile file = scene.run();
        EXPECT_EQ(countIn(log, "4 Processing image " + scene.folder / row.file + " for export!\n"),
                  row.work != kept);
        EXPECT_EQ(uriOf(file, 0, baseSlot), row.uri);
        EXPECT_EQ(file.element("materials", 0).HasMember("alphaMode"), hasAlpha(row.kind));

        const Bytes bytes = readBytes(scene.outFile(row.uri));
        EXPECT_EQ(isPng(bytes), base::toLower(row.uri).ends_with("png"));
        if (row.work == kept) {
            EXPECT_EQ(bytes, readBytes(scene.folder / onDisk));
        }
        const ImageRef stored = readPicture(scene.outFile(row.uri));
        ASSERT_TRUE(stored);
        EXPECT_EQ(int(stored->width()), row.newWidth);
        EXPECT_EQ(int(stored->height()), row.newHeight);
        // No curve is applied and no channel lost.
        const ImageRef image = stored->convertType(Image::IT_UNSIGNED_BYTE, 0, Image::gammaNone);
        const auto pixel = row.kind < palette ? pixelOf(row.kind) : std::vector<int>();
        for (size_t c = 0; c < pixel.size(); ++c)
            EXPECT_NEAR(image->row(image->height() - 1)[c], pixel[c], 3) << c;

        const scene::ImageRecord record = scene.record();
        EXPECT_EQ(record.name, row.uri);
        EXPECT_EQ(record.work, row.work);
        EXPECT_EQ(record.width, row.newWidth);
        EXPECT_EQ(record.height, row.newHeight);
        EXPECT_EQ(record.byteLength, bytes.size());
        EXPECT_EQ(record.sources, base::vector<base::string>{scene.folder / row.file});
    }
}

TEST(Pictures, AreReadAndWrittenOnce) {
    MaterialExport scene;
    scene.put("a.png", rgb);
    scene.put("b.tga", rgba);
    auto &first = scene.addMaterial(), &second = scene.addMaterial(), &third = scene.addMaterial();
    base::IPlugin& shared = scene.setMap(first, Principal::n_colorMap, "b.tga");
    write(second, Principal::n_colorMap) = scene::Object(&shared);
    scene.setMap(third, Principal::n_colorMap, "b.tga");
    for (scene::IMaterial* material : {&first, &second})
        scene.setMap(*material, Principal::n_emissionMap, "a.png");
    const LogCapture log;
    const GltfFile file = scene.run();
    EXPECT_EQ(countIn(log, "Processing image "), 2u);
    EXPECT_EQ(file.count("images"), 2u);
    EXPECT_EQ(file.count("textures"), 4u);
    EXPECT_EQ(findTexture(file, 0, baseSlot), findTexture(file, 1, baseSlot));
    // A texture that is known already does not tell of its alpha.
    for (const size_t i : {0, 1, 2})
        EXPECT_EQ(file.element("materials", i).HasMember("alphaMode"), i != 1) << i;
}

TEST(Pictures, ThatCannotBeReadDoNotEndTheExport) {
    const Bytes png = encoded(rgb, "png"), jpeg = encoded(rgb, "jpg"), clear = encoded(rgba, "png");
    const auto cut = [](const Bytes& bytes) { return Bytes(bytes.begin(), bytes.end() - 20); };
    const struct {
        const char* name;
        Bytes bytes; ///< none for no file
        std::string uri;
        bool isTried = false; ///< to be converted
    } rows[] = {{"gone.png", {}, "gone.png", true},
                {"gone.jpg", {}, "gone.jpg"},
                {"folder.png", {}, "folder.png", true},
                {"empty.tga", {}, "empty.tga", true},
                {"cut.png", cut(png), "cut.png", true},
                {"cut.png", cut(clear), "cut.png"},
                {"a.jpg", png, "a.jpg"},
                {"a.png", jpeg, "a.png", true},
                {"a.bmp", jpeg, "a.bmp", true},
                {"v.1/wood", png, "wood.", true}};
    for (const auto& row : rows) {
        SCOPED_TRACE(&row - rows);
        MaterialExport scene;
        std::filesystem::create_directory(scene.folder / "folder.png");
        if (!row.bytes.empty() || row.name == std::string("empty.tga"))
            scene.put(row.name, row.bytes);
        scene.setMap(scene.addMaterial(), Principal::n_colorMap, row.name);
        const LogCapture log;
        const GltfFile file = scene.run();
        EXPECT_EQ(countIn(log, "2 Unable to convert the image to supported format!\n"),
                  row.isTried);
        EXPECT_EQ(countIn(log, "2 File '" + scene.folder / row.name + "' cannot be found!") > 0,
                  row.uri.starts_with("gone"));
        EXPECT_EQ(uriOf(file, 0, baseSlot), row.uri);
        EXPECT_EQ(file.element("materials", 0).HasMember("alphaMode"), row.bytes == cut(clear));
        ASSERT_EQ(std::filesystem::exists(scene.outFile(row.uri)), !row.bytes.empty());
        if (!row.bytes.empty()) {
            EXPECT_EQ(readBytes(scene.outFile(row.uri)), row.bytes);
        }
        EXPECT_EQ(scene.record().work, kept);
    }
}

TEST(Pictures, WithoutATemporaryFolderAreNotMade) {
    for (const char* place : {"/proc", "/gone"}) {
        SCOPED_TRACE(place);
        MaterialExport scene;
        scene.put("a.png", rgb);
        scene.put("b.jpg", grey);
        auto& material = scene.addMaterial();
        scene.setMap(material, Principal::n_colorMap, "a.png");
        scene.setMap(material, Principal::n_roughnessMap, "b.jpg");
        scene.setMap(material, scene::material_schema::n_bumpMap, "b.jpg");
        const TmpDirGuard tmpdir(place);
        const LogCapture log;
        const GltfFile file = scene.run();
        EXPECT_EQ(uriOf(file, 0, baseSlot), "a.png");
        EXPECT_EQ(uriOf(file, 0, roughSlot), "");
        EXPECT_EQ(uriOf(file, 0, "normalTexture"), "b.jpg");
        for (const char* failed :
             {"Unable to convert the image to supported format!",
              "gltf |Mat| Unable to pack the maps!", "gltf |Mat| Unable to make a normal map!"})
            EXPECT_EQ(countIn(log, std::string("2 ") + failed + "\n"), 1u) << failed;
    }
}

TEST(Pictures, OfEqualNamesAreWrittenApart) {
    // Files go to where the first and the last lie, which differ in case.
    const struct {
        const char *file, *uri;
        bool isPacked = false; ///< and so called after the material
    } rows[] = {{"out/wood.jpg", "wood.jpg"},
                {"a/wood.jpg", "wood_2.jpg"},
                {"b/wood.png", "wood_3.jpg"},
                {"out/brick.png", "brick.jpg"},
                {"out/WOOD.jpeg", "WOOD.jpeg"},
                {"out/Mat_Roughness.jpg", "Mat_Roughness_2.jpg", true},
                {"b.png", "Mat_Roughness_3.jpg", true}};
    MaterialExport scene;
    for (base::u32 i = 0; i < std::size(rows); ++i) {
        scene.put(rows[i].file, rgb, i + 1);
        scene.setMap(scene.addMaterial("Mat"),
                     rows[i].isPacked ? Principal::n_roughnessMap : Principal::n_colorMap,
                     rows[i].file);
    }
    const GltfFile file = scene.run();
    for (base::u32 i = 0; i < std::size(rows); ++i) {
        EXPECT_EQ(uriOf(file, i, rows[i].isPacked ? roughSlot : baseSlot), rows[i].uri);
        EXPECT_EQ(readPicture(scene.outFile(rows[i].uri))->width(), i + 1);
    }
}

TEST(Pictures, AreLookedForInTheFoldersOfTheSettings) {
    struct {
        std::string file;
        std::vector<const char*> folders;
        const char* found; ///< null if the path stays as it is
    } const rows[] = {{"a.jpg", {"one/", "two"}, "one/a.jpg"},
                      {"a.jpg", {"two", "one"}, "two/a.jpg"},
                      {"b.jpg", {"none", "one/../two", "one"}, "two/b.jpg"},
                      {"a.jpg", {"one/b"}, "one/ba.jpg"},
                      {"one/a.jpg", {"one"}, nullptr},
                      {"/a.jpg", {"one"}, nullptr},
                      {"", {"one/a.jpg"}, nullptr}};
    MaterialExport scene;
    for (const char* name : {"one/a.jpg", "one/ba.jpg", "two/a.jpg", "two/b.jpg"})
        scene.put(name, grey);
    auto& texture = scene.add<scene::IFileTexture>();
    for (const auto& row : rows) {
        gltf::GLTFScenePlugin exporter(nullptr, nullptr, 0);
        for (const char* folder : row.folders)
            exporter.resourcePaths.push_back(scene.folder / folder);
        write(texture, scene::fileTexture_schema::n_file) = row.file;
        EXPECT_EQ(exporter.textures.resolveTexturePath(texture),
                  row.found ? scene.folder / row.found : row.file);
    }
}

TEST(Textures, AreSampledByTheirWrappingAndFilter) {
    const struct {
        base::u8 u, v, filter;
        int wrapS, wrapT, minFilter;
        size_t warnings;
    } rows[] = {{0, 1, 0, 10497, 33648, 9987, 0},
                {2, 3, 1, 33071, 33071, 9729, 1},
                {3, 3, 2, 33071, 33071, 9729, 2},
                {4, 255, 3, 10497, 10497, 9987, 0}};
    for (const auto& row : rows) {
        MaterialExport scene;
        scene.put("a.jpg", grey);
        auto& map = scene.setMap(scene.addMaterial(), Principal::n_emissionMap, "a.jpg");
        write(map, texture_schema::n_wrapModeU) = row.u;
        write(map, texture_schema::n_wrapModeV) = row.v;
        write(map, scene::bitmapTexture_schema::n_filter) = row.filter;
        const LogCapture log;
        const GltfFile file = scene.run();
        const auto& texture = *findTexture(file, 0, "emissiveTexture");
        const auto& sampler = file.element("samplers", texture["sampler"].GetUint());
        EXPECT_EQ(sampler["wrapS"].GetInt(), row.wrapS);
        EXPECT_EQ(sampler["wrapT"].GetInt(), row.wrapT);
        EXPECT_EQ(sampler["minFilter"].GetInt(), row.minFilter);
        EXPECT_EQ(sampler["magFilter"].GetInt(), 9729);
        EXPECT_EQ(countIn(log, "3 GLTF doesn't support the border wrap texture mode. Replacing "
                               "with clamp!\n"),
                  row.warnings);
    }
}

TEST(Textures, ReadTheSetThatTheyName) {
    MaterialExport scene;
    scene.put("a.jpg", grey);
    const std::pair<const char*, int> rows[] = {{"first", 0}, {"second", 1}, {"short", 0},
                                                {"none", 0},  {"", 0},       {"Second", 0}};
    for (const auto& row : rows)
        write(scene.setMap(scene.addMaterial(), Principal::n_emissionMap, "a.jpg"),
              texture_schema::n_uvSet) = base::string(row.first);
    for (const base::string name : {"first", "short", "second"}) {
        auto& set = appendItem(scene.mesh, scene::mesh_schema::n_uvSets);
        write(set, scene::meshUVSet_schema::n_name) = name;
        write(set, scene::meshUVSet_schema::n_UV)
            .resize(name == "short" ? 2 : 3, {static_cast<float>(name[0]), 0});
    }
    const GltfFile file = scene.run();
    for (size_t i = 0; i < std::size(rows); ++i)
        EXPECT_EQ((*findMember(file, i, "emissiveTexture"))["texCoord"].GetInt(), rows[i].second)
            << i;
    const auto attributes = file.primitive(0, 0).attributes;
    EXPECT_EQ(attributes.at("TEXCOORD_0").values[0], 'f');
    EXPECT_EQ(attributes.at("TEXCOORD_1").values[0], 's');
}
