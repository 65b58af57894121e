#include <gtest/gtest.h>

#include <chrono>
#include <cmath>
#include <cstring>
#include <limits>
#include <sstream>
#include <string>
#include <vector>

#include "vx/gifhandler.h"
#include "vx/imagehandler.h"
#include "vx/jpeghandler.h"
#include "vx/log.h"
#include "vx/pnghandler.h"
#include "vx/raster.h"
#include "vx/tiffhandler.h"

namespace {

using Bytes = std::vector<uint8_t>;

VxRef<VxRasterGeometry> decode(const char* type, const Bytes& b) {
    std::istringstream in(std::string(b.begin(), b.end()));
    return VxImageHandler::streamIn(type, nullptr, in);
}

// Deterministic noise keeps compressed sizes large enough for cuts to land inside pixel data.
struct LogCapture {
    std::vector<std::string> lines;
    LogCapture() { VxLog::setSink([this](int, const char*, const std::string& t) { lines.push_back(t); }); }
    ~LogCapture() { VxLog::setSink(nullptr); }
    bool saw(const std::string& text) const {
        for (const auto& l : lines) if (l.find(text) != std::string::npos) return true;
        return false;
    }
};

uint32_t noise(uint32_t& s) { s ^= s << 13; s ^= s >> 17; s ^= s << 5; return s; }

VxRef<VxRaster> rgbaPattern(int w, int h) {
    auto r = vxMake<VxRaster>(w, h, VxRasterFormat::RGBA8);
    uint32_t s = 7;
    for (int y = 0; y < h; ++y)
        for (int x = 0; x < w; ++x)
            r->setColor(x, y, VxColor(uint8_t(x * 4), uint8_t(y * 5), uint8_t(noise(s)), uint8_t(255 - x)));
    return r;
}

VxRef<VxRaster> palettePattern(int w, int h) {
    auto pal = vxMake<VxPalette>(std::vector<VxColor>{
        VxColor(255, 0, 0), VxColor(0, 255, 0), VxColor(0, 0, 0, 0), VxColor(10, 20, 30, 128)});
    auto r = vxMake<VxRaster>(w, h, VxRasterFormat::Palette8, pal);
    uint32_t s = 11;
    for (int y = 0; y < h; ++y)
        for (int x = 0; x < w; ++x) r->setSample(x, y, 0, noise(s) % 4);
    return r;
}

// --- An independent PNG writer: stored (uncompressed) deflate blocks, no libpng. ---
uint32_t crc32(const uint8_t* p, size_t n, uint32_t c = 0) {
    c = ~c;
    for (size_t i = 0; i < n; ++i) {
        c ^= p[i];
        for (int k = 0; k < 8; ++k) c = (c >> 1) ^ (0xEDB88320u & (0u - (c & 1)));
    }
    return ~c;
}
void be32(Bytes& b, uint32_t v) { for (int i = 3; i >= 0; --i) b.push_back(uint8_t(v >> (8 * i))); }
void chunk(Bytes& png, const char* type, const Bytes& data) {
    be32(png, uint32_t(data.size()));
    Bytes body(type, type + 4);
    body.insert(body.end(), data.begin(), data.end());
    png.insert(png.end(), body.begin(), body.end());
    be32(png, crc32(body.data(), body.size()));
}
Bytes rawPng(uint32_t w, uint32_t h, uint8_t colorType, uint8_t depth, const Bytes& scanlines,
             const Bytes& plte = {}, const Bytes& trns = {}) {
    Bytes png = {0x89, 'P', 'N', 'G', 0x0D, 0x0A, 0x1A, 0x0A};
    Bytes ihdr;
    be32(ihdr, w); be32(ihdr, h);
    ihdr.insert(ihdr.end(), {depth, colorType, 0, 0, 0});
    chunk(png, "IHDR", ihdr);
    if (!plte.empty()) chunk(png, "PLTE", plte);
    if (!trns.empty()) chunk(png, "tRNS", trns);
    Bytes z = {0x78, 0x01};
    size_t pos = 0;
    do {
        size_t n = std::min<size_t>(65535, scanlines.size() - pos);
        bool last = pos + n == scanlines.size();
        z.push_back(last ? 1 : 0);
        z.push_back(uint8_t(n)); z.push_back(uint8_t(n >> 8));
        z.push_back(uint8_t(~n)); z.push_back(uint8_t(~n >> 8));
        z.insert(z.end(), scanlines.begin() + long(pos), scanlines.begin() + long(pos + n));
        pos += n;
    } while (pos < scanlines.size());
    uint32_t a = 1, b = 0;
    for (uint8_t c : scanlines) { a = (a + c) % 65521; b = (b + a) % 65521; }
    be32(z, (b << 16) | a);
    chunk(png, "IDAT", z);
    chunk(png, "IEND", {});
    return png;
}

// --- An independent TIFF writer: one uncompressed strip per plane, either byte order. ---
struct RawTiff {
    bool bigEndian = false;
    uint32_t width = 0, height = 0;
    uint16_t spp = 1, bits = 8, planar = 1, photometric = 1;  // unsigned samples
    Bytes planes;  // plane after plane (or interleaved when planar == 1), already in file byte order

    Bytes build() const {
        Bytes b;
        auto u16 = [&](uint16_t v) {
            if (bigEndian) { b.push_back(uint8_t(v >> 8)); b.push_back(uint8_t(v)); }
            else { b.push_back(uint8_t(v)); b.push_back(uint8_t(v >> 8)); }
        };
        auto u32 = [&](uint32_t v) {
            if (bigEndian) { u16(uint16_t(v >> 16)); u16(uint16_t(v)); }
            else { u16(uint16_t(v)); u16(uint16_t(v >> 16)); }
        };
        const uint32_t nStrips = planar == 2 ? spp : 1;
        const uint32_t stripBytes = uint32_t(planes.size() / nStrips);
        b.push_back(bigEndian ? 'M' : 'I'); b.push_back(bigEndian ? 'M' : 'I');
        u16(42);
        u32(8);
        const uint16_t nTags = 10;
        const uint32_t ifdEnd = 8 + 2 + nTags * 12 + 4;
        const uint32_t offsetsAt = ifdEnd, countsAt = offsetsAt + 4 * nStrips, dataAt = countsAt + 4 * nStrips;
        auto tag = [&](uint16_t t, uint16_t type, uint32_t count, uint32_t value) {
            u16(t); u16(type); u32(count);
            if (type == 3 && count == 1) { u16(uint16_t(value)); u16(0); } else u32(value);
        };
        u16(nTags);
        tag(256, 4, 1, width);
        tag(257, 4, 1, height);
        tag(258, 3, 1, bits);
        tag(259, 3, 1, 1);
        tag(262, 3, 1, photometric);
        tag(273, 4, nStrips, nStrips == 1 ? dataAt : offsetsAt);
        tag(277, 3, 1, spp);
        tag(278, 4, 1, height);
        tag(279, 4, nStrips, nStrips == 1 ? stripBytes : countsAt);
        tag(284, 3, 1, planar);
        u32(0);
        if (nStrips > 1) {
            for (uint32_t i = 0; i < nStrips; ++i) u32(dataAt + i * stripBytes);
            for (uint32_t i = 0; i < nStrips; ++i) u32(stripBytes);
        }
        b.insert(b.end(), planes.begin(), planes.end());
        return b;
    }
};

}  // namespace

TEST(ImageHandlers, KeysAndMimeTypesFindTheirHandler) {
    EXPECT_EQ(VxImageHandler::getHandler("png")->key(), "png");
    EXPECT_EQ(VxImageHandler::getHandler("jpg")->key(), "jpg");
    EXPECT_EQ(VxImageHandler::getHandler("jpeg"), VxImageHandler::getHandler("jpg"));
    EXPECT_EQ(VxImageHandler::getHandler("image/jpe")->key(), "jpg");
    EXPECT_EQ(VxImageHandler::getHandler("gif")->key(), "gif");
    EXPECT_EQ(VxImageHandler::getHandler("tif")->key(), "tiff");
    EXPECT_EQ(VxImageHandler::getHandler(" IMAGE/PNG; mode=8bit")->key(), "png");
    EXPECT_EQ(VxImageHandler::getHandler("image/geotiff")->key(), "tiff");
    EXPECT_TRUE(VxImageHandler::getHandler("bmp").isNull());
    EXPECT_TRUE(VxImageHandler::getHandler("").isNull());
    Bytes png;
    ASSERT_TRUE(VxPngHandler::encode(*rgbaPattern(4, 4), png));
    EXPECT_TRUE(decode("image/bmp", png).isNull());
    EXPECT_FALSE(decode("png; mode=8bit", png).isNull());
}

TEST(ImageHandlers, PngRgbaAndPaletteRoundTrip) {
    auto rgba = rgbaPattern(37, 23);
    Bytes png;
    ASSERT_TRUE(VxPngHandler::encode(*rgba, png));
    auto g = decode("image/png", png);
    ASSERT_TRUE(g);
    const VxRaster& r = *g->raster();
    ASSERT_EQ(r.format(), VxRasterFormat::RGBA8);
    ASSERT_EQ(r.width(), 37);
    ASSERT_EQ(r.height(), 23);
    EXPECT_EQ(0, std::memcmp(r.data(), rgba->data(), rgba->byteSize()));
    EXPECT_TRUE(g->asMultiBandRaster());

    auto indexed = palettePattern(33, 17);
    ASSERT_TRUE(VxPngHandler::encode(*indexed, png));
    g = decode("png", png);
    ASSERT_TRUE(g);
    const VxRaster& p = *g->raster();
    ASSERT_EQ(p.format(), VxRasterFormat::Palette8);
    ASSERT_TRUE(p.palette());
    EXPECT_EQ(p.palette()->entries(), indexed->palette()->entries());  // tRNS kept as alpha
    EXPECT_EQ(0, std::memcmp(p.data(), indexed->data(), indexed->byteSize()));
    EXPECT_TRUE(g->asMultiBandRaster().isNull());
}

TEST(ImageHandlers, PngFromIndependentWriterCoversOtherColourTypes) {
    // 2x2 grey, 8-bit.
    auto g = decode("png", rawPng(2, 2, 0, 8, {0, 0, 200, 0, 50, 255}));
    ASSERT_TRUE(g);
    EXPECT_EQ(g->raster()->format(), VxRasterFormat::RGBA8);
    EXPECT_EQ(g->raster()->color(1, 0), VxColor(200, 200, 200, 255));
    EXPECT_EQ(g->raster()->color(0, 1), VxColor(50, 50, 50, 255));

    // 2x1 grey + alpha.
    g = decode("png", rawPng(2, 1, 4, 8, {0, 10, 0, 20, 128}));
    ASSERT_TRUE(g);
    EXPECT_EQ(g->raster()->color(0, 0), VxColor(10, 10, 10, 0));
    EXPECT_EQ(g->raster()->color(1, 0), VxColor(20, 20, 20, 128));

    // 1x1 RGB, 16-bit, big-endian samples: scaled to 8 bits.
    g = decode("png", rawPng(1, 1, 2, 16, {0, 0xFF, 0xFF, 0x80, 0x80, 0x00, 0x00}));
    ASSERT_TRUE(g);
    EXPECT_EQ(g->raster()->color(0, 0), VxColor(255, 128, 0, 255));

    // 4x1 palette, 2-bit indices 3,2,1,0 packed in one byte; tRNS shorter than the palette.
    g = decode("png", rawPng(4, 1, 3, 2, {0, 0xE4}, {1, 2, 3, 4, 5, 6, 7, 8, 9, 10, 11, 12}, {0, 99}));
    ASSERT_TRUE(g);
    const VxRaster& p = *g->raster();
    ASSERT_EQ(p.format(), VxRasterFormat::Palette8);
    EXPECT_EQ(p.sample(0, 0), 3);
    EXPECT_EQ(p.sample(3, 0), 0);
    EXPECT_EQ(p.palette()->getColor(0), VxColor(1, 2, 3, 0));
    EXPECT_EQ(p.palette()->getColor(1), VxColor(4, 5, 6, 99));
    EXPECT_EQ(p.palette()->getColor(3), VxColor(10, 11, 12, 255));
}

TEST(ImageHandlers, JpegDecodesOpaqueWithinTolerance) {
    auto src = vxMake<VxRaster>(64, 48, VxRasterFormat::RGBA8);
    for (int y = 0; y < 48; ++y)
        for (int x = 0; x < 64; ++x) src->setColor(x, y, VxColor(uint8_t(x * 4), uint8_t(y * 5), 100, 255));
    Bytes jpg;
    ASSERT_TRUE(VxJpegHandler::encode(*src, jpg, 95));
    auto g = decode("image/jpeg", jpg);
    ASSERT_TRUE(g);
    const VxRaster& r = *g->raster();
    ASSERT_EQ(r.format(), VxRasterFormat::RGBA8);
    ASSERT_EQ(r.width(), 64);
    ASSERT_EQ(r.height(), 48);
    int worst = 0;
    for (int y = 0; y < 48; ++y)
        for (int x = 0; x < 64; ++x) {
            VxColor a = src->color(x, y), b = r.color(x, y);
            EXPECT_EQ(b.a, 255);
            worst = std::max({worst, std::abs(a.r - b.r), std::abs(a.g - b.g), std::abs(a.b - b.b)});
        }
    EXPECT_LE(worst, 8);
}

TEST(ImageHandlers, GifKeepsPaletteAndTransparentIndex) {
    auto src = palettePattern(41, 29);
    Bytes gif;
    ASSERT_TRUE(VxGifHandler::encode(*src, gif));
    auto g = decode("gif", gif);
    ASSERT_TRUE(g);
    const VxRaster& r = *g->raster();
    ASSERT_EQ(r.format(), VxRasterFormat::Palette8);
    ASSERT_EQ(r.width(), 41);
    EXPECT_EQ(0, std::memcmp(r.data(), src->data(), src->byteSize()));
    EXPECT_EQ(r.palette()->getColor(2).a, 0);
    // GIF has no partial alpha: entry 3 comes back opaque.
    EXPECT_EQ(r.palette()->getColor(3), VxColor(10, 20, 30, 255));
    EXPECT_EQ(r.palette()->getColor(0), VxColor(255, 0, 0, 255));
}

TEST(ImageHandlers, TiffKeepsSampleTypeAndBands) {
    auto rgb = vxMake<VxRaster>(19, 7, VxSampleType::UInt8, 3);
    for (int y = 0; y < 7; ++y)
        for (int x = 0; x < 19; ++x)
            for (int b = 0; b < 3; ++b) rgb->setSample(x, y, b, (x * 13 + y * 7 + b * 50) % 256);
    Bytes tif;
    ASSERT_TRUE(VxTiffHandler::encode(*rgb, tif));
    auto g = decode("image/tiff", tif);
    ASSERT_TRUE(g);
    const VxRaster& r = *g->raster();
    EXPECT_EQ(r.format(), VxRasterFormat::Bands);
    EXPECT_EQ(r.sampleType(), VxSampleType::UInt8);
    EXPECT_EQ(r.bands(), 3);
    EXPECT_EQ(0, std::memcmp(r.data(), rgb->data(), rgb->byteSize()));
    EXPECT_TRUE(g->asMultiBandRaster());

    // Float32 grid: every bit pattern kept, through strips, deflate and odd-sized tiles.
    auto grid = vxMake<VxRaster>(37, 21, VxRasterFormat::Float32);
    for (int y = 0; y < 21; ++y)
        for (int x = 0; x < 37; ++x) grid->setSample(x, y, 0, (x - 18) * 0.1f + y * 1e-7f - 3e-30f * x);
    grid->setSample(5, 5, 0, std::numeric_limits<double>::quiet_NaN());
    VxTiffWriteOptions tiled;
    tiled.tileSize = 16;
    VxTiffWriteOptions deflate;
    deflate.deflate = true;
    for (const VxTiffWriteOptions& o : {VxTiffWriteOptions(), tiled, deflate}) {
        ASSERT_TRUE(VxTiffHandler::encode(*grid, tif, o));
        g = decode("tiff", tif);
        ASSERT_TRUE(g);
        const VxRaster& f = *g->raster();
        EXPECT_EQ(f.format(), VxRasterFormat::Float32);
        EXPECT_EQ(f.bands(), 1);
        ASSERT_EQ(f.width(), 37);
        ASSERT_EQ(f.height(), 21);
        EXPECT_EQ(0, std::memcmp(f.data(), grid->data(), grid->byteSize())) << "tile " << o.tileSize;
        EXPECT_TRUE(g->asMultiBandRaster().isNull());
    }
}

TEST(ImageHandlers, TiffOtherByteOrderAndSeparatePlanes) {
    // Two 16-bit bands, big-endian, stored plane after plane.
    RawTiff t;
    t.bigEndian = true;
    t.width = 3; t.height = 2; t.spp = 2; t.bits = 16; t.planar = 2;
    const uint16_t band0[6] = {1, 2, 3, 4, 5, 0xFFFF}, band1[6] = {100, 200, 300, 400, 500, 600};
    for (const uint16_t* band : {band0, band1})
        for (int i = 0; i < 6; ++i) { t.planes.push_back(uint8_t(band[i] >> 8)); t.planes.push_back(uint8_t(band[i])); }
    auto g = decode("tiff", t.build());
    ASSERT_TRUE(g);
    const VxRaster& r = *g->raster();
    EXPECT_EQ(r.sampleType(), VxSampleType::UInt16);
    ASSERT_EQ(r.bands(), 2);
    EXPECT_EQ(r.sample(2, 1, 0), 65535);
    EXPECT_EQ(r.sample(1, 0, 1), 200);
    EXPECT_EQ(r.sample(0, 1, 1), 400);
}

TEST(ImageHandlers, TiffPaletteAndGeoreferencing) {
    auto indexed = palettePattern(9, 5);
    Bytes tif;
    VxTiffWriteOptions geo;
    geo.bounds = VxRect(500000, 4100000, 500900, 4100500);
    geo.epsg = 32632;
    ASSERT_TRUE(VxTiffHandler::encode(*indexed, tif, geo));
    auto g = decode("tiff", tif);
    ASSERT_TRUE(g);
    const VxRaster& r = *g->raster();
    ASSERT_EQ(r.format(), VxRasterFormat::Palette8);
    EXPECT_EQ(0, std::memcmp(r.data(), indexed->data(), indexed->byteSize()));
    EXPECT_EQ(r.palette()->getColor(1), VxColor(0, 255, 0, 255));
    EXPECT_EQ(g->sourceBounds(), geo.bounds);
    EXPECT_EQ(g->sourceEpsg(), 32632);
    EXPECT_TRUE(g->bounds().isNull());  // placing it is the caller's business
}

TEST(ImageHandlers, TruncatedInputYieldsNull) {
    LogCapture quiet;
    Bytes png, jpg, gif, tif;
    ASSERT_TRUE(VxPngHandler::encode(*rgbaPattern(64, 48), png));
    ASSERT_TRUE(VxJpegHandler::encode(*rgbaPattern(64, 48), jpg));
    ASSERT_TRUE(VxGifHandler::encode(*palettePattern(64, 48), gif));
    ASSERT_TRUE(VxTiffHandler::encode(*rgbaPattern(64, 48), tif));
    struct Case { const char* type; const Bytes* bytes; size_t keepAtMost; };
    // A GIF's final ';' is never read: the first frame is all that is decoded.
    for (const Case& c : {Case{"png", &png, 1}, Case{"jpg", &jpg, 1}, Case{"gif", &gif, 2}, Case{"tiff", &tif, 1}}) {
        const size_t n = c.bytes->size();
        for (size_t keep : {size_t(0), size_t(3), size_t(12), size_t(40), n / 3, n / 2, n * 3 / 4, n - c.keepAtMost}) {
            Bytes cut(c.bytes->begin(), c.bytes->begin() + long(keep));
            EXPECT_TRUE(decode(c.type, cut).isNull()) << c.type << " cut at " << keep << " of " << n;
        }
        EXPECT_FALSE(decode(c.type, *c.bytes).isNull()) << c.type;
    }
}

TEST(ImageHandlers, CorruptInputNeverFaults) {
    LogCapture quiet;
    Bytes png, jpg, gif, tif;
    ASSERT_TRUE(VxPngHandler::encode(*rgbaPattern(32, 32), png));
    ASSERT_TRUE(VxJpegHandler::encode(*rgbaPattern(32, 32), jpg));
    ASSERT_TRUE(VxGifHandler::encode(*palettePattern(32, 32), gif));
    ASSERT_TRUE(VxTiffHandler::encode(*rgbaPattern(32, 32), tif));
    struct Case { const char* type; const Bytes* bytes; };
    for (const Case& c : {Case{"png", &png}, Case{"jpg", &jpg}, Case{"gif", &gif}, Case{"tiff", &tif}}) {
        Bytes bad = *c.bytes;
        bad[0] ^= 0xFF;  // signature or byte-order mark
        EXPECT_TRUE(decode(c.type, bad).isNull()) << c.type;
        uint32_t s = 12345;
        for (int round = 0; round < 40; ++round) {
            bad = *c.bytes;
            for (int k = 0; k < 6; ++k) bad[8 + noise(s) % (bad.size() - 8)] = uint8_t(noise(s));
            auto g = decode(c.type, bad);
            if (g) {
                EXPECT_TRUE(g->raster());
                EXPECT_LE(g->raster()->byteSize(), VxRaster::kMaxBytes);
            }
        }
    }
    // A PNG body byte changed is caught by the chunk checksum.
    Bytes bad = png;
    bad[png.size() / 2] ^= 0x01;
    EXPECT_TRUE(decode("png", bad).isNull());
}

TEST(ImageHandlers, AbsurdDimensionsAreRefusedBeforeAllocation) {
    // Each refusal must be this decoder's size check, not a later failure.
    auto timed = [](const char* type, const Bytes& b) {
        LogCapture log;
        auto t0 = std::chrono::steady_clock::now();
        auto g = decode(type, b);
        auto ms = std::chrono::duration_cast<std::chrono::milliseconds>(std::chrono::steady_clock::now() - t0).count();
        EXPECT_LT(ms, 2000) << type;
        EXPECT_TRUE(log.saw("Invalid IHDR") || log.saw("image too large")) << type;
        return g;
    };
    // PNG: patch IHDR width and height, then its checksum, so only the size is wrong.
    Bytes png;
    ASSERT_TRUE(VxPngHandler::encode(*rgbaPattern(8, 8), png));
    for (uint32_t side : {100000u, 60000u}) {
        Bytes big = png;
        for (int i = 0; i < 4; ++i) big[16 + i] = big[20 + i] = uint8_t(side >> (24 - 8 * i));
        uint32_t crc = crc32(big.data() + 12, 17);
        for (int i = 0; i < 4; ++i) big[29 + i] = uint8_t(crc >> (24 - 8 * i));
        EXPECT_TRUE(timed("png", big).isNull()) << side;
    }
    // JPEG: 16-bit sides in the frame header, at most 65500.
    Bytes jpg;
    ASSERT_TRUE(VxJpegHandler::encode(*rgbaPattern(8, 8), jpg));
    size_t sof = 2;
    while (sof + 9 < jpg.size() && !(jpg[sof] == 0xFF && jpg[sof + 1] == 0xC0)) ++sof;
    ASSERT_LT(sof + 9, jpg.size());
    jpg[sof + 5] = jpg[sof + 7] = 0xFD;
    jpg[sof + 6] = jpg[sof + 8] = 0xE8;  // 65000 x 65000
    EXPECT_TRUE(timed("jpg", jpg).isNull());
    // GIF: screen and frame at the 16-bit maximum.
    Bytes gif;
    ASSERT_TRUE(VxGifHandler::encode(*palettePattern(8, 8), gif));
    for (size_t i = 6; i < 10; ++i) gif[i] = 0xFF;
    EXPECT_TRUE(timed("gif", gif).isNull());
    // TIFF: 100000 x 100000 declared over a tiny strip.
    RawTiff t;
    t.width = t.height = 100000;
    t.planes = Bytes(64, 1);
    EXPECT_TRUE(timed("tiff", t.build()).isNull());
}

TEST(Raster, ToRgbaStretchesDataAndExpandsPalettes) {
    auto f = vxMake<VxRaster>(3, 1, VxRasterFormat::Float32);
    f->setSample(0, 0, 0, -10.0);
    f->setSample(1, 0, 0, 30.0);
    f->setSample(2, 0, 0, std::numeric_limits<double>::quiet_NaN());
    auto rgba = f->toRGBA();
    EXPECT_EQ(rgba->color(0, 0), VxColor(0, 0, 0, 255));
    EXPECT_EQ(rgba->color(1, 0), VxColor(255, 255, 255, 255));
    EXPECT_EQ(rgba->color(2, 0).a, 0);

    auto s = vxMake<VxRaster>(2, 1, VxRasterFormat::Bits16, nullptr, true);
    s->setSample(0, 0, 0, -32768);
    s->setSample(1, 0, 0, 40000);  // clamps to the type
    EXPECT_EQ(s->sample(0, 0), -32768);
    EXPECT_EQ(s->sample(1, 0), 32767);

    auto p = palettePattern(2, 2);
    p->setSample(1, 1, 0, 200);  // outside the palette
    auto e = p->toRGBA();
    EXPECT_EQ(e->color(1, 1), VxColor(0, 0, 0, 0));
    EXPECT_EQ(e->color(0, 0), p->palette()->getColor(int(p->sample(0, 0))));

    EXPECT_THROW(VxRaster(100000, 2, VxRasterFormat::Byte), std::length_error);
    EXPECT_THROW(VxRaster(0, 2, VxRasterFormat::Byte), std::length_error);
}

TEST(Raster, PasteExpandsIntoRgbaAndClips) {
    auto mosaic = vxMake<VxRaster>(4, 4, VxRasterFormat::RGBA8);
    mosaic->clear(0, 0, 0, 0);
    auto tile = palettePattern(2, 2);
    ASSERT_TRUE(mosaic->paste(*tile, 3, 1));
    EXPECT_EQ(mosaic->color(3, 1), tile->color(0, 0));
    EXPECT_EQ(mosaic->color(3, 2), tile->color(0, 1));
    EXPECT_EQ(mosaic->color(2, 1), VxColor(0, 0, 0, 0));
    auto grey = vxMake<VxRaster>(2, 2, VxRasterFormat::Byte);
    EXPECT_FALSE(grey->paste(*tile, 0, 0));
}
