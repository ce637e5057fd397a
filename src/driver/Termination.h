// The one way the engine ends: fatal errors, stops with a message, signal handlers and the
// normal end all go through Stop, which writes the completion word and ends the process.
#pragma once

#include <string>
#include <string_view>

// Lines of a fatal error: "Fatal error: " + 57 characters, then pieces of 57 behind 13 blanks.
std::string FormatFatalError(std::string_view message);
// Lines of a warning: "Warning: " + 61 characters, then pieces of 61 behind 9 blanks.
std::string FormatWarning(std::string_view message);

// Prints the message as a fatal error and stops with exit code 1. The message also goes to
// standard error, so a console user sees why the run stopped.
[[noreturn]] void FatalError(std::string_view message);
// Prints the message as a warning in the log and returns. The log is flushed line by line.
void Warning(std::string_view message);
// Prints the message in the log and on standard output (unless BUILDMODE=NIGHT), and on
// standard error while no log is open, then stops with `code`.
[[noreturn]] void StopWithMessage(std::string_view message, int code = 1);
// Writes "Abnormal completion" (code != 0) or "Successful completion" to an open log, closes it
// and ends the process with `code`.
[[noreturn]] void Stop(int code);

// Installs the handlers for abort, illegal instruction, interrupt, segmentation violation,
// termination request and floating-point exception. Each writes its message with write(2) and
// ends the process with the signal number as exit code; nothing else is done in the handler.
void InstallSignalHandlers();
// The log descriptor the handlers append to (-1: none). Set by the log layer.
void SetSignalLogUnit(int fd);
// Text written by the handler for a signal (and floating-point sub-code), e.g. "Control-C send".
const char* SignalMessage(int signal, int code);
