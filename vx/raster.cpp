#include "vx/raster.h"

#include <algorithm>
#include <cmath>
#include <cstring>
#include <limits>
#include <stdexcept>

bool VxRaster::fitsLimits(long long width, long long height, size_t bytesPerPixel) {
    if (width <= 0 || height <= 0 || bytesPerPixel == 0) return false;
    if (width > kMaxSide || height > kMaxSide) return false;
    // Both sides are below 2^16, so the product cannot overflow.
    unsigned long long bytes = static_cast<unsigned long long>(width) * height * bytesPerPixel;
    return bytes <= kMaxBytes;
}

int VxRaster::sampleSize(VxSampleType t) {
    switch (t) {
    case VxSampleType::UInt8: case VxSampleType::Int8: return 1;
    case VxSampleType::UInt16: case VxSampleType::Int16: return 2;
    case VxSampleType::UInt32: case VxSampleType::Int32: case VxSampleType::Float32: return 4;
    case VxSampleType::Float64: return 8;
    }
    return 1;
}

VxRaster::VxRaster(int width, int height, VxRasterFormat format, VxRef<VxPalette> palette,
                   bool signed16)
    : width_(width), height_(height), format_(format), palette_(std::move(palette)) {
    switch (format) {
    case VxRasterFormat::RGBA8: sampleType_ = VxSampleType::UInt8; bands_ = 4; break;
    case VxRasterFormat::Float32: sampleType_ = VxSampleType::Float32; bands_ = 1; break;
    case VxRasterFormat::Int32: sampleType_ = VxSampleType::Int32; bands_ = 1; break;
    case VxRasterFormat::Bits16:
        sampleType_ = signed16 ? VxSampleType::Int16 : VxSampleType::UInt16; bands_ = 1; break;
    case VxRasterFormat::Byte: case VxRasterFormat::Palette8:
        sampleType_ = VxSampleType::UInt8; bands_ = 1; break;
    case VxRasterFormat::Bands: sampleType_ = VxSampleType::UInt8; bands_ = 4; break;
    }
    if (format == VxRasterFormat::Palette8 && !palette_) palette_ = vxMake<VxPalette>();
    allocate();
}

VxRaster::VxRaster(int width, int height, VxSampleType type, int bands)
    : width_(width), height_(height), format_(VxRasterFormat::Bands), sampleType_(type), bands_(bands) {
    if (bands < 1 || bands > 256) throw std::length_error("raster band count out of range");
    if (bands == 1) {
        switch (type) {
        case VxSampleType::UInt8: format_ = VxRasterFormat::Byte; break;
        case VxSampleType::UInt16: case VxSampleType::Int16: format_ = VxRasterFormat::Bits16; break;
        case VxSampleType::Int32: format_ = VxRasterFormat::Int32; break;
        case VxSampleType::Float32: format_ = VxRasterFormat::Float32; break;
        default: break;
        }
    }
    allocate();
}

void VxRaster::allocate() {
    bytesPerPixel_ = sampleSize(sampleType_) * bands_;
    if (!fitsLimits(width_, height_, static_cast<size_t>(bytesPerPixel_)))
        throw std::length_error("raster size out of range");
    data_.assign(static_cast<size_t>(width_) * height_ * bytesPerPixel_, 0);
}

double VxRaster::rawSample(const uint8_t* p) const {
    switch (sampleType_) {
    case VxSampleType::UInt8: return *p;
    case VxSampleType::Int8: return static_cast<int8_t>(*p);
    case VxSampleType::UInt16: { uint16_t v; std::memcpy(&v, p, 2); return v; }
    case VxSampleType::Int16: { int16_t v; std::memcpy(&v, p, 2); return v; }
    case VxSampleType::UInt32: { uint32_t v; std::memcpy(&v, p, 4); return v; }
    case VxSampleType::Int32: { int32_t v; std::memcpy(&v, p, 4); return v; }
    case VxSampleType::Float32: { float v; std::memcpy(&v, p, 4); return v; }
    case VxSampleType::Float64: { double v; std::memcpy(&v, p, 8); return v; }
    }
    return 0;
}

namespace {
template <class T> T clampTo(double v) {
    if (std::isnan(v)) return T(0);
    double lo = static_cast<double>(std::numeric_limits<T>::lowest());
    double hi = static_cast<double>(std::numeric_limits<T>::max());
    return static_cast<T>(std::lround(std::min(std::max(v, lo), hi)));
}
template <class T> void put(uint8_t* p, T v) { std::memcpy(p, &v, sizeof v); }
uint8_t toByte(double v) { return clampTo<uint8_t>(v); }
}

void VxRaster::storeSample(uint8_t* p, double v) {
    switch (sampleType_) {
    case VxSampleType::UInt8: *p = clampTo<uint8_t>(v); break;
    case VxSampleType::Int8: put(p, clampTo<int8_t>(v)); break;
    case VxSampleType::UInt16: put(p, clampTo<uint16_t>(v)); break;
    case VxSampleType::Int16: put(p, clampTo<int16_t>(v)); break;
    case VxSampleType::UInt32: put(p, static_cast<uint32_t>(std::isnan(v) ? 0 : std::min(std::max(v, 0.0), 4294967295.0))); break;
    case VxSampleType::Int32: put(p, static_cast<int32_t>(std::isnan(v) ? 0 : std::min(std::max(v, -2147483648.0), 2147483647.0))); break;
    case VxSampleType::Float32: put(p, static_cast<float>(v)); break;
    case VxSampleType::Float64: put(p, v); break;
    }
}

double VxRaster::sample(int x, int y, int band) const {
    const uint8_t* p = row(y) + static_cast<size_t>(x) * bytesPerPixel_ +
                       static_cast<size_t>(band) * sampleSize(sampleType_);
    return rawSample(p);
}

void VxRaster::setSample(int x, int y, int band, double value) {
    uint8_t* p = row(y) + static_cast<size_t>(x) * bytesPerPixel_ +
                 static_cast<size_t>(band) * sampleSize(sampleType_);
    storeSample(p, value);
}

VxColor VxRaster::color(int x, int y) const {
    const uint8_t* p = row(y) + static_cast<size_t>(x) * bytesPerPixel_;
    switch (format_) {
    case VxRasterFormat::RGBA8: return VxColor(p[0], p[1], p[2], p[3]);
    case VxRasterFormat::Palette8: return palette_ ? palette_->getColor(*p) : VxColor(0, 0, 0, 0);
    case VxRasterFormat::Byte: return VxColor(*p, *p, *p, 255);
    default: break;
    }
    if (bands_ >= 3) {
        uint8_t a = 255;
        if (bands_ >= 4 && lastBandIsAlpha_) a = toByte(sample(x, y, bands_ - 1));
        return VxColor(toByte(sample(x, y, 0)), toByte(sample(x, y, 1)), toByte(sample(x, y, 2)), a);
    }
    uint8_t g = toByte(sample(x, y, 0));
    return VxColor(g, g, g, 255);
}

void VxRaster::setColor(int x, int y, const VxColor& c) {
    if (format_ != VxRasterFormat::RGBA8) return;
    uint8_t* p = row(y) + static_cast<size_t>(x) * 4;
    p[0] = c.r; p[1] = c.g; p[2] = c.b; p[3] = c.a;
}

VxRef<VxRaster> VxRaster::toRGBA() const {
    VxRef<VxRaster> out = vxMake<VxRaster>(width_, height_, VxRasterFormat::RGBA8);
    if (format_ == VxRasterFormat::RGBA8) {
        std::memcpy(out->data(), data(), data_.size());
        return out;
    }
    const bool direct = format_ == VxRasterFormat::Palette8 || format_ == VxRasterFormat::Byte ||
                        (sampleType_ == VxSampleType::UInt8 && bands_ >= 3);
    if (direct) {
        for (int y = 0; y < height_; ++y)
            for (int x = 0; x < width_; ++x) out->setColor(x, y, color(x, y));
        return out;
    }
    const int shown = bands_ >= 3 ? 3 : 1;
    double lo = std::numeric_limits<double>::infinity(), hi = -lo;
    for (int y = 0; y < height_; ++y)
        for (int x = 0; x < width_; ++x)
            for (int b = 0; b < shown; ++b) {
                double v = sample(x, y, b);
                if (std::isnan(v) || std::isinf(v)) continue;
                lo = std::min(lo, v);
                hi = std::max(hi, v);
            }
    const double scale = hi > lo ? 255.0 / (hi - lo) : 0.0;
    for (int y = 0; y < height_; ++y) {
        for (int x = 0; x < width_; ++x) {
            uint8_t c[3] = {0, 0, 0};
            bool valid = true;
            for (int b = 0; b < shown; ++b) {
                double v = sample(x, y, b);
                if (std::isnan(v)) { valid = false; break; }
                c[b] = toByte((v - lo) * scale);
            }
            if (shown == 1) c[1] = c[2] = c[0];
            uint8_t a = valid ? 255 : 0;
            if (valid && bands_ >= 4 && lastBandIsAlpha_) a = toByte(sample(x, y, bands_ - 1));
            out->setColor(x, y, VxColor(c[0], c[1], c[2], a));
        }
    }
    return out;
}

void VxRaster::clear(uint8_t r, uint8_t g, uint8_t b, uint8_t a) {
    if (format_ == VxRasterFormat::RGBA8) {
        for (size_t i = 0; i < data_.size(); i += 4) {
            data_[i] = r; data_[i + 1] = g; data_[i + 2] = b; data_[i + 3] = a;
        }
    } else if (format_ == VxRasterFormat::Byte) {
        std::fill(data_.begin(), data_.end(), r);
    } else {
        std::fill(data_.begin(), data_.end(), 0);
    }
}

bool VxRaster::paste(const VxRaster& src, int x, int y) {
    const bool sameLayout = src.sampleType_ == sampleType_ && src.bands_ == bands_ &&
                            src.format_ == format_ &&
                            (format_ != VxRasterFormat::Palette8 || src.palette_ == palette_);
    if (!sameLayout && format_ != VxRasterFormat::RGBA8) return false;
    const int x0 = std::max(0, x), y0 = std::max(0, y);
    const int x1 = std::min(width_, x + src.width_), y1 = std::min(height_, y + src.height_);
    if (x0 >= x1 || y0 >= y1) return true;
    for (int ty = y0; ty < y1; ++ty) {
        const int sy = ty - y;
        if (sameLayout) {
            std::memcpy(row(ty) + static_cast<size_t>(x0) * bytesPerPixel_,
                        src.row(sy) + static_cast<size_t>(x0 - x) * bytesPerPixel_,
                        static_cast<size_t>(x1 - x0) * bytesPerPixel_);
        } else {
            for (int tx = x0; tx < x1; ++tx) setColor(tx, ty, src.color(tx - x, sy));
        }
    }
    return true;
}
