#include "mesh/Cartography.h"

#include <proj.h>

#include <algorithm>
#include <array>
#include <atomic>
#include <cmath>
#include <cstdint>
#include <initializer_list>
#include <map>
#include <memory>
#include <mutex>
#include <string>
#include <thread>

#include "mesh/MeshData.h"
#include "platform/Projection.h"

namespace {

// A PROJ context with the transformation WGS 84 longitude/latitude -> the mesh's CRS, both in
// x = east, y = north order. A context may only be used by one thread at a time, so every
// thread gets its own pair.
struct Transform {
  PJ_CONTEXT* ctx = nullptr;
  PJ* pj = nullptr;
  Transform() = default;
  Transform(const Transform&) = delete;
  Transform& operator=(const Transform&) = delete;
  ~Transform() {
    if (pj != nullptr) proj_destroy(pj);
    if (ctx != nullptr) proj_context_destroy(ctx);
  }
};

// What the constructor learns about the CRS.
struct CrsFacts {
  bool geographic = false;
  double origin[2] = {0.0, 0.0};
};

// PROJ's messages, kept for the error text instead of being printed.
void KeepMessage(void* data, int, const char* message) {
  if (data != nullptr && message != nullptr) *static_cast<std::string*>(data) = message;
}

// Why PROJ failed: its last message where it wrote one (it names what was not found), else the
// text of its error code.
std::string ProjReason(PJ_CONTEXT* ctx, const std::string& message, const char* fallback) {
  if (!message.empty()) return message;
  const int code = proj_context_errno(ctx);
  const char* text = code != 0 ? proj_context_errno_string(ctx, code) : nullptr;
  return text != nullptr && text[0] != '\0' ? std::string(text) : std::string(fallback);
}

// Value of the first of `names` the conversion has, in degrees; false when it has none.
bool AngleParameter(PJ_CONTEXT* ctx, PJ* op, std::initializer_list<const char*> names, double& degrees) {
  for (const char* name : names) {
    const int index = proj_coordoperation_get_param_index(ctx, op, name);
    if (index < 0) continue;
    double value = 0.0, toBase = 1.0;
    const char* category = nullptr;
    if (!proj_coordoperation_get_param(ctx, op, index, nullptr, nullptr, nullptr, &value, nullptr,
                                       &toBase, nullptr, nullptr, nullptr, &category))
      continue;
    const bool angular = category != nullptr && std::string(category) == "angular";
    degrees = angular ? value * toBase * kRadiansToDegrees : value;
    return true;
  }
  return false;
}

// Origin of a projected CRS (also inside a bound or compound CRS); stays 0, 0 otherwise.
void FindOrigin(PJ_CONTEXT* ctx, PJ* crs, CrsFacts& facts) {
  PJ* base = proj_clone(ctx, crs);
  for (int depth = 0; base != nullptr && depth < 4; ++depth) {
    const PJ_TYPE type = proj_get_type(base);
    PJ* inner = nullptr;
    if (type == PJ_TYPE_BOUND_CRS) inner = proj_get_source_crs(ctx, base);
    else if (type == PJ_TYPE_COMPOUND_CRS) inner = proj_crs_get_sub_crs(ctx, base, 0);
    else break;
    proj_destroy(base);
    base = inner;
  }
  if (base == nullptr) return;
  if (proj_get_type(base) == PJ_TYPE_PROJECTED_CRS) {
    PJ* op = proj_crs_get_coordoperation(ctx, base);
    if (op != nullptr) {
      double lon = 0.0, lat = 0.0;
      if (AngleParameter(ctx, op,
                         {"Longitude of natural origin", "Longitude of false origin",
                          "Longitude of projection centre", "Longitude of origin"},
                         lon))
        facts.origin[0] = lon;
      if (AngleParameter(ctx, op,
                         {"Latitude of natural origin", "Latitude of false origin",
                          "Latitude of projection centre"},
                         lat))
        facts.origin[1] = lat;
      proj_destroy(op);
    }
  }
  proj_destroy(base);
}

// Builds the transformation to `definition`; `facts` (when given) receives what the CRS is.
// False with `why` set when PROJ does not understand the text.
bool BuildTransform(const std::string& definition, Transform& t, std::string& why, CrsFacts* facts) {
  t.ctx = proj_context_create();
  if (t.ctx == nullptr) {
    why = "no PROJ context";
    return false;
  }
  std::string message;
  proj_log_func(t.ctx, &message, KeepMessage);  // failures are reported through MeshError
  proj_log_level(t.ctx, PJ_LOG_ERROR);
  // The context outlives this frame: it must not write to `message` afterwards.
  struct Detach {
    PJ_CONTEXT* ctx;
    ~Detach() {
      proj_log_level(ctx, PJ_LOG_NONE);
      proj_log_func(ctx, nullptr, KeepMessage);
    }
  } detach{t.ctx};
  PJ* crs = proj_create(t.ctx, definition.c_str());
  if (crs == nullptr) {
    why = ProjReason(t.ctx, message, "not understood by PROJ");
    return false;
  }
  if (!proj_is_crs(crs)) {
    proj_destroy(crs);
    why = "not a coordinate reference system";
    return false;
  }
  if (facts != nullptr) {
    const PJ_TYPE type = proj_get_type(crs);
    facts->geographic = type == PJ_TYPE_GEOGRAPHIC_2D_CRS || type == PJ_TYPE_GEOGRAPHIC_3D_CRS;
    FindOrigin(t.ctx, crs, *facts);
  }
  PJ* wgs84 = proj_create(t.ctx, "EPSG:4326");
  PJ* op = wgs84 != nullptr ? proj_create_crs_to_crs_from_pj(t.ctx, wgs84, crs, nullptr, nullptr) : nullptr;
  if (op != nullptr) {
    t.pj = proj_normalize_for_visualization(t.ctx, op);
    proj_destroy(op);
  }
  if (wgs84 != nullptr) proj_destroy(wgs84);
  proj_destroy(crs);
  if (t.pj == nullptr) {
    why = "no transformation from WGS 84: " + ProjReason(t.ctx, message, "unknown reason");
    return false;
  }
  return true;
}

enum class Kind { kLongLat, kCartesian, kProj };

std::atomic<std::uint64_t> g_nextGeneration{1};

// Each thread remembers the transformations it used last, so the common case takes no lock.
struct RecentSlot {
  std::uint64_t generation = 0;
  Transform* transform = nullptr;
};
thread_local std::array<RecentSlot, 4> t_recent;
thread_local unsigned t_recentNext = 0;

}  // namespace

struct Cartography::Impl {
  std::string projection;
  std::string definition;
  Kind kind = Kind::kCartesian;
  CrsFacts facts;
  // Never reused, so a thread's remembered slot can never match a later object at the same
  // address.
  std::uint64_t generation = g_nextGeneration.fetch_add(1);
  mutable std::mutex mutex;
  mutable std::map<std::thread::id, std::unique_ptr<Transform>> perThread;

  // The calling thread's transformation, created on first use; nullptr when that fails.
  Transform* ForThisThread() const {
    for (const RecentSlot& slot : t_recent)
      if (slot.generation == generation) return slot.transform;
    std::lock_guard<std::mutex> lock(mutex);
    std::unique_ptr<Transform>& entry = perThread[std::this_thread::get_id()];
    if (entry == nullptr) {
      auto t = std::make_unique<Transform>();
      std::string why;
      if (!BuildTransform(definition, *t, why, nullptr)) {
        perThread.erase(std::this_thread::get_id());
        return nullptr;
      }
      entry = std::move(t);
    }
    t_recent[t_recentNext++ % t_recent.size()] = RecentSlot{generation, entry.get()};
    return entry.get();
  }

  bool Convert(PJ_DIRECTION direction, double a, double b, double& outA, double& outB) const {
    if (!std::isfinite(a) || !std::isfinite(b)) return false;
    if (kind == Kind::kCartesian) return false;
    if (kind == Kind::kLongLat) {
      outA = a;
      outB = b;
      return true;
    }
    Transform* t = ForThisThread();
    if (t == nullptr) return false;
    const PJ_COORD r = proj_trans(t->pj, direction, proj_coord(a, b, 0.0, 0.0));
    if (!std::isfinite(r.xy.x) || !std::isfinite(r.xy.y)) return false;
    outA = r.xy.x;
    outB = r.xy.y;
    return true;
  }
};

Cartography::Cartography(const std::string& projection) : impl_(std::make_unique<Impl>()) {
  Impl& m = *impl_;
  m.projection = projection;
  if (projection == "LONG/LAT") {
    m.kind = Kind::kLongLat;
    m.facts.geographic = true;
    return;
  }
  if (projection == "NON-UTM") {
    m.kind = Kind::kCartesian;
    return;
  }
  m.kind = Kind::kProj;
  m.definition = ProjectionDefinition(projection);
  std::string why;
  auto t = std::make_unique<Transform>();
  if (m.definition.empty()) {
    why = projection.rfind("UTM-", 0) == 0 ? "the UTM zone must be a number 1 .. 60"
                                           : "no coordinate reference system";
  } else if (BuildTransform(m.definition, *t, why, &m.facts)) {
    // The constructing thread keeps the transformation it has just built.
    m.perThread[std::this_thread::get_id()] = std::move(t);
    return;
  }
  throw MeshError("Unknown projection \"" + projection + "\": " + why);
}

Cartography::~Cartography() {
  // Forget this object in the calling thread's slots (other threads' slots are harmless: the
  // generation is never handed out again).
  for (RecentSlot& slot : t_recent)
    if (slot.generation == impl_->generation) slot = RecentSlot{};
}

const std::string& Cartography::Projection() const { return impl_->projection; }
bool Cartography::IsGeographic() const { return impl_->facts.geographic; }
bool Cartography::IsCartesian() const { return impl_->kind == Kind::kCartesian; }
double Cartography::OriginX() const { return impl_->facts.origin[0]; }
double Cartography::OriginY() const { return impl_->facts.origin[1]; }

bool Cartography::GeoToProj(double lon, double lat, double& x, double& y) const {
  return impl_->Convert(PJ_FWD, lon, lat, x, y);
}

bool Cartography::ProjToGeo(double x, double y, double& lon, double& lat) const {
  return impl_->Convert(PJ_INV, x, y, lon, lat);
}

// Numerically: the point's meridian is followed a little north and south of it and the
// direction of that grid displacement (true north as seen in the grid) is compared with grid
// north. Central differences keep the result exact to well below a microradian.
bool Cartography::MeridianConvergence(double x, double y, double& angle) const {
  angle = 0.0;
  if (impl_->kind == Kind::kCartesian) return false;
  if (IsGeographic()) return std::isfinite(x) && std::isfinite(y);
  double lon = 0.0, lat = 0.0;
  if (!ProjToGeo(x, y, lon, lat)) return false;
  constexpr double kStep = 1e-4;  // degrees of latitude, about 11 m
  const double south = std::max(lat - kStep, -90.0), north = std::min(lat + kStep, 90.0);
  double x1 = 0.0, y1 = 0.0, x2 = 0.0, y2 = 0.0;
  if (!(north > south) || !GeoToProj(lon, south, x1, y1) || !GeoToProj(lon, north, x2, y2)) return false;
  const double dx = x2 - x1, dy = y2 - y1;
  if (dx == 0.0 && dy == 0.0) return false;
  // True north points along (dx, dy); grid north lies clockwise of it by atan2(-dx, dy).
  angle = std::atan2(-dx, dy);
  return true;
}

bool CartGetOrigin(const std::string& projection, double& x, double& y, std::string& error) {
  x = y = 0.0;
  try {
    const Cartography cartography(projection);
    x = cartography.OriginX();
    y = cartography.OriginY();
    return true;
  } catch (const MeshError& e) {
    error = e.what();
    return false;
  }
}
