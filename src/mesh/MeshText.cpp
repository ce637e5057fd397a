// The engine's own mesh text format (.mesh): header, node lines, element header, element lines.
#include <algorithm>
#include <cmath>

#include "io/Units.h"
#include "mesh/MeshReaders.h"
#include "mesh/TextScan.h"

void ReadMeshText(MeshData& mesh, const std::string& path, MeshReadReport&) {
  const std::string data = ReadWholeFile(path);
  ParseMeshText(mesh, data.data(), data.size(), path);
}

void ParseMeshText(MeshData& mesh, const char* data, std::size_t size, const std::string& name) {
  TextScanner scan(data, size, name);

  // 1. Header: "item unit nodes projection", "nodes projection" or "nodes".
  scan.RequireLine("the header line with the number of nodes");
  if (scan.Line().size() > 2048) scan.Fail("the header line is longer than 2048 characters");
  std::int64_t lead[3] = {0, 0, 0};
  int numLead = 0;
  while (numLead < 3 && scan.TryInt(lead[numLead])) ++numLead;
  std::int64_t numNodes = 0;
  if (numLead == 3) {
    mesh.itemType = static_cast<std::int32_t>(lead[0]);
    mesh.unitCode = static_cast<std::int32_t>(lead[1]);
    numNodes = lead[2];
  } else if (numLead >= 1) {
    numNodes = lead[0];
    if (numLead == 2) {  // "nodes <numeric projection text>": the text starts at field 2
      scan = TextScanner(data, size, name);
      scan.NextLine();
      scan.Field();
    }
  } else {
    scan.Fail("the header line must begin with the number of nodes");
  }
  mesh.projection = std::string(scan.Rest());
  if (mesh.projection.size() > 1024) scan.Fail("the projection text is longer than 1024 characters");
  if (numNodes < 1) scan.Fail("the number of nodes must be at least 1 (" + std::to_string(numNodes) + ")");
  CheckCount(scan, numNodes, 10, "number of nodes");

  double zFactor = 1.0, zOffset = 0.0;
  if (mesh.unitCode != kUnitMetre) {
    std::string error;
    if (!UnitConversion(mesh.unitCode, kUnitMetre, zFactor, zOffset, &error))
      scan.Fail("the bed-level unit " + std::to_string(mesh.unitCode) + " cannot be converted to metres: " + error);
  }

  // 2. Nodes.
  AllocateNodes(mesh.nodes, numNodes);
  for (std::int64_t i = 1; i <= numNodes; ++i) {
    if (!scan.NextLine())
      scan.RequireLine("node " + std::to_string(i) + " of " + std::to_string(numNodes));
    const std::int32_t id = scan.Int32("node identifier");
    const double x = scan.Double("x");
    const double y = scan.Double("y");
    double z = scan.Double("z");
    const std::int32_t code = scan.Int32("boundary code");
    if (!scan.AtEnd()) scan.Fail("node line has more than 5 fields");
    if (mesh.unitCode != kUnitMetre) z = z * zFactor + zOffset;
    AddNode(mesh.nodes, id, x, y, z, code);
  }

  // 3. Element header.
  scan.RequireLine("the element header (number of elements, nodes per element, type code)");
  const std::int64_t numElements = scan.Int("number of elements");
  const std::int64_t maxNodes = scan.Int("maximum number of nodes per element");
  const std::int32_t type = scan.Int32("element type code");
  if (!scan.AtEnd()) scan.Fail("element header has more than 3 fields");
  if (numElements < 1) scan.Fail("the number of elements must be at least 1 (" + std::to_string(numElements) + ")");
  if (maxNodes < 1 || maxNodes > 27) scan.Fail("the number of nodes per element must be 1 to 27 (" + std::to_string(maxNodes) + ")");
  ShapeData shape;
  if (!ShapeOfType(type, shape)) scan.Fail("unknown element type code " + std::to_string(type));
  if (shape.dimension != 2)
    scan.Fail("element type " + std::to_string(type) + " is not a 2-D element type");
  if (shape.numNodes > maxNodes)
    scan.Fail("element type " + std::to_string(type) + " needs " + std::to_string(shape.numNodes) +
              " nodes but the header gives " + std::to_string(maxNodes) + " per element");
  CheckCount(scan, numElements, static_cast<std::size_t>(2 * (maxNodes + 1)), "number of elements");

  // 4. Elements.
  AllocateElementsBasic(mesh.elements, numElements, numElements * maxNodes);
  std::int32_t slots[27];
  for (std::int64_t i = 1; i <= numElements; ++i) {
    if (!scan.NextLine())
      scan.RequireLine("element " + std::to_string(i) + " of " + std::to_string(numElements));
    const std::int32_t id = scan.Int32("element identifier");
    std::int32_t positive = 0;
    for (std::int64_t k = 0; k < maxNodes; ++k) {
      slots[k] = scan.Int32("node number");
      if (slots[k] < 0)
        scan.Fail("node number " + std::to_string(slots[k]) + " is lower than 1");
      if (slots[k] > numNodes)
        scan.Fail("node number " + std::to_string(slots[k]) + " is larger than the number of nodes (" +
                  std::to_string(numNodes) + ")");
      positive += slots[k] > 0;
    }
    if (!scan.AtEnd())
      scan.Fail("element line has more than " + std::to_string(maxNodes + 1) + " fields");
    const std::int32_t elementType = positive == 3 && maxNodes > 3 ? 21 : type;
    const std::int32_t need = NodesOfType(elementType);
    if (positive != need)
      scan.Fail("element " + std::to_string(id) + " has " + std::to_string(positive) +
                " nodes, its type " + std::to_string(elementType) + " needs " + std::to_string(need));
    AddElement(mesh.elements, id, elementType, static_cast<std::int32_t>(maxNodes), slots);
  }
  mesh.dimension = 2;
}
