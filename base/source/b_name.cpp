#include "b_name.h"

#include "b_builtin_names.h"
#include "b_containers.h"

#include <cstring>
#include <mutex>
#include <new>

namespace base {

namespace {

constexpr std::size_t reservedBytes = std::size_t{64} << 20;
constexpr std::size_t furtherBlockBytes = std::size_t{1} << 20;
constexpr std::size_t longTextBytes = 4096; ///< from here on a text gets memory of its own

// Zero-initialised, so that it costs address space until pages of it are used.
alignas(NameRecord) constinit unsigned char reserved[reservedBytes] = {};

/// Places records upwards, each with its text behind it. Nothing is ever freed.
class RecordStore {
public:
    const NameRecord* place(std::string_view text, u32 hash) {
        const bool isLong = text.size() >= longTextBytes;
        unsigned char* at = take(sizeof(NameRecord) + (isLong ? 0 : text.size() + 1));
        void* storage = isLong ? AllocPolicy::allocate(text.size() + 1) : at + sizeof(NameRecord);
        char* chars = static_cast<char*>(storage);
        std::memcpy(chars, text.data(), text.size());
        chars[text.size()] = 0;
        return new (at) NameRecord{chars, static_cast<u32>(text.size()), hash, nullptr};
    }

private:
    unsigned char* take(std::size_t byteCount) {
        constexpr std::size_t unit = alignof(NameRecord);
        const std::size_t rounded = (byteCount + unit - 1) / unit * unit;
        if (rounded > static_cast<std::size_t>(end_ - next_)) {
            next_ = static_cast<unsigned char*>(AllocPolicy::allocate(furtherBlockBytes));
            end_ = next_ + furtherBlockBytes;
        }
        return std::exchange(next_, next_ + rounded);
    }

    unsigned char* next_ = reserved;
    unsigned char* end_ = reserved + reservedBytes;
};

std::string_view upToZero(std::string_view text) {
    return text.substr(0, text.find('\0'));
}

} // namespace

/// Open-addressing index over the records; its length is a power of two and at most half of it
/// is in use.
struct NameServer::Impl {
    Impl() {
        index.resize(1024);
        for (const NameRecord& record : builtinNames())
            add(&record);
    }

    /// The slot that holds `text`, or the empty one where it belongs.
    std::size_t slotOf(std::string_view text, u32 hash) const {
        const std::size_t mask = index.size() - 1;
        std::size_t slot = hash & mask;
        while (const NameRecord* record = std::as_const(index)[slot]) {
            if (record->hash == hash && std::string_view(record->chars, record->length) == text)
                break;
            slot = (slot + 1) & mask;
        }
        return slot;
    }

    void add(const NameRecord* record) {
        if (2 * (count + 1) > index.size())
            grow();
        index[slotOf({record->chars, record->length}, record->hash)] = record;
        ++count;
    }

    void grow() {
        vector<const NameRecord*> old(2 * index.size());
        old.swap(index);
        for (const NameRecord* record : std::as_const(old))
            if (record)
                index[slotOf({record->chars, record->length}, record->hash)] = record;
    }

    mutable std::mutex lock;
    vector<const NameRecord*> index;
    std::size_t count = 0;
    RecordStore store;
};

NameServer::NameServer() : impl_(new Impl) {}

name_id NameServer::id(std::string_view text) {
    text = upToZero(text);
    if (text.size() > std::numeric_limits<u32>::max())
        throw std::bad_alloc();
    const u32 hash = nameHash(text);
    const std::lock_guard guard(impl_->lock);
    if (const NameRecord* known = std::as_const(impl_->index)[impl_->slotOf(text, hash)])
        return name_id(known);
    const NameRecord* made = impl_->store.place(text, hash);
    impl_->add(made);
    return name_id(made);
}

name_id NameServer::find(std::string_view text) const {
    text = upToZero(text);
    const u32 hash = nameHash(text);
    const std::lock_guard guard(impl_->lock);
    return name_id(std::as_const(impl_->index)[impl_->slotOf(text, hash)]);
}

name_id NameServer::emptyName() const noexcept {
    return emptyBuiltinName;
}

NameServer& nameServer() {
    static NameServer& server = *new NameServer;
    return server;
}

} // namespace base
