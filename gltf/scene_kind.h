#pragma once

#include "b_log.h"
#include "scene.h"

namespace gltf {

/// `object` as the class of its type. An object that was made before its type was registered is
/// not of that class: it is logged and counts as of no kind.
template <class T>
T* findClass(base::IPlugin& object) {
    T* found = dynamic_cast<T*>(&object);
    if (!found)
        base::log().log(base::logScene, base::logWarning,
                        "gltf |{}| An object of type '{}' was made before that type was known, it "
                        "is left out!",
                        object.getName(), object.typeName());
    return found;
}

/// The mesh that an attribute refers to; null for all else.
inline scene::IMesh* findMesh(const base::AttribMap& map,
                              const scene::SchemaAttribute<scene::Object>& name) {
    base::IPlugin* object = findObject(map, name);
    return object && object->typeName() == scene::mesh_schema::n_kind
               ? findClass<scene::IMesh>(*object)
               : nullptr;
}

} // namespace gltf
