#pragma once

#include "b_memory.h"

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <functional>
#include <initializer_list>
#include <iterator>
#include <map>
#include <memory>
#include <new>
#include <set>
#include <string>
#include <string_view>
#include <type_traits>
#include <unordered_map>
#include <utility>

/// The one place that names the framework's containers and strings and what stands behind them.
namespace base {

using string = std::string;
using std::string_view;

template <class K, class V, class Less = std::less<>>
using map = std::map<K, V, Less>;
template <class T, class Less = std::less<>>
using set = std::set<T, Less>;
template <class K, class V, class Hash = std::hash<K>, class Equal = std::equal_to<K>>
using hash_map = std::unordered_map<K, V, Hash, Equal>;

/// Growing array that may also be a view of memory that belongs to someone else.
///
/// It owns its storage exactly when its capacity end lies above its begin; a view has the
/// capacity end at its begin and its end elsewhere. Every mutating access to a view (the
/// non-const `data`, `begin`, `operator[]` among them) first copies the viewed elements into
/// storage of its own, so foreign memory is never written. A copy of a view is an owned copy; a
/// move keeps it a view. The viewed memory must outlive the view.
///
/// Elements are value-initialised by `resize`; `resizeUninitialized` leaves trivial elements
/// as they come, for arrays that are filled at once. A call that throws leaves the elements as they
/// were, except `assign`, `insert` and `erase`, which may leave fewer. Elements need a move that
/// does not throw.
template <class T>
class vector {
    static constexpr bool trivial = std::is_trivially_copyable_v<T>;

public:
    using value_type = T;
    using size_type = std::size_t;
    using difference_type = std::ptrdiff_t;
    using reference = T&;
    using const_reference = const T&;
    using iterator = T*;
    using const_iterator = const T*;

    vector() noexcept = default;
    // These delegate, so that the destructor runs if an element's copy throws.
    explicit vector(size_type count) : vector() { resize(count); }
    vector(size_type count, const T& value) : vector() { resize(count, value); }
    vector(std::initializer_list<T> values) : vector() { append(values.begin(), values.end()); }
    template <std::forward_iterator It>
    vector(It first, It last) : vector() {
        append(first, last);
    }
    vector(const vector& other) : vector() { append(other.begin(), other.end()); }
    vector(vector&& other) noexcept { swap(other); }
    vector& operator=(const vector& other) {
        if (this != &other)
            assign(other.begin(), other.end());
        return *this;
    }
    vector& operator=(vector&& other) noexcept {
        if (this != &other) {
            release();
            swap(other);
        }
        return *this;
    }
    vector& operator=(std::initializer_list<T> values) {
        assign(values.begin(), values.end());
        return *this;
    }
    ~vector() { release(); }

    /// A view of `count` elements at `elements`. Elements that are not aligned for T are copied.
    static vector view(const T* elements, size_type count) {
        vector v;
        v.setView(elements, elements + count);
        return v;
    }

    /// Turns this into a view of [first, last), releasing what it held. A range that ends at or
    /// before its start is empty; a range not aligned for T becomes an owned copy.
    void setView(const T* first, const T* last) {
        static_assert(trivial);
        release();
        if (last <= first)
            return;
        if (reinterpret_cast<std::uintptr_t>(first) % alignof(T) != 0) {
            const size_type byteCount =
                reinterpret_cast<std::uintptr_t>(last) - reinterpret_cast<std::uintptr_t>(first);
            resizeUninitialized(byteCount / sizeof(T));
            std::memcpy(static_cast<void*>(begin_), static_cast<const void*>(first), byteLength());
            return;
        }
        begin_ = capacityEnd_ = const_cast<T*>(first);
        end_ = const_cast<T*>(last);
    }

    bool isView() const noexcept { return capacityEnd_ == begin_ && end_ != begin_; }

    const T* begin() const noexcept { return begin_; }
    const T* end() const noexcept { return end_; }
    const T* data() const noexcept { return begin_; }
    T* begin() { return own(); }
    T* end() {
        own();
        return end_;
    }
    T* data() { return own(); }
    const T* cbegin() const noexcept { return begin(); }
    const T* cend() const noexcept { return end(); }

    size_type size() const noexcept { return static_cast<size_type>(end_ - begin_); }
    bool empty() const noexcept { return end_ == begin_; }
    /// Elements that fit into the owned storage; 0 for a view.
    size_type capacity() const noexcept { return static_cast<size_type>(capacityEnd_ - begin_); }
    /// Bytes of the elements, without what they point at.
    size_type byteLength() const noexcept { return size() * sizeof(T); }

    const T& operator[](size_type i) const noexcept { return begin_[i]; }
    T& operator[](size_type i) { return own()[i]; }
    const T& front() const noexcept { return *begin_; }
    const T& back() const noexcept { return end_[-1]; }
    T& front() { return *own(); }
    T& back() {
        own();
        return end_[-1];
    }

    void reserve(size_type count) {
        if (isView() || count > capacity())
            reallocate(std::max(count, size()));
    }

    void resize(size_type count) {
        resizeWith(count, [](T* at, size_type n) { std::uninitialized_value_construct_n(at, n); });
    }
    void resize(size_type count, const T& value) {
        const T kept = value; // `value` may be an element of this vector
        resizeWith(count, [&](T* at, size_type n) { std::uninitialized_fill_n(at, n, kept); });
    }
    /// As `resize`, but new elements keep whatever the memory held. For trivial types alone.
    void resizeUninitialized(size_type count) {
        static_assert(trivial);
        resizeWith(count, [](T*, size_type) {});
    }

    /// Forgets a view, destroys owned elements and keeps their storage.
    void clear() noexcept {
        if (isView()) {
            begin_ = end_ = capacityEnd_ = nullptr;
            return;
        }
        std::destroy(begin_, end_);
        end_ = begin_;
    }

    void push_back(const T& value) { emplace_back(value); }
    void push_back(T&& value) { emplace_back(std::move(value)); }
    template <class... Args>
    T& emplace_back(Args&&... args) {
        if (end_ < capacityEnd_) {
            T* at = std::construct_at(end_, std::forward<Args>(args)...);
            ++end_;
            return *at;
        }
        T made(std::forward<Args>(args)...); // an argument may lie in the old storage
        reallocate(grown());
        return *std::construct_at(end_++, std::move(made));
    }
    void pop_back() {
        own();
        std::destroy_at(--end_);
    }

    /// The elements become copies of [first, last), which must not lie in this vector.
    template <std::forward_iterator It>
    void assign(It first, It last) {
        clear();
        append(first, last);
    }

    /// Appends [first, last), which must not lie in this vector.
    template <std::forward_iterator It>
    void append(It first, It last) {
        const auto count = static_cast<size_type>(std::distance(first, last));
        if (count == 0)
            return;
        growFor(size() + count);
        std::uninitialized_copy(first, last, end_);
        end_ += count;
    }

    iterator insert(const_iterator position, T value) {
        const auto at = static_cast<size_type>(position - begin_);
        emplace_back(std::move(value));
        std::rotate(begin_ + at, end_ - 1, end_);
        return begin_ + at;
    }
    iterator erase(const_iterator position) { return erase(position, position + 1); }
    iterator erase(const_iterator first, const_iterator last) {
        const auto at = first - begin_;
        const auto count = last - first;
        own();
        if (count == 0)
            return begin_ + at;
        T* kept = std::move(begin_ + at + count, end_, begin_ + at);
        std::destroy(kept, end_);
        end_ = kept;
        return begin_ + at;
    }

    void swap(vector& other) noexcept {
        std::swap(begin_, other.begin_);
        std::swap(end_, other.end_);
        std::swap(capacityEnd_, other.capacityEnd_);
    }

    friend bool operator==(const vector& a, const vector& b) {
        return std::equal(a.begin(), a.end(), b.begin(), b.end());
    }

private:
    T* own() {
        if (isView())
            reallocate(size());
        return begin_;
    }

    size_type grown() const noexcept { return std::max<size_type>(4, size() + size() / 2); }

    /// Makes owned room for `count` elements: exactly that at first, later in steps that keep
    /// repeated growth linear.
    void growFor(size_type count) {
        if (count > capacity()) // that of a view is 0
            reallocate(std::max(count, empty() ? 0 : grown()));
    }

    template <class Fill>
    void resizeWith(size_type count, Fill fill) {
        const size_type old = size();
        if (count > old) {
            growFor(count);
            fill(end_, count - old);
        } else if (count < old) {
            own();
            std::destroy(begin_ + count, end_);
        }
        end_ = begin_ + count;
    }

    /// Moves (or, from a view, copies) the elements into owned storage for `count`.
    void reallocate(size_type count) {
        static_assert(std::is_nothrow_move_constructible_v<T> && alignof(T) <= 16);
        const size_type n = size();
        if (count > static_cast<size_type>(-1) / 2 / sizeof(T))
            throw std::bad_alloc();
        T* fresh = static_cast<T*>(AllocPolicy::allocate(count * sizeof(T)));
        if constexpr (trivial) {
            if (n != 0)
                std::memcpy(static_cast<void*>(fresh), begin_, n * sizeof(T));
        } else {
            std::uninitialized_move_n(begin_, n, fresh);
            std::destroy_n(begin_, n);
        }
        if (!isView())
            AllocPolicy::free(begin_);
        begin_ = fresh;
        end_ = fresh + n;
        capacityEnd_ = fresh + count;
    }

    void release() noexcept {
        if (!isView()) {
            std::destroy(begin_, end_);
            AllocPolicy::free(begin_);
        }
        begin_ = end_ = capacityEnd_ = nullptr;
    }

    T* begin_ = nullptr;
    T* end_ = nullptr;
    T* capacityEnd_ = nullptr;
};

/// Ordered map as a sorted vector of pairs, for the few entries of an object. Look-ups are
/// binary searches, an insertion moves the entries behind it; iterators and references do not
/// survive one.
template <class K, class V, class Less = std::less<>>
class flat_map {
public:
    using value_type = std::pair<K, V>;
    using iterator = value_type*;
    using const_iterator = const value_type*;

    bool empty() const noexcept { return entries_.empty(); }
    std::size_t size() const noexcept { return entries_.size(); }
    void clear() noexcept { entries_.clear(); }
    void reserve(std::size_t count) { entries_.reserve(count); }

    const_iterator begin() const noexcept { return entries_.begin(); }
    const_iterator end() const noexcept { return entries_.end(); }
    iterator begin() { return entries_.begin(); }
    iterator end() { return entries_.end(); }

    template <class Key>
    const_iterator find(const Key& key) const {
        const_iterator at = lowerBound(key);
        return at != end() && !Less()(key, at->first) ? at : end();
    }
    template <class Key>
    bool contains(const Key& key) const {
        return find(key) != end();
    }
    /// The value under `key`, null where there is none.
    template <class Key>
    const V* get(const Key& key) const {
        const_iterator at = find(key);
        return at == end() ? nullptr : &at->second;
    }

    /// The value under `key`, made with its default where there was none.
    template <class Key>
    V& operator[](const Key& key) {
        const auto at = static_cast<std::size_t>(lowerBound(key) - entries_.cbegin());
        if (at == entries_.size() || Less()(key, entries_[at].first))
            entries_.insert(entries_.cbegin() + at, value_type(K(key), V()));
        return entries_[at].second;
    }

    template <class Key>
    bool erase(const Key& key) {
        const_iterator at = find(key);
        if (at == end())
            return false;
        entries_.erase(at);
        return true;
    }

private:
    template <class Key>
    const_iterator lowerBound(const Key& key) const {
        return std::lower_bound(
            entries_.cbegin(), entries_.cend(), key,
            [](const value_type& entry, const Key& k) { return Less()(entry.first, k); });
    }

    vector<value_type> entries_;
};

} // namespace base
