#include "b_factory.h"

#include "b_attribute_desc.h"
#include "b_exception.h"
#include "b_log.h"

#include <mutex>

namespace base {

namespace {

/// Points the references that `attribute` holds, to any depth, at what `redirect` gives for their
/// objects; null clears them.
template <class Redirect>
void redirectWithin(Attribute& attribute, Redirect& redirect) {
    const auto redirectPath = [&](AttribPath& path) {
        IPlugin* root = path.root();
        IPlugin* target = root ? redirect(root) : nullptr;
        if (root && !target)
            path = {};
        else if (target != root)
            path.setRoot(*target);
    };
    const name_id type = attribute.type();
    if (AttribMap* map = attribute.asMap()) {
        for (const AttribMap::Entry& entry : map->entries())
            redirectWithin(*entry.second, redirect);
    } else if (AttribArray* array = attribute.asArray()) {
        for (Attribute* item : array->items())
            if (item)
                redirectWithin(*item, redirect);
    } else if (AttribLink* link = attribute.asLink()) {
        redirectPath(link->path());
    } else if (type == TypeTraits<ref<IPlugin>>::n_name) {
        auto& value = *static_cast<ref<IPlugin>*>(attribute.data(-1));
        IPlugin* target = value ? redirect(value.get()) : nullptr;
        if (target == value.get())
            return;
        value = ref<IPlugin>(target);
        if (auto* plugin = dynamic_cast<PluginAttribute*>(&attribute))
            plugin->path = {};
    } else if (type == TypeTraits<ref<IPlugin>>::n_array_name) {
        for (ref<IPlugin>& value : *static_cast<vector<ref<IPlugin>>*>(attribute.data(-1)))
            if (IPlugin* target = value ? redirect(value.get()) : nullptr; target != value.get())
                value = ref<IPlugin>(target);
    }
}

/// True unless it is certain that no attribute refers to `object`. `ownCount` is the number of
/// counted references known to the caller. A path that leads into the object starts at it, so its
/// attributes need not be asked; an untracked object may have paths that nobody knows of.
bool mayBeReferenced(const IPlugin& object, i32 ownCount) {
    return object.refCount() > ownCount || object.hasWeakLinks() || object.hasFlag(attribUntracked);
}

} // namespace

PluginPatch::PluginPatch(PluginFactory& factory, string name)
    : factory_(factory), name_(std::move(name)) {}

ref<IPlugin> PluginPatch::create(name_id type, bool undoable) {
    ref<IPlugin> made = factory_.create(type, createWarn);
    if (!made)
        return made;
    made->markCreated();
    if (undoable)
        records_.push_back({Operation::create, made->id(), type});
    return made;
}

bool PluginPatch::remove(u32 id) {
    name_id type;
    if (const ref<IPlugin> object = factory_.plugin(id))
        type = object->typeName();
    if (!factory_.remove(id, false))
        return false;
    records_.push_back({Operation::remove, id, type});
    return true;
}

PluginFactory::PluginFactory(string name, AttribFactory& factory)
    : attributes_(factory), attribFactory_(&factory), name_(std::move(name)),
      rootPatch_(std::make_unique<PluginPatch>(*this, "root")) {}

PluginFactory::~PluginFactory() {
    for (PluginCallback* callback : vector<PluginCallback*>(callbacks_))
        callback->cleared(*this);
    callbacks_.clear();
    redirectReferences([](IPlugin*) -> IPlugin* { return nullptr; });
    while (objects_) {
        IPlugin& object = *objects_;
        delist(object);
        object.factory_ = nullptr;
        object.id_ = IPlugin::noId;
    }
    plugins_.clear();
    rootPatch_.reset();
    dummyDescs_.clear();
    descs_.clear();
    attributes_.clear();
}

bool PluginFactory::registerDesc(ref<IPluginDesc> desc) {
    if (!desc)
        return false;
    const name_id type = desc->type;
    return descs_.emplace(type, std::move(desc)).second;
}

bool PluginFactory::unregisterDesc(const ref<IPluginDesc>& desc) {
    return desc && findDesc(desc->type) == desc && unregisterDesc(desc->type);
}

bool PluginFactory::unregisterDesc(name_id type) {
    return descs_.erase(type) != 0;
}

ref<IPluginDesc> PluginFactory::findDesc(name_id type) const {
    const auto found = descs_.find(type);
    return found == descs_.end() ? nullptr : found->second;
}

bool PluginFactory::findDescs(vector<ref<IPluginDesc>>& out, i32 group) const {
    const std::size_t before = out.size();
    for (const auto& [type, desc] : descs_)
        if (desc->group == group)
            out.push_back(desc);
    return out.size() != before;
}

bool PluginFactory::hasDesc(name_id type) const {
    return descs_.contains(type);
}

ref<IPlugin> PluginFactory::create(name_id type, u32 flags) {
    ref<IPluginDesc> desc = findDesc(type);
    if (!desc && (flags & (createNoDummy | createWarn)) != 0)
        log().log(logSystem, logError, "plugin factory {}| Unable to create plugin of type {}!{}",
                  name_, type,
                  (flags & createNoDummy) != 0
                      ? ""
                      : " Creating a general plugin with limited functionality...");
    if (!desc && (flags & createNoDummy) != 0)
        return nullptr;
    if (!desc) {
        desc = makeRef<DummyPluginDesc>(type);
        dummyDescs_.push_back(desc);
        registerDesc(desc);
    }
    if ((flags & createLoose) != 0)
        return ref<IPlugin>(desc->create(*this, IPlugin::noId));

    std::unique_lock guard(lock_, std::defer_lock);
    if ((flags & createLocked) != 0)
        guard.lock();
    ref<IPlugin> made(desc->create(*this, pluginCount()));
    if (made)
        append(made);
    return made;
}

void PluginFactory::addPlugin(const ref<IPlugin>& plugin, u32 flags) {
    if (!plugin)
        throw invalid_argument("Can't add an invalid plugin", "b_factory",
                               "base::PluginFactory::addPlugin", __LINE__);
    if (plugin->factory_ != this) {
        if (plugin->factory_)
            plugin->factory_->delist(*plugin);
        plugin->factory_ = this;
        enlist(*plugin);
    }
    std::unique_lock guard(lock_, std::defer_lock);
    if ((flags & createLocked) != 0)
        guard.lock();
    append(plugin);
}

/// The id is set here again: making the object may have made others, which came first.
void PluginFactory::append(const ref<IPlugin>& plugin) {
    const u32 id = pluginCount();
    plugins_.push_back(plugin);
    plugin->id_ = id;
    for (PluginCallback* callback : vector<PluginCallback*>(callbacks_))
        callback->added(*this, id);
}

ref<IPlugin> PluginFactory::createAt(name_id type, u32 id) {
    if (id >= plugins_.size() || plugins_[id])
        return nullptr;
    ref<IPlugin> made = create(type, createWarn | createLoose);
    if (!made)
        return made;
    plugins_[id] = made;
    made->id_ = id;
    for (PluginCallback* callback : vector<PluginCallback*>(callbacks_))
        callback->added(*this, id);
    return made;
}

ref<IPlugin> PluginFactory::createPatched(name_id type, bool undoable) {
    return rootPatch_->create(type, undoable);
}

bool PluginFactory::remove(u32 id, bool keepLinks) {
    if (id == IPlugin::noId)
        return false;
    const ref<IPlugin> object = plugin(id);
    if (!object) {
        log().log(logSystem, logDebug,
                  id < plugins_.size()
                      ? "plugin factory| Attempt to remove already removed plugin {}!"
                      : "plugin factory| Attempt to remove non existing plugin {}!",
                  id);
        return false;
    }
    constexpr i32 ownCount = 2; // of the list and of `object`
    if (!keepLinks && mayBeReferenced(*object, ownCount))
        redirectReferences([&](IPlugin* p) { return p == object.get() ? nullptr : p; });
    plugins_[id] = nullptr;
    object->id_ = IPlugin::noId;
    for (PluginCallback* callback : vector<PluginCallback*>(callbacks_))
        callback->removed(*this, id);
    return true;
}

bool PluginFactory::replace(u32 id, u32 newId, u32) {
    const ref<IPlugin> object = plugin(id);
    if (!object || (newId != IPlugin::noId && newId >= plugins_.size())) {
        log().log(logSystem, logDebug,
                  "plugin factory| Attempt to replace non existing plugin {} detected!", id);
        return false;
    }
    const ref<IPlugin> replacement = plugin(newId);
    redirectReferences([&](IPlugin* p) { return p == object.get() ? replacement.get() : p; });
    return true;
}

/// References of all objects in the order of their ids, and those of the document.
template <class Redirect>
void PluginFactory::redirectReferences(Redirect redirect) {
    for (std::size_t i = 0; i < plugins_.size(); ++i)
        if (const ref<IPlugin> object = plugins_[i])
            redirectWithin(*object, redirect);
    redirectWithin(attributes_, redirect);
}

ref<IPlugin> PluginFactory::plugin(u32 id) const {
    return id < plugins_.size() ? plugins_[id] : nullptr;
}

i32 PluginFactory::findByName(string_view text) const {
    static const name_id nameOfName = nameServer().id("name");
    for (const ref<IPlugin>& object : plugins_) {
        const string* name = object ? object->findAttribute<string>(nameOfName) : nullptr;
        if (name && *name == text)
            return static_cast<i32>(object->id());
    }
    return -1;
}

i32 PluginFactory::findByType(name_id type) const {
    const vector<name_id> derived = attribDescManager().derived(type);
    for (const ref<IPlugin>& object : plugins_) {
        const name_id actual = object ? object->typeName() : name_id();
        if (object &&
            (actual == type || std::find(derived.begin(), derived.end(), actual) != derived.end()))
            return static_cast<i32>(object->id());
    }
    return -1;
}

ref<IPlugin> PluginFactory::firstOfType(name_id type) const {
    for (const ref<IPlugin>& object : plugins_)
        if (object && object->typeName() == type)
            return object;
    return nullptr;
}

u64 PluginFactory::memorySize() const {
    u64 total = 0;
    for (const ref<IPlugin>& object : plugins_)
        total += object ? object->byteSize() : 0;
    return total;
}

u32 PluginFactory::afterLoadAll(i32 version, u32 firstId) {
    const u32 count = pluginCount();
    for (u32 id = firstId; id < count; ++id)
        if (const ref<IPlugin> object = plugin(id))
            object->afterLoad(version);
    return pluginCount();
}

void PluginFactory::registerOptions(CmdLineOptions& options) {
    for (const auto& [type, desc] : descs_)
        desc->registerOptions(options);
}

void PluginFactory::merge(const PluginFactory& other) {
    if (&other == this)
        return;
    map<std::pair<name_id, string>, IPlugin*> taken;
    for (const ref<IPlugin>& object : std::as_const(plugins_))
        if (object)
            taken.emplace(std::pair(object->typeName(), object->getName()), object.get());

    hash_map<IPlugin*, IPlugin*> standIns;
    vector<IPlugin*> copies;
    for (const ref<IPlugin>& object : other.plugins_) {
        if (!object)
            continue;
        const name_id type = object->typeName();
        const string name = object->getName();
        const auto existing = taken.find(std::pair(type, name));
        if (!name.empty() && existing != taken.end()) {
            log().log(logSystem, logWarning,
                      "plugin factory| Plugin {} from type {} already exists in the original "
                      "factory!",
                      name, type);
            standIns.emplace(object.get(), existing->second);
            continue;
        }
        if (!hasDesc(type))
            registerDesc(other.findDesc(type));
        if (const ref<IPlugin> copy = create(type, createWarn)) {
            copy->setFlags(object->flags());
            copy->assign(*object, assignAdopt);
            standIns.emplace(object.get(), copy.get());
            copies.push_back(copy.get());
        }
    }

    auto redirect = [&](IPlugin* original) {
        const auto found = standIns.find(original);
        return found == standIns.end() ? original : found->second;
    };
    for (IPlugin* copy : std::as_const(copies))
        redirectWithin(*copy, redirect);
}

void PluginFactory::addCallback(PluginCallback* callback) {
    callbacks_.push_back(callback);
}

void PluginFactory::removeCallback(PluginCallback* callback) {
    const auto at = std::find(callbacks_.cbegin(), callbacks_.cend(), callback);
    if (at != callbacks_.cend())
        callbacks_.erase(at);
}

void PluginFactory::enlist(IPlugin& object) {
    const std::lock_guard guard(objectsLock_);
    object.nextObject_ = objects_;
    if (objects_)
        objects_->previousObject_ = &object;
    objects_ = &object;
}

void PluginFactory::delist(IPlugin& object) {
    const std::lock_guard guard(objectsLock_);
    (object.previousObject_ ? object.previousObject_->nextObject_ : objects_) = object.nextObject_;
    if (object.nextObject_)
        object.nextObject_->previousObject_ = object.previousObject_;
    object.previousObject_ = object.nextObject_ = nullptr;
}

} // namespace base
