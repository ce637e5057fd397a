#include "driver/Termination.h"

#include <signal.h>
#include <unistd.h>

#include <cstdlib>
#include <cstring>
#include <string>

#include "driver/Log.h"

namespace {

std::string Fold(std::string_view head, std::size_t width, std::string_view message) {
  const std::string text = Trim(message);
  std::string out(head);
  out += std::string_view(text).substr(0, width);
  out += '\n';
  const std::string indent(head.size(), ' ');
  for (std::size_t i = width; i < text.size(); i += width) {
    out += indent;
    out += std::string_view(text).substr(i, width);
    out += '\n';
  }
  return out;
}

bool NightBuild() {
  const char* mode = std::getenv("BUILDMODE");
  return mode != nullptr && std::strcmp(mode, "NIGHT") == 0;
}

// State read by the signal handlers; plain integers only.
volatile sig_atomic_t g_signalLogFd = -1;
volatile sig_atomic_t g_signalEntered = 0;
volatile sig_atomic_t g_signalNight = 0;

void WriteRaw(int fd, const char* text) {
  std::size_t left = std::strlen(text);
  while (left > 0) {
    const ssize_t n = ::write(fd, text, left);
    if (n <= 0) return;  // EINTR cannot be retried safely forever here; give up quietly
    text += n;
    left -= static_cast<std::size_t>(n);
  }
}

void SignalHandler(int sig, siginfo_t* info, void*) {
  if (g_signalEntered) _exit(sig);  // a second signal (or a fault inside this handler)
  g_signalEntered = 1;
  const char* message = SignalMessage(sig, info != nullptr ? info->si_code : 0);
  const int logFd = g_signalLogFd;
  if (logFd > 0) {
    WriteRaw(logFd, "\n");
    WriteRaw(logFd, message);
    WriteRaw(logFd, "\n");
  }
  if (!g_signalNight) {
    WriteRaw(STDOUT_FILENO, message);
    WriteRaw(STDOUT_FILENO, "\n");
  }
  if (logFd <= 0) {
    WriteRaw(STDERR_FILENO, message);
    WriteRaw(STDERR_FILENO, "\n");
  } else {
    WriteRaw(logFd, "Abnormal completion\n");
  }
  _exit(sig);
}

}  // namespace

std::string FormatFatalError(std::string_view message) { return Fold("Fatal error: ", 57, message); }
std::string FormatWarning(std::string_view message) { return Fold("Warning: ", 61, message); }

void FatalError(std::string_view message) {
  const std::string lines = FormatFatalError(message);
  PrintLine("");
  PrintLines(lines);
  // Without a log, standard output already has it; standard error gets it unless it is the
  // same file (a terminal).
  if (LogIsOpen() || !StdoutIsStderr()) WriteConsole(lines, false, true);
  Stop(1);
}

void Warning(std::string_view message) {
  PrintLine("");
  PrintLines(FormatWarning(message));
}

void StopWithMessage(std::string_view message, int code) {
  const std::string text = Trim(message) + "\n";
  if (LogIsOpen()) PrintLine(Trim(message));
  WriteConsole(text, !NightBuild(), !LogIsOpen());
  Stop(code);
}

void Stop(int code) {
  if (LogIsOpen()) {
    PrintLine(code != 0 ? "Abnormal completion" : "Successful completion");
    LogClose();
  }
  _exit(code);
}

const char* SignalMessage(int sig, int code) {
  switch (sig) {
    case SIGABRT: return "Abnormal termination";
    case SIGILL: return "Illegal instruction";
    case SIGINT: return "Control-C send";
    case SIGSEGV: return "Illegal storage access";
    case SIGTERM: return "Termination request";
    case SIGFPE:
      switch (code) {
        case FPE_FLTINV: return "Floating point exception: Invalid number";
        case FPE_FLTDIV:
        case FPE_INTDIV: return "Floating point exception: Zero divide";
        case FPE_FLTOVF:
        case FPE_INTOVF: return "Floating point exception: Overflow";
        case FPE_FLTRES: return "Floating point exception: Inexact precision";
        case FPE_FLTUND: return "Floating point exception: Underflow";
        default: return "Floating point exception: Non-IEEE type";
      }
    default: return "Abnormal termination";
  }
}

void SetSignalLogUnit(int fd) { g_signalLogFd = fd; }

void InstallSignalHandlers() {
  g_signalNight = NightBuild() ? 1 : 0;
  struct sigaction sa {};
  sa.sa_sigaction = SignalHandler;
  sa.sa_flags = SA_SIGINFO;
  sigemptyset(&sa.sa_mask);
  // Block the other handled signals while one handler runs.
  for (int s : {SIGABRT, SIGILL, SIGINT, SIGSEGV, SIGTERM, SIGFPE}) sigaddset(&sa.sa_mask, s);
  for (int s : {SIGABRT, SIGILL, SIGINT, SIGSEGV, SIGTERM, SIGFPE}) sigaction(s, &sa, nullptr);
}
