#include "export_fixture.h"

#include "scene_mesh.h"

using namespace test_support;
using base::mat43;
using scene::IMesh;
using scene::INode;
using scene::mesh_schema;
using scene::meshJointsSet_schema;
using scene::node_schema;
using scene::skin_schema;
using Values = std::vector<double>;

namespace {

/// A node "body" with a skin of a triangle; its vertices follow the joints 0, 1 and 1.
struct SkinScene : Exporting {
    SkinScene() {
        write(*root, node_schema::n_name) = base::string("root");
        write(skin, skin_schema::n_baseMesh) = scene::Object(&makeTriangle(mesh));
        addBindPoses({{}, {}, {}});
        base::AttribMap& set = appendItem(mesh, mesh_schema::n_jointsSets);
        write(set, meshJointsSet_schema::n_jointCounts) = {1, 1, 1};
        write(set, meshJointsSet_schema::n_indices) = {0, 1, 1};
        write(set, meshJointsSet_schema::n_weights) = {1, 1, 1};
    }
    void addBindPoses(const base::vector<mat43>& transforms) {
        write(appendItem(mesh, mesh_schema::n_bindPoseSets),
              scene::meshBindPoseSet_schema::n_transforms) = transforms;
    }
    INode& addJoint(INode& parent, const char* name) {
        INode& node = addTo<INode>(parent, name);
        listJoint(&node);
        return node;
    }
    void listJoint(base::IPlugin* joint) {
        write(skin, skin_schema::n_joints).push_back(scene::Object(joint));
    }

    INode& body = addTo<INode>(*root, "body");
    scene::ISkin& skin = addTo<scene::ISkin>(body, "skin");
    IMesh& mesh = add<IMesh>("mesh");
};

std::string nameOf(const rapidjson::Value& node) {
    return node.HasMember("name") ? node["name"].GetString() : "?";
}

/// The joints of the only skin: names, "-" for a number that is no node's.
std::string jointsOf(const GltfFile& file) {
    if (file.count("skins") == 0)
        return "no skin";
    std::string text;
    for (const auto& joint : file.element("skins", 0)["joints"].GetArray()) {
        text += text.empty() ? "" : " ";
        text += joint.GetInt() < 0 ? "-" : nameOf(file.element("nodes", joint.GetUint()));
    }
    return text;
}

/// The nodes of the tree, parents first: names, "?" without one.
std::string nodesOf(const GltfFile& file) {
    std::string text;
    for (const NodeInstance& instance : file.instances()) {
        text += text.empty() ? "" : " ";
        text += nameOf(file.element("nodes", instance.node));
    }
    return text;
}

} // namespace

TEST(Skins, HoldTheMatricesAsTheSceneDoes) {
    SkinScene scene;
    const mat43 pose{{{1, 2, 3}, {4, 5, 6}, {7, 8, 9}}, {10, 11, 12}};
    const mat43 endless{{}, {0, 1e300, 0}};
    scene.addBindPoses({pose, endless, {}}); // the second of two sets
    write(scene.skin, skin_schema::n_bindPoseSetIndex) = 9;
    scene.addJoint(*scene.root, "a");
    scene.addJoint(*scene.root, "b");
    const LogCapture log;
    const GltfFile file = scene.saveAndRead();
    EXPECT_EQ(problems(log),
              "3 gltf |skin| The skin has bind poses that are not finite, they are ignored.\n");
    const auto& skin = file.element("skins", 0);
    EXPECT_STREQ(skin["name"].GetString(), "skin");
    const AccessorValues matrices = file.accessor(skin["inverseBindMatrices"].GetUint());
    ASSERT_EQ(matrices.count, 3u);
    EXPECT_EQ(Values(matrices.at(0), matrices.at(1)),
              (Values{1, 4, 7, 0, 2, 5, 8, 0, 3, 6, 9, 0, 10, 11, 12, 1}));
    for (size_t i = 1; i < 3; ++i)
        EXPECT_EQ(Values(matrices.at(i), matrices.at(i) + 16),
                  (Values{1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1}));
}

TEST(Skins, FindTheirJointsWhereverTheyStand) {
    struct Row {
        const char* name;
        std::function<void(SkinScene&)> build;
        const char *joints, *nodes;
        const char* message = "";
    } const rows[] = {
        {"joints behind the skin, listed against the order of the tree",
         [](SkinScene& s) {
             INode& a = s.addTo<INode>(*s.root, "a");
             s.addJoint(a, "b");
             s.listJoint(&a);
         },
         "b a", "root body a b"},
        {"joints before the skin",
         [](SkinScene& s) {
             auto& children = write(*s.root, node_schema::n_children);
             write(s.addJoint(*s.root, "a"), node_schema::n_isJoint) = true;
             s.addJoint(*s.root, "b");
             std::swap(children[0], children[2]);
         },
         "a b", "root b a body"},
        {"the root, and a joint above its own skin",
         [](SkinScene& s) {
             INode& joint = s.addJoint(*s.root, "joint");
             write(*s.root, node_schema::n_children) = {scene::Object(&joint)};
             s.append(joint, s.body);
             s.addJoint(s.body, "below");
             s.listJoint(s.root);
         },
         "joint below root", "root joint body below"},
        {"in two places",
         [](SkinScene& s) {
             s.append(s.body, s.addJoint(*s.root, "a"));
             s.addJoint(*s.root, "b");
         },
         "a b", "root body a b",
         "3 gltf |a| The joint is the child of several nodes, only the first place counts!\n"},
        {"gaps, what is no node, one twice, one outside the tree",
         [](SkinScene& s) {
             s.listJoint(nullptr);
             s.listJoint(&s.mesh);
             s.listJoint(&s.addJoint(*s.root, "a"));
             s.listJoint(&s.add<INode>("stray"));
         },
         "? ? a a -", "root body ? ? a",
         "3 gltf |skin| The skin has fewer bind poses than joints, the document is not valid!\n"
         "3 gltf |skin| The skin has joints that are no nodes, empty ones stand for them!\n"
         "3 gltf |stray| The joint is not in the scene's tree, it stays empty!\n"}};
    for (const Row& row : rows) {
        SCOPED_TRACE(row.name);
        SkinScene scene;
        row.build(scene);
        const LogCapture log;
        const GltfFile file = scene.saveAndRead();
        EXPECT_EQ(jointsOf(file), row.joints);
        EXPECT_EQ(nodesOf(file), row.nodes);
        EXPECT_EQ(problems(log), row.message);
        EXPECT_TRUE(findFaults(file).empty());
    }
}

TEST(Skins, ThatLackSomethingAreLeftOut) {
    using Poses = scene::meshBindPoseSet_schema;
    const struct {
        std::function<void(SkinScene&, base::AttribMap& poses, base::AttribMap& joints)> spoil;
        const char* joints = "no skin";
        const char* message = "";
    } rows[] = {
        {[](auto&, auto&, auto&) {}, "a b"},
        {[](auto& s, auto&, auto&) { write(s.skin, skin_schema::n_joints).clear(); }},
        {[](auto&, auto& poses, auto&) { write(poses, Poses::n_transforms).clear(); }},
        {[](auto& s, auto&, auto&) {
            write(s.mesh, mesh_schema::n_bindPoseSets).append(nullptr);
            s.skin.template attribute<base::u32>(skin_schema::n_bindPoseSetIndex) = 1;
        }},
        {[](auto&, auto&, auto& joints) {
             write(joints, meshJointsSet_schema::n_jointCounts).push_back(1);
         },
         "no skin",
         "2 mesh| Wrong joint counts in vertex weights at index 0! Expected 3 elements, found 4.\n"
         "3 gltf |skin| The mesh has no joints at its vertices, it gets no skin!\n"},
        {[](auto&, auto&, auto& joints) {
             write(joints, meshJointsSet_schema::n_indices) = {0, 1, 2};
         },
         "no skin",
         "3 gltf |skin| The vertices of the mesh name joints that the skin does not have, it gets "
         "no skin!\n"},
        {[](auto& s, auto&, auto& joints) {
             write(s.mesh, mesh_schema::n_jointsSets).append(joints.clone());
             write(s.skin, skin_schema::n_jointsSetIndex) = -1;
         },
         "a b",
         "3 gltf |skin| The skin names another set of joints than the first, which alone is "
         "exported!\n"}};
    for (const auto& row : rows) {
        SCOPED_TRACE(&row - rows);
        SkinScene scene;
        scene.addJoint(*scene.root, "a");
        scene.addJoint(*scene.root, "b");
        row.spoil(scene, *findListItem(scene.mesh, mesh_schema::n_bindPoseSets, 0),
                  *findListItem(scene.mesh, mesh_schema::n_jointsSets, 0));
        const LogCapture log;
        EXPECT_EQ(jointsOf(scene.saveAndRead()), row.joints);
        EXPECT_EQ(problems(log), row.message);
    }
}

TEST(Skins, KeepTheJointsOfVerticesThatSeamsMultiply) {
    SkinScene scene; // position 0 follows joint 0, the others joint 1
    write(scene.mesh, mesh_schema::n_positionIndices) = {0, 1, 2, 2, 1, 0};
    write(scene.mesh, mesh_schema::n_normals) = {{0, 0, 1}, {0, 0, -1}};
    write(scene.mesh, mesh_schema::n_normalIndices) = {0, 0, 0, 1, 1, 1};
    scene.addJoint(*scene.root, "a");
    scene.addJoint(*scene.root, "b");
    auto attributes = scene.saveAndRead().primitive(0, 0).attributes;
    ASSERT_EQ(attributes["POSITION"].count, 6u);
    for (size_t v = 0; v < 6; ++v) {
        const double* p = attributes["POSITION"].at(v);
        EXPECT_EQ(attributes["JOINTS_0"].at(v)[0], p[0] + p[1]);
    }
}
