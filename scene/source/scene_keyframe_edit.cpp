#include "scene_keyframe.h"

#include "scene_keyframe_curve.h"

#include "b_log.h"

#include <algorithm>
#include <optional>

namespace scene {

namespace {

using base::Attribute;
using base::TimeCode;

/// The number of a weight with which a weighted segment runs as one without weights.
constexpr double neutralWeight = 1.0 / 3;

template <class T>
using KeyNumbers = Components<typename KeyTraits<T>::Stored, KeyTraits<T>::count>;

/// A vector attribute of values for keys of T, for changing it.
template <class T>
class KeyList {
public:
    /// Nothing where `attribute` is null.
    explicit KeyList(Attribute* attribute) : attribute_(attribute) {}

    bool isCompatible() const { return KeyVector<T>().view(attribute_); }
    std::size_t size() const { return attribute_ ? attribute_->size() : 0; }

    void insert(std::size_t at, std::size_t count, const KeyNumbers<T>& numbers) {
        use(
            [&](auto& elements, const auto& element) {
                for (std::size_t i = 0; i < count; ++i)
                    elements.insert(elements.cbegin() + at, element);
            },
            numbers);
    }
    void set(std::size_t at, const KeyNumbers<T>& numbers) {
        use([&](auto& elements, const auto& element) { elements[at] = element; }, numbers);
    }

private:
    template <class Use>
    void use(const Use& use, const KeyNumbers<T>& numbers) {
        useAny(use, numbers, typename KeyTraits<T>::Accepted());
    }
    template <class Use, class... Elements>
    void useAny(const Use& use, const KeyNumbers<T>& numbers, ElementTypes<Elements...>) {
        const auto useAs = [&]<class Element>(std::type_identity<Element>) {
            if (attribute_->type() != base::TypeTraits<Element>::n_array_name)
                return false;
            use(*static_cast<base::vector<Element>*>(attribute_->data()),
                std::bit_cast<Element>(numbers));
            return true;
        };
        static_cast<void>((useAs(std::type_identity<Elements>()) || ...));
    }

    Attribute* attribute_;
};

base::AttribMap* findCurveToChange(const IKeyframeChannel& channel) {
    const base::AttribArray* curves = find(channel, keyframeChannel_schema::n_curves);
    if (curves && curves->size() > 1) {
        logCurve(base::logError, "keyframeChannel |{}| Wrong number of components in the curve!",
                 channel);
        return nullptr;
    }
    base::AttribMap* curve = curves ? findItemMap(*curves, 0) : nullptr;
    if (!curve)
        logCurve(base::logError, "keyframeChannel |{}| Trying to set a key without any curves!",
                 channel);
    return curve;
}

/// The attribute, made as a vector of T where the curve has none.
template <class T>
Attribute* makeVector(base::AttribMap& curve, base::name_id name) {
    if (!curve.findAttribute(name))
        static_cast<void>(curve.vecAttribute<T>(name));
    return curve.findAttributeMutable(name);
}

/// The number of elements of a vector attribute, 0 without it; absent, and logged, where it leads
/// nowhere.
std::optional<std::size_t> findSize(const base::AttribMap& curve, base::name_id name) {
    const Attribute* attribute = curve.findAttribute(name);
    if (!attribute && curve.findAttribute(name, false))
        return std::nullopt;
    return attribute ? attribute->size() : 0;
}

/// Tells what does not fit and answers false.
template <class T>
bool canTakeKey(const base::AttribMap& curve, const IKeyframeChannel& channel) {
    using Schema = keyframeChannelCurve_schema;
    const auto fail = [&](base::string_view text) {
        logCurve(base::logError, text, channel);
        return false;
    };
    const Attribute* times = curve.findAttribute(Schema::n_times);
    const auto keyCount = findSize(curve, Schema::n_times);
    if (!keyCount || (times && times->type() != base::TypeTraits<TimeCode>::n_array_name))
        return fail("keyframeChannel |{}| Different number of 'keys' and 'values' detected!");
    for (const base::name_id name :
         {base::name_id(Schema::n_values), base::name_id(Schema::n_tangents),
          base::name_id(Schema::n_weights)}) {
        Attribute* attribute = curve.findAttribute(name);
        const auto size = findSize(curve, name);
        if (!size || (attribute && !KeyList<T>(attribute).isCompatible()))
            return fail("keyframeChannel |{}| Incompatible 'values' type!");
        const bool isValues = name == Schema::n_values;
        if (*size != (isValues ? *keyCount : 2 * *keyCount) && (isValues || *size != 0))
            return fail("keyframeChannel |{}| Different number of 'keys' and 'values' detected!");
    }
    return true;
}

/// Gives the interpolation of the segment that the key at `at` parts or continues to that key.
void insertCode(base::AttribMap& curve, std::size_t at) {
    Attribute* attribute = curve.findAttributeMutable(keyframeChannelCurve_schema::n_interpolation);
    if (!attribute || attribute->type() != base::TypeTraits<Enumeration>::n_array_name)
        return;
    auto& codes = *static_cast<Array<Enumeration>*>(attribute->data());
    if (at <= codes.size() && !codes.empty())
        codes.insert(codes.cbegin() + at, std::as_const(codes)[std::min(at, codes.size() - 1)]);
}

} // namespace

template <class T>
bool setKey(IKeyframeChannel& channel, TimeCode time, const T& value,
            const KeyTangents<T>* tangents) {
    using Schema = keyframeChannelCurve_schema;
    base::AttribMap* curve = findCurveToChange(channel);
    if (!curve || !canTakeKey<T>(*curve, channel))
        return false;

    Attribute* timesAttribute = makeVector<TimeCode>(*curve, Schema::n_times);
    auto& times = *static_cast<KeyTimes*>(timesAttribute->data());
    KeyList<T> values(makeVector<T>(*curve, Schema::n_values));
    KeyList<T> tangentList(tangents ? makeVector<T>(*curve, Schema::n_tangents)
                                    : curve->findAttributeMutable(Schema::n_tangents));
    if (tangents && tangentList.size() == 0)
        tangentList.insert(0, 2 * times.size(), KeyNumbers<T>());
    KeyList<T> weights(curve->findAttributeMutable(Schema::n_weights));

    const auto place = std::lower_bound(times.cbegin(), times.cend(), time);
    const auto at = static_cast<std::size_t>(place - times.cbegin());
    const bool hasTangents = tangents || tangentList.size() != 0;
    const bool hasWeights = weights.size() != 0;
    if (place != times.cend() && *place == time) {
        values.set(at, std::bit_cast<KeyNumbers<T>>(value));
    } else {
        times.insert(place, time);
        values.insert(at, 1, std::bit_cast<KeyNumbers<T>>(value));
        if (hasTangents)
            tangentList.insert(2 * at, 2, KeyNumbers<T>());
        if (hasWeights)
            weights.insert(2 * at, 2, KeyNumbers<T>::of([](std::size_t) {
                               return static_cast<typename KeyTraits<T>::Stored>(neutralWeight);
                           }));
        insertCode(*curve, at);
    }
    if (tangents) {
        tangentList.set(2 * at, std::bit_cast<KeyNumbers<T>>(tangents->in));
        tangentList.set(2 * at + 1, std::bit_cast<KeyNumbers<T>>(tangents->out));
    }
    return true;
}

#define SCENE_INSTANTIATE(T) \
    template bool setKey<T>(IKeyframeChannel&, TimeCode, const T&, const KeyTangents<T>*);
SCENE_KEY_TYPES(SCENE_INSTANTIATE)

} // namespace scene
