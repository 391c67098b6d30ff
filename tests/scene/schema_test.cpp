#include "scene_schema.h"

#include "log_capture.h"
#include "scene.h"
#include "scene_options.h"

#include "b_exception.h"

#include <gtest/gtest.h>

#include <numbers>
#include <sstream>

namespace {

using namespace scene;
using base::string;
using base::vec2f;
using base::vec3f;
using test_support::LogCapture;

class Schema : public testing::Test {
protected:
    static void SetUpTestSuite() {
        base::PluginFactory factory;
        register_scene_schema(factory);
        register_viewport_schema(factory);
        register_importer_schema();
        register_exporter_schema();
    }
    base::PluginFactory factory_{"schema"};
};

struct Listed {
    string type;
    std::span<SchemaName* const> names;
};

base::vector<Listed> allSchemas() {
    base::vector<Listed> all;
#define LIST(type) all.push_back({#type, type##_schema::names()});
    SCENE_SCHEMAS(LIST)
    SCENE_VIEWPORT_SCHEMAS(LIST)
    LIST(sceneImporter)
    LIST(sceneExporter)
#undef LIST
    return all;
}

TEST_F(Schema, EveryTypeHasItsAttributes) {
    // Counted by hand in the description of the scene model.
    std::istringstream text(
        "scene 20 node 32 instancer 5 sceneReference 2 metadata 4 workflow 0 scriptOutput 0 "
        "historyEvent 0 renderOutput 4 outputJob 0 compositingChannel 0 buffer 3 bufferAdapter 10 "
        "geometry 32 geometryLOD 2 subdividable 9 mesh 27 meshPrimitive 12 meshUVSet 6 "
        "meshColorSet 6 meshJointsSet 6 meshBindPoseSet 2 lines 7 points 3 hair 10 fur 13 skin 5 "
        "morph 7 morphTarget 2 sphere 0 quad 0 disk 0 cube 0 material 7 principalMaterial 41 "
        "hairMaterial 6 customMaterial 2 toonMaterial 27 texture 20 bitmapTexture 9 fileTexture 3 "
        "embeddedTexture 7 randomTexture 7 noiseTexture 8 vertColorTexture 2 cellularTexture 4 "
        "checkerTexture 2 curvatureTexture 7 cubistTexture 4 dotsTexture 6 mixTexture 5 light 30 "
        "lightGroup 5 camera 20 stereoCamera 3 environment 27 clipPlane 10 keyframeChannel 3 "
        "keyframeChannelCurve 9 animClip 4 animLayer 5 animLayerAction 3 viewport 1 "
        "popupWindow 1 viewportWindow 1 sceneExporter 16 sceneImporter 33");
    base::map<string, std::size_t> counts;
    for (string type; text >> type;)
        text >> counts[type];
    const base::vector<Listed> schemas = allSchemas();
    EXPECT_EQ(schemas.size(), counts.size());
    for (const Listed& schema : schemas) {
        const auto expected = counts.find(schema.type);
        ASSERT_NE(expected, counts.end()) << schema.type;
        EXPECT_EQ(schema.names.size(), expected->second + 1) << schema.type;
    }
}

TEST_F(Schema, NamesAreInternedAndUniqueInTheirSchema) {
    for (const Listed& schema : allSchemas()) {
        ASSERT_EQ(schema.names[0]->text, schema.type);
        base::set<base::name_id> seen;
        for (const SchemaName* name : schema.names) {
            EXPECT_EQ(name->id, base::nameServer().find(name->text)) << name->text;
            EXPECT_FALSE(name->id.isEmpty()) << name->text;
        }
        for (const SchemaName* name : schema.names.subspan(1))
            EXPECT_TRUE(seen.insert(name->id).second) << schema.type << ' ' << name->text;
    }
}

TEST_F(Schema, AbsentAttributesMeanTheDefault) {
    register_scene_schema(factory_);
    const base::ref<base::IPlugin> object = factory_.create(node_schema::n_kind);
    const base::AttribMap& map = *object;
    const LogCapture log;

    EXPECT_EQ(read(map, scene_schema::n_framesPerSecond), 30u);
    EXPECT_EQ(read(map, scene_schema::n_playSpeed), 100);
    EXPECT_EQ(read(map, scene_schema::n_upAxis), 1);
    EXPECT_EQ(read(map, scene_schema::n_consoleVerbosity), 4);
    EXPECT_EQ(read(map, scene_schema::n_logVerbosity), 3);
    EXPECT_TRUE(read(map, node_schema::n_visible));
    EXPECT_FALSE(read(map, node_schema::n_isJoint));
    EXPECT_EQ(read(map, node_schema::n_rotateMode), 2);
    EXPECT_EQ(read(map, node_schema::n_rotate), (base::quatf{0, 0, 0, 1}));
    EXPECT_EQ(read(map, node_schema::n_rotateAxisAngle), (base::vec4f{0, 1, 0, 0}));
    EXPECT_EQ(read(map, node_schema::n_scale), (vec3f{1, 1, 1}));
    EXPECT_EQ(read(map, node_schema::n_distance), 10.0);
    EXPECT_EQ(read(map, node_schema::n_color), (vec3f{1, 0, 0}));
    EXPECT_TRUE(read(map, geometry_schema::n_bounds).isEmpty());
    EXPECT_FALSE(read(map, geometry_schema::n_receiveGlossyOcclusion));
    EXPECT_TRUE(read(map, geometry_schema::n_lightShadows));
    EXPECT_EQ(read(map, geometry_schema::n_multiplyNormals), (vec3f{1, 1, 1}));
    EXPECT_EQ(read(map, subdividable_schema::n_tessellation), 2);
    EXPECT_EQ(read(map, mesh_schema::n_computeNormalsAngle), 60.0f);
    EXPECT_EQ(read(map, hair_schema::n_tessellation), 1);
    EXPECT_EQ(read(map, fur_schema::n_knots), 6);
    EXPECT_EQ(read(map, fur_schema::n_curlRadius), 0.1f);
    EXPECT_EQ(read(map, morph_schema::n_targetsWeight), 1.0f);
    EXPECT_EQ(read(map, morphTarget_schema::n_weight), 0.0f);
    EXPECT_EQ(read(map, principalMaterial_schema::n_color), (vec3f{0.8f, 0.8f, 0.8f}));
    EXPECT_EQ(read(map, principalMaterial_schema::n_reflectivity), 0.2f);
    EXPECT_EQ(read(map, principalMaterial_schema::n_flakesContrast), 10.0f);
    EXPECT_EQ(read(map, principalMaterial_schema::n_scatterAmount), 0.7f);
    EXPECT_EQ(read(map, hairMaterial_schema::n_scalesAngle), 2.5f);
    EXPECT_EQ(read(map, toonMaterial_schema::n_shadowColor), (vec3f{0.12f, 0.02f, 0.02f}));
    EXPECT_EQ(read(map, toonMaterial_schema::n_rimSmooth), 0.01f);
    EXPECT_EQ(read(map, bitmapTexture_schema::n_gamma), 2.2f);
    EXPECT_EQ(read(map, fileTexture_schema::n_framesPerSecond), (base::rational{0, 0}));
    EXPECT_EQ(read(map, embeddedTexture_schema::n_depth), 1u);
    EXPECT_EQ(read(map, noiseTexture_schema::n_amplitudeRatio), 0.8f);
    EXPECT_EQ(read(map, cubistTexture_schema::n_minimum), -2.0f);
    EXPECT_EQ(read(map, curvatureTexture_schema::n_concaveColor), (vec3f{0, 0, 1}));
    EXPECT_EQ(read(map, light_schema::n_spotConeAngle), 90.0f);
    EXPECT_EQ(read(map, light_schema::n_size), 0.1f);
    EXPECT_EQ(read(map, light_schema::n_shadowBlendMode), 3);
    EXPECT_EQ(read(map, camera_schema::n_sensor), (vec2f{36, 24}));
    EXPECT_EQ(read(map, camera_schema::n_shutter), (vec2f{0, 0.5f}));
    EXPECT_EQ(read(map, camera_schema::n_cubemapType), 2);
    EXPECT_EQ(read(map, clipPlane_schema::n_normal), (vec3f{0, 1, 0}));
    EXPECT_EQ(read(map, bufferAdapter_schema::n_inputLength), 4294967295u);
    EXPECT_EQ(read(map, keyframeChannelCurve_schema::n_interpolation), 1);
    EXPECT_EQ(read(map, keyframeChannelCurve_schema::n_tightness), 0.5f);
    EXPECT_EQ(read(map, animLayerAction_schema::n_playSpeed), 100);
    EXPECT_EQ(read(map, sceneReference_schema::n_mode), 2);
    EXPECT_EQ(read(map, metadata_schema::n_rating), 255);
    EXPECT_EQ(read(map, renderOutput_schema::n_jpgQuality), 95);
    EXPECT_EQ(find(map, node_schema::n_children), nullptr);
    EXPECT_EQ(findObject(map, scene_schema::n_root), nullptr);

    EXPECT_EQ(object->size(), 0u) << "reading stores nothing";
    EXPECT_TRUE(log.entries().empty());
}

TEST_F(Schema, RegistersOneDescriptionPerType) {
    std::istringstream text(
        "scene light bufferAdapter buffer texture randomTexture noiseTexture vertColorTexture "
        "cellularTexture checkerTexture embeddedTexture curvatureTexture fileTexture cubistTexture "
        "dotsTexture mixTexture principalMaterial hairMaterial toonMaterial lightGroup node "
        "keyframeChannel animLayer instancer animClip lines points hair fur mesh skin morph "
        "environment camera clipPlane renderOutput sceneReference metadata");
    base::vector<string> types;
    for (string type; text >> type;)
        types.push_back(type);
    register_scene_schema(factory_);
    EXPECT_EQ(factory_.descs().size(), types.size());
    register_viewport_schema(factory_);
    EXPECT_EQ(factory_.descs().size(), types.size() + 3);
    register_scene_schema(factory_);
    EXPECT_EQ(factory_.descs().size(), types.size() + 3) << "twice is harmless";

    base::u32 id = 0;
    for (const string& type : std::as_const(types)) {
        SCOPED_TRACE(type);
        const auto object = factory_.create(base::nameServer().id(type), base::createNoDummy);
        ASSERT_TRUE(object);
        EXPECT_EQ(object->typeName().view(), type);
        EXPECT_EQ(object->id(), id++);
        EXPECT_EQ(object->pluginFactory(), &factory_);
        EXPECT_EQ(object->desc()->version, 1);
        EXPECT_EQ(object->desc()->author, "");
        EXPECT_EQ(object->size(), 0u);
    }
    for (const char* base : {"geometry", "subdividable", "material", "bitmapTexture", "meshUVSet"})
        EXPECT_FALSE(factory_.hasDesc(base::nameServer().id(base))) << base;
}

template <class T>
bool isA(base::PluginFactory& factory, base::name_id type) {
    const auto object = factory.create(type, base::createLoose);
    return dynamic_cast<T*>(object.get()) != nullptr;
}

TEST_F(Schema, ClassesDeriveAsTheModelSays) {
    register_scene_schema(factory_);
    for (const SchemaName& type : {mesh_schema::n_kind, skin_schema::n_kind, morph_schema::n_kind})
        EXPECT_TRUE(isA<ISubdividable>(factory_, type)) << type.text;
    for (const SchemaName& type : {lines_schema::n_kind, points_schema::n_kind, hair_schema::n_kind,
                                   fur_schema::n_kind, mesh_schema::n_kind})
        EXPECT_TRUE(isA<IGeometry>(factory_, type)) << type.text;
    EXPECT_FALSE(isA<ISubdividable>(factory_, lines_schema::n_kind));
    EXPECT_FALSE(isA<IGeometry>(factory_, instancer_schema::n_kind));
    EXPECT_TRUE(isA<IMaterial>(factory_, toonMaterial_schema::n_kind));
    for (const SchemaName& type : {fileTexture_schema::n_kind, embeddedTexture_schema::n_kind})
        EXPECT_TRUE(isA<IBitmapTexture>(factory_, type)) << type.text;
    EXPECT_TRUE(isA<ITexture>(factory_, mixTexture_schema::n_kind));
    EXPECT_FALSE(isA<IBitmapTexture>(factory_, mixTexture_schema::n_kind));
    EXPECT_TRUE(isA<base::PluginCallback>(factory_, bufferAdapter_schema::n_kind));
}

TEST_F(Schema, ObjectsAnswerForTheirInterfaces) {
    register_scene_schema(factory_);
    const auto node = factory_.create(node_schema::n_kind);
    const auto mesh = factory_.create(mesh_schema::n_kind);
    const auto light = factory_.create(light_schema::n_kind);
    const base::name_id bounded = base::nameServer().id("IBounded");
    const base::name_id hierarchical = base::nameServer().id("IHierarchical");

    for (const base::name_id name : {bounded, hierarchical}) {
        base::IPluginInterface* found = node->queryInterface(name);
        ASSERT_NE(found, nullptr);
        EXPECT_EQ(found->name(), name);
        EXPECT_EQ(found->plugin(), node.get());
    }
    EXPECT_EQ(mesh->queryInterface(bounded), findInterface<IBounded>(*mesh));
    EXPECT_EQ(mesh->queryInterface(hierarchical), nullptr);
    EXPECT_EQ(light->queryInterface(bounded), nullptr);
    EXPECT_EQ(node->queryInterface(base::nameServer().id("INothing")), nullptr);
}

TEST_F(Schema, BoundsAreTheStoredBoxOrThatOfThePoints) {
    register_scene_schema(factory_);
    const auto mesh = factory_.create(mesh_schema::n_kind);
    const auto& bounded = *findInterface<IBounded>(*mesh);
    EXPECT_TRUE(bounded.getBounds().isEmpty());
    write(*mesh, mesh_schema::n_positions) = {{1, 5, -1}, {3, 4, 0}};
    EXPECT_EQ(bounded.getBounds(), (base::box3f{{1, 4, -1}, {3, 5, 0}}));
    write(*mesh, geometry_schema::n_bounds) = {{-9, -9, -9}, {9, 9, 9}};
    EXPECT_EQ(bounded.getBounds(), (base::box3f{{-9, -9, -9}, {9, 9, 9}}));
}

TEST_F(Schema, ProgramsMayReplaceAClass) {
    class MyNode final : public INode {
    public:
        using INode::INode;
    };
    register_scene_schema(factory_);
    const ObjectCreator<INode> original = objectCreator<INode>;
    objectCreator<INode> = [](base::ref<base::IPluginDesc> desc, base::PluginFactory* factory,
                              base::u32 id) -> INode* { return new MyNode(desc, factory, id); };
    EXPECT_TRUE(isA<MyNode>(factory_, node_schema::n_kind));
    objectCreator<INode> = original;
    EXPECT_FALSE(isA<MyNode>(factory_, node_schema::n_kind));
}

TEST(FieldOfView, OfAFullFrameCamera) {
    // As printed for a 50 mm lens on 36 x 24 mm: 39.6 across, 27.0 down, 46.8 corner to corner.
    const struct {
        base::u8 fit;
        float aspect, degrees;
    } cases[] = {{0, 1.5f, 27.0f}, {0, 1, 27.0f},    {0, 0.5f, 39.6f},
                 {1, 0.5f, 39.6f}, {2, 0.5f, 27.0f}, {3, 1, 46.8f}};
    for (const auto& c : cases)
        EXPECT_NEAR(getFieldOfView(36, 24, 50, c.fit, c.aspect) * 180 / std::numbers::pi, c.degrees,
                    0.05)
            << int(c.fit) << ' ' << c.aspect;
    EXPECT_THROW(getFieldOfView(36, 24, 50, 4, 1), base::switch_exception);
}

} // namespace
