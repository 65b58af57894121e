#pragma once
// JPEG through libjpeg(-turbo); decoded to opaque RGBA8. Truncated data is an error rather
// than a grey-padded picture.
#include <vector>

#include "vx/imagehandler.h"
#include "vx/raster.h"

class VxJpegHandler : public VxImageHandler {
public:
    VxString key() const override { return "jpg"; }
    VxRef<VxRasterGeometry> read(std::istream& in) const override;

    // Any raster, through toRGBA(); alpha is dropped. quality 1..100.
    static bool encode(const VxRaster& raster, std::vector<uint8_t>& out, int quality = 90);
};
