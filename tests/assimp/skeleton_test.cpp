#include "file_builder.h"
#include "pose_model.h"

#include "assimp/vertex_joints.h"
#include "scene_mesh.h"

#include <cmath>

namespace {

using namespace scene;
using namespace test_support;
using namespace base;

const float nan = std::nanf("");

class Skeleton : public FileImport {
protected:
    const base::AttribMap& joints(const base::IPlugin& mesh) {
        const base::AttribMap* set = findListItem(mesh, mesh_schema::n_jointsSets, 0);
        EXPECT_TRUE(set);
        return set ? *set : *nothing_;
    }
    vector<u16> counts(const base::IPlugin& mesh) {
        return valuesOf(joints(mesh), meshJointsSet_schema::n_jointCounts);
    }
    vector<u32> indices(const base::IPlugin& mesh) {
        return valuesOf(joints(mesh), meshJointsSet_schema::n_indices);
    }
    vector<float> weights(const base::IPlugin& mesh) {
        return valuesOf(joints(mesh), meshJointsSet_schema::n_weights);
    }
    /// Names of a skin's joints.
    std::string jointNames(const base::IPlugin& skin) {
        std::string names;
        for (const auto& joint : valuesOf(skin, skin_schema::n_joints)) {
            EXPECT_TRUE(read(*joint, node_schema::n_isJoint));
            names += joint->getName() + " ";
        }
        return names;
    }
};

TEST_F(Skeleton, WeightsAreSortedAndAddUpToOne) {
    const struct {
        const char* name;
        std::vector<FileBuilder::Weights> bones; ///< weights of vertex 0 by bone
        vector<u32> indices;
        vector<float> weights;
        u64 broken;
    } cases[] = {
        {"heaviest first", {{{0, 0.25f}}, {{0, 0.75f}}}, {1, 0}, {0.75f, 0.25f}, 0},
        {"equal ones in order", {{{0, 1}}, {{0, 1}}, {{0, 2}}}, {2, 0, 1}, {0.5f, 0.25f, 0.25f}, 0},
        {"sum of less", {{{0, 0.1f}}, {{0, 0.1f}}}, {0, 1}, {0.5f, 0.5f}, 0},
        {"zero is none", {{{0, 0}}, {{0, 0.5f}}}, {1}, {1}, 0},
        {"twice the same bone", {{{0, 0.25f}, {0, 0.5f}}, {{0, 0.25f}}}, {0, 1}, {0.75f, 0.25f}, 0},
        {"no numbers", {{{0, nan}}, {{0, -1.0f}}, {{0, INFINITY}}, {{0, 2}}}, {3}, {1}, 3},
        {"not there", {{{7, 1}, {0, 1}}}, {0}, {1}, 1},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.name);
        aiMesh mesh;
        for (const auto& weights : c.bones)
            FileBuilder::bone(mesh, "b", {}, weights);
        const vector<const aiBone*> bones(mesh.mBones, mesh.mBones + mesh.mNumBones);
        assimp::SkeletonFaults faults;
        const assimp::VertexJoints joints = assimp::readVertexJoints(bones, 1, faults);
        EXPECT_EQ(joints.joints, c.indices);
        EXPECT_EQ(joints.weights, c.weights);
        EXPECT_EQ(joints.starts, (vector<u32>{0, static_cast<u32>(c.indices.size())}));
        EXPECT_EQ(faults.brokenWeights, c.broken);
    }
}

/// Two triangles that share an edge in place, a vertex for each corner.
const std::vector<aiVector3D> square = {{0, 0, 0}, {1, 0, 0}, {1, 1, 0},
                                        {0, 0, 0}, {1, 1, 0}, {0, 1, 0}};

TEST_F(Skeleton, PosesAreThoseOfTheFile) {
    const auto build = [](FileBuilder& file) {
        aiNode& hip = file.node("hip", file.root(), translated(0, 2, 0));
        file.node("knee", hip, translated(0.5f, 0, 0) * matrixOf(turned(30, {0, 0, 1})));
        aiNode& user = file.node("user", file.root(), translated(5, 5, 5));
        aiMesh& mesh = file.mesh(user, square);
        // Vertex 5 has no bone; the sums are not 1.
        file.bone(mesh, "knee", translated(-0.5f, 0, 0), {{1, 0.5f}, {2, 0.6f}, {4, 0.6f}});
        file.bone(mesh, "hip", translated(0, -1, 0), {{0, 2}, {3, 2}, {2, 0.2f}, {4, 0.2f}});
        file.use(file.node("twin", file.root(), translated(-5, 0, 0)), 0);
        aiAnimation& walk = file.animation(24, 24);
        file.channel(
            walk, "knee",
            {.positions = {{0, {0.5f, 0, 0}}, {12, {0.5f, 1, 0}}},
             .rotations = {{0, {}}, {8, turned(170, {1, 0, 0})}, {24, turned(-100, {0, 1, 0})}}});
        file.channel(walk, "twin", {.scales = {{0, {1, 1, 1}}, {24, {2, 3, 4}}}});
    };
    FileBuilder original, imported;
    build(original);
    build(imported);
    LogCapture log;
    base::IPlugin& scene = importFile(imported);
    for (const double t : {0.0, 0.2, 1.0 / 3, 0.5, 0.77, 1.0})
        EXPECT_LT(poseDifference(poseFile(*original.scene, 0, t), poseScene(scene, t)), 1e-6) << t;
    EXPECT_TRUE(log.has(base::logInformation, "assimp |" + path() +
                                                  "| Found 1 vertices that no bone moves, they go "
                                                  "with their node."));
    // A skin for each node, in the place of the mesh.
    const auto skins = objects(skin_schema::n_kind);
    ASSERT_EQ(skins.size(), 2u);
    EXPECT_EQ(jointNames(*skins[0]), "knee hip user ");
    EXPECT_EQ(jointNames(*skins[1]), "knee hip twin ");
    EXPECT_EQ(findObject(*skins[0], skin_schema::n_baseMesh),
              findObject(*skins[1], skin_schema::n_baseMesh));
    // Corners weld to the four vertices of the square.
    EXPECT_EQ(counts(mesh()), (vector<u16>{1, 1, 2, 1}));
}

TEST_F(Skeleton, VerticesOfDifferentJointsStayApart) {
    for (const auto multiIndex : {Presence::always, Presence::never}) {
        set(Settings::n_importMultiIndex, multiIndex);
        FileBuilder file;
        file.node("a", file.root());
        file.node("b", file.root());
        aiMesh& source = file.mesh(file.root(), square);
        // The second triangle comes away from the first at (1, 1). Faces that touch at a corner
        // alone share no vertex, so it has none of the four of the square then.
        file.bone(source, "a", {}, {{0, 1}, {1, 1}, {2, 1}, {3, 1}});
        file.bone(source, "b", {}, {{4, 1}, {5, 1}});
        importFile(file);
        EXPECT_EQ(valuesOf(mesh(), mesh_schema::n_positions).size(), 6u);
        vector<u32> sorted = indices(mesh());
        std::ranges::sort(sorted);
        EXPECT_EQ(sorted, (vector<u32>{0, 0, 0, 0, 1, 1}));
    }
}

TEST_F(Skeleton, WhatIsMissingIsLeftOut) {
    const auto build = [](FileBuilder& file) {
        file.node("a", file.root());
        aiMesh& mesh = file.mesh(file.root(), square);
        file.bone(mesh, "ghost", {}, {{0, 1}, {1, 1}});
        aiMatrix4x4 broken;
        broken.a1 = nan;
        file.bone(mesh, "a", broken, {{0, 1}, {1, 1}, {2, 1}, {3, 1}, {4, 1}, {5, 1}});
    };
    FileBuilder file;
    build(file);
    LogCapture log;
    importFile(file);
    EXPECT_EQ(problems(log),
              "3 assimp |" + path() + "| Left out 1 bones without a node of their name!\n" +
                  "3 assimp |" + path() +
                  "| Found 1 bind poses that are not finite, the identity is taken!\n");
    EXPECT_EQ(jointNames(only(skin_schema::n_kind)), "a ");
    EXPECT_EQ(weights(mesh()), (vector<float>{1, 1, 1, 1}));

    // Without any weight there is nothing to bend.
    FileBuilder stiff;
    stiff.node("a", stiff.root());
    stiff.bone(stiff.mesh(stiff.root(), square), "a", {}, {});
    importFile(stiff);
    EXPECT_TRUE(objects(skin_schema::n_kind).empty());

    set(Settings::n_importSkeletons, false);
    FileBuilder again;
    build(again);
    importFile(again);
    EXPECT_TRUE(objects(skin_schema::n_kind).empty());
    EXPECT_FALSE(find(mesh(), mesh_schema::n_jointsSets));
}

} // namespace
