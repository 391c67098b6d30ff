#pragma once

#include "b_config.h"
#include "b_containers.h"
#include "b_lock.h"
#include "b_memory.h"
#include "b_name.h"

/// What is known of the types of attribute maps besides the code that reads them.
namespace base {

/// Knows which type derives from which. May be used on several threads.
class BASE1_API AttribDescManager : public NonCopyable {
public:
    /// Tells of a class that the code has: maps of `type` derive from `base`. Repeating it changes
    /// nothing.
    void addClass(name_id type, name_id base);
    /// True if `type` is `base` or derives from it.
    bool derivesFrom(name_id type, name_id base) const;

private:
    friend BASE1_API AttribDescManager& attribDescManager();
    AttribDescManager() = default;
    ~AttribDescManager() = default;

    mutable ReadWriteSpinLock lock_;
    hash_map<name_id, name_id> classes_; ///< the base by the type
};

/// The one instance of the process.
BASE1_API AttribDescManager& attribDescManager();

} // namespace base
