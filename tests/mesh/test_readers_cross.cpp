// Every reader on the bundled example channel gives the mesh that channel.mesh describes: the
// same nodes (x, y, z and, where the format carries them, boundary codes) and elements, and the
// same faces and sections once set up.
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "mesh/Domain.h"
#include "mesh/MeshGeometry.h"
#include "mesh/MeshReaders.h"

namespace {

const std::string kDir = std::string(TAVRIN_SOURCE_DIR) + "/examples/meshes/";

MeshData Read(const std::string& name) {
  MeshData m;
  MeshReadReport report;
  ReadMeshFile(m, kDir + name, MeshReadOptions{}, report);
  return m;
}

std::vector<std::int32_t> Nodes(const MeshData& m, std::int32_t e) {
  std::vector<std::int32_t> v;
  for (std::int32_t k = 1; k <= m.elements.NumNodes(e); ++k) v.push_back(m.elements.Node(e, k));
  return v;
}

TEST(MeshReaders, EveryFormatReadsTheExampleChannel) {
  const MeshData ref = Read("channel.mesh");
  ASSERT_EQ(ref.nodes.numNodes, 15);
  ASSERT_EQ(ref.elements.numElements, 15);
  struct Case { const char* file; bool quad; bool codes; };
  // The triangle-only formats split quadrilateral 15 (9, 10, 15, 14) into (9, 10, 15) and
  // (9, 15, 14).
  const Case cases[] = {{"channel.2dm", true, true},         {"channel.geo", true, true},
                        {"channel.fem", true, true},         {"channel.14", false, true},
                        {"quoddy_channel.bat", false, false}, {"tri_channel", false, true}};
  for (const Case& c : cases) {
    SCOPED_TRACE(c.file);
    const MeshData m = Read(c.file);
    ASSERT_EQ(m.nodes.numNodes, 15);
    for (std::int32_t n = 1; n <= 15; ++n) {
      EXPECT_EQ(m.nodes.x[n], ref.nodes.x[n]) << n;
      EXPECT_EQ(m.nodes.y[n], ref.nodes.y[n]) << n;
      EXPECT_EQ(m.nodes.z[n], ref.nodes.z[n]) << n;
      if (c.codes) EXPECT_EQ(m.nodes.code[n], ref.nodes.code[n]) << n;
      else EXPECT_EQ(m.nodes.code[n] != 0, ref.nodes.code[n] != 0) << n;
    }
    ASSERT_EQ(m.elements.numElements, c.quad ? 15 : 16);
    for (std::int32_t e = 1; e <= 14; ++e) EXPECT_EQ(Nodes(m, e), Nodes(ref, e)) << e;
    if (c.quad) {
      EXPECT_EQ(Nodes(m, 15), Nodes(ref, 15));
    } else {
      EXPECT_EQ(Nodes(m, 15), (std::vector<std::int32_t>{9, 10, 15}));
      EXPECT_EQ(Nodes(m, 16), (std::vector<std::int32_t>{9, 15, 14}));
    }
  }
}

TEST(MeshReaders, ExampleChannelSetsUpWithThreeSections) {
  ResetMeshTables();
  MeshData m = Read("channel.mesh");
  CheckMeshSafety(m);
  std::vector<std::string> lines, warnings;
  ValidateMesh(m, lines);
  EXPECT_EQ(OrientElements(m), 0);
  SetupMeshGeometry(m, warnings);
  EXPECT_TRUE(warnings.empty());
  double area = 0.0;
  for (std::int32_t e = 1; e <= m.elements.numElements; ++e) area += m.elements.area[e];
  EXPECT_DOUBLE_EQ(area, 400.0 * 100.0);
  ASSERT_EQ(m.sections.size(), 3u);
  EXPECT_EQ(m.sections[0].code, 1);
  EXPECT_EQ(m.sections[0].NumFaces(), 8);  // the two long sides
  EXPECT_EQ(m.sections[1].code, 2);
  EXPECT_EQ(m.sections[1].NumFaces(), 2);  // the west end
  EXPECT_EQ(m.sections[2].code, 3);
  EXPECT_EQ(m.sections[2].NumFaces(), 2);
  ResetMeshTables();
}

}  // namespace
