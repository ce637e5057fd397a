// Input data: a value a setup file gives either as constants or from a data file, ramped in
// through a soft start from reference values.
//
// A setup section describes the data with the keywords "format", "constant_value(s)",
// "file_name", "item_number(s)", "type_of_soft_start", "soft_time_interval",
// "reference_value(s)", "type_of_time_interpolation" and "type_of_space_interpolation"
// (docs/input-data.md). Format 0 is a constant; formats 1 .. 4 come from a data file: 1 a time
// series (.vds0), the others maps and lines, which are opened and validated here but not yet
// evaluated.
//
// Times given to the evaluation are seconds since the simulation start. A time series keeps the
// two time steps that bracket the last time asked for, so stepping forward reads a new step only
// when the time passes the later one; the file is never read as a whole.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "driver/DateTime.h"
#include "io/DataFile.h"

// What kind of data an opened file holds.
enum class InputDataKind { kNone, kSeries, kLine, kGrid, kVolume, kMesh };

struct InputDataSpec {
  std::int32_t format = 0;                 // 0 constant, 1 time series, 2 .. 4 maps and lines
  int n = 0;                               // number of values
  std::vector<double> constants;           // [n], format 0
  std::string fileName;                    // formats 1 .. 4, resolved path
  std::vector<std::int32_t> items;         // [n], 1-based item numbers in the file
  std::int32_t softStartType = 2;          // 0 off, 1 linear, 2 sine
  double softInterval = 0.0;               // seconds
  std::vector<double> reference;           // [n]
  std::vector<std::int32_t> timeInterpolation;  // [n]: 0 hold the earlier step, 1 linear
  std::int32_t spaceInterpolation = 0;     // formats 2 and 3 only

  // The open data file and what was learnt from it.
  DataFile file;
  bool open = false;
  InputDataKind kind = InputDataKind::kNone;
  std::vector<double> times;               // per step: seconds since the simulation start
  std::int64_t firstStep = 0;              // whole steps before the simulation start skipped
  std::vector<bool> directional;           // [n]: the item is in degrees (unit 2401)

  // The two cached time steps (-1: none) and their values, [n] each.
  std::int64_t cacheStep[2] = {-1, -1};
  std::vector<float> cacheValues[2];
  std::int64_t stepsRead = 0;              // time steps read from the file so far
};

// Reads the keywords of the current (already opened) section for `n` values.
void ReadInputDataSpec(InputDataSpec& input, int n);
// Same, inside the sub-section "DATA" of the current section (opened and closed here).
void ReadInputDataSpecData(InputDataSpec& input, int n);

// Sets the soft-start type: 0 (off), 1 (linear) or 2 (sine); anything else is fatal.
void SetSoftStartType(InputDataSpec& input, std::int32_t type);

// Soft-start factor at `t` seconds after the start for an interval of `interval` seconds.
double SoftStartFactor(double t, double interval, std::int32_t type);

// Opens the data file of the input data, classifies it and checks the item numbers and, when
// the simulation start and end are given, that the data covers the run. `meshSupplied` tells
// whether the caller can map grids onto a mesh. Every failure is fatal.
void FemDataOpen(InputDataSpec& input, const std::string& fileName, int numItems,
                 const std::int32_t* items, const DateTime* simStart = nullptr,
                 const DateTime* simEnd = nullptr, bool meshSupplied = false);
// Same, with the file and items read from the setup file.
void FemDataOpen(InputDataSpec& input, const DateTime* simStart = nullptr,
                 const DateTime* simEnd = nullptr, bool meshSupplied = false);
void FemDataClose(InputDataSpec& input);
// The coverage check of FemDataOpen: "" when steps at `times` (seconds since the simulation
// start) cover a run of `duration` seconds, else the message it stops with.
std::string InputDataCoverageError(const std::vector<double>& times, double duration,
                                   const std::string& fileName, const DateTime& simStart);

// The n values at `t` seconds since the simulation start into out[0 .. n).
void EvaluateInputData(InputDataSpec& input, double t, double* out);

// Piecewise linear curve through (xs[i], ys[i]), i < n: y at `x`, clamped to the end ordinates.
double CurveLookup(double x, int n, const double* xs, const double* ys);
// The inverse: x at ordinate `y`, by the same rule with the roles swapped.
double CurveLookupInverse(double y, int n, const double* xs, const double* ys);
