#include "assimp/frame_sampler.h"

namespace assimp {

using base::i64;
using base::TimeCode;
using base::vector;

vector<TimeCode> FrameSampler::listFrames(TimeCode first, TimeCode last, i64 trackCount) {
    constexpr i64 mostFrames = 100'000;
    const i64 span = (last.ticks - first.ticks) / frameTicks_;
    const i64 keys = (span + 2) * trackCount;
    if (span >= mostFrames || keys > keysLeft_) {
        ++longMotions_;
        return {};
    }
    keysLeft_ -= keys;
    vector<TimeCode> times{first};
    const i64 whole = first.ticks / frameTicks_ - (first.ticks % frameTicks_ < 0);
    for (i64 t = (whole + 1) * frameTicks_; t < last.ticks; t += frameTicks_)
        times.push_back({t});
    if (first < last)
        times.push_back(last);
    return times;
}

} // namespace assimp
