#pragma once

#include "b_name.h"

#include <span>

/// The names that exist before any code runs: records in the library's data, so that their handles
/// are constants which static initialisers of every library may use.
namespace base {

/// FNV-1a of the bytes.
constexpr u32 nameHash(std::string_view text) noexcept {
    u32 hash = 2166136261u;
    for (const char c : text)
        hash = (hash ^ static_cast<u8>(c)) * 16777619u;
    return hash;
}

std::span<const NameRecord> builtinNames() noexcept;

/// The name without characters.
extern const name_id emptyBuiltinName;

} // namespace base
