// Text mesh readers: .2dm, ADCIRC .14, QUODDY .nod/.ele/.bat, node/topology .node/.topo/.ele,
// the keyed .fem layout and the .geo layout. All of them parse through TextScanner, so every
// fault names the file and the line. docs/file-formats.md describes the layouts and the rules
// for boundary codes.
//
// Common rules:
// - Node identifiers run 1..count, may come in any order and must each appear exactly once;
//   a node is stored at the position of its identifier, so element node numbers are node
//   identifiers.
// - Element node numbers are checked against 1..count; elements are stored in file order.
// - The tables are allocated once, from header counts or a counting pass; header counts are
//   checked against the bytes left in the file first.
// - Where a format gives no boundary codes, nodes on the mesh boundary (edges used by one
//   element, outer boundary and islands alike) that have no code get the land code 1.
#include <algorithm>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "io/Units.h"
#include "mesh/MeshReaders.h"
#include "mesh/TextScan.h"

namespace {

using Index = std::int32_t;

constexpr Index kTriangle = 21;
constexpr Index kQuadrilateral = 25;
constexpr std::int64_t kMaxItems = 2147483645;  // what the tables can hold (int32 - 2)

std::string Str(std::int64_t v) { return std::to_string(v); }

// The path without its extension (the part after the last "." of the file name).
std::string BaseName(const std::string& path) {
  const std::size_t dot = path.find_last_of('.');
  const std::size_t slash = path.find_last_of('/');
  if (dot == std::string::npos || (slash != std::string::npos && dot < slash)) return path;
  return path.substr(0, dot);
}

void EndOfLine(TextScanner& scan) {
  if (!scan.AtEnd()) scan.Fail("unexpected field \"" + std::string(scan.Field()) + "\"");
}

// Checks a node identifier read from a node list: 1..count and not given before in this file
// (`seen` has count + 1 entries).
Index ClaimNodeId(TextScanner& scan, std::int64_t id, std::vector<char>& seen) {
  const std::int64_t count = static_cast<std::int64_t>(seen.size()) - 1;
  if (id < 1 || id > count)
    scan.Fail("node id " + Str(id) + " is out of range 1.." + Str(count));
  if (seen[id] != 0) scan.Fail("node id " + Str(id) + " is given twice");
  seen[id] = 1;
  return static_cast<Index>(id);
}

Index ReadNodeId(TextScanner& scan, std::vector<char>& seen) {
  return ClaimNodeId(scan, scan.Int("node id"), seen);
}

// A node number used by an element or a boundary list: 1..count.
Index ReadNodeNumber(TextScanner& scan, Index count) {
  const std::int64_t n = scan.Int("node number");
  if (n < 1 || n > count) scan.Fail("node number " + Str(n) + " is out of range 1.." + Str(count));
  return static_cast<Index>(n);
}

// Element type of a 2-D element with `k` nodes.
Index TypeOfNodeCount(const TextScanner& scan, std::int64_t k) {
  if (k == 3) return kTriangle;
  if (k == 4) return kQuadrilateral;
  scan.Fail("elements of " + Str(k) + " nodes are not supported in a 2-D mesh (3 or 4 nodes)");
}

// Checks an element type code given in a file: a 2-D type that the solver's text meshes use.
void CheckElementType(const TextScanner& scan, std::int64_t type) {
  ShapeData shape;
  if (type < 0 || type > 99 || !ShapeOfType(static_cast<Index>(type), shape))
    scan.Fail("unknown element type " + Str(type));
  if (shape.dimension != 2) scan.Fail("element type " + Str(type) + " is not a 2-D type");
  if (type != kTriangle && type != kQuadrilateral)
    scan.Fail("element type " + Str(type) + " is not supported (21 or 25)");
}

// Node values gathered by identifier before they go into the node table.
struct NodeStage {
  std::vector<double> x, y, z;
  std::vector<Index> code;
  std::vector<char> seen;  // identifier given in the coordinate list

  void Resize(Index count) {
    const std::size_t n = static_cast<std::size_t>(count) + 1;
    x.assign(n, 0.0);
    y.assign(n, 0.0);
    z.assign(n, 0.0);
    code.assign(n, 0);
    seen.assign(n, 0);
  }
  Index Count() const { return static_cast<Index>(x.size()) - 1; }
  void CommitTo(NodeTable& nodes) const {
    AllocateNodes(nodes, Count());
    for (Index i = 1; i <= Count(); ++i) AddNode(nodes, i, x[i], y[i], z[i], code[i]);
  }
};

// Nodes on the mesh boundary: the end nodes of the edges that only one element uses. The
// edges are keys (smaller node << 32 | larger node); one sort brings equal edges together.
std::vector<char> BoundaryNodes(const ElementTable& el, Index numNodes) {
  std::vector<std::uint64_t> keys;
  keys.reserve(static_cast<std::size_t>(el.nodeStart[el.numElements + 1] - 1));
  for (Index e = 1; e <= el.numElements; ++e) {
    const Index n = el.NumNodes(e);
    for (Index k = 1; k <= n; ++k) {
      auto a = static_cast<std::uint32_t>(el.Node(e, k));
      auto b = static_cast<std::uint32_t>(el.Node(e, k % n + 1));
      if (a > b) std::swap(a, b);
      keys.push_back(static_cast<std::uint64_t>(a) << 32 | b);
    }
  }
  std::sort(keys.begin(), keys.end());
  std::vector<char> onBoundary(static_cast<std::size_t>(numNodes) + 1, 0);
  for (std::size_t i = 0; i < keys.size();) {
    std::size_t j = i + 1;
    while (j < keys.size() && keys[j] == keys[i]) ++j;
    if (j - i == 1) {
      onBoundary[keys[i] >> 32] = 1;
      onBoundary[keys[i] & 0xffffffffu] = 1;
    }
    i = j;
  }
  return onBoundary;
}

// Boundary nodes that are still without a code become land.
void LandOnBoundary(NodeTable& nodes, const std::vector<char>& onBoundary) {
  for (Index i = 1; i <= nodes.numNodes; ++i)
    if (onBoundary[i] != 0 && nodes.code[i] == 0) nodes.code[i] = 1;
}

void LandOnBoundary(MeshData& mesh) {
  LandOnBoundary(mesh.nodes, BoundaryNodes(mesh.elements, mesh.nodes.numNodes));
}

void StartMesh(MeshData& mesh) {
  mesh.dimension = 2;
  mesh.unitCode = kUnitMetre;
}

// ---------------------------------------------------------------------------------------------
// .2dm

enum class Card { kNode, kTriangle, kQuad, kNodeString, kOtherElement, kOther };

Card CardOf(std::string_view name) {
  if (name == "ND") return Card::kNode;
  if (name == "E3T") return Card::kTriangle;
  if (name == "E4Q") return Card::kQuad;
  if (name == "NS") return Card::kNodeString;
  // Element cards are "E", the node count and a shape letter or two (E2L, E6T, E8Q, ...).
  if (name.size() >= 3 && name[0] == 'E' && name[1] >= '0' && name[1] <= '9')
    return Card::kOtherElement;
  return Card::kOther;
}

struct UnitFactor {
  double factor = 1.0, offset = 0.0;
  double operator()(double v) const { return v * factor + offset; }
};

UnitFactor ToMetres(std::int32_t unit, const char* what, const std::string& name) {
  UnitFactor f;
  std::string error;
  if (unit != kUnitMetre && !UnitConversion(unit, kUnitMetre, f.factor, f.offset, &error))
    throw MeshError(name + ": unit of " + what + ": " + error);
  return f;
}

struct NodeString {
  int firstLine = 0;
  bool closed = false;
  std::vector<Index> nodes;
};

}  // namespace

void Parse2dmText(MeshData& mesh, const char* data, std::size_t size, const std::string& name,
                  const MeshReadOptions& options, MeshReadReport& report) {
  const UnitFactor toMetresXY = ToMetres(options.unitXY, "x and y", name);
  const UnitFactor toMetresZ = ToMetres(options.unitZ, "z", name);

  // First pass: check the cards and count nodes and elements.
  std::int64_t numNodes = 0, numElements = 0;
  {
    TextScanner scan(data, size, name);
    if (!scan.NextLine()) throw MeshError(name + ": empty file (expected MESH2D)");
    if (scan.Field() != "MESH2D") scan.Fail("not a 2dm mesh: the first card must be MESH2D");
    while (scan.NextLine()) {
      const std::string_view card = scan.Field();
      switch (CardOf(card)) {
        case Card::kNode: ++numNodes; break;
        case Card::kTriangle: case Card::kQuad: ++numElements; break;
        case Card::kOtherElement:
          scan.Fail("element card " + std::string(card) + " is not supported (E3T and E4Q only)");
        default: break;
      }
    }
    if (numNodes == 0) throw MeshError(name + ": no nodes (ND cards) in the mesh");
    if (numElements == 0) throw MeshError(name + ": no elements (E3T or E4Q cards) in the mesh");
    if (numNodes > kMaxItems || numElements > kMaxItems)
      throw MeshError(name + ": too many nodes or elements");
  }

  // Second pass: gather nodes, elements and node strings.
  const auto nn = static_cast<Index>(numNodes);
  const auto ne = static_cast<std::size_t>(numElements);
  NodeStage stage;
  stage.Resize(nn);
  std::vector<Index> elemId(ne), elemAttr(ne), elemNodes(4 * ne, 0);
  std::vector<NodeString> strings;
  {
    TextScanner scan(data, size, name);
    scan.NextLine();  // MESH2D
    std::size_t e = 0;
    while (scan.NextLine()) {
      const Card card = CardOf(scan.Field());
      if (card == Card::kNode) {
        const Index id = ReadNodeId(scan, stage.seen);
        stage.x[id] = toMetresXY(scan.Double("x"));
        stage.y[id] = toMetresXY(scan.Double("y"));
        stage.z[id] = toMetresZ(scan.Double("z"));
        EndOfLine(scan);
      } else if (card == Card::kTriangle || card == Card::kQuad) {
        elemId[e] = scan.Int32("element id");
        const int k = card == Card::kTriangle ? 3 : 4;
        for (int j = 0; j < k; ++j) elemNodes[4 * e + j] = ReadNodeNumber(scan, nn);
        // The material (attribute) is optional; further material columns are ignored.
        elemAttr[e] = scan.AtEnd() ? -1 : scan.Int32("element attribute");
        ++e;
      } else if (card == Card::kNodeString) {
        if (strings.empty() || strings.back().closed) {
          strings.emplace_back();
          strings.back().firstLine = scan.LineNumber();
        }
        NodeString& s = strings.back();
        while (!s.closed && !scan.AtEnd()) {
          const std::int64_t v = scan.Int("node string entry");
          if (v == 0 || v < -numNodes || v > numNodes)
            scan.Fail("node number " + Str(v) + " in the node string is out of range 1.." +
                      Str(numNodes) + " (negative: last node)");
          s.nodes.push_back(static_cast<Index>(v < 0 ? -v : v));
          s.closed = v < 0;  // what follows the last node is the string's name
        }
      }
    }
    if (!strings.empty() && !strings.back().closed)
      throw MeshError(name + ", line " + std::to_string(strings.back().firstLine) +
                      ": node string does not end (its last node number must be negative)");
  }

  // Dry elements are left out, with the nodes that only they use.
  std::vector<char> wet(ne, 1);
  std::int64_t numDry = 0;
  if (options.elementAttribute >= 0)
    for (std::size_t e = 0; e < ne; ++e)
      if (elemAttr[e] == options.elementAttribute) { wet[e] = 0; ++numDry; }
  report.values.push_back({"Number of dry elements", std::to_string(numDry)});
  if (numDry == numElements)
    throw MeshError(name + ": every element is dry (attribute " +
                    std::to_string(options.elementAttribute) + ")");

  std::vector<Index> renumber(static_cast<std::size_t>(nn) + 1);
  for (Index i = 1; i <= nn; ++i) renumber[i] = i;
  Index numKept = nn;
  if (numDry > 0) {
    std::vector<char> usedWet(renumber.size(), 0), usedDry(renumber.size(), 0);
    for (std::size_t e = 0; e < ne; ++e)
      for (int j = 0; j < 4; ++j) (wet[e] != 0 ? usedWet : usedDry)[elemNodes[4 * e + j]] = 1;
    numKept = 0;
    for (Index i = 1; i <= nn; ++i)
      renumber[i] = usedDry[i] != 0 && usedWet[i] == 0 ? 0 : ++numKept;
  }

  StartMesh(mesh);
  AllocateNodes(mesh.nodes, numKept);
  for (Index i = 1; i <= nn; ++i)
    if (renumber[i] != 0) AddNode(mesh.nodes, renumber[i], stage.x[i], stage.y[i], stage.z[i], 0);
  std::int64_t listSize = 0;
  for (std::size_t e = 0; e < ne; ++e)
    if (wet[e] != 0) listSize += elemNodes[4 * e + 3] != 0 ? 4 : 3;
  AllocateElementsBasic(mesh.elements, numElements - numDry, listSize);
  for (std::size_t e = 0; e < ne; ++e) {
    if (wet[e] == 0) continue;
    Index slots[4];
    for (int j = 0; j < 4; ++j) slots[j] = renumber[elemNodes[4 * e + j]];  // renumber[0] = 0
    AddElement(mesh.elements, elemId[e], slots[3] != 0 ? kQuadrilateral : kTriangle, 4, slots);
  }

  // Codes: boundary nodes of the k-th node string get k + 1 (open boundaries), the nodes of a
  // string that lies wholly inside the mesh get -k (inner lines); later strings win. The
  // remaining boundary nodes are land.
  const std::vector<char> onBoundary = BoundaryNodes(mesh.elements, numKept);
  std::vector<Index>& code = mesh.nodes.code;
  for (std::size_t k = 1; k <= strings.size(); ++k) {
    const NodeString& s = strings[k - 1];
    bool inner = true;
    for (const Index n : s.nodes)
      if (renumber[n] != 0 && onBoundary[renumber[n]] != 0) inner = false;
    for (const Index n : s.nodes) {
      const Index m = renumber[n];
      if (m == 0) continue;
      if (inner) code[m] = -static_cast<Index>(k);
      else if (onBoundary[m] != 0) code[m] = static_cast<Index>(k) + 1;
    }
  }
  LandOnBoundary(mesh.nodes, onBoundary);
}

void ReadMesh2dm(MeshData& mesh, const std::string& path, const MeshReadOptions& options,
                 MeshReadReport& report) {
  const std::string text = ReadWholeFile(path);
  Parse2dmText(mesh, text.data(), text.size(), path, options, report);
}

// ---------------------------------------------------------------------------------------------
// ADCIRC .14

void ReadMeshBasicADCIRC(MeshData& mesh, const std::string& path, MeshReadReport& report) {
  const std::string text = ReadWholeFile(path);
  TextScanner scan(text.data(), text.size(), path);
  scan.RequireLine("the title line");
  if (scan.LineNumber() == 1) scan.RequireLine("NE NP");  // else the title was blank
  // Header and section count lines: the leading numbers count, the rest is a comment.
  const std::int64_t ne = scan.Int("number of elements NE");
  const std::int64_t np = scan.Int("number of nodes NP");
  if (np < 1) scan.Fail("no nodes in the mesh (NP = " + Str(np) + ")");
  if (ne < 1) scan.Fail("no elements in the mesh (NE = " + Str(ne) + ")");
  CheckCount(scan, np, 8, "number of nodes NP");
  CheckCount(scan, ne, 10, "number of elements NE");
  const auto numNodes = static_cast<Index>(np);

  NodeStage stage;
  stage.Resize(numNodes);
  for (Index i = 0; i < numNodes; ++i) {
    scan.RequireLine("a node line \"id x y depth\"");
    const Index id = ReadNodeId(scan, stage.seen);
    stage.x[id] = scan.Double("x");
    stage.y[id] = scan.Double("y");
    stage.z[id] = -scan.Double("depth");  // depths are positive downwards
    EndOfLine(scan);
  }

  StartMesh(mesh);
  AllocateElementsBasic(mesh.elements, ne, 3 * ne);
  for (std::int64_t i = 0; i < ne; ++i) {
    scan.RequireLine("an element line \"id 3 n1 n2 n3\"");
    const Index id = scan.Int32("element id");
    if (scan.Int("number of element nodes") != 3)
      throw MeshError("ReadMeshBasicADCIRC: Element type not supported");
    Index slots[3];
    for (Index& s : slots) s = ReadNodeNumber(scan, numNodes);
    EndOfLine(scan);
    AddElement(mesh.elements, id, kTriangle, 3, slots);
  }

  // Optional boundary lists: open segment k gives its nodes code k + 1, land segments code 1
  // where no open segment gave one. Node lines of barrier segments carry more columns; the
  // first is the node.
  std::vector<Index>& code = stage.code;
  auto readSegments = [&](const char* countName, const char* totalName, bool open) {
    const std::int64_t segments = scan.Int(countName);
    CheckCount(scan, segments, 4, countName);
    scan.RequireLine(totalName);
    const std::int64_t total = scan.Int(totalName);
    std::int64_t listed = 0;
    for (std::int64_t k = 1; k <= segments; ++k) {
      scan.RequireLine(open ? "NVDLL" : "NVELL IBTYPE");
      const std::int64_t count = scan.Int(open ? "NVDLL" : "NVELL");
      if (!open) scan.Int("IBTYPE");
      CheckCount(scan, count, 2, open ? "NVDLL" : "NVELL");
      listed += count;
      for (std::int64_t j = 0; j < count; ++j) {
        scan.RequireLine("a boundary node line");
        const Index n = ReadNodeNumber(scan, numNodes);
        if (open) code[n] = static_cast<Index>(k) + 1;
        else if (code[n] == 0) code[n] = 1;
      }
    }
    if (listed != total)
      report.warnings.push_back(path + ": " + totalName + " is " + Str(total) + " but the " +
                                Str(segments) + " segments list " + Str(listed) + " nodes");
  };
  if (scan.NextLine()) {
    readSegments("NOPE", "NETA", true);
    if (scan.NextLine()) readSegments("NBOU", "NVEL", false);
  }

  stage.CommitTo(mesh.nodes);
  LandOnBoundary(mesh);
}

// ---------------------------------------------------------------------------------------------
// QUODDY .nod/.ele/.bat

namespace {

struct TextFile {
  std::string name, text;
  explicit TextFile(std::string path) : name(std::move(path)), text(ReadWholeFile(name)) {}
  TextScanner Scanner() const { return TextScanner(text.data(), text.size(), name); }
  std::int64_t CountLines() const {
    TextScanner scan = Scanner();
    std::int64_t n = 0;
    while (scan.NextLine()) ++n;
    return n;
  }
};

void ReadQuoddy(MeshData& mesh, const std::string& base) {
  const TextFile nod(base + ".nod"), ele(base + ".ele"), bat(base + ".bat");
  const std::int64_t numNodes = nod.CountLines(), numElements = ele.CountLines();
  if (numNodes == 0) throw MeshError(nod.name + ": no nodes in the file");
  if (numElements == 0) throw MeshError(ele.name + ": no elements in the file");
  if (numNodes > kMaxItems || numElements > kMaxItems) throw MeshError(base + ": mesh too large");
  const auto nn = static_cast<Index>(numNodes);

  NodeStage stage;
  stage.Resize(nn);
  TextScanner scan = nod.Scanner();
  while (scan.NextLine()) {
    const Index id = ReadNodeId(scan, stage.seen);
    stage.x[id] = scan.Double("x");
    stage.y[id] = scan.Double("y");
    EndOfLine(scan);
  }

  std::vector<char> depthSeen(stage.seen.size(), 0);
  scan = bat.Scanner();
  while (scan.NextLine()) {
    const Index id = ReadNodeId(scan, depthSeen);
    stage.z[id] = -scan.Double("depth");  // positive downwards
    EndOfLine(scan);
  }
  for (Index i = 1; i <= nn; ++i)
    if (depthSeen[i] == 0)
      throw MeshError(bat.name + ", line " + Str(scan.LineNumber()) + ": no depth for node " +
                      Str(i) + " (the file ends)");

  StartMesh(mesh);
  AllocateElementsBasic(mesh.elements, numElements, 3 * numElements);
  scan = ele.Scanner();
  while (scan.NextLine()) {
    const Index id = scan.Int32("element id");
    Index slots[3];
    for (Index& s : slots) s = ReadNodeNumber(scan, nn);
    EndOfLine(scan);
    AddElement(mesh.elements, id, kTriangle, 3, slots);
  }
  stage.CommitTo(mesh.nodes);
  LandOnBoundary(mesh);
}

}  // namespace

void ReadMeshBasicQUODDY(MeshData& mesh, const std::string& path, MeshReadReport&) {
  try {
    ReadQuoddy(mesh, BaseName(path));
  } catch (const MeshError& e) {
    throw MeshError(std::string("ReadMeshBasicQUODDY: Error reading mesh information: ") +
                    e.what());
  }
}

// ---------------------------------------------------------------------------------------------
// Node/topology .node/.topo/.ele

void ReadMeshNodeTopo(MeshData& mesh, const std::string& path, MeshReadReport&) {
  const std::string base = BaseName(path);
  const TextFile nodeFile(base + ".node"), topoFile(base + ".topo"), eleFile(base + ".ele");

  TextScanner scan = nodeFile.Scanner();
  scan.RequireLine("the node count");
  const std::int64_t count = scan.Int("node count");
  EndOfLine(scan);
  if (count < 1) scan.Fail("no nodes in the mesh");
  CheckCount(scan, count, 8, "node count");
  const auto nn = static_cast<Index>(count);
  NodeStage stage;
  stage.Resize(nn);
  std::vector<Index> order(static_cast<std::size_t>(nn));  // identifiers in file order
  for (Index& id : order) {
    scan.RequireLine("a node line \"id x y code\"");
    id = ReadNodeId(scan, stage.seen);
    stage.x[id] = scan.Double("x");
    stage.y[id] = scan.Double("y");
    stage.code[id] = scan.Int32("boundary code");
    EndOfLine(scan);
  }
  if (scan.NextLine()) scan.Fail("more node lines than the count " + Str(count));

  scan = topoFile.Scanner();
  scan.RequireLine("the node count");
  const std::int64_t topoCount = scan.Int("node count");
  EndOfLine(scan);
  if (topoCount != count)
    scan.Fail("node count " + Str(topoCount) + " differs from " + Str(count) + " in " +
              nodeFile.name);
  for (const Index id : order) {
    scan.RequireLine("a line \"id z\"");
    const std::int64_t topoId = scan.Int("node id");
    if (topoId != id)
      scan.Fail("node id " + Str(topoId) + " differs from " + Str(id) + " on the same line of " +
                nodeFile.name);
    stage.z[id] = scan.Double("z");
    EndOfLine(scan);
  }
  if (scan.NextLine()) scan.Fail("more lines than the node count " + Str(count));

  scan = eleFile.Scanner();
  scan.RequireLine("\"nelements nodes_per_element\"");
  const std::int64_t ne = scan.Int("number of elements");
  const std::int64_t k = scan.Int("nodes per element");
  EndOfLine(scan);
  const Index type = TypeOfNodeCount(scan, k);
  if (ne < 1) scan.Fail("no elements in the mesh");
  CheckCount(scan, ne, 2 * static_cast<std::size_t>(k + 1), "number of elements");
  StartMesh(mesh);
  AllocateElementsBasic(mesh.elements, ne, k * ne);
  for (std::int64_t e = 0; e < ne; ++e) {
    scan.RequireLine("an element line");
    const Index id = scan.Int32("element id");
    Index slots[4];
    for (std::int64_t j = 0; j < k; ++j) slots[j] = ReadNodeNumber(scan, nn);
    EndOfLine(scan);
    AddElement(mesh.elements, id, type, static_cast<Index>(k), slots);
  }
  if (scan.NextLine()) scan.Fail("more element lines than the count " + Str(ne));
  stage.CommitTo(mesh.nodes);
}

// ---------------------------------------------------------------------------------------------
// .fem: keyword lines, each followed by its data.
//   NODE    next line: node count
//   COOR    node count lines "id x y"
//   ELEV_I  node count lines "id z"
//   ELEM    next line: element count, then lines "id n1 n2 n3 [n4]"
//   CODE    (optional) lines "id code" up to the next keyword or the end
// NODE comes first; the others follow in any order, each once. Lines starting with '#' are
// comments.

void ReadMeshFem(MeshData& mesh, const std::string& path, MeshReadReport&) {
  const TextFile file(path);
  TextScanner scan = file.Scanner();
  constexpr bool kComments = true;
  NodeStage stage;
  std::vector<char> elevSeen, codeSeen;
  bool haveNode = false, haveCoor = false, haveElev = false, haveElem = false, haveCode = false;
  Index nn = 0;
  StartMesh(mesh);

  auto once = [&](bool& flag, std::string_view key) {
    if (flag) scan.Fail("keyword " + std::string(key) + " is given twice");
    if (!haveNode && key != "NODE") scan.Fail(std::string(key) + " before NODE");
    flag = true;
  };
  bool pending = scan.NextLine(kComments);
  while (pending) {
    const std::string key(scan.Field());
    EndOfLine(scan);
    if (key == "NODE") {
      once(haveNode, key);
      scan.RequireLine("the node count", kComments);
      const std::int64_t count = scan.Int("node count");
      EndOfLine(scan);
      if (count < 1) scan.Fail("no nodes in the mesh");
      CheckCount(scan, count, 6, "node count");
      nn = static_cast<Index>(count);
      stage.Resize(nn);
    } else if (key == "COOR" || key == "ELEV_I") {
      const bool coor = key == "COOR";
      once(coor ? haveCoor : haveElev, key);
      std::vector<char>& seen = coor ? stage.seen : elevSeen;
      if (!coor) seen.assign(stage.seen.size(), 0);
      for (Index i = 0; i < nn; ++i) {
        scan.RequireLine(coor ? "a line \"id x y\"" : "a line \"id z\"", kComments);
        const Index id = ReadNodeId(scan, seen);
        if (coor) {
          stage.x[id] = scan.Double("x");
          stage.y[id] = scan.Double("y");
        } else {
          stage.z[id] = scan.Double("z");
        }
        EndOfLine(scan);
      }
    } else if (key == "ELEM") {
      once(haveElem, key);
      scan.RequireLine("the element count", kComments);
      const std::int64_t ne = scan.Int("element count");
      EndOfLine(scan);
      if (ne < 1) scan.Fail("no elements in the mesh");
      CheckCount(scan, ne, 8, "element count");
      AllocateElementsBasic(mesh.elements, ne, 4 * ne);
      for (std::int64_t e = 0; e < ne; ++e) {
        scan.RequireLine("a line \"id n1 n2 n3 [n4]\"", kComments);
        const Index id = scan.Int32("element id");
        Index slots[4] = {0, 0, 0, 0};
        Index k = 0;
        while (!scan.AtEnd()) {
          if (k == 4) {
            std::int64_t more = k;
            for (; !scan.AtEnd(); ++more) scan.Field();
            TypeOfNodeCount(scan, more);
          }
          slots[k++] = ReadNodeNumber(scan, nn);
        }
        AddElement(mesh.elements, id, TypeOfNodeCount(scan, k), k, slots);
      }
    } else if (key == "CODE") {
      once(haveCode, key);
      codeSeen.assign(stage.seen.size(), 0);
      // Data lines start with a number; the first line that does not is the next keyword.
      std::int64_t id = 0;
      while ((pending = scan.NextLine(kComments)) && scan.TryInt(id)) {
        const Index n = ClaimNodeId(scan, id, codeSeen);
        stage.code[n] = scan.Int32("boundary code");
        EndOfLine(scan);
      }
      continue;
    } else {
      scan.Fail("unknown keyword \"" + key + "\" (NODE, COOR, ELEV_I, ELEM or CODE)");
    }
    pending = scan.NextLine(kComments);
  }
  const std::pair<bool, const char*> required[] = {
      {haveNode, "NODE"}, {haveCoor, "COOR"}, {haveElev, "ELEV_I"}, {haveElem, "ELEM"}};
  for (const auto& [have, key] : required)
    if (!have)
      throw MeshError(path + ", line " + Str(scan.LineNumber()) + ": the file ends without the " +
                      key + " block");
  stage.CommitTo(mesh.nodes);
  LandOnBoundary(mesh);
}

// ---------------------------------------------------------------------------------------------
// .geo: "GEO <nodes> <elements>", node lines "id x y z code", element lines "id type n1 .. nk".

void ReadMeshGeo(MeshData& mesh, const std::string& path, MeshReadReport&) {
  const TextFile file(path);
  TextScanner scan = file.Scanner();
  constexpr bool kComments = true;
  scan.RequireLine("the header \"GEO <nodes> <elements>\"", kComments);
  if (scan.Field() != "GEO") scan.Fail("not a geo mesh: the header must start with GEO");
  const std::int64_t np = scan.Int("number of nodes");
  const std::int64_t ne = scan.Int("number of elements");
  EndOfLine(scan);
  if (np < 1) scan.Fail("no nodes in the mesh");
  if (ne < 1) scan.Fail("no elements in the mesh");
  CheckCount(scan, np, 10, "number of nodes");
  CheckCount(scan, ne, 10, "number of elements");
  const auto nn = static_cast<Index>(np);

  NodeStage stage;
  stage.Resize(nn);
  for (Index i = 0; i < nn; ++i) {
    scan.RequireLine("a node line \"id x y z code\"", kComments);
    const Index id = ReadNodeId(scan, stage.seen);
    stage.x[id] = scan.Double("x");
    stage.y[id] = scan.Double("y");
    stage.z[id] = scan.Double("z");
    stage.code[id] = scan.Int32("boundary code");
    EndOfLine(scan);
  }

  StartMesh(mesh);
  AllocateElementsBasic(mesh.elements, ne, 4 * ne);
  for (std::int64_t e = 0; e < ne; ++e) {
    scan.RequireLine("an element line \"id type n1 .. nk\"", kComments);
    const Index id = scan.Int32("element id");
    const std::int64_t type = scan.Int("element type");
    CheckElementType(scan, type);
    const Index k = NodesOfType(static_cast<Index>(type));
    Index slots[4];
    for (Index j = 0; j < k; ++j) slots[j] = ReadNodeNumber(scan, nn);
    EndOfLine(scan);
    AddElement(mesh.elements, id, static_cast<Index>(type), k, slots);
  }
  if (scan.NextLine(kComments)) scan.Fail("more lines than the header's counts");
  stage.CommitTo(mesh.nodes);
}
