#pragma once
// A grid of pixels, rows stored top row first, tightly packed (stride = width * bytes per pixel).
// Pictures are RGBA8 or Palette8; coverages keep the sample type and band count they came in,
// pixel-interleaved.
#include <cstddef>
#include <cstdint>
#include <vector>

#include "vx/palette.h"
#include "vx/refcnt.h"

// The numeric values are relied upon by callers that size pixels from them.
enum class VxRasterFormat : int {
    RGBA8 = 0,     // 4 bytes: r, g, b, a
    Float32 = 1,   // one float band
    Int32 = 2,     // one signed 32-bit band
    Bits16 = 3,    // one 16-bit band, signed or unsigned (see sampleType)
    Byte = 4,      // one 8-bit grey band
    Palette8 = 5,  // one 8-bit index into the palette
    Bands = 6,     // any other data layout, described by sampleType and bands
};

enum class VxSampleType : int { UInt8, Int8, UInt16, Int16, UInt32, Int32, Float32, Float64 };

class VxRaster : public VxRefCnt {
public:
    // Decoders refuse images beyond these before allocating anything.
    static constexpr int kMaxSide = 65535;
    static constexpr size_t kMaxBytes = size_t(512) << 20;
    static bool fitsLimits(long long width, long long height, size_t bytesPerPixel);

    static int sampleSize(VxSampleType t);

    // A picture or single-band raster. Bits16 is unsigned unless signed16; Bands is taken as
    // four UInt8 bands. Throws std::length_error beyond the limits; all samples start at 0.
    VxRaster(int width, int height, VxRasterFormat format, VxRef<VxPalette> palette = nullptr,
             bool signed16 = false);
    // A data raster of any sample type and band count (1..256). Layouts that have a
    // single-band format of their own take it (one Float32 band is Float32, and so on).
    VxRaster(int width, int height, VxSampleType type, int bands);

    int width() const { return width_; }
    int height() const { return height_; }
    VxRasterFormat format() const { return format_; }
    VxSampleType sampleType() const { return sampleType_; }
    int bands() const { return bands_; }
    int bytesPerPixel() const { return bytesPerPixel_; }
    size_t stride() const { return static_cast<size_t>(width_) * bytesPerPixel_; }
    size_t byteSize() const { return data_.size(); }
    bool isDataRaster() const { return format_ != VxRasterFormat::RGBA8 && format_ != VxRasterFormat::Palette8; }

    uint8_t* data() { return data_.data(); }
    const uint8_t* data() const { return data_.data(); }
    uint8_t* row(int y) { return data_.data() + stride() * static_cast<size_t>(y); }
    const uint8_t* row(int y) const { return data_.data() + stride() * static_cast<size_t>(y); }

    const VxRef<VxPalette>& palette() const { return palette_; }
    void palette(const VxRef<VxPalette>& p) { palette_ = p; }

    // For data rasters of four or more bands: whether the last band is opacity.
    bool lastBandIsAlpha() const { return lastBandIsAlpha_; }
    void lastBandIsAlpha(bool v) { lastBandIsAlpha_ = v; }

    // Numeric value of one sample (a palette index for Palette8, a channel for RGBA8).
    // Coordinates must lie inside the raster.
    double sample(int x, int y, int band = 0) const;
    void setSample(int x, int y, int band, double value);

    // The colour a pixel shows: RGBA8 as is, palettes expanded, grey bytes as grey, other
    // data clamped to 0..255 (no stretch; toRGBA stretches).
    VxColor color(int x, int y) const;
    // RGBA8 only; other formats are left unchanged.
    void setColor(int x, int y, const VxColor& c);

    // A new RGBA8 raster: palettes expanded, grey bytes as grey; other one-band data stretched
    // linearly from its minimum to its maximum onto grey, NaN transparent; three or more bands
    // show the first three (stretched together unless they are bytes).
    VxRef<VxRaster> toRGBA() const;

    // RGBA8 fills with the colour, Byte with r; every other format is zeroed.
    void clear(uint8_t r, uint8_t g, uint8_t b, uint8_t a);

    // Copies src with its top-left corner at (x, y), clipped to this raster. Same layouts (and,
    // for palettes, the same palette) copy bytes; into RGBA8 any source is converted through
    // color(). Returns false for other mixes.
    bool paste(const VxRaster& src, int x, int y);

private:
    void allocate();
    double rawSample(const uint8_t* p) const;
    void storeSample(uint8_t* p, double v);

    int width_ = 0, height_ = 0;
    VxRasterFormat format_ = VxRasterFormat::RGBA8;
    VxSampleType sampleType_ = VxSampleType::UInt8;
    int bands_ = 4;
    int bytesPerPixel_ = 4;
    bool lastBandIsAlpha_ = false;
    VxRef<VxPalette> palette_;
    std::vector<uint8_t> data_;
};
