#include "e2e/Process.h"

#include <fcntl.h>
#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <cstdlib>
#include <thread>

#include "support/TestSupport.h"

extern char** environ;

namespace tavrintest {

pid_t StartProcess(const ProcessSpec& spec, const std::string& captureDir) {
  const std::string outFile = captureDir + "/stdout.txt";
  const std::string errFile = captureDir + "/stderr.txt";
  const pid_t pid = fork();
  if (pid != 0) return pid;
  // Child: only async-signal-safe work would be strictly required; the test process is
  // single-threaded at this point in practice, and the child execs at once.
  const int out = open(outFile.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0644);
  const int err = open(errFile.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0644);
  const int in = open("/dev/null", O_RDONLY);
  dup2(in, 0);
  dup2(out, 1);
  dup2(err, 2);
  if (!spec.cwd.empty() && chdir(spec.cwd.c_str()) != 0) _exit(127);
  for (const auto& name : spec.unset) unsetenv(name.c_str());
  for (const auto& [k, v] : spec.env) setenv(k.c_str(), v.c_str(), 1);
  std::vector<char*> argv;
  argv.push_back(const_cast<char*>(spec.exe.c_str()));
  for (const auto& a : spec.args) argv.push_back(const_cast<char*>(a.c_str()));
  argv.push_back(nullptr);
  execve(spec.exe.c_str(), argv.data(), environ);
  _exit(127);
}

ProcessResult WaitProcess(pid_t pid, const std::string& captureDir, double timeoutSeconds) {
  ProcessResult r;
  const auto deadline = std::chrono::steady_clock::now() +
                        std::chrono::milliseconds(static_cast<long>(timeoutSeconds * 1000));
  int status = 0;
  for (;;) {
    const pid_t done = waitpid(pid, &status, WNOHANG);
    if (done == pid) break;
    if (std::chrono::steady_clock::now() > deadline) {
      kill(pid, SIGKILL);
      waitpid(pid, &status, 0);
      r.timedOut = true;
      break;
    }
    std::this_thread::sleep_for(std::chrono::milliseconds(5));
  }
  if (WIFEXITED(status)) r.exitCode = WEXITSTATUS(status);
  if (WIFSIGNALED(status)) r.signal = WTERMSIG(status);
  r.out = ReadFile(captureDir + "/stdout.txt");
  r.err = ReadFile(captureDir + "/stderr.txt");
  return r;
}

ProcessResult RunProcess(const ProcessSpec& spec, const std::string& captureDir) {
  return WaitProcess(StartProcess(spec, captureDir), captureDir, spec.timeoutSeconds);
}

}  // namespace tavrintest
