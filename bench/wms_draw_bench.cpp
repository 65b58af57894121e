// Time of one 1024x768 WMS view from a live service, split into its steps:
// request (GetMap exchange), decode, reprojection and presentation, next to the whole
// draw through the layer.
//   wms_draw_bench URL CRS minx,miny,maxx,maxy LAYERS [ITERATIONS]
#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <istream>
#include <vector>

#include "ogc/MemInput.h"
#include "ogc/ogcwmslayer.h"
#include "vx/log.h"
#include "vx/mapview.h"
#include "vx/stringutils.h"

namespace {
using Clock = std::chrono::steady_clock;
double msSince(Clock::time_point t) { return std::chrono::duration<double, std::milli>(Clock::now() - t).count(); }
std::string requestCrsName(const VxRef<VxOgcWmsLayer>& layer, const VxRef<VxCrs>& view) {
    VxRef<VxCrs> r = layer->selectRequestCrs(view);
    return r.get() == view.get() ? "served in the view's CRS" : "requested in " + r->id().str() + ", reprojected";
}
double median(std::vector<double> v) {
    std::sort(v.begin(), v.end());
    return v.empty() ? 0 : v[v.size() / 2];
}
}  // namespace

int main(int argc, char** argv) {
    if (argc < 5) {
        std::fprintf(stderr, "usage: wms_draw_bench URL CRS minx,miny,maxx,maxy LAYERS [ITERATIONS]\n");
        return 2;
    }
    VxLog::logLevel(VxLog::Error);
    const int width = 1024, height = 768, n = argc > 5 ? std::atoi(argv[5]) : 10;
    const VxRef<VxCrs> crs = VxCrs::fromUrn(argv[2]);
    std::vector<VxString> b = VxStringUtils::split(argv[3], ",");
    if (b.size() != 4) return 2;
    const VxRect area(VxStringUtils::atof(b[0]), VxStringUtils::atof(b[1]), VxStringUtils::atof(b[2]),
                      VxStringUtils::atof(b[3]));
    VxOgcWmsLayerParams p;
    p.url = VxString(argv[1]);
    p.explicitLayers = VxStringUtils::split(argv[4], ",");
    p.throwExceptions = true;
    VxRef<VxOgcWmsLayer> layer(new VxOgcWmsLayer(p));
    layer->initialize(false);

    std::vector<double> whole, request, decode, reproject, present;
    for (int i = 0; i < n + 1; ++i) {
        // The whole cycle through the layer, as an application draws it.
        VxRef<VxCanvas> canvas(new VxCanvas(width, height));
        VxMapView view(crs, area, width, height);
        auto t = Clock::now();
        const size_t nodes = view.drawWithNodes({VxRef<VxLayer>(layer.get())}, *canvas);
        const double total = msSince(t);
        if (nodes != 1) {
            std::fprintf(stderr, "expected one image, got %zu\n", nodes);
            return 1;
        }

        // The same steps one by one.
        VxRef<VxCrs> requestCrs = layer->selectRequestCrs(crs);
        VxRect bounds = area, second;
        if (requestCrs.get() != crs.get()) crs->projectTo(requestCrs, bounds, second);
        VxHttpRequest req;
        layer->initializeHttpRequest(req);
        req.parameters = layer->buildRequest(width, height, view.scale(), bounds, requestCrs).toLatin1();
        VxHttpResponse res;
        t = Clock::now();
        if (!req.execute(res)) return 1;
        const double tRequest = msSince(t);

        t = Clock::now();
        MemInput buf(res.data.data(), res.data.data() + res.data.size());
        std::istream in(&buf);
        VxRef<VxRasterGeometry> g = VxImageHandler::getHandler("png")->read(in);
        if (!g) return 1;
        g->bounds(bounds);
        const double tDecode = msSince(t);

        t = Clock::now();
        VxRef<VxFeature> f(new VxFeature(g, requestCrs, VxId::next(), false));
        std::vector<VxRef<VxFeature>> out;
        VxProjectParams pp;
        pp.targetArea = area;
        f->projectTo(crs, out, &pp, true);
        if (out.empty()) return 1;
        const double tReproject = msSince(t);

        t = Clock::now();
        VxRef<VxRasterVis> vis = VxRasterVis::createRGBVis(nullptr, 255, 1);
        VxRef<VxSGNode2> node = vis->createPresentation2(out[0], VxCreatePresParams());
        VxRef<VxCanvas> target(new VxCanvas(width, height));
        node->draw(*target, VxSGRenderState2(view.updateInfo().view.transform, area, VxRect(), 0.0));
        const double tPresent = msSince(t);

        if (i == 0) continue;  // warm-up
        whole.push_back(total);
        request.push_back(tRequest);
        decode.push_back(tDecode);
        reproject.push_back(tReproject);
        present.push_back(tPresent);
    }
    std::printf("wms view %dx%d %s (%s): whole draw %.1f ms; request %.1f ms, decode %.1f ms, reprojection %.1f ms, "
                "presentation %.1f ms (medians of %d)\n",
                width, height, argv[2], requestCrsName(layer, crs).c_str(), median(whole), median(request),
                median(decode), median(reproject), median(present), n);
    return 0;
}
