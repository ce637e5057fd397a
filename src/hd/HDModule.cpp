#include "hd/HDModule.h"

#include <algorithm>
#include <cmath>
#include <new>
#include <string>

#include "driver/Log.h"
#include "driver/Termination.h"
#include "mesh/MeshData.h"
#include "setup/SetupFile.h"

namespace {

// Reads a sub-section of the module when the setup file has it; false keeps the defaults.
bool OpenOptional(const char* name) {
  int status = 0;
  SkfOpenSection(name, &status);
  return status == 0;
}

void RefuseOnGpu(bool refuse, const char* message) {
  if (refuse) FatalError(message);
}

void ReadInitialConditions(InitialConditionHD& ic) {
  if (!OpenOptional("INITIAL_CONDITIONS")) return;
  SkfReadInt("type", ic.type, 0);
  switch (ic.type) {
    case 0:
      break;
    case 1:
      SkfReadDouble("surface_elevation_constant", ic.eta, 0.0);
      SkfReadDouble("u_velocity_constant", ic.u, 0.0);
      SkfReadDouble("v_velocity_constant", ic.v, 0.0);
      break;
    case 2:
    case 3:
      SkfReadInputFile("file_name_2d", ic.fileName, "");
      if (ic.type == 2) {
        SkfReadInt("surface_elevation_item_no", ic.etaItem, 1);
      } else {
        SkfReadInt("total_water_depth_item_no", ic.hItem, 1);
        SkfReadInt("still_water_depth_item_no", ic.dItem, 0);
        SkfReadInt("u_velocity_item_no", ic.uItem, 2);
        SkfReadInt("v_velocity_item_no", ic.vItem, 3);
      }
      FatalError("INITIAL_CONDITIONS: type " + std::to_string(ic.type) +
                 " (values from a data file) is not available in this build yet");
    default:
      FatalError("INITIAL_CONDITIONS: Type not supported (" + std::to_string(ic.type) + ")");
  }
  SkfCloseSection();
}

void ReadDepth(HDModule& hd) {
  if (!OpenOptional("DEPTH")) return;
  SkfReadInt("type", hd.depthType, 0);
  if (hd.depthType != 0 && hd.depthType != 1 && hd.depthType != 2) FatalError("Type not supported");
  if (hd.depthType != 0) {
    std::int32_t format = 0;
    SkfReadInt("format", format, 0);
    if (format != 2 && format != 3) FatalError("Format not supported");
    FatalError("DEPTH: bathymetry from a data file is not available in this build yet");
  }
  SkfCloseSection();
}

// cos and tan of the latitude per element and node ("LONG/LAT": y in radians); 1 elsewhere.
void SetupGeographicFactors(HDModule& hd, const MeshData& m) {
  const std::int32_t ne = m.elements.numElements, nn = m.nodes.numNodes;
  hd.geographic = m.IsLongLat();
  hd.cosLat.assign(ne + 1, 1.0);
  hd.tanLat.assign(ne + 1, 1.0);
  hd.cosLatNode.assign(nn + 1, 1.0);
  hd.tanLatNode.assign(nn + 1, 1.0);
  if (!hd.geographic) return;
  for (std::int32_t e = 1; e <= ne; ++e) {
    hd.cosLat[e] = std::cos(m.elements.yc[e]);
    hd.tanLat[e] = std::tan(m.elements.yc[e]);
  }
  for (std::int32_t n = 1; n <= nn; ++n) {
    hd.cosLatNode[n] = std::cos(m.nodes.y[n]);
    hd.tanLatNode[n] = std::tan(m.nodes.y[n]);
  }
}

}  // namespace

void SetupSolutionMethodHD(SolutionMethodHD& sm, double dt, std::int32_t floodDryType,
                           int numDimensions, bool gpu) {
  sm = SolutionMethodHD{};
  const bool floodDry13 = floodDryType == 1 || floodDryType == 3;
  sm.bedResistanceDiscretization = floodDry13 ? 2 : 1;
  sm.cflCorrectionHD = floodDry13 ? 1 : 0;
  sm.dtMinHD = sm.dtMinAD = std::min(0.01, dt / 100.0);
  sm.dtMaxHD = sm.dtMaxAD = dt;
  if (OpenOptional("SOLUTION_TECHNIQUE")) {
    SkfReadInt("scheme_of_time_integration", sm.timeOrder, 1);
    SkfReadInt("scheme_of_space_discretization_horizontal", sm.spaceOrder, 1);
    const bool second = sm.spaceOrder == 2;
    if (second) SkfReadInt("gradient_calculation", sm.gradientMethod, 2);
    SkfReadInt("gradient_limiter", sm.gradientLimiter, 0);
    if (second) SkfReadInt("face_value_limiter", sm.faceValueLimiter, 2);
    SkfReadInt("boundary_correction", sm.boundaryCorrection, 1);
    SkfReadLogical("preserve_dU", sm.preserveDU, second);
    SkfReadInt("face_average_d", sm.faceAverageD, second ? 1 : 0);
    SkfReadLogical("face_limit_dry", sm.faceLimitDry, second);
    if (second) {
      SkfReadInt("type_of_filtering", sm.filterType, 0);
      if (sm.filterType > 0) SkfReadDouble("filtering_coefficient", sm.filterCoefficient, 0.01);
    }
    SkfReadInt("type_of_Riemann_solver", sm.riemannSolver, 1);
    if (sm.riemannSolver == 1) SkfReadInt("type_of_entropy_fix", sm.entropyFix, 1);
    if (numDimensions == 2)
      SkfReadInt("bed_resistance_discretization", sm.bedResistanceDiscretization,
                 sm.bedResistanceDiscretization);
    SkfReadInt("type_of_land_condition", sm.landCondition, 2);
    SkfReadDouble("CFL_critical_HD", sm.cflHD, 1.0);
    SkfReadDouble("dt_min_HD", sm.dtMinHD, sm.dtMinHD);
    SkfReadDouble("dt_max_HD", sm.dtMaxHD, sm.dtMaxHD);
    SkfReadInt("CFL_correction_HD", sm.cflCorrectionHD, sm.cflCorrectionHD);
    SkfReadDouble("CFL_critical_AD", sm.cflAD, 1.0);
    SkfReadDouble("dt_min_AD", sm.dtMinAD, sm.dtMinAD);
    SkfReadDouble("dt_max_AD", sm.dtMaxAD, sm.dtMaxAD);
    SkfReadDouble("CFL_critical_substeps_AD", sm.cflSubstepsAD, 0.8);
    SkfReadInt("error_level", sm.errorLevel, 0);
    SkfReadInt("maximum_number_of_errors", sm.maxErrors, 200);
    if (gpu) SkfReadInt("dynamic_list", sm.dynamicList, 1);
    SkfCloseSection();
  }
  if (gpu) {
    RefuseOnGpu(numDimensions == 2 && sm.gradientMethod == 1 && sm.spaceOrder == 2,
                "This type of gradient calculation is not available using GPU");
    RefuseOnGpu(sm.gradientLimiter >= 1 && sm.gradientLimiter <= 3,
                "This type of gradient limiter is not available using GPU");
    RefuseOnGpu(sm.faceValueLimiter == 1 || sm.faceValueLimiter == 3,
                "This type of face value limiter is not available using GPU");
    RefuseOnGpu(sm.boundaryCorrection == 2,
                "This type of boundary correction is not available using GPU");
    RefuseOnGpu(sm.riemannSolver == 0 || sm.riemannSolver == 2 || sm.riemannSolver == 3,
                "This type of Riemann solver is not available using GPU");
  }
}

void SetupHD(HDModule& hd, std::int32_t selectedMode, int numDimensions, std::int32_t runStartStep,
             double overallStep, bool gpu) {
  hd.numDimensions = numDimensions;
  hd.startStep = runStartStep;
  SkfOpenSection("HYDRODYNAMIC_MODULE");
  SkfReadInt("mode", hd.mode, 2);
  if (hd.mode != selectedMode) FatalError("mode is illegal");
  if (hd.mode > 0) {
    if (OpenOptional("TIME")) {
      SkfReadInt("start_time_step", hd.startStep, runStartStep);
      SkfReadInt("time_step_factor", hd.timeStepFactor, 1);
      SkfCloseSection();
    }
    if (hd.timeStepFactor < 1)
      FatalError("HYDRODYNAMIC_MODULE: \"time_step_factor\" must be at least 1");
    if (OpenOptional("EQUATION")) {
      SkfReadInt("formulation", hd.formulation, 1);
      SkfReadInt("time_formulation", hd.timeFormulation, 2);
      SkfCloseSection();
    }
    if (hd.formulation == 4) hd.formulation = 1;
    if (hd.formulation == 2 || hd.formulation == 3) {
      RefuseOnGpu(gpu, "The non-hydrostaic formulation is not available using GPU");
      FatalError("EQUATION: \"formulation\" " + std::to_string(hd.formulation) +
                 " (non-hydrostatic) is not part of this engine");
    }
    if (hd.formulation != 1)
      FatalError("EQUATION: \"formulation\" " + std::to_string(hd.formulation) +
                 " not supported");
    if (OpenOptional("SPACE")) {
      SkfReadInt("number_of_2D_mesh_geometry", hd.meshGeometry, 1);
      SkfReadInt("number_of_2D_mesh_velocity", hd.meshVelocity, 1);
      SkfReadInt("number_of_2D_mesh_elevation", hd.meshElevation, 1);
      SkfCloseSection();
    }
    hd.meshMapping = hd.meshGeometry != hd.meshVelocity || hd.meshGeometry != hd.meshElevation;
    const int numMeshes = g_meshTable.numMeshes;
    for (const std::int32_t k : {hd.meshGeometry, hd.meshVelocity, hd.meshElevation})
      if (numMeshes > 0 && (k < 1 || k > numMeshes))
        FatalError("SPACE: mesh number " + std::to_string(k) + " outside 1.." +
                   std::to_string(numMeshes));
    if (numMeshes > 0) {
      const MeshData& mesh = g_meshTable.meshes[hd.meshGeometry - 1];
      hd.numElements = mesh.elements.numElements;
      hd.wet.assign(hd.numElements + 1, kWet);
      SetupGeographicFactors(hd, mesh);
    }
    // Forcings and property modules.
    ReadDepth(hd);
    ReadDensitySettings(hd.density);
    ReadFloodDrySettings(hd.floodDry);
    SetupSolutionMethodHD(hd.solution, overallStep, hd.floodDry.type, numDimensions, gpu);
  }
  if (hd.mode == 2) ReadInitialConditions(hd.initial);
  SkfCloseSection();
  hd.stepLength = overallStep * hd.timeStepFactor;

  CreateTimingTable(hd.timings, "Hydrodynamic Simulation", 4);
  AddTiming(hd.timings, kHDTimeForcing, "Update forcings");
  AddTiming(hd.timings, kHDTimeSolve, "Solve Shallow Water eq.");
  AddTiming(hd.timings, kHDTimeOther, "Other calculation");
  AddTiming(hd.timings, kHDTimeTotal, "Total");
}

void InitialStateHD(HDModule& hd) {
  if (hd.mode != 2 || g_meshTable.numMeshes == 0) return;
  const MeshData& mesh = g_meshTable.meshes[hd.meshGeometry - 1];
  const std::int32_t ne = hd.numElements;
  try {
    for (auto* a : {&hd.eta, &hd.d, &hd.h, &hd.p, &hd.q, &hd.u, &hd.v, &hd.volumeCorrection})
      a->assign(ne + 1, 0.0);
    hd.wetOld.assign(ne + 1, kWet);
  } catch (const std::bad_alloc&) {
    FatalError("InitialStateHD: Out of memory");
  }
  // 1-2. Elevation and velocities from the chosen type; h = eta + d with d = -(bed level).
  const InitialConditionHD& ic = hd.initial;
  double deepest = 0.0;
  for (std::int32_t e = 1; e <= ne; ++e) {
    hd.d[e] = -mesh.elements.zc[e];
    hd.eta[e] = ic.type == 1 ? ic.eta : 0.0;
    hd.u[e] = ic.type == 1 ? ic.u : 0.0;
    hd.v[e] = ic.type == 1 ? ic.v : 0.0;
    hd.h[e] = hd.eta[e] + hd.d[e];
    deepest = e == 1 ? hd.d[e] : std::max(deepest, hd.d[e]);
  }
  // 3-4. Classification and one full flood-and-dry check.
  FloodDryState st{ne, hd.wet.data(), hd.wetOld.data(), hd.h.data(), hd.d.data(), hd.p.data(),
                   hd.q.data(), hd.volumeCorrection.data()};
  ClassifyFloodDryInitial(hd.floodDry, st);
  CheckFloodDryHD(hd.floodDry, mesh, st);
  // 5. Dry elements hold no water; only wet elements carry velocity and flux.
  for (std::int32_t e = 1; e <= ne; ++e) {
    if (hd.wet[e] == kDry) hd.h[e] = 0.0;
    if (hd.wet[e] != kWet) hd.u[e] = hd.v[e] = 0.0;
    hd.eta[e] = hd.h[e] - hd.d[e];
  }
  CalcFluxFromVelocity(hd);
  // 6. Blow-up limit of the water level.
  hd.blowUpElevation = deepest + 1000.0;
}

void CalcVelocityFromFlux(HDModule& hd) {
  const std::int32_t ne = hd.numElements;
#pragma omp parallel for schedule(static)
  for (std::int32_t e = 1; e <= ne; ++e) {
    const bool wet = hd.wet[e] == kWet && hd.h[e] > 0.0;
    hd.u[e] = wet ? hd.p[e] / hd.h[e] : 0.0;
    hd.v[e] = wet ? hd.q[e] / hd.h[e] : 0.0;
  }
}

void CalcFluxFromVelocity(HDModule& hd) {
  const std::int32_t ne = hd.numElements;
#pragma omp parallel for schedule(static)
  for (std::int32_t e = 1; e <= ne; ++e) {
    hd.p[e] = hd.h[e] * hd.u[e];
    hd.q[e] = hd.h[e] * hd.v[e];
  }
}
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
