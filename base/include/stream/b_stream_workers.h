#pragma once

#include "stream/b_stream.h"

/// The workers that lie in memory or stand on another stream.
namespace base {

/// Capability words of memory streams.
constexpr u32 growingMemoryCapabilities = 127;
constexpr u32 memoryViewCapabilities = 109;

// Workers of clones share the block, the chain or the container with the original's.

/// A zero-filled block of `byteCount` bytes that the stream owns and grows, at position 0.
BASE1_API Stream memStream(u64 byteCount, string name = "memory");
/// An owned copy of the whole content of `source`, which is read in one go (from its start, if it
/// can seek) and then stands at its end. With `streamThrowOnShortRead` on `source` a short read
/// throws; else the copy ends there.
BASE1_API Stream memStream(Stream& source);
/// A read-only view of foreign memory, which must outlive the stream.
BASE1_API Stream memStreamView(const void* data, u64 byteCount, string name);

/// One block of a chain of foreign memory.
struct MemBlock {
    void* data;
    u64 byteCount;
    MemBlock* next;
};
/// Reads and writes a chain of foreign blocks, which must outlive the stream; it can't grow.
BASE1_API Stream memBlockStream(MemBlock* first, string name);

/// Reads, overwrites and grows a container of the caller's, which must outlive the stream. The
/// position starts at 0.
BASE1_API Stream vectorStream(vector<u8>& bytes, string name = "vector");
BASE1_API Stream stringStream(string& text, string name = "string");

/// A window of `parent`, which it keeps open and whose position it uses: that is moved to the
/// window's start here, and two windows at work need a clone each. `length` is cut to the bytes
/// that remain. Throws `exception` if `offset` lies past the parent's end.
BASE1_API Stream subStream(Stream& parent, u64 offset, u64 length);

enum class BufferMode : u32 { read, write };
/// A buffer of `byteCount` bytes in front of `inner`, which it keeps open; positions are those of
/// `inner`. Pending bytes go out in one write when the buffer is full, on `flush`, on seeking and
/// on closing, and `inner` is flushed; the flags of `inner` at creation decide whether a short
/// write throws then.
BASE1_API Stream bufferedStream(Stream& inner, u64 byteCount, BufferMode mode);

} // namespace base
