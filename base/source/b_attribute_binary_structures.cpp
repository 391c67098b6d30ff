#include "b_attribute_binary_reader.h"
#include "b_attribute_binary_writer.h"

#include "b_exception.h"
#include "b_factory.h"
#include "b_log.h"
#include "b_stored_document.h"

namespace base {

namespace {

/// Has the attributes within be made by the factory of their map, while it lives.
class FactoryScope : public NonCopyable {
public:
    FactoryScope(BinaryReadState& state, AttribFactory& factory)
        : state_(state), outer_(state.attributeFactory) {
        change(&factory);
    }
    ~FactoryScope() { change(outer_); }

private:
    void change(AttribFactory* factory) noexcept {
        if (state_.attributeFactory != factory)
            state_.types.clear(); // they hold what the other one knows
        state_.attributeFactory = factory;
    }

    BinaryReadState& state_;
    AttribFactory* outer_;
};

/// What stands before an attribute in a map.
struct EntryHead {
    name_id name;
    name_id type;
    u32 byteCount = 0;

    bool read(BinaryReader& in) { return in.name(name) && in.name(type) && in.number(byteCount); }
};

void reportUnknownType(name_id name) {
    log().log(logSystem, logError,
              "map attribute: Attribute '{}' has unknown type. This may be caused by newer version "
              "or corrupted file. Trying to skip...",
              name);
}

void reportBadName() {
    log().log(logSystem, logError,
              "map attribute: An attribute has an invalid name. Probably a corrupted file. Trying "
              "to skip...");
}

/// Attributes that a map does not have yet. They go into it at once, sorted: one by one, names in
/// falling order would move those before them again and again.
class NewEntries : public NonCopyable {
public:
    ~NewEntries() {
        for (const AttribMap::Entry& entry : std::as_const(entries_))
            delete entry.second;
    }
    Attribute* add(name_id name, std::unique_ptr<Attribute> attribute) {
        entries_.emplace_back(name, attribute.get());
        return attribute.release();
    }
    /// Of several with one name the last.
    void moveTo(vector<AttribMap::Entry>& entries) {
        const auto less = [](const AttribMap::Entry& a, const AttribMap::Entry& b) {
            return a.first < b.first;
        };
        if (!std::is_sorted(entries_.cbegin(), entries_.cend(), less))
            std::stable_sort(entries_.begin(), entries_.end(), less);
        entries.reserve(entries.size() + entries_.size());
        const auto before = static_cast<std::ptrdiff_t>(entries.size());
        for (AttribMap::Entry& entry : entries_) {
            const bool isRepeated = static_cast<std::ptrdiff_t>(entries.size()) != before &&
                                    std::as_const(entries).back().first == entry.first;
            if (isRepeated)
                delete std::exchange(entries.back().second, nullptr);
            else
                entries.emplace_back(entry.first, nullptr);
            entries.back().second = std::exchange(entry.second, nullptr);
        }
        std::inplace_merge(entries.begin(), entries.begin() + before, entries.end(), less);
    }

private:
    vector<AttribMap::Entry> entries_;
};

/// Reads the attributes of a map. `findTarget` gives the one to read into for a name and a type.
template <class FindTarget>
bool readEntries(BinaryReader& in, Stream& stream, BinaryReadOptions& options,
                 FindTarget findTarget) {
    u32 count = 0;
    if (!in.number(count))
        return false;
    for (u32 i = 0; i < count; ++i) {
        EntryHead head;
        if (!head.read(in))
            return false;
        const BinaryType type = in.resolve(head.type);
        Attribute* target = nullptr;
        if (head.name.isEmpty())
            reportBadName();
        else if (!type.type)
            reportUnknownType(head.name);
        else
            target = findTarget(head.name, type);
        if (!in.payload(head.byteCount, [&] { return !target || target->read(stream, options); }))
            return false;
    }
    return true;
}

bool readStep(BinaryReader& in, PathStep& step) {
    u8 kind = 0;
    if (!in.name(step.name) || !in.number(step.index) || !in.number(kind))
        return false;
    step.kind = static_cast<PathStepKind>(kind);
    return true;
}

/// A path of which some step can't be, if only by its place.
bool isValidStep(const PathStep& step, bool isFirst) {
    return step.kind <= PathStepKind::component && (isFirst || step.kind != PathStepKind::plugin);
}

/// The names of steps without one are absent but for that of the root.
name_id ownName(const PathStep& step) {
    if (step.kind == PathStepKind::plugin)
        return nameServer().emptyName();
    return step.name.isEmpty() ? name_id() : step.name;
}

} // namespace

void AttribLink::write(Stream& stream, BinaryWriteOptions& options) const {
    Attribute::write(stream, options);
    BinaryWriter out(stream, options);
    const vector<PathStep>& steps = path_.steps();
    out.count(steps.size());
    for (const PathStep& step : steps) {
        const bool isLiveRoot = step.kind == PathStepKind::plugin && path_.root();
        out.name(step.name);
        out.number(isLiveRoot ? out.idOf(path_.root()) : step.index);
        out.number(static_cast<u8>(step.kind));
    }
}

bool AttribLink::read(Stream& stream, BinaryReadOptions& options) {
    BinaryReader in(stream, options);
    path_ = {};
    u32 count = 0;
    if (!Attribute::read(stream, options) || !in.number(count))
        return false;
    AttribPath path;
    for (u32 i = 0; i < count; ++i) {
        PathStep step;
        if (!readStep(in, step))
            return false;
        if (!isValidStep(step, i == 0)) {
            log().log(logSystem, logError,
                      "link attribute: Step {} of a path has the invalid kind {}. The link is left "
                      "empty.",
                      i, static_cast<u32>(step.kind));
            return true;
        }
        const bool isRoot = step.kind == PathStepKind::plugin;
        path.step(step.kind, ownName(step),
                  isRoot ? shiftedId(step.index, options.firstId) : step.index);
    }
    if (count != 0 && path.steps()[0].kind == PathStepKind::plugin && options.factory)
        if (const ref<IPlugin> root = options.factory->plugin(path.steps()[0].index))
            path.setRoot(*root);
    path_ = std::move(path);
    return true;
}

void AttribArray::write(Stream& stream, BinaryWriteOptions& options) const {
    const BinaryWriteScope scope(*this, options);
    Attribute::write(stream, options);
    BinaryWriter out(stream, options);
    out.count(items_.size());
    out.name(typeName_);
    for (const Attribute* item : items_)
        out.element(item && isStored(*item) ? item : nullptr);
}

bool AttribArray::read(Stream& stream, BinaryReadOptions& options) {
    BinaryReader in(stream, options);
    const BinaryReader::Level level(in);
    u32 count = 0;
    name_id typeName;
    AttribArray none;
    takeItems(none);
    if (!Attribute::read(stream, options) || !in.number(count) || !in.name(typeName))
        return false;
    typeName_ = typeName.isEmpty() ? name_id() : typeName;
    for (u32 i = 0; i < count; ++i) {
        name_id storedType;
        if (!in.name(storedType))
            return false;
        if (!storedType)
            throw exception("array attribute: Unable to read the attribute type inside! Probably a "
                            "corrupted file!",
                            "b_attribute", "base::AttribArray::read", __LINE__);
        append(nullptr);
        if (storedType.isEmpty())
            continue;
        const BinaryType type = in.resolve(storedType);
        u32 byteCount = 0;
        if (!in.number(byteCount))
            return false;
        if (!type.type)
            log().log(logSystem, logWarning,
                      "array attribute: Unknown attribute type '{}'. Ignoring...", storedType);
        else
            setItem(i, in.make(type).release());
        Attribute* item = items_.back();
        if (!in.payload(byteCount, [&] { return !item || item->read(stream, options); }))
            return false;
    }
    return true;
}

void AttribMap::write(Stream& stream, BinaryWriteOptions& options) const {
    const BinaryWriteScope scope(*this, options);
    Attribute::write(stream, options);
    BinaryWriter out(stream, options);
    out.count(static_cast<std::size_t>(
        std::count_if(entries_.begin(), entries_.end(),
                      [](const Entry& entry) { return isStored(*entry.second); })));
    for (const Entry& entry : entries_)
        if (isStored(*entry.second))
            out.entry(entry.first, *entry.second);
}

/// Attributes that the map has already keep the flags that are not stored, and what points at
/// them. The value of a map is what is stored and nothing else, so one within is emptied first.
bool AttribMap::read(Stream& stream, BinaryReadOptions& options) {
    BinaryReader in(stream, options);
    const BinaryReader::Level level(in);
    const FactoryScope scope(in.state(), *factory_);
    if (!Attribute::read(stream, options))
        return false;
    NewEntries made;
    const bool isWhole =
        readEntries(in, stream, options, [&](name_id name, const BinaryType& type) {
            Attribute* own = findOwn(name);
            if (!own)
                return made.add(name, in.make(type));
            if (own->type() != type.type) {
                replace(name, in.make(type));
                return findOwn(name);
            }
            if (AttribMap* map = own->asMap()) {
                map->clear();
                map->setTypeName(type.mapType);
            }
            return own;
        });
    made.moveTo(entries_);
    return isWhole;
}

} // namespace base
