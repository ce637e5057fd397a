// Run driver: command line, set-up of the run-level sections and the modules in their fixed
// order, the overall time loop with its sub-step loop, summaries, timing tables and the end of
// the run.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "driver/DateTime.h"
#include "driver/Timing.h"
#include "hd/HDModule.h"

// Tasks of the main timing table "Overall".
enum OverallTask : int { kTimePre = 1, kTimeCalc = 2, kTimePost = 3, kTimeTotal = 4 };

struct RunControl {
  std::string programName;
  std::string setupFile;
  std::int32_t gpuCount = 0;            // "-gpu N d1 .. dN"
  std::vector<std::int32_t> gpuDevices;
  int processId = -1;                   // -1: single-process run
  int numProcesses = 1;
  std::string processorName;
  int numProcessors = 1;
  int maxThreads = 1;
  std::int32_t deleteLogfile = 0;       // "delete_logfile" (read only when processId >= 0)
  std::int32_t mergeDataDefault = 2;    // "merge_data_default"
  std::int32_t gpuTiming = 2;           // "GPU_timing"
  long streamLimit = 2048;              // "SYSTEM" / "MaxIOHandles"
  std::int32_t startTime[6] = {2004, 1, 1, 0, 0, 0};
  DateTime startDate, endDate;
  double timeStep = 30.0;               // overall time step, seconds
  std::int32_t numTimeSteps = 100;      // N
  std::int32_t startStep = 0;
  int numDimensions = 2;                // from "DOMAIN"
  std::int32_t modeHD = 2, hydrodynamicFeatures = 1, modeTR = 0, modeMT = 0, modeST = 0, modeEL = 0;
  std::int32_t runStatus = 0;           // 0 running, 1 cancelled, negative failed
  TimingTable overall;
};

struct Modules {
  HDModule hd;
};

// Reads the command line into `run` (program name, setup file, "-gpu N d1 .. dN"). Arguments
// that begin with "//" are skipped; at most 100 are examined. Returns false with `error` set
// when the arguments are unusable.
bool ReadCommandLine(RunControl& run, int argc, const char* const* argv, std::string& error);

// Readers of the run-level sections (the current position must be the root target).
void ReadSystemSection(RunControl& run);
void ReadTimeSection(RunControl& run);
void ReadModuleSelection(RunControl& run);

// The whole run; ends the process (exit code 0, 1, 3 or a signal number).
[[noreturn]] void RunTesselHD(int argc, const char* const* argv);

// Fault injection for end-to-end tests of the failure paths; null in the engine.
struct DriverTestHooks {
  // May replace the sub-step length computed for [t0, t1] of overall step n.
  void (*subStep)(int n, double t0, double t1, double& delta) = nullptr;
  // Returns a run status for the hydrodynamic step of overall step n (negative: failure).
  int (*hdStep)(int n, double t, double delta) = nullptr;
};
extern DriverTestHooks* g_driverTestHooks;

// Exit code of a run that reached the end of the time loop: 0 normal or cancelled, 3 failed.
int RunExitCode(std::int32_t runStatus);
// "  Normal run completion", "  Run cancelled by user" or "  Abnormal run completion".
const char* CompletionLine(std::int32_t runStatus);
