#include "b_attribute_values.h"

namespace base {

namespace {

constexpr string_view blanks = " \t\r\n";

void appendPadded(string& out, int value, std::size_t digits) {
    if (value < 0)
        out += '-';
    const string text = std::to_string(std::abs(value));
    if (text.size() < digits)
        out.append(digits - text.size(), '0');
    out += text;
}

/// Reads a number of exactly two digits that is not above `limit`.
bool parseTwoDigits(string_view text, u8 limit, u8& value) {
    const auto isDigit = [](char c) { return c >= '0' && c <= '9'; };
    if (text.size() != 2 || !isDigit(text[0]) || !isDigit(text[1]))
        return false;
    value = static_cast<u8>((text[0] - '0') * 10 + (text[1] - '0'));
    return value <= limit;
}

} // namespace

void appendText(string& out, double value) {
    out += toString(value);
}

void appendText(string& out, bool value) {
    out += toString(value);
}

void appendText(string& out, const string& value) {
    out += value;
}

void appendText(string& out, const TimeCode& value) {
    out += std::to_string(value.ticks);
}

void appendText(string& out, const DateTime& value) {
    appendPadded(out, value.year, 4);
    for (const auto& [separator, part] :
         {std::pair('-', value.month), std::pair('-', value.day), std::pair(' ', value.hour),
          std::pair(':', value.minute), std::pair(':', value.second)}) {
        out += separator;
        appendPadded(out, part, 2);
    }
}

void appendText(string& out, const rational& value) {
    out += std::to_string(value.numerator);
    out += '/';
    out += std::to_string(value.denominator);
}

void appendText(string& out, const ref<IPlugin>& value) {
    if (value)
        out += value->getName();
}

bool parseText(string_view text, TimeCode& value) {
    return tryFromString(text, value.ticks);
}

bool parseText(string_view text, DateTime& value) {
    constexpr string_view tail = "-MM-DD hh:mm:ss";
    text = trimmed(text);
    if (text.size() <= tail.size())
        return false;
    const string_view year = text.substr(0, text.size() - tail.size());
    const string_view rest = text.substr(year.size());
    DateTime parsed;
    if (rest[0] != '-' || rest[3] != '-' || rest[6] != ' ' || rest[9] != ':' || rest[12] != ':' ||
        !tryFromString(year, parsed.year) || !parseTwoDigits(rest.substr(1, 2), 12, parsed.month) ||
        !parseTwoDigits(rest.substr(4, 2), 31, parsed.day) ||
        !parseTwoDigits(rest.substr(7, 2), 23, parsed.hour) ||
        !parseTwoDigits(rest.substr(10, 2), 59, parsed.minute) ||
        !parseTwoDigits(rest.substr(13, 2), 60, parsed.second))
        return false;
    value = parsed;
    return true;
}

bool parseText(string_view text, rational& value) {
    const std::size_t slash = text.find('/');
    rational parsed;
    if (slash == text.npos || !tryFromString(text.substr(0, slash), parsed.numerator) ||
        !tryFromString(text.substr(slash + 1), parsed.denominator))
        return false;
    value = parsed;
    return true;
}

// A name alone does not lead to an object: that takes the factory that owns it.
bool parseText(string_view, ref<IPlugin>&) {
    return false;
}

string_view nextWord(string_view& text) {
    text.remove_prefix(std::min(text.find_first_not_of(blanks), text.size()));
    const string_view word = text.substr(0, text.find_first_of(blanks));
    text.remove_prefix(word.size());
    return word;
}

} // namespace base
