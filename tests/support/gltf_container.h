#pragma once

#include <cstdint>
#include <filesystem>
#include <optional>
#include <span>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

namespace test_support {

/// What is wrong with a glTF file, and where in it.
class GltfError : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

using Bytes = std::vector<uint8_t>;

/// The two chunks of a binary glTF file, with their padding.
struct GltfChunks {
    std::string json;
    std::optional<Bytes> binary;
};

/// Cuts a binary glTF file (version 2) into its chunks. Throws `GltfError` unless magic, version,
/// lengths, chunk types, their order and the padding are those of the format.
GltfChunks splitGlb(std::span<const uint8_t> file);

/// The bytes behind `uri`: a base64 data URI, or else a file in `folder`, whose name may be
/// percent-encoded. Throws `GltfError` if there is no such file or the base64 text is broken.
Bytes readUri(std::string_view uri, const std::filesystem::path& folder);

/// All bytes of a file. Throws `GltfError` if it can't be read.
Bytes readBytes(const std::filesystem::path& path);

} // namespace test_support
