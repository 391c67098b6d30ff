#include "b_attribute_json_forms.h"
#include "b_log.h"
#include "b_string_convert.h"

namespace base {

namespace {

/// The attribute name that a member stands for; empty, with a message, if it can't be one.
name_id attributeName(const DataMember& member, DataReader& in, const JSONReadOptions& options) {
    string_view text = member.name;
    if (text.starts_with("@@"))
        text.remove_prefix(1);
    if (text.empty() || text.find('\0') != string_view::npos) {
        in.setPlace(member.place);
        log().log(logSystem, logError,
                  "json parser {}| Invalid name of an attribute of '{}' at line {}!", in.source(),
                  options.owner, in.line());
        return {};
    }
    if (isValidUtf8(text))
        return nameServer().id(text);
    in.setPlace(member.place);
    log().log(logSystem, logWarning,
              "json parser {}| The name of attribute '{}::{}' at line {} is no valid UTF-8!",
              in.source(), options.owner, text, in.line());
    return validName(text);
}

void logRepeated(const DataReader& in, const JSONReadOptions& options, string_view name) {
    log().log(logSystem, logWarning,
              "json parser {}| '{}::{}' at line {} is given again further on, which counts!",
              in.source(), options.owner, name, in.line());
}

/// A member that stands for an attribute, and what has been read of it.
struct Named {
    name_id name;
    u32 place;
    std::unique_ptr<Attribute> read;
};

template <class Less>
void sortUnlessSorted(vector<Named>& list, Less less) {
    if (!std::is_sorted(list.cbegin(), list.cend(), less))
        std::sort(list.begin(), list.end(), less);
}

bool hasLesserName(const Named& a, const Named& b) {
    return a.name == b.name ? a.place < b.place : a.name < b.name;
}

bool hasLesserPlace(const Named& a, const Named& b) {
    return a.place < b.place;
}

/// The members that stand for attributes, in their order in the text, without those that are given
/// again.
vector<Named> attributeMembers(const JsonMembers& members, DataReader& in,
                               const JSONReadOptions& options) {
    vector<Named> all, counting;
    all.reserve(members.size());
    for (const DataMember& member : members) {
        if (isOwnMember(member))
            continue;
        if (const name_id name = attributeName(member, in, options))
            all.push_back({name, member.place, nullptr});
    }
    const auto isNotLess = [](const Named& a, const Named& b) { return !(a.name < b.name); };
    if (std::adjacent_find(all.cbegin(), all.cend(), isNotLess) == all.cend())
        return all;

    std::sort(all.begin(), all.end(), hasLesserName);
    counting.reserve(all.size());
    for (std::size_t i = 0; i < all.size(); ++i) {
        if (i + 1 < all.size() && all[i + 1].name == all[i].name) {
            in.setPlace(all[i].place);
            logRepeated(in, options, all[i].name.view());
        } else {
            counting.push_back(std::move(all[i]));
        }
    }
    sortUnlessSorted(counting, hasLesserPlace);
    return counting;
}

} // namespace

void collectMembers(DataReader& in, JsonMembers& members) {
    members.reset(in.length());
    in.enter();
    for (DataMember member; in.nextMember(member);)
        members.append(member);
    in.leave();
}

const DataMember* findMember(const JsonMembers& members, string_view name) {
    for (const DataMember* member = members.end(); member != members.begin();)
        if ((--member)->name == name)
            return member;
    return nullptr;
}

void warnOfForeign(const JsonMembers& members, DataReader& in, const JSONReadOptions& options) {
    const u32 start = in.place();
    for (const DataMember& member : members) {
        if (isOwnMember(member))
            continue;
        in.setPlace(member.place);
        logIgnored(in, options, member.name);
    }
    in.setPlace(start);
}

void checkOwnMembers(const JsonMembers& members, std::span<const string_view> known, DataReader& in,
                     const JSONReadOptions& options) {
    const u32 start = in.place();
    const DataMember* latest[4] = {}; // of each known name
    for (const DataMember& member : members) {
        if (!isOwnMember(member))
            continue;
        const auto at = std::find(known.begin(), known.end(), member.name);
        if (at == known.end()) {
            in.setPlace(member.place);
            logIgnored(in, options, member.name);
        } else if (const DataMember* former = std::exchange(latest[at - known.begin()], &member)) {
            in.setPlace(former->place);
            logRepeated(in, options, member.name);
        }
        in.setPlace(start);
    }
}

void readMembers(AttribMap& map, const JsonMembers& members, DataReader& in,
                 JSONReadOptions& options) {
    const bool wasEmpty = map.size() == 0;
    const name_id outer = options.attribute;
    vector<Named> attributes = attributeMembers(members, in, options);
    for (Named& attribute : attributes) {
        options.attribute = attribute.name;
        in.setPlace(attribute.place);
        attribute.read.reset(readJsonAttribute(in, options));
    }
    // In the order of the map each goes behind the last.
    sortUnlessSorted(attributes, hasLesserName);
    for (Named& attribute : attributes) {
        if (!attribute.read)
            continue;
        const u32 flags = attribute.read->flags() & storedFlags;
        map.attribute(attribute.name, attribute.read.get());
        attribute.read.release();
        // An attribute that was there keeps its flags when it takes the value over.
        if (Attribute* kept = wasEmpty ? nullptr : map.findAttribute(attribute.name, false, false))
            kept->setFlags((kept->flags() & ~storedFlags) | flags);
    }
    options.attribute = outer;
}

bool readFlags(const DataMember* member, DataReader& in, const JSONReadOptions& options,
               u32& flags) {
    if (!member)
        return true;
    const u32 start = in.place();
    in.setPlace(member->place);
    u8 bits = 0;
    const bool isRead = in.number(bits);
    if (!isRead)
        logUnreadable(in, options, member->name);
    flags = bits;
    in.setPlace(start);
    return isRead;
}

bool readNameText(const DataMember* member, string_view& text) {
    if (!member || member->kind != DataKind::text)
        return false;
    text = member->text;
    return text.find('\0') == string_view::npos;
}

name_id validName(string_view text) {
    return isValidUtf8(text) ? nameServer().id(text) : nameServer().id(toValidUtf8(text));
}

void logIgnored(const DataReader& in, const JSONReadOptions& options, string_view member) {
    log().log(logSystem, logWarning,
              "json parser {}| Ignoring the unknown member '{}' of '{}' at line {}!", in.source(),
              member, options.owner, in.line());
}

void logExpectedArray(const DataReader& in) {
    log().log(logSystem, logError, "json parser {}| Expected an array value at line {}!",
              in.source(), in.line());
}

void logUnreadable(const DataReader& in, const JSONReadOptions& options, string_view type) {
    log().log(logSystem, logError,
              "json parser {}| Unable to read the value of attribute '{}::{}' with type '{}' at "
              "line {}!",
              in.source(), options.owner, options.attribute, type, in.line());
}

} // namespace base
