#include "assimp/material_format.h"

#include <algorithm>

namespace assimp {

using base::string_view;

namespace {

bool isAmong(string_view text, std::initializer_list<string_view> texts) {
    return std::ranges::find(texts, text) != texts.end();
}

} // namespace

/// - Modelling programs put a map in the place of a color. MTL multiplies them by definition, and
///   so do the formats of games and viewers.
/// - Writers of COLLADA took `<transparency>` for what it is called, though 1 means opaque there,
///   and those of MTL write "Tr" in both senses.
/// - COLLADA's opacity is in `<transparent>` alone.
/// - The reader of MTL also says Gouraud of materials whose file names no model.
MaterialFormat::MaterialFormat(string_view extension)
    : mapsReplace(isAmong(extension, {"fbx", "dae", "zae", "3ds", "prj", "ase", "ask", "blend",
                                      "lwo", "lws", "lxo"})),
      zeroIsOpaque(isAmong(extension, {"dae", "zae", "obj"})),
      diffuseHasAlpha(!isAmong(extension, {"dae", "zae"})), gouraudIsMatte(extension != "obj") {}

} // namespace assimp
