#include "b_attribute_desc.h"

#include <mutex>
#include <shared_mutex>

namespace base {

namespace {

constexpr int greatestDepth = 64; ///< of a chain of classes, which wrong claims may close to a ring

} // namespace

void AttribDescManager::addClass(name_id type, name_id base) {
    const std::lock_guard lock(lock_);
    classes_.try_emplace(type, base);
}

bool AttribDescManager::derivesFrom(name_id type, name_id base) const {
    const std::shared_lock lock(lock_);
    for (int depth = 0; depth < greatestDepth; ++depth) {
        if (type == base)
            return true;
        const auto found = classes_.find(type);
        if (found == classes_.end())
            return false;
        type = found->second;
    }
    return false;
}

AttribDescManager& attribDescManager() {
    // Never destroyed: other static objects may ask it until the end.
    static auto& manager = *new AttribDescManager;
    return manager;
}

} // namespace base
