#pragma once
// What one view's update hands to each layer.
#include <cstdint>

#include "vx/canvas.h"
#include "vx/crs.h"
#include "vx/layer.h"
#include "vx/transform2.h"

struct VxView {
    double scale = 0;  // scale denominator at 0.28 mm per screen pixel
    VxRect area;       // what is visible, in the view's CRS
    VxRect drawArea;   // the area drawn this cycle (equals area unless the driver pads it)
    VxTransform2 transform;
    double pixelSizeX = 0, pixelSizeY = 0;  // world units per pixel
    VxRef<VxCrs> crs;
    VxRef<VxCrs> crs2;  // carries the authority name and code
    double centreX() const { return (area.minx + area.maxx) / 2; }
    double centreY() const { return (area.miny + area.maxy) / 2; }
};

struct VxLayer::UpdateInfo {
    VxView view;
    int drawableWidth = 0, drawableHeight = 0;
    VxCanvas* drawTarget = nullptr;  // for immediate drawing
    bool is3D = false;
    bool skip = false;
    uint64_t cacheGeneration = 0;
};
