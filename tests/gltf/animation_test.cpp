#include "animated_fixture.h"

#include <cmath>

using namespace test_support;
using base::TimeCode;
using base::vec3d;
using base::vec3f;
using scene::INode;
using scene::node_schema;
using scene::scene_schema;

namespace {

size_t nodeNamed(const GltfFile& file, std::string_view name) {
    for (size_t i = 0; i < file.count("nodes"); ++i)
        if (const auto& node = file.element("nodes", i);
            node.HasMember("name") && node["name"].GetString() == name)
            return i;
    throw GltfError("no node of that name");
}

Matrix worldOf(const INode& node) {
    base::mat43 world;
    node.getWorldTransform(world);
    const auto& [r0, r1, r2] = world.m;
    const vec3d& t = world.t;
    return {r0.x, r1.x, r2.x, 0, r0.y, r1.y, r2.y, 0, r0.z, r1.z, r2.z, 0, t.x, t.y, t.z, 1};
}

/// Of the matrices' elements from `first` on.
void expectNear(const Matrix& a, const Matrix& b, size_t first = 0) {
    for (size_t i = first; i < a.size(); ++i)
        EXPECT_NEAR(a[i], b[i], 2e-5) << i;
}

} // namespace

TEST(Baking, SamplesWhatTheSceneShowsAtEachFrame) {
    AnimatedScene scene;
    write(*scene.scene, scene_schema::n_framesPerSecond) = 10;
    INode& outer = scene.addNode(*scene.root, "outer");
    scene.animate<vec3d>(outer, node_schema::n_translate, {0, 2}, {{0, 0, 0}, {4, 2, -1}});
    scene.animate<base::quatf>(outer, node_schema::n_rotate, {0, 1, 2},
                               {{0, 0, 0, 1}, {0, 0.6f, 0, 0.8f}, {1, 0, 0, 0}});
    write(outer, node_schema::n_rotatePivot) = {1, 2, 3};
    INode& inner = scene.addNode(outer, "inner");
    scene
        .animate<vec3f>(inner, node_schema::n_scale, {0, 0.5, 1.5, 2},
                        {{1, 1, 1}, {2, 3, 4}, {-1, 1, 1}, {1, 2, 1}})
        .attribute<base::u8>(scene::keyframeChannelCurve_schema::n_interpolation) = 2;
    // Three negative scales need a rotation with them where one was negative.
    scene.animate<base::quatf>(inner, node_schema::n_rotate, {0}, {{0, 0, 0.6f, 0.8f}});
    INode& free = scene.addNode(inner, "free");
    write(free, node_schema::n_inheritsTransform) = false;
    scene.animate<vec3d>(free, node_schema::n_translate, {0.5, 2}, {{0, 0, 0}, {0, 9, 0}});
    INode& aimed = scene.addNode(*scene.root, "aimed");
    write(aimed, node_schema::n_transformation) = 1;
    scene.animate<vec3d>(aimed, node_schema::n_scale, {0, 2}, {{1, 1, 1}, {2, 2, 2}});
    INode& follower = scene.addNode(*scene.root, "follower");
    follower.attribute(node_schema::n_translate,
                       new base::AttribLink(base::AttribPath(outer, node_schema::n_translate)));

    const GltfFile file = scene.saveAndRead("a.glb");
    ASSERT_TRUE(scene.save(scene.folder / "b.glb"));
    EXPECT_EQ(readText(scene.folder / "a.glb"), readText(scene.folder / "b.glb"));
    EXPECT_TRUE(findFaults(file).empty());
    const auto samples = readSamples(file);
    EXPECT_EQ(samples.size(), 7u);
    EXPECT_EQ(samples.at("free translation").times.size(), 15u);
    const std::vector<double> times = keyTimes(file);
    ASSERT_EQ(times.size(), 20u);
    for (size_t frame = 0; frame < times.size(); ++frame) {
        SCOPED_TRACE(frame);
        const double second = static_cast<double>(frame) / 10;
        EXPECT_NEAR(times[frame], second, 1e-6);
        write(*scene.scene, scene_schema::n_time) = secondsToTime(second);
        scene.layer.changed(base::eventTimeChanged,
                            base::AttribPath(*scene.scene, scene_schema::n_time));
        const GltfPose pose(file, times[frame]);
        for (const INode* node : {&outer, &inner, &aimed, &follower})
            expectNear(pose.worldFromNode(nodeNamed(file, node->getName())), worldOf(*node));
        // This one undoes a shear of its parents, which samples can't hold: only its place counts.
        if (frame >= 5)
            expectNear(pose.worldFromNode(nodeNamed(file, "free")), worldOf(free), 12);
    }
}

TEST(Baking, TakesTheFramesOfOneGrid) {
    const char* const noRate = "3 gltf |scene| The scene has no frames per second, 30 are taken!\n";
    struct Row {
        const char* name;
        base::u32 rate;
        double a[2], b[2]; ///< first and last key of two nodes
        size_t countA, countB;
        double firstB = 0; ///< seconds
        const char* message = "";
    } const rows[] = {
        {"equal ranges", 30, {0, 1}, {0, 1}, 30, 30},
        {"the second half", 30, {0, 1}, {0.5, 1}, 30, 15, 0.5},
        {"a range that does not meet the grid", 4, {0, 1}, {0.3, 0.8}, 4, 2, 0.5},
        {"frames 5 to 12", 24, {5 / 24., 12 / 24.}, {5 / 24., 12 / 24.}, 7, 7, 5 / 24.},
        {"less than a frame", 30, {0, 0.03}, {0, 0.03}, 0, 0},
        {"between two frames", 4, {0, 1}, {0.3, 0.4}, 4, 0},
        {"before zero", 10, {-1, 0}, {-1, 0}, 10, 10, -1},
        {"a length of nothing", 30, {1, 1}, {0, 1}, 0, 30},
        {"no rate", 0, {0, 1}, {0, 1}, 30, 30, 0, noRate}};
    for (const Row& row : rows) {
        SCOPED_TRACE(row.name);
        AnimatedScene scene;
        write(*scene.scene, scene_schema::n_name) = base::string("scene");
        write(*scene.scene, scene_schema::n_framesPerSecond) = row.rate;
        INode &a = scene.addNode(*scene.root, "a"), &b = scene.addNode(*scene.root, "b");
        scene.animate<vec3f>(a, node_schema::n_scale, {row.a[0], row.a[1]}, {{1, 1, 1}, {3, 1, 1}});
        scene.animate<vec3f>(b, node_schema::n_scale, {row.b[0], row.b[1]}, {{1, 1, 1}, {3, 1, 1}});
        const LogCapture log;
        const GltfFile file = scene.saveAndRead();
        EXPECT_EQ(problems(log), row.message);
        auto samples = readSamples(file);
        AnimationChannel &ofA = samples["a scale"], &ofB = samples["b scale"];
        EXPECT_EQ(ofA.times.size(), row.countA);
        EXPECT_EQ(ofB.times.size(), row.countB);
        EXPECT_EQ(ofB.values.count, row.countB);
        EXPECT_EQ(ofA.input == ofB.input, std::ranges::equal(row.a, row.b));
        for (size_t i = 0; i < ofB.times.size() && row.rate != 0; ++i) {
            const double time = row.firstB + static_cast<double>(i) / row.rate;
            EXPECT_NEAR(ofB.times[i], time, 1e-6);
            EXPECT_NEAR(ofB.values.at(i)[0], 1 + 2 * (time - row.b[0]) / (row.b[1] - row.b[0]),
                        1e-5);
        }
        EXPECT_TRUE(findFaults(file).empty());
    }
}

TEST(Baking, LeavesWhatIsNotAnimatedAsItIs) {
    for (const bool exportAnimations : {false, true}) {
        SCOPED_TRACE(exportAnimations);
        AnimatedScene scene;
        scene.set(Exporting::Settings::n_exportAnimations, exportAnimations);
        write(*scene.scene, scene_schema::n_time) = secondsToTime(0.5);
        INode& moving = scene.addNode(*scene.root, "moving");
        scene.animate<vec3d>(moving, node_schema::n_translate, {0, 1}, {{0, 0, 0}, {8, 0, 0}});
        write(moving, node_schema::n_scale) = {2, 2, 2};
        // One key is a pose, also where the outputs were never evaluated before.
        INode& posed = scene.addNode(*scene.root, "posed");
        scene.animate<vec3d>(posed, node_schema::n_translate, {0}, {{5, 6, 7}});
        const GltfFile file = scene.saveAndRead();
        const auto samples = readSamples(file);
        EXPECT_EQ(samples.size(), exportAnimations ? 1u : 0u);
        EXPECT_EQ(file.json().HasMember("animations"), exportAnimations);
        const std::vector<Matrix> stored = file.localMatrices();
        expectNear(stored[nodeNamed(file, "moving")],
                   {2, 0, 0, 0, 0, 2, 0, 0, 0, 0, 2, 0, 4, 0, 0, 1});
        expectNear(stored[nodeNamed(file, "posed")],
                   {1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1, 0, 5, 6, 7, 1});
    }
}

namespace {

/// A layer that fails at the third frame.
class FailingLayer final : public scene::IAnimLayer {
public:
    using IAnimLayer::IAnimLayer;
    void changed(base::u32, const base::AttribPath&) override {
        constexpr int callsBefore = 1; // for the pose at the beginning
        if (++calls_ == callsBefore + 3)
            throw std::runtime_error("this layer fails");
    }

private:
    int calls_ = 0;
};

void addFailingLayer(AnimatedScene& scene) {
    const base::ref<base::IPlugin> layer(new FailingLayer(
        scene.factory->findDesc(scene::animLayer_schema::n_kind), scene.factory.get(), 0));
    scene.factory->addPlugin(layer);
    write(*scene.scene, scene_schema::n_animLayers).push_back(layer);
}

} // namespace

TEST(Baking, LimitsFramesAndBytes) {
    const struct {
        int nodes;
        const char* message;
    } rows[] = {{1, "2 gltf |scene| The animation has 10000000 frames, only the first 1000000 are "
                    "exported!\n"},
                // 28 nodes of 40 bytes each frame: 2^30 / 1120.
                {28, "2 gltf |scene| The animation has 10000000 frames, only the first 958698 are "
                     "exported!\n"}};
    for (const auto& row : rows) {
        AnimatedScene scene;
        write(*scene.scene, scene_schema::n_name) = base::string("scene");
        write(*scene.scene, scene_schema::n_framesPerSecond) = 1000;
        for (int i = 0; i < row.nodes; ++i) {
            INode& node = scene.addNode(*scene.root, "n");
            for (const base::name_id name : {node_schema::n_translate.id, node_schema::n_scale.id})
                scene.animate<vec3f>(node, name, {0, 1e4}, {{1, 1, 1}, {3, 1, 1}});
            scene.animate<base::quatf>(node, node_schema::n_rotate, {0, 1e4}, {{}, {0, 0, 1, 0}});
        }
        addFailingLayer(scene); // so many frames take their time
        const LogCapture log;
        EXPECT_THROW(scene.save(scene.folder / "a.glb"), std::runtime_error);
        EXPECT_EQ(problems(log), row.message);
    }
}

TEST(Baking, PutsTheTimeBack) {
    const base::name_id other = base::nameServer().id("otherTime");
    const struct {
        std::function<void(scene::IScene&)> store;
        const char* text; ///< of what is there afterwards, links as such
    } rows[] = {
        {[](auto&) {}, "0"},
        {[](auto& s) { write(s, scene_schema::n_time) = {77}; }, "77"},
        {[](auto& s) { s.template attribute<float>(scene_schema::n_time) = 0.25f; }, "0.25"},
        {[&](auto& s) {
             s.template attribute<TimeCode>(other) = {5};
             s.attribute(scene_schema::n_time, new base::AttribLink(base::AttribPath(s, other)));
         },
         "Plugin[0].otherTime"}};
    for (const bool fails : {false, true}) {
        for (const auto& row : rows) {
            SCOPED_TRACE(row.text);
            AnimatedScene scene;
            INode& node = scene.addNode(*scene.root, "n");
            scene.animate<vec3d>(node, node_schema::n_translate, {0, 1}, {{0, 0, 0}, {30, 0, 0}});
            if (fails)
                addFailingLayer(scene);
            row.store(*scene.scene);
            if (fails)
                EXPECT_THROW(scene.save(scene.folder / "a.glb"), std::runtime_error);
            else
                EXPECT_EQ(readSamples(scene.saveAndRead())["n translation"].values.at(29)[0], 29);
            EXPECT_EQ(scene.scene->findAttribute(scene_schema::n_time, false)->toString(),
                      row.text);
            if (const TimeCode* linked = scene.scene->findAttribute<TimeCode>(other)) {
                EXPECT_EQ(*linked, TimeCode{5});
            }
        }
    }
}

TEST(Baking, LeavesOutFramesOfTheSameTime) {
    AnimatedScene scene;
    write(*scene.scene, scene_schema::n_name) = base::string("scene");
    INode& node = scene.addNode(*scene.root, "n");
    scene.animate<vec3d>(node, node_schema::n_translate, {1e6, 1e6 + 1}, {{0, 0, 0}, {30, 0, 0}});
    const LogCapture log;
    const GltfFile file = scene.saveAndRead();
    EXPECT_EQ(problems(log), "3 gltf |scene| The animation is so late that frames have the same "
                             "time, those are left out!\n");
    EXPECT_TRUE(findFaults(file).empty());
    // Floats of that size are sixteenths of a second apart.
    auto samples = readSamples(file);
    EXPECT_EQ(samples["n translation"].times.size(), 16u);
    EXPECT_EQ(samples["n translation"].values.count, 16u);
}

TEST(Baking, TellsOfFreeNodesThatCannotFollow) {
    for (const bool isWhole : {false, true}) {
        AnimatedScene scene;
        INode& parent = scene.addNode(*scene.root, "parent");
        scene.animate<vec3d>(parent, node_schema::n_translate, {0, 1}, {{0, 0, 0}, {30, 0, 0}});
        INode& free = scene.addNode(parent, "free");
        write(free, node_schema::n_inheritsTransform) = false;
        scene.animate<vec3d>(free, node_schema::n_translate, {0, 1}, {{0, 0, 0}, {0, 2, 0}});
        if (isWhole) {
            scene.animate<vec3f>(free, node_schema::n_scale, {0}, {{1, 1, 1}});
            scene.animate<base::quatf>(free, node_schema::n_rotate, {0}, {{}});
        }
        const LogCapture log;
        scene.saveAndRead();
        EXPECT_EQ(problems(log), isWhole ? ""
                                         : "3 gltf |free| The node does not inherit the transform "
                                           "of its parent, which is animated: it is placed for "
                                           "the present time only!\n");
    }
}

TEST(Baking, KeepsSamplesFinite) {
    AnimatedScene scene;
    INode& node = scene.addNode(*scene.root, "n");
    scene.animate<vec3d>(node, node_schema::n_translate, {0, 1}, {{0, 0, 0}, {1e300, 0, 0}});
    const LogCapture log;
    EXPECT_TRUE(findFaults(scene.saveAndRead()).empty());
    EXPECT_EQ(problems(log),
              "3 gltf |n| The transform has values that are not finite, they are ignored.\n");
}
