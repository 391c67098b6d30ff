#include "b_attribute_map.h"

#include "b_attribute_links.h"
#include "b_attribute_values.h"
#include "b_exception.h"
#include "b_factory.h"
#include "b_format.h"
#include "b_log.h"

#include <shared_mutex>

namespace base {

namespace {

void checkName(name_id name, const char* function) {
    if (name.isEmpty())
        throw exception("The attribute name can't be an empty string.", "b_attribute", function,
                        __LINE__);
}

[[noreturn]] void throwMismatch(name_id name, name_id expected, name_id actual,
                                const char* function) {
    throw exception(format("Detected invalid access to attribute '{}'. Expected type '{}', "
                           "attribute type - '{}'.",
                           name, expected, actual),
                    "b_attribute", function, __LINE__);
}

/// Makes `target`, which has the type of `source`, take over its value and keep its flags.
void takeValue(Attribute& target, Attribute& source) {
    if (AttribArray* array = target.asArray())
        array->takeItems(*source.asArray());
    else
        target.setData(source.data(-1), -1);
    if (auto* plugin = dynamic_cast<PluginAttribute*>(&target))
        plugin->path = static_cast<const PluginAttribute&>(source).path;
}

} // namespace

AttribMap::AttribMap(AttribFactory& factory, name_id typeName)
    : typeName_(typeName), factory_(&factory) {}

AttribMap::~AttribMap() {
    clear();
}

Attribute* AttribMap::clone() const {
    const CloneDepth depth;
    auto copy = std::make_unique<AttribMap>(*factory_, typeName());
    copy->setFlags(flags());
    copy->parent_ = parent_;
    copy->setData(&entries_, -1);
    return copy.release();
}

void* AttribMap::data(i32 index) {
    if (index < 0)
        return &entries_;
    const auto at = static_cast<std::size_t>(index);
    return at < entries_.size() ? entries_[at].second->data(-1) : nullptr;
}

bool AttribMap::removeItem(u32 index) {
    if (index >= entries_.size())
        return false;
    const std::unique_ptr<Attribute> removed(entries_[index].second);
    entries_.erase(entries_.cbegin() + index);
    return true;
}

u32 AttribMap::byteSize() const {
    u64 total = sizeof(u32);
    for (const Entry& entry : entries_)
        total += entry.second->byteSize();
    return saturatedSize(total);
}

bool AttribMap::assign(const Attribute& other, u32 mode, i32) {
    const AttribMap* source = other.asMap();
    if (!source || source == this)
        return source != nullptr;
    // Copied as a whole first: one of the two maps may lie inside the other.
    AttribMap donor(*factory_);
    donor.setData(&source->entries_, -1);
    merge(donor, mode);
    return true;
}

/// Takes over the attributes of `donor`; the ones left in it are those that were assigned.
void AttribMap::merge(AttribMap& donor, u32 mode) {
    for (Entry& entry : donor.entries_) {
        Attribute* own = findOwn(entry.first);
        if (own && (mode & (assignCopy | assignMerge)) != 0) {
            if (own->asMap() && entry.second->asMap()) {
                own->asMap()->merge(*entry.second->asMap(), mode);
                continue;
            }
            if (own->assign(*entry.second, mode) || (mode & assignCopy) == 0)
                continue;
        }
        replace(entry.first, std::unique_ptr<Attribute>(std::exchange(entry.second, nullptr)));
    }
}

bool AttribMap::isAnimated() const {
    return hasFlag(attribAnimated) ||
           std::any_of(entries_.begin(), entries_.end(),
                       [](const Entry& entry) { return entry.second->isAnimated(); });
}

void AttribMap::setData(const void* value, i32 index) {
    if (index >= 0) {
        if (static_cast<std::size_t>(index) < entries_.size())
            entries_[static_cast<std::size_t>(index)].second->setData(value, -1);
        return;
    }
    const auto& source = *static_cast<const vector<Entry>*>(value);
    if (&source == &entries_)
        return;
    AttribMap copies(*factory_);
    copies.entries_.reserve(source.size());
    for (const Entry& entry : source)
        copies.entries_.emplace_back(entry.first, entry.second->clone());
    entries_.swap(copies.entries_);
}

i32 AttribMap::compare(const void* value, i32 index) const {
    if (index >= 0) {
        const auto at = static_cast<std::size_t>(index);
        return at < entries_.size() ? entries_[at].second->compare(value, -1) : -1;
    }
    const auto& other = *static_cast<const vector<Entry>*>(value);
    if (entries_.size() != other.size())
        return entries_.size() < other.size() ? -1 : 1;
    for (std::size_t i = 0; i < other.size(); ++i) {
        const auto& [name, own] = entries_[i];
        if (name != other[i].first)
            return compareValues(name, other[i].first);
        if (own->type() != other[i].second->type())
            return compareValues(own->type(), other[i].second->type());
        if (const i32 order = own->compare(other[i].second->data(-1), -1); order != 0)
            return order;
    }
    return 0;
}

bool AttribMap::reservedQuery() const {
    return false;
}

bool AttribMap::isPathKeyed(const AttribPath&) const {
    return false;
}

bool AttribMap::isPathAnimated(const AttribPath&) const {
    return false;
}

bool AttribMap::isPathDriven(const AttribPath&) const {
    return false;
}

void AttribMap::pathChanged(const AttribPath&, u32) {}

void AttribMap::pathResolved(const AttribPath&, u32, u32, u32) {}

bool AttribMap::pathIsLinked(const AttribPath&, u32) const {
    return false;
}

void AttribMap::pathTouched(const AttribPath&, u32) {}

AttribMap* AttribMap::parent() const noexcept {
    return static_cast<AttribMap*>(parent_.target());
}

void AttribMap::setParent(AttribMap* parent) {
    parent_.set(parent);
}

Attribute* AttribMap::findInherited(name_id name) const noexcept {
    Attribute* found = nullptr;
    const AttribMap* parent = this->parent();
    for (u32 hops = 0; !found && parent && hops < maxLinkHops; ++hops) {
        // Held for the search alone: following links may come back to this parent.
        const std::shared_lock guard(parent->weakLock());
        found = parent->findOwn(name);
        parent = parent->parent();
    }
    return found;
}

Attribute* AttribMap::followReported(Attribute* a, name_id name) const {
    if (!a || !a->asLink())
        return a;
    u32 hopsLeft = maxLinkHops;
    const AttribLink* broken = nullptr;
    Attribute* end = followLinks(a, hopsLeft, &broken);
    if (broken && !broken->hasFlag(attribSilentLink))
        log().log(logSystem, logWarning,
                  "map attribute| Detected invalid link attribute! Cannot resolve '{}' with value "
                  "'{}'!",
                  name, broken->toString());
    return end;
}

Attribute* AttribMap::findAttribute(name_id name, bool followLinks, bool inherit) const {
    checkName(name, "base::AttribMap::findAttribute");
    Attribute* found = findOwn(name);
    if (!found && inherit)
        found = findInherited(name);
    return followLinks ? followReported(found, name) : found;
}

AttribMap* AttribMap::findMap(name_id name, bool followLinks, bool inherit) const {
    Attribute* found = findAttribute(name, followLinks, inherit);
    return found ? found->asMap() : nullptr;
}

AttribArray* AttribMap::findArray(name_id name, bool followLinks, bool inherit) const {
    Attribute* found = findAttribute(name, followLinks, inherit);
    return found ? found->asArray() : nullptr;
}

Attribute* AttribMap::findAttributeMutable(name_id name, u32 mode, bool followLinks, bool inherit) {
    constexpr u32 tellLinks = 1u << 0, tellPlugin = 1u << 1;
    if (!findAttribute(name, followLinks, inherit))
        return nullptr;
    if ((mode & tellLinks) != 0 && followLinks) {
        u32 hopsLeft = maxLinkHops;
        const Attribute* a = findAttribute(name, false, inherit);
        while (const AttribLink* link = a ? a->asLink() : nullptr) {
            if (IPlugin* root = link->path().root())
                root->pathChanged(link->path(), tellLinks);
            a = linkTarget(*link, hopsLeft);
        }
    }
    if ((mode & tellPlugin) != 0)
        if (auto* plugin = dynamic_cast<IPlugin*>(this))
            plugin->pathChanged(AttribPath(*plugin, name), tellPlugin);
    // Whoever was told may have replaced what was found before.
    return findAttribute(name, followLinks, inherit);
}

const Attribute* AttribMap::findTyped(name_id name, name_id type, bool vectorForm) const {
    checkName(name,
              vectorForm ? "base::AttribMap::findVecAttribute" : "base::AttribMap::findAttribute");
    Attribute* own = findOwn(name);
    if (own && own->type() == type)
        return own;
    const Attribute* found = followReported(own ? own : findInherited(name), name);
    if (!found || found->type() == type)
        return found;
    log().log(logSystem, logWarning,
              vectorForm ? "map attribute| Detected invalid access to attribute '{}'. Expected "
                           "type '{}', actual attribute type - '{}'!"
                         : "map attribute| Detected invalid access to attribute '{}'. Expected "
                           "'{}', actual attribute type - '{}'",
              name, type, found->type());
    return nullptr;
}

Attribute& AttribMap::insert(name_id name, std::unique_ptr<Attribute> a) {
    entries_.insert(lowerBound(name), Entry(name, a.get()));
    return *a.release();
}

void AttribMap::replace(name_id name, std::unique_ptr<Attribute> a) {
    const auto at = static_cast<std::size_t>(lowerBound(name) - entries_.cbegin());
    if (at == entries_.size() || entries_[at].first != name)
        insert(name, std::move(a));
    else
        delete std::exchange(entries_[at].second, a.release());
}

Attribute& AttribMap::make(name_id name, name_id type, const char* function) {
    std::unique_ptr<Attribute> made(factory_->create(type));
    if (!made)
        throw exception(format("Trying to access not registered attribute type '{}'.", type),
                        "b_attribute", function, __LINE__);
    return insert(name, std::move(made));
}

Attribute& AttribMap::requireTyped(name_id name, name_id type, const char* function) {
    checkName(name, function);
    Attribute* own = findOwn(name);
    if (!own)
        return make(name, type, function);
    u32 hopsLeft = maxLinkHops;
    Attribute* found = followLinks(own, hopsLeft);
    if (!found || found->type() != type)
        throwMismatch(name, type, found ? found->type() : n_link, function);
    return *found;
}

Attribute* AttribMap::syncTyped(name_id name, name_id type, bool& made) {
    constexpr const char* function = "base::AttribMap::syncAttribute";
    checkName(name, function);
    Attribute* own = findOwn(name);
    made = !own;
    if (!own)
        return &make(name, type, function);
    if (own->asLink())
        return nullptr;
    if (own->type() != type)
        throwMismatch(name, type, own->type(), function);
    return own;
}

AttribArray& AttribMap::arrayAttribute(name_id name) {
    return *requireTyped(name, n_array, "base::AttribMap::arrayAttribute").asArray();
}

AttribMap& AttribMap::mapAttribute(name_id name, name_id typeName) {
    constexpr const char* function = "base::AttribMap::mapAttribute";
    checkName(name, function);
    if (!findOwn(name))
        return *insert(name, std::make_unique<AttribMap>(*factory_, typeName)).asMap();
    return *requireTyped(name, n_map, function).asMap();
}

void AttribMap::attribute(name_id name, Attribute* a) {
    constexpr const char* function = "base::AttribMap::attribute";
    checkName(name, function);
    if (!a)
        throw exception("Can't set invalid attribute", "b_attribute", function, __LINE__);
    Attribute* own = findOwn(name);
    if (own == a)
        return;
    if (!own) {
        entries_.insert(lowerBound(name), Entry(name, a));
    } else if (own->type() != a->type()) {
        replace(name, std::unique_ptr<Attribute>(a));
    } else {
        if (AttribMap* map = own->asMap())
            map->takeEntries(*a->asMap());
        else
            takeValue(*own, *a);
        delete a;
    }
}

AttribMap* AttribMap::attribute(u32 count, name_id name) {
    checkName(name, "base::AttribMap::attribute");
    AttribArray* array = findArray(name, true, false);
    if (!array) {
        array = new AttribArray;
        replace(name, std::unique_ptr<Attribute>(array));
    }
    while (array->size() < count) {
        auto made = std::make_unique<AttribMap>(*factory_);
        array->append(made.get());
        made.release();
    }
    Attribute* first = count == 0 ? nullptr : array->item(0);
    return first ? first->asMap() : nullptr;
}

bool AttribMap::removeAttribute(name_id name) {
    checkName(name, "base::AttribMap::removeAttribute");
    const auto at = lowerBound(name) - entries_.cbegin();
    return findOwn(name) && removeItem(static_cast<u32>(at));
}

// The map is empty before the first attribute dies: what dies with it may look it up.
void AttribMap::clear() {
    vector<Entry> dying;
    dying.swap(entries_);
    for (const Entry& entry : std::as_const(dying))
        delete entry.second;
}

void AttribMap::takeEntries(AttribMap& other) {
    if (&other == this)
        return;
    clear();
    entries_.swap(other.entries_);
    if (other.typeName())
        typeName_ = other.typeName();
}

} // namespace base
