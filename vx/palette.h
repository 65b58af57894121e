#pragma once
// Colour table of a palette raster: index -> RGBA colour.
#include <cstdint>
#include <vector>

#include "vx/refcnt.h"

// An 8-bit-per-channel colour with straight (not premultiplied) alpha.
struct VxColor {
    uint8_t r = 0, g = 0, b = 0, a = 0;
    VxColor() = default;
    VxColor(uint8_t red, uint8_t green, uint8_t blue, uint8_t alpha = 255)
        : r(red), g(green), b(blue), a(alpha) {}
    friend bool operator==(const VxColor& x, const VxColor& y) {
        return x.r == y.r && x.g == y.g && x.b == y.b && x.a == y.a;
    }
    friend bool operator!=(const VxColor& x, const VxColor& y) { return !(x == y); }
};

class VxPalette : public VxRefCnt {
public:
    VxPalette() = default;
    explicit VxPalette(std::vector<VxColor> entries);

    int size() const { return static_cast<int>(entries_.size()); }
    // Indices outside the table read as transparent black, so corrupt indices cannot fault.
    VxColor getColor(int index) const;
    void setColor(int index, const VxColor& c);
    void addColor(const VxColor& c) { entries_.push_back(c); }
    const std::vector<VxColor>& entries() const { return entries_; }

private:
    std::vector<VxColor> entries_;
};
