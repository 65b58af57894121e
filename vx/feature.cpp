#include "vx/feature.h"

#include <algorithm>
#include <atomic>
#include <cmath>
#include <cstring>
#include <limits>

namespace {

const double kWebMercatorHalfWorld = 20037508.342789244;

// Largest error, in source pixels, that linear interpolation between transformed points
// may make before the points in between are transformed one by one.
const double kMaxApproxError = 0.125;
// Output pixels between transformed points along a row.
const int kApproxStep = 16;

bool isWebMercator(const VxRef<VxCrs>& crs) {
    if (!crs || crs->isGeographic()) return false;
    // Recognised by what it does: the sphere's equator maps linearly onto +-half world and
    // 45 degrees north lands where the spherical formula puts it.
    double x[2] = {180.0, 90.0}, y[2] = {0.0, 45.0};
    if (!VxCrs::wgs84LongLat()->transform(crs, x, y, 2)) return false;
    return std::fabs(x[0] - kWebMercatorHalfWorld) < 1 && std::fabs(x[1] - kWebMercatorHalfWorld / 2) < 1 &&
           std::fabs(y[0]) < 1 && std::fabs(y[1] - 5621521.486192066) < 1;
}

// Width of one world along x: where x repeats itself; 0 when it does not.
double periodOf(const VxRef<VxCrs>& crs) {
    if (!crs) return 0;
    if (crs->isGeographic()) return 360.0;
    return isWebMercator(crs) ? 2 * kWebMercatorHalfWorld : 0;
}

double wrapNear(double x, double centre, double period) {
    return x + period * std::round((centre - x) / period);
}

// An empty raster of the same layout (format, sample type, bands, palette).
VxRef<VxRaster> makeLike(const VxRaster& src, int width, int height) {
    VxRef<VxRaster> r;
    if (src.format() == VxRasterFormat::RGBA8 || src.format() == VxRasterFormat::Palette8)
        r = vxMake<VxRaster>(width, height, src.format(), src.palette());
    else
        r = vxMake<VxRaster>(width, height, src.sampleType(), src.bands());
    r->lastBandIsAlpha(src.lastBandIsAlpha());
    return r;
}

// x extent of the source bounds in a periodic projected target, unwrapped so that an area
// crossing the world's edge stays in one piece (reaching past the edge) instead of spanning
// the whole world. minx ends in [-period/2, period/2).
bool unwrappedExtent(const VxRef<VxCrs>& from, const VxRef<VxCrs>& to, const VxRect& b,
                     double period, double& minx, double& maxx) {
    const int N = 21;
    std::vector<double> x(N * N), y(N * N);
    for (int j = 0; j < N; ++j)
        for (int i = 0; i < N; ++i) {
            x[j * N + i] = b.minx + b.width() * i / (N - 1);
            y[j * N + i] = b.miny + b.height() * j / (N - 1);
        }
    if (!from->transform(to, x.data(), y.data(), x.size())) return false;
    minx = HUGE_VAL;
    maxx = -HUGE_VAL;
    double rowRef = HUGE_VAL;
    for (int j = 0; j < N; ++j) {
        double prev = HUGE_VAL;
        for (int i = 0; i < N; ++i) {
            double v = x[j * N + i];
            if (v == HUGE_VAL) continue;
            if (prev != HUGE_VAL) {
                v = wrapNear(v, prev, period);
            } else {
                if (rowRef != HUGE_VAL) v = wrapNear(v, rowRef, period);
                rowRef = v;
            }
            prev = v;
            minx = std::min(minx, v);
            maxx = std::max(maxx, v);
        }
    }
    if (minx == HUGE_VAL) return false;
    const double shift = period * std::floor((minx + period / 2) / period);
    minx -= shift;
    maxx -= shift;
    if (maxx - minx >= period) {
        minx = -period / 2;
        maxx = period / 2;
    }
    return maxx > minx;
}

// Maps output pixel centres to source pixel coordinates (u right, v down; pixel (i, j)
// covers [i, i+1) x [j, j+1)), one row at a time. PROJ is asked only for every
// kApproxStep-th pixel and the midpoints between; where interpolating between them would
// be off by more than kMaxApproxError source pixels, every pixel of the stretch is
// transformed.
class InverseMap {
public:
    InverseMap(const VxRef<VxCrs>& target, const VxRef<VxCrs>& source, const VxRect& dst, int dstW,
               int dstH, const VxRect& src, int srcW, int srcH, double srcPeriod)
        : target_(target), source_(source), dst_(dst), dstW_(dstW), dstH_(dstH), src_(src),
          srcPeriod_(srcPeriod), srcCentre_((src.minx + src.maxx) / 2),
          sx_(srcW / src.width()), sy_(srcH / src.height()) {
        for (int p = 0;; p = std::min(p + kApproxStep, dstW_ - 1)) {
            nodes_.push_back(p);
            if (p == dstW_ - 1) break;
        }
        const size_t cap = nodes_.size() * 2;
        x_.resize(std::max<size_t>(cap, dstW_));
        y_.resize(x_.size());
    }

    // False when no transformation exists.
    bool row(int j, double* u, double* v) {
        const double wy = dst_.maxy - (j + 0.5) * dst_.height() / dstH_;
        const size_t n = nodes_.size();
        // Nodes first, then the midpoint of every segment.
        size_t k = 0;
        for (size_t a = 0; a < n; ++a, ++k) { x_[k] = pixelX(nodes_[a]); y_[k] = wy; }
        for (size_t a = 0; a + 1 < n; ++a, ++k) { x_[k] = pixelX(mid(a)); y_[k] = wy; }
        if (!target_->transform(source_, x_.data(), y_.data(), k)) return false;
        for (size_t q = 0; q < k; ++q) toSource(x_[q], y_[q]);

        u[nodes_[n - 1]] = x_[n - 1];
        v[nodes_[n - 1]] = y_[n - 1];
        std::vector<int>& exact = exactSegments_;
        exact.clear();
        for (size_t a = 0; a + 1 < n; ++a) {
            const int p0 = nodes_[a], p1 = nodes_[a + 1];
            const double u0 = x_[a], v0 = y_[a], u1 = x_[a + 1], v1 = y_[a + 1];
            const double um = x_[n + a], vm = y_[n + a];
            bool ok = std::isfinite(u0) && std::isfinite(u1) && std::isfinite(um);
            if (ok) {
                const double t = double(mid(a) - p0) / (p1 - p0);
                ok = std::fabs(u0 + (u1 - u0) * t - um) <= kMaxApproxError &&
                     std::fabs(v0 + (v1 - v0) * t - vm) <= kMaxApproxError;
            }
            if (!ok) {
                exact.push_back(static_cast<int>(a));
                continue;
            }
            const double du = (u1 - u0) / (p1 - p0), dv = (v1 - v0) / (p1 - p0);
            for (int i = p0; i < p1; ++i) {
                u[i] = u0 + du * (i - p0);
                v[i] = v0 + dv * (i - p0);
            }
        }
        for (int a : exact) {
            const int p0 = nodes_[a], p1 = nodes_[a + 1];
            const int m = p1 - p0;
            for (int i = 0; i < m; ++i) { x_[i] = pixelX(p0 + i); y_[i] = wy; }
            target_->transform(source_, x_.data(), y_.data(), m);
            for (int i = 0; i < m; ++i) {
                toSource(x_[i], y_[i]);
                u[p0 + i] = x_[i];
                v[p0 + i] = y_[i];
            }
        }
        return true;
    }

private:
    int mid(size_t a) const { return (nodes_[a] + nodes_[a + 1]) / 2; }
    double pixelX(int i) const { return dst_.minx + (i + 0.5) * dst_.width() / dstW_; }
    // World to source pixel coordinates in place; failed points become NaN.
    void toSource(double& x, double& y) const {
        if (x == HUGE_VAL) {
            x = y = std::numeric_limits<double>::quiet_NaN();
            return;
        }
        if (srcPeriod_ > 0) x = wrapNear(x, srcCentre_, srcPeriod_);
        x = (x - src_.minx) * sx_;
        y = (src_.maxy - y) * sy_;
    }

    VxRef<VxCrs> target_, source_;
    VxRect dst_;
    int dstW_, dstH_;
    VxRect src_;
    double srcPeriod_, srcCentre_, sx_, sy_;
    std::vector<int> nodes_;
    std::vector<int> exactSegments_;
    std::vector<double> x_, y_;
};

// Bilinear on straight-alpha RGBA with 8-bit fixed-point weights; colours are weighted by
// their alpha so that transparent neighbours do not darken edges. Outside the source:
// transparent. Edges extend the border pixels, so adjoining rasters meet without seams.
void bilinearRowRGBA(const VxRaster& s, const double* u, const double* v, int n, uint8_t* out) {
    const int W = s.width(), H = s.height();
    const size_t stride = s.stride();
    const uint8_t* base = s.data();
    for (int i = 0; i < n; ++i, out += 4) {
        const double uu = u[i], vv = v[i];
        if (!(uu >= 0 && uu < W && vv >= 0 && vv < H)) {
            std::memset(out, 0, 4);
            continue;
        }
        // uu - 0.5 >= -0.5: the shifted value is positive, so truncation floors.
        const int U = static_cast<int>((uu - 0.5) * 256 + 256.5) - 256;
        const int V = static_cast<int>((vv - 0.5) * 256 + 256.5) - 256;
        const int xi = U >> 8, yi = V >> 8;
        const uint32_t wx = U & 255, wy = V & 255;
        const int xa = std::max(xi, 0), xb = std::min(xi + 1, W - 1);
        const int ya = std::max(yi, 0), yb = std::min(yi + 1, H - 1);
        const uint8_t* r0 = base + stride * ya;
        const uint8_t* r1 = base + stride * yb;
        const uint8_t* p00 = r0 + 4 * xa; const uint8_t* p10 = r0 + 4 * xb;
        const uint8_t* p01 = r1 + 4 * xa; const uint8_t* p11 = r1 + 4 * xb;
        const uint32_t w00 = (256 - wx) * (256 - wy), w10 = wx * (256 - wy);
        const uint32_t w01 = (256 - wx) * wy, w11 = wx * wy;
        if ((p00[3] & p10[3] & p01[3] & p11[3]) == 255) {
            for (int c = 0; c < 3; ++c)
                out[c] = static_cast<uint8_t>((w00 * p00[c] + w10 * p10[c] + w01 * p01[c] + w11 * p11[c] + 32768) >> 16);
            out[3] = 255;
            continue;
        }
        const uint32_t a00 = w00 * p00[3], a10 = w10 * p10[3], a01 = w01 * p01[3], a11 = w11 * p11[3];
        const uint32_t sa = a00 + a10 + a01 + a11;  // at most 65536 * 255
        if (sa == 0) {
            std::memset(out, 0, 4);
            continue;
        }
        for (int c = 0; c < 3; ++c) {
            // At most 65536 * 255 * 255, below 2^32.
            const uint32_t sum = a00 * p00[c] + a10 * p10[c] + a01 * p01[c] + a11 * p11[c];
            out[c] = static_cast<uint8_t>((sum + sa / 2) / sa);
        }
        out[3] = static_cast<uint8_t>((sa + 32768) >> 16);
    }
}

// Nearest neighbour for any layout; outside pixels take `outside` (bytesPerPixel bytes) and
// are marked in mask when one is given.
void nearestRow(const VxRaster& s, const double* u, const double* v, int n, uint8_t* out,
                const uint8_t* outside, uint8_t* mask) {
    const int W = s.width(), H = s.height();
    const size_t bpp = s.bytesPerPixel();
    for (int i = 0; i < n; ++i, out += bpp) {
        const double uu = u[i], vv = v[i];
        if (!(uu >= 0 && uu < W && vv >= 0 && vv < H)) {
            std::memcpy(out, outside, bpp);
            if (mask) mask[i] = 1;
            continue;
        }
        std::memcpy(out, s.row(static_cast<int>(vv)) + bpp * static_cast<int>(uu), bpp);
    }
}

// What pixels outside the source hold in data rasters: NaN for floating-point samples
// (drawn transparent), zero otherwise (which also clears a trailing alpha band).
std::vector<uint8_t> outsideValue(const VxRaster& s) {
    std::vector<uint8_t> px(s.bytesPerPixel(), 0);
    if (s.sampleType() == VxSampleType::Float32) {
        const float nan = std::numeric_limits<float>::quiet_NaN();
        for (int b = 0; b < s.bands(); ++b) std::memcpy(px.data() + 4 * b, &nan, 4);
    } else if (s.sampleType() == VxSampleType::Float64) {
        const double nan = std::numeric_limits<double>::quiet_NaN();
        for (int b = 0; b < s.bands(); ++b) std::memcpy(px.data() + 8 * b, &nan, 8);
    }
    return px;
}

// Palette outputs mark outside pixels with a transparent entry: an existing one when the
// palette has it, else one appended to a copy (the source's palette may be shared). A full
// palette without one cannot say "nothing here": the result becomes RGBA8 then.
VxRef<VxRaster> finishPalette(const VxRef<VxRaster>& out, const std::vector<uint8_t>& mask) {
    if (std::find(mask.begin(), mask.end(), 1) == mask.end()) return out;
    const VxRef<VxPalette>& pal = out->palette();
    int index = -1;
    for (int k = 0; k < pal->size(); ++k)
        if (pal->getColor(k).a == 0) { index = k; break; }
    if (index < 0 && pal->size() < 256) {
        auto copy = vxMake<VxPalette>(pal->entries());
        index = copy->size();
        copy->addColor(VxColor(0, 0, 0, 0));
        out->palette(copy);
    }
    if (index >= 0) {
        uint8_t* p = out->data();
        for (size_t k = 0; k < mask.size(); ++k)
            if (mask[k]) p[k] = static_cast<uint8_t>(index);
        return out;
    }
    VxRef<VxRaster> rgba = out->toRGBA();
    for (size_t k = 0; k < mask.size(); ++k)
        if (mask[k]) std::memset(rgba->data() + 4 * k, 0, 4);
    return rgba;
}

// Warps source (covering srcBounds in `from`) onto a width x height grid over dst in `to`.
VxRef<VxRaster> warp(const VxRaster& source, const VxRect& srcBounds, const VxRef<VxCrs>& from,
                     const VxRect& dst, const VxRef<VxCrs>& to, int width, int height,
                     bool bilinear) {
    InverseMap map(to, from, dst, width, height, srcBounds, source.width(), source.height(),
                   periodOf(from));
    VxRef<VxRaster> out = makeLike(source, width, height);
    const bool isPalette = source.format() == VxRasterFormat::Palette8;
    const bool rgbaBilinear = bilinear && source.format() == VxRasterFormat::RGBA8;
    std::vector<uint8_t> mask(isPalette ? static_cast<size_t>(width) * height : 0, 0);
    const std::vector<uint8_t> outside = outsideValue(source);
    std::vector<double> u(width), v(width);
    for (int j = 0; j < height; ++j) {
        if (!map.row(j, u.data(), v.data())) return nullptr;
        if (rgbaBilinear)
            bilinearRowRGBA(source, u.data(), v.data(), width, out->row(j));
        else
            nearestRow(source, u.data(), v.data(), width, out->row(j), outside.data(),
                       isPalette ? mask.data() + static_cast<size_t>(width) * j : nullptr);
    }
    return isPalette ? finishPalette(out, mask) : out;
}

// Source pixel columns that map into piece (measured along its middle row), for sharing
// out the output width between two pieces.
double sourceColumns(const VxRef<VxCrs>& target, const VxRef<VxCrs>& source, const VxRect& piece,
                     const VxRect& srcBounds, int srcW) {
    const double period = periodOf(source);
    const double ym = (piece.miny + piece.maxy) / 2;
    const int N = 9;
    double x[N], y[N];
    for (int k = 0; k < N; ++k) {
        x[k] = piece.minx + piece.width() * k / (N - 1);
        y[k] = ym;
    }
    if (!target->transform(source, x, y, N)) return 0;
    double lo = HUGE_VAL, hi = -HUGE_VAL;
    for (int k = 0; k < N; ++k) {
        if (x[k] == HUGE_VAL) continue;
        double sx = period > 0 ? wrapNear(x[k], (srcBounds.minx + srcBounds.maxx) / 2, period) : x[k];
        sx = std::clamp(sx, srcBounds.minx, srcBounds.maxx);
        lo = std::min(lo, sx);
        hi = std::max(hi, sx);
    }
    if (lo == HUGE_VAL) return 0;
    return (hi - lo) / srcBounds.width() * srcW;
}

// Moves r by whole worlds next to area when it lies a world (or more) away from it.
void placeNear(VxRect& r, const VxRect& area, double period) {
    if (period <= 0 || area.isNull() || (r.minx < area.maxx && area.minx < r.maxx)) return;
    const double k = std::round(((area.minx + area.maxx) - (r.minx + r.maxx)) / 2 / period);
    const double shift = k * period;
    if (k != 0 && r.minx + shift < area.maxx && area.minx < r.maxx + shift) {
        r.minx += shift;
        r.maxx += shift;
    }
}

}  // namespace

VxId VxId::next() {
    static std::atomic<uint64_t> counter{0};
    VxId id;
    id.value = counter.fetch_add(1, std::memory_order_relaxed) + 1;
    return id;
}

VxFeature::VxFeature(const VxRef<VxRasterGeometry>& geometry, const VxRef<VxCrs>& crs, VxId id,
                     bool flag)
    : geometry_(geometry), crs_(crs), id_(id), flag_(flag) {}

VxFeature::~VxFeature() = default;

void VxFeature::move(double dx, double dy, double /*dz: rasters lie flat*/) {
    if (!geometry_) return;
    VxRect b = geometry_->bounds();
    b.minx += dx; b.maxx += dx;
    b.miny += dy; b.maxy += dy;
    geometry_->bounds(b);
}

VxRef<VxFeature> VxFeature::clipByRect(const VxRect& r) const {
    if (!geometry_ || !geometry_->raster()) return nullptr;
    const VxRaster& raster = *geometry_->raster();
    const VxRect& b = geometry_->bounds();
    if (!b.isValid() || !r.isValid() || !b.intersects(r)) return nullptr;
    const double pw = b.width() / raster.width(), ph = b.height() / raster.height();
    // A hair of tolerance so that edges falling on pixel borders do not pull in a neighbour.
    const double eps = 1e-9;
    auto clampTo = [](double v, int hi) { return static_cast<int>(std::clamp(v, 0.0, double(hi))); };
    const int c0 = clampTo(std::floor((r.minx - b.minx) / pw + eps), raster.width());
    const int c1 = clampTo(std::ceil((r.maxx - b.minx) / pw - eps), raster.width());
    const int r0 = clampTo(std::floor((b.maxy - r.maxy) / ph + eps), raster.height());
    const int r1 = clampTo(std::ceil((b.maxy - r.miny) / ph - eps), raster.height());
    if (c1 <= c0 || r1 <= r0) return nullptr;

    VxRef<VxRasterGeometry> g;
    if (c0 == 0 && r0 == 0 && c1 == raster.width() && r1 == raster.height()) {
        g = vxMake<VxRasterGeometry>(geometry_->raster(), b);
    } else {
        VxRef<VxRaster> part = makeLike(raster, c1 - c0, r1 - r0);
        const size_t bpp = raster.bytesPerPixel();
        for (int y = r0; y < r1; ++y)
            std::memcpy(part->row(y - r0), raster.row(y) + bpp * c0, bpp * (c1 - c0));
        g = vxMake<VxRasterGeometry>(part, VxRect(b.minx + c0 * pw, b.maxy - r1 * ph,
                                                  b.minx + c1 * pw, b.maxy - r0 * ph));
    }
    g->sourceBounds(geometry_->sourceBounds());
    g->sourceEpsg(geometry_->sourceEpsg());
    return vxMake<VxFeature>(g, crs_, id_, flag_);
}

bool VxFeature::projectTo(const VxRef<VxCrs>& target, std::vector<VxRef<VxFeature>>& out,
                          const VxProjectParams* params, bool /*flag: no effect on rasters*/) const {
    if (!target || !crs_ || !geometry_ || !geometry_->raster()) return false;
    const VxRaster& raster = *geometry_->raster();
    const VxRect& bounds = geometry_->bounds();
    if (!bounds.isValid() || raster.width() <= 0 || raster.height() <= 0) return false;
    const VxRect area = params ? params->targetArea : VxRect();
    const bool bilinear = params ? params->bilinear : true;

    // Same system: a new geometry object (moving the result must not move this feature)
    // over the very same raster.
    if (crs_ == target || crs_->compatibleWith(target)) {
        VxRect b = bounds;
        placeNear(b, area, periodOf(target));
        auto g = vxMake<VxRasterGeometry>(geometry_->raster(), b);
        out.push_back(vxMake<VxFeature>(g, target, id_, flag_));
        return true;
    }

    VxRect first = bounds, second;
    const bool two = crs_->projectTo(target, first, second);
    if (!first.isValid()) return false;
    const double period = periodOf(target);
    if (!two && period > 0 && !target->isGeographic()) {
        // A projected world that repeats: keep an area across its edge in one piece.
        double minx, maxx;
        if (unwrappedExtent(crs_, target, bounds, period, minx, maxx)) {
            first.minx = minx;
            first.maxx = maxx;
        }
    }

    std::vector<VxRect> pieces{first};
    if (two && second.isValid()) pieces.push_back(second);
    std::vector<int> widths{raster.width()};
    if (pieces.size() == 2) {
        double c0 = sourceColumns(target, crs_, pieces[0], bounds, raster.width());
        double c1 = sourceColumns(target, crs_, pieces[1], bounds, raster.width());
        if (!(c0 + c1 > 0)) {
            c0 = pieces[0].width();
            c1 = pieces[1].width();
        }
        int w0 = static_cast<int>(std::lround(raster.width() * c0 / (c0 + c1)));
        w0 = std::clamp(w0, 1, std::max(1, raster.width() - 1));
        widths = {w0, std::max(1, raster.width() - w0)};
    }

    std::vector<VxRef<VxFeature>> results;
    for (size_t k = 0; k < pieces.size(); ++k) {
        VxRef<VxRaster> warped = warp(raster, bounds, crs_, pieces[k], target, widths[k],
                                      raster.height(), bilinear);
        if (!warped) return false;
        VxRect b = pieces[k];
        placeNear(b, area, period);
        results.push_back(vxMake<VxFeature>(vxMake<VxRasterGeometry>(warped, b), target, id_, flag_));
    }
    out.insert(out.end(), results.begin(), results.end());
    return true;
}
