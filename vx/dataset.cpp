#include "vx/dataset.h"

#include "vx/exception.h"
#include "vx/log.h"
#include "vx/runtime.h"

VX_IMPLEMENT_CLASS(VxDataSet, VxEngineObject, 0)

VxLayerInfo::~VxLayerInfo() = default;
VxQuery::~VxQuery() = default;
VxQueryResult::~VxQueryResult() = default;

VxSingleResult::VxSingleResult(const VxRef<VxFeature>& feature, const VxRef<VxRefCnt>& visualizer)
    : feature_(feature), visualizer_(visualizer) {}
VxSingleResult::~VxSingleResult() = default;

VxDataSet::VxDataSet(const VxRef<VxCrs>& crs, bool writable)
    : crs_(crs ? crs : VxCrs::wgs84LongLat()), writable_(writable) {}

VxDataSet::VxDataSet(const VxDataSetParams& params, bool writable)
    : name_(params.name), crs_(params.crs ? params.crs : VxCrs::wgs84LongLat()), writable_(writable),
      suppressInitializationErrors_(params.suppressInitializationErrors) {}

// A copy starts uninitialized: it negotiates on its own first use.
VxDataSet::VxDataSet(const VxDataSet& other)
    : VxEngineObject(other), name_(other.name()), crs_(other.crs()), userBounds_(other.userBounds_),
      writable_(other.writable_), suppressInitializationErrors_(other.suppressInitializationErrors()) {}

VxDataSet::~VxDataSet() = default;

VxString VxDataSet::name() const {
    std::lock_guard<std::mutex> g(nameMutex_);
    return name_;
}

void VxDataSet::name(const VxString& n) {
    std::lock_guard<std::mutex> g(nameMutex_);
    name_ = n;
}

VxRef<VxCrs> VxDataSet::crs() const {
    std::lock_guard<std::mutex> g(nameMutex_);
    return crs_;
}

void VxDataSet::crs(const VxRef<VxCrs>& c) {
    std::lock_guard<std::mutex> g(nameMutex_);
    crs_ = c;
}

bool VxDataSet::initialize(bool suppressErrors) {
    if (initialized_.load()) return true;
    std::lock_guard<std::recursive_mutex> g(mutex_);
    if (initialized_.load()) return true;
    try {
        doInitialize();
    } catch (const VxException& e) {
        failed_.store(1);
        if (!suppressErrors && !suppressInitializationErrors()) throw;
        VxRuntime::errorEvent().raise(this, VxErrorEventArgs{e.asString()});
        VxLog::logf(VxLog::Error, "%1% : %2%", name(), e.asString());
        return false;
    }
    failed_.store(0);
    initialized_.store(1);
    return true;
}

VxRect VxDataSet::bounds() {
    {
        std::lock_guard<std::mutex> g(nameMutex_);
        if (!userBounds_.isNull()) return userBounds_;
    }
    if (!initialize(true)) return VxRect();
    std::lock_guard<std::recursive_mutex> g(mutex_);
    return doBounds();
}

void VxDataSet::bounds(const VxRect& b) {
    std::lock_guard<std::mutex> g(nameMutex_);
    userBounds_ = b;
}

bool VxDataSet::hasNoUserSpecifiedBounds() const {
    std::lock_guard<std::mutex> g(nameMutex_);
    return userBounds_.isNull();
}

VxRef<VxQueryResult> VxDataSet::query(const VxRect& rect, const VxRef<VxQuery>& q, const VxRef<VxLayerInfo>& info) {
    if (!initialize()) return nullptr;
    return doQuery(info, rect, q, nullptr);
}

void VxDataSet::clearStateFlags() {
    uint8_t one = 1;
    initialized_.compare_exchange_strong(one, 0);
    one = 1;
    failed_.compare_exchange_strong(one, 0);
}
