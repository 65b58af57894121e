#pragma once
// What a WMS service offers, as read from its capabilities document. Filled once by
// the parser, then shared read-only.
#include <set>
#include <vector>

#include "ogc/ogcimageformat.h"
#include "ogc/ogcwmsserverlayer.h"
#include "vx/crs.h"

class VxOgcWmsCapabilities : public VxRefCnt {
public:
    VxOgcWmsCapabilities();
    ~VxOgcWmsCapabilities() override;

    // A deep copy: the layer tree is copied, the CRS shared.
    VxOgcWmsCapabilities* clone() const;
    VxRef<VxOgcWmsServerLayer> layer() const { return rootLayer; }
    bool isCrsSupported(const VxRef<VxCrs>& crs) const;

    VxString abstract;
    std::vector<OgcImageFormat> formats;
    std::set<VxString> keywords;
    VxString contactElectronicMailAddress;
    VxString contactPerson;
    VxString contactOrganization;
    VxRef<VxCrs> crs;
    VxString getMapGetUrl;
    VxString getMapPostUrl;
    VxString name;
    VxString title;
    int version = 0;  // 0 = 1.1.1, 1 = 1.3.0
    int maxWidth = 4096;
    int maxHeight = 4096;
    VxRef<VxOgcWmsServerLayer> rootLayer;

private:
    VxOgcWmsCapabilities(const VxOgcWmsCapabilities& other);
};
