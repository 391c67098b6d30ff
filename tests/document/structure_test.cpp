#include "document_support.h"

namespace document_test {
namespace {

ref<Node::TransformTRS> trs(std::array<float, 3> t, std::array<float, 4> r,
                            std::array<float, 3> s) {
    auto transform = makeRef<Node::TransformTRS>();
    transform->translation = t;
    transform->rotation = r;
    transform->scale = s;
    return transform;
}

TEST(Nodes, WriteWhatDiffersFromTheIdentity) {
    const float rows[16] = {1, 0, 0, 7, 0, 1, 0, 8, 0, 0, 1, 9, 0, 0, 0, 1};
    const struct {
        ref<Node::Transform> transform;
        const char* text;
    } table[] = {{nullptr, "{}"},
                 {makeRef<Node::Transform>(), "{}"},
                 {makeRef<Node::TransformMatrix>(), "{}"},
                 {makeRef<Node::TransformMatrix>(rows, false),
                  R"({"matrix":[1.0,0,0,0,0,1.0,0,0,0,0,1.0,0,7.0,8.0,9.0,1.0]})"},
                 {makeRef<Node::TransformMatrix>(rows, true),
                  R"({"matrix":[1.0,0,0,7.0,0,1.0,0,8.0,0,0,1.0,9.0,0,0,0,1.0]})"},
                 {trs({-0.0f, 0, -0.0f}, {0, 0, 0, 1}, {1, 1, 1}), "{}"},
                 {trs({0, 0, 0}, {0, 0, 0, 1}, {2, 2, 2}), R"({"scale":[2.0,2.0,2.0]})"},
                 {trs({0, 0, 1e-30f}, {0, 0, 0, -1}, {1, 1, 1}),
                  R"({"translation":[0,0,1.0000000031710769e-30],"rotation":[0,0,0,-1.0]})"}};
    for (const auto& row : table) {
        Node node;
        node.transform = row.transform;
        EXPECT_EQ(written(node), row.text);
    }
}

TEST(Nodes, NameTheirLightOnlyWhereTheOptionKeepsIt) {
    Node node;
    node.light = makeRef<MaterialCommon::Light>();
    node.light->id = 3;
    node.name = "lamp";
    Options options;
    EXPECT_EQ(written(node, options), R"({"name":"lamp"})");
    options.keepMaterialsCommon = true;
    EXPECT_EQ(written(node, options),
              R"({"extensions":{"KHR_materials_common":{"light":3}},"name":"lamp"})");
}

TEST(Numbering, GoesFromTheLastRootAndTheLastChild) {
    Asset asset;
    auto& roots = asset.getDefaultScene().nodes;
    roots.push_back(namedNode("a", {namedNode("c"), namedNode("d")}));
    roots.push_back(namedNode("b"));
    EXPECT_EQ(documentText(asset),
              R"({"asset":{"generator":"TARNHOLD2GLTF"},"scenes":[{"nodes":[1,0]}],"scene":0,)"
              R"("nodes":[{"name":"b"},{"children":[3,2],"name":"a"},{"name":"d"},{"name":"c"}]})");
}

TEST(Document, OfAnEmptySceneHasOnlyTheScene) {
    Asset asset;
    Options options;
    options.version = "2.0";
    asset.metadata->copyright = "us";
    asset.removeUnusedNodes(options);
    const ref<Buffer> buffer = asset.packAccessors();
    EXPECT_EQ(buffer->byteLength, 0);
    EXPECT_EQ(documentText(asset, options),
              R"({"asset":{"copyright":"us","generator":"TARNHOLD2GLTF","version":"2.0"},)"
              R"("scenes":[{"nodes":[]}],"scene":0})");
}

/// A skinned and animated triangle with a texture: every kind of list but lights and cameras.
struct FullDocument {
    FullDocument() {
        primitive->attributes["POSITION"] =
            makeRef<Accessor>(Accessor::Type::vec3, componentFloat, position, 3, 34962);
        primitive->indices =
            makeRef<Accessor>(Accessor::Type::scalar, componentU16, indices, 3, 34963);
        primitive->mode = 4;
        primitive->targets.push_back(makeRef<Primitive::Target>());
        primitive->targets[0]->attributes["NORMAL"] = primitive->attributes["POSITION"];
        auto material = makeRef<MaterialPBR>();
        material->normalTexture = makeRef<MaterialPBR::Texture>();
        material->normalTexture->texture = makeRef<Texture>();
        material->normalTexture->texture->source = makeRef<Image>("i.png", "");
        material->normalTexture->texture->sampler = asset.globalSampler;
        primitive->material = material;

        auto node = meshNode(primitive);
        node->mesh->weights.push_back(0.25f);
        auto joint = namedNode("joint");
        node->skin = makeRef<Skin>();
        node->skin->joints.push_back(joint);
        node->skin->joints.push_back(nullptr);
        node->skin->joints.push_back(namedNode("unreached"));
        node->skin->inverseBindMatrices =
            makeRef<Accessor>(Accessor::Type::mat4, componentFloat,
                              Node::TransformMatrix().matrix.data(), 1, BufferView::noTarget);
        asset.getDefaultScene().nodes.push_back(node);
        asset.getDefaultScene().nodes.push_back(joint);
        animate(joint, Animation::Channel::rotation);
        options.name = "scene";
        options.embedBuffers = options.embedTextures = false;
        options.doubleSidedMaterials = true;
    }

    void animate(ref<Node> node, i32 path) {
        auto channel = makeRef<Animation::Channel>();
        channel->target.node = node;
        channel->target.path = path;
        channel->sampler.input =
            makeRef<Accessor>(Accessor::Type::scalar, componentFloat, position, 2, -1);
        channel->sampler.output =
            makeRef<Accessor>(Accessor::Type::vec4, componentFloat, position, 2, -1);
        asset.animations.push_back(makeRef<Animation>());
        asset.animations.back()->channels.push_back(channel);
    }

    float position[9] = {0, 0, 0, 1, 0, 0, 0, 1, 0};
    base::u16 indices[3] = {0, 1, 2};
    Asset asset;
    ref<Primitive> primitive = makeRef<Primitive>();
    Options options;
};

TEST(Document, HasItsMembersInOrder) {
    FullDocument document;
    document.asset.packAccessors();
    document.asset.useExtension("B");
    document.asset.requireExtension("A");
    EXPECT_EQ(documentText(document.asset, document.options),
              R"({"asset":{"generator":"TARNHOLD2GLTF"},"scenes":[{"nodes":[1,0]}],"scene":0,)"
              R"("nodes":[{"name":"joint"},{"mesh":0,"skin":0}],)"
              R"("meshes":[{"primitives":[{"attributes":{"POSITION":1},"indices":0,"mode":4,)"
              R"("material":0,"targets":[{"NORMAL":1}]}],"weights":[0.25]}],)"
              R"("animations":[{"channels":[{"sampler":0,"target":{"node":0,"path":"rotation"}}],)"
              R"("samplers":[{"input":2,"interpolation":"LINEAR","output":3}]}],)"
              R"("skins":[{"inverseBindMatrices":4,"joints":[0,-1]}],)"
              R"("accessors":[{"bufferView":0,"byteOffset":0,"componentType":5123,"count":3,)"
              R"("max":[2],"min":[0],"type":"SCALAR"},)"
              R"({"bufferView":1,"byteOffset":0,"componentType":5126,"count":3,)"
              R"("max":[1.0,1.0,0],"min":[0,0,0],"type":"VEC3"},)"
              R"({"bufferView":2,"byteOffset":0,"componentType":5126,"count":2,)"
              R"("max":[0],"min":[0],"type":"SCALAR"},)"
              R"({"bufferView":3,"byteOffset":0,"componentType":5126,"count":2,)"
              R"("max":[0,0,0,1.0],"min":[0,0,0,1.0],"type":"VEC4"},)"
              R"({"bufferView":4,"byteOffset":0,"componentType":5126,"count":1,)"
              R"("max":[1.0,0,0,0,0,1.0,0,0,0,0,1.0,0,0,0,0,1.0],)"
              R"("min":[1.0,0,0,0,0,1.0,0,0,0,0,1.0,0,0,0,0,1.0],"type":"MAT4"}],)"
              R"("materials":[{"pbrMetallicRoughness":{},"normalTexture":{"index":0},)"
              R"("doubleSided":true}],)"
              R"("textures":[{"sampler":0,"source":0}],"images":[{"uri":"i.png"}],)"
              R"("samplers":[{"magFilter":9729,"minFilter":9986,"wrapS":10497,"wrapT":10497}],)"
              R"("bufferViews":[{"buffer":0,"byteOffset":140,"byteLength":6,"target":34963},)"
              R"({"buffer":0,"byteOffset":96,"byteLength":36,"byteStride":12,"target":34962},)"
              R"({"buffer":0,"byteOffset":132,"byteLength":8},)"
              R"({"buffer":0,"byteOffset":64,"byteLength":32},)"
              R"({"buffer":0,"byteOffset":0,"byteLength":64}],)"
              R"("buffers":[{"byteLength":146,"uri":"scene0.bin"}],)"
              R"("extensionsRequired":["A"],"extensionsUsed":["A","B"]})");
}

TEST(Animations, DropWhatHasNoTargetAndKeepCounting) {
    FullDocument document;
    Asset& asset = document.asset;
    document.animate(namedNode("not in the scene"), Animation::Channel::scale);
    document.animate(asset.getDefaultScene().nodes[0], 7);
    asset.animations[2]->channels.push_back(makeRef<Animation::Channel>());
    std::swap(asset.animations[0], asset.animations[1]);
    const string text = documentText(asset, document.options);
    const auto from = text.find("\"animations\""), to = text.find(",\"skins\"");
    EXPECT_EQ(text.substr(from, to - from),
              R"("animations":[{"channels":[{"sampler":0,"target":{"node":0,"path":"rotation"}}],)"
              R"("samplers":[{"input":2,"interpolation":"LINEAR","output":3}]},)"
              R"({"channels":[{"sampler":0,"target":{"node":1,"path":"unknown"}}],)"
              R"("samplers":[{"input":4,"interpolation":"LINEAR","output":5}]}])");
}

} // namespace
} // namespace document_test
