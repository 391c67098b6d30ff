#include "fbx_text.h"
#include "import_fixture.h"

#include "scene_mesh.h"

namespace {

using namespace scene;
using namespace test_support;
using namespace base;

class Geometry : public Import {
protected:
    vector<vec3f> positions() { return valuesOf(mesh(), mesh_schema::n_positions); }
    vector<u16> vcounts() {
        const base::AttribMap* primitive = findListItem(mesh(), mesh_schema::n_primitives, 0);
        return primitive ? valuesOf(*primitive, meshPrimitive_schema::n_vcounts) : vector<u16>();
    }
    base::AttribMap& item(const SchemaAttribute<Items>& list, u32 index = 0) {
        base::AttribMap* found = findListItem(mesh(), list, index);
        EXPECT_TRUE(found);
        return found ? *found : *nothing_;
    }
};

const char* const cube = "v 0 0 0\nv 1 0 0\nv 1 1 0\nv 0 1 0\nv 0 0 1\nv 1 0 1\nv 1 1 1\nv 0 1 1\n"
                         "vn 0 0 -1\nvn 0 0 1\nvn 0 -1 0\nvn 1 0 0\nvn 0 1 0\nvn -1 0 0\n"
                         "f 1//1 4//1 3//1 2//1\nf 5//2 6//2 7//2 8//2\nf 1//3 2//3 6//3 5//3\n"
                         "f 2//4 3//4 7//4 6//4\nf 3//5 4//5 8//5 7//5\nf 4//6 1//6 5//6 8//6\n";

TEST_F(Geometry, EachArrayIsWelded) {
    ASSERT_TRUE(load("cube.obj", cube));
    // Numbered by first appearance along the faces.
    EXPECT_EQ(positions().size(), 8u);
    EXPECT_EQ(
        valuesOf(mesh(), mesh_schema::n_positionIndices),
        (vector<u32>{0, 1, 2, 3, 4, 5, 6, 7, 0, 3, 5, 4, 3, 2, 6, 5, 2, 1, 7, 6, 1, 0, 4, 7}));
    EXPECT_EQ(valuesOf(mesh(), mesh_schema::n_normals).size(), 6u);
    EXPECT_EQ(
        valuesOf(mesh(), mesh_schema::n_normalIndices),
        (vector<u32>{0, 0, 0, 0, 1, 1, 1, 1, 2, 2, 2, 2, 3, 3, 3, 3, 4, 4, 4, 4, 5, 5, 5, 5}));
    EXPECT_FALSE(find(mesh(), mesh_schema::n_indices));
    EXPECT_EQ(vcounts(), vector<u16>{4});

    // Positions alone need no indices of their own.
    set(Settings::n_importNormals, Presence::never);
    ASSERT_TRUE(load("cube.obj", cube));
    EXPECT_EQ(positions().size(), 8u);
    EXPECT_EQ(valuesOf(mesh(), mesh_schema::n_indices).size(), 24u);
    EXPECT_FALSE(find(mesh(), mesh_schema::n_positionIndices));
    EXPECT_FALSE(find(mesh(), mesh_schema::n_normals));

    set(Settings::n_importNormals, Presence::always);
    set(Settings::n_importMultiIndex, Presence::never);
    ASSERT_TRUE(load("cube.obj", cube));
    EXPECT_EQ(positions().size(), 24u);
    EXPECT_EQ(valuesOf(mesh(), mesh_schema::n_normals).size(), 24u);
    EXPECT_EQ(valuesOf(mesh(), mesh_schema::n_indices).size(), 24u);
}

const char* const mixedPolygons =
    "v 0 0 0\nv 2 0 0\nv 2 2 0\nv 1 3 0\nv 0 2 0\nv 3 0 0\nv 3 2 0\nv 4 1 0\n"
    "f 1 2 3 4 5\nf 2 6 7 3\nf 7 6 8\n";

TEST_F(Geometry, PolygonsStayAsTheyAreUnlessTriangulated) {
    set(Settings::n_importNormals, Presence::never);
    ASSERT_TRUE(load("mixed.obj", mixedPolygons));
    EXPECT_EQ(vcounts(), (vector<u16>{5, 4, 3}));
    EXPECT_EQ(valuesOf(mesh(), mesh_schema::n_indices),
              (vector<u32>{0, 1, 2, 3, 4, 1, 5, 6, 2, 6, 5, 7}));
    EXPECT_EQ(getPrimitiveType(mesh(), 0, false), primitiveMixedPolygons);

    set(Settings::n_flipNormals, true);
    ASSERT_TRUE(load("mixed.obj", mixedPolygons));
    EXPECT_EQ(valuesOf(mesh(), mesh_schema::n_indices),
              (vector<u32>{0, 1, 2, 3, 4, 4, 3, 5, 6, 5, 7, 6}));

    set(Settings::n_flipNormals, false);
    set(Settings::n_importNormals, Presence::always);
    set(Settings::n_importTriangulateMeshes, true);
    ASSERT_TRUE(load("mixed.obj", mixedPolygons));
    EXPECT_EQ(vcounts(), vector<u16>{3});
    // A pentagon makes three triangles, a quad two. The corners they share are welded again.
    EXPECT_EQ(valuesOf(mesh(), mesh_schema::n_positionIndices).size(), 3u * (3 + 2 + 1));
    EXPECT_EQ(positions().size(), 8u);
    EXPECT_EQ(valuesOf(mesh(), mesh_schema::n_normals), (vector<base::normal>{{0, 0, 1}}));
}

const char* const sharedVertices =
    "ply\nformat ascii 1.0\nelement vertex 5\n"
    "property float x\nproperty float y\nproperty float z\n"
    "property uchar red\nproperty uchar green\nproperty uchar blue\nproperty uchar alpha\n"
    "element face 2\nproperty list uchar int vertex_indices\nend_header\n"
    "0 0 0 255 0 0 255\n9 9 9 0 0 0 0\n1 0 0 0 255 0 255\n0 1 0 0 0 255 255\n"
    "1 1 0 255 255 255 51\n3 0 2 3\n3 2 4 3\n";

TEST_F(Geometry, SharedVerticesKeepTheirNumbering) {
    set(Settings::n_importNormals, Presence::present);
    ASSERT_TRUE(load("shared.ply", sharedVertices));
    EXPECT_EQ(valuesOf(mesh(), mesh_schema::n_indices), (vector<u32>{0, 1, 2, 1, 3, 2}));
    // Without the vertex that no face uses.
    EXPECT_EQ(positions(), (vector<vec3f>{{0, 0, 0}, {1, 0, 0}, {0, 1, 0}, {1, 1, 0}}));
    EXPECT_FALSE(find(mesh(), mesh_schema::n_positionIndices));
    base::AttribMap& colors = item(mesh_schema::n_colorSets);
    EXPECT_EQ(valuesOf(colors, meshColorSet_schema::n_RGB),
              (vector<vec3f>{{1, 0, 0}, {0, 1, 0}, {0, 0, 1}, {1, 1, 1}}));
    EXPECT_EQ(valuesOf(colors, meshColorSet_schema::n_RGBA),
              (vector<vec4f>{{1, 0, 0, 1}, {0, 1, 0, 1}, {0, 0, 1, 1}, {1, 1, 1, 0.2f}}));

    set(Settings::n_importColors, false);
    ASSERT_TRUE(load("shared.ply", sharedVertices));
    EXPECT_EQ(getListCount(mesh(), mesh_schema::n_colorSets), 0u);
}

TEST_F(Geometry, LinesAndPointsBecomeObjectsOfTheirOwn) {
    const char* const text = "o thing\nv 0 0 0\nv 1 0 0\nv 1 1 0\nv 0 1 0\nv 5 5 5\n"
                             "f 1 2 3 4\nl 1 2 3\nl 4 5\np 5 1\n";
    ASSERT_TRUE(load("mixed.obj", text));
    EXPECT_EQ(vcounts(), vector<u16>{4});
    EXPECT_EQ(positions().size(), 4u);
    const base::IPlugin& lines = only(lines_schema::n_kind);
    EXPECT_EQ(valuesOf(lines, lines_schema::n_points),
              (vector<vec3f>{{0, 0, 0}, {1, 0, 0}, {1, 1, 0}, {0, 1, 0}, {5, 5, 5}}));
    EXPECT_EQ(valuesOf(lines, lines_schema::n_linesStart), (vector<u32>{0, 3}));
    EXPECT_EQ(valuesOf(only(points_schema::n_kind), points_schema::n_points),
              (vector<vec3f>{{5, 5, 5}, {0, 0, 0}}));
    for (const base::IPlugin* object : {&std::as_const(mesh()), &lines})
        EXPECT_EQ(object->getName(), "thing");

    const struct {
        base::name_id setting, type;
    } cases[] = {{Settings::n_importMeshes, mesh_schema::n_kind},
                 {Settings::n_importHair, lines_schema::n_kind},
                 {Settings::n_importPoints, points_schema::n_kind}};
    for (const auto& c : cases) {
        set(c.setting, false);
        ASSERT_TRUE(load("mixed.obj", text));
        EXPECT_TRUE(objects(c.type).empty()) << c.setting.text();
        set(c.setting, true);
    }
}

TEST_F(Geometry, PointCloudsAreRead) {
    ASSERT_TRUE(load("cloud.ply", "ply\nformat ascii 1.0\nelement vertex 2\nproperty float x\n"
                                  "property float y\nproperty float z\nend_header\n"
                                  "1 2 3\n4 5 6\n"));
    EXPECT_EQ(valuesOf(only(points_schema::n_kind), points_schema::n_points),
              (vector<vec3f>{{1, 2, 3}, {4, 5, 6}}));
    EXPECT_TRUE(objects(mesh_schema::n_kind).empty());
}

TEST_F(Geometry, TextureCoordinatesKeepTheirDimension) {
    const auto triangle = [](const char* third) {
        return std::string("v 0 0 0\nv 1 0 0\nv 0 1 0\nvt 0 0.25 0\nvt 1 0 0\nvt 0 1 ") + third +
               "\nf 1/1 2/2 3/3\n";
    };
    ASSERT_TRUE(load("deep.obj", triangle("0.5")));
    EXPECT_EQ(valuesOf(item(mesh_schema::n_uvSets), meshUVSet_schema::n_UVW),
              (vector<vec3f>{{0, 0.25f, 0}, {1, 0, 0}, {0, 1, 0.5f}}));
    EXPECT_FALSE(find(item(mesh_schema::n_uvSets), meshUVSet_schema::n_UV));
    // A third coordinate that is always zero means nothing. v counts from the bottom.
    ASSERT_TRUE(load("flat.obj", triangle("0")));
    EXPECT_EQ(valuesOf(item(mesh_schema::n_uvSets), meshUVSet_schema::n_UV),
              (vector<vec2f>{{0, 0.25f}, {1, 0}, {0, 1}}));
    EXPECT_FALSE(find(item(mesh_schema::n_uvSets), meshUVSet_schema::n_UVW));

    set(Settings::n_importTextureCoordinates, false);
    ASSERT_TRUE(load("flat.obj", triangle("0")));
    EXPECT_EQ(getListCount(mesh(), mesh_schema::n_uvSets), 0u);
}

TEST_F(Geometry, TextureSetsKeepNamesAndOrder) {
    test_support::FbxText fbx;
    fbx.layers = fbx.layer("UV", "UV", 0, "base", "0,0,1,0,1,1,0,1") +
                 fbx.layer("UV", "UV", 1, "detail", "5,5,6,5,6,6,5,6");
    ASSERT_TRUE(load("sets.fbx", fbx.text()));
    ASSERT_EQ(getListCount(mesh(), mesh_schema::n_uvSets), 2u);
    const char* const names[] = {"base", "detail"};
    const vec2f first[] = {{0, 0}, {5, 5}};
    for (u32 i = 0; i < 2; ++i) {
        base::AttribMap& set = item(mesh_schema::n_uvSets, i);
        ASSERT_TRUE(find(set, meshUVSet_schema::n_name));
        EXPECT_EQ(*find(set, meshUVSet_schema::n_name), names[i]);
        EXPECT_EQ(valuesOf(set, meshUVSet_schema::n_UV).front(), first[i]);
    }
}

TEST_F(Geometry, FacesWithoutAreaAreLeftOut) {
    set(Settings::n_importNormals, Presence::never);
    LogCapture log;
    // The fourth vertex is the first, with negative zeros.
    const std::string path =
        write("bad.obj", "v 0 0 0\nv 1 0 0\nv 0 1 0\nv -0.0 0 -0.0\nv 1 1 0\n"
                         "f 1 1 1\nf 1 2 3\nf 1 4 2\nf 2 1 2 3\nf 1 2 5 2\nf 3 2 4\n"
                         "f 1 2 2 5 3 4\n");
    ASSERT_TRUE(loadPath(path));
    EXPECT_EQ(vcounts(), (vector<u16>{3, 3, 4}));
    const vec3f a{0, 0, 0}, b{1, 0, 0}, c{0, 1, 0}, d{1, 1, 0};
    EXPECT_EQ(cornersOf(mesh(), mesh_schema::n_positions, mesh_schema::n_indices),
              (vector<vec3f>{a, b, c, c, b, a, a, b, d, c}));
    EXPECT_TRUE(
        log.has(base::logInformation, "assimp |" + path + "| Left out 4 faces without area."));
    // Nothing left: no mesh.
    ASSERT_TRUE(load("none.obj", "v 0 0 0\nv 1 0 0\nf 1 2 1\n"));
    EXPECT_TRUE(objects(mesh_schema::n_kind).empty());
}

TEST_F(Geometry, ValuesThatAreNotFiniteBecomeZero) {
    // One facet of a binary STL: normal and corners, then two bytes. The second x is a NaN, the
    // third y infinite.
    const float nan = std::numeric_limits<float>::quiet_NaN();
    const float inf = std::numeric_limits<float>::infinity();
    const float values[12] = {0, 0, 1, 0, 0, 0, nan, 2, 0, 3, -inf, 1};
    std::string file(80, ' ');
    file += std::string("\1\0\0\0", 4);
    file.append(reinterpret_cast<const char*>(values), sizeof values);
    file += std::string(2, '\0');
    LogCapture log;
    const base::string path = write("broken.stl", file);
    ASSERT_TRUE(loadPath(path));
    EXPECT_EQ(positions(), (vector<vec3f>{{0, 0, 0}, {0, 2, 0}, {3, 0, 1}}));
    EXPECT_TRUE(log.has(base::logWarning, "assimp |" + path +
                                              "| Found 2 vertex values that are no finite "
                                              "numbers, zero is taken!"));
}

} // namespace
