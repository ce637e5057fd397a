#include "mesh/MeshData.h"

#include "platform/Memory.h"

#include <limits>
#include <new>

ShapeTable g_shapes;
MeshTable g_meshTable;

namespace {

constexpr std::int64_t kMaxCount = std::numeric_limits<std::int32_t>::max() - 2;

template <typename T>
void Allocate(std::vector<T>& v, std::int64_t n) {
  AllocateArray(v, static_cast<std::size_t>(n));
}

}  // namespace

void AllocateElementsBasic(ElementTable& el, std::int64_t capacity, std::int64_t nodeListCapacity) {
  if (capacity < 1) throw MeshError("AllocateElementsBasic: nelements_max must be >= 0");
  if (nodeListCapacity < 1) throw MeshError("AllocateElementsBasic: nindexes_max must be >= 0");
  if (capacity > kMaxCount || nodeListCapacity > kMaxCount)
    throw MeshError("AllocateElementsBasic: Out of memory");
  try {
    el = ElementTable{};
    Allocate(el.id, capacity + 1);
    Allocate(el.type, capacity + 1);
    Allocate(el.shape, capacity + 1);
    Allocate(el.nodeStart, capacity + 2);
    Allocate(el.nodeList, nodeListCapacity + 1);
  } catch (const std::bad_alloc&) {
    el = ElementTable{};
    throw MeshError("AllocateElementsBasic: Out of memory");
  }
  el.capacity = static_cast<std::int32_t>(capacity);
  el.nodeListCapacity = static_cast<std::int32_t>(nodeListCapacity);
  el.nodeStart[1] = 1;
  el.numElements = el.numInternal = 0;
}

std::int32_t AddElement(ElementTable& el, std::int32_t id, std::int32_t type, std::int32_t numSlots,
                        const std::int32_t* slots) {
  if (el.numElements >= el.capacity) throw MeshError("AddElement: nelements_max is to small");
  std::int32_t used = 0;
  for (std::int32_t k = 0; k < numSlots; ++k) used += slots[k] != 0;
  const std::int32_t e = el.numElements + 1;
  std::int32_t at = el.nodeStart[e];
  if (static_cast<std::int64_t>(at) - 1 + used > el.nodeListCapacity)
    throw MeshError("AddElement: nindexes_max is to small");
  for (std::int32_t k = 0; k < numSlots; ++k)
    if (slots[k] != 0) el.nodeList[at++] = slots[k];
  el.nodeStart[e + 1] = at;
  el.id[e] = id;
  el.type[e] = type;
  el.numElements = el.numInternal = e;
  return e;
}

void AllocateNodes(NodeTable& nd, std::int64_t capacity) {
  if (capacity < 1) throw MeshError("AllocateNodesBasic: nnodess_max must be >= 0");
  if (capacity > kMaxCount) throw MeshError("AllocateNodes: Out of memory");
  try {
    nd = NodeTable{};
    Allocate(nd.id, capacity + 1);
    Allocate(nd.code, capacity + 1);
    Allocate(nd.x, capacity + 1);
    Allocate(nd.y, capacity + 1);
    Allocate(nd.z, capacity + 1);
  } catch (const std::bad_alloc&) {
    nd = NodeTable{};
    throw MeshError("AllocateNodes: Out of memory");
  }
  nd.capacity = static_cast<std::int32_t>(capacity);
}

std::int32_t AddNode(NodeTable& nd, std::int32_t id, double x, double y, double z,
                     std::int32_t code) {
  if (nd.numNodes >= nd.capacity) throw MeshError("AddNode: nnodes_max is to small");
  const std::int32_t n = ++nd.numNodes;
  nd.numInternal = n;
  nd.id[n] = id;
  nd.x[n] = x;
  nd.y[n] = y;
  nd.z[n] = z;
  nd.code[n] = code;
  return n;
}

void AllocateFaces(FaceTable& fc, std::int64_t capacity, std::int64_t nodeListCapacity) {
  if (capacity < 1) throw MeshError("AllocateFacesBasic: nfaces_max must be >= 0");
  if (nodeListCapacity < 1) throw MeshError("AllocateFacesBasic: nindexes_max must be >= 0");
  if (capacity > kMaxCount || nodeListCapacity > kMaxCount)
    throw MeshError("AllocateFaces: Out of memory");
  try {
    fc = FaceTable{};
    const std::int64_t n = capacity + 1;
    for (auto* v : {&fc.id, &fc.left, &fc.right, &fc.leftLocal, &fc.rightLocal}) Allocate(*v, n);
    Allocate(fc.nodeStart, capacity + 2);
    Allocate(fc.nodeList, nodeListCapacity + 1);
  } catch (const std::bad_alloc&) {
    fc = FaceTable{};
    throw MeshError("AllocateFaces: Out of memory");
  }
  fc.capacity = static_cast<std::int32_t>(capacity);
  fc.nodeListCapacity = static_cast<std::int32_t>(nodeListCapacity);
  fc.nodeStart[1] = 1;
}

namespace {

void SetTable(std::vector<std::int32_t>& table, std::initializer_list<std::int32_t> values) {
  table.assign(values.begin(), values.end());
}

// 2-D element with `corners` corners; with `edgeNodes` each edge k also holds node corners + k.
void Polygon(ShapeData& s, std::int32_t corners, bool edgeNodes) {
  s.numCorners = corners;
  s.numEdges = s.numFaces = corners;
  s.nodesPerEdge = s.nodesPerFace = edgeNodes ? 3 : 2;
  s.edgeNodes.clear();
  for (std::int32_t k = 1; k <= corners; ++k) {
    s.edgeNodes.push_back(k);
    s.edgeNodes.push_back(k % corners + 1);
    if (edgeNodes) s.edgeNodes.push_back(corners + k);
  }
  s.faceNodes = s.edgeNodes;
}

}  // namespace

bool ShapeOfType(std::int32_t type, ShapeData& s) {
  s = ShapeData{};
  switch (type) {
    case 11: case 12:
      s.dimension = 1; s.kind = 1; s.function = type - 10;
      s.numNodes = type == 11 ? 2 : 3;
      s.numCorners = 2;
      s.numEdges = 1; s.nodesPerEdge = s.numNodes;
      SetTable(s.edgeNodes, type == 11 ? std::initializer_list<std::int32_t>{1, 2}
                                       : std::initializer_list<std::int32_t>{1, 2, 3});
      // The faces of a line element are its two end points.
      s.numFaces = 2; s.nodesPerFace = 1;
      SetTable(s.faceNodes, {1, 2});
      return true;
    case 21: case 22: case 23: case 24:
      s.dimension = 2; s.kind = 1; s.function = type - 20;
      s.numNodes = type == 21 ? 3 : type == 22 ? 4 : 6;
      Polygon(s, 3, type >= 23);
      return true;
    case 25: case 26: case 27: case 28:
      s.dimension = 2; s.kind = 2; s.function = type - 24;
      s.numNodes = type == 25 ? 4 : type == 26 ? 5 : 8;
      Polygon(s, 4, type >= 27);
      return true;
    case 31:
      s.dimension = 3; s.kind = 1; s.function = 1;
      s.numNodes = s.numCorners = 4;
      s.numEdges = 6; s.nodesPerEdge = 2;
      SetTable(s.edgeNodes, {1, 2, 2, 3, 3, 1, 1, 4, 2, 4, 3, 4});
      s.numFaces = 4; s.nodesPerFace = 3;
      SetTable(s.faceNodes, {1, 3, 2, 1, 2, 4, 2, 3, 4, 3, 1, 4});
      return true;
    case 32:
      // Prism: bottom 1-2-3, top 4-5-6 above them. Faces 1 and 2 are bottom and top, 3.. the
      // sides (bottom edge k, k+1 and the nodes above).
      s.dimension = 3; s.kind = 2; s.function = 1;
      s.numNodes = s.numCorners = 6;
      s.numEdges = 9; s.nodesPerEdge = 2;
      SetTable(s.edgeNodes, {1, 2, 2, 3, 3, 1, 4, 5, 5, 6, 6, 4, 1, 4, 2, 5, 3, 6});
      s.numFaces = 5; s.nodesPerFace = 4;
      SetTable(s.faceNodes, {1, 3, 2, 0, 4, 5, 6, 0, 1, 2, 5, 4, 2, 3, 6, 5, 3, 1, 4, 6});
      return true;
    case 33:
      s.dimension = 3; s.kind = 3; s.function = 1;
      s.numNodes = s.numCorners = 8;
      s.numEdges = 12; s.nodesPerEdge = 2;
      SetTable(s.edgeNodes,
               {1, 2, 2, 3, 3, 4, 4, 1, 5, 6, 6, 7, 7, 8, 8, 5, 1, 5, 2, 6, 3, 7, 4, 8});
      s.numFaces = 6; s.nodesPerFace = 4;
      SetTable(s.faceNodes, {1, 4, 3, 2, 5, 6, 7, 8, 1, 2, 6, 5, 2, 3, 7, 6, 3, 4, 8, 7,
                             4, 1, 5, 8});
      return true;
    case 41: case 42: case 43:
      s.dimension = type - 40; s.kind = 0; s.function = 1;
      s.numNodes = s.numCorners = 1;
      return true;
    default:
      return false;
  }
}

std::int32_t NodesOfType(std::int32_t type) {
  switch (type) {
    case 11: return 2;
    case 12: return 3;
    case 21: return 3;
    case 22: return 4;
    case 23: case 24: return 6;
    case 25: return 4;
    case 26: return 5;
    case 27: case 28: return 8;
    case 31: return 4;
    case 32: return 6;
    case 33: return 8;
    case 41: case 42: case 43: return 1;
    default: return 0;
  }
}
