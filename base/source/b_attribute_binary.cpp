#include "b_attribute_binary.h"

#include "b_factory.h"

namespace base {

void Attribute::write(Stream&, BinaryWriteOptions&) const {}
bool Attribute::read(Stream&, BinaryReadOptions&) {
    return false;
}

template <class T>
void TypedAttribute<T>::write(Stream&, BinaryWriteOptions&) const {}
template <class T>
bool TypedAttribute<T>::read(Stream&, BinaryReadOptions&) {
    return false;
}
template <class T>
void TypedVectorAttribute<T>::write(Stream&, BinaryWriteOptions&) const {}
template <class T>
bool TypedVectorAttribute<T>::read(Stream&, BinaryReadOptions&) {
    return false;
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

void AttribArray::write(Stream&, BinaryWriteOptions&) const {}
bool AttribArray::read(Stream&, BinaryReadOptions&) {
    return false;
}
void AttribLink::write(Stream&, BinaryWriteOptions&) const {}
bool AttribLink::read(Stream&, BinaryReadOptions&) {
    return false;
}
void AttribMap::write(Stream&, BinaryWriteOptions&) const {}
bool AttribMap::read(Stream&, BinaryReadOptions&) {
    return false;
}
void PluginFactory::write(Stream&) const {}
bool PluginFactory::read(Stream&) {
    return false;
}

} // namespace base
