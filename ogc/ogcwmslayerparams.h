#pragma once
// What a configuration or a caller hands to a WMS layer: each value with whether it was set.
#include <optional>

#include "ogc/ogcimageformat.h"
#include "vx/layer.h"
#include "vx/palette.h"
#include "vx/vec.h"

struct VxOgcWmsLayerParams : VxLayerSetParams {
    std::optional<VxColor> background;
    std::optional<bool> buffered;
    std::optional<VxString> dimensionValues;
    std::optional<VxString> elevation;
    std::optional<std::vector<VxString>> explicitLayers;
    std::optional<std::vector<VxString>> explicitStyles;
    std::optional<int> format;
    std::optional<VxString> password;
    std::optional<bool> throwExceptions;
    std::optional<VxString> time;
    std::optional<int> timeout;
    std::optional<bool> transparent;
    std::optional<VxString> url;
    std::optional<VxString> user;
    std::optional<VxString> vendorSpecificParameters;
};
