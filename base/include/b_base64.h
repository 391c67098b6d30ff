#pragma once

#include "b_config.h"
#include "b_types.h"

#include <cstddef>

/// Base64 with the standard alphabet and padding (RFC 4648, section 4).
namespace base {

/// Characters of the encoded form of `byteCount` bytes, padding included.
constexpr std::size_t base64Length(std::size_t byteCount) {
    return (byteCount + 2) / 3 * 4;
}

/// Writes the encoded form of `bytes` to `out`, which has room for `base64Length(byteCount)`
/// characters; no zero is added. The ranges must not overlap.
BASE1_API void base64Encode(const u8* bytes, std::size_t byteCount, char* out);

} // namespace base
