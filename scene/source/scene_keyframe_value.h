#pragma once

#include "b_attribute.h"

#include <algorithm>
#include <bit>
#include <cmath>

/// The arithmetic of animation curves: what each type of key values is stored and computed as.
namespace scene {

/// N numbers of type C that are computed one by one.
template <class C, std::size_t N>
struct Components {
    C c[N]{};

    friend bool operator==(const Components&, const Components&) = default;

    /// A value whose components are `make(index)`.
    template <class Make>
    static Components of(const Make& make) {
        Components made;
        for (std::size_t i = 0; i < N; ++i)
            made.c[i] = make(i);
        return made;
    }
    friend Components operator+(const Components& a, const Components& b) {
        return of([&](std::size_t i) { return a.c[i] + b.c[i]; });
    }
    friend Components operator-(const Components& a, const Components& b) {
        return of([&](std::size_t i) { return a.c[i] - b.c[i]; });
    }
    friend Components operator*(const Components& a, C factor) {
        return of([&](std::size_t i) { return a.c[i] * factor; });
    }
    friend Components operator/(const Components& a, C divisor) {
        return of([&](std::size_t i) { return a.c[i] / divisor; });
    }
    friend C dot(const Components& a, const Components& b) {
        C sum{};
        for (std::size_t i = 0; i < N; ++i)
            sum += a.c[i] * b.c[i];
        return sum;
    }
};

/// Element types of vectors.
template <class... Elements>
struct ElementTypes {};

/// Values of `N` numbers: the type of a number where it is stored and where it is computed, and
/// the vectors that may hold such values.
template <class StoredNumber, class ComputedNumber, std::size_t N, class... Elements>
struct KeyArithmetic {
    using Stored = StoredNumber;
    using Number = ComputedNumber;
    using Value = Components<Number, N>;
    using Accepted = ElementTypes<Elements...>;
    static constexpr std::size_t count = N;
};

template <class T>
struct KeyTraits;
template <>
struct KeyTraits<base::i32> : KeyArithmetic<base::i32, float, 1, base::i32> {};
template <>
struct KeyTraits<float> : KeyArithmetic<float, float, 1, float> {};
template <>
struct KeyTraits<double> : KeyArithmetic<double, double, 1, double> {};
template <class C>
struct KeyTraits<base::base_vec2<C>> : KeyArithmetic<C, C, 2, base::base_vec2<C>> {};
template <class C>
struct KeyTraits<base::base_vec3<C>> : KeyArithmetic<C, C, 3, base::base_vec3<C>> {};
template <>
struct KeyTraits<base::vec4f> : KeyArithmetic<float, float, 4, base::vec4f, base::quatf,
                                              base::color4f, base::base_mat22<float>> {};
template <>
struct KeyTraits<base::quatf> : KeyArithmetic<float, float, 4, base::quatf, base::vec4f,
                                              base::color4f, base::base_mat22<float>> {};
template <>
struct KeyTraits<base::vec4d>
    : KeyArithmetic<double, double, 4, base::vec4d, base::quatd, base::base_mat22<double>> {};
template <>
struct KeyTraits<base::quatd>
    : KeyArithmetic<double, double, 4, base::quatd, base::vec4d, base::base_mat22<double>> {};

/// Whether values of type T turn on the sphere between two keys.
template <class T>
constexpr bool isQuaternion = false;
template <class C>
constexpr bool isQuaternion<base::base_quat<C>> = true;

/// X(type): every type that a channel yields.
#define SCENE_KEY_TYPES(X) \
    X(base::vec3d)         \
    X(base::vec3f)         \
    X(base::quatf)         \
    X(base::quatd)         \
    X(float)               \
    X(double)              \
    X(base::vec4f)         \
    X(base::vec4d)         \
    X(base::vec2f)         \
    X(base::vec2d)         \
    X(base::i32)

/// Calls `use` with the `std::type_identity` of the type that keys of the vector type `arrayType`
/// yield. False if there is none.
template <class Use>
bool visitKeyType(base::name_id arrayType, const Use& use) {
    const auto visit = [&]<class T>(std::type_identity<T> type) {
        if (arrayType != base::TypeTraits<T>::n_array_name)
            return false;
        use(type);
        return true;
    };
#define SCENE_VISIT_KEY_TYPE(T) visit(std::type_identity<T>()) ||
    return SCENE_KEY_TYPES(SCENE_VISIT_KEY_TYPE) false;
#undef SCENE_VISIT_KEY_TYPE
}

/// The values that a vector attribute holds for keys of type T.
template <class T>
class KeyVector {
public:
    using Traits = KeyTraits<T>;
    using Value = typename Traits::Value;

    /// False, and empty, if `attribute` is null or of a type that keys of T can't be stored as.
    bool view(const base::Attribute* attribute) {
        numbers_ = nullptr;
        size_ = 0;
        return attribute && viewAny(*attribute, typename Traits::Accepted());
    }

    std::size_t size() const { return size_; }
    Value operator[](std::size_t key) const {
        const auto* numbers = numbers_ + key * Traits::count;
        return Value::of(
            [&](std::size_t i) { return static_cast<typename Traits::Number>(numbers[i]); });
    }
    Value back() const { return (*this)[size_ - 1]; }
    /// The first number of a value as it is stored.
    typename Traits::Stored stored(std::size_t key) const { return numbers_[key * Traits::count]; }
    /// Whether two values are stored alike.
    bool areEqual(std::size_t a, std::size_t b) const {
        return std::equal(numbers_ + a * Traits::count, numbers_ + (a + 1) * Traits::count,
                          numbers_ + b * Traits::count);
    }

private:
    template <class... Elements>
    bool viewAny(const base::Attribute& attribute, ElementTypes<Elements...>) {
        const base::name_id type = attribute.type();
        return (viewAs<Elements>(attribute, type) || ...);
    }
    template <class Element>
    bool viewAs(const base::Attribute& attribute, base::name_id type) {
        static_assert(sizeof(Element) == Traits::count * sizeof(typename Traits::Stored));
        if (type != base::TypeTraits<Element>::n_array_name)
            return false;
        const auto& elements = *static_cast<const base::vector<Element>*>(attribute.data());
        numbers_ = reinterpret_cast<const typename Traits::Stored*>(elements.data());
        size_ = elements.size();
        return true;
    }

    const typename Traits::Stored* numbers_ = nullptr;
    std::size_t size_ = 0;
};

/// The value that `computed` stands for. A quaternion of zeros is the identity.
template <class T>
T makeKeyValue(const typename KeyTraits<T>::Value& computed) {
    if constexpr (std::is_same_v<T, base::i32>) {
        return base::saturate<base::i32>(computed.c[0]);
    } else {
        if (isQuaternion<T> && computed == typename KeyTraits<T>::Value())
            return T{};
        return std::bit_cast<T>(computed);
    }
}

} // namespace scene
