// vxogc: the host program of the OGC client module.
#include <cstring>
#include <iostream>
#include <stdexcept>

#include "commands.h"
#include "vx/exception.h"

namespace {
void usage() {
    std::cerr << "usage: vxogc <command> [options]\n"
                 "commands:\n"
                 "  render --wms URL --crs EPSG:3857 --bbox minx,miny,maxx,maxy --size 1024x768\n"
                 "         [--layers a,b] [--format auto|png|png8|jpeg|gif] [--time T]\n"
                 "         [--opaque --background RRGGBB] [--throw] -o map.png\n"
                 "                                 draws a WMS map into a PNG\n"
                 "  capabilities URL [--json] [--service wms|wcs|csw]\n"
                 "                                 what a WMS, WCS or CSW service offers (tried in\n"
                 "                                 that order unless the URL or --service names one)\n"
                 "  coverage URL --coverage ID --bbox minx,miny,maxx,maxy -o out.tif|out.png\n"
                 "                                 one WCS coverage as GeoTIFF (sample type kept) or PNG\n"
                 "  records URL [--start N] [--post] [--all]\n"
                 "                                 a catalogue's service records as a table\n"
                 "common options: --timeout SECONDS (10)  --user U  --password P\n"
                 "                --log-level debug|info|warning|error (default: quiet)\n";
}
}  // namespace

int main(int argc, char** argv) {
    if (argc < 2 || !std::strcmp(argv[1], "--help") || !std::strcmp(argv[1], "-h")) {
        usage();
        return argc < 2 ? 2 : 0;
    }
    const std::string cmd = argv[1];
    try {
        if (cmd == "render")
            return cmdRender(parseCliOptions(argc, argv, 2,
                                             {"wms", "crs", "bbox", "size", "layers", "format", "time", "background", "o"}));
        if (cmd == "capabilities") return cmdCapabilities(parseCliOptions(argc, argv, 2, {"service"}));
        if (cmd == "coverage")
            return cmdCoverage(parseCliOptions(argc, argv, 2, {"coverage", "bbox", "output", "o"}));
        if (cmd == "records") return cmdRecords(parseCliOptions(argc, argv, 2, {"start"}));
        std::cerr << "vxogc: unknown command '" << cmd << "'\n";
        usage();
        return 2;
    } catch (const VxException& e) {
        std::cerr << "vxogc: " << e.asString() << "\n";
        return 1;
    } catch (const std::exception& e) {
        std::cerr << "vxogc: " << e.what() << "\n";
        return 1;
    }
}
