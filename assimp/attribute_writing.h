#pragma once

#include "scene_attribute.h"

#include <memory>

namespace assimp {

/// Appends an item of the type of `Schema` to a list of `object` and returns it.
template <class Schema>
base::AttribMap& appendItem(base::AttribMap& object,
                            const scene::SchemaAttribute<scene::Items>& list) {
    base::AttribArray& items = write(object, list);
    items.setTypeName(Schema::n_kind);
    auto item = std::make_unique<base::AttribMap>(object.factory(), Schema::n_kind);
    items.append(item.get());
    return *item.release();
}

/// Sets an attribute of `object`; one with its default is not stored.
template <class T>
void writeUnlessDefault(base::AttribMap& object, const scene::DefaultedAttribute<T>& name,
                        const T& value) {
    object.removeAttribute(name);
    if (value != name.defaultValue)
        write(object, name) = value;
}

} // namespace assimp
