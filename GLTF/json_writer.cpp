#include "GLTF/json_writer.h"

#include "b_base64.h"
#include "b_exception.h"
#include "b_format.h"
#include "b_pages.h"
#include "b_string_convert.h"

#include <rapidjson/internal/dtoa.h>

#include <bit>
#include <cmath>
#include <cstdlib>
#include <new>

namespace GLTF {

namespace {

/// The library reckons the room for a text in 32 bits and six times its length.
constexpr std::size_t maxTextLength = std::size_t(1) << 28;

void requireTextLength(std::size_t byteCount) {
    if (byteCount > maxTextLength)
        throw base::exception(base::format("JSON text of {} bytes is too long, at most {} bytes "
                                           "can be written",
                                           byteCount, maxTextLength),
                              "json_writer", "GLTF::JsonWriter::textValue", __LINE__);
}

/// Printable ASCII that stands for itself in a JSON string.
constexpr std::array<bool, 256> plainCharacters = [] {
    std::array<bool, 256> plain{};
    for (std::size_t c = 0x20; c < 0x80; ++c)
        plain[c] = c != '"' && c != '\\';
    return plain;
}();

/// Copies `text` up to its first character that is not plain and returns how many it copied.
std::size_t copyPlain(string_view text, char* out) {
    for (std::size_t i = 0; i < text.size(); ++i) {
        if (!plainCharacters[static_cast<u8>(text[i])])
            return i;
        out[i] = text[i];
    }
    return text.size();
}

} // namespace

void* TextAllocator::Malloc(std::size_t byteCount) {
    return Realloc(nullptr, 0, byteCount);
}

void* TextAllocator::Realloc(void* block, std::size_t, std::size_t byteCount) {
    if (byteCount == 0) {
        std::free(block);
        return nullptr;
    }
    if (void* moved = std::realloc(block, byteCount))
        return moved;
    throw std::bad_alloc();
}

void TextAllocator::Free(void* block) noexcept {
    std::free(block);
}

char* JsonWriter::putFloat(float value, char* out) {
    if (value == 0) {
        *out = '0';
        return out + 1;
    }
    // Small whole numbers are common (scales, axes, colours) and need no search for digits.
    if (std::abs(value) < 65536) {
        if (const auto whole = static_cast<i32>(value); static_cast<float>(whole) == value) {
            out = rapidjson::internal::i32toa(whole, out);
            *out++ = '.';
            *out++ = '0';
            return out;
        }
    }
    const u32 bits = std::bit_cast<u32>(value);
    FloatText& recent = recentFloats_[(bits ^ bits >> 8 ^ bits >> 16) % recentFloats_.size()];
    if (recent.bits != bits) {
        const char* const end = rapidjson::internal::dtoa(value, recent.text);
        recent.bits = bits;
        recent.length = static_cast<u8>(end - recent.text);
    }
    std::memcpy(out, recent.text, floatRoom);
    return out + recent.length;
}

void JsonWriter::textValue(string_view value) {
    requireTextLength(value.size());
    Prefix(rapidjson::kStringType);
    char* const start = os_->Push(value.size() + 2);
    if (copyPlain(value, start + 1) == value.size()) {
        start[0] = start[value.size() + 1] = '"';
        return;
    }
    os_->Pop(value.size() + 2);
    const string repaired = base::toValidUtf8(value);
    requireTextLength(repaired.size());
    WriteString(repaired.data(), static_cast<rapidjson::SizeType>(repaired.size()));
}

string_view JsonWriter::dataUriValue(string_view mimeType, const u8* bytes, std::size_t byteCount) {
    const std::size_t length = base::base64Length(byteCount);
    const string prefix = "data:" + string(mimeType) + ";base64,";
    os_->Reserve(prefix.size() + length + 4);
    const std::size_t start = os_->GetSize();
    textValue(prefix);

    // The text goes on where the closing quote of its beginning stands.
    os_->Pop(1);
    char* const encoded = os_->Push(length + 1);
    base::prefault(encoded, length);
    base::base64Encode(bytes, byteCount, encoded);
    encoded[length] = '"';

    const char* const text = os_->stack_.template Bottom<char>();
    const std::size_t quote = text[start] == '"' ? start : start + 1;
    return {text + quote + 1, encoded + length};
}

} // namespace GLTF
