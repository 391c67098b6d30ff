#include "gltf_container.h"

#include <cstddef>
#include <fstream>
#include <iterator>

namespace test_support {

namespace {

constexpr uint32_t magic = 0x46546C67;
constexpr uint32_t jsonChunk = 0x4E4F534A;
constexpr uint32_t binaryChunk = 0x004E4942;
constexpr size_t fileHeaderSize = 12;
constexpr size_t chunkHeaderSize = 8;

uint32_t readWord(std::span<const uint8_t> bytes, size_t offset) {
    uint32_t word = 0;
    for (size_t i = 4; i-- > 0;) {
        word = word << 8 | bytes[offset + i];
    }
    return word;
}

void require(bool condition, const std::string& text) {
    if (!condition) {
        throw GltfError(text);
    }
}

/// Returns the content of the chunk at `offset`, which must be of `type`, and steps behind it.
std::span<const uint8_t> takeChunk(std::span<const uint8_t> file, size_t& offset, uint32_t type,
                                   const std::string& name) {
    require(file.size() - offset >= chunkHeaderSize, "glb: the header of the " + name + " is cut");
    const uint32_t length = readWord(file, offset);
    require(readWord(file, offset + 4) == type, "glb: wrong type of the " + name);
    require(length % 4 == 0, "glb: the length of the " + name + " is no multiple of 4");
    offset += chunkHeaderSize;
    require(length <= file.size() - offset, "glb: the " + name + " passes the end of the file");
    offset += length;
    return file.subspan(offset - length, length);
}

uint32_t base64Digit(char c) {
    constexpr std::string_view digits =
        "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";
    const size_t digit = digits.find(c);
    require(digit != std::string_view::npos, "data URI: no base64 character");
    return static_cast<uint32_t>(digit);
}

Bytes decodeBase64(std::string_view text) {
    require(text.size() % 4 == 0, "data URI: the base64 text is cut or lacks its padding");
    size_t padding = 0;
    while (padding < 2 && padding < text.size() && text[text.size() - 1 - padding] == '=') {
        ++padding;
    }
    Bytes bytes;
    bytes.reserve(text.size() / 4 * 3);
    for (size_t i = 0; i < text.size(); i += 4) {
        uint32_t group = 0;
        for (size_t k = i; k < i + 4; ++k) {
            group = group << 6 | (k < text.size() - padding ? base64Digit(text[k]) : 0);
        }
        for (int shift = 16; shift >= 0; shift -= 8) {
            bytes.push_back(static_cast<uint8_t>(group >> shift & 0xFF));
        }
    }
    bytes.erase(bytes.end() - static_cast<std::ptrdiff_t>(padding), bytes.end());
    return bytes;
}

std::string decodePercent(std::string_view text) {
    constexpr std::string_view digits = "0123456789abcdef0123456789ABCDEF";
    std::string decoded;
    for (size_t i = 0; i < text.size(); ++i) {
        const size_t high = i + 2 < text.size() ? digits.find(text[i + 1]) : std::string_view::npos;
        const size_t low = i + 2 < text.size() ? digits.find(text[i + 2]) : std::string_view::npos;
        if (text[i] == '%' && high != std::string_view::npos && low != std::string_view::npos) {
            decoded += static_cast<char>(high % 16 * 16 + low % 16);
            i += 2;
        } else {
            decoded += text[i];
        }
    }
    return decoded;
}

} // namespace

GltfChunks splitGlb(std::span<const uint8_t> file) {
    require(file.size() >= fileHeaderSize, "glb: shorter than its header");
    require(readWord(file, 0) == magic, "glb: wrong magic");
    require(readWord(file, 4) == 2, "glb: version " + std::to_string(readWord(file, 4)));
    require(readWord(file, 8) == file.size(),
            "glb: the header says " + std::to_string(readWord(file, 8)) + " bytes, the file has " +
                std::to_string(file.size()));
    size_t offset = fileHeaderSize;
    const std::span<const uint8_t> json = takeChunk(file, offset, jsonChunk, "JSON chunk");
    GltfChunks chunks{{json.begin(), json.end()}, std::nullopt};
    require(chunks.json.find_last_not_of(' ') + 4 >= chunks.json.size(),
            "glb: more than three blanks behind the JSON text");
    require(chunks.json.find_last_of('}') == chunks.json.find_last_not_of(' '),
            "glb: the JSON chunk is padded with something else than blanks");
    if (offset < file.size()) {
        const std::span<const uint8_t> binary = takeChunk(file, offset, binaryChunk, "BIN chunk");
        chunks.binary.emplace(binary.begin(), binary.end());
    }
    require(offset == file.size(), "glb: something follows the BIN chunk");
    return chunks;
}

Bytes readUri(std::string_view uri, const std::filesystem::path& folder) {
    if (uri.starts_with("data:")) {
        const size_t comma = uri.find(',');
        require(comma != std::string_view::npos && uri.substr(0, comma).ends_with(";base64"),
                "data URI: not in base64");
        return decodeBase64(uri.substr(comma + 1));
    }
    const auto fileName = [](const std::string& text) {
        return std::filesystem::path(std::u8string(text.begin(), text.end()));
    };
    // Some writers leave a name with a percent sign as it is.
    const std::filesystem::path verbatim = folder / fileName(std::string(uri));
    const std::filesystem::path decoded = folder / fileName(decodePercent(uri));
    return readBytes(std::filesystem::exists(decoded) ? decoded : verbatim);
}

Bytes readBytes(const std::filesystem::path& path) {
    std::ifstream stream(path, std::ios::binary);
    require(stream.good() && !std::filesystem::is_directory(path),
            "can't read the file " + path.string());
    return {std::istreambuf_iterator<char>(stream), std::istreambuf_iterator<char>()};
}

} // namespace test_support
