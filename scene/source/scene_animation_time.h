#pragma once

#include "b_types.h"

#include <limits>

/// The clocks of layers and clips.
namespace scene {

/// Wide enough for a time multiplied by a speed.
__extension__ using WideTicks = __int128;

inline base::TimeCode saturatedTime(WideTicks ticks) {
    constexpr WideTicks least = std::numeric_limits<base::i64>::min();
    constexpr WideTicks greatest = std::numeric_limits<base::i64>::max();
    return {static_cast<base::i64>(ticks < least ? least : ticks > greatest ? greatest : ticks)};
}

/// `ticks` at `percent` of the speed, truncated.
inline WideTicks scaledTicks(WideTicks ticks, base::i32 percent) {
    return percent == 100 ? ticks : ticks * percent / 100;
}

/// The time inside a clip when the layer is at `time`.
inline base::TimeCode clipTime(base::TimeCode time, base::TimeCode playAt, base::i32 playSpeed,
                               base::TimeCode startTime) {
    return saturatedTime(scaledTicks(WideTicks(time.ticks) - playAt.ticks, playSpeed) +
                         startTime.ticks);
}

/// The time of the layer when the clip is at `key`. `playSpeed` is not 0.
inline base::TimeCode layerTime(base::TimeCode key, base::TimeCode playAt, base::i32 playSpeed,
                                base::TimeCode startTime) {
    const WideTicks played = WideTicks(key.ticks) - startTime.ticks;
    return saturatedTime((playSpeed == 100 ? played : played * 100 / playSpeed) + playAt.ticks);
}

} // namespace scene
