#include "b_json_pull.h"

// The parser's empty stack computes with a null pointer, and where a number has an exponent, a zero
// or a sum of exponents may leave the range of its arithmetic. `EventRecorder` converts those
// numbers itself.
#ifdef __clang__
#pragma clang attribute push(                                                             \
    __attribute__((                                                                       \
        no_sanitize("pointer-overflow", "signed-integer-overflow", "builtin", "shift"))), \
    apply_to = function)
#endif
#include <rapidjson/error/en.h>
#include <rapidjson/reader.h>
#ifdef __clang__
#pragma clang attribute pop
#endif

#include <charconv>
#include <cmath>

namespace base {

namespace {

/// Bytes of known length; a read past the end gives zero bytes.
class TextSource {
public:
    using Ch = char;

    explicit TextSource(string_view text)
        : at_(text.data()), start_(text.data()), end_(text.data() + text.size()) {}
    Ch Peek() const { return at_ == end_ ? '\0' : *at_; }
    Ch Take() { return at_ == end_ ? '\0' : *at_++; }
    std::size_t Tell() const { return static_cast<std::size_t>(at_ - start_); }

    void skipBlanks() {
        while (at_ != end_ && (*at_ == ' ' || *at_ == '\n' || *at_ == '\r' || *at_ == '\t'))
            ++at_;
    }

    // The parser names these for parsing in place, which is not done here.
    Ch* PutBegin() { return nullptr; }
    void Put(Ch) {}
    void Flush() {}
    std::size_t PutEnd(Ch*) { return 0; }

private:
    const char* at_;
    const char* start_;
    const char* end_;
};

/// Found by the parser in place of its own, which is slower.
[[maybe_unused]] void SkipWhitespace(TextSource& source) {
    source.skipBlanks();
}

/// Memory of the parser's stack. A failed allocation throws, as everywhere else.
struct StackAllocator {
    static const bool kNeedFree = true;
    void* Malloc(std::size_t byteCount) { return Realloc(nullptr, 0, byteCount); }
    void* Realloc(void* block, std::size_t, std::size_t byteCount) {
        if (byteCount == 0) {
            std::free(block);
            return nullptr;
        }
        if (void* moved = std::realloc(block, byteCount))
            return moved;
        throw std::bad_alloc();
    }
    static void Free(void* block) noexcept { std::free(block); }
};

constexpr const char* tooBigText = "Number too big to be stored in double.";
constexpr const char* wordWithDigitsText = "Invalid value.";
constexpr const char* zeroByteText = "Zero byte in the text.";

} // namespace

/// Receives what the parser finds.
struct EventRecorder {
    using Event = GenericPullReader::Event;
    using Kind = GenericPullReader::Kind;

    GenericPullReader& reader;
    const TextSource& source;
    GrowingBlock<u32> open{}; ///< indices of the begin events without an end
    std::size_t openCount = 0;
    const char* fault = nullptr; ///< found in a number

    Event& add(Kind kind) {
        Event event{};
        event.offset = static_cast<u32>(source.Tell());
        event.kind = kind;
        return reader.events_.append(event);
    }

    bool Null() {
        add(Kind::null);
        return true;
    }
    bool Bool(bool value) {
        add(Kind::boolean).boolean = value;
        return true;
    }
    bool Int(int value) { return Int64(value); }
    bool Uint(unsigned value) { return Int64(value); }
    bool Int64(i64 value) {
        add(Kind::integer).integer = value;
        return true;
    }
    bool Uint64(u64 value) {
        if (value <= static_cast<u64>(std::numeric_limits<i64>::max()))
            return Int64(static_cast<i64>(value));
        add(Kind::natural).natural = value;
        return true;
    }
    bool Double(double value) {
        const string_view text = numberText();
        if (text.empty()) { // a word
            add(Kind::real).real = value;
            return true;
        }
        const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), value);
        if (end != text.data() + text.size() || isWordBefore(text)) {
            fault = wordWithDigitsText;
            return false;
        }
        if (error != std::errc() && !isTiny(text, value)) {
            fault = tooBigText;
            return false;
        }
        const bool isInteger = text.find_first_of(".eE") == string_view::npos;
        add(isInteger ? Kind::hugeReal : Kind::real).real = value;
        return true;
    }
    bool String(const char* text, rapidjson::SizeType length, bool) {
        return addText(Kind::text, text, length);
    }
    bool Key(const char* text, rapidjson::SizeType length, bool) {
        return addText(Kind::name, text, length);
    }
    bool RawNumber(const char*, rapidjson::SizeType, bool) { return false; }
    bool StartObject() { return begin(Kind::beginObject); }
    bool EndObject(rapidjson::SizeType count) { return end(count); }
    bool StartArray() { return begin(Kind::beginArray); }
    bool EndArray(rapidjson::SizeType count) { return end(count); }

private:
    static bool isOfNumber(char c) {
        return (c >= '0' && c <= '9') || c == '.' || c == '-' || c == '+' || (c | 0x20) == 'e';
    }

    /// The number that ends here, as it stands; empty for NaN and Infinity. The parser's own values
    /// are not exact, and wrong where they leave the range of double.
    string_view numberText() const {
        const std::size_t end = source.Tell();
        std::size_t start = end;
        while (start > 0 && isOfNumber(reader.text_[start - 1]))
            --start;
        return reader.text_.substr(start, end - start);
    }

    /// True for digits that go on behind NaN or Infinity, which the parser takes for one number.
    bool isWordBefore(string_view number) const {
        const char* const start = number.data();
        return start != reader.text_.data() &&
               ((start[-1] | 0x20) >= 'a' && (start[-1] | 0x20) <= 'z');
    }

    /// For a number that is no double: true, and a zero as `value`, if it is too small for one.
    static bool isTiny(string_view number, double& value) {
        long double wide = 0;
        const bool isFar =
            std::from_chars(number.data(), number.data() + number.size(), wide).ec != std::errc();
        // The parser has refused exponents that leave even this range upwards.
        value = number.front() == '-' ? -0.0 : 0.0;
        return isFar || std::fabs(wide) < 1;
    }

    bool addText(Kind kind, const char* text, std::size_t length) {
        Event& event = add(kind);
        // Without escapes the text stands in the source as it is, ahead of its closing quote.
        const std::size_t end = event.offset - 1u;
        const bool isPlain =
            length <= end && std::memcmp(reader.text_.data() + end - length, text, length) == 0;
        event.isDecoded = !isPlain;
        event.span.start = static_cast<u32>(isPlain ? end - length : reader.decoded_.size());
        event.span.length = static_cast<u32>(length);
        if (!isPlain) {
            std::memcpy(reader.decoded_.room(length), text, length);
            reader.decoded_.take(length);
        }
        return true;
    }

    bool begin(Kind kind) {
        const auto index = static_cast<u32>(reader.events_.size());
        add(kind);
        if (openCount == open.size())
            open.append(0);
        open[openCount++] = index;
        return true;
    }

    bool end(u32 length) {
        Event& first = reader.events_[open[--openCount]];
        first.block.end = static_cast<u32>(reader.events_.size());
        first.block.length = length;
        add(Kind::end);
        return true;
    }
};

GenericPullReader::Fault GenericPullReader::parse(string_view text) {
    constexpr unsigned flags = rapidjson::kParseIterativeFlag | rapidjson::kParseNanAndInfFlag;
    text_ = text;
    TextSource source(text);
    EventRecorder recorder{*this, source};
    rapidjson::GenericReader<rapidjson::UTF8<>, rapidjson::UTF8<>, StackAllocator> parser;
    const rapidjson::ParseResult result = parser.Parse<flags>(source, recorder);
    if (recorder.fault)
        return {result.Offset(), recorder.fault};
    if (result.IsError())
        return {result.Offset(), rapidjson::GetParseError_En(result.Code())};
    if (source.Tell() != text.size())
        return {source.Tell(), zeroByteText};
    recorder.add(Kind::end);
    return {};
}

u32 GenericPullReader::lineOf(std::size_t offset) const {
    offset = std::min(offset, text_.size());
    const auto linesBetween = [this](std::size_t from, std::size_t to) {
        return static_cast<u32>(std::count(text_.data() + from, text_.data() + to, '\n'));
    };
    if (offset < countedOffset_)
        countedLine_ -= linesBetween(offset, countedOffset_);
    else
        countedLine_ += linesBetween(countedOffset_, offset);
    countedOffset_ = offset;
    return countedLine_;
}

} // namespace base
