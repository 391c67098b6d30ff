#include "gltf/exporter.h"
#include "gltf/scene_clock.h"

#include "b_log.h"
#include "b_pages.h"
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
/// Bytes of all samples: half of what a document's one buffer holds, which has other data too.
constexpr base::u64 maximumBytes = 1u << 30;

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

/// From `from` to a time that is not before it; more than a signed number holds perhaps.
base::u64 ticksBetween(TimeCode from, TimeCode to) {
    return static_cast<base::u64>(to.ticks) - static_cast<base::u64>(from.ticks);
}

/// The times at which everything is sampled.
struct SampleGrid {
    TimeCode start;
    i64 step; ///< ticks, above 0
    u32 count;

    TimeCode at(u32 index) const { return {start.ticks + index * step}; }
    /// The time in the document.
    float secondsAt(u32 index) const { return static_cast<float>(at(index).seconds()); }
    /// False for a time that the document can't tell from the one before it.
    bool isDistinct(u32 index) const {
        return index == 0 || secondsAt(index) > secondsAt(index - 1);
    }
    /// The first index whose time is `time` or later, `count` if there is none.
    u32 firstFrom(TimeCode time) const {
        if (time <= start)
            return 0;
        const base::u64 distance = ticksBetween(start, time);
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

base::u64 sampleBytes(const NodeAnimation& entry) {
    const auto bytes = [&](Channel::Path path, std::size_t size) {
        return (entry.paths & 1u << path) != 0 ? size : 0;
    };
    return bytes(Channel::translation, sizeof(base::vec3f)) +
           bytes(Channel::scale, sizeof(base::vec3f)) +
           bytes(Channel::rotation, sizeof(base::quatf));
}
base::u64 sampleBytes(const MorphAnimation& entry) {
    return entry.targets.size() * sizeof(float);
}

/// Bytes of the samples of all entries on `grid`.
template <class Entries>
base::u64 byteCount(const SampleGrid& grid, const Entries& entries) {
    base::u64 bytes = 0;
    for (const auto& entry : entries)
        bytes += sampleBytes(entry) * grid.countWithin({entry.start, entry.end});
    return bytes;
}

/// The greatest count up to that of `grid` with which `fits` holds, which all lesser ones do too.
template <class Fits>
u32 greatestCount(SampleGrid grid, const Fits& fits) {
    u32 low = 0, high = grid.count;
    while (low < high) {
        grid.count = low + (high - low + 1) / 2;
        if (fits(grid))
            low = grid.count;
        else
            high = grid.count - 1;
    }
    return low;
}

/// The grid of whole frames that begins with the range; its last one lies before the end.
SampleGrid makeGrid(const TimeRange& range, const IPlugin& scene) {
    // Whole numbers of frames come out a little too small for some ranges.
    constexpr double tolerance = 1e-6;
    const double rate = readFrameRate(scene);
    const double frames = (range.end.seconds() - range.start.seconds()) * rate + tolerance;
    const auto step = base::saturate<i64>(static_cast<double>(TimeCode::ticksPerSecond) / rate);
    // At the ends of time the seconds are coarser than the frames.
    const base::u64 most = ticksBetween(range.start, range.end) / static_cast<base::u64>(step) + 1;
    return {range.start, step,
            static_cast<u32>(std::min<base::u64>(base::saturate<u32>(frames), most))};
}

void logCut(const IPlugin& scene, u32 wanted, u32 exported) {
    base::log().log(base::logScene, base::logError,
                    "gltf |{}| The animation has {} frames, only the first {} are exported!",
                    scene.getName(), wanted, exported);
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

/// Room for the samples of all nodes, in one block: in blocks of their own those of each frame
/// would lie on as many pages of memory as there are channels.
class SampleRoom {
public:
    explicit SampleRoom(base::u64 byteLength) {
        floats_.resizeUninitialized(byteLength / sizeof(float));
        base::askForLargePages(floats_.data(), floats_.byteLength());
    }
    void give(NodeAnimation& entry, std::size_t count) {
        give(entry.translations, entry, Channel::translation, count);
        give(entry.scales, entry, Channel::scale, count);
        give(entry.rotations, entry, Channel::rotation, count);
    }
    vector<float> take() { return std::move(floats_); }

private:
    template <class T>
    void give(T*& samples, const NodeAnimation& entry, Channel::Path path, std::size_t count) {
        if ((entry.paths & 1u << path) == 0)
            return;
        samples = reinterpret_cast<T*>(floats_.data() + used_);
        used_ += count * sizeof(T) / sizeof(float);
    }

    vector<float> floats_;
    std::size_t used_ = 0;
};

/// An accessor to samples, which are borrowed; null if there are none.
ref<GLTF::Accessor> makeOutput(Type type, const void* samples, std::size_t count) {
    if (count == 0)
        return nullptr;
    const std::size_t length =
        count * sizeof(float) * static_cast<std::size_t>(GLTF::Accessor::numberOfComponents(type));
    auto accessor = base::makeRef<GLTF::Accessor>(
        type, GLTF::componentFloat, 0, static_cast<i32>(count),
        base::makeRef<GLTF::BufferView>(samples, static_cast<i32>(length),
                                        GLTF::BufferView::noTarget, false));
    accessor->computeMinMax();
    return accessor;
}

/// Gives the samples of all entries to the document.
class SampleWriter {
public:
    SampleWriter(GLTF::Asset& asset, const SampleGrid& grid) : asset_(asset), grid_(grid) {}

    void write(NodeAnimation& entry) {
        for (const ref<Channel>& channel : std::as_const(entry.animation->channels)) {
            switch (channel->target.path) {
            case Channel::translation:
                channel->sampler.output =
                    makeOutput(Type::vec3, entry.translations, entry.sampleCount);
                break;
            case Channel::scale:
                channel->sampler.output = makeOutput(Type::vec3, entry.scales, entry.sampleCount);
                break;
            default:
                channel->sampler.output =
                    makeOutput(Type::vec4, entry.rotations, entry.sampleCount);
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
            if (grid_.isDistinct(i))
                seconds.push_back(grid_.secondsAt(i));
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
    SampleGrid grid = makeGrid(range, scene);
    const u32 wanted = grid.count;
    grid.count = std::min(wanted, maximumFrames);
    grid.count = greatestCount(grid, [&](const SampleGrid& cut) {
        return byteCount(cut, nodeAnimations) + byteCount(cut, morphAnimations) <= maximumBytes;
    });
    if (grid.count != wanted)
        logCut(scene, wanted, grid.count);
    if (grid.count > 1 && !grid.isDistinct(grid.count - 1))
        base::log().log(base::logScene, base::logWarning,
                        "gltf |{}| The animation is so late that frames have the same time, those "
                        "are left out!",
                        scene.getName());
    SampleRoom room(byteCount(grid, nodeAnimations));
    for (NodeAnimation& entry : nodeAnimations)
        room.give(entry, grid.countWithin({entry.start, entry.end}));
    samples_ = room.take();
    for (MorphAnimation& entry : morphAnimations)
        entry.weights.reserve(grid.countWithin({entry.start, entry.end}) * entry.targets.size());
    {
        SceneClock clock(scene);
        for (u32 i = 0; i < grid.count; ++i) {
            if (!grid.isDistinct(i))
                continue;
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
