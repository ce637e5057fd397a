// Element-to-node interpolation (clipped pseudo-Laplacian weights with an inverse-distance
// fallback), the quadtree that finds the element containing a point, the point-in-element test
// and the linear point value inside an element.
//
// Arrays are 1-based like the mesh tables: element values are indexed 1..numElements, node
// values 1..numNodes (entry 0 is not used). The node loops run in parallel with a static
// schedule; each node writes only its own result and nothing is allocated inside them.
#pragma once

#include <cstdint>
#include <vector>

#include "mesh/MeshData.h"

// Node values from element values. Elements whose value equals `deleteValue` are skipped; a
// node with no usable element gets `deleteValue`. Mode 2: the values are directions in degrees,
// averaged across the 0/360 cut.
void CalcNodeValuesPL2D(const MeshData& mesh, const double* elementValues, double deleteValue,
                        std::int32_t mode, double* nodeValues);
// Node values from the wet elements only (wet[e] > 0); a node without a wet element gets 0.
void CalcNodeValuesWetPL2D(const MeshData& mesh, const double* elementValues,
                           const std::int32_t* wet, double* nodeValues);
// Two components with one set of weights (the velocity components).
void CalcNodeValues2WetPL2D(const MeshData& mesh, const double* elementValues1,
                            const double* elementValues2, const std::int32_t* wet,
                            double* nodeValues1, double* nodeValues2);

// Quadtree of boxes over the elements of a 2-D mesh. Nodes are kept in one flat array; the
// root is node 0. Coordinates are relative to the tree origin (the minimum of the root box).
struct SearchTreeNode {
  std::int32_t dimension = 2;
  double xmin = 0, xmax = 0, ymin = 0, ymax = 0, zmin = 0, zmax = 0;
  std::int32_t numElements = 0;  // elements of a leaf; -1 for an inner node
  std::int32_t firstChild = 0;   // inner node: index of the first of its 4 children
  std::int32_t depth = 0;
  std::vector<std::int32_t> elements;
};

struct SearchTree2D {
  double x0 = 0.0, y0 = 0.0;  // tree origin
  std::vector<SearchTreeNode> nodes;
  const MeshData* mesh = nullptr;
  // Per node its first child, -1 for a leaf: a compact copy of nodes[i].firstChild that keeps
  // the descent of a lookup in cache (the boxes on the way follow from the root box).
  std::vector<std::int32_t> descent;
};

constexpr std::int32_t kSearchTreeLeafCapacity = 20;

// Builds the tree of every element of a 2-D mesh (stops with the routine's message for a mesh
// of another dimension or a faulty mesh).
void BuildSearchTree2D(const MeshData& mesh, SearchTree2D& tree);
// The mesh's tree, built on the first call and kept with the mesh.
const SearchTree2D& GetSearchTree2D(MeshData& mesh);
// Element containing (x, y) in mesh coordinates, or 0.
std::int32_t FindElementID2DSearchTree(const SearchTree2D& tree, double x, double y);

// True when (px, py) lies in the element with `numNodes` nodes at (x, y), within 1e-10.
bool PointInElement2D(std::int32_t numNodes, const double* x, const double* y, double px,
                      double py);
// Linear value at (px, py) from the node values of a triangle (3 or 6 nodes) or quadrilateral
// (4 or 8 nodes). A delete value among the nodes, or a degenerate triangle, gives `deleteValue`.
double CalcPointValue2D(double px, double py, std::int32_t numNodes, const double* x,
                        const double* y, const double* values, double deleteValue);
