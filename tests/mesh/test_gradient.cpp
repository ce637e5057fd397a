// Gradients, limiters and face values on random unstructured meshes: exactness on linear
// fields, the limiters' bounds, boundary substitutes, wet/dry flags and the refusals.
#include <gtest/gtest.h>
#include <omp.h>

#include <algorithm>
#include <array>
#include <cmath>
#include <random>
#include <string>
#include <vector>

#include "mesh/Domain.h"
#include "mesh/Gradient.h"
#include "mesh/MeshGeometry.h"
#include "support/RandomMesh.h"

using tavrintest::MakeRandomMesh;
using tavrintest::RandomMeshSpec;

namespace {

class Gradient : public ::testing::Test {
 protected:
  void SetUp() override { ResetMeshTables(); }
  void TearDown() override { ResetMeshTables(); }
};

std::int32_t Across(const MeshData& m, std::int32_t f, std::int32_t e) {
  return m.faces.left[f] == e ? m.faces.right[f] : m.faces.left[f];
}

bool Interior(const MeshData& m, std::int32_t e) {
  for (std::int32_t k = 1; k <= m.elements.NumFaces(e); ++k)
    if (Across(m, m.elements.Face(e, k), e) == 0) return false;
  return true;
}

std::vector<double> Field(const MeshData& m, double a, double b, double c) {
  std::vector<double> phi(m.elements.numElements + 1, 0.0);
  for (std::int32_t e = 1; e <= m.elements.numElements; ++e)
    phi[e] = a + b * m.elements.xc[e] + c * m.elements.yc[e];
  return phi;
}

std::vector<double> RandomField(const MeshData& m, std::uint32_t seed) {
  std::mt19937 rng(seed);
  std::uniform_real_distribution<double> d(-1.0, 1.0);
  std::vector<double> phi(m.elements.numElements + 1, 0.0);
  for (std::int32_t e = 1; e <= m.elements.numElements; ++e) phi[e] = d(rng);
  return phi;
}

// Builds a mesh by hand (nodes x, y; elements as node lists) through the whole set-up.
void HandMesh(MeshData& m, const std::vector<std::array<double, 2>>& nodes,
              const std::vector<std::vector<std::int32_t>>& elements) {
  m = MeshData{};
  m.projection = "NON-UTM";
  AllocateNodes(m.nodes, static_cast<std::int64_t>(nodes.size()));
  for (std::size_t i = 0; i < nodes.size(); ++i)
    AddNode(m.nodes, static_cast<std::int32_t>(i + 1), nodes[i][0], nodes[i][1], -1.0, 1);
  AllocateElementsBasic(m.elements, static_cast<std::int64_t>(elements.size()),
                        static_cast<std::int64_t>(elements.size()) * 4);
  for (std::size_t i = 0; i < elements.size(); ++i)
    AddElement(m.elements, static_cast<std::int32_t>(i + 1), elements[i].size() == 3 ? 21 : 25,
               static_cast<std::int32_t>(elements[i].size()), elements[i].data());
  CheckMeshSafety(m);
  std::vector<std::string> unused, warnings;
  ValidateMesh(m, unused);
  OrientElements(m);
  SetupMeshGeometry(m, warnings);
}

}  // namespace

TEST_F(Gradient, LinearFieldsAreExactOnInteriorElementsForEveryMethod) {
  for (const double quads : {0.0, 0.4}) {
    RandomMeshSpec spec;
    spec.nx = 14;
    spec.ny = 11;
    spec.dx = 3.0;
    spec.dy = 2.0;
    spec.x0 = 1000.0;
    spec.quadFraction = quads;
    spec.seed = quads > 0 ? 7 : 3;
    MeshData m;
    MakeRandomMesh(spec, m);
    const std::vector<double> phi = Field(m, 5.0, 2.0, 3.0);
    const std::vector<double> w = Field(m, -1.0, 0.5, -4.0);
    const std::int32_t ne = m.elements.numElements;
    std::vector<double> gx(ne + 1), gy(ne + 1), wx(ne + 1), wy(ne + 1);
    GradientWorkspace work;
    for (const std::int32_t method : {1, 2, 4, 5}) {
      for (const std::int32_t mode : {1, 2}) {
        SCOPED_TRACE("quads " + std::to_string(quads) + " method " + std::to_string(method) +
                     " mode " + std::to_string(mode));
        CalcGradientScalar2D(m, method, 0, mode, nullptr, nullptr, phi.data(), gx.data(),
                             gy.data(), work);
        CalcGradientVelocity2D(m, method, 0, mode, nullptr, nullptr, nullptr, phi.data(),
                               w.data(), gx.data(), gy.data(), wx.data(), wy.data(), work);
        int checked = 0;
        for (std::int32_t e = 1; e <= ne; ++e) {
          if (!Interior(m, e)) continue;
          if (method == 2) {
            // Green-Gauss is exact where the node values are: check them first.
            bool nodesExact = true;
            for (std::int32_t k = 1; k <= m.elements.NumNodes(e); ++k) {
              const std::int32_t n = m.elements.Node(e, k);
              const double exact = 5.0 + 2.0 * m.nodes.x[n] + 3.0 * m.nodes.y[n];
              nodesExact = nodesExact && std::fabs(work.node1[n] - exact) < 1e-9;
            }
            if (!nodesExact) continue;
          }
          ++checked;
          EXPECT_NEAR(gx[e], 2.0, 1e-8) << e;
          EXPECT_NEAR(gy[e], 3.0, 1e-8) << e;
          if (method != 2) {
            EXPECT_NEAR(wx[e], 0.5, 1e-8) << e;
            EXPECT_NEAR(wy[e], -4.0, 1e-8) << e;
          }
        }
        EXPECT_GT(checked, ne / 4);
      }
    }
  }
}

TEST_F(Gradient, ResultsDoNotDependOnTheNumberOfThreads) {
  RandomMeshSpec spec;
  spec.nx = 30;
  spec.ny = 20;
  spec.quadFraction = 0.3;
  MeshData m;
  MakeRandomMesh(spec, m);
  const std::vector<double> phi = RandomField(m, 11);
  const std::int32_t ne = m.elements.numElements;
  GradientWorkspace work;
  for (const std::int32_t method : {1, 2, 5}) {
    for (const std::int32_t limiter : {0, 1, 2, 3}) {
      std::vector<double> gx1(ne + 1), gy1(ne + 1), gx2(ne + 1), gy2(ne + 1);
      omp_set_num_threads(1);
      CalcGradientScalar2D(m, method, limiter, 1, nullptr, nullptr, phi.data(), gx1.data(),
                           gy1.data(), work);
      omp_set_num_threads(2);
      CalcGradientScalar2D(m, method, limiter, 1, nullptr, nullptr, phi.data(), gx2.data(),
                           gy2.data(), work);
      EXPECT_EQ(gx1, gx2);
      EXPECT_EQ(gy1, gy2);
    }
  }
}

TEST_F(Gradient, BarthJespersenFaceValuesStayWithinTheNeighbourRange) {
  RandomMeshSpec spec;
  spec.nx = 25;
  spec.ny = 25;
  spec.quadFraction = 0.25;
  spec.jitter = 0.3;
  MeshData m;
  MakeRandomMesh(spec, m);
  const std::int32_t ne = m.elements.numElements;
  const std::vector<double> phi = RandomField(m, 5);
  // A few dry elements: they bound nothing and their faces carry no contribution.
  std::vector<std::int32_t> active(ne + 1, 1);
  for (std::int32_t e = 7; e <= ne; e += 37) active[e] = 0;
  std::vector<double> gx(ne + 1), gy(ne + 1);
  GradientWorkspace work;
  for (const std::int32_t method : {1, 2, 4, 5}) {
    CalcGradientScalar2D(m, method, kLimiterBarthJespersen, 2, active.data(), nullptr,
                         phi.data(), gx.data(), gy.data(), work);
    int limited = 0;
    for (std::int32_t e = 1; e <= ne; ++e) {
      if (!active[e]) {
        EXPECT_EQ(gx[e], 0.0);
        continue;
      }
      double lo = phi[e], hi = phi[e];
      for (std::int32_t k = 1; k <= m.elements.NumFaces(e); ++k) {
        const std::int32_t n = Across(m, m.elements.Face(e, k), e);
        if (n != 0 && active[n]) { lo = std::min(lo, phi[n]); hi = std::max(hi, phi[n]); }
      }
      for (std::int32_t k = 1; k <= m.elements.NumFaces(e); ++k) {
        const std::int32_t f = m.elements.Face(e, k);
        const std::int32_t n = Across(m, f, e);
        if (n == 0 || !active[n]) continue;
        const double face = phi[e] + gx[e] * (m.faces.xc[f] - m.elements.xc[e]) +
                            gy[e] * (m.faces.yc[f] - m.elements.yc[e]);
        EXPECT_LE(face, hi + 1e-12) << "method " << method << " element " << e;
        EXPECT_GE(face, lo - 1e-12) << "method " << method << " element " << e;
      }
      limited += gx[e] != 0.0 || gy[e] != 0.0;
    }
    EXPECT_GT(limited, ne / 10) << method;
  }

  // A local maximum gets a zero gradient, whatever its unlimited gradient was.
  std::vector<double> peak = Field(m, 0.0, 1.0, 0.5);
  std::int32_t e0 = 0;
  for (std::int32_t e = ne / 2; e <= ne && e0 == 0; ++e)
    if (Interior(m, e)) e0 = e;
  peak[e0] += 100.0;
  CalcGradientScalar2D(m, 4, 0, 1, nullptr, nullptr, peak.data(), gx.data(), gy.data(), work);
  ASSERT_NE(gx[e0] * gx[e0] + gy[e0] * gy[e0], 0.0);
  LimitGradientBarthJespersen2D(m, nullptr, nullptr, peak.data(), gx.data(), gy.data());
  EXPECT_EQ(gx[e0], 0.0);
  EXPECT_EQ(gy[e0], 0.0);
}

TEST_F(Gradient, EnoAndWeightedLimitersPickAndBlendNeighbourGradients) {
  RandomMeshSpec spec;
  spec.nx = 6;
  spec.ny = 6;
  MeshData m;
  MakeRandomMesh(spec, m);
  const std::int32_t ne = m.elements.numElements;
  std::int32_t e0 = 0;
  for (std::int32_t e = 1; e <= ne && e0 == 0; ++e)
    if (Interior(m, e)) e0 = e;
  ASSERT_NE(e0, 0);
  std::vector<double> gx(ne + 1, 0.0), gy(ne + 1, 1.0), ox(ne + 1), oy(ne + 1);
  // Equal magnitudes everywhere: the element keeps its own gradient.
  gx[e0] = 1.0;
  gy[e0] = 0.0;
  LimitGradientENO2D(m, nullptr, nullptr, gx.data(), gy.data(), ox.data(), oy.data());
  EXPECT_EQ(ox[e0], 1.0);
  EXPECT_EQ(oy[e0], 0.0);
  // A smaller neighbour wins, unless it is dry or its face is inactive.
  const std::int32_t f = m.elements.Face(e0, 2);
  const std::int32_t n = Across(m, f, e0);
  gx[n] = 0.1;
  gy[n] = 0.2;
  LimitGradientENO2D(m, nullptr, nullptr, gx.data(), gy.data(), ox.data(), oy.data());
  EXPECT_EQ(ox[e0], 0.1);
  EXPECT_EQ(oy[e0], 0.2);
  std::vector<std::int32_t> faces(m.faces.numFaces + 1, 1);
  faces[f] = 0;
  LimitGradientENO2D(m, nullptr, faces.data(), gx.data(), gy.data(), ox.data(), oy.data());
  EXPECT_EQ(ox[e0], 1.0);

  // The weighted limiter keeps a uniform gradient on interior elements.
  std::fill(gx.begin(), gx.end(), 0.3);
  std::fill(gy.begin(), gy.end(), -0.7);
  LimitGradientWeighted2D(m, nullptr, gx.data(), gy.data(), ox.data(), oy.data());
  for (std::int32_t e = 1; e <= ne; ++e) {
    if (!Interior(m, e)) continue;
    EXPECT_NEAR(ox[e], 0.3, 1e-15);
    EXPECT_NEAR(oy[e], -0.7, 1e-15);
  }
  // A neighbour with a steep gradient hardly contributes.
  gx[n] = 50.0;
  LimitGradientWeighted2D(m, nullptr, gx.data(), gy.data(), ox.data(), oy.data());
  EXPECT_LT(std::fabs(ox[e0]), 0.3);
  m.dimension = 3;
  try {
    LimitGradientWeighted2D(m, nullptr, gx.data(), gy.data(), ox.data(), oy.data());
    FAIL();
  } catch (const MeshError& e) {
    EXPECT_STREQ(e.what(), "Simple limiter not implemented in 3D");
  }
}

TEST_F(Gradient, FaceValueKinds) {
  // A linear field 1 + 2x - y; U at (0, 0), D at (2, 1), face point (1, 0.2), P on U-D.
  auto phi = [](double x, double y) { return 1.0 + 2.0 * x - y; };
  const double xU = 0, yU = 0, xD = 2, yD = 1, xF = 1, yF = 0.2, xP = 1, yP = 0.5;
  const double pU = phi(xU, yU), pD = phi(xD, yD);
  EXPECT_NEAR(FaceValue2D(0, xU, yU, xD, yD, xF, yF, xP, yP, 1, pU, pD, 2, -1, 2, -1),
              phi(xF, yF), 1e-14);
  EXPECT_NEAR(FaceValue2D(1, xU, yU, xD, yD, xF, yF, xP, yP, 1, pU, pD, 2, -1, 2, -1),
              phi(xF, yF), 1e-14);
  EXPECT_NEAR(FaceValue2D(2, xU, yU, xD, yD, xF, yF, xP, yP, 1, pU, pD, 2, -1, 2, -1),
              phi(1.0, 0.5), 1e-14);  // the midpoint of U-D
  EXPECT_NEAR(FaceValue2D(3, xU, yU, xD, yD, xF, yF, xP, yP, 1, pU, pD, 2, -1, 2, -1),
              phi(xF, yF), 1e-12);
  // No jump: van Leer gives the upwind value.
  EXPECT_EQ(FaceValue2D(2, xU, yU, xD, yD, xF, yF, xP, yP, 1, 4.0, 4.0, 9, 9, 9, 9), 4.0);
  // Random data: bounded and van Leer never leave their ranges.
  std::mt19937 rng(17);
  std::uniform_real_distribution<double> d(-3.0, 3.0);
  for (int i = 0; i < 2000; ++i) {
    const double a = d(rng), b = d(rng), g1 = d(rng), g2 = d(rng), g3 = d(rng), g4 = d(rng);
    const double f1 = FaceValue2D(1, xU, yU, xD, yD, xF, yF, xP, yP, 1, a, b, g1, g2, g3, g4);
    const double bD = b + g3 * (xF - xD) + g4 * (yF - yD);
    EXPECT_LE(f1, std::max({a, b, bD}) + 1e-15);
    EXPECT_GE(f1, std::min({a, b, bD}) - 1e-15);
    const double f2 = FaceValue2D(2, xU, yU, xD, yD, xF, yF, xP, yP, 1, a, b, g1, g2, g3, g4);
    EXPECT_LE(f2, std::max(a, b) + 1e-15);
    EXPECT_GE(f2, std::min(a, b) - 1e-15);
    EXPECT_TRUE(std::isfinite(
        FaceValue2D(3, xU, yU, xD, yD, xF, yF, xP, yP, 1, a, b, g1, g2, g3, g4)));
  }
}

TEST_F(Gradient, BoundarySubstitutesAndVelocityReflection) {
  // Reflection reverses the normal component and keeps the tangential one.
  const double nx = 0.6, ny = 0.8;
  double us, vs;
  VelocitySubstitute(2, 3, nx, ny, 1.5, -0.5, us, vs);
  EXPECT_NEAR(us * nx + vs * ny, -(1.5 * nx - 0.5 * ny), 1e-15);
  EXPECT_NEAR(-us * ny + vs * nx, -1.5 * ny - 0.5 * nx, 1e-15);
  VelocitySubstitute(1, 1, nx, ny, 1.5, -0.5, us, vs);
  EXPECT_EQ(us, 0.0);
  VelocitySubstitute(2, 1, nx, ny, 1.5, -0.5, us, vs);
  EXPECT_EQ(us, -1.5);

  RandomMeshSpec spec;
  spec.nx = 8;
  spec.ny = 8;
  spec.jitter = 0.0;
  MeshData m;
  MakeRandomMesh(spec, m);
  const std::int32_t ne = m.elements.numElements;
  // Corner triangles with two boundary faces get a zero type-1 gradient.
  const GradientStencil& st = SetupGradient(m, 1, 1);
  std::vector<double> phi = Field(m, 0.0, 1.0, 1.0), gx(ne + 1), gy(ne + 1);
  CalcGradientStencil2D(m, st, nullptr, nullptr, phi.data(), gx.data(), gy.data(), false);
  int corners = 0;
  for (std::int32_t e = 1; e <= ne; ++e) {
    if (st.numSubstitutes[e] < 2) continue;
    ++corners;
    EXPECT_EQ(gx[e], 0.0);
    EXPECT_EQ(gy[e], 0.0);
  }
  EXPECT_GT(corners, 0);
  // Mirror points: across the face, as far from it as the centroid.
  const GradientStencil& mirror = SetupGradient(m, 2, 2);
  for (std::int32_t f = 1; f <= m.faces.numFaces; ++f) {
    if (m.faces.right[f] != 0) continue;
    const std::int32_t e = m.faces.left[f];
    const double dc = (m.elements.xc[e] - m.faces.xc[f]) * m.faces.nx[f] +
                      (m.elements.yc[e] - m.faces.yc[f]) * m.faces.ny[f];
    const double dm = (mirror.xMirror[f] - m.faces.xc[f]) * m.faces.nx[f] +
                      (mirror.yMirror[f] - m.faces.yc[f]) * m.faces.ny[f];
    EXPECT_NEAR(dm, -dc, 1e-12);
  }
  // A uniform flow along the straight walls: reflected and copied substitutes keep it
  // uniform, closed walls in mode 2 reverse it.
  const std::vector<double> u(ne + 1, 1.0), v(ne + 1, 0.0);
  std::vector<double> ux(ne + 1), uy(ne + 1), vx(ne + 1), vy(ne + 1);
  GradientWorkspace work;
  for (const std::int32_t type : {2, 3}) {
    std::vector<std::int32_t> south(m.faces.numFaces + 1, 0);
    for (std::int32_t f = 1; f <= m.faces.numFaces; ++f)
      if (m.faces.right[f] == 0) south[f] = type;
    for (const std::int32_t method : {1, 4, 5}) {
      CalcGradientVelocity2D(m, method, 0, 2, nullptr, nullptr, south.data(), u.data(),
                             v.data(), ux.data(), uy.data(), vx.data(), vy.data(), work);
      for (std::int32_t e = 1; e <= ne; ++e) {
        // Reflection at east/west walls turns u around; only the south/north ones keep it.
        const bool eastWest = std::fabs(m.elements.xc[e] - 0.5) < 0.5 ||
                              std::fabs(m.elements.xc[e] - 7.5) < 0.5;
        if (type == 3 && eastWest) continue;
        EXPECT_NEAR(ux[e], 0.0, 1e-12) << type << " " << method << " " << e;
        EXPECT_NEAR(uy[e], 0.0, 1e-12) << type << " " << method << " " << e;
      }
    }
  }
  std::vector<std::int32_t> land(m.faces.numFaces + 1, 1);
  CalcGradientVelocity2D(m, 4, 0, 2, nullptr, nullptr, land.data(), u.data(), v.data(),
                         ux.data(), uy.data(), vx.data(), vy.data(), work);
  double wall = 0.0;
  for (std::int32_t e = 1; e <= ne; ++e) wall += std::fabs(uy[e]);
  EXPECT_GT(wall, 1.0);
}

TEST_F(Gradient, DryNeighboursNeverEnterAGradient) {
  RandomMeshSpec spec;
  spec.nx = 12;
  spec.ny = 12;
  spec.quadFraction = 0.3;
  MeshData m;
  MakeRandomMesh(spec, m);
  const std::int32_t ne = m.elements.numElements;
  std::vector<std::int32_t> active(ne + 1, 1);
  for (std::int32_t e = 3; e <= ne; e += 11) active[e] = 0;
  std::vector<double> phi = RandomField(m, 9), stale = phi;
  for (std::int32_t e = 1; e <= ne; ++e)
    if (!active[e]) stale[e] = 1e30;
  std::vector<double> a(ne + 1), b(ne + 1), c(ne + 1), d(ne + 1);
  GradientWorkspace work;
  for (const std::int32_t method : {1, 2, 4, 5}) {
    for (const std::int32_t limiter : {0, 1, 3}) {
      CalcGradientScalar2D(m, method, limiter, 1, active.data(), nullptr, phi.data(), a.data(),
                           b.data(), work);
      CalcGradientScalar2D(m, method, limiter, 1, active.data(), nullptr, stale.data(),
                           c.data(), d.data(), work);
      for (std::int32_t e = 1; e <= ne; ++e) {
        if (!active[e]) {
          EXPECT_EQ(a[e], 0.0);
          continue;
        }
        ASSERT_NEAR(a[e], c[e], 1e-9) << method << " " << limiter << " " << e;
        ASSERT_NEAR(b[e], d[e], 1e-9) << method << " " << limiter << " " << e;
      }
    }
  }
  // The kept type-1 stencil counts dry neighbours as substitutes: a triangle with two of them
  // (or one beside a boundary face) has too few points for a plane and gets a zero gradient.
  const GradientStencil& st = SetupGradient(m, 1, 1);
  std::fill(active.begin(), active.end(), 1);
  std::int32_t e0 = 0;
  for (std::int32_t e = 1; e <= ne && e0 == 0; ++e)
    if (Interior(m, e) && m.elements.NumFaces(e) == 3) e0 = e;
  const std::vector<double> linear = Field(m, 0.0, 1.0, 1.0);
  active[Across(m, m.elements.Face(e0, 1), e0)] = 0;
  CalcGradientStencil2D(m, st, active.data(), nullptr, linear.data(), a.data(), b.data(), false);
  EXPECT_NE(a[e0], 0.0);
  active[Across(m, m.elements.Face(e0, 2), e0)] = 0;
  CalcGradientStencil2D(m, st, active.data(), nullptr, linear.data(), a.data(), b.data(), false);
  EXPECT_EQ(a[e0], 0.0);
  EXPECT_EQ(b[e0], 0.0);
}

TEST_F(Gradient, SingularStencilsGiveZeroAndAreCounted) {
  // The middle triangle's two neighbours have their centroids on the line of its boundary
  // face, so the face-centre substitute makes the type-1 points collinear.
  MeshData m;
  HandMesh(m, {{0, 0}, {2, 0}, {1, 1}, {-3, -1}, {5, -1}}, {{1, 2, 3}, {1, 3, 4}, {2, 5, 3}});
  const std::vector<double> phi = Field(m, 0.0, 1.0, 2.0);
  std::vector<double> gx(4, 9.0), gy(4, 9.0);
  const GradientStencil& st = SetupGradient(m, 1, 1);
  EXPECT_EQ(st.numSingular, 1);
  CalcGradientStencil2D(m, st, nullptr, nullptr, phi.data(), gx.data(), gy.data(), false);
  EXPECT_EQ(gx[1], 0.0);
  EXPECT_EQ(gy[1], 0.0);
  EXPECT_EQ(CalcGradientElementValues2D(m, 1, nullptr, nullptr, phi.data(), gx.data(), gy.data()),
            1);
  // The mirror point lies off that line, and least squares do not mind.
  EXPECT_EQ(SetupGradient(m, 1, 2).numSingular, 0);
  EXPECT_EQ(SetupGradient(m, 2, 1).numSingular, 0);
}

TEST_F(Gradient, StencilsAreKeptPerTypeAndModeAndBadCodesStop) {
  RandomMeshSpec spec;
  spec.nx = 4;
  spec.ny = 4;
  MeshData m;
  MakeRandomMesh(spec, m);
  const GradientStencil* a = &SetupGradient(m, 2, 1);
  EXPECT_EQ(a, &SetupGradient(m, 2, 1));
  EXPECT_NE(a, &SetupGradient(m, 2, 2));
  EXPECT_NE(a, &SetupGradient(m, 3, 1));
  EXPECT_EQ(m.stencils.size(), 3u);
  // Type 3 reaches the second ring but never the element itself or an element twice.
  const GradientStencil& s3 = SetupGradient(m, 3, 1);
  for (std::int32_t e = 1; e <= m.elements.numElements; ++e) {
    std::vector<std::int32_t> seen;
    for (std::int32_t j = s3.start[e]; j < s3.start[e + 1]; ++j) {
      EXPECT_NE(s3.element[j], e);
      if (s3.element[j] == 0) continue;
      EXPECT_EQ(std::count(seen.begin(), seen.end(), s3.element[j]), 0);
      seen.push_back(s3.element[j]);
    }
    EXPECT_LE(s3.start[e + 1] - s3.start[e], 16);
  }
  const std::int32_t ne = m.elements.numElements;
  std::vector<double> phi(ne + 1, 1.0), gx(ne + 1), gy(ne + 1);
  GradientWorkspace work;
  auto message = [&](std::int32_t method, std::int32_t mode) {
    try {
      CalcGradientScalar2D(m, method, 0, mode, nullptr, nullptr, phi.data(), gx.data(),
                           gy.data(), work);
    } catch (const MeshError& e) {
      return std::string(e.what());
    }
    return std::string();
  };
  EXPECT_EQ(message(6, 1), "SetupGradient: Gradient type not supported");
  EXPECT_EQ(message(0, 1), "CalcGradientScalar2D: Gradient method not supported (0)");
  EXPECT_EQ(message(4, 3), "CalcGradientScalar2D: Boundary mode not supported (3)");
}
