// `vxogc coverage URL --coverage ID --bbox minx,miny,maxx,maxy -o out.tif|out.png`: one
// GetCoverage through the WCS dataset, written as a GeoTIFF with the service's sample
// type, or as a PNG rendering.
#include <iostream>
#include <stdexcept>

#include "commands.h"
#include "ogc/ogcwcsdataset.h"
#include "vx/pnghandler.h"
#include "vx/stringutils.h"
#include "vx/tiffhandler.h"

namespace {

const char* sampleTypeName(VxSampleType t) {
    switch (t) {
    case VxSampleType::UInt8: return "Byte";
    case VxSampleType::Int8: return "Int8";
    case VxSampleType::UInt16: return "UInt16";
    case VxSampleType::Int16: return "Int16";
    case VxSampleType::UInt32: return "UInt32";
    case VxSampleType::Int32: return "Int32";
    case VxSampleType::Float32: return "Float32";
    case VxSampleType::Float64: return "Float64";
    }
    return "?";
}

VxRect parseBbox(const std::string& text) {
    const std::vector<VxString> parts = VxStringUtils::split(text, ",", false);
    if (parts.size() != 4) throw std::runtime_error("--bbox needs minx,miny,maxx,maxy");
    double v[4];
    for (int i = 0; i < 4; ++i) {
        bool ok = false;
        v[i] = VxStringUtils::atof(parts[i], ok);
        if (!ok) throw std::runtime_error("--bbox: not a number: " + parts[i].str());
    }
    VxRect r(v[0], v[1], v[2], v[3]);
    if (!r.isValid()) throw std::runtime_error("--bbox: the minimum must lie below the maximum");
    return r;
}

bool endsWith(const std::string& s, const std::string& suffix) {
    return s.size() >= suffix.size() &&
           VxString(s.substr(s.size() - suffix.size())).compare(VxString(suffix), true) == 0;
}

}  // namespace

int cmdCoverage(const CliOptions& o) {
    const std::vector<std::string>& args = o.positional;
    const std::string output = o.value("o", o.value("output"));
    if (args.size() != 1 || !o.has("coverage") || !o.has("bbox") || output.empty())
        throw std::runtime_error("usage: vxogc coverage URL --coverage ID --bbox minx,miny,maxx,maxy -o out.tif|out.png");
    const VxRect rect = parseBbox(o.value("bbox"));

    VxOgcWcsDataSetParams p;
    p.name = o.value("coverage");
    p.url = args[0];
    p.coverageId = o.value("coverage");
    p.timeout = o.timeout;
    p.user = o.user;
    p.password = o.password;
    p.throwExceptions = true;  // failures reach main as messages
    VxRef<VxOgcWcsDataSet> dataset(new VxOgcWcsDataSet(p));
    dataset->initialize();
    VxRef<VxQueryResult> result = dataset->query(rect);
    VxRef<VxFeature> feature = result ? result->feature(0) : nullptr;
    if (!feature) throw std::runtime_error("the service returned no coverage");
    const VxRef<VxRaster>& raster = feature->rasterGeometry()->raster();
    const VxRef<VxCrs> crs = feature->crs();

    bool written;
    if (endsWith(output, ".png")) {
        VxRef<VxRaster> picture = raster->isDataRaster() ? raster->toRGBA() : raster;
        written = picture && VxPngHandler::writePng(*picture, output);
    } else {
        VxTiffWriteOptions w;
        w.bounds = feature->rasterGeometry()->bounds();
        if (crs && VxStringUtils::isEqualIgnoreCase(crs->authority(), "EPSG")) {
            w.epsg = static_cast<int>(VxStringUtils::atoi64(crs->code()));
            w.geographic = crs->isGeographic();
        }
        written = VxTiffHandler::writeTiff(*raster, output, w);
    }
    if (!written) throw std::runtime_error("cannot write " + output);
    std::cout << output << ": " << raster->width() << " x " << raster->height() << ", " << raster->bands()
              << (raster->bands() == 1 ? " band " : " bands ") << sampleTypeName(raster->sampleType()) << ", format "
              << dataset->imageFormat() << ", " << (crs ? crs->id().str() : std::string("no CRS")) << " ("
              << rect.minx << ", " << rect.miny << ") - (" << rect.maxx << ", " << rect.maxy << ")\n";
    return 0;
}
