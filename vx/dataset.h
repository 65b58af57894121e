#pragma once
// Datasets: sources of features that answer rectangle queries. A dataset initializes once
// (doInitialize) before it answers; its lock serializes initialization and queries.
#include <atomic>
#include <cstdint>
#include <mutex>

#include "vx/crs.h"
#include "vx/engineobject.h"
#include "vx/feature.h"
#include "vx/rect.h"
#include "vx/vec.h"

// What the asking layer knows about the query (view, scale); datasets may ignore it.
class VxLayerInfo : public VxRefCnt {
public:
    ~VxLayerInfo() override;
};

// Options of a query; datasets may ignore it.
class VxQuery : public VxRefCnt {
public:
    ~VxQuery() override;
};

// The features a query found.
class VxQueryResult : public VxRefCnt {
public:
    ~VxQueryResult() override;
    virtual size_t featureCount() const = 0;
    // Null for an index outside 0 .. featureCount() - 1.
    virtual VxRef<VxFeature> feature(size_t index) const = 0;
};

// A result of exactly one feature, with the visualizer that should draw it (may be null).
class VxSingleResult : public VxQueryResult {
public:
    VxSingleResult(const VxRef<VxFeature>& feature, const VxRef<VxRefCnt>& visualizer);
    ~VxSingleResult() override;
    size_t featureCount() const override { return feature_ ? 1 : 0; }
    VxRef<VxFeature> feature(size_t index) const override { return index == 0 ? feature_ : nullptr; }
    const VxRef<VxFeature>& feature() const { return feature_; }
    const VxRef<VxRefCnt>& visualizer() const { return visualizer_; }

private:
    VxRef<VxFeature> feature_;
    VxRef<VxRefCnt> visualizer_;
};

// Common dataset properties a configuration or a caller hands to a dataset's constructor.
struct VxDataSetParams {
    VxString name;
    VxRef<VxCrs> crs;  // null: WGS 84 longitude/latitude
    bool suppressInitializationErrors = false;
};

class VxDataSet : public VxEngineObject {
    VX_DECLARE_CLASS()
public:
    // flag: whether the dataset can be written to.
    VxDataSet(const VxRef<VxCrs>& crs, bool writable);
    VxDataSet(const VxDataSetParams& params, bool writable);
    ~VxDataSet() override;

    VxString name() const;
    void name(const VxString& n);
    VxString engineName() const override { return name(); }

    VxRef<VxCrs> crs() const;
    void crs(const VxRef<VxCrs>& c);

    // When set, an exception from doInitialize is reported through the error event and
    // the log instead of reaching the caller.
    bool suppressInitializationErrors() const { return suppressInitializationErrors_.load(); }
    void suppressInitializationErrors(bool v) { suppressInitializationErrors_ = v; }

    bool isInitialized() const { return initialized_.load() != 0; }
    // Runs doInitialize once under the lock. An exception leaves the dataset uninitialized
    // and marks it failed; it reaches the caller unless suppressed (then false is returned).
    bool initialize(bool suppressErrors = false);
    bool hasFailed() const { return failed_.load() != 0; }

    // Bounds in crs(); initializes first. A user-set rectangle wins over the data's.
    VxRect bounds();
    virtual void bounds(const VxRect& b);
    bool hasNoUserSpecifiedBounds() const;

    // Initializes, then asks doQuery; null when initialization failed or nothing was found.
    VxRef<VxQueryResult> query(const VxRect& rect, const VxRef<VxQuery>& q = nullptr,
                               const VxRef<VxLayerInfo>& info = nullptr);

    virtual bool isReadOnly() const { return !writable_; }
    virtual bool returnsFeaturesWithAttributes() const { return true; }
    virtual void flushCache() { doFlushCache(); }

    bool isLockable() const override { return true; }
    void lock() const override { mutex_.lock(); }
    void unlock() const override { mutex_.unlock(); }

protected:
    VxDataSet(const VxDataSet& other);

    virtual void doInitialize() {}
    virtual VxRect doBounds() { return VxRect(); }
    virtual VxRef<VxQueryResult> doQuery(const VxRef<VxLayerInfo>& info, const VxRect& rect, VxRef<VxQuery> query,
                                         const VxRef<VxVec<VxId>>& ids) = 0;
    virtual void doFlushCache() {}

    std::recursive_mutex& mutex() const { return mutex_; }
    // Swaps both state flags from 1 to 0 (initialized and failed), each atomically.
    void clearStateFlags();

private:
    mutable std::recursive_mutex mutex_;
    mutable std::mutex nameMutex_;
    VxString name_;
    VxRef<VxCrs> crs_;
    VxRect userBounds_;
    bool writable_;
    std::atomic<bool> suppressInitializationErrors_{false};
    std::atomic<uint8_t> initialized_{0};
    std::atomic<uint8_t> failed_{0};
};
