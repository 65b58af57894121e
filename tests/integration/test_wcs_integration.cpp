// The WCS dataset against MapServer's WCS 1.1.1 on the sample GeoTIFFs: capabilities,
// description, and queries whose rasters hold the source values at the queried place
// (read from the source files with gdallocationinfo).
#include <cstdio>
#include <sstream>
#include <string>
#include <vector>

#include "integration/sample_services.h"
#include "ogc/ogcwcsdataset.h"
#include "ogc/wcsservice.h"

namespace {

// Band values of a GeoTIFF at a longitude/latitude, as GDAL reads them.
std::vector<double> gdalValues(const std::string& file, double lon, double lat) {
    std::ostringstream cmd;
    cmd.precision(10);
    cmd << "gdallocationinfo -valonly -geoloc '" << file << "' " << lon << " " << lat << " 2>/dev/null";
    std::vector<double> out;
    if (FILE* p = popen(cmd.str().c_str(), "r")) {
        double v;
        while (std::fscanf(p, "%lf", &v) == 1) out.push_back(v);
        pclose(p);
    }
    return out;
}

class WcsIntegration : public SampleServicesTest {
protected:
    VxRef<VxFeature> query(const std::string& coverage, const VxRect& rect) {
        VxRef<VxOgcWcsDataSet> d(new VxOgcWcsDataSet(SampleServices::url("/wcs"), coverage));
        d->name(coverage);
        d->initialize();
        VxRef<VxQueryResult> r = d->query(rect);
        return r ? r->feature(0) : nullptr;
    }

    // Compares pixels of the returned raster with the source at the pixel centres as the
    // raster is placed (on the queried rectangle).
    void expectSourceValues(const VxRef<VxFeature>& f, const std::string& source,
                            const std::vector<std::pair<int, int>>& pixels) {
        const VxRaster& r = *f->rasterGeometry()->raster();
        const VxRect b = f->rasterGeometry()->bounds();
        for (auto [col, row] : pixels) {
            SCOPED_TRACE(std::to_string(col) + "," + std::to_string(row));
            const double lon = b.minx + (col + 0.5) * b.width() / r.width();
            const double lat = b.maxy - (row + 0.5) * b.height() / r.height();
            const std::vector<double> expected = gdalValues(SampleServices::dataDir() + "/" + source, lon, lat);
            ASSERT_EQ(expected.size(), static_cast<size_t>(r.bands()));
            for (int band = 0; band < r.bands(); ++band) EXPECT_DOUBLE_EQ(r.sample(col, row, band), expected[band]);
        }
    }
};

}  // namespace

TEST_F(WcsIntegration, CapabilitiesAndDescription) {
    VxRef<VxWcsCapabilities> caps =
        VxWcsService::negotiateCapabilities(SampleServices::url("/wcs"), "elevation", 10, "", "");
    ASSERT_TRUE(caps);
    EXPECT_EQ(caps->title, "Sample coverages");
    EXPECT_EQ(caps->coverageIds->size(), 2u);
    EXPECT_EQ((*caps->coverageIds)[1], "elevation");
    EXPECT_EQ(caps->getCoverageGetUrl, SampleServices::url("/wcs?"));
    ASSERT_TRUE(caps->crs);
    EXPECT_EQ(caps->crs->id(), "EPSG:4326");
    // The description writes latitude first; the record holds longitude first.
    EXPECT_EQ(caps->bounds, VxRect(5, 45, 15, 55));
    ASSERT_EQ(caps->supportedFormats->size(), 1u);
    EXPECT_EQ((*caps->supportedFormats)[0], "image/tiff;subtype=float32");
}

// MapServer answers multipart/mixed; the Float32 grid keeps its values. The box spans
// pixel centres, as MapServer reads a WCS 1.1 box, so the grid comes back unshifted.
TEST_F(WcsIntegration, ElevationKeepsFloatValues) {
    VxRef<VxFeature> f = query("elevation", VxRect(5.05, 45.05, 14.95, 54.95));
    ASSERT_TRUE(f);
    const VxRaster& r = *f->rasterGeometry()->raster();
    EXPECT_EQ(r.sampleType(), VxSampleType::Float32);
    EXPECT_EQ(r.width(), 100);
    EXPECT_EQ(r.height(), 100);
    EXPECT_EQ(f->rasterGeometry()->bounds(), VxRect(5.05, 45.05, 14.95, 54.95));
    EXPECT_DOUBLE_EQ(r.sample(0, 0), 100.5);
    expectSourceValues(f, "elevation.tif", {{0, 0}, {50, 50}, {99, 99}, {13, 77}});
}

TEST_F(WcsIntegration, RgbSubsetHoldsTheSourceBytes) {
    VxRef<VxFeature> f = query("rgb", VxRect(2.05, 41.05, 5.95, 44.95));
    ASSERT_TRUE(f);
    const VxRaster& r = *f->rasterGeometry()->raster();
    EXPECT_EQ(r.sampleType(), VxSampleType::UInt8);
    EXPECT_EQ(r.bands(), 3);
    EXPECT_EQ(r.width(), 40);
    expectSourceValues(f, "rgb.tif", {{0, 0}, {20, 20}, {39, 39}, {5, 30}});
}
