#include "vx/gifhandler.h"

#include <gif_lib.h>

#include <algorithm>

#include "vx/log.h"

namespace {

int gifReadFromStream(GifFileType* gif, GifByteType* data, int length) {
    auto* in = static_cast<std::istream*>(gif->UserData);
    try {
        in->read(reinterpret_cast<char*>(data), length);
        return static_cast<int>(in->gcount());
    } catch (...) {
        return 0;
    }
}

int gifWriteToVector(GifFileType* gif, const GifByteType* data, int length) {
    auto* out = static_cast<std::vector<uint8_t>*>(gif->UserData);
    try {
        out->insert(out->end(), data, data + length);
        return length;
    } catch (...) {
        return 0;
    }
}

struct GifCloser {
    GifFileType* gif;
    ~GifCloser() {
        int err = 0;
        if (gif) DGifCloseFile(gif, &err);
    }
};

VxRef<VxRasterGeometry> rejected(const std::string& why) {
    VxLog::logf(VxLog::Warning, "GIF image rejected: %1%", why);
    return nullptr;
}

std::string gifErrorText(int code) {
    const char* s = GifErrorString(code);
    return s ? s : "unknown error";
}

}  // namespace

VxRef<VxRasterGeometry> VxGifHandler::read(std::istream& in) const {
    int err = 0;
    GifCloser closer{DGifOpen(&in, gifReadFromStream, &err)};
    GifFileType* gif = closer.gif;
    if (!gif) return rejected(gifErrorText(err));
    try {
        int transparent = -1;
        for (;;) {
            GifRecordType type = UNDEFINED_RECORD_TYPE;
            if (DGifGetRecordType(gif, &type) == GIF_ERROR) return rejected(gifErrorText(gif->Error));
            if (type == TERMINATE_RECORD_TYPE) return rejected("no image in file");
            if (type == EXTENSION_RECORD_TYPE) {
                int code = 0;
                GifByteType* ext = nullptr;
                if (DGifGetExtension(gif, &code, &ext) == GIF_ERROR) return rejected(gifErrorText(gif->Error));
                if (code == GRAPHICS_EXT_FUNC_CODE && ext && ext[0] >= 4) {
                    GraphicsControlBlock gcb;
                    if (DGifExtensionToGCB(ext[0], ext + 1, &gcb) == GIF_OK) transparent = gcb.TransparentColor;
                }
                while (ext) {
                    if (DGifGetExtensionNext(gif, &ext) == GIF_ERROR) return rejected(gifErrorText(gif->Error));
                }
                continue;
            }
            if (type != IMAGE_DESC_RECORD_TYPE) continue;

            if (DGifGetImageDesc(gif) == GIF_ERROR) return rejected(gifErrorText(gif->Error));
            const GifImageDesc& frame = gif->Image;
            int width = gif->SWidth > 0 ? gif->SWidth : frame.Width;
            int height = gif->SHeight > 0 ? gif->SHeight : frame.Height;
            if (!VxRaster::fitsLimits(width, height, 1) || !VxRaster::fitsLimits(frame.Width, frame.Height, 1))
                return rejected("image too large");
            const ColorMapObject* map = frame.ColorMap ? frame.ColorMap : gif->SColorMap;
            if (!map || map->ColorCount <= 0 || !map->Colors) return rejected("no colour map");

            auto palette = vxMake<VxPalette>();
            for (int i = 0; i < map->ColorCount; ++i) {
                const GifColorType& c = map->Colors[i];
                palette->addColor(VxColor(c.Red, c.Green, c.Blue, i == transparent ? 0 : 255));
            }
            auto raster = vxMake<VxRaster>(width, height, VxRasterFormat::Palette8, palette);
            // Screen pixels the frame does not cover show through, or the background colour.
            const int fill = transparent >= 0 ? transparent : gif->SBackGroundColor;
            std::fill(raster->data(), raster->data() + raster->byteSize(), static_cast<uint8_t>(fill));

            std::vector<GifPixelType> line(static_cast<size_t>(frame.Width));
            auto readLine = [&](int y) -> bool {
                if (DGifGetLine(gif, line.data(), frame.Width) == GIF_ERROR) return false;
                int ty = frame.Top + y;
                if (ty < 0 || ty >= height) return true;
                uint8_t* dst = raster->row(ty);
                for (int x = 0; x < frame.Width; ++x) {
                    int tx = frame.Left + x;
                    if (tx >= 0 && tx < width) dst[tx] = line[static_cast<size_t>(x)];
                }
                return true;
            };
            if (frame.Interlace) {
                static const int start[4] = {0, 4, 2, 1}, step[4] = {8, 8, 4, 2};
                for (int pass = 0; pass < 4; ++pass)
                    for (int y = start[pass]; y < frame.Height; y += step[pass])
                        if (!readLine(y)) return rejected(gifErrorText(gif->Error));
            } else {
                for (int y = 0; y < frame.Height; ++y)
                    if (!readLine(y)) return rejected(gifErrorText(gif->Error));
            }
            return vxMake<VxRasterGeometry>(raster);
        }
    } catch (const std::exception& e) {
        return rejected(e.what());
    }
}

bool VxGifHandler::encode(const VxRaster& raster, std::vector<uint8_t>& out) {
    out.clear();
    if (raster.format() != VxRasterFormat::Palette8 || !raster.palette()) return false;
    const VxPalette& pal = *raster.palette();
    if (pal.size() > 256 || raster.width() > 65535 || raster.height() > 65535) return false;
    int mapSize = 2;
    while (mapSize < pal.size()) mapSize *= 2;
    ColorMapObject* map = GifMakeMapObject(mapSize, nullptr);
    if (!map) return false;
    int transparent = NO_TRANSPARENT_COLOR;
    for (int i = 0; i < mapSize; ++i) {
        VxColor c = pal.getColor(i);
        map->Colors[i] = GifColorType{c.r, c.g, c.b};
        if (i < pal.size() && c.a == 0 && transparent == NO_TRANSPARENT_COLOR) transparent = i;
    }
    int err = 0;
    GifFileType* gif = EGifOpen(&out, gifWriteToVector, &err);
    bool ok = gif != nullptr;
    if (ok) {
        EGifSetGifVersion(gif, true);
        ok = EGifPutScreenDesc(gif, raster.width(), raster.height(), 8, 0, map) == GIF_OK;
        if (ok && transparent != NO_TRANSPARENT_COLOR) {
            GraphicsControlBlock gcb{};
            gcb.DisposalMode = DISPOSAL_UNSPECIFIED;
            gcb.TransparentColor = transparent;
            GifByteType ext[4];
            size_t n = EGifGCBToExtension(&gcb, ext);
            ok = EGifPutExtension(gif, GRAPHICS_EXT_FUNC_CODE, static_cast<int>(n), ext) == GIF_OK;
        }
        ok = ok && EGifPutImageDesc(gif, 0, 0, raster.width(), raster.height(), false, nullptr) == GIF_OK;
        std::vector<GifPixelType> line(static_cast<size_t>(raster.width()));
        for (int y = 0; ok && y < raster.height(); ++y) {
            std::copy(raster.row(y), raster.row(y) + raster.width(), line.begin());
            ok = EGifPutLine(gif, line.data(), raster.width()) == GIF_OK;
        }
        int closeErr = 0;
        if (EGifCloseFile(gif, &closeErr) != GIF_OK) ok = false;
    }
    GifFreeMapObject(map);
    if (!ok) out.clear();
    return ok;
}
