#include "driver/Progress.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <cstring>

#include "driver/Termination.h"
#include "platform/System.h"

ProgressState g_progress;

namespace {

std::string Clock(double seconds) {
  if (!std::isfinite(seconds) || seconds < 0) seconds = 0;
  const long long s = static_cast<long long>(seconds + 0.5);
  char buf[64];
  std::snprintf(buf, sizeof buf, "%02lld:%02lld:%02lld", s / 3600, (s / 60) % 60, s % 60);
  return buf;
}

void LiveLine(int n, bool force) {
  ProgressState& p = g_progress;
  if (!p.liveLine) return;
  const double wall = WallSeconds();
  if (!force && p.liveWallLast >= 0.0 && wall - p.liveWallLast < 0.5) return;
  p.liveWallLast = wall;
  const int done = n - p.startStep;
  const int total = p.lastStep - p.startStep;
  const double percent = total > 0 ? 100.0 * done / total : 100.0;
  const double elapsed = wall - p.wallStart;
  const double left = done > 0 ? elapsed * (p.lastStep - n) / done : 0.0;
  char buf[256];
  std::snprintf(buf, sizeof buf, "\r  %5.1f%%  %s  elapsed %s  left %s ", percent,
                FormatDateTime(AddSeconds(p.startDate, n * p.stepSeconds)).c_str(),
                Clock(elapsed).c_str(), Clock(left).c_str());
  WriteAll(STDERR_FILENO, buf);
}

}  // namespace

std::string ProgressBaseName(const std::string& logName) {
  return StripExtension(StripExtension(logName, ".log"), ".inp");
}

void ProgressWrite(const char* tag, const std::string& value) {
  const ProgressState& p = g_progress;
  if (p.unit < 0) return;
  if (p.unit == 0) {
    if (std::strcmp(tag, "MESSAG") == 0) WriteAll(STDOUT_FILENO, value + "\n");
    return;
  }
  WriteAll(p.unit, std::string(tag) + " " + value + "\n");
}

void ProgressInit(const std::string& logName) {
  ProgressState& p = g_progress;
  const std::string base = ProgressBaseName(logName);
  p.messageFile = base + "._spi_";
  p.killFile = base + "._kill_";
  p.killSeen = false;
  const char* mode = std::getenv("TAVRIN_PROGRESS");
  if (mode != nullptr && std::strcmp(mode, "NONE") == 0) {
    p.unit = -1;
  } else if (mode != nullptr && std::strcmp(mode, "STDOUT") == 0) {
    p.unit = 0;
  } else {
    const int fd = ::open(p.messageFile.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC, 0644);
    if (fd < 0) FatalError("Unable to open VxPgv2 message file: " + p.messageFile);
    p.unit = fd;
    p.liveLine = (mode == nullptr || mode[0] == '\0') && isatty(STDERR_FILENO);
  }
  ::unlink(p.killFile.c_str());
  ProgressWrite("STALBL", "Simulation date and time [YYYY-MM-DD hh:mm:ss]");
  ProgressWrite("MESLBL", "Simulation info");
  ProgressWrite("MESSAG", "Initializing");
  ProgressWrite("PROGRE", "0");
}

void ProgressStartLoop(int n0, int N, const DateTime& startDate, double stepSeconds) {
  ProgressState& p = g_progress;
  p.startStep = n0;
  p.lastStep = N;
  p.lastReportedStep = n0;
  p.startDate = startDate;
  p.stepSeconds = stepSeconds;
  p.scale = N > n0 ? 1000.0 / (N - n0) : 0.0;
  p.cpuStart = ProcessCpuSeconds();
  p.cpuLast = 0.0;
  p.wallStart = WallSeconds();
  p.wallLast = p.wallStart;
  p.activeSum = 0.0;
  p.activeCount = 0;
  ProgressWrite("STATUS", FormatDateTime(AddSeconds(startDate, n0 * stepSeconds)));
  ProgressWrite("MESLBL", "Simulation time step");
  ProgressWrite("MESSAG", "Time step: " + std::to_string(n0));
  ProgressWrite("PROGRE", "0");
  LiveLine(n0, true);
}

bool ProgressStep(int n, double activeElements) {
  ProgressState& p = g_progress;
  p.activeSum += activeElements;
  ++p.activeCount;
  const double c = ProcessCpuSeconds() - p.cpuStart;
  if (c - p.cpuLast >= 2.0 || n == p.lastStep) {
    const double wall = WallSeconds();
    const double w = p.activeSum / static_cast<double>(p.activeCount);
    const double speed = c > 0.0 ? (n - p.startStep) / c * w : 0.0;
    const long long comspd = std::max(0LL, static_cast<long long>(std::min(speed, 9.0e18)));
    const double progre = std::min(1000.0, (n - p.startStep) * p.scale);
    long long left = 0;
    if (n != p.lastStep && n > p.lastReportedStep) {
      const double est = (p.lastStep - n) * (wall - p.wallLast) / (n - p.lastReportedStep);
      left = std::max(0LL, static_cast<long long>(std::min(est, 9.0e18)));
    }
    ProgressWrite("STATUS", FormatDateTime(AddSeconds(p.startDate, n * p.stepSeconds)));
    ProgressWrite("MESSAG", "Time step: " + std::to_string(n));
    ProgressWrite("COMSPD", std::to_string(comspd));
    ProgressWrite("PROGRE", std::to_string(static_cast<long long>(progre)));
    ProgressWrite("TIMLFT", std::to_string(left));
    p.cpuLast = c;
    p.lastReportedStep = n;
    p.wallLast = wall;
  }
  LiveLine(n, n == p.lastStep);
  return ProgressKillCheck();
}

void ProgressIteration(int n, int iteration) {
  ProgressWrite("MESSAG", "Time step " + std::to_string(n) + ", Iteration: " + std::to_string(iteration));
}

bool ProgressKillCheck() {
  ProgressState& p = g_progress;
  if (p.killSeen) return false;
  if (p.killFile.empty()) return false;
  struct stat st {};
  if (::stat(p.killFile.c_str(), &st) == 0) {
    p.killSeen = true;
    return true;
  }
  return false;
}

void ProgressEnd() {
  ProgressState& p = g_progress;
  if (p.liveLine) {
    WriteAll(STDERR_FILENO, "\n");
    p.liveLine = false;
  }
  if (p.unit > 0) ::close(p.unit);
  p.unit = -1;
}
