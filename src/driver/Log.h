// Log file and message output. While a log is open, general messages go to it; otherwise to
// standard output. Every finished line is written with one write(2), so the log on disk is
// complete up to its last line at any moment (signal handlers append to it safely).
#pragma once

#include <string>
#include <string_view>

struct LogState {
  int unit = -1;         // file descriptor of the log, -1 when none is open
  std::string fileName;  // log file name
  std::string pending;   // text of the line being composed (keyword echo)
  int processId = -1;    // -1: single-process run
  int numProcesses = 1;
};

extern LogState g_log;

// Log name for a setup file: its extension replaced by ".log"; in a run with more than one
// process, processes other than 0 add "_p" + id before the extension.
std::string LogFileName(const std::string& setupFile, int processId, int numProcesses);

// Creates the log (truncating an old one) and writes the date and time lines. Returns false
// when it cannot be created; messages then keep going to standard output.
bool LogOpen(const std::string& fileName);
void LogClose();
bool LogIsOpen();

// Message output on the message unit (the log, or standard output when no log is open).
void PrintLine(std::string_view text);             // trailing blanks trimmed
void PrintPartial(std::string_view text);          // appended to the pending line
void EndLine();                                    // writes the pending line
void Banner(std::string_view text);                // empty line + 70-column "=" banner
std::string BannerText(std::string_view text);     // the 70-column banner line itself
void IndentedMessage(std::string_view format, std::string_view value);  // "  " + format, % = value
void IndentedMessage(std::string_view format, long long value);
void PrintLongText(std::string_view text);
void PrintLines(std::string_view text);          // one PrintLine per '\n'-separated line         // pieces of 70 characters, one per line

// Writes straight to standard output and/or standard error with write(2); when both are wanted
// and they are the same file (a terminal), the text is written once.
void WriteConsole(std::string_view text, bool toStdout, bool toStderr);
bool StdoutIsStderr();

// Text helpers.
std::string TrimRight(std::string_view text);
std::string Trim(std::string_view text);
// A number with at most 10 significant digits: trailing zeros and point removed, exponent form
// for very large or small magnitudes, "0" up to 1e-100, "**********" when not finite.
std::string FormatNumber(double value, int significant = 10);
