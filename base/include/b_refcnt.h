#pragma once

#include "b_config.h"
#include "b_lock.h"
#include "b_memory.h"
#include "b_types.h"

#include <atomic>
#include <cstddef>
#include <functional>
#include <utility>

/// Counted objects and the pointers that hold them.
///
/// A count starts at 0; the first `ref` makes it 1 and the object dies when the last one goes.
/// An object that is a member of another starts at 1 (`addRef` in the owner's constructor) and is
/// never given to a `ref` that could take it to 0.
namespace base {

/// What all counted objects share.
class BASE1_API IRefCnt {
public:
    virtual ~IRefCnt();
};

/// Plain count, confined to one thread. There are no weak pointers to such an object.
class BASE1_API RefCnt : public virtual IRefCnt, public NonCopyable {
public:
    void addRef() const noexcept { ++count_; }
    void release() const {
        if (--count_ == 0)
            const_cast<RefCnt*>(this)->destroy();
    }
    u32 refCount() const noexcept { return count_; }

protected:
    RefCnt() = default;
    ~RefCnt() override;
    /// Called when the count reaches zero: deletes the object.
    virtual void destroy();

private:
    mutable u32 count_ = 0;
};

class WeakRefBase;

/// Atomic count with weak pointers. When the count falls to 0, every weak pointer is set to null
/// under the lock and then the object is destroyed. `ref`s may be copied and dropped on any
/// thread; a weak pointer may not be used while another thread drops the last `ref`.
class BASE1_API RefCntAtomic {
public:
    RefCntAtomic(const RefCntAtomic&) = delete;
    RefCntAtomic& operator=(const RefCntAtomic&) = delete;

    void addRef() const noexcept { count_.fetch_add(1, std::memory_order_relaxed); }
    void release() const {
        if (count_.fetch_sub(1, std::memory_order_acq_rel) == 1)
            die();
    }
    i32 refCount() const noexcept { return count_.load(std::memory_order_relaxed); }

protected:
    RefCntAtomic() = default;
    virtual ~RefCntAtomic();
    /// Deletes the object.
    virtual void destroy();

private:
    friend class WeakRefBase;
    void die() const;
    void clearWeakRefs() const;

    mutable std::atomic<i32> count_{0};
    mutable SpinLock weakLock_;
    mutable WeakRefBase* weakHead_ = nullptr;
};

/// Link of a weak pointer in its target's chain; `weak_ref` gives it a type.
class BASE1_API WeakRefBase : public NonCopyable {
protected:
    WeakRefBase() = default;
    ~WeakRefBase() { set(nullptr); }
    void set(const RefCntAtomic* target) noexcept;
    const RefCntAtomic* target() const noexcept { return target_; }

private:
    friend class RefCntAtomic;
    const RefCntAtomic* target_ = nullptr;
    WeakRefBase* previous_ = nullptr;
    WeakRefBase* next_ = nullptr;
};

/// Counted pointer: copying adds one, releasing subtracts one.
template <class T>
class ref {
public:
    using element_type = T;

    ref() noexcept = default;
    ref(std::nullptr_t) noexcept {}
    ref(T* object) : object_(object) {
        if (object_)
            object_->addRef();
    }
    ref(const ref& other) : ref(other.object_) {}
    ref(ref&& other) noexcept : object_(std::exchange(other.object_, nullptr)) {}
    template <class U>
    requires std::is_convertible_v<U*, T*> ref(const ref<U>& other) : ref(other.get()) {}
    template <class U>
    requires std::is_convertible_v<U*, T*> ref(ref<U>&& other)
    noexcept : object_(other.detach()) {}
    ref& operator=(ref other) noexcept {
        std::swap(object_, other.object_);
        return *this;
    }
    ~ref() {
        if (object_)
            object_->release();
    }

    T* get() const noexcept { return object_; }
    T* operator->() const noexcept { return object_; }
    T& operator*() const noexcept { return *object_; }
    explicit operator bool() const noexcept { return object_ != nullptr; }

    /// Gives up the pointer without a release: the caller takes the count over.
    T* detach() noexcept { return std::exchange(object_, nullptr); }
    void reset() { ref().swap(*this); }
    void swap(ref& other) noexcept { std::swap(object_, other.object_); }

    friend bool operator==(const ref& a, const ref& b) noexcept { return a.object_ == b.object_; }
    friend bool operator==(const ref& a, const T* b) noexcept { return a.object_ == b; }
    friend bool operator==(const ref& a, std::nullptr_t) noexcept { return !a.object_; }
    friend bool operator<(const ref& a, const ref& b) noexcept {
        return std::less<T*>()(a.object_, b.object_);
    }

private:
    T* object_ = nullptr;
};

/// Makes a counted object. The first count is the returned pointer's.
template <class T, class... Args>
ref<T> makeRef(Args&&... args) {
    return ref<T>(new T(std::forward<Args>(args)...));
}

/// Pointer to a `RefCntAtomic` object that does not keep it alive and is null once it is gone.
template <class T>
class weak_ref : public WeakRefBase {
public:
    weak_ref() = default;
    explicit weak_ref(T* target) noexcept { set(target); }
    weak_ref(const weak_ref& other) noexcept : weak_ref(other.get()) {}
    weak_ref& operator=(const weak_ref& other) noexcept {
        set(other.target());
        return *this;
    }
    weak_ref& operator=(T* target) noexcept {
        set(target);
        return *this;
    }
    T* get() const noexcept { return const_cast<T*>(static_cast<const T*>(target())); }
    explicit operator bool() const noexcept { return target() != nullptr; }
};

} // namespace base
