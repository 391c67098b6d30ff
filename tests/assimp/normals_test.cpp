#include "fbx_text.h"
#include "import_fixture.h"

#include <cmath>

namespace {

using namespace scene;
using namespace test_support;
using namespace base;

class Normals : public Import {
protected:
    /// Of the corners.
    vector<normal> normals() {
        return cornersOf(mesh(), mesh_schema::n_normals, mesh_schema::n_normalIndices);
    }
    vector<vec4f> tangents() {
        return cornersOf(mesh(), mesh_schema::n_tangents, mesh_schema::n_tangentIndices);
    }
};

void expectNear(const normal& found, const vec3f& wanted) {
    EXPECT_NEAR(found.x, wanted.x, 1e-6);
    EXPECT_NEAR(found.y, wanted.y, 1e-6);
    EXPECT_NEAR(found.z, wanted.z, 1e-6);
}

/// Two squares of side 1 that meet in the Y axis: one lies in the XY plane, the other falls off
/// to the other side by a slope of 4/3 (53.13 degrees). They share vertices.
const char* const hinge = R"(OFF
6 2 0
0 0 0
1 0 0
1 1 0
0 1 0
-0.6 1 -0.8
-0.6 0 -0.8
4 0 1 2 3
4 0 3 4 5
)";

TEST_F(Normals, AreSmoothUpToTheAngle) {
    const vec3f up{0, 0, 1}, slope{-0.8f, 0, 0.6f};
    // Both squares have a right angle at the edge, so the mean is the bisector.
    const float f = 1 / std::sqrt(0.8f * 0.8f + 1.6f * 1.6f);
    const vec3f mean{-0.8f * f, 0, 1.6f * f};
    const struct {
        NormalsMethod method;
        float angle;
        bool isSmooth;
    } cases[] = {{NormalsMethod::smooth, 60, true},
                 {NormalsMethod::smooth, 54, true},
                 {NormalsMethod::smooth, 53, false},
                 {NormalsMethod::flat, 180, false}};
    for (const auto& c : cases) {
        SCOPED_TRACE(c.angle);
        set(Settings::n_computeNormalsMethod, c.method);
        set(Settings::n_computeNormalsAngle, c.angle);
        ASSERT_TRUE(load("hinge.off", hinge));
        const vector<normal> found = normals();
        ASSERT_EQ(found.size(), 8u);
        const auto at = [&](const vec3f& flat) { return c.isSmooth ? mean : flat; };
        const vec3f wanted[8] = {at(up), up, up, at(up), at(slope), at(slope), slope, slope};
        for (u32 i = 0; i < 8; ++i)
            expectNear(found[i], wanted[i]);
        // Corners of one vertex must weld again.
        if (c.isSmooth) {
            EXPECT_EQ(found[0], found[4]);
        }
    }
    set(Settings::n_importNormals, Presence::present);
    ASSERT_TRUE(load("hinge.off", hinge));
    EXPECT_TRUE(normals().empty());
}

TEST_F(Normals, OfConcavePolygonsAndFlippedFaces) {
    // The first corner is the concave one, the last two lie on a line with it.
    const char* const text = "v 1 1 0\nv 0 3 0\nv 0 0 0\nv 3 0 0\nv 2 0.5 0\nf 1 2 3 4 5\n";
    for (const bool flip : {false, true}) {
        set(Settings::n_flipNormals, flip);
        ASSERT_TRUE(load("concave.obj", text));
        ASSERT_EQ(normals().size(), 5u);
        for (const normal& n : normals())
            expectNear(n, {0, 0, flip ? -1.0f : 1.0f});
    }
}

TEST_F(Normals, AtTheTipOfAConeAreTheAxis) {
    // So many faces that only some of them are looked at.
    constexpr int sides = 1000;
    std::string text = "v 0 0 1\n";
    for (int i = 0; i < sides; ++i) {
        const double angle = 2 * M_PI * i / sides;
        text +=
            "v " + std::to_string(std::cos(angle)) + " " + std::to_string(std::sin(angle)) + " 0\n";
    }
    for (int i = 0; i < sides; ++i)
        text += "f 1 " + std::to_string(i + 2) + " " + std::to_string((i + 1) % sides + 2) + "\n";
    set(Settings::n_computeNormalsAngle, 180.0f);
    ASSERT_TRUE(load("cone.obj", text));
    const vector<normal> found = normals();
    ASSERT_EQ(found.size(), 3u * sides);
    for (u32 face = 0; face < sides; ++face) {
        EXPECT_NEAR(found[3 * face].z, 1, 1e-4);
        // The slope of the sides is 45 degrees.
        EXPECT_NEAR(found[3 * face + 1].z, std::sqrt(0.5), 1e-4);
    }
}

TEST_F(Normals, OfTheFileGetUnitLengthAndADirection) {
    LogCapture log;
    const base::string path =
        write("normals.obj", "v 0 0 0\nv 1 0 0\nv 0 1 0\nvn 0 0 0\nvn 0 3 4\nvn 0 -1e-20 0\n"
                             "f 1//1 2//2 3//3\n");
    ASSERT_TRUE(loadPath(path));
    ASSERT_EQ(normals().size(), 3u);
    expectNear(normals()[0], {0, 0, 1}); // the face's
    expectNear(normals()[1], {0, 0.6f, 0.8f});
    expectNear(normals()[2], {0, -1, 0});
    EXPECT_TRUE(log.has(base::logWarning, "assimp |" + path +
                                              "| Found 1 normals without a direction, those of "
                                              "the faces are taken!"));
    set(Settings::n_flipNormals, true);
    ASSERT_TRUE(loadPath(path));
    expectNear(normals()[0], {0, 0, -1});
    expectNear(normals()[2], {0, -0.6f, -0.8f}); // the corners come in the other order
}

/// A square in the XY plane, counter-clockwise from the origin, with the texture coordinates
/// (a x + b y, c x + d y).
std::string square(int a, int b, int c, int d) {
    std::string text = "v 0 0 0\nv 1 0 0\nv 1 1 0\nv 0 1 0\n";
    const int corners[4][2] = {{0, 0}, {1, 0}, {1, 1}, {0, 1}};
    for (const auto& [x, y] : corners)
        text += "vt " + std::to_string(a * x + b * y) + " " + std::to_string(c * x + d * y) + "\n";
    return text + "f 1/1 2/2 3/3 4/4\n";
}

TEST_F(Normals, TangentsFollowTheTexture) {
    set(Settings::n_importTangents, Presence::always);
    const struct {
        int a, b, c, d;
        vec4f tangent;
    } cases[] = {{1, 0, 0, 1, {1, 0, 0, 1}},
                 {-1, 0, 0, 1, {-1, 0, 0, -1}},
                 {0, 1, -1, 0, {0, 1, 0, 1}},
                 {1, 0, 0, -1, {1, 0, 0, -1}}, // Along u where v stays, which is not across v.
                 {3, 0, 1, 2, {0.894427f, -0.447214f, 0, 1}}};
    for (const auto& c : cases) {
        ASSERT_TRUE(load("square.obj", square(c.a, c.b, c.c, c.d)));
        ASSERT_EQ(tangents().size(), 4u);
        for (const vec4f& t : tangents()) {
            expectNear({t.x, t.y, t.z}, {c.tangent.x, c.tangent.y, c.tangent.z});
            EXPECT_EQ(t.w, c.tangent.w);
        }
    }
    // No direction in texture space: any at right angles to the normal.
    ASSERT_TRUE(load("square.obj", square(0, 0, 0, 0)));
    ASSERT_EQ(tangents().size(), 4u);
    EXPECT_NEAR(std::hypot(tangents()[0].x, tangents()[0].y), 1, 1e-6);

    set(Settings::n_importTangents, Presence::present);
    ASSERT_TRUE(load("square.obj", square(1, 0, 0, 1)));
    EXPECT_TRUE(tangents().empty());
}

TEST_F(Normals, TangentsOfTheFileGetTheSideOfTheBitangents) {
    test_support::FbxText fbx;
    fbx.layers = fbx.layer("Normal", "Normals", 0, "", "0,0,1,0,0,1,0,0,1,0,0,1") +
                 fbx.layer("Tangent", "Tangents", 1, "", "1,0,0,0,2,0,0,0,0,1,0,0") +
                 fbx.layer("Binormal", "Binormals", 2, "", "0,1,0,1,0,0,0,1,0,0,-1,0");
    const base::string path = write("tangents.fbx", fbx.text());
    LogCapture log;
    ASSERT_TRUE(loadPath(path));
    const vector<vec4f> found = tangents();
    ASSERT_EQ(found.size(), 4u);
    EXPECT_EQ(found[0], (vec4f{1, 0, 0, 1}));
    EXPECT_EQ(found[1], (vec4f{0, 1, 0, -1}));
    EXPECT_EQ(found[3], (vec4f{1, 0, 0, -1}));
    EXPECT_EQ(found[2].z, 0);
    EXPECT_TRUE(log.has(base::logWarning, "assimp |" + path +
                                              "| Found 1 tangents without a direction, any are "
                                              "taken!"));
    EXPECT_EQ(cornersOf(mesh(), mesh_schema::n_bitangents, mesh_schema::n_tangentIndices)[3],
              (normal{0, -1, 0}));

    // The other way round the normals change sides, the texture does not.
    set(Settings::n_flipNormals, true);
    ASSERT_TRUE(loadPath(path));
    EXPECT_EQ(tangents()[0], (vec4f{1, 0, 0, -1}));

    set(Settings::n_importTangents, Presence::never);
    ASSERT_TRUE(loadPath(path));
    EXPECT_TRUE(tangents().empty());
    EXPECT_FALSE(find(mesh(), mesh_schema::n_bitangents));
}

} // namespace
