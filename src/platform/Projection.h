// Thin layer over PROJ: the engine's projection texts as PROJ definitions, and as WKT for data
// files.
#pragma once

#include <string>

// The PROJ definition of a projection text: "UTM-<zone>" (zone 1 .. 60) is WGS 84 / UTM zone
// north ("EPSG:326zz"), "LONG/LAT" WGS 84 geographic ("EPSG:4326"); PROJ strings
// ("+proj=...") get "+type=crs" so PROJ reads them as a coordinate reference system; anything
// else ("EPSG:25832", WKT) is handed on as it stands. "" for the texts that name no coordinate
// reference system: "", "NON-UTM", "unknown" and "UTM-" with a zone outside 1 .. 60.
std::string ProjectionDefinition(const std::string& projection);

// WKT (WKT2:2019) of a projection text, or "" when PROJ does not know it.
std::string ProjectionWkt(const std::string& projection);
