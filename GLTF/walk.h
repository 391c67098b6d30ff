#pragma once

#include "GLTF/document.h"

namespace GLTF {

/// The objects that one walk over the graph has met, kept as a mark on the objects. A walk may
/// mark objects as long as no later walk has marked objects of the same kind.
class Walk {
public:
    Walk() : number_(nextNumber()) {}

    /// True at the first call for the object.
    bool take(Object& object) const noexcept {
        const bool first = !hasTaken(object);
        object.walkMark_ = number_;
        return first;
    }
    bool hasTaken(const Object& object) const noexcept { return object.walkMark_ == number_; }

private:
    /// Never 0, which is the mark of a new object.
    static u32 nextNumber() noexcept;

    u32 number_;
};

} // namespace GLTF
