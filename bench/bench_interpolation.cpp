// Node values, search tree and point lookups on a triangulated rectangle of 1,000,000 triangles
// (or the count given as the argument) built in memory: the wet node values, the two-component
// node values, the tree build and 100,000 random point lookups, each with 1 and 2 threads and
// the best of three runs. The tree is built by one thread; the lookups of the benchmark run in
// an OpenMP loop (the tree is read-only once built).
#include <omp.h>

#include <algorithm>
#include <chrono>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <random>
#include <string>
#include <vector>

#include "mesh/Domain.h"
#include "mesh/Interpolation.h"
#include "mesh/MeshGeometry.h"

namespace {

using Clock = std::chrono::steady_clock;

double Seconds(Clock::time_point a, Clock::time_point b) {
  return std::chrono::duration<double>(b - a).count();
}

// nx x ny cells of 10 m, two triangles each, interior nodes jittered.
void MakeMesh(MeshData& m, long nx, long ny) {
  AllocateNodes(m.nodes, (nx + 1) * (ny + 1));
  for (long j = 0; j <= ny; ++j)
    for (long i = 0; i <= nx; ++i) {
      const bool edge = i == 0 || j == 0 || i == nx || j == ny;
      const double jitter = edge ? 0.0 : 2.0 * std::sin(0.7 * double(i) + 1.3 * double(j));
      AddNode(m.nodes, std::int32_t(j * (nx + 1) + i + 1), 10.0 * i + jitter, 10.0 * j - jitter,
              -5.0, edge ? 1 : 0);
    }
  AllocateElementsBasic(m.elements, 2 * nx * ny, 6 * nx * ny);
  std::int32_t id = 0;
  for (long j = 0; j < ny; ++j)
    for (long i = 0; i < nx; ++i) {
      const std::int32_t n1 = std::int32_t(j * (nx + 1) + i + 1), n2 = n1 + 1,
                         n3 = n2 + std::int32_t(nx) + 1, n4 = n1 + std::int32_t(nx) + 1;
      const std::int32_t a[3] = {n1, n2, n3}, b[3] = {n1, n3, n4};
      AddElement(m.elements, ++id, 21, 3, a);
      AddElement(m.elements, ++id, 21, 3, b);
    }
  std::vector<std::string> unused, warnings;
  CheckMeshSafety(m);
  ValidateMesh(m, unused);
  OrientElements(m);
  SetupMeshGeometry(m, warnings);
}

template <class F>
double Best(F f) {
  double best = 1e30;
  for (int rep = 0; rep < 3; ++rep) {
    const auto t0 = Clock::now();
    f();
    best = std::min(best, Seconds(t0, Clock::now()));
  }
  return best;
}

}  // namespace

int main(int argc, char** argv) {
  const long triangles = argc > 1 ? std::atol(argv[1]) : 1000000;
  const long ny = static_cast<long>(std::sqrt(double(triangles) / 4.0));  // cells 2:1
  const long nx = triangles / (2 * ny);
  ResetMeshTables();
  MeshData m;
  MakeMesh(m, nx, ny);
  const std::int32_t ne = m.elements.numElements, nn = m.nodes.numNodes;

  std::vector<double> u(ne + 1), v(ne + 1), a(nn + 1), b(nn + 1);
  std::vector<std::int32_t> wet(ne + 1);
  for (std::int32_t e = 1; e <= ne; ++e) {
    u[e] = 0.01 * m.elements.xc[e] - 0.02 * m.elements.yc[e];
    v[e] = std::sin(1e-3 * m.elements.xc[e]);
    wet[e] = (e % 10) != 0;  // one element in ten dry
  }
  constexpr int kLookups = 100000;
  std::mt19937 rng(7);
  std::uniform_real_distribution<double> ux(0.0, 10.0 * nx), uy(0.0, 10.0 * ny);
  std::vector<double> px(kLookups), py(kLookups);
  for (int i = 0; i < kLookups; ++i) { px[i] = ux(rng); py[i] = uy(rng); }
  std::vector<std::int32_t> found(kLookups);

  std::printf("mesh: %d triangles, %d nodes\n", ne, nn);
  std::printf("%7s %10s %10s %10s %12s %10s\n", "threads", "wet_ms", "wet2_ms", "build_s",
              "lookup_us", "found");
  for (const int threads : {1, 2}) {
    omp_set_num_threads(threads);
    const double wet1 = Best([&] { CalcNodeValuesWetPL2D(m, u.data(), wet.data(), a.data()); });
    const double wet2 = Best(
        [&] { CalcNodeValues2WetPL2D(m, u.data(), v.data(), wet.data(), a.data(), b.data()); });
    SearchTree2D tree;
    const double build = Best([&] { BuildSearchTree2D(m, tree); });
    const double lookups = Best([&] {
#pragma omp parallel for schedule(static)
      for (int i = 0; i < kLookups; ++i) found[i] = FindElementID2DSearchTree(tree, px[i], py[i]);
    });
    const long hits = found.size() - std::count(found.begin(), found.end(), 0);
    std::printf("%7d %10.2f %10.2f %10.3f %12.3f %10ld\n", threads, 1e3 * wet1, 1e3 * wet2, build,
                1e6 * lookups / kLookups, hits);
    if (threads == 1) {
      std::int32_t leaves = 0, depth = 0;
      std::size_t held = 0;
      for (const SearchTreeNode& node : tree.nodes) {
        if (node.numElements < 0) continue;
        ++leaves;
        held += node.elements.size();
        depth = std::max(depth, node.depth);
      }
      std::printf("tree: %zu nodes, %d leaves, %.2f elements per leaf, %.2f leaf entries per "
                  "element, depth %d\n",
                  tree.nodes.size(), leaves, double(held) / leaves, double(held) / ne, depth);
    }
    std::fflush(stdout);
  }
  return 0;
}
