#pragma once
// Intrusive reference counting with weak references.
#include <atomic>
#include <cstddef>
#include <mutex>
#include <utility>

class VxRefCnt;

// Shared between an object and its weak references; outlives the object.
struct VxWeakBlock {
    std::atomic<long> refs{1};  // one for the object itself
    std::mutex mutex;
    VxRefCnt* object = nullptr;
    void release() {
        if (refs.fetch_sub(1, std::memory_order_acq_rel) == 1) delete this;
    }
};

class VxRefCnt {
public:
    VxRefCnt() = default;
    VxRefCnt(const VxRefCnt&) : count_(0), weak_(nullptr) {}
    VxRefCnt& operator=(const VxRefCnt&) { return *this; }
    virtual ~VxRefCnt();

    void addRef() const { count_.fetch_add(1, std::memory_order_relaxed); }
    void release() const;
    long refCount() const { return count_.load(std::memory_order_acquire); }

    // Weak-reference support: the block is created on first use.
    VxWeakBlock* weakBlock() const;
    // Increments the count only if it is not already zero.
    bool tryAddRef() const;

private:
    mutable std::atomic<long> count_{0};
    mutable std::atomic<VxWeakBlock*> weak_{nullptr};
};

template <class T>
class VxRef {
public:
    VxRef() = default;
    VxRef(std::nullptr_t) {}
    VxRef(T* p) : p_(p) { if (p_) p_->addRef(); }
    VxRef(const VxRef& o) : p_(o.p_) { if (p_) p_->addRef(); }
    VxRef(VxRef&& o) noexcept : p_(o.p_) { o.p_ = nullptr; }
    template <class U>
    VxRef(const VxRef<U>& o) : p_(o.get()) { if (p_) p_->addRef(); }
    ~VxRef() { if (p_) p_->release(); }

    VxRef& operator=(const VxRef& o) { reset(o.p_); return *this; }
    VxRef& operator=(VxRef&& o) noexcept {
        if (this != &o) { T* old = p_; p_ = o.p_; o.p_ = nullptr; if (old) old->release(); }
        return *this;
    }
    VxRef& operator=(T* p) { reset(p); return *this; }
    VxRef& operator=(std::nullptr_t) { reset(nullptr); return *this; }

    // The new reference is taken before the old one is released.
    void reset(T* p = nullptr) {
        if (p) p->addRef();
        T* old = p_;
        p_ = p;
        if (old) old->release();
    }
    // Adopts a pointer whose count was already incremented.
    static VxRef adopt(T* p) { VxRef r; r.p_ = p; return r; }

    T* get() const { return p_; }
    T* operator->() const { return p_; }
    T& operator*() const { return *p_; }
    explicit operator bool() const { return p_ != nullptr; }
    bool isNull() const { return p_ == nullptr; }

    template <class U>
    VxRef<U> cast() const { return VxRef<U>(dynamic_cast<U*>(p_)); }

    friend bool operator==(const VxRef& a, const VxRef& b) { return a.p_ == b.p_; }
    friend bool operator!=(const VxRef& a, const VxRef& b) { return a.p_ != b.p_; }
    friend bool operator==(const VxRef& a, std::nullptr_t) { return a.p_ == nullptr; }
    friend bool operator!=(const VxRef& a, std::nullptr_t) { return a.p_ != nullptr; }

private:
    T* p_ = nullptr;
};

template <class T, class... A>
VxRef<T> vxMake(A&&... a) { return VxRef<T>(new T(std::forward<A>(a)...)); }

// A reference that does not keep the object alive; lock() yields null once it is gone.
template <class T>
class VxWeakRef {
public:
    VxWeakRef() = default;
    VxWeakRef(T* p) { assign(p); }
    VxWeakRef(const VxWeakRef& o) : block_(o.block_) { if (block_) block_->refs.fetch_add(1); }
    VxWeakRef& operator=(const VxWeakRef& o) {
        if (this != &o) { if (o.block_) o.block_->refs.fetch_add(1); drop(); block_ = o.block_; }
        return *this;
    }
    VxWeakRef& operator=(T* p) { drop(); assign(p); return *this; }
    ~VxWeakRef() { drop(); }

    VxRef<T> lock() const {
        if (!block_) return VxRef<T>();
        std::lock_guard<std::mutex> g(block_->mutex);
        if (!block_->object || !block_->object->tryAddRef()) return VxRef<T>();
        return VxRef<T>::adopt(static_cast<T*>(block_->object));
    }
    bool expired() const { return lock().isNull(); }

private:
    void assign(T* p) {
        block_ = nullptr;
        if (p) { block_ = p->weakBlock(); block_->refs.fetch_add(1); }
    }
    void drop() { if (block_) { block_->release(); block_ = nullptr; } }
    VxWeakBlock* block_ = nullptr;
};
