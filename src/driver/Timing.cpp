#include "driver/Timing.h"

#include <cstdio>

#include "driver/Log.h"
#include "driver/Termination.h"
#include "platform/System.h"

void CreateTimingTable(TimingTable& table, const std::string& name, int capacity) {
  table.name = name;
  table.capacity = capacity < 0 ? 0 : capacity;
  table.count = 0;
  table.printOrder.clear();
  table.tasks.assign(static_cast<std::size_t>(table.capacity) + 1, TimingTask{});
  for (int i = 1; i <= table.capacity; ++i) table.tasks[static_cast<std::size_t>(i)].name = "task_" + std::to_string(i);
}

void AddTiming(TimingTable& table, int number, const std::string& name) {
  if (number < 1 || number > table.capacity) FatalError("AddTiming: Wrong timing number");
  table.tasks[static_cast<std::size_t>(number)].name = name;
  table.printOrder.push_back(number);
  ++table.count;
}

void StartTiming(TimingTable& table, int number) {
  if (number < 1 || number > table.capacity) return;
  TimingTask& t = table.tasks[static_cast<std::size_t>(number)];
  t.cpuStart = ProcessCpuSeconds();
  t.processStart = ThreadCpuSeconds();
  t.wallStart = WallSeconds();
  t.running = true;
}

void StopTiming(TimingTable& table, int number) {
  if (number < 1 || number > table.capacity) return;
  TimingTask& t = table.tasks[static_cast<std::size_t>(number)];
  if (!t.running) return;  // a stop without a start adds nothing
  t.cpuTotal += ProcessCpuSeconds() - t.cpuStart;
  t.processTotal += ThreadCpuSeconds() - t.processStart;
  t.wallTotal += WallSeconds() - t.wallStart;
  t.running = false;
}

static std::string Row(const std::string& name, const std::string& cpu, const std::string& wall) {
  char buf[512];
  std::snprintf(buf, sizeof buf, "%-36.36s%15s%15s", name.c_str(), cpu.c_str(), wall.c_str());
  return TrimRight(buf);
}

static std::string Seconds(double s) {
  char buf[64];
  std::snprintf(buf, sizeof buf, "%.2f", s);
  return buf;
}

std::string FormatTimingTable(const TimingTable& table) {
  const std::string rule(66, '-');
  std::string out = BannerText(table.name + " Timings") + "\n";
  out += rule + "\n";
  out += Row("Task", "CPU time", "Elapsed time") + "\n";
  out += rule + "\n";
  for (int number : table.printOrder) {
    const TimingTask& t = table.tasks[static_cast<std::size_t>(number)];
    if (Trim(t.name) == "Total") out += rule + "\n";
    out += Row(t.name, Seconds(t.cpuTotal), Seconds(t.wallTotal)) + "\n";
  }
  out += rule + "\n";
  out += std::string(70, '=') + "\n";
  return out;
}

void PrintTimingTable(const TimingTable& table) {
  PrintLine("");
  PrintLines(FormatTimingTable(table));
}
