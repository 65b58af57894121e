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
                 "  capabilities URL [--json]      what a WMS service offers\n"
                 "  render --wms URL --crs EPSG:3857 --bbox minx,miny,maxx,maxy --size 1024x768\n"
                 "         [--layers a,b] [--format auto|png|png8|jpeg|gif] [--time T]\n"
                 "         [--opaque --background RRGGBB] [--throw] -o map.png\n"
                 "common options: --timeout SECONDS (10)  --user U  --password P\n"
                 "                --log-level debug|info|warning|error (warning)\n";
}
}  // namespace

int main(int argc, char** argv) {
    if (argc < 2 || !std::strcmp(argv[1], "--help") || !std::strcmp(argv[1], "-h")) {
        usage();
        return argc < 2 ? 2 : 0;
    }
    const std::string cmd = argv[1];
    try {
        if (cmd == "capabilities") return cmdCapabilities(parseCliOptions(argc, argv, 2, {}));
        if (cmd == "render")
            return cmdRender(parseCliOptions(argc, argv, 2,
                                             {"wms", "crs", "bbox", "size", "layers", "format", "time", "background", "o"}));
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
