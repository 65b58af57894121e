#pragma once
// What a WCS 1.1.1 service says about itself and about the coverages asked for:
// filled once by VxWcsService, shared read-only afterwards.
#include <cstdint>
#include <set>

#include "vx/crs.h"
#include "vx/rect.h"
#include "vx/refcnt.h"
#include "vx/string.h"
#include "vx/vec.h"

class VxWcsCapabilities : public VxRefCnt {
public:
    VxWcsCapabilities();
    VxWcsCapabilities(const VxWcsCapabilities& other);
    ~VxWcsCapabilities() override;

    VxString abstract;
    VxRef<VxVec<VxString>> coverageIds;  // allowed identifiers of GetCoverage
    VxRef<VxVec<VxString>> formats;      // allowed formats of GetCoverage
    VxRef<VxVec<VxString>> epsgIds;
    std::set<VxString> keywords;
    // Room for service metadata the client does not use.
    VxString fees;
    VxString accessConstraints;
    VxString providerName;
    VxString describeCoverageGetUrl;
    VxString getCoverageGetUrl;
    VxString describeCoveragePostUrl;
    VxString getCoveragePostUrl;
    VxString title;
    int32_t version = 0;  // 0: WCS 1.1.1
    // From the coverage description:
    VxRef<VxVec<VxString>> supportedCrs;  // in document order
    VxRef<VxCrs> crs;                     // of the bounding box, null when not a URN
    VxString crsAuthority;                // upper case, e.g. "EPSG"
    VxString crsCode;
    VxRect bounds;
    // The formats the described coverages list for themselves, in document order. A
    // service's GetCoverage formats are shared by all its coverages, and the first TIFF
    // among them may not keep a coverage's sample type; these do.
    VxRef<VxVec<VxString>> supportedFormats;
};
