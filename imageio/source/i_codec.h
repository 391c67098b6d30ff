#pragma once

#include "i_image_types.h"

#include "stream/b_stream.h"

#include <span>

/// What stands between the C libraries that pack and unpack pictures and our streams and log.
///
/// Such a library leaves a failed call by a jump out of its callbacks. So whatever these call does
/// not throw, and nothing that has a destructor lives in the frames that are jumped over.
namespace iio {

/// Whether the next bytes of the stream are these; moves its position.
bool startsWith(const base::Stream& stream, std::span<const u8> bytes);

/// Reads a stream in large blocks, from its position on; that stands somewhere behind the bytes
/// that were asked for then.
class StreamReader {
public:
    explicit StreamReader(const base::Stream& stream);

    /// The bytes at hand that were not consumed yet.
    const u8* data() const noexcept { return block_.data() + begin_; }
    std::size_t size() const noexcept { return end_ - begin_; }
    void consume(std::size_t byteCount) noexcept { begin_ += byteCount; }

    /// Replaces what is at hand by the next block. False at the end and on a fault.
    bool fill() noexcept;
    /// Copies the next bytes. False if there are fewer, or on a fault.
    bool read(u8* target, std::size_t byteCount) noexcept;
    /// What the stream threw; empty if it just ended.
    const string& fault() const noexcept { return fault_; }

private:
    base::Stream stream_; ///< a handle of our own: its flags make no short read throw
    vector<u8> block_;
    std::size_t begin_ = 0, end_ = 0;
    string fault_;
};

/// Collects what is written and hands it to a stream in large blocks.
class StreamWriter {
public:
    explicit StreamWriter(const base::Stream& stream);

    /// The block itself, for libraries that fill it on their own.
    u8* data() noexcept { return block_.data(); }
    std::size_t size() const noexcept { return block_.size(); }
    /// Writes the first `byteCount` bytes of the block. False if they don't all fit.
    bool writeBlock(std::size_t byteCount) noexcept;

    /// These collect first. False as above.
    bool append(const u8* bytes, std::size_t byteCount) noexcept;
    bool flush() noexcept;

    /// Why writing failed.
    const char* fault() const noexcept;

private:
    base::Stream stream_;
    vector<u8> block_;
    std::size_t used_ = 0;
    string fault_;
};

/// What a library says while it works; keeps the fault that ended it and the first warning, cut
/// to a fixed length.
class CodecMessages {
public:
    void setFault(const char* text) noexcept;
    void addWarning(const char* text) noexcept;
    /// The fault came when all was done: counts as a warning.
    void demoteFault() noexcept;

    /// One line of level 2, as "png load |path| text"; none if there was no fault.
    void logFault(const char* operation, const base::Stream& stream) const;
    /// One line of level 3; none if there was no warning.
    void logWarnings(const char* operation, const base::Stream& stream) const;

private:
    char fault_[256] = "";
    char firstWarning_[256] = "";
    u32 warningCount_ = 0;
};

} // namespace iio
