// Text mesh readers: the .2dm options, the ADCIRC boundary lists and the refusal of bad input
// (the example channel in every format is compared with channel.mesh in test_readers_cross.cpp).
#include <gtest/gtest.h>

#include <filesystem>
#include <map>
#include <string>
#include <vector>

#include "mesh/MeshReaders.h"
#include "support/TestSupport.h"

namespace {

const std::string kExamples =
    (std::filesystem::path(__FILE__).parent_path() / "../../examples/meshes/").string();

struct Element {
  std::int32_t id, type;
  std::vector<std::int32_t> nodes;
  bool operator==(const Element&) const = default;
};

std::vector<Element> ElementsOf(const MeshData& m) {
  const ElementTable& el = m.elements;
  std::vector<Element> out;
  for (std::int32_t e = 1; e <= el.numElements; ++e)
    out.push_back({el.id[e], el.type[e],
                   {&el.nodeList[el.nodeStart[e]], &el.nodeList[el.nodeStart[e + 1]]}});
  return out;
}

// The reader of the file's extension (anything else: node/topology).
void ReadByExtension(MeshData& mesh, const std::string& path, MeshReadReport& report) {
  const std::string ext = path.substr(path.find_last_of('.') + 1);
  if (ext == "2dm") ReadMesh2dm(mesh, path, MeshReadOptions{}, report);
  else if (ext == "14") ReadMeshBasicADCIRC(mesh, path, report);
  else if (ext == "bat") ReadMeshBasicQUODDY(mesh, path, report);
  else if (ext == "fem") ReadMeshFem(mesh, path, report);
  else if (ext == "geo") ReadMeshGeo(mesh, path, report);
  else ReadMeshNodeTopo(mesh, path, report);
}

// Reads `file`, written with `text` (a folder for "<dir>", nothing when `text` and `extra` are
// empty), with the companion files `extra`; returns the error message with file names relative
// to the folder ("" when the file reads).
std::string ReadError(const std::string& file, const std::string& text,
                      const std::map<std::string, std::string>& extra = {}) {
  tavrintest::TempDir dir;
  if (text == "<dir>") std::filesystem::create_directory(dir.file(file));
  else if (!text.empty() || !extra.empty()) dir.write(file, text);
  for (const auto& [name, content] : extra) dir.write(name, content);
  MeshData mesh;
  MeshReadReport report;
  try {
    ReadByExtension(mesh, dir.file(file), report);
  } catch (const MeshError& e) {
    std::string message = e.what();
    const std::string prefix = dir.path() + "/";
    for (std::size_t at; (at = message.find(prefix)) != std::string::npos;)
      message.erase(at, prefix.size());
    return message;
  }
  return "";
}

TEST(MeshTextErrors, BadInputIsRefusedWithFileAndLine) {
  const std::string tri2dm = "MESH2D\nND 1 0 0 0\nND 2 1 0 0\nND 3 0 1 0\n";
  const std::string adcirc = "t\n1 3\n1 0 0 1\n2 1 0 1\n3 0 1 1\n";
  const std::string node3 = "3\n1 0 0 1\n2 1 0 1\n3 0 1 1\n";
  const std::string topo3 = "3\n1 -1\n2 -1\n3 -1\n";
  const std::string geo = "GEO 3 1\n1 0 0 0 1\n2 1 0 0 1\n3 0 1 0 1\n";
  const struct {
    std::string file, text;
    std::map<std::string, std::string> extra;
    std::string expected;
  } cases[] = {
      {"a.2dm", tri2dm + "E3T 1 1 2 4 1\n", {}, "a.2dm, line 5: node number 4 is out of range 1..3"},
      {"a.2dm", tri2dm + "E6T 1 1 2 3 4 5 6 1\n", {}, "a.2dm, line 5: element card E6T is not supported"},
      {"a.2dm", "MESH2D\nND 1 0 x 0\nE3T 1 1 1 1\n", {}, "a.2dm, line 2: y \"x\" is not a number"},
      {"a.2dm", tri2dm + "ND 2 5 5 5\nE3T 1 1 2 3 1\n", {}, "a.2dm, line 5: node id 2 is given twice"},
      {"a.2dm", tri2dm + "E3T 1 1 2 3 1\nNS 1 2\n", {}, "a.2dm, line 6: node string does not end"},
      {"a.2dm", "MESH2D\nMESHNAME x\n", {}, "a.2dm: no nodes"},
      {"a.2dm", "ND 1 0 0 0\n", {}, "a.2dm, line 1: not a 2dm mesh"},
      {"a.2dm", "<dir>", {}, "Unable to open file a.2dm (not a regular file)"},
      {"none.14", "", {}, "Unable to open file none.14 (No such file"},
      {"a.14", "t\n1 3\n1 0 0 1\n2 1 0 1\n", {}, "a.14: file ends early at line 5"},
      {"a.14", "t\n2000000000 2000000000\n1 0 0 1\n", {}, "a.14, line 2: number of nodes NP 2000000000 is more than"},
      {"a.14", adcirc + "1 3 1 2 x\n", {}, "a.14, line 6: node number \"x\" is not an integer"},
      {"a.14", adcirc + "1 3 1 2 3\n1\n1\n2\n1\n", {}, "a.14: file ends early at line 11"},
      {"a.bat", "1 0 0\n", {{"a.nod", "1 0 0\n"}},
       "ReadMeshBasicQUODDY: Error reading mesh information: Unable to open file"},
      {"a.bat", "1 1\n2 1\n", {{"a.nod", "1 0 0\n2 1 0\n"}, {"a.ele", "1 1 2 3\n"}},
       "ReadMeshBasicQUODDY: Error reading mesh information: a.ele, line 1: node number 3 is out of range 1..2"},
      {"a.nt", "", {{"a.node", node3}, {"a.topo", topo3}, {"a.ele", "1 6\n1 1 2 3 1 2 3\n"}},
       "a.ele, line 1: elements of 6 nodes are not supported in a 2-D mesh"},
      {"a.nt", "", {{"a.node", node3}, {"a.topo", "3\n1 -1\n3 -1\n2 -1\n"}, {"a.ele", "1 3\n1 1 2 3\n"}},
       "a.topo, line 3: node id 3 differs from 2"},
      {"a.nt", "", {{"a.node", "2147483647\n1 0 0 1\n"}, {"a.topo", topo3}, {"a.ele", "1 3\n1 1 2 3\n"}},
       "a.node, line 1: node count 2147483647 is more than"},
      {"a.nt", "", {{"a.node", node3}, {"a.topo", topo3}}, "Unable to open file"},
      {"a.fem", "NODE\n1\nCOOR\n1 0 0\nMESH\n", {}, "a.fem, line 5: unknown keyword \"MESH\""},
      {"a.fem", "ELEM\n1\n1 1 2 3\n", {}, "a.fem, line 1: ELEM before NODE"},
      {"a.fem", "NODE\n3\nCOOR\n1 0 0\n2 1 0\n3 0 1\nELEM\n1\n1 1 2 3\n", {},
       "a.fem, line 9: the file ends without the ELEV_I block"},
      {"a.geo", geo + "1 31 1 2 3 1\n", {}, "a.geo, line 5: element type 31 is not a 2-D type"},
      {"a.geo", geo, {}, "a.geo: file ends early at line 5"},
      {"a.geo", geo + "1 21 1 2 3 7\n", {}, "a.geo, line 5: unexpected field \"7\""},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.file + ": " + c.text);
    const std::string message = ReadError(c.file, c.text, c.extra);
    EXPECT_EQ(message.rfind(c.expected, 0), 0u) << message;
  }
}

MeshData Parse2dm(const std::string& text, const MeshReadOptions& options, MeshReadReport& report) {
  MeshData mesh;
  Parse2dmText(mesh, text.data(), text.size(), "test.2dm", options, report);
  return mesh;
}

TEST(MeshText2dm, UnitsConvertToMetres) {
  MeshReadOptions options;
  options.unitXY = 1010;  // foot
  options.unitZ = 1001;   // centimetre
  MeshReadReport report;
  const MeshData m = Parse2dm("MESH2D\nND 1 0 0 -250\nND 2 1000 0 0\nND 3 0 10 0\nE3T 1 1 2 3\n",
                              options, report);
  EXPECT_DOUBLE_EQ(m.nodes.x[2], 304.8);
  EXPECT_DOUBLE_EQ(m.nodes.y[3], 3.048);
  EXPECT_DOUBLE_EQ(m.nodes.z[1], -2.5);
  options.unitXY = 2000;  // a velocity
  EXPECT_THROW(Parse2dm("MESH2D\n", options, report), MeshError);
}

// Three quadrilaterals in a row over nodes 1-4 (bottom) and 5-8 (top), given out of order.
const std::string kThreeQuads =
    "MESH2D\nND 8 3 1 0\nND 1 0 0 0\nND 2 1 0 0\nND 3 2 0 0\nND 4 3 0 0\nND 5 0 1 0\n"
    "ND 6 1 1 0\nND 7 2 1 0\nE4Q 11 1 2 6 5 1\nE4Q 12 2 3 7 6 1\nE4Q 13 3 4 8 7 9\n"
    "NS 1 -5\nNS 4 8\nNS -7 east end\n";

TEST(MeshText2dm, DryElementsAndTheirNodesAreDropped) {
  MeshReadOptions options;
  MeshReadReport report;
  MeshData m = Parse2dm(kThreeQuads, options, report);
  EXPECT_EQ(m.elements.numElements, 3);
  ASSERT_EQ(report.values.size(), 1u);
  EXPECT_EQ(report.values[0].first + " " + report.values[0].second, "Number of dry elements 0");

  options.elementAttribute = 9;
  report = {};
  m = Parse2dm(kThreeQuads, options, report);
  EXPECT_EQ(report.values.at(0).second, "1");
  ASSERT_EQ(m.nodes.numNodes, 6);  // nodes 4 and 8 only belonged to element 13
  for (std::int32_t n = 1; n <= 6; ++n) EXPECT_EQ(m.nodes.id[n], n);
  EXPECT_EQ(std::make_pair(m.nodes.x[4], m.nodes.y[4]), std::make_pair(0.0, 1.0));  // old 5
  EXPECT_EQ(ElementsOf(m), (std::vector<Element>{{11, 25, {1, 2, 5, 4}}, {12, 25, {2, 3, 6, 5}}}));
  // Strings 1 (1, 5) and 2 (4, 8, 7: only 7 remains) give their boundary nodes codes 2 and 3.
  EXPECT_EQ(m.nodes.code, (std::vector<std::int32_t>{0, 2, 1, 1, 2, 1, 3}));

  options.elementAttribute = 1;
  EXPECT_THROW(Parse2dm("MESH2D\nND 1 0 0 0\nND 2 1 0 0\nND 3 0 1 0\nE3T 1 1 2 3 1\n", options, report),
               MeshError);
}

TEST(MeshText2dm, NodeStringCodes) {
  std::string text = tavrintest::ReadFile(kExamples + "channel.2dm");
  // An inner line over two cards, and a later string that takes node 10 from the east end.
  text += "NS 7 8\nNS -9 inner\nNS 10 -5 north\n";
  MeshReadReport report;
  const MeshData m = Parse2dm(text, MeshReadOptions{}, report);
  const std::vector<std::int32_t> expected = {0, 2, 1, 1, 1, 5, 2, -3, -3, -3, 5, 2, 1, 1, 1, 3};
  EXPECT_EQ(m.nodes.code, expected);
}

// Two triangles over nodes 1-2-3-4 (a square), with the boundary lists that follow.
std::string Adcirc(const std::string& elementLines, const std::string& boundary) {
  return "square\n2 4\n1 0 0 3\n2 10 0 3\n3 10 10 4\n4 0 10 4\n" + elementLines + boundary;
}

TEST(MeshTextADCIRC, BoundaryListsGiveCodes) {
  tavrintest::TempDir dir;
  MeshReadReport report;
  const std::string tris = "1 3 1 2 3\n2 3 1 3 4\n";
  const auto read = [&](const std::string& text) {
    MeshData m;
    ReadMeshBasicADCIRC(m, dir.write("m.14", text), report);
    return m.nodes.code;
  };
  EXPECT_EQ(read(Adcirc(tris, "")), (std::vector<std::int32_t>{0, 1, 1, 1, 1}));
  // Open segment 1 over nodes 2-3; land over 3-4-1, with the columns of a barrier type; the
  // open code wins at node 3; node 2 is open only.
  EXPECT_EQ(read(Adcirc(tris, "1\n2\n2 0\n2\n3\n1\n3\n3 24\n3 1 0.5 1 1\n4 2 0.5 1 1\n1 3 1 1 1\n")),
            (std::vector<std::int32_t>{0, 1, 2, 2, 1}));
  EXPECT_TRUE(report.warnings.empty());
  // Counts that do not add up are a warning.
  read(Adcirc(tris, "1\n5\n1\n2\n"));
  ASSERT_EQ(report.warnings.size(), 1u);
  EXPECT_NE(report.warnings[0].find("NETA is 5"), std::string::npos);

  EXPECT_EQ(ReadError("q.14", Adcirc("1 4 1 2 3 4\n2 3 1 3 4\n", "")),
            "ReadMeshBasicADCIRC: Element type not supported");  // exactly, no file name
}

}  // namespace
