// Mesh records: nodes, elements, faces, boundary sections and reference elements.
//
// Numbering is 1-based throughout and 0 means "none". Every per-item array is allocated with
// count + 1 entries and entry 0 is a harmless dummy (zero), so element, node and face numbers
// index the arrays directly and a missing right element (0) reads zeros instead of going out of
// bounds. Variable-length lists are compressed rows: start[1] = 1, the entries of item i are
// list[start[i]] .. list[start[i + 1] - 1]; list[0] is the dummy.
//
// In a sub-domain the halo elements, nodes and faces follow the internal ones (numInternal).
// The tables are filled once at set-up and are read-only afterwards, except z (bed changes) and
// the layer geometry of layered meshes.
#pragma once

#include <array>
#include <cstdint>
#include <memory>
#include <stdexcept>
#include <string>
#include <vector>

#include "io/Units.h"

class Cartography;
struct SearchTree2D;
struct GradientStencil;

// Thrown by the mesh readers and the mesh set-up; the set-up routine turns it into a fatal
// error, tests and the fuzz targets catch it.
struct MeshError : std::runtime_error {
  using std::runtime_error::runtime_error;
};

constexpr std::int32_t kBathymetryItemType = kItemBathymetry;
constexpr int kMaxMeshes = 4;
constexpr int kMaxShapes = 4;
constexpr double kDegreesToRadians = 0.017453292519943295;
constexpr double kRadiansToDegrees = 57.29577951308232;
constexpr double kPi = 3.141592653589793;
constexpr double kTwoPi = 6.283185307179586;

// Longitude `x` brought next to the reference longitude `x1` (radians), so that differences
// across the dateline stay small on "LONG/LAT" meshes.
inline double WrapNear(double x, double x1) {
  const double d = x - x1;
  if (d < -kPi) return x + kTwoPi;
  if (d > kPi) return x - kTwoPi;
  return x;
}

struct NodeTable {
  std::int32_t capacity = 0;
  std::int32_t numNodes = 0;
  std::int32_t numInternal = 0;
  std::vector<std::int32_t> id, code;  // code: 0 interior, 1 land, >= 2 open, < 0 inner line
  std::vector<double> x, y, z;
  std::vector<double> z0;              // bed level after the set-up adjustments
  std::vector<double> sigma;           // layered meshes: relative position in the column
  std::vector<std::int32_t> elemStart, elemList;  // node -> elements, increasing numbers
};

struct ElementTable {
  std::int32_t capacity = 0;
  std::int32_t numElements = 0;
  std::int32_t numInternal = 0;
  std::int32_t nodeListCapacity = 0;
  std::vector<std::int32_t> id, type, shape;
  std::vector<std::int32_t> nodeStart, nodeList;
  std::vector<double> xc, yc, zc;
  std::vector<double> lengthScale;  // shortest edge (1-D: the length)
  std::vector<double> area, volume;
  // Linear triangles: dN_k/dx and dN_k/dy of element e at [3 * e + k - 1], k = 1..3.
  std::vector<double> dNdx, dNdy;
  std::vector<std::int32_t> faceStart, faceList;  // element -> faces; quadrilaterals in local
                                                 // face order, others by face number

  std::int32_t NumNodes(std::int32_t e) const { return nodeStart[e + 1] - nodeStart[e]; }
  std::int32_t Node(std::int32_t e, std::int32_t k) const { return nodeList[nodeStart[e] + k - 1]; }
  std::int32_t NumFaces(std::int32_t e) const { return faceStart[e + 1] - faceStart[e]; }
  std::int32_t Face(std::int32_t e, std::int32_t k) const { return faceList[faceStart[e] + k - 1]; }
};

struct FaceTable {
  std::int32_t capacity = 0;
  std::int32_t numFaces = 0;
  std::int32_t numInternal = 0;
  std::int32_t nodeListCapacity = 0;
  std::vector<std::int32_t> id, left, right, leftLocal, rightLocal;
  std::vector<std::int32_t> nodeStart, nodeList;  // in the left element's local order
  std::vector<double> xc, yc, zc;                 // face centre
  std::vector<double> xr, yr;                     // reconstruction point (2-D)
  std::vector<double> length, area;
  std::vector<double> nx, ny, nz;                 // unit normal out of the left element
  std::vector<double> distLeft, distRight;        // centre to the elements' centroids

  std::int32_t NumNodes(std::int32_t f) const { return nodeStart[f + 1] - nodeStart[f]; }
  std::int32_t Node(std::int32_t f, std::int32_t k) const { return nodeList[nodeStart[f] + k - 1]; }
};

// One boundary section: the faces whose nodes carry one code value.
struct MeshSection {
  std::int32_t number = 0;
  std::int32_t code = 0;
  std::vector<std::int32_t> nodes;  // distinct nodes of the faces, in face order
  std::vector<std::int32_t> faces;  // increasing face numbers
  std::int32_t NumPoints() const { return static_cast<std::int32_t>(nodes.size()); }
  std::int32_t NumFaces() const { return static_cast<std::int32_t>(faces.size()); }
};

// Reference element.
struct ShapeData {
  std::int32_t dimension = 0, kind = 0, function = 0;
  std::int32_t numNodes = 0, numEdges = 0, nodesPerEdge = 0, numFaces = 0, nodesPerFace = 0;
  std::int32_t numCorners = 0;
  // Local node numbers (1-based), numEdges x nodesPerEdge and numFaces x nodesPerFace, row by
  // row; a face with fewer nodes than nodesPerFace ends in zeros.
  std::vector<std::int32_t> edgeNodes, faceNodes;
  std::int32_t EdgeNode(std::int32_t edge, std::int32_t k) const {
    return edgeNodes[(edge - 1) * nodesPerEdge + k - 1];
  }
  std::int32_t FaceNode(std::int32_t face, std::int32_t k) const {
    return faceNodes[(face - 1) * nodesPerFace + k - 1];
  }
};

struct MeshData {
  std::int32_t number = 0;
  std::int32_t unitCode = kUnitMetre;            // bed level unit as read
  std::int32_t itemType = kBathymetryItemType;
  std::int32_t projectionHandle = 0;
  std::string projection;                        // "LONG/LAT", "NON-UTM", "UTM-<zone>" or other
  double origin[2] = {0.0, 0.0};
  std::int32_t dimension = 2;
  std::int32_t numLayers = 0, verticalKind = 0, numSigmaLayers = 0, numZLevels = 0;
  std::string fileName;                          // the mesh file as named in the setup file
  NodeTable nodes;
  ElementTable elements;
  FaceTable faces;
  std::vector<MeshSection> sections;
  bool hasSections = false;
  std::shared_ptr<Cartography> cartography;      // conversions of this mesh's projection
  // Built on first use and kept with the mesh: the point-lookup tree and the gradient
  // stencils (one per stencil type and boundary mode).
  std::shared_ptr<SearchTree2D> searchTree;
  std::vector<std::shared_ptr<GradientStencil>> stencils;

  bool IsLongLat() const { return projection == "LONG/LAT"; }
};

// ---------------------------------------------------------------------------------------------
// Filling the tables. The readers call these; every failure throws MeshError with the message
// of the routine.

// Element table with room for `capacity` elements and `nodeListCapacity` node numbers.
void AllocateElementsBasic(ElementTable& elements, std::int64_t capacity,
                           std::int64_t nodeListCapacity);
// Appends an element with the non-zero entries of `slots`; returns its number.
std::int32_t AddElement(ElementTable& elements, std::int32_t id, std::int32_t type,
                        std::int32_t numSlots, const std::int32_t* slots);
void AllocateNodes(NodeTable& nodes, std::int64_t capacity);
// Appends a node; returns its number.
std::int32_t AddNode(NodeTable& nodes, std::int32_t id, double x, double y, double z,
                     std::int32_t code);
void AllocateFaces(FaceTable& faces, std::int64_t capacity, std::int64_t nodeListCapacity);

// Reference-element data of a type code: (dimension, kind, function type) and counts. Returns
// false for an unknown code.
bool ShapeOfType(std::int32_t type, ShapeData& shape);
// Number of nodes an element of this type has (0 for an unknown code).
std::int32_t NodesOfType(std::int32_t type);

// The run's shape table (at most kMaxShapes distinct reference elements).
struct ShapeTable {
  std::vector<ShapeData> shapes;  // index = shape id - 1
};
extern ShapeTable g_shapes;

// The run's mesh table (at most kMaxMeshes records).
struct MeshTable {
  std::array<MeshData, kMaxMeshes> meshes;
  int numMeshes = 0;
};
extern MeshTable g_meshTable;
