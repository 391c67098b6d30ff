#include "GLTF/json_text.h"

#include "GLTF/json_writer.h"

#include <bit>

namespace GLTF {

namespace {

enum class Level : u8 { array, object };

// Text is searched and copied eight bytes at a time; the first byte of a word is its lowest.
static_assert(std::endian::native == std::endian::little);

constexpr u64 everyByte(char c) {
    return 0x0101010101010101u * static_cast<u8>(c);
}

/// Has its lowest set bit in the first zero byte of `word`, and is 0 if there is none.
constexpr u64 zeroBytes(u64 word) {
    return (word - everyByte('\x01')) & ~word & everyByte('\x80');
}

/// The same for the first byte that ends a plain run of a string.
constexpr u64 stringStops(u64 word) {
    return zeroBytes(word ^ everyByte('"')) | zeroBytes(word ^ everyByte('\\'));
}

/// The same for the first byte behind a number or literal; the brackets differ in one bit.
constexpr u64 scalarStops(u64 word) {
    return zeroBytes(word ^ everyByte(',')) |
           zeroBytes((word | everyByte('\x20')) ^ everyByte('}'));
}

/// Lays the text out while gathering it in a buffer for the sink.
class PrettyPrinter {
public:
    PrettyPrinter(string_view text, TextSink& sink)
        : begin_(text.data()), end_(begin_ + text.size()), sink_(sink) {}

    void print() {
        Position p{begin_, buffer_.data()};
        while (p.at != end_) {
            p.out = makeRoom(p.out);
            switch (*p.at) {
            case '{':
                p = open(p, Level::object);
                break;
            case '[':
                p = open(p, Level::array);
                break;
            case '}':
            case ']':
                p = close(p);
                break;
            case ',':
                p = separate(p);
                break;
            case '"':
                p = copyString(p);
                break;
            default:
                p = copyPlain(p, scalarStops);
            }
        }
        flush(p.out);
    }

private:
    /// The two ends of the work. Goes from step to step by value: as members, both would have to be
    /// read again after every store of a character, which may alias anything.
    struct Position {
        const char* at; ///< what is left of the text
        char* out;      ///< end of what the buffer holds
    };

    /// Free characters in front of each step, enough for what it writes without asking again.
    static constexpr std::ptrdiff_t stepRoom = 256;
    /// A piece from this length on goes to the sink from where it lies.
    static constexpr std::ptrdiff_t longPiece = 4096;

    char* flush(const char* out) {
        if (out != buffer_.data())
            sink_.write({buffer_.data(), static_cast<std::size_t>(out - buffer_.data())});
        return buffer_.data();
    }

    std::ptrdiff_t room(const char* out) const { return buffer_.data() + buffer_.size() - out; }

    char* makeRoom(char* out) { return room(out) < stepRoom ? flush(out) : out; }

    static Position take(Position p) {
        *p.out = *p.at;
        return {p.at + 1, p.out + 1};
    }

    /// One tab a level, sixteen at a time.
    char* newLine(char* out) {
        static constexpr char tabs[] = "\t\t\t\t\t\t\t\t\t\t\t\t\t\t\t\t";
        *out++ = '\n';
        std::size_t left = levels_.size();
        for (; left > 16; left -= 16) {
            std::memcpy(out, tabs, 16);
            out = makeRoom(out + 16);
        }
        std::memcpy(out, tabs, 16);
        return out + left;
    }

    Position open(Position p, Level level) {
        p = take(p);
        if (p.at != end_ && (*p.at == '}' || *p.at == ']'))
            return take(p);
        levels_.push_back(level);
        if (level == Level::object)
            p.out = newLine(p.out);
        return p;
    }

    Position close(Position p) {
        levels_.pop_back();
        p.out = newLine(p.out);
        return take(p);
    }

    Position separate(Position p) {
        p = take(p);
        if (!levels_.empty() && std::as_const(levels_).back() == Level::object)
            p.out = newLine(p.out);
        return p;
    }

    /// Copies up to the first stop, the end of the text or half of the step's room.
    template <class Stops>
    Position copyPlain(Position p, Stops stops) const {
        const char* const limit = p.at + std::min(end_ - p.at, stepRoom / 2);
        while (limit - p.at >= 8) {
            u64 word;
            std::memcpy(&word, p.at, 8);
            std::memcpy(p.out, &word, 8);
            const u64 found = stops(word);
            const int count = found == 0 ? 8 : std::countr_zero(found) / 8;
            p.at += count;
            p.out += count;
            if (found != 0)
                return p;
        }
        while (p.at != limit && (stops(static_cast<u8>(*p.at)) & 0x80) == 0)
            p = take(p);
        return p;
    }

    /// Copies short strings by the word, the rest of a long one as a block.
    Position copyString(Position p) {
        const char* const quote = p.at;
        p = copyPlain(take(p), stringStops);
        if (p.at != end_ && *p.at == '"')
            p = take(p);
        else
            p = copyBlock(p, stringEnd(quote, p.at));
        if (p.at != end_ && *p.at == ':') {
            p = take(p);
            *p.out++ = ' ';
        }
        return p;
    }

    /// Behind the closing quote of the string that starts at `quote`; it does not lie before
    /// `from`.
    const char* stringEnd(const char* quote, const char* from) const {
        while (const void* found = std::memchr(from, '"', static_cast<std::size_t>(end_ - from))) {
            const char* const close = static_cast<const char*>(found);
            const char* before = close;
            while (before[-1] == '\\' && before - 1 != quote)
                --before;
            from = close + 1;
            if ((close - before) % 2 == 0)
                return from;
        }
        return end_;
    }

    Position copyBlock(Position p, const char* blockEnd) {
        const std::ptrdiff_t length = blockEnd - p.at;
        if (length >= longPiece || length > room(p.out))
            p.out = flush(p.out);
        if (length >= longPiece) {
            sink_.write({p.at, static_cast<std::size_t>(length)});
        } else {
            std::memcpy(p.out, p.at, static_cast<std::size_t>(length));
            p.out += length;
        }
        return {blockEnd, makeRoom(p.out)};
    }

    const char* const begin_;
    const char* const end_;
    TextSink& sink_;
    vector<Level> levels_; ///< that are open
    std::array<char, 1 << 16> buffer_;
};

} // namespace

struct JsonText::Impl {
    TextBuffer text;
};

JsonText::JsonText(Asset& asset, const Options& options) : impl_(std::make_unique<Impl>()) {
    JsonWriter writer(impl_->text);
    writer.startObject();
    asset.writeJSON(writer, options);
    writer.endObject();
}

JsonText::~JsonText() = default;

string_view JsonText::view() const noexcept {
    return {impl_->text.stack_.Bottom<char>(), impl_->text.GetSize()};
}

void writePretty(string_view compact, TextSink& sink) {
    PrettyPrinter(compact, sink).print();
}

} // namespace GLTF
