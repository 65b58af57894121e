#pragma once
#include <algorithm>

// Axis-aligned rectangle; (0, 0, 0, 0) means not set.
struct VxRect {
    double minx = 0, miny = 0, maxx = 0, maxy = 0;
    VxRect() = default;
    VxRect(double x0, double y0, double x1, double y1) : minx(x0), miny(y0), maxx(x1), maxy(y1) {}

    bool isNull() const { return minx == 0 && miny == 0 && maxx == 0 && maxy == 0; }
    bool isValid() const { return maxx > minx && maxy > miny; }
    double width() const { return maxx - minx; }
    double height() const { return maxy - miny; }

    // Grows to contain the other rectangle; an unset rectangle takes the other as is.
    void unite(const VxRect& o) {
        if (o.isNull()) return;
        if (isNull()) { *this = o; return; }
        minx = std::min(minx, o.minx); miny = std::min(miny, o.miny);
        maxx = std::max(maxx, o.maxx); maxy = std::max(maxy, o.maxy);
    }
    bool intersects(const VxRect& o) const {
        return minx < o.maxx && o.minx < maxx && miny < o.maxy && o.miny < maxy;
    }
    VxRect intersected(const VxRect& o) const {
        return VxRect(std::max(minx, o.minx), std::max(miny, o.miny), std::min(maxx, o.maxx),
                      std::min(maxy, o.maxy));
    }
    friend bool operator==(const VxRect& a, const VxRect& b) {
        return a.minx == b.minx && a.miny == b.miny && a.maxx == b.maxx && a.maxy == b.maxy;
    }
    friend bool operator!=(const VxRect& a, const VxRect& b) { return !(a == b); }
};
