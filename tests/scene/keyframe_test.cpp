#include "scene_keyframe.h"

#include "allocation_count.h"
#include "keyframe_model.h"
#include "log_capture.h"
#include "scene_builder.h"

#include "b_exception.h"

#include <gtest/gtest.h>

#include <array>
#include <bit>
#include <limits>
#include <random>

namespace {

using namespace base;
using namespace scene;
using namespace test_support;
using keyframe_model::Numbers;
using Curve = keyframeChannelCurve_schema;
using Curves = keyframeChannel_schema;
using KeyTimes = base::vector<TimeCode>;

template <class T>
struct NumberOf {
    using type = T;
};
template <template <class> class V, class C>
struct NumberOf<V<C>> {
    using type = C;
};

template <class T>
using NumbersOf =
    std::array<typename NumberOf<T>::type, sizeof(T) / sizeof(typename NumberOf<T>::type)>;

template <class T>
T fromNumbers(const Numbers& numbers) {
    NumbersOf<T> stored;
    for (std::size_t i = 0; i < stored.size(); ++i)
        stored[i] = static_cast<typename NumberOf<T>::type>(numbers[i]);
    return std::bit_cast<T>(stored);
}

template <class T>
Numbers toNumbers(const T& value) {
    const auto stored = std::bit_cast<NumbersOf<T>>(value);
    return Numbers(stored.begin(), stored.end());
}

template <class T>
constexpr bool isQuaternion = std::is_same_v<T, quatf> || std::is_same_v<T, quatd>;

template <class T>
void store(AttribMap& map, name_id name, const std::vector<Numbers>& values) {
    auto& stored = map.vecAttribute<T>(name);
    for (const Numbers& value : values)
        stored.push_back(fromNumbers<T>(value));
}

template <class T>
class KeyframeTypes : public testing::Test, protected SceneBuilder {
protected:
    /// A value that T holds exactly; unit length for quaternions.
    Numbers draw(double greatest) {
        std::uniform_int_distribution<int> steps(-64, 64);
        Numbers numbers(toNumbers(T{}).size());
        double squares = 0;
        for (double& number : numbers) {
            number = steps(random_) * greatest / 64;
            squares += number * number;
        }
        if (isQuaternion<T>)
            for (double& number : numbers)
                number /= std::sqrt(squares);
        return toNumbers(fromNumbers<T>(numbers));
    }

    keyframe_model::Curve drawCurve(std::vector<int> codes, bool isClosed, bool isWeighted,
                                    double tightness) {
        constexpr bool isInteger = std::is_same_v<T, i32>;
        keyframe_model::Curve curve;
        curve.isQuaternion = isQuaternion<T>;
        curve.codes = std::move(codes);
        curve.tightness = tightness;
        curve.tension = tightness == 1 ? 0.75 : 1;
        for (const double second : {10.25, 10.5, 11.25, 11.5, 13.0}) {
            curve.times.push_back(secondsToTime(second).ticks);
            curve.values.push_back(draw(isInteger ? 640 : 4));
            curve.tangents.push_back(draw(isInteger ? 640 : 4));
            curve.tangents.push_back(draw(isInteger ? 640 : 4));
        }
        if (isClosed)
            curve.values.back() = curve.values.front();
        std::uniform_int_distribution<int> part(isInteger ? 0 : 4, 64);
        for (std::size_t i = 0; isWeighted && i < curve.tangents.size(); ++i) {
            Numbers weights = toNumbers(T{});
            for (double& weight : weights)
                weight = isInteger ? part(random_) % 2 : part(random_) / 64.0;
            curve.weights.push_back(weights);
        }
        return curve;
    }

    IKeyframeChannel& channelOf(const keyframe_model::Curve& curve) {
        IKeyframeChannel& channel = add<IKeyframeChannel>("model");
        AttribMap& map = curveOf(channel);
        for (const i64 ticks : curve.times)
            write(map, Curve::n_times).push_back({ticks});
        store<T>(map, Curve::n_values, curve.values);
        store<T>(map, Curve::n_tangents, curve.tangents);
        if (!curve.weights.empty())
            store<T>(map, Curve::n_weights, curve.weights);
        if (curve.codes.size() == 1)
            write(map, Curve::n_interpolation) = static_cast<u8>(curve.codes[0]);
        for (std::size_t i = 0; curve.codes.size() > 1 && i < curve.codes.size(); ++i)
            map.vecAttribute<u8>(Curve::n_interpolation).push_back(static_cast<u8>(curve.codes[i]));
        write(map, Curve::n_preExtrapolation) = static_cast<u8>(curve.pre);
        write(map, Curve::n_postExtrapolation) = static_cast<u8>(curve.post);
        write(map, Curve::n_tension) = static_cast<float>(curve.tension);
        write(map, Curve::n_tightness) = static_cast<float>(curve.tightness);
        return channel;
    }

    /// Compares at times from `from` to `to` periods of the curve.
    void compare(const keyframe_model::Curve& curve, double from, double to) {
        const IKeyframeChannel& channel = channelOf(curve);
        const auto period = static_cast<double>(curve.times.back() - curve.times.front());
        std::vector<i64> times;
        for (double part = from; part < to; part += 0.0173)
            times.push_back(curve.times.front() + static_cast<i64>(part * period));
        for (const i64 time : curve.times)
            times.insert(times.end(), {time, time + 46186, time + 46187});
        for (const i64 time : times)
            ASSERT_TRUE(isClose(toNumbers(computeValue<T>(channel, {time})),
                                keyframe_model::evaluate(curve, time)))
                << "at " << static_cast<double>(time - curve.times.front()) / period
                << " periods, extrapolation " << curve.pre;
    }

    static testing::AssertionResult isClose(const Numbers& actual, const Numbers& expected) {
        constexpr bool isDouble = std::is_same_v<typename NumberOf<T>::type, double>;
        for (std::size_t i = 0; i < expected.size(); ++i) {
            // Single precision rounds at each of a dozen operations; Cardano's formula loses digits
            // where the time axis is nearly flat.
            const double tolerance = (isDouble ? 1e-9 : 2e-6) * (8 + std::abs(expected[i]));
            const double low = expected[i] - tolerance, high = expected[i] + tolerance;
            const bool isFitting = std::is_same_v<T, i32>
                                       ? actual[i] >= std::trunc(expected[i] - 100 * tolerance) &&
                                             actual[i] <= std::trunc(expected[i] + 100 * tolerance)
                                       : actual[i] >= low && actual[i] <= high;
            if (!isFitting)
                return testing::AssertionFailure()
                       << "component " << i << " is " << actual[i] << " instead of " << expected[i]
                       << ", off by " << actual[i] - expected[i];
        }
        return testing::AssertionSuccess();
    }

    std::mt19937 random_{7};
};

using Types =
    testing::Types<i32, float, double, vec2f, vec3f, vec4f, quatf, vec2d, vec3d, vec4d, quatd>;
TYPED_TEST_SUITE(KeyframeTypes, Types);

TYPED_TEST(KeyframeTypes, FollowTheModel) {
    const LogCapture log;
    for (const std::vector<int>& codes :
         {std::vector{0}, {1}, {2}, {3}, {2, 3, 1, 0, 3}, {1, 2, 2, 3, 3}, {3, 1, 2, 3, 0}})
        for (const bool isClosed : {false, true})
            for (const bool isWeighted : {false, true})
                for (const double tightness : {0.0, 0.5, 1.0})
                    for (int extrapolation = 0; extrapolation < 5; ++extrapolation) {
                        SCOPED_TRACE(format("codes {} {}, closed {}, weighted {}, tightness {}",
                                            codes.front(), codes.size(), isClosed, isWeighted,
                                            tightness));
                        auto curve = this->drawCurve(codes, isClosed, isWeighted, tightness);
                        while (!isSingleValued(curve))
                            curve = this->drawCurve(codes, isClosed, isWeighted, tightness);
                        curve.pre = extrapolation;
                        curve.post = (extrapolation + 2) % 5;
                        this->compare(curve, -2.3, 3.3);
                        if (this->HasFatalFailure())
                            return;
                    }
    EXPECT_TRUE(log.entries().empty()) << problems(log);
}

/// What is the same for all types.
class Keyframes : public testing::Test, protected SceneBuilder {
protected:
    using SceneBuilder::add;
    IKeyframeChannel& add(std::initializer_list<double> seconds, base::vector<float> values,
                          int interpolation = 1) {
        IKeyframeChannel& channel = add<IKeyframeChannel>("c");
        AttribMap& curve = setKeys(channel, seconds, std::move(values));
        write(curve, Curve::n_interpolation) = static_cast<u8>(interpolation);
        return channel;
    }
    static float at(const IKeyframeChannel& channel, double second, i64 ticks = 0) {
        return computeValue<float>(channel, {secondsToTime(second).ticks + ticks});
    }
};

constexpr const char* missingTangents =
    "3 keyframeChannel |c| Missing or wrong tangents provided for the Bezier curve! Falling back "
    "to linear interpolation!\n";
constexpr const char* invalidWeights =
    "3 keyframeChannel |c| Invalid tangent weights provided for the Bezier curve! The curve will "
    "not work properly!\n";

TEST_F(Keyframes, TellOnceInEachEvaluationWhatIsWrong) {
    using Floats = base::vector<float>;
    const auto set = [](name_id name, Floats values) {
        return [=](AttribMap& curve) { curve.vecAttribute<float>(name) = values; };
    };
    const auto codes = [](base::vector<u8> values) {
        return [=](AttribMap& curve) {
            curve.removeAttribute(Curve::n_interpolation);
            curve.vecAttribute<u8>(Curve::n_interpolation) = values;
        };
    };
    const struct {
        const char* name;
        int interpolation;
        std::function<void(AttribMap&)> change;
        float expected; ///< half a second after the first of the values 1 and 3, a second apart
        const char* messages;
    } cases[] = {
        {"nothing", 1, [](AttribMap&) {}, 2, ""},
        {"no values", 1, [](AttribMap& c) { c.removeAttribute(Curve::n_values); }, 0,
         "2 keyframeChannel |c| Empty 'values' attribute detected!\n"},
        {"empty values", 1, set(Curve::n_values, {}), 0,
         "2 keyframeChannel |c| Empty 'values' attribute detected!\n"},
        {"other values", 1,
         [](AttribMap& c) {
             c.removeAttribute(Curve::n_values);
             c.vecAttribute<double>(Curve::n_values).resize(2);
         },
         0, "2 keyframeChannel |c| Incompatible 'values' type!\n"},
        {"no times", 1, [](AttribMap& c) { c.removeAttribute(Curve::n_times); }, 0,
         "2 keyframeChannel |c| Empty 'times' attribute detected!\n"},
        {"empty times", 1, [](AttribMap& c) { write(c, Curve::n_times).clear(); }, 0,
         "2 keyframeChannel |c| Empty 'times' attribute detected!\n"},
        {"one value more", 1, set(Curve::n_values, {1, 3, 5}), 0,
         "2 keyframeChannel |c| Different number of 'keys' and 'values' detected!\n"},
        {"no tangents", 3, [](AttribMap&) {}, 2, missingTangents},
        {"three tangents", 3, set(Curve::n_tangents, {9, 9, 9}), 2, missingTangents},
        {"other tangents", 3,
         [](AttribMap& c) { c.vecAttribute<double>(Curve::n_tangents).resize(4); }, 2,
         missingTangents},
        {"three weights", 3,
         [&](AttribMap& c) {
             set(Curve::n_tangents, {0, 0, 0, 0})(c);
             set(Curve::n_weights, {1, 1, 1})(c);
         },
         2, invalidWeights},
        {"no tangents for one segment", 1, codes({1, 3}), 2, missingTangents},
        {"a code for the first key alone", 1, codes({0}), 2, ""},
        {"no code", 1, codes({}), 2, ""},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.name);
        IKeyframeChannel& channel = add({0, 1}, {1, 3}, c.interpolation);
        c.change(curveOf(channel));
        const LogCapture log;
        EXPECT_EQ(at(channel, 0.5), c.expected);
        EXPECT_EQ(linesOf(log), c.messages);
    }
}

TEST_F(Keyframes, NeedExactlyOneCurve) {
    const LogCapture log;
    IKeyframeChannel& channel = add<IKeyframeChannel>("c");
    EXPECT_EQ(at(channel, 0), 0);
    channel.arrayAttribute(Curves::n_curves);
    EXPECT_EQ(at(channel, 0), 0);
    EXPECT_TRUE(log.entries().empty());
    channel.attribute(2, Curves::n_curves);
    EXPECT_EQ(at(channel, 0), 0);
    EXPECT_FALSE(setKey(channel, {}, 1.0f));
    EXPECT_FALSE(setKey(add<IKeyframeChannel>("d"), {}, 1.0f));
    EXPECT_EQ(linesOf(log), "2 keyframeChannel |c| Wrong number of components in the curve\n"
                            "2 keyframeChannel |c| Wrong number of components in the curve!\n"
                            "2 keyframeChannel |d| Trying to set a key without any curves!\n");
}

TEST_F(Keyframes, ThrowForUnknownInterpolationsWhereTheyCount) {
    IKeyframeChannel& channel = add({0, 1}, {1, 3}, 4);
    EXPECT_THROW(at(channel, 0.5), switch_exception);
    EXPECT_EQ(at(channel, 0), 1);
    EXPECT_EQ(at(channel, 2), 3);
    write(curveOf(channel), Curve::n_postExtrapolation) = 5;
    EXPECT_EQ(at(channel, 2), 3) << "an unknown extrapolation is constant";
    write(curveOf(channel), Curve::n_postExtrapolation) = 1;
    EXPECT_THROW(at(channel, 2), switch_exception);
}

TEST_F(Keyframes, OneKeyIsAllThereIs) {
    IKeyframeChannel& channel = add({}, {7}, 9);
    const LogCapture log;
    EXPECT_EQ(at(channel, -5), 7);
    EXPECT_TRUE(log.entries().empty());
}

TEST_F(Keyframes, RepeatFromTicksToTicks) {
    IKeyframeChannel& channel = add({1, 2, 5}, {10, 20, 50});
    AttribMap& curve = curveOf(channel);
    const auto extrapolate = [&](int code) {
        write(curve, Curve::n_preExtrapolation) = write(curve, Curve::n_postExtrapolation) =
            static_cast<u8>(code);
    };
    extrapolate(2);
    EXPECT_EQ(at(channel, 1 - 4), 10);
    EXPECT_EQ(at(channel, 5 + 4), 50);
    EXPECT_NEAR(at(channel, 5 + 1), 20, 1e-4);
    // Five years on: not a tick is lost.
    const i64 manyPeriods = 40'000'000 * 4 * TimeCode::ticksPerSecond;
    EXPECT_EQ(at(channel, 2, manyPeriods), 20);
    extrapolate(3);
    EXPECT_EQ(at(channel, 2 + 4), 20 + 40);
    EXPECT_EQ(at(channel, 2 - 8), 20 - 80);
    extrapolate(4);
    EXPECT_EQ(at(channel, 5 + 3), 20); // three seconds behind the end, as three before it
    EXPECT_EQ(at(channel, 1 - 1), 20);
    EXPECT_EQ(at(channel, 5 + 4), 10);
    for (const int code : {0, 1, 2, 3, 4}) {
        extrapolate(code);
        for (const i64 time : {std::numeric_limits<i64>::min(), std::numeric_limits<i64>::max()})
            EXPECT_TRUE(std::isfinite(computeValue<float>(channel, {time})));
    }
}

TEST_F(Keyframes, StayFiniteWhateverTheTimes) {
    for (const base::vector<double>& seconds :
         {base::vector<double>{1, 1, 1, 1}, {0, 1, 1, 2}, {3, 1, 2, 0}, {0, 5, 1, 2}, {2, 2, 0, 0}})
        for (const int interpolation : {0, 1, 2, 3})
            for (const int extrapolation : {0, 1, 2, 3, 4})
                for (const float tightness : {0.0f, 0.5f, 1.0f, 5.0f}) {
                    IKeyframeChannel& channel = add({}, {1, -1, -1, 1}, interpolation);
                    AttribMap& curve = curveOf(channel);
                    for (const double second : seconds)
                        write(curve, Curve::n_times).push_back(secondsToTime(second));
                    curve.vecAttribute<float>(Curve::n_tangents).resize(8, 2);
                    write(curve, Curve::n_tightness) = tightness;
                    write(curve, Curve::n_preExtrapolation) =
                        write(curve, Curve::n_postExtrapolation) = static_cast<u8>(extrapolation);
                    for (double second = -3; second < 8; second += 0.25)
                        ASSERT_TRUE(std::isfinite(at(channel, second)))
                            << second << ' ' << interpolation << ' ' << extrapolation;
                }
}

TEST_F(Keyframes, VectorsOfFourStandInForEachOther) {
    const LogCapture log;
    IKeyframeChannel& channel = add<IKeyframeChannel>("c");
    setKeys<color4f>(channel, {0, 1}, {{1, 2, 3, 4}, {3, 4, 5, 6}});
    EXPECT_EQ(computeValue<vec4f>(channel, secondsToTime(0.5)), (vec4f{2, 3, 4, 5}));
    EXPECT_EQ(computeValue<quatf>(channel, {}), (quatf{1, 2, 3, 4}));
    EXPECT_FALSE(findValueType(channel));
    IKeyframeChannel& matrices = add<IKeyframeChannel>("m");
    setKeys<base_mat22<double>>(matrices, {0}, {{{1, 2}, {3, 4}}});
    EXPECT_EQ(computeValue<vec4d>(matrices, {}), (vec4d{1, 2, 3, 4}));
    IKeyframeChannel& turns = add<IKeyframeChannel>("q");
    setKeys<quatd>(turns, {0}, {{0, 0, 0, 0}});
    EXPECT_EQ(computeValue<quatd>(turns, {}), quatd()) << "zeros are no rotation";
    EXPECT_EQ(findValueType(turns), TypeTraits<quatd>::n_name);
    EXPECT_TRUE(log.entries().empty());
    EXPECT_EQ(computeValue<vec4f>(matrices, {}), vec4f());
    EXPECT_EQ(linesOf(log), "2 keyframeChannel |m| Incompatible 'values' type!\n");
}

TEST_F(Keyframes, IntegersAreCutAfterTheComputation) {
    IKeyframeChannel& channel = add<IKeyframeChannel>("c");
    setKeys<i32>(channel, {0, 1, 2}, {0, -3, 16777217});
    EXPECT_EQ(computeValue<i32>(channel, secondsToTime(0.9)), -2); // -2.7
    EXPECT_EQ(computeValue<i32>(channel, secondsToTime(2)), 16777217) << "no single precision";
    write(curveOf(channel), Curve::n_postExtrapolation) = 1;
    EXPECT_EQ(computeValue<i32>(channel, secondsToTime(1e6)), std::numeric_limits<i32>::max());
}

TEST_F(Keyframes, FollowLinks) {
    IKeyframeChannel& source = add({0, 2}, {1, 5});
    IKeyframeChannel& channel = add<IKeyframeChannel>("c");
    for (const name_id name : {name_id(Curve::n_times), name_id(Curve::n_values)})
        curveOf(channel).attribute(
            name, new AttribLink(AttribPath(source, Curves::n_curves).element(0).attribute(name)));
    const LogCapture log;
    EXPECT_EQ(at(channel, 1), 3);
    EXPECT_TRUE(log.entries().empty());
}

TEST_F(Keyframes, TakeNewKeysInOrder) {
    IKeyframeChannel& channel = add<IKeyframeChannel>("c");
    AttribMap& curve = curveOf(channel);
    const auto& times = write(curve, Curve::n_times);
    const auto& values = curve.vecAttribute<float>(Curve::n_values);
    const LogCapture log;
    for (const double second : {3.0, 1.0, 2.0})
        EXPECT_TRUE(setKey(channel, secondsToTime(second), static_cast<float>(10 * second)));
    EXPECT_TRUE(setKey(channel, secondsToTime(3), 4.0f));
    EXPECT_EQ(times, (KeyTimes{secondsToTime(1), secondsToTime(2), secondsToTime(3)}));
    EXPECT_EQ(values, (base::vector<float>{10, 20, 4}));

    // Lists with something for each key grow in the same places.
    curve.vecAttribute<u8>(Curve::n_interpolation) = {0, 2, 3};
    const KeyTangents<float> tangents{5, 6};
    EXPECT_TRUE(setKey(channel, secondsToTime(2), 21.0f, &tangents));
    curve.vecAttribute<float>(Curve::n_weights) = {1, 1, 2, 2, 3, 3};
    EXPECT_TRUE(setKey(channel, secondsToTime(2.5), 25.0f));
    EXPECT_TRUE(setKey(channel, secondsToTime(9), 90.0f));
    EXPECT_EQ(values, (base::vector<float>{10, 21, 25, 4, 90}));
    EXPECT_EQ(curve.vecAttribute<u8>(Curve::n_interpolation), (base::vector<u8>{0, 2, 3, 3, 3}));
    EXPECT_EQ(curve.vecAttribute<float>(Curve::n_tangents),
              (base::vector<float>{0, 0, 5, 6, 0, 0, 0, 0, 0, 0}));
    const float third = 1.0f / 3;
    EXPECT_EQ(curve.vecAttribute<float>(Curve::n_weights),
              (base::vector<float>{1, 1, 2, 2, third, third, 3, 3, third, third}));
    EXPECT_TRUE(log.entries().empty());

    EXPECT_FALSE(setKey(channel, secondsToTime(4), 1.0)) << "doubles among floats";
    write(curve, Curve::n_times).push_back(secondsToTime(10));
    EXPECT_FALSE(setKey(channel, secondsToTime(4), 1.0f));
    EXPECT_EQ(values.size(), 5u);
    EXPECT_EQ(linesOf(log),
              "2 keyframeChannel |c| Incompatible 'values' type!\n"
              "2 keyframeChannel |c| Different number of 'keys' and 'values' detected!\n");
}

TEST_F(Keyframes, EvaluateWithoutAllocating) {
    if (allocationCount() < 0)
        GTEST_SKIP() << "allocations can't be counted here";
    IKeyframeChannel& floats = add({0, 1, 2, 3}, {1, 2, 3, 1});
    IKeyframeChannel& turns = add<IKeyframeChannel>("q");
    setKeys<quatd>(turns, {0, 1, 2}, {{0, 0, 0, 1}, {0, 0, 1, 0}, {0, 0, 0, 1}});
    curveOf(floats).vecAttribute<float>(Curve::n_tangents).resize(8);
    curveOf(floats).vecAttribute<float>(Curve::n_weights).resize(8, 0.5f);
    for (const u8 interpolation : {u8{0}, u8{1}, u8{2}, u8{3}}) {
        write(curveOf(floats), Curve::n_interpolation) = interpolation;
        if (interpolation != 3)
            write(curveOf(turns), Curve::n_interpolation) = interpolation;
        const long before = allocationCount();
        for (double second = -1; second < 5; second += 0.1) {
            at(floats, second);
            computeValue<quatd>(turns, secondsToTime(second));
        }
        EXPECT_EQ(allocationCount(), before) << int{interpolation};
    }
    EXPECT_NE(allocationCount(), 0);
}

} // namespace
