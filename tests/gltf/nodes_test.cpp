#include "export_fixture.h"

#include <gmock/gmock.h>

using namespace test_support;
using scene::IMesh;
using scene::INode;
using scene::node_schema;
using testing::HasSubstr;

namespace {

std::string describe(const GltfFile& file, const rapidjson::Value& node) {
    std::string text = node.HasMember("name") ? node["name"].GetString() : "";
    if (node.HasMember("mesh"))
        text.append("(")
            .append(file.element("meshes", node["mesh"].GetUint())["name"].GetString())
            .append(")");
    if (!node.HasMember("children"))
        return text;
    char separator = '{';
    for (const auto& child : node["children"].GetArray()) {
        text += separator;
        text += describe(file, file.element("nodes", child.GetUint()));
        separator = ' ';
    }
    return text.append("}");
}

/// The number of meshes, and the node tree: names, in parentheses those of meshes, in braces the
/// children.
std::string describe(const GltfFile& file) {
    const auto root = file.element("scenes", 0)["nodes"][0].GetUint();
    return std::to_string(file.count("meshes")) + ": " +
           describe(file, file.element("nodes", root));
}

IMesh& addTriangle(Exporting& scene, INode& node, const char* name) {
    return makeTriangle(scene.addTo<IMesh>(node, name));
}

INode& addNode(Exporting& scene, INode& parent, const char* name) {
    return scene.addTo<INode>(parent, name);
}

struct Row {
    const char* name;
    std::function<void(Exporting&, INode& root)> build;
    const char* tree;
    const char* message = "";
};

const Row rows[] = {
    {"nodes come before the holders of further meshes",
     [](Exporting& s, INode& root) {
         for (const char* name : {"m1", "m2"})
             addTriangle(s, root, name);
         addTriangle(s, addNode(s, root, "a"), "m3");
         addTriangle(s, root, "m4");
         addTriangle(s, addNode(s, root, "b"), "m5");
     },
     "5: (m1){a(m3) b(m5) (m2) (m4)}"},
    {"a skin or morph stands for its base mesh, which may be a child itself",
     [](Exporting& s, INode& root) {
         const scene::Object mesh(&addTriangle(s, addNode(s, root, "a"), "m"));
         write(s.addTo<scene::ISkin>(root), scene::skin_schema::n_baseMesh) = mesh;
         write(s.addTo<scene::IMorph>(root), scene::morph_schema::n_baseMesh) = mesh;
         s.addTo<scene::ISkin>(root); // without a base mesh
     },
     "1: (m){a(m) (m)}"},
    {"nodes that carry nothing go, up to the root",
     [](Exporting& s, INode& root) {
         INode& node = addNode(s, addNode(s, root, "a"), "b");
         s.addTo<scene::IPoints>(node);
         s.addTo<scene::ICamera>(node);
         s.addTo<scene::IHair>(root);
         write(root, node_schema::n_children).push_back(nullptr);
     },
     "0: "},
    {"a mesh without primitives is tried once",
     [](Exporting& s, INode& root) {
         const scene::Object mesh(&s.addTo<IMesh>(root, "m"));
         write(s.addTo<scene::ISkin>(root), scene::skin_schema::n_baseMesh) = mesh;
         addTriangle(s, root, "n");
     },
     "1: (n)", "3 validate |m| Mesh doesn't contain any primitives!\n"},
    {"nodes below themselves",
     [](Exporting& s, INode& root) {
         INode& a = addNode(s, root, "a");
         INode& b = addNode(s, a, "b");
         s.append(b, a);
         s.append(b, root);
         addTriangle(s, b, "m");
     },
     "1: {a{b(m)}}",
     "2 gltf |a| The node is a child of its own descendant, it is skipped!\n"
     "2 gltf || The node is a child of its own descendant, it is skipped!\n"},
    {"a joint has one place, other nodes may have several",
     [](Exporting& s, INode& root) {
         INode& a = addNode(s, root, "a");
         for (const char* name : {"joint", "node"}) {
             INode& shared = addNode(s, a, name);
             addTriangle(s, shared, "m");
             write(shared, node_schema::n_isJoint) = *name == 'j';
             s.append(root, shared);
         }
     },
     "2: {a{joint(m) node(m)} node(m)}",
     "3 gltf |joint| The joint is the child of several nodes, only the first place counts!\n"},
    {"children of the wrong type",
     [](Exporting& s, INode& root) {
         addNode(s, root, "a").attribute<float>(node_schema::n_children) = 1;
         addTriangle(s, root, "m");
     },
     "1: (m)",
     "3 map attribute| Detected invalid access to attribute 'children'. Expected type 'plugin[]', "
     "actual attribute type - 'float'!\n"},
    {"an object whose type was unknown when it was made",
     [](Exporting& s, INode& root) {
         base::PluginFactory strange;
         const auto dummy = strange.create(scene::mesh_schema::n_kind);
         s.append(root, *dummy);
         addTriangle(s, root, "m");
     },
     "1: (m)",
     "3 gltf || An object of type 'mesh' was made before that type was known, it is left out!\n"}};

} // namespace

TEST(Nodes, FoldChildrenIntoTheTree) {
    for (const Row& row : rows) {
        SCOPED_TRACE(row.name);
        Exporting scene;
        row.build(scene, *scene.root);
        const LogCapture log;
        EXPECT_EQ(describe(scene.saveAndRead()), row.tree);
        EXPECT_EQ(problems(log), row.message);
    }
}

TEST(Nodes, BeyondTheDeepestLevelAreCut) {
    Exporting scene;
    INode* node = scene.root;
    for (int level = 1; level <= 5000; ++level) {
        addTriangle(scene, *node, "m");
        node = &addNode(scene, *node, "n");
    }
    const LogCapture log;
    EXPECT_EQ(scene.saveAndRead().count("nodes"), 4096u);
    EXPECT_EQ(problems(log), "2 gltf |n| The node lies too deep in the tree, it is skipped!\n");
}

TEST(Nodes, ThatShareNodesDoNotMultiplyWithoutEnd) {
    Exporting scene;
    INode* node = scene.root;
    for (int level = 0; level < 60; ++level) {
        INode& below = addNode(scene, *node, "n");
        scene.append(*node, below);
        node = &below;
    }
    const LogCapture log;
    EXPECT_TRUE(scene.save(scene.folder / "a.glb"));
    EXPECT_THAT(problems(log), HasSubstr("2 gltf |n| The node was met before"));
}

namespace {

Vector applied(const GltfFile& file, const char* name, const Vector& point) {
    for (const NodeInstance& instance : file.instances()) {
        const auto& node = file.element("nodes", instance.node);
        if (node.HasMember("name") && node["name"].GetString() == std::string_view(name))
            return transformPoint(instance.worldFromNode, point);
    }
    throw std::runtime_error("no such node");
}

} // namespace

TEST(Transforms, TurnTheUpAxisToY) {
    // The root takes (1, 2, 3) to (11, 2, 33): that turned is expected.
    const std::pair<base::u8, Vector> rows[] = {
        {0, {-2, 11, 33}}, {1, {11, 2, 33}}, {2, {11, 33, -2}}, {3, {11, 2, 33}}};
    for (const auto& [upAxis, expected] : rows) {
        SCOPED_TRACE(upAxis);
        Exporting scene;
        write(*scene.scene, scene::scene_schema::n_upAxis) = upAxis;
        write(*scene.root, node_schema::n_translate) = {10, 0, 30};
        INode& child = addNode(scene, *scene.root, "child");
        write(child, node_schema::n_scale) = {2, 2, 2};
        addTriangle(scene, child, "m");
        EXPECT_EQ(applied(scene.saveAndRead(), "child", {0.5, 1, 1.5}), expected);
    }
}

TEST(Transforms, MayBeFreeOfTheParents) {
    struct {
        float parentScale;
        double translate;
        Vector expected;
        const char* message;
    } const rows[] = {{2, 5, {5, 0, 0}, ""},
                      {0, 5, {1, 2, 3}, "can't be freed of its parent's"},        // singular
                      {0x1p-60f, 0x1p100, {1 + 0x1p40, 2, 3}, "can't be freed"}}; // beyond floats
    for (const auto& row : rows) {
        SCOPED_TRACE(row.parentScale);
        Exporting scene;
        INode& parent = addNode(scene, *scene.root, "parent");
        write(parent, node_schema::n_translate) = {1, 2, 3};
        write(parent, node_schema::n_scale) = {row.parentScale, row.parentScale, row.parentScale};
        INode& child = addNode(scene, parent, "child");
        write(child, node_schema::n_inheritsTransform) = false;
        write(child, node_schema::n_translate) = {row.translate, 0, 0};
        addTriangle(scene, child, "m");
        const LogCapture log;
        EXPECT_EQ(applied(scene.saveAndRead(), "child", {0, 0, 0}), row.expected);
        EXPECT_EQ(problems(log).empty(), !*row.message);
        EXPECT_THAT(problems(log), HasSubstr(row.message));
    }
}

TEST(Transforms, OfAnimatedNodesAreTakenApart) {
    Exporting scene;
    auto& layer = scene.add<scene::IAnimLayer>();
    layer.arrayAttribute(scene::animLayer_schema::n_outputs)
        .append(new base::TypedAttribute<base::vec3d>({1, 2, 3}));
    INode& node = addNode(scene, *scene.root, "n");
    write(node, node_schema::n_scale) = {-2, 1, 1};
    base::AttribPath path(layer, scene::animLayer_schema::n_outputs);
    node.attribute(node_schema::n_translate, new base::AttribLink(path.element(0)));
    addTriangle(scene, node, "m");
    INode& still = addNode(scene, node, "still");
    write(still, node_schema::n_inheritsTransform) = false;
    addTriangle(scene, still, "m");

    const LogCapture log;
    const GltfFile file = scene.saveAndRead();
    EXPECT_THAT(problems(log), HasSubstr("3 gltf |still| The node does not inherit"));
    EXPECT_EQ(applied(file, "n", {1, 1, 1}), (Vector{-1, 3, 4}));
    // A mirrored node has three negative scales; the rotation makes up for it.
    const auto& json = file.element("nodes", 1);
    EXPECT_FALSE(json.HasMember("matrix"));
    const double scale[] = {-2, -1, -1};
    for (rapidjson::SizeType c = 0; c < 3; ++c)
        EXPECT_EQ(json["scale"][c].GetDouble(), scale[c]);
}
