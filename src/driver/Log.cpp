#include "driver/Log.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cmath>
#include <cstdio>
#include <ctime>
#include <string>

#include "driver/Termination.h"
#include "platform/System.h"

LogState g_log;

static int MessageUnit() { return g_log.unit > 0 ? g_log.unit : STDOUT_FILENO; }

std::string LogFileName(const std::string& setupFile, int processId, int numProcesses) {
  if (numProcesses > 1 && processId > 0) {
    const std::string leaf = PathLeaf(setupFile);
    const std::size_t dot = leaf.find_last_of('.');
    const std::string folder = setupFile.substr(0, setupFile.size() - leaf.size());
    const std::string base = dot == std::string::npos ? leaf : leaf.substr(0, dot);
    const std::string ext = dot == std::string::npos ? "" : leaf.substr(dot + 1);
    return ReplaceExtension(folder + base + "_p" + std::to_string(processId) + "." + ext, ".log");
  }
  return ReplaceExtension(setupFile, ".log");
}

bool LogOpen(const std::string& fileName) {
  LogClose();
  const int fd = ::open(fileName.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC, 0644);
  if (fd < 0) return false;
  g_log.unit = fd;
  g_log.fileName = fileName;
  SetSignalLogUnit(fd);
  const std::time_t now = std::time(nullptr);
  std::tm tm{};
  localtime_r(&now, &tm);
  char date[64], clock[64];
  std::strftime(date, sizeof date, "Date: %Y-%m-%d", &tm);
  std::strftime(clock, sizeof clock, "Time: %H:%M:%S", &tm);
  PrintLine(date);
  PrintLine(clock);
  return true;
}

void LogClose() {
  if (g_log.unit > 0) {
    if (!g_log.pending.empty()) EndLine();
    SetSignalLogUnit(-1);
    ::fsync(g_log.unit);
    ::close(g_log.unit);
  }
  g_log.unit = -1;
}

bool LogIsOpen() { return g_log.unit > 0; }

std::string TrimRight(std::string_view text) {
  std::size_t n = text.size();
  while (n > 0 && (text[n - 1] == ' ' || text[n - 1] == '\t')) --n;
  return std::string(text.substr(0, n));
}

std::string Trim(std::string_view text) {
  std::size_t b = 0;
  while (b < text.size() && (text[b] == ' ' || text[b] == '\t')) ++b;
  return TrimRight(text.substr(b));
}

void PrintLine(std::string_view text) {
  std::string line = std::move(g_log.pending);
  g_log.pending.clear();
  line += TrimRight(text);
  line += '\n';
  WriteAll(MessageUnit(), line);
}

void PrintPartial(std::string_view text) { g_log.pending.append(text); }

void EndLine() {
  std::string line = std::move(g_log.pending);
  g_log.pending.clear();
  line += '\n';
  WriteAll(MessageUnit(), line);
}

std::string BannerText(std::string_view text) {
  const std::string t = Trim(text);
  if (t.empty()) return std::string(70, '=');
  const int len = static_cast<int>(t.size());
  const int left = len >= 68 ? 0 : (68 - len) / 2;
  std::string line(static_cast<std::size_t>(left), '=');
  line += ' ';
  line += t;
  line += ' ';
  if (line.size() < 70) line.append(70 - line.size(), '=');
  return line;
}

void Banner(std::string_view text) {
  PrintLine("");
  PrintLine(BannerText(text));
}

void IndentedMessage(std::string_view format, std::string_view value) {
  std::string out = "  ";
  const std::size_t pct = format.find('%');
  if (pct == std::string_view::npos) {
    out += format;
  } else {
    out += format.substr(0, pct);
    out += value;
    out += format.substr(pct + 1);
  }
  PrintLine(out);
}

void IndentedMessage(std::string_view format, long long value) {
  IndentedMessage(format, std::to_string(value));
}

void PrintLongText(std::string_view text) {
  const std::string t = Trim(text);
  if (t.empty()) {
    PrintLine("");
    return;
  }
  for (std::size_t i = 0; i < t.size(); i += 70) PrintLine(std::string_view(t).substr(i, 70));
}

bool StdoutIsStderr() {
  struct stat a {}, b {};
  return fstat(STDOUT_FILENO, &a) == 0 && fstat(STDERR_FILENO, &b) == 0 && a.st_dev == b.st_dev &&
         a.st_ino == b.st_ino;
}

void PrintLines(std::string_view text) {
  std::size_t start = 0;
  while (start < text.size()) {
    std::size_t end = text.find('\n', start);
    if (end == std::string_view::npos) end = text.size();
    PrintLine(text.substr(start, end - start));
    start = end + 1;
  }
}

void WriteConsole(std::string_view text, bool toStdout, bool toStderr) {
  if (toStdout && toStderr && StdoutIsStderr()) toStderr = false;
  if (toStdout) WriteAll(STDOUT_FILENO, text);
  if (toStderr) WriteAll(STDERR_FILENO, text);
}

std::string FormatNumber(double value, int significant) {
  if (!std::isfinite(value)) return std::string(static_cast<std::size_t>(significant), '*');
  if (std::fabs(value) <= 1e-100) return "0";
  char buf[64];
  std::snprintf(buf, sizeof buf, "%.*g", significant, value);
  return buf;
}
