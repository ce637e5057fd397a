// Meshes from data files: flexible-mesh files as they stand, line, grid and volume files turned
// into meshes of their points and cells.
#include <gtest/gtest.h>

#include <functional>
#include <string>
#include <vector>

#include "io/DataFile.h"
#include "mesh/MeshReaders.h"
#include "support/TestSupport.h"

namespace {

using tavrintest::TempDir;

// The two-element mesh of the data-file tests (a triangle and a quadrilateral on 5 nodes).
struct VdsuMesh {
  std::vector<std::int32_t> block = {5, 2, 2, 0, 0};
  std::vector<std::int32_t> ids = {1, 2, 3, 4, 5};
  std::vector<double> x = {0, 1, 0, 2, 2}, y = {0, 0, 1, 0, 1};
  std::vector<float> z = {-1, -2, -3, -4, -5};
  std::vector<std::int32_t> types = {21, 25}, counts = {3, 4}, nodes = {1, 2, 3, 2, 4, 5, 3};
};

std::string WriteVdsu(const TempDir& dir, const VdsuMesh& m) {
  const std::string file = dir.file("mesh.vdsu");
  DataFile df;
  VdsInitHeader(df, kVdsFileKindStatic, "Mesh", "test", 0);
  VdsSetDataType(df, 2000);
  for (std::size_t i = 0; i < m.block.size(); ++i) VdsSetCustomBlockInt(df, static_cast<int>(i + 1), m.block[i]);
  VdsSetProjection(df, "UTM-32", 0, 0);
  VdsSetTimeAxis(df, "2004-01-01 00:00:00", 60);
  EXPECT_EQ(VdsCreateFile(df, file), 0) << df.errorText;
  df.printSummary = false;
  const std::vector<std::int32_t> codes = {1, 0, 2, 1, 1}, elementIds = {10, 20};
  VdsWriteStaticInt(df, m.ids.data(), 5);
  VdsWriteStaticDouble(df, m.x.data(), 5);
  VdsWriteStaticDouble(df, m.y.data(), 5);
  VdsWriteStaticFloat(df, m.z.data(), 5);
  VdsWriteStaticInt(df, codes.data(), 5);
  VdsWriteStaticInt(df, elementIds.data(), 2);
  VdsWriteStaticInt(df, m.types.data(), 2);
  VdsWriteStaticInt(df, m.counts.data(), 2);
  EXPECT_EQ(VdsWriteStaticInt(df, m.nodes.data(), static_cast<std::int64_t>(m.nodes.size())), 0) << df.errorText;
  VdsClose(df);
  return file;
}

// An equidistant file with item 1 = `values` on `n` points per axis (x fastest).
struct Grid {
  std::string name = "basin.vds2";
  VdsSpatialAxis axis;
  std::vector<float> values;
  bool land = true;
  float landValue = 10.0f;
  std::string projection = "UTM-32";
  double origin[2] = {1000.0, 2000.0}, orientation = 0.0;
};

std::string WriteGrid(const TempDir& dir, const Grid& g) {
  const std::string file = dir.file(g.name);
  DataFile df;
  VdsInitHeader(df, kVdsFileKindData, "Grid", "test", 1);
  if (g.land) VdsSetCustomBlockFloat(df, 4, g.landValue);
  VdsSetProjection(df, g.projection, g.origin[0], g.origin[1], g.orientation);
  VdsSetTimeAxis(df, "2004-01-01 00:00:00", 60);
  VdsDefineItem(df, 1, 100079, "Bathymetry", static_cast<std::int64_t>(g.values.size()));
  EXPECT_EQ(VdsSetItemAxis(df, 1, g.axis), 0) << df.errorText;
  EXPECT_EQ(VdsCreateFile(df, file), 0) << df.errorText;
  df.printSummary = false;
  VdsWriteDynamic(df, 1, g.values.data(), static_cast<std::int64_t>(g.values.size()), 0, 0);
  VdsEndTimeStep(df);
  VdsClose(df);
  return file;
}

// 3 x 2 cells of 10 m whose first centre lies at (5, 5); cell (3, 1) is land.
Grid Basin() {
  Grid g;
  g.axis.dimension = 2;
  g.axis.n[0] = 3;
  g.axis.n[1] = 2;
  g.axis.origin[0] = g.axis.origin[1] = 5.0;
  g.axis.step[0] = g.axis.step[1] = 10.0;
  g.values = {-1, -2, 50, -3, -4, -5};
  return g;
}

std::string ErrorOf(const std::function<void()>& read) {
  try {
    read();
  } catch (const MeshError& e) {
    return e.what();
  }
  return "no error";
}

// Of the polygon of the element's first `corners` nodes (all by default).
double SignedArea(const MeshData& m, std::int32_t e, std::int32_t corners = 0) {
  const std::int32_t n = corners > 0 ? corners : m.elements.NumNodes(e);
  double a = 0;
  for (std::int32_t k = 1; k <= n; ++k) {
    const std::int32_t p = m.elements.Node(e, k), q = m.elements.Node(e, k % n + 1);
    a += m.nodes.x[p] * m.nodes.y[q] - m.nodes.x[q] * m.nodes.y[p];
  }
  return a / 2;
}

TEST(MeshVds, FlexibleMeshIsReadAsStored) {
  TempDir dir;
  VdsuMesh m;
  m.block = {5, 2, 3, 10, 4};
  MeshData mesh;
  MeshReadReport report;
  ReadMeshVdsu(mesh, WriteVdsu(dir, m), report);
  EXPECT_TRUE(report.warnings.empty());
  ASSERT_EQ(mesh.nodes.numNodes, 5);
  ASSERT_EQ(mesh.elements.numElements, 2);
  EXPECT_EQ(mesh.nodes.z[3], -3.0);
  EXPECT_EQ(mesh.nodes.code[3], 2);
  EXPECT_EQ(mesh.elements.id[2], 20);
  EXPECT_EQ(mesh.elements.Node(2, 3), 5);
  EXPECT_EQ(mesh.projection, "UTM-32");
  EXPECT_EQ(mesh.unitCode, 1000);
  EXPECT_EQ(mesh.dimension, 3);
  EXPECT_EQ(mesh.verticalKind, 2);  // 4 sigma layers over 6 z-levels
  EXPECT_EQ(mesh.numZLevels, 6);
}

TEST(MeshVds, FlexibleMeshNodesGoWhereTheirIdentifiersSay) {
  TempDir dir;
  VdsuMesh m;
  m.ids = {3, 1, 2, 5, 4};  // the file's first node is node 3, ...
  MeshData mesh;
  MeshReadReport report;
  ReadMeshVdsu(mesh, WriteVdsu(dir, m), report);
  ASSERT_EQ(report.warnings, std::vector<std::string>{"Reordering of node information"});
  EXPECT_EQ(mesh.nodes.z[3], -1.0f);
  EXPECT_EQ(mesh.nodes.x[4], 2.0);
  EXPECT_EQ(mesh.nodes.y[4], 1.0);
  EXPECT_EQ(mesh.elements.Node(1, 1), 1);  // node lists name identifiers: unchanged

  m.ids = {1, 2, 2, 4, 5};
  const std::string file = WriteVdsu(dir, m);
  EXPECT_EQ(ErrorOf([&] { ReadMeshVdsu(mesh = MeshData{}, file, report); }),
            file + ": node identifiers are not a permutation of 1..5 (node 3 has identifier 2)");
  m = VdsuMesh{};
  m.counts = {4, 3};  // a triangle with four nodes
  m.nodes = {1, 2, 3, 4, 2, 5, 3};
  EXPECT_NE(ErrorOf([&] { ReadMeshVdsu(mesh = MeshData{}, WriteVdsu(dir, m), report); }).find("element 1 of type 21 has 4 nodes"),
            std::string::npos);
}

TEST(MeshVds, GridCellsBecomeQuadsOnWaterCorners) {
  TempDir dir;
  MeshData mesh;
  MeshReadReport report;
  ReadMeshBasicVds2(mesh, WriteGrid(dir, Basin()), MeshReadOptions{}, report);
  EXPECT_TRUE(report.warnings.empty());
  // 4 x 3 corners less the land cell's outer corner (row 1, column 4).
  ASSERT_EQ(mesh.nodes.numNodes, 11);
  ASSERT_EQ(mesh.elements.numElements, 5);
  EXPECT_EQ(mesh.nodes.x[1], 1000.0);
  EXPECT_EQ(mesh.nodes.y[1], 2000.0);
  EXPECT_EQ(mesh.nodes.x[4], 1000.0);  // row 2 starts at node 4
  EXPECT_EQ(mesh.nodes.y[4], 2010.0);
  // Corner (2, 2) is inside: mean of four cells, code 0; the corner next to land is code 1.
  EXPECT_DOUBLE_EQ(mesh.nodes.z[5], (-1 - 2 - 3 - 4) / 4.0);
  EXPECT_EQ(mesh.nodes.code[5], 0);
  EXPECT_EQ(mesh.nodes.code[6], 1);
  EXPECT_DOUBLE_EQ(mesh.nodes.z[6], (-2 - 4 - 5) / 3.0);
  for (std::int32_t e = 1; e <= 5; ++e) {
    EXPECT_EQ(mesh.elements.type[e], 25);
    EXPECT_DOUBLE_EQ(SignedArea(mesh, e), 100.0);
  }
  EXPECT_EQ(mesh.elements.Node(1, 3), 5);
  EXPECT_EQ(mesh.projection, "UTM-32");
}

TEST(MeshVds, GridTrianglesRotationAndLandValue) {
  TempDir dir;
  Grid g = Basin();
  g.orientation = 90.0;  // the grid's y axis points east
  g.land = false;
  g.values[2] = kVdsDeleteValue;  // missing data stay out even without a land value
  MeshData mesh;
  MeshReadReport report;
  MeshReadOptions options;
  options.typeOfElement = 21;
  ReadMeshBasicVds2(mesh, WriteGrid(dir, g), options, report);
  EXPECT_EQ(report.warnings, std::vector<std::string>{"zland not found i file, all point included"});
  ASSERT_EQ(mesh.elements.numElements, 10);
  for (std::int32_t e = 1; e <= 10; ++e) EXPECT_NEAR(SignedArea(mesh, e), 50.0, 1e-6);
  // Diagonal south-west to north-east.
  EXPECT_EQ(mesh.elements.Node(1, 3), mesh.elements.Node(2, 2));
  EXPECT_NEAR(mesh.nodes.x[2], 1000.0, 1e-9);  // one step along the grid's x axis: south
  EXPECT_NEAR(mesh.nodes.y[2], 1990.0, 1e-9);

  g = Basin();
  g.landValue = -10.0f;
  EXPECT_NE(ErrorOf([&] { ReadMeshBasicVds2(mesh, WriteGrid(dir, g), MeshReadOptions{}, report); })
                .find("Input bathymetry consists of pure land values. Mesh cannot be generated."),
            std::string::npos);
}

TEST(MeshVds, GridOptionsAndWrongFiles) {
  TempDir dir;
  Grid g = Basin();
  g.name = "bathy.vds2";
  g.projection = "NON-UTM";
  const std::string bathy = WriteGrid(dir, g);
  g = Basin();
  g.name = "geometry.vds2";
  g.origin[0] = 0.0;
  g.values.assign(6, 99.0f);  // only the geometry counts
  MeshReadOptions options;
  options.typeOfGrid = 2;
  options.gridFile = WriteGrid(dir, g);
  MeshData mesh;
  MeshReadReport report;
  ReadMeshBasicVds2(mesh, bathy, options, report);
  EXPECT_EQ(mesh.elements.numElements, 5);
  EXPECT_EQ(mesh.nodes.x[1], 0.0);
  EXPECT_EQ(mesh.projection, "UTM-32");

  auto error = [&](const std::string& file, const MeshReadOptions& o) {
    return ErrorOf([&] { ReadMeshBasicVds2(mesh, file, o, report); });
  };
  options.gridFile = dir.file("geometry.vds1");
  EXPECT_EQ(error(bathy, options).rfind("ReadMeshBasicVds2: Illegal input file: " + options.gridFile, 0), 0u);
  options.typeOfGrid = 3;
  EXPECT_EQ(error(bathy, options).rfind("ReadMeshBasicVds2: Grid type not supported", 0), 0u);
  g.axis.n[0] = 2;
  g.values.resize(4);
  options.typeOfGrid = 2;
  options.gridFile = WriteGrid(dir, g);
  EXPECT_EQ(error(bathy, options).rfind("ReadMeshBasicVds2: Wrong bathy file: " + bathy, 0), 0u);
  EXPECT_EQ(ErrorOf([&] { ReadMeshBasicVds3(mesh, bathy, MeshReadOptions{}, report); })
                .rfind("ReadMeshBasicVds3: Wrong mesh file", 0),
            0u);
}

TEST(MeshVds, VolumeCellsBecomeHexahedra) {
  TempDir dir;
  Grid g;
  g.name = "box.vds3";
  g.axis.dimension = 3;
  g.axis.n[0] = 2;
  g.axis.n[2] = 2;
  g.axis.origin[2] = -5.0;
  g.axis.step[2] = 10.0;
  g.values = {0, 0, 0, 50};  // the upper cell at x = 2 is solid
  MeshData mesh;
  MeshReadReport report;
  ReadMeshBasicVds3(mesh, WriteGrid(dir, g), MeshReadOptions{}, report);
  ASSERT_EQ(mesh.elements.numElements, 3);
  ASSERT_EQ(mesh.nodes.numNodes, 3 * 2 * 3 - 2);  // the solid cell's two upper outer corners
  EXPECT_EQ(mesh.elements.type[3], 33);
  EXPECT_EQ(mesh.nodes.z[mesh.elements.Node(3, 1)], 0.0);  // the upper cell spans z = 0 .. 10
  EXPECT_EQ(mesh.nodes.z[mesh.elements.Node(3, 8)], 10.0);
  EXPECT_EQ(mesh.nodes.code[mesh.elements.Node(1, 3)], 1);  // below the solid cell
  EXPECT_GT(SignedArea(mesh, 1, 4), 0.0);  // bottom face counter-clockwise from above
}

TEST(MeshVds, LineFileBecomesAChainOfLines) {
  TempDir dir;
  Grid g;
  g.name = "river.vds1";
  g.axis.dimension = 1;
  g.axis.n[0] = 4;
  g.axis.origin[0] = 100.0;
  g.axis.step[0] = 25.0;
  g.values = {-1, -2, -3, -4};
  const std::string file = WriteGrid(dir, g);
  const std::string dt1 = dir.write("river.dt1", tavrintest::ReadFile(file));
  for (const std::string& name : {file, dt1}) {
    MeshData mesh;
    MeshReadReport report;
    ReadMeshBasicVds1(mesh, name, report);
    ASSERT_EQ(mesh.nodes.numNodes, 4);
    ASSERT_EQ(mesh.elements.numElements, 3);
    EXPECT_EQ(mesh.nodes.x[4], 175.0);
    EXPECT_EQ(mesh.nodes.z[4], -4.0);
    EXPECT_EQ(mesh.nodes.code[1] + mesh.nodes.code[2] + mesh.nodes.code[4], 2);
    EXPECT_EQ(mesh.elements.Node(3, 1), 3);
    EXPECT_EQ(mesh.projection, "NON-UTM");
  }
  MeshData mesh;
  MeshReadReport report;
  const std::string grid = WriteGrid(dir, Basin());
  EXPECT_EQ(ErrorOf([&] { ReadMeshBasicVds1(mesh, grid, report); }).rfind("ReadMeshBasicVds1: Wrong mesh file", 0), 0u);
}

}  // namespace
