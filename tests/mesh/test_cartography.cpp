// Projection texts, conversions, origins and meridian convergence of mesh cartography.
#include <gtest/gtest.h>

#include <cmath>
#include <functional>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include "mesh/Cartography.h"
#include "mesh/MeshData.h"
#include "platform/Projection.h"

namespace {

TEST(Cartography, UtmZoneConvertsKnownPointsAndBack) {
  const Cartography c("UTM-32");
  double x = 0, y = 0;
  ASSERT_TRUE(c.GeoToProj(9.0, 0.0, x, y));
  EXPECT_NEAR(x, 500000.0, 1e-6);
  EXPECT_NEAR(y, 0.0, 1e-6);
  // On the central meridian the northing is 0.9996 times the WGS 84 meridian arc (45 degrees:
  // 4984944.378 m).
  ASSERT_TRUE(c.GeoToProj(9.0, 45.0, x, y));
  EXPECT_NEAR(x, 500000.0, 1e-6);
  EXPECT_NEAR(y, 0.9996 * 4984944.378, 0.01);
  double lon = 0, lat = 0;
  ASSERT_TRUE(c.GeoToProj(10.5, 53.5, x, y));
  ASSERT_TRUE(c.ProjToGeo(x, y, lon, lat));
  EXPECT_NEAR(lon, 10.5, 1e-9);
  EXPECT_NEAR(lat, 53.5, 1e-9);
  EXPECT_GT(x, 500000.0);  // x is the easting whatever order the CRS declares
}

TEST(Cartography, EpsgWktAndProjStringsAreHandedToProj) {
  const std::string wkt = ProjectionWkt("UTM-32");
  ASSERT_FALSE(wkt.empty());
  for (const std::string& text : {std::string("EPSG:25832"), wkt, std::string("+proj=utm +zone=32 +datum=WGS84")}) {
    SCOPED_TRACE(text.substr(0, 40));
    const Cartography c(text);
    double x = 0, y = 0;
    ASSERT_TRUE(c.GeoToProj(9.0, 0.0, x, y));
    EXPECT_NEAR(x, 500000.0, 1e-3);  // ETRS89 and WGS 84 agree to far better than a millimetre here
    EXPECT_NEAR(y, 0.0, 1e-3);
    EXPECT_NEAR(c.OriginX(), 9.0, 1e-12);
    EXPECT_NEAR(c.OriginY(), 0.0, 1e-12);
  }
  // Geographic CRSs take x = longitude, also where the CRS itself lists latitude first.
  const Cartography geo("EPSG:4326");
  EXPECT_TRUE(geo.IsGeographic());
  double x = 0, y = 0;
  ASSERT_TRUE(geo.GeoToProj(12.0, 55.0, x, y));
  EXPECT_NEAR(x, 12.0, 1e-12);
  EXPECT_NEAR(y, 55.0, 1e-12);
}

TEST(Cartography, UnknownTextsThrowWithProjsReason) {
  for (const std::string text : {"not a projection", "EPSG:99999999", "UTM-61", "unknown"}) {
    SCOPED_TRACE(text);
    try {
      const Cartography c(text);
      ADD_FAILURE() << "accepted";
    } catch (const MeshError& e) {
      const std::string message = e.what();
      const std::string prefix = "Unknown projection \"" + text + "\": ";
      EXPECT_EQ(message.rfind(prefix, 0), 0u) << message;
      EXPECT_GT(message.size(), prefix.size()) << "no reason given";
    }
  }
  double x = 1, y = 1;
  std::string error;
  EXPECT_FALSE(CartGetOrigin("not a projection", x, y, error));
  EXPECT_NE(error.find("Unknown projection"), std::string::npos);
}

TEST(Cartography, OriginOfNaturalAndFalseOrigins) {
  double x = 1, y = 1;
  std::string error;
  ASSERT_TRUE(CartGetOrigin("UTM-32", x, y, error)) << error;
  EXPECT_NEAR(x, 9.0, 1e-12);
  EXPECT_NEAR(y, 0.0, 1e-12);
  // Lambert-93 is a conic projection with a false origin at 3 E, 46.5 N.
  ASSERT_TRUE(CartGetOrigin("EPSG:2154", x, y, error)) << error;
  EXPECT_NEAR(x, 3.0, 1e-9);
  EXPECT_NEAR(y, 46.5, 1e-9);
  ASSERT_TRUE(CartGetOrigin("NON-UTM", x, y, error));
  EXPECT_EQ(x + y, 0.0);
  // Cartesian meshes have no geographic conversions.
  const Cartography plain("NON-UTM");
  EXPECT_FALSE(plain.GeoToProj(1.0, 1.0, x, y));
  EXPECT_FALSE(plain.MeridianConvergence(1.0, 1.0, x));
}

TEST(Cartography, MeridianConvergenceSignAndSize) {
  const Cartography c("UTM-32");
  // Grid north lies east of true north east of the central meridian in the north:
  // gamma ~ (lon - lon0) sin(lat).
  struct Case { double lon, lat; };
  for (const Case p : {Case{10.0, 50.0}, Case{7.0, 50.0}, Case{10.0, -30.0}, Case{9.0, 60.0}}) {
    SCOPED_TRACE(std::to_string(p.lon) + " " + std::to_string(p.lat));
    double x = 0, y = 0, angle = 0;
    ASSERT_TRUE(c.GeoToProj(p.lon, p.lat, x, y));
    ASSERT_TRUE(c.MeridianConvergence(x, y, angle));
    const double expected = (p.lon - 9.0) * kDegreesToRadians * std::sin(p.lat * kDegreesToRadians);
    EXPECT_NEAR(angle, expected, p.lon == 9.0 ? 1e-9 : 2e-5);
  }
}

TEST(Cartography, ConcurrentThreadsGetIdenticalResults) {
  const Cartography c("UTM-33");
  constexpr int kPoints = 500;
  auto run = [&c](std::vector<double>& out) {
    out.clear();
    for (int i = 0; i < kPoints; ++i) {
      double x = 0, y = 0, lon = 0, lat = 0, angle = 0;
      const bool ok = c.GeoToProj(12.0 + 0.01 * i, 40.0 + 0.02 * i, x, y) && c.ProjToGeo(x, y, lon, lat) &&
                      c.MeridianConvergence(x, y, angle);
      out.insert(out.end(), {ok ? 1.0 : 0.0, x, y, lon, lat, angle});
    }
  };
  std::vector<double> reference;
  run(reference);
  std::vector<std::vector<double>> results(4);
  std::vector<std::thread> threads;
  for (auto& r : results) threads.emplace_back(run, std::ref(r));
  for (std::thread& t : threads) t.join();
  for (const auto& r : results) EXPECT_EQ(r, reference);
  // An object made and used in a thread may be released by another.
  std::unique_ptr<Cartography> made;
  std::thread([&made] {
    made = std::make_unique<Cartography>("EPSG:32632");
    double x = 0, y = 0;
    made->GeoToProj(9.0, 1.0, x, y);
  }).join();
  made.reset();
}

}  // namespace
