// "DOMAIN" and the .mesh text format: header forms, mixed elements, units, coordinate types,
// bed-level adjustment, and the faults that stop the run.
#include <gtest/gtest.h>

#include <cmath>
#include <filesystem>
#include <string>

#include "driver/Log.h"
#include "mesh/Domain.h"
#include "mesh/MeshReaders.h"
#include "setup/SetupFile.h"
#include "support/TestSupport.h"

namespace {

const char* const kSquareNodes =
    "1 0 0 -0.5 1\n2 10 0 -2 1\n3 10 10 0.5 1\n4 0 10 -1 1\n";
const char* const kSquareElements = "2 3 21\n1 1 2 3\n2 1 3 4\n";

class Domain : public ::testing::Test {
 protected:
  void SetUp() override { ResetMeshTables(); }
  void TearDown() override {
    if (LogIsOpen()) LogClose();
    if (open_) SkfCloseFile();
    ResetMeshTables();
  }
  // Runs the set-up on a setup file whose DOMAIN section holds `domain`.
  DomainSettings Run(const std::string& domain) {
    Open(domain);
    DomainSettings s;
    SetupSpaceDiscretization(s);
    return s;
  }
  void Open(const std::string& domain) {
    const std::string setup = dir_.write("case.skf", "TesselHD {\n  DOMAIN {\n" + domain + "\n  }\n}\n");
    SkfOpenFile(setup, false);
    open_ = true;
    ASSERT_TRUE(LogOpen(dir_.file("case.log")));
    SkfOpenTarget("TesselHD");
  }
  std::string Log() const { return tavrintest::ReadFile(dir_.file("case.log")); }
  const MeshData& Mesh(int i = 1) const { return g_meshTable.meshes[i - 1]; }
  tavrintest::TempDir dir_;
  bool open_ = false;
};

TEST_F(Domain, HeaderFormsGiveProjectionItemAndUnit) {
  dir_.write("a.mesh", std::string("100079 1000 4 +proj=utm +zone=32 +datum=WGS84  \n") + kSquareNodes +
                           kSquareElements);
  dir_.write("b.mesh", std::string("4 NON-UTM\n") + kSquareNodes + kSquareElements);
  dir_.write("c.mesh", std::string("4\n") + kSquareNodes + kSquareElements);
  const DomainSettings s = Run(
      "number_of_meshes = 3\n"
      "Mesh { file_name = \"a.mesh\" }\n"
      "Mesh { file_name = \"b.mesh\" }\n"
      "Mesh { file_name = \"c.mesh\" }");
  EXPECT_EQ(s.numMeshes, 3);
  ASSERT_EQ(g_meshTable.numMeshes, 3);
  EXPECT_EQ(Mesh(1).projection, "+proj=utm +zone=32 +datum=WGS84");
  EXPECT_EQ(Mesh(2).projection, "NON-UTM");
  EXPECT_EQ(Mesh(3).projection, "UTM-32");  // no text: "coordinate_type" default
  for (int i = 1; i <= 3; ++i) {
    EXPECT_EQ(Mesh(i).number, i);
    EXPECT_EQ(Mesh(i).itemType, 100079);
    EXPECT_EQ(Mesh(i).unitCode, 1000);
    EXPECT_EQ(Mesh(i).faces.numFaces, 5);
  }
  const std::string log = Log();
  EXPECT_NE(log.find("Mesh information\n  Number of elements         : 2\n"), std::string::npos) << log;
  EXPECT_NE(log.find("Boundary information\n"), std::string::npos);
}

TEST_F(Domain, MixedElementsFeetAndGeographicCoordinates) {
  // Header type 25 with four columns; a 0 in the fourth column makes a triangle.
  dir_.write("mixed.mesh",
             "100079 1010 5\n1 0 0 -10 1\n2 1 0 -10 1\n3 1 1 -10 1\n4 0 1 -10 1\n5 2 0.5 -20 1\n"
             "2 4 25\n1 1 2 3 4\n2 2 5 3 0\n");
  Run("file_name = \"mixed.mesh\"\ncoordinate_type = \"GEOGRAPHIC\"");
  const MeshData& m = Mesh();
  EXPECT_EQ(m.projection, "LONG/LAT");
  EXPECT_EQ(m.elements.type[1], 25);
  EXPECT_EQ(m.elements.type[2], 21);
  EXPECT_EQ(m.elements.NumNodes(2), 3);
  EXPECT_DOUBLE_EQ(m.nodes.z[1], -3.048);   // feet to metres
  EXPECT_DOUBLE_EQ(m.nodes.z0[5], -6.096);  // the second bed-level array
  EXPECT_DOUBLE_EQ(m.nodes.x[5], 2.0 * 0.017453292519943295);  // x, y never converted by unit
  EXPECT_NE(Log().find("Min x-coordinate (degree)  : 0\n  Max x-coordinate (degree)  : 2\n"),
            std::string::npos) << Log();
}

TEST_F(Domain, UtmZoneFromTextAndBedLevelAdjustment) {
  dir_.write("sq.mesh", std::string("4\n") + kSquareNodes + kSquareElements);
  Run("file_name = \"sq.mesh\"\ncoordinate_type = \"UTM-33\"\nminimum_depth = -1\n"
      "thresshold_depth = 0");
  EXPECT_EQ(Mesh().projection, "UTM-33");
  // minimum_depth < z <= thresshold_depth becomes minimum_depth.
  EXPECT_DOUBLE_EQ(Mesh().nodes.z[1], -1.0);  // -0.5
  EXPECT_DOUBLE_EQ(Mesh().nodes.z[2], -2.0);
  EXPECT_DOUBLE_EQ(Mesh().nodes.z[3], 0.5);
  EXPECT_DOUBLE_EQ(Mesh().nodes.z[4], -1.0);
  TearDown();
  SetUp();
  Run("file_name = \"sq.mesh\"\ncoordinate_type = \"UTM-33\"\nzone = 34\ndatum_depth = 1");
  EXPECT_EQ(Mesh().projection, "UTM-34");
  EXPECT_DOUBLE_EQ(Mesh().nodes.z[3], -0.5);
  EXPECT_NE(Log().find("\"coordinate_type\" UTM-33 and \"zone\" 34 disagree"), std::string::npos);
}

TEST_F(Domain, ClockwiseElementsAreTurnedWithOneWarning) {
  dir_.write("cw.mesh", std::string("4 NON-UTM\n") + kSquareNodes + "2 3 21\n1 1 3 2\n2 1 4 3\n");
  Run("file_name = \"cw.mesh\"");
  EXPECT_GT(Mesh().elements.area[1], 0.0);
  EXPECT_GT(Mesh().elements.area[2], 0.0);
  EXPECT_NE(Log().find("2 elements were given clockwise"),
            std::string::npos) << Log();
}

using DomainDeath = Domain;

TEST_F(DomainDeath, FaultsStopTheRunWithTheirMessage) {
  GTEST_FLAG_SET(death_test_style, "threadsafe");
  dir_.write("sq.mesh", std::string("4\n") + kSquareNodes + kSquareElements);
  dir_.write("ids.mesh", std::string("4 NON-UTM\n1 0 0 0 1\n2 1 0 0 1\n4 1 1 0 1\n3 0 1 0 1\n") +
                             kSquareElements);
  std::filesystem::create_directory(dir_.file("folder.mesh"));
  struct Case { const char* domain; const char* message; };
  const Case cases[] = {
      {"file_name = \"sq.mesh\"\nzone = 0", "Wrong UTM zone"},
      {"file_name = \"sq.mesh\"\nzone = 61", "Wrong UTM zone"},
      {"file_name = \"ids.mesh\"", "The node indicices and IDs must be the same"},
      {"file_name = \"missing.mesh\"", "Unable to open file"},
      {"file_name = \"folder.mesh\"", "not a regular file"},
      {"number_of_meshes = 5\nMesh { file_name = \"sq.mesh\" }\nMesh { file_name = \"sq.mesh\" }\n"
       "Mesh { file_name = \"sq.mesh\" }\nMesh { file_name = \"sq.mesh\" }\n"
       "Mesh { file_name = \"sq.mesh\" }",
       "SetupSpaceDiscretization: Too many meshes"},
      {"number_of_dimensions = 3\nnumber_of_meshes = 2\nMesh { file_name = \"sq.mesh\" }\n"
       "Mesh { file_name = \"sq.mesh\" }\n", "layered 3-D meshes are"},
      {"file_name = \"sq.mesh\"\nnumber_of_dimensions = 4", "must be 2 or 3"},
      {"file_name = \"sq.mesh\"\ncoordinate_type = \"Mercator of my own\"", "Unknown projection"},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.domain);
    EXPECT_EXIT(Run(c.domain), ::testing::ExitedWithCode(1), c.message);
  }
}

// Parse errors of the .mesh text: each names the file and line.
TEST(MeshFormat, BrokenTextIsRefusedWithFileAndLine) {
  const std::string good = std::string("4 NON-UTM\n") + kSquareNodes + kSquareElements;
  struct Case { std::string text; const char* message; };
  const std::string filler = "3 0 0 0 1\n4 0 0 0 1\n";  // room for the node count
  const Case cases[] = {
      {"", "t.mesh: file ends early at line 1"},
      {"NON-UTM 4\n", "t.mesh, line 1: the header line must begin with the number of nodes"},
      {"2000000000 NON-UTM\n1 0 0 0 1\n", "line 1: number of nodes 2000000000 is more than"},
      {"0\n", "the number of nodes must be at least 1"},
      {"4\n1 0 0 0 1\n2 1 0 x 1\n" + filler, "t.mesh, line 3: z \"x\" is not a number"},
      {"4\n1 0 0 0 1\n2 1 0 0\n" + filler, "t.mesh, line 3: missing boundary code"},
      {"4\n1 0 0 0 1 7\n" + filler, "node line has more than 5 fields"},
      {std::string("4\n") + kSquareNodes, "file ends early at line 6 (expected the element header"},
      {std::string("4\n") + kSquareNodes + "2 3 99\n", "unknown element type code 99"},
      {std::string("4\n") + kSquareNodes + "2 4 33\n", "element type 33 is not a 2-D element type"},
      {std::string("4\n") + kSquareNodes + "2 3 21\n1 1 2 3\n", "file ends early at line 8"},
      {std::string("4\n") + kSquareNodes + "2 3 21\n1 1 2 5\n2 1 3 4\n",
       "line 7: node number 5 is larger than the number of nodes (4)"},
      {std::string("4\n") + kSquareNodes + "2 3 21\n1 1 2 -3\n2 1 3 4\n", "is lower than 1"},
      {std::string("4\n") + kSquareNodes + "2 3 21\n1 1 2 0\n2 1 3 4\n",
       "element 1 has 2 nodes, its type 21 needs 3"},
      {std::string("4\n") + kSquareNodes + "2 4 25\n1 1 2 3 4 5\n", "more than 5 fields"},
      {std::string("4\n") + kSquareNodes + "900000000 3 21\n1 1 2 3\n",
       "number of elements 900000000 is more than the rest of the file can hold"},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.text);
    MeshData m;
    try {
      ParseMeshText(m, c.text.data(), c.text.size(), "t.mesh");
      ADD_FAILURE() << "no error";
    } catch (const MeshError& e) {
      EXPECT_NE(std::string(e.what()).find(c.message), std::string::npos) << e.what();
    }
  }
  // Every prefix of a good file either parses or fails cleanly.
  for (std::size_t cut = 0; cut < good.size(); ++cut) {
    MeshData m;
    try {
      ParseMeshText(m, good.data(), cut, "t.mesh");
    } catch (const MeshError&) {
    }
  }
  MeshData m;
  ParseMeshText(m, good.data(), good.size(), "t.mesh");
  EXPECT_EQ(m.nodes.numNodes, 4);
  EXPECT_EQ(m.elements.numElements, 2);
}

}  // namespace
