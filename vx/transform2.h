#pragma once
// Affine map from world coordinates (x east, y north) to canvas pixels (x right, y down):
// px = x * scaleX + offsetX, py = offsetY - y * scaleY.
#include "vx/rect.h"

struct VxTransform2 {
    double scaleX = 1, scaleY = 1, offsetX = 0, offsetY = 0;

    VxTransform2() = default;
    VxTransform2(double sx, double sy, double ox, double oy)
        : scaleX(sx), scaleY(sy), offsetX(ox), offsetY(oy) {}

    // Maps area onto a width x height canvas: (minx, maxy) to (0, 0), (maxx, miny) to
    // (width, height).
    static VxTransform2 fromView(const VxRect& area, int width, int height) {
        VxTransform2 t;
        t.scaleX = area.width() != 0 ? width / area.width() : 1;
        t.scaleY = area.height() != 0 ? height / area.height() : 1;
        t.offsetX = -area.minx * t.scaleX;
        t.offsetY = area.maxy * t.scaleY;
        return t;
    }

    double pixelX(double x) const { return x * scaleX + offsetX; }
    double pixelY(double y) const { return offsetY - y * scaleY; }
    double worldX(double px) const { return (px - offsetX) / scaleX; }
    double worldY(double py) const { return (offsetY - py) / scaleY; }
};
