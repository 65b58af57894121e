// Checks that the sample MapServer answers as the integration suite expects: the layer
// tree, pictures with the sample features where they belong, coverages with the designed
// values, and the request counter.
#include <png.h>
#include <tiffio.h>

#include <cmath>
#include <cstdint>
#include <cstdio>
#include <string>
#include <vector>

#include "integration/sample_services.h"

namespace {

using Response = SampleServices::Response;

struct Rgba {
    int r, g, b, a;
};

struct Picture {
    unsigned width = 0, height = 0;
    std::vector<uint8_t> rgba;
    Rgba at(unsigned x, unsigned y) const {
        const uint8_t* p = &rgba[(size_t(y) * width + x) * 4];
        return {p[0], p[1], p[2], p[3]};
    }
};

uint32_t bigEndian32(const std::string& s, size_t at) {
    return (uint32_t(uint8_t(s[at])) << 24) | (uint32_t(uint8_t(s[at + 1])) << 16) |
           (uint32_t(uint8_t(s[at + 2])) << 8) | uint32_t(uint8_t(s[at + 3]));
}

// Width and height from the IHDR chunk, which a PNG file must start with.
bool pngHeaderSize(const std::string& data, uint32_t& w, uint32_t& h) {
    static const char sig[] = "\x89PNG\r\n\x1a\n";
    if (data.size() < 24 || data.compare(0, 8, sig, 8) != 0 || data.compare(12, 4, "IHDR") != 0)
        return false;
    w = bigEndian32(data, 16);
    h = bigEndian32(data, 20);
    return true;
}

Picture decodePng(const std::string& data) {
    Picture pic;
    png_image image{};
    image.version = PNG_IMAGE_VERSION;
    if (!png_image_begin_read_from_memory(&image, data.data(), data.size())) return pic;
    image.format = PNG_FORMAT_RGBA;
    std::vector<uint8_t> buf(PNG_IMAGE_SIZE(image));
    if (!png_image_finish_read(&image, nullptr, buf.data(), 0, nullptr)) return pic;
    pic.width = image.width;
    pic.height = image.height;
    pic.rgba = std::move(buf);
    return pic;
}

bool isCityBlue(const Rgba& c) { return c.r < 30 && c.g < 30 && c.b > 220 && c.a == 255; }

std::string wms(const std::string& query) { return SampleServices::url("/wms?") + query; }

// The part of a multipart/mixed body that follows the header "Content-Type: <type>".
std::string multipartPart(const std::string& body, const std::string& boundary,
                          const std::string& type) {
    const size_t header = body.find("Content-Type: " + type + "\r\n");
    if (header == std::string::npos) return {};
    const size_t start = body.find("\r\n\r\n", header);
    if (start == std::string::npos) return {};
    const size_t end = body.find("\r\n--" + boundary, start + 4);
    if (end == std::string::npos) return {};
    return body.substr(start + 4, end - start - 4);
}

class SampleServicesSmoke : public SampleServicesTest {};

TEST_F(SampleServicesSmoke, WmsCapabilitiesListTheSampleTreeInBothVersions) {
    const std::string online = "xlink:href=\"" + SampleServices::url("/wms?") + "\"";
    const char* names[] = {"basemap", "countries", "roads",   "overlays",  "places",
                           "cities",  "dateline",  "parcels", "elevation", "rgb"};
    for (const char* version : {"1.1.1", "1.3.0"}) {
        SCOPED_TRACE(version);
        Response r = SampleServices::get(
            wms(std::string("SERVICE=WMS&VERSION=") + version + "&REQUEST=GetCapabilities"));
        ASSERT_EQ(r.status, 200) << r.error;
        EXPECT_NE(r.contentType.find("xml"), std::string::npos) << r.contentType;
        EXPECT_NE(r.body.find(std::string(version) == "1.1.1" ? "<WMT_MS_Capabilities"
                                                              : "<WMS_Capabilities"),
                  std::string::npos);
        for (const char* name : names)
            EXPECT_NE(r.body.find(std::string("<Name>") + name + "</Name>"), std::string::npos)
                << name;
        // GetMap must lead back to this front, not to mapserv's own idea of its address.
        EXPECT_NE(r.body.find(online), std::string::npos) << online;
        EXPECT_NE(r.body.find("<Name>filled</Name>"), std::string::npos);
        EXPECT_NE(r.body.find("<Name>outline</Name>"), std::string::npos);
    }
    Response r = SampleServices::get(wms("SERVICE=WMS&VERSION=1.3.0&REQUEST=GetCapabilities"));
    EXPECT_NE(r.body.find("<MaxWidth>2048</MaxWidth>"), std::string::npos);
    EXPECT_NE(r.body.find("<MinScaleDenominator>1000</MinScaleDenominator>"), std::string::npos);
}

TEST_F(SampleServicesSmoke, Wms111PathAnswersEveryCapabilitiesRequestWith111) {
    Response r = SampleServices::get(SampleServices::url("/wms111?") +
                                     "service=WMS&request=GetCapabilities&version=1.3.0");
    ASSERT_EQ(r.status, 200) << r.error;
    EXPECT_NE(r.body.find("<WMT_MS_Capabilities version=\"1.1.1\""), std::string::npos);
    EXPECT_NE(r.body.find("xlink:href=\"" + SampleServices::url("/wms111?") + "\""),
              std::string::npos);
}

TEST_F(SampleServicesSmoke, SecondMapOffersEpsg4326Only) {
    Response r = SampleServices::get(SampleServices::url("/wms4326?") +
                                     "SERVICE=WMS&VERSION=1.3.0&REQUEST=GetCapabilities");
    ASSERT_EQ(r.status, 200) << r.error;
    EXPECT_NE(r.body.find("<Name>rgb4326</Name>"), std::string::npos);
    EXPECT_NE(r.body.find("<CRS>EPSG:4326</CRS>"), std::string::npos);
    EXPECT_EQ(r.body.find("EPSG:3857"), std::string::npos);
    EXPECT_EQ(r.body.find("CRS:84"), std::string::npos);
}

TEST_F(SampleServicesSmoke, GetMapDrawsCitiesWhereTheyAre) {
    // 1.3.0 with EPSG:4326 takes latitude first; half a degree per pixel.
    Response r = SampleServices::get(
        wms("SERVICE=WMS&VERSION=1.3.0&REQUEST=GetMap&LAYERS=cities&STYLES=&CRS=EPSG:4326"
            "&BBOX=-90,-180,90,180&WIDTH=720&HEIGHT=360&FORMAT=image/png&TRANSPARENT=TRUE"));
    ASSERT_EQ(r.status, 200) << r.error;
    ASSERT_EQ(r.contentType, "image/png") << r.body.substr(0, 300);
    uint32_t w = 0, h = 0;
    ASSERT_TRUE(pngHeaderSize(r.body, w, h));
    EXPECT_EQ(w, 720u);
    EXPECT_EQ(h, 360u);
    Picture pic = decodePng(r.body);
    ASSERT_EQ(pic.width, 720u);
    EXPECT_TRUE(isCityBlue(pic.at(380, 80)));   // 10E 50N
    EXPECT_TRUE(isCityBlue(pic.at(220, 240)));  // 70W 30S
    EXPECT_EQ(pic.at(370, 90).a, 0);            // 5E 45N: nothing there
    EXPECT_EQ(pic.at(600, 300).a, 0);

    // Web Mercator: the server reprojects; 10E 50N lands at (270.2, 173.6).
    const double half = 20037508.342789244;
    r = SampleServices::get(wms(
        "SERVICE=WMS&VERSION=1.1.1&REQUEST=GetMap&LAYERS=cities&STYLES=&SRS=EPSG:3857&BBOX=" +
        std::to_string(-half) + "," + std::to_string(-half) + "," + std::to_string(half) + "," +
        std::to_string(half) + "&WIDTH=512&HEIGHT=512&FORMAT=image/png&TRANSPARENT=TRUE"));
    ASSERT_EQ(r.contentType, "image/png") << r.body.substr(0, 300);
    pic = decodePng(r.body);
    ASSERT_EQ(pic.width, 512u);
    const double yMerc = 6378137.0 * std::log(std::tan(M_PI / 4 + 50.0 * M_PI / 360));
    const unsigned py = unsigned((half - yMerc) / (2 * half) * 512);
    EXPECT_TRUE(isCityBlue(pic.at(270, py)));
    EXPECT_EQ(pic.at(256, 100).a, 0);
}

TEST_F(SampleServicesSmoke, GetMapOutputFormats) {
    const std::string base =
        "SERVICE=WMS&VERSION=1.1.1&REQUEST=GetMap&LAYERS=countries&STYLES=outline"
        "&SRS=EPSG:4326&BBOX=-180,-90,180,90&WIDTH=200&HEIGHT=100&FORMAT=";
    Response r = SampleServices::get(wms(base + "image/png;%20mode=8bit"));
    EXPECT_EQ(r.contentType, "image/png; mode=8bit");
    uint32_t w = 0, h = 0;
    ASSERT_TRUE(pngHeaderSize(r.body, w, h));
    EXPECT_EQ(uint8_t(r.body[25]), 3) << "palette colour type expected";

    r = SampleServices::get(wms(base + "image/jpeg"));
    EXPECT_EQ(r.contentType, "image/jpeg");
    ASSERT_GE(r.body.size(), 3u);
    EXPECT_EQ(r.body.compare(0, 3, "\xff\xd8\xff"), 0);

    // Beyond MAXSIZE the server answers with an exception, still HTTP 200.
    r = SampleServices::get(wms(
        "SERVICE=WMS&VERSION=1.1.1&REQUEST=GetMap&LAYERS=countries&STYLES="
        "&SRS=EPSG:4326&BBOX=-180,-90,180,90&WIDTH=4000&HEIGHT=100&FORMAT=image/png"));
    EXPECT_EQ(r.status, 200);
    EXPECT_EQ(r.contentType.rfind("application/vnd.ogc.se_xml", 0), 0u) << r.contentType;
}

TEST_F(SampleServicesSmoke, WcsCapabilitiesListBothCoverages) {
    Response r = SampleServices::get(SampleServices::url("/wcs?") +
                                     "SERVICE=WCS&VERSION=1.1.1&REQUEST=GetCapabilities");
    ASSERT_EQ(r.status, 200) << r.error;
    EXPECT_NE(r.body.find("http://www.opengis.net/wcs/1.1"), std::string::npos);
    EXPECT_NE(r.body.find("<Identifier>rgb</Identifier>"), std::string::npos);
    EXPECT_NE(r.body.find("<Identifier>elevation</Identifier>"), std::string::npos);
    EXPECT_NE(r.body.find("<SupportedFormat>image/tiff;subtype=float32</SupportedFormat>"),
              std::string::npos);
    EXPECT_NE(r.body.find("xlink:href=\"" + SampleServices::url("/wcs?") + "\""),
              std::string::npos);
}

TEST_F(SampleServicesSmoke, GetCoverageAnswersMultipartWithTheDesignedValues) {
    // WCS 1.1 bounding boxes span grid point centres: this one is the source grid exactly.
    Response r = SampleServices::get(
        SampleServices::url("/wcs?") +
        "SERVICE=WCS&VERSION=1.1.1&REQUEST=GetCoverage&IDENTIFIER=elevation"
        "&FORMAT=image/tiff;subtype=float32"
        "&BOUNDINGBOX=45.05,5.05,54.95,14.95,urn:ogc:def:crs:EPSG::4326");
    ASSERT_EQ(r.status, 200) << r.error;
    ASSERT_EQ(r.contentType, "multipart/mixed; boundary=wcs") << r.body.substr(0, 300);
    EXPECT_NE(r.body.find("<Coverages"), std::string::npos);
    const std::string tiff = multipartPart(r.body, "wcs", "image/tiff;subtype=float32");
    ASSERT_GT(tiff.size(), 8u);
    ASSERT_TRUE(tiff.compare(0, 4, "II*\0", 4) == 0 || tiff.compare(0, 4, "MM\0*", 4) == 0);

    char path[] = "/tmp/vx-coverage-XXXXXX";
    int fd = ::mkstemp(path);
    ASSERT_GE(fd, 0);
    ASSERT_EQ(::write(fd, tiff.data(), tiff.size()), ssize_t(tiff.size()));
    ::close(fd);
    TIFFSetWarningHandler(nullptr);  // MapServer's GeoTIFF tags are unknown to plain libtiff
    TIFF* tif = TIFFOpen(path, "r");
    ASSERT_NE(tif, nullptr);
    uint32_t w = 0, h = 0;
    uint16_t bits = 0, format = 0;
    TIFFGetField(tif, TIFFTAG_IMAGEWIDTH, &w);
    TIFFGetField(tif, TIFFTAG_IMAGELENGTH, &h);
    TIFFGetField(tif, TIFFTAG_BITSPERSAMPLE, &bits);
    TIFFGetFieldDefaulted(tif, TIFFTAG_SAMPLEFORMAT, &format);
    EXPECT_EQ(w, 100u);
    EXPECT_EQ(h, 100u);
    EXPECT_EQ(bits, 32);
    EXPECT_EQ(format, SAMPLEFORMAT_IEEEFP);
    std::vector<float> row(TIFFScanlineSize(tif) / sizeof(float));
    for (uint32_t y : {0u, 50u, 99u}) {
        ASSERT_EQ(TIFFReadScanline(tif, row.data(), y, 0), 1);
        for (uint32_t x : {0u, 50u, 99u})
            EXPECT_EQ(row[x], 100.5f + float(x) + 1000.0f * float(y)) << x << "," << y;
    }
    TIFFClose(tif);
    ::unlink(path);
}

TEST_F(SampleServicesSmoke, RequestCounterCountsServiceRequestsOnly) {
    SampleServices::resetStats();
    EXPECT_EQ(SampleServices::requestCount(), 0);
    SampleServices::get(wms("SERVICE=WMS&VERSION=1.3.0&REQUEST=GetCapabilities"));
    SampleServices::get(SampleServices::url("/wcs?SERVICE=WCS&REQUEST=GetCapabilities"));
    Response r = SampleServices::post(
        SampleServices::url("/wms"),
        "SERVICE=WMS&VERSION=1.1.1&REQUEST=GetMap&LAYERS=cities&STYLES=&SRS=EPSG:4326"
        "&BBOX=-180,-90,180,90&WIDTH=64&HEIGHT=32&FORMAT=image/png",
        "application/x-www-form-urlencoded");
    EXPECT_EQ(r.contentType, "image/png");
    EXPECT_EQ(SampleServices::requestCount(), 3);
    const std::vector<std::string> log = SampleServices::requestLog();
    ASSERT_EQ(log.size(), 3u);
    EXPECT_EQ(log[0], "GET /wms?SERVICE=WMS&VERSION=1.3.0&REQUEST=GetCapabilities");
    EXPECT_EQ(log[1], "GET /wcs?SERVICE=WCS&REQUEST=GetCapabilities");
    EXPECT_EQ(log[2], "POST /wms");
    SampleServices::resetStats();
    EXPECT_EQ(SampleServices::requestCount(), 0);
}

}  // namespace
