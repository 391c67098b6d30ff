#include "b_attribute_json.h"

#include "b_factory.h"

namespace base {

template <class T>
void TypedAttribute<T>::writeJson(DataWriter&, JSONWriteOptions&) const {}
template <class T>
bool TypedAttribute<T>::readJson(DataReader&, JSONReadOptions&) {
    return false;
}
template <class T>
void TypedVectorAttribute<T>::writeJson(DataWriter&, JSONWriteOptions&) const {}
template <class T>
bool TypedVectorAttribute<T>::readJson(DataReader&, JSONReadOptions&) {
    return false;
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

void AttribArray::writeJson(DataWriter&, JSONWriteOptions&) const {}
bool AttribArray::readJson(DataReader&, JSONReadOptions&) {
    return false;
}
void AttribLink::writeJson(DataWriter&, JSONWriteOptions&) const {}
bool AttribLink::readJson(DataReader&, JSONReadOptions&) {
    return false;
}
void AttribMap::writeJson(DataWriter&, JSONWriteOptions&) const {}
bool AttribMap::readJson(DataReader&, JSONReadOptions&) {
    return false;
}
void PluginFactory::writeJson(Stream&) const {}
bool PluginFactory::readJson(Stream&) {
    return false;
}

} // namespace base
