#include "b_attribute_links.h"
#include "b_attribute_values.h"
#include "b_exception.h"
#include "b_nested_level.h"

namespace base {

namespace {

constexpr u32 mostLevels = 256;
thread_local u32 cloneDepth = 0;

/// The links that one question "is it animated?" on this thread has asked already. Each is asked
/// once, so that links which lead back to where they are held end.
struct AnimatedWalk {
    set<const AttribLink*> asked;
    u32 depth = 0;
};
thread_local AnimatedWalk* animatedWalk = nullptr;

/// `ask`, unless `link` was asked in this walk or too many links are being followed.
template <class Ask>
bool askOnce(const AttribLink& link, Ask ask) {
    struct Scope {
        AnimatedWalk own;
        bool outermost = !animatedWalk;
        Scope() {
            if (outermost)
                animatedWalk = &own;
            ++animatedWalk->depth;
        }
        ~Scope() {
            --animatedWalk->depth;
            if (outermost)
                animatedWalk = nullptr;
        }
    };
    const Scope scope;
    return animatedWalk->depth <= maxLinkHops && animatedWalk->asked.insert(&link).second && ask();
}

void deleteAll(vector<Attribute*> items) {
    for (const Attribute* item : std::as_const(items))
        delete item;
}

/// Compares two attributes of any class, either of which may be missing.
i32 compareItems(const Attribute* a, const Attribute* b) {
    if (!a || !b)
        return compareValues(a != nullptr, b != nullptr);
    if (a->type() != b->type())
        return compareValues(a->type(), b->type());
    return a->compare(b->data(-1), -1);
}

bool contains(const vector<Attribute*>& items, const Attribute* item) {
    return std::any_of(items.begin(), items.end(),
                       [&](const Attribute* other) { return compareItems(other, item) == 0; });
}

/// Owns attributes until they have all been made.
struct Copies : NonCopyable {
    vector<Attribute*> items;
    ~Copies() { deleteAll(std::move(items)); }

    void add(const Attribute* original) {
        std::unique_ptr<Attribute> copy(original ? original->clone() : nullptr);
        items.push_back(copy.get());
        copy.release();
    }
};

} // namespace

void enterLevel(u32& depth, const char* function) {
    if (depth == mostLevels)
        throw exception("Attributes are nested deeper than 256 levels.", "b_attribute", function,
                        __LINE__);
    ++depth;
}

CloneDepth::CloneDepth() {
    enterLevel(cloneDepth, "base::Attribute::clone");
}

CloneDepth::~CloneDepth() {
    --cloneDepth;
}

AttribArray::~AttribArray() {
    deleteAll(std::move(items_));
}

Attribute* AttribArray::clone() const {
    const CloneDepth depth;
    auto copy = std::make_unique<AttribArray>();
    copy->setFlags(flags());
    copy->typeName_ = typeName_;
    copy->setData(&items_, -1);
    return copy.release();
}

void* AttribArray::data(i32 index) {
    if (index < 0)
        return &items_;
    Attribute* found = item(static_cast<u32>(index));
    return found ? found->data(-1) : nullptr;
}

bool AttribArray::removeItem(u32 index) {
    if (index >= items_.size())
        return false;
    const std::unique_ptr<Attribute> removed(items_[index]);
    items_.erase(items_.cbegin() + index);
    return true;
}

u32 AttribArray::byteSize() const {
    u64 total = sizeof(u32);
    for (const Attribute* item : items_)
        total += item ? item->byteSize() : 0;
    return saturatedSize(total);
}

bool AttribArray::assign(const Attribute& other, u32 mode, i32) {
    const AttribArray* source = other.asArray();
    if (!source || source == this)
        return source != nullptr;
    const bool replace = items_.empty() || (mode & assignCopy) != 0;
    if (!replace && !hasFlag(attribMergeOnAssign))
        return true;

    const bool keepAll = replace || hasFlag(attribMergeDuplicates);
    Copies copies;
    for (const Attribute* item : source->items_)
        if (keepAll || (!contains(items_, item) && !contains(copies.items, item)))
            copies.add(item);
    if (replace) {
        items_.swap(copies.items);
        typeName_ = source->typeName_;
    } else {
        items_.append(copies.items.cbegin(), copies.items.cend());
        copies.items.clear();
    }
    return true;
}

bool AttribArray::isAnimated() const {
    return hasFlag(attribAnimated) ||
           std::any_of(items_.begin(), items_.end(),
                       [](const Attribute* item) { return item && item->isAnimated(); });
}

void AttribArray::setData(const void* value, i32 index) {
    if (index >= 0) {
        if (Attribute* found = item(static_cast<u32>(index)))
            found->setData(value, -1);
        return;
    }
    const auto& source = *static_cast<const vector<Attribute*>*>(value);
    if (&source == &items_)
        return;
    Copies copies;
    for (const Attribute* item : source)
        copies.add(item);
    items_.swap(copies.items);
}

i32 AttribArray::compare(const void* value, i32 index) const {
    if (index >= 0) {
        const Attribute* found = item(static_cast<u32>(index));
        return found ? found->compare(value, -1) : -1;
    }
    const auto& other = *static_cast<const vector<Attribute*>*>(value);
    if (items_.size() != other.size())
        return items_.size() < other.size() ? -1 : 1;
    for (std::size_t i = 0; i < other.size(); ++i)
        if (const i32 order = compareItems(items_[i], other[i]); order != 0)
            return order;
    return 0;
}

void AttribArray::setItem(u32 index, Attribute* item) {
    if (index >= items_.size())
        items_.resize(std::size_t{index} + 1);
    if (items_[index] != item)
        delete std::exchange(items_[index], item);
}

void AttribArray::takeItems(AttribArray& other) {
    if (&other == this)
        return;
    deleteAll(std::exchange(items_, std::move(other.items_)));
    if (other.typeName_)
        typeName_ = other.typeName_;
}

AttribLink::~AttribLink() = default;

Attribute* AttribLink::clone() const {
    auto copy = std::make_unique<AttribLink>(path_);
    copy->setFlags(flags());
    return copy.release();
}

void* AttribLink::data(i32 index) {
    return index < 0 ? &path_ : nullptr;
}

bool AttribLink::assign(const Attribute& other, u32 mode, i32) {
    const AttribLink* source = other.asLink();
    if (!source || (mode & assignCopy) == 0)
        return false;
    path_ = source->path_;
    return true;
}

string AttribLink::toString() const {
    return path_.toString();
}

bool AttribLink::isAnimated() const {
    if (hasFlag(attribAnimated))
        return true;
    return askOnce(*this, [this] {
        const Attribute* target = path_.resolve();
        const IPlugin* root = path_.root();
        return (target && target->isAnimated()) || (root && root->isPathAnimated(path_));
    });
}

void AttribLink::setData(const void* value, i32 index) {
    if (index < 0)
        path_ = *static_cast<const AttribPath*>(value);
}

i32 AttribLink::compare(const void* value, i32 index) const {
    const auto& other = *static_cast<const AttribPath*>(value);
    if (index >= 0 || path_ == other)
        return index >= 0 ? -1 : 0;
    return path_.toString() < other.toString() ? -1 : 1;
}

} // namespace base
