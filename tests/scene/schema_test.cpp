#include "scene_schema.h"

#include "log_capture.h"
#include "scene.h"
#include "scene_options.h"

#include "b_exception.h"

#include <gtest/gtest.h>

#include <numbers>

namespace {

using namespace scene;
using namespace base;
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
    EXPECT_TRUE(read(map, node_schema::n_visible));
    EXPECT_EQ(read(map, node_schema::n_rotate), (base::quatf{0, 0, 0, 1}));
    EXPECT_EQ(read(map, node_schema::n_scale), (vec3f{1, 1, 1}));
    EXPECT_TRUE(read(map, geometry_schema::n_bounds).isEmpty());
    EXPECT_EQ(read(map, camera_schema::n_sensor), (vec2f{36, 24}));
    EXPECT_EQ(read(map, bufferAdapter_schema::n_inputLength), 4294967295u);
    EXPECT_EQ(find(map, node_schema::n_children), nullptr);
    EXPECT_EQ(findObject(map, scene_schema::n_root), nullptr);

    EXPECT_EQ(object->size(), 0u) << "reading stores nothing";
    EXPECT_TRUE(log.entries().empty());
}

template <class T>
bool isA(base::PluginFactory& factory, base::name_id type) {
    const auto object = factory.create(type, base::createLoose);
    return dynamic_cast<T*>(object.get()) != nullptr;
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
    ASSERT_NE(mesh->queryInterface(bounded), nullptr);
    write(*mesh, mesh_schema::n_positions) = {{1, 5, -1}, {3, 4, 0}};
    EXPECT_EQ(findInterface<IBounded>(*mesh)->getBounds(), (base::box3f{{1, 4, -1}, {3, 5, 0}}));
    EXPECT_EQ(mesh->queryInterface(hierarchical), nullptr);
    EXPECT_EQ(light->queryInterface(bounded), nullptr);
    EXPECT_EQ(node->queryInterface(base::nameServer().id("INothing")), nullptr);
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
