#include "host/document_stream.h"

#include <algorithm>
#include <cstring>

namespace host {

namespace {

constexpr base::string_view dataPrefix = "data:";
constexpr std::size_t noMatch = dataPrefix.size() + 1;

} // namespace

void DocumentStream::fill() {
    before_ += end_;
    at_ = 0;
    end_ = static_cast<std::size_t>(source_.read(block_, std::min<base::u64>(unread_, blockSize)));
    unread_ = end_ == 0 ? 0 : unread_ - end_;
    block_[end_] = '\0';
}

/// Notes where strings begin and end, and skips those that hold data.
void DocumentStream::follow(char c) {
    if (!inString_) {
        inString_ = c == '"';
        matched_ = 0;
        skipped_ = inString_ ? 0 : skipped_;
    } else if (isEscaped_) {
        isEscaped_ = false;
        matched_ = noMatch;
    } else if (c == '\\') {
        isEscaped_ = true;
    } else if (c == '"') {
        inString_ = false;
    } else {
        matched_ = c == dataPrefix[matched_] ? matched_ + 1 : noMatch;
        if (matched_ == dataPrefix.size())
            skipString();
    }
    watchesNext_ = inString_ && (isEscaped_ || matched_ < dataPrefix.size());
}

/// Goes to the quote that ends the string.
void DocumentStream::skipString() {
    while (at_ < end_) {
        const char* begin = block_ + at_;
        const void* quote = std::memchr(begin, '"', end_ - at_);
        const std::size_t plain =
            quote ? static_cast<std::size_t>(static_cast<const char*>(quote) - begin) : end_ - at_;
        const void* escape = std::memchr(begin, '\\', plain);
        if (escape) {
            const auto length = static_cast<std::size_t>(static_cast<const char*>(escape) - begin);
            skipped_ += length + 2;
            at_ += length;
            advance(); // the backslash, which may be the last of its block
            advance(); // what it escapes
            continue;
        }
        skipped_ += plain;
        at_ += plain;
        if (quote)
            return;
        fill();
    }
}

} // namespace host
