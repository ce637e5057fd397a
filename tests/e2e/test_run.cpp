// End-to-end runs of the engine as a process: normal runs, progress modes, cancel through the
// kill file, signals, failed computations and every kind of bad input.
#include <cstdio>
#include <gtest/gtest.h>

#include <signal.h>
#include <unistd.h>

#include <chrono>
#include <fstream>
#include <string>
#include <thread>

#include "e2e/Process.h"
#include "support/TestSupport.h"

namespace {

using tavrintest::ProcessResult;
using tavrintest::ProcessSpec;
using tavrintest::ReadFile;
using tavrintest::TempDir;

std::string SetupText(const std::string& time, const std::string& extra = "",
                  const std::string& modules = "") {
  return "TesselHD {\n  TIME {\n" + time + "\n  }\n  MODULE_SELECTION {\n" + modules +
         "\n  }\n  HYDRODYNAMIC_MODULE { mode = 2 }\n"
         "  DOMAIN { file_name = \"square.mesh\" }\n" + extra + "}\n";
}

const std::string kTenSteps =
    "    start_time = 2004, 2, 28, 23, 0, 0\n    time_step_interval = 600\n"
    "    number_of_time_steps = 10";

class EngineRun : public ::testing::Test {
 protected:
  ProcessResult Run(const std::string& setupText, std::map<std::string, std::string> env = {},
                    std::vector<std::string> extraArgs = {}, const char* exe = TESSELHD_EXE) {
    const std::string file = setupText.empty() ? dir_.file("case.skf") : dir_.write("case.skf", setupText);
    ProcessSpec spec = Spec(exe, env);
    spec.args.push_back(file);
    for (auto& a : extraArgs) spec.args.push_back(a);
    return Checked(tavrintest::RunProcess(spec, dir_.path()));
  }
  ProcessSpec Spec(const char* exe, std::map<std::string, std::string> env) {
    ProcessSpec spec;
    spec.exe = exe;
    spec.cwd = dir_.path();
    if (!env.count("TAVRIN_PROGRESS")) spec.unset.push_back("TAVRIN_PROGRESS");
    spec.unset.push_back("BUILDMODE");
    spec.unset.push_back("TAVRIN_LOG_NOPATH");
    spec.env = std::move(env);
    return spec;
  }
  // No sanitizer report and no time-out in any run.
  static ProcessResult Checked(ProcessResult r) {
    EXPECT_FALSE(r.timedOut);
    EXPECT_EQ(r.err.find("Sanitizer"), std::string::npos) << r.err;
    EXPECT_EQ(r.err.find("runtime error:"), std::string::npos) << r.err;
    return r;
  }
  std::string Log() const { return ReadFile(dir_.file("case.log")); }
  bool WaitForLog(const std::string& text, double seconds) const {
    const auto end = std::chrono::steady_clock::now() + std::chrono::milliseconds(long(seconds * 1000));
    while (std::chrono::steady_clock::now() < end) {
      if (Log().find(text) != std::string::npos) return true;
      std::this_thread::sleep_for(std::chrono::milliseconds(10));
    }
    return false;
  }
  static bool EndsWith(const std::string& s, const std::string& tail) {
    return s.size() >= tail.size() && s.compare(s.size() - tail.size(), tail.size(), tail) == 0;
  }
  void SetUp() override {
    // Two triangles on a 10 m square: the mesh every run here reads.
    dir_.write("square.mesh",
               "4 NON-UTM\n1 0 0 -1 1\n2 10 0 -1 1\n3 10 10 -1 1\n4 0 10 -1 1\n"
               "2 3 21\n1 1 2 3\n2 1 3 4\n");
  }
  TempDir dir_;
};

TEST_F(EngineRun, NormalRunWritesTheWholeLogAndProgressFile) {
  const ProcessResult r = Run(SetupText(kTenSteps));
  EXPECT_EQ(r.exitCode, 0) << r.out << r.err;
  EXPECT_EQ(r.out, "");
  const std::string log = Log();
  const char* inOrder[] = {"Computing Environment", "Local process id     : -1", "Target: TesselHD",
                           "  Section: TIME", "    start_time : 2004 2 28 23 0 0 ",
                           "    time_step_interval : 600",
                           "Simulation period: 2004-02-28 23:00:00 - 2004-02-29 00:40:00",
                           "    mode_of_hydrodynamic_module : 2 (default)",
                           "    mode : 2", "COMPUTATION STARTED", "COMPUTATION ENDED",
                           " Shallow water equations", "  Number of time steps     : 10",
                           "  Minimum time step (s)    : 600", "  Average time step (s)    : 600",
                           "Hydrodynamic Simulation Timings", "Overall Timings", "Pre-processing",
                           "Calculation", "Post-processing", "Total", "Memory Usage",
                           "Peak memory usage (MB) : ", "Number of threads on CPU: "};
  std::size_t at = 0;
  for (const char* text : inOrder) {
    const std::size_t found = log.find(text, at);
    ASSERT_NE(found, std::string::npos) << "missing or out of order: " << text << "\n" << log;
    at = found;
  }
  EXPECT_TRUE(EndsWith(log, "\n  Normal run completion\n")) << log;
  EXPECT_EQ(log.find("Warning"), std::string::npos) << log;
  const std::string progress = ReadFile(dir_.file("case._spi_"));
  EXPECT_EQ(progress.rfind("STALBL Simulation date and time [YYYY-MM-DD hh:mm:ss]\n"
                           "MESLBL Simulation info\nMESSAG Initializing\nPROGRE 0\n", 0), 0u)
      << progress;
  EXPECT_NE(progress.find("STATUS 2004-02-29 00:40:00\nMESSAG Time step: 10\n"), std::string::npos);
  EXPECT_NE(progress.find("PROGRE 1000\nTIMLFT 0\n"), std::string::npos) << progress;
}

TEST_F(EngineRun, ProgressModesStdoutAndNone) {
  ProcessResult r = Run(SetupText(kTenSteps), {{"TAVRIN_PROGRESS", "STDOUT"}});
  EXPECT_EQ(r.exitCode, 0);
  EXPECT_EQ(r.out, "Initializing\nTime step: 0\nTime step: 10\n");
  EXPECT_FALSE(tavrintest::FileExists(dir_.file("case._spi_")));
  r = Run(SetupText(kTenSteps), {{"TAVRIN_PROGRESS", "NONE"}});
  EXPECT_EQ(r.exitCode, 0);
  EXPECT_EQ(r.out, "");
  EXPECT_FALSE(tavrintest::FileExists(dir_.file("case._spi_")));
}

TEST_F(EngineRun, ZeroStepsAndUnreadEntries) {
  const ProcessResult r = Run(SetupText("    number_of_time_steps = 0\n    time_step_intervall = 5",
                                    "  SYSTEM { MaxIOHandles = 512 }\n  EXTRA { x = 1 }\n"),
                              {}, {"//comment-argument", "-gpu", "1", "0"});
  EXPECT_EQ(r.exitCode, 0) << r.out << r.err;
  const std::string log = Log();
  EXPECT_NE(log.find("COMPUTATION STARTED"), std::string::npos);
  EXPECT_NE(log.find("COMPUTATION ENDED"), std::string::npos);
  EXPECT_NE(log.find("  Number of time steps     : 0\n  Minimum time step (s)    : 0\n"), std::string::npos) << log;
  EXPECT_NE(log.find("    MaxIOHandles : 512"), std::string::npos);
  EXPECT_NE(log.find("Warning: 2 setup-file entries were not read (misspelt or unused):\n"), std::string::npos) << log;
  EXPECT_NE(log.find("TesselHD.TIME.time_step_intervall (line 4)"), std::string::npos) << log;
  EXPECT_NE(log.find("TesselHD.EXTRA (line 12)"), std::string::npos) << log;
  EXPECT_NE(log.find("GPU execution is not available in this build"), std::string::npos) << log;
  EXPECT_TRUE(EndsWith(log, "  Normal run completion\n"));
}

TEST_F(EngineRun, FailedComputationEndsWithExitCodeThree) {
  ProcessResult r = Run(SetupText(kTenSteps), {{"TAVRIN_FAULT_STEP", "4"}}, {}, TESSELHD_FAULT_EXE);
  EXPECT_EQ(r.exitCode, 3) << r.out << r.err;
  std::string log = Log();
  EXPECT_NE(log.find("COMPUTATION ENDED"), std::string::npos);
  EXPECT_NE(log.find("Overall Timings"), std::string::npos);
  EXPECT_TRUE(EndsWith(log, "\n  Abnormal run completion\n")) << log;

  r = Run(SetupText(kTenSteps), {{"TAVRIN_FAULT_SUBSTEP", "2"}}, {}, TESSELHD_FAULT_EXE);
  EXPECT_EQ(r.exitCode, 3);
  log = Log();
  EXPECT_NE(log.find("Run-time error: the hydrodynamic sub-step length ********** s at time 600 s "
                     "(overall step 2) is not a positive number"), std::string::npos) << log;
  EXPECT_NE(log.find("  Number of time steps     : 1\n"), std::string::npos) << log;
  EXPECT_TRUE(EndsWith(log, "\n  Abnormal run completion\n"));
}

TEST_F(EngineRun, KillFileCancelsAfterTheCurrentStep) {
  dir_.write("case.skf", SetupText("    number_of_time_steps = 100000"));
  ProcessSpec spec = Spec(TESSELHD_FAULT_EXE, {{"TAVRIN_FAULT_SLEEP_MS", "2"}});
  spec.args.push_back(dir_.file("case.skf"));
  // A stale kill file from an earlier run is removed at start.
  dir_.write("case._kill_", "");
  const pid_t pid = tavrintest::StartProcess(spec, dir_.path());
  ASSERT_TRUE(WaitForLog("COMPUTATION STARTED", 30));
  std::this_thread::sleep_for(std::chrono::milliseconds(50));
  dir_.write("case._kill_", "");
  const ProcessResult r = Checked(tavrintest::WaitProcess(pid, dir_.path(), 60));
  EXPECT_EQ(r.exitCode, 0) << r.out << r.err;
  const std::string log = Log();
  EXPECT_NE(log.find("COMPUTATION ENDED"), std::string::npos);
  EXPECT_TRUE(EndsWith(log, "\n  Run cancelled by user\n")) << log;
}

TEST_F(EngineRun, SignalsEndTheRunWithTheirNumber) {
  struct Case { int sig; const char* message; };
  for (const Case c : {Case{SIGTERM, "Termination request"}, Case{SIGINT, "Control-C send"}}) {
    std::remove(dir_.file("case.log").c_str());  // wait for this run's log, not the last one's
    dir_.write("case.skf", SetupText("    number_of_time_steps = 100000"));
    ProcessSpec spec = Spec(TESSELHD_FAULT_EXE, {{"TAVRIN_FAULT_SLEEP_MS", "2"}});
    spec.args.push_back(dir_.file("case.skf"));
    const pid_t pid = tavrintest::StartProcess(spec, dir_.path());
    ASSERT_TRUE(WaitForLog("COMPUTATION STARTED", 30));
    kill(pid, c.sig);
    const ProcessResult r = Checked(tavrintest::WaitProcess(pid, dir_.path(), 60));
    EXPECT_EQ(r.exitCode, c.sig) << c.message;
    EXPECT_EQ(r.out, std::string(c.message) + "\n");
    EXPECT_TRUE(EndsWith(Log(), std::string("\n") + c.message + "\nAbnormal completion\n")) << Log();
  }
}

TEST_F(EngineRun, NightBuildKeepsStopMessagesOffStandardOutput) {
  const ProcessResult r = Run("Other { }\n", {{"BUILDMODE", "NIGHT"}});
  EXPECT_EQ(r.exitCode, 1);
  EXPECT_EQ(r.out, "");
  EXPECT_TRUE(EndsWith(Log(), "SKF target: TesselHD not found\nAbnormal completion\n")) << Log();
}

// Each bad input: exit code 1 and the message on the console or in the log.
TEST_F(EngineRun, BadInputStopsWithAClearMessage) {
  struct Case { const char* name; std::string setup; const char* message; };
  const std::string t = kTenSteps;
  const Case cases[] = {
      {"empty file", "", "SKF target: TesselHD not found"},
      {"missing root target", "Other { a = 1 }\n", "SKF target: TesselHD not found"},
      {"binary garbage", std::string("\x7f" "ELF\x01\x02\0\0garbage", 14), "near line 1 and colum"},
      {"unterminated block", "TesselHD {\n  TIME {\n", "near line"},
      {"bad keyword", "TesselHD {\n  TIME {\n    a b = 1\n  }\n}\n", "near line 3 and colum"},
      {"unterminated string", "TesselHD {\n  title = \"abc\n}\n", "near line 2"},
      {"missing TIME", "TesselHD {\n  MODULE_SELECTION { }\n}\n", "SKF section: TIME not found"},
      {"hydrodynamic mode 0", SetupText(t, "", "mode_of_hydrodynamic_module = 0"),
       "The Hydrodynnamic module must be included"},
      {"differing mode", SetupText(t, "", "mode_of_hydrodynamic_module = 1"), "mode is illegal"},
      {"transport module", SetupText(t, "", "mode_of_transport_module = 1"),
       "Transport module: module not available in this build"},
      {"mud transport", SetupText(t, "", "mode_of_mud_transport_module = 2"),
       "Mud transport module: module not available in this build"},
      {"MaxIOHandles low", SetupText(t, "  SYSTEM { MaxIOHandles = 100 }\n"),
       "MaxIOHandles must be between 512 - 2048 !"},
      {"MaxIOHandles high", SetupText(t, "  SYSTEM { MaxIOHandles = 4096 }\n"),
       "MaxIOHandles must be between 512 - 2048 !"},
      {"zero time step", SetupText("time_step_interval = 0"), "time_step_interval must be a positive"},
      {"negative time step", SetupText("time_step_interval = -30"), "time_step_interval must be a positive"},
      {"negative steps", SetupText("number_of_time_steps = -1"), "number_of_time_steps must not be negative"},
      {"month 13", SetupText("start_time = 2004, 13, 1, 0, 0, 0"), "start_time 2004-13-01 00:00:00 is not a valid"},
      {"31 April", SetupText("start_time = 2004, 4, 31, 0, 0, 0"), "start_time 2004-04-31 00:00:00 is not a valid"},
      {"hour 25", SetupText("start_time = 2004, 4, 1, 25, 0, 0"), "is not a valid date and time"},
      {"text for a number", SetupText("time_step_interval = \"fast\""),
       "keyword time_step_interval in section TesselHD.TIME, line 3: the value \"fast\" cannot be"},
      {"double for an integer", SetupText("number_of_time_steps = 2.5"), "cannot be read as an integer"},
      {"period past 9999", SetupText("time_step_interval = 1e9\nnumber_of_time_steps = 2000000"),
       "ends after the year 9999"},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.name);
    std::ofstream(dir_.file("case.skf"), std::ios::binary) << c.setup;
    const ProcessResult r = Run("");
    EXPECT_EQ(r.exitCode, 1) << r.out << r.err;
    const std::string all = tavrintest::Unfolded(r.out + r.err + Log());
    EXPECT_NE(all.find(c.message), std::string::npos) << all;
  }
}

TEST_F(EngineRun, BadCommandLines) {
  ProcessSpec spec = Spec(TESSELHD_EXE, {});
  ProcessResult r = Checked(tavrintest::RunProcess(spec, dir_.path()));
  EXPECT_EQ(r.exitCode, 1);
  EXPECT_NE(r.out.find(std::string("Usage: ") + TESSELHD_EXE + " skf-file"), std::string::npos);
  EXPECT_NE(r.err.find("Usage: "), std::string::npos);  // no log open: also on standard error

  spec.args = {dir_.file("nothing.skf")};
  r = Checked(tavrintest::RunProcess(spec, dir_.path()));
  EXPECT_EQ(r.exitCode, 1);
  EXPECT_NE(r.out.find(std::string(TESSELHD_EXE) + ": Unable to open " + dir_.file("nothing.skf")),
            std::string::npos) << r.out;

  spec.args = {dir_.path()};  // a folder
  r = Checked(tavrintest::RunProcess(spec, dir_.path()));
  EXPECT_EQ(r.exitCode, 1);
  EXPECT_NE(r.out.find("Unable to open"), std::string::npos);

  const std::string logNamed = dir_.write("case.log", SetupText(kTenSteps));
  spec.args = {logNamed};
  r = Checked(tavrintest::RunProcess(spec, dir_.path()));
  EXPECT_EQ(r.exitCode, 1);
  EXPECT_NE(r.err.find("extension .log"), std::string::npos) << r.err;
  EXPECT_EQ(ReadFile(logNamed), SetupText(kTenSteps));  // untouched

  const std::string good = dir_.write("case.skf", SetupText(kTenSteps));
  for (const auto& args : std::vector<std::vector<std::string>>{
           {good, "-gpu"}, {good, "-gpu", "x"}, {good, "-gpu", "0"}, {good, "-gpu", "2", "0"},
           {good, "-gpu", "1", "-1"}}) {
    spec.args = args;
    r = Checked(tavrintest::RunProcess(spec, dir_.path()));
    EXPECT_EQ(r.exitCode, 1) << args.size();
    EXPECT_NE(r.out.find("Usage: "), std::string::npos) << r.out;
  }
}

}  // namespace
