#include "fbx_text.h"
#include "import_fixture.h"

#include "scene_mesh.h"
#include "scene_mesh_index.h"

namespace {

using namespace scene;
using base::u16;
using base::u32;
using base::vec2f;
using base::vec3f;
using base::vec4f;
using base::vector;
using test_support::Import;
using test_support::LogCapture;
using test_support::valuesOf;

class Geometry : public Import {
protected:
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

const char* const cube = R"(
v 0 0 0
v 1 0 0
v 1 1 0
v 0 1 0
v 0 0 1
v 1 0 1
v 1 1 1
v 0 1 1
vn 0 0 -1
vn 0 0 1
vn 0 -1 0
vn 1 0 0
vn 0 1 0
vn -1 0 0
f 1//1 4//1 3//1 2//1
f 5//2 6//2 7//2 8//2
f 1//3 2//3 6//3 5//3
f 2//4 3//4 7//4 6//4
f 3//5 4//5 8//5 7//5
f 4//6 1//6 5//6 8//6
)";

TEST_F(Geometry, CornersAreWeldedByPositionAndThenByValue) {
    ASSERT_TRUE(load("cube.obj", cube));
    // Numbered by first appearance along the faces.
    EXPECT_EQ(valuesOf(mesh(), mesh_schema::n_positions), (vector<vec3f>{{0, 0, 0},
                                                                         {0, 1, 0},
                                                                         {1, 1, 0},
                                                                         {1, 0, 0},
                                                                         {0, 0, 1},
                                                                         {1, 0, 1},
                                                                         {1, 1, 1},
                                                                         {0, 1, 1}}));
    EXPECT_EQ(
        valuesOf(mesh(), mesh_schema::n_positionIndices),
        (vector<u32>{0, 1, 2, 3, 4, 5, 6, 7, 0, 3, 5, 4, 3, 2, 6, 5, 2, 1, 7, 6, 1, 0, 4, 7}));
    EXPECT_EQ(valuesOf(mesh(), mesh_schema::n_normals).size(), 24u);
    EXPECT_FALSE(find(mesh(), mesh_schema::n_indices));
    EXPECT_EQ(vcounts(), vector<u16>{4});
    ASSERT_TRUE(convertToSingleIndex(mesh()));
    EXPECT_EQ(valuesOf(mesh(), mesh_schema::n_positions).size(), 24u);

    // Without data per corner the eight positions are the vertices.
    set(Settings::n_importNormals, Presence::never);
    ASSERT_TRUE(load("cube.obj", cube));
    EXPECT_EQ(valuesOf(mesh(), mesh_schema::n_positions).size(), 8u);
    EXPECT_EQ(valuesOf(mesh(), mesh_schema::n_indices).size(), 24u);
    EXPECT_FALSE(find(mesh(), mesh_schema::n_positionIndices));
    EXPECT_FALSE(find(mesh(), mesh_schema::n_normals));

    set(Settings::n_importNormals, Presence::always);
    set(Settings::n_importMultiIndex, Presence::never);
    ASSERT_TRUE(load("cube.obj", cube));
    EXPECT_EQ(valuesOf(mesh(), mesh_schema::n_positions).size(), 24u);
    EXPECT_EQ(valuesOf(mesh(), mesh_schema::n_indices).size(), 24u);
}

const char* const mixedPolygons = R"(
v 0 0 0
v 2 0 0
v 2 2 0
v 1 3 0
v 0 2 0
v 3 0 0
v 3 2 0
f 1 2 3 4 5
f 2 6 7 3
f 6 2 1
f 6 7 2
)";

TEST_F(Geometry, PolygonsStayAsTheyAreUnlessTriangulated) {
    set(Settings::n_importNormals, Presence::never);
    ASSERT_TRUE(load("mixed.obj", mixedPolygons));
    EXPECT_EQ(vcounts(), (vector<u16>{5, 4, 3, 3}));
    EXPECT_EQ(valuesOf(mesh(), mesh_schema::n_indices),
              (vector<u32>{0, 1, 2, 3, 4, 1, 5, 6, 2, 5, 1, 0, 5, 6, 1}));
    EXPECT_EQ(getPrimitiveType(mesh(), 0, false), primitiveMixedPolygons);

    set(Settings::n_flipNormals, true);
    ASSERT_TRUE(load("mixed.obj", mixedPolygons));
    EXPECT_EQ(valuesOf(mesh(), mesh_schema::n_indices),
              (vector<u32>{0, 1, 2, 3, 4, 4, 3, 5, 6, 6, 0, 4, 6, 4, 5}));

    set(Settings::n_flipNormals, false);
    set(Settings::n_importNormals, Presence::always);
    set(Settings::n_importTriangulateMeshes, true);
    ASSERT_TRUE(load("mixed.obj", mixedPolygons));
    EXPECT_EQ(vcounts(), vector<u16>{3});
    // A pentagon makes three triangles, a quad two. The corners they share are welded again.
    EXPECT_EQ(valuesOf(mesh(), mesh_schema::n_positionIndices).size(), 3u * (3 + 2 + 1 + 1));
    EXPECT_EQ(valuesOf(mesh(), mesh_schema::n_normals).size(), 21u);
    EXPECT_EQ(valuesOf(mesh(), mesh_schema::n_positions).size(), 7u);
}

const char* const sharedVertices = R"(ply
format ascii 1.0
element vertex 5
property float x
property float y
property float z
property uchar red
property uchar green
property uchar blue
property uchar alpha
element face 2
property list uchar int vertex_indices
end_header
0 0 0 255 0 0 255
9 9 9 0 0 0 0
1 0 0 0 255 0 255
0 1 0 0 0 255 255
1 1 0 255 255 255 51
3 0 2 3
3 2 4 3
)";

TEST_F(Geometry, SharedVerticesKeepTheirNumbering) {
    set(Settings::n_importNormals, Presence::present);
    ASSERT_TRUE(load("shared.ply", sharedVertices));
    EXPECT_EQ(valuesOf(mesh(), mesh_schema::n_indices), (vector<u32>{0, 1, 2, 1, 3, 2}));
    // Without the vertex that no face uses.
    EXPECT_EQ(valuesOf(mesh(), mesh_schema::n_positions),
              (vector<vec3f>{{0, 0, 0}, {1, 0, 0}, {0, 1, 0}, {1, 1, 0}}));
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
    const char* const text = R"(
o thing
v 0 0 0
v 1 0 0
v 1 1 0
v 0 1 0
v 5 5 5
f 1 2 3 4
l 1 2 3
l 4 5
p 5 1
)";
    ASSERT_TRUE(load("mixed.obj", text));
    EXPECT_EQ(vcounts(), vector<u16>{4});
    EXPECT_EQ(valuesOf(mesh(), mesh_schema::n_positions).size(), 4u);
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
        EXPECT_EQ(set.typeName(), meshUVSet_schema::n_kind);
    }
}

TEST_F(Geometry, FacesWithoutAreaAreLeftOut) {
    set(Settings::n_importNormals, Presence::never);
    LogCapture log;
    // The fourth vertex is the first, with negative zeros.
    const std::string path = write("bad.obj", R"(
v 0 0 0
v 1 0 0
v 0 1 0
v -0.0 0 -0.0
v 1 1 0
f 1 1 1
f 1 2 3
f 1 4 2
f 2 1 2 3
f 1 2 5 2
f 3 2 4
f 1 2 2 5 3 4
)");
    ASSERT_TRUE(loadPath(path));
    EXPECT_EQ(vcounts(), (vector<u16>{3, 3, 4}));
    EXPECT_EQ(valuesOf(mesh(), mesh_schema::n_indices),
              (vector<u32>{0, 1, 2, 2, 1, 0, 0, 1, 3, 2}));
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
    EXPECT_EQ(valuesOf(mesh(), mesh_schema::n_positions),
              (vector<vec3f>{{0, 0, 0}, {0, 2, 0}, {3, 0, 1}}));
    EXPECT_TRUE(log.has(base::logWarning, "assimp |" + path +
                                              "| Found 2 vertex values that are no finite "
                                              "numbers, zero is taken!"));
}

} // namespace
