#include "io/InputData.h"

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <numbers>
#include <string>

#include "driver/Termination.h"
#include "io/Units.h"
#include "setup/SetupFile.h"

namespace {

constexpr double kTimeTolerance = 1e-6;  // seconds

// Angle in [0, 360).
double WrapDegrees(double a) {
  double r = std::fmod(a, 360.0);
  if (r < 0.0) r += 360.0;
  if (r >= 360.0) r -= 360.0;
  return r;
}

// Signed shortest turn from `from` to `to`, in (-180, 180].
double TurnDegrees(double from, double to) {
  double d = std::fmod(to - from, 360.0);
  if (d > 180.0) d -= 360.0;
  if (d <= -180.0) d += 360.0;
  return d;
}

// a + w (b - a), the shortest way round for directions.
double Blend(double a, double b, double w, bool directional) {
  if (!directional) return a + w * (b - a);
  return WrapDegrees(a + w * TurnDegrees(a, b));
}

bool ParseFileDate(const std::string& text, DateTime& out) {
  CalendarDate c;
  int sec = 0;
  if (std::sscanf(text.c_str(), "%d-%d-%d %d:%d:%d", &c.year, &c.month, &c.day, &c.hour,
                  &c.minute, &sec) != 6)
    return false;
  c.second = sec;
  if (!IsValidCalendarDate(c)) return false;
  out = MakeDateTime(c);
  return true;
}

// Reads "name" (n = 1) or "names" (n > 1) as doubles, `def` for each when missing.
void ReadDoubles(const std::string& singular, std::vector<double>& dest, int n, double def) {
  dest.assign(static_cast<std::size_t>(n), def);
  if (n == 1) {
    SkfReadDouble(singular, dest[0], def);
  } else if (n > 1) {
    const std::vector<double> defaults(static_cast<std::size_t>(n), def);
    SkfReadDoubleList(singular + "s", dest.data(), n, defaults.data());
  }
}

void ReadKeywords(InputDataSpec& input, int n) {
  input.n = n;
  SkfReadInt("format", input.format, 0);
  if (input.format < 0 || input.format > 4) FatalError("Format not supported");
  input.constants.assign(static_cast<std::size_t>(n), 0.0);
  input.items.assign(static_cast<std::size_t>(n), 0);
  if (input.format == 0) {
    ReadDoubles("constant_value", input.constants, n, 0.0);
  } else {
    SkfReadInputFile("file_name", input.fileName);
    if (n == 1)
      SkfReadInt("item_number", input.items[0]);
    else if (n > 1)
      SkfReadIntList("item_numbers", input.items.data(), n);
  }
  std::int32_t type = 2;
  SkfReadInt("type_of_soft_start", type, 2);
  SetSoftStartType(input, type);
  SkfReadDouble("soft_time_interval", input.softInterval, 0.0);
  ReadDoubles("reference_value", input.reference, n, 0.0);
  std::int32_t timeType = 1;
  SkfReadInt("type_of_time_interpolation", timeType, 1);
  if (timeType != 0 && timeType != 1) FatalError("Time interpolation type not supported");
  input.timeInterpolation.assign(static_cast<std::size_t>(n), timeType);
  input.spaceInterpolation = 0;
  if (input.format == 2 || input.format == 3)
    SkfReadInt("type_of_space_interpolation", input.spaceInterpolation, 0);
}

// Loads time step `step` of the requested items into cache slot `slot`.
void LoadStep(InputDataSpec& input, int slot, std::int64_t step) {
  std::vector<float>& v = input.cacheValues[slot];
  v.assign(static_cast<std::size_t>(input.n), 0.0f);
  for (int i = 0; i < input.n; ++i) {
    int status = 0;
    if (VdsReadDynamic(input.file, input.items[static_cast<std::size_t>(i)], step, &v[static_cast<std::size_t>(i)], 1, 0,
                       &status) != 0)
      FatalError("Error Reading data file");
  }
  input.cacheStep[slot] = step;
  ++input.stepsRead;
}

// Makes slots 0 and 1 hold steps a and b, reusing what the cache already has.
void CacheSteps(InputDataSpec& input, std::int64_t a, std::int64_t b) {
  if (input.cacheStep[0] == a && input.cacheStep[1] == b) return;
  if (input.cacheStep[1] == a) {  // moving forward by one step: the later step becomes the earlier
    std::swap(input.cacheValues[0], input.cacheValues[1]);
    std::swap(input.cacheStep[0], input.cacheStep[1]);
  } else if (input.cacheStep[0] == b) {  // one step back
    std::swap(input.cacheValues[0], input.cacheValues[1]);
    std::swap(input.cacheStep[0], input.cacheStep[1]);
  }
  if (input.cacheStep[0] != a) LoadStep(input, 0, a);
  if (input.cacheStep[1] != b) {
    if (b == a) {
      input.cacheValues[1] = input.cacheValues[0];
      input.cacheStep[1] = b;
    } else {
      LoadStep(input, 1, b);
    }
  }
}

// Values of the requested items at `t` from the time series (before the soft start).
void SeriesValues(InputDataSpec& input, double t, std::vector<double>& read) {
  const std::int64_t last = static_cast<std::int64_t>(input.times.size()) - 1;
  std::int64_t a = input.firstStep, b = input.firstStep;
  double w = 0.0;
  if (t <= input.times[static_cast<std::size_t>(input.firstStep)]) {
    a = b = input.firstStep;  // before the data: the first value
  } else if (t >= input.times[static_cast<std::size_t>(last)]) {
    a = b = last;  // after the data: the last value
  } else {
    // Start the search at the cached interval: consecutive calls move little.
    std::int64_t k = input.cacheStep[0] >= input.firstStep ? input.cacheStep[0] : input.firstStep;
    while (k > input.firstStep && input.times[static_cast<std::size_t>(k)] > t) --k;
    while (k + 1 < last && input.times[static_cast<std::size_t>(k + 1)] <= t) ++k;
    a = k;
    b = k + 1;
    const double span = input.times[static_cast<std::size_t>(b)] - input.times[static_cast<std::size_t>(a)];
    w = span > 0.0 ? (t - input.times[static_cast<std::size_t>(a)]) / span : 1.0;
  }
  CacheSteps(input, a, b);
  read.resize(static_cast<std::size_t>(input.n));
  for (std::size_t i = 0; i < read.size(); ++i) {
    const double va = input.cacheValues[0][i], vb = input.cacheValues[1][i];
    const double wi = input.timeInterpolation[i] == 0 ? 0.0 : w;
    read[i] = Blend(va, vb, wi, input.directional[i]);
  }
}

std::string TimeRange(const DateTime& start, double from, double to) {
  return FormatDateTime(AddSeconds(start, from)) + " to " + FormatDateTime(AddSeconds(start, to));
}

}  // namespace

void ReadInputDataSpec(InputDataSpec& input, int n) { ReadKeywords(input, n); }

void ReadInputDataSpecData(InputDataSpec& input, int n) {
  SkfOpenSection("DATA");
  ReadKeywords(input, n);
  SkfCloseSection();
}

void SetSoftStartType(InputDataSpec& input, std::int32_t type) {
  if (type < 0 || type > 2) FatalError("SetSoftStartType: Invalid soft start type");
  input.softStartType = type;
}

double SoftStartFactor(double t, double interval, std::int32_t type) {
  if (interval <= 0.0 || t > interval) return 1.0;
  const double x = t / interval;
  if (type == 1) return x;
  if (type == 2) return 0.5 * (1.0 + std::sin((x - 0.5) * std::numbers::pi));
  return 1.0;
}

void FemDataOpen(InputDataSpec& input, const std::string& fileName, int numItems,
                 const std::int32_t* items, const DateTime* simStart, const DateTime* simEnd,
                 bool meshSupplied) {
  FemDataClose(input);
  int status = 0;
  if (VdsOpenRead(input.file, fileName, {}, &status) != 0) FatalError("Error Reading data file");
  input.open = true;
  input.fileName = fileName;
  DataFile& df = input.file;

  if (df.dataType >= 2000 && df.dataType <= 2003) {
    input.kind = InputDataKind::kMesh;
  } else {
    const int dim = df.itemCount > 0 ? df.items[0].axis.dimension : 0;
    switch (dim) {
      case 0: input.kind = InputDataKind::kSeries; break;
      case 1: input.kind = InputDataKind::kLine; break;
      case 2: input.kind = InputDataKind::kGrid; break;
      case 3: input.kind = InputDataKind::kVolume; break;
      default: FatalError("Wrong dimension");
    }
  }
  if (input.kind == InputDataKind::kGrid && !meshSupplied) FatalError("No mesh supplied");

  input.n = numItems;
  input.items.assign(items, items + numItems);
  input.directional.assign(static_cast<std::size_t>(numItems), false);
  for (int i = 0; i < numItems; ++i) {
    if (items[i] < 1 || items[i] > df.itemCount) FatalError("Invalid number of items in VDS file");
    input.directional[static_cast<std::size_t>(i)] = df.items[static_cast<std::size_t>(items[i] - 1)].unit == kUnitDegree;
  }
  if (input.reference.size() != static_cast<std::size_t>(numItems))
    input.reference.resize(static_cast<std::size_t>(numItems), 0.0);
  if (input.timeInterpolation.size() != static_cast<std::size_t>(numItems))
    input.timeInterpolation.resize(static_cast<std::size_t>(numItems), 1);

  const std::int64_t count = static_cast<std::int64_t>(df.stepTimes.size());
  if (count == 0) FatalError("Error in FemDataOpen");

  // Step times in seconds since the simulation start. A calendar file is placed by its start
  // date; a relative axis counts from the simulation start, shifted by its start offset. Without
  // a simulation start the file's own start is time 0.
  double shift = 0.0;
  if (df.time.kind == kVdsEqTime) {
    shift = df.time.startOffset;
  } else if (simStart) {
    DateTime fileStart;
    if (!ParseFileDate(df.time.start, fileStart)) FatalError("Error Reading data file");
    shift = DiffSeconds(fileStart, *simStart);
  }
  input.times.resize(static_cast<std::size_t>(count));
  for (std::int64_t k = 0; k < count; ++k)
    input.times[static_cast<std::size_t>(k)] = df.stepTimes[static_cast<std::size_t>(k)] + shift;

  input.firstStep = 0;
  if (simStart && simEnd) {
    const std::string problem =
        InputDataCoverageError(input.times, DiffSeconds(*simEnd, *simStart), fileName, *simStart);
    if (!problem.empty()) FatalError(problem);
  }
  // An equidistant file that starts before the simulation skips the whole steps that lie
  // before the step bracketing the start.
  if (df.time.kind != kVdsNeqCalendar && count > 1 && input.times.front() < 0.0 && df.time.step > 0.0) {
    const double skip = std::floor((0.0 - input.times.front()) / df.time.step + kTimeTolerance);
    input.firstStep = std::min<std::int64_t>(static_cast<std::int64_t>(skip), count - 1);
  }
  input.cacheStep[0] = input.cacheStep[1] = -1;
  input.cacheValues[0].clear();
  input.cacheValues[1].clear();
  input.stepsRead = 0;
}

std::string InputDataCoverageError(const std::vector<double>& times, double duration,
                                   const std::string& fileName, const DateTime& simStart) {
  if (times.size() == 1) {
    if (std::fabs(duration) > kTimeTolerance)
      return "The data does not cover the entire simulation - only one time step in file";
    return "";
  }
  if (times.empty()) return "Error in FemDataOpen";
  if (times.front() > kTimeTolerance || times.back() < duration - kTimeTolerance)
    return "The data does not cover the entire simulation: file " + fileName + " holds " +
           TimeRange(simStart, times.front(), times.back()) + ", the simulation runs " +
           TimeRange(simStart, 0.0, duration);
  return "";
}

void FemDataOpen(InputDataSpec& input, const DateTime* simStart, const DateTime* simEnd,
                 bool meshSupplied) {
  const std::vector<std::int32_t> items = input.items;
  const std::string name = input.fileName;
  FemDataOpen(input, name, static_cast<int>(items.size()), items.data(), simStart, simEnd, meshSupplied);
}

void FemDataClose(InputDataSpec& input) {
  if (!input.open) return;
  int status = 0;
  VdsClose(input.file, &status);
  input.file = DataFile{};
  input.open = false;
  input.kind = InputDataKind::kNone;
}

void EvaluateInputData(InputDataSpec& input, double t, double* out) {
  const double f = input.softStartType == 0 ? 1.0 : SoftStartFactor(t, input.softInterval, input.softStartType);
  const std::size_t n = static_cast<std::size_t>(input.n);
  // A record filled in by hand may leave out values: they count as 0.
  if (input.reference.size() < n) input.reference.resize(n, 0.0);
  if (input.format == 0 && input.constants.size() < n) input.constants.resize(n, 0.0);
  switch (input.format) {
    case 0:
      for (std::size_t i = 0; i < n; ++i)
        out[i] = input.reference[i] + f * (input.constants[i] - input.reference[i]);
      return;
    case 1: {
      if (!input.open || input.kind != InputDataKind::kSeries) FatalError("Not implemented");
      std::vector<double> read;
      SeriesValues(input, t, read);
      for (std::size_t i = 0; i < n; ++i) out[i] = Blend(input.reference[i], read[i], f, input.directional[i]);
      return;
    }
    default:
      // Lines, grids and mesh data are evaluated by the map and line interpolation, which
      // plugs in here.
      FatalError("Not implemented");
  }
}

namespace {

// Shared by the lookup and its inverse: `a` are the abscissae searched, `b` the ordinates given.
double Lookup(double x, int n, const double* a, const double* b) {
  if (n <= 0) return 0.0;
  if (n == 1) return b[0];
  bool found = false;
  double y = 0.0;
  for (int i = 0; i + 1 < n; ++i) {
    const double lo = std::min(a[i], a[i + 1]), hi = std::max(a[i], a[i + 1]);
    if (x < lo || x > hi) continue;
    const double span = a[i + 1] - a[i];
    y = span == 0.0 ? b[i + 1] : b[i] + (x - a[i]) / span * (b[i + 1] - b[i]);
    found = true;  // the last enclosing segment wins
  }
  if (found) return y;
  // Outside the curve: the end ordinate on x's side.
  return std::fabs(x - a[0]) <= std::fabs(x - a[n - 1]) ? b[0] : b[n - 1];
}

}  // namespace

double CurveLookup(double x, int n, const double* xs, const double* ys) { return Lookup(x, n, xs, ys); }

double CurveLookupInverse(double y, int n, const double* xs, const double* ys) {
  return Lookup(y, n, ys, xs);
}
