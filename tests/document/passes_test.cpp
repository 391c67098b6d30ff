#include "document_support.h"

#include <random>

namespace document_test {
namespace {

using Light = MaterialCommon::Light;

ref<Node> lamp(const string& name, Light::Type type) {
    auto node = namedNode(name);
    node->light = makeRef<Light>();
    node->light->type = type;
    return node;
}

string outline(const vector<ref<Node>>& nodes) {
    string text = "(";
    for (const ref<Node>& node : nodes)
        text += node->name + outline(node->children);
    return text + ")";
}

TEST(UnusedNodes, AreRemovedUpToTheRoots) {
    const struct {
        bool keepLights;
        const char* left;
        std::size_t globalLights;
    } rows[] = {{true, "(j()p()r())", 1}, {false, "(j()r())", 2}};
    for (const auto& row : rows) {
        Asset asset;
        auto skinned = namedNode("r");
        skinned->skin = makeRef<Skin>();
        auto joint = namedNode("j");
        skinned->skin->joints.push_back(joint);
        auto ambient = lamp("a", Light::Type::ambient);
        auto point = lamp("p", Light::Type::point);
        auto& roots = asset.getDefaultScene().nodes;
        roots.push_back(joint);
        roots.push_back(namedNode("x", {namedNode("y", {namedNode("z"), ambient})}));
        roots.push_back(point);
        roots.push_back(skinned);
        Options options;
        options.keepMaterialsCommon = row.keepLights;
        asset.removeUnusedNodes(options);
        EXPECT_EQ(outline(roots), row.left);
        EXPECT_EQ(asset.globalLights.size(), row.globalLights);
        EXPECT_EQ(asset.globalLights[0], ambient->light);
    }
}

/// Removes one unused leaf after the other until there is none: the rule itself.
bool removeOneLeaf(vector<ref<Node>>& nodes) {
    for (std::size_t i = 0; i < nodes.size(); ++i) {
        if (nodes[i]->children.empty() && !nodes[i]->mesh) {
            nodes.erase(nodes.begin() + i);
            return true;
        }
        if (removeOneLeaf(nodes[i]->children))
            return true;
    }
    return false;
}

vector<ref<Node>> randomNodes(u32 seed) {
    std::mt19937 random(seed);
    std::vector<ref<Node>> all;
    vector<ref<Node>> roots;
    for (int i = 0; i < 60; ++i) {
        auto node = namedNode(std::to_string(i));
        if (random() % 4 == 0)
            node->mesh = makeRef<Mesh>();
        // Now and then a node has a second parent, later in the order or earlier.
        const auto parents = all.empty() ? 0 : 1 + random() % 8 / 7;
        for (u32 p = 0; p < parents; ++p) {
            auto& siblings = random() % 5 ? all[random() % all.size()]->children : roots;
            siblings.insert(siblings.begin() + random() % (siblings.size() + 1), node);
        }
        if (parents == 0)
            roots.push_back(node);
        all.push_back(node);
    }
    return roots;
}

TEST(UnusedNodes, AreThoseOfRepeatedRemoval) {
    for (u32 seed = 0; seed < 200; ++seed) {
        vector<ref<Node>> expected = randomNodes(seed);
        while (removeOneLeaf(expected)) {
        }
        Asset asset;
        asset.getDefaultScene().nodes = randomNodes(seed);
        asset.removeUnusedNodes({});
        ASSERT_EQ(outline(asset.getDefaultScene().nodes), outline(expected)) << seed;
    }
}

// A skinned node below its own joint: the graph of nodes and skins has a cycle.
TEST(Walks, EndOnCyclesAndTheCyclesAreFreed) {
    const auto skin = makeRef<Skin>();
    {
        Asset asset;
        auto skinned = namedNode("s");
        auto joint = namedNode("j", {namedNode("k"), skinned});
        skinned->skin = skin;
        skin->skeleton = namedNode("o");
        skin->joints.push_back(joint);
        skin->joints.push_back(namedNode("q"));
        skin->joints.push_back(skinned);
        asset.getDefaultScene().nodes.push_back(joint);
        EXPECT_EQ(names(asset.getAllNodes()), "jsqok");
        asset.removeUnusedNodes({});
        EXPECT_EQ(names(asset.getAllNodes()), "jsqo");
        const string text = documentText(asset);
        EXPECT_NE(text.find(R"("nodes":[{"children":[1],"name":"j"},{"skin":0,"name":"s"},)"
                            R"({"name":"o"}])"),
                  string::npos);
        EXPECT_NE(text.find(R"("skins":[{"skeleton":2,"joints":[0,-1,1]}])"), string::npos);
    }
    EXPECT_EQ(skin->refCount(), 1u);
}

TEST(Walks, TakeDeepTrees) {
    Asset asset;
    auto& roots = asset.getDefaultScene().nodes;
    roots.push_back(namedNode("root"));
    Node* last = roots[0].get();
    constexpr std::size_t depth = 100000;
    for (std::size_t i = 1; i < depth; ++i) {
        last->children.push_back(namedNode(""));
        last = last->children[0].get();
    }
    last->mesh = makeRef<Mesh>();
    asset.removeUnusedNodes({});
    EXPECT_EQ(asset.getAllNodes().size(), depth);
    documentText(asset);
    EXPECT_EQ(last->id, static_cast<i32>(depth - 1));
}

TEST(Walks, ListSharedObjectsOnce) {
    Asset asset;
    auto primitive = makeRef<Primitive>();
    auto accessor = makeRef<Accessor>(Accessor::Type::vec3, componentFloat);
    primitive->attributes["POSITION"] = accessor;
    primitive->attributes["NORMAL"] = makeRef<Accessor>(Accessor::Type::vec3, componentFloat);
    primitive->indices = makeRef<Accessor>(Accessor::Type::scalar, componentU32);
    primitive->targets.push_back(makeRef<Primitive::Target>());
    primitive->targets[0]->attributes["POSITION"] = accessor;
    primitive->material = makeRef<MaterialPBR>();
    auto first = meshNode(primitive), second = meshNode(primitive), third = makeRef<Node>();
    third->mesh = first->mesh;
    for (const auto& node : {first, second, third})
        asset.getDefaultScene().nodes.push_back(node);

    EXPECT_EQ(asset.getAllMeshes().size(), 2u);
    EXPECT_EQ(asset.getAllPrimitives().size(), 1u);
    EXPECT_EQ(asset.getAllMaterials().size(), 1u);
    Accessor* const normal = primitive->attributes["NORMAL"].get();
    EXPECT_EQ(Asset::getAllPrimitiveAccessors(*primitive),
              (vector<Accessor*>{normal, accessor.get(), accessor.get()}));
    EXPECT_EQ(asset.getAllAccessors(),
              (vector<Accessor*>{normal, accessor.get(), primitive->indices.get()}));
}

TEST(Assets, MakeTheirDefaultSceneAtFirstUse) {
    Asset asset;
    asset.scenes.push_back(makeRef<Scene>());
    Scene& scene = asset.getDefaultScene();
    EXPECT_EQ(asset.scenes[1], &scene);
    // The index is 0 all the same.
    EXPECT_EQ(asset.scene, 0);
    EXPECT_EQ(&asset.getDefaultScene(), asset.scenes[0].get());
}

TEST(Animations, AreMergedIntoOneWithoutAName) {
    Asset asset;
    vector<ref<Animation::Channel>> channels;
    for (const std::size_t count : {2u, 0u, 1u}) {
        asset.animations.push_back(makeRef<Animation>());
        asset.animations.back()->name = "take";
        for (std::size_t i = 0; i < count; ++i) {
            channels.push_back(makeRef<Animation::Channel>());
            asset.animations.back()->channels.push_back(channels.back());
        }
    }
    asset.mergeAnimations();
    ASSERT_EQ(asset.animations.size(), 1u);
    EXPECT_EQ(asset.animations[0]->name, "");
    EXPECT_EQ(asset.animations[0]->channels, channels);
}

} // namespace
} // namespace document_test
