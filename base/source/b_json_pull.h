#pragma once

#include "b_containers.h"
#include "b_types.h"

#include <cstdlib>

/// Parsing of JSON text into a list of events that can be walked at will.
namespace base {

/// Memory that grows where it lies if it can, and is not touched ahead of its use.
template <class T>
class GrowingBlock {
    static_assert(std::is_trivially_copyable_v<T>);

public:
    GrowingBlock() = default;
    GrowingBlock(const GrowingBlock&) = delete;
    GrowingBlock& operator=(const GrowingBlock&) = delete;
    ~GrowingBlock() { std::free(data_); }

    std::size_t size() const noexcept { return size_; }
    T* data() noexcept { return data_; }
    const T* data() const noexcept { return data_; }
    T& operator[](std::size_t i) noexcept { return data_[i]; }
    const T& operator[](std::size_t i) const noexcept { return data_[i]; }
    T& append(const T& value) {
        if (size_ == capacity_)
            reserve(size_ + 1);
        return data_[size_++] = value;
    }
    /// Room for `count` elements more behind the last, which `take` then adds.
    T* room(std::size_t count) {
        if (capacity_ - size_ < count)
            reserve(size_ + count);
        return data_ + size_;
    }
    void take(std::size_t count) noexcept { size_ += count; }

private:
    void reserve(std::size_t count) {
        const std::size_t wanted = std::max({count, capacity_ + capacity_ / 2, std::size_t{64}});
        void* moved = std::realloc(static_cast<void*>(data_), wanted * sizeof(T));
        if (!moved)
            throw std::bad_alloc();
        data_ = static_cast<T*>(moved);
        capacity_ = wanted;
    }

    T* data_ = nullptr;
    std::size_t size_ = 0;
    std::size_t capacity_ = 0;
};

/// One parse of a whole text records its events, each of 16 bytes; walking them knows where every
/// array and object ends.
class GenericPullReader {
public:
    enum class Kind : u8 {
        end, ///< of an array, an object or the document
        name,
        null,
        boolean,
        integer,  ///< fits into i64
        natural,  ///< only fits into u64
        hugeReal, ///< an integer that fits into neither, as a real number
        real,
        text,
        beginArray,
        beginObject,
    };

    struct Event {
        u32 offset; ///< in the text, behind what made the event
        Kind kind;
        bool isDecoded; ///< the text lies in the decoded texts, not in the source
        union {
            bool boolean;
            i64 integer;
            u64 natural;
            double real;
            struct {
                u32 start, length;
            } span;
            struct {
                u32 end, length; ///< index of the end event; elements or members
            } block;
        };
    };
    static_assert(sizeof(Event) == 16);

    struct Fault {
        std::size_t offset = 0;
        const char* text = nullptr; ///< null if there is none
    };

    static constexpr std::size_t maxTextLength = std::size_t{1} << 30;

    /// The text, of at most `maxTextLength` bytes, is borrowed.
    Fault parse(string_view text);

    const Event& event() const noexcept { return events_[at_]; }
    const Event* events() const noexcept { return events_.data() + at_; }
    u32 place() const noexcept { return at_; }
    void setPlace(u32 place) noexcept { at_ = place; }
    void next() noexcept {
        if (event().kind != Kind::end)
            ++at_;
    }
    /// Steps over the value here with all that is in it.
    void skip() noexcept {
        if (event().kind == Kind::beginArray || event().kind == Kind::beginObject)
            at_ = event().block.end + 1;
        else
            next();
    }
    string_view textOf(const Event& event) const noexcept {
        const char* from = event.isDecoded ? decoded_.data() : text_.data();
        return {from + event.span.start, event.span.length};
    }
    /// Line, from 1, that an offset lies in.
    u32 lineOf(std::size_t offset) const;

private:
    friend struct EventRecorder;
    string_view text_;
    GrowingBlock<Event> events_;
    GrowingBlock<char> decoded_; ///< texts that had escapes
    u32 at_ = 0;
    // Messages stand close to each other in the text: the last answer shortens the next count.
    mutable std::size_t countedOffset_ = 0;
    mutable u32 countedLine_ = 1;
};

} // namespace base
