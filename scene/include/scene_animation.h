#pragma once

#include "scene.h"

/// Animation layers: they place clips of channels on the scene's timeline and hold the values that
/// animated attributes are linked to.
namespace scene {

/// A layer publishes one value per channel position in its attribute `outputs`; the attributes of
/// animated objects are links to these. Outputs are made when they are first needed and are never
/// written to files. Of several clips that play at one time the last in `actions` decides.
class SCENE_API IAnimLayer : public base::IPlugin,
                             public animLayer_schema,
                             public base::PluginCallback {
public:
    using Schema = animLayer_schema;
    using base::IPlugin::IPlugin;

    /// With `eventTimeChanged`, `path` names the scene's time, which stands in for an own time
    /// that is missing or no link: brings all outputs up to date.
    void changed(base::u32 code, const base::AttribPath& path) override;

    /// Adds the times, on the scene's timeline, of the keys behind output `index`, of all clips
    /// that the layer ever plays. Neither sorted nor unique.
    void collectKeyTimes(base::u32 index, base::vector<base::TimeCode>& times) const;
};

/// Merges the times of the keys that `attribute`, a link to an output of a layer, perhaps through
/// other links, gets its value from into `times`, which stays sorted and without duplicates.
void mergeKeyTimes(const base::Attribute* attribute, base::vector<base::TimeCode>& times);

} // namespace scene
