#pragma once

#include "b_containers.h"
#include "b_name.h"
#include "b_refcnt.h"
#include "b_types.h"

/// The closed list of value types that attributes can hold, with their type names.
namespace base {

class IPlugin;

/// `n_name` is the type name of a scalar attribute, `n_array_name` that of a vector attribute.
/// A type that may not be a scalar (or not a vector) lacks the member, so its use does not
/// compile. The names are constants of `base1` and may be used at any time.
template <class T>
struct TypeTraits;

#define BASE_DECLARE_TYPE(T)                       \
    template <>                                    \
    struct BASE1_API TypeTraits<T> {               \
        static const name_id n_name, n_array_name; \
    };
#define BASE_DECLARE_SCALAR_TYPE(T)  \
    template <>                      \
    struct BASE1_API TypeTraits<T> { \
        static const name_id n_name; \
    };
#define BASE_DECLARE_ARRAY_TYPE(T)         \
    template <>                            \
    struct BASE1_API TypeTraits<T> {       \
        static const name_id n_array_name; \
    };

/// X(type, text of the scalar's name): types with both forms.
#define BASE_FULL_TYPES(X)          \
    X(u8, "u8")                     \
    X(i16, "i16")                   \
    X(u16, "u16")                   \
    X(i32, "i32")                   \
    X(u32, "u32")                   \
    X(float, "float")               \
    X(double, "double")             \
    X(string, "string")             \
    X(vec2f, "vec2f")               \
    X(vec3f, "vec3f")               \
    X(vec4f, "vec4f")               \
    X(vec2d, "vec2d")               \
    X(vec3d, "vec3d")               \
    X(vec4d, "vec4d")               \
    X(quatf, "quatf")               \
    X(quatd, "quatd")               \
    X(color4f, "color4f")           \
    X(base_mat22<float>, "mat22f")  \
    X(base_mat33<float>, "mat33f")  \
    X(base_mat44<float>, "mat44f")  \
    X(base_mat22<double>, "mat22d") \
    X(base_mat33<double>, "mat33d") \
    X(base_mat44<double>, "mat44d") \
    X(box3f, "box3f")               \
    X(TimeCode, "timecode")         \
    X(ref<IPlugin>, "plugin")

/// X(type, text): types that are only scalars.
#define BASE_SCALAR_TYPES(X)             \
    X(bool, "bool")                      \
    X(base_vec2<i8>, "vec2i8")           \
    X(base_vec2<u8>, "vec2u8")           \
    X(base_vec2<i16>, "vec2i16")         \
    X(base_vec2<u16>, "vec2u16")         \
    X(base_vec2<i32>, "vec2i")           \
    X(base_vec2<u32>, "vec2u")           \
    X(base_vec3<i8>, "vec3i8")           \
    X(base_vec3<u8>, "vec3u8")           \
    X(base_vec3<i16>, "vec3i16")         \
    X(base_vec3<u16>, "vec3u16")         \
    X(base_vec3<i32>, "vec3i")           \
    X(base_vec3<u32>, "vec3u")           \
    X(base_vec4<i8>, "vec4i8")           \
    X(base_vec4<u8>, "vec4u8")           \
    X(base_vec4<i16>, "vec4i16")         \
    X(base_vec4<u16>, "vec4u16")         \
    X(base_vec4<i32>, "vec4i")           \
    X(base_vec4<u32>, "vec4u")           \
    X(base_box<base_vec2<i32>>, "box2i") \
    X(base_box<base_vec2<u32>>, "box2u") \
    X(base_box<vec2f>, "box2f")          \
    X(base_box<vec2d>, "box2d")          \
    X(base_box<base_vec3<i32>>, "box3i") \
    X(base_box<base_vec3<u32>>, "box3u") \
    X(base_box<vec3d>, "box3d")          \
    X(DateTime, "datetime")              \
    X(rational, "rational")

/// X(type, text without the "[]" of the array's name): types that are only vectors.
#define BASE_ARRAY_TYPES(X) \
    X(i8, "i8")             \
    X(mat43, "mat43")       \
    X(normal, "normal")

#define BASE_DECLARE_TYPE_ROW(T, text) BASE_DECLARE_TYPE(T)
#define BASE_DECLARE_SCALAR_TYPE_ROW(T, text) BASE_DECLARE_SCALAR_TYPE(T)
#define BASE_DECLARE_ARRAY_TYPE_ROW(T, text) BASE_DECLARE_ARRAY_TYPE(T)
BASE_FULL_TYPES(BASE_DECLARE_TYPE_ROW)
BASE_SCALAR_TYPES(BASE_DECLARE_SCALAR_TYPE_ROW)
BASE_ARRAY_TYPES(BASE_DECLARE_ARRAY_TYPE_ROW)

/// The names of the three structural types: "map", "array" and "link".
BASE1_API extern const name_id n_map, n_array, n_link;

} // namespace base
