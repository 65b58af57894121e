#include "ogc/wcscapabilities.h"

VxWcsCapabilities::VxWcsCapabilities()
    : coverageIds(new VxVec<VxString>()), formats(new VxVec<VxString>()), epsgIds(new VxVec<VxString>()),
      supportedCrs(new VxVec<VxString>()), supportedFormats(new VxVec<VxString>()) {}

// The lists are copied, not shared, so that a copy can be changed on its own.
VxWcsCapabilities::VxWcsCapabilities(const VxWcsCapabilities& o)
    : VxRefCnt(), abstract(o.abstract), coverageIds(new VxVec<VxString>(*o.coverageIds)),
      formats(new VxVec<VxString>(*o.formats)), epsgIds(new VxVec<VxString>(*o.epsgIds)), keywords(o.keywords),
      fees(o.fees), accessConstraints(o.accessConstraints), providerName(o.providerName),
      describeCoverageGetUrl(o.describeCoverageGetUrl), getCoverageGetUrl(o.getCoverageGetUrl),
      describeCoveragePostUrl(o.describeCoveragePostUrl), getCoveragePostUrl(o.getCoveragePostUrl), title(o.title),
      version(o.version), supportedCrs(new VxVec<VxString>(*o.supportedCrs)), crs(o.crs),
      crsAuthority(o.crsAuthority), crsCode(o.crsCode), bounds(o.bounds),
      supportedFormats(new VxVec<VxString>(*o.supportedFormats)) {}

VxWcsCapabilities::~VxWcsCapabilities() = default;
