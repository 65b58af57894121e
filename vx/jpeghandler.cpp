#include "vx/jpeghandler.h"

#include <algorithm>
#include <csetjmp>
#include <cstdio>
#include <cstdlib>
#include <cstring>

#include <jpeglib.h>
#include <jerror.h>

#include "vx/log.h"

// libjpeg reports fatal errors through error_exit, which here longjmps. As with PNG, the
// functions holding setjmp keep only plain data in their frames.
namespace {

struct JpegError {
    jpeg_error_mgr pub;
    jmp_buf jump;
    char message[JMSG_LENGTH_MAX];
};

void jpegErrorExit(j_common_ptr cinfo) {
    auto* err = reinterpret_cast<JpegError*>(cinfo->err);
    (*cinfo->err->format_message)(cinfo, err->message);
    longjmp(err->jump, 1);
}

void jpegOutputMessage(j_common_ptr cinfo) {
    char text[JMSG_LENGTH_MAX];
    (*cinfo->err->format_message)(cinfo, text);
    VxLog::logf(VxLog::Debug, "JPEG decoder: %1%", std::string(text));
}

void installErrorManager(JpegError* err) {
    std::memset(err, 0, sizeof *err);
    jpeg_std_error(&err->pub);
    err->pub.error_exit = jpegErrorExit;
    err->pub.output_message = jpegOutputMessage;
}

struct StreamSource {
    jpeg_source_mgr pub;
    std::istream* in;
    JOCTET buffer[16384];
};

void sourceInit(j_decompress_ptr) {}

boolean sourceFill(j_decompress_ptr cinfo) {
    auto* src = reinterpret_cast<StreamSource*>(cinfo->src);
    std::streamsize n = 0;
    try {
        src->in->read(reinterpret_cast<char*>(src->buffer), sizeof src->buffer);
        n = src->in->gcount();
    } catch (...) {
        n = 0;
    }
    if (n <= 0) ERREXIT(cinfo, JERR_INPUT_EOF);
    src->pub.next_input_byte = src->buffer;
    src->pub.bytes_in_buffer = static_cast<size_t>(n);
    return TRUE;
}

void sourceSkip(j_decompress_ptr cinfo, long count) {
    auto* src = &cinfo->src[0];
    while (count > 0) {
        if (src->bytes_in_buffer == 0) sourceFill(cinfo);
        size_t step = std::min(static_cast<size_t>(count), src->bytes_in_buffer);
        src->next_input_byte += step;
        src->bytes_in_buffer -= step;
        count -= static_cast<long>(step);
    }
}

void sourceTerm(j_decompress_ptr) {}

struct JpegHeader {
    JDIMENSION width, height;
    J_COLOR_SPACE colorSpace;
    int adobe;
};

int jpegOpen(jpeg_decompress_struct* cinfo, JpegError* err, StreamSource* src, JpegHeader* h) {
    if (setjmp(err->jump)) return 0;
    jpeg_create_decompress(cinfo);
    src->pub.init_source = sourceInit;
    src->pub.fill_input_buffer = sourceFill;
    src->pub.skip_input_data = sourceSkip;
    src->pub.resync_to_restart = jpeg_resync_to_restart;
    src->pub.term_source = sourceTerm;
    src->pub.bytes_in_buffer = 0;
    src->pub.next_input_byte = nullptr;
    cinfo->src = &src->pub;
    // Bounds the coefficient buffers of progressive images.
    cinfo->mem->max_memory_to_use = static_cast<long>(VxRaster::kMaxBytes);
    jpeg_read_header(cinfo, TRUE);
    h->width = cinfo->image_width;
    h->height = cinfo->image_height;
    h->colorSpace = cinfo->jpeg_color_space;
    h->adobe = cinfo->saw_Adobe_marker;
    return 1;
}

// Decodes into rows of four bytes per pixel: RGBA, or CMYK for four-channel images.
int jpegDecode(jpeg_decompress_struct* cinfo, JpegError* err, JSAMPROW* rows, int cmyk) {
    if (setjmp(err->jump)) return 0;
    cinfo->out_color_space = cmyk ? JCS_CMYK : JCS_EXT_RGBA;
    jpeg_start_decompress(cinfo);
    if (cinfo->output_components != 4) ERREXIT(cinfo, JERR_CONVERSION_NOTIMPL);
    while (cinfo->output_scanline < cinfo->output_height)
        jpeg_read_scanlines(cinfo, rows + cinfo->output_scanline, 1);
    jpeg_finish_decompress(cinfo);
    return 1;
}

int jpegEncode(jpeg_compress_struct* cinfo, JpegError* err, JSAMPROW* rows, JDIMENSION width,
               JDIMENSION height, int quality, unsigned char** buffer, unsigned long* size) {
    if (setjmp(err->jump)) return 0;
    jpeg_create_compress(cinfo);
    jpeg_mem_dest(cinfo, buffer, size);
    cinfo->image_width = width;
    cinfo->image_height = height;
    cinfo->input_components = 4;
    cinfo->in_color_space = JCS_EXT_RGBA;
    jpeg_set_defaults(cinfo);
    jpeg_set_quality(cinfo, quality, TRUE);
    jpeg_start_compress(cinfo, TRUE);
    while (cinfo->next_scanline < cinfo->image_height)
        jpeg_write_scanlines(cinfo, rows + cinfo->next_scanline, 1);
    jpeg_finish_compress(cinfo);
    return 1;
}

VxRef<VxRasterGeometry> rejected(const char* why) {
    VxLog::logf(VxLog::Warning, "JPEG image rejected: %1%", std::string(why));
    return nullptr;
}

}  // namespace

VxRef<VxRasterGeometry> VxJpegHandler::read(std::istream& in) const {
    jpeg_decompress_struct cinfo;
    std::memset(&cinfo, 0, sizeof cinfo);
    JpegError err;
    installErrorManager(&err);
    cinfo.err = &err.pub;
    StreamSource src;
    std::memset(&src, 0, sizeof src);
    src.in = &in;
    struct Cleanup {
        jpeg_decompress_struct* c;
        ~Cleanup() { jpeg_destroy_decompress(c); }
    } cleanup{&cinfo};

    JpegHeader h{};
    if (!jpegOpen(&cinfo, &err, &src, &h)) return rejected(err.message);
    if (!VxRaster::fitsLimits(h.width, h.height, 4)) return rejected("image too large");
    const int cmyk = h.colorSpace == JCS_CMYK || h.colorSpace == JCS_YCCK;
    try {
        auto raster = vxMake<VxRaster>(static_cast<int>(h.width), static_cast<int>(h.height),
                                       VxRasterFormat::RGBA8);
        std::vector<JSAMPROW> rows(h.height);
        for (JDIMENSION y = 0; y < h.height; ++y) rows[y] = raster->row(static_cast<int>(y));
        if (!jpegDecode(&cinfo, &err, rows.data(), cmyk)) return rejected(err.message);
        if (cmyk) {
            // Adobe writes CMYK inverted, which is by far the common case.
            for (JDIMENSION y = 0; y < h.height; ++y) {
                uint8_t* p = rows[y];
                for (JDIMENSION x = 0; x < h.width; ++x, p += 4) {
                    int c = p[0], m = p[1], ye = p[2], k = p[3];
                    if (!h.adobe) { c = 255 - c; m = 255 - m; ye = 255 - ye; k = 255 - k; }
                    p[0] = static_cast<uint8_t>(c * k / 255);
                    p[1] = static_cast<uint8_t>(m * k / 255);
                    p[2] = static_cast<uint8_t>(ye * k / 255);
                    p[3] = 255;
                }
            }
        }
        return vxMake<VxRasterGeometry>(raster);
    } catch (const std::exception& e) {
        return rejected(e.what());
    }
}

bool VxJpegHandler::encode(const VxRaster& raster, std::vector<uint8_t>& out, int quality) {
    out.clear();
    VxRef<VxRaster> rgba = raster.toRGBA();
    std::vector<JSAMPROW> rows(static_cast<size_t>(rgba->height()));
    for (int y = 0; y < rgba->height(); ++y) rows[static_cast<size_t>(y)] = rgba->row(y);
    jpeg_compress_struct cinfo;
    std::memset(&cinfo, 0, sizeof cinfo);
    JpegError err;
    installErrorManager(&err);
    cinfo.err = &err.pub;
    unsigned char* buffer = nullptr;
    unsigned long size = 0;
    int ok = jpegEncode(&cinfo, &err, rows.data(), static_cast<JDIMENSION>(rgba->width()),
                        static_cast<JDIMENSION>(rgba->height()),
                        std::min(100, std::max(1, quality)), &buffer, &size);
    jpeg_destroy_compress(&cinfo);
    if (ok && buffer) out.assign(buffer, buffer + size);
    std::free(buffer);
    if (!ok) VxLog::logf(VxLog::Warning, "JPEG encoding failed: %1%", std::string(err.message));
    return ok != 0;
}
