#pragma once

#include "b_config.h"
#include "b_containers.h"
#include "b_memory.h"
#include "b_name.h"
#include "b_refcnt.h"

#include <shared_mutex>

/// What is known of the types of attribute maps besides the code that reads them: which type
/// derives from which, and what description files say of their attributes.
namespace base {

class AttribDescManager;

/// Flags of `AttribDesc`, as mask values.
enum AttribDescFlag : u32 {
    descVisible = 1 << 0,
    descResource = 1 << 1,
    descOptional = 1 << 2,
    descReadOnly = 1 << 3,
    descCmdline = 1 << 4,
    descState = 1 << 5,
    descKeyable = 1 << 6,
};

/// Flags of `AttribMapDesc`, as mask values.
enum AttribMapDescFlag : u32 {
    descSingleInstance = 1 << 0,
    descCustomDescriptor = 1 << 1,
};

/// One attribute of a described type. Values and limits are kept as the texts of the file; what a
/// file leaves out is empty, absent or 0.
class BASE1_API AttribDesc : public RefCntAtomic {
public:
    name_id name;
    string label;
    string type;
    name_id typeName;    ///< `type` as a name
    name_id elementType; ///< of the type "arrayof" alone
    name_id control;     ///< of a user interface; see `AttribMapDesc::control`
    u32 flags = 0;       ///< of `AttribDescFlag`
    string initialisator;
    string action;
    string defaultValue;
    string min;
    string max;
    string softMin; ///< limits of sliders, which a typed value may pass
    string softMax;
    string enumeration;
    string help;
    string units;
    u32 precision = 0;
    u32 controlLines = 0; ///< height of the control

protected:
    ~AttribDesc() override;
};

/// A described type of attribute map. It uses its manager and must not be asked after that is gone.
class BASE1_API AttribMapDesc : public RefCntAtomic {
public:
    explicit AttribMapDesc(const AttribDescManager& manager) : manager_(&manager) {}
    /// The attribute of that name: an own one, else the nearest along the chain of `inherit`, of
    /// which 64 steps are followed. Null if there is none.
    ref<const AttribDesc> find(name_id attribute) const;
    /// The control that shows the attribute found by `find`: its own `control`, else the one that
    /// goes by the name of its type. Absent for an unknown attribute.
    name_id control(name_id attribute) const;

private:
    const AttribDescManager* manager_;

public:
    name_id name;
    name_id friendName;
    name_id inherit; ///< the type that this one derives from, described or not
    name_id className;
    string label;
    string help;
    string copyright;
    vector<ref<const AttribDesc>> attributes; ///< own ones, in the order of the file
    map<name_id, ref<const AttribDesc>> attributesByName;
    u32 flags = 0;           ///< of `AttribMapDescFlag`
    bool isAbstract = false; ///< of this type no object is created

protected:
    ~AttribMapDesc() override;
};

/// Knows the described types, and which type derives from which. May be used on several threads.
/// The first description of a type stays to the end of the manager and is not changed.
class BASE1_API AttribDescManager : public NonCopyable {
public:
    AttribDescManager();
    ~AttribDescManager();

    /// Reads a description file. A type that is known already keeps its description, and the log
    /// gets an error. Throws as `fs::MasterFS::open`, and `exception` for a file that is longer
    /// than 64 MiB, can't be read whole or is no XML; then nothing has changed.
    void load(const string& path);
    /// Reads `text` as the content of a description file; `path` is for messages.
    void loadText(string text, const string& path);
    /// Loads the files "*.xml" of a folder, in the order of their names. What `load` throws ends
    /// it, and what was loaded before stays.
    void loadDirectory(const string& path);

    /// What the document element of a file says of code that is made of it.
    struct FileAttributes {
        string nameSpace;
        string destination;
        string constructor;
    };
    /// Those of the file that was loaded last.
    FileAttributes fileAttributes() const;

    /// The description of a type; null if no file has one.
    const AttribMapDesc* find(name_id type) const;
    /// The described types that inherit from `type`, directly or over at most 64 steps, without
    /// itself. In the order of names, which is no order of texts.
    vector<name_id> derived(name_id type) const;

    /// Tells of a class that the code has: maps of `type` derive from `base`. Repeating it changes
    /// nothing. `find` and `derived` don't know such classes.
    void addClass(name_id type, name_id base);
    /// True if `type` is `base` or derives from it, by what files say, by the classes of the code,
    /// or by both together.
    bool derivesFrom(name_id type, name_id base) const;

private:
    const AttribMapDesc* described(name_id type) const;
    bool inherits(const AttribMapDesc& desc, name_id base) const;

    mutable std::shared_mutex lock_; ///< of all below
    map<name_id, ref<AttribMapDesc>> descs_;
    FileAttributes fileAttributes_;
    hash_map<name_id, name_id> classes_; ///< the base by the type
};

/// The one instance of the process.
BASE1_API AttribDescManager& attribDescManager();

} // namespace base
