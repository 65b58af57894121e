#pragma once
// Drives the update cycle of a list of layers for one view onto a canvas.
#include <vector>

#include "vx/canvas.h"
#include "vx/layer.h"
#include "vx/updateinfo.h"

class VxMapView {
public:
    // Metres per screen pixel used for the scale denominator.
    static constexpr double kScreenPixelSize = 0.00028;

    VxMapView(const VxRef<VxCrs>& crs, const VxRect& area, int width, int height);

    const VxLayer::UpdateInfo& updateInfo() const { return info_; }
    VxLayer::UpdateInfo& updateInfo() { return info_; }
    double scale() const { return info_.view.scale; }

    // doPrepare, then doUpdate drawing straight onto the canvas, then doUpdateCompleted.
    void drawImmediate(const std::vector<VxRef<VxLayer>>& layers, VxCanvas& canvas);
    // doPrepare, doCreatePresentation2 for every layer, the nodes drawn in order, then
    // doUpdateCompleted. Returns the number of nodes drawn.
    size_t drawWithNodes(const std::vector<VxRef<VxLayer>>& layers, VxCanvas& canvas);

private:
    VxLayer::UpdateInfo info_;
};
