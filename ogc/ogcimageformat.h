#pragma once
// The image encodings the module can ask a map or tile service for. Layers and
// capabilities keep the value as a plain integer.
#include "vx/refcnt.h"
#include "vx/string.h"

class VxXmlParserContext;

enum OgcImageFormat : int {
    Png = 0,
    Jpeg = 1,
    Gif = 2,
    Auto = 3,  // no preference: the layer picks one the server offers
    Png8 = 4,  // 8-bit palette PNG
};

// The configuration name of a value; throws VxXIllegalValue for a value without one.
const char* ogcImageFormatName(int value);

// Converter for the configuration type "OgcImageFormat": the exact, case-sensitive name
// gives a ValueTypeAdapt<int>; any other text goes to the context's error handler,
// whose answer is returned.
VxRef<VxRefCnt> convertOgcImageFormat(const VxString& text, VxXmlParserContext& ctx);
