// vdstool: the command-line utility over the data-file layer (io/DataFile.h).
//
// Every command parses its arguments, does all of its work and only then writes its result:
// standard output gets the whole text at once and a made file appears under its final name by
// one rename, so an error never leaves a partial table or a half-written file behind. Errors
// travel as ToolError up to VdsToolMain, which prints "vdstool: <message>" and returns 1.
#include "io/VdsTool.h"

#include <unistd.h>

#include <cerrno>
#include <charconv>
#include <cmath>
#include <cstdint>
#include <cstdio>
#include <cstring>
#include <exception>
#include <filesystem>
#include <limits>
#include <optional>
#include <sstream>
#include <string>
#include <string_view>
#include <system_error>
#include <utility>
#include <vector>

#include "driver/DateTime.h"
#include "driver/Log.h"
#include "io/DataFile.h"
#include "io/Units.h"

namespace {

struct ToolError {
  std::string message;
};

[[noreturn]] void Fail(std::string message) { throw ToolError{std::move(message)}; }

// Turns a failed layer call into the layer's message plus its detail.
void Check(int status, const DataFile& df, const std::string& context = "") {
  if (status == kVdsOk) return;
  std::string text = context + VdsErrorMessage(status);
  if (!df.errorText.empty()) text += ": " + df.errorText;
  Fail(text);
}

// The layer reports warnings and file summaries on the message unit, which is standard output
// while no log is open; there they would end up inside the CSV a command writes. While the tool
// runs without a log they go to standard error instead.
class LayerMessagesToStderr {
 public:
  LayerMessagesToStderr() : saved_(g_log.unit) {
    if (saved_ <= 0) g_log.unit = STDERR_FILENO;
  }
  ~LayerMessagesToStderr() {
    if (saved_ <= 0) g_log.unit = saved_;
  }
  LayerMessagesToStderr(const LayerMessagesToStderr&) = delete;
  LayerMessagesToStderr& operator=(const LayerMessagesToStderr&) = delete;

 private:
  int saved_;
};

// ---------------------------------------------------------------------------------------------
// Text helpers

// Shortest text that reads back as the same float: a float item value round-trips through the
// CSV and the table stays readable ("0.1", not "0.100000001").
std::string FormatFloat(float value) {
  char buf[64];
  const auto r = std::to_chars(buf, buf + sizeof buf, value);
  return std::string(buf, r.ptr);
}

// Shortest text that reads back as the same double (times, coordinates).
std::string FormatDouble(double value) {
  char buf[64];
  const auto r = std::to_chars(buf, buf + sizeof buf, value);
  return std::string(buf, r.ptr);
}

// A CSV field, quoted when it holds a separator, a quote, a line end or outer blanks.
std::string CsvField(std::string_view text) {
  const bool plain = text.find_first_of(",\"\r\n") == std::string_view::npos &&
                     (text.empty() || (text.front() != ' ' && text.back() != ' '));
  if (plain) return std::string(text);
  std::string q = "\"";
  for (char c : text) {
    if (c == '"') q += '"';
    q += c;
  }
  q += '"';
  return q;
}

std::string Quoted(std::string_view text) { return "\"" + std::string(text) + "\""; }

std::string_view TrimBlanks(std::string_view s) {
  while (!s.empty() && (s.front() == ' ' || s.front() == '\t')) s.remove_prefix(1);
  while (!s.empty() && (s.back() == ' ' || s.back() == '\t')) s.remove_suffix(1);
  return s;
}

// A finite number written in full ("1.5", "-2e3", "+4"); nothing else may follow.
bool ParseNumber(std::string_view s, double& value) {
  s = TrimBlanks(s);
  if (!s.empty() && s.front() == '+') s.remove_prefix(1);
  if (s.empty() || s.front() == '+') return false;
  const auto r = std::from_chars(s.data(), s.data() + s.size(), value);
  return r.ec == std::errc() && r.ptr == s.data() + s.size() && std::isfinite(value);
}

bool ParseInt(std::string_view s, std::int64_t& value) {
  s = TrimBlanks(s);
  if (!s.empty() && s.front() == '+') s.remove_prefix(1);
  if (s.empty() || s.front() == '+') return false;
  const auto r = std::from_chars(s.data(), s.data() + s.size(), value);
  return r.ec == std::errc() && r.ptr == s.data() + s.size();
}

bool IsDigits(std::string_view s) {
  if (s.empty()) return false;
  for (char c : s)
    if (c < '0' || c > '9') return false;
  return true;
}

// "YYYY-MM-DD" or "YYYY-MM-DD hh:mm:ss" (also with 'T' between date and time), by its shape
// alone; ParseDate then checks the fields.
bool HasDateShape(std::string_view s) {
  s = TrimBlanks(s);
  if (s.size() != 10 && s.size() != 19) return false;
  if (!IsDigits(s.substr(0, 4)) || s[4] != '-' || !IsDigits(s.substr(5, 2)) || s[7] != '-' ||
      !IsDigits(s.substr(8, 2)))
    return false;
  if (s.size() == 10) return true;
  return (s[10] == ' ' || s[10] == 'T') && IsDigits(s.substr(11, 2)) && s[13] == ':' &&
         IsDigits(s.substr(14, 2)) && s[16] == ':' && IsDigits(s.substr(17, 2));
}

bool ParseDate(std::string_view s, DateTime& date) {
  s = TrimBlanks(s);
  if (!HasDateShape(s)) return false;
  auto num = [&](std::size_t at, std::size_t n) {
    int v = 0;
    for (std::size_t i = at; i < at + n; ++i) v = v * 10 + (s[i] - '0');
    return v;
  };
  CalendarDate c;
  c.year = num(0, 4);
  c.month = num(5, 2);
  c.day = num(8, 2);
  if (s.size() == 19) {
    c.hour = num(11, 2);
    c.minute = num(14, 2);
    c.second = num(17, 2);
  }
  if (!IsValidCalendarDate(c)) return false;
  date = MakeDateTime(c);
  return true;
}

bool InDateRange(const DateTime& date) {
  const CalendarDate c = ToCalendar(date);
  return c.year >= 1 && c.year <= 9999;
}

// Splits one CSV line into fields: commas separate, double quotes enclose fields that hold
// commas or quotes ("" is a quote inside them), blanks around unquoted fields are dropped.
std::vector<std::string> SplitCsv(std::string_view line, const std::string& where) {
  std::vector<std::string> fields;
  std::size_t i = 0;
  while (true) {
    std::string field;
    while (i < line.size() && (line[i] == ' ' || line[i] == '\t')) ++i;
    if (i < line.size() && line[i] == '"') {
      ++i;
      bool closed = false;
      while (i < line.size()) {
        if (line[i] == '"') {
          if (i + 1 < line.size() && line[i + 1] == '"') {
            field += '"';
            i += 2;
            continue;
          }
          ++i;
          closed = true;
          break;
        }
        field += line[i++];
      }
      if (!closed) Fail(where + ": unterminated quoted field");
      while (i < line.size() && (line[i] == ' ' || line[i] == '\t')) ++i;
      if (i < line.size() && line[i] != ',')
        Fail(where + ": text after a quoted field (a field is either quoted or not)");
    } else {
      const std::size_t end = line.find(',', i);
      const std::size_t stop = end == std::string_view::npos ? line.size() : end;
      field = std::string(TrimBlanks(line.substr(i, stop - i)));
      i = stop;
    }
    fields.push_back(std::move(field));
    if (i >= line.size()) break;
    ++i;  // the comma
  }
  return fields;
}

// Whole file as text, or a clear failure.
std::string ReadTextFile(const std::string& path) {
  std::error_code ec;
  if (std::filesystem::is_directory(path, ec)) Fail("cannot read " + path + ": it is a folder");
  std::FILE* f = std::fopen(path.c_str(), "rb");
  if (f == nullptr) Fail("cannot open " + path + ": " + std::strerror(errno));
  std::string text;
  char buf[65536];
  std::size_t n;
  while ((n = std::fread(buf, 1, sizeof buf, f)) > 0) text.append(buf, n);
  const bool bad = std::ferror(f) != 0;
  const int e = errno;
  std::fclose(f);
  if (bad) Fail("cannot read " + path + ": " + std::strerror(e));
  return text;
}

// ---------------------------------------------------------------------------------------------
// Arguments

struct Args {
  std::vector<std::string> positional;
  std::vector<std::pair<std::string, std::string>> options;  // in command-line order
  bool help = false;

  std::vector<std::string> All(std::string_view name) const {
    std::vector<std::string> v;
    for (const auto& [n, value] : options)
      if (n == name) v.push_back(value);
    return v;
  }
  std::optional<std::string> Last(std::string_view name) const {
    std::optional<std::string> v;
    for (const auto& [n, value] : options)
      if (n == name) v = value;
    return v;
  }
  bool Has(std::string_view name) const {
    for (const auto& [n, value] : options)
      if (n == name) return true;
    return false;
  }
};

// Options are "--name value" or "--name=value" for those in `withValue`, "--name" for flags;
// "--help" / "-h" anywhere asks for the command's help and "--" ends the options.
Args ParseArgs(const std::vector<std::string>& argv, const std::string& command,
               std::initializer_list<std::string_view> withValue,
               std::initializer_list<std::string_view> flags) {
  Args a;
  bool optionsEnded = false;
  for (std::size_t i = 0; i < argv.size(); ++i) {
    const std::string& arg = argv[i];
    if (optionsEnded || arg.size() < 2 || arg[0] != '-') {
      a.positional.push_back(arg);
      continue;
    }
    if (arg == "--") {
      optionsEnded = true;
      continue;
    }
    if (arg == "--help" || arg == "-h") {
      a.help = true;
      continue;
    }
    std::string name = arg;
    std::optional<std::string> value;
    const std::size_t eq = arg.find('=');
    if (arg.rfind("--", 0) == 0 && eq != std::string::npos) {
      name = arg.substr(0, eq);
      value = arg.substr(eq + 1);
    }
    bool known = false;
    for (std::string_view w : withValue) {
      if (name != w) continue;
      known = true;
      if (!value) {
        if (i + 1 >= argv.size()) Fail(command + ": option " + name + " needs a value");
        value = argv[++i];
      }
      a.options.emplace_back(name, *value);
    }
    for (std::string_view f : flags) {
      if (name != f) continue;
      known = true;
      if (value) Fail(command + ": option " + name + " takes no value");
      a.options.emplace_back(name, "");
    }
    if (!known) Fail(command + ": unknown option " + arg + " (see vdstool " + command + " --help)");
  }
  return a;
}

void NeedPositional(const Args& a, std::size_t n, const std::string& command,
                    const std::string& what) {
  if (a.positional.size() != n)
    Fail(command + ": expected " + what + " (see vdstool " + command + " --help)");
}

// ---------------------------------------------------------------------------------------------
// Reading data files

// A data file open for reading; closed when the object goes.
class OpenFile {
 public:
  explicit OpenFile(const std::string& path) {
    std::error_code ec;
    if (!std::filesystem::exists(path, ec)) Fail("cannot open " + path + ": no such file");
    if (std::filesystem::is_directory(path, ec)) Fail("cannot open " + path + ": it is a folder");
    if (VdsKindFromName(path) == VdsKind::kUnknown)
      Fail(path + ": not a data file name (the extension must be .vds0, .vds1, .vds2, .vds3 "
                  "or .vdsu)");
    int status = kVdsOk;
    VdsOpenRead(df, path, {}, &status);
    Check(status, df, path + ": ");
  }
  ~OpenFile() {
    int status = kVdsOk;
    VdsClose(df, &status);
  }
  OpenFile(const OpenFile&) = delete;
  OpenFile& operator=(const OpenFile&) = delete;

  DataFile df;
};

bool IsCalendarAxis(const VdsTimeAxis& t) {
  return t.kind == kVdsEqCalendar || t.kind == kVdsNeqCalendar;
}

const char* TimeAxisName(int kind) {
  switch (kind) {
    case kVdsEqTime: return "equidistant time";
    case kVdsEqCalendar: return "equidistant calendar";
    case kVdsNeqCalendar: return "non-equidistant calendar";
    default: return "unknown";
  }
}

const char* ValueTypeName(int valueType) {
  switch (valueType) {
    case kVdsInstantaneous: return "instantaneous";
    case kVdsAccumulated: return "accumulated";
    case kVdsStepAccumulated: return "step accumulated";
    case kVdsMeanStepBackward: return "mean step backward";
    case kVdsMeanStepForward: return "mean step forward";
    default: return "unknown value type";
  }
}

const char* StaticTypeName(VdsStaticType t) {
  switch (t) {
    case VdsStaticType::kInt32: return "int32";
    case VdsStaticType::kFloat: return "float";
    case VdsStaticType::kDouble: return "double";
  }
  return "unknown";
}

std::string ItemTypeText(std::int32_t code) {
  const ItemTypeInfo* t = FindItemType(code);
  return std::to_string(code) + " (" + (t ? t->name : "unknown item type") + ")";
}

std::string UnitText(std::int32_t code) {
  const UnitInfo* u = FindUnit(code);
  return std::to_string(code) + " (" + (u ? u->abbreviation : "unknown unit") + ")";
}

// Start of a calendar time axis.
DateTime AxisStart(const DataFile& df) {
  DateTime start;
  if (!ParseDate(df.time.start, start))
    Fail(df.fileName + ": the time axis start " + Quoted(df.time.start) + " is not a date");
  return start;
}

// Date of a step's time on a calendar axis; "" on an axis without calendar.
std::string StepDate(const DataFile& df, const DateTime& start, double time) {
  if (!IsCalendarAxis(df.time)) return "";
  return FormatDateTime(AddSeconds(start, time));
}

// Range of the values of a series, leaving out delete values, NaN and infinities.
struct Range {
  double minimum = 0.0, maximum = 0.0;
  std::int64_t counted = 0;
  void Add(double v) {
    if (!std::isfinite(v)) return;
    if (counted == 0 || v < minimum) minimum = v;
    if (counted == 0 || v > maximum) maximum = v;
    ++counted;
  }
};

std::string SpatialAxisText(const VdsSpatialAxis& a) {
  std::ostringstream s;
  s << "dimension " << a.dimension;
  if (a.dimension <= 0) return s.str();
  s << ", points ";
  for (int d = 0; d < a.dimension && d < 3; ++d) s << (d ? " x " : "") << a.n[d];
  s << ", origin ";
  for (int d = 0; d < a.dimension && d < 3; ++d) s << (d ? ", " : "") << FormatDouble(a.origin[d]);
  s << ", step ";
  for (int d = 0; d < a.dimension && d < 3; ++d) s << (d ? ", " : "") << FormatDouble(a.step[d]);
  s << ", unit " << UnitText(a.unit);
  return s.str();
}

bool SameAxis(const VdsSpatialAxis& a, const VdsSpatialAxis& b) {
  if (a.dimension != b.dimension || a.unit != b.unit) return false;
  for (int d = 0; d < 3; ++d)
    if (a.n[d] != b.n[d] || a.origin[d] != b.origin[d] || a.step[d] != b.step[d]) return false;
  return true;
}

// ---------------------------------------------------------------------------------------------
// info

int CmdInfo(const Args& a, std::ostream& out) {
  NeedPositional(a, 1, "info", "one data file");
  const std::string& path = a.positional[0];
  OpenFile f(path);
  DataFile& df = f.df;
  std::ostringstream o;

  o << "file: " << path << "\n";
  o << "kind: " << VdsKindName(df.kind) << "\n";
  o << "title: " << df.title << "\n";
  o << "creator: " << df.creator << "\n";
  o << "data type: " << df.dataType << "\n";
  o << "file kind: " << df.fileKind
    << (df.fileKind == kVdsFileKindData     ? " (data)"
        : df.fileKind == kVdsFileKindStatic ? " (static)"
                                            : "")
    << "\n";
  o << "delete value: " << FormatFloat(df.deleteValue) << "\n";
  o << "projection: " << df.projection << "\n";
  o << "origin: " << FormatDouble(df.origin[0]) << ", " << FormatDouble(df.origin[1])
    << "; orientation: " << FormatDouble(df.orientation) << "\n";

  const VdsTimeAxis& t = df.time;
  o << "time axis: " << TimeAxisName(t.kind) << " (kind " << t.kind << ")\n";
  const bool calendar = IsCalendarAxis(t);
  DateTime start;
  if (calendar) {
    start = AxisStart(df);
    o << "  start: " << t.start << "\n";
  } else {
    o << "  start offset: " << FormatDouble(t.startOffset) << " s\n";
  }
  if (t.kind != kVdsNeqCalendar) o << "  step: " << FormatDouble(t.step) << " s\n";
  o << "  steps: " << t.count << "\n";
  if (t.count > 0) {
    auto stepLine = [&](const char* label, std::int64_t k) {
      const double time = VdsStepTime(df, k);
      o << "  " << label << ": t = " << FormatDouble(time) << " s";
      if (calendar) o << ", " << StepDate(df, start, time);
      o << "\n";
    };
    stepLine("first step", 0);
    stepLine("last step", t.count - 1);
  }

  if (df.kind == VdsKind::kVds1 || df.kind == VdsKind::kVds2 || df.kind == VdsKind::kVds3) {
    if (!df.items.empty()) o << "spatial axis: " << SpatialAxisText(df.items[0].axis) << "\n";
  }
  if (df.kind == VdsKind::kVdsu && df.customInt.size() >= 2) {
    o << "mesh: " << df.customInt[0] << " nodes, " << df.customInt[1] << " elements\n";
  }

  if (!df.customInt.empty() || !df.customFloat.empty()) {
    o << "custom block " << (df.customBlockName.empty() ? "(unnamed)" : df.customBlockName)
      << (df.customInt.empty() ? " (float):" : " (int32):");
    if (!df.customInt.empty())
      for (std::int32_t v : df.customInt) o << " " << v;
    else
      for (float v : df.customFloat) o << " " << FormatFloat(v);
    o << "\n";
  }

  // Static items first: the layer reads no static item once a dynamic one has been read.
  const double del = static_cast<double>(df.deleteValue);
  o << "static items: " << df.statics.size() << "\n";
  for (std::size_t i = 0; i < df.statics.size(); ++i) {
    const VdsStaticItem& s = df.statics[i];
    std::vector<double> values;
    int status = kVdsOk;
    VdsReadStaticDouble(df, static_cast<int>(i + 1), values, &status);
    Check(status, df);
    Range r;
    for (double v : values)
      if (v != del && v != df.deleteValueDouble) r.Add(v);
    auto num = [&](double v) {
      return s.type == VdsStaticType::kDouble ? FormatDouble(v)
                                              : FormatFloat(static_cast<float>(v));
    };
    o << "  " << (i + 1) << " " << Quoted(s.name) << ": " << StaticTypeName(s.type) << ", "
      << values.size() << (values.size() == 1 ? " element" : " elements");
    if (r.counted > 0)
      o << ", min " << num(r.minimum) << ", max " << num(r.maximum);
    else
      o << ", no values";
    o << "\n";
  }

  o << "dynamic items: " << df.itemCount << "\n";
  std::vector<Range> ranges(static_cast<std::size_t>(df.itemCount));
  std::vector<float> buf;
  for (std::int64_t k = 0; k < t.count; ++k) {
    for (int i = 1; i <= df.itemCount; ++i) {
      const VdsItem& item = df.items[static_cast<std::size_t>(i - 1)];
      buf.assign(static_cast<std::size_t>(item.elements), 0.0f);
      int status = kVdsOk;
      VdsReadDynamic(df, i, k, buf.data(), item.elements, 0, &status);
      Check(status, df);
      for (float v : buf)
        if (v != df.deleteValue) ranges[static_cast<std::size_t>(i - 1)].Add(v);
    }
  }
  for (int i = 1; i <= df.itemCount; ++i) {
    const VdsItem& item = df.items[static_cast<std::size_t>(i - 1)];
    const Range& r = ranges[static_cast<std::size_t>(i - 1)];
    o << "  " << i << " " << Quoted(item.name) << ": item type " << ItemTypeText(item.itemType)
      << ", unit " << UnitText(item.unit) << ", " << item.elements
      << (item.elements == 1 ? " element, " : " elements, ") << ValueTypeName(item.valueType);
    if (r.counted > 0)
      o << ", min " << FormatFloat(static_cast<float>(r.minimum)) << ", max "
        << FormatFloat(static_cast<float>(r.maximum));
    else
      o << ", no values";
    if ((df.kind == VdsKind::kVds1 || df.kind == VdsKind::kVds2 || df.kind == VdsKind::kVds3) &&
        i > 1 && !SameAxis(item.axis, df.items[0].axis))
      o << ", spatial axis " << SpatialAxisText(item.axis);
    o << "\n";
  }
  out << o.str();
  return 0;
}

// ---------------------------------------------------------------------------------------------
// dump

// Item numbers from --item NAME|NUMBER (all items when none is given). A selector made of
// digits only is an item number; anything else must be exactly one item's name.
std::vector<int> SelectItems(const DataFile& df, const std::vector<std::string>& selectors) {
  std::vector<int> chosen;
  if (selectors.empty()) {
    for (int i = 1; i <= df.itemCount; ++i) chosen.push_back(i);
    return chosen;
  }
  for (const std::string& sel : selectors) {
    if (IsDigits(sel)) {
      std::int64_t n = 0;
      if (!ParseInt(sel, n) || n < 1 || n > df.itemCount)
        Fail(df.fileName + ": no item number " + sel + " (the file has " +
             std::to_string(df.itemCount) + (df.itemCount == 1 ? " item)" : " items)"));
      chosen.push_back(static_cast<int>(n));
      continue;
    }
    int found = 0, count = 0;
    for (int i = 1; i <= df.itemCount; ++i)
      if (df.items[static_cast<std::size_t>(i - 1)].name == sel) {
        if (count++ == 0) found = i;
      }
    if (count == 0) Fail(df.fileName + ": no item named " + Quoted(sel));
    if (count > 1)
      Fail(df.fileName + ": " + std::to_string(count) + " items are named " + Quoted(sel) +
           "; select one by its number");
    chosen.push_back(found);
  }
  return chosen;
}

// --step K: 0-based, negative counts from the end (-1 is the last step).
std::int64_t ResolveStep(const DataFile& df, const std::string& text) {
  std::int64_t k = 0;
  if (!ParseInt(text, k)) Fail("dump: --step needs an integer, not " + Quoted(text));
  const std::int64_t n = df.time.count;
  if (n == 0) Fail(df.fileName + ": the file has no time steps");
  const std::int64_t resolved = k < 0 ? n + k : k;
  if (resolved < 0 || resolved >= n)
    Fail(df.fileName + ": step " + text + " is outside the file's " + std::to_string(n) +
         (n == 1 ? " step" : " steps") + " (0 .. " + std::to_string(n - 1) + ", or -1 .. -" +
         std::to_string(n) + " from the end)");
  return resolved;
}

void AppendValue(std::string& row, float v, float deleteValue) {
  row += ',';
  if (v != deleteValue) row += FormatFloat(v);
}

std::string DumpSeries(DataFile& df, const std::vector<int>& items,
                       const std::optional<std::string>& stepText) {
  if (df.itemCount == 0)
    Fail(df.fileName + ": the file has no dynamic items to dump (see vdstool info)");
  std::string text = "time_s,date";
  for (int i : items) {
    const VdsItem& item = df.items[static_cast<std::size_t>(i - 1)];
    if (item.elements == 1) {
      text += "," + CsvField(item.name);
    } else {
      for (std::int64_t e = 0; e < item.elements; ++e)
        text += "," + CsvField(item.name + "[" + std::to_string(e) + "]");
    }
  }
  text += '\n';

  std::int64_t first = 0, last = df.time.count - 1;
  if (stepText) first = last = ResolveStep(df, *stepText);
  DateTime start;
  if (IsCalendarAxis(df.time)) start = AxisStart(df);
  std::vector<float> buf;
  for (std::int64_t k = first; k <= last; ++k) {
    const double time = VdsStepTime(df, k);
    std::string row = FormatDouble(time) + "," + StepDate(df, start, time);
    for (int i : items) {
      const VdsItem& item = df.items[static_cast<std::size_t>(i - 1)];
      buf.assign(static_cast<std::size_t>(item.elements), 0.0f);
      int status = kVdsOk;
      VdsReadDynamic(df, i, k, buf.data(), item.elements, 0, &status);
      Check(status, df);
      for (float v : buf) AppendValue(row, v, df.deleteValue);
    }
    text += row;
    text += '\n';
  }
  return text;
}

// Flexible-mesh data: one row per element with its centroid, values of one step.
std::string DumpMesh(DataFile& df, std::vector<int> items, bool explicitItems,
                     const std::optional<std::string>& stepText, std::ostream& err) {
  if (VdsStaticCount(df) < 9)
    Fail(df.fileName + ": the file has " + std::to_string(VdsStaticCount(df)) +
         " static items, not the 9 of a mesh");
  std::vector<double> x, y;
  std::vector<std::int32_t> perElement, nodes;
  int status = kVdsOk;
  VdsReadStaticDouble(df, 2, x, &status);
  Check(status, df);
  VdsReadStaticDouble(df, 3, y, &status);
  Check(status, df);
  VdsReadStaticInt(df, 8, perElement, &status);
  Check(status, df);
  VdsReadStaticInt(df, 9, nodes, &status);
  Check(status, df);
  if (x.size() != y.size())
    Fail(df.fileName + ": the mesh has " + std::to_string(x.size()) + " node x values but " +
         std::to_string(y.size()) + " node y values");

  const std::int64_t nodeCount = static_cast<std::int64_t>(x.size());
  const std::int64_t elementCount = static_cast<std::int64_t>(perElement.size());
  std::vector<double> cx(perElement.size()), cy(perElement.size());
  std::size_t at = 0;
  for (std::int64_t e = 0; e < elementCount; ++e) {
    const std::int32_t k = perElement[static_cast<std::size_t>(e)];
    if (k < 1)
      Fail(df.fileName + ": element " + std::to_string(e + 1) + " has " + std::to_string(k) +
           " nodes");
    if (at + static_cast<std::size_t>(k) > nodes.size())
      Fail(df.fileName + ": the element node lists end before element " + std::to_string(e + 1));
    double sx = 0.0, sy = 0.0;
    for (std::int32_t j = 0; j < k; ++j) {
      const std::int32_t node = nodes[at++];
      if (node < 1 || node > nodeCount)
        Fail(df.fileName + ": element " + std::to_string(e + 1) + " refers to node " +
             std::to_string(node) + ", but the mesh has " + std::to_string(nodeCount) + " nodes");
      sx += x[static_cast<std::size_t>(node - 1)];
      sy += y[static_cast<std::size_t>(node - 1)];
    }
    cx[static_cast<std::size_t>(e)] = sx / k;
    cy[static_cast<std::size_t>(e)] = sy / k;
  }

  // Only items with one value per element fit the table; node items and the like are left out.
  std::vector<int> kept;
  for (int i : items) {
    const VdsItem& item = df.items[static_cast<std::size_t>(i - 1)];
    if (item.elements == elementCount) {
      kept.push_back(i);
      continue;
    }
    const std::string why = "item " + std::to_string(i) + " " + Quoted(item.name) + " has " +
                            std::to_string(item.elements) + " values per step, not one per " +
                            "element (" + std::to_string(elementCount) + ")";
    if (explicitItems) Fail(df.fileName + ": " + why);
    err << "vdstool: warning: " << why << "; left out\n";
  }
  items = kept;

  std::int64_t step = -1;
  if (!items.empty() || stepText) step = ResolveStep(df, stepText.value_or("-1"));

  std::vector<std::vector<float>> values;
  for (int i : items) {
    std::vector<float> v(static_cast<std::size_t>(elementCount));
    VdsReadDynamic(df, i, step, v.data(), elementCount, 0, &status);
    Check(status, df);
    values.push_back(std::move(v));
  }

  std::string text = "element,x,y";
  for (int i : items) text += "," + CsvField(df.items[static_cast<std::size_t>(i - 1)].name);
  text += '\n';
  for (std::int64_t e = 0; e < elementCount; ++e) {
    const std::size_t ue = static_cast<std::size_t>(e);
    std::string row =
        std::to_string(e + 1) + "," + FormatDouble(cx[ue]) + "," + FormatDouble(cy[ue]);
    for (const std::vector<float>& v : values) AppendValue(row, v[ue], df.deleteValue);
    text += row;
    text += '\n';
  }
  return text;
}

int CmdDump(const Args& a, const std::string& command, std::ostream& out, std::ostream& err) {
  NeedPositional(a, 1, command, "one data file");
  OpenFile f(a.positional[0]);
  const std::vector<std::string> selectors = a.All("--item");
  const std::vector<int> items = SelectItems(f.df, selectors);
  const std::optional<std::string> step = a.Last("--step");
  const std::string text = f.df.kind == VdsKind::kVdsu
                               ? DumpMesh(f.df, items, !selectors.empty(), step, err)
                               : DumpSeries(f.df, items, step);
  out << text;
  return 0;
}

// ---------------------------------------------------------------------------------------------
// from-csv

struct ItemDefinition {
  std::string name;
  std::int32_t itemType = kItemUndefined;
  std::int32_t unit = kUnitUndefined;
};

// "NAME:TYPECODE[:UNITCODE]"; the name may itself hold colons, the codes are the last fields.
ItemDefinition ParseItemArgument(const std::string& text) {
  const std::string where = "from-csv: --item " + Quoted(text);
  std::vector<std::string> parts;
  std::size_t start = 0;
  for (std::size_t c = text.find(':'); c != std::string::npos; c = text.find(':', start)) {
    parts.push_back(text.substr(start, c - start));
    start = c + 1;
  }
  parts.push_back(text.substr(start));
  if (parts.size() < 2) Fail(where + ": expected NAME:TYPECODE:UNITCODE");

  // With three or more parts, the last two are codes when both are integers.
  std::int64_t type = 0, unit = 0;
  std::size_t nameParts = parts.size() - 1;
  bool haveUnit = false;
  if (parts.size() >= 3 && ParseInt(parts[parts.size() - 2], type) &&
      ParseInt(parts.back(), unit)) {
    nameParts = parts.size() - 2;
    haveUnit = true;
  } else if (parts.size() >= 3 && ParseInt(parts[parts.size() - 2], type)) {
    Fail(where + ": the unit code " + Quoted(parts.back()) + " is not an integer");
  } else if (!ParseInt(parts.back(), type)) {
    Fail(where + ": the item type code " + Quoted(parts.back()) + " is not an integer");
  }
  ItemDefinition s;
  for (std::size_t i = 0; i < nameParts; ++i) s.name += (i ? ":" : "") + parts[i];
  if (std::string(TrimBlanks(s.name)).empty()) Fail(where + ": the item name is empty");
  if (s.name.size() > 80) Fail(where + ": the item name is longer than 80 characters");

  const ItemTypeInfo* info =
      type >= INT32_MIN && type <= INT32_MAX ? FindItemType(static_cast<std::int32_t>(type))
                                             : nullptr;
  if (info == nullptr)
    Fail(where + ": unknown item type code " + std::to_string(type) +
         " (vdstool units lists them)");
  s.itemType = info->code;
  if (!haveUnit) {
    s.unit = info->defaultUnit;
    return s;
  }
  const UnitInfo* u =
      unit >= INT32_MIN && unit <= INT32_MAX ? FindUnit(static_cast<std::int32_t>(unit)) : nullptr;
  if (u == nullptr)
    Fail(where + ": unknown unit code " + std::to_string(unit) +
         " (vdstool units --units lists them)");
  if (!ItemTypeAcceptsUnit(info->code, u->code)) {
    const UnitKindInfo* want = FindUnitKind(info->unitKind);
    const UnitKindInfo* have = FindUnitKind(u->kind);
    Fail(where + ": unit " + std::to_string(u->code) + " (" + u->abbreviation + ") is a " +
         (have ? have->name : "unknown") + " unit, but item type " + std::to_string(info->code) +
         " (" + info->name + ") needs a " + (want ? want->name : "unknown") + " unit");
  }
  s.unit = u->code;
  return s;
}

struct Table {
  std::vector<double> times;               // seconds since the first row
  std::vector<std::vector<float>> values;  // [row][item]
  DateTime firstDate;                      // date of the first row
  bool firstWholeSecond = true;            // the first row falls on a whole second
};

// Reads the CSV table: column 1 the time (seconds since `start`, or dates), then one column per
// item. Comment (#) and blank lines are skipped; the first other line is a header when its
// first field is neither a number nor a date.
Table ReadTable(const std::string& path, const std::vector<ItemDefinition>& items,
                const std::optional<DateTime>& start) {
  std::string text = ReadTextFile(path);
  if (text.rfind("\xEF\xBB\xBF", 0) == 0) text.erase(0, 3);  // byte-order mark
  if (text.find('\0') != std::string::npos) Fail(path + ": not a text file (it holds NUL bytes)");

  const std::size_t columns = items.size() + 1;
  Table t;
  std::vector<double> raw;  // times as read: seconds, or seconds since the first date
  enum class TimeForm { kUnknown, kSeconds, kDates } form = TimeForm::kUnknown;
  DateTime firstDate;
  bool sawContent = false;
  std::size_t lineNo = 0, pos = 0;
  while (pos < text.size()) {
    std::size_t end = text.find('\n', pos);
    if (end == std::string::npos) end = text.size();
    std::string_view line(text.data() + pos, end - pos);
    pos = end + 1;
    ++lineNo;
    if (!line.empty() && line.back() == '\r') line.remove_suffix(1);
    const std::string_view trimmed = TrimBlanks(line);
    if (trimmed.empty() || trimmed.front() == '#') continue;

    const std::string where = path + " line " + std::to_string(lineNo);
    const std::vector<std::string> fields = SplitCsv(line, where);
    const bool firstContent = !sawContent;
    sawContent = true;
    double number = 0.0;
    if (firstContent && !ParseNumber(fields[0], number) && !HasDateShape(fields[0])) {
      if (fields.size() != columns)
        Fail(where + ": the header has " + std::to_string(fields.size()) + " columns, but " +
             std::to_string(columns) + " are expected (the time and " +
             std::to_string(items.size()) + " --item)");
      continue;
    }
    if (fields.size() != columns)
      Fail(where + ": " + std::to_string(fields.size()) + " fields, but " +
           std::to_string(columns) + " are expected (the time and " +
           std::to_string(items.size()) + " --item)");

    if (form == TimeForm::kUnknown) form = HasDateShape(fields[0]) ? TimeForm::kDates
                                                                   : TimeForm::kSeconds;
    double time = 0.0;
    if (form == TimeForm::kDates) {
      DateTime d;
      if (!HasDateShape(fields[0]))
        Fail(where + ": the time " + Quoted(fields[0]) +
             " is not a date \"YYYY-MM-DD hh:mm:ss\" like the first row's");
      if (!ParseDate(fields[0], d)) Fail(where + ": invalid date " + Quoted(fields[0]));
      if (raw.empty()) firstDate = d;
      time = DiffSeconds(d, firstDate);
    } else {
      if (!ParseNumber(fields[0], time))
        Fail(where + ": the time " + Quoted(fields[0]) +
             " is not a number of seconds like the first row's");
    }
    if (!raw.empty() && !(time > raw.back()))
      Fail(where + ": the time " + Quoted(fields[0]) +
           " does not come after the previous row's; times must strictly increase");
    raw.push_back(time);

    std::vector<float> row(items.size());
    for (std::size_t i = 0; i < items.size(); ++i) {
      const std::string& f = fields[i + 1];
      if (f.empty()) {
        row[i] = kVdsDeleteValue;
        continue;
      }
      double v = 0.0;
      if (!ParseNumber(f, v))
        Fail(where + ", column " + std::to_string(i + 2) + " (" + items[i].name + "): " +
             Quoted(f) + " is not a number");
      // Beyond this a value no longer rounds to the largest float.
      const double floatLimit = std::ldexp(1.0, 128) - std::ldexp(1.0, 103);
      if (std::fabs(v) >= floatLimit)
        Fail(where + ", column " + std::to_string(i + 2) + " (" + items[i].name + "): " +
             Quoted(f) + " is outside the range of the file's 32-bit values");
      row[i] = static_cast<float>(v);
    }
    t.values.push_back(std::move(row));
  }
  if (raw.empty()) Fail(path + ": no data rows");

  if (form == TimeForm::kSeconds) {
    if (!start) Fail("from-csv: --start is needed when the first column holds seconds");
    // The file starts on the whole second at or before the first row, so its start date is
    // exact; the first row's time keeps any fraction.
    const double whole = std::floor(raw.front());
    t.firstDate = AddSeconds(*start, whole);
    for (double r : raw) t.times.push_back(r - whole);
    t.firstWholeSecond = t.times.front() == 0.0;
  } else {
    t.firstDate = firstDate;
    t.times = raw;
  }
  if (!InDateRange(t.firstDate) || !InDateRange(AddSeconds(t.firstDate, t.times.back())))
    Fail(path + ": the times reach outside the years 1 .. 9999");
  return t;
}

// The common step when the times are equidistant (within rounding of the text), else 0.
double EquidistantStep(const std::vector<double>& times) {
  if (times.size() < 2) return 0.0;
  const double step = (times.back() - times.front()) / static_cast<double>(times.size() - 1);
  const double tolerance = 1e-9 * std::max(std::fabs(times.back()), step) + 1e-9;
  for (std::size_t i = 0; i < times.size(); ++i) {
    const double expected = times.front() + step * static_cast<double>(i);
    if (std::fabs(times[i] - expected) > tolerance) return 0.0;
  }
  return step;
}

std::string TempNameFor(const std::string& out) {
  const std::filesystem::path p(out);
  const std::filesystem::path dir = p.has_parent_path() ? p.parent_path() : ".";
  const std::string leaf = p.filename().string();
  // The layer picks the file kind from the extension, so the temporary name keeps it.
  return (dir / ("." + leaf + ".tmp" + std::to_string(::getpid()) + ".vds0")).string();
}

int CmdFromCsv(const Args& a, std::ostream& out) {
  NeedPositional(a, 2, "from-csv", "an input CSV file and an output .vds0 file");
  const std::string& in = a.positional[0];
  const std::string& outName = a.positional[1];
  if (VdsKindFromName(outName) != VdsKind::kVds0)
    Fail("from-csv: the output " + outName + " must have the extension .vds0");
  {
    std::error_code ec;
    const std::filesystem::path parent = std::filesystem::path(outName).parent_path();
    if (!parent.empty() && !std::filesystem::is_directory(parent, ec))
      Fail("from-csv: cannot write " + outName + ": the folder " + parent.string() +
           " does not exist");
    if (std::filesystem::is_directory(outName, ec))
      Fail("from-csv: cannot write " + outName + ": it is a folder");
  }

  std::optional<DateTime> start;
  if (const auto s = a.Last("--start")) {
    DateTime d;
    if (!ParseDate(*s, d))
      Fail("from-csv: --start " + Quoted(*s) +
           " is not a valid date \"YYYY-MM-DD hh:mm:ss\" (or \"YYYY-MM-DD\")");
    start = d;
  }
  std::vector<ItemDefinition> items;
  for (const std::string& s : a.All("--item")) items.push_back(ParseItemArgument(s));
  if (items.empty()) Fail("from-csv: give at least one --item NAME:TYPECODE:UNITCODE");
  const std::string title = a.Last("--title").value_or(std::filesystem::path(in).stem().string());

  const Table t = ReadTable(in, items, start);
  double step = EquidistantStep(t.times);
  bool equidistant = step > 0.0 && t.firstWholeSecond;
  if (t.times.size() == 1 && t.firstWholeSecond) {
    equidistant = true;  // one step: any step length describes it
    step = 1.0;
  }
  const std::string startText = FormatDateTime(t.firstDate);

  const std::string tmp = TempNameFor(outName);
  const std::string context = "cannot write " + outName + ": ";
  DataFile df;
  try {
    int st = kVdsOk;
    VdsInitHeader(df, kVdsFileKindData, title, "vdstool", static_cast<int>(items.size()), &st);
    Check(st, df, context);
    if (equidistant)
      VdsSetTimeAxis(df, startText, step, "second", &st);
    else
      VdsSetNeqCalendarAxis(df, startText, &st);
    Check(st, df, context);
    for (std::size_t i = 0; i < items.size(); ++i) {
      const int number = static_cast<int>(i + 1);
      VdsDefineItem(df, number, items[i].itemType, items[i].name, 1, kVdsInstantaneous, &st);
      Check(st, df, context);
      VdsSetItemUnit(df, number, items[i].unit, &st);
      Check(st, df, context);
    }
    df.printSummary = false;  // the tool reports on standard output itself
    VdsCreateFile(df, tmp, &st);
    Check(st, df, context);
    for (std::size_t r = 0; r < t.times.size(); ++r) {
      const double time = equidistant ? step * static_cast<double>(r) : t.times[r];
      for (std::size_t i = 0; i < items.size(); ++i) {
        VdsWriteDynamic(df, static_cast<int>(i + 1), &t.values[r][i], 1, time,
                        static_cast<std::int32_t>(r), &st);
        Check(st, df, context);
      }
      VdsEndTimeStep(df, &st);
      Check(st, df, context);
    }
    VdsClose(df, &st);
    Check(st, df, context);
    if (std::rename(tmp.c_str(), outName.c_str()) != 0)
      Fail("cannot rename " + tmp + " to " + outName + ": " + std::strerror(errno));
  } catch (...) {
    int ignored = kVdsOk;
    VdsClose(df, &ignored);
    std::remove(tmp.c_str());
    throw;
  }
  out << "wrote " << outName << ": " << items.size() << (items.size() == 1 ? " item, " : " items, ")
      << t.times.size() << (t.times.size() == 1 ? " time step" : " time steps") << ", "
      << (equidistant ? "equidistant calendar axis, step " + FormatDouble(step) + " s"
                      : std::string("non-equidistant calendar axis"))
      << ", start " << startText << "\n";
  return 0;
}

// ---------------------------------------------------------------------------------------------
// units

int CmdUnits(const Args& a, std::ostream& out) {
  NeedPositional(a, 0, "units", "no file");
  const bool units = a.Has("--units"), kinds = a.Has("--kinds");
  if (units && kinds) Fail("units: give --units or --kinds, not both");
  std::string text;
  if (units) {
    text = "unit,name,abbreviation,kind,factor,offset,udunits\n";
    for (const UnitInfo& u : AllUnits())
      text += std::to_string(u.code) + "," + CsvField(u.name) + "," + CsvField(u.abbreviation) +
              "," + std::to_string(u.kind) + "," + FormatDouble(u.factor) + "," +
              FormatDouble(u.offset) + "," + CsvField(u.udunits ? u.udunits : "") + "\n";
  } else if (kinds) {
    text = "kind,name,base_unit\n";
    for (const UnitKindInfo& k : AllUnitKinds())
      text += std::to_string(k.kind) + "," + CsvField(k.name) + "," + std::to_string(k.baseUnit) +
              "\n";
  } else {
    text = "item_type,name,unit_kind,default_unit,default_unit_name\n";
    for (const ItemTypeInfo& t : AllItemTypes()) {
      const UnitInfo* u = FindUnit(t.defaultUnit);
      text += std::to_string(t.code) + "," + CsvField(t.name) + "," + std::to_string(t.unitKind) +
              "," + std::to_string(t.defaultUnit) + "," + CsvField(u ? u->name : "") + "\n";
    }
  }
  out << text;
  return 0;
}

// ---------------------------------------------------------------------------------------------
// Commands and help

const char* const kUsage =
    "usage: vdstool COMMAND [ARGUMENTS]\n"
    "\n"
    "Inspect, dump and make data files (.vds0, .vds1, .vds2, .vds3, .vdsu).\n"
    "\n"
    "commands:\n"
    "  info      header, axes and items of a data file, with their value ranges\n"
    "  dump      items of a data file as CSV on standard output\n"
    "  to-csv    the same as dump\n"
    "  from-csv  make a point series (.vds0) from a CSV table\n"
    "  units     the item-type and unit tables as CSV\n"
    "  help      this text; vdstool help COMMAND describes one command\n"
    "\n"
    "vdstool COMMAND --help describes a command too. Exit code 0 on success, 1 on any error.\n";

const char* const kInfoHelp =
    "usage: vdstool info FILE\n"
    "\n"
    "Prints the header of a data file: kind, title, creator, data type, file kind, delete\n"
    "value, projection, the time axis (kind, start, step, number of steps, first and last\n"
    "step), the spatial axis (.vds1/2/3) or mesh size (.vdsu), the custom block values, the\n"
    "static items (number, name, type, elements, minimum, maximum) and the dynamic items\n"
    "(number, name, item type, unit, elements, value type, minimum, maximum). Minimum and\n"
    "maximum are computed by reading every value of every step; delete values, NaN and\n"
    "infinities are left out (\"no values\" when nothing remains).\n";

const char* const kDumpHelp =
    "usage: vdstool dump FILE [--item NAME|NUMBER]... [--step K]\n"
    "       (to-csv is the same command)\n"
    "\n"
    "Writes items of a data file as CSV on standard output.\n"
    "\n"
    "  --item NAME|NUMBER  an item to write; repeat for more, in the order wanted; all\n"
    "                      items when none is given. Digits only: the item number (1-based);\n"
    "                      anything else: the exact item name.\n"
    "  --step K            one time step, 0-based; negative counts from the end (-1: last).\n"
    "\n"
    ".vds0/.vds1/.vds2/.vds3: header time_s,date,<item>...; one row per time step (all steps\n"
    "unless --step). time_s is the step's time in seconds since the file's start, date is\n"
    "\"YYYY-MM-DD hh:mm:ss\" (empty on a time axis without calendar). An item with several\n"
    "values per step gets one column per value, <item>[i] with i 0-based and x varying\n"
    "fastest: i = ix + nx * (iy + ny * iz).\n"
    ".vdsu: header element,x,y,<item>...; one row per element (1-based number) with the\n"
    "centroid of its nodes and the values of one step (the last unless --step). Items that do\n"
    "not hold one value per element are left out with a warning.\n"
    "\n"
    "Delete values are empty fields. Values are written with the shortest text that reads\n"
    "back as the same float, times and coordinates as the same double.\n";

const char* const kFromCsvHelp =
    "usage: vdstool from-csv IN.csv OUT.vds0 --item NAME:TYPECODE[:UNITCODE]...\n"
    "                        [--start \"YYYY-MM-DD hh:mm:ss\"] [--title TEXT]\n"
    "\n"
    "Makes a point series from a CSV table. Column 1 is the time, then one column per --item,\n"
    "in the order given.\n"
    "\n"
    "  --item NAME:TYPECODE[:UNITCODE]  an item: its name, item type code and unit code (the\n"
    "                      item type's default unit when left out). The unit must be of the\n"
    "                      item type's unit kind; vdstool units lists the codes.\n"
    "  --start DATE        date of time 0 when column 1 holds seconds (needed then).\n"
    "  --title TEXT        file title (default: the input name without extension).\n"
    "\n"
    "Column 1 holds either seconds since --start or dates \"YYYY-MM-DD hh:mm:ss\" (the first\n"
    "data row decides for the file). Times must strictly increase. Lines starting with # and\n"
    "blank lines are skipped; the first other line is a header when its first field is\n"
    "neither a number nor a date. An empty field is a delete value. The file starts at the\n"
    "first row; equidistant times give an equidistant calendar axis, others a non-equidistant\n"
    "one. OUT appears only when it is complete.\n";

const char* const kUnitsHelp =
    "usage: vdstool units [--units | --kinds]\n"
    "\n"
    "Writes the code tables as CSV on standard output:\n"
    "  (default)  item types: item_type,name,unit_kind,default_unit,default_unit_name\n"
    "  --units    units: unit,name,abbreviation,kind,factor,offset,udunits\n"
    "             (value in the kind's base unit = value * factor + offset)\n"
    "  --kinds    unit kinds: kind,name,base_unit\n";

const char* HelpOf(const std::string& command) {
  if (command == "info") return kInfoHelp;
  if (command == "dump" || command == "to-csv") return kDumpHelp;
  if (command == "from-csv") return kFromCsvHelp;
  if (command == "units") return kUnitsHelp;
  if (command == "help") return kUsage;
  return nullptr;
}

int Run(const std::vector<std::string>& argv, std::ostream& out, std::ostream& err) {
  if (argv.empty()) {
    err << kUsage;
    return 1;
  }
  const std::string& command = argv[0];
  const std::vector<std::string> rest(argv.begin() + 1, argv.end());
  if (command == "--help" || command == "-h") {
    out << kUsage;
    return 0;
  }
  if (command == "help") {
    if (rest.empty()) {
      out << kUsage;
      return 0;
    }
    const char* h = HelpOf(rest[0]);
    if (h == nullptr || rest.size() > 1)
      Fail("help: unknown command " + Quoted(rest[0]) + " (vdstool help lists them)");
    out << h;
    return 0;
  }
  const char* help = HelpOf(command);
  if (help == nullptr) Fail("unknown command " + Quoted(command) + " (vdstool help lists them)");

  Args a;
  if (command == "info") {
    a = ParseArgs(rest, command, {}, {});
  } else if (command == "dump" || command == "to-csv") {
    a = ParseArgs(rest, command, {"--item", "--step"}, {});
  } else if (command == "from-csv") {
    a = ParseArgs(rest, command, {"--item", "--start", "--title"}, {});
  } else {
    a = ParseArgs(rest, command, {}, {"--units", "--kinds"});
  }
  if (a.help) {
    out << help;
    return 0;
  }

  const LayerMessagesToStderr redirect;
  if (command == "info") return CmdInfo(a, out);
  if (command == "dump" || command == "to-csv") return CmdDump(a, command, out, err);
  if (command == "from-csv") return CmdFromCsv(a, out);
  return CmdUnits(a, out);
}

}  // namespace

int VdsToolMain(int argc, char** argv, std::ostream& out, std::ostream& err) {
  std::vector<std::string> args;
  for (int i = 1; i < argc; ++i) args.emplace_back(argv[i] ? argv[i] : "");
  try {
    return Run(args, out, err);
  } catch (const ToolError& e) {
    err << "vdstool: " << e.message << "\n";
  } catch (const std::exception& e) {
    err << "vdstool: " << e.what() << "\n";
  }
  return 1;
}
