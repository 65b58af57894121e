#include "vx/sgnode.h"

#include <algorithm>
#include <cmath>

#include "vx/rastervis.h"

VxSGNode2::~VxSGNode2() = default;
VxSGNode3::~VxSGNode3() = default;

VxSGRasterNode2::VxSGRasterNode2(const VxRef<VxFeature>& feature, const VxRef<VxKeyValueTable>& colors,
                                 int filter)
    : feature_(feature), colors_(colors), filter_(filter) {}

VxSGRasterNode2::~VxSGRasterNode2() = default;

VxRef<VxRaster> VxSGRasterNode2::coloredRaster() const {
    if (!colors_ || !feature_ || !feature_->rasterGeometry() || !feature_->rasterGeometry()->raster())
        return nullptr;
    std::lock_guard<std::mutex> lock(cacheMutex_);
    if (colored_) return colored_;
    const VxRaster& src = *feature_->rasterGeometry()->raster();
    auto out = vxMake<VxRaster>(src.width(), src.height(), VxRasterFormat::RGBA8);
    auto colorOf = [&](int64_t key) {
        VxColor c;
        return colors_->lookupFloor(key, c) ? c : defaultColor_;
    };
    if (src.format() == VxRasterFormat::Palette8 || src.format() == VxRasterFormat::Byte) {
        // Byte-valued: one look-up per possible value.
        VxColor lut[256];
        for (int k = 0; k < 256; ++k) lut[k] = colorOf(k);
        for (int y = 0; y < src.height(); ++y) {
            const uint8_t* in = src.row(y);
            uint8_t* o = out->row(y);
            for (int x = 0; x < src.width(); ++x, o += 4) {
                const VxColor& c = lut[in[x * src.bytesPerPixel()]];
                o[0] = c.r; o[1] = c.g; o[2] = c.b; o[3] = c.a;
            }
        }
    } else {
        // Other data: the first band's value, rounded, is the key; no value (NaN), no colour.
        const double lo = -9.2e18, hi = 9.2e18;
        for (int y = 0; y < src.height(); ++y)
            for (int x = 0; x < src.width(); ++x) {
                const double v = src.sample(x, y, 0);
                const VxColor c = std::isnan(v) ? defaultColor_
                                                : colorOf(static_cast<int64_t>(std::llround(std::clamp(v, lo, hi))));
                out->setColor(x, y, c);
            }
    }
    colored_ = out;
    return colored_;
}

void VxSGRasterNode2::draw(VxCanvas& canvas, const VxSGRenderState2& state) const {
    if (!feature_ || !feature_->rasterGeometry() || !feature_->rasterGeometry()->raster()) return;
    const VxRect& bounds = feature_->rasterGeometry()->bounds();
    if (!bounds.isValid()) return;
    const VxRef<VxRaster> image = colors_ ? coloredRaster() : feature_->rasterGeometry()->raster();
    if (!image) return;
    const VxCanvas::Filter filter = filter_ == 1 ? VxCanvas::Filter::Bilinear : VxCanvas::Filter::Nearest;
    const double alpha = std::clamp(opacity_, 0, 255) / 255.0 * (1.0 - std::clamp(state.value, 0.0, 1.0));
    if (alpha <= 0) return;
    const bool clipped = !state.clip.isNull();
    if (!clipped && alpha >= 1) {
        canvas.drawRaster(*image, bounds, state.transform, filter);
        return;
    }

    // Clipped or translucent: draw the covered canvas pixels into a scratch canvas first,
    // then blend them with the opacity applied.
    const VxRect area = clipped ? bounds.intersected(state.clip) : bounds;
    if (!area.isValid()) return;
    const VxTransform2& t = state.transform;
    const double xa = t.pixelX(area.minx), xb = t.pixelX(area.maxx);
    const double ya = t.pixelY(area.maxy), yb = t.pixelY(area.miny);
    if (!std::isfinite(xa) || !std::isfinite(xb) || !std::isfinite(ya) || !std::isfinite(yb)) return;
    // Pixels whose centres fall inside the area.
    auto first = [](double edge, int limit) {
        return static_cast<int>(std::clamp(std::ceil(edge - 0.5), 0.0, double(limit)));
    };
    const int i0 = first(std::min(xa, xb), canvas.width()), i1 = first(std::max(xa, xb), canvas.width());
    const int j0 = first(std::min(ya, yb), canvas.height()), j1 = first(std::max(ya, yb), canvas.height());
    if (i1 <= i0 || j1 <= j0) return;
    VxCanvas scratch(i1 - i0, j1 - j0);
    VxTransform2 shifted = t;
    shifted.offsetX -= i0;
    shifted.offsetY -= j0;
    scratch.drawRaster(*image, bounds, shifted, filter);
    for (int y = 0; y < scratch.height(); ++y)
        for (int x = 0; x < scratch.width(); ++x) {
            VxColor c = scratch.pixel(x, y);
            if (c.a == 0) continue;
            c.a = static_cast<uint8_t>(std::lround(c.a * alpha));
            canvas.blendPixel(i0 + x, j0 + y, c);
        }
}
