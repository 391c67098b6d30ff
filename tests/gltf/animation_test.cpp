#include "animated_fixture.h"

#include "scene_transform.h"

#include <cmath>

using namespace test_support;
using base::TimeCode;
using base::vec3d;
using base::vec3f;
using scene::INode;
using scene::node_schema;
using scene::scene_schema;
using Values = std::vector<double>;

namespace {

constexpr base::i64 ticksPerSecond = 46186158000;

/// The transform of sample `i` of a node: its samples, or what the node stores.
base::mat43 transformOf(const std::map<std::string, Samples>& samples, const GltfFile& file,
                        const std::string& name, size_t i) {
    const auto part = [&](const char* path, Values value) {
        if (const auto sampled = samples.find(name + " " + path); sampled != samples.end())
            return Values(sampled->second.values.at(i), sampled->second.values.at(i + 1));
        for (const auto& json : file.json()["nodes"].GetArray())
            if (json.HasMember("name") && json["name"].GetString() == name && json.HasMember(path))
                for (rapidjson::SizeType c = 0; c < value.size(); ++c)
                    value[c] = json[path][c].GetDouble();
        return value;
    };
    const Values t = part("translation", {0, 0, 0}), r = part("rotation", {0, 0, 0, 1}),
                 s = part("scale", {1, 1, 1});
    scene::TransformValues values;
    values.translate = {t[0], t[1], t[2]};
    values.rotate = {r[0], r[1], r[2], r[3]};
    values.scale = {s[0], s[1], s[2]};
    bool repaired = false;
    return composeTransform(values, repaired);
}

void expectNear(const base::mat43& a, const base::mat43& b) {
    const float *x = &a.m.r0.x, *y = &b.m.r0.x;
    for (int i = 0; i < 9; ++i)
        EXPECT_NEAR(x[i], y[i], 2e-5) << i;
    for (const auto coordinate : {&vec3d::x, &vec3d::y, &vec3d::z})
        EXPECT_NEAR(a.t.*coordinate, b.t.*coordinate, 2e-5);
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
    ASSERT_EQ(samples.size(), 7u);
    const struct {
        INode& node;
        const char *name, *path;
        size_t first, count; ///< frames
    } rows[] = {{outer, "outer", "rotation", 0, 20},
                {inner, "inner", "scale", 0, 20},
                {free, "free", "translation", 5, 15},
                {aimed, "aimed", "scale", 0, 20},
                {follower, "follower", "translation", 0, 20}};
    for (const auto& row : rows) {
        const Samples& sampled = samples.at(row.name + std::string(" ") + row.path);
        ASSERT_EQ(sampled.times.size(), row.count);
        for (size_t i = 0; i < row.count; ++i) {
            SCOPED_TRACE(row.name + std::to_string(i));
            const auto frame = static_cast<base::i64>(row.first + i);
            EXPECT_FLOAT_EQ(static_cast<float>(sampled.times[i]), static_cast<float>(frame) / 10);
            write(*scene.scene, scene_schema::n_time) = {frame * ticksPerSecond / 10};
            scene.layer.changed(base::eventTimeChanged,
                                base::AttribPath(*scene.scene, scene_schema::n_time));
            base::mat43 expected;
            row.node.getTransform(expected);
            // A free node undoes a shear of its parents, which samples can't hold.
            if (&row.node != &free)
                expectNear(transformOf(samples, file, row.name, i), expected);
            else
                EXPECT_NEAR(transformOf(samples, file, row.name, i).t.y, expected.t.y, 2e-5);
        }
    }
}

TEST(Baking, TakesTheFramesOfOneGrid) {
    const char* const noRate = "3 gltf |scene| The scene has no frames per second, 30 are taken!\n";
    const char* const tooLong = "2 gltf |scene| The animation has 10000000 frames, only the first "
                                "1000000 are exported!\n";
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
        {"no rate", 0, {0, 1}, {0, 1}, 30, 30, 0, noRate},
        {"too long", 1000, {0, 1e4}, {1, 2}, 1'000'000, 1001, 1, tooLong}};
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
        Samples &ofA = samples["a scale"], &ofB = samples["b scale"];
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
        expectNear(transformOf({}, file, "moving", 0),
                   {{{2, 0, 0}, {0, 2, 0}, {0, 0, 2}}, {4, 0, 0}});
        expectNear(transformOf({}, file, "posed", 0), {{}, {5, 6, 7}});
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

} // namespace

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
            const base::ref<base::IPlugin> failing(new FailingLayer(
                scene.factory->findDesc(scene::animLayer_schema::n_kind), scene.factory.get(), 0));
            if (fails) {
                scene.factory->addPlugin(failing);
                write(*scene.scene, scene_schema::n_animLayers).push_back(failing);
            }
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

TEST(Baking, KeepsSamplesFinite) {
    AnimatedScene scene;
    INode& node = scene.addNode(*scene.root, "n");
    scene.animate<vec3d>(node, node_schema::n_translate, {0, 1}, {{0, 0, 0}, {1e300, 0, 0}});
    const LogCapture log;
    EXPECT_TRUE(findFaults(scene.saveAndRead()).empty());
    EXPECT_EQ(problems(log),
              "3 gltf |n| The transform has values that are not finite, they are ignored.\n");
}
