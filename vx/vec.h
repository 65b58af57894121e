#pragma once
// A counted vector, so that lists inside shared records can be handed out by reference.
#include <vector>

#include "vx/refcnt.h"

template <class T>
class VxVec : public VxRefCnt, public std::vector<T> {
public:
    using std::vector<T>::vector;
    VxVec() = default;
    VxVec(const VxVec& o) : VxRefCnt(), std::vector<T>(o) {}
    VxVec& operator=(const VxVec& o) {
        std::vector<T>::operator=(o);
        return *this;
    }
    VxRef<VxVec> clone() const { return VxRef<VxVec>(new VxVec(*this)); }
};
