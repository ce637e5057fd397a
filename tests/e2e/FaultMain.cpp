// The engine with fault injection for end-to-end tests of failure paths that no setup file can
// provoke yet. Environment:
//   TAVRIN_FAULT_STEP=n       the hydrodynamic step of overall step n fails (run status -1)
//   TAVRIN_FAULT_SUBSTEP=n    the sub-step length of overall step n is not a number
//   TAVRIN_FAULT_SLEEP_MS=m   every hydrodynamic step sleeps m milliseconds (slow runs)
#include <unistd.h>

#include <cmath>
#include <cstdlib>

#include "driver/RunDriver.h"

namespace {

int EnvInt(const char* name) {
  const char* v = std::getenv(name);
  return v != nullptr ? std::atoi(v) : -1;
}

void SubStep(int n, double, double, double& delta) {
  if (n == EnvInt("TAVRIN_FAULT_SUBSTEP")) delta = std::nan("");
}

int HdStep(int n, double, double) {
  const int sleepMs = EnvInt("TAVRIN_FAULT_SLEEP_MS");
  if (sleepMs > 0) usleep(static_cast<useconds_t>(sleepMs) * 1000u);
  return n == EnvInt("TAVRIN_FAULT_STEP") ? -1 : 0;
}

}  // namespace

int main(int argc, char** argv) {
  static DriverTestHooks hooks;
  hooks.subStep = SubStep;
  hooks.hdStep = HdStep;
  g_driverTestHooks = &hooks;
  RunTesselHD(argc, argv);
}
