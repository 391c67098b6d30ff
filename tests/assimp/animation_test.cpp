#include "fbx_text.h"
#include "file_builder.h"
#include "pose_model.h"

#include "assimp/frame_sampler.h"
#include "scene.h"

#include <assimp/Importer.hpp>

#include <cmath>

namespace {

using namespace scene;
using namespace test_support;
using namespace base;

const std::vector<aiVector3D> triangle = {{0, 0, 0}, {1, 0, 0}, {0, 1, 0.5f}};

class Animation : public FileImport {
protected:
    /// Names of the channels of clip `index`.
    std::string channels(std::size_t index = 0) {
        std::string names;
        const auto clips = objects(animClip_schema::n_kind);
        if (index < clips.size())
            for (const auto& channel : valuesOf(*clips[index], animClip_schema::n_keyframeChannels))
                names += channel->getName() + " ";
        return names;
    }
    base::IPlugin& nodeCalled(const char* name) {
        return *document_->plugin(static_cast<u32>(document_->findByName(name)));
    }
    /// The times of a channel's keys in seconds.
    vector<double> times(const base::IPlugin& channel) {
        vector<double> seconds;
        for (const TimeCode t :
             valuesOf(*find(channel, keyframeChannel_schema::n_curves)->item(0)->asMap(),
                      keyframeChannelCurve_schema::n_times))
            seconds.push_back(t.seconds());
        return seconds;
    }
    /// Those of the first channel with the name.
    vector<double> times(const char* channel) {
        for (const auto* object : objects(keyframeChannel_schema::n_kind))
            if (object->getName() == channel)
                return times(*object);
        return {};
    }
    double second(const base::IPlugin& object, const SchemaAttribute<TimeCode>& attribute) {
        const TimeCode* time = find(object, attribute);
        return time ? time->seconds() : NAN;
    }
    void expectPoses(const aiScene& original, base::IPlugin& scene, unsigned clip, double first,
                     double last, double offset, double tolerance = 1e-6) {
        for (int i = 0; i <= 20; ++i) {
            const double t = first + (last - first) * i / 20;
            EXPECT_LT(poseDifference(poseFile(original, clip, t), poseScene(scene, t + offset)),
                      tolerance)
                << t;
        }
    }
};

TEST_F(Animation, OnlyWhatChangesIsLinked) {
    FileBuilder file;
    file.mesh(file.node("a", file.root(), translated(9, 9, 9)), triangle);
    file.node("b", file.root());
    aiAnimation& walk = file.animation(24, 48);
    // Noise of the last digit is no change, and a constant is the node's.
    file.channel(walk, "a",
                 {{{12, {1, 2, 3}}, {48, {1, 2.0000002f, 3}}},
                  {{12, {}}, {24, turned(90, {0, 0, 1})}},
                  {{12, {1, 1, 1}}, {48, {1, 1, 0.9999999f}}}});
    file.channel(walk, "b", {.positions = {{12, {}}, {48, {}}}});
    base::IPlugin& scene = importFile(file);
    EXPECT_EQ(channels(), "a.rotate ");
    base::IPlugin& node = nodeCalled("a");
    EXPECT_EQ(read(node, node_schema::n_translate), (vec3d{1, 2, 3}));
    EXPECT_EQ(times("a.rotate"), (vector<double>{0.5, 1}));
    EXPECT_EQ(read(scene, scene_schema::n_framesPerSecond), 24u);
    EXPECT_EQ(second(scene, scene_schema::n_startTime), 0.5);
    EXPECT_EQ(second(scene, scene_schema::n_endTime), 2);
    vector<TimeCode> keys;
    dynamic_cast<INode&>(node).getTransformKeyTimes(keys);
    EXPECT_EQ(keys, (vector<TimeCode>{{TimeCode::ticksPerSecond / 2}, {TimeCode::ticksPerSecond}}));
    // A reader who tells nobody of the time sees the start.
    EXPECT_EQ(read(node, node_schema::n_rotate), quatf());
    poseScene(scene, 0);
    EXPECT_EQ(read(node, node_schema::n_rotate).w, 1); // and before the first key the first value

    set(Settings::n_importAnimations, false);
    FileBuilder again;
    again.channel(again.animation(1, 1), "root", {.positions = {{0, {}}, {1, {1, 0, 0}}}});
    importFile(again);
    EXPECT_TRUE(objects(animLayer_schema::n_kind).empty());
}

TEST_F(Animation, ClipsFollowEachOther) {
    const auto build = [](FileBuilder& file) {
        file.mesh(file.node("a", file.root(), translated(0, 5, 0)), triangle);
        file.mesh(file.node("b", file.root(), translated(7, 0, 0)), triangle);
        // Half a second before 0 to one after it.
        file.channel(file.animation(24, 0), "a",
                     {.positions = {{-12, {0, 1, 0}}, {0, {4, 1, 0}}, {24, {0, 0, 8}}}});
        file.channel(file.animation(1000, 0), "b",
                     {.rotations = {{500, {}}, {1010, turned(120, {1, 1, 0})}}});
        file.channel(file.animation(24, 0), "ghost", {.positions = {{0, {}}, {1, {1, 1, 1}}}});
        // Holds another value than at rest.
        file.channel(file.animation(24, 0), "a", {.positions = {{0, {3, 3, 3}}}});
    };
    FileBuilder original, imported;
    build(original);
    build(imported);
    LogCapture log;
    base::IPlugin& scene = importFile(imported);
    EXPECT_EQ(problems(log), "3 assimp |" + path() +
                                 "| Left out 1 animation channels of nodes or morph targets that "
                                 "the file does not have!\n");
    EXPECT_EQ(objects(animClip_schema::n_kind).size(), 3u);
    for (std::size_t clip = 0; clip < 3; ++clip)
        EXPECT_EQ(channels(clip), "a.translate b.rotate ");
    // The first from 0 on; the next from frame 37 on, for 0.51 s; the last from frame 51 on.
    expectPoses(*original.scene, scene, 0, -0.5, 1, 0.5);
    expectPoses(*original.scene, scene, 1, 0.5, 1.01, 37 / 24.0 - 0.5);
    expectPoses(*original.scene, scene, 3, 0, 0, 51 / 24.0);
    EXPECT_NEAR(second(scene, scene_schema::n_endTime), 51 / 24.0, 1e-9);

    settings_.attribute<bool>(base::nameServer().id("importFirstAnimation")) = true;
    FileBuilder again;
    build(again);
    importFile(again);
    EXPECT_EQ(objects(animClip_schema::n_kind).size(), 1u);
    EXPECT_EQ(channels(), "a.translate ");
}

TEST_F(Animation, LengthsThatFilesTellStretchNoClip) {
    FileBuilder file;
    for (const char* name : {"a", "b"}) {
        file.node(name, file.root());
        file.channel(file.animation(30, 2.9e7), name, {.positions = {{0, {}}, {30, {1, 0, 0}}}});
    }
    base::IPlugin& scene = importFile(file);
    // A clip holds what the other moves as long as its own keys last; a frame later comes the
    // other.
    for (const auto* channel : objects(keyframeChannel_schema::n_kind))
        EXPECT_EQ(times(*channel), (vector<double>{0, 1})) << channel->getName();
    poseScene(scene, 31 / 30.0 + 0.5);
    EXPECT_EQ(read(nodeCalled("b"), node_schema::n_translate), (vec3d{0.5, 0, 0}));
    EXPECT_NEAR(second(scene, scene_schema::n_endTime), 31 / 30.0 + 2.9e7 / 30, 1e-6);
}

TEST_F(Animation, RatesComeFromTicksOrKeys) {
    const struct {
        double ticksPerSecond;
        vector<double> keys; ///< in ticks
        u32 rate;
    } cases[] = {{24, {0, 1}, 24},     {29.97, {0, 1}, 30},
                 {0, {0, 1}, 25},      {1000, {41.6666, 83.3333, 5791.67}, 24},
                 {1, {0, 1, 2}, 30},   {4800, {0, 80, 240}, 60},
                 {1, {0, 0.02}, 50},   {1000, {0, 7.3, 11.9, 1234}, 30},
                 {NAN, {0, 1, 3}, 25}, {-3, {0, 1}, 25}};
    for (const auto& c : cases) {
        FileBuilder file;
        file.node("a", file.root());
        FileBuilder::Keys keys;
        for (const double t : c.keys)
            keys.positions.push_back({t, {static_cast<float>(t), 0, 0}});
        file.channel(file.animation(c.ticksPerSecond, 0), "a", keys);
        base::IPlugin& scene = importFile(file);
        EXPECT_EQ(read(scene, scene_schema::n_framesPerSecond), c.rate) << c.ticksPerSecond;
    }
}

TEST_F(Animation, BrokenKeysAreLeftOut) {
    FileBuilder file;
    file.node("a", file.root());
    file.node("a", file.root());
    aiAnimation& walk = file.animation(30, NAN);
    file.channel(walk, "a",
                 {{{30, {2, 0, 0}},
                   {NAN, {9, 9, 9}},
                   {0, {1, 0, 0}},
                   {10, {NAN, 0, 0}},
                   {30, {3, 0, 0}},
                   {1e300, {9, 9, 9}}},
                  {{0, aiQuaternion(0, 0, 0, 0)}, {5, aiQuaternion(0, 3, 0, 0)}},
                  {}});
    file.channel(walk, "a", {.positions = {{0, {}}, {1, {5, 5, 5}}}});
    file.animation(30, 10);
    LogCapture log;
    base::IPlugin& scene = importFile(file);
    EXPECT_EQ(problems(log),
              "3 assimp |" + path() + "| The file has no geometry!\n3 assimp |" + path() +
                  "| Left out 4 keys of animations whose times or values are no finite numbers!\n"
                  "3 assimp |" +
                  path() +
                  "| Found 1 animation curves whose keys are not in the order of time, they are "
                  "sorted!\n3 assimp |" +
                  path() +
                  "| Left out 1 animation channels of nodes or morph targets that have one!\n"
                  "3 assimp |" +
                  path() +
                  "| Found 1 names of joints, animated nodes, lights or cameras that several nodes "
                  "have, the first one is taken!\n");
    // Sorted, and of two keys at one time both.
    EXPECT_EQ(times("a.translate"), (vector<double>{0, 1, 1}));
    EXPECT_EQ(read(nodeCalled("a"), node_schema::n_rotate), (quatf{1, 0, 0, 0}));
    EXPECT_EQ(second(scene, scene_schema::n_endTime), 1);
}

TEST_F(Animation, AnimatedRootsGetANodeAbove) {
    FileBuilder original, imported;
    for (FileBuilder* file : {&original, &imported}) {
        file->mesh(file->root(), triangle);
        file->channel(file->animation(30, 30), "root",
                      {.positions = {{0, {1, 0, 0}}, {30, {0, 3, 0}}}});
    }
    base::IPlugin& scene = importFile(imported);
    base::IPlugin& root = *findObject(scene, scene_schema::n_root);
    EXPECT_EQ(root.getName(), "");
    EXPECT_EQ(valuesOf(root, node_schema::n_children)[0]->getName(), "root");
    expectPoses(*original.scene, scene, 0, 0, 1, 0);
}

/// FBX helpers around the node "n", with the channels of some of them.
void buildChain(FileBuilder& file, bool hasPivot) {
    const std::string prefix = "n_$AssimpFbx$_";
    aiNode& translation = file.node(prefix + "Translation", file.root(), translated(1, 0, 0));
    aiNode* last = &translation;
    if (hasPivot)
        last = &file.node(prefix + "RotationPivot", *last, translated(0, 3, 0));
    last = &file.node(prefix + "PreRotation", *last, matrixOf(turned(40, {1, 0, 0})));
    last = &file.node(prefix + "Rotation", *last);
    if (hasPivot)
        last = &file.node(prefix + "RotationPivotInverse", *last, translated(0, -3, 0));
    last = &file.node(prefix + "Scaling", *last);
    file.mesh(file.node("n", *last), triangle);
    aiAnimation& walk = file.animation(24, 24);
    file.channel(walk, prefix + "Translation",
                 {{{0, {1, 0, 0}}, {24, {5, 1, 0}}}, {{0, {}}}, {{0, {1, 1, 1}}}});
    file.channel(walk, prefix + "Rotation",
                 {{{0, {}}},
                  {{0, {}}, {12, turned(100, {0, 0, 1})}, {24, turned(-70, {0, 1, 0})}},
                  {{0, {1, 1, 1}}}});
    file.channel(walk, prefix + "Scaling",
                 {{{0, {}}}, {{0, {}}}, {{6, {1, 1, 1}}, {18, {1, 2, hasPivot ? 3.0f : -3.0f}}}});
}

TEST_F(Animation, ChainsOfHelpersBecomeOneNode) {
    for (const bool hasPivot : {false, true}) {
        SCOPED_TRACE(hasPivot);
        FileBuilder original, imported;
        buildChain(original, hasPivot);
        buildChain(imported, hasPivot);
        base::IPlugin& scene = importFile(imported, "chain.fbx");
        EXPECT_EQ(objects(node_schema::n_kind).size(), 2u);
        EXPECT_EQ(channels(), "n.translate n.rotate n.scale ");
        if (!hasPivot) {
            // The file's keys, and right between frames too.
            EXPECT_EQ(times("n.translate"), (vector<double>{0, 1}));
            EXPECT_EQ(times("n.rotate"), (vector<double>{0, 0.5, 1}));
            EXPECT_EQ(times("n.scale"), (vector<double>{0.25, 0.75}));
            for (const double t : {0.0, 0.1, 0.333, 0.52, 0.9, 1.0})
                EXPECT_LT(poseDifference(poseFile(*original.scene, 0, t), poseScene(scene, t)),
                          2e-6);
        } else {
            // The pivot's path is bent: right on frames.
            EXPECT_EQ(times("n.translate").size(), 25u);
            for (int frame = 0; frame <= 24; ++frame)
                EXPECT_LT(poseDifference(poseFile(*original.scene, 0, frame / 24.0),
                                         poseScene(scene, frame / 24.0)),
                          2e-6)
                    << frame;
        }
    }
}

TEST_F(Animation, HelpersAreThoseOfFbxAndShortChains) {
    const struct {
        const char* file;
        std::size_t nodes;
    } cases[] = {{"deep.fbx", 3}, {"deep.dae", 42}};
    for (const auto& c : cases) {
        FileBuilder original, imported;
        for (FileBuilder* file : {&original, &imported}) {
            aiNode* last = &file->root();
            for (int i = 0; i < 40; ++i)
                last = &file->node("n_$AssimpFbx$_Scaling" + std::to_string(i), *last,
                                   translated(1, 0, 0) * matrixOf(turned(20, {0, 1, 0})));
            file->mesh(file->node("n", *last), triangle);
        }
        base::IPlugin& scene = importFile(imported, c.file);
        EXPECT_EQ(objects(node_schema::n_kind).size(), c.nodes) << c.file;
        EXPECT_LT(poseDifference(poseFile(*original.scene, 0, 0), poseScene(scene, 0)), 1e-5);
    }
}

TEST_F(Animation, StepsInChainsStaySteps) {
    // With a rotation that moves, the offset behind it is sampled on frames; else keys are kept.
    for (const bool turns : {false, true}) {
        SCOPED_TRACE(turns);
        FileBuilder original, imported;
        for (FileBuilder* file : {&original, &imported}) {
            aiNode& turn = file->node("n_$AssimpFbx$_Rotation", file->root());
            file->mesh(file->node("n", turn, translated(0, 3, 0)), triangle);
            aiAnimation& walk = file->animation(24, 0);
            if (turns)
                file->channel(walk, "n_$AssimpFbx$_Rotation",
                              {.rotations = {{0, {}}, {24, turned(90, {0, 0, 1})}}});
            file->channel(
                walk, "n",
                {.positions = {{0, {0, 3, 0}}, {12.5, {1, 3, 0}}, {12.5, {9, 0, 0}}, {24, {}}}});
        }
        base::IPlugin& scene = importFile(imported, "chain.fbx");
        for (const double frame : {0.0, 11.0, 12.4999, 12.5, 24.0})
            EXPECT_LT(poseDifference(poseFile(*original.scene, 0, frame / 24),
                                     poseScene(scene, frame / 24)),
                      turns ? 2e-4 : 2e-6)
                << frame;
    }
}

TEST_F(Animation, CyclesGoOn) {
    for (const bool isChain : {false, true}) {
        set(Settings::n_importBakedAnimations, !isChain);
        FileBuilder file;
        aiNode& above = isChain ? file.node("n_$AssimpFbx$_PreRotation", file.root(),
                                            matrixOf(turned(90, {0, 0, 1})))
                                : file.root();
        file.node("n", above);
        aiNodeAnim& channel = FileBuilder::channel(file.animation(24, 240), "n",
                                                   {.positions = {{0, {}}, {24, {4, 0, 0}}}});
        channel.mPostState = aiAnimBehaviour_REPEAT;
        base::IPlugin& scene = importFile(file, "cycle.fbx");
        poseScene(scene, 2.25);
        const vec3d found = read(nodeCalled("n"), node_schema::n_translate);
        EXPECT_NEAR(isChain ? found.y : found.x, 1, 1e-6);
    }
}

TEST_F(Animation, HeldFactorsMoveWhatIsBehindThem) {
    FileBuilder original, imported;
    for (FileBuilder* file : {&original, &imported}) {
        aiNode& turn = file->node("n_$AssimpFbx$_Rotation", file->root());
        file->mesh(file->node("n", turn, translated(0, 3, 0)), triangle);
        file->channel(file->animation(24, 24), "n_$AssimpFbx$_Rotation",
                      {.rotations = {{0, turned(90, {0, 0, 1})}, {24, turned(90, {0, 0, 1})}}});
    }
    base::IPlugin& scene = importFile(imported, "chain.fbx");
    EXPECT_TRUE(objects(animLayer_schema::n_kind).empty());
    EXPECT_LT(poseDifference(poseFile(*original.scene, 0, 0), poseScene(scene, 0)), 1e-6);
}

TEST_F(Animation, BakedCurvesHaveAKeyOnEveryFrame) {
    set(Settings::n_importBakedAnimations, true);
    FileBuilder original, imported;
    for (FileBuilder* file : {&original, &imported}) {
        aiMesh& mesh = file->mesh(file->node("a", file->root()), triangle);
        file->target(mesh, "up", 0, triangle);
        file->channel(file->animation(24, 0), "a", {.positions = {{0.5, {}}, {3, {1, 2, 3}}}});
        file->weights(*file->scene->mAnimations[0], "a", {{0, {0}}, {2, {1}}});
    }
    base::IPlugin& scene = importFile(imported);
    const vector<double> wanted{0.5 / 24, 1 / 24.0, 2 / 24.0, 3 / 24.0};
    const vector<double> found = times("a.translate");
    ASSERT_EQ(found.size(), wanted.size());
    for (std::size_t i = 0; i < wanted.size(); ++i)
        EXPECT_NEAR(found[i], wanted[i], 1e-9);
    ASSERT_EQ(times("up.weight").size(), 3u);
    expectPoses(*original.scene, scene, 0, 0, 3 / 24.0, 0);
}

TEST_F(Animation, VeryLongMotionsKeepTheirKeys) {
    set(Settings::n_importBakedAnimations, true);
    FileBuilder file;
    aiMesh& mesh = file.mesh(file.node("a", file.root()), triangle);
    file.target(mesh, "up", 0, triangle);
    aiAnimation& walk = file.animation(24, 0);
    file.channel(walk, "a", {.positions = {{0, {}}, {24, {9, 9, 9}}, {2.3e7, {1, 2, 3}}}});
    file.weights(walk, "a", {{0, {0}}, {48, {1}}, {2.3e7, {0}}});
    LogCapture log;
    importFile(file);
    EXPECT_TRUE(log.has(base::logWarning,
                        "assimp |" + path() +
                            "| Found 2 motions that are too long for keys on every frame!"));
    ASSERT_EQ(times("a.translate").size(), 3u);
    EXPECT_EQ(times("a.translate")[1], 1);
    ASSERT_EQ(times("up.weight").size(), 3u);
    EXPECT_EQ(times("up.weight")[1], 2);
}

TEST(FrameSampler, KeysOfAllTracksHaveALimit) {
    assimp::FrameSampler frames(10, true);
    int count = 0;
    while (count < 50 && frames.listFrames({0}, {999'980}, 3).size() == 99'999)
        ++count;
    EXPECT_EQ(count, 33); // the next would come to 10,199,898 keys
    EXPECT_EQ(frames.longMotions(), 1u);
    EXPECT_EQ(frames.listFrames({0}, {15}, 3).size(), 3u);
}

TEST_F(Animation, MirroredNodesKeepTheirSideWhereKeysAreMissing) {
    const aiMatrix4x4 mirror(-1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1);
    const aiQuaternion turn = turned(40, {0, 0, 1});
    const FileBuilder::Keys rotations{.rotations = {{0, turn}, {24, turned(-30, {1, 0, 0})}}};
    const FileBuilder::Keys scales{.scales = {{0, {-1, 1, 1}}, {24, {-2, 3, 1}}}};
    for (const bool turns : {true, false})
        for (const std::string name : {"n", "n_$AssimpFbx$_Scaling"}) {
            SCOPED_TRACE(name + (turns ? " turns" : " grows"));
            FileBuilder original, imported;
            for (FileBuilder* file : {&original, &imported}) {
                aiNode& node = file->node(name, file->root(), matrixOf(turn) * mirror);
                file->mesh(name == "n" ? node : file->node("n", node), triangle);
                // The library has no rest beside keys: there, the other kind stands still.
                FileBuilder::Keys keys = turns ? rotations : scales;
                if (file == &original && turns)
                    keys.scales = {{0, {-1, 1, 1}}};
                else if (file == &original)
                    keys.rotations = {{0, turn}};
                file->channel(file->animation(24, 0), name, keys);
            }
            base::IPlugin& scene = importFile(imported, "mirror.fbx");
            for (const double t : {0.0, 0.3, 1.0})
                EXPECT_LT(poseDifference(poseFile(*original.scene, 0, t), poseScene(scene, t)),
                          2e-6)
                    << t;
        }
}

TEST_F(Animation, FilesWithPivotsMoveAsTheLibraryTells) {
    const auto property = [](const char* name, const char* x) {
        return std::string("P: \"") + name + "\", \"" + name + "\", \"\", \"A\"," + x + "\n";
    };
    FbxText fbx;
    fbx.properties = "P: \"RotationActive\", \"bool\", \"\", \"\",1\n" +
                     fbx.vectorProperty("RotationPivot", "5,0,0") +
                     property("Lcl Rotation", "0,0,10") + property("Lcl Translation", "1,2,3");
    fbx.hasTwins = true;
    const std::string ticks = std::to_string(TimeCode::ticksPerSecond);
    fbx.objects = "AnimationStack: 70, \"AnimStack::walk\", \"\" {\n}\n"
                  "AnimationLayer: 71, \"AnimLayer::base\", \"\" {\n}\n"
                  "AnimationCurveNode: 72, \"AnimCurveNode::R\", \"\" {\nProperties70:  {\n"
                  "P: \"d|Z\", \"Number\", \"\", \"A\",10\n}\n}\n"
                  "AnimationCurve: 73, \"AnimCurve::\", \"\" {\nDefault: 0\nKeyVer: 4008\n"
                  "KeyTime: *2 {\na: 0," +
                  ticks + "\n}\nKeyValueFloat: *2 {\na: 10,100\n}\n}\n";
    fbx.objects += "Material: 40, \"Material::m\", \"\" {\nVersion: 102\n"
                   "ShadingModel: \"phong\"\n}\n";
    fbx.connections = "C: \"OO\",71,70\nC: \"OO\",72,71\n"
                      "C: \"OP\",72,20, \"Lcl Rotation\"\nC: \"OP\",73,72, \"d|Z\"\n";
    const base::string file = write("pivot.fbx", fbx.text());
    ASSERT_TRUE(loadPath(file));
    Assimp::Importer library;
    const aiScene* original = library.ReadFile(file, 0);
    ASSERT_TRUE(original);
    ASSERT_EQ(original->mNumAnimations, 1u);
    base::IPlugin& scene = only(scene_schema::n_kind);
    const u32 rate = read(scene, scene_schema::n_framesPerSecond);
    for (u32 frame = 0; frame <= rate; ++frame)
        EXPECT_LT(poseDifference(poseFile(*original, 0, double(frame) / rate),
                                 poseScene(scene, double(frame) / rate)),
                  2e-6)
            << frame;
    // The pivot stays where it is.
    EXPECT_NE(channels().find("panel.rotate"), std::string::npos);
}

} // namespace
