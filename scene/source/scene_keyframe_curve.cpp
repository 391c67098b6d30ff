#include "scene_keyframe_curve.h"

#include "b_log.h"

namespace scene {

namespace {

using base::AttribMap;
using base::Attribute;

const Attribute* followed(const AttribMap& map, const AttribMap::Entry& entry) {
    return entry.second->asLink() ? map.findAttribute(entry.first) : entry.second;
}

template <class T>
void take(const AttribMap& map, const AttribMap::Entry& entry, T& value) {
    if (entry.second->type() == base::TypeTraits<T>::n_name)
        value = *static_cast<const T*>(entry.second->data());
    else if (const T* found = map.findAttribute<T>(entry.first)) // follows links, logs other types
        value = *found;
}

template <class T>
const Array<T>* vectorOf(const AttribMap& map, const AttribMap::Entry& entry) {
    return entry.second->type() == base::TypeTraits<T>::n_array_name
               ? static_cast<const Array<T>*>(entry.second->data())
               : map.findVecAttribute<T>(entry.first);
}

void takeInterpolation(const AttribMap& map, const AttribMap::Entry& entry, CurveData& data) {
    const Attribute* target = followed(map, entry);
    if (target && target->type() == base::TypeTraits<Enumeration>::n_array_name)
        data.codes = static_cast<const Array<Enumeration>*>(target->data());
    else if (target)
        take(map, entry, data.interpolation);
}

void readAttributes(const AttribMap& map, CurveData& data) {
    using Schema = keyframeChannelCurve_schema;
    for (const AttribMap::Entry& entry : map.entries()) {
        const base::name_id name = entry.first;
        if (name == Schema::n_times)
            data.times = vectorOf<base::TimeCode>(map, entry);
        else if (name == Schema::n_values)
            data.values = followed(map, entry);
        else if (name == Schema::n_interpolation)
            takeInterpolation(map, entry, data);
        else if (name == Schema::n_preExtrapolation)
            take(map, entry, data.preExtrapolation);
        else if (name == Schema::n_postExtrapolation)
            take(map, entry, data.postExtrapolation);
        else if (name == Schema::n_tangents)
            data.tangents = followed(map, entry);
        else if (name == Schema::n_weights)
            data.weights = followed(map, entry);
        else if (name == Schema::n_tension)
            take(map, entry, data.tension);
        else if (name == Schema::n_tightness)
            take(map, entry, data.tightness);
    }
}

} // namespace

void logCurve(int level, base::string_view text, const base::IPlugin& channel) {
    base::log().log(base::logScene, level, text, channel.getName());
}

const AttribMap* findOnlyCurve(const base::IPlugin& channel) {
    const base::AttribArray* curves = find(channel, keyframeChannel_schema::n_curves);
    return curves && curves->size() == 1 ? findItemMap(*curves, 0) : nullptr;
}

bool readCurve(const base::IPlugin& channel, CurveData& data) {
    const base::AttribArray* curves = find(channel, keyframeChannel_schema::n_curves);
    if (!curves || curves->size() == 0)
        return false;
    if (curves->size() > 1) {
        logCurve(base::logError, "keyframeChannel |{}| Wrong number of components in the curve",
                 channel);
        return false;
    }
    if (const AttribMap* map = findItemMap(*curves, 0))
        readAttributes(*map, data);
    return true;
}

} // namespace scene
