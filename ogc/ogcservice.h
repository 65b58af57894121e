#pragma once
// Helpers shared by the OGC service clients.
#include "vx/crs.h"
#include "vx/refcnt.h"

class VxOgcService {
public:
    VxOgcService() = delete;

    // True when coordinates in this system go on the wire as (second axis, first axis):
    // every system whose registry axes are not east, then north, including systems the
    // registry does not know and a null system.
    static bool switchXY(const VxRef<VxCrs>& crs);

    // The URL followed by "?" when it has no query, by "&" when its query does not already
    // end in "?" or "&", so that key-value parameters can be appended.
    static VxString readyForParameters(const VxString& url);
};
