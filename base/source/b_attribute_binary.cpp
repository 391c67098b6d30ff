#include "b_attribute_binary.h"

#include "b_attribute_binary_reader.h"
#include "b_attribute_binary_writer.h"
#include "b_stored_document.h"

#include <array>

namespace base {

namespace {

constexpr std::size_t blockBytes = 4096; ///< of converted elements, on the stack

/// The bytes of values that do not lie in memory as they are stored. The primary template is for
/// those that do.
template <class T>
struct Stored {
    using Type = T;
};

template <>
struct Stored<bool> {
    using Type = u8;
    static u8 from(bool value, const BinaryWriter&) { return value ? 1 : 0; }
    static bool to(u8 stored, const BinaryReader&) { return stored != 0; }
};

/// Without the padding in the middle.
template <>
struct Stored<mat43> {
    using Type = std::array<u8, sizeof(mat43::m) + sizeof(mat43::t)>;
    static Type from(const mat43& value, const BinaryWriter&) {
        Type stored;
        std::memcpy(stored.data(), &value.m, sizeof value.m);
        std::memcpy(stored.data() + sizeof value.m, &value.t, sizeof value.t);
        return stored;
    }
    static mat43 to(const Type& stored, const BinaryReader&) {
        mat43 value;
        std::memcpy(&value.m, stored.data(), sizeof value.m);
        std::memcpy(&value.t, stored.data() + sizeof value.m, sizeof value.t);
        return value;
    }
};

template <>
struct Stored<ref<IPlugin>> {
    using Type = u32;
    static u32 from(const ref<IPlugin>& value, const BinaryWriter& out) {
        return out.idOf(value.get());
    }
    static ref<IPlugin> to(u32 stored, const BinaryReader& in) {
        return ref<IPlugin>(in.object(stored));
    }
};

template <class T>
constexpr bool liesAsStored = std::is_same_v<typename Stored<T>::Type, T>;

template <class T>
void writeElements(BinaryWriter& out, const vector<T>& values) {
    if constexpr (std::is_same_v<T, string>) {
        for (const string& value : values)
            out.text(value);
    } else if constexpr (liesAsStored<T>) {
        out.bytes(values.data(), values.byteLength());
    } else {
        std::array<typename Stored<T>::Type, blockBytes / sizeof(typename Stored<T>::Type)> block;
        for (std::size_t done = 0; done < values.size();) {
            const std::size_t count = std::min(block.size(), values.size() - done);
            for (std::size_t i = 0; i < count; ++i)
                block[i] = Stored<T>::from(values[done + i], out);
            out.bytes(block.data(), count * sizeof block[0]);
            done += count;
        }
    }
}

template <class T>
bool readElements(BinaryReader& in, vector<T>& values, u32 count) {
    if constexpr (std::is_same_v<T, string>) {
        string text;
        while (values.size() < count && in.text(text))
            values.push_back(std::move(text));
        return values.size() == count;
    } else if constexpr (liesAsStored<T>) {
        return in.values(values, count);
    } else {
        vector<typename Stored<T>::Type> stored;
        const bool isWhole = in.values(stored, count);
        values.reserve(stored.size());
        for (const auto& value : std::as_const(stored))
            values.push_back(Stored<T>::to(value, in));
        return isWhole;
    }
}

template <class T>
bool readValue(BinaryReader& in, T& value) {
    if constexpr (std::is_same_v<T, string>) {
        return in.text(value);
    } else if constexpr (liesAsStored<T>) {
        return in.bytes(&value, sizeof value);
    } else {
        typename Stored<T>::Type stored;
        const bool isWhole = in.bytes(&stored, sizeof stored);
        if (isWhole)
            value = Stored<T>::to(stored, in);
        return isWhole;
    }
}

} // namespace

void Attribute::write(Stream& stream, BinaryWriteOptions& options) const {
    BinaryWriter(stream, options).number(static_cast<u8>(flags()));
}

bool Attribute::read(Stream& stream, BinaryReadOptions& options) {
    BinaryReader in(stream, options);
    u8 low = 0;
    if (!in.number(low))
        return false;
    setFlags((flags() & ~storedFlags) | low);
    return true;
}

template <class T>
void TypedAttribute<T>::write(Stream& stream, BinaryWriteOptions& options) const {
    Attribute::write(stream, options);
    BinaryWriter out(stream, options);
    if constexpr (std::is_same_v<T, string>) {
        out.text(value_);
    } else if constexpr (liesAsStored<T>) {
        out.bytes(&value_, sizeof value_);
    } else {
        const auto stored = Stored<T>::from(value_, out);
        out.bytes(&stored, sizeof stored);
    }
}

template <class T>
bool TypedAttribute<T>::read(Stream& stream, BinaryReadOptions& options) {
    BinaryReader in(stream, options);
    T value{};
    const bool isWhole = Attribute::read(stream, options) && readValue(in, value);
    if (!isWhole)
        value = T{}; // a part of it may have been filled
    // That of references forgets a path as well.
    if constexpr (std::is_same_v<T, ref<IPlugin>>)
        setData(&value);
    else
        value_ = std::move(value);
    return isWhole;
}

template <class T>
void TypedVectorAttribute<T>::write(Stream& stream, BinaryWriteOptions& options) const {
    Attribute::write(stream, options);
    BinaryWriter out(stream, options);
    out.count(value_.size());
    writeElements(out, value_);
}

template <class T>
bool TypedVectorAttribute<T>::read(Stream& stream, BinaryReadOptions& options) {
    BinaryReader in(stream, options);
    u32 count = 0;
    vector<T> values;
    const bool isWhole =
        Attribute::read(stream, options) && in.number(count) && readElements(in, values, count);
    value_ = std::move(values);
    return isWhole;
}

// The rest of these classes is compiled elsewhere, so the members are instantiated one by one.
#define BASE_INSTANTIATE_SCALAR(T, text)                                                  \
    template BASE1_API void TypedAttribute<T>::write(Stream&, BinaryWriteOptions&) const; \
    template BASE1_API bool TypedAttribute<T>::read(Stream&, BinaryReadOptions&);
#define BASE_INSTANTIATE_VECTOR(T, text)                                                        \
    template BASE1_API void TypedVectorAttribute<T>::write(Stream&, BinaryWriteOptions&) const; \
    template BASE1_API bool TypedVectorAttribute<T>::read(Stream&, BinaryReadOptions&);
BASE_FULL_TYPES(BASE_INSTANTIATE_SCALAR)
BASE_SCALAR_TYPES(BASE_INSTANTIATE_SCALAR)
BASE_FULL_TYPES(BASE_INSTANTIATE_VECTOR)
BASE_ARRAY_TYPES(BASE_INSTANTIATE_VECTOR)

} // namespace base
