#include "driver/RunDriver.h"

#include <omp.h>

#include <charconv>
#include <cmath>
#include <cstdio>
#include <string>

#include "driver/Log.h"
#include "driver/Progress.h"
#include "driver/Termination.h"
#include "platform/System.h"
#include "mesh/Domain.h"
#include "setup/SetupFile.h"

DriverTestHooks* g_driverTestHooks = nullptr;

namespace {

constexpr int kMaxArguments = 100;
// Sub-intervals shorter than this end the sub-step loop.
constexpr double kSubStepTolerance = 1e-6;

bool ParseInt(const std::string& text, std::int32_t& value) {
  const char* end = text.data() + text.size();
  const auto result = std::from_chars(text.data(), end, value);
  return result.ec == std::errc() && result.ptr == end && !text.empty();
}

// Thread count clamped to 1 .. min(processors, maximum threads).
void SetThreads(const RunControl& run, int wanted) {
  int n = wanted;
  if (n > run.numProcessors) n = run.numProcessors;
  if (n > run.maxThreads) n = run.maxThreads;
  if (n < 1) n = 1;
  omp_set_num_threads(n);
  // Every worker thread flushes denormals as the driver thread does.
#pragma omp parallel num_threads(n)
  SetDenormalsFlushToZero();
}

void PrintRunInformation(const RunControl& run) {
  Banner("Computing Environment");
  IndentedMessage("Local processor name : %", run.processorName);
  IndentedMessage("Number of processes  : %", run.numProcesses);
  IndentedMessage("Local process id     : %", run.processId);
  IndentedMessage("Number of processors : %", run.numProcessors);
  IndentedMessage("Max number of threads: %", run.maxThreads);
}

std::string DateText(const std::int32_t t[6]) {
  char buf[96];
  std::snprintf(buf, sizeof buf, "%04d-%02d-%02d %02d:%02d:%02d", t[0], t[1], t[2], t[3], t[4], t[5]);
  return buf;
}

void CheckModuleMode(const char* keyword, std::int32_t mode) {
  if (mode < 0)
    FatalError(std::string("MODULE_SELECTION: ") + keyword + " must not be negative, not " +
               std::to_string(mode));
}

// Modules this engine does not contain stop the run instead of being skipped silently.
void RefuseMissingModule(const char* module, std::int32_t mode) {
  if (mode > 0) FatalError(std::string(module) + ": module not available in this build");
}

void SetupModules(RunControl& run, Modules& modules) {
  SetupHD(modules.hd, run.modeHD, run.numDimensions, run.startStep, run.timeStep,
          run.gpuCount > 0);
}

// Before the loop: initial states, outputs of the start step, banners.
void PrepareLoop(RunControl& run, Modules& modules) {
  StartTiming(run.overall, kTimePre);
  const int n = run.startStep;
  if (run.modeHD > 1) {
    InitialStateHD(modules.hd);
    OpenOutputsHD(modules.hd);
  }
  // Every entry of the setup file has been looked at by now: report the ones nothing read.
  SkfWarnUnread();
  if (g_log.processId < 1) ProgressStartLoop(n, run.numTimeSteps, run.startDate, run.timeStep);
  Banner("COMPUTATION STARTED");
  WriteOutputsHD(modules.hd, n);
  StopTiming(run.overall, kTimePre);
  StartTiming(run.overall, kTimeCalc);
}

// One overall step [n dt, (n+1) dt] as hydrodynamic sub-steps. Returns the run status.
std::int32_t AdvanceOverallStep(RunControl& run, Modules& modules, int n) {
  const double t1 = (n + 1) * run.timeStep;
  double t0 = n * run.timeStep;
  while (std::fabs(t1 - t0) > kSubStepTolerance) {
    double delta = CalcSubStepHD(modules.hd, t0, t1);
    if (g_driverTestHooks != nullptr && g_driverTestHooks->subStep != nullptr)
      g_driverTestHooks->subStep(n + 1, t0, t1, delta);
    if (std::isfinite(delta) && delta > t1 - t0) delta = t1 - t0;  // never past the step's end
    if (!std::isfinite(delta) || delta <= 0.0 || t0 + delta <= t0) {
      PrintLine("");
      PrintLine("Run-time error: the hydrodynamic sub-step length " + FormatNumber(delta) +
                " s at time " + FormatNumber(t0) + " s (overall step " + std::to_string(n + 1) +
                ") is not a positive number: the computation cannot advance");
      return -1;
    }
    t0 += delta;
    std::int32_t status = StepHD(modules.hd, t0, delta);
    if (status == 0 && g_driverTestHooks != nullptr && g_driverTestHooks->hdStep != nullptr)
      status = g_driverTestHooks->hdStep(n + 1, t0, delta);
    if (status < 0) return status;
    EndSubStepHD(modules.hd, delta);
  }
  return 0;
}

void RunTimeLoop(RunControl& run, Modules& modules) {
  int n = run.startStep;
  while (n < run.numTimeSteps && run.runStatus == 0) {
    run.runStatus = AdvanceOverallStep(run, modules, n);
    if (run.runStatus < 0) break;
    ++n;
    StopTiming(run.overall, kTimeCalc);
    StartTiming(run.overall, kTimePost);
    WriteOutputsHD(modules.hd, n);
    StopTiming(run.overall, kTimePost);
    StartTiming(run.overall, kTimeCalc);
    if (g_log.processId < 1 && ProgressStep(n, modules.hd.activeElements)) run.runStatus = 1;
    // Under MPI the master's run status is broadcast here so all processes stop together.
  }
  StopTiming(run.overall, kTimeCalc);
  Banner("COMPUTATION ENDED");
  StartTiming(run.overall, kTimePost);
  if (run.runStatus < 0) WriteFailureOutputsHD(modules.hd);
  if (run.runStatus > 0) WriteCancelOutputsHD(modules.hd, n);
  CloseOutputsHD(modules.hd);
  PrintSummaryHD(modules.hd);
  PrintTimingsHD(modules.hd);
  StopTiming(run.overall, kTimePost);
}

[[noreturn]] void EndOfRun(RunControl& run) {
  StopTiming(run.overall, kTimeTotal);
  PrintTimingTable(run.overall);
  Banner("Memory Usage");
  char mb[64];
  std::snprintf(mb, sizeof mb, "%.1f", static_cast<double>(PeakMemoryBytes()) / (1024.0 * 1024.0));
  IndentedMessage("Peak memory usage (MB) : %", mb);
  IndentedMessage("Number of threads on CPU: %", omp_get_max_threads());
  PrintLine("");
  ProgressEnd();
  PrintLine(CompletionLine(run.runStatus));
  SkfCloseFile();
  LogClose();
  Stop(RunExitCode(run.runStatus));
}

}  // namespace

int RunExitCode(std::int32_t runStatus) { return runStatus < 0 ? 3 : 0; }

const char* CompletionLine(std::int32_t runStatus) {
  if (runStatus == 0) return "  Normal run completion";
  if (runStatus == 1) return "  Run cancelled by user";
  return "  Abnormal run completion";
}

bool ReadCommandLine(RunControl& run, int argc, const char* const* argv, std::string& error) {
  std::vector<std::string> args;
  for (int i = 0; i < argc && i < kMaxArguments; ++i) {
    const std::string a = argv[i] != nullptr ? argv[i] : "";
    if (i > 0 && a.rfind("//", 0) == 0) continue;
    args.push_back(a);
  }
  run.programName = args.empty() ? "tesselhd" : args[0];
  const std::string usage = "Usage: " + run.programName + " skf-file";
  if (args.size() < 2 || args[1].empty()) {
    error = usage;
    return false;
  }
  run.setupFile = args[1];
  for (std::size_t i = 2; i < args.size(); ++i) {
    if (args[i] != "-gpu") continue;
    std::int32_t count = 0;
    if (i + 1 >= args.size() || !ParseInt(args[i + 1], count) || count < 1) {
      error = "-gpu must be followed by a device count of at least 1\n" + usage + " [-gpu N d1 .. dN]";
      return false;
    }
    std::vector<std::int32_t> devices;
    for (std::int32_t k = 0; k < count; ++k) {
      std::int32_t device = 0;
      const std::size_t at = i + 2 + static_cast<std::size_t>(k);
      if (at >= args.size() || !ParseInt(args[at], device) || device < 0) {
        error = "-gpu " + std::to_string(count) + " must be followed by " + std::to_string(count) +
                " device numbers (integers from 0)\n" + usage + " [-gpu N d1 .. dN]";
        return false;
      }
      devices.push_back(device);
    }
    run.gpuCount = count;
    run.gpuDevices = devices;
    i += 1 + static_cast<std::size_t>(count);
  }
  return true;
}

void ReadSystemSection(RunControl& run) {
  run.streamLimit = 2048;
  int status = 0;
  SkfOpenSection("SYSTEM", &status);
  if (status == 0) {
    std::int32_t handles = 2048;
    if (SkfReadInt("MaxIOHandles", handles) == 0) {
      if (handles < 512 || handles > 2048) FatalError("MaxIOHandles must be between 512 - 2048 !");
      run.streamLimit = handles;
    }
    SkfCloseSection();
  }
  SetOpenFileLimit(run.streamLimit);
}

void ReadTimeSection(RunControl& run) {
  static const std::int32_t kDefaultStart[6] = {2004, 1, 1, 0, 0, 0};
  SkfOpenSection("TIME");
  SkfReadIntList("start_time", run.startTime, 6, kDefaultStart);
  SkfReadDouble("time_step_interval", run.timeStep, 30.0);
  SkfReadInt("number_of_time_steps", run.numTimeSteps, 100);
  SkfCloseSection();
  run.startStep = 0;

  CalendarDate start;
  start.year = run.startTime[0];
  start.month = run.startTime[1];
  start.day = run.startTime[2];
  start.hour = run.startTime[3];
  start.minute = run.startTime[4];
  start.second = run.startTime[5];
  if (!IsValidCalendarDate(start))
    FatalError("TIME: start_time " + DateText(run.startTime) + " is not a valid date and time");
  if (!std::isfinite(run.timeStep) || run.timeStep <= 0.0)
    FatalError("TIME: time_step_interval must be a positive number of seconds, not " +
               FormatNumber(run.timeStep));
  if (run.numTimeSteps < 0)
    FatalError("TIME: number_of_time_steps must not be negative, not " +
               std::to_string(run.numTimeSteps));
  run.startDate = MakeDateTime(start);
  const double period = run.numTimeSteps * run.timeStep;
  const DateTime last = MakeDateTime(CalendarDate{9999, 12, 31, 23, 59, 59.0});
  if (!(period <= DiffSeconds(last, run.startDate)))
    FatalError("TIME: the simulation period of " + std::to_string(run.numTimeSteps) + " steps of " +
               FormatNumber(run.timeStep) + " s ends after the year 9999");
  run.endDate = AddSeconds(run.startDate, period);
  IndentedMessage("Simulation period: %", FormatDateTime(run.startDate) + " - " + FormatDateTime(run.endDate));
}

void ReadModuleSelection(RunControl& run) {
  SkfOpenSection("MODULE_SELECTION");
  SkfReadInt("mode_of_hydrodynamic_module", run.modeHD, 2);
  SkfReadInt("hydrodynamic_features", run.hydrodynamicFeatures, 1);
  SkfReadInt("mode_of_transport_module", run.modeTR, 0);
  if (run.hydrodynamicFeatures == 1) {
    SkfReadInt("mode_of_mud_transport_module", run.modeMT, 0);
    SkfReadInt("mode_of_sand_transport_module", run.modeST, 0);
  } else {
    run.modeMT = 0;
    run.modeST = 0;
  }
  SkfReadInt("mode_of_eco_lab_module", run.modeEL, 0);
  SkfCloseSection();

  if (run.modeHD == 0) FatalError("The Hydrodynnamic module must be included");
  if (run.modeHD != 1 && run.modeHD != 2)
    FatalError("MODULE_SELECTION: mode_of_hydrodynamic_module must be 1 or 2, not " +
               std::to_string(run.modeHD));
  CheckModuleMode("mode_of_transport_module", run.modeTR);
  CheckModuleMode("mode_of_mud_transport_module", run.modeMT);
  CheckModuleMode("mode_of_sand_transport_module", run.modeST);
  CheckModuleMode("mode_of_eco_lab_module", run.modeEL);
  RefuseMissingModule("Transport module", run.modeTR);
  RefuseMissingModule("Mud transport module", run.modeMT);
  RefuseMissingModule("Sand transport module", run.modeST);
  RefuseMissingModule("Ecology module", run.modeEL);
}

void RunTesselHD(int argc, const char* const* argv) {
  RunControl run;
  Modules modules;

  // 1-2. Floating-point control; processes (single-process until MPI arrives).
  SetDenormalsFlushToZero();
  run.processId = -1;
  run.numProcesses = 1;
  g_log.processId = run.processId;
  g_log.numProcesses = run.numProcesses;
  run.processorName = ProcessorName();
  run.numProcessors = NumberOfProcessors();
  run.maxThreads = omp_get_max_threads();

  // 3. Signals, command line, setup file and log.
  InstallSignalHandlers();
  std::string error;
  if (!ReadCommandLine(run, argc, argv, error)) StopWithMessage(error);
  int status = 0;
  SkfOpenFile(run.setupFile, true, &status);
  if (status != 0) StopWithMessage(run.programName + ": Unable to open " + run.setupFile);

  // 4-6. Run information, set-up threads, timings, progress.
  PrintRunInformation(run);
  SetThreads(run, 2);
  CreateTimingTable(run.overall, "Overall", 4);
  AddTiming(run.overall, kTimePre, "Pre-processing");
  AddTiming(run.overall, kTimeCalc, "Calculation");
  AddTiming(run.overall, kTimePost, "Post-processing");
  AddTiming(run.overall, kTimeTotal, "Total");
  StartTiming(run.overall, kTimeTotal);
  StartTiming(run.overall, kTimePre);
  if (run.processId < 1) ProgressInit(g_setup.logName);

  // 8. The file is parsed once: the second load reuses the loaded tree.
  SkfOpenFile(run.setupFile, false, &status);
  if (status != 0) FatalError("Unable to open Tavrin FM setup file");
  SkfOpenTarget("TesselHD");

  // 9. GPU devices: this build computes on the CPU.
  if (run.gpuCount > 0)
    Warning("-gpu " + std::to_string(run.gpuCount) +
            ": GPU execution is not available in this build; the run uses the CPU");

  // 10-11. Root keywords and "SYSTEM".
  if (run.processId >= 0) {
    SkfReadInt("delete_logfile", run.deleteLogfile, 1);
    SkfReadInt("merge_data_default", run.mergeDataDefault, 2);
  } else {
    run.deleteLogfile = 0;
  }
  SkfReadInt("GPU_timing", run.gpuTiming, 2);
  ReadSystemSection(run);

  // 13-16. "TIME", "DOMAIN" (read with the mesh), "MODULE_SELECTION", computation threads.
  ReadTimeSection(run);
  DomainSettings domain;
  SetupSpaceDiscretization(domain);
  run.numDimensions = domain.numDimensions;
  ReadModuleSelection(run);
  SetThreads(run, run.numProcessors);

  // 18. Modules in their fixed order.
  SetupModules(run, modules);
  StopTiming(run.overall, kTimePre);

  PrepareLoop(run, modules);
  RunTimeLoop(run, modules);
  EndOfRun(run);
}
