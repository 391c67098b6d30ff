#pragma once

#include "b_containers.h"
#include "b_name.h"
#include "b_refcnt.h"

#include <atomic>

/// Paths that lead from a plugin object to one of its attributes, and the weak links they are
/// made of.
namespace base {

class Attribute;
class IPlugin;

/// Lock word for many readers or one writer. The low 30 bits count readers, bit 30 marks a
/// waiting writer; a writer holds the word at that mark with no readers.
class BASE1_API ReadWriteSpinLock : public NonCopyable {
public:
    void lockRead() noexcept;
    void unlockRead() noexcept;
    void lockWrite() noexcept;
    void unlockWrite() noexcept;

private:
    std::atomic<u32> word_{0};
};

/// Pointer to an attribute that is cleared when the attribute dies. An attribute with the flag
/// `attribUntracked` is never stored.
class BASE1_API AttribWeakLink {
public:
    AttribWeakLink() = default;
    AttribWeakLink(const AttribWeakLink& other) { set(other.target_); }
    AttribWeakLink& operator=(const AttribWeakLink& other) {
        set(other.target_);
        return *this;
    }
    ~AttribWeakLink() { set(nullptr); }

    Attribute* target() const noexcept { return target_; }
    /// Leaves the chain of the old target and enters that of the new one.
    void set(Attribute* target);

private:
    friend class Attribute;
    Attribute* target_ = nullptr;
    AttribWeakLink* previous_ = nullptr;
    AttribWeakLink* next_ = nullptr;
};

enum class PathStepKind : u8 {
    plugin = 0,    ///< the object itself; `name` is the empty name, `index` its id
    attribute = 1, ///< `name` in the previous step's map
    element = 2,   ///< `index` in the previous step's array
    component = 3, ///< `index` in the previous step's value
};

struct PathStep {
    AttribWeakLink target; ///< what the step resolved to, null if nothing (yet)
    name_id name;
    u32 index = 0;
    PathStepKind kind = PathStepKind::plugin;
};

/// Steps from a plugin (the root step) to an attribute. A path survives its target: it resolves
/// again by names and indices.
class BASE1_API AttribPath {
public:
    AttribPath() = default;
    /// The path of a plugin itself.
    explicit AttribPath(IPlugin& root);
    /// The path of the attribute `name` of `root`.
    AttribPath(IPlugin& root, name_id name);

    AttribPath& attribute(name_id name);
    AttribPath& element(u32 index);
    AttribPath& component(u32 index);

    bool empty() const noexcept { return steps_.empty(); }
    const vector<PathStep>& steps() const noexcept { return steps_; }
    /// The plugin of the root step, null if it is gone or the path is empty.
    IPlugin* root() const noexcept;
    /// Points the root step at another object.
    void setRoot(IPlugin& root);

    /// The attribute at the resolving end: the last step, or the one before a component step.
    /// Stored targets are used and refreshed. Null if some step leads nowhere.
    Attribute* resolve() const;

    /// "Plugin[12]" followed by ".name", "[3]" and "{0}" for the step kinds; a backslash escapes
    /// . [ ] { } \ in names. Empty for an empty path.
    string toString() const;

    /// Equal steps by kind, name and index, and the same root object.
    friend BASE1_API bool operator==(const AttribPath& a, const AttribPath& b);

private:
    mutable vector<PathStep> steps_;
};

} // namespace base
