#include "b_attribute_binary_writer.h"

#include "b_exception.h"
#include "b_factory.h"
#include "b_format.h"
#include "b_log.h"
#include "b_nested_level.h"
#include "b_stored_document.h"

#include <bit>

namespace base {

namespace {

// Values go out as they lie in memory.
static_assert(std::endian::native == std::endian::little);

constexpr u32 maxSize = std::numeric_limits<u32>::max();
constexpr std::uintptr_t isNumbered = 0x10000; ///< beside the low 16 bits of an extra field

std::mutex& nameTableTurn() {
    static std::mutex& turn = *new std::mutex;
    return turn;
}

/// The record of a name; absent names are stored as the one without characters.
const NameRecord& recordOf(name_id name) {
    return name ? *name.record() : *nameServer().emptyName().record();
}

[[noreturn]] void throwWriting(string text) {
    throw exception(std::move(text), "b_attribute", "base::Attribute::write", __LINE__);
}

name_id storedType(const Attribute& attribute, hash_map<name_id, name_id>& mapTypes) {
    const name_id type = attribute.type();
    if (type != n_map)
        return type;
    const name_id ownType = attribute.asMap()->typeName();
    if (ownType.isEmpty())
        return type;
    name_id& stored = mapTypes[ownType];
    if (!stored)
        stored = nameServer().id(string(mapTypePrefix).append(ownType.view()));
    return stored;
}

/// Counts bytes in the order in which `BinaryWriter` writes them.
class Measure {
public:
    explicit Measure(BinaryWriteState& state) : state_(state) {}

    u64 whole(const Attribute& attribute) {
        constexpr u64 flagsBytes = 1;
        const name_id type = attribute.type();
        if (type == n_map)
            return flagsBytes + map(*attribute.asMap());
        if (type == n_array)
            return flagsBytes + array(*attribute.asArray());
        if (type == n_link)
            return flagsBytes + path(attribute.asLink()->path());
        return flagsBytes + attribute.byteSize();
    }

private:
    u64 map(const AttribMap& map) {
        enterLevel(state_.depth, "base::Attribute::write");
        u64 total = sizeof(u32);
        for (const AttribMap::Entry& entry : map.entries())
            if (isStored(*entry.second))
                total += name(entry.first) + sized(*entry.second);
        --state_.depth;
        return total;
    }

    u64 array(const AttribArray& array) {
        enterLevel(state_.depth, "base::Attribute::write");
        u64 total = sizeof(u32) + name(array.typeName());
        for (const Attribute* item : array.items())
            total += item && isStored(*item) ? sized(*item) : name({});
        --state_.depth;
        return total;
    }

    u64 path(const AttribPath& path) {
        u64 total = sizeof(u32);
        for (const PathStep& step : path.steps())
            total += name(step.name) + sizeof(u32) + sizeof(u8);
        return total;
    }

    /// Type name, size and attribute.
    u64 sized(const Attribute& attribute) {
        state_.attributeTypes.add(attribute.type());
        u64 total = name(storedType(attribute, state_.mapTypes)) + sizeof(u32);
        const std::size_t place = state_.sizes.size();
        state_.sizes.push_back(0);
        const u64 byteCount = whole(attribute);
        state_.sizes[place] = saturatedSize(byteCount);
        return total + byteCount;
    }

    u64 name(name_id name) {
        if (!state_.nameTable)
            return sizeof(u32) + name.view().size();
        state_.nameTable->add(name);
        return sizeof(u16);
    }

    BinaryWriteState& state_;
};

} // namespace

BinaryNameTable::BinaryNameTable() : turn_(nameTableTurn()) {}

BinaryNameTable::~BinaryNameTable() {
    clear();
}

void BinaryNameTable::clear() noexcept {
    for (const name_id name : std::as_const(names_))
        recordOf(name).extra = nullptr;
    names_.clear();
}

void BinaryNameTable::add(name_id name) {
    const NameRecord& record = recordOf(name);
    if (record.extra)
        return;
    names_.push_back(name_id(&record));
    record.extra = reinterpret_cast<void*>((names_.size() - 1) | isNumbered);
}

u16 BinaryNameTable::id(name_id name) const {
    return static_cast<u16>(reinterpret_cast<std::uintptr_t>(recordOf(name).extra));
}

u32 BinaryTypeTable::add(name_id name) {
    const auto [at, isNew] = ids_.try_emplace(name, static_cast<u32>(names_.size()));
    if (isNew)
        names_.push_back(name);
    return at->second;
}

u64 measureBinary(const Attribute& attribute, BinaryWriteState& state) {
    return Measure(state).whole(attribute);
}

BinaryWriteScope::BinaryWriteScope(const Attribute& attribute, BinaryWriteOptions& options)
    : options_(options) {
    if (options.state)
        return;
    own_ = std::make_unique<BinaryWriteState>();
    if (measureBinary(attribute, *own_) > maxSize)
        throwWriting(format("An attribute of type '{}' takes more than 4 GiB.", attribute.type()));
    options.state = own_.get();
}

BinaryWriteScope::~BinaryWriteScope() {
    if (own_)
        options_.state = nullptr;
}

void BinaryWriter::count(std::size_t elements) {
    if (elements > maxSize)
        throwWriting("An attribute has more than 4294967295 elements.");
    number(static_cast<u32>(elements));
}

void BinaryWriter::text(string_view text) {
    if (text.size() > maxBinaryString)
        throwWriting(format("A string of {} bytes is longer than the 256 MiB that can be stored.",
                            text.size()));
    number(static_cast<u32>(text.size()));
    bytes(text.data(), text.size());
}

void BinaryWriter::name(name_id name) {
    if (options_.state && options_.state->nameTable)
        number(options_.state->nameTable->id(name));
    else
        text(name.view());
}

void BinaryWriter::entry(name_id name, const Attribute& attribute) {
    options_.state->attributeName = name;
    this->name(name);
    element(&attribute);
}

void BinaryWriter::element(const Attribute* attribute) {
    if (!attribute)
        return name({});
    name(storedType(*attribute, options_.state->mapTypes));
    number(options_.state->sizes[options_.state->nextSize++]);
    attribute->write(stream_, options_);
}

u32 BinaryWriter::idOf(const IPlugin* object) const {
    if (!object)
        return IPlugin::noId;
    const bool isForeign = options_.factory && object->pluginFactory() != options_.factory;
    if (!isForeign && object->id() != IPlugin::noId && !object->hasFlag(attribTransient))
        return object->id();
    const BinaryWriteState* state = options_.state;
    log().log(logSystem, logWarning,
              "plugin factory| Attribute '{}' of plugin {} refers to a plugin that is not stored "
              "with it, the reference is left empty.",
              state ? state->attributeName : name_id(),
              state && state->object ? std::to_string(state->object->id()) : string("-"));
    return IPlugin::noId;
}

} // namespace base
