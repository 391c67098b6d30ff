#pragma once

#include "b_containers.h"
#include "b_lock.h"
#include "b_name.h"

/// Paths that lead from a plugin object to one of its attributes, and the weak links they are
/// made of.
namespace base {

class Attribute;
class AttribLink;
class IPlugin;

/// Pointer to an attribute that is cleared when the attribute dies.
class BASE1_API AttribWeakLink {
public:
    AttribWeakLink() = default;
    AttribWeakLink(const AttribWeakLink& other) noexcept { set(other.target_); }
    AttribWeakLink& operator=(const AttribWeakLink& other) noexcept {
        set(other.target_);
        return *this;
    }
    ~AttribWeakLink() { set(nullptr); }

    Attribute* target() const noexcept { return target_; }
    /// Leaves the chain of the old target and enters that of the new one.
    void set(Attribute* target) noexcept;

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
/// again by names and indices. Maps and arrays on the way may be reached through links.
class BASE1_API AttribPath {
public:
    AttribPath() = default;
    /// The path of a plugin itself.
    explicit AttribPath(IPlugin& root);
    /// The path of the attribute `name` of `root`.
    AttribPath(IPlugin& root, name_id name);

    // Each appends a step and returns the path.

    AttribPath& attribute(name_id name);
    AttribPath& element(u32 index);
    AttribPath& component(u32 index);
    /// Of any kind, as it was stored. One of kind `plugin` belongs first; it has no object until
    /// `setRoot` and keeps its index without one.
    AttribPath& step(PathStepKind kind, name_id name, u32 index);

    bool empty() const noexcept { return steps_.empty(); }
    const vector<PathStep>& steps() const noexcept { return steps_; }
    /// The plugin of the root step, null if it is gone or the path is empty.
    IPlugin* root() const noexcept;
    /// Points the root step at another object; the steps behind it resolve anew.
    void setRoot(IPlugin& root);

    /// The attribute at the resolving end: the last step, or the one before a component step. A
    /// link found there is followed to its end. Stored targets are used and refreshed. Null if
    /// some step leads nowhere or more than 64 links are on the way; nothing is logged.
    Attribute* resolve() const;

    /// "Plugin[12]" followed by ".name", "[3]" and "{0}" for the step kinds; a backslash escapes
    /// . [ ] { } \ in names. Empty for an empty path.
    string toString() const;

    /// Equal steps by kind, name and index, and the same root object.
    friend BASE1_API bool operator==(const AttribPath& a, const AttribPath& b);

private:
    friend Attribute* linkTarget(const AttribLink& link, u32& hopsLeft);
    Attribute* resolveStep(u32& hopsLeft) const;

    mutable vector<PathStep> steps_;
};

} // namespace base
