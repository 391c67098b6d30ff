#include "gltf/exporter.h"
#include "gltf/scene_clock.h"

#include "b_log.h"
#include "scene_schema.h"

#include <algorithm>
#include <limits>

namespace gltf {

using base::i32;
using base::i64;
using base::IPlugin;
using base::ref;
using base::TimeCode;
using base::u32;
using base::vector;
using scene::scene_schema;
using Channel = GLTF::Animation::Channel;
using Type = GLTF::Accessor::Type;

namespace {

constexpr u32 maximumFrames = 1'000'000;

struct TimeRange {
    TimeCode start{std::numeric_limits<i64>::max()};
    TimeCode end{std::numeric_limits<i64>::min()};

    template <class Entries>
    void include(const Entries& entries) {
        for (const auto& entry : entries) {
            start = std::min(start, entry.start);
            end = std::max(end, entry.end);
        }
    }
    auto operator<=>(const TimeRange&) const = default;
};

/// The times at which everything is sampled.
struct SampleGrid {
    TimeCode start;
    i64 step; ///< ticks, above 0
    u32 count;

    TimeCode at(u32 index) const { return {start.ticks + index * step}; }
    /// The first index whose time is `time` or later, `count` if there is none.
    u32 firstFrom(TimeCode time) const {
        if (time <= start)
            return 0;
        // The distance may exceed a signed number.
        const auto distance =
            static_cast<base::u64>(time.ticks) - static_cast<base::u64>(start.ticks);
        const auto ticks = static_cast<base::u64>(step);
        const base::u64 index = distance / ticks + (distance % ticks != 0);
        return static_cast<u32>(std::min<base::u64>(index, count));
    }
    u32 endOf(const TimeRange& range) const {
        const u32 index = firstFrom(range.end);
        return index < count && at(index) == range.end ? index + 1 : index;
    }
    u32 countWithin(const TimeRange& range) const { return endOf(range) - firstFrom(range.start); }
};

u32 readFrameRate(const IPlugin& scene) {
    const u32 rate = read(scene, scene_schema::n_framesPerSecond);
    if (rate != 0)
        return rate;
    const u32 standard = scene_schema::n_framesPerSecond.defaultValue;
    base::log().log(base::logScene, base::logWarning,
                    "gltf |{}| The scene has no frames per second, {} are taken!", scene.getName(),
                    standard);
    return standard;
}

/// The grid of whole frames that begins with the range; its last one lies before the end.
SampleGrid makeGrid(const TimeRange& range, const IPlugin& scene) {
    // Whole numbers of frames come out a little too small for some ranges.
    constexpr double tolerance = 1e-6;
    const double rate = readFrameRate(scene);
    const double frames = (range.end.seconds() - range.start.seconds()) * rate + tolerance;
    auto count = base::saturate<u32>(frames);
    if (count > maximumFrames) {
        base::log().log(base::logScene, base::logError,
                        "gltf |{}| The animation has {} frames, only the first {} are exported!",
                        scene.getName(), count, maximumFrames);
        count = maximumFrames;
    }
    const double ticks = static_cast<double>(TimeCode::ticksPerSecond) / rate;
    return {range.start, base::saturate<i64>(ticks), count};
}

/// An accessor with a copy of `samples`, which are released; null if there are none. Weights are
/// scalars, however many make one sample.
template <class T>
ref<GLTF::Accessor> takeSamples(Type type, vector<T>& samples) {
    if (samples.empty())
        return nullptr;
    const auto count = std::min<std::size_t>(samples.size(), std::numeric_limits<i32>::max());
    auto accessor =
        base::makeRef<GLTF::Accessor>(type, GLTF::componentFloat, std::as_const(samples).data(),
                                      static_cast<i32>(count), GLTF::BufferView::noTarget);
    vector<T>().swap(samples);
    return accessor;
}

void reserveSamples(NodeAnimation& entry, std::size_t count) {
    if ((entry.paths & 1u << Channel::translation) != 0)
        entry.translations.reserve(count);
    if ((entry.paths & 1u << Channel::scale) != 0)
        entry.scales.reserve(count);
    if ((entry.paths & 1u << Channel::rotation) != 0)
        entry.rotations.reserve(count);
}

/// Moves the samples of all entries into the document.
class SampleWriter {
public:
    SampleWriter(GLTF::Asset& asset, const SampleGrid& grid) : asset_(asset), grid_(grid) {}

    void write(NodeAnimation& entry) {
        for (const ref<Channel>& channel : std::as_const(entry.animation->channels)) {
            switch (channel->target.path) {
            case Channel::translation:
                channel->sampler.output = takeSamples(Type::vec3, entry.translations);
                break;
            case Channel::scale:
                channel->sampler.output = takeSamples(Type::vec3, entry.scales);
                break;
            default:
                channel->sampler.output = takeSamples(Type::vec4, entry.rotations);
                break;
            }
        }
        append(entry.animation, {entry.start, entry.end});
    }
    void write(MorphAnimation& entry) {
        entry.animation->channels[0]->sampler.output = takeSamples(Type::scalar, entry.weights);
        append(entry.animation, {entry.start, entry.end});
    }

private:
    /// Leaves out an animation whose range lies between two times of the grid or behind its end.
    void append(const ref<GLTF::Animation>& animation, const TimeRange& range) {
        const ref<GLTF::Accessor> times = makeTimes(range);
        if (!times)
            return;
        for (const ref<Channel>& channel : std::as_const(animation->channels))
            channel->sampler.input = times;
        asset_.animations.push_back(animation);
    }

    /// The times of the grid within `range` in seconds, the same accessor for the same range.
    ref<GLTF::Accessor> makeTimes(const TimeRange& range) {
        ref<GLTF::Accessor>& times = times_[range];
        if (times)
            return times;
        vector<float> seconds;
        const u32 end = grid_.endOf(range);
        for (u32 i = grid_.firstFrom(range.start); i < end; ++i)
            seconds.push_back(static_cast<float>(grid_.at(i).seconds()));
        return times = takeSamples(Type::scalar, seconds);
    }

    GLTF::Asset& asset_;
    const SampleGrid& grid_;
    base::map<TimeRange, ref<GLTF::Accessor>> times_;
};

} // namespace

/// Steps the scene through the range of all keys and stores what becomes of the animated nodes
/// and morphs as samples. The last one lies a frame before the end of the range.
void GLTFScenePlugin::bakeAnimations(GLTF::Asset& asset, IPlugin& scene) {
    TimeRange range;
    range.include(nodeAnimations);
    range.include(morphAnimations);
    if (range.start >= range.end)
        return;
    const SampleGrid grid = makeGrid(range, scene);
    for (NodeAnimation& entry : nodeAnimations)
        reserveSamples(entry, grid.countWithin({entry.start, entry.end}));
    for (MorphAnimation& entry : morphAnimations)
        entry.weights.reserve(grid.countWithin({entry.start, entry.end}) * entry.targets.size());
    {
        SceneClock clock(scene);
        for (u32 i = 0; i < grid.count; ++i) {
            const TimeCode time = grid.at(i);
            clock.set(time);
            for (NodeAnimation& entry : nodeAnimations)
                sampleNodeAnimation(entry, time);
            for (MorphAnimation& entry : morphAnimations)
                sampleMorphAnimation(entry, time);
        }
    }
    SampleWriter writer(asset, grid);
    for (NodeAnimation& entry : nodeAnimations)
        writer.write(entry);
    for (MorphAnimation& entry : morphAnimations)
        writer.write(entry);
}

} // namespace gltf
