#pragma once
// A raster dataset served by one coverage of a WCS 1.1.1 service: every query becomes one
// GetCoverage request for exactly the queried rectangle, answered as a GeoTIFF.
#include <optional>

#include "ogc/wcscapabilities.h"
#include "vx/dataset.h"

// Construction parameters as a configuration reads them; unset values take the defaults.
struct VxOgcWcsDataSetParams : VxDataSetParams {
    std::optional<VxString> coverageId;
    std::optional<VxString> password;
    std::optional<bool> throwExceptions;
    std::optional<int> timeout;
    std::optional<VxString> url;
    std::optional<VxString> user;
    std::optional<VxString> version;

    VxString getCoverageId() const { return coverageId.value_or(VxString()); }
    VxString getPassword() const { return password.value_or(VxString()); }
    bool getThrowExceptions() const { return throwExceptions.value_or(false); }
    int getTimeout() const { return timeout.value_or(10); }
    VxString getUrl() const { return url.value_or(VxString()); }
    VxString getUser() const { return user.value_or(VxString()); }
    VxString getVersion() const { return version.value_or(VxString("1.1.1")); }
};

class VxOgcWcsDataSet : public VxDataSet {
    VX_DECLARE_CLASS()
public:
    VxOgcWcsDataSet(const VxString& url, const VxString& coverageId);
    explicit VxOgcWcsDataSet(const VxOgcWcsDataSetParams& params);
    ~VxOgcWcsDataSet() override;

    VxString myRuntimeClassName() const override { return "OgcWcsDataSet"; }
    VxRef<VxEngineObject> cloneWithMap(VxOperatorMap* map) const override;

    VxString url() const;
    VxString coverageId() const;
    VxString version() const;
    // Frozen while initialized: VxXPropertyFrozen.
    void url(const VxString& v);
    void coverageId(const VxString& v);
    void version(const VxString& v);

    VxString user() const { return user_; }
    VxString password() const { return password_; }
    int timeout() const { return timeout_; }
    bool throwExceptions() const { return throwExceptions_; }

    // The bounds come from the service only: VxXPropertyReadOnly.
    using VxDataSet::bounds;
    void bounds(const VxRect& b) override;

    bool returnsFeaturesWithAttributes() const override { return false; }

    // Marks the dataset as not initialized, so that the next use negotiates again.
    void reset();

    // What initialization chose (empty before).
    VxString imageFormat() const;
    VxString crsString() const;
    VxString getCoverageUrl() const;

protected:
    void doInitialize() override;
    VxRect doBounds() override;
    VxRef<VxQueryResult> doQuery(const VxRef<VxLayerInfo>& info, const VxRect& rect, VxRef<VxQuery> query,
                                 const VxRef<VxVec<VxId>>& ids) override;
    void doFlushCache() override {}

private:
    VxOgcWcsDataSet(const VxOgcWcsDataSet& other);

    bool setImageFormat(const VxVec<VxString>& formats, const VxString& key);
    VxString getCrsString();
    void handleError(const VxString& message);

    VxString url_;
    VxString coverageId_;
    VxString version_ = "1.1.1";
    VxString user_;
    VxString password_;
    int timeout_ = 10;
    bool throwExceptions_ = false;
    VxString getCoverageUrl_;
    VxString imageFormat_;
    VxString crsString_;
    VxRect bounds_{-180.0, -90.0, 180.0, 90.0};
};
