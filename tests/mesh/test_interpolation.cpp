// Node values from element values, the point-lookup tree and point values in elements.
#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <functional>
#include <random>
#include <string>
#include <vector>

#include "mesh/Domain.h"
#include "mesh/Interpolation.h"
#include "mesh/MeshGeometry.h"
#include "support/RandomMesh.h"

namespace {

using tavrintest::RandomMeshSpec;
struct XY { double x, y; };
struct Shape { std::vector<XY> nodes; std::vector<std::vector<std::int32_t>> cells; };

// Mesh of a node and element list; `setUp` runs the geometry set-up (nodes left unused, as in
// a mesh with a hole, are kept: the identifier validation is not run).
MeshData Build(const Shape& s, bool setUp = true, const std::string& projection = "NON-UTM") {
  MeshData m;
  m.projection = projection;
  AllocateNodes(m.nodes, std::int64_t(s.nodes.size()));
  for (std::size_t i = 0; i < s.nodes.size(); ++i)
    AddNode(m.nodes, std::int32_t(i + 1), s.nodes[i].x, s.nodes[i].y, -1.0, 1);
  AllocateElementsBasic(m.elements, std::int64_t(s.cells.size()), 4 * std::int64_t(s.cells.size()));
  for (std::size_t i = 0; i < s.cells.size(); ++i)
    AddElement(m.elements, std::int32_t(i + 1), s.cells[i].size() == 3 ? 21 : 25,
               std::int32_t(s.cells[i].size()), s.cells[i].data());
  std::vector<std::string> warnings;
  if (setUp) {
    CheckMeshSafety(m);
    OrientElements(m);
    SetupMeshGeometry(m, warnings);
  }
  return m;
}

// nx x ny square cells of size h, two triangles each where keep(i, j); nodes row by row, x
// mapped through `mapX` (longitudes across the dateline).
Shape Grid(int nx, int ny, double h, double x0, double y0,
           const std::function<bool(int, int)>& keep = [](int, int) { return true; },
           const std::function<double(double)>& mapX = [](double x) { return x; }) {
  Shape s;
  for (int j = 0; j <= ny; ++j)
    for (int i = 0; i <= nx; ++i) s.nodes.push_back({mapX(x0 + h * i), y0 + h * j});
  for (int j = 0; j < ny; ++j)
    for (int i = 0; i < nx; ++i) {
      const std::int32_t n1 = j * (nx + 1) + i + 1, n3 = n1 + nx + 2;
      if (keep(i, j)) s.cells.insert(s.cells.end(), {{n1, n1 + 1, n3}, {n1, n3, n3 - 1}});
    }
  return s;
}

bool Contains(const MeshData& m, std::int32_t e, double px, double py) {
  double x[4], y[4];
  const std::int32_t n = std::min(m.elements.NumNodes(e), 4);
  for (std::int32_t k = 0; k < n; ++k) {
    const std::int32_t node = m.elements.Node(e, k + 1);
    x[k] = m.IsLongLat() && k > 0 ? WrapNear(m.nodes.x[node], x[0]) : m.nodes.x[node];
    y[k] = m.nodes.y[node];
  }
  return PointInElement2D(n, x, y, m.IsLongLat() ? WrapNear(px, x[0]) : px, py);
}

// Tree lookups of `count` random points in [x0, x1] x [y0, y1] (longitudes brought within
// +-pi) and of `extra` against a search over all elements; returns how many the mesh holds.
int CheckLookups(MeshData& m, int count, double x0, double x1, double y0, double y1,
                 std::vector<XY> extra = {}) {
  std::mt19937 rng(count);
  std::uniform_real_distribution<double> ux(x0, x1), uy(y0, y1);
  for (int i = 0; i < count; ++i) extra.push_back({ux(rng), uy(rng)});
  if (m.IsLongLat())
    for (XY& p : extra) p.x = p.x > kPi ? p.x - kTwoPi : p.x;
  const SearchTree2D& tree = GetSearchTree2D(m);
  int inside = 0;
  for (const XY& p : extra) {
    bool any = false;
    for (std::int32_t e = 1; e <= m.elements.numElements && !any; ++e)
      any = Contains(m, e, p.x, p.y);
    const std::int32_t found = FindElementID2DSearchTree(tree, p.x, p.y);
    inside += any;
    EXPECT_TRUE(any ? found != 0 && Contains(m, found, p.x, p.y) : found == 0) << p.x << " " << p.y;
  }
  return inside;
}

// Whether all pseudo-Laplacian weights of node n stay inside (0, 2): only there is a linear
// field reproduced exactly.
bool WeightsUnclipped(const MeshData& m, std::int32_t n) {
  double r[2] = {0, 0}, ixx = 0, iyy = 0, ixy = 0;
  std::vector<XY> d;
  for (std::int32_t i = m.nodes.elemStart[n]; i < m.nodes.elemStart[n + 1]; ++i) {
    const std::int32_t e = m.nodes.elemList[i];
    const double xc = m.IsLongLat() ? WrapNear(m.elements.xc[e], m.nodes.x[n]) : m.elements.xc[e];
    const XY q = d.emplace_back(XY{xc - m.nodes.x[n], m.elements.yc[e] - m.nodes.y[n]});
    r[0] += q.x; r[1] += q.y; ixx += q.x * q.x; iyy += q.y * q.y; ixy += q.x * q.y;
  }
  const double det = ixx * iyy - ixy * ixy;
  const double lx = (ixy * r[1] - iyy * r[0]) / det, ly = (ixy * r[0] - ixx * r[1]) / det;
  return std::fabs(det) > 1e-8 * ixx * iyy && std::all_of(d.begin(), d.end(), [&](XY q) {
    return std::fabs(lx * q.x + ly * q.y) < 1.0 - 1e-9;
  });
}

void ExpectMeshError(const std::function<void()>& f, const char* message) {
  try {
    f();
    ADD_FAILURE() << "no error: " << message;
  } catch (const MeshError& e) {
    EXPECT_STREQ(e.what(), message);
  }
}

class Interpolation : public ::testing::Test {
 protected:
  void SetUp() override { ResetMeshTables(); }
  void TearDown() override { ResetMeshTables(); }
  // A triangle mesh and a mixed one (quadrilaterals kept convex by the smaller jitter).
  std::vector<RandomMeshSpec> Layouts() const {
    return {{.nx = 24, .ny = 18, .dx = 1.5, .x0 = -7.0, .y0 = 3.0, .jitter = 0.3, .seed = 11},
            {.nx = 24, .ny = 18, .dx = 1.5, .x0 = -7.0, .y0 = 3.0, .jitter = 0.2,
             .quadFraction = 0.4, .seed = 12}};
  }
  MeshData Random(const RandomMeshSpec& layout) const {
    MeshData m;
    tavrintest::MakeRandomMesh(layout, m);
    return m;
  }
};
using SearchTree = Interpolation;
using PointValue = Interpolation;

TEST_F(Interpolation, LinearFieldReproducedWhereNoWeightIsClipped) {
  for (const RandomMeshSpec& layout : Layouts()) {
    const MeshData m = Random(layout);
    const std::int32_t ne = m.elements.numElements, nn = m.nodes.numNodes;
    auto f = [](double x, double y) { return 3.0 + 0.7 * x - 1.3 * y; };
    auto g = [](double x, double y) { return -2.0 - 0.4 * x + 0.9 * y; };
    std::vector<double> u(ne + 1), v(ne + 1), a(nn + 1), b(nn + 1), c(nn + 1), d(nn + 1);
    for (std::int32_t e = 1; e <= ne; ++e) {
      u[e] = f(m.elements.xc[e], m.elements.yc[e]);
      v[e] = g(m.elements.xc[e], m.elements.yc[e]);
    }
    const std::vector<std::int32_t> wet(ne + 1, 1);
    CalcNodeValuesPL2D(m, u.data(), -1e30, 1, a.data());
    CalcNodeValuesWetPL2D(m, u.data(), wet.data(), b.data());
    CalcNodeValues2WetPL2D(m, u.data(), v.data(), wet.data(), c.data(), d.data());
    int checked = 0;
    for (std::int32_t n = 1; n <= nn; ++n) {
      if (!WeightsUnclipped(m, n)) continue;
      ++checked;
      const double x = m.nodes.x[n], y = m.nodes.y[n], tol = 5e-8;  // 1e-9 of the field range
      for (const double got : {a[n], b[n], c[n]}) EXPECT_NEAR(got, f(x, y), tol) << n;
      EXPECT_NEAR(d[n], g(x, y), tol) << n;
    }
    EXPECT_GT(checked, nn / 2);
  }
}

// Dry and deleted elements carry values that would show. The wet and delete rules agree,
// results lie within the kept values, a node with one kept element takes its value, and a node
// with none gets 0 (wet) or the delete value.
TEST_F(Interpolation, DryAndDeletedElementsAreSkipped) {
  for (const RandomMeshSpec& layout : Layouts()) {
    const MeshData m = Random(layout);
    const std::int32_t ne = m.elements.numElements, nn = m.nodes.numNodes;
    const double del = -999.0;
    std::mt19937 rng(5);
    std::uniform_real_distribution<double> val(-1.0, 1.0);
    std::vector<std::int32_t> wet(ne + 1);
    std::vector<double> u(ne + 1), v(ne + 1), deleted(ne + 1);
    for (std::int32_t e = 1; e <= ne; ++e) wet[e] = val(rng) < 0.4;
    for (std::int32_t i = m.nodes.elemStart[40]; i < m.nodes.elemStart[41]; ++i)
      wet[m.nodes.elemList[i]] = 0;  // node 40 wholly dry
    for (std::int32_t e = 1; e <= ne; ++e) {
      u[e] = wet[e] ? val(rng) : 1e6;
      v[e] = wet[e] ? val(rng) : 1e6;
      deleted[e] = wet[e] ? u[e] : del;
    }
    std::vector<double> a(nn + 1), b(nn + 1), c(nn + 1), d(nn + 1), single(nn + 1);
    CalcNodeValuesWetPL2D(m, u.data(), wet.data(), a.data());
    CalcNodeValuesPL2D(m, deleted.data(), del, 1, b.data());
    CalcNodeValues2WetPL2D(m, u.data(), v.data(), wet.data(), c.data(), d.data());
    CalcNodeValuesWetPL2D(m, v.data(), wet.data(), single.data());
    int singles = 0;
    for (std::int32_t n = 1; n <= nn; ++n) {
      double lo = 1e9, hi = -1e9;
      std::int32_t count = 0;
      for (std::int32_t i = m.nodes.elemStart[n]; i < m.nodes.elemStart[n + 1]; ++i) {
        const std::int32_t e = m.nodes.elemList[i];
        if (wet[e]) lo = std::min(lo, u[e]), hi = std::max(hi, u[e]), ++count;
      }
      EXPECT_EQ(c[n], a[n]);
      EXPECT_EQ(d[n], single[n]);
      EXPECT_EQ(b[n], count ? a[n] : del);
      if (count == 0) {
        EXPECT_EQ(a[n], 0.0);
      } else {
        EXPECT_TRUE(a[n] >= lo - 1e-12 && a[n] <= hi + 1e-12) << n;
        if (count == 1) {
          ++singles;
          EXPECT_DOUBLE_EQ(a[n], lo);
        }
      }
    }
    EXPECT_EQ(a[40], 0.0);
    EXPECT_GT(singles, 0);
  }
}

TEST_F(Interpolation, DirectionsAverageAcrossNorth) {
  const MeshData m = Random(Layouts()[1]);
  std::vector<double> dir(m.elements.numElements + 1), out(m.nodes.numNodes + 1);
  for (std::int32_t e = 1; e <= m.elements.numElements; ++e) dir[e] = e % 3 ? 350.0 : 10.0;
  CalcNodeValuesPL2D(m, dir.data(), -1e30, 2, out.data());
  for (std::int32_t n = 1; n <= m.nodes.numNodes; ++n) {
    EXPECT_TRUE(out[n] >= 0.0 && out[n] < 360.0);
    EXPECT_LE(std::min(out[n], 360.0 - out[n]), 10.0 + 1e-12) << n << " " << out[n];
  }
}

TEST_F(SearchTree, FindsTheContainingElementOnRandomMeshes) {
  for (const RandomMeshSpec& layout : Layouts()) {
    MeshData m = Random(layout);
    const double x1 = layout.x0 + layout.nx * layout.dx, y1 = layout.y0 + layout.ny * layout.dy;
    std::vector<XY> points;
    for (std::int32_t e = 1; e <= m.elements.numElements; e += 2) {  // nodes, edge midpoints
      const std::int32_t p = m.elements.Node(e, 1), q = m.elements.Node(e, 2);
      points.push_back({m.nodes.x[p], m.nodes.y[p]});
      points.push_back({0.5 * (m.nodes.x[p] + m.nodes.x[q]), 0.5 * (m.nodes.y[p] + m.nodes.y[q])});
    }
    EXPECT_EQ(CheckLookups(m, 4000, layout.x0, x1, layout.y0, y1, points), 4000 + int(points.size()));
    EXPECT_EQ(&GetSearchTree2D(m), m.searchTree.get());  // kept with the mesh
  }
}

// Boxes wholly inside a large element are crossed by none of its edges.
TEST_F(SearchTree, LargeElementsBesideSmallOnes) {
  Shape s = Grid(80, 4, 0.1, 0.0, 0.0);  // strip [0, 8] x [0, 0.4]; top corners 325 and 405
  s.nodes.insert(s.nodes.end(), {{8.0, 8.0}, {0.0, 8.0}});
  s.cells.insert(s.cells.end(), {{325, 405, 406}, {325, 406, 407}});
  MeshData m = Build(s);
  EXPECT_EQ(CheckLookups(m, 3000, 0.0, 8.0, 0.0, 8.0), 3000);
}

// Without the depth limit the leaf around the common node would split for ever.
TEST_F(SearchTree, ManyTrianglesMeetingAtOneNode) {
  Shape s{{{0.31, 0.17}}, {}};
  for (int i = 0; i < 64; ++i) {
    s.nodes.push_back({std::cos(0.05 + 2 * kPi * i / 64), std::sin(0.05 + 2 * kPi * i / 64)});
    s.cells.push_back({1, i + 2, (i + 1) % 64 + 2});
  }
  MeshData m = Build(s);
  EXPECT_GT(CheckLookups(m, 2000, -1.0, 1.0, -1.0, 1.0, {{0.31, 0.17}, {0.31 + 1e-12, 0.17}}),
            1000);
  // A symmetric fan whose centre is the root box centre: every element touches all four
  // quadrants at the split point, which is not a faulty mesh.
  ResetMeshTables();
  Shape radial{{{0.0, 0.0}}, {}};
  for (int i = 0; i < 24; ++i) {
    radial.nodes.push_back({std::cos(2 * kPi * i / 24), std::sin(2 * kPi * i / 24)});
    radial.cells.push_back({1, i + 2, (i + 1) % 24 + 2});
  }
  MeshData r = Build(radial);
  EXPECT_GT(CheckLookups(r, 2000, -1.0, 1.0, -1.0, 1.0, {{0.0, 0.0}}), 1000);
}

TEST_F(SearchTree, PointsOutsideAnLShapedMeshGiveZero) {
  MeshData m = Build(Grid(16, 16, 1.0, 0.0, 0.0, [](int i, int j) { return i < 8 || j < 8; }));
  const int inside = CheckLookups(m, 3000, -2.0, 18.0, -2.0, 18.0);
  EXPECT_TRUE(inside > 1300 && inside < 1600) << inside;  // 48 % of the sampled box
  EXPECT_EQ(FindElementID2DSearchTree(GetSearchTree2D(m), 12.0, 12.0), 0);
}

// Longitudes 178..182 degrees stored within +-180: elements across the dateline are found on
// both sides, and the nodes on it see their elements close by.
TEST_F(SearchTree, LongLatMeshAcrossTheDateline) {
  const double deg = kDegreesToRadians;
  MeshData m = Build(Grid(16, 8, 0.25 * deg, 178.0 * deg, -1.0 * deg, [](int, int) { return true; },
                          [](double x) { return x > kPi + 1e-12 ? x - kTwoPi : x; }),
                     true, "LONG/LAT");
  EXPECT_EQ(CheckLookups(m, 3000, 178.01 * deg, 181.99 * deg, -0.99 * deg, 0.99 * deg,
                         {{kPi, 0.3 * deg}, {-kPi, -0.3 * deg}}),
            3002);

  auto f = [](double x, double y) { return 1.0 + 20.0 * WrapNear(x, kPi) - 5.0 * y; };
  std::vector<double> u(m.elements.numElements + 1), out(m.nodes.numNodes + 1);
  for (std::int32_t e = 1; e <= m.elements.numElements; ++e)
    u[e] = f(m.elements.xc[e], m.elements.yc[e]);
  CalcNodeValuesPL2D(m, u.data(), -1e30, 1, out.data());
  int onDateline = 0;
  for (std::int32_t n = 1; n <= m.nodes.numNodes; ++n) {
    if (!WeightsUnclipped(m, n)) continue;
    EXPECT_NEAR(out[n], f(m.nodes.x[n], m.nodes.y[n]), 7e-8) << n;
    onDateline += std::fabs(std::fabs(m.nodes.x[n]) - kPi) < 1e-9;
  }
  EXPECT_EQ(onDateline, 7);
}

TEST_F(SearchTree, BuildFaults) {
  MeshData m = Build(Grid(2, 2, 1.0, 0.0, 0.0));
  SearchTree2D tree;
  m.dimension = 3;
  ExpectMeshError([&] { BuildSearchTree2D(m, tree); },
                  "BuildSearchTree2D: Mesh must be 2D or 3D layered");
  // 30 nearly equal triangles over the whole box: the quadrants hold all of them.
  Shape s;
  for (int i = 0; i < 30; ++i) {
    s.nodes.insert(s.nodes.end(), {{1e-3 * i, 0.0}, {1.0, 1e-3 * i}, {0.0, 1.0 - 1e-3 * i}});
    s.cells.push_back({3 * i + 1, 3 * i + 2, 3 * i + 3});
  }
  const MeshData faulty = Build(s, false);
  ExpectMeshError(
      [&] { BuildSearchTree2D(faulty, tree); },
      "InsertElementd2DSearchTree: Error building search tree - possibly erroneous mesh");
}

TEST_F(PointValue, LinearInTrianglesAndQuadrilaterals) {
  const double x[8] = {0.2, 2.1, 1.9, 0.1, 1.0, 2.0, 1.0, 0.1};
  const double y[8] = {0.1, 0.3, 1.8, 1.5, 0.2, 1.0, 1.6, 0.8};
  double p[8];
  for (int k = 0; k < 8; ++k) p[k] = 4.0 - 2.5 * x[k] + 0.75 * y[k];
  for (const int n : {3, 6, 4, 8})
    for (const XY q : {XY{1.0, 0.8}, XY{0.4, 1.2}, XY{1.8, 1.4}, XY{0.2, 0.1}})
      EXPECT_NEAR(CalcPointValue2D(q.x, q.y, n, x, y, p, -1.0), 4.0 - 2.5 * q.x + 0.75 * q.y,
                  1e-12);
  // Not a plane: the quadrilateral is split along the diagonal 1-3.
  const double sx[4] = {0, 1, 1, 0}, sy[4] = {0, 0, 1, 1}, sp[4] = {0, 0, 0, 1};
  EXPECT_NEAR(CalcPointValue2D(0.7, 0.2, 4, sx, sy, sp, -1.0), 0.0, 1e-15);
  EXPECT_NEAR(CalcPointValue2D(0.2, 0.7, 4, sx, sy, sp, -1.0), 0.5, 1e-15);
}

TEST_F(PointValue, DeleteValuesDegenerateElementsAndOtherTypes) {
  const double x[4] = {0, 1, 1, 0}, y[4] = {0, 0, 1, 1}, del = -1e-35;
  const double p[4] = {1, 2, del, 4}, q[4] = {1, 2, 3, del};
  EXPECT_EQ(CalcPointValue2D(0.5, 0.2, 3, x, y, p, del), del);
  EXPECT_EQ(CalcPointValue2D(0.2, 0.5, 4, x, y, p, del), del);
  EXPECT_NEAR(CalcPointValue2D(0.7, 0.2, 4, x, y, q, del), 1.9, 1e-12);  // node 4 not used
  const double lx[3] = {0, 1, 2}, ly[3] = {0, 1, 2};  // zero area
  EXPECT_EQ(CalcPointValue2D(0.5, 0.5, 3, lx, ly, q, del), del);
  EXPECT_FALSE(PointInElement2D(3, lx, ly, 0.5, 0.5));
  for (const int n : {2, 5, 7}) {
    ExpectMeshError([&] { CalcPointValue2D(0.5, 0.5, n, x, y, q, del); },
                    "CalcPointValue2D: Interpolation not possible for this type of element");
    EXPECT_FALSE(PointInElement2D(n, x, y, 0.5, 0.5));
  }
  EXPECT_TRUE(PointInElement2D(4, x, y, 1.0 + 1e-11, 0.5));
  EXPECT_FALSE(PointInElement2D(4, x, y, 1.0 + 1e-8, 0.5));
}

}  // namespace
