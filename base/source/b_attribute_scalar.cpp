#include "b_attribute_values.h"

namespace base {

template <class T>
TypedAttribute<T>::~TypedAttribute() = default;

template <class T>
Attribute* TypedAttribute<T>::clone() const {
    auto copy = std::make_unique<TypedAttribute<T>>(value_);
    copy->setFlags(flags());
    return copy.release();
}

template <class T>
i8 TypedAttribute<T>::elementCode() const {
    return elementCodeOf<T>();
}

template <class T>
void* TypedAttribute<T>::data(i32 index) {
    void* found = nullptr;
    if (index < 0)
        found = &value_;
    else
        withComponent(value_, index, [&](auto& component) { found = &component; });
    return found;
}

template <class T>
u32 TypedAttribute<T>::byteSize() const {
    return saturatedSize(storedSize(value_));
}

template <class T>
bool TypedAttribute<T>::assign(const Attribute& other, u32 mode, i32) {
    if ((mode & assignCopy) == 0 || other.type() != type())
        return false;
    setData(other.data(-1), -1);
    return true;
}

template <class T>
string TypedAttribute<T>::toString() const {
    string text;
    appendValueText(text, value_);
    return text;
}

template <class T>
bool TypedAttribute<T>::fromString(string_view text, i32 index) {
    if (index < 0)
        return parseValueText(text, value_);
    bool parsed = false;
    withComponent(value_, index, [&](auto& component) { parsed = parseText(text, component); });
    return parsed;
}

template <class T>
void TypedAttribute<T>::setData(const void* value, i32 index) {
    if (index < 0) {
        value_ = *static_cast<const T*>(value);
        return;
    }
    withComponent(value_, index,
                  [&]<class C>(C& component) { component = *static_cast<const C*>(value); });
}

template <class T>
i32 TypedAttribute<T>::compare(const void* value, i32 index) const {
    if (index < 0)
        return compareValues(value_, *static_cast<const T*>(value));
    i32 order = -1;
    withComponent(value_, index, [&]<class C>(const C& component) {
        order = compareValues(component, *static_cast<const C*>(value));
    });
    return order;
}

#define BASE_INSTANTIATE_SCALAR(T, text) template class TypedAttribute<T>;
BASE_FULL_TYPES(BASE_INSTANTIATE_SCALAR)
BASE_SCALAR_TYPES(BASE_INSTANTIATE_SCALAR)

} // namespace base
