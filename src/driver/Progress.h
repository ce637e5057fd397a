// Progress reporting: the message file polled by an external viewer (or standard output, or
// nothing, chosen by TAVRIN_PROGRESS), the kill file through which a user cancels a run, and a
// live progress line on a terminal's standard error.
#pragma once

#include <cstdint>
#include <string>

#include "driver/DateTime.h"

struct ProgressState {
  int unit = -1;             // -1 disabled, 0 standard output, > 0 the message file
  std::string messageFile;   // base + "._spi_"
  std::string killFile;      // base + "._kill_"
  bool killSeen = false;
  bool liveLine = false;     // live line on standard error (terminal, TAVRIN_PROGRESS unset)
  int startStep = 0;         // n0
  int lastStep = 0;          // N
  int lastReportedStep = 0;
  double cpuLast = 0.0;      // process CPU seconds at the last report
  double wallLast = 0.0;     // wall seconds at the last report
  double wallStart = 0.0;
  double liveWallLast = -1.0;
  double cpuStart = 0.0;
  double scale = 0.0;        // per mille per step: 1000 / (N - n0), 0 when N = n0
  double stepSeconds = 0.0;  // overall time step
  DateTime startDate;
  double activeSum = 0.0;    // running average of the active element count
  std::int64_t activeCount = 0;
};

extern ProgressState g_progress;

// Base name of the progress files: the log name with ".log" and ".inp" removed.
std::string ProgressBaseName(const std::string& logName);

// Start of set-up: reads TAVRIN_PROGRESS, opens the message file, deletes a stale kill file and
// reports "Initializing". A message file that cannot be opened is fatal.
void ProgressInit(const std::string& logName);
// Start of the time loop at step n0 of N.
void ProgressStartLoop(int n0, int N, const DateTime& startDate, double stepSeconds);
// After overall step n; `activeElements` is the number of elements computed in the step.
// Returns true when the user asked to cancel (kill file found).
bool ProgressStep(int n, double activeElements);
// Progress of an iterative solver within step n.
void ProgressIteration(int n, int iteration);
// True when the kill file exists (checked until the first time it is seen).
bool ProgressKillCheck();
// Ends the live line and closes the message file.
void ProgressEnd();

// Writes one tagged line ("MESSAG Initializing") to the progress unit.
void ProgressWrite(const char* tag, const std::string& value);
