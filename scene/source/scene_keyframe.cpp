#include "scene_keyframe.h"

#include "scene_keyframe_spline.h"

#include "b_exception.h"
#include "b_log.h"

#include <optional>

namespace scene {

namespace {

using base::TimeCode;
using base::u64;
using base::u8;

/// Up to a microsecond after a key the value is the key's; it also covers the last key itself.
constexpr u64 ticksOfKey = 46187;

enum Extrapolation : u8 {
    extrapolateConstant = 0,
    extrapolateLinear = 1,
    extrapolateCycle = 2,
    extrapolateCycleOffset = 3,
    extrapolateOscillate = 4,
};

/// The first key behind `time`, `count` if there is none. The steps are part of what a curve with
/// unsorted times yields.
std::size_t findKeyAfter(const TimeCode* times, std::size_t count, TimeCode time) {
    std::size_t low = 0, high = count;
    while (high - low > 3) {
        const std::size_t middle = low + (high - low) / 2;
        if (times[middle] <= time)
            low = middle;
        else
            high = middle;
    }
    while (low < high && times[low] <= time)
        ++low;
    return low;
}

/// One evaluation of a curve at one time.
template <class T>
class Evaluation {
public:
    Evaluation(const CurveData& curve, const base::IPlugin& channel, TimeCode time)
        : curve_(curve), channel_(channel), time_(time) {}

    T run() {
        if (!loadValues())
            return T{};
        if (keys_.count == 1)
            return keyValue(0);
        if (!loadTimes())
            return T{};
        interpolation_ = curve_.interpolation;
        if (!curve_.codes && interpolation_ == interpolateBezier)
            interpolation_ = bezierOrLinear();

        const bool isBefore = time_ < keys_.firstTime();
        if (isBefore || keys_.lastTime() < time_)
            if (const std::optional<T> value = extrapolate(isBefore))
                return *value;
        const std::size_t next = findKeyAfter(keys_.times, keys_.count, time_);
        if (next == 0)
            return keyValue(0);
        if (ticksBetween(keys_.times[next - 1], time_) < ticksOfKey)
            return keyValue(next - 1);
        return interpolate(std::min(next, keys_.count - 1));
    }

private:
    using Value = typename KeyTraits<T>::Value;
    using Number = typename KeyTraits<T>::Number;

    bool fail(base::string_view text) const {
        logCurve(base::logError, text, channel_);
        return false;
    }

    bool loadValues() {
        if (curve_.values && !keys_.values.view(curve_.values))
            return fail("keyframeChannel |{}| Incompatible 'values' type!");
        keys_.count = keys_.values.size();
        return keys_.count != 0 || fail("keyframeChannel |{}| Empty 'values' attribute detected!");
    }

    bool loadTimes() {
        if (!curve_.times || curve_.times->empty())
            return fail("keyframeChannel |{}| Empty 'times' attribute detected!");
        if (curve_.times->size() != keys_.count)
            return fail("keyframeChannel |{}| Different number of 'keys' and 'values' detected!");
        keys_.times = curve_.times->data();
        return true;
    }

    /// Linear, with a message, where there are no tangents for a Bezier curve.
    u8 bezierOrLinear() {
        if (!keys_.tangents.view(curve_.tangents) || keys_.tangents.size() != 2 * keys_.count) {
            logCurve(base::logWarning,
                     "keyframeChannel |{}| Missing or wrong tangents provided for the Bezier "
                     "curve! Falling back to linear interpolation!",
                     channel_);
            return interpolateLinear;
        }
        if (curve_.weights && (!keys_.weights.view(curve_.weights) ||
                               keys_.weights.size() != keys_.tangents.size())) {
            logCurve(base::logWarning,
                     "keyframeChannel |{}| Invalid tangent weights provided for the Bezier curve! "
                     "The curve will not work properly!",
                     channel_);
            keys_.weights = {};
        }
        return interpolateBezier;
    }

    u8 codeOf(std::size_t key) {
        if (!curve_.codes)
            return interpolation_;
        const u8 code = key < curve_.codes->size() ? (*curve_.codes)[key] : u8{interpolateLinear};
        return code == interpolateBezier ? bezierOrLinear() : code;
    }

    T keyValue(std::size_t key) const {
        // Single precision does not hold every integer.
        if constexpr (std::is_same_v<T, base::i32>)
            if (offset_ == Value())
                return keys_.values.stored(key);
        return makeKeyValue<T>(keys_.values[key] + offset_);
    }

    /// The value outside the keys; absent where the time was moved in between them.
    std::optional<T> extrapolate(bool isBefore) {
        const TimeCode first = keys_.firstTime(), last = keys_.lastTime();
        const std::size_t end = isBefore ? 0 : keys_.count - 1;
        const u8 code = isBefore ? curve_.preExtrapolation : curve_.postExtrapolation;
        if (last <= first || code == extrapolateConstant || code > extrapolateOscillate)
            return keyValue(end);
        if (code == extrapolateLinear) {
            const double seconds = secondsBetween(keys_.times[end], time_);
            return makeKeyValue<T>(keys_.values[end] +
                                   slopeAt(isBefore) * static_cast<Number>(seconds));
        }
        const u64 period = ticksBetween(first, last);
        const u64 distance = isBefore ? ticksBetween(time_, first) : ticksBetween(last, time_);
        const u64 whole = distance / period, rest = distance % period;
        u64 inward = 0; // from the end that was passed
        if (code == extrapolateOscillate)
            inward = whole % 2 == 0 ? rest : period - rest;
        else
            inward = (period - rest) % period;
        time_.ticks = static_cast<base::i64>(isBefore ? static_cast<u64>(first.ticks) + inward
                                                      : static_cast<u64>(last.ticks) - inward);
        if (code == extrapolateCycleOffset) {
            const auto periods = static_cast<Number>(whole) + static_cast<Number>(rest != 0);
            offset_ = (keys_.values.back() - keys_.values[0]) * (isBefore ? -periods : periods);
        }
        return std::nullopt;
    }

    /// Change a second at the first or the last key.
    Value slopeAt(bool isFirst) {
        switch (codeOf(0)) {
        case interpolateConstant:
            return {};
        case interpolateLinear: {
            const std::size_t end = isFirst ? 1 : keys_.count - 1;
            const auto duration = static_cast<Number>(keys_.duration(end));
            return duration == 0 ? Value() : (keys_.values[end] - keys_.values[end - 1]) / duration;
        }
        case interpolateSpline: {
            const CurveSpline<T> spline(keys_, curve_.tension, curve_.tightness);
            if (!spline.isClosed())
                return {};
            const auto tangent = spline.tangentAt(isFirst ? 0 : keys_.count - 1, isFirst);
            return tangent.time == 0 ? Value::of([](std::size_t) { return Number(1); })
                                     : tangent.value / tangent.time;
        }
        case interpolateBezier:
            return isFirst ? keys_.tangents[0] : keys_.tangents.back();
        default:
            throw base::switch_exception("scene_keyframe", "scene::computeValue", __LINE__);
        }
    }

    /// The value in the segment that ends at key `end`.
    T interpolate(std::size_t end) {
        switch (codeOf(end)) {
        case interpolateConstant:
            return keyValue(end - 1);
        case interpolateLinear:
            return makeKeyValue<T>(interpolateSegmentLinear(keys_, end, time_) + offset_);
        case interpolateSpline: {
            const CurveSpline<T> spline(keys_, curve_.tension, curve_.tightness);
            return makeKeyValue<T>(spline.interpolate(end, time_) + offset_);
        }
        case interpolateBezier:
            return makeKeyValue<T>(interpolateSegmentBezier(keys_, end, time_) + offset_);
        default:
            throw base::switch_exception("scene_keyframe", "scene::computeValue", __LINE__);
        }
    }

    const CurveData& curve_;
    const base::IPlugin& channel_;
    TimeCode time_;
    CurveKeys<T> keys_;
    Value offset_{};
    u8 interpolation_ = interpolateLinear; ///< of all segments, where there is no code for each
};

} // namespace

template <class T>
T evaluateCurve(const CurveData& curve, const base::IPlugin& channel, TimeCode time) {
    return Evaluation<T>(curve, channel, time).run();
}

template <class T>
T computeValue(const IKeyframeChannel& channel, TimeCode time) {
    CurveData curve;
    return readCurve(channel, curve) ? evaluateCurve<T>(curve, channel, time) : T{};
}

base::name_id findValueType(const IKeyframeChannel& channel) {
    const base::AttribMap* curve = findOnlyCurve(channel);
    const base::Attribute* values =
        curve ? curve->findAttribute(keyframeChannelCurve_schema::n_values) : nullptr;
    base::name_id name;
    if (values)
        visitKeyType(values->type(),
                     [&]<class T>(std::type_identity<T>) { name = base::TypeTraits<T>::n_name; });
    return name;
}

#define SCENE_INSTANTIATE(T)                                                       \
    template T evaluateCurve<T>(const CurveData&, const base::IPlugin&, TimeCode); \
    template T computeValue<T>(const IKeyframeChannel&, TimeCode);
SCENE_KEY_TYPES(SCENE_INSTANTIATE)

} // namespace scene
