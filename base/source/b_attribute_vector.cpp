#include "b_attribute_values.h"

#include "b_format.h"

#include <xxhash.h>

namespace base {

namespace {

constexpr std::size_t maxElementsInText = 4;

/// The bytes of a value in files, for the types whose memory holds something else.
void appendStored(vector<u8>& out, const void* bytes, std::size_t count) {
    const u8* first = static_cast<const u8*>(bytes);
    out.append(first, first + count);
}

void appendStored(vector<u8>& out, const string& value) {
    const u32 length = saturatedSize(value.size());
    appendStored(out, &length, sizeof length);
    appendStored(out, value.data(), value.size());
}

void appendStored(vector<u8>& out, const ref<IPlugin>& value) {
    const u32 id = value ? value->id() : IPlugin::noId;
    appendStored(out, &id, sizeof id);
}

void appendStored(vector<u8>& out, const mat43& value) {
    appendStored(out, &value.m, sizeof value.m);
    appendStored(out, &value.t, sizeof value.t);
}

template <class T>
u32 hashOf(const vector<T>& values) {
    if constexpr (requires(vector<u8> & out, const T& value) { appendStored(out, value); }) {
        vector<u8> bytes;
        for (const T& value : values)
            appendStored(bytes, value);
        return XXH32(std::as_const(bytes).data(), bytes.size(), 0);
    } else {
        return XXH32(values.data(), values.byteLength(), 0);
    }
}

template <class T>
bool contains(const vector<T>& values, const T& value) {
    return std::find(values.begin(), values.end(), value) != values.end();
}

/// `TypeTraits<T>::n_name`, absent for types that are only vectors.
template <class T>
name_id scalarName() {
    if constexpr (requires { TypeTraits<T>::n_name; })
        return TypeTraits<T>::n_name;
    else
        return {};
}

/// The parts between commas; the blank that follows one in the text form is no part of them. Texts
/// may hold commas, so there the blank parts them too.
template <class T>
bool parseElements(string_view text, vector<T>& values) {
    constexpr string_view separator = std::is_same_v<T, string> ? ", " : ",";
    vector<T> parsed;
    for (bool isOver = text.empty(); !isOver;) {
        const std::size_t end = text.find(separator);
        isOver = end == string_view::npos;
        string_view part = text.substr(0, end);
        text.remove_prefix(isOver ? text.size() : end + separator.size());
        if (!std::is_same_v<T, string> && !parsed.empty() && part.starts_with(' '))
            part.remove_prefix(1);
        if (!parseValueText(part, parsed.emplace_back()))
            return false;
    }
    values = std::move(parsed);
    return true;
}

} // namespace

template <class T>
TypedVectorAttribute<T>::~TypedVectorAttribute() = default;

template <class T>
Attribute* TypedVectorAttribute<T>::clone() const {
    auto copy = std::make_unique<TypedVectorAttribute<T>>(value_);
    copy->setFlags(flags());
    return copy.release();
}

template <class T>
i8 TypedVectorAttribute<T>::elementCode() const {
    return elementCodeOf<T>();
}

template <class T>
void* TypedVectorAttribute<T>::data(i32 index) {
    if (index < 0)
        return &value_;
    const auto at = static_cast<std::size_t>(index);
    return at < value_.size() ? &value_[at] : nullptr;
}

template <class T>
bool TypedVectorAttribute<T>::removeItem(u32 index) {
    if (index >= value_.size())
        return false;
    value_.erase(value_.cbegin() + index);
    return true;
}

template <class T>
u32 TypedVectorAttribute<T>::byteSize() const {
    u64 total = sizeof(u32);
    if constexpr (std::is_same_v<T, string>) {
        for (const string& value : value_)
            total += storedSize(value);
    } else {
        total += value_.size() * storedSize(T());
    }
    return saturatedSize(total);
}

template <class T>
bool TypedVectorAttribute<T>::assign(const Attribute& other, u32 mode, i32 index) {
    if (&other == this)
        return true;
    const bool keepDuplicates = hasFlag(attribMergeDuplicates);
    if (other.type() == type()) {
        const auto& source = *static_cast<const vector<T>*>(other.data(-1));
        if (value_.empty() || (mode & assignCopy) != 0) {
            value_ = source;
        } else if (hasFlag(attribMergeOnAssign)) {
            for (const T& value : source)
                if (keepDuplicates || !contains(value_, value))
                    value_.push_back(value);
        }
        return true;
    }
    if (other.type() != scalarName<T>())
        return false;
    const T& value = *static_cast<const T*>(other.data(-1));
    if (index >= 0) {
        if (static_cast<std::size_t>(index) > value_.size())
            return false;
        value_.insert(value_.cbegin() + index, value);
    } else if (keepDuplicates || !contains(value_, value)) {
        value_.push_back(value);
    }
    return true;
}

template <class T>
string TypedVectorAttribute<T>::toString() const {
    if (value_.size() > maxElementsInText)
        return format("{}[{}]", type(), value_.size());
    string text;
    for (const T& value : value_) {
        if (&value != value_.begin())
            text += ", ";
        appendValueText(text, value);
    }
    return text;
}

template <class T>
bool TypedVectorAttribute<T>::fromString(string_view text, i32 index) {
    if (index < 0)
        return parseElements(text, value_);
    const auto at = static_cast<std::size_t>(index);
    return at < value_.size() && parseValueText(text, value_[at]);
}

template <class T>
void TypedVectorAttribute<T>::setData(const void* value, i32 index) {
    if (index < 0)
        value_ = *static_cast<const vector<T>*>(value);
    else if (static_cast<std::size_t>(index) < value_.size())
        value_[static_cast<std::size_t>(index)] = *static_cast<const T*>(value);
}

template <class T>
i32 TypedVectorAttribute<T>::compare(const void* value, i32 index) const {
    if (index >= 0) {
        const auto at = static_cast<std::size_t>(index);
        return at < value_.size() ? compareValues(value_[at], *static_cast<const T*>(value)) : -1;
    }
    const auto& other = *static_cast<const vector<T>*>(value);
    if (value_.size() != other.size())
        return value_.size() < other.size() ? -1 : 1;
    for (std::size_t i = 0; i < other.size(); ++i)
        if (const i32 order = compareValues(value_[i], other[i]); order != 0)
            return order;
    return 0;
}

template <class T>
u32 TypedVectorAttribute<T>::hash() const {
    return hashOf(value_);
}

#define BASE_INSTANTIATE_VECTOR(T, text) template class TypedVectorAttribute<T>;
BASE_FULL_TYPES(BASE_INSTANTIATE_VECTOR)
BASE_ARRAY_TYPES(BASE_INSTANTIATE_VECTOR)

} // namespace base
