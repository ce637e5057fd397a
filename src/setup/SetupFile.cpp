#include "setup/SetupFile.h"

#include <algorithm>
#include <cstdlib>
#include <string>
#include <utility>

#include "driver/Log.h"
#include "driver/Termination.h"
#include "platform/System.h"

SetupFileState g_setup;

namespace {

std::string Indent(int level) { return std::string(static_cast<std::size_t>(2 * (level > 0 ? level : 0)), ' '); }

bool Echoing(bool echo) { return echo && LogIsOpen(); }

// Starts the echo line of a keyword: 2 x (level + 1) blanks, the name and " : ".
void EchoStart(std::string_view keyword) {
  const int level = g_setup.current != nullptr ? skfGetLevel(g_setup.current) : 0;
  PrintPartial(Indent(level + 1));
  PrintPartial(keyword);
  PrintPartial(" : ");
}

SkfKeyword* Lookup(std::string_view keyword, int instance) {
  if (g_setup.current == nullptr) return nullptr;
  const std::string name(keyword);
  SkfKeyword* k = skfKeywordByNameNum(g_setup.current, name.c_str(), instance);
  if (k != nullptr) skfMarkRead(k);
  return k;
}

[[noreturn]] void TypeFault(std::string_view keyword, const SkfParam* param, const char* wanted) {
  std::string msg = "Setup file: keyword " + std::string(keyword) + " in section " + SkfCurrentPath();
  msg += ", line " + std::to_string(skfGetParamLine(param)) + ": the value " + skfGetParamText(param);
  msg += std::string(" cannot be read as ") + wanted;
  FatalError(msg);
}

std::string EchoBool(bool b) { return b ? "True" : "False"; }

// One parameter through `get`; a parameter of the wrong type stops the run (after closing the
// echo line that was started).
template <class T, class Get>
T GetChecked(std::string_view keyword, SkfParam* p, bool echoOn, const char* wanted, Get get) {
  skfClearErrorGlb();
  T value{};
  if (!get(p, value) || skfPeekErrorGlb() != SKF_OK) {
    if (echoOn) EndLine();
    skfClearErrorGlb();
    TypeFault(keyword, p, wanted);
  }
  return value;
}

// Reads one parameter with `get`, which returns false when the parameter has the wrong type.
// `format` renders the destination for the echo.
template <class T, class Get, class Format>
int ReadScalar(std::string_view keyword, T& dest, const std::optional<T>& def, int param,
               int instance, bool echo, const char* wanted, Get get, Format format) {
  if (def) dest = *def;
  const bool on = Echoing(echo);
  if (on) EchoStart(keyword);
  SkfKeyword* k = Lookup(keyword, instance);
  SkfParam* p = k != nullptr ? skfParamByNum(k, param) : nullptr;
  if (p == nullptr) {
    if (on) {
      PrintPartial(format(dest, nullptr));
      PrintPartial(" (default)");
      EndLine();
    }
    return 1;
  }
  dest = GetChecked<T>(keyword, p, on, wanted, get);
  if (on) {
    PrintPartial(format(dest, p));
    EndLine();
  }
  return 0;
}

bool GetInt(const SkfParam* p, std::int32_t& v) {
  if (!skfIsInt(p)) return false;
  v = skfGetInt(p);
  return true;
}
bool GetDouble(const SkfParam* p, double& v) {
  if (!skfIsInt(p) && !skfIsDouble(p)) return false;
  v = skfGetDouble(p);
  return true;
}
bool GetFloat(const SkfParam* p, float& v) {
  if (!skfIsInt(p) && !skfIsDouble(p)) return false;
  v = skfGetFloat(p);
  return true;
}
bool GetBool(const SkfParam* p, bool& v) {
  if (skfIsInt(p)) {
    v = skfGetInt(p) != 0;
    return true;
  }
  if (!skfIsBool(p)) return false;
  v = skfGetBool(p);
  return true;
}
bool GetString(const SkfParam* p, std::string& v) {
  if (skfIsFilename(p)) {
    v = skfGetFilename(p);
    return true;
  }
  if (!skfIsString(p)) return false;
  v = skfGetString(p);
  return true;
}
bool GetInputFile(const SkfParam* p, std::string& v) {
  if (!skfIsFilename(p) && !skfIsString(p)) return false;
  v = skfGetFilename(p);
  return true;
}
bool GetResultFile(const SkfParam* p, std::string& v) {
  if (!skfIsFilename(p) && !skfIsString(p)) return false;
  v = skfGetResultFilenamePath(p);
  return true;
}

std::string FormatInt(const std::int32_t& v, const SkfParam*) { return std::to_string(v); }
std::string FormatDouble(const double& v, const SkfParam*) { return FormatNumber(v); }
std::string FormatFloat(const float& v, const SkfParam*) { return FormatNumber(v, 7); }
std::string FormatBool(const bool& v, const SkfParam*) { return EchoBool(v); }
std::string FormatString(const std::string& v, const SkfParam* p) {
  return p != nullptr && skfIsFilename(p) ? SkfEchoPath(v) : Trim(v);
}
std::string FormatPath(const std::string& v, const SkfParam*) { return SkfEchoPath(v); }

template <class T, class Get, class Format>
int ReadList(std::string_view keyword, T* dest, int n, const T* def, int instance, int* count,
             const char* wanted, Get get, Format format) {
  if (def != nullptr) std::copy(def, def + n, dest);
  if (count != nullptr) *count = 0;
  const bool on = Echoing(true);
  if (on) EchoStart(keyword);
  SkfKeyword* k = Lookup(keyword, instance);
  if (k == nullptr) {
    if (on) {
      for (int i = 0; i < n; ++i) PrintPartial(format(dest[i], nullptr) + " ");
      PrintPartial(" (default)");
      EndLine();
    }
    return 1;
  }
  int read = 0;
  for (int i = 1; i <= n; ++i) {
    SkfParam* p = skfParamByNum(k, i);
    if (p == nullptr) break;
    const T value = GetChecked<T>(keyword, p, on, wanted, get);
    dest[i - 1] = value;
    ++read;
    if (on) PrintPartial(format(value, p) + " ");
  }
  if (on) EndLine();
  if (count != nullptr) *count = read;
  return 0;
}

// Makes `block` the current position and marks it read. A missing block gives status -1 when
// the caller asks for a status, else stops the run with "<what> not found".
bool Enter(SkfBlock* block, const std::string& what, int* status) {
  if (block == nullptr) {
    if (status != nullptr) {
      *status = -1;
      return false;
    }
    StopWithMessage(what + " not found");
  }
  g_setup.current = block;
  skfMarkRead(block);
  if (status != nullptr) *status = 0;
  return true;
}

void OpenSection(const std::string& name, int instance, bool echo, int* status) {
  SkfBlock* s = g_setup.current != nullptr
                    ? skfSectionByNameNum(g_setup.current, name.c_str(), instance)
                    : nullptr;
  if (!Enter(s, "SKF section: " + name, status)) return;
  if (Echoing(echo)) {
    PrintLine("");
    std::string line = Indent(skfGetLevel(s)) + "Section: " + name + " ";
    if (line.size() < 70) line.append(70 - line.size(), '-');
    PrintLine(line);
  }
}

void CollectUnread(const SkfBlock* block, std::vector<std::pair<int, std::string>>& out) {
  const std::string path = skfGetNameGlb(block);
  const int nk = skfGetNoKeywords(block);
  for (int i = 1; i <= nk; ++i) {
    const SkfKeyword* k = skfKeywordByNum(block, i);
    if (!skfIsRead(k)) {
      const int line = skfGetKeywordLine(k);
      out.emplace_back(line, path + "." + skfGetKeywordName(k) + " (line " + std::to_string(line) + ")");
    }
  }
  const int ns = skfGetNoSections(block);
  for (int i = 1; i <= ns; ++i) {
    const SkfBlock* s = skfSectionByNum(block, i);
    if (skfIsRead(s)) {
      CollectUnread(s, out);
    } else {
      const int line = skfGetLine(s);
      out.emplace_back(line, skfGetNameGlb(s) + " (line " + std::to_string(line) + ")");
    }
  }
}

}  // namespace

void SkfOpenFile(const std::string& name, bool createLog, int* status) {
  if (PathLeaf(name).size() > 4 && name.compare(name.size() - 4, 4, ".log") == 0)
    FatalError("SkfOpenFile : The setup file " + name +
               " has the extension .log, which is kept for the log of the run");
  if (g_setup.file == nullptr || g_setup.fileName != name) {
    SkfCloseFile();
    SkfFile* f = skfLoadFile(name.c_str(), -1);
    if (f == nullptr) {
      skfClearErrorGlb();
      if (status != nullptr) {
        *status = -1;
        return;
      }
      FatalError("SkfOpenFile : Unable to open " + name);
    }
    if (skfPeekErrorGlb() == SKF_ERR_SYNTAX) {
      int line = 0, column = 0;
      std::string message;
      skfGetSyntaxErr(f, &line, &column, &message);
      skfClose(f);
      skfClearErrorGlb();
      FatalError(message + " near line " + std::to_string(line) + " and colum " +
                 std::to_string(column) + " in file " + name);
    }
    skfClearErrorGlb();
    g_setup.file = f;
    g_setup.current = nullptr;
    g_setup.fileName = name;
  }
  if (createLog) {
    g_setup.logName = LogFileName(name, g_log.processId, g_log.numProcesses);
    LogOpen(g_setup.logName);
  }
  if (status != nullptr) *status = 0;
}

void SkfCloseFile() {
  if (g_setup.file != nullptr) skfClose(g_setup.file);
  g_setup.file = nullptr;
  g_setup.current = nullptr;
  g_setup.fileName.clear();
}

void SkfOpenTarget(std::string_view name, int instance, int* status) {
  const std::string n(name);
  SkfBlock* t = g_setup.file != nullptr ? skfTargetByNameNum(g_setup.file, n.c_str(), instance) : nullptr;
  if (!Enter(t, "SKF target: " + n, status)) return;
  if (LogIsOpen()) {
    PrintLine(std::string(70, '='));
    PrintLine("Target: " + n);
  }
}

std::string SkfNumberedName(std::string_view name, int index) {
  return std::string(name) + (index >= 0 ? "_" + std::to_string(index) : "_M" + std::to_string(-static_cast<long long>(index)));
}

void SkfOpenSection(std::string_view name, int* status) {
  OpenSection(std::string(name), g_setup.defaultInstance, true, status);
}
void SkfOpenSectionIndex(std::string_view name, int index, int* status) {
  OpenSection(SkfNumberedName(name, index), g_setup.defaultInstance, true, status);
}
void SkfOpenSectionQuiet(std::string_view name, int* status) {
  OpenSection(std::string(name), g_setup.defaultInstance, false, status);
}
void SkfOpenSectionInstance(std::string_view name, int instance, int* status) {
  OpenSection(std::string(name), instance, true, status);
}

void SkfCloseSection() {
  if (g_setup.current == nullptr) return;
  SkfBlock* parent = skfGetParent(g_setup.current);
  if (parent != nullptr) g_setup.current = parent;
}

void SkfCloseSection(std::string_view, int) {
  // The tree keeps parent links, so the parent is the instance that was open: no path walk.
  SkfCloseSection();
}

int SkfNoSections() { return g_setup.current != nullptr ? skfGetNoSections(g_setup.current) : 0; }
int SkfNoKeywords() { return g_setup.current != nullptr ? skfGetNoKeywords(g_setup.current) : 0; }
std::string SkfCurrentPath() {
  return g_setup.current != nullptr ? skfGetNameGlb(g_setup.current) : std::string();
}

int SkfReadInt(std::string_view keyword, std::int32_t& dest, std::optional<std::int32_t> def,
               int param, int instance) {
  return ReadScalar(keyword, dest, def, param, instance, true, "an integer", GetInt, FormatInt);
}

int SkfReadIntSilent(std::string_view keyword, std::int32_t& dest, std::optional<std::int32_t> def,
                     int param, int instance) {
  return ReadScalar(keyword, dest, def, param, instance, false, "an integer", GetInt, FormatInt);
}

int SkfReadDouble(std::string_view keyword, double& dest, std::optional<double> def, int param,
                  int instance) {
  return ReadScalar(keyword, dest, def, param, instance, true, "a number", GetDouble, FormatDouble);
}

int SkfReadFloat(std::string_view keyword, float& dest, std::optional<float> def, int param,
                 int instance) {
  return ReadScalar(keyword, dest, def, param, instance, true, "a single-precision number",
                    GetFloat, FormatFloat);
}

int SkfReadBool(std::string_view keyword, bool& dest, std::optional<bool> def, int param,
                int instance) {
  return ReadScalar(keyword, dest, def, param, instance, true, "true or false", GetBool, FormatBool);
}

int SkfReadLogical(std::string_view keyword, std::int32_t& dest, std::optional<bool> def, int param,
                   int instance) {
  bool value = dest != 0;
  const int status = SkfReadBool(keyword, value, def, param, instance);
  dest = value ? -1 : 0;
  return status;
}

int SkfReadString(std::string_view keyword, std::string& dest, std::optional<std::string_view> def,
                  int param, int instance) {
  std::optional<std::string> d;
  if (def) d = std::string(*def);
  return ReadScalar(keyword, dest, d, param, instance, true, "a string", GetString, FormatString);
}

int SkfReadInputFile(std::string_view keyword, std::string& dest,
                     std::optional<std::string_view> def, int param, int instance) {
  std::optional<std::string> d;
  if (def) d = std::string(*def);
  return ReadScalar(keyword, dest, d, param, instance, true, "a file name", GetInputFile,
                    FormatPath);
}

int SkfReadResultFile(std::string_view keyword, std::string& dest,
                      std::optional<std::string_view> def, int param, int instance) {
  std::optional<std::string> d;
  if (def) d = std::string(*def);
  return ReadScalar(keyword, dest, d, param, instance, true, "a file name", GetResultFile,
                    FormatPath);
}

int SkfReadDoubleList(std::string_view keyword, double* dest, int n, const double* def,
                      int instance, int* count) {
  return ReadList(keyword, dest, n, def, instance, count, "a number", GetDouble, FormatDouble);
}

int SkfReadIntList(std::string_view keyword, std::int32_t* dest, int n, const std::int32_t* def,
                   int instance, int* count) {
  return ReadList(keyword, dest, n, def, instance, count, "an integer", GetInt, FormatInt);
}

int SkfReadDoubleArray(std::string_view keyword, std::vector<double>& dest, int instance) {
  const std::string name(keyword);
  const SkfKeyword* k = g_setup.current != nullptr
                            ? skfKeywordByNameNum(g_setup.current, name.c_str(), instance)
                            : nullptr;
  if (k != nullptr) dest.resize(static_cast<std::size_t>(skfGetNoParams(k)));
  return ReadList(keyword, dest.data(), static_cast<int>(dest.size()),
                  static_cast<const double*>(nullptr), instance, nullptr, "a number", GetDouble,
                  FormatDouble);
}

SkfKeyword* SkfFindKeyword(std::string_view keyword, int instance, bool echo) {
  if (Echoing(echo)) {
    EchoStart(keyword);
    EndLine();
  }
  return Lookup(keyword, instance);
}

std::vector<std::string> SkfUnreadEntries() {
  std::vector<std::pair<int, std::string>> entries;
  if (g_setup.file != nullptr) {
    const int nt = skfGetNoTargets(g_setup.file);
    for (int i = 1; i <= nt; ++i) {
      const SkfBlock* t = skfTargetByNum(g_setup.file, i);
      if (skfIsRead(t)) {
        CollectUnread(t, entries);
      } else {
        const int line = skfGetLine(t);
        entries.emplace_back(line, skfGetName(t) + " (line " + std::to_string(line) + ")");
      }
    }
  }
  std::stable_sort(entries.begin(), entries.end(),
                   [](const auto& a, const auto& b) { return a.first < b.first; });
  std::vector<std::string> out;
  out.reserve(entries.size());
  for (auto& e : entries) out.push_back(std::move(e.second));
  return out;
}

void SkfWarnUnread() {
  const std::vector<std::string> entries = SkfUnreadEntries();
  if (entries.empty()) return;
  // Kept under one folded line's width so the text never breaks inside a word.
  Warning(std::to_string(entries.size()) + " setup-file entries were not read (misspelt or unused):");
  for (const std::string& e : entries) PrintLine("         " + e);
}

bool SkfCreateParentFolders(const std::string& path) { return CreateParentFolders(path); }

std::string SkfEchoPath(const std::string& path) {
  const char* nopath = std::getenv("TAVRIN_LOG_NOPATH");
  const std::string p = Trim(path);
  if (nopath == nullptr || nopath[0] == '\0') return p;
  const std::size_t cut = p.find_last_of("/\\");
  return cut == std::string::npos ? p : p.substr(cut + 1);
}
