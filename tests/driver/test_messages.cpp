// Message formatting of the log: banners, fatal-error and warning folding, numbers, timing
// tables and the names of the log and progress files.
#include <gtest/gtest.h>

#include <string>

#include "driver/Log.h"
#include "driver/Progress.h"
#include "driver/Termination.h"
#include "driver/Timing.h"
#include "support/TestSupport.h"

namespace {

std::string Chars(int from, int to) {  // characters from..to (1-based) of a known text
  std::string s;
  for (int i = from; i <= to; ++i) s += static_cast<char>('a' + (i % 26));
  return s;
}

TEST(LogBanner, CentresTextInSeventyColumns) {
  const std::string b = BannerText("COMPUTATION STARTED");
  EXPECT_EQ(b, std::string(24, '=') + " COMPUTATION STARTED " + std::string(25, '='));
  EXPECT_EQ(b.size(), 70u);
  EXPECT_EQ(BannerText(""), std::string(70, '='));
  EXPECT_EQ(BannerText("COMPUTATION ENDED").size(), 70u);
  EXPECT_EQ(BannerText("Overall Timings"), std::string(26, '=') + " Overall Timings " + std::string(27, '='));
  // A text too long for the rule keeps its blanks and is not cut.
  const std::string longText(80, 'x');
  EXPECT_EQ(BannerText(longText), " " + longText + " ");
}

TEST(LogFolding, FatalErrorsFoldAtFiftySevenCharacters) {
  const std::string msg = Chars(1, 130);
  const std::string expected = "Fatal error: " + msg.substr(0, 57) + "\n" + std::string(13, ' ') +
                               msg.substr(57, 57) + "\n" + std::string(13, ' ') + msg.substr(114) + "\n";
  EXPECT_EQ(FormatFatalError(msg), expected);
  EXPECT_EQ(FormatFatalError("  short  "), "Fatal error: short\n");
  EXPECT_EQ(FormatFatalError(Chars(1, 57)), "Fatal error: " + Chars(1, 57) + "\n");
}

TEST(LogFolding, WarningsFoldAtSixtyOneCharacters) {
  const std::string msg = Chars(1, 122);
  EXPECT_EQ(FormatWarning(msg), "Warning: " + msg.substr(0, 61) + "\n" + std::string(9, ' ') +
                                    msg.substr(61) + "\n");
}

TEST(LogNumbers, TenSignificantDigitsWithoutTrailingZeros) {
  struct Case { double value; const char* text; };
  const Case cases[] = {{30.0, "30"}, {1.5, "1.5"}, {-0.25, "-0.25"}, {0.1, "0.1"},
                        {1.0 / 3.0, "0.3333333333"}, {123456789.0, "123456789"},
                        {1e20, "1e+20"}, {2e-7, "2e-07"}, {1e-101, "0"}, {-1e-120, "0"},
                        {0.0, "0"}, {12345678901.0, "1.23456789e+10"}};
  for (const Case& c : cases) EXPECT_EQ(FormatNumber(c.value), c.text) << c.value;
  EXPECT_EQ(FormatNumber(std::numeric_limits<double>::quiet_NaN()), "**********");
  EXPECT_EQ(FormatNumber(std::numeric_limits<double>::infinity()), "**********");
}

TEST(LogNames, LogAndProgressFilesFollowTheSetupFileName) {
  EXPECT_EQ(LogFileName("case.skf", -1, 1), "case.log");
  EXPECT_EQ(LogFileName("runs/v1.2/case", -1, 1), "runs/v1.2/case.log");  // dot in a folder
  EXPECT_EQ(LogFileName("a.b.skf", -1, 1), "a.b.log");
  EXPECT_EQ(LogFileName("case.skf", 2, 4), "case_p2.log");
  EXPECT_EQ(LogFileName("case.skf", 0, 4), "case.log");
  EXPECT_EQ(LogFileName("dir.x/case", 3, 4), "dir.x/case_p3.log");
  EXPECT_EQ(ProgressBaseName("runs/case.log"), "runs/case");
  EXPECT_EQ(ProgressBaseName("runs/case.inp.log"), "runs/case");
  EXPECT_EQ(ProgressBaseName("v1.log/case"), "v1.log/case");
}

TEST(LogOutput, LinesReachTheLogFileAtOnce) {
  tavrintest::TempDir dir;
  const std::string log = dir.file("run.log");
  ASSERT_TRUE(LogOpen(log));
  PrintLine("first line   ");
  PrintPartial("echo : ");
  PrintPartial("12");
  EndLine();
  IndentedMessage("Number of processes  : %", 1LL);
  IndentedMessage("Local processor name : %", "host");
  PrintLongText(std::string(75, 'z'));
  // Written with write(2) line by line: visible before the log is closed.
  const std::string text = tavrintest::ReadFile(log);
  LogClose();
  const std::size_t body = text.find("first line");
  ASSERT_NE(body, std::string::npos);
  EXPECT_EQ(text.substr(0, 6), "Date: ");
  EXPECT_EQ(text.substr(body), "first line\necho : 12\n  Number of processes  : 1\n"
                               "  Local processor name : host\n" + std::string(70, 'z') + "\n" +
                               std::string(5, 'z') + "\n");
  EXPECT_FALSE(LogIsOpen());
}

TEST(TimingTable, LayoutFollowsThePrintOrder) {
  TimingTable t;
  CreateTimingTable(t, "Overall", 4);
  AddTiming(t, 1, "Pre-processing");
  AddTiming(t, 2, "Calculation");
  AddTiming(t, 4, "Total");
  StartTiming(t, 2);
  StopTiming(t, 2);
  StartTiming(t, 9);  // beyond the capacity: ignored
  StopTiming(t, 9);
  EXPECT_EQ(t.tasks[3].name, "task_3");
  const std::string text = FormatTimingTable(t);
  const std::string rule(66, '-');
  const std::string expected = BannerText("Overall Timings") + "\n" + rule + "\n" +
      "Task                                       CPU time   Elapsed time\n" + rule + "\n" +
      "Pre-processing                                 0.00           0.00\n" +
      "Calculation                                    0.00           0.00\n" + rule + "\n" +
      "Total                                          0.00           0.00\n" + rule + "\n" +
      std::string(70, '=') + "\n";
  EXPECT_EQ(text, expected);
  EXPECT_GE(t.tasks[2].wallTotal, 0.0);
}

TEST(TimingTable, WrongTaskNumberIsFatal) {
  TimingTable t;
  CreateTimingTable(t, "Overall", 4);
  EXPECT_EXIT(AddTiming(t, 5, "x"), ::testing::ExitedWithCode(1), "AddTiming: Wrong timing number");
}

TEST(Termination, SignalMessagesUseTheEngineWords) {
  EXPECT_STREQ(SignalMessage(SIGINT, 0), "Control-C send");
  EXPECT_STREQ(SignalMessage(SIGTERM, 0), "Termination request");
  EXPECT_STREQ(SignalMessage(SIGSEGV, 0), "Illegal storage access");
  EXPECT_STREQ(SignalMessage(SIGILL, 0), "Illegal instruction");
  EXPECT_STREQ(SignalMessage(SIGABRT, 0), "Abnormal termination");
  EXPECT_STREQ(SignalMessage(SIGFPE, FPE_FLTDIV), "Floating point exception: Zero divide");
  EXPECT_STREQ(SignalMessage(SIGFPE, FPE_FLTINV), "Floating point exception: Invalid number");
  EXPECT_STREQ(SignalMessage(SIGFPE, FPE_FLTOVF), "Floating point exception: Overflow");
  EXPECT_STREQ(SignalMessage(SIGFPE, FPE_FLTRES), "Floating point exception: Inexact precision");
  EXPECT_STREQ(SignalMessage(SIGFPE, 12345), "Floating point exception: Non-IEEE type");
}

TEST(Termination, FatalErrorWritesLogAndStandardError) {
  tavrintest::TempDir dir;
  const std::string log = dir.file("fatal.log");
  EXPECT_EXIT(
      {
        LogOpen(log);
        FatalError("Something is wrong with the mesh file");
      },
      ::testing::ExitedWithCode(1), "Fatal error: Something is wrong with the mesh file");
  const std::string text = tavrintest::ReadFile(log);
  EXPECT_NE(text.find("\n\nFatal error: Something is wrong with the mesh file\nAbnormal completion\n"),
            std::string::npos) << text;
}

TEST(Termination, SignalHandlerEndsWithTheSignalNumber) {
  tavrintest::TempDir dir;
  const std::string log = dir.file("sig.log");
  EXPECT_EXIT(
      {
        InstallSignalHandlers();
        LogOpen(log);
        raise(SIGTERM);
      },
      ::testing::ExitedWithCode(SIGTERM), "");  // the message goes to the log and stdout
  const std::string text = tavrintest::ReadFile(log);
  EXPECT_NE(text.find("\nTermination request\nAbnormal completion\n"), std::string::npos) << text;
}

}  // namespace
