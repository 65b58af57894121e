#include "ogc/ogcwmscapabilities.h"

VxOgcWmsCapabilities::VxOgcWmsCapabilities() : rootLayer(new VxOgcWmsServerLayer()) {}

VxOgcWmsCapabilities::~VxOgcWmsCapabilities() = default;

VxOgcWmsCapabilities::VxOgcWmsCapabilities(const VxOgcWmsCapabilities& o)
    : VxRefCnt(),
      abstract(o.abstract),
      formats(o.formats),
      keywords(o.keywords),
      contactElectronicMailAddress(o.contactElectronicMailAddress),
      contactPerson(o.contactPerson),
      contactOrganization(o.contactOrganization),
      crs(o.crs),
      getMapGetUrl(o.getMapGetUrl),
      getMapPostUrl(o.getMapPostUrl),
      name(o.name),
      title(o.title),
      version(o.version),
      maxWidth(o.maxWidth),
      maxHeight(o.maxHeight) {
    if (o.rootLayer) rootLayer = o.rootLayer->clone().cast<VxOgcWmsServerLayer>();
}

VxOgcWmsCapabilities* VxOgcWmsCapabilities::clone() const { return new VxOgcWmsCapabilities(*this); }

bool VxOgcWmsCapabilities::isCrsSupported(const VxRef<VxCrs>& crs) const {
    if (!rootLayer) return false;
    const VxString auth = crs->authority().toUpper();
    for (const auto& p : rootLayer->supportedCrs)
        if (p.first == auth && p.second == crs->code()) return true;
    return false;
}
