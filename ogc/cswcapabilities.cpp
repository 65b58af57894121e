#include "ogc/cswcapabilities.h"

VxCswCapabilities::VxCswCapabilities() : crs(VxCrs::wgs84LongLat()) {}

VxCswCapabilities::VxCswCapabilities(const VxCswCapabilities& o)
    : VxRefCnt(), abstract(o.abstract), fees(o.fees), accessConstraints(o.accessConstraints),
      serviceType(o.serviceType), crs(o.crs), bounds(o.bounds), keywords(o.keywords), operations(o.operations),
      providerName(o.providerName), title(o.title), version(o.version) {}

VxCswCapabilities::~VxCswCapabilities() = default;
