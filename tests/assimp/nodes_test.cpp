#include "fbx_text.h"
#include "import_fixture.h"

namespace {

using namespace scene;
using namespace test_support;
using namespace base;

vec3d transformed(const mat43& m, const vec3d& p) {
    const auto row = [&](const vec3f& r) { return r.x * p.x + r.y * p.y + r.z * p.z; };
    return {row(m.m.r0) + m.t.x, row(m.m.r1) + m.t.y, row(m.m.r2) + m.t.z};
}

void expectNear(const vec3d& found, const vec3d& wanted, double tolerance = 1e-6) {
    EXPECT_NEAR(found.x, wanted.x, tolerance);
    EXPECT_NEAR(found.y, wanted.y, tolerance);
    EXPECT_NEAR(found.z, wanted.z, tolerance);
}

mat43 transformOf(base::IPlugin& node) {
    mat43 transform;
    dynamic_cast<INode&>(node).getTransform(transform);
    return transform;
}

class Nodes : public Import {
protected:
    base::IPlugin& root() { return *findObject(only(scene_schema::n_kind), scene_schema::n_root); }

    /// The tree as text: name, then the children in brackets, with "*" for a mesh.
    base::string outline(const base::IPlugin& object) {
        if (object.typeName() == mesh_schema::n_kind)
            return "*";
        base::string text = object.getName();
        if (const auto* children = find(object, node_schema::n_children)) {
            text += "(";
            for (const auto& child : *children) {
                if (text.back() != '(')
                    text += ' ';
                text += outline(*child);
            }
            text += ")";
        }
        return text;
    }
};

const char* const collada = R"(<?xml version="1.0" encoding="utf-8"?>
<COLLADA xmlns="http://www.collada.org/2005/11/COLLADASchema" version="1.4.1">
<asset><unit name="inch" meter="0.0254"/><up_axis>Z_UP</up_axis></asset>
<library_geometries><geometry id="g1" name="Plate"><mesh>
<source id="p"><float_array id="pa" count="12">0 0 0 1 0 0 1 1 0 0 1 0</float_array>
<technique_common><accessor source="#pa" count="4" stride="3"><param name="X" type="float"/>
<param name="Y" type="float"/><param name="Z" type="float"/></accessor></technique_common></source>
<vertices id="v"><input semantic="POSITION" source="#p"/></vertices>
<polylist count="1"><input semantic="VERTEX" source="#v" offset="0"/><vcount>4</vcount>
<p>0 1 2 3</p></polylist></mesh></geometry></library_geometries>
<library_visual_scenes><visual_scene id="s" name="Größe">
<node id="n1" name="left plate">
<matrix>-2 0 0 1  0 3 0 2  0 0 4 3  0 0 0 1</matrix><instance_geometry url="#g1"/>
<node id="n3" name="inner"/></node>
<node id="n2"><rotate>0 0 1 90</rotate><scale>2 1 1</scale><instance_geometry url="#g1"/></node>
<node/>
</visual_scene></library_visual_scenes>
<scene><instance_visual_scene url="#s"/></scene></COLLADA>
)";

TEST_F(Nodes, TreeNamesAndSharedMeshes) {
    ASSERT_TRUE(load("plates.dae", collada));
    // A node without a name is called by its id, one without either not at all.
    EXPECT_EQ(outline(root()), "Größe(left plate(* inner) n2(*) )");
    EXPECT_EQ(objects(mesh_schema::n_kind).size(), 1u);
    EXPECT_EQ(mesh().getName(), "Plate");
    EXPECT_EQ(only(scene_schema::n_kind).getName(), "plates");

    // The unit of the file is in the root and its axis in the scene, and nowhere else.
    expectNear(transformed(transformOf(root()), {1, 2, 3}), {0.0254, 2 * 0.0254, 3 * 0.0254});
    EXPECT_EQ(read(only(scene_schema::n_kind), scene_schema::n_upAxis), 2);

    // A mirrored node as the file has it, without a rotation.
    const auto nodes = objects(node_schema::n_kind);
    EXPECT_EQ(read(*nodes[1], node_schema::n_scale), (vec3f{-2, 3, 4}));
    EXPECT_EQ(read(*nodes[1], node_schema::n_translate), (vec3d{1, 2, 3}));
    EXPECT_FALSE(nodes[1]->findAttribute(node_schema::n_rotate));
    expectNear(transformed(transformOf(*nodes[3]), {1, 1, 0}), {-1, 2, 0});
}

/// What an exporter does with the root of a scene whose up axis is not Y.
vec3d turnedUp(base::u8 upAxis, const vec3d& p) {
    return upAxis == 0 ? vec3d{-p.y, p.x, p.z} : upAxis == 2 ? vec3d{p.x, p.z, -p.y} : p;
}

TEST_F(Nodes, FbxUnitAndAxesAreInTheSceneOnce) {
    const struct {
        FbxText fbx;
        double metres;
        base::u8 upAxis;
    } cases[] = {{{1, 1, 2, 1, 0, 1, "1", "", ""}, 0.01, 1},
                 {{1, 1, 2, 1, 0, 1, "100", "", ""}, 1, 1},
                 {{2, 1, 1, -1, 0, 1, "2.54", "", ""}, 0.0254, 2},
                 {{0, 1, 2, 1, 1, -1, "1", "", ""}, 0.01, 0},
                 {{2, 1, 0, 1, 1, 1, "1", "", ""}, 0.01, 1},
                 {{1, -1, 2, 1, 0, -1, "1", "", ""}, 0.01, 1},
                 {{2, 1, 1, 1, 0, 1, "100", "", ""}, 1, 1}};
    for (const auto& c : cases) {
        SCOPED_TRACE(&c - cases);
        ASSERT_TRUE(load("axes.fbx", c.fbx.text()));
        const base::u8 upAxis = read(only(scene_schema::n_kind), scene_schema::n_upAxis);
        EXPECT_EQ(upAxis, c.upAxis);
        const auto along = [&](int axis, int sign) {
            double v[3] = {};
            v[axis] = sign;
            return turnedUp(upAxis, transformed(transformOf(root()), {v[0], v[1], v[2]}));
        };
        expectNear(along(c.fbx.right, c.fbx.rightSign), {c.metres, 0, 0});
        expectNear(along(c.fbx.up, c.fbx.upSign), {0, c.metres, 0});
        expectNear(along(c.fbx.front, c.fbx.frontSign), {0, 0, c.metres});
    }
}

TEST_F(Nodes, FbxPivotsAreOneNode) {
    FbxText fbx;
    fbx.properties = "P: \"RotationActive\", \"bool\", \"\", \"\",1\n" +
                     fbx.vectorProperty("Lcl Translation", "1,2,3") +
                     fbx.vectorProperty("RotationPivot", "5,0,0") +
                     fbx.vectorProperty("Lcl Rotation", "0,0,90");
    ASSERT_TRUE(load("pivot.fbx", fbx.text()));
    EXPECT_EQ(outline(root()), "RootNode(panel(* child))");
    base::IPlugin& panel = *objects(node_schema::n_kind)[1];
    // The pivot stays in its place but for the translation, all else turns around it.
    expectNear(transformed(transformOf(panel), {5, 0, 0}), {6, 2, 3});
    expectNear(transformed(transformOf(panel), {6, 0, 0}), {6, 3, 3});
}

TEST_F(Nodes, FbxGeometryTransformsDoNotReachTheChildren) {
    FbxText fbx;
    fbx.hasTwins = true;
    fbx.properties = fbx.vectorProperty("GeometricTranslation", "1,2,3");
    ASSERT_TRUE(load("geometric.fbx", fbx.text()));
    EXPECT_EQ(outline(root()), "RootNode(panel(* child twin))");
    const auto nodes = objects(node_schema::n_kind);
    expectNear(transformed(transformOf(*nodes[1]), {0, 0, 0}), {1, 2, 3});
    for (std::size_t i : {2, 3})
        expectNear(transformed(transformOf(*nodes[i]), {0, 0, 0}), {-1, -2, -3});
}

TEST_F(Nodes, DeepTreesNeedNoStack) {
    constexpr int depth = 20000;
    std::string text = "xof 0303txt 0032\n";
    for (int i = 0; i < depth; ++i)
        text += "Frame f" + std::to_string(i) + " {\n";
    text += "Mesh { 3; 0;0;0;, 1;0;0;, 0;1;0;; 1; 3;0,1,2;; }\n";
    for (int i = 0; i < depth; ++i)
        text += "}\n";
    ASSERT_TRUE(load("deep.x", text));
    EXPECT_GE(objects(node_schema::n_kind).size(), std::size_t(depth));
    EXPECT_EQ(objects(mesh_schema::n_kind).size(), 1u);
}

} // namespace
