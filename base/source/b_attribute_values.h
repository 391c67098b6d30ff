#pragma once

#include "b_factory.h"
#include "b_string_convert.h"

/// What the typed attributes need to know about each value type: its components, its text, its
/// order and its bytes in files. Everything else follows from the components.
namespace base {

template <class T>
struct ComponentOf {
    using Type = T;
};
template <class C>
struct ComponentOf<base_vec2<C>> {
    using Type = C;
};
template <class C>
struct ComponentOf<base_vec3<C>> {
    using Type = C;
};
template <class C>
struct ComponentOf<base_vec4<C>> {
    using Type = C;
};
template <class C>
struct ComponentOf<base_quat<C>> {
    using Type = C;
};
template <class C>
struct ComponentOf<base_color4<C>> {
    using Type = C;
};
template <class C>
struct ComponentOf<base_mat22<C>> {
    using Type = C;
};
template <class C>
struct ComponentOf<base_mat33<C>> {
    using Type = C;
};
template <class C>
struct ComponentOf<base_mat44<C>> {
    using Type = C;
};
template <class V>
struct ComponentOf<base_box<V>> : ComponentOf<V> {};
template <>
struct ComponentOf<normal> {
    using Type = float;
};
/// Of its nine rotational components; the translation's three are `double`.
template <>
struct ComponentOf<mat43> {
    using Type = float;
};

template <class T>
using Component = typename ComponentOf<T>::Type;

template <class T>
constexpr bool isComposite = !std::is_same_v<T, Component<T>>;

/// Calls `visit` with each component in order until it answers false; false then.
template <class T, class Visit>
bool forEachComponent(T& value, Visit&& visit) {
    using Value = std::remove_const_t<T>;
    if constexpr (std::is_same_v<Value, mat43>) {
        return forEachComponent(value.m, visit) && forEachComponent(value.t, visit);
    } else {
        using C = Component<Value>;
        using Element = std::conditional_t<std::is_const_v<T>, const C, C>;
        static_assert(sizeof(Value) % sizeof(C) == 0);
        auto* component = reinterpret_cast<Element*>(&value);
        for (std::size_t i = 0; i < sizeof(Value) / sizeof(C); ++i)
            if (!visit(component[i]))
                return false;
        return true;
    }
}

/// Calls `visit` with the component at `index`; false if there is none.
template <class T, class Visit>
bool withComponent(T& value, i32 index, Visit&& visit) {
    i32 at = 0;
    return !forEachComponent(value, [&](auto& component) {
        if (at++ != index)
            return true;
        visit(component);
        return false;
    });
}

/// See `Attribute::elementCode`.
template <class T>
constexpr i8 elementCodeOf() {
    using C = Component<T>;
    if constexpr (std::is_same_v<C, bool>)
        return 0;
    else if constexpr (std::is_same_v<C, u8>)
        return 1;
    else if constexpr (std::is_same_v<C, i8>)
        return 2;
    else if constexpr (std::is_same_v<C, u16>)
        return 3;
    else if constexpr (std::is_same_v<C, i16>)
        return 4;
    else if constexpr (std::is_same_v<C, u32> || std::is_same_v<C, ref<IPlugin>>)
        return 5;
    else if constexpr (std::is_same_v<C, i32>)
        return 6;
    else if constexpr (std::is_same_v<C, TimeCode>)
        return 8;
    else if constexpr (std::is_same_v<C, float>)
        return 10;
    else if constexpr (std::is_same_v<C, double>)
        return 11;
    else
        return -1;
}

// Text of one component, and the value read back from one; false and no change if it is none.

void appendText(string& out, double value);
void appendText(string& out, bool value);
void appendText(string& out, const string& value);
void appendText(string& out, const TimeCode& value);
void appendText(string& out, const DateTime& value);
void appendText(string& out, const rational& value);
void appendText(string& out, const ref<IPlugin>& value);
template <std::integral T>
void appendText(string& out, T value) {
    out += std::to_string(value);
}

bool parseText(string_view text, TimeCode& value);
bool parseText(string_view text, DateTime& value);
bool parseText(string_view text, rational& value);
bool parseText(string_view text, ref<IPlugin>& value);
template <class T>
bool parseText(string_view text, T& value) {
    return tryFromString(text, value);
}

/// Takes the next word off the front of `text`; empty when there is none left.
string_view nextWord(string_view& text);

/// The text of a value: its components with a blank between.
template <class T>
void appendValueText(string& out, const T& value) {
    bool first = true;
    forEachComponent(value, [&](const auto& component) {
        if (!first)
            out += ' ';
        first = false;
        appendText(out, component);
        return true;
    });
}

template <class T>
bool parseValueText(string_view text, T& value) {
    if constexpr (!isComposite<T>) {
        return parseText(text, value);
    } else {
        T parsed;
        const bool complete = forEachComponent(
            parsed, [&](auto& component) { return parseText(nextWord(text), component); });
        if (!complete || !nextWord(text).empty())
            return false;
        value = parsed;
        return true;
    }
}

/// 0 when equal, -1 when `b` is greater, else 1 (also for NaN).
template <class T>
i32 compareValues(const T& a, const T& b) {
    if (a == b)
        return 0;
    return a < b ? -1 : 1;
}

/// Bytes of a value in files.
template <class T>
u64 storedSize(const T& value) {
    if constexpr (std::is_same_v<T, string>)
        return sizeof(u32) + value.size();
    else if constexpr (std::is_same_v<T, ref<IPlugin>>)
        return sizeof(u32);
    else if constexpr (std::is_same_v<T, mat43>)
        return sizeof(value.m) + sizeof(value.t);
    else
        return sizeof(T);
}

constexpr u32 saturatedSize(u64 byteCount) {
    return byteCount < std::numeric_limits<u32>::max() ? static_cast<u32>(byteCount)
                                                       : std::numeric_limits<u32>::max();
}

} // namespace base
