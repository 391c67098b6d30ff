#pragma once

#include "b_attribute_map.h"

#include <span>

/// What a schema is made of: static names that carry the type and the default of an attribute.
///
/// A schema is a struct without data. Each of its attributes is one static `n_<name>`, declared
/// by a row of the class's table (`scene_schema.h`); the handles are interned once, by the
/// registrars, before which they are absent. Code refers to attributes through these alone,
/// never through text:
///
///     bool visible = read(node, node_schema::n_visible);             // value or default
///     if (auto* positions = find(mesh, mesh_schema::n_positions))    // vector or null
///
/// An attribute that an object lacks means the default; nothing stores defaults.
namespace scene {

/// Name of an attribute or type of the schema.
struct SchemaName {
    const char* text;
    base::name_id id{};

    operator base::name_id() const noexcept { return id; }
};

/// Marks an attribute that is an array of maps.
struct Items {};
/// Marks an attribute that is a map.
struct Submap {};

/// An attribute without a default: absent means none, null or empty. T is the value type of a
/// scalar, `base::vector` of it for a vector, `Items` or `Submap`.
template <class T>
struct SchemaAttribute : SchemaName {};

/// An attribute with a default.
template <class T>
struct DefaultedAttribute : SchemaName {
    T defaultValue;
};

template <class T>
constexpr SchemaAttribute<T> schemaAttribute(const char* text) {
    return {{text}};
}
template <class T, class D>
constexpr DefaultedAttribute<T> schemaAttribute(const char* text, D&& defaultValue) {
    return {{text}, T(defaultValue)};
}

/// The attribute's value, or its default where `map` has none. A wrong type is logged.
template <class T>
T read(const base::AttribMap& map, const DefaultedAttribute<T>& attribute) {
    const T* value = map.findAttribute<T>(attribute);
    return value ? *value : attribute.defaultValue;
}

/// The attribute's value, null where `map` has none. A wrong type is logged.
template <class T>
const T* find(const base::AttribMap& map, const SchemaAttribute<T>& attribute) {
    return map.findAttribute<T>(attribute);
}
template <class T>
const T* find(const base::AttribMap& map, const DefaultedAttribute<T>& attribute) {
    return map.findAttribute<T>(attribute);
}
template <class T>
const base::vector<T>* find(const base::AttribMap& map,
                            const SchemaAttribute<base::vector<T>>& attribute) {
    return map.findVecAttribute<T>(attribute);
}
inline base::AttribArray* find(const base::AttribMap& map,
                               const SchemaAttribute<Items>& attribute) {
    return map.findArray(attribute);
}
inline base::AttribMap* find(const base::AttribMap& map, const SchemaAttribute<Submap>& attribute) {
    return map.findMap(attribute);
}

/// The attribute's value for writing, made with its type's zero where `map` has none.
template <class T>
T& write(base::AttribMap& map, const SchemaAttribute<T>& attribute) {
    return map.attribute<T>(attribute);
}
template <class T>
T& write(base::AttribMap& map, const DefaultedAttribute<T>& attribute) {
    return map.attribute<T>(attribute);
}
template <class T>
base::vector<T>& write(base::AttribMap& map, const SchemaAttribute<base::vector<T>>& attribute) {
    return map.vecAttribute<T>(attribute);
}
inline base::AttribArray& write(base::AttribMap& map, const SchemaAttribute<Items>& attribute) {
    return map.arrayAttribute(attribute);
}

/// The object that a reference attribute holds, null where there is none.
inline base::IPlugin* findObject(const base::AttribMap& map,
                                 const SchemaAttribute<base::ref<base::IPlugin>>& attribute) {
    const base::ref<base::IPlugin>* object = map.findAttribute<base::ref<base::IPlugin>>(attribute);
    return object ? object->get() : nullptr;
}

/// Declares one attribute of a schema: name, type, and the default if there is one.
#define SCENE_ATTRIBUTE(name, type, ...)    \
    static inline constinit auto n_##name = \
        ::scene::schemaAttribute<type>(#name __VA_OPT__(, ) __VA_ARGS__);
#define SCENE_ATTRIBUTE_ADDRESS(name, ...) &n_##name,

/// Declares the schema struct of a type from its table: a macro that applies its argument to
/// each row.
#define SCENE_SCHEMA(type, TABLE)                                                           \
    struct type##_schema {                                                                  \
        static inline constinit ::scene::SchemaName n_type{#type};                          \
        TABLE(SCENE_ATTRIBUTE)                                                              \
        static std::span<::scene::SchemaName* const> names() {                              \
            static constexpr ::scene::SchemaName* all[] = {&n_type,                         \
                                                           TABLE(SCENE_ATTRIBUTE_ADDRESS)}; \
            return all;                                                                     \
        }                                                                                   \
    };

} // namespace scene
