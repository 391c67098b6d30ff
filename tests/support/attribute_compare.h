#pragma once

#include "b_factory.h"

#include <bit>
#include <string>

/// Compares documents attribute by attribute: class, type, low flag byte, value to the bit, and
/// order of everything that has one. References are equal if they name the same place in their
/// lists. Transient attributes, and elements of arrays that are, count as missing.
namespace test_support {

namespace detail {

inline bool isStored(const base::Attribute* a) {
    return a && !a->hasFlag(base::attribTransient);
}

inline base::u32 placeOf(const base::IPlugin* object) {
    return object ? object->id() : base::IPlugin::noId;
}

/// The bytes of a value; padding is not among them.
template <class T>
void appendBytes(std::string& out, const T& value) {
    if constexpr (std::is_same_v<T, base::string>) {
        out += std::to_string(value.size()) + ":" + value;
    } else if constexpr (std::is_same_v<T, base::ref<base::IPlugin>>) {
        appendBytes(out, placeOf(value.get()));
    } else if constexpr (std::is_same_v<T, base::mat43>) {
        appendBytes(out, value.m);
        appendBytes(out, value.t);
    } else {
        out.append(reinterpret_cast<const char*>(&value), sizeof value);
    }
}

/// The bytes of a typed attribute's value.
inline std::string valueBytes(const base::Attribute& a) {
    std::string bytes;
    const void* data = a.data(-1);
#define TEST_SCALAR_BYTES(T, text)                        \
    if (a.type() == base::TypeTraits<T>::n_name) {        \
        appendBytes(bytes, *static_cast<const T*>(data)); \
        return bytes;                                     \
    }
#define TEST_VECTOR_BYTES(T, text)                                        \
    if (a.type() == base::TypeTraits<T>::n_array_name) {                  \
        for (const T& value : *static_cast<const base::vector<T>*>(data)) \
            appendBytes(bytes, value);                                    \
        return bytes;                                                     \
    }
    // The types are named without their namespace in the lists.
    using namespace base;
    BASE_FULL_TYPES(TEST_SCALAR_BYTES)
    BASE_SCALAR_TYPES(TEST_SCALAR_BYTES)
    BASE_FULL_TYPES(TEST_VECTOR_BYTES)
    BASE_ARRAY_TYPES(TEST_VECTOR_BYTES)
#undef TEST_SCALAR_BYTES
#undef TEST_VECTOR_BYTES
    return "unknown type";
}

inline std::string pathText(const base::AttribPath& path) {
    std::string text;
    for (const base::PathStep& step : path.steps()) {
        const bool isRoot = step.kind == base::PathStepKind::plugin;
        const base::u32 index = isRoot && path.root() ? path.root()->id() : step.index;
        text += std::to_string(static_cast<int>(step.kind)) + " " + std::to_string(index) + " " +
                (isRoot ? "" : step.name.text()) + "/";
    }
    return text;
}

std::string firstDifference(const base::AttribMap& a, const base::AttribMap& b,
                            const std::string& where);

inline std::string firstDifference(const base::Attribute* a, const base::Attribute* b,
                                   const std::string& where) {
    if (!isStored(a) || !isStored(b))
        return isStored(a) == isStored(b) ? "" : where + ": only one is there";
    if (a->type() != b->type())
        return where + ": " + a->type().text() + " and " + b->type().text();
    if (((a->flags() ^ b->flags()) & 0xFF) != 0)
        return where + ": other flags";
    if (a->asMap())
        return firstDifference(*a->asMap(), *b->asMap(), where);
    if (const base::AttribArray* x = a->asArray()) {
        const base::AttribArray* y = b->asArray();
        if (x->size() != y->size() || x->typeName() != y->typeName())
            return where + ": arrays of other sizes or types";
        for (base::u32 i = 0; i < x->size(); ++i)
            if (std::string found =
                    firstDifference(x->item(i), y->item(i), where + "[" + std::to_string(i) + "]");
                !found.empty())
                return found;
        return "";
    }
    if (a->asLink())
        return pathText(a->asLink()->path()) == pathText(b->asLink()->path())
                   ? ""
                   : where + ": links to " + a->toString() + " and " + b->toString();
    return valueBytes(*a) == valueBytes(*b)
               ? ""
               : where + ": " + a->toString() + " and " + b->toString();
}

inline std::string firstDifference(const base::AttribMap& a, const base::AttribMap& b,
                                   const std::string& where) {
    if (a.typeName() != b.typeName())
        return where + ": maps of types " + a.typeName().text() + " and " + b.typeName().text();
    const auto stored = [](const base::AttribMap& map) {
        base::vector<base::AttribMap::Entry> entries;
        for (const base::AttribMap::Entry& entry : map.entries())
            if (isStored(entry.second))
                entries.push_back(entry);
        return entries;
    };
    const base::vector<base::AttribMap::Entry> x = stored(a), y = stored(b);
    for (std::size_t i = 0; i < x.size() && i < y.size(); ++i) {
        if (!(x[i].first == y[i].first))
            return where + ": attributes " + x[i].first.text() + " and " + y[i].first.text();
        if (std::string found =
                firstDifference(x[i].second, y[i].second, where + "." + x[i].first.text());
            !found.empty())
            return found;
    }
    return x.size() == y.size() ? "" : where + ": other numbers of attributes";
}

} // namespace detail

/// What differs first, by its place; empty if the two documents are equal.
inline std::string firstDifference(const base::PluginFactory& a, const base::PluginFactory& b) {
    // The own attributes have no function that gives them to readers.
    std::string found =
        detail::firstDifference(const_cast<base::PluginFactory&>(a).attributes(),
                                const_cast<base::PluginFactory&>(b).attributes(), "document");
    if (!found.empty() || a.pluginCount() != b.pluginCount())
        return found.empty() ? "other numbers of objects" : found;
    for (base::u32 id = 0; id < a.pluginCount(); ++id) {
        const base::ref<base::IPlugin> x = a.plugin(id), y = b.plugin(id);
        const std::string where = "object " + std::to_string(id);
        if (detail::isStored(x.get()) != detail::isStored(y.get()))
            return where + ": only one is there";
        if (!detail::isStored(x.get()))
            continue;
        if (((x->flags() ^ y->flags()) & 0xFF) != 0 || base::isDummy(*x) != base::isDummy(*y))
            return where + ": other flags";
        if (found = detail::firstDifference(*x, *y, where); !found.empty())
            return found;
    }
    return "";
}

} // namespace test_support
