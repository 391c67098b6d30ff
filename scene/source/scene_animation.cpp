#include "scene_animation.h"

#include "scene_animation_action.h"
#include "scene_keyframe.h"
#include "scene_keyframe_curve.h"

#include "b_exception.h"
#include "b_log.h"

namespace scene {

namespace {

using base::AttribPath;
using base::TimeCode;
using base::u32;

constexpr base::u8 outOfDate = 1;
constexpr u32 outputFlags = base::attribTransient | base::attribUntracked;

/// Marks a layer as being evaluated while it lives.
class BusyScope : public base::NonCopyable {
public:
    explicit BusyScope(bool& isBusy) : isBusy_(isBusy), before_(isBusy) { isBusy_ = true; }
    ~BusyScope() { isBusy_ = before_; }

private:
    bool& isBusy_;
    bool before_;
};

template <class T>
T unitLength(const T& value) {
    if constexpr (isQuaternion<T>) {
        using Number = decltype(value.x);
        /// Shorter ones have no direction.
        constexpr Number least = Number(1e-12);
        /// Squared lengths this far from 1 are left alone.
        constexpr Number tolerance = Number(1e-8);
        const Number squared =
            value.x * value.x + value.y * value.y + value.z * value.z + value.w * value.w;
        if (!(squared > least) || std::isinf(squared))
            return T{};
        if (std::abs(squared - 1) < tolerance)
            return value;
        const Number factor = 1 / std::sqrt(squared);
        return {value.x * factor, value.y * factor, value.z * factor, value.w * factor};
    } else {
        return value;
    }
}

/// Stores `value` in the output at `index`, which gets the type T if it has another one.
template <class T>
void storeOutput(base::AttribArray& outputs, u32 index, const T& value) {
    base::Attribute* output = outputs.item(index);
    if (!output || output->type() != base::TypeTraits<T>::n_name) {
        output = new base::TypedAttribute<T>();
        outputs.setItem(index, output);
    }
    output->setFlags(output->flags() | outputFlags);
    *static_cast<T*>(output->data()) = value;
}

} // namespace

std::optional<u32> findOutputIndex(const AttribPath& path) {
    const base::vector<base::PathStep>& steps = path.steps();
    if (steps.size() < 3 || steps[1].kind != base::PathStepKind::attribute ||
        steps[1].name != animLayer_schema::n_outputs ||
        steps[2].kind != base::PathStepKind::element)
        return std::nullopt;
    return steps[2].index;
}

/// The layer's time. An own one that is a link stays with what it is linked to; `sceneTime` stands
/// in for any other.
IAnimLayer::OptionalTime IAnimLayer::findTime(const OptionalTime& sceneTime) const {
    const base::Attribute* own = findAttribute(n_time, false);
    if (!own || (sceneTime && !own->asLink()))
        return sceneTime;
    const TimeCode* time = find(*this, n_time);
    return time ? OptionalTime(*time) : sceneTime;
}

void IAnimLayer::rebuildActiveClips() {
    const BusyScope busy(isBusy_);
    rebuildAt(findTime({}));
}

void IAnimLayer::rebuildAt(const OptionalTime& time) {
    activeClips_.clear();
    std::fill(outputMask_.begin(), outputMask_.end(), outOfDate);
    areClipsBuilt_ = true;
    const base::AttribArray* actions = time ? find(*this, n_actions) : nullptr;
    const u32 count = actions ? actions->size() : 0;
    for (u32 i = 0; i < count; ++i) {
        base::AttribMap* map = findItemMap(*actions, i);
        if (!map)
            continue;
        const LayerAction action = readAction(*map);
        if (!action.playAt && !toldMissingPlayAt_) {
            toldMissingPlayAt_ = true;
            base::log().log(base::logScene, base::logWarning,
                            "gltf |{}| Action {} of the layer has no 'playAt', it is not played!",
                            getName(), i);
        }
        if (!action.playsAt(*time))
            continue;
        if (action.isNegative()) {
            base::log().log(base::logScene, base::logWarning,
                            "animLayer |{}| Negative animation clip duration!", getName());
            continue;
        }
        AnimClipInfo& info = activeClips_.emplace_back();
        info.action = i;
        info.actionMap.set(map);
        info.clip = base::ref<base::IPlugin>(action.clip);
        info.playAt = *action.playAt;
        info.playSpeed = action.playSpeed;
        info.channels.set(action.clip->findAttribute(animClip_schema::n_keyframeChannels));
    }
}

void IAnimLayer::update(base::name_id typeFilter, base::i32 channelIndex) {
    const BusyScope busy(isBusy_);
    const OptionalTime time = findTime({});
    if (!time)
        base::log().log(base::logScene, base::logWarning,
                        "animLayer |{}| is missing time attribute!", getName());
    updateAt(time.value_or(TimeCode()), typeFilter, channelIndex);
}

/// The own array of outputs; made in place of anything else.
base::AttribArray& IAnimLayer::makeOutputs() {
    base::Attribute* own = findAttribute(n_outputs, false, false);
    if (!own || !own->asArray())
        attribute(n_outputs, own = new base::AttribArray);
    return *own->asArray();
}

void IAnimLayer::updateAt(TimeCode time, base::name_id typeFilter, base::i32 channelIndex) {
    base::AttribArray& outputs = makeOutputs();
    const auto single = static_cast<u32>(channelIndex);
    for (const AnimClipInfo& info : std::as_const(activeClips_)) {
        const auto* channels = channelsOf(info.channels.target());
        const u32 count = channels ? static_cast<u32>(channels->size()) : 0;
        if (count == 0)
            continue;
        const TimeCode* start = find(*info.clip, animClip_schema::n_startTime);
        const TimeCode localTime =
            clipTime(time, info.playAt, info.playSpeed, start ? *start : TimeCode());
        if (outputMask_.size() < count)
            outputMask_.resize(count, outOfDate);
        if (outputs.size() < count)
            outputs.setItem(count - 1, nullptr);
        if (channelIndex != -1 && single >= count) {
            base::log().log(base::logScene, base::logWarning,
                            "animLayer |{}| Animation clip '{}' has no channel at index {}! "
                            "Skipping calculation.",
                            getName(), info.clip->getName(), channelIndex);
            continue;
        }
        const u32 first = channelIndex == -1 ? 0 : single;
        const u32 end = channelIndex == -1 ? count : single + 1;
        for (u32 i = first; i < end; ++i)
            if (std::as_const(outputMask_)[i] != 0)
                updateOutput(outputs, info, (*channels)[i].get(), i, localTime, typeFilter);
    }
    if (channelIndex == -1)
        std::fill(outputMask_.begin(), outputMask_.end(), base::u8{0});
    else if (single < outputMask_.size())
        outputMask_[single] = 0;
}

void IAnimLayer::updateOutput(base::AttribArray& outputs, const AnimClipInfo& info,
                              const base::IPlugin* channel, u32 index, TimeCode localTime,
                              base::name_id typeFilter) {
    const auto tell = [&](base::string_view text) {
        base::log().log(base::logScene, base::logWarning, text, getName(), channel->getName());
    };
    if (!channel) {
        base::log().log(base::logScene, base::logWarning,
                        "animLayer |{}| Animation clip '{}' has no keyframe assigned for channel "
                        "at index {}! Skipping calculation.",
                        getName(), info.clip->getName(), index);
        return;
    }
    CurveData curve;
    if (!readCurve(*channel, curve) || !curve.values)
        return tell("animLayer |{}| Keyframe '{}' has no valid data! Skipping calculation.");
    const auto evaluate = [&]<class T>(std::type_identity<T>) {
        using Traits = base::TypeTraits<T>;
        if (!typeFilter || typeFilter == Traits::n_name || typeFilter == Traits::n_array_name)
            storeOutput(outputs, index, unitLength(evaluateCurve<T>(curve, *channel, localTime)));
    };
    try {
        if (!visitKeyType(curve.values->type(), evaluate))
            tell("animLayer |{}| Keyframe '{}' has unknown type! Skipping calculation.");
    } catch (const base::exception& e) {
        e.report(base::log());
    }
}

void IAnimLayer::changed(u32 code, const AttribPath& path) {
    if (code != base::eventTimeChanged || isBusy_)
        return;
    const BusyScope busy(isBusy_);
    const base::Attribute* named = path.resolve();
    const bool isTime = named && named->type() == base::TypeTraits<TimeCode>::n_name;
    const OptionalTime time =
        findTime(isTime ? *static_cast<const TimeCode*>(named->data()) : TimeCode());
    rebuildAt(time);
    updateAt(*time, {}, -1);
}

void IAnimLayer::markCreated() {
    base::IPlugin::markCreated();
    rebuildActiveClips();
}

void IAnimLayer::afterLoad(base::i32 version) {
    base::IPlugin::afterLoad(version);
    rebuildActiveClips();
}

/// True if a clip that plays has a channel for output `index`.
bool IAnimLayer::isDriven(u32 index) const {
    return std::ranges::any_of(activeClips_, [&](const AnimClipInfo& info) {
        const auto* channels = channelsOf(info.channels.target());
        return channels && index < channels->size();
    });
}

void IAnimLayer::pathChanged(const AttribPath& path, u32 mode) {
    if (isBusy_ || path.steps().size() < 2)
        return;
    if (mode == 0) {
        const std::optional<u32> index = findOutputIndex(path);
        if (!index || (areClipsBuilt_ && *index < outputMask_.size() &&
                       std::as_const(outputMask_)[*index] == 0))
            return;
        if (!areClipsBuilt_)
            rebuildActiveClips();
        else if (!isDriven(*index))
            return;
        update({}, static_cast<base::i32>(*index));
        return;
    }
    const base::name_id name = path.steps()[1].name;
    if (name != n_time && name != n_actions)
        return;
    rebuildActiveClips();
    update();
    // The change may be still to come: who reads an output after it finds nothing up to date.
    areClipsBuilt_ = false;
    std::fill(outputMask_.begin(), outputMask_.end(), outOfDate);
}

bool IAnimLayer::isPathKeyed(const AttribPath& path) const {
    const std::optional<u32> index = findOutputIndex(path);
    if (!index)
        return false;
    base::vector<TimeCode> times;
    collectKeyTimes(*index, times);
    return !times.empty();
}

bool IAnimLayer::isPathAnimated(const AttribPath& path) const {
    return isPathKeyed(path);
}

} // namespace scene
