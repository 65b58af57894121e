#include <gtest/gtest.h>

#include "ogc/errors.h"
#include "support/logcapture.h"

TEST(ErrorCatalogue, MessagesAreBuiltLetterForLetter) {
    EXPECT_EQ(VxXIllegalValue("f", 1, "5", "OgcImageFormat").asString(),
              "Value \"5\" is illegal in OgcImageFormat");
    EXPECT_EQ(VxXWmsGetCapabilitiesXmlError("f", 1, "bad").asString(),
              "Error parsing WMS GetCapabilites response: bad");
    EXPECT_EQ(VxXGetCapabilitiesXmlError("f", 1, "12", "oops").asString(),
              "Error parsing GetCapabilites response, line 12: oops");
    EXPECT_EQ(VxXRequestError("f", 1, "GetMap", "example.org").asString(),
              "Request 'GetMap' to server 'example.org' failed.");
    EXPECT_EQ(VxXWmtsServiceNegotiationFailed("f", 1, "tiles", "http://x").asString(),
              "tiles: Failed to negotiate capabilities with WMTS service at: http://x");
    EXPECT_EQ(VxXReadOnly("f", 1, "Collection").asString(), "The Collection is read-only.");
    EXPECT_EQ(VxXNullValue("f", 1, "setter", "VxRefProperty").asString(),
              "Value \"setter\" is null in VxRefProperty.");
    EXPECT_STREQ(VxXGetCapabilitiesXmlError("f", 1, "", "").errorId(),
                 VxXWmsGetCapabilitiesXmlError("f", 1, "").errorId());
}

TEST(ErrorCatalogue, FixedTemplatesIgnoreArgumentsAndQuotesAreKept) {
    EXPECT_EQ(VxXXmlRequiredValueMissing("f", 1).asString(), "RequiredValueMissing");
    EXPECT_EQ(VxXXmlTypeConversionFailed("f", 1).asString(), "Type conversion failed");
    // A name that already carries quotation marks gets them twice.
    EXPECT_EQ(VxXPropertyFrozen("f", 1, "\"Url\"").asString(),
              "The property \"\"Url\"\" can not be changed after the object has been initialized.");
    // Arguments are substituted once: a "$2" inside an argument stays literal.
    EXPECT_EQ(VxXOgcWmsError("f", 1, "cost $2").asString(), "cost $2");
}

TEST(ErrorCatalogue, ConstructionLogsOnceEvenWhenCaughtAndIgnored) {
    LogCapture cap;
    try {
        throw VxXInvalidUrl("ogcwmslayer", 42, "ftp://x");
    } catch (const VxException&) {
    }
    ASSERT_EQ(cap.lines.size(), 1u);
    EXPECT_EQ(cap.lines[0].level, VxLog::Error);
    EXPECT_NE(cap.lines[0].text.find("Invalid URL: ftp://x"), std::string::npos);
    // Copies made while throwing do not log again.
    VxXInvalidUrl e("f", 1, "u");
    VxXInvalidUrl copy(e);
    EXPECT_EQ(cap.lines.size(), 2u);
    EXPECT_EQ(copy.asString(), "Invalid URL: u");
}
