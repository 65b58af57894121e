#pragma once
// GIF through giflib: the first frame, on the logical screen, as Palette8. The transparent
// index of the frame's graphic control block has alpha 0 in the palette.
#include <vector>

#include "vx/imagehandler.h"
#include "vx/raster.h"

class VxGifHandler : public VxImageHandler {
public:
    VxString key() const override { return "gif"; }
    VxRef<VxRasterGeometry> read(std::istream& in) const override;

    // Palette8 only (at most 256 entries); the first fully transparent entry becomes the
    // transparent index.
    static bool encode(const VxRaster& raster, std::vector<uint8_t>& out);
};
