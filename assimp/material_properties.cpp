#include "assimp/material_properties.h"

#include "b_types.h"

#include <assimp/material.h>

#include <algorithm>
#include <cstring>

namespace assimp {

namespace {

/// Sets as many of `numbers` as `property` has as elements of type T.
template <class T>
std::size_t readAs(const aiMaterialProperty& property, std::span<float> numbers) {
    const std::size_t count = std::min(numbers.size(), property.mDataLength / sizeof(T));
    for (std::size_t i = 0; i < count; ++i) {
        T element;
        std::memcpy(&element, property.mData + i * sizeof(T), sizeof(T));
        numbers[i] = static_cast<float>(element);
    }
    return count;
}

} // namespace

const aiMaterialProperty* MaterialProperties::find(const PropertyKey& key) const {
    for (unsigned i = 0; i < material_.mNumProperties; ++i) {
        const aiMaterialProperty* property = material_.mProperties[i];
        if (property && property->mData && property->mSemantic == key.semantic &&
            property->mIndex == key.index && std::strcmp(property->mKey.C_Str(), key.name) == 0)
            return property;
    }
    return nullptr;
}

std::size_t MaterialProperties::read(const PropertyKey& key, std::span<float> numbers) const {
    const aiMaterialProperty* property = find(key);
    if (!property)
        return 0;
    switch (property->mType) {
    case aiPTI_Double:
        return readAs<double>(*property, numbers);
    case aiPTI_Integer:
        return readAs<int>(*property, numbers);
    case aiPTI_Float:
    case aiPTI_Buffer: // how the library stores structures of numbers
        return readAs<float>(*property, numbers);
    default:
        return 0;
    }
}

/// Some readers store whole numbers in properties of another type, as the bytes that they are.
int MaterialProperties::readInt(const PropertyKey& key, int absent) const {
    const aiMaterialProperty* property = find(key);
    if (!property || property->mType == aiPTI_String || property->mDataLength < sizeof(int))
        return absent;
    if (property->mType == aiPTI_Float || property->mType == aiPTI_Double) {
        float number = 0;
        read(key, {&number, 1});
        return base::saturate<int>(number);
    }
    int number;
    std::memcpy(&number, property->mData, sizeof number);
    return number;
}

/// A text is stored as its length in 4 bytes, its bytes and a zero byte.
base::string_view MaterialProperties::readText(const PropertyKey& key) const {
    const aiMaterialProperty* property = find(key);
    base::u32 length = 0;
    if (!property || property->mType != aiPTI_String || property->mDataLength <= sizeof length)
        return {};
    std::memcpy(&length, property->mData, sizeof length);
    const std::size_t room = property->mDataLength - sizeof length;
    const base::string_view text(property->mData + sizeof length,
                                 std::min<std::size_t>(length, room));
    return text.substr(0, text.find('\0'));
}

} // namespace assimp
