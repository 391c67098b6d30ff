#pragma once

#include "b_config.h"
#include "b_containers.h"
#include "b_types.h"

#include <atomic>

/// Streams: small handles on counted workers through which every byte is read or written.
namespace base {

class Stream;
class StreamWorker;

/// What a worker can do, as mask values.
enum StreamCapability : u32 {
    streamReadable = 1,
    streamWritable = 2,
    streamSeekable = 4,
    streamResizable = 16,
};

/// Flags of a handle, as mask values.
enum StreamFlag : u32 {
    streamThrowOnShortRead = 1,
    streamThrowOnShortWrite = 2,
    streamInitialFlags = 4, ///< what a new handle has: neither check is on
};

enum class StreamOrigin : u32 { start = 0, current = 1, end = 2 };

/// The operations of a worker. Entries that a worker leaves unset throw `unsupported_interface`.
struct StreamOperations {
    /// Address of the whole content, for workers that lie in memory; good until the size changes.
    void* (*map)(StreamWorker&, u64& start, u64& size);
    /// Returns the bytes read, fewer at the end.
    u64 (*read)(StreamWorker&, void* destination, u64 byteCount);
    /// Returns the bytes written, fewer where there is no room.
    u64 (*write)(StreamWorker&, const void* source, u64 byteCount);
    /// Clamps to the content and returns the new position.
    u64 (*setPosition)(StreamWorker&, i64 offset, StreamOrigin origin);
    u64 (*getPosition)(StreamWorker&);
    u64 (*getSize)(StreamWorker&);
    /// A position past the new end moves there.
    void (*setSize)(StreamWorker&, u64 size);
    /// True when the position is at or past the size.
    bool (*atEnd)(StreamWorker&);
    void (*flush)(StreamWorker&);
    /// Ends the worker's use of its data. Called once, by the last handle.
    void (*close)(StreamWorker&);
    void (*reserved)(StreamWorker&);
    /// A new stream on the same data, at position 0.
    Stream (*clone)(StreamWorker&);
};

/// Transforms the bytes of a stream; a clone of the stream gets a clone of it.
class BASE1_API StreamCoder {
public:
    virtual ~StreamCoder();
    /// The caller owns the result.
    virtual StreamCoder* clone() const = 0;
};

/// A source or sink of bytes. Its own count starts at 1 and counts handles; the last handle
/// closes and deletes it. It has one position, so it is not shared between threads; only
/// handles may be dropped on any thread.
class BASE1_API StreamWorker {
public:
    StreamWorker(string name, u32 capabilities);
    StreamWorker(const StreamWorker&) = delete;
    StreamWorker& operator=(const StreamWorker&) = delete;
    virtual ~StreamWorker();

    StreamOperations operations; ///< every entry is set, at first to throw
    u32 capabilities;
    string name; ///< used in messages
    std::unique_ptr<StreamCoder> coder;

private:
    friend class Stream;
    std::atomic<i32> handles_{1};
};

/// Handle on a worker; copies share it. Using a closed handle is the caller's fault and is not
/// guarded.
class BASE1_API Stream {
public:
    Stream() noexcept = default;
    /// Takes over the count with which the worker was made.
    explicit Stream(StreamWorker* worker) noexcept : worker_(worker) {}
    Stream(const Stream& other) noexcept;
    Stream(Stream&& other) noexcept;
    Stream& operator=(Stream other) noexcept;
    ~Stream();

    bool isOpen() const noexcept { return worker_ != nullptr; }
    const string& name() const { return worker_->name; }
    u32 capabilities() const { return worker_->capabilities; }
    StreamWorker* worker() const noexcept { return worker_; }

    /// Returns the bytes read, fewer at the end. With `streamThrowOnShortRead` a short read
    /// throws `exception`.
    u64 read(void* destination, u64 byteCount);
    /// Returns the bytes written. With `streamThrowOnShortWrite` a short write throws
    /// `exception`.
    u64 write(const void* source, u64 byteCount);
    void* map(u64& start, u64& size) { return worker_->operations.map(*worker_, start, size); }
    /// Clamped to the content; returns the new position.
    u64 setPosition(i64 offset, StreamOrigin origin = StreamOrigin::start) {
        return worker_->operations.setPosition(*worker_, offset, origin);
    }
    u64 position() const { return worker_->operations.getPosition(*worker_); }
    u64 size() const { return worker_->operations.getSize(*worker_); }
    void setSize(u64 size) { worker_->operations.setSize(*worker_, size); }
    bool atEnd() const { return worker_->operations.atEnd(*worker_); }
    void flush() { worker_->operations.flush(*worker_); }
    /// A stream on the same data with a worker and a position of its own, at 0.
    Stream clone() const;
    /// Drops this handle. The last one closes the worker; what goes wrong then is logged.
    void close() noexcept;

    u32 flags() const noexcept { return flags_; }
    void setFlags(u32 flags) noexcept { flags_ = flags; }

    /// Copies from the present position of the source to its end. The source must be readable
    /// and the target writable, else `unsupported_interface`; a short transfer throws whatever
    /// the flags. Both return this stream.
    Stream& operator>>(Stream& target);
    Stream& operator<<(Stream& source);

private:
    StreamWorker* worker_ = nullptr;
    u64 state_[2] = {0, 0}; ///< kept for the handle's user, copied with it
    u32 flags_ = streamInitialFlags;
};

} // namespace base
