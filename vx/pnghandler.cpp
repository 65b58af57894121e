#include "vx/pnghandler.h"

#include <png.h>

#include <cstring>
#include <fstream>

#include "vx/log.h"

// libpng reports errors by longjmp. Every function below that calls setjmp keeps only plain
// data in its frame, so no destructor is ever skipped; C++ objects live in the callers.
namespace {

struct PngErrorState {
    char message[256];
};

void pngError(png_structp png, png_const_charp msg) {
    auto* st = static_cast<PngErrorState*>(png_get_error_ptr(png));
    if (st) {
        std::strncpy(st->message, msg ? msg : "unknown error", sizeof st->message - 1);
        st->message[sizeof st->message - 1] = 0;
    }
    png_longjmp(png, 1);
}

void pngWarning(png_structp, png_const_charp msg) {
    VxLog::logf(VxLog::Debug, "PNG decoder warning: %1%", std::string(msg ? msg : ""));
}

void pngReadFromStream(png_structp png, png_bytep data, png_size_t length) {
    auto* in = static_cast<std::istream*>(png_get_io_ptr(png));
    bool complete = false;
    try {
        in->read(reinterpret_cast<char*>(data), static_cast<std::streamsize>(length));
        complete = in->gcount() == static_cast<std::streamsize>(length);
    } catch (...) {
    }
    if (!complete) png_error(png, "unexpected end of image data");
}

struct PngHeader {
    png_uint_32 width, height;
    int bitDepth, colorType;
};

int pngReadHeader(png_structp png, png_infop info, PngHeader* h) {
    if (setjmp(png_jmpbuf(png))) return 0;
    png_read_info(png, info);
    int interlace, compression, filter;
    png_get_IHDR(png, info, &h->width, &h->height, &h->bitDepth, &h->colorType, &interlace,
                 &compression, &filter);
    return 1;
}

// Sets up the transformations to 8-bit indices (palette) or RGBA; yields the row size.
int pngSetupTransforms(png_structp png, png_infop info, int colorType, int bitDepth,
                       png_size_t* rowBytes) {
    if (setjmp(png_jmpbuf(png))) return 0;
    if (colorType == PNG_COLOR_TYPE_PALETTE) {
        if (bitDepth < 8) png_set_packing(png);
    } else {
        if (bitDepth == 16) png_set_scale_16(png);
        if (colorType == PNG_COLOR_TYPE_GRAY && bitDepth < 8) png_set_expand_gray_1_2_4_to_8(png);
        int hasTrns = png_get_valid(png, info, PNG_INFO_tRNS) != 0;
        if (hasTrns) png_set_tRNS_to_alpha(png);
        if (colorType == PNG_COLOR_TYPE_GRAY || colorType == PNG_COLOR_TYPE_GRAY_ALPHA)
            png_set_gray_to_rgb(png);
        if (!(colorType & PNG_COLOR_MASK_ALPHA) && !hasTrns)
            png_set_filler(png, 0xff, PNG_FILLER_AFTER);
    }
    png_set_interlace_handling(png);
    png_read_update_info(png, info);
    *rowBytes = png_get_rowbytes(png, info);
    return 1;
}

int pngReadRows(png_structp png, png_bytepp rows) {
    if (setjmp(png_jmpbuf(png))) return 0;
    png_read_image(png, rows);
    png_read_end(png, nullptr);
    return 1;
}

struct PngWriteTarget {
    std::vector<uint8_t>* out;
};

void pngWriteToVector(png_structp png, png_bytep data, png_size_t length) {
    auto* target = static_cast<PngWriteTarget*>(png_get_io_ptr(png));
    bool ok = true;
    try {
        target->out->insert(target->out->end(), data, data + length);
    } catch (...) {
        ok = false;
    }
    if (!ok) png_error(png, "out of memory");
}

void pngFlushNothing(png_structp) {}

struct PngWriteJob {
    png_uint_32 width, height;
    int colorType;
    png_colorp palette;
    int paletteSize;
    png_bytep trans;
    int transSize;
    png_bytepp rows;
};

int pngWriteImage(png_structp png, png_infop info, const PngWriteJob* job) {
    if (setjmp(png_jmpbuf(png))) return 0;
    png_set_IHDR(png, info, job->width, job->height, 8, job->colorType, PNG_INTERLACE_NONE,
                 PNG_COMPRESSION_TYPE_DEFAULT, PNG_FILTER_TYPE_DEFAULT);
    if (job->colorType == PNG_COLOR_TYPE_PALETTE) {
        png_set_PLTE(png, info, job->palette, job->paletteSize);
        if (job->transSize > 0) png_set_tRNS(png, info, job->trans, job->transSize, nullptr);
    }
    png_write_info(png, info);
    png_write_image(png, job->rows);
    png_write_end(png, info);
    return 1;
}

VxRef<VxRasterGeometry> rejected(const char* why) {
    VxLog::logf(VxLog::Warning, "PNG image rejected: %1%", std::string(why));
    return nullptr;
}

}  // namespace

VxRef<VxRasterGeometry> VxPngHandler::read(std::istream& in) const {
    PngErrorState err{};
    png_structp png = png_create_read_struct(PNG_LIBPNG_VER_STRING, &err, pngError, pngWarning);
    if (!png) return rejected("cannot create decoder");
    png_infop info = png_create_info_struct(png);
    if (!info) {
        png_destroy_read_struct(&png, nullptr, nullptr);
        return rejected("cannot create decoder");
    }
    struct Cleanup {
        png_structp* png; png_infop* info;
        ~Cleanup() { png_destroy_read_struct(png, info, nullptr); }
    } cleanup{&png, &info};

    png_set_read_fn(png, &in, pngReadFromStream);
    png_set_user_limits(png, VxRaster::kMaxSide, VxRaster::kMaxSide);

    PngHeader h{};
    if (!pngReadHeader(png, info, &h)) return rejected(err.message);
    const bool palette = h.colorType == PNG_COLOR_TYPE_PALETTE;
    const size_t pixelBytes = palette ? 1 : 4;
    if (!VxRaster::fitsLimits(h.width, h.height, pixelBytes)) return rejected("image too large");

    png_size_t rowBytes = 0;
    if (!pngSetupTransforms(png, info, h.colorType, h.bitDepth, &rowBytes))
        return rejected(err.message);
    if (rowBytes != h.width * pixelBytes) return rejected("unexpected row layout");

    try {
        VxRef<VxRaster> raster;
        if (palette) {
            auto pal = vxMake<VxPalette>();
            png_colorp colors = nullptr;
            int count = 0;
            if (png_get_PLTE(png, info, &colors, &count) && colors) {
                png_bytep trans = nullptr;
                int transCount = 0;
                png_get_tRNS(png, info, &trans, &transCount, nullptr);
                for (int i = 0; i < count; ++i) {
                    uint8_t a = (trans && i < transCount) ? trans[i] : 255;
                    pal->addColor(VxColor(colors[i].red, colors[i].green, colors[i].blue, a));
                }
            }
            raster = vxMake<VxRaster>(static_cast<int>(h.width), static_cast<int>(h.height),
                                      VxRasterFormat::Palette8, pal);
        } else {
            raster = vxMake<VxRaster>(static_cast<int>(h.width), static_cast<int>(h.height),
                                      VxRasterFormat::RGBA8);
        }
        std::vector<png_bytep> rows(h.height);
        for (png_uint_32 y = 0; y < h.height; ++y) rows[y] = raster->row(static_cast<int>(y));
        if (!pngReadRows(png, rows.data())) return rejected(err.message);
        return vxMake<VxRasterGeometry>(raster);
    } catch (const std::exception& e) {
        return rejected(e.what());
    }
}

bool VxPngHandler::encode(const VxRaster& raster, std::vector<uint8_t>& out) {
    out.clear();
    VxRef<VxRaster> converted;
    const VxRaster* src = &raster;
    if (raster.format() != VxRasterFormat::RGBA8 && raster.format() != VxRasterFormat::Palette8 &&
        raster.format() != VxRasterFormat::Byte) {
        converted = raster.toRGBA();
        src = converted.get();
    }
    PngWriteJob job{};
    job.width = static_cast<png_uint_32>(src->width());
    job.height = static_cast<png_uint_32>(src->height());
    std::vector<png_color> colors;
    std::vector<png_byte> trans;
    switch (src->format()) {
    case VxRasterFormat::Palette8: {
        job.colorType = PNG_COLOR_TYPE_PALETTE;
        const VxRef<VxPalette>& pal = src->palette();
        int n = pal ? std::min(pal->size(), 256) : 0;
        for (int i = 0; i < n; ++i) {
            VxColor c = pal->getColor(i);
            colors.push_back(png_color{c.r, c.g, c.b});
            trans.push_back(c.a);
        }
        if (colors.empty()) { colors.push_back(png_color{0, 0, 0}); trans.push_back(255); }
        while (!trans.empty() && trans.back() == 255) trans.pop_back();
        break;
    }
    case VxRasterFormat::Byte: job.colorType = PNG_COLOR_TYPE_GRAY; break;
    default: job.colorType = PNG_COLOR_TYPE_RGBA; break;
    }
    job.palette = colors.data();
    job.paletteSize = static_cast<int>(colors.size());
    job.trans = trans.data();
    job.transSize = static_cast<int>(trans.size());
    std::vector<png_bytep> rows(job.height);
    for (png_uint_32 y = 0; y < job.height; ++y)
        rows[y] = const_cast<png_bytep>(src->row(static_cast<int>(y)));
    job.rows = rows.data();

    PngErrorState err{};
    png_structp png = png_create_write_struct(PNG_LIBPNG_VER_STRING, &err, pngError, pngWarning);
    if (!png) return false;
    png_infop info = png_create_info_struct(png);
    PngWriteTarget target{&out};
    bool ok = false;
    if (info) {
        png_set_write_fn(png, &target, pngWriteToVector, pngFlushNothing);
        ok = pngWriteImage(png, info, &job) != 0;
    }
    png_destroy_write_struct(&png, info ? &info : nullptr);
    if (!ok) {
        VxLog::logf(VxLog::Warning, "PNG encoding failed: %1%", std::string(err.message));
        out.clear();
    }
    return ok;
}

bool VxPngHandler::writePng(const VxRaster& raster, const std::string& path) {
    std::vector<uint8_t> bytes;
    if (!encode(raster, bytes)) return false;
    std::ofstream f(path, std::ios::binary | std::ios::trunc);
    f.write(reinterpret_cast<const char*>(bytes.data()), static_cast<std::streamsize>(bytes.size()));
    f.close();
    return static_cast<bool>(f);
}
