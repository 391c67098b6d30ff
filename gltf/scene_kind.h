#pragma once

#include "b_factory.h"
#include "b_log.h"

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

} // namespace gltf
