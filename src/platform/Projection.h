// Thin layer over PROJ: turns the engine's projection texts into WKT for data files.
#pragma once

#include <string>

// WKT (WKT2:2019) of a projection text, or "" when PROJ does not know it. Recognised:
// "UTM-<zone>" (WGS 84 / UTM, northern hemisphere), "LONG/LAT" (WGS 84 geographic), and anything
// PROJ itself accepts ("EPSG:25832", a PROJ string, WKT). "NON-UTM" and "unknown" give "".
std::string ProjectionWkt(const std::string& projection);
