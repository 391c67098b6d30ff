#include "b_format.h"

#include "b_string_convert.h"

#include <algorithm>
#include <charconv>

namespace base {

namespace {

template <class T>
void appendInteger(string& out, T value) {
    char digits[24];
    const auto end = std::to_chars(digits, digits + sizeof digits, value).ptr;
    out.append(digits, end);
}

/// Characters of UTF-8 text: every byte but the continuation bytes starts one.
std::size_t characterCount(string_view text) {
    return static_cast<std::size_t>(std::count_if(
        text.begin(), text.end(), [](char c) { return (static_cast<u8>(c) & 0xC0) != 0x80; }));
}

struct Placeholder {
    std::size_t length = 0; ///< bytes in the pattern; 0 where there is none
    int width = 0;
};

/// The placeholder that `text`, which starts with "{", begins with.
Placeholder parsePlaceholder(string_view text) {
    if (text.starts_with("{}"))
        return {2, 0};
    if (!text.starts_with("{,"))
        return {};
    int width = 0;
    const char* end = text.data() + text.size();
    const auto [at, error] = std::from_chars(text.data() + 2, end, width);
    if (error != std::errc() || at == end || *at != '}')
        return {};
    return {static_cast<std::size_t>(at + 1 - text.data()), width};
}

void appendPadded(string& out, const FormatArg& arg, int width) {
    const std::size_t start = out.size();
    arg.appendTo(out);
    const std::size_t wanted = static_cast<std::size_t>(width < 0 ? -i64{width} : i64{width});
    const std::size_t printed = characterCount(string_view(out).substr(start));
    if (printed < wanted)
        out.insert(width < 0 ? out.size() : start, wanted - printed, ' ');
}

} // namespace

void FormatArg::appendTo(string& out) const {
    switch (kind_) {
    case Kind::text:
        out.append(text_);
        break;
    case Kind::integer:
        appendInteger(out, integer_);
        break;
    case Kind::natural:
        appendInteger(out, natural_);
        break;
    case Kind::real:
        out.append(toString(real_));
        break;
    }
}

string formatArgs(string_view pattern, std::span<const FormatArg> args) {
    string out;
    out.reserve(pattern.size() + 16 * args.size());
    std::size_t next = 0;
    while (!pattern.empty() && next < args.size()) {
        const std::size_t brace = std::min(pattern.find('{'), pattern.size());
        out.append(pattern.substr(0, brace));
        pattern.remove_prefix(brace);
        if (pattern.empty())
            break;
        const Placeholder found = parsePlaceholder(pattern);
        if (found.length != 0)
            appendPadded(out, args[next++], found.width);
        else
            out.push_back('{');
        pattern.remove_prefix(found.length != 0 ? found.length : 1);
    }
    return out.append(pattern);
}

} // namespace base
