#include "platform/Projection.h"

#include <proj.h>

#include <cctype>
#include <cstdlib>

namespace {

// The PROJ definition of a projection text, or "" when none applies.
std::string ProjDefinition(const std::string& text) {
  if (text.empty() || text == "NON-UTM" || text == "unknown" || text == "Unknown") return "";
  if (text == "LONG/LAT") return "EPSG:4326";
  if (text.rfind("UTM-", 0) == 0 && text.size() > 4) {
    char* end = nullptr;
    const long zone = std::strtol(text.c_str() + 4, &end, 10);
    if (*end == '\0' && zone >= 1 && zone <= 60) return "EPSG:" + std::to_string(32600 + zone);
    return "";
  }
  return text;
}

}  // namespace

std::string ProjectionWkt(const std::string& projection) {
  const std::string definition = ProjDefinition(projection);
  if (definition.empty()) return "";
  PJ_CONTEXT* ctx = proj_context_create();
  proj_log_level(ctx, PJ_LOG_NONE);  // an unknown text is an answer here, not an error to print
  std::string wkt;
  PJ* crs = proj_create(ctx, definition.c_str());
  if (crs != nullptr) {
    const char* const options[] = {"MULTILINE=NO", nullptr};
    const char* text = proj_as_wkt(ctx, crs, PJ_WKT2_2019, options);
    if (text != nullptr) wkt = text;
    proj_destroy(crs);
  }
  proj_context_destroy(ctx);
  return wkt;
}
