#include <gtest/gtest.h>

#include <cmath>
#include <thread>
#include <vector>

#include "ogc/ogcservice.h"
#include "vx/crs.h"
#include "vx/exception.h"

namespace {
const double kHalfWorld = 20037508.342789244;

VxRef<VxCrs> epsg(const char* code) { return VxCrs::fromAuthorityAndCode("EPSG", code); }

// Test points spread over Europe, in longitude/latitude.
void europeGrid(std::vector<double>& x, std::vector<double>& y) {
    x.clear();
    y.clear();
    for (int i = 0; i < 40; ++i)
        for (int j = 0; j < 25; ++j) {
            x.push_back(-10.0 + i * 0.9);
            y.push_back(35.0 + j * 1.1);
        }
}
}

TEST(Crs, InterningYieldsTheSameObject) {
    VxRef<VxCrs> a = VxCrs::fromAuthorityAndCode("EPSG", "4326");
    EXPECT_EQ(a.get(), VxCrs::fromAuthorityAndCode("epsg", "4326").get());
    EXPECT_EQ(a.get(), VxCrs::fromAuthorityAndCode(" Epsg ", "4326").get());
    EXPECT_EQ(a.get(), VxCrs::wgs84LongLat().get());
    EXPECT_EQ(a->id(), "EPSG:4326");

    VxRef<VxCrs> crs84 = VxCrs::fromAuthorityAndCode("CRS", "84");
    EXPECT_NE(crs84.get(), a.get());
    EXPECT_EQ(crs84.get(), VxCrs::fromAuthorityAndCode("OGC", "CRS84").get());
    EXPECT_EQ(crs84->id(), "CRS:84");
    // Same datum, only the registry's axis order differs: no transformation needed.
    EXPECT_TRUE(crs84->compatibleWith(a));
    EXPECT_TRUE(*crs84 == *a);

    VxRef<VxCrs> merc = epsg("3857");
    EXPECT_FALSE(a->compatibleWith(merc));
    EXPECT_FALSE(merc->compatibleWith(a));
    EXPECT_TRUE(merc->compatibleWith(merc));
    EXPECT_FALSE(merc->compatibleWith(nullptr));
    EXPECT_TRUE(*merc != *a);
    EXPECT_EQ(merc->name(), "WGS 84 / Pseudo-Mercator");
}

TEST(Crs, UnknownOrMalformedSystemsThrow) {
    try {
        VxCrs::fromAuthorityAndCode("EPSG", "999999");
        FAIL() << "no exception";
    } catch (const VxException& e) {
        EXPECT_EQ(e.asString(), "Unknown coordinate reference system EPSG:999999");
    }
    EXPECT_THROW(VxCrs::fromAuthorityAndCode("NOSUCH", "4326"), VxException);
    EXPECT_THROW(VxCrs::fromAuthorityAndCode("EPSG", ""), VxException);
    EXPECT_THROW(VxCrs::fromAuthorityAndCode("CRS", "99"), VxException);
    EXPECT_THROW(VxCrs::fromUrn("urn:ogc:def:crs:EPSG:6.3:"), VxException);
    EXPECT_THROW(VxCrs::fromUrn("urn:ogc:def:crs:EPSG:6.3:3857:7"), VxException);
    EXPECT_THROW(VxCrs::fromUrn("urn:ogc:def:crs:EPSG::999999"), VxException);
    EXPECT_THROW(VxCrs::fromUrn("4326"), VxException);
    EXPECT_THROW(VxCrs::fromUrn(""), VxException);
    // A failed lookup is not remembered as a valid system.
    EXPECT_THROW(VxCrs::fromAuthorityAndCode("EPSG", "999999"), VxException);
}

TEST(Crs, UrnForms) {
    VxCrs* wgs = VxCrs::wgs84LongLat().get();
    VxCrs* merc = epsg("3857").get();
    VxCrs* crs84 = VxCrs::fromAuthorityAndCode("CRS", "84").get();
    EXPECT_EQ(VxCrs::fromUrn("urn:ogc:def:crs:EPSG:6.3:3857").get(), merc);
    EXPECT_EQ(VxCrs::fromUrn("URN:OGC:DEF:CRS:EPSG::4326").get(), wgs);
    EXPECT_EQ(VxCrs::fromUrn("urn:x-ogc:def:crs:EPSG:4326").get(), wgs);
    EXPECT_EQ(VxCrs::fromUrn("urn:ogc:def:crs:OGC:1.3:CRS84").get(), crs84);
    EXPECT_EQ(VxCrs::fromUrn("EPSG:4326").get(), wgs);
    EXPECT_EQ(VxCrs::fromUrn("CRS:84").get(), crs84);
    EXPECT_EQ(VxCrs::fromUrn("http://www.opengis.net/def/crs/EPSG/0/3857").get(), merc);
}

TEST(Crs, AxisDirectionsAndSwitchXY) {
    EXPECT_EQ(VxCrs::authoritativeAxisDirection(0, "EPSG", "4326"), VxCrsAxisNorth);
    EXPECT_EQ(VxCrs::authoritativeAxisDirection(1, "EPSG", "4326"), VxCrsAxisEast);
    EXPECT_EQ(VxCrs::authoritativeAxisDirection(0, "EPSG", "3857"), VxCrsAxisEast);
    EXPECT_EQ(VxCrs::authoritativeAxisDirection(1, "EPSG", "3857"), VxCrsAxisNorth);
    EXPECT_EQ(VxCrs::authoritativeAxisDirection(0, "CRS", "84"), VxCrsAxisEast);
    EXPECT_EQ(VxCrs::authoritativeAxisDirection(1, "CRS", "84"), VxCrsAxisNorth);
    EXPECT_EQ(VxCrs::authoritativeAxisDirection(0, "EPSG", "3035"), VxCrsAxisNorth);
    EXPECT_EQ(VxCrs::authoritativeAxisDirection(1, "EPSG", "3035"), VxCrsAxisEast);
    EXPECT_EQ(VxCrs::authoritativeAxisDirection(2, "EPSG", "3857"), VxCrsAxisUnknown);
    EXPECT_EQ(VxCrs::authoritativeAxisDirection(0, "NOSUCH", "1"), VxCrsAxisUnknown);
    EXPECT_EQ(VxCrs::authoritativeAxisDirection(0, "EPSG", "999999"), VxCrsAxisUnknown);
    // Hartebeesthoek94 / Lo15: westing, southing.
    EXPECT_EQ(VxCrs::authoritativeAxisDirection(0, "EPSG", "2053"), VxCrsAxisWest);

    EXPECT_TRUE(VxOgcService::switchXY(epsg("4326")));
    EXPECT_FALSE(VxOgcService::switchXY(epsg("3857")));
    EXPECT_FALSE(VxOgcService::switchXY(VxCrs::fromUrn("CRS:84")));
    EXPECT_TRUE(VxOgcService::switchXY(epsg("3035")));
    EXPECT_TRUE(VxOgcService::switchXY(epsg("2053")));
    EXPECT_FALSE(VxOgcService::switchXY(epsg("32632")));
    EXPECT_TRUE(VxOgcService::switchXY(nullptr));
}

TEST(Crs, UnitsAndKinds) {
    EXPECT_NEAR(epsg("4326")->lengthUnit(), 2 * M_PI * 6378137.0 / 360.0, 1e-6);
    EXPECT_DOUBLE_EQ(epsg("3857")->lengthUnit(), 1.0);
    // NAD83 / New York Long Island (ftUS).
    EXPECT_NEAR(epsg("2263")->lengthUnit(), 1200.0 / 3937.0, 1e-12);
    EXPECT_TRUE(epsg("4326")->isGeographic());
    EXPECT_TRUE(VxCrs::fromUrn("CRS:84")->isGeographic());
    EXPECT_FALSE(epsg("3857")->isGeographic());
    // A compound system is judged by its horizontal part: Amersfoort / RD New + NAP.
    EXPECT_FALSE(epsg("7415")->isGeographic());
    EXPECT_DOUBLE_EQ(epsg("7415")->lengthUnit(), 1.0);
}

TEST(Crs, TransformsPointsEastNorth) {
    // 4326 is latitude first in the registry, but the engine always hands over lon/lat.
    double x[3] = {10.0, 0.0, 10.0}, y[3] = {50.0, 0.0, 95.0};
    ASSERT_TRUE(VxCrs::wgs84LongLat()->transform(epsg("3857"), x, y, 3));
    EXPECT_NEAR(x[0], 1113194.9079, 1e-3);
    EXPECT_NEAR(y[0], 6446275.8410, 1e-3);
    EXPECT_NEAR(x[1], 0.0, 1e-6);
    EXPECT_NEAR(y[1], 0.0, 1e-6);
    EXPECT_EQ(x[2], HUGE_VAL);
    EXPECT_EQ(y[2], HUGE_VAL);

    ASSERT_TRUE(epsg("3857")->transform(VxCrs::fromUrn("CRS:84"), x, y, 1));
    EXPECT_NEAR(x[0], 10.0, 1e-9);
    EXPECT_NEAR(y[0], 50.0, 1e-9);

    // LAEA Europe's natural origin is at 10E 52N, (4321000, 3210000) east/north.
    x[0] = 10.0;
    y[0] = 52.0;
    ASSERT_TRUE(VxCrs::wgs84LongLat()->transform(epsg("3035"), x, y, 1));
    EXPECT_NEAR(x[0], 4321000.0, 1e-3);
    EXPECT_NEAR(y[0], 3210000.0, 1e-3);
    EXPECT_FALSE(epsg("3035")->transform(nullptr, x, y, 1));
}

TEST(Crs, ProjectsRectangles) {
    VxRef<VxCrs> wgs = VxCrs::wgs84LongLat();
    VxRef<VxCrs> merc = epsg("3857");
    VxRect second(1, 2, 3, 4);

    // Parallels and meridians stay straight in Mercator: the corners give the result.
    VxRect r(5, 45, 15, 55);
    EXPECT_FALSE(VxCrs::fromUrn("CRS:84")->projectTo(merc, r, second));
    EXPECT_TRUE(second.isNull());
    double cx[2] = {5, 15}, cy[2] = {45, 55};
    wgs->transform(merc, cx, cy, 2);
    EXPECT_NEAR(r.minx, cx[0], 1e-6);
    EXPECT_NEAR(r.miny, cy[0], 1e-6);
    EXPECT_NEAR(r.maxx, cx[1], 1e-6);
    EXPECT_NEAR(r.maxy, cy[1], 1e-6);

    // The top edge of a LAEA rectangle bulges north between its corners: the result
    // must reach the bulge, not just the corners. Centred on the projection's central
    // meridian, where the bulge peaks.
    r = VxRect(2821000, 2000000, 5821000, 5000000);
    VxRef<VxCrs> laea = epsg("3035");
    EXPECT_FALSE(laea->projectTo(wgs, r, second));
    double tx[3] = {2821000, 5821000, 4321000}, ty[3] = {5000000, 5000000, 5000000};
    laea->transform(wgs, tx, ty, 3);
    EXPECT_GT(ty[2], std::max(ty[0], ty[1]) + 1.0);
    EXPECT_NEAR(r.maxy, ty[2], 1e-9);
    EXPECT_NEAR(r.minx, tx[0], 1e-9);
    EXPECT_NEAR(r.maxx, tx[1], 1e-9);

    // The whole world clamps to Mercator's square instead of stopping short of the poles.
    r = VxRect(-180, -90, 180, 90);
    EXPECT_FALSE(wgs->projectTo(merc, r, second));
    EXPECT_NEAR(r.minx, -kHalfWorld, 1e-3);
    EXPECT_NEAR(r.maxx, kHalfWorld, 1e-3);
    EXPECT_NEAR(r.miny, -kHalfWorld, 1.0);
    EXPECT_NEAR(r.maxy, kHalfWorld, 1.0);

    // A polar view holds the pole: all longitudes, up to 90N.
    r = VxRect(-1000000, -1000000, 1000000, 1000000);
    EXPECT_FALSE(epsg("3413")->projectTo(wgs, r, second));
    EXPECT_DOUBLE_EQ(r.minx, -180.0);
    EXPECT_DOUBLE_EQ(r.maxx, 180.0);
    EXPECT_DOUBLE_EQ(r.maxy, 90.0);
    EXPECT_GT(r.miny, 70.0);
    EXPECT_LT(r.miny, 85.0);
}

TEST(Crs, ProjectionFailuresYieldAnEmptyRectangle) {
    VxRect second;
    VxRect r(0, 91, 10, 95);  // beyond the pole
    EXPECT_FALSE(VxCrs::wgs84LongLat()->projectTo(epsg("3857"), r, second));
    EXPECT_TRUE(r.isNull());
    r = VxRect(10, 10, 5, 20);  // inverted
    EXPECT_FALSE(VxCrs::wgs84LongLat()->projectTo(epsg("3857"), r, second));
    EXPECT_TRUE(r.isNull());
    r = VxRect(0, 0, 10, 10);
    EXPECT_FALSE(VxCrs::wgs84LongLat()->projectTo(nullptr, r, second));
    EXPECT_TRUE(r.isNull());
}

TEST(Crs, AntimeridianSplitsGeographicResults) {
    VxRef<VxCrs> wgs = VxCrs::wgs84LongLat();
    // A Mercator view from 19,000,000 across 180 degrees to 19,000,000 west of it.
    VxRect r(19000000, -5000000, -19000000 + 2 * kHalfWorld, 5000000), second;
    ASSERT_TRUE(epsg("3857")->projectTo(wgs, r, second));
    const double edge = 19000000 / kHalfWorld * 180.0;  // 170.68...
    const double lat = std::atan(std::sinh(5000000 / 6378137.0)) * 180.0 / M_PI;
    EXPECT_NEAR(r.minx, edge, 1e-6);
    EXPECT_DOUBLE_EQ(r.maxx, 180.0);
    EXPECT_DOUBLE_EQ(second.minx, -180.0);
    EXPECT_NEAR(second.maxx, -edge, 1e-6);
    for (const VxRect* p : {&r, &second}) {
        EXPECT_NEAR(p->miny, -lat, 1e-6);
        EXPECT_NEAR(p->maxy, lat, 1e-6);
    }

    // A geographic source that runs past +180 splits too, also onto itself.
    for (const VxRef<VxCrs>& target : {wgs, VxCrs::fromUrn("CRS:84")}) {
        r = VxRect(170, -10, 190, 10);
        second = VxRect();
        ASSERT_TRUE(wgs->projectTo(target, r, second));
        EXPECT_NEAR(r.minx, 170, 1e-9);
        EXPECT_DOUBLE_EQ(r.maxx, 180);
        EXPECT_DOUBLE_EQ(second.minx, -180);
        EXPECT_NEAR(second.maxx, -170, 1e-9);
        EXPECT_NEAR(second.maxy, 10, 1e-9);
    }
    // A view that stays on one side is one piece, wherever its longitudes start.
    r = VxRect(-190, 0, -185, 5);
    EXPECT_FALSE(wgs->projectTo(wgs, r, second));
    EXPECT_NEAR(r.minx, 170, 1e-9);
    EXPECT_NEAR(r.maxx, 175, 1e-9);
    EXPECT_TRUE(second.isNull());
}

TEST(Crs, ConcurrentProjectionMatchesSingleThreaded) {
    std::vector<double> x0, y0;
    europeGrid(x0, y0);
    const char* codes[] = {"3857", "3035", "32632", "2154"};
    std::vector<std::vector<double>> ex(4, x0), ey(4, y0);
    std::vector<VxRect> er(4), es(4);
    for (int c = 0; c < 4; ++c) {
        ASSERT_TRUE(VxCrs::wgs84LongLat()->transform(epsg(codes[c]), ex[c].data(), ey[c].data(),
                                                     x0.size()));
        er[c] = VxRect(-5, 40, 20, 60);
        VxCrs::wgs84LongLat()->projectTo(epsg(codes[c]), er[c], es[c]);
        ASSERT_TRUE(er[c].isValid());
    }

    const int threads = 6;
    std::vector<int> mismatches(threads, 0);
    std::vector<std::thread> pool;
    for (int t = 0; t < threads; ++t) {
        pool.emplace_back([&, t] {
            for (int round = 0; round < 3; ++round) {
                for (int k = 0; k < 4; ++k) {
                    const int c = (t + k) % 4;
                    VxRef<VxCrs> target = VxCrs::fromUrn(VxString("EPSG:") + codes[c]);
                    if (target.get() != epsg(codes[c]).get()) ++mismatches[t];
                    std::vector<double> x = x0, y = y0;
                    if (!VxCrs::wgs84LongLat()->transform(target, x.data(), y.data(), x.size()))
                        ++mismatches[t];
                    if (x != ex[c] || y != ey[c]) ++mismatches[t];
                    VxRect r(-5, 40, 20, 60), s;
                    VxCrs::wgs84LongLat()->projectTo(target, r, s);
                    if (r != er[c]) ++mismatches[t];
                    // And back again, through another cached transformation.
                    if (!target->transform(VxCrs::wgs84LongLat(), x.data(), y.data(), x.size()))
                        ++mismatches[t];
                    for (size_t i = 0; i < x.size(); ++i)
                        if (std::fabs(x[i] - x0[i]) > 1e-7 || std::fabs(y[i] - y0[i]) > 1e-7) {
                            ++mismatches[t];
                            break;
                        }
                }
            }
        });
    }
    for (auto& th : pool) th.join();
    for (int t = 0; t < threads; ++t) EXPECT_EQ(mismatches[t], 0) << "thread " << t;
}
