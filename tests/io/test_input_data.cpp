// Input data: soft start, the setup-file reader, time series from a .vds0 file (interpolation,
// the two-step cache, directions, item and coverage checks) and the curve look-ups.
#include <gtest/gtest.h>

#include <cmath>
#include <string>
#include <vector>

#include "driver/DateTime.h"
#include "driver/Log.h"
#include "io/DataFile.h"
#include "io/InputData.h"
#include "setup/SetupFile.h"
#include "support/TestSupport.h"

namespace {

using tavrintest::TempDir;

DateTime At(int day, int hour, int minute = 0) {
  CalendarDate c;
  c.year = 2020;
  c.month = 1;
  c.day = day;
  c.hour = hour;
  c.minute = minute;
  return MakeDateTime(c);
}

// Hourly series from 2020-01-01 00:00, `steps` steps: item 1 = 10 s, item 2 a direction
// (350, 10, 30, ...), item 3 = 100 + s.
std::string WriteSeries(const TempDir& dir, int steps, const char* name = "series.vds0") {
  DataFile df;
  VdsInitHeader(df, kVdsFileKindData, "Series", "test", 3);
  VdsSetDataType(df, 0);
  VdsSetTimeAxis(df, "2020-01-01 00:00:00", 3600.0);
  VdsDefineItem(df, 1, 999, "Level", 1);
  VdsDefineItem(df, 2, 100303, "Wind direction", 1);
  VdsDefineItem(df, 3, 999, "Other", 1);
  const std::string file = dir.file(name);
  EXPECT_EQ(VdsCreateFile(df, file), 0);
  for (int s = 0; s < steps; ++s) {
    const float v[3] = {10.0f * s, s == 0 ? 350.0f : 10.0f + 20.0f * (s - 1), 100.0f + s};
    for (int k = 1; k <= 3; ++k) VdsWriteDynamic(df, k, &v[k - 1], 1, 3600.0 * s, s);
    VdsEndTimeStep(df);
  }
  df.printSummary = false;
  VdsClose(df);
  return file;
}

InputDataSpec Series(int n) {
  InputDataSpec input;
  input.format = 1;
  input.n = n;
  input.softStartType = 0;
  input.reference.assign(static_cast<std::size_t>(n), 0.0);
  input.timeInterpolation.assign(static_cast<std::size_t>(n), 1);
  return input;
}

TEST(InputDataSoftStart, FactorAndConstantRamp) {
  for (int type : {0, 1, 2, 7}) {
    EXPECT_EQ(SoftStartFactor(0.0, 0.0, type), 1.0);  // no interval: full value at once
    EXPECT_EQ(SoftStartFactor(11.0, 10.0, type), 1.0);
  }
  EXPECT_DOUBLE_EQ(SoftStartFactor(2.5, 10.0, 1), 0.25);
  EXPECT_DOUBLE_EQ(SoftStartFactor(5.0, 10.0, 2), 0.5);
  EXPECT_DOUBLE_EQ(SoftStartFactor(10.0, 10.0, 2), 1.0);
  EXPECT_NEAR(SoftStartFactor(0.0, 10.0, 2), 0.0, 1e-15);

  // A constant with the default reference ramps up from 0; type 0 switches the ramp off.
  InputDataSpec input;
  input.n = 2;
  input.constants = {4.0, -2.0};
  input.reference = {0.0, 0.0};
  input.softStartType = 1;
  input.softInterval = 100.0;
  double out[2];
  EvaluateInputData(input, 25.0, out);
  EXPECT_DOUBLE_EQ(out[0], 1.0);
  EXPECT_DOUBLE_EQ(out[1], -0.5);
  input.reference = {2.0, 0.0};
  EvaluateInputData(input, 50.0, out);
  EXPECT_DOUBLE_EQ(out[0], 3.0);
  SetSoftStartType(input, 0);
  EvaluateInputData(input, 0.0, out);
  EXPECT_DOUBLE_EQ(out[0], 4.0);
  EXPECT_EXIT(SetSoftStartType(input, 3), ::testing::ExitedWithCode(1), "SetSoftStartType: Invalid soft start type");
}

class InputDataReader : public ::testing::Test {
 protected:
  void TearDown() override {
    if (LogIsOpen()) LogClose();
    if (open_) SkfCloseFile();
  }
  void Open(const std::string& body) {
    const std::string setup = dir_.write("case.skf", "TesselHD {\n  BOUNDARY {\n" + body + "\n  }\n}\n");
    SkfOpenFile(setup, false);
    open_ = true;
    ASSERT_TRUE(LogOpen(dir_.file("case.log")));
    SkfOpenTarget("TesselHD");
    SkfOpenSection("BOUNDARY");
  }
  std::string Log() {
    LogClose();
    return tavrintest::ReadFile(dir_.file("case.log"));
  }
  TempDir dir_;
  bool open_ = false;
};

TEST_F(InputDataReader, DefaultsAreEchoedAndSingularNamesUsed) {
  Open("constant_value = 3.5");
  InputDataSpec input;
  ReadInputDataSpec(input, 1);
  EXPECT_EQ(input.format, 0);
  EXPECT_EQ(input.constants, std::vector<double>{3.5});
  EXPECT_EQ(input.softStartType, 2);
  EXPECT_EQ(input.softInterval, 0.0);
  EXPECT_EQ(input.reference, std::vector<double>{0.0});
  EXPECT_EQ(input.timeInterpolation, std::vector<std::int32_t>{1});
  const std::string log = Log();
  for (const char* k : {"format", "type_of_soft_start", "soft_time_interval", "reference_value",
                        "type_of_time_interpolation"}) {
    const std::size_t at = log.find(k);
    ASSERT_NE(at, std::string::npos) << k << "\n" << log;
    EXPECT_NE(log.substr(at, log.find('\n', at) - at).find(" (default)"), std::string::npos) << k;
  }
  EXPECT_EQ(log.find("type_of_space_interpolation"), std::string::npos);  // formats 2, 3 only
}

TEST_F(InputDataReader, PluralNamesFileFormatAndDataTwin) {
  dir_.write("wind.vds2", "");
  Open("DATA {\n format = 2\n file_name = \"wind.vds2\"\n item_numbers = 2, 3\n"
       " type_of_soft_start = 0\n soft_time_interval = 60\n reference_values = 1, 2\n"
       " type_of_time_interpolation = 0\n type_of_space_interpolation = 1\n}");
  InputDataSpec input;
  ReadInputDataSpecData(input, 2);
  EXPECT_EQ(input.format, 2);
  EXPECT_EQ(input.fileName, dir_.file("wind.vds2"));
  EXPECT_EQ(input.items, (std::vector<std::int32_t>{2, 3}));
  EXPECT_EQ(input.softStartType, 0);  // 0 is accepted: no soft start
  EXPECT_EQ(input.softInterval, 60.0);
  EXPECT_EQ(input.reference, (std::vector<double>{1.0, 2.0}));
  EXPECT_EQ(input.timeInterpolation, (std::vector<std::int32_t>{0, 0}));
  EXPECT_EQ(input.spaceInterpolation, 1);
  EXPECT_EQ(SkfCurrentPath(), "TesselHD.BOUNDARY");  // DATA closed again
}

TEST_F(InputDataReader, ConstantValuesAndRefusedFormat) {
  Open("constant_values = 1, 2, 3\n type_of_space_interpolation = 4");
  InputDataSpec input;
  ReadInputDataSpec(input, 3);
  EXPECT_EQ(input.constants, (std::vector<double>{1, 2, 3}));
  EXPECT_EQ(input.spaceInterpolation, 0);  // not read for format 0
}

TEST_F(InputDataReader, RefusedFormatAndSoftStartType) {
  EXPECT_EXIT(
      {
        Open("format = 5");
        InputDataSpec s;
        ReadInputDataSpec(s, 1);
      },
      ::testing::ExitedWithCode(1), "Format not supported");
  EXPECT_EXIT(
      {
        Open("type_of_soft_start = 3");
        InputDataSpec s;
        ReadInputDataSpec(s, 1);
      },
      ::testing::ExitedWithCode(1), "SetSoftStartType: Invalid soft start type");
}

class InputDataSeries : public ::testing::Test {
 protected:
  TempDir dir_;
};

TEST_F(InputDataSeries, InterpolatesInTimeAndReadsOnlyTheBracketingSteps) {
  const std::string file = WriteSeries(dir_, 5);
  const std::int32_t items[2] = {3, 1};
  InputDataSpec input = Series(2);
  const DateTime start = At(1, 0), end = At(1, 4);
  FemDataOpen(input, file, 2, items, &start, &end);
  ASSERT_EQ(input.kind, InputDataKind::kSeries);
  double out[2];
  EvaluateInputData(input, 0.0, out);
  EXPECT_DOUBLE_EQ(out[0], 100.0);
  EXPECT_DOUBLE_EQ(out[1], 0.0);
  EvaluateInputData(input, 5400.0, out);  // halfway between steps 1 and 2
  EXPECT_DOUBLE_EQ(out[0], 101.5);
  EXPECT_DOUBLE_EQ(out[1], 15.0);
  const std::int64_t reads = input.stepsRead;
  EvaluateInputData(input, 6000.0, out);  // same interval: nothing new is read
  EvaluateInputData(input, 7199.0, out);
  EXPECT_EQ(input.stepsRead, reads);
  EvaluateInputData(input, 7200.0, out);  // exactly at step 2
  EXPECT_DOUBLE_EQ(out[1], 20.0);
  EvaluateInputData(input, 9000.0, out);  // next interval: one new step
  EXPECT_DOUBLE_EQ(out[1], 25.0);
  EXPECT_EQ(input.stepsRead, reads + 1);  // step 3 was read at 7200 s, nothing since
  EXPECT_EQ(input.cacheStep[0], 2);
  EXPECT_EQ(input.cacheStep[1], 3);
  EvaluateInputData(input, 1e6, out);  // past the data: the last value
  EXPECT_DOUBLE_EQ(out[1], 40.0);

  // Hold instead of linear, and a soft start towards a reference.
  input.timeInterpolation = {0, 0};
  EvaluateInputData(input, 5400.0, out);
  EXPECT_DOUBLE_EQ(out[1], 10.0);
  input.timeInterpolation = {1, 1};
  input.softStartType = 1;
  input.softInterval = 7200.0;
  input.reference = {0.0, 5.0};
  EvaluateInputData(input, 3600.0, out);  // f = 0.5: 5 + 0.5 (10 - 5)
  EXPECT_DOUBLE_EQ(out[1], 7.5);
  FemDataClose(input);
}

TEST_F(InputDataSeries, DirectionsTurnTheShortWayRound) {
  const std::string file = WriteSeries(dir_, 3);
  const std::int32_t items[1] = {2};
  InputDataSpec input = Series(1);
  FemDataOpen(input, file, 1, items);
  ASSERT_TRUE(input.directional[0]);
  double out = -1;
  EvaluateInputData(input, 1800.0, &out);  // 350 -> 10 halfway
  EXPECT_NEAR(out, 0.0, 1e-9);
  EvaluateInputData(input, 900.0, &out);
  EXPECT_NEAR(out, 355.0, 1e-9);
  // Soft start from 340 to the value 10 at 3600 s goes through 355, not 175.
  input.softStartType = 1;
  input.softInterval = 7200.0;
  input.reference = {340.0};
  EvaluateInputData(input, 3600.0, &out);
  EXPECT_NEAR(out, 355.0, 1e-9);
  FemDataClose(input);
}

TEST_F(InputDataSeries, StartsBeforeTheRunSkipWholeSteps) {
  const std::string file = WriteSeries(dir_, 5);
  const std::int32_t items[1] = {1};
  InputDataSpec input = Series(1);
  const DateTime start = At(1, 2, 30), end = At(1, 3);
  FemDataOpen(input, file, 1, items, &start, &end);
  EXPECT_EQ(input.firstStep, 2);
  double out = 0;
  EvaluateInputData(input, 0.0, &out);
  EXPECT_DOUBLE_EQ(out, 25.0);
  EXPECT_EQ(input.stepsRead, 2);
  FemDataClose(input);
}

TEST_F(InputDataSeries, ItemNumbersAndCoverageAreChecked) {
  const std::string file = WriteSeries(dir_, 3);
  const std::int32_t zero[1] = {0}, beyond[1] = {4}, one[1] = {1};
  EXPECT_EXIT({ InputDataSpec s; FemDataOpen(s, file, 1, zero); }, ::testing::ExitedWithCode(1),
              "Invalid number of items in VDS file");
  EXPECT_EXIT({ InputDataSpec s; FemDataOpen(s, file, 1, beyond); }, ::testing::ExitedWithCode(1),
              "Invalid number of items in VDS file");
  // The file holds 2020-01-01 00:00 .. 02:00: a run to 03:00 ends after it, a run from the
  // minute before starts ahead of it. The message names the file and both ranges.
  const DateTime runStart = At(1, 0), runEnd = At(1, 3), before = AddSeconds(runStart, -60.0);
  EXPECT_EXIT({ InputDataSpec s; FemDataOpen(s, file, 1, one, &runStart, &runEnd); }, ::testing::ExitedWithCode(1),
              "The data does not cover the entire simulation");
  EXPECT_EXIT({ InputDataSpec s; FemDataOpen(s, file, 1, one, &before, &runStart); },
              ::testing::ExitedWithCode(1), "The data does not cover the entire simulation");
  EXPECT_EQ(InputDataCoverageError({0.0, 3600.0, 7200.0}, 10800.0, "a.vds0", runStart),
            "The data does not cover the entire simulation: file a.vds0 holds 2020-01-01 00:00:00 to "
            "2020-01-01 02:00:00, the simulation runs 2020-01-01 00:00:00 to 2020-01-01 03:00:00");
  EXPECT_EQ(InputDataCoverageError({0.0, 7200.0 - 1e-7}, 7200.0, "a.vds0", runStart), "");
  {
    InputDataSpec s;  // exactly covered
    const DateTime a = At(1, 0), b = At(1, 2);
    FemDataOpen(s, file, 1, one, &a, &b);
    FemDataClose(s);
  }
  const std::string single = WriteSeries(dir_, 1, "single.vds0");
  const DateTime a = At(1, 5), b = At(1, 6);
  {
    InputDataSpec s = Series(1);  // a zero-length run is covered by one step, wherever it lies
    FemDataOpen(s, single, 1, one, &a, &a);
    double out = -1;
    EvaluateInputData(s, 0.0, &out);
    EXPECT_EQ(out, 0.0);
    FemDataClose(s);
  }
  EXPECT_EXIT({ InputDataSpec s; FemDataOpen(s, single, 1, one, &a, &b); }, ::testing::ExitedWithCode(1),
              "simulation - only one");
  EXPECT_EXIT({ InputDataSpec s; FemDataOpen(s, dir_.file("missing.vds0"), 1, one); },
              ::testing::ExitedWithCode(1), "Error Reading data file");
}

TEST_F(InputDataSeries, MapsAreRefusedWithoutMeshAndNotYetEvaluated) {
  DataFile df;
  VdsInitHeader(df, kVdsFileKindData, "Grid", "test", 1);
  VdsSetDataType(df, 0);
  VdsSetTimeAxis(df, "2020-01-01 00:00:00", 3600.0);
  VdsSpatialAxis axis;
  axis.dimension = 2;
  axis.n[0] = 2;
  axis.n[1] = 2;
  VdsDefineItem(df, 1, 999, "Grid", 4);
  VdsSetItemAxis(df, 1, axis);
  const std::string file = dir_.file("grid.vds2");
  ASSERT_EQ(VdsCreateFile(df, file), 0);
  const float v[4] = {1, 2, 3, 4};
  VdsWriteDynamic(df, 1, v, 4, 0.0, 0);
  VdsEndTimeStep(df);
  df.printSummary = false;
  VdsClose(df);
  const std::int32_t one[1] = {1};
  EXPECT_EXIT({ InputDataSpec s; FemDataOpen(s, file, 1, one); }, ::testing::ExitedWithCode(1), "No mesh supplied");
  InputDataSpec s;
  s.format = 2;
  FemDataOpen(s, file, 1, one, nullptr, nullptr, true);
  EXPECT_EQ(s.kind, InputDataKind::kGrid);
  double out[1];
  EXPECT_EXIT(EvaluateInputData(s, 0.0, out), ::testing::ExitedWithCode(1), "Not implemented");
  FemDataClose(s);
}

TEST(InputDataCurve, ClampsInterpolatesAndInverts) {
  const double xs[4] = {0.0, 1.0, 1.0, 3.0}, ys[4] = {10.0, 20.0, 40.0, 80.0};
  EXPECT_EQ(CurveLookup(-5.0, 4, xs, ys), 10.0);
  EXPECT_EQ(CurveLookup(9.0, 4, xs, ys), 80.0);
  EXPECT_DOUBLE_EQ(CurveLookup(0.5, 4, xs, ys), 15.0);
  EXPECT_DOUBLE_EQ(CurveLookup(2.0, 4, xs, ys), 60.0);
  // At the repeated abscissa the last enclosing segment wins; the zero-length one gives its
  // right ordinate and never divides by zero.
  EXPECT_DOUBLE_EQ(CurveLookup(1.0, 4, xs, ys), 40.0);
  const double flat[2] = {2.0, 2.0}, fy[2] = {1.0, 7.0};
  EXPECT_EQ(CurveLookup(2.0, 2, flat, fy), 7.0);

  EXPECT_DOUBLE_EQ(CurveLookupInverse(15.0, 4, xs, ys), 0.5);
  EXPECT_DOUBLE_EQ(CurveLookupInverse(30.0, 4, xs, ys), 1.0);
  EXPECT_EQ(CurveLookupInverse(0.0, 4, xs, ys), 0.0);
  EXPECT_EQ(CurveLookupInverse(100.0, 4, xs, ys), 3.0);
}

}  // namespace
