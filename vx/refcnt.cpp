#include "vx/refcnt.h"

VxRefCnt::~VxRefCnt() {
    if (VxWeakBlock* b = weak_.load(std::memory_order_acquire)) b->release();
}

void VxRefCnt::release() const {
    if (count_.fetch_sub(1, std::memory_order_acq_rel) != 1) return;
    if (VxWeakBlock* b = weak_.load(std::memory_order_acquire)) {
        // A concurrent VxWeakRef::lock() holds this mutex while it revives; once the
        // count is zero no revival can succeed, so clearing under the mutex is enough.
        std::lock_guard<std::mutex> g(b->mutex);
        b->object = nullptr;
    }
    delete this;
}

VxWeakBlock* VxRefCnt::weakBlock() const {
    VxWeakBlock* b = weak_.load(std::memory_order_acquire);
    if (b) return b;
    auto* fresh = new VxWeakBlock;
    fresh->object = const_cast<VxRefCnt*>(this);
    if (weak_.compare_exchange_strong(b, fresh, std::memory_order_acq_rel)) return fresh;
    delete fresh;
    return b;
}

bool VxRefCnt::tryAddRef() const {
    long n = count_.load(std::memory_order_acquire);
    while (n > 0) {
        if (count_.compare_exchange_weak(n, n + 1, std::memory_order_acq_rel)) return true;
    }
    return false;
}
