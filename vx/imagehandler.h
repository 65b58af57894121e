#pragma once
// Image decoders, one per file format, chosen by a short key or a MIME type.
#include <cstdint>
#include <istream>
#include <vector>

#include "vx/rastergeometry.h"
#include "vx/refcnt.h"
#include "vx/string.h"

class VxImageHandler : public VxRefCnt {
public:
    // "png", "jpg"/"jpeg"/"jpe", "gif", "tiff"/"tif"/"geotiff"; MIME forms such as
    // "image/png; mode=8bit" work too. Null for anything else. Handlers are shared and stateless.
    static VxRef<VxImageHandler> getHandler(const VxString& key);

    // Decodes the stream with the handler for type. The attributes are not used and may be
    // null. Null when the type is unknown or the data cannot be decoded.
    static VxRef<VxRasterGeometry> streamIn(const VxString& type, const void* attributes,
                                            std::istream& in);

    // Lower case, without "image/", parameters after ';' and surrounding blanks.
    static VxString normalizeType(const VxString& type);

    // The canonical key: "png", "jpg", "gif" or "tiff".
    virtual VxString key() const = 0;
    // Never throws; truncated, corrupt or oversized input yields null and a log line.
    virtual VxRef<VxRasterGeometry> read(std::istream& in) const = 0;

protected:
    // Reads the rest of the stream; false when it holds more than limit bytes.
    static bool readAll(std::istream& in, std::vector<uint8_t>& out, size_t limit);
};
