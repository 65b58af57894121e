#include "ogc/ogcservice.h"

bool VxOgcService::switchXY(const VxRef<VxCrs>& crs) {
    if (!crs) return true;
    return !(VxCrs::authoritativeAxisDirection(0, crs->authority(), crs->code()) == VxCrsAxisEast &&
             VxCrs::authoritativeAxisDirection(1, crs->authority(), crs->code()) == VxCrsAxisNorth);
}

VxString VxOgcService::readyForParameters(const VxString& url) {
    if (!url.contains("?")) return url + "?";
    if (url.endsWith("?") || url.endsWith("&")) return url;
    return url + "&";
}
