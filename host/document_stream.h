#pragma once

#include "stream/b_stream.h"

namespace host {

/// Input of a JSON reader that lets only the first bytes of embedded data through: of a string
/// that begins with "data:" everything behind these five bytes is left out and counted. So a
/// document is read in the memory of one block, however much data it embeds.
class DocumentStream {
public:
    using Ch = char;

    /// The next `length` bytes of `source`.
    DocumentStream(base::Stream source, base::u64 length)
        : source_(std::move(source)), unread_(length) {
        fill();
    }

    /// Bytes left out of the string that was read last.
    base::u64 skipped() const noexcept { return skipped_; }

    // What the reader asks for. The end is a zero.
    Ch Peek() const { return block_[at_]; }
    Ch Take() {
        const char c = block_[at_];
        advance();
        if (c == '"' || c == '\\' || watchesNext_)
            follow(c);
        return c;
    }
    std::size_t Tell() const { return static_cast<std::size_t>(before_ + at_); }
    // For readers that write into their input.
    Ch* PutBegin() { return nullptr; }
    void Put(Ch) {}
    std::size_t PutEnd(Ch*) { return 0; }

private:
    void fill();
    void advance() {
        if (++at_ >= end_)
            fill();
    }
    void follow(char c);
    void skipString();

    static constexpr std::size_t blockSize = std::size_t(1) << 15;

    base::Stream source_;
    base::u64 unread_;     ///< bytes of the source that are in no block yet
    base::u64 before_ = 0; ///< bytes in front of the block
    char block_[blockSize + 1];
    std::size_t at_ = 0;
    std::size_t end_ = 0;

    bool inString_ = false;
    bool isEscaped_ = false;
    bool watchesNext_ = false; ///< the next byte is of interest, whatever it is
    std::size_t matched_ = 0;  ///< bytes of "data:" that the string began with; too many for none
    base::u64 skipped_ = 0;
};

} // namespace host
