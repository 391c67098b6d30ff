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

/// Marks an attribute that is an array, of maps where nothing else is said.
struct Items {};
/// Marks an attribute that is a map.
struct Submap {};
/// Marks an attribute whose type depends on the object that carries it.
struct Untyped {};

/// Value types of the tables: a code number, a reference to an object, vectors.
using Enumeration = base::u8;
using Object = base::ref<base::IPlugin>;
template <class T>
using Array = base::vector<T>;

/// An attribute without a default: absent means none, null or empty. T is the value type of a
/// scalar, `Array` of it for a vector, or one of the marks.
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
template <class T>
constexpr DefaultedAttribute<T> schemaAttribute(const char* text, T defaultValue) {
    return {{text}, defaultValue};
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

/// Calls `use` with the vector of an attribute whose elements may be of several types. False where
/// there is none; a type that is not among them is logged and counts as none.
template <class First, class... Others, class Use>
bool visitVector(const base::AttribMap& map, base::name_id name, const Use& use) {
    const base::Attribute* attribute = map.findAttribute(name);
    if (!attribute)
        return false;
    const auto visit = [&]<class T>(std::type_identity<T>) {
        if (attribute->type() != base::TypeTraits<T>::n_array_name)
            return false;
        use(*static_cast<const base::vector<T>*>(attribute->data()));
        return true;
    };
    if (visit(std::type_identity<First>()) || (visit(std::type_identity<Others>()) || ...))
        return true;
    map.findVecAttribute<First>(name);
    return false;
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

/// The map at `index` of a list, perhaps through a link; null for a gap and past the end.
base::AttribMap* findItemMap(const base::AttribArray& items, base::u32 index);

/// The object that a reference attribute holds, null where there is none.
inline base::IPlugin* findObject(const base::AttribMap& map,
                                 const SchemaAttribute<Object>& attribute) {
    const Object* object = map.findAttribute<Object>(attribute);
    return object ? object->get() : nullptr;
}

/// Values in double precision.
inline double widened(double value) {
    return value;
}
template <class T>
base::vec3d widened(const base::base_vec3<T>& v) {
    return {v.x, v.y, v.z};
}
template <class T>
base::vec4d widened(const base::base_vec4<T>& v) {
    return {v.x, v.y, v.z, v.w};
}
template <class T>
base::quatd widened(const base::base_quat<T>& q) {
    return {q.x, q.y, q.z, q.w};
}

/// Sets `components` to those of `attribute` if it is a float or double value with as many (four:
/// a vector or a quaternion). False if it has another type, which is not logged.
bool loadReal(const base::Attribute& attribute, std::span<double> components);
/// The same for the attribute `name`; true, with nothing set, if there is none.
bool loadReal(const base::AttribMap& map, base::name_id name, std::span<double> components);

template <class Attribute, class T>
auto readRealOr(const base::AttribMap& map, const Attribute& attribute, const T& absent) {
    auto value = widened(absent);
    const std::span components(reinterpret_cast<double*>(&value), sizeof value / sizeof(double));
    if (!loadReal(map, attribute, components))
        static_cast<void>(find(map, attribute)); // logs the wrong type
    return value;
}
/// As `read`, in double precision and from a value stored in either: what an animation channel
/// yields has the precision of its keys. Without a default an absent attribute counts as zero.
template <class T>
auto readReal(const base::AttribMap& map, const DefaultedAttribute<T>& attribute) {
    return readRealOr(map, attribute, attribute.defaultValue);
}
template <class T>
auto readReal(const base::AttribMap& map, const SchemaAttribute<T>& attribute) {
    return readRealOr(map, attribute, T{});
}

/// Declares one attribute of a schema: name, type, and the default if there is one.
#define SCENE_ATTRIBUTE(name, type, ...)    \
    static inline constinit auto n_##name = \
        ::scene::schemaAttribute<type>(#name __VA_OPT__(, ) __VA_ARGS__);
#define SCENE_ATTRIBUTE_ADDRESS(name, ...) &n_##name,

/// Declares the schema struct of a type from its table, a macro that applies its argument to
/// each row: the type's own name as `n_kind`, then the attributes.
#define SCENE_SCHEMA(type, TABLE)                                                           \
    struct type##_schema {                                                                  \
        static inline constinit ::scene::SchemaName n_kind{#type};                          \
        TABLE(SCENE_ATTRIBUTE)                                                              \
        /* All names, the type's first. */                                                  \
        static std::span<::scene::SchemaName* const> names() {                              \
            static constexpr ::scene::SchemaName* all[] = {&n_kind,                         \
                                                           TABLE(SCENE_ATTRIBUTE_ADDRESS)}; \
            return all;                                                                     \
        }                                                                                   \
    };

/// The table of a type that nothing but its name is told of.
#define SCENE_NO_ATTRIBUTES(X)

} // namespace scene
