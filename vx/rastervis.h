#pragma once
// Visualizers turn raster features into scene-graph nodes.
#include <cstdint>
#include <iterator>
#include <map>

#include "vx/palette.h"
#include "vx/sgnode.h"

// Colours keyed by an attribute value (here: a palette index).
class VxKeyValueTable : public VxRefCnt {
public:
    void add(int64_t key, const VxColor& c) { map_[key] = c; }
    // A step table: a key without an entry of its own takes the colour of the nearest key
    // below it, so runs of one colour need only their first key. Below the first key: none.
    bool lookup(int64_t key, VxColor& out) const {
        auto it = map_.upper_bound(key);
        if (it == map_.begin()) return false;
        out = std::prev(it)->second;
        return true;
    }
    // The colour of the greatest key not above key: tables store a run of equal colours once.
    bool lookupFloor(int64_t key, VxColor& out) const {
        auto it = map_.upper_bound(key);
        if (it == map_.begin()) return false;
        out = std::prev(it)->second;
        return true;
    }
    size_t size() const { return map_.size(); }

private:
    std::map<int64_t, VxColor> map_;
};

// A colour that depends on one attribute of what is drawn, looked up in a table.
class VxKeyedAttributeVariable : public VxRefCnt {
public:
    VxKeyedAttributeVariable(int attribute, const VxRef<VxKeyValueTable>& table, const VxColor* defaultColor)
        : attribute(attribute), table(table), hasDefault(defaultColor != nullptr),
          defaultColor(defaultColor ? *defaultColor : VxColor()) {}
    int attribute;
    VxRef<VxKeyValueTable> table;
    bool hasDefault;
    VxColor defaultColor;
};

// Parameters of a presentation; the raster visualizers need none of them.
struct VxCreatePresParams {
    void* drawable = nullptr;
    VxRect rect1, rect2;
    VxRef<VxFeature> feature;
    bool flag1 = true, flag2 = false, flag3 = true;
    VxRect rect3;
    double value = 0;
};

class VxRasterVis : public VxRefCnt {
public:
    // Multi-band rasters drawn as colours; value is the opacity (255 opaque), filter 1 bilinear.
    static VxRef<VxRasterVis> createRGBVis(const void* condition, int value, int filter);
    // Single-band rasters drawn through a colour table.
    static VxRef<VxRasterVis> createFromColorTable(const VxRef<VxKeyedAttributeVariable>& colors);

    VxRef<VxSGNode2> createPresentation2(const VxRef<VxFeature>& f, const VxCreatePresParams& p) const;
    VxRef<VxSGNode3> createPresentation3(const VxRef<VxFeature>& f, const VxCreatePresParams& p) const;

private:
    VxRasterVis() = default;
    int value_ = 255;
    int filter_ = 1;
    VxRef<VxKeyedAttributeVariable> colors_;
};
