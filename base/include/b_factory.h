#pragma once

#include "b_attribute_map.h"

#include <memory>
#include <mutex>

/// Objects with identity (plugins), the descriptions of their types, and the factory that owns
/// the objects of one document.
namespace base {

class AttribPath;
class CmdLineOptions;
class IPlugin;
class PluginFactory;
class StoredDocument;
class Stream;

/// A mix-in that an object exposes by name.
class BASE1_API IPluginInterface {
public:
    virtual ~IPluginInterface();
    virtual name_id name() const = 0;
    /// The object behind the interface, null if it has none.
    virtual IPlugin* plugin();
};

/// Describes one type of object; what is registered in a factory.
class BASE1_API IPluginDesc : public RefCntAtomic {
public:
    static constexpr i32 dummyVersion = static_cast<i32>(0x80000000u);

    IPluginDesc();
    ~IPluginDesc() override;
    /// Makes an object with this description, `factory` as its owner and `id`; null on failure.
    /// The object is not added to the factory.
    virtual IPlugin* create(PluginFactory& factory, u32 id) = 0;
    /// Adds the command-line options of this type.
    virtual void registerOptions(CmdLineOptions& options);

    u32 reserved = 0;
    i32 version = 0; ///< negative marks the dummy of an unknown type
    name_id type;    ///< the type's name; "Plugin" until the concrete description sets it
    string author;
    i32 group = 0;
    string info;
    const u32 tag = 47789;
};

/// Stands for a type that nobody registered: its objects are plain and keep their attributes.
class BASE1_API DummyPluginDesc final : public IPluginDesc {
public:
    explicit DummyPluginDesc(name_id type);
    ~DummyPluginDesc() override;
    IPlugin* create(PluginFactory& factory, u32 id) override;
};

/// An object with identity: an attribute map with a type, a factory and an id.
class BASE1_API IPlugin : public AttribMap, public RefCntAtomic {
public:
    static constexpr u32 noId = 0xffffffffu;

    IPlugin(ref<IPluginDesc> desc, PluginFactory* factory, u32 id);
    ~IPlugin() override;

    /// A new object of the same type from the same factory, which owns it, with clones of all
    /// attributes. A plain map, which the caller owns, where description or factory is missing.
    Attribute* clone() const override;
    /// The object's name.
    string toString() const override;
    /// The description's type, absent without one.
    name_id typeName() const override;

    /// The interface of that name: the object's built-in ones first, then those added, the most
    /// recent first. Null if it has none.
    virtual IPluginInterface* queryInterface(name_id name);
    /// Sets the plugin mark in the flags.
    virtual void markCreated();
    /// Called on every object, in id order, once a document has been read.
    virtual void afterLoad(i32 version);
    virtual void resolveLinks();
    /// Called before an attribute of this object is linked by path.
    virtual void beforeLink(const AttribPath& path);
    virtual void reservedOperation();

    /// Adds an interface, which must outlive the object.
    void addInterface(IPluginInterface* added);

    /// The attribute "name", links followed; empty if absent.
    string getName() const;

    const IPluginDesc* desc() const noexcept { return desc_.get(); }
    /// The factory that owns this object, null once that is gone.
    PluginFactory* pluginFactory() const noexcept { return factory_; }
    /// Index in the factory's object list, `noId` when not in one.
    u32 id() const noexcept { return id_; }

protected:
    /// Deletes the object, at once or, if that happens while another object is being deleted on
    /// this thread, right after that one: chains of objects end without recursion.
    void destroy() override;

private:
    friend class PluginFactory;
    friend class AttribPath;
    struct InterfaceNode;
    InterfaceNode* interfaces_ = nullptr;
    ref<IPluginDesc> desc_;
    PluginFactory* factory_;
    u32 id_;
    mutable ReadWriteSpinLock pathLock_; ///< held shared while a path resolves through this object
    // Place among the living objects of the factory, listed or not.
    IPlugin* previousObject_ = nullptr;
    IPlugin* nextObject_ = nullptr;
    IPlugin* nextDying_ = nullptr;
};

/// True if `plugin` is the inert stand-in for an object of an unknown type.
BASE1_API bool isDummy(const IPlugin& plugin);

/// Codes of `PluginCallback::changed`.
enum PluginEvent : u32 {
    eventTimeChanged = 12, ///< the path names the attribute `time` of the scene
};

/// What listeners override to hear about changes. All do nothing here.
class BASE1_API PluginCallback {
public:
    virtual ~PluginCallback();
    virtual void changed(u32 code, const AttribPath& path);
    virtual void added(PluginFactory& factory, u32 id);
    virtual void removed(PluginFactory& factory, u32 id);
    virtual void cleared(PluginFactory& factory);
};

class PluginEnum {};

/// Performs creations and removals and keeps a record of those that can be undone.
class BASE1_API PluginPatch : public NonCopyable {
public:
    enum class Operation : u8 { create, remove };
    struct Record {
        Operation operation;
        u32 id;
        name_id type;
    };

    PluginPatch(PluginFactory& factory, string name);
    const string& name() const noexcept { return name_; }
    ref<IPlugin> create(name_id type, bool undoable);
    bool remove(u32 id);
    const vector<Record>& records() const noexcept { return records_; }

private:
    PluginFactory& factory_;
    string name_;
    vector<Record> records_;
};

/// Bits of the flags of `PluginFactory::create`, by position.
enum CreateFlag : u32 {
    createNoDummy = 1u << 0, ///< null for an unknown type
    createWarn = 1u << 1,    ///< log an unknown type
    createLocked = 1u << 2,  ///< hold the critical section while adding
    createLoose = 1u << 3,   ///< do not add the object; its id stays `IPlugin::noId`
};

/// The known types and all live objects of one document. An object's id is its place in the
/// list; a removed object leaves a null entry and its id is never used again.
class BASE1_API PluginFactory : public RefCntAtomic, public NonCopyable, public PluginEnum {
public:
    explicit PluginFactory(string name = {}, AttribFactory& factory = attribFactory());
    /// Clears every reference of every object first, so that cycles among them end here. Objects
    /// that somebody still holds live on without a factory.
    ~PluginFactory() override;

    bool registerDesc(ref<IPluginDesc> desc);
    bool unregisterDesc(const ref<IPluginDesc>& desc);
    bool unregisterDesc(name_id type);
    ref<IPluginDesc> findDesc(name_id type) const;
    bool findDescs(vector<ref<IPluginDesc>>& out, i32 group) const;
    bool hasDesc(name_id type) const;
    const map<name_id, ref<IPluginDesc>>& descs() const noexcept { return descs_; }

    /// Makes an object of `type` and adds it, see `CreateFlag`. An unknown type gives a dummy
    /// object unless `createNoDummy` is set.
    ref<IPlugin> create(name_id type, u32 flags = 0);
    /// Gives the object the next id, appends it and makes this its factory. The object must not be
    /// in a list already; null throws.
    void addPlugin(const ref<IPlugin>& plugin, u32 flags = 0);
    /// Makes an object in the place of a removed one; null if `id` is out of range or taken.
    ref<IPlugin> createAt(name_id type, u32 id);
    /// As `create` through the root patch; marks the object as created.
    ref<IPlugin> createPatched(name_id type, bool undoable);
    /// Takes the object off the list; its id is `IPlugin::noId` then and its factory stays. Unless
    /// `keepLinks`, every reference to it is cleared: plugin attributes become null, so do the
    /// elements of plugin vectors, and paths of links that start at it become empty. That walks
    /// over all objects, except if the list holds the only counted reference (drop your own
    /// first) and no weak link points at the object. False for an id without object.
    bool remove(u32 id, bool keepLinks);
    /// Points every reference to object `id` at `newId`; `IPlugin::noId` clears them. `options` are
    /// not used. False unless both ids are in range and the first has an object.
    bool replace(u32 id, u32 newId, u32 options = 0);

    ref<IPlugin> plugin(u32 id) const;
    u32 pluginCount() const noexcept { return static_cast<u32>(plugins_.size()); }
    const vector<ref<IPlugin>>& plugins() const noexcept { return plugins_; }
    /// The first object by id whose name is `text`, -1 if there is none.
    i32 findByName(string_view text) const;
    /// The first object by id of this type or of one that derives from it by the loaded
    /// descriptions (`AttribDescManager::derived`), -1 if there is none.
    i32 findByType(name_id type) const;
    /// The first object by id of exactly this type, null if there is none.
    ref<IPlugin> firstOfType(name_id type) const;
    /// Sum of `byteSize` over all objects.
    u64 memorySize() const;
    /// Calls `afterLoad` on the objects from `firstId` up and returns the length of the list.
    u32 afterLoadAll(i32 version, u32 firstId);
    /// Adds the options of every description, in the order of `descs`.
    void registerOptions(CmdLineOptions& options);
    /// Copies the objects of `other` into this factory, with descriptions that are unknown here,
    /// and points references among the objects of `other` at what stands for them here. A named
    /// object is logged and skipped if this factory had one of its type and name before; that one
    /// stands for it.
    void merge(const PluginFactory& other);

    // The stored forms of the whole document: its own attributes and all objects with their ids.
    // Left out are attributes and objects that are transient; an entry of the list without object
    // stays one. Reading appends the objects to this factory, ids shifted by the present length of
    // the list, adds the document's attributes to the factory's, and calls `afterLoad` on all that
    // was read. Whatever ends a reading early takes the objects that it made away again.

    /// Writes the binary form at the stream's position. Throws `exception` for what has no place
    /// in it, such as an object of more than 4 GiB, and what the stream throws.
    void write(Stream& stream) const;
    /// Reads the binary form from the stream's position. Throws `exception` for a file of another
    /// kind or version and, with `streamThrowOnShortRead`, for one that is cut. False if the list
    /// of objects is broken, which the log tells, or if, without that flag, the data ends before
    /// the objects.
    bool read(Stream& stream);
    /// Writes the JSON form; the same scene gives the same text in every process.
    void writeJson(Stream& stream) const;
    /// Reads the JSON form to the end of the stream. False if it is no such document. The log tells
    /// of all faults, with the stream's name and the line; a value that can't be read costs only
    /// the attribute that it belongs to.
    bool readJson(Stream& stream);

    /// Listeners are not owned.
    void addCallback(PluginCallback* callback);
    void removeCallback(PluginCallback* callback);

    AttribMap& attributes() noexcept { return attributes_; }
    AttribFactory& attributeFactory() const noexcept { return *attribFactory_; }
    const string& name() const noexcept { return name_; }
    PluginPatch& rootPatch() noexcept { return *rootPatch_; }

private:
    friend class IPlugin;
    template <class Redirect>
    void redirectReferences(Redirect redirect);
    void append(const ref<IPlugin>& plugin);
    void readDocument(StoredDocument& document, i32 version);
    void enlist(IPlugin& object);
    void delist(IPlugin& object);

    AttribMap attributes_;
    map<name_id, ref<IPluginDesc>> descs_;
    vector<ref<IPlugin>> plugins_;
    AttribFactory* attribFactory_;
    // Taken again when making an object makes another one.
    std::recursive_mutex lock_;
    SpinLock objectsLock_; ///< guards the chain of `objects_`
    IPlugin* objects_ = nullptr;
    string name_;
    std::unique_ptr<PluginPatch> rootPatch_;
    vector<ref<IPluginDesc>> dummyDescs_;
    vector<PluginCallback*> callbacks_;
};

} // namespace base
