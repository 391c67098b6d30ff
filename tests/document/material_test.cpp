#include "document_support.h"

namespace document_test {
namespace {

ref<MaterialPBR::Texture> slot(float scale, i32 texCoord, i32 index) {
    auto texture = makeRef<MaterialPBR::Texture>();
    texture->scale = scale;
    texture->texCoord = texCoord;
    texture->texture = makeRef<Texture>();
    texture->texture->id = index;
    return texture;
}

TEST(Materials, WriteTheirMembersByTheirRules) {
    const struct {
        void (*fill)(MaterialPBR& material, Options& options);
        const char* text;
    } table[] = {
        {[](MaterialPBR&, Options&) {}, R"({"pbrMetallicRoughness":{}})"},
        {[](MaterialPBR& m, Options& o) {
             m.metallicRoughness->baseColorFactor = {1, 0, 0, 0};
             o.doubleSidedMaterials = true;
         },
         R"({"pbrMetallicRoughness":{},"doubleSided":true})"},
        {[](MaterialPBR& m, Options&) {
             auto& block = *m.metallicRoughness;
             block.baseColorFactor = {0, 0.5f, 0, 1};
             block.baseColorTexture = slot(1, 0, 5);
             block.metallicFactor = 0;
             block.roughnessFactor = 1;
             block.metallicRoughnessTexture = slot(0.5f, -1, 6);
         },
         R"({"pbrMetallicRoughness":{"baseColorFactor":[0,0.5,0,1.0],)"
         R"("baseColorTexture":{"index":5,"texCoord":0},"metallicFactor":0,)"
         R"("roughnessFactor":1.0,"metallicRoughnessTexture":{"scale":0.5,"index":6}}})"},
        {[](MaterialPBR& m, Options&) {
             m.metallicRoughness.reset();
             m.emissiveFactor = {0, 1, 1, 0};
         },
         "{}"},
        {[](MaterialPBR& m, Options&) {
             m.metallicRoughness.reset();
             m.emissiveFactor = {0, 1, 1, 1};
             m.emissiveTexture = slot(1, 1, 0);
             m.normalTexture = slot(1, -1, 1);
             m.occlusionTexture = slot(1, -1, 2);
             m.alphaMode = "MASK";
             m.alphaCutoff = 0.25f;
             m.doubleSided = true;
             m.name = "metal";
         },
         R"({"emissiveFactor":[0,1.0,1.0],"emissiveTexture":{"index":0,"texCoord":1},)"
         R"("normalTexture":{"index":1},"occlusionTexture":{"index":2},"alphaMode":"MASK",)"
         R"("alphaCutoff":0.25,"doubleSided":true,"name":"metal"})"},
        {[](MaterialPBR& m, Options&) {
             m.metallicRoughness.reset();
             m.emissiveFactor = {2, 0, 0, 0};
             m.alphaMode = "BLEND";
             m.alphaCutoff = 0.25f;
         },
         R"({"emissiveFactor":[2.0,0,0],"alphaMode":"BLEND"})"},
        {[](MaterialPBR& m, Options& o) {
             o.useSpecularGlossiness = true;
             m.specularGlossiness->diffuseFactor = {0, 0, 0, 0};
             m.specularGlossiness->diffuseTexture = slot(1, -1, 3);
             m.specularGlossiness->specularFactor = {1, 1, 0};
             m.specularGlossiness->glossinessFactor = 0;
             m.specularGlossiness->specularGlossinessTexture = slot(1, -1, 4);
             m.alphaMode = "OPAQUE";
         },
         R"({"pbrMetallicRoughness":{},"extensions":{"KHR_materials_pbrSpecularGlossiness":)"
         R"({"diffuseFactor":[0,0,0,0],"diffuseTexture":{"index":3},"specularFactor":[1.0,1.0,0],)"
         R"("glossinessFactor":0,"specularGlossinessTexture":{"index":4}}},"alphaMode":"OPAQUE"})"}};
    for (const auto& row : table) {
        MaterialPBR material;
        Options options;
        row.fill(material, options);
        EXPECT_EQ(written(material, options), row.text);
    }
}

TEST(Lights, WriteAnObjectUnderTheirOwnWord) {
    using Type = MaterialCommon::Light::Type;
    const struct {
        Type type;
        const char* text;
    } table[] = {
        {Type::ambient, R"({"type":"ambient","ambient":{"color":[1.0,0.5,0]}})"},
        {Type::directional, R"({"type":"directional","directional":{"color":[1.0,0.5,0]}})"},
        {Type::point,
         R"({"type":"point","point":{"constantAttenuation":1.0,)"
         R"("linearAttenuation":2.0,"quadraticAttenuation":3.0,"color":[1.0,0.5,0]}})"},
        {Type::spot, R"({"type":"spot","spot":{"constantAttenuation":1.0,"linearAttenuation":2.0,)"
                     R"("quadraticAttenuation":3.0,"fallOffAngle":4.0,"fallOffExponent":5.0,)"
                     R"("color":[1.0,0.5,0]}})"},
        {Type::unknown, "{}"}};
    for (const auto& row : table) {
        MaterialCommon::Light light;
        light.type = row.type;
        light.color = {1, 0.5f, 0, 9};
        light.constantAttenuation = 1;
        light.linearAttenuation = 2;
        light.quadraticAttenuation = 3;
        light.fallOffAngle = 4;
        light.fallOffExponent = 5;
        EXPECT_EQ(written(light), row.text);
    }
}

// Textures are collected in another order than they are numbered, and each once.
TEST(Materials, NumberTheirTexturesInTheOrderOfTheSlots) {
    Asset asset;
    auto primitive = makeRef<Primitive>();
    auto material = makeRef<MaterialPBR>();
    primitive->material = material;
    asset.getDefaultScene().nodes.push_back(meshNode(primitive));
    const auto texture = [&](const char* name) {
        auto reference = slot(1, -1, -1);
        reference->texture->name = name;
        reference->texture->source = makeRef<Image>(name, "");
        reference->texture->sampler = asset.globalSampler;
        return reference;
    };
    material->metallicRoughness->baseColorTexture = texture("base");
    material->metallicRoughness->metallicRoughnessTexture = texture("rough");
    material->normalTexture = texture("normal");
    material->occlusionTexture = texture("occlusion");
    material->emissiveTexture = texture("emissive");
    material->specularGlossiness->diffuseTexture = material->normalTexture;
    material->specularGlossiness->specularGlossinessTexture = texture("gloss");

    string collected;
    for (const Image* image : asset.getAllImages())
        collected.append(image->uri).append(" ");
    EXPECT_EQ(collected, "base rough emissive normal occlusion gloss ");

    Options options;
    options.useSpecularGlossiness = true;
    const string text = documentText(asset, options);
    const auto from = text.find("\"images\""), to = text.find(",\"samplers\"");
    EXPECT_EQ(text.substr(from, to - from),
              R"("images":[{"uri":"base"},{"uri":"rough"},{"uri":"normal"},{"uri":"occlusion"},)"
              R"({"uri":"emissive"},{"uri":"gloss"}])");
    EXPECT_NE(text.find(R"("extensionsUsed":["KHR_materials_pbrSpecularGlossiness"])"),
              string::npos);
    EXPECT_EQ(text.find("extensionsRequired"), string::npos);
}

TEST(Lights, HaveTheirArrayOnlyBesideACommonMaterial) {
    for (const bool isCommon : {false, true}) {
        Asset asset;
        auto primitive = makeRef<Primitive>();
        primitive->material = makeRef<Material>();
        primitive->material->type = isCommon ? Material::Type::common : Material::Type::pbr;
        auto node = meshNode(primitive);
        node->light = makeRef<MaterialCommon::Light>();
        node->light->type = MaterialCommon::Light::Type::ambient;
        asset.getDefaultScene().nodes.push_back(node);
        const string text = documentText(asset);
        EXPECT_EQ(node->light->id, 0);
        EXPECT_EQ(
            text.find(R"("extensions":{"KHR_materials_common":{"lights":[{"type":"ambient")") !=
                string::npos,
            isCommon);
        EXPECT_EQ(text.find("extensionsRequired") != string::npos, isCommon);
    }
}

} // namespace
} // namespace document_test
