#include "b_attribute_json_forms.h"
#include "b_attribute_values.h"
#include "b_log.h"

#include <cmath>

namespace base {

namespace {

template <class T>
constexpr bool isPlainType = std::is_same_v<T, bool> || std::is_same_v<T, string> ||
                             std::is_same_v<T, i32> || std::is_same_v<T, float>;

/// Numbers of a value within a flat array.
template <class T>
constexpr std::size_t numberCount = sizeof(T) / sizeof(Component<T>);
template <>
constexpr std::size_t numberCount<mat43> = 12;
template <>
constexpr std::size_t numberCount<DateTime> = 7;
template <>
constexpr std::size_t numberCount<rational> = 2;

/// Calls `run` with spans over all numbers of `values`, in order, until it answers false.
template <class T, class Run>
bool forEachRun(std::span<T> values, Run run) {
    using Value = std::remove_const_t<T>;
    const auto spanOf = [](auto* first, std::size_t count) { return std::span(first, count); };
    if constexpr (std::is_same_v<Value, mat43>) {
        for (T& value : values)
            if (!run(spanOf(&value.m.r0.x, 9)) || !run(spanOf(&value.t.x, 3)))
                return false;
        return true;
    } else if constexpr (std::is_same_v<Value, DateTime>) {
        for (T& value : values)
            if (!run(spanOf(&value.year, 1)) || !run(spanOf(&value.month, 6)))
                return false;
        return true;
    } else {
        using Number = std::conditional_t<
            std::is_same_v<Value, TimeCode>, i64,
            std::conditional_t<std::is_same_v<Value, rational>, i32, Component<Value>>>;
        using Element = std::conditional_t<std::is_const_v<T>, const Number, Number>;
        static_assert(sizeof(Value) == numberCount<Value> * sizeof(Number));
        return run(
            spanOf(reinterpret_cast<Element*>(values.data()), values.size() * numberCount<Value>));
    }
}

/// Readers refuse infinite floats, since they lie outside the range.
void warnOfInfinite(std::span<const float> values, const JSONWriteOptions& options) {
    if (std::any_of(values.begin(), values.end(), [](float value) { return std::isinf(value); }))
        log().log(logSystem, logWarning,
                  "json writer| Attribute '{}::{}' has infinite floats and can't be read again!",
                  options.owner, options.attribute);
}

template <class T>
void writeNumbers(std::span<const T> values, DataWriter& out, const JSONWriteOptions& options) {
    forEachRun(values, [&](auto run) {
        if constexpr (std::is_same_v<decltype(run), std::span<const float>>)
            warnOfInfinite(run, options);
        out.numbers(run);
        return true;
    });
}

template <class T>
bool readNumbers(std::span<T> values, DataReader& in) {
    return forEachRun(values, [&](auto run) { return in.numbers(run); });
}

/// Bytes that are no text are written as an array of numbers, so that none is lost.
void writeText(const string& value, DataWriter& out) {
    if (isValidUtf8(value)) {
        out.text(value);
        return;
    }
    out.beginArray(DataLayout::flow);
    out.numbers(std::span(reinterpret_cast<const u8*>(value.data()), value.size()));
    out.endArray();
}

bool readText(DataReader& in, string& value) {
    if (in.kind() == DataKind::text) {
        value = in.text();
        in.skip();
        return true;
    }
    if (in.kind() != DataKind::array)
        return false;
    const u32 start = in.place();
    value.resize(in.length());
    in.enter();
    const bool isRead = in.numbers(std::span(reinterpret_cast<u8*>(value.data()), value.size()));
    in.setPlace(start);
    in.skip();
    return isRead;
}

bool readReference(DataReader& in, string_view noneText, const JSONReadOptions& options,
                   ref<IPlugin>& value) {
    if (in.kind() != DataKind::text)
        return false;
    const string_view text = in.text();
    value = ref<IPlugin>(text == noneText ? nullptr : findReferenced(in, text, options));
    in.skip();
    return true;
}

constexpr string_view noReference = "null";         // of an attribute
constexpr string_view noElementReference = "~null"; // of an element

template <class T>
void writeValue(const T& value, DataWriter& out, const JSONWriteOptions& options) {
    if constexpr (std::is_same_v<T, bool>) {
        out.boolean(value);
    } else if constexpr (std::is_same_v<T, string>) {
        writeText(value, out);
    } else if constexpr (std::is_same_v<T, ref<IPlugin>>) {
        writeReference(value.get(), noReference, out, options);
    } else {
        if (numberCount < T >> 1)
            out.beginArray(DataLayout::flow);
        writeNumbers(std::span(&value, 1), out, options);
        if (numberCount < T >> 1)
            out.endArray();
    }
}

/// Steps behind the value; on failure it may leave `in` anywhere within.
template <class T>
bool readValue(T& value, DataReader& in, const JSONReadOptions& options) {
    if constexpr (std::is_same_v<T, bool>) {
        if (in.kind() != DataKind::boolean)
            return false;
        value = in.boolean();
        in.skip();
        return true;
    } else if constexpr (std::is_same_v<T, string>) {
        return readText(in, value);
    } else if constexpr (std::is_same_v<T, ref<IPlugin>>) {
        return readReference(in, noReference, options, value);
    } else {
        if (numberCount < T >> 1) {
            if (in.kind() != DataKind::array || in.length() != numberCount<T>)
                return false;
            in.enter();
        }
        const bool isRead = readNumbers(std::span(&value, 1), in);
        if (isRead && numberCount < T >> 1)
            in.leave();
        return isRead;
    }
}

template <class T>
void writeElements(const vector<T>& values, DataWriter& out, const JSONWriteOptions& options) {
    out.beginArray(DataLayout::flow);
    if constexpr (std::is_same_v<T, string>) {
        for (const string& value : values)
            writeText(value, out);
    } else if constexpr (std::is_same_v<T, ref<IPlugin>>) {
        for (const ref<IPlugin>& value : values)
            writeReference(value.get(), noElementReference, out, options);
    } else {
        writeNumbers(std::span(values.data(), values.size()), out, options);
    }
    out.endArray();
}

/// Reads the elements of the array that `in` stands at; may leave `in` anywhere within.
template <class T>
bool readElements(vector<T>& values, DataReader& in, const JSONReadOptions& options) {
    const u32 count = in.length();
    in.enter();
    if constexpr (std::is_same_v<T, string> || std::is_same_v<T, ref<IPlugin>>) {
        values.resize(count);
        for (T& value : values) {
            if constexpr (std::is_same_v<T, string>) {
                if (!readText(in, value))
                    return false;
            } else if (!readReference(in, noElementReference, options, value)) {
                return false;
            }
        }
        return true;
    } else {
        if (count % numberCount<T> != 0)
            return false;
        values.resizeUninitialized(count / numberCount<T>);
        return readNumbers(std::span(values.data(), values.size()), in);
    }
}

} // namespace

template <class T>
void TypedAttribute<T>::writeJson(DataWriter& out, JSONWriteOptions& options) const {
    bool isPlain = isPlainType<T> && (flags() & storedFlags) == 0;
    if constexpr (std::is_same_v<T, string>)
        isPlain = isPlain && isValidUtf8(value_);
    if constexpr (std::is_same_v<T, float>) {
        if (isPlain) {
            warnOfInfinite({&value_, 1}, options);
            out.real(value_);
            return;
        }
    }
    if (isPlain) {
        writeValue(value_, out, options);
        return;
    }
    beginTyped(out, type(), flags(), DataLayout::flow);
    out.name("@value");
    writeValue(value_, out, options);
    out.endObject();
}

template <class T>
bool TypedAttribute<T>::readJson(DataReader& in, JSONReadOptions& options) {
    const u32 start = in.place();
    T value{};
    const bool isRead = readValue(value, in, options);
    if (!isRead) {
        value = T{};
        in.setPlace(start);
        in.skip();
    }
    setData(&value, -1);
    return isRead;
}

template <class T>
void TypedVectorAttribute<T>::writeJson(DataWriter& out, JSONWriteOptions& options) const {
    beginTyped(out, type(), flags(), DataLayout::flow);
    out.name("@value");
    writeElements(value_, out, options);
    out.endObject();
}

template <class T>
bool TypedVectorAttribute<T>::readJson(DataReader& in, JSONReadOptions& options) {
    const u32 start = in.place();
    value_ = {};
    const bool isArray = in.kind() == DataKind::array;
    if (!isArray)
        logExpectedArray(in);
    const bool isRead = isArray && readElements(value_, in, options);
    if (!isRead)
        value_ = {};
    in.setPlace(start);
    in.skip();
    return isRead;
}

// The rest of these classes is compiled elsewhere, so the members are instantiated one by one.
#define BASE_INSTANTIATE_SCALAR(T, text)                                                        \
    template BASE1_API void TypedAttribute<T>::writeJson(DataWriter&, JSONWriteOptions&) const; \
    template BASE1_API bool TypedAttribute<T>::readJson(DataReader&, JSONReadOptions&);
#define BASE_INSTANTIATE_VECTOR(T, text)                                                       \
    template BASE1_API void TypedVectorAttribute<T>::writeJson(DataWriter&, JSONWriteOptions&) \
        const;                                                                                 \
    template BASE1_API bool TypedVectorAttribute<T>::readJson(DataReader&, JSONReadOptions&);
BASE_FULL_TYPES(BASE_INSTANTIATE_SCALAR)
BASE_SCALAR_TYPES(BASE_INSTANTIATE_SCALAR)
BASE_FULL_TYPES(BASE_INSTANTIATE_VECTOR)
BASE_ARRAY_TYPES(BASE_INSTANTIATE_VECTOR)

} // namespace base
