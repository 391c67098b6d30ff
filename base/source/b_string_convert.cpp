#include "b_string_convert.h"

#include "b_exception.h"

#include <algorithm>
#include <charconv>
#include <cmath>

namespace base {

namespace {

constexpr string_view blanks = " \t\r\n";
constexpr string_view replacementCharacter = "\xEF\xBF\xBD"; // U+FFFD

char lowerAscii(char c) {
    return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c;
}

/// Converts the whole of `text`; `value` is untouched on failure.
template <class T>
bool readNumber(string_view text, T& value) {
    T read{};
    const char* end = text.data() + text.size();
    const auto [at, error] = std::from_chars(text.data(), end, read);
    if (error != std::errc() || at != end || text.empty())
        return false;
    value = read;
    return true;
}

/// Decimal reals alone: the words for infinity and NaN are refused.
bool readReal(string_view text, double& value) {
    const std::size_t first = text.starts_with('-') ? 1 : 0;
    if (first >= text.size() || (text[first] != '.' && (text[first] < '0' || text[first] > '9')))
        return false;
    return readNumber(text, value);
}

bool readBool(string_view text, bool& value) {
    const string word = toLower(text);
    const bool isTrue = word == "1" || word == "true" || word == "yes";
    if (!isTrue && word != "0" && word != "false" && word != "no")
        return false;
    value = isTrue;
    return true;
}

struct Utf8Sequence {
    std::size_t length; ///< of the valid sequence, or of the broken part to replace
    bool valid;
};

/// The sequence at the front of `text`. A broken one is as long as the longest part that a valid
/// sequence could start with, at least one byte (Unicode, table 3-7).
Utf8Sequence utf8Sequence(string_view text) {
    const u8 lead = static_cast<u8>(text[0]);
    if (lead < 0x80)
        return {1, true};
    const std::size_t length = lead >= 0xF0 ? 4 : lead >= 0xE0 ? 3 : 2;
    if (lead < 0xC2 || lead > 0xF4)
        return {1, false};
    // The second byte's range rules out overlong forms, surrogates and what is above U+10FFFF.
    u8 low = lead == 0xE0 ? 0xA0 : lead == 0xF0 ? 0x90 : 0x80;
    u8 high = lead == 0xED ? 0x9F : lead == 0xF4 ? 0x8F : 0xBF;
    for (std::size_t i = 1; i < length; ++i) {
        if (i >= text.size() || static_cast<u8>(text[i]) < low || static_cast<u8>(text[i]) > high)
            return {i, false};
        low = 0x80;
        high = 0xBF;
    }
    return {length, true};
}

} // namespace

string toString(double value) {
    if (std::isnan(value))
        return "nan";
    if (std::isinf(value))
        return value < 0 ? "-inf" : "inf";
    char text[64];
    char* end = text + sizeof text;
    if (std::fabs(value) > 1e30) {
        end = std::to_chars(text, end, value, std::chars_format::general, 3).ptr;
        return string(text, end);
    }
    end = std::to_chars(text, end, value, std::chars_format::fixed, 6).ptr;
    while (end[-1] == '0')
        --end;
    if (end[-1] == '.')
        --end;
    return string(text, end);
}

template <class T>
bool tryFromString(string_view text, T& value) {
    if constexpr (std::is_same_v<T, string>) {
        value = string(text);
        return true;
    } else if constexpr (std::is_same_v<T, bool>) {
        return readBool(trimmed(text), value);
    } else if constexpr (std::is_same_v<T, double>) {
        return readReal(trimmed(text), value);
    } else if constexpr (std::is_same_v<T, float>) {
        double read = 0;
        if (!readReal(trimmed(text), read) || std::fabs(read) > double{FLT_MAX})
            return false;
        value = static_cast<float>(read);
        return true;
    } else {
        return readNumber(trimmed(text), value);
    }
}

template <class T>
T from_string(string_view text) {
    T value{};
    if (!tryFromString(text, value))
        throw string_conversion_exception("b_string_convert", "base::from_string", __LINE__);
    return value;
}

#define BASE_INSTANTIATE_CONVERSION(T)                \
    template BASE1_API T from_string<T>(string_view); \
    template BASE1_API bool tryFromString<T>(string_view, T&);
BASE_INSTANTIATE_CONVERSION(bool)
BASE_INSTANTIATE_CONVERSION(i8)
BASE_INSTANTIATE_CONVERSION(u8)
BASE_INSTANTIATE_CONVERSION(i16)
BASE_INSTANTIATE_CONVERSION(u16)
BASE_INSTANTIATE_CONVERSION(i32)
BASE_INSTANTIATE_CONVERSION(u32)
BASE_INSTANTIATE_CONVERSION(i64)
BASE_INSTANTIATE_CONVERSION(u64)
BASE_INSTANTIATE_CONVERSION(float)
BASE_INSTANTIATE_CONVERSION(double)
BASE_INSTANTIATE_CONVERSION(string)

string toLower(string_view text) {
    string lower(text);
    std::transform(lower.begin(), lower.end(), lower.begin(), lowerAscii);
    return lower;
}

string_view trimmed(string_view text) {
    const std::size_t first = text.find_first_not_of(blanks);
    if (first == string_view::npos)
        return {};
    return text.substr(first, text.find_last_not_of(blanks) - first + 1);
}

vector<string_view> split(string_view text, char separator) {
    vector<string_view> parts;
    for (;;) {
        const std::size_t end = text.find(separator);
        parts.push_back(text.substr(0, end));
        if (end == string_view::npos)
            return parts;
        text.remove_prefix(end + 1);
    }
}

string_view cutUtf8(string_view text, std::size_t longest) {
    if (text.size() <= longest)
        return text;
    const auto isContinuation = [](char c) { return (c & 0xC0) == 0x80; };
    while (longest > 0 && isContinuation(text[longest]))
        --longest;
    return text.substr(0, longest);
}

string toValidUtf8(string_view text) {
    string out;
    out.reserve(text.size());
    while (!text.empty()) {
        const Utf8Sequence sequence = utf8Sequence(text);
        out.append(sequence.valid ? text.substr(0, sequence.length) : replacementCharacter);
        text.remove_prefix(sequence.length);
    }
    return out;
}

} // namespace base
