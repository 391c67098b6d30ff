#include "scene.h"

#include "log_capture.h"
#include "scene_transform.h"

#include <gtest/gtest.h>

#include <limits>
#include <utility>

namespace {

using namespace scene;
using namespace base;
using test_support::LogCapture;

class Nodes : public testing::Test {
protected:
    Nodes() { register_scene_schema(factory_); }

    INode& add(INode* parent = nullptr) {
        const auto node = factory_.create(node_schema::n_kind);
        if (parent)
            write(*parent, node_schema::n_children).push_back(node);
        return dynamic_cast<INode&>(*node);
    }
    INode& addAt(INode* parent, const vec3d& translate) {
        INode& node = add(parent);
        write(node, node_schema::n_translate) = translate;
        return node;
    }
    static vec3d world(const INode& node) {
        mat43 m;
        node.getWorldTransform(m);
        return m.t;
    }
    static vec3d local(const INode& node) {
        mat43 m;
        node.getTransform(m);
        return m.t;
    }
    /// Makes `name` of `node` a link.
    static void link(base::IPlugin& node, base::name_id name, base::AttribPath path) {
        node.attribute(name, new base::AttribLink(std::move(path)));
    }

    base::PluginFactory factory_{"nodes"};
};

TEST_F(Nodes, ChildrenAndParents) {
    INode& root = add();
    const auto light = factory_.create(light_schema::n_kind);
    write(root, node_schema::n_children) = {light, nullptr};
    INode& child = add(&root);
    INode& other = add();
    write(other, node_schema::n_children).push_back(base::ref<base::IPlugin>(&child));

    EXPECT_EQ(root.getChildCount(), 3u);
    EXPECT_EQ(root.findChild(1), nullptr);
    EXPECT_EQ(root.findChild(2), &child);
    EXPECT_EQ(root.findChild(3), nullptr);
    EXPECT_EQ(child.findParent(), &root) << "the first by id of two";
    EXPECT_EQ(root.findParent(), nullptr);
}

TEST_F(Nodes, WorldTransformsAreProductsFromTheRoot) {
    INode& root = addAt(nullptr, {1, 0, 0});
    write(root, node_schema::n_scale) = {10, 10, 10};
    INode& middle = addAt(&root, {0, 1, 0});
    write(middle, node_schema::n_rotate) = {0, 0, 1, 0}; // half a turn about z
    INode& leaf = addAt(&middle, {1, 0, 0});
    EXPECT_EQ(world(root), (vec3d{1, 0, 0}));
    EXPECT_EQ(world(middle), (vec3d{1, 10, 0}));
    EXPECT_EQ(world(leaf), (vec3d{-9, 10, 0}));
    EXPECT_EQ(local(leaf), (vec3d{1, 0, 0}));
}

TEST_F(Nodes, ThoseThatDoNotInheritStayInTheWorld) {
    INode& root = addAt(nullptr, {8, 0, 0});
    write(root, node_schema::n_scale) = {2, 2, 2};
    INode& middle = addAt(&root, {1, 1, 1});
    INode& leaf = addAt(&middle, {3, 4, 5});
    write(leaf, node_schema::n_inheritsTransform) = false;
    const LogCapture log;
    EXPECT_EQ(world(leaf), (vec3d{3, 4, 5}));
    EXPECT_EQ(local(leaf), (vec3d{-3.5, 1, 1.5})); // (3 - 10, 4 - 2, 5 - 2) / 2

    mat43 given;
    const mat43 parentWorld{{}, {1, 0, 0}};
    leaf.getTransform(given, &parentWorld);
    EXPECT_EQ(given.t, (vec3d{2, 4, 5}));
    EXPECT_TRUE(log.entries().empty());
}

TEST_F(Nodes, TellWhatTheyDoWithout) {
    INode& flat = add();
    write(flat, node_schema::n_scale) = {1, 0, 1};
    INode& child = addAt(&flat, {6, 7, 8});
    mat43 flatWorld, m;
    flat.getWorldTransform(flatWorld);
    EXPECT_EQ(child.getTransform(m, &flatWorld), 0u);

    write(child, node_schema::n_inheritsTransform) = false;
    for (const mat43* parentWorld :
         {static_cast<const mat43*>(nullptr), &std::as_const(flatWorld)}) {
        EXPECT_EQ(child.getTransform(m, parentWorld), INode::faultParent);
        EXPECT_EQ(m.t, (vec3d{6, 7, 8}));
    }
    write(child, node_schema::n_translate).y = std::numeric_limits<double>::infinity();
    EXPECT_EQ(child.getTransform(m, nullptr), INode::faultParent | INode::faultNotFinite);
    EXPECT_EQ(m.t, vec3d());
}

TEST_F(Nodes, CyclesEnd) {
    INode& a = addAt(nullptr, {1, 0, 0});
    INode& b = addAt(&a, {1, 0, 0});
    write(b, node_schema::n_children).push_back(base::ref<base::IPlugin>(&a));
    EXPECT_EQ(world(b).x, 2);
}

TEST_F(Nodes, SetTransformIsWhatGetTransformAnswers) {
    INode& root = addAt(nullptr, {8, 0, 0});
    write(root, node_schema::n_scale) = {2, 2, 2};
    INode& child = add(&root);
    const mat43 wanted{{{0, -3, 0}, {3, 0, 0}, {0, 0, 3}}, {1, 2, 3}};
    for (const bool inherits : {true, false}) {
        write(child, node_schema::n_inheritsTransform) = inherits;
        link(child, node_schema::n_scale, base::AttribPath(root, node_schema::n_shear));
        child.setTransform(wanted);
        mat43 got;
        child.getTransform(got);
        EXPECT_EQ(got.t, wanted.t);
        EXPECT_NEAR(got.m.r0.y, -3, 1e-6);
        EXPECT_NEAR(got.m.r1.x, 3, 1e-6);
        EXPECT_NEAR(got.m.r2.z, 3, 1e-6);
    }
}

TEST_F(Nodes, ChannelsAreLinksToALayer) {
    const auto layer = factory_.create(animLayer_schema::n_kind);
    const auto output = [&](base::u32 index) {
        return base::AttribPath(*layer, animLayer_schema::n_outputs).element(index);
    };
    const LogCapture log;
    INode& plain = addAt(nullptr, {1, 2, 3});
    EXPECT_FALSE(plain.hasTransformChannels());

    for (const base::name_id name :
         {node_schema::n_translate.id, node_schema::n_scale.id, node_schema::n_rotate.id}) {
        INode& node = add();
        link(node, name, output(4)); // which the layer has not made yet
        EXPECT_TRUE(node.hasTransformChannels()) << name.text();
        INode& follower = add();
        link(follower, name, base::AttribPath(node, name));
        EXPECT_TRUE(follower.hasTransformChannels()) << name.text();
        const base::AttribPath* path = findLayerPath(follower.findAttribute(name, false));
        ASSERT_NE(path, nullptr);
        EXPECT_EQ(*path, output(4));
    }
    INode& turned = add();
    link(turned, node_schema::n_rotateEuler, output(0));
    EXPECT_FALSE(turned.hasTransformChannels());
    INode& constrained = add();
    link(constrained, node_schema::n_translate, base::AttribPath(plain, node_schema::n_translate));
    EXPECT_FALSE(constrained.hasTransformChannels());
    INode& circular = add();
    link(circular, node_schema::n_scale, base::AttribPath(circular, node_schema::n_scale));
    EXPECT_FALSE(circular.hasTransformChannels());
    EXPECT_TRUE(log.entries().empty());
}

} // namespace
