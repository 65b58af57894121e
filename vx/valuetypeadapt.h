#pragma once
// A counted holder for a plain value, so that converters and property readers can
// hand any value around as VxRef<VxRefCnt>.
#include <utility>

#include "vx/refcnt.h"

template <class T>
class ValueTypeAdapt : public VxRefCnt {
public:
    explicit ValueTypeAdapt(T v) : value_(std::move(v)) {}
    const T& value() const { return value_; }
    void value(T v) { value_ = std::move(v); }

private:
    T value_;
};
