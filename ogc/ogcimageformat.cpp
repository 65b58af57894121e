#include "ogc/ogcimageformat.h"

#include "ogc/errors.h"
#include "vx/stringutils.h"
#include "vx/valuetypeadapt.h"
#include "vx/xmlparsercontext.h"

namespace {
const char* const kNames[] = {"Png", "Jpeg", "Gif", "Auto", "Png8"};
constexpr int kCount = sizeof(kNames) / sizeof(kNames[0]);
}

const char* ogcImageFormatName(int value) {
    if (value < 0 || value >= kCount)
        throw VxXIllegalValue("ogcimageformat", __LINE__, VxStringUtils::itoa(value), "OgcImageFormat");
    return kNames[value];
}

VxRef<VxRefCnt> convertOgcImageFormat(const VxString& text, VxXmlParserContext& ctx) {
    for (int i = 0; i < kCount; ++i)
        if (text == kNames[i]) return VxRef<VxRefCnt>(new ValueTypeAdapt<int>(i));
    return ctx.errorHandler().unknownEnumValue("OgcImageFormat", text);
}
