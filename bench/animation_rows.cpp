#include "animation_floor.h"
#include "measure.h"

#include "scene_keyframe.h"

#include <cmath>
#include <random>
#include <stdexcept>

/// Animation curves.
namespace bench {

namespace {

using base::TimeCode;

constexpr std::size_t channelCount = 1000, keyCount = 100, timeCount = 1000;

/// Linear curves with keys at uneven times in ten seconds.
std::vector<PlainCurve> makeCurves() {
    std::mt19937 random(1);
    std::uniform_int_distribution<base::i64> jitter(0, TimeCode::ticksPerSecond / 20);
    std::uniform_real_distribution<float> value(-1, 1);
    std::vector<PlainCurve> curves(channelCount);
    for (PlainCurve& curve : curves)
        for (std::size_t key = 0; key < keyCount; ++key) {
            const auto tenth = static_cast<base::i64>(key) * TimeCode::ticksPerSecond / 10;
            curve.times.push_back(key == 0 ? 0 : tenth + jitter(random));
            curve.values.push_back(value(random));
        }
    return curves;
}

std::vector<base::i64> makeTimes() {
    std::vector<base::i64> times;
    for (std::size_t i = 0; i < timeCount; ++i)
        times.push_back(static_cast<base::i64>(i) * TimeCode::ticksPerSecond * 99 / 10000 + 100000);
    return times;
}

scene::IKeyframeChannel& addChannel(base::PluginFactory& factory, const PlainCurve& curve) {
    using Channel = scene::keyframeChannel_schema;
    using Curve = scene::keyframeChannelCurve_schema;
    auto& channel = dynamic_cast<scene::IKeyframeChannel&>(*factory.create(Channel::n_kind));
    base::AttribMap& map = *channel.attribute(1, Channel::n_curves);
    for (const base::i64 time : curve.times)
        write(map, Curve::n_times).push_back({time});
    map.vecAttribute<float>(Curve::n_values).append(curve.values.begin(), curve.values.end());
    return channel;
}

void evaluation(benchmark::State& state) {
    base::PluginFactory factory;
    scene::register_scene_schema(factory);
    const std::vector<PlainCurve> curves = makeCurves();
    std::vector<const scene::IKeyframeChannel*> channels;
    for (const PlainCurve& curve : curves)
        channels.push_back(&addChannel(factory, curve));
    const std::vector<base::i64> times = makeTimes();

    for (auto _ : state) {
        double sum = 0, floorSum = 0;
        const double seconds = secondsOf([&] {
            for (const base::i64 time : times)
                for (const scene::IKeyframeChannel* channel : channels)
                    sum += static_cast<double>(scene::computeValue<float>(*channel, {time}));
        });
        const double floorSeconds = secondsOf([&] {
            for (const base::i64 time : times)
                for (const PlainCurve& curve : curves)
                    floorSum += static_cast<double>(evaluatePlain(curve, time));
        });
        // For a microsecond after a key the product yields the key's value.
        if (!(std::abs(sum - floorSum) < 1e-3))
            throw std::runtime_error("the floor has another result");
        reportTimes(state, seconds, floorSeconds);
        const auto evaluations = static_cast<double>(channelCount * timeCount);
        state.counters["items"] = evaluations;
        state.counters["evaluations_a_second"] = evaluations / seconds;
    }
}

BENCH_ROW(evaluation, "animation/evaluate");

} // namespace

} // namespace bench
