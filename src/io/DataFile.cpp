#include "io/DataFile.h"

#include <fcntl.h>
#include <netcdf.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <bit>
#include <cctype>
#include <cerrno>
#include <climits>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <limits>
#include <map>
#include <type_traits>
#include <set>

#include "driver/DateTime.h"
#include "driver/Log.h"
#include "driver/Termination.h"
#include "io/Units.h"
#include "platform/NetCdfCheck.h"
#include "platform/Projection.h"
#include "platform/System.h"
#include "setup/SetupFile.h"

namespace {

constexpr const char* kMeshVar = "mesh";
constexpr int kMaxItems = 100000;
constexpr std::size_t kMaxItemName = 80;
constexpr std::size_t kMaxProjection = 1024;

// Files this process has open for reading: a result file must never be created over one.
std::set<std::string>& FilesOpenForReading() {
  static std::set<std::string> files;
  return files;
}

std::string CanonicalPath(const std::string& name) {
  char* real = ::realpath(name.c_str(), nullptr);
  if (real == nullptr) return name;
  std::string out(real);
  std::free(real);
  return out;
}

// Records the failure; with a status returns the code, otherwise stops the run.
int Fail(DataFile& df, int code, const std::string& detail, int* status) {
  df.errorText = detail;
  if (status != nullptr) {
    *status = code;
    return code;
  }
  std::string message;
  if (code == kVdsOpen) {
    message = "VDS open error on " + df.fileName;
  } else {
    message = "VDS Error: " + VdsErrorMessage(code);
    if (df.fileName != "unknown") message += " for " + df.fileName;
  }
  if (!detail.empty()) message += ": " + detail;
  FatalError(message);
}

int Ok(int* status) {
  if (status != nullptr) *status = kVdsOk;
  return kVdsOk;
}

std::string NcText(int rc) { return nc_strerror(rc); }

bool IsMeshDataType(std::int32_t dataType) { return dataType >= 2000 && dataType <= 2004; }


// Minimum and maximum of the values that count (not delete values, NaN or infinities). The
// loop keeps running extremes in the value type, so it vectorises for item values.
template <class T>
void Gather(const T* values, std::int64_t n, float deleteValue, double& mn, double& mx,
            std::int64_t& counted) {
  using V = std::conditional_t<std::is_integral_v<T>, double, T>;
  const V del = static_cast<V>(deleteValue);
  const V top = std::numeric_limits<V>::max(), bottom = std::numeric_limits<V>::lowest();
  V lo = top, hi = bottom;
  std::int64_t skipped = 0;
#pragma omp simd reduction(min : lo) reduction(max : hi) reduction(+ : skipped)
  for (std::int64_t i = 0; i < n; ++i) {
    const V v = static_cast<V>(values[i]);
    const bool use = (v != del) & (v - v == V(0));  // false for NaN and infinities
    const V forLo = use ? v : top, forHi = use ? v : bottom;
    lo = forLo < lo ? forLo : lo;
    hi = forHi > hi ? forHi : hi;
    skipped += static_cast<std::int64_t>(!use);
  }
  const std::int64_t c = n - skipped;
  if (c == 0) return;
  if (counted == 0) {
    mn = static_cast<double>(lo);
    mx = static_cast<double>(hi);
  } else {
    mn = std::min(mn, static_cast<double>(lo));
    mx = std::max(mx, static_cast<double>(hi));
  }
  counted += c;
}

// "YYYY-MM-DD hh:mm:ss" into a date; false when malformed or not a real date.
bool ParseDate(std::string_view text, DateTime& out) {
  CalendarDate c;
  int sec = 0;
  char tail = 0;
  const std::string t(text);
  if (t.size() != 19 || std::sscanf(t.c_str(), "%4d-%2d-%2d %2d:%2d:%2d%c", &c.year, &c.month,
                                    &c.day, &c.hour, &c.minute, &sec, &tail) != 6)
    return false;
  if (t[4] != '-' || t[7] != '-' || t[10] != ' ' || t[13] != ':' || t[16] != ':') return false;
  c.second = sec;
  if (!IsValidCalendarDate(c)) return false;
  out = MakeDateTime(c);
  return true;
}

bool PutText(int ncid, int var, const char* name, const std::string& value) {
  return nc_put_att_text(ncid, var, name, value.size(), value.c_str()) == NC_NOERR;
}
bool PutInt(int ncid, int var, const char* name, std::int32_t value) {
  return nc_put_att_int(ncid, var, name, NC_INT, 1, &value) == NC_NOERR;
}
bool PutDouble(int ncid, int var, const char* name, const double* values, std::size_t n) {
  return nc_put_att_double(ncid, var, name, NC_DOUBLE, n, values) == NC_NOERR;
}

bool GetText(int ncid, int var, const char* name, std::string& out) {
  std::size_t len = 0;
  nc_type type = 0;
  if (nc_inq_att(ncid, var, name, &type, &len) != NC_NOERR || type != NC_CHAR) return false;
  if (len > (1u << 20)) return false;
  out.assign(len, '\0');
  if (len > 0 && nc_get_att_text(ncid, var, name, out.data()) != NC_NOERR) return false;
  while (!out.empty() && out.back() == '\0') out.pop_back();
  return true;
}
template <class T>
bool GetNumbers(int ncid, int var, const char* name, std::vector<T>& out, std::size_t maxLen) {
  std::size_t len = 0;
  nc_type type = 0;
  if (nc_inq_att(ncid, var, name, &type, &len) != NC_NOERR || len > maxLen) return false;
  if (type == NC_CHAR || type == NC_STRING) return false;
  out.resize(len);
  if (len == 0) return true;
  int rc = 0;
  if constexpr (std::is_same_v<T, double>) rc = nc_get_att_double(ncid, var, name, out.data());
  else if constexpr (std::is_same_v<T, float>) rc = nc_get_att_float(ncid, var, name, out.data());
  else rc = nc_get_att_int(ncid, var, name, out.data());
  return rc == NC_NOERR;
}
template <class T>
bool GetNumber(int ncid, int var, const char* name, T& out) {
  std::vector<T> v;
  if (!GetNumbers(ncid, var, name, v, 1) || v.size() != 1) return false;
  out = v[0];
  return true;
}

// The static items of a flexible-mesh file, in their fixed order.
struct MeshStatic {
  const char* name;
  const char* var;
  VdsStaticType type;
  bool onNodes;  // else on elements
};
constexpr MeshStatic kMeshStatics[9] = {
    {"Node id", "mesh_node_id", VdsStaticType::kInt32, true},
    {"X-coord", "mesh_node_x", VdsStaticType::kDouble, true},
    {"Y-coord", "mesh_node_y", VdsStaticType::kDouble, true},
    {"Z-coord", "mesh_node_z", VdsStaticType::kFloat, true},
    {"Code", "mesh_node_code", VdsStaticType::kInt32, true},
    {"Element id", "mesh_face_id", VdsStaticType::kInt32, false},
    {"Element type", "mesh_face_type", VdsStaticType::kInt32, false},
    {"No of nodes", "mesh_face_node_count", VdsStaticType::kInt32, false},
    {"Connectivity", "mesh_face_nodes", VdsStaticType::kInt32, false},
};
constexpr int kStaticNodeX = 2, kStaticNodeY = 3, kStaticNodeCount = 8, kStaticConnectivity = 9;

nc_type NcType(VdsStaticType t) {
  switch (t) {
    case VdsStaticType::kInt32: return NC_INT;
    case VdsStaticType::kFloat: return NC_FLOAT;
    default: return NC_DOUBLE;
  }
}
const char* StaticTypeName(VdsStaticType t) {
  switch (t) {
    case VdsStaticType::kInt32: return "int32";
    case VdsStaticType::kFloat: return "float";
    default: return "double";
  }
}

std::string TimeUnits(const VdsTimeAxis& t) {
  if (t.kind == kVdsEqTime) return "seconds";
  return "seconds since " + t.start;
}

std::int64_t MeshNodes(const DataFile& df) { return df.customInt.size() >= 1 ? df.customInt[0] : 0; }
std::int64_t MeshElements(const DataFile& df) { return df.customInt.size() >= 2 ? df.customInt[1] : 0; }
int MeshDimension(const DataFile& df) { return df.customInt.size() >= 3 ? df.customInt[2] : 2; }

bool ProtectedPath(const std::string& canonical) {
  if (FilesOpenForReading().count(canonical) > 0) return true;
  for (const std::string& p : {g_setup.fileName, g_setup.logName, g_log.fileName})
    if (!p.empty() && CanonicalPath(p) == canonical) return true;
  return false;
}

}  // namespace

std::string VdsErrorMessage(int code) {
  switch (code) {
    case 101: return "Unable to open VDS file";
    case 102: return "Invalid type of VDS file";
    case 103: return "Invalid item number";
    case 104: return "Unable to detect number of static items";
    case 105: return "Invalid item";
    case 106: return "Invalid spatial axis";
    case 107: return "Invalid time axis";
    case 108: return "Unable to add custom block";
    case 109: return "Unable to get custom block value";
    case 110: return "Unable to set custom block value";
    case 201: return "Unable to read static item";
    case 202: return "Unable to read dynamic item";
    case 203: return "Static read call after dynamic";
    case 204: return "Unable to skip data";
    case 205: return "Unable to flush file";
    case 301: return "Unable to create header";
    case 302: return "Unable to create file";
    case 401: return "Unable to write static item";
    case 402: return "Unable to write dynamic item";
    case 403: return "Static write call after dynamic";
    case 501: return "Unable to locate static block";
    case 502: return "Unable to locate dynamic block";
    default: return "Unknown error: " + std::to_string(code);
  }
}

VdsKind VdsKindFromName(std::string_view fileName) {
  const std::string leaf = PathLeaf(std::string(fileName));
  const std::size_t dot = leaf.rfind('.');
  if (dot == std::string::npos) return VdsKind::kUnknown;
  std::string ext = leaf.substr(dot + 1);
  for (char& c : ext) c = static_cast<char>(std::tolower(static_cast<unsigned char>(c)));
  if (ext == "vds0") return VdsKind::kVds0;
  if (ext == "vds1") return VdsKind::kVds1;
  if (ext == "vds2") return VdsKind::kVds2;
  if (ext == "vds3") return VdsKind::kVds3;
  if (ext == "vdsu") return VdsKind::kVdsu;
  return VdsKind::kUnknown;
}

const char* VdsKindName(VdsKind kind) {
  switch (kind) {
    case VdsKind::kVds0: return "vds0";
    case VdsKind::kVds1: return "vds1";
    case VdsKind::kVds2: return "vds2";
    case VdsKind::kVds3: return "vds3";
    case VdsKind::kVdsu: return "vdsu";
    default: return "unknown";
  }
}

// --- Header ----------------------------------------------------------------------------------

int VdsInitHeader(DataFile& df, std::int32_t fileKind, std::string_view title,
                  std::string_view creator, int itemCount, int* status) {
  if (df.ncid >= 0 || df.recordFd >= 0) VdsClose(df, nullptr);
  df = DataFile{};
  if (itemCount < 0 || itemCount > kMaxItems)
    return Fail(df, kVdsCreateHeader, "number of items " + std::to_string(itemCount), status);
  df.fileKind = fileKind;
  df.title = std::string(title);
  df.creator = std::string(creator);
  df.itemCount = itemCount;
  df.items.resize(static_cast<std::size_t>(itemCount));
  return Ok(status);
}

int VdsSetDataType(DataFile& df, std::int32_t dataType, int* status) {
  if (df.openMode != 0) return Fail(df, kVdsCreateHeader, "the file is already created", status);
  df.dataType = dataType;
  return Ok(status);
}

int VdsSetDeleteValue(DataFile& df, float value, int* status) {
  if (df.openMode != 0 || !std::isfinite(value))
    return Fail(df, kVdsCreateHeader, "delete value", status);
  df.deleteValue = value;
  df.deleteValueDouble = value;
  return Ok(status);
}

int VdsSetCustomBlockInt(DataFile& df, int index, std::int32_t value, int* status) {
  if (df.openMode != 0 || index < 1 || index > kVdsMaxCustomBlock)
    return Fail(df, kVdsSetCustom, "index " + std::to_string(index), status);
  if (df.customInt.size() < static_cast<std::size_t>(index)) df.customInt.resize(index, 0);
  df.customInt[index - 1] = value;
  return Ok(status);
}

int VdsSetCustomBlockFloat(DataFile& df, int index, float value, int* status) {
  if (df.openMode != 0 || index < 1 || index > kVdsMaxCustomBlock)
    return Fail(df, kVdsSetCustom, "index " + std::to_string(index), status);
  if (df.customFloat.size() < static_cast<std::size_t>(index)) df.customFloat.resize(index, 0.0f);
  df.customFloat[index - 1] = value;
  return Ok(status);
}

int VdsGetCustomBlockInt(const DataFile& df, int index, std::int32_t& value, int* status) {
  DataFile& d = const_cast<DataFile&>(df);
  if (index < 1 || static_cast<std::size_t>(index) > df.customInt.size())
    return Fail(d, kVdsGetCustom, "index " + std::to_string(index), status);
  value = df.customInt[index - 1];
  return Ok(status);
}

int VdsGetCustomBlockFloat(const DataFile& df, int index, float& value, int* status) {
  DataFile& d = const_cast<DataFile&>(df);
  if (index < 1 || static_cast<std::size_t>(index) > df.customFloat.size())
    return Fail(d, kVdsGetCustom, "index " + std::to_string(index), status);
  value = df.customFloat[index - 1];
  return Ok(status);
}

int VdsSetCompression(DataFile& df, std::int32_t flag, int* status) {
  if (df.openMode != 0 || flag < 0 || flag > 1)
    return Fail(df, kVdsCreateHeader, "compression flag " + std::to_string(flag), status);
  df.compression = flag;
  return Ok(status);
}

int VdsSetProjection(DataFile& df, std::string_view projection, double originX, double originY,
                     double orientation, int* status) {
  if (df.openMode != 0 || projection.size() > kMaxProjection || !std::isfinite(originX) ||
      !std::isfinite(originY) || !std::isfinite(orientation))
    return Fail(df, kVdsSpatialAxis, "projection", status);
  df.projection = std::string(projection);
  df.origin[0] = originX;
  df.origin[1] = originY;
  df.orientation = orientation;
  return Ok(status);
}

int VdsSetTimeAxis(DataFile& df, std::string_view start, double step, std::string_view unit,
                   int* status) {
  DateTime d;
  if (df.openMode != 0 || !ParseDate(start, d))
    return Fail(df, kVdsTimeAxis, "start date \"" + std::string(start) + "\"", status);
  if (!std::isfinite(step) || step <= 0.0)
    return Fail(df, kVdsTimeAxis, "time step " + FormatNumber(step) + " s is not positive", status);
  df.time = VdsTimeAxis{};
  df.time.kind = kVdsEqCalendar;
  df.time.start = std::string(start);
  df.time.step = step;
  df.time.unit = std::string(unit);
  return Ok(status);
}

int VdsSetEqTimeAxis(DataFile& df, double startOffset, double step, int* status) {
  if (df.openMode != 0 || !std::isfinite(startOffset) || !std::isfinite(step) || step <= 0.0)
    return Fail(df, kVdsTimeAxis, "time step " + FormatNumber(step) + " s is not positive", status);
  df.time = VdsTimeAxis{};
  df.time.kind = kVdsEqTime;
  df.time.startOffset = startOffset;
  df.time.step = step;
  return Ok(status);
}

int VdsSetNeqCalendarAxis(DataFile& df, std::string_view start, int* status) {
  DateTime d;
  if (df.openMode != 0 || !ParseDate(start, d))
    return Fail(df, kVdsTimeAxis, "start date \"" + std::string(start) + "\"", status);
  df.time = VdsTimeAxis{};
  df.time.kind = kVdsNeqCalendar;
  df.time.start = std::string(start);
  df.time.step = 0.0;
  return Ok(status);
}

int VdsDefineItem(DataFile& df, int number, std::int32_t itemType, std::string_view name,
                  std::int64_t elements, int valueType, int* status) {
  if (df.openMode != 0 || number < 1 || number > df.itemCount)
    return Fail(df, kVdsItemNumber, "item " + std::to_string(number), status);
  if (name.empty() || name.size() > kMaxItemName || elements < 1 || valueType < 0 || valueType > 4)
    return Fail(df, kVdsItem, "item " + std::to_string(number) + " \"" + std::string(name) + "\"", status);
  if (FindItemType(itemType) == nullptr)
    return Fail(df, kVdsItem, "item type " + std::to_string(itemType) + " is not known", status);
  VdsItem& it = df.items[number - 1];
  it = VdsItem{};
  it.name = std::string(name);
  it.itemType = itemType;
  it.unit = DefaultUnitOfItemType(itemType);
  it.elements = elements;
  it.valueType = valueType;
  it.axis.dimension = elements == 1 ? 0 : 1;
  it.axis.n[0] = elements;
  it.defined = true;
  return Ok(status);
}

int VdsSetItemUnit(DataFile& df, int number, std::int32_t unit, int* status) {
  if (df.openMode != 0 || number < 1 || number > df.itemCount || !df.items[number - 1].defined)
    return Fail(df, kVdsItemNumber, "item " + std::to_string(number), status);
  if (!ItemTypeAcceptsUnit(df.items[number - 1].itemType, unit))
    return Fail(df, kVdsItem,
                "unit " + std::to_string(unit) + " is not a unit of item type " +
                    std::to_string(df.items[number - 1].itemType),
                status);
  df.items[number - 1].unit = unit;
  return Ok(status);
}

int VdsSetItemAxis(DataFile& df, int number, const VdsSpatialAxis& axis, int* status) {
  if (df.openMode != 0 || number < 1 || number > df.itemCount || !df.items[number - 1].defined)
    return Fail(df, kVdsItemNumber, "item " + std::to_string(number), status);
  std::int64_t product = 1;
  bool ok = axis.dimension >= 0 && axis.dimension <= 3;
  for (int d = 0; ok && d < axis.dimension; ++d) {
    ok = axis.n[d] >= 1 && std::isfinite(axis.origin[d]) && std::isfinite(axis.step[d]) &&
         axis.step[d] > 0.0 && product <= INT64_MAX / axis.n[d];
    if (ok) product *= axis.n[d];
  }
  if (!ok || product != df.items[number - 1].elements)
    return Fail(df, kVdsSpatialAxis,
                "the axis of item " + std::to_string(number) + " does not match its " +
                    std::to_string(df.items[number - 1].elements) + " elements",
                status);
  df.items[number - 1].axis = axis;
  return Ok(status);
}

int VdsDefineStaticItem(DataFile& df, std::string_view name, VdsStaticType type,
                        std::int64_t elements, std::int32_t itemType, std::int32_t unit,
                        int* status) {
  if (df.openMode != 0 || name.empty() || name.size() > kMaxItemName || elements < 1)
    return Fail(df, kVdsCreateHeader, "static item \"" + std::string(name) + "\"", status);
  VdsStaticItem s;
  s.name = std::string(name);
  s.type = type;
  s.elements = elements;
  s.itemType = itemType;
  s.unit = unit;
  df.statics.push_back(s);
  return Ok(status);
}

// --- Create ----------------------------------------------------------------------------------

namespace {

struct Definer {
  DataFile& df;
  int ncid;
  std::string why;

  bool Check(int rc, const std::string& what) {
    if (rc == NC_NOERR) return true;
    why = what + ": " + NcText(rc);
    return false;
  }
  bool Dim(const std::string& name, std::size_t len, int& id) {
    return Check(nc_def_dim(ncid, name.c_str(), len, &id), "dimension " + name);
  }
  bool Var(const std::string& name, nc_type type, std::vector<int> dims, int& id) {
    if (!Check(nc_def_var(ncid, name.c_str(), type, static_cast<int>(dims.size()), dims.data(), &id),
               "variable " + name))
      return false;
    if (df.netcdf4 && !dims.empty()) {
      // Record variables are chunked one record at a time; everything is deflated.
      std::vector<std::size_t> chunks;
      for (std::size_t i = 0; i < dims.size(); ++i) {
        std::size_t len = 0;
        nc_inq_dimlen(ncid, dims[i], &len);
        chunks.push_back(i == 0 && dims[0] == timeDim ? 1 : std::max<std::size_t>(len, 1));
      }
      if (!Check(nc_def_var_chunking(ncid, id, NC_CHUNKED, chunks.data()), "chunking of " + name))
        return false;
      if (!Check(nc_def_var_deflate(ncid, id, 1, 1, 4), "compression of " + name)) return false;
    }
    return true;
  }
  int timeDim = -1;
};

bool DefineUnitAttributes(Definer& d, int var, std::int32_t itemType, std::int32_t unit) {
  const ItemTypeInfo* type = FindItemType(itemType);
  const UnitInfo* u = FindUnit(unit);
  bool ok = PutInt(d.ncid, var, "vds_item_type", itemType) && PutInt(d.ncid, var, "vds_unit", unit);
  if (type != nullptr) ok = ok && PutText(d.ncid, var, "vds_item_type_name", type->name);
  if (u != nullptr && u->udunits != nullptr && u->udunits[0] != '\0')
    ok = ok && PutText(d.ncid, var, "units", u->udunits);
  return ok;
}

// Defines everything of the file; the caller closes and removes it when this fails.
bool DefineFile(DataFile& df, Definer& d, const std::string& wkt) {
  const int nc = d.ncid;
  const bool mesh = df.kind == VdsKind::kVdsu;
  const bool geographic = df.projection == "LONG/LAT";
  bool ok = true;
  // Global attributes.
  ok = ok && PutText(nc, NC_GLOBAL, "Conventions", mesh && MeshDimension(df) == 2 ? "CF-1.8 UGRID-1.0" : "CF-1.8");
  ok = ok && PutText(nc, NC_GLOBAL, "title", df.title) && PutText(nc, NC_GLOBAL, "creator", df.creator);
  ok = ok && PutText(nc, NC_GLOBAL, "source", df.creator);
  ok = ok && PutText(nc, NC_GLOBAL, "vds_kind", VdsKindName(df.kind));
  ok = ok && PutInt(nc, NC_GLOBAL, "vds_file_kind", df.fileKind);
  ok = ok && PutInt(nc, NC_GLOBAL, "vds_data_type", df.dataType);
  ok = ok && nc_put_att_float(nc, NC_GLOBAL, "vds_delete_value", NC_FLOAT, 1, &df.deleteValue) == NC_NOERR;
  ok = ok && PutText(nc, NC_GLOBAL, "vds_projection", df.projection);
  ok = ok && PutDouble(nc, NC_GLOBAL, "vds_origin", df.origin, 2);
  ok = ok && PutDouble(nc, NC_GLOBAL, "vds_orientation", &df.orientation, 1);
  if (!ok) {
    d.why = "global attributes";
    return false;
  }
  // The custom block.
  if (IsMeshDataType(df.dataType)) {
    df.customBlockName = "TAVRIN_FM";
    if (df.customInt.empty())
      for (float f : df.customFloat) df.customInt.push_back(static_cast<std::int32_t>(f));
    if (nc_put_att_int(nc, NC_GLOBAL, "TAVRIN_FM", NC_INT, df.customInt.size(), df.customInt.data()) != NC_NOERR) {
      d.why = "custom block";
      return false;
    }
  } else {
    df.customBlockName = "TV2_Misc";
    if (df.customFloat.empty())
      for (std::int32_t i : df.customInt) df.customFloat.push_back(static_cast<float>(i));
    if (nc_put_att_float(nc, NC_GLOBAL, "TV2_Misc", NC_FLOAT, df.customFloat.size(), df.customFloat.data()) != NC_NOERR) {
      d.why = "custom block";
      return false;
    }
  }
  // Grid mapping.
  int crs = -1;
  if (!wkt.empty()) {
    if (!d.Var("crs", NC_INT, {}, crs)) return false;
    ok = PutText(nc, crs, "crs_wkt", wkt) && PutText(nc, crs, "spatial_ref", wkt) &&
         PutText(nc, crs, "vds_projection", df.projection);
    if (geographic) ok = ok && PutText(nc, crs, "grid_mapping_name", "latitude_longitude");
    if (!ok) return d.Check(NC_EINVAL, "grid mapping");
  }
  // Time axis.
  if (!d.Dim("time", NC_UNLIMITED, d.timeDim)) return false;
  if (!d.Var("time", NC_DOUBLE, {d.timeDim}, df.timeVar)) return false;
  ok = PutText(nc, df.timeVar, "standard_name", "time") && PutText(nc, df.timeVar, "long_name", "time") &&
       PutText(nc, df.timeVar, "units", TimeUnits(df.time)) && PutText(nc, df.timeVar, "axis", "T") &&
       PutInt(nc, df.timeVar, "vds_time_axis_kind", df.time.kind) &&
       PutDouble(nc, df.timeVar, "vds_time_step", &df.time.step, 1) &&
       PutDouble(nc, df.timeVar, "vds_time_start_offset", &df.time.startOffset, 1) &&
       PutText(nc, df.timeVar, "vds_time_unit", df.time.unit);
  if (df.time.kind != kVdsEqTime) ok = ok && PutText(nc, df.timeVar, "calendar", "standard");
  if (!d.Var("step", NC_INT, {d.timeDim}, df.stepVar)) return false;
  ok = ok && PutText(nc, df.stepVar, "long_name", "time step number") &&
       PutText(nc, df.stepVar, "comment", "-1 marks the record written after a failed computation");
  if (!ok) return d.Check(NC_EINVAL, "time axis attributes");

  // Static items and the mesh topology.
  int nodeDim = -1, faceDim = -1;
  if (mesh) {
    const std::int64_t nodes = MeshNodes(df), elements = MeshElements(df);
    df.maxFaceNodes = MeshDimension(df) == 2 ? 4 : 8;
    int maxDim = -1;
    if (!d.Dim("nMesh_node", static_cast<std::size_t>(nodes), nodeDim) ||
        !d.Dim("nMesh_face", static_cast<std::size_t>(elements), faceDim) ||
        !d.Dim("nMaxMesh_face_nodes", static_cast<std::size_t>(df.maxFaceNodes), maxDim))
      return false;
    if (MeshDimension(df) == 2) {
      int topo = -1;
      if (!d.Var(kMeshVar, NC_INT, {}, topo)) return false;
      ok = PutText(nc, topo, "cf_role", "mesh_topology") &&
           PutText(nc, topo, "long_name", "Topology data of 2D mesh") &&
           PutInt(nc, topo, "topology_dimension", 2) &&
           PutText(nc, topo, "node_coordinates", "mesh_node_x mesh_node_y") &&
           PutText(nc, topo, "face_node_connectivity", "mesh_face_nodes") &&
           PutText(nc, topo, "face_dimension", "nMesh_face") &&
           PutText(nc, topo, "face_coordinates", "mesh_face_x mesh_face_y");
      if (!ok) return d.Check(NC_EINVAL, "mesh topology");
    }
    df.statics.clear();
    for (int k = 0; k < 9; ++k) {
      const MeshStatic& m = kMeshStatics[k];
      VdsStaticItem s;
      s.name = m.name;
      s.varName = m.var;
      s.type = m.type;
      s.elements = m.onNodes ? nodes : elements;
      if (k == kStaticConnectivity - 1) s.elements = 0;  // known once the node counts are written
      if (k == 3) {
        s.itemType = kItemBathymetry;
        s.unit = kUnitMetre;
      }
      std::vector<int> dims = {m.onNodes ? nodeDim : faceDim};
      if (k == kStaticConnectivity - 1) dims.push_back(maxDim);
      if (!d.Var(m.var, NcType(m.type), dims, s.varId)) return false;
      ok = PutText(nc, s.varId, "long_name", m.name) && PutInt(nc, s.varId, "vds_static_number", k + 1);
      if (k == 1 || k == 2) {
        const bool x = k == 1;
        ok = ok && PutText(nc, s.varId, "standard_name",
                           geographic ? (x ? "longitude" : "latitude")
                                      : (x ? "projection_x_coordinate" : "projection_y_coordinate"));
        ok = ok && PutText(nc, s.varId, "units", geographic ? (x ? "degrees_east" : "degrees_north") : "m");
        ok = ok && PutText(nc, s.varId, "mesh", kMeshVar) && PutText(nc, s.varId, "location", "node");
      }
      if (k == 3) ok = ok && DefineUnitAttributes(d, s.varId, s.itemType, s.unit);
      if (k == kStaticConnectivity - 1) {
        const int fill = -1, start = 1;
        ok = ok && PutText(nc, s.varId, "cf_role", "face_node_connectivity") &&
             nc_put_att_int(nc, s.varId, "_FillValue", NC_INT, 1, &fill) == NC_NOERR &&
             nc_put_att_int(nc, s.varId, "start_index", NC_INT, 1, &start) == NC_NOERR;
        df.faceNodesVar = s.varId;
      }
      if (!ok) return d.Check(NC_EINVAL, std::string("attributes of ") + m.var);
      df.statics.push_back(s);
    }
    for (int k = 0; k < 2; ++k) {
      int& var = k == 0 ? df.faceXVar : df.faceYVar;
      const char* name = k == 0 ? "mesh_face_x" : "mesh_face_y";
      if (!d.Var(name, NC_DOUBLE, {faceDim}, var)) return false;
      ok = PutText(nc, var, "long_name", k == 0 ? "Element centre x" : "Element centre y") &&
           PutText(nc, var, "standard_name",
                   geographic ? (k == 0 ? "longitude" : "latitude")
                              : (k == 0 ? "projection_x_coordinate" : "projection_y_coordinate")) &&
           PutText(nc, var, "units", geographic ? (k == 0 ? "degrees_east" : "degrees_north") : "m") &&
           PutText(nc, var, "mesh", kMeshVar) && PutText(nc, var, "location", "face");
      if (!ok) return d.Check(NC_EINVAL, name);
    }
  } else {
    for (std::size_t k = 0; k < df.statics.size(); ++k) {
      VdsStaticItem& s = df.statics[k];
      s.varName = "static_" + std::to_string(k + 1);
      int dim = -1;
      if (!d.Dim(s.varName + "_n", static_cast<std::size_t>(s.elements), dim)) return false;
      if (!d.Var(s.varName, NcType(s.type), {dim}, s.varId)) return false;
      ok = PutText(nc, s.varId, "long_name", s.name) &&
           PutInt(nc, s.varId, "vds_static_number", static_cast<int>(k + 1)) &&
           DefineUnitAttributes(d, s.varId, s.itemType, s.unit);
      if (!ok) return d.Check(NC_EINVAL, "attributes of " + s.varName);
    }
  }

  // Spatial axes of the items: items with the same axis share their dimensions.
  std::map<std::vector<double>, std::vector<int>> axisDims;
  const char* axisNames[3] = {"x", "y", "z"};
  for (int k = 1; k <= df.itemCount; ++k) {
    VdsItem& it = df.items[k - 1];
    std::vector<int> dims = {d.timeDim};
    std::string location;
    if (mesh && it.elements == MeshElements(df)) {
      dims.push_back(faceDim);
      location = "face";
    } else if (mesh && it.elements == MeshNodes(df)) {
      dims.push_back(nodeDim);
      location = "node";
    } else if (!mesh && it.axis.dimension >= 1 && df.kind != VdsKind::kVds0) {
      std::vector<double> key = {static_cast<double>(it.axis.dimension)};
      for (int a = 0; a < it.axis.dimension; ++a) {
        key.push_back(static_cast<double>(it.axis.n[a]));
        key.push_back(it.axis.origin[a]);
        key.push_back(it.axis.step[a]);
      }
      auto found = axisDims.find(key);
      if (found == axisDims.end()) {
        const std::string suffix = axisDims.empty() ? "" : "_" + std::to_string(axisDims.size() + 1);
        std::vector<int> ids(3, -1);
        for (int a = 0; a < it.axis.dimension; ++a) {
          const std::string name = axisNames[a] + suffix;
          int coord = -1;
          if (!d.Dim(name, static_cast<std::size_t>(it.axis.n[a]), ids[a]) ||
              !d.Var(name, NC_DOUBLE, {ids[a]}, coord))
            return false;
          ok = PutText(nc, coord, "axis", a == 0 ? "X" : (a == 1 ? "Y" : "Z")) &&
               PutText(nc, coord, "units", "m");
          if (!ok) return d.Check(NC_EINVAL, "axis " + name);
        }
        found = axisDims.emplace(key, ids).first;
      }
      for (int a = it.axis.dimension - 1; a >= 0; --a) dims.push_back(found->second[a]);
    } else if (it.elements > 1) {
      int dim = -1;
      if (!d.Dim("item_" + std::to_string(k) + "_n", static_cast<std::size_t>(it.elements), dim)) return false;
      dims.push_back(dim);
    }
    if (!d.Var("item_" + std::to_string(k), NC_FLOAT, dims, it.varId)) return false;
    const double origin[3] = {it.axis.origin[0], it.axis.origin[1], it.axis.origin[2]};
    const double step[3] = {it.axis.step[0], it.axis.step[1], it.axis.step[2]};
    ok = PutText(nc, it.varId, "long_name", it.name) && PutInt(nc, it.varId, "vds_item_number", k) &&
         DefineUnitAttributes(d, it.varId, it.itemType, it.unit) &&
         PutInt(nc, it.varId, "vds_value_type", it.valueType) &&
         PutInt(nc, it.varId, "vds_axis_dimension", it.axis.dimension) &&
         PutDouble(nc, it.varId, "vds_axis_origin", origin, 3) &&
         PutDouble(nc, it.varId, "vds_axis_step", step, 3) &&
         PutInt(nc, it.varId, "vds_axis_unit", it.axis.unit) &&
         nc_put_att_float(nc, it.varId, "_FillValue", NC_FLOAT, 1, &df.deleteValue) == NC_NOERR;
    if (!location.empty()) {
      ok = ok && PutText(nc, it.varId, "mesh", kMeshVar) && PutText(nc, it.varId, "location", location) &&
           PutText(nc, it.varId, "coordinates",
                   location == "face" ? "mesh_face_x mesh_face_y" : "mesh_node_x mesh_node_y");
    }
    if (crs >= 0) ok = ok && PutText(nc, it.varId, "grid_mapping", "crs");
    if (!ok) return d.Check(NC_EINVAL, "attributes of item " + std::to_string(k));
  }
  if (!d.Check(nc_enddef(nc), "end of definitions")) return false;

  // Coordinates of the equidistant axes.
  for (const auto& [key, ids] : axisDims) {
    const int dimension = static_cast<int>(key[0]);
    for (int a = 0; a < dimension; ++a) {
      char name[NC_MAX_NAME + 1] = {};
      int var = -1;
      if (!d.Check(nc_inq_dimname(nc, ids[a], name), "axis") || !d.Check(nc_inq_varid(nc, name, &var), "axis"))
        return false;
      const std::size_t n = static_cast<std::size_t>(key[1 + 3 * a]);
      std::vector<double> values(n);
      for (std::size_t i = 0; i < n; ++i) values[i] = key[2 + 3 * a] + static_cast<double>(i) * key[3 + 3 * a];
      if (!d.Check(nc_put_var_double(nc, var, values.data()), "axis coordinates")) return false;
    }
  }
  return true;
}

}  // namespace

int VdsCreateFile(DataFile& df, const std::string& fileName, int* status) {
  if (df.openMode != 0) return Fail(df, kVdsCreateFile, "the record already holds an open file", status);
  df.fileName = fileName;
  df.kind = VdsKindFromName(fileName);
  if (df.kind == VdsKind::kUnknown)
    return Fail(df, kVdsCreateFile, "the extension is not one of .vds0, .vds1, .vds2, .vds3, .vdsu", status);
  for (int k = 1; k <= df.itemCount; ++k)
    if (!df.items[k - 1].defined)
      return Fail(df, kVdsItem, "item " + std::to_string(k) + " was not defined", status);
  if (df.kind == VdsKind::kVdsu) {
    if (!IsMeshDataType(df.dataType))
      return Fail(df, kVdsAddCustom, "flexible-mesh files need a data type 2000 .. 2004", status);
    if (MeshNodes(df) < 1 || MeshElements(df) < 1 || (MeshDimension(df) != 2 && MeshDimension(df) != 3))
      return Fail(df, kVdsAddCustom,
                  "custom block positions 1 to 3 must hold the numbers of nodes and elements and the dimension",
                  status);
    if (!df.statics.empty())
      return Fail(df, kVdsCreateFile, "flexible-mesh files have fixed static items", status);
  }
  if (ProtectedPath(CanonicalPath(fileName)))
    return Fail(df, kVdsCreateFile, "the file is the setup file, the log or a file open for reading", status);
  struct stat st {};
  if (::stat(fileName.c_str(), &st) == 0 && S_ISDIR(st.st_mode))
    return Fail(df, kVdsCreateFile, "a folder of that name exists", status);
  CreateParentFolders(fileName);

  df.netcdf4 = df.compression == 1;
  const int mode = NC_CLOBBER | (df.netcdf4 ? NC_NETCDF4 : NC_64BIT_DATA);
  int ncid = -1;
  // Classic files go through the library's own buffer: a large one turns each item's values into
  // a few big writes instead of many page-sized ones.
  std::size_t chunk = 4u << 20;  // measured best of 64 KiB .. 32 MiB (docs/performance.md)
  const int rc = df.netcdf4 ? nc_create(fileName.c_str(), mode, &ncid)
                            : nc__create(fileName.c_str(), mode, 0, &chunk, &ncid);
  if (rc != NC_NOERR) return Fail(df, kVdsCreateFile, NcText(rc), status);
  int oldFill = 0;
  nc_set_fill(ncid, NC_NOFILL, &oldFill);
  Definer d{df, ncid, {}};
  if (!DefineFile(df, d, ProjectionWkt(df.projection))) {
    nc_close(ncid);
    std::remove(fileName.c_str());
    df.timeVar = df.stepVar = -1;
    return Fail(df, kVdsCreateFile, d.why, status);
  }
  df.ncid = ncid;
  df.openMode = 2;
  df.nextItem = 1;
  df.stepsWritten = 0;
  df.dynamicStarted = false;
  return Ok(status);
}

// --- Static and dynamic writes ---------------------------------------------------------------

namespace {

template <class T>
int WriteStatic(DataFile& df, const T* values, std::int64_t n, int* status) {
  if (df.openMode != 2) return Fail(df, kVdsWriteStatic, "the file is not open for writing", status);
  if (df.dynamicStarted) return Fail(df, kVdsStaticAfterDynamicWrite, "", status);
  auto next = std::find_if(df.statics.begin(), df.statics.end(),
                           [](const VdsStaticItem& s) { return !s.written; });
  if (next == df.statics.end())
    return Fail(df, kVdsWriteStatic, "every static item is written already", status);
  VdsStaticItem& s = *next;
  const int number = static_cast<int>(next - df.statics.begin()) + 1;
  const std::string which = "static item " + std::to_string(number) + " (" + s.name + ")";
  if constexpr (!std::is_same_v<T, std::int32_t>) {
    if (s.type == VdsStaticType::kInt32)
      return Fail(df, kVdsWriteStatic, which + " holds integers", status);
  }
  if (values == nullptr || n != s.elements)
    return Fail(df, kVdsWriteStatic,
                which + ": " + std::to_string(n) + " values given, " + std::to_string(s.elements) + " expected",
                status);
  const bool mesh = df.kind == VdsKind::kVdsu;
  int rc = NC_NOERR;
  if (mesh && number == kStaticConnectivity) {
    // The concatenated node lists become the face-node table, padded with the fill value.
    const std::int64_t elements = MeshElements(df), nodes = MeshNodes(df);
    std::vector<std::int32_t> table(static_cast<std::size_t>(elements * df.maxFaceNodes), -1);
    std::int64_t at = 0;
    for (std::int64_t e = 0; e < elements; ++e) {
      const std::int32_t count = df.elementNodeCount[e];
      for (std::int32_t j = 0; j < count; ++j, ++at) {
        const auto node = static_cast<std::int64_t>(values[at]);
        if (node < 1 || node > nodes)
          return Fail(df, kVdsWriteStatic,
                      "element " + std::to_string(e + 1) + " refers to node " + std::to_string(node) +
                          " of " + std::to_string(nodes),
                      status);
        table[e * df.maxFaceNodes + j] = static_cast<std::int32_t>(node);
      }
    }
    rc = nc_put_var_int(df.ncid, s.varId, table.data());
    // Element centres for readers that place face values by coordinates.
    if (rc == NC_NOERR && df.nodeX.size() == static_cast<std::size_t>(nodes) &&
        df.nodeY.size() == static_cast<std::size_t>(nodes)) {
      std::vector<double> cx(elements), cy(elements);
      for (std::int64_t e = 0; e < elements; ++e) {
        double sx = 0, sy = 0;
        const std::int32_t count = df.elementNodeCount[e];
        for (std::int32_t j = 0; j < count; ++j) {
          const std::int32_t node = table[e * df.maxFaceNodes + j];
          sx += df.nodeX[node - 1];
          sy += df.nodeY[node - 1];
        }
        cx[e] = sx / count;
        cy[e] = sy / count;
      }
      rc = nc_put_var_double(df.ncid, df.faceXVar, cx.data());
      if (rc == NC_NOERR) rc = nc_put_var_double(df.ncid, df.faceYVar, cy.data());
    }
    df.nodeX.clear();
    df.nodeY.clear();
  } else {
    if (mesh && number == kStaticNodeCount) {
      std::int64_t total = 0;
      for (std::int64_t e = 0; e < n; ++e) {
        const auto count = static_cast<std::int64_t>(values[e]);
        if (count < 3 || count > df.maxFaceNodes)
          return Fail(df, kVdsWriteStatic,
                      "element " + std::to_string(e + 1) + " has " + std::to_string(count) + " nodes",
                      status);
        total += count;
      }
      df.elementNodeCount.assign(values, values + n);
      df.statics[kStaticConnectivity - 1].elements = total;
    }
    if (mesh && (number == kStaticNodeX || number == kStaticNodeY))
      (number == kStaticNodeX ? df.nodeX : df.nodeY).assign(values, values + n);
    if constexpr (std::is_same_v<T, std::int32_t>) rc = nc_put_var_int(df.ncid, s.varId, values);
    else if constexpr (std::is_same_v<T, float>) rc = nc_put_var_float(df.ncid, s.varId, values);
    else rc = nc_put_var_double(df.ncid, s.varId, values);
  }
  if (rc != NC_NOERR) return Fail(df, kVdsWriteStatic, which + ": " + NcText(rc), status);
  Gather(values, n, df.deleteValue, s.minimum, s.maximum, s.counted);
  s.written = true;
  return Ok(status);
}

}  // namespace

int VdsWriteStaticInt(DataFile& df, const std::int32_t* values, std::int64_t n, int* status) {
  return WriteStatic(df, values, n, status);
}
int VdsWriteStaticFloat(DataFile& df, const float* values, std::int64_t n, int* status) {
  return WriteStatic(df, values, n, status);
}
int VdsWriteStaticDouble(DataFile& df, const double* values, std::int64_t n, int* status) {
  return WriteStatic(df, values, n, status);
}

namespace {

bool PWriteAll(int fd, const void* data, std::size_t n, std::uint64_t offset) {
  const char* p = static_cast<const char*>(data);
  while (n > 0) {
    const ssize_t w = ::pwrite(fd, p, n, static_cast<off_t>(offset));
    if (w < 0 && errno == EINTR) continue;
    if (w <= 0) return false;
    p += w;
    n -= static_cast<std::size_t>(w);
    offset += static_cast<std::uint64_t>(w);
  }
  return true;
}

// Classic files store big-endian values.
std::uint32_t BigEndian32(std::uint32_t v) {
  return (v >> 24) | ((v >> 8) & 0xFF00u) | ((v << 8) & 0xFF0000u) | (v << 24);  // vectorises
}
std::uint64_t BigEndian64(std::uint64_t v) { return __builtin_bswap64(v); }

// Hands the file over from the library to direct record writing: the library closes it (its
// header then says 0 records) and the layout of a record is read from that header.
bool StartDirectRecords(DataFile& df, std::string& why) {
  int rc = nc_close(df.ncid);
  df.ncid = -1;
  if (rc != NC_NOERR) {
    why = "closing the header: " + NcText(rc);
    return false;
  }
  ClassicLayout layout;
  if (!ReadClassicLayout(df.fileName, layout, &why)) return false;
  if (layout.version != 5 || layout.numrecs != 0) {
    why = "unexpected file layout";
    return false;
  }
  auto begin = [&](const std::string& name, std::uint64_t& out) {
    for (const ClassicVariable& v : layout.variables)
      if (v.name == name && v.record) {
        out = v.begin;
        return true;
      }
    return false;
  };
  df.itemBegin.assign(static_cast<std::size_t>(df.itemCount), 0);
  bool ok = begin("time", df.timeBegin) && begin("step", df.stepBegin);
  for (int k = 1; ok && k <= df.itemCount; ++k) ok = begin("item_" + std::to_string(k), df.itemBegin[k - 1]);
  if (!ok) {
    why = "a record variable is missing from the file";
    return false;
  }
  df.recordSize = layout.recordSize;
  df.recordFd = ::open(df.fileName.c_str(), O_WRONLY | O_CLOEXEC);
  if (df.recordFd < 0) {
    why = std::string("reopening: ") + std::strerror(errno);
    return false;
  }
  return true;
}

bool PutRecordTime(DataFile& df, std::size_t record, double time, std::int32_t step, std::string& why) {
  if (df.recordFd >= 0) {
    std::uint64_t t = 0;
    std::memcpy(&t, &time, sizeof t);
    t = BigEndian64(t);
    const std::uint32_t s = BigEndian32(static_cast<std::uint32_t>(step));
    const std::uint64_t at = record * df.recordSize;
    if (PWriteAll(df.recordFd, &t, sizeof t, df.timeBegin + at) &&
        PWriteAll(df.recordFd, &s, sizeof s, df.stepBegin + at))
      return true;
    why = std::string("time of the step: ") + std::strerror(errno);
    return false;
  }
  int rc = nc_put_var1_double(df.ncid, df.timeVar, &record, &time);
  if (rc == NC_NOERR) rc = nc_put_var1_int(df.ncid, df.stepVar, &record, &step);
  if (rc == NC_NOERR) return true;
  why = "time of the step: " + NcText(rc);
  return false;
}

bool PutRecordItem(DataFile& df, int item, std::size_t record, const float* values, std::string& why) {
  const VdsItem& it = df.items[item - 1];
  if (df.recordFd >= 0) {
    const std::size_t n = static_cast<std::size_t>(it.elements);
    df.recordBuffer.resize(n);
    // One pass: the float's bits, byte-swapped, straight into the buffer.
    static_assert(sizeof(float) == sizeof(std::uint32_t));
    std::uint32_t* words = df.recordBuffer.data();
#pragma omp simd
    for (std::size_t i = 0; i < n; ++i) words[i] = BigEndian32(std::bit_cast<std::uint32_t>(values[i]));
    if (PWriteAll(df.recordFd, df.recordBuffer.data(), n * sizeof(float),
                  df.itemBegin[item - 1] + record * df.recordSize))
      return true;
    why = "item " + std::to_string(item) + ": " + std::strerror(errno);
    return false;
  }
  std::size_t start[4] = {record, 0, 0, 0}, count[4] = {1, 1, 1, 1};
  int ndims = 0, dimIds[4] = {};
  nc_inq_varndims(df.ncid, it.varId, &ndims);
  nc_inq_vardimid(df.ncid, it.varId, dimIds);
  for (int d = 1; d < ndims && d < 4; ++d) nc_inq_dimlen(df.ncid, dimIds[d], &count[d]);
  const int rc = nc_put_vara_float(df.ncid, it.varId, start, count, values);
  if (rc == NC_NOERR) return true;
  why = "item " + std::to_string(item) + ": " + NcText(rc);
  return false;
}

// Makes the written steps part of the file: direct records get their count in the header (the
// data are in the file before the count says so); library files are synchronised.
bool CommitSteps(DataFile& df, std::string& why) {
  if (df.recordFd >= 0) {
    const std::uint64_t count = BigEndian64(static_cast<std::uint64_t>(df.stepsWritten));
    if (PWriteAll(df.recordFd, &count, sizeof count, 4)) return true;
    why = std::string("record count: ") + std::strerror(errno);
    return false;
  }
  const int rc = nc_sync(df.ncid);
  if (rc == NC_NOERR) return true;
  why = NcText(rc);
  return false;
}

}  // namespace

int VdsWriteDynamic(DataFile& df, int item, const float* values, std::int64_t n, double time,
                    std::int32_t step, int* status) {
  if (df.openMode != 2) return Fail(df, kVdsWriteDynamic, "the file is not open for writing", status);
  if (item < 1 || item > df.itemCount)
    return Fail(df, kVdsItemNumber, "item " + std::to_string(item) + " of " + std::to_string(df.itemCount), status);
  if (item != df.nextItem)
    return Fail(df, kVdsWriteDynamic,
                "item " + std::to_string(item) + " written where item " + std::to_string(df.nextItem) +
                    " was due",
                status);
  const VdsItem& it = df.items[item - 1];
  if (values == nullptr || n != it.elements)
    return Fail(df, kVdsWriteDynamic,
                "item " + std::to_string(item) + ": " + std::to_string(n) + " values given, " +
                    std::to_string(it.elements) + " expected",
                status);
  std::string why;
  if (!df.dynamicStarted) {
    for (std::size_t k = 0; k < df.statics.size(); ++k)
      if (!df.statics[k].written)
        return Fail(df, kVdsWriteDynamic,
                    "static item " + std::to_string(k + 1) + " was not written before the dynamic items",
                    status);
    if (!df.netcdf4 && !StartDirectRecords(df, why)) return Fail(df, kVdsWriteDynamic, why, status);
  }
  const std::size_t record = static_cast<std::size_t>(df.stepsWritten);
  if (item == 1) {
    if (!std::isfinite(time))
      return Fail(df, kVdsWriteDynamic, "the time of step " + std::to_string(step) + " is not finite", status);
    if (!df.stepTimes.empty() && step >= 0 && time < df.stepTimes.back())
      return Fail(df, kVdsWriteDynamic, "time " + FormatNumber(time) + " s lies before the last step", status);
    if (!PutRecordTime(df, record, time, step, why)) return Fail(df, kVdsWriteDynamic, why, status);
    df.stepTimes.push_back(time);
    df.stepNumbers.push_back(step);
  }
  df.dynamicStarted = true;
  if (!PutRecordItem(df, item, record, values, why)) return Fail(df, kVdsWriteDynamic, why, status);
  VdsItem& w = df.items[item - 1];
  Gather(values, n, df.deleteValue, w.minimum, w.maximum, w.counted);
  df.nextItem = item == df.itemCount ? 1 : item + 1;
  if (df.nextItem == 1) ++df.stepsWritten;
  return Ok(status);
}

int VdsEndTimeStep(DataFile& df, int* status) {
  if (df.openMode != 2) return Fail(df, kVdsFlush, "the file is not open for writing", status);
  if (df.nextItem != 1)
    return Fail(df, kVdsWriteDynamic,
                "the time step ends before its item " + std::to_string(df.nextItem) + " was written", status);
  std::string why;
  if (df.dynamicStarted && !CommitSteps(df, why)) return Fail(df, kVdsFlush, why, status);
  if (!df.dynamicStarted && df.ncid >= 0 && nc_sync(df.ncid) != NC_NOERR)
    return Fail(df, kVdsFlush, "synchronising", status);
  return Ok(status);
}

// --- Close and summary -----------------------------------------------------------------------

namespace {

std::string Pad(std::string text, std::size_t width) {
  if (text.size() < width) text.append(width - text.size(), ' ');
  return text;
}

std::string Range(std::int64_t counted, double mn, double mx, int width) {
  char buf[96];
  if (counted == 0) {
    std::snprintf(buf, sizeof buf, "%*s%*s", width, "-", width, "-");
  } else {
    std::snprintf(buf, sizeof buf, "%*s%*s", width, FormatNumber(mn, 6).c_str(), width,
                  FormatNumber(mx, 6).c_str());
  }
  return buf;
}

std::string UnitAbbreviation(std::int32_t unit) {
  const UnitInfo* u = FindUnit(unit);
  return u != nullptr ? u->abbreviation : std::to_string(unit);
}

std::string ItemTypeName(std::int32_t type) {
  const ItemTypeInfo* t = FindItemType(type);
  return t != nullptr ? t->name : std::to_string(type);
}

}  // namespace

std::string VdsSummaryText(const DataFile& df) {
  std::string out;
  auto line = [&out](const std::string& text) { out += TrimRight(text) + "\n"; };
  std::string banner = " Data File Summary ";
  const std::size_t left = (70 - banner.size()) / 2;
  line(std::string(left, '-') + banner + std::string(70 - left - banner.size(), '-'));
  line("  Creator: " + df.creator);
  line("  File   : " + SkfEchoPath(df.fileName));
  line("  Title  : " + df.title);
  const std::int64_t sets = static_cast<std::int64_t>(df.stepTimes.size());
  if (df.time.kind == kVdsEqTime) {
    line("  Time axis  : equidistant time");
    line("  Start time : " + FormatNumber(df.time.startOffset));
  } else {
    line(std::string("  Time axis  : ") +
         (df.time.kind == kVdsEqCalendar ? "equidistant calendar" : "non-equidistant calendar"));
    line("  Start date : " + df.time.start.substr(0, 10));
    line("  Start time : " + df.time.start.substr(11));
  }
  line("  Sets       : " + std::to_string(sets));
  if (df.time.kind == kVdsNeqCalendar) {
    const double span = sets > 1 ? df.stepTimes.back() - df.stepTimes.front() : 0.0;
    line("  Span       : " + FormatNumber(span));
  } else {
    line("  Interval   : " + FormatNumber(df.time.step));
  }
  line("  Unit       : " + df.time.unit);
  // Spatial axis: the mesh, the first item's axis, or single values.
  if (df.kind == VdsKind::kVdsu) {
    line("  Axis       : flexible mesh, " + std::to_string(MeshDimension(df)) + "-D");
    line("  Sets       : " + std::to_string(MeshElements(df)) + " elements, " +
         std::to_string(MeshNodes(df)) + " nodes");
  } else if (df.itemCount > 0 && df.items[0].axis.dimension > 0) {
    const VdsSpatialAxis& a = df.items[0].axis;
    std::string sets = std::to_string(a.n[0]), interval = FormatNumber(a.step[0]),
                origin = FormatNumber(a.origin[0]);
    for (int d = 1; d < a.dimension; ++d) {
      sets += " x " + std::to_string(a.n[d]);
      interval += " x " + FormatNumber(a.step[d]);
      origin += ", " + FormatNumber(a.origin[d]);
    }
    line("  Axis       : equidistant " + std::to_string(a.dimension) + "-D");
    line("  Sets       : " + sets);
    line("  Interval   : " + interval);
    line("  Axis origin: " + origin);
    line("  Unit       : " + UnitAbbreviation(a.unit));
  } else {
    line("  Axis       : single value");
  }
  auto table = [&](const char* heading, auto rows) {
    line(heading);
    line("    " + Pad("Name", 30) + Pad("Type", 28) + "       Minimum       Maximum  Unit");
    rows();
  };
  if (!df.statics.empty()) {
    table("  Static items:", [&] {
      for (const VdsStaticItem& s : df.statics)
        line("    " + Pad(s.name.substr(0, 29), 30) + Pad(std::string(StaticTypeName(s.type)), 28) +
             Range(s.counted, s.minimum, s.maximum, 14) + "  " + UnitAbbreviation(s.unit));
    });
  }
  table("  Dynamic items:", [&] {
    for (const VdsItem& it : df.items)
      line("    " + Pad(it.name.substr(0, 29), 30) + Pad(ItemTypeName(it.itemType).substr(0, 27), 28) +
           Range(it.counted, it.minimum, it.maximum, 14) + "  " + UnitAbbreviation(it.unit));
  });
  line(std::string(70, '-'));
  return out;
}

int VdsClose(DataFile& df, int* status) {
  if (df.ncid < 0 && df.recordFd < 0) {
    df = DataFile{};
    return Ok(status);
  }
  int code = kVdsOk;
  std::string why;
  if (df.openMode == 2 && df.nextItem != 1) {
    // An unfinished step is completed with delete values, so the file never holds a record
    // with items that were not written; the caller still learns of it.
    const std::size_t record = static_cast<std::size_t>(df.stepsWritten);
    std::string ignored;
    for (int k = df.nextItem; k <= df.itemCount; ++k) {
      const std::vector<float> missing(static_cast<std::size_t>(df.items[k - 1].elements), df.deleteValue);
      PutRecordItem(df, k, record, missing.data(), ignored);
    }
    code = kVdsWriteDynamic;
    why = "the last time step was closed before its item " + std::to_string(df.nextItem) + " was written";
    ++df.stepsWritten;
  }
  if (df.recordFd >= 0) {
    std::string failure;
    const bool committed = CommitSteps(df, failure);
    const bool closed = ::close(df.recordFd) == 0;
    df.recordFd = -1;
    if ((!committed || !closed) && code == kVdsOk) {
      code = kVdsFlush;
      why = committed ? std::string("closing: ") + std::strerror(errno) : failure;
    }
  }
  if (df.ncid >= 0) {
    const int rc = nc_close(df.ncid);
    df.ncid = -1;
    if (rc != NC_NOERR && code == kVdsOk) {
      code = kVdsFlush;
      why = "closing: " + NcText(rc);
    }
  }
  const bool written = df.openMode == 2;
  if (df.openMode == 1) FilesOpenForReading().erase(CanonicalPath(df.fileName));
  if (written && df.printSummary) {
    df.time.count = static_cast<std::int64_t>(df.stepTimes.size());
    PrintLine("");
    PrintLines(VdsSummaryText(df));
  }
  if (code != kVdsOk) {
    const int result = Fail(df, code, why, status);
    const std::string text = df.errorText;
    df = DataFile{};
    df.errorText = text;
    return result;
  }
  df = DataFile{};
  return Ok(status);
}

// --- Reading ---------------------------------------------------------------------------------

namespace {

// Number of values of a variable per record (record variables) or in all (others); -1 when the
// layout is not one this layer writes.
std::int64_t ValuesPerRecord(int ncid, int var, int unlimited, bool& record) {
  int ndims = 0;
  if (nc_inq_varndims(ncid, var, &ndims) != NC_NOERR || ndims > 4) return -1;
  int dims[4] = {};
  nc_inq_vardimid(ncid, var, dims);
  std::int64_t n = 1;
  record = ndims > 0 && dims[0] == unlimited;
  for (int d = record ? 1 : 0; d < ndims; ++d) {
    std::size_t len = 0;
    if (nc_inq_dimlen(ncid, dims[d], &len) != NC_NOERR) return -1;
    if (len == 0 || n > (std::int64_t{1} << 40) / static_cast<std::int64_t>(len)) return -1;
    n *= static_cast<std::int64_t>(len);
  }
  return n;
}

int OpenFail(DataFile& df, int code, const std::string& why, int* status) {
  if (df.ncid >= 0) nc_close(df.ncid);
  df.ncid = -1;
  df.openMode = 0;
  return Fail(df, code, why, status);
}

}  // namespace

int VdsOpenRead(DataFile& df, const std::string& fileName,
                const std::vector<VdsItemRequirement>& requirements, int* status) {
  if (df.ncid >= 0 || df.recordFd >= 0) VdsClose(df, nullptr);
  df = DataFile{};
  df.fileName = fileName;
  df.kind = VdsKindFromName(fileName);
  struct stat st {};
  if (::stat(fileName.c_str(), &st) != 0) return OpenFail(df, kVdsOpen, "the file does not exist", status);
  if (S_ISDIR(st.st_mode)) return OpenFail(df, kVdsOpen, "it is a folder", status);
  if (st.st_size == 0) return OpenFail(df, kVdsOpen, "the file is empty", status);
  std::string why;
  if (!CheckClassicNetCdfSize(fileName, &why)) return OpenFail(df, kVdsOpen, why, status);
  int ncid = -1;
  int rc = nc_open(fileName.c_str(), NC_NOWRITE, &ncid);
  if (rc != NC_NOERR) return OpenFail(df, kVdsOpen, "not a readable data file (" + NcText(rc) + ")", status);
  df.ncid = ncid;
  int format = 0;
  nc_inq_format(ncid, &format);
  df.netcdf4 = format == NC_FORMAT_NETCDF4 || format == NC_FORMAT_NETCDF4_CLASSIC;

  std::string kindText;
  if (!GetText(ncid, NC_GLOBAL, "vds_kind", kindText) || !GetNumber(ncid, NC_GLOBAL, "vds_file_kind", df.fileKind))
    return OpenFail(df, kVdsFileType, "the file carries no data-file header", status);
  if (df.fileKind != kVdsFileKindData && df.fileKind != kVdsFileKindStatic)
    return OpenFail(df, kVdsFileType, "file kind " + std::to_string(df.fileKind), status);
  if (df.kind == VdsKind::kUnknown || kindText != VdsKindName(df.kind))
    return OpenFail(df, kVdsFileType,
                    "the file holds " + kindText + " data, its name says " + VdsKindName(df.kind), status);
  GetText(ncid, NC_GLOBAL, "title", df.title);
  GetText(ncid, NC_GLOBAL, "creator", df.creator);
  GetNumber(ncid, NC_GLOBAL, "vds_data_type", df.dataType);
  if (GetNumber(ncid, NC_GLOBAL, "vds_delete_value", df.deleteValue)) df.deleteValueDouble = df.deleteValue;
  GetText(ncid, NC_GLOBAL, "vds_projection", df.projection);
  std::vector<double> origin;
  if (GetNumbers(ncid, NC_GLOBAL, "vds_origin", origin, 2) && origin.size() == 2) {
    df.origin[0] = origin[0];
    df.origin[1] = origin[1];
  }
  GetNumber(ncid, NC_GLOBAL, "vds_orientation", df.orientation);
  // Custom block: the first recognised name.
  for (const char* name : {"TV2_Misc", "TV2BW_1D", "TAVRIN_FM", "FEM_Misc", "FEM"}) {
    nc_type type = 0;
    std::size_t len = 0;
    if (nc_inq_att(ncid, NC_GLOBAL, name, &type, &len) != NC_NOERR) continue;
    df.customBlockName = name;
    const bool ok = type == NC_INT ? GetNumbers(ncid, NC_GLOBAL, name, df.customInt, kVdsMaxCustomBlock)
                                   : GetNumbers(ncid, NC_GLOBAL, name, df.customFloat, kVdsMaxCustomBlock);
    if (!ok) return OpenFail(df, kVdsGetCustom, std::string("custom block ") + name, status);
    break;
  }
  const bool mesh = df.kind == VdsKind::kVdsu;
  if (mesh) {
    if (df.customInt.size() < 5)
      return OpenFail(df, kVdsGetCustom, "the custom block holds fewer than 5 values", status);
    if (!IsMeshDataType(df.dataType)) {
      Warning("Wrong data type found, 2000 assumed");
      df.dataType = 2000;
    }
  }

  // Time axis.
  int unlimited = -1;
  nc_inq_unlimdim(ncid, &unlimited);
  if (unlimited < 0 || nc_inq_varid(ncid, "time", &df.timeVar) != NC_NOERR ||
      nc_inq_varid(ncid, "step", &df.stepVar) != NC_NOERR)
    return OpenFail(df, kVdsTimeAxis, "no time axis", status);
  std::size_t records = 0;
  nc_inq_dimlen(ncid, unlimited, &records);
  if (!GetNumber(ncid, df.timeVar, "vds_time_axis_kind", df.time.kind) ||
      (df.time.kind != kVdsEqTime && df.time.kind != kVdsEqCalendar && df.time.kind != kVdsNeqCalendar))
    return OpenFail(df, kVdsTimeAxis, "unknown time axis kind", status);
  GetNumber(ncid, df.timeVar, "vds_time_step", df.time.step);
  GetNumber(ncid, df.timeVar, "vds_time_start_offset", df.time.startOffset);
  GetText(ncid, df.timeVar, "vds_time_unit", df.time.unit);
  std::string units;
  GetText(ncid, df.timeVar, "units", units);
  if (df.time.kind != kVdsEqTime) {
    DateTime start;
    if (units.rfind("seconds since ", 0) != 0 || !ParseDate(units.substr(14), start))
      return OpenFail(df, kVdsTimeAxis, "time units \"" + units + "\"", status);
    df.time.start = units.substr(14);
  }
  if (df.time.kind != kVdsNeqCalendar && !(df.time.step > 0.0))
    return OpenFail(df, kVdsTimeAxis, "time step " + FormatNumber(df.time.step) + " s is not positive", status);
  df.time.count = static_cast<std::int64_t>(records);
  df.stepTimes.resize(records);
  df.stepNumbers.resize(records);
  if (records > 0) {
    const std::size_t start = 0;
    if (nc_get_vara_double(ncid, df.timeVar, &start, &records, df.stepTimes.data()) != NC_NOERR ||
        nc_get_vara_int(ncid, df.stepVar, &start, &records, df.stepNumbers.data()) != NC_NOERR)
      return OpenFail(df, kVdsTimeAxis, "the record times cannot be read", status);
  }

  // Items and static items by their numbers.
  int nvars = 0;
  nc_inq_nvars(ncid, &nvars);
  std::map<int, VdsItem> items;
  std::map<int, VdsStaticItem> statics;
  for (int v = 0; v < nvars; ++v) {
    int number = 0;
    char name[NC_MAX_NAME + 1] = {};
    nc_inq_varname(ncid, v, name);
    bool record = false;
    if (GetNumber(ncid, v, "vds_item_number", number)) {
      VdsItem it;
      it.varId = v;
      it.defined = true;
      it.elements = ValuesPerRecord(ncid, v, unlimited, record);
      nc_type type = 0;
      nc_inq_vartype(ncid, v, &type);
      if (it.elements < 1 || !record || type != NC_FLOAT || number < 1 || items.count(number) > 0)
        return OpenFail(df, kVdsItem, std::string("variable ") + name, status);
      GetText(ncid, v, "long_name", it.name);
      GetNumber(ncid, v, "vds_item_type", it.itemType);
      GetNumber(ncid, v, "vds_unit", it.unit);
      GetNumber(ncid, v, "vds_value_type", it.valueType);
      GetNumber(ncid, v, "vds_axis_dimension", it.axis.dimension);
      std::vector<double> o, s;
      if (GetNumbers(ncid, v, "vds_axis_origin", o, 3) && o.size() == 3) std::copy(o.begin(), o.end(), it.axis.origin);
      if (GetNumbers(ncid, v, "vds_axis_step", s, 3) && s.size() == 3) std::copy(s.begin(), s.end(), it.axis.step);
      GetNumber(ncid, v, "vds_axis_unit", it.axis.unit);
      int ndims = 0, dims[4] = {};
      nc_inq_varndims(ncid, v, &ndims);
      nc_inq_vardimid(ncid, v, dims);
      if (it.axis.dimension < 0 || it.axis.dimension > 3) return OpenFail(df, kVdsSpatialAxis, name, status);
      for (int a = 0; a < 3; ++a) it.axis.n[a] = 1;
      if (it.axis.dimension > 0 && ndims - 1 == it.axis.dimension) {
        for (int a = 0; a < it.axis.dimension; ++a) {
          std::size_t len = 0;
          nc_inq_dimlen(ncid, dims[ndims - 1 - a], &len);
          it.axis.n[a] = static_cast<std::int64_t>(len);
        }
      } else if (it.axis.dimension > 0) {
        it.axis.n[0] = it.elements;
      }
      items[number] = it;
    } else if (GetNumber(ncid, v, "vds_static_number", number)) {
      VdsStaticItem s;
      s.varId = v;
      s.varName = name;
      s.elements = ValuesPerRecord(ncid, v, unlimited, record);
      nc_type type = 0;
      nc_inq_vartype(ncid, v, &type);
      s.type = type == NC_INT ? VdsStaticType::kInt32 : (type == NC_FLOAT ? VdsStaticType::kFloat : VdsStaticType::kDouble);
      if (s.elements < 1 || record || number < 1 || statics.count(number) > 0 ||
          (type != NC_INT && type != NC_FLOAT && type != NC_DOUBLE))
        return OpenFail(df, kVdsStaticCount, std::string("variable ") + name, status);
      GetText(ncid, v, "long_name", s.name);
      GetNumber(ncid, v, "vds_item_type", s.itemType);
      GetNumber(ncid, v, "vds_unit", s.unit);
      s.written = true;
      statics[number] = s;
    }
  }
  for (int k = 1; k <= static_cast<int>(items.size()); ++k)
    if (items.count(k) == 0) return OpenFail(df, kVdsItem, "item " + std::to_string(k) + " is missing", status);
  for (int k = 1; k <= static_cast<int>(statics.size()); ++k)
    if (statics.count(k) == 0)
      return OpenFail(df, kVdsStaticCount, "static item " + std::to_string(k) + " is missing", status);
  for (auto& [k, it] : items) df.items.push_back(it);
  for (auto& [k, s] : statics) df.statics.push_back(s);
  df.itemCount = static_cast<int>(df.items.size());
  if (mesh) {
    // The mesh sizes of the custom block must be those of the stored mesh.
    if (df.statics.size() != 9 || df.statics[0].elements != MeshNodes(df) ||
        df.statics[5].elements != MeshElements(df))
      return OpenFail(df, kVdsGetCustom,
                      "the custom block's node and element counts do not match the stored mesh", status);
  }
  if (df.netcdf4) {
    // Compressed files can claim sizes far beyond their bytes; refuse anything absurd.
    for (const VdsItem& it : df.items)
      if (it.elements > (std::int64_t{1} << 31)) return OpenFail(df, kVdsItem, it.name, status);
  }
  for (const VdsItemRequirement& r : requirements) {
    if (r.item < 1 || r.item > df.itemCount)
      return OpenFail(df, kVdsItemNumber, "item " + std::to_string(r.item) + " of " + std::to_string(df.itemCount), status);
    if (r.unitKind != 0 && !ItemTypeHasUnitKind(df.items[r.item - 1].itemType, r.unitKind)) {
      const UnitKindInfo* kind = FindUnitKind(r.unitKind);
      const std::string message = "The Item type: " + std::to_string(df.items[r.item - 1].itemType) +
                                  " does not have the required unit type: " +
                                  (kind != nullptr ? std::string(kind->name) : std::to_string(r.unitKind));
      if (status == nullptr) FatalError(message);
      return OpenFail(df, kVdsItem, message, status);
    }
  }
  df.openMode = 1;
  df.readStep = 0;
  df.readItem = 1;
  FilesOpenForReading().insert(CanonicalPath(fileName));
  return Ok(status);
}

int VdsStaticCount(const DataFile& df) { return static_cast<int>(df.statics.size()); }

namespace {

template <class T>
int ReadStatic(DataFile& df, int number, std::vector<T>& values, int* status) {
  if (df.openMode != 1) return Fail(df, kVdsReadStatic, "the file is not open for reading", status);
  if (df.dynamicStarted) return Fail(df, kVdsStaticAfterDynamicRead, "", status);
  if (number < 1 || number > VdsStaticCount(df))
    return Fail(df, kVdsReadStatic,
                "static item " + std::to_string(number) + " of " + std::to_string(VdsStaticCount(df)), status);
  const VdsStaticItem& s = df.statics[number - 1];
  const bool connectivity = df.kind == VdsKind::kVdsu && number == kStaticConnectivity;
  std::vector<T> raw(static_cast<std::size_t>(s.elements));
  int rc = NC_NOERR;
  if constexpr (std::is_same_v<T, std::int32_t>) rc = nc_get_var_int(df.ncid, s.varId, raw.data());
  else if constexpr (std::is_same_v<T, float>) rc = nc_get_var_float(df.ncid, s.varId, raw.data());
  else rc = nc_get_var_double(df.ncid, s.varId, raw.data());
  if (rc != NC_NOERR)
    return Fail(df, kVdsReadStatic, "static item " + std::to_string(number) + ": " + NcText(rc), status);
  if (!connectivity) {
    values = std::move(raw);
    return Ok(status);
  }
  // The face-node table back to concatenated node lists, checked against the node counts.
  const std::int64_t nodes = MeshNodes(df), elements = MeshElements(df);
  const std::int64_t width = elements > 0 ? s.elements / elements : 0;
  std::vector<std::int32_t> counts(static_cast<std::size_t>(elements));
  if (width < 3 || nc_get_var_int(df.ncid, df.statics[kStaticNodeCount - 1].varId, counts.data()) != NC_NOERR)
    return Fail(df, kVdsReadStatic, "the element node counts cannot be read", status);
  values.clear();
  values.reserve(static_cast<std::size_t>(elements * 4));
  for (std::int64_t e = 0; e < elements; ++e) {
    if (counts[e] < 3 || counts[e] > width)
      return Fail(df, kVdsReadStatic, "element " + std::to_string(e + 1) + " has " + std::to_string(counts[e]) + " nodes", status);
    for (std::int32_t j = 0; j < counts[e]; ++j) {
      const T node = raw[static_cast<std::size_t>(e * width + j)];
      if (!(node >= 1 && static_cast<std::int64_t>(node) <= nodes))
        return Fail(df, kVdsReadStatic,
                    "element " + std::to_string(e + 1) + " refers to node " + std::to_string(static_cast<long long>(node)) +
                        " of " + std::to_string(nodes),
                    status);
      values.push_back(node);
    }
  }
  return Ok(status);
}

}  // namespace

int VdsReadStaticInt(DataFile& df, int number, std::vector<std::int32_t>& values, int* status) {
  return ReadStatic(df, number, values, status);
}
int VdsReadStaticFloat(DataFile& df, int number, std::vector<float>& values, int* status) {
  return ReadStatic(df, number, values, status);
}
int VdsReadStaticDouble(DataFile& df, int number, std::vector<double>& values, int* status) {
  return ReadStatic(df, number, values, status);
}

int VdsReadDynamic(DataFile& df, int item, std::int64_t step, float* values, std::int64_t n,
                   std::int32_t unit, int* status) {
  if (df.openMode != 1) return Fail(df, kVdsReadDynamic, "the file is not open for reading", status);
  if (item < 1 || item > df.itemCount)
    return Fail(df, kVdsItemNumber, "item " + std::to_string(item) + " of " + std::to_string(df.itemCount), status);
  if (step < 0 || step >= df.time.count)
    return Fail(df, kVdsReadDynamic,
                "time step " + std::to_string(step) + " of " + std::to_string(df.time.count), status);
  const VdsItem& it = df.items[item - 1];
  if (values == nullptr || n < it.elements)
    return Fail(df, kVdsReadDynamic,
                "room for " + std::to_string(n) + " values, item " + std::to_string(item) + " has " +
                    std::to_string(it.elements),
                status);
  double factor = 1.0, offset = 0.0;
  if (unit > 0 && unit != it.unit) {
    std::string why;
    if (!UnitConversion(it.unit, unit, factor, offset, &why)) return Fail(df, kVdsReadDynamic, why, status);
  }
  std::size_t start[4] = {static_cast<std::size_t>(step), 0, 0, 0}, count[4] = {1, 1, 1, 1};
  int ndims = 0, dims[4] = {};
  nc_inq_varndims(df.ncid, it.varId, &ndims);
  nc_inq_vardimid(df.ncid, it.varId, dims);
  for (int d = 1; d < ndims && d < 4; ++d) nc_inq_dimlen(df.ncid, dims[d], &count[d]);
  const int rc = nc_get_vara_float(df.ncid, it.varId, start, count, values);
  if (rc != NC_NOERR) return Fail(df, kVdsReadDynamic, "item " + std::to_string(item) + ": " + NcText(rc), status);
  if (factor != 1.0 || offset != 0.0) {
    for (std::int64_t i = 0; i < it.elements; ++i)
      if (values[i] != df.deleteValue && std::isfinite(values[i]))
        values[i] = static_cast<float>(values[i] * factor + offset);
  }
  df.dynamicStarted = true;
  return Ok(status);
}

int VdsReadNextDynamic(DataFile& df, float* values, std::int64_t n, std::int32_t unit, int* status) {
  const int rc = VdsReadDynamic(df, df.readItem, df.readStep, values, n, unit, status);
  if (rc == kVdsOk) VdsSkipItem(df, nullptr);
  return rc;
}

int VdsSkipItem(DataFile& df, int* status) {
  if (df.openMode != 1 || df.readStep >= df.time.count || df.itemCount == 0)
    return Fail(df, kVdsSkip, "past the last time step", status);
  df.dynamicStarted = true;
  if (++df.readItem > df.itemCount) {
    df.readItem = 1;
    ++df.readStep;
  }
  return Ok(status);
}

int VdsSkipTimeStep(DataFile& df, int* status) {
  if (df.openMode != 1 || df.readStep >= df.time.count)
    return Fail(df, kVdsSkip, "past the last time step", status);
  df.dynamicStarted = true;
  df.readItem = 1;
  ++df.readStep;
  return Ok(status);
}

double VdsStepTime(const DataFile& df, std::int64_t step) {
  if (step < 0 || static_cast<std::size_t>(step) >= df.stepTimes.size()) return 0.0;
  return df.stepTimes[static_cast<std::size_t>(step)];
}

std::int32_t VdsStepNumber(const DataFile& df, std::int64_t step) {
  if (step < 0 || static_cast<std::size_t>(step) >= df.stepNumbers.size()) return 0;
  return df.stepNumbers[static_cast<std::size_t>(step)];
}

// --- File units ------------------------------------------------------------------------------

namespace {

constexpr int kFirstUnit = 10;
std::vector<std::FILE*>& UnitPool() {
  static std::vector<std::FILE*> pool;
  return pool;
}

int TakeUnit(std::FILE* f) {
  std::vector<std::FILE*>& pool = UnitPool();
  for (std::size_t i = 0; i < pool.size(); ++i)
    if (pool[i] == nullptr) {
      pool[i] = f;
      return kFirstUnit + static_cast<int>(i);
    }
  pool.push_back(f);
  return kFirstUnit + static_cast<int>(pool.size()) - 1;
}

int UnitFail(const std::string& message, int* status) {
  if (status != nullptr) {
    *status = 1;
    return -1;
  }
  FatalError(message);
}

}  // namespace

int FileUnitCreate(const std::string& name, bool unformatted, int* status) {
  CreateParentFolders(name);
  std::FILE* f = std::fopen(name.c_str(), unformatted ? "wb" : "w");
  if (f == nullptr) return UnitFail("Unable to create file " + name, status);
  if (status != nullptr) *status = 0;
  return TakeUnit(f);
}

int FileUnitOpenRead(const std::string& name, int* status) {
  struct stat st {};
  std::FILE* f = nullptr;
  if (::stat(name.c_str(), &st) == 0 && !S_ISDIR(st.st_mode)) f = std::fopen(name.c_str(), "r");
  if (f == nullptr) return UnitFail("Unable to open file " + name, status);
  if (status != nullptr) *status = 0;
  return TakeUnit(f);
}

int FileUnitClose(int unit, int* status) {
  std::FILE* f = FileUnitStream(unit);
  if (f == nullptr) return UnitFail("Unable to close file unit", status);
  UnitPool()[static_cast<std::size_t>(unit - kFirstUnit)] = nullptr;
  if (std::fclose(f) != 0) return UnitFail("Unable to close file unit", status);
  if (status != nullptr) *status = 0;
  return 0;
}

std::FILE* FileUnitStream(int unit) {
  const std::vector<std::FILE*>& pool = UnitPool();
  if (unit < kFirstUnit || unit - kFirstUnit >= static_cast<int>(pool.size())) return nullptr;
  return pool[static_cast<std::size_t>(unit - kFirstUnit)];
}
