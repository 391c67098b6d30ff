#pragma once

#include "scene_attribute.h"

namespace gltf {

/// An index that is stored with or without a sign, `absent` where there is none. A negative one
/// lies past the end of every list.
inline base::u32 readIndex(const base::AttribMap& map,
                           const scene::DefaultedAttribute<base::i32>& name, base::u32 absent) {
    const base::Attribute* index = map.findAttribute(name);
    if (!index)
        return absent;
    if (index->type() == base::TypeTraits<base::u32>::n_name)
        return *static_cast<const base::u32*>(index->data());
    const base::i32* value = find(map, name);
    return value ? static_cast<base::u32>(*value) : absent;
}

} // namespace gltf
