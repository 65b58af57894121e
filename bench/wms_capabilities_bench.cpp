// Throughput of reading a WMS capabilities document: the whole negotiation against a
// loopback server, and the parse of bytes already in memory.
//
//   wms_capabilities_bench FILE [--iterations N]
#include <httplib.h>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <functional>
#include <sstream>
#include <string>
#include <thread>
#include <vector>

#include "ogc/wmsservice.h"
#include "vx/log.h"

namespace {

using Clock = std::chrono::steady_clock;

struct Timing {
    double best = 0;    // seconds
    double median = 0;  // seconds
};

Timing timeRuns(int iterations, const std::function<void()>& run) {
    std::vector<double> secs;
    secs.reserve(iterations);
    for (int i = 0; i < iterations; ++i) {
        const auto t0 = Clock::now();
        run();
        secs.push_back(std::chrono::duration<double>(Clock::now() - t0).count());
    }
    std::sort(secs.begin(), secs.end());
    const size_t n = secs.size();
    return {secs.front(), n % 2 ? secs[n / 2] : (secs[n / 2 - 1] + secs[n / 2]) / 2};
}

size_t countNamedLayers(const VxOgcWmsServerLayer* l) {
    if (!l) return 0;
    size_t n = l->name().empty() ? 0 : 1;
    const auto children = l->layers();
    const unsigned count = children ? static_cast<unsigned>(children->size()) : 0;
    for (unsigned i = 0; i < count; ++i) n += countNamedLayers(l->getChildLayer(i).get());
    return n;
}

void report(const char* what, size_t bytes, const Timing& t) {
    const double mb = bytes / 1e6;
    std::printf("%s: best %.2f ms (%.1f MB/s), median %.2f ms (%.1f MB/s)\n", what, t.best * 1e3, mb / t.best,
                t.median * 1e3, mb / t.median);
}

int usage() {
    std::fprintf(stderr, "usage: wms_capabilities_bench FILE [--iterations N]\n");
    return 2;
}

}  // namespace

int main(int argc, char** argv) {
    std::string file;
    int iterations = 20;
    for (int i = 1; i < argc; ++i) {
        if (std::strcmp(argv[i], "--iterations") == 0 && i + 1 < argc) {
            iterations = std::atoi(argv[++i]);
        } else if (argv[i][0] == '-' || !file.empty()) {
            return usage();
        } else {
            file = argv[i];
        }
    }
    if (file.empty() || iterations < 1) return usage();

    std::ifstream in(file, std::ios::binary);
    if (!in) {
        std::fprintf(stderr, "cannot read %s\n", file.c_str());
        return 1;
    }
    std::ostringstream buf;
    buf << in.rdbuf();
    const std::string body = buf.str();

    VxLog::logLevel(4);

    // Only the unversioned request is answered, so each negotiation is one exchange.
    std::atomic<int> exchanges{0};
    httplib::Server server;
    server.set_tcp_nodelay(true);
    server.set_keep_alive_timeout(1);
    server.Get("/wms", [&](const httplib::Request& rq, httplib::Response& rs) {
        const bool caps = rq.get_param_value("request") == "GetCapabilities";
        if (caps && !rq.has_param("version")) {
            ++exchanges;
            rs.set_content(body, "application/vnd.ogc.wms_xml");
        } else {
            rs.status = 400;
        }
    });
    const int port = server.bind_to_any_port("127.0.0.1");
    if (port <= 0) {
        std::fprintf(stderr, "cannot bind a loopback port\n");
        return 1;
    }
    std::thread serving([&] { server.listen_after_bind(); });
    const VxString url = VxString("http://127.0.0.1:") + VxString(std::to_string(port)) + VxString("/wms");

    // The previous result is released inside the next timed run, as a client that
    // refreshes its capabilities would.
    VxRef<VxOgcWmsCapabilities> negotiated, parsed;
    bool failed = false;
    auto negotiate = [&] {
        negotiated = VxOgcWmsService::negotiateCapabilities(url, 10, "", "");
        if (!negotiated) failed = true;
    };
    auto parse = [&] {
        parsed = VxOgcWmsService::parseCapabilities(body, file);
        if (!parsed) failed = true;
    };
    // One untimed round each warms caches, the connection and CRS lookups.
    Timing tNegotiate, tParse;
    int timedExchanges = 0;
    std::string error;
    try {
        negotiate();
        parse();
        const int warmExchanges = exchanges.load();
        tNegotiate = timeRuns(iterations, negotiate);
        tParse = timeRuns(iterations, parse);
        timedExchanges = exchanges.load() - warmExchanges;
    } catch (const std::exception& e) {
        error = e.what();
    }
    server.stop();
    serving.join();

    if (!error.empty() || failed || !negotiated || !parsed) {
        std::fprintf(stderr, "negotiation or parse failed%s%s\n", error.empty() ? "" : ": ", error.c_str());
        return 1;
    }
    if (timedExchanges != iterations) {
        std::fprintf(stderr, "expected %d exchanges, server saw %d\n", iterations, timedExchanges);
        return 1;
    }
    const size_t negotiatedLayers = countNamedLayers(negotiated->layer().get());
    const size_t parsedLayers = countNamedLayers(parsed->layer().get());
    std::printf("file: %s (%zu bytes), %d iterations\n", file.c_str(), body.size(), iterations);
    std::printf("named layers: %zu (negotiated %zu)\n", parsedLayers, negotiatedLayers);
    report("parse", body.size(), tParse);
    report("negotiate+parse", body.size(), tNegotiate);
    return parsedLayers == negotiatedLayers ? 0 : 1;
}
