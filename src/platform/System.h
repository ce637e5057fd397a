// Thin layer over the operating system: clocks, process counters, floating-point control,
// resource limits and file-system helpers used by the run control.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>

// Flush denormal results to zero and treat denormal inputs as zero on the calling thread.
void SetDenormalsFlushToZero();
// True when the calling thread flushes denormals (used by tests).
bool DenormalsAreFlushed();

// Seconds on a monotonic clock (never goes backwards, not affected by clock changes).
double WallSeconds();
// CPU seconds used by the whole process (all threads).
double ProcessCpuSeconds();
// CPU seconds used by the calling thread.
double ThreadCpuSeconds();

// Peak resident memory of the process in bytes (VmHWM), 0 when unknown.
std::int64_t PeakMemoryBytes();

// Writes all of `text` to the descriptor, retrying after interrupts; gives up on other errors.
void WriteAll(int fd, std::string_view text);

std::string ProcessorName();
int NumberOfProcessors();

// Raises (or lowers) the soft limit of open files to `limit`, capped by the hard limit.
// Returns the soft limit now in force.
long SetOpenFileLimit(long limit);

// Folder part of a path ("" for a bare name) and the last component.
std::string PathFolder(const std::string& path);
std::string PathLeaf(const std::string& path);
// Replaces the extension of the last component (a dot in a folder name is not an extension);
// `ext` includes the dot. Appends it when the name has none.
std::string ReplaceExtension(const std::string& path, const std::string& ext);
// Removes the extension of the last component when it equals `ext` (case-sensitive).
std::string StripExtension(const std::string& path, const std::string& ext);
// Creates the folders above `path`. Returns false when that fails.
bool CreateParentFolders(const std::string& path);
