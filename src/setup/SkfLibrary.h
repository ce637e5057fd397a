// Setup-file library: loads a setup file into a read-only tree of targets, sections, keywords and
// parameters, and offers typed, numbered access to it. The access layer (SetupFile.h) is written
// only against the operations declared here, so a second file format can be offered by another
// implementation of the same operations.
//
// Syntax (docs/setup-file.md has the full description):
//   TesselHD {                       // top-level blocks are targets
//     TIME {                         // nested blocks are sections
//       start_time = 2004, 1, 1, 0, 0, 0
//       time_step_interval = 30.0; number_of_time_steps = 100
//     }
//     CORIOLIS { type = 0 }
//     mesh_file = <mesh/bay.mesh>    // file name, resolved against the setup file's folder
//     title = "Bay \"north\""        // string with \" and \\ escapes
//   }
// A repeated block or keyword name within the same parent is a new instance, numbered 1, 2, ... in
// file order. Handles are pointers into the loaded tree; they stay valid until skfClose.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>

struct SkfFile;     // a loaded file
struct SkfBlock;    // a target (level 0) or a section (level >= 1)
struct SkfKeyword;  // one keyword instance
struct SkfParam;    // one parameter of a keyword

// Library error codes (skfPeekErrorGlb). 0 means no pending error.
enum SkfError : int {
  SKF_OK = 0,
  SKF_ERR_OPEN = 1001,      // file missing, unreadable or a directory
  SKF_ERR_MEMORY = 1002,    // allocation failed while loading
  SKF_ERR_SYNTAX = 1003,    // syntax error; skfGetSyntaxErr tells where and what
  SKF_ERR_TYPE = 1004,      // parameter read as a type it does not hold
  SKF_ERR_RANGE = 1005,     // value does not fit the destination type (double into float)
  SKF_ERR_HANDLE = 1006,    // null handle passed where a valid one is needed
};

enum class SkfParamType : std::uint8_t { Int, Double, Bool, String, Filename };

// Limits that guard against hostile input; exceeding one is a syntax error.
inline constexpr int kSkfMaxNesting = 64;                 // blocks nested deeper than this
inline constexpr std::size_t kSkfMaxLineBytes = 1u << 20;  // a line longer than 1 MiB

// --- loading -------------------------------------------------------------------------------
// Loads a file. Returns nullptr when the file cannot be read (pending error SKF_ERR_OPEN). On a
// syntax error the returned file is non-null but holds no targets, and the pending error is
// SKF_ERR_SYNTAX. `flag` is accepted for compatibility and ignored (the access layer passes -1).
SkfFile* skfLoadFile(const char* name, int flag);
// Parses text already in memory; `name` is used for messages and as the base of relative file
// names (its folder). Same results as skfLoadFile.
SkfFile* skfLoadBuffer(const char* data, std::size_t size, const char* name);
void skfClose(SkfFile* file);

// Syntax error of the last load of `file`: 1-based line and column, and the message text (what
// was found and what was expected, without position). Returns false when the load succeeded.
bool skfGetSyntaxErr(const SkfFile* file, int* line, int* column, std::string* message);

// The file name as given to the loader, and the folder that relative file names resolve against.
std::string skfGetFileName(const SkfFile* file);

// --- navigation (counts are >= 0, numbers are 1-based; misses return nullptr) ----------------
int skfGetNoTargets(const SkfFile* file);
SkfBlock* skfTargetByNum(const SkfFile* file, int number);
SkfBlock* skfTargetByNameNum(const SkfFile* file, const char* name, int instance);

int skfGetNoSections(const SkfBlock* parent);
SkfBlock* skfSectionByNum(const SkfBlock* parent, int number);
SkfBlock* skfSectionByNameNum(const SkfBlock* parent, const char* name, int instance);
SkfBlock* skfGetParent(const SkfBlock* block);  // nullptr for a target

int skfGetNoKeywords(const SkfBlock* block);
SkfKeyword* skfKeywordByNum(const SkfBlock* block, int number);
SkfKeyword* skfKeywordByNameNum(const SkfBlock* block, const char* name, int instance);

int skfGetNoParams(const SkfKeyword* keyword);
SkfParam* skfParamByNum(const SkfKeyword* keyword, int number);

// --- names, positions and bookkeeping --------------------------------------------------------
std::string skfGetName(const SkfBlock* block);        // "TIME"
std::string skfGetNameGlb(const SkfBlock* block);     // dotted path "TesselHD.HYDRODYNAMIC_MODULE.TIME"
int skfGetLevel(const SkfBlock* block);               // 0 for a target, parent level + 1 below
int skfGetInstance(const SkfBlock* block);            // instance number among same-named siblings
int skfGetLine(const SkfBlock* block);                // line of the block's name
std::string skfGetKeywordName(const SkfKeyword* keyword);
int skfGetKeywordLine(const SkfKeyword* keyword);
int skfGetKeywordInstance(const SkfKeyword* keyword);
SkfBlock* skfGetKeywordBlock(const SkfKeyword* keyword);  // the block holding the keyword
// Read marks, used to list the entries of a file that nothing looked at. The loaded tree is
// otherwise immutable; marks are the only mutable state.
void skfMarkRead(SkfBlock* block);
void skfMarkRead(SkfKeyword* keyword);
bool skfIsRead(const SkfBlock* block);
bool skfIsRead(const SkfKeyword* keyword);

// --- parameters ------------------------------------------------------------------------------
SkfParamType skfGetParamType(const SkfParam* param);
int skfGetParamLine(const SkfParam* param);
int skfGetParamColumn(const SkfParam* param);
bool skfIsInt(const SkfParam* param);
bool skfIsDouble(const SkfParam* param);  // a literal with '.', 'e' or 'E'
bool skfIsBool(const SkfParam* param);
bool skfIsString(const SkfParam* param);
bool skfIsFilename(const SkfParam* param);

// Typed reads. A read of the wrong type sets SKF_ERR_TYPE and returns 0 / false / "";
// skfGetDouble and skfGetFloat accept integers; skfGetFloat sets SKF_ERR_RANGE for a finite
// double outside the float range; skfGetBool accepts only true/false (the access layer handles
// integers read as booleans itself).
std::int32_t skfGetInt(const SkfParam* param);
float skfGetFloat(const SkfParam* param);
double skfGetDouble(const SkfParam* param);
bool skfGetBool(const SkfParam* param);
// String text (unescaped). A file-name parameter is not a string: SKF_ERR_TYPE.
std::string skfGetString(const SkfParam* param);
// File-name parameter resolved against the setup file's folder (absolute names stay). Strings
// are accepted too and resolved the same way.
std::string skfGetFilename(const SkfParam* param);
// Result-file path: resolved as skfGetFilename. Result folders are created by whoever creates
// the file (SkfCreateParentFolders in SetupFile.h).
std::string skfGetResultFilenamePath(const SkfParam* param);
// The parameter as written in the file, for messages ("12", "1.5", "true", "\"text\"", "<f>").
std::string skfGetParamText(const SkfParam* param);

// --- pending error (one per thread; the loaded tree is read by one thread) -------------------
int skfPeekErrorGlb();
void skfClearErrorGlb();

// Joins a relative file name to a folder ("" or "." keep it relative); absolute names stay.
std::string skfResolvePath(std::string_view folder, std::string_view name);
