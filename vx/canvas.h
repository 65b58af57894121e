#pragma once
// An RGBA8 drawing surface: rasters are resampled onto it through a world-to-pixel transform
// and blended source-over with straight alpha.
#include <string>

#include "vx/palette.h"
#include "vx/raster.h"
#include "vx/rect.h"
#include "vx/refcnt.h"
#include "vx/transform2.h"

class VxCanvas : public VxRefCnt {
public:
    enum class Filter { Nearest, Bilinear };

    VxCanvas(int width, int height, const VxColor& background = VxColor(0, 0, 0, 0));

    int width() const { return raster_->width(); }
    int height() const { return raster_->height(); }
    const VxRef<VxRaster>& raster() const { return raster_; }

    void clear(const VxColor& c) { raster_->clear(c.r, c.g, c.b, c.a); }
    VxColor pixel(int x, int y) const { return raster_->color(x, y); }
    void setPixel(int x, int y, const VxColor& c) { raster_->setColor(x, y, c); }
    // Blends c over the pixel; coordinates outside the canvas are ignored.
    void blendPixel(int x, int y, const VxColor& c);

    // Draws src, which covers srcBoundsWorld, at the place the transform gives. Each canvas
    // pixel whose centre falls inside the raster takes the sample at that point; palette and
    // data rasters are shown as toRGBA() shows them.
    void drawRaster(const VxRaster& src, const VxRect& srcBoundsWorld, const VxTransform2& transform,
                    Filter filter = Filter::Bilinear);

    bool writePng(const std::string& path) const;

private:
    // src (RGBA8) placed with its top-left pixel at (offsetX, offsetY), one to one.
    void blendAligned(const VxRaster& src, int offsetX, int offsetY);
    VxRef<VxRaster> raster_;
};
