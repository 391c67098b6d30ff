#include "i_codec.h"

#include "b_log.h"

#include <algorithm>
#include <cstring>

namespace iio {

namespace {

constexpr std::size_t blockBytes = 65536;

/// A handle whose short transfers show in their counts.
base::Stream quietHandle(const base::Stream& stream) {
    base::Stream handle = stream;
    handle.setFlags(base::streamInitialFlags);
    return handle;
}

/// Keeps the text of what is being thrown. To be called in a handler.
void noteThrown(string& fault) noexcept {
    try {
        try {
            throw;
        } catch (const std::exception& error) {
            fault = error.what();
        } catch (...) {
            fault = "unknown fault of the stream";
        }
    } catch (...) {
        fault.clear(); // No memory for the text.
    }
}

/// Cuts what is too long.
template <std::size_t size>
void copyText(char (&target)[size], const char* text) noexcept {
    const std::size_t length = strnlen(text, size - 1);
    std::memcpy(target, text, length);
    target[length] = 0;
}

} // namespace

bool startsWith(const base::Stream& stream, std::span<const u8> bytes) {
    vector<u8> found(bytes.size());
    return quietHandle(stream).read(found.data(), found.size()) == found.size() &&
           std::equal(bytes.begin(), bytes.end(), found.begin());
}

StreamReader::StreamReader(const base::Stream& stream)
    : stream_(quietHandle(stream)), block_(blockBytes) {}

bool StreamReader::fill() noexcept {
    begin_ = end_ = 0;
    try {
        end_ = stream_.read(block_.data(), block_.size());
    } catch (...) {
        noteThrown(fault_);
    }
    return end_ != 0;
}

bool StreamReader::read(u8* target, std::size_t byteCount) noexcept {
    while (byteCount != 0) {
        if (size() == 0 && !fill())
            return false;
        const std::size_t count = std::min(byteCount, size());
        std::memcpy(target, data(), count);
        consume(count);
        target += count;
        byteCount -= count;
    }
    return true;
}

StreamWriter::StreamWriter(const base::Stream& stream)
    : stream_(quietHandle(stream)), block_(blockBytes) {}

bool StreamWriter::writeBlock(std::size_t byteCount) noexcept {
    try {
        return stream_.write(block_.data(), byteCount) == byteCount;
    } catch (...) {
        noteThrown(fault_);
        return false;
    }
}

bool StreamWriter::append(const u8* bytes, std::size_t byteCount) noexcept {
    while (byteCount != 0) {
        const std::size_t count = std::min(byteCount, size() - used_);
        std::memcpy(data() + used_, bytes, count);
        used_ += count;
        bytes += count;
        byteCount -= count;
        if (used_ == size() && !flush())
            return false;
    }
    return true;
}

bool StreamWriter::flush() noexcept {
    return writeBlock(std::exchange(used_, 0));
}

const char* StreamWriter::fault() const noexcept {
    return fault_.empty() ? "the file could not be written whole" : fault_.c_str();
}

void CodecMessages::setFault(const char* text) noexcept {
    copyText(fault_, text);
}

void CodecMessages::addWarning(const char* text) noexcept {
    if (warningCount_++ == 0)
        copyText(firstWarning_, text);
}

void CodecMessages::demoteFault() noexcept {
    addWarning(fault_);
    fault_[0] = 0;
}

void CodecMessages::logFault(const char* operation, const base::Stream& stream) const {
    if (fault_[0] != 0)
        base::log().log(base::logIO, base::logError, "{} |{}| {}", operation, stream.name(),
                        fault_);
}

void CodecMessages::logWarnings(const char* operation, const base::Stream& stream) const {
    if (warningCount_ == 1)
        base::log().log(base::logIO, base::logWarning, "{} |{}| {}", operation, stream.name(),
                        firstWarning_);
    else if (warningCount_ > 1)
        base::log().log(base::logIO, base::logWarning, "{} |{}| {} ({} warnings)", operation,
                        stream.name(), firstWarning_, warningCount_);
}

} // namespace iio
