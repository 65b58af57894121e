#include <gtest/gtest.h>

#include "support/logcapture.h"

#include <string>
#include <vector>

#include "ogc/errors.h"
#include "ogc/ogcimageformat.h"
#include "vx/log.h"
#include "vx/valuetypeadapt.h"
#include "vx/xmlparsercontext.h"

namespace {

int valueOf(const VxRef<VxRefCnt>& r) {
    auto* v = dynamic_cast<ValueTypeAdapt<int>*>(r.get());
    return v ? v->value() : -1;
}

// A policy that substitutes a value instead of dropping it.
struct FallbackToPng : ErrorHandler {
    std::vector<std::string> seen;
    VxRef<VxRefCnt> unknownEnumValue(const VxString& type, const VxString& text) override {
        seen.push_back(type.str() + ":" + text.str());
        return VxRef<VxRefCnt>(new ValueTypeAdapt<int>(Png));
    }
};
}  // namespace

TEST(OgcImageFormat, NamesOfEveryValue) {
    const char* names[] = {"Png", "Jpeg", "Gif", "Auto", "Png8"};
    for (int v = Png; v <= Png8; ++v) EXPECT_STREQ(ogcImageFormatName(v), names[v]);
    EXPECT_EQ(int(Png8), 4);

    LogCapture cap;
    for (int bad : {5, -1}) {
        try {
            ogcImageFormatName(bad);
            FAIL() << bad;
        } catch (const VxXIllegalValue& e) {
            EXPECT_EQ(e.arg(0), VxString(std::to_string(bad)));
            EXPECT_EQ(e.asString(), "Value \"" + std::to_string(bad) + "\" is illegal in OgcImageFormat");
        }
    }
    EXPECT_EQ(cap.lines.size(), 2u);  // each exception logs itself once
}

TEST(OgcImageFormat, ConverterAcceptsExactNamesOnly) {
    VxXmlParserContext ctx;
    for (int v = Png; v <= Png8; ++v) EXPECT_EQ(valueOf(convertOgcImageFormat(ogcImageFormatName(v), ctx)), v);

    LogCapture cap;
    for (const char* text : {"png", "PNG", "JPEG", " Png", "Png ", "Png8x", ""})
        EXPECT_TRUE(convertOgcImageFormat(text, ctx).isNull()) << text;
    ASSERT_EQ(cap.lines.size(), 7u);
    EXPECT_EQ(cap.lines[0].level, VxLog::Warning);
    EXPECT_EQ(cap.lines[0].text, "Unknown value \"png\" for type OgcImageFormat");
    EXPECT_EQ(cap.lines[6].text, "Unknown value \"\" for type OgcImageFormat");

    // Below the warning level the report is dropped, and the answer stays null.
    int saved = VxLog::logLevel();
    VxLog::logLevel(VxLog::Error);
    EXPECT_TRUE(convertOgcImageFormat("gif", ctx).isNull());
    VxLog::logLevel(saved);
    EXPECT_EQ(cap.lines.size(), 7u);
}

TEST(OgcImageFormat, ConverterReturnsWhatTheErrorPolicyDecides) {
    VxXmlParserContext ctx;
    auto* policy = new FallbackToPng;
    ctx.setErrorHandler(std::unique_ptr<ErrorHandler>(policy));
    EXPECT_EQ(valueOf(convertOgcImageFormat("jpeg", ctx)), int(Png));
    EXPECT_EQ(valueOf(convertOgcImageFormat("Jpeg", ctx)), int(Jpeg));
    EXPECT_EQ(policy->seen, std::vector<std::string>{"OgcImageFormat:jpeg"});

    // Found through the context under its type name, as the configuration reader does.
    ctx.setErrorHandler(nullptr);
    ctx.registerTypeConverter("OgcImageFormat", &convertOgcImageFormat);
    auto conv = ctx.findTypeConverter("OgcImageFormat");
    ASSERT_TRUE(conv);
    EXPECT_EQ(valueOf(conv("Gif", ctx)), int(Gif));
    LogCapture cap;
    EXPECT_TRUE(conv("jpeg", ctx).isNull());  // the default policy is back
    EXPECT_EQ(cap.lines.size(), 1u);
}
