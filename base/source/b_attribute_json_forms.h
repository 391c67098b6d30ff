#pragma once

#include "b_attribute_json.h"
#include "b_factory.h"
#include "b_nested_level.h"
#include "b_stored_document.h"

/// What the parts of the JSON form share.
namespace base {

bool isValidUtf8(string_view text);
/// Text of a name; what is no UTF-8 is replaced, in `repaired` and with a warning.
string_view validText(name_id name, const JSONWriteOptions& options, string& repaired);

/// Counts the maps and arrays that lie in each other.
class NestedValue : public NonCopyable {
public:
    /// Throws `exception` beyond 256 levels.
    explicit NestedValue(u32& depth) : depth_(depth) { enterLevel(depth, "base::NestedValue"); }
    ~NestedValue() { --depth_; }

private:
    u32& depth_;
};

/// Begins an object that tells its type and flags; its value, and `endObject`, are to follow.
void beginTyped(DataWriter& out, name_id type, u32 flags, DataLayout layout);
/// Writes the member for the stored flags, unless they are 0.
void writeFlags(DataWriter& out, u32 flags);
/// Writes the attributes of `map` as members of the open object.
void writeMembers(const AttribMap& map, DataWriter& out, JSONWriteOptions& options);

/// The name by which others may refer to an object: that of its own attribute "name", if it is
/// written as a text and can't be taken for anything else. Null without such a name.
const string* plainNameOf(const IPlugin& object);
/// True if the document has a place for `object`.
bool isWritten(const IPlugin& object, const JSONWriteOptions& options);
/// The plain name of an object if no other object has it, else null.
const string* uniqueNameOf(const IPlugin& object, const JSONWriteOptions& options);
/// Writes a reference: the unique name, else "Plugin[12]". `noneText` stands for null and, with a
/// warning, for an object that is not written.
void writeReference(const IPlugin* object, string_view noneText, DataWriter& out,
                    const JSONWriteOptions& options);

/// The object that the text at `in` refers to; null, with a message, if there is none.
IPlugin* findReferenced(const DataReader& in, string_view text, const JSONReadOptions& options);
/// The object with that plain name, null if there is none; logs if there are several.
IPlugin* findNamed(const DataReader& in, string_view text, const JSONReadOptions& options);

void logMissingObject(const DataReader& in, string_view text);

/// True for a member of the form's own: its name has a single "@" in front.
inline bool isOwnMember(const DataMember& member) {
    return member.name.starts_with('@') && !member.name.starts_with("@@");
}

/// A list that needs no memory of its own while it is as short as most are.
class JsonMembers : public NonCopyable {
public:
    const DataMember* begin() const noexcept { return many_.empty() ? few_ : many_.begin(); }
    const DataMember* end() const noexcept { return begin() + size_; }
    std::size_t size() const noexcept { return size_; }
    /// Forgets the members and makes room for so many.
    void reset(std::size_t capacity) {
        size_ = 0;
        many_.clear();
        if (capacity > std::size(few_))
            many_.resize(capacity);
    }
    /// There has to be room.
    void append(const DataMember& member) {
        DataMember* at = many_.empty() ? few_ : many_.begin();
        at[size_++] = member;
    }

private:
    DataMember few_[8];
    vector<DataMember> many_;
    std::size_t size_ = 0;
};

/// The members of the object that `in` stands at; `in` stands behind it then.
void collectMembers(DataReader& in, JsonMembers& members);
/// The last member of that name, null if there is none.
const DataMember* findMember(const JsonMembers& members, string_view name);
/// Warns of all members that are not the form's own.
void warnOfForeign(const JsonMembers& members, DataReader& in, const JSONReadOptions& options);
/// Warns of those among the form's own members that are not in `known`, at most four, and of
/// repeated ones.
void checkOwnMembers(const JsonMembers& members, std::span<const string_view> known, DataReader& in,
                     const JSONReadOptions& options);
/// Puts the other members into `map` as attributes.
void readMembers(AttribMap& map, const JsonMembers& members, DataReader& in,
                 JSONReadOptions& options);
/// Reads the flags in `member`, which may be missing; false, with a message, if they are none.
bool readFlags(const DataMember* member, DataReader& in, const JSONReadOptions& options,
               u32& flags);
/// Takes the text of `member`, which may be missing; false if it is none or has zero bytes, as
/// names do not.
bool readNameText(const DataMember* member, string_view& text);
/// The name with that text, or with what is left of it as UTF-8.
name_id validName(string_view text);

/// Warns of a member that has no meaning in its place.
void logIgnored(const DataReader& in, const JSONReadOptions& options, string_view member);
void logExpectedArray(const DataReader& in);
void logUnreadable(const DataReader& in, const JSONReadOptions& options, string_view type);

} // namespace base
