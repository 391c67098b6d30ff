#include "scene_animation.h"

#include "log_capture.h"
#include "scene_builder.h"

#include <gtest/gtest.h>

#include <cmath>
#include <limits>

namespace {

using namespace base;
using namespace scene;
using namespace test_support;
using Layer = animLayer_schema;
using Action = animLayerAction_schema;
using Clip = animClip_schema;
using Curve = keyframeChannelCurve_schema;
using KeyTimes = base::vector<TimeCode>;

constexpr u32 outputFlags = 0x80000001u;

class Layers : public testing::Test, protected SceneBuilder {
protected:
    /// A channel whose value is the time in seconds, at all times.
    IKeyframeChannel& addClock(const char* name = "clock") {
        IKeyframeChannel& channel = add<IKeyframeChannel>(name);
        AttribMap& curve = setKeys<float>(channel, {0, 10}, {0, 10});
        write(curve, Curve::n_preExtrapolation) = write(curve, Curve::n_postExtrapolation) = 1;
        return channel;
    }
    template <class T>
    IKeyframeChannel& addConstant(T value, const char* name = "constant") {
        IKeyframeChannel& channel = add<IKeyframeChannel>(name);
        setKeys<T>(channel, {0}, {value});
        return channel;
    }
    /// Adds an action of `layer` with a clip of `channels`.
    struct Played {
        IPlugin& clip;
        AttribMap& action;
    };
    Played play(IAnimLayer& layer, std::initializer_list<IPlugin*> channels, double playAt = 0) {
        IPlugin& clip = add<IAnimClip>("clip");
        for (IPlugin* channel : channels)
            write(clip, Clip::n_keyframeChannels).push_back(Object(channel));
        AttribMap& action = appendItem(layer, Layer::n_actions);
        write(action, Action::n_animClip) = Object(&clip);
        write(action, Action::n_playAt) = secondsToTime(playAt);
        return {clip, action};
    }
    Played play(std::initializer_list<IPlugin*> channels) { return play(*layer_, channels); }

    /// When and how a clip plays, in seconds and percent.
    struct Placement {
        double playAt = 0;
        i32 speed = 100;
        double start = absent, end = absent;
    };
    static constexpr double absent = std::numeric_limits<double>::quiet_NaN();
    void play(std::initializer_list<IPlugin*> channels, const Placement& placement) {
        const Played played = play(channels);
        const auto set = [](AttribMap& map, const DefaultedAttribute<TimeCode>& name,
                            double second) {
            if (std::isnan(second))
                map.removeAttribute(name);
            else
                write(map, name) = secondsToTime(second);
        };
        set(played.action, Action::n_playAt, placement.playAt);
        set(played.clip, Clip::n_startTime, placement.start);
        set(played.clip, Clip::n_endTime, placement.end);
        write(played.action, Action::n_playSpeed) = placement.speed;
    }

    void updateAt(double second) {
        write(*layer_, Layer::n_time) = secondsToTime(second);
        layer_->rebuildActiveClips();
        layer_->update();
    }
    void tellTime(IAnimLayer& layer, double second) {
        write(*scene, scene_schema::n_time) = secondsToTime(second);
        layer.changed(eventTimeChanged, AttribPath(*scene, scene_schema::n_time));
    }
    const Attribute* output(u32 index) const {
        const AttribArray* outputs = layer_->findArray(Layer::n_outputs);
        return outputs ? outputs->item(index) : nullptr;
    }
    /// The output if it is a T, else a value that no test expects.
    template <class T>
    T value(u32 index, T none = {}) const {
        const Attribute* found = output(index);
        return found && found->type() == TypeTraits<T>::n_name
                   ? *static_cast<const T*>(found->data())
                   : none;
    }
    float number(u32 index) const { return value<float>(index, NAN); }

    static AttribPath outputPath(IAnimLayer& layer, u32 index) {
        return AttribPath(layer, Layer::n_outputs).element(index);
    }
    static void link(IPlugin& object, name_id name, AttribPath path) {
        object.attribute(name, new AttribLink(std::move(path)));
    }

    IAnimLayer* layer_ = &add<IAnimLayer>("layer");
};

TEST_F(Layers, PlaceClipsInTime) {
    constexpr const char* negative = "3 animLayer |layer| Negative animation clip duration!\n";
    constexpr const char* noPlace =
        "3 gltf |layer| Action 0 of the layer has no 'playAt', it is not played!\n";
    const struct {
        const char* name;
        Placement placement;
        double time, clipTime;
        bool isPlayed = true;
        const char* message = "";
    } cases[] = {
        {"as it is", {0, 100}, 3, 3},
        {"later", {2, 100}, 3, 1},
        {"too early", {4, 100}, 3, -1, false},
        {"just begun", {3, 100}, 3, 0},
        {"twice as fast", {0, 200}, 3, 6},
        {"twice as fast lasts twice as long", {0, 200, 0, 2}, 4, 8},
        {"twice as fast, over", {0, 200, 0, 2}, 4.001, 8.002, false},
        {"half as fast", {0, 50, 0, 2}, 1, 0.5},
        {"half as fast, over", {0, 50, 0, 2}, 1.5, 0.75, false},
        {"part of a clip", {1, 100, 5, 7}, 2, 6},
        {"up to its end", {1, 100, 5, 7}, 3, 7},
        {"over", {1, 100, 5, 7}, 3.001, 7.001, false},
        {"no end", {1, 100, 5}, 90, 94},
        {"no start", {1, 100, absent, 5}, 90, 89},
        {"backwards", {1, -100}, 4, -3},
        {"standing still", {1, 0, 2}, 4, 2},
        {"negative", {0, 100, 7, 5}, 0, 7, false, negative},
        {"backwards with an end", {0, -100, 0, 5}, 0, 0, false, negative},
        {"no place", {absent, 100}, 0, 0, false, noPlace},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.name);
        layer_ = &add<IAnimLayer>("layer");
        IKeyframeChannel& keyed = add<IKeyframeChannel>("keyed");
        setKeys<float>(keyed, {c.clipTime}, {0});
        play({&addClock(), &keyed, nullptr}, c.placement);
        const LogCapture log;
        write(*layer_, Layer::n_time) = secondsToTime(c.time);
        layer_->rebuildActiveClips();
        EXPECT_EQ(layer_->activeClips().size(), c.isPlayed ? 1u : 0u);
        layer_->update({}, 0);
        if (c.isPlayed) {
            EXPECT_NEAR(number(0), c.clipTime, 1e-5);
        } else {
            EXPECT_EQ(output(0), nullptr);
        }

        // A key at that time of the clip takes place now, played or not.
        KeyTimes times;
        for (const u32 index : {1u, 2u, 3u})
            layer_->collectKeyTimes(index, times);
        const bool hasKey = c.placement.speed != 0 && !*c.message;
        ASSERT_EQ(times.size(), hasKey ? 1u : 0u);
        if (hasKey) {
            EXPECT_NEAR(times[0].seconds(), c.time, 1e-9);
        }
        EXPECT_EQ(linesOf(log), c.message);
    }
}

TEST_F(Layers, TimesBeyondTheirRangeStayAtItsEnds) {
    const Played played = play({&addClock()});
    write(played.action, Action::n_playSpeed) = std::numeric_limits<i32>::max();
    write(played.clip, Clip::n_startTime) = {std::numeric_limits<i64>::max()};
    write(*layer_, Layer::n_time) = {std::numeric_limits<i64>::max()};
    layer_->rebuildActiveClips();
    layer_->update();
    EXPECT_NEAR(number(0), 9223372036854775807.0 / 46186158000.0, 100);
    KeyTimes times;
    layer_->collectKeyTimes(0, times);
    EXPECT_EQ(times.size(), 2u);
}

TEST_F(Layers, SkipWhatIsBrokenAlone) {
    IKeyframeChannel& empty = add<IKeyframeChannel>("empty");
    IKeyframeChannel& strange = add<IKeyframeChannel>("strange");
    curveOf(strange).vecAttribute<u8>(Curve::n_values).resize(1);
    IKeyframeChannel& unknown = addClock("unknown");
    write(curveOf(unknown), Curve::n_interpolation) = 7;
    play({&addClock(), nullptr, &empty, &strange, &unknown, &addConstant(vec3d{1, 2, 3})});
    play(*layer_, {&addConstant(5.0f)}, 100); // not yet
    const LogCapture log;
    updateAt(2);
    EXPECT_EQ(number(0), 2);
    for (const u32 index : {1u, 2u, 3u, 4u})
        EXPECT_EQ(output(index), nullptr) << index;
    EXPECT_EQ(value<vec3d>(5), (vec3d{1, 2, 3}));
    const string text = linesOf(log);
    const string told =
        "3 animLayer |layer| Animation clip 'clip' has no keyframe assigned for channel at index "
        "1! Skipping calculation.\n"
        "3 animLayer |layer| Keyframe 'empty' has no valid data! Skipping calculation.\n"
        "3 animLayer |layer| Keyframe 'strange' has unknown type! Skipping calculation.\n"
        "2 Unhandled case in switch statement.";
    EXPECT_EQ(text.substr(0, told.size()), told);
}

TEST_F(Layers, TheLastClipDecides) {
    play({&addConstant(1.0f), &addConstant(2.0f), &addConstant(3.0f)});
    play({&addConstant(4.0f), &addConstant(quatd{0, 0, 3, 4})});
    updateAt(0);
    EXPECT_EQ(number(0), 4);
    EXPECT_NEAR(value<quatd>(1).z, 0.6, 1e-15) << "of another type, and of unit length";
    EXPECT_NEAR(value<quatd>(1).w, 0.8, 1e-15);
    EXPECT_EQ(number(2), 3);

    const Attribute* before = output(0);
    updateAt(1);
    EXPECT_EQ(output(0), before) << "outputs are used again";
    EXPECT_EQ(output(0)->flags(), outputFlags);
    EXPECT_EQ(output(1)->flags(), outputFlags);
}

TEST_F(Layers, QuaternionsHaveUnitLength) {
    const struct {
        quatf key, expected;
    } cases[] = {{{0, 0, 0, 1e-7f}, {0, 0, 0, 1}},
                 {{0, 0, 2e-6f, 0}, {0, 0, 1, 0}},
                 {{0, 8, 0, 6}, {0, 0.8f, 0, 0.6f}},
                 {{3e38f, 3e38f, 3e38f, 3e38f}, {0, 0, 0, 1}}};
    for (const auto& c : cases) {
        layer_ = &add<IAnimLayer>("layer");
        play({&addConstant(c.key)});
        updateAt(0);
        EXPECT_NEAR(value<quatf>(0).y, c.expected.y, 1e-6);
        EXPECT_NEAR(value<quatf>(0).z, c.expected.z, 1e-6);
        EXPECT_NEAR(value<quatf>(0).w, c.expected.w, 1e-6);
    }
}

TEST_F(Layers, CalculateWhatIsOutOfDate) {
    IKeyframeChannel& a = addConstant(1.0f);
    IKeyframeChannel& b = addConstant(2.0);
    play({&a, &b});
    updateAt(0);
    EXPECT_EQ(layer_->outputMask(), (base::vector<u8>{0, 0}));
    const auto change = [&](float first, double second) {
        curveOf(a).vecAttribute<float>(Curve::n_values)[0] = first;
        curveOf(b).vecAttribute<double>(Curve::n_values)[0] = second;
    };
    change(3, 4);
    layer_->update();
    EXPECT_EQ(number(0), 1) << "nobody said that it changed";
    layer_->rebuildActiveClips();
    EXPECT_EQ(layer_->outputMask(), (base::vector<u8>{1, 1}));
    layer_->update({}, 0);
    EXPECT_EQ(layer_->outputMask(), (base::vector<u8>{0, 1}));
    EXPECT_EQ(number(0), 3);
    EXPECT_EQ(value<double>(1), 2);
    change(5, 6);
    layer_->rebuildActiveClips();
    layer_->update(TypeTraits<double>::n_array_name);
    EXPECT_EQ(number(0), 3) << "not of that type";
    EXPECT_EQ(value<double>(1), 6);

    const LogCapture log;
    layer_->update({}, 2);
    EXPECT_EQ(linesOf(log), "3 animLayer |layer| Animation clip 'clip' has no channel at index 2! "
                            "Skipping calculation.\n");
}

TEST_F(Layers, MissingTimeIsZero) {
    play({&addClock()});
    layer_->rebuildActiveClips();
    EXPECT_TRUE(layer_->activeClips().empty());
    const LogCapture log;
    layer_->update();
    EXPECT_EQ(linesOf(log), "3 animLayer |layer| is missing time attribute!\n");
    EXPECT_EQ(output(0), nullptr);

    updateAt(1);
    EXPECT_TRUE(layer_->setKey(0, secondsToTime(1), 1.0f)); // so that something is out of date
    layer_->removeAttribute(Layer::n_time);
    layer_->update();
    EXPECT_EQ(number(0), 0) << "the clips that played are still known";
}

TEST_F(Layers, FollowTheTimeOfTheScene) {
    play({&addClock()});
    const LogCapture log;
    tellTime(*layer_, 4);
    EXPECT_EQ(number(0), 4);
    EXPECT_EQ(layer_->findAttribute(Layer::n_time), nullptr);
    write(*layer_, Layer::n_time) = secondsToTime(9);
    tellTime(*layer_, 5);
    EXPECT_EQ(number(0), 5) << "instead of an own one";
    EXPECT_EQ(read(*layer_, Layer::n_time), secondsToTime(9));

    IScene& other = add<IScene>();
    write(other, scene_schema::n_time) = secondsToTime(7);
    link(*layer_, Layer::n_time, AttribPath(other, scene_schema::n_time));
    tellTime(*layer_, 6);
    EXPECT_EQ(number(0), 7) << "a linked one stays";

    layer_->removeAttribute(Layer::n_time);
    layer_->changed(eventTimeChanged + 1, AttribPath(*scene, scene_schema::n_time));
    EXPECT_EQ(number(0), 7) << "another event";
    scene->removeAttribute(scene_schema::n_time);
    layer_->changed(eventTimeChanged, AttribPath(*scene, scene_schema::n_time));
    EXPECT_EQ(number(0), 0);
    EXPECT_TRUE(log.entries().empty()) << linesOf(log);
}

TEST_F(Layers, LinksReadWhatIsUpToDate) {
    play({&addClock(), &addConstant(vec3d{1, 2, 3})});
    play(*layer_, {&addConstant(9.0f)}, 4);
    write(*layer_, Layer::n_time) = secondsToTime(2);
    INode& object = add<INode>();
    const name_id weight = nameServer().id("weight");
    link(object, weight, outputPath(*layer_, 0));
    link(object, node_schema::n_translate, outputPath(*layer_, 1));

    // Before anybody updated the layer.
    const LogCapture log;
    EXPECT_EQ(*object.findAttribute<vec3d>(node_schema::n_translate), (vec3d{1, 2, 3}));
    EXPECT_EQ(layer_->outputMask(), (base::vector<u8>{1, 0})) << "only what was asked for";
    EXPECT_EQ(*object.findAttribute<float>(weight), 2);
    EXPECT_TRUE(object.findAttribute(weight, false)->isAnimated());

    write(*layer_, Layer::n_time) = secondsToTime(3);
    EXPECT_EQ(*object.findAttribute<float>(weight), 2) << "nobody said that it changed";
    *static_cast<TimeCode*>(layer_->findAttributeMutable(Layer::n_time)->data()) = secondsToTime(4);
    EXPECT_EQ(*object.findAttribute<float>(weight), 9) << "announced before the change";
    tellTime(*layer_, 3);
    EXPECT_EQ(*object.findAttribute<float>(weight), 3);
    EXPECT_TRUE(log.entries().empty()) << linesOf(log);

    // Behind the last channel there is nothing.
    link(object, weight, outputPath(*layer_, 2));
    EXPECT_EQ(object.findAttribute<float>(weight), nullptr);
    EXPECT_FALSE(object.findAttribute(weight, false)->isAnimated());
}

TEST_F(Layers, LoadedAndCreatedOnesKnowTheirClips) {
    for (const bool isLoaded : {false, true}) {
        layer_ = &add<IAnimLayer>("layer");
        play({&addClock()});
        write(*layer_, Layer::n_time) = {};
        isLoaded ? layer_->afterLoad(1) : layer_->markCreated();
        EXPECT_EQ(layer_->activeClips().size(), 1u) << isLoaded;
    }
}

// Whatever they come to: nothing recurses without end or reads what is gone.
TEST_F(Layers, CirclesEnd) {
    IAnimLayer& a = *layer_;
    IAnimLayer& b = add<IAnimLayer>("other");
    IKeyframeChannel& bent = addClock("bent");
    link(*scene, nameServer().id("reader"), outputPath(a, 0));
    curveOf(bent).attribute(Curve::n_tension, new AttribLink(outputPath(a, 0)));
    curveOf(bent).attribute(Curve::n_tightness, new AttribLink(outputPath(b, 0)));
    play(a, {&bent, &addClock()});
    play(b, {&bent});
    link(a, Layer::n_time, outputPath(b, 0));
    link(b, Layer::n_time, outputPath(a, 0));
    for (int round = 0; round < 3; ++round) {
        tellTime(a, 1);
        tellTime(b, 2);
        scene->findAttribute(nameServer().id("reader"));
        a.findAttributeMutable(Layer::n_time);
        a.update();
        link(a, Layer::n_time, outputPath(a, 1));
    }
    // Clips are not found anew while the layer goes through them, though its own output is read.
    const Played second = play(a, {&addClock()});
    a.removeAttribute(Layer::n_time);
    write(a, Layer::n_time) = secondsToTime(5);
    a.findAttributeMutable(Layer::n_actions);
    write(second.action, Action::n_playAt) = secondsToTime(100);
    a.update();
    EXPECT_EQ(number(0), 5);
    EXPECT_EQ(a.activeClips().size(), 2u);
}

TEST_F(Layers, NodesKnowTheTimesOfAllTheirKeys) {
    IKeyframeChannel& moves = add<IKeyframeChannel>("moves");
    setKeys<vec3d>(moves, {3, 1}, {{}, {}});
    IKeyframeChannel& grows = add<IKeyframeChannel>("grows");
    setKeys<vec3f>(grows, {2, 3}, {{}, {}});
    play(*layer_, {&moves, &grows});
    play(*layer_, {&moves}, 2); // 5, 3
    auto& node = add<INode>();
    auto& follower = add<INode>();
    link(node, node_schema::n_scale, outputPath(*layer_, 1));
    link(node, node_schema::n_translate, outputPath(*layer_, 0));
    link(follower, node_schema::n_rotate, AttribPath(node, node_schema::n_translate));
    const auto expect = [](const INode& n, std::initializer_list<double> seconds) {
        KeyTimes times, expected;
        n.getTransformKeyTimes(times);
        for (const double second : seconds)
            expected.push_back(secondsToTime(second));
        EXPECT_EQ(times, expected);
        EXPECT_EQ(n.hasTransformChannels(), seconds.size() != 0);
    };
    expect(node, {1, 2, 3, 5});
    expect(follower, {1, 3, 5});
    link(follower, node_schema::n_rotate, AttribPath(*layer_, Layer::n_time));
    expect(follower, {});
}

TEST_F(Layers, SetKeysOfTheChannelThatDecides) {
    IKeyframeChannel& first = addClock("first");
    IKeyframeChannel& second = addClock("second");
    play({&first});
    const Played played = play(*layer_, {&second}, 2);
    write(played.clip, Clip::n_startTime) = secondsToTime(1);
    write(played.action, Action::n_playSpeed) = 200;
    write(*layer_, Layer::n_time) = secondsToTime(3);
    layer_->rebuildActiveClips();
    layer_->update();
    EXPECT_EQ(number(0), 3); // (3 - 2) * 2 + 1
    EXPECT_TRUE(layer_->setKey(0, secondsToTime(3), 77.0f));
    layer_->update();
    EXPECT_EQ(number(0), 77);
    EXPECT_EQ(computeValue<float>(second, secondsToTime(3)), 77);
    EXPECT_EQ(computeValue<float>(first, secondsToTime(3)), 3);

    const LogCapture log;
    EXPECT_TRUE(layer_->setKey(0, secondsToTime(1), 5.0f)) << "the second clip does not play yet";
    EXPECT_EQ(computeValue<float>(first, secondsToTime(1)), 5);
    EXPECT_FALSE(layer_->setKey(1, secondsToTime(3), 1.0f));
    EXPECT_EQ(linesOf(log),
              "3 gltf |layer| No clip of the layer drives output 1, no key is set!\n");
}

} // namespace
