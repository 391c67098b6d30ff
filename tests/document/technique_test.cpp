#include "document_support.h"

namespace document_test {
namespace {

ref<Texture> texture(i32 index = -1) {
    auto made = makeRef<Texture>();
    made->sampler = makeRef<Sampler>(1, 2, 3, 4);
    made->source = makeRef<Image>("a.png", "a.png");
    made->id = index;
    return made;
}

TEST(Techniques, ShadersAreEmbeddedOrNamed) {
    const struct {
        i32 type;
        const char* source;
        bool isEmbedded;
        const char* text;
    } table[] = {
        // "void main" is dm9pZCBtYWlu by RFC 4648
        {35633, "void main", true,
         R"({"type":35633,"uri":"data:text/plain;base64,dm9pZCBtYWlu","name":"s"})"},
        {35632, "", true, R"({"type":35632,"uri":"data:text/plain;base64,","name":"s"})"},
        {35633, "void main", false, R"({"type":35633,"uri":"out7.vert","name":"s"})"},
        {35632, "void main", false, R"({"type":35632,"uri":"out7.frag","name":"s"})"},
    };
    for (const auto& row : table) {
        Shader shader(row.type);
        shader.source = row.source;
        shader.id = 7;
        shader.name = string("s");
        Options options;
        options.name = string("out");
        options.embedShaders = row.isEmbedded;
        EXPECT_EQ(written(shader, options), row.text);
    }
}

TEST(Techniques, WriteTheirMembersInOrder) {
    Technique technique;
    EXPECT_EQ(written(technique), "{}");
    EXPECT_EQ(technique.getStringId(), "technique_-1");
    technique.states.depthMask = false;
    EXPECT_EQ(written(technique), R"({"states":{"functions":{"depthMask":[false]}}})");
    technique.states = {};
    technique.states.enable = {2884};
    EXPECT_EQ(written(technique), R"({"states":{"enable":[2884]}})");

    technique.attributes["a_position"] = "position";
    technique.parameters["position"] = {"POSITION", nullptr, {}, 0, 35665};
    auto lamp = namedNode("lamp");
    lamp->id = 3;
    technique.parameters["light"] = {"MODELVIEW", lamp, {}, 0, 35676};
    technique.parameters["color"] = {"", nullptr, {1, 0.5f}, 0, 35664};
    technique.parameters["joints"] = {"JOINTMATRIX", nullptr, {}, 12, 35676};
    technique.parameters["shininess"] = {"", nullptr, {16}, 0, 5126};
    technique.program = makeRef<Program>();
    technique.program->id = 2;
    technique.states.enable = {2929, 3042};
    technique.states.depthMask = true;
    technique.states.blendEquationSeparate = {32774, 32774};
    technique.states.blendFuncSeparate = {1, 771, 1, 771};
    technique.uniforms["u_color"] = "color";
    technique.name = "t";
    EXPECT_EQ(written(technique),
              R"({"attributes":{"a_position":"position"},"parameters":{)"
              R"("color":{"value":[1.0,0.5],"type":35664},)"
              R"("joints":{"semantic":"JOINTMATRIX","count":12,"type":35676},)"
              R"("light":{"semantic":"MODELVIEW","node":3,"type":35676},)"
              R"("position":{"semantic":"POSITION","type":35665},)"
              R"("shininess":{"value":16.0,"type":5126}},"program":2,)"
              R"("states":{"enable":[2929,3042],"functions":{"depthMask":[true],)"
              R"("blendEquationSeparate":[32774,32774],"blendFuncSeparate":[1,771,1,771]}},)"
              R"("uniforms":{"u_color":"color"},"name":"t"})");
}

TEST(Techniques, CommonMaterialsAreAnExtension) {
    MaterialCommon material;
    material.name = "m";
    EXPECT_EQ(written(material),
              R"({"extensions":{"KHR_materials_common":{"doubleSided":false,"jointCount":0,)"
              R"("technique":"LAMBERT","transparent":false}},"name":"m"})");
    EXPECT_EQ(material.techniqueKey(), "");

    material.technique = MaterialCommon::Kind::blinn;
    material.jointCount = 4;
    material.transparent = true;
    material.values = std::make_unique<Material::Values>();
    material.values->ambient.color = {0, 0, 0, 1};
    material.values->diffuse.texture = texture(5);
    material.values->diffuse.color = {1, 1, 1, 1}; // the texture takes its place
    material.values->transparency = 0.0f;
    Options options;
    options.doubleSidedMaterials = true;
    EXPECT_EQ(written(material, options),
              R"({"extensions":{"KHR_materials_common":{"doubleSided":true,"jointCount":4,)"
              R"("technique":"BLINN","transparent":true,"values":{"ambient":[0,0,0,1.0],)"
              R"("diffuse":5,"transparency":0}}},"name":"m"})");
    EXPECT_EQ(material.techniqueKey(),
              "AMBIENT;DIFFUSE;DIFFUSETEXTURE;TRANSPARENCY;TRANSPARENT;SKINNED;");

    material.values->diffuse = {};
    material.values->ambient = {};
    material.values->transparency.reset();
    material.values->emission.texture = texture(6);
    material.values->specular.color = {1, 0, 0, 1};
    material.values->shininess = 2.5f;
    material.doubleSided = true;
    material.transparent = false;
    material.jointCount = 0;
    material.technique = MaterialCommon::Kind::constant;
    EXPECT_EQ(written(material),
              R"({"extensions":{"KHR_materials_common":{"doubleSided":true,"jointCount":0,)"
              R"("technique":"CONSTANT","transparent":false,"values":{"emission":6,)"
              R"("specular":[1.0,0,0,1.0],"shininess":2.5}}},"name":"m"})");
    EXPECT_EQ(material.techniqueKey(), "EMISSION;SPECULAR;SHININESS;DOUBLESIDED;");
}

/// The whole way: a plain material leads to a technique, that to a program and two shaders.
TEST(Techniques, HaveTheirArraysInADocumentThatUsesThem) {
    for (const auto type : {Material::Type::plain, Material::Type::common, Material::Type::pbr}) {
        auto primitive = makeRef<Primitive>();
        primitive->material = makeRef<Material>();
        Material& material = *primitive->material;
        material.type = type;
        material.values = std::make_unique<Material::Values>();
        material.values->specular.texture = texture();
        material.technique = makeRef<Technique>();
        material.technique->program = makeRef<Program>();
        Program& program = *material.technique->program;
        program.attributes = {"a_position", "a_normal"};
        program.vertexShader = makeRef<Shader>(Shader::vertexShader);
        program.fragmentShader = makeRef<Shader>(Shader::fragmentShader);

        Asset asset;
        asset.getDefaultScene().nodes.push_back(meshNode(primitive));
        EXPECT_EQ(asset.getAllTextures().size(), type == Material::Type::pbr ? 0u : 1u);
        Options options;
        options.embedShaders = false;
        const string text = documentText(asset, options);
        const auto has = [&](string_view part) { return text.find(part) != string::npos; };
        EXPECT_EQ(has(R"("textures":[{"sampler":0,"source":0}])"), type != Material::Type::pbr);
        const bool isPlain = type == Material::Type::plain;
        EXPECT_EQ(has(R"("materials":[{"values":{"specular":0},"technique":0}])"), isPlain);
        EXPECT_EQ(has(R"("samplers":[{"magFilter":1,"minFilter":2,"wrapS":3,"wrapT":4}],)"
                      R"("techniques":[{"program":0}],)"
                      R"("programs":[{"attributes":["a_normal","a_position"],"fragmentShader":0,)"
                      R"("vertexShader":1}],)"
                      R"("shaders":[{"type":35632,"uri":"0.frag"},{"type":35633,"uri":"1.vert"}])"),
                  isPlain);
        EXPECT_EQ(has(R"("extensionsRequired":["KHR_technique_webgl"])"), isPlain);
        for (const char* member : {"\"techniques\"", "\"programs\"", "\"shaders\""})
            EXPECT_EQ(has(member), isPlain) << member;
    }
}

} // namespace
} // namespace document_test
