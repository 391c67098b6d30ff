#pragma once

#include "GLTF/document.h"

#include <rapidjson/internal/itoa.h>
#include <rapidjson/stringbuffer.h>
#include <rapidjson/writer.h>

#include <span>

namespace GLTF {

/// Memory of the text. A failed allocation throws, as everywhere else.
struct TextAllocator {
    static const bool kNeedFree = true;
    void* Malloc(std::size_t byteCount);
    void* Realloc(void* block, std::size_t oldByteCount, std::size_t byteCount);
    static void Free(void* block) noexcept;
};

using TextBuffer = rapidjson::GenericStringBuffer<rapidjson::UTF8<>, TextAllocator>;

/// Writes compact JSON text and owns its commas, its escapes and the form of its numbers.
/// Names that are given as literals must need no escape.
class JsonWriter : private rapidjson::Writer<TextBuffer> {
public:
    explicit JsonWriter(TextBuffer& text) : rapidjson::Writer<TextBuffer>(text) {}

    /// Makes room for so many characters more.
    void reserve(std::size_t byteCount) { os_->Reserve(byteCount); }

    void startObject() { StartObject(); }
    void endObject() { EndObject(); }
    void startArray() { StartArray(); }
    void endArray() { EndArray(); }

    template <std::size_t N>
    void key(const char (&name)[N]) {
        Level& level = *level_stack_.template Top<Level>();
        char* const start = os_->Push(N + 2);
        os_->Pop(N + 2 - static_cast<std::size_t>(putKey(level, name, start) - start));
        ++level.valueCount;
    }
    template <std::size_t N>
    void startObject(const char (&name)[N]) {
        key(name);
        StartObject();
    }
    template <std::size_t N>
    void startArray(const char (&name)[N]) {
        key(name);
        StartArray();
    }
    /// Any name.
    void keyText(string_view name) { textValue(name); }

    void intValue(i32 value) {
        Prefix(rapidjson::kNumberType);
        char* const start = os_->Push(intRoom);
        pop(intRoom, start, rapidjson::internal::i32toa(value, start));
    }
    /// The shortest text that reads back as the same double, "0" for both zeros. What is not
    /// finite becomes a large finite number: JSON has no form for it.
    void floatValue(float value) {
        Prefix(rapidjson::kNumberType);
        char* const start = os_->Push(floatRoom);
        pop(floatRoom, start, putFloat(value, start));
    }
    void boolValue(bool value) { Bool(value); }
    /// Bytes that are not UTF-8 become U+FFFD. Throws `base::exception` for a text above 2^28
    /// bytes.
    void textValue(string_view value);

    template <std::size_t N>
    void intMember(const char (&name)[N], i32 value) {
        Level& level = *level_stack_.template Top<Level>();
        char* const start = os_->Push(N + 3 + intRoom);
        char* end = putKey(level, name, start);
        *end++ = ':';
        pop(N + 3 + intRoom, start, rapidjson::internal::i32toa(value, end));
        level.valueCount += 2;
    }
    template <std::size_t N>
    void floatMember(const char (&name)[N], float value) {
        key(name);
        floatValue(value);
    }
    template <std::size_t N>
    void floatsMember(const char (&name)[N], std::span<const float> values) {
        startArray(name);
        for (const float value : values)
            floatValue(value);
        EndArray();
    }
    template <std::size_t N>
    void boolMember(const char (&name)[N], bool value) {
        key(name);
        Bool(value);
    }
    template <std::size_t N>
    void textMember(const char (&name)[N], string_view value) {
        key(name);
        textValue(value);
    }

    /// Writes `bytes` as the text of a data URI, encoded straight into its place. Returns the
    /// written text without its quotes; it is valid until the next write.
    string_view dataUriValue(string_view mimeType, const u8* bytes, std::size_t byteCount);

private:
    static constexpr std::size_t intRoom = 11;
    static constexpr std::size_t floatRoom = 25;

    void pop(std::size_t pushed, const char* start, const char* end) {
        os_->Pop(pushed - static_cast<std::size_t>(end - start));
    }
    template <std::size_t N>
    static char* putKey(const Level& level, const char (&name)[N], char* out) {
        if (level.valueCount != 0)
            *out++ = ',';
        *out++ = '"';
        std::memcpy(out, name, N - 1);
        out += N - 1;
        *out++ = '"';
        return out;
    }
    char* putFloat(float value, char* out);

    /// The text of a recent float. Scenes repeat them: bounds, scales and turns of like objects.
    struct FloatText {
        u32 bits = 0; ///< 0 in an unused entry
        u8 length = 0;
        char text[floatRoom];
    };
    std::array<FloatText, 256> recentFloats_;
};

/// Room in the text for one object of the usual kinds, for reserving by an estimate.
constexpr std::size_t estimatedObjectLength = 200;

} // namespace GLTF
