#pragma once
// PNG through libpng. Palette images stay Palette8 (tRNS becomes palette alpha); every other
// colour type becomes RGBA8.
#include <string>
#include <vector>

#include "vx/imagehandler.h"
#include "vx/raster.h"

class VxPngHandler : public VxImageHandler {
public:
    VxString key() const override { return "png"; }
    VxRef<VxRasterGeometry> read(std::istream& in) const override;

    // RGBA8, Palette8 (with tRNS for translucent entries) and Byte (grey) are written as they
    // are; other rasters through toRGBA(). False on failure.
    static bool encode(const VxRaster& raster, std::vector<uint8_t>& out);
    static bool writePng(const VxRaster& raster, const std::string& path);
};
