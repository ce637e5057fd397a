// Data-file access layer. Every input series, map and result of the engine is a data file of one
// family, stored as NetCDF with our own conventions (docs/file-formats.md):
//   .vds0  point time series      items hold 1 value per time step
//   .vds1  line series            items on a 1-D equidistant axis
//   .vds2  grids                  items on a 2-D equidistant axis
//   .vds3  volumes                items on a 3-D equidistant axis
//   .vdsu  flexible-mesh data     items on the elements (or nodes) of a mesh, UGRID-1.0 topology
//
// One `DataFile` record per open file collects the header before the file is created, writes
// static and dynamic items in a fixed order, reads items and time steps back and turns every
// failure into a numbered error. Each operation takes an optional status: with it a failure
// returns the error code (the record's `errorText` says what went wrong); without it the run
// stops with "VDS Error: " + the message.
//
// Writing, in this order:
//   VdsInitHeader, VdsSetDataType, VdsSetCustomBlockInt / VdsSetCustomBlockFloat,
//   VdsSetCompression, VdsSetProjection, VdsSetTimeAxis (or VdsSetEqTimeAxis /
//   VdsSetNeqCalendarAxis), VdsDefineItem (+ VdsSetItemAxis, VdsDefineStaticItem for kinds
//   other than vdsu), VdsCreateFile, VdsWriteStatic* (in the kind's order), per time step
//   VdsWriteDynamic for items 1 .. n then VdsEndTimeStep (flush), VdsClose (summary in the log).
// Reading:
//   VdsOpenRead, then VdsReadStatic* by number, VdsReadDynamic (any item and step, optional unit
//   conversion) or the sequential VdsReadNextDynamic / VdsSkipItem / VdsSkipTimeStep, VdsClose.
#pragma once

#include <cstdint>
#include <cstdio>
#include <string>
#include <string_view>
#include <vector>

// Error codes of the layer.
enum VdsError : int {
  kVdsOk = 0,
  kVdsOpen = 101,             // "Unable to open VDS file"
  kVdsFileType = 102,         // "Invalid type of VDS file"
  kVdsItemNumber = 103,       // "Invalid item number"
  kVdsStaticCount = 104,      // "Unable to detect number of static items"
  kVdsItem = 105,             // "Invalid item"
  kVdsSpatialAxis = 106,      // "Invalid spatial axis"
  kVdsTimeAxis = 107,         // "Invalid time axis"
  kVdsAddCustom = 108,        // "Unable to add custom block"
  kVdsGetCustom = 109,        // "Unable to get custom block value"
  kVdsSetCustom = 110,        // "Unable to set custom block value"
  kVdsReadStatic = 201,       // "Unable to read static item"
  kVdsReadDynamic = 202,      // "Unable to read dynamic item"
  kVdsStaticAfterDynamicRead = 203,  // "Static read call after dynamic"
  kVdsSkip = 204,             // "Unable to skip data"
  kVdsFlush = 205,            // "Unable to flush file"
  kVdsCreateHeader = 301,     // "Unable to create header"
  kVdsCreateFile = 302,       // "Unable to create file"
  kVdsWriteStatic = 401,      // "Unable to write static item"
  kVdsWriteDynamic = 402,     // "Unable to write dynamic item"
  kVdsStaticAfterDynamicWrite = 403,  // "Static write call after dynamic"
  kVdsLocateStatic = 501,     // "Unable to locate static block"
  kVdsLocateDynamic = 502,    // "Unable to locate dynamic block"
};

// The fixed message of an error code; "Unknown error: <code>" for any other code.
std::string VdsErrorMessage(int code);

enum class VdsKind { kUnknown, kVds0, kVds1, kVds2, kVds3, kVdsu };
// Kind from the file name's extension (case-insensitive); kUnknown for any other.
VdsKind VdsKindFromName(std::string_view fileName);
const char* VdsKindName(VdsKind kind);  // "vds0" .. "vdsu", "unknown"

// File kinds of the header: files opened for reading must be of kind 1 or 4.
inline constexpr std::int32_t kVdsFileKindData = 1;    // dynamic items over time
inline constexpr std::int32_t kVdsFileKindStatic = 4;  // static items only (meshes, maps)

// Time axis kinds.
inline constexpr int kVdsEqTime = 1;        // equidistant, relative seconds (no calendar)
inline constexpr int kVdsEqCalendar = 3;    // equidistant, calendar start date
inline constexpr int kVdsNeqCalendar = 4;   // non-equidistant, calendar start date

inline constexpr float kVdsDeleteValue = 1e-35f;  // default delete value (missing data)
inline constexpr int kVdsMaxCustomBlock = 1024;   // largest custom-block index

// Value types of items (stored as the item attribute "value_type").
enum VdsValueType : int {
  kVdsInstantaneous = 0,
  kVdsAccumulated = 1,
  kVdsStepAccumulated = 2,
  kVdsMeanStepBackward = 3,
  kVdsMeanStepForward = 4,
};

// Element types of static items.
enum class VdsStaticType { kInt32, kFloat, kDouble };

struct VdsSpatialAxis {
  int dimension = 0;          // 0 (one value), 1, 2 or 3
  std::int64_t n[3] = {1, 1, 1};  // points along x, y, z
  double origin[3] = {0, 0, 0};
  double step[3] = {1, 1, 1};
  std::int32_t unit = 1000;   // unit of the axis (metre)
};

struct VdsTimeAxis {
  int kind = kVdsEqCalendar;
  std::string start = "2000-01-01 00:00:00";  // "YYYY-MM-DD hh:mm:ss"; kind 1: unused
  double startOffset = 0.0;   // kind 1: time of the first step in seconds
  double step = 1.0;          // seconds (equidistant kinds)
  std::int64_t count = 0;     // number of time steps in the file
  std::string unit = "second";
};

struct VdsItem {
  std::string name = "Unknown";   // at most 80 characters
  std::int32_t itemType = 999;    // item type code (io/Units.h)
  std::int32_t unit = 0;          // unit code
  std::int64_t elements = 1;      // values per time step
  int valueType = kVdsInstantaneous;
  VdsSpatialAxis axis;
  bool defined = false;
  // Statistics of the values written (delete values, NaN and infinities left out).
  double minimum = 0.0, maximum = 0.0;
  std::int64_t counted = 0;
  // NetCDF variable
  int varId = -1;
};

struct VdsStaticItem {
  std::string name;
  std::string varName;            // NetCDF variable name
  VdsStaticType type = VdsStaticType::kFloat;
  std::int32_t itemType = 999;
  std::int32_t unit = 0;
  std::int64_t elements = 0;
  bool written = false;
  double minimum = 0.0, maximum = 0.0;
  std::int64_t counted = 0;
  int varId = -1;
};

// What a caller requires of an item it reads: the item type's unit kind (0: any).
struct VdsItemRequirement {
  int item = 0;               // 1-based item number
  std::int32_t unitKind = 0;  // required unit kind (io/Units.h)
};

struct DataFile {
  std::string fileName = "unknown";
  std::string title = "unknown";
  std::string creator = "unknown";
  VdsKind kind = VdsKind::kUnknown;
  std::int32_t fileKind = kVdsFileKindData;
  std::int32_t dataType = 0;
  float deleteValue = kVdsDeleteValue;
  double deleteValueDouble = static_cast<double>(kVdsDeleteValue);
  int itemCount = 0;
  std::vector<VdsItem> items;             // [itemCount]
  std::vector<VdsStaticItem> statics;     // in file order
  std::string customBlockName;            // "TAVRIN_FM" (int32) or "TV2_Misc" (float), ...
  std::vector<std::int32_t> customInt;    // 1-based index i at [i - 1]
  std::vector<float> customFloat;
  std::string projection = "unknown";     // projection text, at most 1024 characters
  double origin[2] = {0.0, 0.0};
  double orientation = 0.0;
  VdsTimeAxis time;
  std::int32_t compression = 0;           // 0: classic CDF-5, kill-safe; 1: NetCDF-4 deflate
  double compressionFactor = 1.0, compressionOffset = 0.0;
  int nextItem = 1;                       // item the next dynamic write belongs to (1 .. n)
  int openMode = 0;                       // 0 header only, 1 reading, 2 writing
  bool dynamicStarted = false;            // a dynamic item was written or read
  std::string errorText;                  // detail of the last failure
  // Reading cursor of the sequential reads: next step (0-based) and item (1-based).
  std::int64_t readStep = 0;
  int readItem = 1;
  // NetCDF handles
  int ncid = -1;
  int timeVar = -1, stepVar = -1;
  std::int64_t stepsWritten = 0;
  bool netcdf4 = false;                   // NetCDF-4 (compressed) rather than classic CDF-5
  bool printSummary = true;               // VdsClose writes the summary of a written file
  std::vector<double> stepTimes;          // per record: seconds since the start
  std::vector<std::int32_t> stepNumbers;  // per record: step number (-1: failure record)
  // vdsu while writing: node coordinates and node counts, for the face connectivity and centres
  std::vector<double> nodeX, nodeY;
  std::vector<std::int32_t> elementNodeCount;
  int faceNodesVar = -1, faceXVar = -1, faceYVar = -1;
  std::int64_t maxFaceNodes = 0;
  // Classic files, once the dynamic items start: the library has closed the file and the
  // records are written here directly, the record count last (see docs/file-formats.md).
  int recordFd = -1;
  std::uint64_t recordSize = 0, timeBegin = 0, stepBegin = 0;
  std::vector<std::uint64_t> itemBegin;   // [itemCount]
  std::vector<std::uint32_t> recordBuffer;
};

// --- Writing -------------------------------------------------------------------------------
// Resets the record to a blank header of `itemCount` dynamic items.
int VdsInitHeader(DataFile& df, std::int32_t fileKind, std::string_view title,
                  std::string_view creator, int itemCount, int* status = nullptr);
int VdsSetDataType(DataFile& df, std::int32_t dataType, int* status = nullptr);
int VdsSetDeleteValue(DataFile& df, float value, int* status = nullptr);
// Custom block value at 1-based `index` (1 .. kVdsMaxCustomBlock): int32 for flexible-mesh data
// types (2000 .. 2004), float otherwise.
int VdsSetCustomBlockInt(DataFile& df, int index, std::int32_t value, int* status = nullptr);
int VdsSetCustomBlockFloat(DataFile& df, int index, float value, int* status = nullptr);
int VdsSetCompression(DataFile& df, std::int32_t flag, int* status = nullptr);
int VdsSetProjection(DataFile& df, std::string_view projection, double originX, double originY,
                     double orientation = 0.0, int* status = nullptr);
// Equidistant calendar axis from "YYYY-MM-DD hh:mm:ss" and a step in seconds (> 0).
int VdsSetTimeAxis(DataFile& df, std::string_view start, double step,
                   std::string_view unit = "second", int* status = nullptr);
int VdsSetEqTimeAxis(DataFile& df, double startOffset, double step, int* status = nullptr);
int VdsSetNeqCalendarAxis(DataFile& df, std::string_view start, int* status = nullptr);
// Item `number` (1 .. n); the unit is the item type's default unit.
int VdsDefineItem(DataFile& df, int number, std::int32_t itemType, std::string_view name,
                  std::int64_t elements, int valueType = kVdsInstantaneous, int* status = nullptr);
int VdsSetItemUnit(DataFile& df, int number, std::int32_t unit, int* status = nullptr);
int VdsSetItemAxis(DataFile& df, int number, const VdsSpatialAxis& axis, int* status = nullptr);
// Static items of kinds other than vdsu are declared before the file is created; vdsu files
// have their nine mesh items, sized by the custom block positions 1 and 2.
int VdsDefineStaticItem(DataFile& df, std::string_view name, VdsStaticType type,
                        std::int64_t elements, std::int32_t itemType = 999, std::int32_t unit = 0,
                        int* status = nullptr);
int VdsCreateFile(DataFile& df, const std::string& fileName, int* status = nullptr);
// Static items in order; each call writes the next one.
int VdsWriteStaticInt(DataFile& df, const std::int32_t* values, std::int64_t n, int* status = nullptr);
int VdsWriteStaticFloat(DataFile& df, const float* values, std::int64_t n, int* status = nullptr);
int VdsWriteStaticDouble(DataFile& df, const double* values, std::int64_t n, int* status = nullptr);
// Dynamic item `item` of the current time step: it must be the next item in the cyclic order
// (1, 2, .., n, 1, ..). `time` is the step's time in seconds since the file's start and `step`
// its step number (-1 marks the record written after a failure); both are taken from item 1.
int VdsWriteDynamic(DataFile& df, int item, const float* values, std::int64_t n, double time,
                    std::int32_t step, int* status = nullptr);
// Ends a time step: the file is synchronised so the step survives a killed process.
int VdsEndTimeStep(DataFile& df, int* status = nullptr);
// Closes the file; a written file gets its summary in the log. Closing a blank record is a no-op.
int VdsClose(DataFile& df, int* status = nullptr);

// --- Reading -------------------------------------------------------------------------------
// Opens for reading: the file kind must be 1 or 4, the requirements are checked. A flexible-mesh
// file whose data type is outside 2000 .. 2004 is read as 2000 after a warning.
int VdsOpenRead(DataFile& df, const std::string& fileName,
                const std::vector<VdsItemRequirement>& requirements = {}, int* status = nullptr);
int VdsStaticCount(const DataFile& df);
// Static item `number` (1-based) converted to the destination type.
int VdsReadStaticInt(DataFile& df, int number, std::vector<std::int32_t>& values, int* status = nullptr);
int VdsReadStaticFloat(DataFile& df, int number, std::vector<float>& values, int* status = nullptr);
int VdsReadStaticDouble(DataFile& df, int number, std::vector<double>& values, int* status = nullptr);
// Item `item` of time step `step` (0-based) into values[0 .. n), n = the item's elements. With
// `unit` > 0 the values are converted to that unit (delete values stay).
int VdsReadDynamic(DataFile& df, int item, std::int64_t step, float* values, std::int64_t n,
                   std::int32_t unit = 0, int* status = nullptr);
// Sequential reading: the item at the cursor, then the cursor moves on.
int VdsReadNextDynamic(DataFile& df, float* values, std::int64_t n, std::int32_t unit = 0,
                       int* status = nullptr);
int VdsSkipItem(DataFile& df, int* status = nullptr);
int VdsSkipTimeStep(DataFile& df, int* status = nullptr);
// Time in seconds since the file's start, and the step number, of record `step` (0-based).
double VdsStepTime(const DataFile& df, std::int64_t step);
std::int32_t VdsStepNumber(const DataFile& df, std::int64_t step);
// Custom block value at 1-based `index`.
int VdsGetCustomBlockInt(const DataFile& df, int index, std::int32_t& value, int* status = nullptr);
int VdsGetCustomBlockFloat(const DataFile& df, int index, float& value, int* status = nullptr);

// The data-file summary block as written into the log when a written file is closed.
std::string VdsSummaryText(const DataFile& df);

// --- File units for text and unformatted side files -----------------------------------------
// Units are small integers from a pool; a failure returns -1 with a status or stops the run.
int FileUnitCreate(const std::string& name, bool unformatted, int* status = nullptr);
int FileUnitOpenRead(const std::string& name, int* status = nullptr);
int FileUnitClose(int unit, int* status = nullptr);
// The stream of an open unit (nullptr when the unit is not open).
std::FILE* FileUnitStream(int unit);
