#pragma once

#include "b_containers.h"

#include <cstdio>

namespace host {

/// What stands in front of all that the program says of itself.
inline constexpr const char* programName = "scene_export";

/// Writes the text by one call.
inline void print(std::FILE* stream, base::string_view text) {
    std::fwrite(text.data(), 1, text.size(), stream);
}

/// The text with "?" for each control byte that could act on a terminal; names in files may hold
/// any. Line ends and tabs stay.
base::string printable(base::string_view text);

/// "scene_export: error: " and the text on the standard error stream.
void printError(base::string_view text);

} // namespace host
