// Hydrodynamic module record and the operations the run driver calls on it. The state, the
// solver and the outputs grow here; until they exist a step advances no state, so a run is the
// driver's loop alone, with the sub-step statistics kept.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "driver/Timing.h"
#include "hd/Density.h"
#include "hd/FloodDry.h"

// "SOLUTION_TECHNIQUE": the numerical options of the shallow-water solver.
struct SolutionMethodHD {
  std::int32_t timeOrder = 1;             // "scheme_of_time_integration"
  std::int32_t spaceOrder = 1;            // "scheme_of_space_discretization_horizontal"
  std::int32_t gradientMethod = 2;        // "gradient_calculation"
  std::int32_t gradientLimiter = 0;       // "gradient_limiter"
  std::int32_t faceValueLimiter = 0;      // "face_value_limiter"
  std::int32_t boundaryCorrection = 1;    // "boundary_correction"
  std::int32_t preserveDU = 0;            // "preserve_dU" (logical: -1 true, 0 false)
  std::int32_t faceAverageD = 0;          // "face_average_d"
  std::int32_t faceLimitDry = 0;          // "face_limit_dry" (logical)
  std::int32_t filterType = 0;            // "type_of_filtering"
  double filterCoefficient = 0.01;        // "filtering_coefficient"
  std::int32_t riemannSolver = 1;         // "type_of_Riemann_solver"
  std::int32_t entropyFix = 1;            // "type_of_entropy_fix"
  std::int32_t bedResistanceDiscretization = 1;  // "bed_resistance_discretization"
  std::int32_t landCondition = 2;         // "type_of_land_condition"
  double cflHD = 1.0, dtMinHD = 0.01, dtMaxHD = 30.0;  // "CFL_critical_HD", "dt_min_HD", ...
  std::int32_t cflCorrectionHD = 0;       // "CFL_correction_HD"
  double cflAD = 1.0, dtMinAD = 0.01, dtMaxAD = 30.0, cflSubstepsAD = 0.8;
  std::int32_t errorLevel = 0;            // "error_level"
  std::int32_t maxErrors = 200;           // "maximum_number_of_errors"
  std::int32_t dynamicList = 1;           // "dynamic_list" (GPU runs)
};

// "INITIAL_CONDITIONS" of a 2-D run.
struct InitialConditionHD {
  std::int32_t type = 0;
  double eta = 0.0, u = 0.0, v = 0.0;     // type 1 constants
  std::string fileName;                   // types 2 and 3: "file_name_2d"
  std::int32_t etaItem = 1, hItem = 1, dItem = 0, uItem = 2, vItem = 3;
};

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
  std::int32_t formulation = 1;    // "EQUATION": 1 hydrostatic shallow-water equations
  std::int32_t timeFormulation = 2;
  std::int32_t meshGeometry = 1, meshVelocity = 1, meshElevation = 1;  // "SPACE"
  bool meshMapping = false;
  bool geographic = false;         // "LONG/LAT" geometry mesh
  SolutionMethodHD solution;
  InitialConditionHD initial;
  std::int32_t depthType = 0;      // "DEPTH"
  double blowUpElevation = 0.0;    // largest still-water depth + 1000 m
  // Per element (1-based, entry 0 unused): state, wet state and metric factors.
  std::int32_t numElements = 0;
  std::vector<double> eta, d, h, p, q, u, v;
  std::vector<std::int32_t> wet, wetOld;
  std::vector<double> volumeCorrection;
  std::vector<double> cosLat, tanLat, cosLatNode, tanLatNode;
  DensitySettings density;         // "DENSITY"
  FloodDrySettings floodDry;       // "FLOOD_AND_DRY"
};

// Timing task numbers of the hydrodynamic table.
enum HDTimingTask : int { kHDTimeForcing = 1, kHDTimeSolve = 2, kHDTimeOther = 3, kHDTimeTotal = 4 };

// Reads "HYDRODYNAMIC_MODULE": "mode" must equal the mode of "MODULE_SELECTION" ("mode is
// illegal" otherwise).
void SetupHD(HDModule& hd, std::int32_t selectedMode, int numDimensions, std::int32_t runStartStep,
             double overallStep, bool gpu = false);
// Reads "SOLUTION_TECHNIQUE" (a missing section keeps every default) into `sm`; the defaults
// depend on the overall step and the flood-and-dry type; GPU runs refuse the choices the device
// path does not have.
void SetupSolutionMethodHD(SolutionMethodHD& sm, double overallStep, std::int32_t floodDryType,
                           int numDimensions, bool gpu);
// u = p / h, v = q / h for wet elements, 0 elsewhere; and the inverse.
void CalcVelocityFromFlux(HDModule& hd);
void CalcFluxFromVelocity(HDModule& hd);
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
