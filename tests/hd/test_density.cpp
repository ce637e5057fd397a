// Equation of state and the "DENSITY" settings.
#include <gtest/gtest.h>

#include <cmath>
#include <string>
#include <vector>

#include "driver/Log.h"
#include "hd/Density.h"
#include "setup/SetupFile.h"
#include "support/TestSupport.h"

namespace {

// Reads the settings from HYDRODYNAMIC_MODULE { <body> }.
DensitySettings Read(const std::string& body, std::string* log = nullptr) {
  tavrintest::TempDir dir;
  const std::string setup =
      dir.write("case.skf", "TesselHD {\n  HYDRODYNAMIC_MODULE {\n" + body + "\n  }\n}\n");
  SkfOpenFile(setup, false);
  EXPECT_TRUE(LogOpen(dir.file("case.log")));
  SkfOpenTarget("TesselHD");
  SkfOpenSection("HYDRODYNAMIC_MODULE");
  DensitySettings d;
  ReadDensitySettings(d);
  SkfCloseSection();
  LogClose();
  SkfCloseFile();
  if (log != nullptr) *log = tavrintest::ReadFile(dir.file("case.log"));
  return d;
}

// The one-atmosphere formula evaluated term by term.
double ByHand(double t, double s) {
  const double rw = 999.842594 + 6.793952e-2 * t - 9.095290e-3 * t * t + 1.001685e-4 * t * t * t -
                    1.120083e-6 * std::pow(t, 4) + 6.536332e-9 * std::pow(t, 5);
  const double a = 8.24493e-1 - 4.0899e-3 * t + 7.6438e-5 * t * t - 8.2467e-7 * t * t * t +
                   5.3875e-9 * std::pow(t, 4);
  const double b = -5.72466e-3 + 1.0227e-4 * t - 1.6546e-6 * t * t;
  return rw + a * s + b * std::pow(s, 1.5) + 4.8314e-4 * s * s;
}

}  // namespace

TEST(Density, EquationOfStateAgainstHandValues) {
  EXPECT_EQ(DensityEOS(0.0, 0.0), 999.842594);
  for (const auto& [t, s] : std::vector<std::pair<double, double>>{
           {5.0, 35.0}, {25.0, 35.0}, {10.0, 13.2}, {0.5, 2.0}, {30.0, 40.0}})
    EXPECT_NEAR(DensityEOS(t, s), ByHand(t, s), 1e-9) << t << " " << s;
  // Published one-atmosphere check values of the formula.
  EXPECT_NEAR(DensityEOS(5.0, 35.0), 1027.67547, 1e-5);
  EXPECT_NEAR(DensityEOS(25.0, 35.0), 1023.34306, 1e-5);
  EXPECT_NEAR(DensityEOS(5.0, 0.0), 999.96675, 1e-5);
  EXPECT_EQ(DensityEOS(12.0, -3.0), DensityEOS(12.0, 0.0));
  // Compression makes water denser; the correction follows rho0 / (1 - p / K).
  const double k = DensityBulkModulus(10.0, 30.0, 500.0);
  EXPECT_NEAR(DensityEOSPressure(10.0, 30.0, 500.0), DensityEOS(10.0, 30.0) / (1.0 - 500.0 / k),
              1e-9);
  EXPECT_GT(DensityEOSPressure(10.0, 30.0, 500.0), DensityEOS(10.0, 30.0));
  EXPECT_EQ(DensityEOSPressure(10.0, 30.0, 0.0), DensityEOS(10.0, 30.0));
}

TEST(Density, SettingsAndFieldUpdate) {
  const DensitySettings none = Read("");
  EXPECT_EQ(none.type, 0);
  EXPECT_NEAR(none.referenceDensity, 1009.987, 5e-4);  // 10 deg C and 13.2 PSU, not 32
  std::string log;
  const DensitySettings barotropic = Read("DENSITY { type = 0 }", &log);
  EXPECT_EQ(barotropic.salinityReference, 13.2);
  EXPECT_NE(log.find("type : 0"), std::string::npos) << log;
  const DensitySettings ts = Read("DENSITY { type = 2\n temperature_reference = 4 }", &log);
  EXPECT_EQ(ts.salinityReference, 32.0);
  EXPECT_EQ(ts.referenceDensity, DensityEOS(4.0, 32.0));
  EXPECT_NE(log.find("type_of_buoyancy_calculation : 1 (default)"), std::string::npos) << log;

  const std::vector<double> t = {0, 5, 25}, s = {0, 35, -1};
  std::vector<double> rho(3, 0.0);
  DensitySettings d = ts;
  for (const std::int32_t type : {1, 2, 3}) {
    d.type = type;
    UpdateDensityField(d, 2, t.data(), s.data(), rho.data());
    EXPECT_EQ(rho[0], 0.0);  // 1-based: entry 0 untouched
    EXPECT_EQ(rho[1], DensityEOS(type == 3 ? 4.0 : 5.0, type == 2 ? 32.0 : 35.0));
    EXPECT_EQ(rho[2], DensityEOS(type == 3 ? 4.0 : 25.0, type == 2 ? 32.0 : 0.0));
  }
  EXPECT_EXIT(Read("DENSITY { type = 4 }"), ::testing::ExitedWithCode(1),
              "Type not supported for density");
  EXPECT_EXIT(Read("DENSITY { type = -1 }"), ::testing::ExitedWithCode(1),
              "Type not supported for density");
}
