#include "stream/b_stream_workers.h"

#include "b_exception.h"
#include "b_format.h"
#include "b_worker_table.h"

#include <algorithm>
#include <limits>

namespace base {

u64 seekTarget(i64 offset, StreamOrigin origin, const SeekBases& bases, const char* function) {
    u64 from = 0;
    switch (origin) {
    case StreamOrigin::start:
        from = bases.start;
        break;
    case StreamOrigin::current:
        from = bases.current;
        break;
    case StreamOrigin::end:
        from = bases.end;
        break;
    default:
        throw switch_exception("b_stream", function, __LINE__);
    }
    if (offset < 0) {
        const u64 back = ~static_cast<u64>(offset) + 1;
        return back < from ? from - back : 0;
    }
    return from + std::min(static_cast<u64>(offset), std::numeric_limits<u64>::max() - from);
}

namespace {

/// What the workers have in common that keep a position of their own within their content.
class PositionedWorker : public StreamWorker {
public:
    using StreamWorker::StreamWorker;
    u64 setPosition(i64 offset, StreamOrigin origin) {
        const u64 size = operations.getSize(*this);
        const SeekBases bases{0, position_, size};
        position_ = std::min(seekTarget(offset, origin, bases, "base::memSetPosition"), size);
        return position_;
    }
    u64 getPosition() { return position_; }
    bool atEnd() { return position_ >= operations.getSize(*this); }
    void flush() {}

protected:
    u64 position_ = 0;
};

/// A container of bytes, shared with the workers of clones; one of the caller's is not owned.
template <class Container>
class ContainerStreamWorker final : public PositionedWorker {
    using Byte = typename Container::value_type;

public:
    ContainerStreamWorker(std::shared_ptr<Container> content, string workerName,
                          u32 workerCapabilities)
        : PositionedWorker(std::move(workerName), workerCapabilities),
          content_(std::move(content)) {
        const StreamOperations unset = operations;
        bindOperations(*this);
        if ((capabilities & streamWritable) == 0)
            operations.write = unset.write;
        if ((capabilities & streamResizable) == 0)
            operations.setSize = unset.setSize;
    }

    void* map(u64& start, u64& size) {
        start = 0;
        size = getSize();
        return const_cast<Byte*>(bytes());
    }

    u64 read(void* destination, u64 byteCount) {
        const u64 size = getSize();
        if (position_ >= size || byteCount == 0)
            return 0;
        const u64 count = std::min(byteCount, size - position_);
        std::memcpy(destination, bytes() + position_, count);
        position_ += count;
        return count;
    }

    u64 write(const void* source, u64 byteCount) {
        if (byteCount == 0)
            return 0;
        // Another handle's worker may have cut the content below the position.
        if (position_ > getSize())
            content_->resize(position_);
        const Byte* first = static_cast<const Byte*>(source);
        const u64 overlap = std::min(byteCount, getSize() - position_);
        if (overlap != 0)
            std::memcpy(content_->data() + position_, first, overlap);
        content_->append(first + overlap, first + byteCount);
        position_ += byteCount;
        return byteCount;
    }

    u64 getSize() { return content_->size(); }

    void setSize(u64 size) {
        content_->resize(size);
        position_ = std::min(position_, size);
    }

    void close() { content_.reset(); }

    Stream clone() { return Stream(new ContainerStreamWorker(content_, name, capabilities)); }

private:
    const Byte* bytes() const { return std::as_const(*content_).data(); }

    std::shared_ptr<Container> content_;
};

using VectorStreamWorker = ContainerStreamWorker<vector<u8>>;
using StringStreamWorker = ContainerStreamWorker<string>;
/// A block is a vector of the worker's own, foreign memory a view of it.
using MemStreamWorker = VectorStreamWorker;

/// A pointer that shares nothing, for a container that belongs to the caller.
template <class Container>
std::shared_ptr<Container> borrowed(Container& container) {
    return std::shared_ptr<Container>(std::shared_ptr<void>(), &container);
}

constexpr u32 memBlockCapabilities = growingMemoryCapabilities & ~u32{streamResizable};

class MemBlockStreamWorker final : public PositionedWorker {
public:
    MemBlockStreamWorker(MemBlock* first, string workerName)
        : PositionedWorker(std::move(workerName), memBlockCapabilities), first_(first),
          block_(first) {
        bindOperations(*this);
    }

    u64 read(void* destination, u64 byteCount) {
        return walk(byteCount, [&](void* at, u64 done, u64 count) {
            std::memcpy(static_cast<u8*>(destination) + done, at, count);
        });
    }

    u64 write(const void* source, u64 byteCount) {
        return walk(byteCount, [&](void* at, u64 done, u64 count) {
            std::memcpy(at, static_cast<const u8*>(source) + done, count);
        });
    }

    u64 setPosition(i64 offset, StreamOrigin origin) {
        const u64 target = PositionedWorker::setPosition(offset, origin);
        block_ = first_;
        offset_ = position_ = 0;
        return walk(target, [](void*, u64, u64) {});
    }

    u64 getSize() {
        u64 size = 0;
        for (const MemBlock* block = first_; block; block = block->next)
            size += block->byteCount;
        return size;
    }

    void setSize(u64) {
        throw exception("memBlockStream do not support resizing!", "b_stream",
                        "base::memBlockSetSize", __LINE__);
    }

    void close() { first_ = block_ = nullptr; }

    Stream clone() { return Stream(new MemBlockStreamWorker(first_, name)); }

private:
    /// Hands `use` up to `byteCount` bytes in one piece for each block and moves behind them.
    template <class Use>
    u64 walk(u64 byteCount, Use use) {
        u64 done = 0;
        while (block_ && done < byteCount) {
            const u64 count = std::min(byteCount - done, block_->byteCount - offset_);
            if (count != 0)
                use(static_cast<u8*>(block_->data) + offset_, done, count);
            done += count;
            offset_ += count;
            if (offset_ == block_->byteCount) {
                block_ = block_->next;
                offset_ = 0;
            }
        }
        position_ += done;
        return done;
    }

    MemBlock* first_;
    MemBlock* block_; ///< null at the end
    u64 offset_ = 0;  ///< within the block
};

i64 asOffset(u64 position) {
    return static_cast<i64>(std::min(position, u64{std::numeric_limits<i64>::max()}));
}

/// Lies on the parent's position: there is none of its own.
class SubStreamWorker final : public StreamWorker {
public:
    SubStreamWorker(const Stream& parent, u64 start, u64 length)
        : StreamWorker(parent.name(), parent.capabilities() & ~u32{streamResizable}),
          parent_(parent), start_(start), length_(length) {
        bindOperations(*this);
        parent_.setPosition(asOffset(start_));
    }

    u64 read(void* destination, u64 byteCount) {
        return parent_.read(destination, std::min(byteCount, enterWindow()));
    }

    u64 write(const void* source, u64 byteCount) {
        return parent_.write(source, std::min(byteCount, enterWindow()));
    }

    u64 setPosition(i64 offset, StreamOrigin origin) {
        const SeekBases bases{start_, parent_.position(), start_ + length_};
        const u64 target = seekTarget(offset, origin, bases, "base::subSetPosition");
        parent_.setPosition(asOffset(clampedToWindow(target)));
        return getPosition();
    }

    u64 getPosition() {
        const u64 position = parent_.position();
        return position > start_ ? position - start_ : 0;
    }

    u64 getSize() { return length_; }

    bool atEnd() { return getPosition() >= length_; }

    void flush() { parent_.flush(); }

    void close() { parent_.close(); }

    Stream clone() { return Stream(new SubStreamWorker(parent_.clone(), start_, length_)); }

private:
    u64 clampedToWindow(u64 position) const {
        return std::clamp(position, start_, start_ + length_);
    }

    /// Moves the parent into the window if it was left elsewhere; returns the bytes that follow.
    u64 enterWindow() {
        const u64 position = parent_.position();
        const u64 inside = clampedToWindow(position);
        if (inside != position)
            parent_.setPosition(asOffset(inside));
        return start_ + length_ - inside;
    }

    Stream parent_;
    u64 start_;
    u64 length_;
};

/// The buffer holds the bytes of the inner stream from `start_` on: those read ahead, or those
/// that wait to be written.
class BufStreamWorker final : public StreamWorker {
public:
    BufStreamWorker(const Stream& inner, u64 byteCount, BufferMode mode)
        : StreamWorker(inner.name(), inner.capabilities() & ~removedCapabilities(mode)),
          inner_(inner), mode_(mode), start_(inner.position()) {
        buffer_.resizeUninitialized(byteCount);
        const StreamOperations unset = operations;
        bindOperations(*this);
        if (mode_ == BufferMode::read)
            operations.write = unset.write;
        else
            operations.read = unset.read;
    }

    u64 read(void* destination, u64 byteCount) {
        u8* out = static_cast<u8*>(destination);
        u64 done = 0;
        while (done < byteCount) {
            if (cursor_ == filled_ && !fill(out, done, byteCount))
                break;
            const u64 count = std::min(byteCount - done, filled_ - cursor_);
            if (count != 0)
                std::memcpy(out + done, buffer_.data() + cursor_, count);
            cursor_ += count;
            done += count;
        }
        return done;
    }

    u64 write(const void* source, u64 byteCount) {
        if (byteCount > buffer_.size() - filled_)
            drain();
        if (filled_ == 0 && byteCount >= buffer_.size()) {
            const u64 put = inner_.write(source, byteCount);
            start_ += put;
            return put;
        }
        const u64 count = std::min(byteCount, buffer_.size() - filled_);
        if (count != 0)
            std::memcpy(buffer_.data() + filled_, source, count);
        filled_ += count;
        if (filled_ == buffer_.size())
            drain();
        return count;
    }

    u64 setPosition(i64 offset, StreamOrigin origin) {
        const u64 size = getSize();
        const SeekBases bases{0, getPosition(), size};
        const u64 target =
            std::min(seekTarget(offset, origin, bases, "base::bufSetPosition"), size);
        if (mode_ == BufferMode::write) {
            drain();
            if (filled_ != 0)
                return getPosition(); // what could not be written belongs here
        } else if (target >= start_ && target - start_ <= filled_) {
            cursor_ = target - start_;
            return target;
        }
        cursor_ = filled_ = 0;
        start_ = inner_.setPosition(asOffset(target));
        return start_;
    }

    u64 getPosition() { return start_ + (mode_ == BufferMode::read ? cursor_ : filled_); }

    u64 getSize() {
        return mode_ == BufferMode::read ? inner_.size()
                                         : std::max(inner_.size(), start_ + filled_);
    }

    bool atEnd() { return getPosition() >= getSize(); }

    void flush() {
        if (mode_ == BufferMode::write && filled_ != 0)
            drain();
        else
            inner_.flush();
    }

    void close() {
        if (mode_ == BufferMode::write)
            drain();
        inner_.close();
    }

    Stream clone() {
        if (mode_ == BufferMode::write)
            drain();
        Stream inner = inner_.clone();
        inner.setFlags(inner_.flags());
        return Stream(new BufStreamWorker(inner, buffer_.size(), mode_));
    }

private:
    static u32 removedCapabilities(BufferMode mode) {
        return streamResizable | (mode == BufferMode::read ? streamWritable : streamReadable);
    }

    /// Reads on into the empty buffer, or straight into `out` what would fill it anyway. False
    /// at the end. The inner stream's check is left out: to find less than a buffer full is no
    /// fault.
    bool fill(u8* out, u64& done, u64 byteCount) {
        StreamWorker& inner = *inner_.worker();
        start_ += filled_;
        cursor_ = filled_ = 0;
        if (byteCount - done >= buffer_.size()) {
            const u64 got = inner.operations.read(inner, out + done, byteCount - done);
            start_ += got;
            done += got;
            return got != 0;
        }
        filled_ = inner.operations.read(inner, buffer_.data(), buffer_.size());
        return filled_ != 0;
    }

    /// Writes the pending bytes. What a short write leaves stays pending; if it throws, they are
    /// given up, so that closing does not write them a second time.
    void drain() {
        if (filled_ == 0)
            return;
        const u64 pending = std::exchange(filled_, 0);
        const u64 put = inner_.write(buffer_.data(), pending);
        start_ += put;
        filled_ = pending - put;
        std::memmove(buffer_.data(), buffer_.data() + put, filled_);
        inner_.flush();
    }

    Stream inner_;
    vector<u8> buffer_;
    BufferMode mode_;
    u64 start_;
    u64 filled_ = 0;
    u64 cursor_ = 0; ///< within the buffer, when reading
};

} // namespace

Stream memStream(u64 byteCount, string name) {
    return Stream(new MemStreamWorker(std::make_shared<vector<u8>>(byteCount), std::move(name),
                                      growingMemoryCapabilities));
}

Stream memStream(Stream& source) {
    if ((source.capabilities() & streamSeekable) != 0)
        source.setPosition(0);
    auto content = std::make_shared<vector<u8>>();
    content->resizeUninitialized(source.size());
    content->resize(source.read(content->data(), content->size()));
    return Stream(
        new MemStreamWorker(std::move(content), source.name(), growingMemoryCapabilities));
}

Stream memStreamView(const void* data, u64 byteCount, string name) {
    auto content =
        std::make_shared<vector<u8>>(vector<u8>::view(static_cast<const u8*>(data), byteCount));
    return Stream(new MemStreamWorker(std::move(content), std::move(name), memoryViewCapabilities));
}

Stream memBlockStream(MemBlock* first, string name) {
    return Stream(new MemBlockStreamWorker(first, std::move(name)));
}

Stream vectorStream(vector<u8>& bytes, string name) {
    return Stream(
        new VectorStreamWorker(borrowed(bytes), std::move(name), growingMemoryCapabilities));
}

Stream stringStream(string& text, string name) {
    return Stream(
        new StringStreamWorker(borrowed(text), std::move(name), growingMemoryCapabilities));
}

Stream subStream(Stream& parent, u64 offset, u64 length) {
    const u64 size = parent.size();
    if (offset > size)
        throw exception(format("empty substream of '{}'!", parent.name()), "b_stream",
                        "base::subStream", __LINE__);
    return Stream(new SubStreamWorker(parent, offset, std::min(length, size - offset)));
}

Stream bufferedStream(Stream& inner, u64 byteCount, BufferMode mode) {
    return Stream(new BufStreamWorker(inner, byteCount, mode));
}

} // namespace base
