#include "platform/System.h"

#include <sys/resource.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <ctime>
#include <filesystem>
#include <fstream>
#include <string>
#include <thread>

#if defined(__x86_64__) || defined(__i386__)
#include <pmmintrin.h>
#include <xmmintrin.h>
#endif

void SetDenormalsFlushToZero() {
#if defined(__x86_64__) || defined(__i386__)
  _MM_SET_FLUSH_ZERO_MODE(_MM_FLUSH_ZERO_ON);
  _MM_SET_DENORMALS_ZERO_MODE(_MM_DENORMALS_ZERO_ON);
#elif defined(__aarch64__)
  std::uint64_t fpcr;
  __asm__ volatile("mrs %0, fpcr" : "=r"(fpcr));
  fpcr |= (1ull << 24);  // FZ
  __asm__ volatile("msr fpcr, %0" : : "r"(fpcr));
#endif
}

bool DenormalsAreFlushed() {
  volatile double tiny = 1e-310;  // denormal
  volatile double half = 0.5;
  return tiny * half == 0.0;
}

static double ClockSeconds(clockid_t id) {
  timespec ts{};
  clock_gettime(id, &ts);
  return static_cast<double>(ts.tv_sec) + 1e-9 * static_cast<double>(ts.tv_nsec);
}

double WallSeconds() { return ClockSeconds(CLOCK_MONOTONIC); }
double ProcessCpuSeconds() { return ClockSeconds(CLOCK_PROCESS_CPUTIME_ID); }
double ThreadCpuSeconds() { return ClockSeconds(CLOCK_THREAD_CPUTIME_ID); }

std::int64_t PeakMemoryBytes() {
  std::ifstream in("/proc/self/status");
  std::string line;
  while (std::getline(in, line)) {
    if (line.rfind("VmHWM:", 0) == 0) {
      long long kb = 0;
      if (std::sscanf(line.c_str() + 6, "%lld", &kb) == 1) return kb * 1024;
    }
  }
  rusage ru{};
  if (getrusage(RUSAGE_SELF, &ru) == 0) return static_cast<std::int64_t>(ru.ru_maxrss) * 1024;
  return 0;
}

void WriteAll(int fd, std::string_view text) {
  const char* p = text.data();
  std::size_t left = text.size();
  while (left > 0) {
    const ssize_t n = ::write(fd, p, left);
    if (n < 0) {
      if (errno == EINTR) continue;
      return;
    }
    p += n;
    left -= static_cast<std::size_t>(n);
  }
}

std::string ProcessorName() {
  char buf[256] = {};
  if (gethostname(buf, sizeof buf - 1) != 0) return "unknown";
  return buf;
}

int NumberOfProcessors() {
  long n = sysconf(_SC_NPROCESSORS_ONLN);
  if (n < 1) n = static_cast<long>(std::thread::hardware_concurrency());
  return n < 1 ? 1 : static_cast<int>(n);
}

long SetOpenFileLimit(long limit) {
  rlimit rl{};
  if (getrlimit(RLIMIT_NOFILE, &rl) != 0) return -1;
  rlim_t want = static_cast<rlim_t>(limit);
  if (rl.rlim_max != RLIM_INFINITY && want > rl.rlim_max) want = rl.rlim_max;
  rl.rlim_cur = want;
  setrlimit(RLIMIT_NOFILE, &rl);
  getrlimit(RLIMIT_NOFILE, &rl);
  return static_cast<long>(rl.rlim_cur);
}

static std::size_t LeafStart(const std::string& path) {
  const std::size_t slash = path.find_last_of("/\\");
  return slash == std::string::npos ? 0 : slash + 1;
}

std::string PathFolder(const std::string& path) {
  const std::size_t leaf = LeafStart(path);
  return leaf == 0 ? std::string() : path.substr(0, leaf - 1);
}

std::string PathLeaf(const std::string& path) { return path.substr(LeafStart(path)); }

std::string ReplaceExtension(const std::string& path, const std::string& ext) {
  const std::size_t leaf = LeafStart(path);
  const std::size_t dot = path.find_last_of('.');
  if (dot == std::string::npos || dot < leaf) return path + ext;
  return path.substr(0, dot) + ext;
}

std::string StripExtension(const std::string& path, const std::string& ext) {
  const std::size_t leaf = LeafStart(path);
  if (path.size() >= ext.size() + leaf && path.size() > ext.size() &&
      path.compare(path.size() - ext.size(), ext.size(), ext) == 0 &&
      path.size() - ext.size() >= leaf)
    return path.substr(0, path.size() - ext.size());
  return path;
}

bool CreateParentFolders(const std::string& path) {
  const std::string folder = PathFolder(path);
  if (folder.empty()) return true;
  std::error_code ec;
  std::filesystem::create_directories(folder, ec);
  return !ec && std::filesystem::is_directory(folder, ec);
}
