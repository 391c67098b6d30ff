#include "b_attribute_json_forms.h"
#include "b_log.h"
#include "b_string_convert.h"

namespace base {

namespace {

/// The type name that a reader takes from the elements of an array.
name_id impliedTypeName(const AttribArray& array) {
    for (const Attribute* item : array.items())
        if (item && item->asMap() && isStored(*item))
            return item->asMap()->typeName();
    return {};
}

bool isSameType(name_id a, name_id b) {
    return a == b || (a.isEmpty() && b.isEmpty());
}

void writeElements(const AttribArray& array, DataWriter& out, JSONWriteOptions& options) {
    out.beginArray();
    for (const Attribute* item : array.items()) {
        if (item && isStored(*item))
            item->writeJson(out, options);
        else
            out.null();
    }
    out.endArray();
}

/// Reads a value whose type is known; null, with a message, if it is none.
Attribute* readTyped(std::unique_ptr<Attribute> made, DataReader& in, JSONReadOptions& options) {
    const u32 start = in.place();
    const bool isRead = made->readJson(in, options);
    if (isRead)
        return made.release();
    const u32 behind = in.place();
    in.setPlace(start);
    logUnreadable(in, options, made->type().view());
    in.setPlace(behind);
    return nullptr;
}

/// A new attribute of a type that may be unknown, for which it is null.
std::unique_ptr<Attribute> makeAttribute(name_id type, const JSONReadOptions& options) {
    std::unique_ptr<Attribute> made;
    if (type == n_map)
        made = std::make_unique<AttribMap>(*options.attribFactory);
    else if (options.attribFactory->has(type))
        made.reset(options.attribFactory->create(type));
    return made;
}

void logUnknownType(const DataReader& in, const JSONReadOptions& options, string_view type,
                    bool isElement) {
    if (isElement)
        log().log(logSystem, logError,
                  "json parser {}| Trying to create an attribute from unknown type '{}' at line "
                  "{}!",
                  in.source(), type, in.line());
    else
        log().log(logSystem, logError,
                  "json parser {}| Trying to create an attribute '{}::{}' from unknown type '{}' "
                  "at line {}!",
                  in.source(), options.owner, options.attribute, type, in.line());
}

/// An empty one is none.
name_id ownType(string_view text) {
    return text.empty() ? name_id() : validName(text);
}

/// Reads the form that tells its type, whose members are given. `in` stands at its beginning.
Attribute* readLongForm(const JsonMembers& members, DataReader& in, JSONReadOptions& options,
                        bool isElement) {
    static constexpr string_view known[] = {"@type", "@flags", "@of", "@value"};
    checkOwnMembers(members, known, in, options);
    warnOfForeign(members, in, options);
    string_view typeText, elementType;
    const DataMember* of = findMember(members, "@of");
    const DataMember* value = findMember(members, "@value");
    if (!readNameText(findMember(members, "@type"), typeText) || !value ||
        (of && !readNameText(of, elementType))) {
        logUnreadable(in, options, typeText);
        return nullptr;
    }
    u32 flags = 0;
    if (!readFlags(findMember(members, "@flags"), in, options, flags))
        return nullptr;

    std::unique_ptr<Attribute> made = makeAttribute(nameServer().find(typeText), options);
    if (!made) {
        logUnknownType(in, options, typeText, isElement);
        return nullptr;
    }
    made->setFlags((made->flags() & ~storedFlags) | flags);
    in.setPlace(value->place);
    Attribute* read = readTyped(std::move(made), in, options);
    if (read && of && read->asArray())
        read->asArray()->setTypeName(ownType(elementType));
    return read;
}

void readMap(AttribMap& map, const JsonMembers& members, DataReader& in, JSONReadOptions& options) {
    static constexpr string_view known[] = {"@map"};
    checkOwnMembers(members, known, in, options);
    const DataMember* type = findMember(members, "@map");
    string_view typeText;
    if (readNameText(type, typeText))
        map.setTypeName(ownType(typeText));
    else if (type)
        logUnreadable(in, options, n_map.view());
    readMembers(map, members, in, options);
}

Attribute* readObject(DataReader& in, JSONReadOptions& options, bool isElement) {
    const u32 start = in.place();
    JsonMembers members;
    collectMembers(in, members);
    const u32 behind = in.place();
    in.setPlace(start);
    Attribute* read = nullptr;
    if (findMember(members, "@type")) {
        read = readLongForm(members, in, options, isElement);
    } else {
        const NestedValue nested(options.depth);
        auto map = std::make_unique<AttribMap>(*options.attribFactory);
        readMap(*map, members, in, options);
        read = map.release();
    }
    in.setPlace(behind);
    return read;
}

Attribute* readAttribute(DataReader& in, JSONReadOptions& options, bool isElement) {
    name_id type;
    switch (in.kind()) {
    case DataKind::boolean:
        type = TypeTraits<bool>::n_name;
        break;
    case DataKind::integer:
        type = TypeTraits<i32>::n_name;
        break;
    case DataKind::real:
        type = TypeTraits<float>::n_name;
        break;
    case DataKind::text:
        type = TypeTraits<string>::n_name;
        break;
    case DataKind::array:
        type = n_array;
        break;
    case DataKind::object:
        return readObject(in, options, isElement);
    case DataKind::null:
    case DataKind::name:
    case DataKind::end:
        break;
    }
    std::unique_ptr<Attribute> made(type ? options.attribFactory->create(type) : nullptr);
    if (made)
        return readTyped(std::move(made), in, options);
    logUnreadable(in, options, type ? type.view() : "null");
    in.skip();
    return nullptr;
}

} // namespace

bool isValidUtf8(string_view text) {
    char seen = 0;
    for (const char c : text)
        seen = static_cast<char>(seen | c);
    return (seen & 0x80) == 0 || toValidUtf8(text) == text;
}

string_view validText(name_id name, const JSONWriteOptions& options, string& repaired) {
    if (isValidUtf8(name.view()))
        return name.view();
    log().log(logSystem, logWarning, "json writer| Name '{}' in '{}' is no valid UTF-8!", name,
              options.owner);
    return repaired = toValidUtf8(name.view());
}

void beginTyped(DataWriter& out, name_id type, u32 flags, DataLayout layout) {
    out.beginObject(layout);
    out.name("@type");
    out.text(type.view());
    writeFlags(out, flags);
}

void writeFlags(DataWriter& out, u32 flags) {
    if ((flags & storedFlags) == 0)
        return;
    out.name("@flags");
    out.number(flags & storedFlags);
}

void AttribMap::writeJson(DataWriter& out, JSONWriteOptions& options) const {
    const NestedValue nested(options.depth);
    const bool isTyped = (flags() & storedFlags) != 0;
    if (isTyped) {
        beginTyped(out, n_map, flags(), DataLayout::lines);
        out.name("@value");
    }
    out.beginObject();
    if (const name_id own = typeName(); !own.isEmpty()) {
        string repaired;
        out.name("@map");
        out.text(validText(own, options, repaired));
    }
    writeMembers(*this, out, options);
    out.endObject();
    if (isTyped)
        out.endObject();
}

void writeMembers(const AttribMap& map, DataWriter& out, JSONWriteOptions& options) {
    vector<const AttribMap::Entry*> written;
    written.reserve(map.size());
    for (const AttribMap::Entry& entry : map.entries())
        if (isStored(*entry.second))
            written.push_back(&entry);
    const auto byText = [](const AttribMap::Entry* a, const AttribMap::Entry* b) {
        return a->first.view() < b->first.view();
    };
    std::sort(written.begin(), written.end(), byText);

    const name_id outer = options.attribute;
    for (const AttribMap::Entry* entry : std::as_const(written)) {
        options.attribute = entry->first;
        string repaired;
        const string_view name = validText(entry->first, options, repaired);
        out.name(name.starts_with('@') ? '@' + string(name) : name);
        entry->second->writeJson(out, options);
    }
    options.attribute = outer;
}

void AttribArray::writeJson(DataWriter& out, JSONWriteOptions& options) const {
    const NestedValue nested(options.depth);
    const bool tellsType = !isSameType(typeName_, impliedTypeName(*this));
    const bool isTyped = tellsType || (flags() & storedFlags) != 0;
    if (isTyped)
        beginTyped(out, n_array, flags(), DataLayout::lines);
    if (tellsType) {
        string repaired;
        out.name("@of");
        out.text(validText(typeName_, options, repaired));
    }
    if (isTyped)
        out.name("@value");
    writeElements(*this, out, options);
    if (isTyped)
        out.endObject();
}

bool AttribMap::readJson(DataReader& in, JSONReadOptions& options) {
    const NestedValue nested(options.depth);
    clear();
    if (in.kind() != DataKind::object) {
        in.skip();
        return false;
    }
    const u32 start = in.place();
    JsonMembers members;
    collectMembers(in, members);
    in.setPlace(start);
    readMap(*this, members, in, options);
    in.setPlace(start);
    in.skip();
    return true;
}

bool AttribArray::readJson(DataReader& in, JSONReadOptions& options) {
    const NestedValue nested(options.depth);
    AttribArray read;
    takeItems(read);
    typeName_ = {};
    if (in.kind() != DataKind::array) {
        logExpectedArray(in);
        in.skip();
        return false;
    }
    items_.reserve(in.length());
    in.enter();
    while (in.kind() != DataKind::end) {
        const bool isGap = in.kind() == DataKind::null;
        append(nullptr);
        if (isGap)
            in.skip();
        else
            items_.back() = readAttribute(in, options, true);
    }
    in.leave();
    typeName_ = impliedTypeName(*this);
    return true;
}

Attribute* readJsonAttribute(DataReader& in, JSONReadOptions& options) {
    return readAttribute(in, options, false);
}

} // namespace base
