// The vxogc program as a user runs it, against the sample services.
#include <gtest/gtest.h>

#include <cstdio>
#include <nlohmann/json.hpp>

#include "integration/sample_services.h"
#include "support/files.h"
#include "vx/pnghandler.h"
#include "vx/imagehandler.h"

namespace {

struct CliRun {
    int status;
    std::string out;
};

// Runs the program with a shell command line; standard error is folded into the output.
CliRun vxogc(const std::string& args) {
    CliRun r{-1, ""};
    FILE* p = ::popen((std::string(VX_CLI) + " " + args + " 2>&1").c_str(), "r");
    if (!p) return r;
    char buf[4096];
    for (size_t n; (n = std::fread(buf, 1, sizeof buf, p)) > 0;) r.out.append(buf, n);
    const int st = ::pclose(p);
    r.status = WIFEXITED(st) ? WEXITSTATUS(st) : -1;
    return r;
}

class Cli : public SampleServicesTest {};

}  // namespace

TEST_F(Cli, CapabilitiesAsJson) {
    CliRun r = vxogc("capabilities --json " + SampleServices::url("/wms"));
    ASSERT_EQ(r.status, 0) << r.out;
    nlohmann::json j = nlohmann::json::parse(r.out);
    EXPECT_EQ(j["version"], "1.3.0");
    EXPECT_EQ(j["maxWidth"], 2048);
    const auto& root = j["layers"];
    EXPECT_EQ(root["name"], "world");
    ASSERT_FALSE(root["children"].empty());
    const auto& basemap = root["children"][0];
    EXPECT_EQ(basemap["uniqueName"], "basemap");
    for (const char* key : {"name", "uniqueName", "title", "enabled", "styles", "minScale", "maxScale", "crs"})
        EXPECT_TRUE(basemap.contains(key)) << key;
    EXPECT_EQ(basemap["children"][0]["styles"][0], "filled");
}

TEST_F(Cli, RenderWritesTheMapAndSaysWhatItAsked) {
    const std::string png = "cli-render.png";
    CliRun r = vxogc("render --wms " + SampleServices::url("/wms") +
                  " --crs EPSG:4326 --bbox 0,40,20,60 --size 200x200 --layers cities -o " + png);
    ASSERT_EQ(r.status, 0) << r.out;
    EXPECT_NE(r.out.find("requested: " + SampleServices::url("/wms?") + "VERSION=1.3.0&REQUEST=GetMap"),
              std::string::npos) << r.out;
    EXPECT_NE(r.out.find("wrote " + png), std::string::npos);
    std::string bytes = readFile(png);
    std::istringstream in(bytes);
    VxRef<VxRasterGeometry> g = VxImageHandler::streamIn("png", nullptr, in);
    ASSERT_TRUE(g);
    EXPECT_EQ(g->raster()->width(), 200);
    EXPECT_EQ(g->raster()->color(100, 100), VxColor(0, 0, 255, 255));  // the city at lon 10, lat 50
}

TEST_F(Cli, ErrorsAreOneLineAndFailTheRun) {
    CliRun r = vxogc("render --wms " + SampleServices::url("/wms") +
                  " --crs EPSG:4326 --bbox -180,-90,180,90 --size 3000x100 -o too-big.png");
    EXPECT_EQ(r.status, 1);
    EXPECT_NE(r.out.find("vxogc: Requested image size is too large. Consider putting the OgcWmsLayer into a "
                         "TileLayer."), std::string::npos) << r.out;
    r = vxogc("capabilities http://127.0.0.1:1/nothing --timeout 2");
    EXPECT_EQ(r.status, 1);
    EXPECT_EQ(r.out, "vxogc: Failed to negotiate capabilities with service at: http://127.0.0.1:1/nothing\n");
    r = vxogc("render --wms x --bbox 1,2,3 -o x.png");
    EXPECT_EQ(r.out, "vxogc: --bbox needs 4 numbers\n");
    EXPECT_EQ(r.status, 1);
}
