#pragma once

#include "b_factory.h"

#include <cstring>
#include <limits>
#include <string>

/// A document that holds every type of value, and everything that refers to something.
namespace test_support {

namespace detail {

/// Values from `seed` on in all components, the ends of their ranges among them.
template <class T>
T sampleValue(unsigned seed) {
    if constexpr (std::is_same_v<T, base::string>) {
        const char* texts[] = {"",
                               "plain",
                               "Gr\xC3\xBC\xC3\x9F\x65 \"quoted\" \\ \n\t",
                               "null",
                               "~null",
                               "Plugin[1]",
                               "\x01\x1F\x7F",
                               "broken \xFF\xC3"};
        return texts[seed % 8];
    } else if constexpr (std::is_same_v<T, bool>) {
        return seed % 2 != 0;
    } else if constexpr (std::is_same_v<T, base::DateTime>) {
        return {base::i16(2000 + seed), 12, 31, 23, 59, 58, base::u8(seed % 2)};
    } else if constexpr (std::is_integral_v<T>) {
        const T values[] = {std::numeric_limits<T>::max(), std::numeric_limits<T>::min(), T(0),
                            T(seed * 7)};
        return values[seed % 4];
    } else if constexpr (std::is_floating_point_v<T>) {
        const T values[] = {T(0.1) * T(seed),
                            T(-0.0),
                            std::numeric_limits<T>::max(),
                            std::numeric_limits<T>::denorm_min(),
                            T(1) / T(3),
                            std::numeric_limits<T>::lowest(),
                            T(16777216),
                            T(-1e-7)};
        return values[seed % 8];
    } else {
        T value;
        const auto fill = [&seed](auto& field) {
            field = sampleValue<std::remove_reference_t<decltype(field)>>(seed++);
        };
        if constexpr (std::is_same_v<T, base::TimeCode>) {
            fill(value.ticks);
        } else if constexpr (std::is_same_v<T, base::rational>) {
            fill(value.numerator);
            fill(value.denominator);
        } else if constexpr (requires { value.m; }) {
            fill(value.m);
            fill(value.t);
        } else if constexpr (requires { value.min; }) {
            fill(value.min);
            fill(value.max);
        } else if constexpr (requires { value.r0; }) {
            fill(value.r0);
            fill(value.r1);
            if constexpr (requires { value.r2; })
                fill(value.r2);
            if constexpr (requires { value.r3; })
                fill(value.r3);
        } else if constexpr (requires { value.r; }) {
            fill(value.r);
            fill(value.g);
            fill(value.b);
            fill(value.a);
        } else {
            fill(value.x);
            fill(value.y);
            if constexpr (requires { value.z; })
                fill(value.z);
            if constexpr (requires { value.w; })
                fill(value.w);
        }
        return value;
    }
}

/// One attribute for each of eight seeds.
template <class T>
void addScalars(base::AttribMap& map, const std::string& type) {
    if constexpr (!std::is_same_v<T, base::ref<base::IPlugin>>)
        for (unsigned seed = 0; seed < 8; ++seed)
            map.attribute<T>(base::nameServer().id(type + " " + std::to_string(seed))) =
                sampleValue<T>(seed);
}

/// An empty vector and one of nine elements.
template <class T>
void addVectors(base::AttribMap& map, const std::string& type) {
    if constexpr (!std::is_same_v<T, base::ref<base::IPlugin>>) {
        map.vecAttribute<T>(base::nameServer().id("empty " + type));
        auto& values = map.vecAttribute<T>(base::nameServer().id(type));
        for (unsigned seed = 1; seed < 10; ++seed)
            values.push_back(sampleValue<T>(seed));
    }
}

/// Attributes of every type but references.
inline void addValues(base::AttribMap& map) {
    using namespace base;
#define TEST_ADD_SCALARS(T, text) addScalars<T>(map, text);
#define TEST_ADD_VECTORS(T, text) addVectors<T>(map, text "[]");
    BASE_FULL_TYPES(TEST_ADD_SCALARS)
    BASE_SCALAR_TYPES(TEST_ADD_SCALARS)
    BASE_FULL_TYPES(TEST_ADD_VECTORS)
    BASE_ARRAY_TYPES(TEST_ADD_VECTORS)
#undef TEST_ADD_SCALARS
#undef TEST_ADD_VECTORS
}

template <class T>
T* withFlags(T* attribute, base::u32 flags) {
    attribute->setFlags(attribute->flags() | flags);
    return attribute;
}

inline base::IPlugin& addObject(base::PluginFactory& factory, const char* type, const char* name) {
    base::IPlugin& object = *factory.create(base::nameServer().id(type));
    if (*name)
        object.attribute<base::string>(base::nameServer().id("name")) = name;
    return object;
}

/// Maps and arrays in each other, with gaps, types and flags of their own.
inline void addStructures(base::AttribMap& map) {
    using namespace base;
    const auto id = [](const char* text) { return nameServer().id(text); };
    AttribArray& items = map.arrayAttribute(id("items"));
    items.setTypeName(id("an item"));
    items.append(nullptr);
    auto* item = new AttribMap(attribFactory(), id("an item"));
    item->attribute<i32>(id("@count")) = 3;
    item->mapAttribute(id("inner"), id("inner type")).attribute<float>(id("@@weight")) = 0.5f;
    items.append(item);
    items.append(new AttribMap);
    items.append(new TypedAttribute<float>(1));
    items.append(new TypedAttribute<u8>(u8(2)));
    items.append(withFlags(new TypedAttribute<string>("flagged"), attribSilentLink));
    items.append(withFlags(new TypedAttribute<float>(9), attribTransient));
    items.append(new AttribArray);
    map.arrayAttribute(id("empty array"));
    map.arrayAttribute(id("typed empty array")).setTypeName(id("float"));
    map.mapAttribute(id("empty map"), {});
    withFlags(&map.mapAttribute(id("flagged map"), id("own type")), 0x42)
        ->attribute<string>(id("@type")) = "no type at all";
    map.attribute(id("flagged value"), withFlags(new TypedAttribute<i32>(-7), 0x81));
    map.attribute(id("left out"), withFlags(new TypedAttribute<i32>(-7), attribTransient));
}

/// References and links: to objects before and behind `object`, to itself, to nothing.
inline void addReferences(base::PluginFactory& factory, base::IPlugin& object) {
    using namespace base;
    const auto id = [](const std::string& text) { return nameServer().id(text); };
    auto& all = object.vecAttribute<ref<IPlugin>>(id("all objects"));
    for (u32 i = 0; i < factory.pluginCount(); ++i) {
        all.push_back(factory.plugin(i));
        object.attribute<ref<IPlugin>>(id("object " + std::to_string(i))) = factory.plugin(i);
        if (const ref<IPlugin> other = factory.plugin(i))
            object.attribute(id("link " + std::to_string(i)),
                             new AttribLink(AttribPath(*other, id("name"))));
    }
    object.attribute(id("deep link"), new AttribLink(AttribPath(object, id("items"))
                                                         .element(1)
                                                         .attribute(id("inner"))
                                                         .attribute(id("@@weight"))
                                                         .component(0)));
    object.attribute(id("plain path"), new AttribLink(AttribPath(object)));
    object.attribute(id("empty link"), withFlags(new AttribLink, attribSilentLink));
    object.vecAttribute<ref<IPlugin>>(id("no objects"));
}

} // namespace detail

/// Fills an empty document: all of the above in plain objects of types that nobody registered,
/// names that are missing, doubled or easily mistaken, and a removed place in the list.
inline void buildEveryValue(base::PluginFactory& factory) {
    using namespace detail;
    const char* names[] = {"",      "values",    "double",      "double",          "null",
                           "~null", "Plugin[3]", "broken \xFF", "\xC3\xA4.[]{}\\", "removed"};
    for (const char* name : names)
        addObject(factory, *name ? "first kind" : "second kind", name);
    addValues(*factory.plugin(1));
    addStructures(*factory.plugin(1));
    addReferences(factory, *factory.plugin(1));
    factory.plugin(2)->setFlags(factory.plugin(2)->flags() | 0x20);
    factory.remove(factory.pluginCount() - 1, false);
    addObject(factory, "third kind", "behind the gap")
        .arrayAttribute(base::nameServer().id("name of none"));
    addStructures(factory.attributes());
    factory.attributes().attribute<base::ref<base::IPlugin>>(base::nameServer().id("main object")) =
        factory.plugin(1);
}

} // namespace test_support
