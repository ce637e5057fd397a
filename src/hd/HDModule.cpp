#include "hd/HDModule.h"

#include "driver/Log.h"
#include "driver/Termination.h"
#include "setup/SetupFile.h"

void SetupHD(HDModule& hd, std::int32_t selectedMode, int numDimensions, std::int32_t runStartStep,
             double overallStep) {
  hd.numDimensions = numDimensions;
  hd.startStep = runStartStep;
  hd.stepLength = overallStep * hd.timeStepFactor;
  SkfOpenSection("HYDRODYNAMIC_MODULE");
  SkfReadInt("mode", hd.mode, 2);
  if (hd.mode != selectedMode) FatalError("mode is illegal");
  if (hd.mode > 0) {
    ReadDensitySettings(hd.density);
    ReadFloodDrySettings(hd.floodDry);
  }
  SkfCloseSection();

  CreateTimingTable(hd.timings, "Hydrodynamic Simulation", 4);
  AddTiming(hd.timings, kHDTimeForcing, "Update forcings");
  AddTiming(hd.timings, kHDTimeSolve, "Solve Shallow Water eq.");
  AddTiming(hd.timings, kHDTimeOther, "Other calculation");
  AddTiming(hd.timings, kHDTimeTotal, "Total");
}

void InitialStateHD(HDModule&) {}
void OpenOutputsHD(HDModule&) {}
void WriteOutputsHD(HDModule&, int) {}

double CalcSubStepHD(HDModule&, double t0, double t1) { return t1 - t0; }

int StepHD(HDModule& hd, double, double delta) {
  StartTiming(hd.timings, kHDTimeTotal);
  if (hd.numSubSteps == 0) {
    hd.minSubStep = hd.maxSubStep = delta;
  } else {
    if (delta < hd.minSubStep) hd.minSubStep = delta;
    if (delta > hd.maxSubStep) hd.maxSubStep = delta;
  }
  ++hd.numSubSteps;
  hd.sumSubSteps += delta;
  StopTiming(hd.timings, kHDTimeTotal);
  return 0;
}

void EndSubStepHD(HDModule&, double) {}
void WriteFailureOutputsHD(HDModule&) {}
void WriteCancelOutputsHD(HDModule&, int) {}
void CloseOutputsHD(HDModule&) {}

void PrintSummaryHD(const HDModule& hd) {
  const double average = hd.numSubSteps > 0 ? hd.sumSubSteps / static_cast<double>(hd.numSubSteps) : 0.0;
  PrintLine("");
  PrintLine(" Shallow water equations");
  PrintLine(" -----------------------");
  IndentedMessage("Number of time steps     : %", static_cast<long long>(hd.numSubSteps));
  IndentedMessage("Minimum time step (s)    : %", FormatNumber(hd.minSubStep));
  IndentedMessage("Maximum time step (s)    : %", FormatNumber(hd.maxSubStep));
  IndentedMessage("Average time step (s)    : %", FormatNumber(average));
}

void PrintTimingsHD(const HDModule& hd) { PrintTimingTable(hd.timings); }
