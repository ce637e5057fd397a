// Mesh topology and geometry: faces and their left/right rule, element and face geometry,
// orientation, safety checks, boundary sections and the log blocks.
#include <gtest/gtest.h>

#include <cmath>
#include <string>
#include <vector>

#include "mesh/Domain.h"
#include "mesh/MeshGeometry.h"

namespace {

struct NodeSpec { double x, y, z; std::int32_t code; };

MeshData MakeMesh(const std::vector<NodeSpec>& nodes,
                  const std::vector<std::vector<std::int32_t>>& elements,
                  const std::string& projection = "NON-UTM") {
  MeshData m;
  m.projection = projection;
  AllocateNodes(m.nodes, static_cast<std::int64_t>(nodes.size()));
  for (std::size_t i = 0; i < nodes.size(); ++i)
    AddNode(m.nodes, static_cast<std::int32_t>(i + 1), nodes[i].x, nodes[i].y, nodes[i].z,
            nodes[i].code);
  AllocateElementsBasic(m.elements, static_cast<std::int64_t>(elements.size()),
                        static_cast<std::int64_t>(elements.size()) * 8);
  for (std::size_t i = 0; i < elements.size(); ++i) {
    const auto& e = elements[i];
    const std::int32_t type = e.size() == 3 ? 21 : e.size() == 4 ? 25 : e.size() == 6 ? 23 : 27;
    AddElement(m.elements, static_cast<std::int32_t>(i + 1), type,
               static_cast<std::int32_t>(e.size()), e.data());
  }
  return m;
}

class MeshGeometry : public ::testing::Test {
 protected:
  void SetUp() override { ResetMeshTables(); }
  void TearDown() override { ResetMeshTables(); }
  void Build(MeshData& m) {
    CheckMeshSafety(m);
    std::vector<std::string> unused;
    ValidateMesh(m, unused);
    OrientElements(m);
    SetupMeshGeometry(m, warnings_);
  }
  std::vector<std::string> warnings_;
};

TEST_F(MeshGeometry, TwoTrianglesShareOneFaceFromLowerToHigherElement) {
  MeshData m = MakeMesh({{0, 0, 0, 1}, {1, 0, 0, 1}, {0, 1, 0, 1}, {1, 1, 0, 1}},
                        {{1, 2, 3}, {2, 4, 3}});
  Build(m);
  ASSERT_EQ(m.faces.numFaces, 5);
  EXPECT_EQ(m.faces.numInternal, 5);
  int inner = 0;
  for (std::int32_t f = 1; f <= 5; ++f) {
    if (m.faces.right[f] == 0) continue;
    ++inner;
    EXPECT_EQ(m.faces.left[f], 1);
    EXPECT_EQ(m.faces.right[f], 2);
    EXPECT_EQ(m.faces.Node(f, 1), 2);
    EXPECT_EQ(m.faces.Node(f, 2), 3);
    // Normal from element 1 towards element 2: (1, 1) / sqrt(2).
    EXPECT_NEAR(m.faces.nx[f], std::sqrt(0.5), 1e-15);
    EXPECT_NEAR(m.faces.ny[f], std::sqrt(0.5), 1e-15);
    EXPECT_NEAR(m.faces.distLeft[f], m.faces.distRight[f], 1e-15);
  }
  EXPECT_EQ(inner, 1);
  // Node-element lists in increasing element numbers; every element has three faces.
  EXPECT_EQ(m.nodes.elemStart[3] - m.nodes.elemStart[2], 2);
  EXPECT_EQ(m.nodes.elemList[m.nodes.elemStart[2]], 1);
  EXPECT_EQ(m.elements.NumFaces(1), 3);
  EXPECT_EQ(m.elements.NumFaces(2), 3);
  // All nodes are code 1: one land section of the four boundary faces.
  ASSERT_EQ(m.sections.size(), 1u);
  EXPECT_EQ(m.sections[0].code, 1);
  EXPECT_EQ(m.sections[0].NumFaces(), 4);
  EXPECT_EQ(m.sections[0].NumPoints(), 4);
  EXPECT_TRUE(warnings_.empty());
}

TEST_F(MeshGeometry, UnitRightTriangleGeometry) {
  MeshData m = MakeMesh({{0, 0, -1, 1}, {1, 0, -2, 1}, {0, 1, -3, 1}}, {{1, 2, 3}});
  Build(m);
  const ElementTable& el = m.elements;
  EXPECT_DOUBLE_EQ(el.area[1], 0.5);
  EXPECT_DOUBLE_EQ(el.xc[1], 1.0 / 3.0);
  EXPECT_DOUBLE_EQ(el.yc[1], 1.0 / 3.0);
  EXPECT_DOUBLE_EQ(el.zc[1], -2.0);
  EXPECT_DOUBLE_EQ(el.lengthScale[1], 1.0);
  // Shape derivatives: N1 = 1 - x - y, N2 = x, N3 = y.
  const double* dx = &el.dNdx[3];
  const double* dy = &el.dNdy[3];
  EXPECT_DOUBLE_EQ(dx[0], -1.0); EXPECT_DOUBLE_EQ(dx[1], 1.0); EXPECT_DOUBLE_EQ(dx[2], 0.0);
  EXPECT_DOUBLE_EQ(dy[0], -1.0); EXPECT_DOUBLE_EQ(dy[1], 0.0); EXPECT_DOUBLE_EQ(dy[2], 1.0);
  // Local face 2 joins (1, 0) and (0, 1).
  const std::int32_t f = el.Face(1, 2);
  EXPECT_EQ(m.faces.leftLocal[f], 2);
  EXPECT_DOUBLE_EQ(m.faces.length[f], std::sqrt(2.0));
  EXPECT_DOUBLE_EQ(m.faces.nx[f], std::sqrt(0.5));
  EXPECT_DOUBLE_EQ(m.faces.ny[f], std::sqrt(0.5));
  EXPECT_DOUBLE_EQ(m.faces.xr[f], 0.5);  // boundary face: the face centre
  EXPECT_DOUBLE_EQ(m.faces.yr[f], 0.5);
}

TEST_F(MeshGeometry, DatelineElementStaysSmallOnItsFirstNodesSide) {
  const double d = kDegreesToRadians;
  MeshData m = MakeMesh({{179.9 * d, 0.0, 0, 1}, {-179.9 * d, 0.0, 0, 1}, {179.95 * d, 0.1 * d, 0, 1}},
                        {{1, 2, 3}}, "LONG/LAT");
  Build(m);
  const double expected = 0.5 * (0.2 * d) * (0.1 * d);
  EXPECT_NEAR(m.elements.area[1], expected, 1e-12 * expected);
  EXPECT_NEAR(m.elements.xc[1], (179.9 + 180.1 + 179.95) / 3.0 * d, 1e-12);
  for (std::int32_t f = 1; f <= m.faces.numFaces; ++f) EXPECT_LT(m.faces.length[f], 0.3 * d);
}

// A 3 x 2 rectangle of quadrilaterals and triangles with some elements given clockwise: areas,
// boundary lengths, closed element boundaries, opposite normals and reconstruction points.
TEST_F(MeshGeometry, ClosedRectangleBalancesAreasLengthsAndNormals) {
  // Nodes on a 4 x 3 lattice with spacing 1.5 x 0.7, interior nodes shifted a little.
  std::vector<NodeSpec> nodes;
  for (int j = 0; j < 3; ++j)
    for (int i = 0; i < 4; ++i) {
      const bool inner = i > 0 && i < 3 && j > 0 && j < 2;
      nodes.push_back({1.5 * i + (inner ? 0.2 * i : 0.0), 0.7 * j + (inner ? 0.05 : 0.0), -1.0,
                       inner ? 0 : 1});
    }
  auto n = [](int i, int j) { return j * 4 + i + 1; };
  MeshData m = MakeMesh(nodes, {{n(0, 0), n(1, 0), n(1, 1), n(0, 1)},
                                {n(1, 0), n(2, 0), n(2, 1)},
                                {n(1, 0), n(1, 1), n(2, 1)},  // clockwise
                                {n(2, 0), n(3, 0), n(3, 1), n(2, 1)},
                                {n(0, 1), n(0, 2), n(1, 2), n(1, 1)},  // clockwise
                                {n(1, 1), n(2, 1), n(2, 2), n(1, 2)},
                                {n(2, 1), n(3, 1), n(3, 2), n(2, 2)}});
  CheckMeshSafety(m);
  EXPECT_EQ(OrientElements(m), 2);
  SetupMeshGeometry(m, warnings_);
  const double w = 4.5, h = 1.4;
  double area = 0.0;
  for (std::int32_t e = 1; e <= m.elements.numElements; ++e) {
    EXPECT_GT(m.elements.area[e], 0.0);
    area += m.elements.area[e];
    double sx = 0.0, sy = 0.0;
    for (std::int32_t k = 1; k <= m.elements.NumFaces(e); ++k) {
      const std::int32_t f = m.elements.Face(e, k);
      const double sign = m.faces.left[f] == e ? 1.0 : -1.0;
      sx += sign * m.faces.length[f] * m.faces.nx[f];
      sy += sign * m.faces.length[f] * m.faces.ny[f];
    }
    EXPECT_NEAR(sx, 0.0, 1e-14);
    EXPECT_NEAR(sy, 0.0, 1e-14);
  }
  EXPECT_NEAR(area, w * h, 1e-13);
  double perimeter = 0.0;
  for (std::int32_t f = 1; f <= m.faces.numFaces; ++f) {
    if (m.faces.right[f] == 0) {
      perimeter += m.faces.length[f];
      continue;
    }
    EXPECT_LT(m.faces.left[f], m.faces.right[f]);
    // The reconstruction point lies on the face's line and on the line of the two centroids.
    const double x1 = m.nodes.x[m.faces.Node(f, 1)], y1 = m.nodes.y[m.faces.Node(f, 1)];
    const double x2 = m.nodes.x[m.faces.Node(f, 2)], y2 = m.nodes.y[m.faces.Node(f, 2)];
    const double xr = m.faces.xr[f], yr = m.faces.yr[f];
    EXPECT_NEAR((x2 - x1) * (yr - y1) - (y2 - y1) * (xr - x1), 0.0, 1e-12);
    const std::int32_t l = m.faces.left[f], r = m.faces.right[f];
    const double ax = m.elements.xc[l], ay = m.elements.yc[l];
    const double bx = m.elements.xc[r], by = m.elements.yc[r];
    EXPECT_NEAR((bx - ax) * (yr - ay) - (by - ay) * (xr - ax), 0.0, 1e-12);
  }
  EXPECT_NEAR(perimeter, 2.0 * (w + h), 1e-13);
  // Quadrilaterals list their faces in local order.
  for (std::int32_t k = 1; k <= 4; ++k) {
    const std::int32_t f = m.elements.Face(1, k);
    EXPECT_EQ(m.faces.left[f] == 1 ? m.faces.leftLocal[f] : m.faces.rightLocal[f], k);
  }
  // The boundary faces form one land section, the perimeter's ten nodes.
  ASSERT_EQ(m.sections.size(), 1u);
  EXPECT_EQ(m.sections[0].NumFaces(), 10);
  EXPECT_EQ(m.sections[0].NumPoints(), 10);
}

TEST_F(MeshGeometry, ClockwiseSixNodeTriangleKeepsEdgeNodesOnTheirEdges) {
  // Corners 1 (0,0), 2 (0,1), 3 (1,0) clockwise; edge nodes 4 on 1-2, 5 on 2-3, 6 on 3-1.
  MeshData m = MakeMesh({{0, 0, 0, 1}, {0, 1, 0, 1}, {1, 0, 0, 1}, {0, 0.5, 0, 1},
                         {0.5, 0.5, 0, 1}, {0.5, 0, 0, 1}},
                        {{1, 2, 3, 4, 5, 6}});
  EXPECT_EQ(OrientElements(m), 1);
  const std::int32_t* e = &m.elements.nodeList[m.elements.nodeStart[1]];
  // Now 1, 3, 2 with edge nodes on 1-3 (6), 3-2 (5), 2-1 (4).
  EXPECT_EQ(std::vector<std::int32_t>(e, e + 6), (std::vector<std::int32_t>{1, 3, 2, 6, 5, 4}));
}

TEST_F(MeshGeometry, BrokenMeshesAreRefusedNamingTheFault) {
  struct Case { const char* name; MeshData mesh; const char* message; };
  auto expectError = [&](MeshData m, const std::string& message) {
    try {
      Build(m);
      ADD_FAILURE() << "no error, expected " << message;
    } catch (const MeshError& e) {
      EXPECT_NE(std::string(e.what()).find(message), std::string::npos) << e.what() << " / expected: " << message;
    }
    ResetMeshTables();
  };
  const std::vector<NodeSpec> square = {{0, 0, 0, 1}, {1, 0, 0, 1}, {1, 1, 0, 1}, {0, 1, 0, 1}};
  expectError(MakeMesh(square, {{1, 2, 3}, {1, 3, 5}}),
              "Node in the element table is larger than the number of nodes (element 2, node 5)");
  expectError(MakeMesh(square, {{1, 2, 3}, {1, 3, 3}}), "Element 2 uses node 3 twice");
  expectError(MakeMesh({{0, 0, 0, 1}, {1, 0, 0, 1}, {2, 0, 0, 1}}, {{1, 2, 3}}),
              "Element 1 (identifier 1) has zero area");
  expectError(MakeMesh({{0, 0, 0, 1}, {1, 0, NAN, 1}, {0, 1, 0, 1}}, {{1, 2, 3}}),
              "Node 2 has a bed level that is not a finite number");
  expectError(MakeMesh({{0, 0, 0, 1}, {INFINITY, 0, 0, 1}, {0, 1, 0, 1}}, {{1, 2, 3}}),
              "Node 2 has a coordinate that is not a finite number");
  expectError(MakeMesh({{0, 0, 0, 1}, {1, 0, 0, 1}, {0, 1, 0, 1}}, {{1, 2, 3}, {1, 2, 3}}),
              "Elements 1 and 2 have the same nodes");
  expectError(MakeMesh({{0, 0, 0, 1}, {1, 0, 0, 1}, {0, 1, 0, 1}, {0, -1, 0, 1}, {1, 1, 0, 1}},
                       {{1, 2, 3}, {2, 1, 4}, {1, 2, 5}}),
              "The face of nodes 1-2 is shared by more than two elements (1, 2, 3)");
  expectError(MakeMesh({{0, 0, 0, 1}, {1, 0, 0, 1}, {0, 1.6, 0, 1}}, {{1, 2, 3}}, "LONG/LAT"),
              "Node 3 has a latitude beyond 90 degrees");
  MeshData ids = MakeMesh(square, {{1, 2, 3}, {1, 3, 4}});
  ids.nodes.id[3] = 4;
  expectError(std::move(ids), "The node indicices and IDs must be the same");
  MeshData eids = MakeMesh(square, {{1, 2, 3}, {1, 3, 4}});
  eids.elements.id[2] = 7;
  expectError(std::move(eids), "The element indicices and IDs must be the same");
  // A node no element uses: one log line per node, then the stop.
  MeshData unused = MakeMesh({{0, 0, 0, 1}, {1, 0, 0, 1}, {0, 1, 0, 1}, {5, 5, 0, 0}}, {{1, 2, 3}});
  std::vector<std::string> lines;
  EXPECT_THROW(ValidateMesh(unused, lines), MeshError);
  EXPECT_EQ(lines, std::vector<std::string>{"Node not included in mesh: 4"});
  // Capacities are checked.
  NodeTable nodes;
  EXPECT_THROW(AllocateNodes(nodes, 0), MeshError);
  AllocateNodes(nodes, 1);
  AddNode(nodes, 1, 0, 0, 0, 0);
  try {
    AddNode(nodes, 2, 0, 0, 0, 0);
    ADD_FAILURE();
  } catch (const MeshError& e) {
    EXPECT_STREQ(e.what(), "AddNode: nnodes_max is to small");
  }
}

// A channel 3 x 1 of quadrilaterals with a land boundary along the sides, open boundaries 2 at
// the left and 3 at the right, and an inner line (-1) across the middle.
TEST_F(MeshGeometry, SectionsFollowTheNodeCodes) {
  std::vector<NodeSpec> nodes;
  const std::int32_t codes[2][4] = {{2, -1, 1, 3}, {2, -1, 1, 3}};
  for (int j = 0; j < 2; ++j)
    for (int i = 0; i < 4; ++i) nodes.push_back({double(i), double(j), 0.0, codes[j][i]});
  MeshData m = MakeMesh(nodes, {{1, 2, 6, 5}, {2, 3, 7, 6}, {3, 4, 8, 7}});
  Build(m);
  ASSERT_EQ(m.sections.size(), 4u);
  // Increasing code order: -1, 1, 2, 3.
  EXPECT_EQ(m.sections[0].code, -1);
  EXPECT_EQ(m.sections[0].NumFaces(), 1);  // the face 2-6 between elements 1 and 2
  EXPECT_EQ(m.sections[1].code, 1);
  EXPECT_EQ(m.sections[1].NumFaces(), 6);  // both long sides (a node code below 2 on each)
  EXPECT_EQ(m.sections[2].code, 2);
  EXPECT_EQ(m.sections[2].NumFaces(), 1);
  EXPECT_EQ(m.sections[2].NumPoints(), 2);
  EXPECT_EQ(m.sections[3].code, 3);
  for (std::size_t s = 0; s < m.sections.size(); ++s)
    EXPECT_EQ(m.sections[s].number, static_cast<std::int32_t>(s + 1));

  const std::vector<std::string> info = MeshInformationLines(m);
  const std::vector<std::string> expected = {
      "Mesh information",
      "  Number of elements         : 3",
      "  Number of elements (int.)  : 3",
      "  Number of faces            : 10",
      "  Number of faces (int.)     : 10",
      "  Number of nodes            : 8",
      "  Number of nodes (int.)     : 8",
      "  Number of sections         : 4",
      "  Min x-coordinate (m)       : 0",
      "  Max x-coordinate (m)       : 3",
      "  Min y-coordinate (m)       : 0",
      "  Max y-coordinate (m)       : 1",
      "  Min z-coordinate (m)       : 0",
      "  Max z-coordinate (m)       : 0",
      "",
      "Boundary information",
      "  number                code    number of points     number of faces",
      "       1                  -1                   2                   1",
      "       2                   1                   8                   6",
      "       3                   2                   2                   1",
      "       4                   3                   2                   1"};
  EXPECT_EQ(info, expected);

  // Without codes there is no section, only the warning.
  ResetMeshTables();
  MeshData plain = MakeMesh({{0, 0, 0, 0}, {1, 0, 0, 0}, {0, 1, 0, 0}}, {{1, 2, 3}});
  warnings_.clear();
  Build(plain);
  EXPECT_TRUE(plain.sections.empty());
  EXPECT_EQ(warnings_, std::vector<std::string>{"SetupMeshSection: No boundary specified"});
}

TEST_F(MeshGeometry, ShapeTableAndBoundaryOnlyFaces) {
  MeshData m = MakeMesh({{0, 0, 0, 1}, {1, 0, 0, 1}, {1, 1, 0, 1}, {0, 1, 0, 1}, {2, 0, 0, 1}},
                        {{1, 2, 3, 4}, {2, 5, 3}});
  SetupShapeData(m);
  ASSERT_EQ(g_shapes.shapes.size(), 2u);
  EXPECT_EQ(ShapeDataLines(1), (std::vector<std::string>{
                                   "id = 1", "  Dimensions                 : 2",
                                   "  Type of element            : 2",
                                   "  Type of function           : 1",
                                   "  Number of nodes            : 4",
                                   "  Number of edges            : 4",
                                   "  Number of edge nodes       : 2",
                                   "  Number of faces            : 4",
                                   "  Number of faces nodes      : 2"}));
  try {
    ShapeDataLines(3);
    ADD_FAILURE();
  } catch (const MeshError& e) {
    EXPECT_STREQ(e.what(), "PrintShapeData: Wrong shape id");
  }
  // The node counts of the fast lookup agree with the reference elements.
  for (std::int32_t type = 0; type < 50; ++type) {
    ShapeData s;
    EXPECT_EQ(NodesOfType(type), ShapeOfType(type, s) ? s.numNodes : 0) << type;
  }
  CalcFaces(m, 1);
  EXPECT_EQ(m.faces.numFaces, 5);  // 6 faces, the shared one dropped
  for (std::int32_t f = 1; f <= 5; ++f) {
    EXPECT_EQ(m.faces.id[f], f);
    EXPECT_EQ(m.faces.right[f], 0);
  }
}

}  // namespace
