#pragma once
// TIFF through libtiff. Data keeps the file's sample type and band count (strips or tiles,
// interleaved or separate planes); 8-bit palette images become Palette8; layouts that only
// make sense as pictures (bilevel, CMYK, subsampled YCbCr, ...) are rendered to RGBA8.
// GeoTIFF tie point, pixel scale and EPSG code are reported as the geometry's source
// georeferencing.
#include <string>
#include <vector>

#include "vx/imagehandler.h"
#include "vx/raster.h"
#include "vx/rect.h"

struct VxTiffWriteOptions {
    int tileSize = 0;        // 0: strips; otherwise square tiles, rounded up to a multiple of 16
    bool deflate = false;    // Deflate compression instead of none
    VxRect bounds;           // georeferencing written when valid (ModelPixelScale, ModelTiepoint)
    int epsg = 0;            // with bounds: a GeoKeyDirectory naming this EPSG system
    bool geographic = false; // whether epsg is a geographic (not projected) system
};

class VxTiffHandler : public VxImageHandler {
public:
    VxString key() const override { return "tiff"; }
    VxRef<VxRasterGeometry> read(std::istream& in) const override;
    static VxRef<VxRasterGeometry> decode(const uint8_t* data, size_t size);

    // Any raster layout: RGBA8 as RGB with alpha, Palette8 with a colour map, data as is.
    static bool encode(const VxRaster& raster, std::vector<uint8_t>& out,
                       const VxTiffWriteOptions& options = VxTiffWriteOptions());
    static bool writeTiff(const VxRaster& raster, const std::string& path,
                          const VxTiffWriteOptions& options = VxTiffWriteOptions());
};
