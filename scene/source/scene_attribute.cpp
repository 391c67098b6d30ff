#include "scene_attribute.h"

namespace scene {

namespace {

template <class T>
bool load(const base::Attribute& attribute, std::span<double> components) {
    const auto* values = static_cast<const T*>(attribute.data());
    std::copy_n(values, components.size(), components.data());
    return true;
}

template <template <class> class Composite>
bool loadComposite(const base::Attribute& attribute, std::span<double> components) {
    const base::name_id type = attribute.type();
    if (type == base::TypeTraits<Composite<float>>::n_name)
        return load<float>(attribute, components);
    if (type == base::TypeTraits<Composite<double>>::n_name)
        return load<double>(attribute, components);
    return false;
}

template <class T>
using Scalar = T;

} // namespace

base::AttribMap* findItemMap(const base::AttribArray& items, base::u32 index) {
    base::Attribute* item = items.item(index);
    if (const base::AttribLink* link = item ? item->asLink() : nullptr)
        item = link->path().resolve();
    return item ? item->asMap() : nullptr;
}

bool loadReal(const base::Attribute& attribute, std::span<double> components) {
    switch (components.size()) {
    case 1:
        return loadComposite<Scalar>(attribute, components);
    case 3:
        return loadComposite<base::base_vec3>(attribute, components);
    case 4:
        return loadComposite<base::base_quat>(attribute, components) ||
               loadComposite<base::base_vec4>(attribute, components);
    default:
        return false;
    }
}

bool loadReal(const base::AttribMap& map, base::name_id name, std::span<double> components) {
    const base::Attribute* attribute = map.findAttribute(name);
    return !attribute || loadReal(*attribute, components);
}

} // namespace scene
