#include "b_attribute.h"

#include "b_factory.h"
#include "b_log.h"

#include <mutex>

namespace base {

Attribute::~Attribute() {
    clearWeakLinks();
}

AttribLink* Attribute::asLink() {
    return nullptr;
}

AttribArray* Attribute::asArray() {
    return nullptr;
}

AttribMap* Attribute::asMap() {
    return nullptr;
}

u32 Attribute::size() const {
    return 1;
}

bool Attribute::removeItem(u32) {
    return false;
}

string Attribute::toString() const {
    return {};
}

bool Attribute::fromString(string_view, i32) {
    return false;
}

bool Attribute::isAnimated() const {
    return hasFlag(attribAnimated);
}

u32 Attribute::hash() const {
    return 0;
}

void Attribute::clearWeakLinks() noexcept {
    if (!weakHead_)
        return;
    const std::lock_guard guard(weakLock_);
    while (AttribWeakLink* link = weakHead_) {
        weakHead_ = link->next_;
        link->target_ = nullptr;
        link->previous_ = link->next_ = nullptr;
    }
}

PluginAttribute::~PluginAttribute() = default;

Attribute* PluginAttribute::clone() const {
    auto copy = std::make_unique<PluginAttribute>(value_);
    copy->setFlags(flags());
    copy->path = path;
    return copy.release();
}

bool PluginAttribute::assign(const Attribute& other, u32 mode, i32 index) {
    if (!TypedAttribute::assign(other, mode, index))
        return false;
    if (const auto* source = dynamic_cast<const PluginAttribute*>(&other))
        path = source->path;
    return true;
}

void PluginAttribute::setData(const void* value, i32 index) {
    TypedAttribute::setData(value, index);
    path = {};
}

PluginVectorAttribute::PluginVectorAttribute() {
    setFlags(attribMergeOnAssign);
}

PluginVectorAttribute::~PluginVectorAttribute() = default;

Attribute* PluginVectorAttribute::clone() const {
    auto copy = std::make_unique<PluginVectorAttribute>();
    copy->setFlags(flags());
    copy->value_ = value_;
    return copy.release();
}

Attribute* AttribFactory::create(name_id type) const {
    const auto found = creators_.find(type);
    if (Attribute* made = found == creators_.end() ? nullptr : found->second())
        return made;
    log().log(logSystem, logWarning, "factory: Trying to create am item with unknown type {}.",
              type);
    return nullptr;
}

bool AttribFactory::has(name_id type) const {
    return creators_.contains(type);
}

bool AttribFactory::add(name_id type, Creator creator) {
    return creators_.emplace(type, creator).second;
}

bool AttribFactory::remove(name_id type) {
    return creators_.erase(type) != 0;
}

namespace {

template <class Made>
Attribute* make() {
    return new Made;
}

void addAllTypes(AttribFactory& factory) {
    // Ahead of the tables, whose plain forms of these two then find their types taken.
    factory.add(TypeTraits<ref<IPlugin>>::n_name, make<PluginAttribute>);
    factory.add(TypeTraits<ref<IPlugin>>::n_array_name, make<PluginVectorAttribute>);
#define BASE_ADD_SCALAR(T, text) factory.add(TypeTraits<T>::n_name, make<TypedAttribute<T>>);
#define BASE_ADD_ARRAY(T, text) \
    factory.add(TypeTraits<T>::n_array_name, make<TypedVectorAttribute<T>>);
    BASE_FULL_TYPES(BASE_ADD_SCALAR)
    BASE_SCALAR_TYPES(BASE_ADD_SCALAR)
    BASE_FULL_TYPES(BASE_ADD_ARRAY)
    BASE_ARRAY_TYPES(BASE_ADD_ARRAY)
    factory.add(n_map, make<AttribMap>);
    factory.add(n_array, make<AttribArray>);
    factory.add(n_link, make<AttribLink>);
}

} // namespace

AttribFactory& attribFactory() {
    static AttribFactory& factory = []() -> AttribFactory& {
        auto& made = *new AttribFactory;
        addAllTypes(made);
        return made;
    }();
    return factory;
}

} // namespace base
