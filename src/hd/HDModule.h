// Hydrodynamic module record and the operations the run driver calls on it. The state, the
// solver and the outputs grow here; until they exist a step advances no state, so a run is the
// driver's loop alone, with the sub-step statistics kept.
#pragma once

#include <cstdint>

#include "driver/Timing.h"
#include "hd/Density.h"
#include "hd/FloodDry.h"

struct HDModule {
  std::int32_t mode = 0;           // 1: flow from data files, 2: computed flow
  int numDimensions = 2;
  std::int32_t startStep = 0;      // overall step at which the module starts
  std::int32_t timeStepFactor = 1;
  double stepLength = 0.0;         // timeStepFactor x overall time step, seconds
  bool timeStepControl = false;    // adaptive sub-steps; off: one sub-step per overall step
  // Sub-step statistics.
  std::int64_t numSubSteps = 0;
  double minSubStep = 0.0, maxSubStep = 0.0, sumSubSteps = 0.0;
  double activeElements = 0.0;     // elements computed in the last sub-step
  TimingTable timings;             // "Hydrodynamic Simulation"
  DensitySettings density;         // "DENSITY"
  FloodDrySettings floodDry;       // "FLOOD_AND_DRY"
};

// Timing task numbers of the hydrodynamic table.
enum HDTimingTask : int { kHDTimeForcing = 1, kHDTimeSolve = 2, kHDTimeOther = 3, kHDTimeTotal = 4 };

// Reads "HYDRODYNAMIC_MODULE": "mode" must equal the mode of "MODULE_SELECTION" ("mode is
// illegal" otherwise).
void SetupHD(HDModule& hd, std::int32_t selectedMode, int numDimensions, std::int32_t runStartStep,
             double overallStep);
// Initial state (mode > 1) and its sub-modules; opens the outputs.
void InitialStateHD(HDModule& hd);
void OpenOutputsHD(HDModule& hd);
void WriteOutputsHD(HDModule& hd, int step);
// Sub-step for [t0, t1]: with the time-step control off, t1 - t0.
double CalcSubStepHD(HDModule& hd, double t0, double t1);
// Advances the flow by `delta` to time `t`. Returns the run status: 0, or negative on failure.
int StepHD(HDModule& hd, double t, double delta);
// End-of-sub-step bookkeeping (time averages for mode 2).
void EndSubStepHD(HDModule& hd, double delta);
// After a failure: every output written with step number -1.
void WriteFailureOutputsHD(HDModule& hd);
// After a cancel at step n: outputs whose statistics would be written later are written now.
void WriteCancelOutputsHD(HDModule& hd, int step);
void CloseOutputsHD(HDModule& hd);
// "Shallow water equations" statistics block.
void PrintSummaryHD(const HDModule& hd);
void PrintTimingsHD(const HDModule& hd);
