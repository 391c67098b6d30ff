#include "file_builder.h"
#include "pose_model.h"

#include "scene_mesh.h"
#include "scene_mesh_index.h"

#include <cmath>

namespace {

using namespace scene;
using namespace test_support;
using namespace base;

/// Two triangles that share an edge in place, a vertex for each corner.
const std::vector<aiVector3D> square = {{0, 0, 0}, {1, 0, 0}, {1, 1, 0},
                                        {0, 0, 0}, {1, 1, 0}, {0, 1, 0}};
const std::vector<aiVector3D> lifted = {{0, 0, 0}, {0, 0, 1}, {0, 0, 0},
                                        {0, 0, 0}, {0, 0, 0}, {0, 0, 2}};

class Morphs : public FileImport {
protected:
    base::IPlugin& morph() { return only(morph_schema::n_kind); }
    base::IPlugin& baseMesh() { return *findObject(morph(), morph_schema::n_baseMesh); }
    const base::AttribMap& target(u32 index) {
        const base::AttribMap* item = findListItem(morph(), morph_schema::n_targets, index);
        EXPECT_TRUE(item);
        return item ? *item : *nothing_;
    }
    base::IPlugin& targetMesh(u32 index) {
        return *findObject(target(index), morphTarget_schema::n_targetMesh);
    }
    float weight(u32 index) { return read(target(index), morphTarget_schema::n_weight); }
    vector<float> weights() {
        vector<float> all;
        for (u32 i = 0; i < getListCount(morph(), morph_schema::n_targets); ++i)
            all.push_back(weight(i));
        return all;
    }
};

TEST_F(Morphs, TargetsAreDifferencesAtTheVerticesOfTheBase) {
    FileBuilder file;
    aiMesh& source = file.mesh(file.root(), square);
    file.target(source, "lifted", 1.5f, lifted);
    // What is no number moves nothing.
    file.target(source, "broken", -1, {{}, {NAN, 0, 0}, {}, {}, {}, {}});
    importFile(file);
    EXPECT_EQ(targetMesh(0).getName(), "lifted");
    EXPECT_EQ(weights(), (vector<float>{1.5f, -1}));
    // Corners weld to four vertices, and the target has as many.
    const auto positions = valuesOf(baseMesh(), mesh_schema::n_positions);
    EXPECT_EQ(positions, (vector<vec3f>{{0, 0, 0}, {1, 0, 0}, {1, 1, 0}, {0, 1, 0}}));
    EXPECT_EQ(valuesOf(targetMesh(0), mesh_schema::n_positions),
              (vector<vec3f>{{0, 0, 0}, {0, 0, 1}, {0, 0, 0}, {0, 0, 2}}));
    EXPECT_EQ(valuesOf(targetMesh(1), mesh_schema::n_positions), vector<vec3f>(4));
}

TEST_F(Morphs, VerticesThatMoveDifferentlyStayApart) {
    FileBuilder file;
    aiMesh& source = file.mesh(file.root(), square);
    auto torn = lifted;
    torn[4] = {0, 0, 3}; // it is where vertex 2 is
    file.target(source, "torn", 0, torn);
    importFile(file);
    const auto indices = valuesOf(baseMesh(), mesh_schema::n_positionIndices);
    const auto differences = valuesOf(targetMesh(0), mesh_schema::n_positions);
    EXPECT_EQ(differences.size(), 6u); // the triangles touch at a corner alone
    for (std::size_t c = 0; c < torn.size(); ++c)
        EXPECT_EQ(differences[indices[c]], (vec3f{torn[c].x, torn[c].y, torn[c].z})) << c;

    // With one index for all, what exporters need to bring the target to the base is there.
    set(Settings::n_importMultiIndex, Presence::never);
    FileBuilder again;
    again.target(again.mesh(again.root(), square), "torn", 0, torn);
    importFile(again);
    const VertexOrigins origins = findVertexOrigins(baseMesh());
    ASSERT_TRUE(origins.positions);
    const auto single = valuesOf(baseMesh(), mesh_schema::n_indices);
    const auto moved = valuesOf(targetMesh(0), mesh_schema::n_positions);
    for (std::size_t c = 0; c < torn.size(); ++c)
        EXPECT_EQ(moved[(*origins.positions)[single[c]]].z, torn[c].z) << c;
}

TEST_F(Morphs, NormalsTurnInAllTargetsOrInNone) {
    for (const bool turns : {false, true}) {
        set(Settings::n_flipNormals, turns);
        FileBuilder file;
        aiMesh& source = file.mesh(file.root(), square);
        source.mNormals = new aiVector3D[6];
        std::fill_n(source.mNormals, 6, aiVector3D(0, 0, 1));
        file.target(source, "still", 0, lifted);
        aiAnimMesh& target = file.target(source, "turned", 0, lifted);
        target.mNormals = new aiVector3D[6];
        std::fill_n(target.mNormals, 6, turns ? aiVector3D(3, 0, 0) : aiVector3D(0, 0, 2));
        importFile(file);
        const std::size_t count = turns ? 4 : 0;
        EXPECT_EQ(valuesOf(targetMesh(0), mesh_schema::n_normals), vector<normal>(count));
        // From +Z to +X at unit length, the other way round for flipped faces.
        EXPECT_EQ(valuesOf(targetMesh(1), mesh_schema::n_normals),
                  vector<normal>(count, normal{-1, 0, 1}));
    }
}

TEST_F(Morphs, FbxWeightsBelongToGroupsOfTargets) {
    const auto build = [](FileBuilder& file, bool isAnimated) {
        aiNode& face = file.node("face", file.root());
        aiMesh& source = file.mesh(face, square);
        for (const char* name : {"smile", "smile", "smile", "blink", "frown", "frown"})
            file.target(source, name, name[0] == 'b' ? 1 : -0.5f, lifted);
        if (!isAnimated)
            return;
        file.weights(file.animation(24, 48), "face*0",
                     {{0, {0, 0.25, 1}}, {24, {1, 0.25, 2}}, {48, {3, 0.25, 1}}});
        // Groups that there are not.
        file.weights(*file.scene->mAnimations[0], "nobody*0", {{0, {0}}});
    };
    FileBuilder still;
    build(still, false);
    importFile(still, "face.fbx");
    // The last of each group has the weight; that of a single one is not known.
    EXPECT_EQ(weights(), (vector<float>{0, 0, -0.5f, 0, 0, -0.5f}));

    FileBuilder file;
    build(file, true);
    LogCapture log;
    base::IPlugin& scene = importFile(file, "face.fbx");
    EXPECT_EQ(problems(log),
              "3 assimp |" + path("face.fbx") +
                  "| Found 3 morph targets that are stages on the way to another, their weights "
                  "stay at 0!\n3 assimp |" +
                  path("face.fbx") +
                  "| Left out 1 animation channels of nodes or morph targets that the file does "
                  "not have!\n");
    poseScene(scene, 0.5);
    EXPECT_EQ(weights(), (vector<float>{0, 0, 0.5f, 0.25f, 0, 1.5f}));
    poseScene(scene, 2);
    EXPECT_EQ(weights(), (vector<float>{0, 0, 3, 0.25f, 0, 1}));
}

TEST_F(Morphs, OfSkinnedMeshesAreLeftOut) {
    FileBuilder file;
    file.node("bone", file.root());
    aiMesh& source = file.mesh(file.root(), square);
    file.target(source, "a", 0, lifted);
    file.bone(source, "bone", {}, {{0, 1}});
    file.weights(file.animation(24, 0), "root*0", {{0, {0}}, {1, {1}}}); // goes with them
    aiAnimMesh& odd = file.target(file.mesh(file.root(), square), "odd", 0, lifted);
    odd.mNumVertices = 5;
    LogCapture log;
    importFile(file);
    EXPECT_TRUE(objects(morph_schema::n_kind).empty());
    EXPECT_EQ(objects(skin_schema::n_kind).size(), 1u);
    EXPECT_EQ(problems(log),
              "3 assimp |" + path() +
                  "| Left out 1 morph targets with a wrong number of vertices!\n3 assimp |" +
                  path() +
                  "| Left out 1 morph targets of meshes that have a skeleton too, as exporters "
                  "draw a mesh with either of them!\n");
}

} // namespace
