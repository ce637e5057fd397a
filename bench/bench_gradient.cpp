// Gradient and limiter throughput on a random triangle mesh (1,000,000 elements by default, or
// the element count given as the first argument): the stencil set-up, and one gradient pass per
// method and limiter for one quantity and for three (water level and the two velocity
// components), at 1 and 2 threads. Figures are the best of five passes, in million elements
// per second (per pass; "per core" divides by the threads).
#include <omp.h>

#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <random>
#include <vector>

#include "mesh/Domain.h"
#include "mesh/Gradient.h"
#include "support/RandomMesh.h"

namespace {

using Clock = std::chrono::steady_clock;

template <typename F>
double Best(int runs, F&& f) {
  double best = 1e30;
  for (int i = 0; i < runs; ++i) {
    const auto t0 = Clock::now();
    f();
    best = std::min(best, std::chrono::duration<double>(Clock::now() - t0).count());
  }
  return best;
}

}  // namespace

int main(int argc, char** argv) {
  const long elements = argc > 1 ? std::atol(argv[1]) : 1000000;
  tavrintest::RandomMeshSpec spec;
  spec.nx = 1000;
  spec.ny = static_cast<int>(elements / (2 * spec.nx));
  spec.dx = spec.dy = 10.0;
  spec.jitter = 0.2;
  spec.seed = 42;
  ResetMeshTables();
  MeshData mesh;
  omp_set_num_threads(2);
  tavrintest::MakeRandomMesh(spec, mesh);
  const std::int32_t ne = mesh.elements.numElements;
  std::printf("mesh: %d elements, %d faces\n", ne, mesh.faces.numFaces);

  std::mt19937 rng(1);
  std::uniform_real_distribution<double> d(-1.0, 1.0);
  std::vector<double> eta(ne + 1), u(ne + 1), v(ne + 1);
  for (std::int32_t e = 1; e <= ne; ++e) {
    eta[e] = 0.01 * mesh.elements.xc[e] + 0.1 * d(rng);
    u[e] = 1.0 + 0.1 * d(rng);
    v[e] = 0.1 * d(rng);
  }
  std::vector<std::int32_t> active(ne + 1, 1), activeFace(mesh.faces.numFaces + 1, 1),
      btype(mesh.faces.numFaces + 1, 1);
  std::vector<double> gx(ne + 1), gy(ne + 1), ux(ne + 1), uy(ne + 1), vx(ne + 1), vy(ne + 1);
  GradientWorkspace work;
  SetupGradientWorkspace(mesh, work);

  for (const int threads : {1, 2}) {
    omp_set_num_threads(threads);
    for (const int type : {2, 3}) {
      const double t = Best(3, [&] {
        mesh.stencils.clear();
        SetupGradient(mesh, type, 1);
      });
      std::printf("threads %d  stencil type %d set-up: %.3f s\n", threads, type, t);
    }
    SetupGradient(mesh, 2, 1);
    SetupGradient(mesh, 3, 1);
    struct Case { int method, limiter; const char* name; };
    const Case cases[] = {{4, 3, "stencil type 2 + Barth-Jespersen"},
                          {4, 0, "stencil type 2, unlimited"},
                          {5, 3, "stencil type 3 + Barth-Jespersen"},
                          {1, 3, "element values + Barth-Jespersen"},
                          {2, 3, "node values (Green-Gauss) + Barth-Jespersen"},
                          {4, 1, "stencil type 2 + ENO"},
                          {4, 2, "stencil type 2 + weighted"}};
    for (const Case& c : cases) {
      const double one = Best(5, [&] {
        CalcGradientScalar2D(mesh, c.method, c.limiter, 1, active.data(), activeFace.data(),
                             eta.data(), gx.data(), gy.data(), work);
      });
      const double three = Best(5, [&] {
        CalcGradientScalar2D(mesh, c.method, c.limiter, 1, active.data(), activeFace.data(),
                             eta.data(), gx.data(), gy.data(), work);
        CalcGradientVelocity2D(mesh, c.method, c.limiter, 1, active.data(), activeFace.data(),
                               btype.data(), u.data(), v.data(), ux.data(), uy.data(),
                               vx.data(), vy.data(), work);
      });
      std::printf("threads %d  %-44s 1 quantity %7.2f ms = %6.1f M el/s (%5.1f per core); "
                  "3 quantities %7.2f ms\n",
                  threads, c.name, 1e3 * one, ne / one / 1e6, ne / one / 1e6 / threads,
                  1e3 * three);
    }
  }
  return 0;
}
