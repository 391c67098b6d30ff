#include "b_refcnt.h"

#include <mutex>

namespace base {

IRefCnt::~IRefCnt() = default;

RefCnt::~RefCnt() = default;

void RefCnt::destroy() {
    delete this;
}

// An object that no `ref` held dies without passing through `die`.
RefCntAtomic::~RefCntAtomic() {
    clearWeakRefs();
}

void RefCntAtomic::destroy() {
    delete this;
}

void RefCntAtomic::die() const {
    clearWeakRefs();
    const_cast<RefCntAtomic*>(this)->destroy();
}

void RefCntAtomic::clearWeakRefs() const {
    const std::lock_guard guard(weakLock_);
    while (WeakRefBase* link = weakHead_) {
        weakHead_ = link->next_;
        link->target_ = nullptr;
        link->previous_ = link->next_ = nullptr;
    }
}

void WeakRefBase::set(const RefCntAtomic* target) noexcept {
    if (target == target_)
        return;
    if (target_) {
        const std::lock_guard guard(target_->weakLock_);
        (previous_ ? previous_->next_ : target_->weakHead_) = next_;
        if (next_)
            next_->previous_ = previous_;
        previous_ = next_ = nullptr;
    }
    target_ = target;
    if (target) {
        const std::lock_guard guard(target->weakLock_);
        next_ = target->weakHead_;
        if (next_)
            next_->previous_ = this;
        target->weakHead_ = this;
    }
}

} // namespace base
