// Setup-file access layer. Keeps one current position in the loaded setup file, opens and closes
// targets and sections by name, reads typed keyword values with defaults, and echoes every value
// read (or the default used) into the log, indented by section level. Every module reads the
// setup file only through these procedures; they use only the library operations of
// SkfLibrary.h.
//
// Keyword readers: the destination is set to the default first (when one is given); when the
// keyword exists its parameter is read into the destination. They return 0 when the keyword
// exists and was read, 1 when it is missing (never fatal). A keyword that exists but whose value
// cannot be read as the requested type stops the run with a message naming the keyword, its
// section path and its line.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "setup/SkfLibrary.h"

struct SetupFileState {
  SkfFile* file = nullptr;      // the loaded setup file
  SkfBlock* current = nullptr;  // current position: a target or section
  std::string fileName;         // as passed to SkfOpenFile
  std::string logName;          // derived from fileName
  int defaultInstance = 1;
};

extern SetupFileState g_setup;

// Loads the file; with `createLog` also creates the log. A file that cannot be loaded gives
// status -1, or without status is fatal "SkfOpenFile : Unable to open <name>". A syntax error is
// fatal. A setup file whose name ends in ".log" is refused (its log would overwrite it). When
// the same file is already loaded, the loaded tree is reused.
void SkfOpenFile(const std::string& name, bool createLog, int* status = nullptr);
void SkfCloseFile();

// Opens a target; it becomes the current position. Missing: status -1 (position unchanged), or
// without status a stop with "SKF target: <name> not found".
void SkfOpenTarget(std::string_view name, int instance = 1, int* status = nullptr);

// Opens a sub-section of the current position. Missing: status -1 (position unchanged, do not
// close), or without status a stop with "SKF section: <name> not found".
void SkfOpenSection(std::string_view name, int* status = nullptr);
// Numbered section: index k >= 0 opens name_k, a negative index opens name_M|k|.
void SkfOpenSectionIndex(std::string_view name, int index, int* status = nullptr);
// As SkfOpenSection without the log echo.
void SkfOpenSectionQuiet(std::string_view name, int* status = nullptr);
// Opens the instance-th section of that name.
void SkfOpenSectionInstance(std::string_view name, int instance, int* status = nullptr);
// Returns to the parent of the current section: the instance that was actually open.
void SkfCloseSection();
// Same, for callers that name the section and instance being closed.
void SkfCloseSection(std::string_view name, int instance);
// The section name looked up for a numbered section ("OUTPUT_3", "OUTPUT_M2").
std::string SkfNumberedName(std::string_view name, int index);

// Counts in the current position.
int SkfNoSections();
int SkfNoKeywords();
// Dotted path of the current position ("TesselHD.TIME").
std::string SkfCurrentPath();

// Keyword readers (parameter and instance numbers are 1-based).
int SkfReadInt(std::string_view keyword, std::int32_t& dest,
               std::optional<std::int32_t> def = std::nullopt, int param = 1, int instance = 1);
int SkfReadDouble(std::string_view keyword, double& dest, std::optional<double> def = std::nullopt,
                  int param = 1, int instance = 1);
int SkfReadFloat(std::string_view keyword, float& dest, std::optional<float> def = std::nullopt,
                 int param = 1, int instance = 1);
// Booleans: true/false, or an integer (non-zero is true).
int SkfReadBool(std::string_view keyword, bool& dest, std::optional<bool> def = std::nullopt,
                int param = 1, int instance = 1);
// Logical as int32: true = -1, false = 0.
int SkfReadLogical(std::string_view keyword, std::int32_t& dest,
                   std::optional<bool> def = std::nullopt, int param = 1, int instance = 1);
// Strings; a file-name parameter gives its resolved path.
int SkfReadString(std::string_view keyword, std::string& dest,
                  std::optional<std::string_view> def = std::nullopt, int param = 1,
                  int instance = 1);
// Input-file path (a file name or a string), resolved against the setup file's folder.
int SkfReadInputFile(std::string_view keyword, std::string& dest,
                     std::optional<std::string_view> def = std::nullopt, int param = 1,
                     int instance = 1);
// Result-file path, resolved against the setup file's folder.
int SkfReadResultFile(std::string_view keyword, std::string& dest,
                      std::optional<std::string_view> def = std::nullopt, int param = 1,
                      int instance = 1);
// Parameters 1 .. n in turn, stopping at the first that is missing; `def` (n values) may be null.
// Returns the number of values read through `count` when given.
int SkfReadDoubleList(std::string_view keyword, double* dest, int n, const double* def = nullptr,
                      int instance = 1, int* count = nullptr);
int SkfReadIntList(std::string_view keyword, std::int32_t* dest, int n,
                   const std::int32_t* def = nullptr, int instance = 1, int* count = nullptr);
// All parameters of the keyword; the array is resized to fit.
int SkfReadDoubleArray(std::string_view keyword, std::vector<double>& dest, int instance = 1);
// As SkfReadInt without the log echo.
int SkfReadIntSilent(std::string_view keyword, std::int32_t& dest,
                     std::optional<std::int32_t> def = std::nullopt, int param = 1,
                     int instance = 1);
// Looks a keyword up without reading it; with `echo` the keyword name is written to the log.
SkfKeyword* SkfFindKeyword(std::string_view keyword, int instance = 1, bool echo = false);

// Every keyword and section of the loaded file that nothing read, as "path (line N)", in file
// order. A section nothing opened is listed without its contents.
std::vector<std::string> SkfUnreadEntries();
// Warns once, listing the unread entries; nothing when every entry was read.
void SkfWarnUnread();

// Creates the folders above a result file (called when the file is created).
bool SkfCreateParentFolders(const std::string& path);

// Echo formatting used by the readers (exposed for tests).
std::string SkfEchoPath(const std::string& path);  // cut at the last "/" or "\" with TAVRIN_LOG_NOPATH
