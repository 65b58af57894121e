// `vxogc render`: draws a WMS map for one view into a PNG file.
#include <iostream>
#include <mutex>
#include <sstream>

#include "commands.h"
#include "ogc/errors.h"
#include "ogc/ogcwmslayer.h"
#include "vx/log.h"
#include "vx/mapview.h"
#include "vx/runtime.h"
#include "vx/stringutils.h"

namespace {

std::vector<double> numbers(const std::string& text, size_t count, const char* what) {
    std::vector<double> out;
    for (const VxString& piece : VxStringUtils::split(text, ",")) {
        bool ok = false;
        out.push_back(VxStringUtils::atof(piece, ok));
        if (!ok) throw std::runtime_error(std::string("--") + what + ": '" + piece.str() + "' is not a number");
    }
    if (out.size() != count)
        throw std::runtime_error(std::string("--") + what + " needs " + std::to_string(count) + " numbers");
    return out;
}

int formatOption(const std::string& f) {
    if (f == "auto") return Auto;
    if (f == "png") return Png;
    if (f == "png8") return Png8;
    if (f == "jpeg" || f == "jpg") return Jpeg;
    if (f == "gif") return Gif;
    throw std::runtime_error("--format must be auto, png, png8, jpeg or gif");
}

VxColor colourOption(const std::string& hex) {
    if (hex.size() != 6 || hex.find_first_not_of("0123456789abcdefABCDEF") != std::string::npos)
        throw std::runtime_error("--background needs RRGGBB in hexadecimal");
    const unsigned long v = std::stoul(hex, nullptr, 16);
    return VxColor((v >> 16) & 0xFF, (v >> 8) & 0xFF, v & 0xFF, 255);
}

}  // namespace

int cmdRender(const CliOptions& o) {
    const std::string usage =
        "usage: vxogc render --wms URL --crs EPSG:3857 --bbox minx,miny,maxx,maxy --size WxH [--layers a,b] "
        "[--format auto|png|png8|jpeg|gif] [--time T] [--opaque --background RRGGBB] [--throw] -o map.png";
    if (!o.has("wms") || !o.has("bbox") || !o.has("o")) throw std::runtime_error(usage);
    const VxRef<VxCrs> crs = VxCrs::fromUrn(o.value("crs", "EPSG:3857"));
    const std::vector<double> b = numbers(o.value("bbox"), 4, "bbox");
    const VxRect area(b[0], b[1], b[2], b[3]);
    if (!area.isValid()) throw std::runtime_error("--bbox needs minx < maxx and miny < maxy");
    const std::string size = o.value("size", "1024x768");
    const size_t x = size.find('x');
    const std::vector<double> wh =
        x == std::string::npos ? std::vector<double>{} : numbers(size.substr(0, x) + "," + size.substr(x + 1), 2, "size");
    if (wh.size() != 2 || wh[0] < 1 || wh[1] < 1 || wh[0] > 16384 || wh[1] > 16384)
        throw std::runtime_error("--size needs WIDTHxHEIGHT, each 1 to 16384");
    const int width = static_cast<int>(wh[0]), height = static_cast<int>(wh[1]);

    VxOgcWmsLayerParams params;
    params.url = VxString(o.value("wms"));
    params.timeout = o.timeout;
    params.user = VxString(o.user);
    params.password = VxString(o.password);
    params.format = formatOption(o.value("format", "auto"));
    if (o.has("time")) params.time = VxString(o.value("time"));
    if (o.has("layers")) params.explicitLayers = VxStringUtils::split(o.value("layers"), ",");
    const bool opaque = o.flag("opaque");
    params.transparent = !opaque;
    if (o.has("background")) params.background = colourOption(o.value("background"));
    params.throwExceptions = o.flag("throw");
    VxRef<VxOgcWmsLayer> layer(new VxOgcWmsLayer(params));

    // Report what went over the wire, and every error the layer signals.
    std::mutex m;
    std::vector<std::string> requests, errors;
    const int userLevel = VxLog::logLevel();
    VxLog::logLevel(std::min(userLevel, static_cast<int>(VxLog::Info)));
    VxLog::setSink([&](int level, const char* tag, const std::string& text) {
        static const std::string marker = "OgcWmsLayer getting map: ";
        if (text.rfind(marker, 0) == 0) {
            std::lock_guard<std::mutex> g(m);
            requests.push_back(text.substr(marker.size()));
        }
        if (level >= userLevel) std::cerr << "[" << tag << "] " << text << "\n";
    });
    VxRuntime::errorEvent().setHandler(0, [&](VxEngineObject*, const VxErrorEventArgs& a) {
        std::lock_guard<std::mutex> g(m);
        errors.push_back(a.message.str());
    });

    const VxColor bg = opaque ? layer->background() : VxColor(0, 0, 0, 0);
    VxRef<VxCanvas> canvas(new VxCanvas(width, height, bg));
    VxMapView view(crs, area, width, height);
    int rc = 0;
    try {
        layer->initialize(false);
        view.drawImmediate({VxRef<VxLayer>(layer.get())}, *canvas);
    } catch (...) {
        VxLog::setSink(nullptr);
        VxRuntime::errorEvent().setHandler(0, nullptr);
        throw;
    }
    VxLog::setSink(nullptr);
    VxLog::logLevel(userLevel);
    VxRuntime::errorEvent().setHandler(0, nullptr);

    const VxString endpoint = layer->capabilities() ? (layer->capabilities()->getMapGetUrl.isEmpty()
                                                          ? layer->capabilities()->getMapPostUrl
                                                          : layer->capabilities()->getMapGetUrl)
                                                    : VxString();
    for (const std::string& r : requests) std::cout << "requested: " << endpoint << r << "\n";
    if (requests.empty()) std::cout << "requested: nothing (no visible layer in this view)\n";
    if (!canvas->writePng(o.value("o"))) throw std::runtime_error("cannot write " + o.value("o"));
    std::cout << "wrote " << o.value("o") << " (" << width << "x" << height << ", " << crs->id() << ", scale 1:"
              << static_cast<long long>(view.scale() + 0.5) << ")\n";
    for (const std::string& e : errors) {
        std::cerr << "vxogc: " << e << "\n";
        rc = 1;
    }
    return rc;
}
