#include "picture_files.h"

#include "scene_mesh.h"

#include <rapidjson/stringbuffer.h>
#include <rapidjson/writer.h>

using namespace test_support;
using base::vec3f;

namespace {

constexpr float nan = std::numeric_limits<float>::quiet_NaN();
constexpr float infinity = std::numeric_limits<float>::infinity();

/// With numbers cut behind their fourth decimal.
std::string textOf(const rapidjson::Value& value) {
    rapidjson::StringBuffer buffer;
    rapidjson::Writer<rapidjson::StringBuffer> writer(buffer);
    writer.SetMaxDecimalPlaces(4);
    value.Accept(writer);
    return buffer.GetString();
}

struct FactorRow {
    vec3f color, transparency, emission;
    float roughness;
    const char *newColor, *newEmission;
    const char* newRoughness = R"(,"roughnessFactor":0.5)";
    bool isBlended = true;
    bool isRepaired = false;
};

const FactorRow factorRows[] = {
    // Without any attribute
    {{}, {}, {}, 0, "0.8,0.8,0.8,1.0", "0,0,0", R"(,"roughnessFactor":0.2)", false},
    // A roughness below zero stands for none in the document.
    {{0, 0.5f, 2}, {}, {0, 0.25f, 8}, -1, "0,0.5,2.0,1.0", "0,0.25,8.0", "", false},
    {{1, 1, 1}, {1, 1, 1}, {}, 0.5f, "1.0,1.0,1.0,0.05", "0,0,0"},
    {{1, 1, 1}, {0, 0.75f, 0}, {}, 0.5f, "1.0,1.0,1.0,0.75", "0,0,0"},
    {{1, 1, 1}, {0.00015f, 0, 0.00016f}, {}, 0.5f, "1.0,1.0,1.0,0.9998", "0,0,0"},
    {{1, 1, 1},
     {0.00015f, 0, 0.00014f},
     {},
     0.5f,
     "1.0,1.0,1.0,1.0",
     "0,0,0",
     R"(,"roughnessFactor":0.5)",
     false},
    {{1, nan, 1},
     {0, infinity, 0},
     {-infinity, 1, 1},
     nan,
     "0.8,0.8,0.8,1.0",
     "0,0,0",
     R"(,"roughnessFactor":0.2)",
     false,
     true}};

} // namespace

TEST(Materials, HaveTheFactorsOfTheScene) {
    for (const FactorRow& row : factorRows) {
        SCOPED_TRACE(&row - factorRows);
        MaterialExport scene;
        auto& material = scene.addMaterial();
        if (&row != factorRows) {
            write(material, Principal::n_color) = row.color;
            write(material, Principal::n_transparency) = row.transparency;
            write(material, Principal::n_emission) = row.emission;
            write(material, Principal::n_roughness) = row.roughness;
            write(material, Principal::n_model) = 4; // is not read
        }
        const LogCapture log;
        const GltfFile file = scene.run();
        EXPECT_EQ(textOf(file.element("materials", 0)),
                  std::string(R"({"pbrMetallicRoughness":{"baseColorFactor":[)") + row.newColor +
                      R"(],"metallicFactor":0)" + row.newRoughness + R"(},"emissiveFactor":[)" +
                      row.newEmission + (row.isBlended ? R"(],"alphaMode":"BLEND")" : "]") +
                      R"(,"doubleSided":true,"name":"Mat"})");
        EXPECT_EQ(problems(log), row.isRepaired ? "3 gltf |Mat| The material has values that are "
                                                  "not finite, the defaults are taken!\n"
                                                : "");
    }
}

TEST(Materials, AreThoseOfTheIndexInTheList) {
    struct {
        const char* list; ///< a principal, b another, t toon, h hair, - none, n a node
        base::i32 index;
        const char* expected; ///< the name of the material, if there is one
    } const rows[] = {{"abt", 0, "a"}, {"ab", 1, "b"}, {"ab", 2, "b"},
                      {"ab", -1, "b"}, {"ta", 0, ""},  {"ah", 1, ""},
                      {"a-", 9, ""},   {"n", 0, ""},   {"", 0, ""}};
    for (const auto& row : rows) {
        SCOPED_TRACE(&row - rows);
        Exporting scene;
        auto& node = scene.addTo<scene::INode>(*scene.root);
        std::map<char, base::IPlugin*> objects{{'a', &scene.add<scene::IPrincipalMaterial>("a")},
                                               {'b', &scene.add<scene::IPrincipalMaterial>("b")},
                                               {'t', &scene.add<scene::IToonMaterial>()},
                                               {'h', &scene.add<scene::IHairMaterial>()},
                                               {'n', &node}};
        base::vector<scene::Object> list;
        for (const char* name = row.list; *name; ++name)
            list.push_back(scene::Object(objects[*name]));
        write(node, scene::node_schema::n_materialIndex) = row.index;
        auto& mesh = makeTriangle(scene.addTo<scene::IMesh>(node));
        write(*findListItem(mesh, scene::mesh_schema::n_primitives, 0),
              scene::meshPrimitive_schema::n_materials) = list;
        auto& lines = scene.addTo<scene::ILines>(node);
        write(lines, scene::lines_schema::n_points) = {{0, 0, 0}, {1, 1, 1}};
        write(lines, scene::lines_schema::n_materials) = list;
        const LogCapture log;
        const GltfFile file = scene.saveAndRead();
        EXPECT_EQ(problems(log), "");
        const bool isExpected = *row.expected != 0;
        ASSERT_EQ(file.count("materials"), isExpected);
        for (const size_t i : {0, 1})
            EXPECT_EQ(file.primitive(i, 0).material, isExpected ? 0 : -1);
        if (isExpected) {
            EXPECT_EQ(file.element("materials", 0)["name"].GetString(), std::string(row.expected));
        }
    }
}

namespace {

struct PackingRow {
    const char *metal, *rough, *ambient;
    base::u8 ambientType;
    const char* uri; ///< of the metallic-roughness texture
    int metallic;
    const char* occlusion = "";
};

const PackingRow packingRows[] = {
    {"", "a.jpg:4", "", 0, "a.jpg", 0},
    {"", "a.jpg:0", "", 0, "Mat_Roughness.jpg", 0},
    {"", "checker", "", 0, "", 0},
    {"a.jpg:5", "a.jpg:4", "", 0, "a.jpg", 1},
    {"a.jpg:4", "a.jpg:4", "", 0, "Mat_RoughnessMetallic.jpg", 1},
    {"a.jpg:5", "a.jpg:0", "", 0, "Mat_RoughnessMetallic.jpg", 1},
    {"a.jpg:5", "./a.jpg:4", "", 0, "Mat_RoughnessMetallic.jpg", 1},
    {"a.jpg:5", "b.jpg:4", "", 0, "Mat_RoughnessMetallic.jpg", 1},
    {"a.jpg:5", "", "", 0, "Mat_Metallic.jpg", 1},
    // The slot is that of the metal map, though the picture would have the roughness.
    {"checker", "a.jpg:4", "", 0, "", 1},
    {"node", "a.jpg:4", "node", 1, "a.jpg", 0},
    {"node", "", "", 0, "", 0},
    // Occlusion counts as such by its type, and is packed by its presence.
    {"", "a.jpg:1", "b.jpg:1", 0, "Mat_OcclusionRoughness.jpg", 0},
    {"", "a.jpg:1", "b.jpg:1", 1, "Mat_OcclusionRoughness.jpg", 0, "Mat_OcclusionRoughness.jpg"},
    {"", "a.jpg:1", "b.jpg:1", 2, "Mat_OcclusionRoughness.jpg", 0},
    {"", "a.jpg:4", "b.jpg:1", 1, "a.jpg", 0, "b.jpg"},
    {"a.jpg:5", "a.jpg:4", "a.jpg:1", 1, "a.jpg", 1, "a.jpg"},
    {"", "", "b.jpg:1", 1, "", 0, "b.jpg"},
    {"", "", "b.jpg:1", 0, "", 0}};

} // namespace

TEST(Materials, PackTheMapsThatDoNotStandAsGltfReadsThem) {
    for (const PackingRow& row : packingRows) {
        SCOPED_TRACE(&row - packingRows);
        MaterialExport scene;
        scene.put("a.jpg", rgb);
        scene.put("b.jpg", grey);
        auto& material = scene.addMaterial();
        write(material, Principal::n_ambientType) = row.ambientType;
        for (const char* name : {"rough", "metal"}) {
            auto& set = appendItem(scene.mesh, scene::mesh_schema::n_uvSets);
            write(set, scene::meshUVSet_schema::n_name) = base::string(name);
            write(set, scene::meshUVSet_schema::n_UV).resize(3);
        }
        base::IPlugin& metal = scene.setMap(material, Principal::n_metalMap, row.metal);
        write(metal, scene::texture_schema::n_wrapModeU) = 1;
        write(metal, scene::texture_schema::n_uvSet) = base::string("metal");
        scene.setMap(material, Principal::n_roughnessMap, row.rough);
        scene.setMap(material, Principal::n_ambientMap, row.ambient);
        const GltfFile file = scene.run();
        EXPECT_EQ(uriOf(file, 0, roughSlot), row.uri);
        EXPECT_EQ(findMember(file, 0, "pbrMetallicRoughness/metallicFactor")->GetFloat(),
                  float(row.metallic));
        EXPECT_EQ(uriOf(file, 0, "occlusionTexture"), row.occlusion);
        const rapidjson::Value* texture = findTexture(file, 0, roughSlot);
        if (texture && std::string(row.uri).starts_with("Mat_")) {
            // Sampled as the metal map is, or else the roughness map.
            const bool isByMetal = *row.metal != 0;
            EXPECT_EQ((*findMember(file, 0, roughSlot))["texCoord"].GetInt(), isByMetal ? 1 : 0);
            EXPECT_EQ(file.element("samplers", (*texture)["sampler"].GetUint())["wrapS"].GetInt(),
                      isByMetal ? 33648 : 10497);
            // The same texture, not another one of the picture.
            if (*row.occlusion) {
                EXPECT_EQ(findTexture(file, 0, "occlusionTexture"), texture);
            }
        }
    }
}
