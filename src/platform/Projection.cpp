#include "platform/Projection.h"

#include <proj.h>

#include <cstdlib>

std::string ProjectionDefinition(const std::string& text) {
  if (text.empty() || text == "NON-UTM" || text == "unknown" || text == "Unknown") return "";
  if (text == "LONG/LAT") return "EPSG:4326";
  if (text.rfind("UTM-", 0) == 0) {
    char* end = nullptr;
    const long zone = text.size() > 4 ? std::strtol(text.c_str() + 4, &end, 10) : 0;
    if (end != nullptr && *end == '\0' && zone >= 1 && zone <= 60)
      return "EPSG:" + std::to_string(32600 + zone);
    return "";
  }
  // A bare PROJ string describes an operation unless it says it is a CRS.
  if ((text[0] == '+' || text.rfind("proj=", 0) == 0) && text.find("type=crs") == std::string::npos)
    return text + " +type=crs";
  return text;
}

std::string ProjectionWkt(const std::string& projection) {
  const std::string definition = ProjectionDefinition(projection);
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
