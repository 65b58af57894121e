#include "vx/imagehandler.h"

#include "vx/gifhandler.h"
#include "vx/jpeghandler.h"
#include "vx/log.h"
#include "vx/pnghandler.h"
#include "vx/tiffhandler.h"

VxString VxImageHandler::normalizeType(const VxString& type) {
    std::string s = type.str();
    size_t semi = s.find(';');
    if (semi != std::string::npos) s.erase(semi);
    VxString t = VxString(s).trimmed().toLower();
    if (t.startsWith("image/")) t = VxString(t.str().substr(6)).trimmed();
    return t;
}

VxRef<VxImageHandler> VxImageHandler::getHandler(const VxString& key) {
    // Function-local statics: built once, thread-safely, and never released.
    static const VxRef<VxImageHandler> png(new VxPngHandler);
    static const VxRef<VxImageHandler> jpeg(new VxJpegHandler);
    static const VxRef<VxImageHandler> gif(new VxGifHandler);
    static const VxRef<VxImageHandler> tiff(new VxTiffHandler);
    const VxString k = normalizeType(key);
    if (k == "png" || k == "x-png") return png;
    if (k == "jpg" || k == "jpeg" || k == "jpe" || k == "pjpeg") return jpeg;
    if (k == "gif") return gif;
    if (k == "tiff" || k == "tif" || k == "geotiff") return tiff;
    return nullptr;
}

VxRef<VxRasterGeometry> VxImageHandler::streamIn(const VxString& type, const void* attributes,
                                                 std::istream& in) {
    (void)attributes;
    VxRef<VxImageHandler> handler = getHandler(type);
    if (!handler) {
        VxLog::logf(VxLog::Debug, "No image handler for type '%1%'", type);
        return nullptr;
    }
    return handler->read(in);
}

bool VxImageHandler::readAll(std::istream& in, std::vector<uint8_t>& out, size_t limit) {
    out.clear();
    char chunk[65536];
    while (in) {
        in.read(chunk, sizeof chunk);
        std::streamsize n = in.gcount();
        if (n <= 0) break;
        if (out.size() + static_cast<size_t>(n) > limit) return false;
        out.insert(out.end(), chunk, chunk + n);
    }
    return true;
}
