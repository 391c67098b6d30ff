#include "fbx_text.h"
#include "material_fixture.h"

#include "assimp/material_properties.h"

#include <assimp/material.h>

#include <cstring>

namespace {

using namespace scene;
using namespace test_support;
using base::string;
using base::vec3f;
using Schema = principalMaterial_schema;

class Materials : public MaterialFixture {};

TEST_F(Materials, NumbersOfMtl) {
    touch("c.png");
    const struct {
        const char* lines;
        vec3f color;
        float transparency, roughness;
        vec3f emission;
        bool isBroken = false;
    } cases[] = {
        {"Kd 0.2 0.4 0.6", {0.2f, 0.4f, 0.6f}, 0, 1, {}},
        {"Kd 2 -1 0.5\nKe 1 2 0.5", {1, 0, 0.5f}, 0, 1, {1, 1, 0.5f}},
        {"Kd nan 0 0\nd nan", {0.8f, 0.8f, 0.8f}, 0, 1, {}, true},
        // Fourth root of 2 / (98 + 2); no highlight without a specular color.
        {"Kd 0 0 0\nNs 98\nKs 1 1 1\nillum 2", {0, 0, 0}, 0, 0.3760603f, {}},
        {"Kd 0 0 0\nNs 98\nKs 1 1 1", {0, 0, 0}, 0, 0.3760603f, {}},
        {"Kd 0 0 0\nNs 98\nKs 0 0 0\nillum 2", {0, 0, 0}, 0, 1, {}},
        {"Kd 0 0 0\nNs 98\nKs 1 1 1\nPr 0.25", {0, 0, 0}, 0, 0.25f, {}},
        {"Kd 0 0 0\nNs 98\nKs 1 1 1\nmap_Pr c.png", {0, 0, 0}, 0, 1, {}},
        {"Kd 0 0 0\nPr 0.5\nmap_Pr c.png", {0, 0, 0}, 0, 0.5f, {}},
        {"Kd 0 0 0\nd 0.25", {0, 0, 0}, 0.75f, 1, {}},
        {"Kd 0 0 0\nTr 0.25", {0, 0, 0}, 0.25f, 1, {}},
        {"Kd 0 0 0\nd 0", {0, 0, 0}, 0, 1, {}},
        // MTL multiplies colors and maps, but a map is not to be hidden.
        {"Kd 0.2 0.4 0.6\nmap_Kd c.png", {0.2f, 0.4f, 0.6f}, 0, 1, {}},
        {"Kd 0 0 0\nmap_Kd c.png\nmap_Ke c.png", {1, 1, 1}, 0, 1, {1, 1, 1}},
        {"map_Kd c.png\nKe 0 0.5 0\nmap_Ke c.png", {1, 1, 1}, 0, 1, {0, 0.5f, 0}},
        {"Kd 0 0 0\nmap_Kd missing.png", {0, 0, 0}, 0, 1, {}},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.lines);
        LogCapture log;
        ASSERT_TRUE(loadMtl(c.lines));
        EXPECT_EQ(material().getName(), "m");
        expectColor(Schema::n_color, c.color);
        expectColor(Schema::n_transparency, {c.transparency, c.transparency, c.transparency});
        EXPECT_NEAR(read(material(), Schema::n_roughness), c.roughness, 1e-6);
        expectColor(Schema::n_emission, c.emission);
        const string broken = "3 assimp |" + (folder_ / "m.obj").string() +
                              "| Found 2 material values that are no finite numbers, defaults are "
                              "taken!\n";
        EXPECT_EQ(problems(log).find(broken) != string::npos, c.isBroken) << problems(log);
    }
}

TEST_F(Materials, MapsOfMtl) {
    for (const char* file : {"c.png", "d.png", "wall_Normal.png", "wall_n.png", "rough.png"})
        touch(file);
    const string path = (folder_ / "m.obj").string();
    const struct {
        const char* lines;
        const SchemaAttribute<Object>& map;
        const char* file;
        int channels;
        const char* told = ""; ///< behind the path
    } cases[] = {
        {"map_Kd c.png", Schema::n_colorMap, "c.png", 0},
        {"map_Ke c.png", Schema::n_emissionMap, "c.png", 0},
        {"map_Bump c.png", material_schema::n_bumpMap, "c.png", 6},
        {"bump -bm 2 wall_Normal.png", material_schema::n_bumpMap, "wall_Normal.png", 0},
        {"bump wall_n.png", material_schema::n_bumpMap, "wall_n.png", 0},
        {"norm c.png\nbump d.png", material_schema::n_bumpMap, "c.png", 0},
        {"map_Pr c.png", Schema::n_roughnessMap, "c.png", 1},
        {"map_Pm c.png", Schema::n_metalMap, "c.png", 1},
        {"map_Pr c.png\nmap_Pm d.png", Schema::n_metalMap, "d.png", 1},
        {"map_Pr c.png\nmap_Pm c.png", Schema::n_metalMap, "c.png", 5},
        {"map_Pr c.png\nmap_Pm c.png", Schema::n_roughnessMap, "c.png", 4},
        {"map_Ns rough.png", Schema::n_roughnessMap, "rough.png", 1},
        {"map_Ns c.png", Schema::n_roughnessMap, "", -1, "Left out 1 gloss maps."},
        {"map_Kd c.png\nmap_d c.png", Schema::n_colorMap, "c.png", 0},
        {"map_Kd c.png\nmap_d d.png", Schema::n_transparencyMap, "", -1,
         "Left out 1 opacity maps that are not the color map as well."},
        {"Pm 1", Schema::n_metalMap, "", -1,
         "Found 1 metals without a map, which can't be told from other materials."},
        {"map_Ka c.png", Schema::n_ambientMap, "", -1},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.lines);
        LogCapture log;
        ASSERT_TRUE(loadMtl(c.lines));
        EXPECT_EQ(fileOf(c.map), c.file);
        EXPECT_EQ(channelsOf(c.map), c.channels);
        EXPECT_EQ(linesOf(log, base::logInformation),
                  *c.told ? "4 assimp |" + path + "| " + c.told + "\n" : "");
    }
}

/// Maps need texture coordinates, which lines and some meshes have not.
TEST_F(Materials, HaveMapsOnlyWhereThereAreCoordinates) {
    touch("c.png");
    write("m.mtl", "newmtl m\nKd 1 0 0\nmap_Kd c.png\n");
    ASSERT_TRUE(load("m.obj", "mtllib m.mtl\nv 0 0 0\nv 1 0 0\nv 0 1 0\nvt 0 0\nvt 1 0\nvt 0 1\n"
                              "o a\nusemtl m\nf 1/1 2/2 3/3\no b\nusemtl m\nf 1 2 3\nl 1 2\n"));
    for (base::IPlugin* mesh : objects(mesh_schema::n_kind)) {
        const auto& primitive = *findListItem(*mesh, mesh_schema::n_primitives, 0);
        const base::IPlugin& shown = *(*find(primitive, meshPrimitive_schema::n_materials))[0];
        EXPECT_EQ(findObject(shown, Schema::n_colorMap) != nullptr,
                  mesh->findAttribute(mesh_schema::n_uvSets) != nullptr);
    }
    const base::IPlugin& lines = only(lines_schema::n_kind);
    EXPECT_EQ(findObject(*(*find(lines, lines_schema::n_materials))[0], Schema::n_colorMap),
              nullptr);
    EXPECT_EQ(objects(Schema::n_kind).size(), 2u);
}

TEST_F(Materials, BelongToPolygonsAndLinesAndAreShared) {
    write("two.mtl", "newmtl red\nKd 1 0 0\nnewmtl unused\nKd 0 1 0\n");
    const string model = "mtllib two.mtl\nv 0 0 0\nv 1 0 0\nv 0 1 0\n"
                         "o a\nusemtl red\nf 1 2 3\nl 1 2\no b\nusemtl red\nf 3 2 1\n";
    const auto isRed = [&](const base::AttribMap* owner, const auto& list) {
        const auto* materials = owner ? find(*owner, list) : nullptr;
        return materials && materials->size() == 1 && (*materials)[0].get() == &material();
    };
    ASSERT_TRUE(load("two.obj", model));
    ASSERT_EQ(objects(mesh_schema::n_kind).size(), 2u);
    for (base::IPlugin* mesh : objects(mesh_schema::n_kind))
        EXPECT_TRUE(isRed(findListItem(*mesh, mesh_schema::n_primitives, 0),
                          meshPrimitive_schema::n_materials));
    EXPECT_TRUE(isRed(&only(lines_schema::n_kind), lines_schema::n_materials));

    set(Settings::n_importMaterials, false);
    ASSERT_TRUE(load("two.obj", model));
    EXPECT_TRUE(objects(Schema::n_kind).empty());

    // What readers make up where the file has no material is none.
    set(Settings::n_importMaterials, true);
    const string triangle = "v 0 0 0\nv 1 0 0\nv 0 1 0\nf 1 2 3\n";
    ASSERT_TRUE(load("plain.obj", triangle));
    EXPECT_TRUE(objects(Schema::n_kind).empty());
    ASSERT_TRUE(load("plain.off", "OFF\n3 1 0\n0 0 0\n1 0 0\n0 1 0\n3 0 1 2\n"));
    EXPECT_TRUE(objects(Schema::n_kind).empty());
}

/// A square with two sets of texture coordinates and a material of this `<technique>`.
string colladaText(const string& technique) {
    return R"(<?xml version="1.0" encoding="utf-8"?>
<COLLADA xmlns="http://www.collada.org/2005/11/COLLADASchema" version="1.4.1">
<asset><unit name="m" meter="1"/><up_axis>Y_UP</up_axis></asset>
<library_images><image id="i1"><init_from>file://a%20b.png</init_from></image>
<image id="i2"><init_from>gone.png</init_from></image></library_images>
<library_materials><material id="m1" name="m"><instance_effect url="#e1"/></material>
</library_materials><library_effects><effect id="e1"><profile_COMMON>
<newparam sid="s1"><surface type="2D"><init_from>i1</init_from></surface></newparam>
<newparam sid="p1"><sampler2D><source>s1</source></sampler2D></newparam>
<newparam sid="s2"><surface type="2D"><init_from>i2</init_from></surface></newparam>
<newparam sid="p2"><sampler2D><source>s2</source></sampler2D></newparam>
<technique sid="common">)" +
           technique + R"(</technique></profile_COMMON></effect></library_effects>
<library_geometries><geometry id="g1"><mesh>
<source id="p"><float_array id="pa" count="12">0 0 0 1 0 0 1 1 0 0 1 0</float_array>
<technique_common><accessor source="#pa" count="4" stride="3"><param name="X" type="float"/>
<param name="Y" type="float"/><param name="Z" type="float"/></accessor></technique_common></source>
<source id="t"><float_array id="ta" count="8">0 0 1 0 1 1 0 1</float_array>
<technique_common><accessor source="#ta" count="4" stride="2"><param name="S" type="float"/>
<param name="T" type="float"/></accessor></technique_common></source>
<vertices id="v"><input semantic="POSITION" source="#p"/></vertices>
<polylist count="1" material="mm"><input semantic="VERTEX" source="#v" offset="0"/>
<input semantic="TEXCOORD" source="#t" offset="0" set="0"/>
<input semantic="TEXCOORD" source="#t" offset="0" set="1"/><vcount>4</vcount><p>0 1 2 3</p>
</polylist></mesh></geometry></library_geometries>
<library_visual_scenes><visual_scene id="s"><node id="n"><instance_geometry url="#g1">
<bind_material><technique_common><instance_material symbol="mm" target="#m1">
<bind_vertex_input semantic="UV0" input_semantic="TEXCOORD" input_set="0"/>
<bind_vertex_input semantic="UV1" input_semantic="TEXCOORD" input_set="1"/>
</instance_material></technique_common></bind_material></instance_geometry></node></visual_scene>
</library_visual_scenes><scene><instance_visual_scene url="#s"/></scene></COLLADA>)";
}

TEST_F(Materials, Collada) {
    touch("a b.png");
    const string shine = "<specular><color>.5 .5 .5 1</color></specular>"
                         "<shininess><float>30</float></shininess>";
    const auto transparency = [](const string& value) {
        return "<transparent opaque=\"A_ONE\"><color>0 0 0 1</color></transparent><transparency>"
               "<float>" +
               value + "</float></transparency>";
    };
    const string missing = "<emission><texture texture=\"p2\" texcoord=\"UV0\"/></emission>";
    const struct {
        string technique;
        float transparency, roughness;
    } cases[] = {
        {"<phong>" + shine + "</phong>", 0, 0.5f}, // fourth root of 2 / 32
        {"<lambert>" + transparency("0.25") + "</lambert>", 0.75f, 1},
        {"<phong>" + shine + transparency("0") + "</phong>", 0, 0.5f}, // "not transparent"
        {"<lambert>" + missing + "</lambert>", 0, 1},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.technique);
        LogCapture log;
        ASSERT_TRUE(load("m.dae", colladaText(c.technique)));
        expectColor(Schema::n_transparency, {c.transparency, c.transparency, c.transparency});
        EXPECT_NEAR(read(material(), Schema::n_roughness), c.roughness, 1e-6);
        expectColor(Schema::n_emission, {0, 0, 0}); // also without the map that stands for it
    }

    ASSERT_TRUE(load("m.dae", colladaText("<lambert><diffuse><texture texture=\"p1\" "
                                          "texcoord=\"UV1\"/></diffuse></lambert>")));
    EXPECT_EQ(fileOf(Schema::n_colorMap), "a b.png");
    expectColor(Schema::n_color, {1, 1, 1});
    const base::IPlugin& map = *texture(Schema::n_colorMap);
    EXPECT_EQ(map.getName(), "a b");
    // The second set is found by its name, which the file lacks.
    const auto* set = findListItem(mesh(), mesh_schema::n_uvSets, 1);
    ASSERT_TRUE(set);
    const string* setName = find(*set, meshUVSet_schema::n_name);
    const string* usedName = find(map, texture_schema::n_uvSet);
    ASSERT_TRUE(setName && usedName);
    EXPECT_FALSE(setName->empty());
    EXPECT_EQ(*usedName, *setName);
}

TEST_F(Materials, FbxMapsStandForColors) {
    for (const char* file : {"c.png", "e.png", "rough.png", "metal.png", "n.png", "t.png"})
        touch(file);
    FbxText fbx;
    fbx.addMaterial(fbx.colorProperty("DiffuseColor", "0.5,0.25,0.125") +
                    fbx.colorProperty("EmissiveColor", "0,0,0") +
                    fbx.numberProperty("ShininessExponent", "25") +
                    fbx.numberProperty("TransparencyFactor", "1") +
                    fbx.colorProperty("TransparentColor", "1,1,1"));
    const FbxText plain = fbx;
    fbx.addTexture(50, "c.png", "DiffuseColor", fbx.vectorProperty("Scaling", "2,2,1"));
    fbx.addTexture(51, "e.png", "EmissiveColor");
    fbx.addTexture(52, "rough.png", "ShininessExponent");
    fbx.addTexture(53, "metal.png", "ReflectionFactor");
    fbx.addTexture(54, "n.png", "NormalMap");
    fbx.addTexture(55, "t.png", "TransparencyFactor");

    ASSERT_TRUE(load("plain.fbx", plain.text()));
    expectColor(Schema::n_color, {0.5f, 0.25f, 0.125f});
    expectColor(Schema::n_transparency, {1, 1, 1});
    EXPECT_NEAR(read(material(), Schema::n_roughness), 0.5f, 1e-6); // what writers store as 25

    LogCapture log;
    ASSERT_TRUE(load("mapped.fbx", fbx.text()));
    EXPECT_EQ(material().getName(), "paint");
    expectColor(Schema::n_color, {1, 1, 1});
    expectColor(Schema::n_emission, {1, 1, 1});
    expectColor(Schema::n_transparency, {0, 0, 0});
    EXPECT_EQ(read(material(), Schema::n_roughness), 1);
    EXPECT_EQ(fileOf(Schema::n_colorMap), "c.png");
    EXPECT_EQ(fileOf(Schema::n_emissionMap), "e.png");
    EXPECT_EQ(fileOf(Schema::n_roughnessMap), "rough.png");
    EXPECT_EQ(fileOf(Schema::n_metalMap), "metal.png");
    EXPECT_EQ(fileOf(material_schema::n_bumpMap), "n.png");
    EXPECT_EQ(channelsOf(material_schema::n_bumpMap), 0);
    const string start = "4 assimp |" + (folder_ / "mapped.fbx").string() + "| ";
    EXPECT_EQ(linesOf(log, base::logInformation),
              start + "Left out 1 opacity maps that are not the color map as well.\n" + start +
                  "Found 1 textures with a transform or projection, which is left out.\n");
}

TEST(MaterialProperties, OddSizesAndTypes) {
    const struct {
        aiPropertyTypeInfo type;
        string bytes;
        base::vector<float> numbers;
        int whole; ///< -7 for none
        const char* text;
    } cases[] = {
        {aiPTI_Float, string("\0\0\x80\x3f\0\0\0\x40\0\0", 10), {1, 2}, 1, ""},
        {aiPTI_Float, "abc", {}, -7, ""},
        {aiPTI_Double, string("\0\0\0\0\0\0\0\x40", 8), {2}, 2, ""},
        {aiPTI_Integer, string("\3\0\0\0", 4), {3}, 3, ""},
        {aiPTI_String, string("\2\0\0\0ab\0", 7), {}, -7, "ab"},
        {aiPTI_String, string("\xff\xff\xff\xffxy", 6), {}, -7, "xy"},
        {aiPTI_String, string("\3\0\0\0", 4), {}, -7, ""},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(&c - cases);
        aiMaterial material;
        material.AddBinaryProperty(c.bytes.data(), unsigned(c.bytes.size()), "k", 0, 0, c.type);
        const assimp::MaterialProperties properties(material);
        float numbers[3] = {};
        const std::size_t count = properties.read({"k"}, numbers);
        EXPECT_EQ(base::vector<float>(numbers, numbers + count), c.numbers);
        EXPECT_EQ(properties.readInt({"k"}, -7), c.whole);
        EXPECT_EQ(properties.readText({"k"}), c.text);
    }
}

} // namespace
