#pragma once
#include "vx/engineobject.h"

// A style a WMS server can draw a layer with.
class VxOgcWmsNamedStyle : public VxEngineObject {
    VX_DECLARE_CLASS()
public:
    VxOgcWmsNamedStyle() = default;
    VxOgcWmsNamedStyle(const VxString& name, const VxString& title, const VxString& abstract)
        : abstract(abstract), name(name), title(title) {}
    ~VxOgcWmsNamedStyle() override;

    VxRef<VxEngineObject> clone() const override;

    // Styles carry no ownership of their own; the owning collection may still call these.
    void markReadOnly() {}
    bool takeOwnership(int) { return true; }
    void releaseOwnership() {}

    VxString abstract;
    VxString name;
    VxString title;

private:
    VxOgcWmsNamedStyle(const VxOgcWmsNamedStyle&) = default;
};
