#include "vx/tiffhandler.h"

#include <tiffio.h>

#include <algorithm>
#include <cstdarg>
#include <cstdio>
#include <cstring>
#include <fstream>
#include <mutex>

#include "vx/log.h"

namespace {

// Input beyond this is refused before it is buffered.
constexpr size_t kMaxTiffFileBytes = size_t(1) << 30;

constexpr ttag_t kModelPixelScale = 33550;
constexpr ttag_t kModelTiepoint = 33922;
constexpr ttag_t kGeoKeyDirectory = 34735;

// libtiff does not know the GeoTIFF tags; registering them lets them be read and written
// as typed arrays.
const TIFFFieldInfo kGeoFields[] = {
    {kModelPixelScale, -1, -1, TIFF_DOUBLE, FIELD_CUSTOM, 1, 1, const_cast<char*>("ModelPixelScale")},
    {kModelTiepoint, -1, -1, TIFF_DOUBLE, FIELD_CUSTOM, 1, 1, const_cast<char*>("ModelTiepoint")},
    {kGeoKeyDirectory, -1, -1, TIFF_SHORT, FIELD_CUSTOM, 1, 1, const_cast<char*>("GeoKeyDirectory")},
};

TIFFExtendProc previousExtender = nullptr;

void geoTagExtender(TIFF* tif) {
    TIFFMergeFieldInfo(tif, kGeoFields, sizeof kGeoFields / sizeof kGeoFields[0]);
    if (previousExtender) previousExtender(tif);
}

void registerGeoTags() {
    static std::once_flag once;
    std::call_once(once, [] { previousExtender = TIFFSetTagExtender(geoTagExtender); });
}

int tiffMessage(TIFF*, void* user, const char* module, const char* fmt, va_list ap) {
    char text[512];
    std::vsnprintf(text, sizeof text, fmt, ap);
    VxLog::logf(VxLog::Debug, "TIFF %1% (%2%): %3%", std::string(user ? "error" : "warning"),
                std::string(module ? module : ""), std::string(text));
    return 1;  // handled: nothing reaches libtiff's global handlers
}

// A file in memory for libtiff's client I/O; grows when written.
struct MemFile {
    const uint8_t* data = nullptr;
    size_t size = 0;
    size_t pos = 0;
    std::vector<uint8_t>* out = nullptr;
};

tmsize_t memRead(thandle_t h, void* buf, tmsize_t n) {
    auto* f = static_cast<MemFile*>(h);
    if (n <= 0 || f->pos >= f->size) return 0;
    size_t count = std::min(static_cast<size_t>(n), f->size - f->pos);
    std::memcpy(buf, f->data + f->pos, count);
    f->pos += count;
    return static_cast<tmsize_t>(count);
}

tmsize_t memWrite(thandle_t h, void* buf, tmsize_t n) {
    auto* f = static_cast<MemFile*>(h);
    if (!f->out || n < 0) return -1;
    try {
        size_t end = f->pos + static_cast<size_t>(n);
        if (end > f->out->size()) f->out->resize(end);
        std::memcpy(f->out->data() + f->pos, buf, static_cast<size_t>(n));
        f->pos = end;
        f->data = f->out->data();
        f->size = f->out->size();
    } catch (...) {
        return -1;
    }
    return n;
}

toff_t memSeek(thandle_t h, toff_t off, int whence) {
    auto* f = static_cast<MemFile*>(h);
    // Relative offsets arrive as two's-complement in the unsigned type.
    const int64_t delta = static_cast<int64_t>(off);
    int64_t target = delta;
    if (whence == SEEK_CUR) target = static_cast<int64_t>(f->pos) + delta;
    else if (whence == SEEK_END) target = static_cast<int64_t>(f->size) + delta;
    if (target < 0 || static_cast<uint64_t>(target) > uint64_t(4) * kMaxTiffFileBytes)
        return static_cast<toff_t>(-1);
    f->pos = static_cast<size_t>(target);
    return static_cast<toff_t>(f->pos);
}

int memClose(thandle_t) { return 0; }
toff_t memSize(thandle_t h) { return static_cast<MemFile*>(h)->size; }
int memMap(thandle_t, void**, toff_t*) { return 0; }
void memUnmap(thandle_t, void*, toff_t) {}

TIFF* openMem(MemFile* file, const char* mode) {
    registerGeoTags();
    TIFFOpenOptions* opts = TIFFOpenOptionsAlloc();
    if (!opts) return nullptr;
    static int errorTag = 1;
    TIFFOpenOptionsSetErrorHandlerExtR(opts, tiffMessage, &errorTag);
    TIFFOpenOptionsSetWarningHandlerExtR(opts, tiffMessage, nullptr);
    TIFFOpenOptionsSetMaxSingleMemAlloc(opts, static_cast<tmsize_t>(VxRaster::kMaxBytes));
    TIFF* tif = TIFFClientOpenExt("memory", mode, file, memRead, memWrite, memSeek, memClose,
                                  memSize, memMap, memUnmap, opts);
    TIFFOpenOptionsFree(opts);
    return tif;
}

struct TiffCloser {
    TIFF* tif;
    ~TiffCloser() { if (tif) TIFFClose(tif); }
};

VxRef<VxRasterGeometry> rejected(const std::string& why) {
    VxLog::logf(VxLog::Warning, "TIFF image rejected: %1%", why);
    return nullptr;
}

bool sampleTypeOf(uint16_t bits, uint16_t format, VxSampleType* t) {
    if (format == SAMPLEFORMAT_VOID) format = SAMPLEFORMAT_UINT;
    switch (format) {
    case SAMPLEFORMAT_UINT:
        if (bits == 8) { *t = VxSampleType::UInt8; return true; }
        if (bits == 16) { *t = VxSampleType::UInt16; return true; }
        if (bits == 32) { *t = VxSampleType::UInt32; return true; }
        return false;
    case SAMPLEFORMAT_INT:
        if (bits == 8) { *t = VxSampleType::Int8; return true; }
        if (bits == 16) { *t = VxSampleType::Int16; return true; }
        if (bits == 32) { *t = VxSampleType::Int32; return true; }
        return false;
    case SAMPLEFORMAT_IEEEFP:
        if (bits == 32) { *t = VxSampleType::Float32; return true; }
        if (bits == 64) { *t = VxSampleType::Float64; return true; }
        return false;
    default: return false;
    }
}

// Copies a block of decoded rows (cols x rows pixels at its own row pitch) into the raster at
// (x0, y0); for separate planes only the given band is written.
void copyBlock(VxRaster& r, const uint8_t* block, size_t blockPitch, int x0, int y0, int cols,
               int rows, bool separate, int band) {
    const size_t bpp = static_cast<size_t>(r.bytesPerPixel());
    const size_t ss = static_cast<size_t>(VxRaster::sampleSize(r.sampleType()));
    for (int y = 0; y < rows; ++y) {
        const uint8_t* src = block + blockPitch * static_cast<size_t>(y);
        uint8_t* dst = r.row(y0 + y) + bpp * static_cast<size_t>(x0);
        if (!separate) {
            std::memcpy(dst, src, bpp * static_cast<size_t>(cols));
        } else {
            dst += ss * static_cast<size_t>(band);
            for (int x = 0; x < cols; ++x) std::memcpy(dst + bpp * x, src + ss * x, ss);
        }
    }
}

bool readTiles(TIFF* tif, VxRaster& r, bool separate, std::string& why) {
    uint32_t tw = 0, th = 0;
    TIFFGetField(tif, TIFFTAG_TILEWIDTH, &tw);
    TIFFGetField(tif, TIFFTAG_TILELENGTH, &th);
    if (tw == 0 || th == 0 || tw > 65536 || th > 65536) { why = "bad tile size"; return false; }
    const size_t pixelBytes = separate ? VxRaster::sampleSize(r.sampleType()) : r.bytesPerPixel();
    const size_t pitch = pixelBytes * tw;
    const size_t expected = pitch * th;
    if (expected > VxRaster::kMaxBytes) { why = "tile too large"; return false; }
    tmsize_t tileSize = TIFFTileSize(tif);
    if (tileSize <= 0 || static_cast<size_t>(tileSize) < expected) { why = "inconsistent tile size"; return false; }
    std::vector<uint8_t> buf(static_cast<size_t>(tileSize));
    const int planes = separate ? r.bands() : 1;
    for (int plane = 0; plane < planes; ++plane) {
        for (uint32_t ty = 0; ty < static_cast<uint32_t>(r.height()); ty += th) {
            for (uint32_t tx = 0; tx < static_cast<uint32_t>(r.width()); tx += tw) {
                uint32_t tile = TIFFComputeTile(tif, tx, ty, 0, static_cast<uint16_t>(plane));
                if (tile >= TIFFNumberOfTiles(tif)) { why = "missing tile"; return false; }
                if (TIFFReadEncodedTile(tif, tile, buf.data(), tileSize) < static_cast<tmsize_t>(expected)) {
                    why = "cannot read tile";
                    return false;
                }
                int cols = static_cast<int>(std::min<uint32_t>(tw, r.width() - tx));
                int rows = static_cast<int>(std::min<uint32_t>(th, r.height() - ty));
                copyBlock(r, buf.data(), pitch, static_cast<int>(tx), static_cast<int>(ty), cols, rows,
                          separate, plane);
            }
        }
    }
    return true;
}

bool readStrips(TIFF* tif, VxRaster& r, bool separate, std::string& why) {
    uint32_t rps = 0;
    TIFFGetFieldDefaulted(tif, TIFFTAG_ROWSPERSTRIP, &rps);
    const uint32_t height = static_cast<uint32_t>(r.height());
    if (rps == 0 || rps > height) rps = height;
    const uint32_t stripsPerPlane = (height + rps - 1) / rps;
    const int planes = separate ? r.bands() : 1;
    if (TIFFNumberOfStrips(tif) < stripsPerPlane * static_cast<uint32_t>(planes)) {
        why = "missing strips";
        return false;
    }
    const size_t pixelBytes = separate ? VxRaster::sampleSize(r.sampleType()) : r.bytesPerPixel();
    const size_t pitch = pixelBytes * static_cast<size_t>(r.width());
    std::vector<uint8_t> buf(pitch * rps);
    for (int plane = 0; plane < planes; ++plane) {
        for (uint32_t s = 0; s < stripsPerPlane; ++s) {
            const uint32_t y0 = s * rps;
            const uint32_t rows = std::min(rps, height - y0);
            const tmsize_t want = static_cast<tmsize_t>(pitch * rows);
            const uint32_t strip = static_cast<uint32_t>(plane) * stripsPerPlane + s;
            if (TIFFReadEncodedStrip(tif, strip, buf.data(), want) < want) {
                why = "cannot read strip";
                return false;
            }
            copyBlock(r, buf.data(), pitch, 0, static_cast<int>(y0), r.width(), static_cast<int>(rows),
                      separate, plane);
        }
    }
    return true;
}

void readGeoreferencing(TIFF* tif, VxRasterGeometry& g, int width, int height) {
    uint16_t nScale = 0, nTie = 0, nKeys = 0;
    double* scale = nullptr;
    double* tie = nullptr;
    uint16_t* keys = nullptr;
    if (TIFFGetField(tif, kGeoKeyDirectory, &nKeys, &keys) && keys && nKeys >= 4) {
        const int count = std::min<int>(keys[3], (nKeys - 4) / 4);
        for (int i = 0; i < count; ++i) {
            const uint16_t* k = keys + 4 + 4 * i;
            if (k[1] != 0 || k[2] != 1) continue;  // only values held in place
            if (k[0] == 2048 || k[0] == 3072) g.sourceEpsg(k[3]);
        }
    }
    if (!TIFFGetField(tif, kModelPixelScale, &nScale, &scale) || !scale || nScale < 2) return;
    if (!TIFFGetField(tif, kModelTiepoint, &nTie, &tie) || !tie || nTie < 6) return;
    const double minx = tie[3] - tie[0] * scale[0];
    const double maxy = tie[4] + tie[1] * scale[1];
    g.sourceBounds(VxRect(minx, maxy - height * scale[1], minx + width * scale[0], maxy));
}

VxRef<VxRaster> readAsRgba(TIFF* tif, uint32_t w, uint32_t h, std::string& why) {
    char msg[1024] = {0};
    if (!TIFFRGBAImageOK(tif, msg)) { why = msg; return nullptr; }
    auto r = vxMake<VxRaster>(static_cast<int>(w), static_cast<int>(h), VxRasterFormat::RGBA8);
    std::vector<uint32_t> pixels(static_cast<size_t>(w) * h);
    if (!TIFFReadRGBAImageOriented(tif, w, h, pixels.data(), ORIENTATION_TOPLEFT, 0)) {
        why = "cannot render image";
        return nullptr;
    }
    for (uint32_t y = 0; y < h; ++y)
        for (uint32_t x = 0; x < w; ++x) {
            uint32_t p = pixels[static_cast<size_t>(y) * w + x];
            r->setColor(static_cast<int>(x), static_cast<int>(y),
                        VxColor(static_cast<uint8_t>(TIFFGetR(p)), static_cast<uint8_t>(TIFFGetG(p)),
                                static_cast<uint8_t>(TIFFGetB(p)), static_cast<uint8_t>(TIFFGetA(p))));
        }
    return r;
}

}  // namespace

VxRef<VxRasterGeometry> VxTiffHandler::read(std::istream& in) const {
    std::vector<uint8_t> bytes;
    try {
        if (!readAll(in, bytes, kMaxTiffFileBytes)) return rejected("file too large");
    } catch (const std::exception& e) {
        return rejected(e.what());
    }
    return decode(bytes.data(), bytes.size());
}

VxRef<VxRasterGeometry> VxTiffHandler::decode(const uint8_t* data, size_t size) {
    if (!data || size < 8) return rejected("not a TIFF file");
    MemFile file;
    file.data = data;
    file.size = size;
    // "m": no memory mapping; the procedures above serve every read.
    TiffCloser closer{openMem(&file, "rm")};
    TIFF* tif = closer.tif;
    if (!tif) return rejected("cannot open");
    try {
        uint32_t w = 0, h = 0;
        uint16_t spp = 1, bits = 1, format = SAMPLEFORMAT_UINT, planar = PLANARCONFIG_CONTIG;
        uint16_t photometric = PHOTOMETRIC_MINISBLACK, compression = COMPRESSION_NONE;
        TIFFGetField(tif, TIFFTAG_IMAGEWIDTH, &w);
        TIFFGetField(tif, TIFFTAG_IMAGELENGTH, &h);
        TIFFGetFieldDefaulted(tif, TIFFTAG_SAMPLESPERPIXEL, &spp);
        TIFFGetFieldDefaulted(tif, TIFFTAG_BITSPERSAMPLE, &bits);
        TIFFGetFieldDefaulted(tif, TIFFTAG_SAMPLEFORMAT, &format);
        TIFFGetFieldDefaulted(tif, TIFFTAG_PLANARCONFIG, &planar);
        TIFFGetField(tif, TIFFTAG_PHOTOMETRIC, &photometric);
        TIFFGetFieldDefaulted(tif, TIFFTAG_COMPRESSION, &compression);
        if (!TIFFIsCODECConfigured(compression)) return rejected("unsupported compression");
        if (spp == 0) return rejected("no samples");
        if (!VxRaster::fitsLimits(w, h, static_cast<size_t>(spp) * std::max<uint16_t>(bits, 8) / 8))
            return rejected("image too large");

        if (photometric == PHOTOMETRIC_YCBCR && compression == COMPRESSION_JPEG) {
            // Let the codec deliver RGB, which then reads like any 3-band image.
            TIFFSetField(tif, TIFFTAG_JPEGCOLORMODE, JPEGCOLORMODE_RGB);
            photometric = PHOTOMETRIC_RGB;
        }
        VxSampleType type;
        const bool dataLayout = sampleTypeOf(bits, format, &type) && photometric != PHOTOMETRIC_YCBCR &&
                                photometric != PHOTOMETRIC_SEPARATED && photometric != PHOTOMETRIC_CIELAB &&
                                photometric != PHOTOMETRIC_LOGLUV && photometric != PHOTOMETRIC_LOGL &&
                                (photometric != PHOTOMETRIC_PALETTE || (spp == 1 && bits == 8));
        std::string why;
        VxRef<VxRaster> raster;
        if (!dataLayout) {
            if (!VxRaster::fitsLimits(w, h, 8)) return rejected("image too large");
            raster = readAsRgba(tif, w, h, why);
            if (!raster) return rejected(why);
        } else {
            raster = vxMake<VxRaster>(static_cast<int>(w), static_cast<int>(h), type, static_cast<int>(spp));
            const bool separate = planar == PLANARCONFIG_SEPARATE && spp > 1;
            const bool ok = TIFFIsTiled(tif) ? readTiles(tif, *raster, separate, why)
                                             : readStrips(tif, *raster, separate, why);
            if (!ok) return rejected(why);
            if (photometric == PHOTOMETRIC_PALETTE) {
                uint16_t *red = nullptr, *green = nullptr, *blue = nullptr;
                if (!TIFFGetField(tif, TIFFTAG_COLORMAP, &red, &green, &blue) || !red || !green || !blue)
                    return rejected("palette image without colour map");
                // Some writers put 8-bit values in the 16-bit map.
                bool eightBit = true;
                for (int i = 0; i < 256; ++i)
                    if (red[i] > 255 || green[i] > 255 || blue[i] > 255) eightBit = false;
                const int shift = eightBit ? 0 : 8;
                auto pal = vxMake<VxPalette>();
                for (int i = 0; i < 256; ++i)
                    pal->addColor(VxColor(static_cast<uint8_t>(red[i] >> shift),
                                          static_cast<uint8_t>(green[i] >> shift),
                                          static_cast<uint8_t>(blue[i] >> shift)));
                auto indexed = vxMake<VxRaster>(static_cast<int>(w), static_cast<int>(h),
                                                VxRasterFormat::Palette8, pal);
                std::memcpy(indexed->data(), raster->data(), raster->byteSize());
                raster = indexed;
            } else if (spp >= 4) {
                uint16_t extraCount = 0;
                uint16_t* extra = nullptr;
                if (TIFFGetField(tif, TIFFTAG_EXTRASAMPLES, &extraCount, &extra) && extra && extraCount > 0) {
                    uint16_t last = extra[extraCount - 1];
                    raster->lastBandIsAlpha(last == EXTRASAMPLE_ASSOCALPHA || last == EXTRASAMPLE_UNASSALPHA);
                }
            }
        }
        auto geometry = vxMake<VxRasterGeometry>(raster);
        readGeoreferencing(tif, *geometry, static_cast<int>(w), static_cast<int>(h));
        return geometry;
    } catch (const std::exception& e) {
        return rejected(e.what());
    }
}

bool VxTiffHandler::encode(const VxRaster& raster, std::vector<uint8_t>& out,
                           const VxTiffWriteOptions& options) {
    out.clear();
    MemFile file;
    file.out = &out;
    TIFF* tif = openMem(&file, "w");
    if (!tif) return false;
    TiffCloser closer{tif};

    const int spp = raster.bands();
    const uint32_t w = static_cast<uint32_t>(raster.width()), h = static_cast<uint32_t>(raster.height());
    const VxSampleType t = raster.sampleType();
    uint16_t sampleFormat = SAMPLEFORMAT_UINT;
    if (t == VxSampleType::Int8 || t == VxSampleType::Int16 || t == VxSampleType::Int32) sampleFormat = SAMPLEFORMAT_INT;
    if (t == VxSampleType::Float32 || t == VxSampleType::Float64) sampleFormat = SAMPLEFORMAT_IEEEFP;

    bool ok = TIFFSetField(tif, TIFFTAG_IMAGEWIDTH, w) && TIFFSetField(tif, TIFFTAG_IMAGELENGTH, h) &&
              TIFFSetField(tif, TIFFTAG_SAMPLESPERPIXEL, static_cast<uint16_t>(spp)) &&
              TIFFSetField(tif, TIFFTAG_BITSPERSAMPLE, static_cast<uint16_t>(VxRaster::sampleSize(t) * 8)) &&
              TIFFSetField(tif, TIFFTAG_SAMPLEFORMAT, sampleFormat) &&
              TIFFSetField(tif, TIFFTAG_PLANARCONFIG, PLANARCONFIG_CONTIG) &&
              TIFFSetField(tif, TIFFTAG_COMPRESSION, options.deflate ? COMPRESSION_ADOBE_DEFLATE : COMPRESSION_NONE);

    std::vector<uint16_t> cmap[3];
    const bool rgb = t == VxSampleType::UInt8 && spp >= 3 && raster.format() != VxRasterFormat::Palette8;
    if (raster.format() == VxRasterFormat::Palette8) {
        for (auto& c : cmap) c.assign(256, 0);
        for (int i = 0; i < 256 && raster.palette(); ++i) {
            VxColor c = raster.palette()->getColor(i);
            cmap[0][i] = static_cast<uint16_t>(c.r * 257);
            cmap[1][i] = static_cast<uint16_t>(c.g * 257);
            cmap[2][i] = static_cast<uint16_t>(c.b * 257);
        }
        ok = ok && TIFFSetField(tif, TIFFTAG_PHOTOMETRIC, PHOTOMETRIC_PALETTE) &&
             TIFFSetField(tif, TIFFTAG_COLORMAP, cmap[0].data(), cmap[1].data(), cmap[2].data());
    } else {
        ok = ok && TIFFSetField(tif, TIFFTAG_PHOTOMETRIC, rgb ? PHOTOMETRIC_RGB : PHOTOMETRIC_MINISBLACK);
    }
    const int colourBands = rgb ? 3 : 1;
    if (spp > colourBands) {
        std::vector<uint16_t> extra(static_cast<size_t>(spp - colourBands), EXTRASAMPLE_UNSPECIFIED);
        if (raster.format() == VxRasterFormat::RGBA8 || raster.lastBandIsAlpha())
            extra.back() = EXTRASAMPLE_UNASSALPHA;
        ok = ok && TIFFSetField(tif, TIFFTAG_EXTRASAMPLES, static_cast<uint16_t>(extra.size()), extra.data());
    }

    if (ok && options.bounds.isValid()) {
        double scale[3] = {options.bounds.width() / w, options.bounds.height() / h, 0.0};
        double tie[6] = {0, 0, 0, options.bounds.minx, options.bounds.maxy, 0};
        ok = TIFFSetField(tif, kModelPixelScale, 3, scale) && TIFFSetField(tif, kModelTiepoint, 6, tie);
        if (ok && options.epsg > 0 && options.epsg < 65535) {
            // Version 1.1.0, three keys: model type, PixelIsArea, the EPSG system.
            uint16_t keys[16] = {1, 1, 0, 3,
                                 1024, 0, 1, static_cast<uint16_t>(options.geographic ? 2 : 1),
                                 1025, 0, 1, 1,
                                 static_cast<uint16_t>(options.geographic ? 2048 : 3072), 0, 1,
                                 static_cast<uint16_t>(options.epsg)};
            ok = TIFFSetField(tif, kGeoKeyDirectory, 16, keys);
        }
    }

    const size_t pitch = raster.stride();
    if (ok && options.tileSize > 0) {
        const uint32_t ts = static_cast<uint32_t>((std::min(options.tileSize, 4096) + 15) / 16 * 16);
        ok = TIFFSetField(tif, TIFFTAG_TILEWIDTH, ts) && TIFFSetField(tif, TIFFTAG_TILELENGTH, ts);
        const size_t bpp = static_cast<size_t>(raster.bytesPerPixel());
        std::vector<uint8_t> tile(bpp * ts * ts);
        for (uint32_t ty = 0; ok && ty < h; ty += ts) {
            for (uint32_t tx = 0; ok && tx < w; tx += ts) {
                std::fill(tile.begin(), tile.end(), 0);
                const uint32_t cols = std::min(ts, w - tx), rows = std::min(ts, h - ty);
                for (uint32_t y = 0; y < rows; ++y)
                    std::memcpy(tile.data() + y * ts * bpp, raster.row(static_cast<int>(ty + y)) + tx * bpp, cols * bpp);
                ok = TIFFWriteEncodedTile(tif, TIFFComputeTile(tif, tx, ty, 0, 0), tile.data(),
                                          static_cast<tmsize_t>(tile.size())) >= 0;
            }
        }
    } else if (ok) {
        const uint32_t rps = std::max<uint32_t>(1, TIFFDefaultStripSize(tif, 0));
        ok = TIFFSetField(tif, TIFFTAG_ROWSPERSTRIP, rps);
        for (uint32_t y = 0, s = 0; ok && y < h; y += rps, ++s) {
            const uint32_t rows = std::min(rps, h - y);
            ok = TIFFWriteEncodedStrip(tif, s, const_cast<uint8_t*>(raster.row(static_cast<int>(y))),
                                       static_cast<tmsize_t>(pitch * rows)) >= 0;
        }
    }
    ok = ok && TIFFWriteDirectory(tif);
    TIFFClose(tif);
    closer.tif = nullptr;
    if (!ok) {
        VxLog::warning("TIFF encoding failed");
        out.clear();
    }
    return ok;
}

bool VxTiffHandler::writeTiff(const VxRaster& raster, const std::string& path,
                              const VxTiffWriteOptions& options) {
    std::vector<uint8_t> bytes;
    if (!encode(raster, bytes, options)) return false;
    std::ofstream f(path, std::ios::binary | std::ios::trunc);
    f.write(reinterpret_cast<const char*>(bytes.data()), static_cast<std::streamsize>(bytes.size()));
    f.close();
    return static_cast<bool>(f);
}
