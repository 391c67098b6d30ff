#pragma once

#include "b_containers.h"

#include <span>

struct aiMaterial;
struct aiMaterialProperty;

namespace assimp {

/// Key of a property; the library's AI_MATKEY_ macros expand to its members.
struct PropertyKey {
    const char* name;
    unsigned semantic = 0; ///< an aiTextureType for properties of textures
    unsigned index = 0;
};

/// The properties of one material, read with respect to their real sizes: the library's own
/// functions assert what they expect, and with that a broken file would end the process. Borrows
/// the material.
class MaterialProperties {
public:
    explicit MaterialProperties(const aiMaterial& material) : material_(material) {}

    /// Sets as many of `numbers` as the property has and returns how many; 0 if it is absent or
    /// holds no numbers.
    std::size_t read(const PropertyKey& key, std::span<float> numbers) const;
    /// The first whole number of the property, `absent` if it has none.
    int readInt(const PropertyKey& key, int absent) const;
    /// The text up to its first zero byte; empty if it is absent or no text. Borrowed.
    base::string_view readText(const PropertyKey& key) const;

private:
    const aiMaterialProperty* find(const PropertyKey& key) const;

    const aiMaterial& material_;
};

} // namespace assimp
