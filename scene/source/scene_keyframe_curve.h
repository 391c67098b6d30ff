#pragma once

#include "scene_keyframe_value.h"

#include "scene.h"

/// Curves as their maps hold them, for what evaluates and changes them.
namespace scene {

using KeyTimes = base::vector<base::TimeCode>;

/// What one curve holds. Borrowed from its map; what is absent is null or has its default.
struct CurveData {
    const KeyTimes* times = nullptr;
    const base::Attribute* values = nullptr;
    const base::Attribute* tangents = nullptr;
    const base::Attribute* weights = nullptr;
    const Array<Enumeration>* codes = nullptr; ///< an interpolation for each key
    Enumeration interpolation = keyframeChannelCurve_schema::n_interpolation.defaultValue;
    Enumeration preExtrapolation = keyframeChannelCurve_schema::n_preExtrapolation.defaultValue;
    Enumeration postExtrapolation = keyframeChannelCurve_schema::n_postExtrapolation.defaultValue;
    float tension = keyframeChannelCurve_schema::n_tension.defaultValue;
    float tightness = keyframeChannelCurve_schema::n_tightness.defaultValue;
};

enum Interpolation : base::u8 {
    interpolateConstant = 0,
    interpolateLinear = 1,
    interpolateSpline = 2,
    interpolateBezier = 3,
};

/// The curve of a channel that has one, else null.
const base::AttribMap* findOnlyCurve(const base::IPlugin& channel);

/// Sets `data`, which is as new, to what the only curve of `channel` holds, in one pass over its
/// map; a gap in the list is a curve without attributes. False if there is none or, which is
/// logged, if there are several.
bool readCurve(const base::IPlugin& channel, CurveData& data);

/// The value at `time`, see `computeValue`; messages name `channel`.
template <class T>
T evaluateCurve(const CurveData& curve, const base::IPlugin& channel, base::TimeCode time);

void logCurve(int level, base::string_view text, const base::IPlugin& channel);

/// Ticks from `from` to a time that is not before it.
inline base::u64 ticksBetween(base::TimeCode from, base::TimeCode to) {
    return static_cast<base::u64>(to.ticks) - static_cast<base::u64>(from.ticks);
}
/// Seconds from `from` to `to`, negative if that is before.
inline double secondsBetween(base::TimeCode from, base::TimeCode to) {
    const double ticks = to < from ? -static_cast<double>(ticksBetween(to, from))
                                   : static_cast<double>(ticksBetween(from, to));
    return ticks * base::TimeCode::secondsPerTick;
}

} // namespace scene
