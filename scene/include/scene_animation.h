#pragma once

#include "scene.h"

#include <optional>

/// Animation layers: they place clips of channels on the scene's timeline and hold the values that
/// animated attributes are linked to.
namespace scene {

/// A layer publishes one value per channel position in its attribute `outputs`; the attributes of
/// animated objects are links to these. Outputs are made when they are first needed, have the type
/// that the channel yields and are never written to files; quaternions among them have unit
/// length. Of several clips that play at one time the last in `actions` decides.
///
/// A link that reads an output brings it up to date if need be. Who moves the scene's time tells
/// each layer by `changed`; who changes `time` or `actions` without announcing it
/// (`findAttributeMutable` does) calls `rebuildActiveClips`. Channels are not watched: after a
/// change of one of them `rebuildActiveClips` is due too.
///
/// Faults of the data are logged and cost the output concerned alone. One thread at a time.
class SCENE_API IAnimLayer : public base::IPlugin,
                             public animLayer_schema,
                             public base::PluginCallback {
public:
    using Schema = animLayer_schema;
    using base::IPlugin::IPlugin;

    /// An action whose clip plays at the layer's time.
    struct AnimClipInfo {
        base::u32 action = 0;           ///< index in `actions`
        base::AttribWeakLink actionMap; ///< null once that is gone
        base::ref<base::IPlugin> clip;
        base::TimeCode playAt;
        base::i32 playSpeed = 100;     ///< percent
        base::AttribWeakLink channels; ///< the clip's `keyframeChannels`, null if it has none
    };

    /// Brings the outputs that are out of date to the value of `time` (0, with a message, if it is
    /// missing): that at `channelIndex`, or all with -1. With `typeFilter`, the name of a value
    /// type or of its vectors, only outputs of that type are written; the others count as up to
    /// date all the same.
    void update(base::name_id typeFilter = {}, base::i32 channelIndex = -1);
    /// Finds the clips that play at the value of `time` (none without it) and marks all outputs as
    /// out of date.
    void rebuildActiveClips();

    /// In the order of `actions`.
    const base::vector<AnimClipInfo>& activeClips() const noexcept { return activeClips_; }
    /// One flag for each output, not 0 where it is out of date.
    const base::vector<base::u8>& outputMask() const noexcept { return outputMask_; }

    /// With `eventTimeChanged`, `path` names the scene's time, which stands in for an own time
    /// that is missing or no link: brings all outputs up to date. A path that leads to no time
    /// counts as 0.
    void changed(base::u32 code, const base::AttribPath& path) override;

    void markCreated() override;
    void afterLoad(base::i32 version) override;
    /// True for an output behind which there are keys.
    bool isPathKeyed(const base::AttribPath& path) const override;
    bool isPathAnimated(const base::AttribPath& path) const override;
    void pathChanged(const base::AttribPath& path, base::u32 mode) override;

    /// Sets a key, see `setKey` of channels, of the channel that decides output `index` at `time`,
    /// which is one of the layer's timeline. False, with a message, if there is none. T is one of
    /// the types that channels yield.
    template <class T>
    bool setKey(base::u32 index, base::TimeCode time, const T& value);

    /// Adds the times, on the scene's timeline, of the keys behind output `index`, of all clips
    /// that the layer ever plays. Neither sorted nor unique.
    void collectKeyTimes(base::u32 index, base::vector<base::TimeCode>& times) const;

private:
    using OptionalTime = std::optional<base::TimeCode>;

    OptionalTime findTime(const OptionalTime& sceneTime) const;
    void rebuildAt(const OptionalTime& time);
    void updateAt(base::TimeCode time, base::name_id typeFilter, base::i32 channelIndex);
    base::AttribArray& makeOutputs();
    bool isDriven(base::u32 index) const;
    void updateOutput(base::AttribArray& outputs, const AnimClipInfo& info,
                      const base::IPlugin* channel, base::u32 index, base::TimeCode localTime,
                      base::name_id typeFilter);

    base::vector<base::u8> outputMask_;
    base::vector<AnimClipInfo> activeClips_;
    bool areClipsBuilt_ = false;
    bool isBusy_ = false; ///< evaluating: what is read meanwhile may lead back here
    bool toldMissingPlayAt_ = false;
};

/// The output of a layer that `path` names; absent if it names none.
std::optional<base::u32> findOutputIndex(const base::AttribPath& path);

/// Merges the times of the keys that `attribute`, a link to an output of a layer, perhaps through
/// other links, gets its value from into `times`, which stays sorted and without duplicates.
void mergeKeyTimes(const base::Attribute* attribute, base::vector<base::TimeCode>& times);

} // namespace scene
