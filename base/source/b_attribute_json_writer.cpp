#include "b_attribute_json.h"

#include "b_exception.h"
#include "b_json_pull.h"
#include "b_number_type.h"
#include "stream/b_stream.h"

#include <array>
#include <charconv>
#include <cmath>

namespace base {

namespace {

constexpr std::size_t blockSize = 256 * 1024;
constexpr i64 lineLength = 100;        ///< a line that flows ends with the first value beyond it
constexpr std::size_t numberRoom = 32; ///< for the text of any number
constexpr std::size_t indentation = 2;

constexpr string_view hexDigits = "0123456789abcdef";

/// What stands for each character behind a backslash: 0 for one that needs none, 'u' for the form
/// by code.
constexpr std::array<char, 256> escapes = [] {
    std::array<char, 256> table{};
    for (std::size_t c = 0; c < 0x20; ++c)
        table[c] = 'u';
    table['"'] = '"';
    table['\\'] = '\\';
    table['\b'] = 'b';
    table['\f'] = 'f';
    table['\n'] = 'n';
    table['\r'] = 'r';
    table['\t'] = 't';
    return table;
}();

char escapeOf(char c) {
    return escapes[static_cast<u8>(c)];
}

char* copy(string_view text, char* out) {
    std::memcpy(out, text.data(), text.size());
    return out + text.size();
}

template <class T>
char* putNumber(T value, char* out) {
    if constexpr (std::is_integral_v<T>) {
        return std::to_chars(out, out + numberRoom, value).ptr;
    } else {
        if (std::isnan(value))
            return copy("NaN", out);
        if (std::isinf(value))
            return copy(value < 0 ? "-Infinity" : "Infinity", out);
        if (value == 0) // "-0" would be an integer, which has no sign of zero
            return copy(std::signbit(value) ? "-0.0" : "0", out);
        // The shortest text of the greatest float lies beyond it, outside a reader's range. That of
        // 7.038531e-26 is, of all floats, the one that a double rounds onto the middle between two.
        if constexpr (std::is_same_v<T, float>)
            if (const float size = std::fabs(value);
                size == std::numeric_limits<float>::max() || size == 0x1.5c87fap-84f)
                return putNumber(double{value}, out);
        return std::to_chars(out, out + numberRoom, value).ptr;
    }
}

} // namespace

DataWriter::~DataWriter() = default;

JSONAttrWriter::JSONAttrWriter(Stream& stream)
    : stream_(stream), block_(new char[blockSize]), at_(block_.get()),
      blockEnd_(block_.get() + blockSize) {}

JSONAttrWriter::~JSONAttrWriter() = default;

void JSONAttrWriter::finish() {
    put("\n");
    flush();
}

void JSONAttrWriter::flush() {
    const std::size_t count = static_cast<std::size_t>(at_ - block_.get());
    written_ += count;
    if (written_ > GenericPullReader::maxTextLength)
        throw exception("The JSON form takes more than 1 GiB, which nothing reads. Use the binary "
                        "form.",
                        "b_attribute_json", "base::JSONAttrWriter", __LINE__);
    lineStart_ -= static_cast<i64>(count);
    at_ = block_.get();
    stream_.write(at_, count);
}

void JSONAttrWriter::put(string_view text) {
    require(text.size());
    at_ = copy(text, at_);
}

void JSONAttrWriter::newLine() {
    const std::size_t indent = levels_.size() * indentation;
    require(1);
    *at_++ = '\n';
    lineStart_ = at_ - block_.get();
    for (std::size_t done = 0; done < indent;) {
        const std::size_t count = std::min(indent - done, blockSize);
        require(count);
        std::memset(at_, ' ', count);
        at_ += count;
        done += count;
    }
}

bool JSONAttrWriter::isLineFull() const {
    return at_ - block_.get() - lineStart_ >= lineLength;
}

/// What stands between the values of a container, ahead of the next one.
void JSONAttrWriter::separate() {
    if (std::exchange(hasName_, false) || levels_.empty())
        return;
    Level& level = levels_.back();
    const bool isFirst = std::exchange(level.isEmpty, false);
    if (!isFirst)
        put(",");
    if (level.layout == DataLayout::lines || (!isFirst && isLineFull()))
        newLine();
    else if (!isFirst)
        put(" ");
}

void JSONAttrWriter::begin(char bracket, DataLayout layout) {
    separate();
    put({&bracket, 1});
    levels_.push_back({layout});
}

void JSONAttrWriter::end(char bracket) {
    const Level level = std::as_const(levels_).back();
    levels_.pop_back();
    if (!level.isEmpty && level.layout == DataLayout::lines)
        newLine();
    put({&bracket, 1});
}

void JSONAttrWriter::beginObject(DataLayout layout) {
    begin('{', layout);
}

void JSONAttrWriter::endObject() {
    end('}');
}

void JSONAttrWriter::beginArray(DataLayout layout) {
    begin('[', layout);
}

void JSONAttrWriter::endArray() {
    end(']');
}

void JSONAttrWriter::name(string_view text) {
    separate();
    putQuoted(text);
    put(": ");
    hasName_ = true;
}

void JSONAttrWriter::null() {
    separate();
    put("null");
}

void JSONAttrWriter::boolean(bool value) {
    separate();
    put(value ? "true" : "false");
}

void JSONAttrWriter::text(string_view value) {
    separate();
    putQuoted(value);
}

void JSONAttrWriter::real(float value) {
    separate();
    char number[numberRoom];
    const string_view text(number, static_cast<std::size_t>(putNumber(value, number) - number));
    put(text);
    if (text.find_first_not_of("-0123456789") == string_view::npos)
        put(".0");
}

void JSONAttrWriter::putQuoted(string_view text) {
    constexpr std::size_t longestEscape = 6;
    constexpr std::size_t pieceLength = blockSize / longestEscape;
    put("\"");
    while (!text.empty()) {
        const string_view piece = text.substr(0, pieceLength);
        text.remove_prefix(piece.size());
        require(piece.size() * longestEscape);
        char* at = at_;
        for (const char c : piece) {
            const char escape = escapeOf(c);
            if (!escape) {
                *at++ = c;
                continue;
            }
            *at++ = '\\';
            *at++ = escape;
            if (escape == 'u') {
                const auto code = static_cast<u8>(c);
                at = copy("00", at);
                *at++ = hexDigits[code >> 4];
                *at++ = hexDigits[code & 15];
            }
        }
        at_ = at;
    }
    put("\"");
}

void JSONAttrWriter::writeNumbers(NumberType type, const void* values, std::size_t count) {
    withNumberType(type, [&](auto* typed) {
        putNumbers(static_cast<decltype(typed)>(const_cast<void*>(values)), count);
    });
}

template <class T>
void JSONAttrWriter::putNumbers(const T* values, std::size_t count) {
    if (hasName_ || levels_.empty() || std::as_const(levels_).back().layout == DataLayout::lines) {
        for (std::size_t i = 0; i < count; ++i) {
            separate();
            require(numberRoom);
            at_ = putNumber(values[i], at_);
        }
        return;
    }
    for (std::size_t i = 0; i < count; ++i) {
        if (!std::exchange(levels_.back().isEmpty, false)) {
            require(2);
            *at_++ = ',';
            if (!isLineFull())
                *at_++ = ' ';
            else
                newLine();
        }
        require(numberRoom);
        at_ = putNumber(values[i], at_);
    }
}

} // namespace base
