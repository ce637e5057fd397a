// Gmsh reader: one mesh in every encoding, node tags, boundary codes, damaged and refused files.
#include <gtest/gtest.h>

#include <algorithm>
#include <charconv>
#include <cstring>
#include <string>
#include <tuple>
#include <vector>

#include "mesh/ReaderGmsh.h"
#include "support/TestSupport.h"

namespace {

// A 4 x 3 node grid, 10 m by 5 m cells: the first column two quadrangles, the rest triangles.
// Curves: bottom (entity 1), left (2), right (3), an inner line between the two interior nodes
// (4) and the top (5); each with its physical tags.
struct Model {
  struct Node { std::int64_t tag; double x, y, z; };
  struct Curve { std::int32_t entity; std::vector<std::int32_t> physicals;
                 std::vector<std::vector<std::int64_t>> lines; };
  std::vector<Node> nodes;  // file order
  std::vector<std::tuple<int, int, std::string>> names;
  std::vector<Curve> curves;
  std::vector<std::vector<std::int64_t>> quads, tris;
  std::int64_t point = 0;  // node of the one point element
};

std::int64_t GridTag(int i, int j, std::int64_t scale) { return (10 * (j * 4 + i) + 7) * scale; }

Model MakeModel(std::int64_t tagScale = 1) {
  Model m;
  for (int k = 11; k >= 0; --k)  // reverse order: the reader sorts by tag
    m.nodes.push_back({GridTag(k % 4, k / 4, tagScale), 10.0 * (k % 4), 5.0 * (k / 4),
                       -1.0 - 0.1 * (k % 4) - 0.125 * (k / 4)});
  auto t = [&](int i, int j) { return GridTag(i, j, tagScale); };
  m.names = {{1, 5, "Land"}, {1, 7, "inflow"}, {1, 3, "outflow"}, {2, 1, "water"}};
  m.curves = {{1, {5}, {{t(0, 0), t(1, 0)}, {t(1, 0), t(2, 0)}, {t(2, 0), t(3, 0)}}},
              {2, {7}, {{t(0, 2), t(0, 1)}, {t(0, 1), t(0, 0)}}},
              {3, {3}, {{t(3, 0), t(3, 1)}, {t(3, 1), t(3, 2)}}},
              {4, {9}, {{t(1, 1), t(2, 1)}}},
              {5, {}, {{t(3, 2), t(2, 2)}, {t(2, 2), t(1, 2)}, {t(1, 2), t(0, 2)}}}};
  for (int j = 0; j < 2; ++j)
    for (int i = 0; i < 3; ++i) {
      const std::int64_t a = t(i, j), b = t(i + 1, j), c = t(i + 1, j + 1), d = t(i, j + 1);
      if (i == 0) m.quads.push_back({a, b, c, d});
      else m.tris.insert(m.tris.end(), {{a, b, c}, {a, c, d}});
    }
  m.point = t(0, 0);
  return m;
}

// Text tokens or binary values; `swap` writes the other byte order.
struct Out {
  bool binary, swap;
  std::string s;
  template <typename T> void Bin(T v) {
    char b[sizeof v];
    std::memcpy(b, &v, sizeof v);
    if (swap) std::reverse(b, b + sizeof v);
    s.append(b, sizeof v);
  }
  template <typename T> void Text(T v) {
    char b[32];
    s.append(b, std::to_chars(b, b + 32, v).ptr - b);
    s += ' ';
  }
  void I(std::int32_t v) { binary ? Bin(v) : Text(v); }
  void S(std::uint64_t v) { binary ? Bin(v) : Text(v); }
  void D(double v) { binary ? Bin(v) : Text(v); }
  void NL() { if (!binary) s += '\n'; }
  void Lit(const std::string& text) { s += text; }
  void EndBinary() { if (binary) s += '\n'; }
};

std::string Write(const Model& m, int major, bool binary, bool swap = false) {
  Out o{binary, swap, ""};
  o.Lit(std::string("$MeshFormat\n") + (major == 2 ? "2.2 " : "4.1 ") + (binary ? "1" : "0") + " 8\n");
  if (binary) { o.Bin<std::int32_t>(1); o.Lit("\n"); }
  o.Lit("$EndMeshFormat\n$PhysicalNames\n" + std::to_string(m.names.size()) + "\n");
  for (const auto& [dim, tag, name] : m.names)
    o.Lit(std::to_string(dim) + " " + std::to_string(tag) + " \"" + name + "\"\n");
  o.Lit("$EndPhysicalNames\n");
  // An unknown section, with bytes that almost end it.
  static const char kJunk[] = "$NodeData\n\x01\x00\n$EndNodeDataX\xff\n$EndNodeData\n";
  o.Lit(binary ? std::string(kJunk, sizeof kJunk - 1)
               : "$Comments\nmade by hand\n$EndComment\n$EndComments\n");
  if (major == 4) {
    o.Lit("$Entities\n");
    o.S(1); o.S(m.curves.size()); o.S(1); o.S(0); o.NL();
    o.I(1); o.D(0); o.D(0); o.D(0); o.S(0); o.NL();
    for (const auto& c : m.curves) {
      o.I(c.entity);
      for (int k = 0; k < 6; ++k) o.D(k);
      o.S(c.physicals.size());
      for (auto p : c.physicals) o.I(p);
      o.S(2); o.I(1); o.I(-1); o.NL();
    }
    o.I(1);
    for (int k = 0; k < 6; ++k) o.D(k);
    o.S(1); o.I(1); o.S(m.curves.size());
    for (const auto& c : m.curves) o.I(c.entity);
    o.NL(); o.EndBinary(); o.Lit("$EndEntities\n$Nodes\n");
    o.S(1); o.S(m.nodes.size()); o.S(1); o.S(1000); o.NL();
    o.I(2); o.I(1); o.I(0); o.S(m.nodes.size()); o.NL();
    for (const auto& n : m.nodes) { o.S(n.tag); o.NL(); }
    for (const auto& n : m.nodes) { o.D(n.x); o.D(n.y); o.D(n.z); o.NL(); }
  } else {
    o.Lit("$Nodes\n" + std::to_string(m.nodes.size()) + "\n");
    for (const auto& n : m.nodes) {
      o.I(static_cast<std::int32_t>(n.tag)); o.D(n.x); o.D(n.y); o.D(n.z); o.NL();
    }
  }
  o.EndBinary();
  o.Lit("$EndNodes\n$Elements\n");
  // Groups of one type and entity: (type, entity, physical, node lists).
  std::vector<std::tuple<int, int, int, std::vector<std::vector<std::int64_t>>>> groups;
  groups.push_back({15, 1, 0, {{m.point}}});
  for (const auto& c : m.curves) {
    for (std::size_t k = 0; k < std::max<std::size_t>(1, c.physicals.size()); ++k) {
      groups.push_back({1, c.entity, c.physicals.empty() ? 0 : c.physicals[k], c.lines});
      if (major == 4) break;  // the entity carries all its physical tags
    }
  }
  groups.push_back({3, 1, 1, m.quads});
  groups.push_back({2, 1, 1, m.tris});
  std::size_t total = 0;
  for (const auto& g : groups) total += std::get<3>(g).size();
  if (major == 4) { o.S(groups.size()); o.S(total); o.S(1); o.S(total); o.NL(); }
  else o.Lit(std::to_string(total) + "\n");
  std::int32_t number = 0;
  for (const auto& [type, entity, physical, elems] : groups) {
    if (major == 4) {
      o.I(type == 15 ? 0 : type == 1 ? 1 : 2); o.I(entity); o.I(type); o.S(elems.size()); o.NL();
    }
    else if (binary) { o.I(type); o.I(static_cast<std::int32_t>(elems.size())); o.I(2); }
    for (const auto& nodes : elems) {
      if (major == 4) {
        o.S(++number);
        for (auto n : nodes) o.S(n);
      } else {
        o.I(++number);
        if (!binary) { o.I(type); o.I(2); }
        o.I(physical); o.I(entity);
        for (auto n : nodes) o.I(static_cast<std::int32_t>(n));
      }
      o.NL();
    }
  }
  o.EndBinary();
  o.Lit("$EndElements\n");
  return o.s;
}

struct Variant { const char* label; int major; bool binary, swap; };
constexpr Variant kVariants[] = {{"2.2 ascii", 2, false, false}, {"2.2 binary", 2, true, false},
                                 {"2.2 swapped", 2, true, true}, {"4.1 ascii", 4, false, false},
                                 {"4.1 binary", 4, true, false}, {"4.1 swapped", 4, true, true}};

MeshData Parse(const std::string& text, MeshReadReport* reportOut = nullptr) {
  MeshData mesh;
  MeshReadReport report;
  ParseGmshData(mesh, text.data(), text.size(), "t.msh", report);
  if (reportOut != nullptr) *reportOut = report;
  return mesh;
}

std::vector<std::int32_t> Codes(const MeshData& m) {
  return {m.nodes.code.begin() + 1, m.nodes.code.begin() + 1 + m.nodes.numNodes};
}

std::string ErrorOf(const std::string& text) {
  try {
    Parse(text);
  } catch (const MeshError& e) {
    return e.what();
  }
  return "(no error)";
}

bool Has(const std::string& text, const std::string& part) {
  return text.find(part) != std::string::npos;
}

std::vector<std::int32_t> NodesOf(const MeshData& m, int e) {
  const auto& el = m.elements;
  return {&el.nodeList[el.nodeStart[e]], &el.nodeList[el.nodeStart[e + 1]]};
}

std::string Value(const MeshReadReport& r, const std::string& label) {
  for (const auto& [l, v] : r.values) if (l == label) return v;
  return "(missing)";
}

// Nodes numbered row by row from the lower left (the tag order).
const std::vector<std::int32_t> kModelCodes = {3, 1, 1, 2, 3, -4, -4, 2, 3, 1, 1, 2};

TEST(MeshGmshFormats, EveryEncodingReadsTheSameMesh) {
  for (const Variant& v : kVariants) {
    SCOPED_TRACE(v.label);
    MeshReadReport report;
    const MeshData m = Parse(Write(MakeModel(), v.major, v.binary, v.swap), &report);
    ASSERT_EQ(m.nodes.numNodes, 12);
    for (int n = 1; n <= 12; ++n) {
      const int i = (n - 1) % 4, j = (n - 1) / 4;
      EXPECT_EQ(m.nodes.x[n], 10.0 * i);
      EXPECT_EQ(m.nodes.y[n], 5.0 * j);
      EXPECT_EQ(m.nodes.z[n], -1.0 - 0.1 * i - 0.125 * j);
    }
    EXPECT_EQ(Codes(m), kModelCodes);
    ASSERT_EQ(m.elements.numElements, 10);
    EXPECT_EQ(m.elements.type[1], 25);
    EXPECT_EQ(m.elements.type[3], 21);
    EXPECT_EQ(NodesOf(m, 2), (std::vector<std::int32_t>{5, 6, 10, 9}));
    EXPECT_EQ(NodesOf(m, 10), (std::vector<std::int32_t>{7, 12, 11}));
    EXPECT_EQ(Value(report, "Gmsh physical curve 5 Land"), "code 1");
    EXPECT_EQ(Value(report, "Gmsh physical curve 3 outflow"), "code 2");
    EXPECT_EQ(Value(report, "Gmsh physical curve 7 inflow"), "code 3");
    EXPECT_EQ(Value(report, "Gmsh physical curve 9"), "code -4");
  }
}

TEST(MeshGmshFormats, ExampleFilesAgree) {
  const std::string file = __FILE__;
  const std::string dir = file.substr(0, file.rfind("tests/mesh/")) + "examples/meshes/";
  MeshData a, b;
  MeshReadReport report;
  ReadMeshGmsh(a, dir + "channel_v22.msh", report);
  ReadMeshGmsh(b, dir + "channel_v41.msh", report);
  EXPECT_EQ(Codes(a), (std::vector<std::int32_t>{2, 3, 3, 2, 1, 1, 1, 3, 1, 1, 1, 2, 0, 0, 0}));
  EXPECT_EQ(Codes(a), Codes(b));
  EXPECT_EQ(a.nodes.z, b.nodes.z);
  EXPECT_EQ(a.elements.nodeList, b.elements.nodeList);
  EXPECT_EQ(a.elements.numElements, 14);
}

TEST(MeshGmshTags, SparseTagsDuplicatesAndUndefinedNodes) {
  // Tags far apart (the hash-map path) give the same mesh; 2.2 tags stay within 32 bits.
  for (const Variant& v : kVariants) {
    SCOPED_TRACE(v.label);
    const std::int64_t scale = v.major == 4 ? 1000000007 : 10000000;
    const MeshData m = Parse(Write(MakeModel(scale), v.major, v.binary, v.swap));
    EXPECT_EQ(Codes(m), kModelCodes);
    EXPECT_EQ(m.elements.nodeList, Parse(Write(MakeModel(), v.major, v.binary)).elements.nodeList);
  }
  Model twice = MakeModel();
  twice.nodes[3].tag = twice.nodes[4].tag;
  EXPECT_PRED2(Has, ErrorOf(Write(twice, 4, true)), "node tag 77 is defined twice");
  Model undefined = MakeModel();
  undefined.tris[1][2] = 55;
  EXPECT_PRED2(Has, ErrorOf(Write(undefined, 2, false)), ": element 16: node tag 55 is not defined");
  EXPECT_PRED2(Has, ErrorOf(Write(undefined, 4, true)), "node tag 55 is not defined");
}

TEST(MeshGmshCodes, OpenCurvesLandAndInnerLines) {
  Model m = MakeModel();
  m.names = {{1, 11, "sea"}, {1, 5, "LAND"}};
  m.curves[0].physicals = {11};  // bottom: open, meets both sides
  m.curves[3].physicals = {5};   // inner land line: ignored
  m.curves[4].physicals = {1};   // top: unnamed tag 1 is land
  for (int major : {2, 4}) {
    MeshReadReport report;
    const MeshData mesh = Parse(Write(m, major, false), &report);
    // Codes 3 -> 2, 7 -> 3, 11 -> 4; corners take the lower open code.
    EXPECT_EQ(Codes(mesh), (std::vector<std::int32_t>{3, 4, 4, 2, 3, 0, 0, 2, 3, 1, 1, 2}));
    EXPECT_EQ(Value(report, "Gmsh physical curve 1"), "code 1");
    EXPECT_EQ(Value(report, "Gmsh physical curve 11 sea"), "code 4");
    ASSERT_EQ(report.warnings.size(), 1u);
    EXPECT_PRED2(Has, report.warnings[0], "land curve 5 inside the mesh");
  }
  // A curve in two physical groups: the open one wins over land on its nodes.
  m.curves[4].physicals = {1, 7};
  for (int major : {2, 4}) {
    const MeshData mesh = Parse(Write(m, major, true));
    EXPECT_EQ(Codes(mesh), (std::vector<std::int32_t>{3, 4, 4, 2, 3, 0, 0, 2, 3, 3, 3, 2}));
  }
}

TEST(MeshGmshDamaged, TruncatedAtEveryOffsetThrows) {
  for (const Variant& v : kVariants) {
    SCOPED_TRACE(v.label);
    const std::string full = Write(MakeModel(), v.major, v.binary, v.swap);
    int wrong = 0;
    for (std::size_t cut = 0; cut + 1 < full.size(); ++cut) {  // the last newline is optional
      const std::string e = ErrorOf(full.substr(0, cut));
      if (e.rfind("t.msh", 0) != 0 && e.find(" in t.msh") == std::string::npos && wrong++ < 3)
        ADD_FAILURE() << "cut at " << cut << ": " << e;
    }
    EXPECT_EQ(wrong, 0);
    EXPECT_EQ(Parse(full.substr(0, full.size() - 1)).elements.numElements, 10);
  }
}

TEST(MeshGmshDamaged, HostileCountsTextAndFiles) {
  const std::string head = "$MeshFormat\n2.2 0 8\n$EndMeshFormat\n";
  EXPECT_PRED2(Has, ErrorOf(head + "$Nodes\n2000000000\n1 0 0 0\n$EndNodes\n"),
               "t.msh, line 5: number of nodes 2000000000 is more");
  EXPECT_PRED2(Has, ErrorOf(head + "$Nodes\n1\n1 0 x 0\n$EndNodes\n"),
               "t.msh, line 6: node y \"x\" is not a number");
  // Binary fields patched after the section names.
  const std::string b41 = Write(MakeModel(), 4, true);
  std::string patched = b41;
  const std::uint64_t huge = 2000000000;
  std::memcpy(&patched[b41.find("$Nodes\n") + 7 + 8], &huge, 8);
  EXPECT_PRED2(Has, ErrorOf(patched), "number of nodes 2000000000 is more than the rest");
  const std::string b22 = Write(MakeModel(), 2, true);
  const std::size_t block = b22.find("$Elements\n") + 13;  // after "22\n"
  patched = b22;
  const std::int32_t count = 2000000000;
  std::memcpy(&patched[block + 4], &count, 4);
  EXPECT_PRED2(Has, ErrorOf(patched), "element block of 2000000000 elements");

  tavrintest::TempDir dir;
  MeshData mesh;
  MeshReadReport report;
  EXPECT_THROW(ReadMeshGmsh(mesh, dir.file("none.msh"), report), MeshError);
  EXPECT_THROW(ReadMeshGmsh(mesh, dir.path(), report), MeshError);
}

TEST(MeshGmshRefused, VersionsAndElementTypes) {
  auto format = [](const std::string& line) { return "$MeshFormat\n" + line + "\n$EndMeshFormat\n"; };
  EXPECT_PRED2(Has, ErrorOf(format("4 0 8")), "MSH version 4.0 is not supported");
  EXPECT_PRED2(Has, ErrorOf(format("3.0 0 8")), "MSH version 3.0 is not supported");
  EXPECT_PRED2(Has, ErrorOf(format("2.2 2 8")), "file type 2");
  EXPECT_PRED2(Has, ErrorOf(format("4.1 1 4")), "data size 4 is not supported");
  EXPECT_PRED2(Has, ErrorOf("$NOD\n1\n1 0 0 0\n$ENDNOD\n"), "version 1");

  auto mesh = [&](const std::string& element) {
    return format("2.2 0 8") + "$Nodes\n4\n1 0 0 0\n2 1 0 0\n3 0 1 0\n4 0 0 1\n$EndNodes\n" +
           "$Elements\n1\n" + element + "\n$EndElements\n";
  };
  EXPECT_EQ(Parse(mesh("1 2 0 1 2 3")).elements.numElements, 1);
  EXPECT_PRED2(Has, ErrorOf(mesh("1 4 0 1 2 3 4")),
               "line 13: gmsh element type 4: 3-D elements are not supported in a 2-D mesh");
  EXPECT_PRED2(Has, ErrorOf(mesh("1 9 0 1 2 3 1 2 3")), "gmsh element type 9 (second");
  EXPECT_PRED2(Has, ErrorOf(mesh("1 99 0 1")), "gmsh element type 99 is not supported");
  EXPECT_EQ(ErrorOf(mesh("1 1 2 3 1 1 2")), "no triangles or quadrilaterals in t.msh");
  EXPECT_PRED2(Has, ErrorOf(format("2.2 0 8") + "$Elements\n0\n$EndElements\n"), "before the $Nodes");
}

}  // namespace
