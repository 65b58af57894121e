#pragma once
// A counted, copyable vector of values (the engine's string lists and the like).
#include <vector>

#include "vx/refcnt.h"

template <class T>
class VxVec : public VxRefCnt {
public:
    VxVec() = default;
    explicit VxVec(std::vector<T> v) : items(std::move(v)) {}
    VxRef<VxVec> clone() const { return VxRef<VxVec>(new VxVec(items)); }
    size_t size() const { return items.size(); }
    bool empty() const { return items.empty(); }
    const T& operator[](size_t i) const { return items[i]; }
    std::vector<T> items;
};
