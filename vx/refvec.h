#pragma once
// An ordered collection of counted references, itself a counted engine object.
// Elements are compared by identity. A collection can be marked read-only (for
// good) and claimed by a single owner.
#include <cxxabi.h>

#include <algorithm>
#include <atomic>
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <functional>
#include <memory>
#include <string>
#include <type_traits>
#include <typeinfo>
#include <utility>
#include <vector>

#include <tinyxml.h>

#include "ogc/errors.h"
#include "vx/engineobject.h"

// Change notifications are not needed by any current instance.
struct VxRefVecNotifierDummy {};

// The single-owner claim. Elements are not told about claims: the element types that
// exist so far accept any owner, and a read-only view of layers must not touch them.
template <class T>
class VxRefVecSharing {
public:
    bool takeOwnership() {
        uint8_t expected = 0;
        return owned_.compare_exchange_strong(expected, 1, std::memory_order_acq_rel);
    }
    void releaseOwnership() {
        uint8_t expected = 1;
        owned_.compare_exchange_strong(expected, 0, std::memory_order_acq_rel);
    }
    bool isOwned() const { return owned_.load(std::memory_order_acquire) == 1; }
    void takeOwnershipArgument(int value) { ownershipArgument_ = value; }
    int ownershipArgument() const { return ownershipArgument_; }

private:
    int ownershipArgument_ = 0;
    std::atomic<uint8_t> owned_{0};
};

namespace vxrefvec_detail {
template <class T, class = void>
struct HasToXml : std::false_type {};
template <class T>
struct HasToXml<T, std::void_t<decltype(std::declval<const T&>().toXml(
                       static_cast<VxXmlSerializer*>(nullptr), static_cast<TiXmlElement*>(nullptr),
                       VxString(), false))>> : std::true_type {};

template <class T>
std::string typeName() {
    int status = 0;
    char* d = abi::__cxa_demangle(typeid(T).name(), nullptr, nullptr, &status);
    std::string name = (status == 0 && d) ? d : typeid(T).name();
    std::free(d);
    return name;
}
}  // namespace vxrefvec_detail

template <class T, int Code = 11, class Notifier = VxRefVecNotifierDummy,
          class Sharing = VxRefVecSharing<T>>
class VxRefVec : public VxEngineObject {
public:
    using value_type = VxRef<T>;
    using iterator = VxRef<T>*;
    using const_iterator = const VxRef<T>*;
    using size_type = size_t;

    VxRefVec() = default;
    explicit VxRefVec(size_t n) {
        if (n) {
            allocate(n);
            size_ = n;
        }
    }
    VxRefVec(const VxRefVec&) = delete;
    VxRefVec& operator=(const VxRefVec&) = delete;
    ~VxRefVec() override = default;

    // Identity: one runtime class per instantiation.
    static const VxRuntimeClass* runtimeClass() {
        static const std::string name = "VxRefVec<" + vxrefvec_detail::typeName<T>() + ">";
        static const VxRuntimeClass rc{name.c_str(), VxEngineObject::runtimeClass(), Code};
        return &rc;
    }
    static int classId() {
        static const int id = VxEngineObject::initClassId(runtimeClass());
        return id;
    }
    int myClassId_() const override { return classId(); }
    const VxRuntimeClass* myRuntimeClass_() const override { return runtimeClass(); }

    // Reading
    size_t size() const { return size_; }
    size_t capacity() const { return capacity_; }
    bool empty() const { return size_ == 0; }
    VxRef<T>& get(size_t i) { return data_[i]; }
    const VxRef<T>& get(size_t i) const { return data_[i]; }
    VxRef<T>& operator[](size_t i) { return data_[i]; }
    const VxRef<T>& operator[](size_t i) const { return data_[i]; }
    VxRef<T>& front() { return data_[0]; }
    const VxRef<T>& front() const { return data_[0]; }
    VxRef<T>& back() { return data_[size_ - 1]; }
    const VxRef<T>& back() const { return data_[size_ - 1]; }
    iterator begin() { return data_.get(); }
    iterator end() { return data_.get() + size_; }
    const_iterator begin() const { return data_.get(); }
    const_iterator end() const { return data_.get() + size_; }

    bool indexOf(const T* e, size_t& index) const {
        for (index = 0; index < size_; ++index)
            if (data_[index].get() == e) return true;
        return false;
    }
    bool indexOf(const VxRef<T>& e, size_t& index) const { return indexOf(e.get(), index); }
    bool contains(const T* e) const {
        size_t i;
        return indexOf(e, i);
    }
    bool contains(const VxRef<T>& e) const { return contains(e.get()); }

    bool equals(const VxRefVec* other) const {
        if (!other) return false;
        if (other->size_ != size_) return false;
        for (size_t i = 0; i < size_; ++i)
            if (data_[i].get() != other->data_[i].get()) return false;
        return true;
    }
    bool equals(const VxRef<VxRefVec>& other) const { return equals(other.get()); }
    bool operator==(const VxRefVec& other) const { return equals(&other); }
    bool operator!=(const VxRefVec& other) const { return !equals(&other); }

    // Changing
    void add(const VxRef<T>& e) { push_back(e); }
    void push_back(const VxRef<T>& e) {
        checkWritable();
        if (size_ == capacity_) {
            size_t grown = capacity_ + capacity_ / 2;
            if (grown <= capacity_) grown = size_ + 1;
            VxRef<T> keep(e);  // e may live in this array
            reallocate(grown);
            data_[size_++] = std::move(keep);
            return;
        }
        data_[size_++] = e;
    }
    void addRange(const VxRefVec& other) {
        checkWritable();
        const size_t n = other.size_;
        makeRoom(size_ + n);
        // Reading through other after the reallocation also covers adding to itself.
        for (size_t i = 0; i < n; ++i) data_[size_ + i] = other.data_[i];
        size_ += n;
    }
    void assign(const VxRefVec& other) {
        checkWritable();
        if (&other == this) return;
        clear();
        addRange(other);
    }
    void insert(size_t i, const VxRef<T>& e) {
        checkWritable();
        VxRef<T> keep(e);
        makeRoom(size_ + 1);
        for (size_t k = size_; k > i; --k) data_[k] = std::move(data_[k - 1]);
        data_[i] = std::move(keep);
        ++size_;
    }
    void insertRange(size_t i, const VxRefVec& other) {
        checkWritable();
        std::vector<VxRef<T>> items(other.begin(), other.end());
        const size_t n = items.size();
        if (!n) return;
        makeRoom(size_ + n);
        for (size_t k = size_; k > i; --k) data_[k - 1 + n] = std::move(data_[k - 1]);
        for (size_t k = 0; k < n; ++k) data_[i + k] = std::move(items[k]);
        size_ += n;
    }
    void set(size_t i, const VxRef<T>& e) {
        checkWritable();
        data_[i] = e;
    }
    bool remove(const T* e) {
        size_t i;
        if (!indexOf(e, i)) return false;
        checkWritable();
        eraseAt(i, i + 1);
        return true;
    }
    bool remove(const VxRef<T>& e) { return remove(e.get()); }
    void removeAt(size_t i) {
        checkWritable();
        eraseAt(i, i + 1);
    }
    iterator erase(iterator pos) {
        checkWritable();
        size_t i = static_cast<size_t>(pos - begin());
        eraseAt(i, i + 1);
        return begin() + i;
    }
    iterator erase(iterator first, iterator last) {
        checkWritable();
        size_t i = static_cast<size_t>(first - begin());
        eraseAt(i, static_cast<size_t>(last - begin()));
        return begin() + i;
    }
    void pop_back() {
        checkWritable();
        if (size_) eraseAt(size_ - 1, size_);
    }
    void pop() { pop_back(); }
    void clear() {
        checkWritable();
        eraseAt(0, size_);
    }
    void reverse() {
        checkWritable();
        std::reverse(begin(), end());
    }
    void sort() {
        checkWritable();
        std::sort(begin(), end(), [](const VxRef<T>& a, const VxRef<T>& b) {
            return std::less<const T*>()(a.get(), b.get());
        });
    }
    void resize(size_t n) {
        checkWritable();
        if (n < size_) {
            eraseAt(n, size_);
        } else if (n > size_) {
            makeRoom(capacity_ + n);
            size_ = n;  // slots past the old size already hold null references
        }
    }
    void reserve(size_t n) {
        checkWritable();
        makeRoom(n);
    }

    // Copies are writable and unowned.
    VxRef<VxEngineObject> cloneWithMap(VxOperatorMap* map) const override {
        VxRef<VxRefVec> copy(new VxRefVec(size_));
        for (size_t i = 0; i < size_; ++i) {
            if (!data_[i]) continue;
            copy->data_[i] = cloneElement(*data_[i], map);
        }
        if (map) map->put(this, copy.get());
        return copy;
    }
    VxRef<VxRefVec> cloneVec() const { return cloneWithMap(nullptr).template cast<VxRefVec>(); }
    VxRef<VxRefVec> shallowCopy() const {
        VxRef<VxRefVec> copy(new VxRefVec(size_));
        for (size_t i = 0; i < size_; ++i) copy->data_[i] = data_[i];
        return copy;
    }

    // Read-only mark; it cannot be cleared.
    void markReadOnly() { readOnly_ = 1; }
    bool isReadOnly() const { return readOnly_ == 1; }

    // Ownership claim; it does not restrict any operation.
    bool takeOwnership() { return sharing_.takeOwnership(); }
    void releaseOwnership() { sharing_.releaseOwnership(); }
    bool isOwned() const { return sharing_.isOwned(); }
    void takeOwnershipArgument(int value) { sharing_.takeOwnershipArgument(value); }
    int ownershipArgument() const { return sharing_.ownershipArgument(); }

    unsigned memoryPressure() const {
        return capacity_ ? static_cast<unsigned>(44 * capacity_) : 44u * 20u;
    }
    Notifier& notifier() { return notifier_; }

    // Writes an element named className holding every element, wrapped in the property
    // element "<parent>.<property>"; without a parent the elements write themselves.
    void toXml(VxXmlSerializer* s, TiXmlElement* parent, const VxString& property,
               const VxString& className, bool isPublic) const {
        if (!parent) {
            for (size_t i = 0; i < size_; ++i) writeElement(s, data_[i], nullptr, true);
            return;
        }
        auto* cls = new TiXmlElement(className.toUtf8());
        if (isPublic) cls->SetAttribute("Public", "true");
        auto* prop = new TiXmlElement(parent->ValueStr() + "." + property.toUtf8());
        prop->LinkEndChild(cls);
        parent->LinkEndChild(prop);
        for (size_t i = 0; i < size_; ++i) writeElement(s, data_[i], cls, false);
    }
    void toXml(VxXmlSerializer* s, TiXmlElement* parent, const VxString& property,
               bool isPublic) const override {
        toXml(s, parent, property, "VxRefVec", isPublic);
    }

private:
    void checkWritable() const {
        if (readOnly_ == 1) VX_THROW(VxXReadOnly, "Collection");
    }
    static void writeElement(VxXmlSerializer* s, const VxRef<T>& e, TiXmlElement* parent,
                             bool isPublic) {
        if constexpr (vxrefvec_detail::HasToXml<T>::value) {
            if (e) e->toXml(s, parent, VxString(), isPublic);
        } else {
            (void)s, (void)e, (void)parent, (void)isPublic;
        }
    }
    static VxRef<T> cloneElement(const T& e, VxOperatorMap* map) {
        if constexpr (std::is_base_of<VxEngineObject, T>::value) {
            if (map) return VxRef<T>(dynamic_cast<T*>(e.cloneWithMap(map).get()));
        } else {
            (void)map;
        }
        auto c = e.clone();
        return VxRef<T>(dynamic_cast<T*>(c.get()));
    }
    void allocate(size_t n) {
        data_.reset(new VxRef<T>[n]);
        capacity_ = n;
    }
    // Moves the elements into an array of n slots; moves leave the counts alone.
    void reallocate(size_t n) {
        std::unique_ptr<VxRef<T>[]> fresh(new VxRef<T>[n]);
        for (size_t i = 0; i < size_; ++i) fresh[i] = std::move(data_[i]);
        data_ = std::move(fresh);
        capacity_ = n;
    }
    void makeRoom(size_t n) {
        if (capacity_ < n) reallocate(n);
    }
    // Releases [first, last) and closes the gap; freed slots are left null.
    void eraseAt(size_t first, size_t last) {
        if (first >= last) return;
        // Take the doomed references out first: releasing one may run a destructor
        // that looks at this collection.
        std::vector<VxRef<T>> doomed;
        doomed.reserve(last - first);
        for (size_t k = first; k < last; ++k) doomed.push_back(std::move(data_[k]));
        size_t n = last - first;
        for (size_t k = last; k < size_; ++k) data_[k - n] = std::move(data_[k]);
        size_ -= n;
    }

    std::unique_ptr<VxRef<T>[]> data_;
    size_t size_ = 0;
    size_t capacity_ = 0;
    Notifier notifier_;
    uint8_t readOnly_ = 0;
    Sharing sharing_;
};
