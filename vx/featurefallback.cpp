// Construction of features for builds in which vx/feature.cpp has not landed yet. The
// definitions are weak: once feature.cpp is linked, its own win. Delete this file then.
#include <atomic>

#include "vx/feature.h"

__attribute__((weak)) VxId VxId::next() {
    static std::atomic<uint64_t> counter{0};
    return VxId{++counter};
}

__attribute__((weak)) VxFeature::VxFeature(const VxRef<VxRasterGeometry>& geometry, const VxRef<VxCrs>& crs, VxId id,
                                           bool flag)
    : geometry_(geometry), crs_(crs), id_(id), flag_(flag) {}

__attribute__((weak)) VxFeature::~VxFeature() {}
