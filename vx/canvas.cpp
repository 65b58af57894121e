#include "vx/canvas.h"

#include <algorithm>
#include <cmath>
#include <cstring>

#include "vx/pnghandler.h"

VxCanvas::VxCanvas(int width, int height, const VxColor& background)
    : raster_(vxMake<VxRaster>(width, height, VxRasterFormat::RGBA8)) {
    clear(background);
}

void VxCanvas::blendPixel(int x, int y, const VxColor& c) {
    if (x < 0 || y < 0 || x >= width() || y >= height() || c.a == 0) return;
    if (c.a == 255) {
        raster_->setColor(x, y, c);
        return;
    }
    const VxColor d = raster_->color(x, y);
    const double sa = c.a / 255.0, da = d.a / 255.0;
    const double outA = sa + da * (1.0 - sa);
    auto mix = [&](uint8_t s, uint8_t t) {
        return static_cast<uint8_t>(std::lround((s * sa + t * da * (1.0 - sa)) / outA));
    };
    raster_->setColor(x, y, VxColor(mix(c.r, d.r), mix(c.g, d.g), mix(c.b, d.b),
                                    static_cast<uint8_t>(std::lround(outA * 255.0))));
}

namespace {

// Interpolates in premultiplied space so that transparent neighbours do not darken edges.
VxColor bilinear(const VxRaster& s, double u, double v) {
    const double fu = u - 0.5, fv = v - 0.5;
    const double xf = std::floor(fu), yf = std::floor(fv);
    const double wx = fu - xf, wy = fv - yf;
    const int maxX = s.width() - 1, maxY = s.height() - 1;
    const int xa = std::clamp(static_cast<int>(xf), 0, maxX), xb = std::clamp(static_cast<int>(xf) + 1, 0, maxX);
    const int ya = std::clamp(static_cast<int>(yf), 0, maxY), yb = std::clamp(static_cast<int>(yf) + 1, 0, maxY);
    const VxColor c[4] = {s.color(xa, ya), s.color(xb, ya), s.color(xa, yb), s.color(xb, yb)};
    const double w[4] = {(1 - wx) * (1 - wy), wx * (1 - wy), (1 - wx) * wy, wx * wy};
    double r = 0, g = 0, b = 0, a = 0;
    for (int i = 0; i < 4; ++i) {
        const double wa = w[i] * c[i].a;
        r += wa * c[i].r; g += wa * c[i].g; b += wa * c[i].b; a += wa;
    }
    if (a <= 0) return VxColor(0, 0, 0, 0);
    auto ch = [](double x) { return static_cast<uint8_t>(std::clamp(std::lround(x), 0L, 255L)); };
    return VxColor(ch(r / a), ch(g / a), ch(b / a), ch(a));
}

}  // namespace

void VxCanvas::drawRaster(const VxRaster& src, const VxRect& bounds, const VxTransform2& t, Filter filter) {
    if (!bounds.isValid() || src.width() <= 0 || src.height() <= 0) return;
    VxRef<VxRaster> converted;
    const VxRaster* s = &src;
    if (src.format() != VxRasterFormat::RGBA8) {
        converted = src.toRGBA();
        s = converted.get();
    }
    // Canvas positions of the raster's left, right, top and bottom edges; a mirroring
    // transform may swap them, which the signed steps below respect.
    const double x0 = t.pixelX(bounds.minx), x1 = t.pixelX(bounds.maxx);
    const double y0 = t.pixelY(bounds.maxy), y1 = t.pixelY(bounds.miny);
    if (!std::isfinite(x0) || !std::isfinite(x1) || !std::isfinite(y0) || !std::isfinite(y1)) return;
    if (x0 == x1 || y0 == y1) return;
    const double du = s->width() / (x1 - x0), dv = s->height() / (y1 - y0);
    // A raster that lies on the canvas grid pixel for pixel (the usual case for an image
    // fetched for this very view) is blended row by row without resampling: every pixel
    // centre falls on a sample centre, where both filters give the sample itself.
    const double ox = std::round(x0), oy = std::round(y0);
    if (std::abs(du - 1) < 1e-9 && std::abs(dv - 1) < 1e-9 && std::abs(x0 - ox) < 1e-6 && std::abs(y0 - oy) < 1e-6) {
        blendAligned(*s, static_cast<int>(ox), static_cast<int>(oy));
        return;
    }
    const int i0 = static_cast<int>(std::clamp(std::floor(std::min(x0, x1)), 0.0, double(width())));
    const int i1 = static_cast<int>(std::clamp(std::ceil(std::max(x0, x1)), 0.0, double(width())));
    const int j0 = static_cast<int>(std::clamp(std::floor(std::min(y0, y1)), 0.0, double(height())));
    const int j1 = static_cast<int>(std::clamp(std::ceil(std::max(y0, y1)), 0.0, double(height())));
    for (int j = j0; j < j1; ++j) {
        const double v = (j + 0.5 - y0) * dv;
        if (v < 0 || v >= s->height()) continue;
        for (int i = i0; i < i1; ++i) {
            const double u = (i + 0.5 - x0) * du;
            if (u < 0 || u >= s->width()) continue;
            const VxColor c = filter == Filter::Nearest
                                  ? s->color(static_cast<int>(u), static_cast<int>(v))
                                  : bilinear(*s, u, v);
            blendPixel(i, j, c);
        }
    }
}

void VxCanvas::blendAligned(const VxRaster& s, int offsetX, int offsetY) {
    const int i0 = std::max(0, offsetX), i1 = std::min(width(), offsetX + s.width());
    const int j0 = std::max(0, offsetY), j1 = std::min(height(), offsetY + s.height());
    for (int j = j0; j < j1; ++j) {
        const uint8_t* src = s.row(j - offsetY) + static_cast<size_t>(i0 - offsetX) * 4;
        uint8_t* dst = raster_->row(j) + static_cast<size_t>(i0) * 4;
        for (int i = i0; i < i1; ++i, src += 4, dst += 4) {
            if (src[3] == 255) {
                std::memcpy(dst, src, 4);
            } else if (src[3] != 0) {
                blendPixel(i, j, VxColor(src[0], src[1], src[2], src[3]));
            }
        }
    }
}

bool VxCanvas::writePng(const std::string& path) const {
    return VxPngHandler::writePng(*raster_, path);
}
