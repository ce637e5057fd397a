// Timing tables: named tasks with accumulated CPU time (whole process), driver-thread time and
// elapsed wall time (monotonic clock), printed as a table at the end of the run.
#pragma once

#include <string>
#include <vector>

struct TimingTask {
  std::string name;
  double cpuStart = 0.0, cpuTotal = 0.0;          // process CPU seconds (all threads)
  double processStart = 0.0, processTotal = 0.0;  // CPU seconds of the driver thread
  double wallStart = 0.0, wallTotal = 0.0;        // elapsed seconds
  bool running = false;
};

struct TimingTable {
  std::string name;               // printed as name + " Timings"
  int capacity = 0;               // highest valid task number
  int count = 0;                  // tasks added so far
  std::vector<int> printOrder;    // task numbers in the order they were added
  std::vector<TimingTask> tasks;  // 1-based: tasks[0] unused
};

// Sizes the table; task names default to "task_<n>".
void CreateTimingTable(TimingTable& table, const std::string& name, int capacity);
// Appends task `number` to the print order under `name`; a number outside 1 .. capacity is fatal
// "AddTiming: Wrong timing number".
void AddTiming(TimingTable& table, int number, const std::string& name);
// Start and stop of a task; numbers outside 1 .. capacity are ignored.
void StartTiming(TimingTable& table, int number);
void StopTiming(TimingTable& table, int number);
// The table as printed (without the leading empty line of the banner).
std::string FormatTimingTable(const TimingTable& table);
void PrintTimingTable(const TimingTable& table);
