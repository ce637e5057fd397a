// A small flexible-mesh file for the data-file tests: a triangle (nodes 1, 2, 3) and a
// quadrilateral (nodes 2, 4, 5, 3) with one item of one value per element.
#pragma once

#include <string>

#include "io/DataFile.h"

namespace tavrintest {

// Creates `file` with the mesh at node coordinates x[5], y[5], leaving the record open for
// dynamic writes of item 1 ("Depth", bathymetry, 2 values).
bool CreateTwoElementMesh(DataFile& df, const std::string& file, const double* x, const double* y);

}  // namespace tavrintest
