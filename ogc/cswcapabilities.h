#pragma once
// What a CSW 2.0.1/2.0.2 catalogue says about itself; filled once, shared read-only.
#include <cstdint>
#include <set>
#include <vector>

#include "vx/crs.h"
#include "vx/rect.h"
#include "vx/refcnt.h"
#include "vx/string.h"

class VxCswCapabilities : public VxRefCnt {
public:
    struct Operation {
        VxString name;
        VxString getUrl;
        VxString postUrl;
    };

    VxCswCapabilities();
    VxCswCapabilities(const VxCswCapabilities& other);
    ~VxCswCapabilities() override;

    VxString abstract;
    // Room for service metadata the client does not use.
    VxString fees;
    VxString accessConstraints;
    VxString serviceType;
    VxRef<VxCrs> crs;                          // WGS 84 longitude/latitude
    VxRect bounds{-180.0, -90.0, 180.0, 90.0};
    std::set<VxString> keywords;
    std::vector<Operation> operations;         // in document order
    VxString providerName;
    VxString title;
    int32_t version = 0;                       // 1: 2.0.1, 2: 2.0.2
};
