// The setup-file access layer: navigation, typed reads with defaults, the exact log echo, type
// faults and the list of entries nothing read.
#include <gtest/gtest.h>

#include <cstdlib>
#include <string>

#include "driver/Log.h"
#include "setup/SetupFile.h"
#include "support/TestSupport.h"

namespace {

const char* const kSetup = R"(// access layer test
TesselHD {
  GPU_timing = 1
  TIME {
    start_time = 2010, 6, 1, 12, 0, 0
    time_step_interval = 15.5
  }
  OUTPUTS {
    OUTPUT_1 { file_name = <out/a.vdsu>; use_flag = true }
    OUTPUT_3 { file_name = "b.vds0"; use_flag = 1 }
    OUTPUT_M2 { use_flag = 0 }
  }
  POINT { x = 1 }
  POINT { x = 2
    SUB { y = 3 }
  }
  BAD {
    text_for_number = "abc"
    double_for_int = 1.5
    list = 1, 2, 3.5
  }
  misspelt_keyword = 4
  UNUSED_SECTION { a = 1 }
}
OTHER_TARGET { }
)";

class SetupAccess : public ::testing::Test {
 protected:
  void SetUp() override {
    unsetenv("TAVRIN_LOG_NOPATH");
    setupFile_ = dir_.write("case.skf", kSetup);
    SkfOpenFile(setupFile_, false);
    ASSERT_TRUE(LogOpen(dir_.file("echo.log")));
    SkfOpenTarget("TesselHD");
  }
  void TearDown() override {
    LogClose();
    SkfCloseFile();
    unsetenv("TAVRIN_LOG_NOPATH");
  }
  // The log after its two date/time lines.
  std::string Echo() {
    const std::string text = tavrintest::ReadFile(dir_.file("echo.log"));
    const std::size_t first = text.find('\n');
    return text.substr(text.find('\n', first + 1) + 1);
  }
  static std::string Rule(const std::string& head) { return head + std::string(70 - head.size(), '-'); }

  tavrintest::TempDir dir_;
  std::string setupFile_;
};

TEST_F(SetupAccess, EchoesEveryReadWithIndentationAndDefaults) {
  std::int32_t gpuTiming = 0, steps = 0;
  std::int32_t start[6] = {2004, 1, 1, 0, 0, 0};
  double dt = 0;
  EXPECT_EQ(SkfReadInt("GPU_timing", gpuTiming, 2), 0);
  SkfOpenSection("TIME");
  EXPECT_EQ(SkfReadIntList("start_time", start, 6), 0);
  EXPECT_EQ(SkfReadDouble("time_step_interval", dt, 30.0), 0);
  EXPECT_EQ(SkfReadInt("number_of_time_steps", steps, 100), 1);
  SkfCloseSection();
  SkfOpenSection("OUTPUTS");
  std::string file;
  bool use = false;
  SkfOpenSectionIndex("OUTPUT", 1);
  SkfReadResultFile("file_name", file);
  SkfReadBool("use_flag", use);
  SkfCloseSection();
  EXPECT_EQ(file, dir_.path() + "/out/a.vdsu");
  EXPECT_TRUE(use);
  SkfOpenSectionIndex("OUTPUT", 3);
  std::int32_t logical = 0;
  SkfReadLogical("use_flag", logical);
  EXPECT_EQ(logical, -1);
  SkfCloseSection();
  SkfOpenSectionIndex("OUTPUT", -2);
  SkfReadBool("use_flag", use);
  EXPECT_FALSE(use);
  SkfReadBool("missing_flag", use, true);
  double list[3] = {0.5, 1, 2};
  SkfReadDoubleList("missing_list", list, 3, list);
  SkfCloseSection();
  SkfCloseSection();

  EXPECT_EQ(gpuTiming, 1);
  EXPECT_EQ(start[0], 2010);
  EXPECT_EQ(start[3], 12);
  EXPECT_EQ(dt, 15.5);
  EXPECT_EQ(steps, 100);
  const std::string expected =
      std::string(70, '=') + "\n" + "Target: TesselHD\n" + "  GPU_timing : 1\n\n" +
      Rule("  Section: TIME ") + "\n" +
      "    start_time : 2010 6 1 12 0 0 \n"
      "    time_step_interval : 15.5\n"
      "    number_of_time_steps : 100 (default)\n\n" +
      Rule("  Section: OUTPUTS ") + "\n\n" + Rule("    Section: OUTPUT_1 ") + "\n" +
      "      file_name : " + dir_.path() + "/out/a.vdsu\n" +
      "      use_flag : True\n\n" + Rule("    Section: OUTPUT_3 ") + "\n" +
      "      use_flag : True\n\n" + Rule("    Section: OUTPUT_M2 ") + "\n" +
      "      use_flag : False\n"
      "      missing_flag : True (default)\n"
      "      missing_list : 0.5 1 2  (default)\n";
  EXPECT_EQ(Echo(), expected);
}

TEST_F(SetupAccess, MissingKeywordWithoutDefaultKeepsTheDestination) {
  std::int32_t value = 42;
  std::string text = "kept";
  EXPECT_EQ(SkfReadInt("not_there", value), 1);
  EXPECT_EQ(SkfReadString("no_text", text), 1);
  EXPECT_EQ(value, 42);
  EXPECT_EQ(text, "kept");
  EXPECT_EQ(SkfReadIntSilent("GPU_timing", value), 0);
  EXPECT_EQ(value, 1);
  EXPECT_EQ(Echo(), std::string(70, '=') + "\nTarget: TesselHD\n  not_there : 42 (default)\n"
                                           "  no_text : kept (default)\n");
}

TEST_F(SetupAccess, ResultFilesAreEchoedWithoutPathOnRequest) {
  setenv("TAVRIN_LOG_NOPATH", "1", 1);
  EXPECT_EQ(SkfEchoPath("C:\\runs\\a\\out.vdsu"), "out.vdsu");
  EXPECT_EQ(SkfEchoPath("/runs/a/out.vdsu"), "out.vdsu");
  unsetenv("TAVRIN_LOG_NOPATH");
  EXPECT_EQ(SkfEchoPath("C:\\runs\\a\\out.vdsu"), "C:\\runs\\a\\out.vdsu");
  setenv("TAVRIN_LOG_NOPATH", "", 1);  // empty counts as unset
  EXPECT_EQ(SkfEchoPath("/runs/a/out.vdsu"), "/runs/a/out.vdsu");
}

TEST_F(SetupAccess, SectionsOpenByNameNumberAndInstance) {
  EXPECT_EQ(SkfNumberedName("OUTPUT", 3), "OUTPUT_3");
  EXPECT_EQ(SkfNumberedName("OUTPUT", -2), "OUTPUT_M2");
  EXPECT_EQ(SkfNumberedName("OUTPUT", 0), "OUTPUT_0");
  int status = 0;
  SkfOpenSection("NOT_THERE", &status);
  EXPECT_EQ(status, -1);
  EXPECT_EQ(SkfCurrentPath(), "TesselHD");  // position unchanged
  SkfOpenSectionInstance("POINT", 2, &status);
  ASSERT_EQ(status, 0);
  SkfOpenSection("SUB");
  EXPECT_EQ(SkfCurrentPath(), "TesselHD.POINT.SUB");
  SkfCloseSection();
  // Back in the instance that was open, not instance 1.
  std::int32_t x = 0;
  SkfReadInt("x", x);
  EXPECT_EQ(x, 2);
  EXPECT_EQ(SkfNoSections(), 1);
  EXPECT_EQ(SkfNoKeywords(), 1);
  SkfCloseSection("POINT", 2);
  EXPECT_EQ(SkfCurrentPath(), "TesselHD");
  SkfCloseSection();  // at a target: stays there
  EXPECT_EQ(SkfCurrentPath(), "TesselHD");
}

TEST_F(SetupAccess, MissingTargetOrSectionStopsWithoutStatus) {
  // With the log open, stop messages go to the log and standard output only.
  EXPECT_EXIT(SkfOpenSection("NOT_THERE"), ::testing::ExitedWithCode(1), "");
  EXPECT_NE(Echo().find("SKF section: NOT_THERE not found\nAbnormal completion\n"), std::string::npos);
  EXPECT_EXIT(SkfOpenTarget("Nope"), ::testing::ExitedWithCode(1), "");
  EXPECT_NE(Echo().find("SKF target: Nope not found\nAbnormal completion\n"), std::string::npos);
  int status = 0;
  SkfOpenTarget("Nope", 1, &status);
  EXPECT_EQ(status, -1);
}

TEST_F(SetupAccess, ValuesOfTheWrongTypeStopTheRun) {
  SkfOpenSection("BAD");
  double d = 0;
  std::int32_t i = 0;
  std::int32_t list[3] = {};
  EXPECT_EXIT(SkfReadDouble("text_for_number", d, 1.0), ::testing::ExitedWithCode(1),
              "Fatal error: Setup file: keyword text_for_number");
  EXPECT_NE(tavrintest::Unfolded(Echo()).find(
                "Fatal error: Setup file: keyword text_for_number in section TesselHD.BAD, line 18: "
                "the value \"abc\" cannot be read as a number\n"),
            std::string::npos)
      << Echo();
  EXPECT_EXIT(SkfReadInt("double_for_int", i, 1), ::testing::ExitedWithCode(1),
              "double_for_int.*line 19.*1.5.*integer");
  EXPECT_EXIT(SkfReadIntList("list", list, 3), ::testing::ExitedWithCode(1), "list.*line 20.*3.5");
  bool b = false;
  EXPECT_EXIT(SkfReadBool("double_for_int", b), ::testing::ExitedWithCode(1), "true or false");
  // Integers are read as doubles and as booleans.
  EXPECT_EQ(SkfReadDouble("list", d, std::nullopt, 2), 0);
  EXPECT_EQ(d, 2.0);
  EXPECT_EQ(SkfReadBool("list", b), 0);
  EXPECT_TRUE(b);
  std::vector<double> all;
  EXPECT_EQ(SkfReadDoubleArray("list", all), 0);
  EXPECT_EQ(all, (std::vector<double>{1, 2, 3.5}));
}

TEST_F(SetupAccess, ListsEverythingNothingRead) {
  std::int32_t v = 0;
  SkfReadInt("GPU_timing", v);
  SkfOpenSection("TIME");
  SkfReadInt("number_of_time_steps", v, 100);
  SkfCloseSection();
  SkfOpenSectionInstance("POINT", 2);
  SkfReadInt("x", v);
  SkfCloseSection();
  const std::vector<std::string> expected = {
      "TesselHD.TIME.start_time (line 5)", "TesselHD.TIME.time_step_interval (line 6)",
      "TesselHD.OUTPUTS (line 8)",         "TesselHD.POINT (line 13)",
      "TesselHD.POINT.SUB (line 15)",      "TesselHD.BAD (line 17)",
      "TesselHD.misspelt_keyword (line 22)", "TesselHD.UNUSED_SECTION (line 23)",
      "OTHER_TARGET (line 25)"};
  EXPECT_EQ(SkfUnreadEntries(), expected);
  SkfWarnUnread();
  const std::string echo = Echo();
  EXPECT_NE(echo.find("Warning: 9 setup-file entries were not read (misspelt or unused):\n"), std::string::npos);
  EXPECT_NE(echo.find("\n         TesselHD.misspelt_keyword (line 22)\n"), std::string::npos);
}

TEST(SetupFileOpen, RefusesUnreadableAndLogNamedFiles) {
  tavrintest::TempDir dir;
  int status = 0;
  SkfOpenFile(dir.file("missing.skf"), false, &status);
  EXPECT_EQ(status, -1);
  SkfOpenFile(dir.path(), false, &status);  // a folder
  EXPECT_EQ(status, -1);
  EXPECT_EXIT(SkfOpenFile(dir.file("missing.skf"), false), ::testing::ExitedWithCode(1),
              "SkfOpenFile : Unable to open /");
  const std::string logNamed = dir.write("case.log", "TesselHD { }\n");
  EXPECT_EXIT(SkfOpenFile(logNamed, true), ::testing::ExitedWithCode(1), "extension .log");
  const std::string bad = dir.write("bad.skf", "TesselHD {\n  TIME {\n    a = 1 2\n}\n");
  EXPECT_EXIT(SkfOpenFile(bad, false), ::testing::ExitedWithCode(1),
              "Syntax error: expected ',' or the end");
}

}  // namespace
