#include "ogc/ogcwmsnamedstyle.h"

VX_IMPLEMENT_CLASS(VxOgcWmsNamedStyle, VxEngineObject, 11)

VxOgcWmsNamedStyle::~VxOgcWmsNamedStyle() = default;

VxRef<VxEngineObject> VxOgcWmsNamedStyle::clone() const {
    return VxRef<VxEngineObject>(new VxOgcWmsNamedStyle(*this));
}
