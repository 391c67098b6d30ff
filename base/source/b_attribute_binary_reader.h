#pragma once

#include "b_attribute_binary.h"
#include "b_attribute_map.h"
#include "stream/b_stream.h"

/// Reading the binary form, inside the library. Nothing that is read is trusted: each payload is a
/// limit for all within it, and memory is taken for bytes that are known to be there.
namespace base {

/// What a stored type name stands for.
struct BinaryType {
    name_id type;    ///< absent if it is unknown
    name_id mapType; ///< the own name of a map's type
};

struct BinaryReadState {
    u64 left = 0; ///< bytes of the innermost payload that are not read yet
    bool canSeek = false;
    u32 depth = 0;
    bool hasNameTable = false; ///< else names stand as text wherever they are used
    vector<name_id> names;
    AttribFactory* attributeFactory = &attribFactory();
    hash_map<name_id, BinaryType> types; ///< those that were met, by their stored names
};

class BinaryReader : public NonCopyable {
public:
    /// Begins a call if `options` have none under way, which this object then ends.
    BinaryReader(Stream& stream, BinaryReadOptions& options);
    ~BinaryReader();

    BinaryReadState& state() noexcept { return *options_.state; }

    // All are false if the data ended first.

    bool bytes(void* destination, u64 byteCount);
    /// True if so many bytes follow, as far as that can be known.
    bool has(u64 byteCount);
    template <class T>
    bool number(T& value) {
        static_assert(std::is_arithmetic_v<T>);
        return bytes(&value, sizeof value);
    }
    /// Throws `exception` if there are more than `maxLength`.
    bool text(string& text, u32 maxLength, const char* tooLong);
    bool text(string& text);
    /// Absent for a name that holds a zero byte and for a number that the table does not have.
    bool name(name_id& name);
    /// Fills `values` with up to `count` values as they lie in memory: with those that are whole.
    template <class T>
    bool values(vector<T>& values, u32 count);
    bool skip(u64 byteCount);

    /// Calls `read`, limited to the next `byteCount` bytes, and goes on behind them whatever it
    /// left. False if they are not all there.
    template <class Read>
    bool payload(u32 byteCount, Read read);

    /// What a stored type name means to the attributes' factory.
    const BinaryType& resolve(name_id storedType);
    /// Makes an attribute of a known type. Throws `exception` if its creator gives none.
    std::unique_ptr<Attribute> make(const BinaryType& type);
    /// The object that a stored id means; null, with a message unless it is that of none, if there
    /// is no such object.
    IPlugin* object(u32 storedId) const;

    /// Counts the levels of maps and arrays while it lives.
    class Level : public NonCopyable {
    public:
        explicit Level(BinaryReader& reader);
        ~Level() { --state_.depth; }

    private:
        BinaryReadState& state_;
    };

private:
    /// Throws if the stream asks for that.
    void reportShortRead(u64 byteCount);

    Stream& stream_;
    BinaryReadOptions& options_;
    std::unique_ptr<BinaryReadState> own_;
};

constexpr u64 blindStepBytes = 64 * 1024; ///< that are read at once where the size is not known

template <class T>
bool BinaryReader::values(vector<T>& values, u32 count) {
    static_assert(std::is_trivially_copyable_v<T>);
    BinaryReadState& state = this->state();
    const u64 wanted = u64{count} * sizeof(T);
    const bool isCut = wanted > state.left;
    if (isCut)
        reportShortRead(wanted);
    const u64 whole = isCut ? state.left / sizeof(T) : count;
    const u64 step = state.canSeek ? whole : blindStepBytes / sizeof(T);
    for (u64 done = 0; done < whole;) {
        const u64 now = std::min(step, whole - done);
        values.resizeUninitialized(done + now);
        const u64 got = stream_.read(values.data() + done, now * sizeof(T));
        state.left -= got;
        done += got / sizeof(T);
        if (got == now * sizeof(T))
            continue;
        values.resizeUninitialized(done);
        return false;
    }
    return !isCut;
}

template <class Read>
bool BinaryReader::payload(u32 byteCount, Read read) {
    BinaryReadState& state = this->state();
    const u64 outer = state.left;
    state.left = std::min<u64>(byteCount, outer);
    const u64 given = state.left;
    const bool isWhole = read();
    const u64 used = given - state.left;
    state.left = outer - used;
    if (!isWhole && byteCount > outer)
        return false;
    return skip(byteCount - used);
}

} // namespace base
