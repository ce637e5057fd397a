// Runs the engine as a child process with its own environment and working folder, capturing
// standard output and standard error, with a time limit.
#pragma once

#include <sys/types.h>

#include <map>
#include <string>
#include <vector>

namespace tavrintest {

struct ProcessResult {
  int exitCode = -1;    // exit status, or -1 when ended by a signal
  int signal = 0;       // signal that ended the process, 0 when it exited
  bool timedOut = false;
  std::string out, err;
};

struct ProcessSpec {
  std::string exe;
  std::vector<std::string> args;           // without argv[0]
  std::map<std::string, std::string> env;  // added to (or replacing in) the environment
  std::vector<std::string> unset;          // removed from the environment
  std::string cwd;
  double timeoutSeconds = 60.0;
};

// Starts the process; returns its pid. Output goes to files in `captureDir`.
pid_t StartProcess(const ProcessSpec& spec, const std::string& captureDir);
// Waits for it (killing it with SIGKILL after the time limit) and collects the output.
ProcessResult WaitProcess(pid_t pid, const std::string& captureDir, double timeoutSeconds);
ProcessResult RunProcess(const ProcessSpec& spec, const std::string& captureDir);

}  // namespace tavrintest
