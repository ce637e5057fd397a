// Random unstructured 2-D meshes for the property tests: a rectangle of nx x ny cells whose
// interior nodes are moved at random, each cell split into two triangles along a random
// diagonal or, with probability `quadFraction`, kept as a quadrilateral. The mesh is complete
// (validated, oriented, faces, geometry, connectivity) and lives in the caller's record.
#pragma once

#include <cstdint>
#include <string>

#include "mesh/MeshData.h"

namespace tavrintest {

struct RandomMeshSpec {
  int nx = 10, ny = 10;
  double dx = 1.0, dy = 1.0;
  double x0 = 0.0, y0 = 0.0;
  double jitter = 0.25;        // interior node movement as a fraction of the cell size
  double quadFraction = 0.0;   // share of cells kept as quadrilaterals
  std::uint32_t seed = 1;
  std::string projection = "NON-UTM";
};

// Fills `mesh` (the run's shape table must be empty or hold compatible shapes).
void MakeRandomMesh(const RandomMeshSpec& spec, MeshData& mesh);

}  // namespace tavrintest
