#pragma once

#include "b_factory.h"
#include "stream/b_stream_workers.h"

#include <algorithm>

/// What the tests of the binary form share: bytes put together by hand and streams of all kinds.
namespace test_support {

using Bytes = base::vector<base::u8>;

/// Builds the bytes of a file by hand, numbers with their low byte first.
class ByteList {
public:
    ByteList& u8(unsigned value) { return number(value, 1); }
    ByteList& u16(unsigned value) { return number(value, 2); }
    ByteList& u32(base::u64 value) { return number(value, 4); }
    /// Length and characters.
    ByteList& text(base::string_view text) {
        u32(text.size());
        return raw(text);
    }
    ByteList& raw(base::string_view text) {
        bytes_.append(text.begin(), text.end());
        return *this;
    }
    ByteList& add(const ByteList& other) {
        bytes_.append(other.bytes_.begin(), other.bytes_.end());
        return *this;
    }
    const Bytes& bytes() const { return bytes_; }
    unsigned size() const { return static_cast<unsigned>(bytes_.size()); }

private:
    ByteList& number(base::u64 value, int byteCount) {
        for (int i = 0; i < byteCount; ++i)
            bytes_.push_back(static_cast<base::u8>(value >> i * 8));
        return *this;
    }
    Bytes bytes_;
};

inline base::Stream viewOf(const Bytes& bytes, bool throwsOnShortRead = false) {
    base::Stream stream = base::memStreamView(bytes.data(), bytes.size(), "input");
    if (throwsOnShortRead)
        stream.setFlags(stream.flags() | base::streamThrowOnShortRead);
    return stream;
}

/// Reads or appends bytes, and can do nothing else.
class PipeWorker final : public base::StreamWorker {
public:
    explicit PipeWorker(Bytes& bytes)
        : StreamWorker("pipe", base::streamReadable | base::streamWritable), bytes_(bytes) {
        operations.read = [](StreamWorker& worker, void* destination, base::u64 byteCount) {
            auto& self = static_cast<PipeWorker&>(worker);
            const base::u64 count = std::min(byteCount, self.bytes_.size() - self.position_);
            std::copy_n(self.bytes_.cbegin() + self.position_, count,
                        static_cast<base::u8*>(destination));
            self.position_ += count;
            return count;
        };
        operations.write = [](StreamWorker& worker, const void* source, base::u64 byteCount) {
            const auto* first = static_cast<const base::u8*>(source);
            static_cast<PipeWorker&>(worker).bytes_.append(first, first + byteCount);
            return byteCount;
        };
        operations.close = [](StreamWorker&) {};
    }

private:
    Bytes& bytes_;
    base::u64 position_ = 0;
};

inline base::Stream pipeOf(Bytes& bytes) {
    return base::Stream(new PipeWorker(bytes));
}

inline Bytes written(const base::PluginFactory& factory) {
    Bytes bytes;
    base::Stream stream = base::vectorStream(bytes);
    factory.write(stream);
    return bytes;
}

} // namespace test_support
