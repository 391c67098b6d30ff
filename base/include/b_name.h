#pragma once

#include "b_config.h"
#include "b_types.h"

#include <functional>
#include <string_view>

/// Interned names. Two names are equal exactly when their handles are, and the order of handles
/// is the order of the records' addresses; no text is compared after interning.
namespace base {

/// What a name handle points at. Records live to the end of the process. `NameServer` places
/// them upwards in one reserved range, so their order is the order of interning and repeats when
/// a process interns the same names in the same sequence; nothing stored may depend on it.
struct NameRecord {
    const char* chars; ///< zero-terminated UTF-8
    u32 length;        ///< bytes, without the zero
    u32 hash;          ///< FNV-1a of the bytes
    /// Null at creation; for the code that numbers names while writing.
    mutable void* extra;
};

/// Handle of an interned name, the size of a pointer; null is the absent name.
class name_id {
public:
    constexpr name_id() noexcept = default;
    constexpr explicit name_id(const NameRecord* record) noexcept : record_(record) {}

    /// Text of the name; empty for the absent name.
    const char* text() const noexcept { return record_ ? record_->chars : ""; }
    std::string_view view() const noexcept {
        return record_ ? std::string_view(record_->chars, record_->length) : std::string_view();
    }
    /// True for the absent name and for the name without characters.
    bool isEmpty() const noexcept { return !record_ || record_->length == 0; }
    explicit operator bool() const noexcept { return record_ != nullptr; }
    const NameRecord* record() const noexcept { return record_; }

    friend bool operator==(name_id a, name_id b) noexcept { return a.record_ == b.record_; }
    friend bool operator<(name_id a, name_id b) noexcept {
        return std::less<const NameRecord*>()(a.record_, b.record_);
    }

private:
    const NameRecord* record_ = nullptr;
};

/// Owner of all name records, one per process. Safe to use from several threads.
class BASE1_API NameServer {
public:
    /// The handle of `text`, made if it is new. The text ends at its first zero byte.
    name_id id(std::string_view text);
    /// The handle of `text`, absent if nobody interned it.
    name_id find(std::string_view text) const;
    /// The name without characters, which names the root step of an attribute path.
    name_id emptyName() const noexcept;

private:
    friend BASE1_API NameServer& nameServer();
    NameServer();
    ~NameServer() = delete; // lives to the end of the process
    struct Impl;
    Impl* impl_;
};

BASE1_API NameServer& nameServer();

} // namespace base

template <>
struct std::hash<base::name_id> {
    std::size_t operator()(base::name_id name) const noexcept {
        return std::hash<const void*>()(name.record());
    }
};
