#include "support/RandomMesh.h"

#include <random>
#include <vector>

#include "mesh/MeshGeometry.h"

namespace tavrintest {

void MakeRandomMesh(const RandomMeshSpec& spec, MeshData& m) {
  std::mt19937 rng(spec.seed);
  std::uniform_real_distribution<double> unit(-1.0, 1.0), coin(0.0, 1.0);
  m = MeshData{};
  m.projection = spec.projection;
  const int nx = spec.nx, ny = spec.ny;
  AllocateNodes(m.nodes, std::int64_t(nx + 1) * (ny + 1));
  for (int j = 0; j <= ny; ++j)
    for (int i = 0; i <= nx; ++i) {
      const bool edge = i == 0 || j == 0 || i == nx || j == ny;
      double x = spec.x0 + spec.dx * i, y = spec.y0 + spec.dy * j;
      if (!edge) {
        x += spec.jitter * spec.dx * unit(rng);
        y += spec.jitter * spec.dy * unit(rng);
      }
      AddNode(m.nodes, j * (nx + 1) + i + 1, x, y, -1.0, edge ? 1 : 0);
    }
  AllocateElementsBasic(m.elements, std::int64_t(2) * nx * ny, std::int64_t(6) * nx * ny);
  std::int32_t id = 0;
  for (int j = 0; j < ny; ++j)
    for (int i = 0; i < nx; ++i) {
      const std::int32_t n1 = j * (nx + 1) + i + 1, n2 = n1 + 1, n3 = n2 + nx + 1,
                         n4 = n1 + nx + 1;
      if (coin(rng) < spec.quadFraction) {
        const std::int32_t q[4] = {n1, n2, n3, n4};
        AddElement(m.elements, ++id, 25, 4, q);
      } else if (coin(rng) < 0.5) {
        const std::int32_t a[3] = {n1, n2, n3}, b[3] = {n1, n3, n4};
        AddElement(m.elements, ++id, 21, 3, a);
        AddElement(m.elements, ++id, 21, 3, b);
      } else {
        const std::int32_t a[3] = {n1, n2, n4}, b[3] = {n2, n3, n4};
        AddElement(m.elements, ++id, 21, 3, a);
        AddElement(m.elements, ++id, 21, 3, b);
      }
    }
  CheckMeshSafety(m);
  std::vector<std::string> unused, warnings;
  ValidateMesh(m, unused);
  OrientElements(m);
  SetupMeshGeometry(m, warnings);
}

}  // namespace tavrintest
