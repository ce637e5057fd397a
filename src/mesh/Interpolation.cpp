#include "mesh/Interpolation.h"

#include <algorithm>
#include <cmath>
#include <memory>
#include <utility>

namespace {

// ---------------------------------------------------------------------------------------------
// Node values

// Offset of an element centroid from a node; on "LONG/LAT" meshes the centroid longitude is
// brought next to the node's first, so a node on the dateline sees its elements close by.
inline void CentroidOffset(const ElementTable& el, std::int32_t e, double xn, double yn,
                           bool wrap, double& dx, double& dy) {
  const double xc = wrap ? WrapNear(el.xc[e], xn) : el.xc[e];
  dx = xc - xn;
  dy = el.yc[e] - yn;
}

// Direction `v` (degrees) moved by a full turn when it lies more than half a turn from `ref`.
inline double NearDirection(double v, double ref) {
  if (v < ref - 180.0) return v + 360.0;
  if (v > ref + 180.0) return v - 360.0;
  return v;
}

inline double ToFullTurn(double v) {
  v = std::fmod(v, 360.0);
  if (v < 0.0) v += 360.0;
  if (v >= 360.0) v -= 360.0;  // -tiny + 360 rounds to 360
  return v;
}

// The common node loop. For every node it keeps the elements `keep(e)` accepts, weights them
// with the clipped pseudo-Laplacian weights (inverse distances where those are unusable) and
// writes sum(w v) / sum(w) for each of the `kComponents` value arrays. A node without a kept
// element gets `empty`. With kDirections the values are degrees averaged across the 0/360 cut.
//
// The loop makes two passes over a node's elements (moments, then weighted sums) instead of
// buffering the offsets, so nothing is allocated per node.
template <int kComponents, bool kDirections, class Keep>
void NodeValuesLoop(const MeshData& m, const double* const (&values)[kComponents], Keep keep,
                    double empty, double* const (&out)[kComponents]) {
  const NodeTable& nd = m.nodes;
  const ElementTable& el = m.elements;
  const bool wrap = m.IsLongLat();
  const std::int32_t nn = nd.numNodes;
  const std::int32_t* start = nd.elemStart.data();
  const std::int32_t* list = nd.elemList.data();
#pragma omp parallel for schedule(static)
  for (std::int32_t n = 1; n <= nn; ++n) {
    const double xn = nd.x[n], yn = nd.y[n];
    const std::int32_t first = start[n], last = start[n + 1];
    double rx = 0.0, ry = 0.0, ixx = 0.0, iyy = 0.0, ixy = 0.0;
    double ref = 0.0;  // directions: the first kept value
    std::int32_t count = 0;
    for (std::int32_t i = first; i < last; ++i) {
      const std::int32_t e = list[i];
      if (!keep(e)) continue;
      if (kDirections && count == 0) ref = values[0][e];
      double dx, dy;
      CentroidOffset(el, e, xn, yn, wrap, dx, dy);
      rx += dx; ry += dy;
      ixx += dx * dx; iyy += dy * dy; ixy += dx * dy;
      ++count;
    }
    if (count == 0) {
      for (int c = 0; c < kComponents; ++c) out[c][n] = empty;
      continue;
    }
    auto value = [&](int c, std::int32_t e) {
      const double v = values[c][e];
      return kDirections ? NearDirection(v, ref) : v;
    };
    double sum[kComponents];
    bool done = false;
    const double det = ixx * iyy - ixy * ixy;
    if (std::fabs(det) > 1e-10 * ixx * iyy) {
      const double lx = (ixy * ry - iyy * rx) / det;
      const double ly = (ixy * rx - ixx * ry) / det;
      double sw = 0.0;
      for (int c = 0; c < kComponents; ++c) sum[c] = 0.0;
      for (std::int32_t i = first; i < last; ++i) {
        const std::int32_t e = list[i];
        if (!keep(e)) continue;
        double dx, dy;
        CentroidOffset(el, e, xn, yn, wrap, dx, dy);
        const double w = std::clamp(1.0 + lx * dx + ly * dy, 0.0, 2.0);
        sw += w;
        for (int c = 0; c < kComponents; ++c) sum[c] += w * value(c, e);
      }
      if (std::fabs(sw) > 1e-10) {
        for (int c = 0; c < kComponents; ++c) sum[c] /= sw;
        done = true;
      }
    }
    if (!done) {
      // Inverse distances; a centroid on the node itself takes that element's value.
      double sw = 0.0;
      for (int c = 0; c < kComponents; ++c) sum[c] = 0.0;
      std::int32_t at = 0;
      for (std::int32_t i = first; i < last && at == 0; ++i) {
        const std::int32_t e = list[i];
        if (!keep(e)) continue;
        double dx, dy;
        CentroidOffset(el, e, xn, yn, wrap, dx, dy);
        const double d = std::sqrt(dx * dx + dy * dy);
        if (d == 0.0) {
          at = e;
          break;
        }
        const double w = 1.0 / d;
        sw += w;
        for (int c = 0; c < kComponents; ++c) sum[c] += w * value(c, e);
      }
      for (int c = 0; c < kComponents; ++c) sum[c] = at != 0 ? value(c, at) : sum[c] / sw;
    }
    for (int c = 0; c < kComponents; ++c) out[c][n] = kDirections ? ToFullTurn(sum[c]) : sum[c];
  }
}

// ---------------------------------------------------------------------------------------------
// Point in element

constexpr double kInsideTolerance = 1e-10;

// Barycentric test of (px, py) against the triangle (x1, y1), (x2, y2), (x3, y3) of either
// orientation. A zero-area triangle contains nothing.
inline bool PointInTriangle(double x1, double y1, double x2, double y2, double x3, double y3,
                            double px, double py) {
  const double det = (x2 - x1) * (y3 - y1) - (x3 - x1) * (y2 - y1);
  if (det == 0.0) return false;
  const double l1 = ((x2 - px) * (y3 - py) - (x3 - px) * (y2 - py)) / det;
  const double l2 = ((x3 - px) * (y1 - py) - (x1 - px) * (y3 - py)) / det;
  constexpr double lo = -kInsideTolerance, hi = 1.0 + kInsideTolerance;
  return l1 >= lo && l1 <= hi && l2 >= lo && l2 <= hi && l1 + l2 <= hi;
}

// Corners used for the geometry of an element with this many nodes: 3 for triangles (3 or 6
// nodes), 4 for quadrilaterals (4 or 8 nodes), 0 for anything else.
inline std::int32_t CornersOfNodeCount(std::int32_t numNodes) {
  if (numNodes == 3 || numNodes == 6) return 3;
  if (numNodes == 4 || numNodes == 8) return 4;
  return 0;
}

inline bool PointInCorners(std::int32_t corners, const double* x, const double* y, double px,
                           double py) {
  if (corners == 3) return PointInTriangle(x[0], y[0], x[1], y[1], x[2], y[2], px, py);
  if (corners == 4)
    return PointInTriangle(x[0], y[0], x[1], y[1], x[2], y[2], px, py) ||
           PointInTriangle(x[0], y[0], x[2], y[2], x[3], y[3], px, py);
  return false;
}

// ---------------------------------------------------------------------------------------------
// Search tree

constexpr std::int32_t kMaxTreeDepth = 24;      // a leaf this deep no longer splits
constexpr double kMinRelativeBoxSize = 1e-9;    // nor one this small relative to the root box

// Corners of an element relative to the tree origin, longitudes unwrapped next to the first
// corner on "LONG/LAT" meshes, and their bounding box.
struct Corners {
  std::int32_t count = 0;
  double x[4], y[4];
  double xmin, xmax, ymin, ymax;
};

inline void GatherCorners(const MeshData& m, std::int32_t e, bool wrap, double x0, double y0,
                          Corners& c) {
  const ElementTable& el = m.elements;
  const NodeTable& nd = m.nodes;
  const std::int32_t start = el.nodeStart[e];
  c.count = CornersOfNodeCount(el.nodeStart[e + 1] - start);
  if (c.count == 0) return;
  const double first = nd.x[el.nodeList[start]];
  for (std::int32_t k = 0; k < c.count; ++k) {
    const std::int32_t node = el.nodeList[start + k];
    const double x = wrap && k > 0 ? WrapNear(nd.x[node], first) : nd.x[node];
    c.x[k] = x - x0;
    c.y[k] = nd.y[node] - y0;
  }
  c.xmin = c.xmax = c.x[0];
  c.ymin = c.ymax = c.y[0];
  for (std::int32_t k = 1; k < c.count; ++k) {
    c.xmin = std::min(c.xmin, c.x[k]); c.xmax = std::max(c.xmax, c.x[k]);
    c.ymin = std::min(c.ymin, c.y[k]); c.ymax = std::max(c.ymax, c.y[k]);
  }
}

// Whether an element overlaps a tree box (closed sets; a conservative answer is harmless, a
// missed overlap loses points). After the bounding-box rejection every edge whose end points
// do not both lie beyond one side of the box is checked: if its line does not leave all four
// box corners strictly on one side, the edge may cross the box. When no edge does, the box is
// either wholly inside the element or outside it; the box centre tells which.
inline bool Overlaps(const Corners& c, const SearchTreeNode& b) {
  if (c.count == 0) return false;
  if (c.xmax < b.xmin || c.xmin > b.xmax || c.ymax < b.ymin || c.ymin > b.ymax) return false;
  for (std::int32_t k = 0; k < c.count; ++k) {
    const std::int32_t k1 = k + 1 == c.count ? 0 : k + 1;
    const double xa = c.x[k], ya = c.y[k], xb = c.x[k1], yb = c.y[k1];
    if ((xa < b.xmin && xb < b.xmin) || (xa > b.xmax && xb > b.xmax) ||
        (ya < b.ymin && yb < b.ymin) || (ya > b.ymax && yb > b.ymax))
      continue;
    const double ex = xb - xa, ey = yb - ya;
    auto side = [&](double px, double py) { return ex * (py - ya) - ey * (px - xa); };
    const double f1 = side(b.xmin, b.ymin), f2 = side(b.xmax, b.ymin);
    const double f3 = side(b.xmin, b.ymax), f4 = side(b.xmax, b.ymax);
    const bool positive = f1 > 0.0 && f2 > 0.0 && f3 > 0.0 && f4 > 0.0;
    const bool negative = f1 < 0.0 && f2 < 0.0 && f3 < 0.0 && f4 < 0.0;
    if (!positive && !negative) return true;
  }
  return PointInCorners(c.count, c.x, c.y, 0.5 * (b.xmin + b.xmax), 0.5 * (b.ymin + b.ymax));
}

class TreeBuilder {
 public:
  TreeBuilder(const MeshData& m, SearchTree2D& tree, bool wrap, double minBoxSize)
      : m_(m), tree_(tree), wrap_(wrap), minBoxSize_(minBoxSize) {}

  void InsertElement(std::int32_t e) {
    Corners c;
    GatherCorners(m_, e, wrap_, tree_.x0, tree_.y0, c);
    Insert(0, e, c);
  }

 private:
  // Inserts element e into tree node `index` and below; returns whether the node's box
  // overlaps the element. Children are appended to the flat array, so nodes are addressed by
  // index and references are not kept across insertions.
  bool Insert(std::int32_t index, std::int32_t e, const Corners& c) {
    SearchTreeNode& node = tree_.nodes[index];
    if (!Overlaps(c, node)) return false;
    if (node.numElements < 0) {
      const std::int32_t first = node.firstChild;
      for (std::int32_t q = 0; q < 4; ++q) Insert(first + q, e, c);
    } else if (node.numElements < kSearchTreeLeafCapacity || !CanSplit(node)) {
      node.elements.push_back(e);
      ++node.numElements;
    } else {
      Split(index, e, c);
    }
    return true;
  }

  bool CanSplit(const SearchTreeNode& node) const {
    return node.depth < kMaxTreeDepth &&
           std::max(node.xmax - node.xmin, node.ymax - node.ymin) > minBoxSize_;
  }

  // Splits a full leaf at its box centre into the quadrants SW, SE, NW, NE (in that order),
  // hands its elements and the new one to them and makes it an inner node.
  void Split(std::int32_t index, std::int32_t e, const Corners& c) {
    std::vector<std::int32_t> held = std::move(tree_.nodes[index].elements);
    const SearchTreeNode box = tree_.nodes[index];  // (its element list is now empty)
    const double xm = 0.5 * (box.xmin + box.xmax), ym = 0.5 * (box.ymin + box.ymax);
    const std::int32_t first = static_cast<std::int32_t>(tree_.nodes.size());
    for (std::int32_t q = 0; q < 4; ++q) {
      SearchTreeNode child;
      child.dimension = box.dimension;
      child.xmin = (q & 1) ? xm : box.xmin;
      child.xmax = (q & 1) ? box.xmax : xm;
      child.ymin = (q & 2) ? ym : box.ymin;
      child.ymax = (q & 2) ? box.ymax : ym;
      child.zmin = box.zmin;
      child.zmax = box.zmax;
      child.depth = box.depth + 1;
      child.elements.reserve(kSearchTreeLeafCapacity);
      tree_.nodes.push_back(std::move(child));
    }
    SearchTreeNode& inner = tree_.nodes[index];
    inner.numElements = -1;
    inner.firstChild = first;
    inner.elements = std::vector<std::int32_t>();

    std::int64_t placed = 0;
    Corners oc;
    for (const std::int32_t o : held) {
      GatherCorners(m_, o, wrap_, tree_.x0, tree_.y0, oc);
      for (std::int32_t q = 0; q < 4; ++q) placed += Insert(first + q, o, oc);
    }
    for (std::int32_t q = 0; q < 4; ++q) placed += Insert(first + q, e, c);
    if (placed >= 3 * kSearchTreeLeafCapacity) placed = CountInside(first, held, c);
    // Elements of a sound mesh mostly fall into one or two quadrants; three times the leaf
    // capacity means elements piled on top of each other.
    if (placed >= 3 * kSearchTreeLeafCapacity)
      throw MeshError(
          "InsertElementd2DSearchTree: Error building search tree - possibly erroneous mesh");
  }

  // The fault count again, without the elements that only touch a quadrant (at its edge or
  // at the split point): the quadrant boxes are shrunk a little. Otherwise every element of a
  // fan around a node lying exactly on the split point would count four times and a sound
  // radial mesh would be refused.
  std::int64_t CountInside(std::int32_t first, const std::vector<std::int32_t>& held,
                           const Corners& c) const {
    SearchTreeNode inside[4];
    const SearchTreeNode& sw = tree_.nodes[first];
    const SearchTreeNode& ne = tree_.nodes[first + 3];
    const double shrink = 1e-9 * std::max(ne.xmax - sw.xmin, ne.ymax - sw.ymin);
    for (std::int32_t q = 0; q < 4; ++q) {
      const SearchTreeNode& child = tree_.nodes[first + q];
      inside[q].xmin = child.xmin + shrink; inside[q].xmax = child.xmax - shrink;
      inside[q].ymin = child.ymin + shrink; inside[q].ymax = child.ymax - shrink;
    }
    std::int64_t count = 0;
    Corners oc;
    for (std::size_t i = 0; i <= held.size(); ++i) {
      if (i < held.size()) GatherCorners(m_, held[i], wrap_, tree_.x0, tree_.y0, oc);
      const Corners& corners = i < held.size() ? oc : c;  // the new element last
      for (std::int32_t q = 0; q < 4; ++q) count += Overlaps(corners, inside[q]);
    }
    return count;
  }

  const MeshData& m_;
  SearchTree2D& tree_;
  bool wrap_;
  double minBoxSize_;
};

// Element of the tree containing (px, py), given relative to the tree origin, or 0.
std::int32_t FindRelative(const SearchTree2D& tree, bool wrap, double px, double py) {
  const SearchTreeNode& root = tree.nodes[0];
  double x0 = root.xmin, x1 = root.xmax, y0 = root.ymin, y1 = root.ymax;
  if (!(px >= x0 && px <= x1 && py >= y0 && py <= y1)) return 0;
  // The children split a box at its centre in the order SW, SE, NW, NE, so the first child
  // containing the point (bounds included) and its box follow from the parent's box alone,
  // computed exactly as the split did. Only the compact child index is read on the way down.
  std::int32_t index = 0;
  for (std::int32_t first = tree.descent[0]; first >= 0; first = tree.descent[index]) {
    const double xm = 0.5 * (x0 + x1), ym = 0.5 * (y0 + y1);
    const bool east = !(px <= xm), north = !(py <= ym);
    (east ? x0 : x1) = xm;
    (north ? y0 : y1) = ym;
    index = first + (east ? 1 : 0) + (north ? 2 : 0);
  }
  const SearchTreeNode* node = &tree.nodes[index];
  if (node->numElements < 0 || node->xmin != x0 || node->xmax != x1 || node->ymin != y0 ||
      node->ymax != y1)
    throw MeshError("FindElementID2DSearchTree: Error in search tree");
  // The leaf's elements are scattered over the mesh tables: touch their node lists and
  // coordinates ahead (independent loads overlap) before testing them one by one in order.
  const MeshData& m = *tree.mesh;
  const std::int32_t count = std::min<std::int32_t>(node->numElements, 32);
  const std::int32_t* list = node->elements.data();
  const std::int32_t* start = m.elements.nodeStart.data();
  const std::int32_t* nodeList = m.elements.nodeList.data();
  for (std::int32_t i = 0; i < count; ++i) __builtin_prefetch(&start[list[i]]);
  for (std::int32_t i = 0; i < count; ++i) __builtin_prefetch(&nodeList[start[list[i]]]);
  for (std::int32_t i = 0; i < count; ++i) {
    const std::int32_t* nodes = &nodeList[start[list[i]]];
    for (std::int32_t k = 0; k < 3; ++k) {
      __builtin_prefetch(&m.nodes.x[nodes[k]]);
      __builtin_prefetch(&m.nodes.y[nodes[k]]);
    }
  }
  Corners c;
  for (const std::int32_t e : node->elements) {
    GatherCorners(m, e, wrap, tree.x0, tree.y0, c);
    // Bounding-box rejection with a margin wider than the test's tolerance (1e-10 of a
    // barycentric coordinate is at most 1e-10 of the element's diameter away).
    const double margin = 1e-9 * ((c.xmax - c.xmin) + (c.ymax - c.ymin));
    if (px < c.xmin - margin || px > c.xmax + margin || py < c.ymin - margin ||
        py > c.ymax + margin)
      continue;
    if (PointInCorners(c.count, c.x, c.y, px, py)) return e;
  }
  return 0;
}

// Barycentric interpolation in one triangle (the rule of CalcPointValue2D).
double TriangleValue(double px, double py, double x1, double y1, double x2, double y2,
                     double x3, double y3, double p1, double p2, double p3, double deleteValue) {
  if (p1 == deleteValue || p2 == deleteValue || p3 == deleteValue) return deleteValue;
  const double d = x3 * (y1 - y2) + x1 * (y2 - y3) + x2 * (y3 - y1);
  // A degenerate triangle has no gradient; the delete value says so instead of a made-up 0.
  if (std::fabs(d) <= 1e-20) return deleteValue;
  const double dpdx = ((y2 - y3) * p1 + (y3 - y1) * p2 + (y1 - y2) * p3) / d;
  const double dpdy = ((x3 - x2) * p1 + (x1 - x3) * p2 + (x2 - x1) * p3) / d;
  return p1 + (px - x1) * dpdx + (py - y1) * dpdy;
}

}  // namespace

// ---------------------------------------------------------------------------------------------

void CalcNodeValuesPL2D(const MeshData& mesh, const double* elementValues, double deleteValue,
                        std::int32_t mode, double* nodeValues) {
  const double* const values[1] = {elementValues};
  double* const out[1] = {nodeValues};
  auto keep = [elementValues, deleteValue](std::int32_t e) {
    return elementValues[e] != deleteValue;
  };
  if (mode == 2)
    NodeValuesLoop<1, true>(mesh, values, keep, deleteValue, out);
  else
    NodeValuesLoop<1, false>(mesh, values, keep, deleteValue, out);
}

void CalcNodeValuesWetPL2D(const MeshData& mesh, const double* elementValues,
                           const std::int32_t* wet, double* nodeValues) {
  const double* const values[1] = {elementValues};
  double* const out[1] = {nodeValues};
  NodeValuesLoop<1, false>(mesh, values, [wet](std::int32_t e) { return wet[e] > 0; }, 0.0,
                           out);
}

void CalcNodeValues2WetPL2D(const MeshData& mesh, const double* elementValues1,
                            const double* elementValues2, const std::int32_t* wet,
                            double* nodeValues1, double* nodeValues2) {
  const double* const values[2] = {elementValues1, elementValues2};
  double* const out[2] = {nodeValues1, nodeValues2};
  NodeValuesLoop<2, false>(mesh, values, [wet](std::int32_t e) { return wet[e] > 0; }, 0.0,
                           out);
}

void BuildSearchTree2D(const MeshData& mesh, SearchTree2D& tree) {
  if (mesh.dimension != 2) throw MeshError("BuildSearchTree2D: Mesh must be 2D or 3D layered");
  tree = SearchTree2D{};
  tree.mesh = &mesh;
  const NodeTable& nd = mesh.nodes;
  const ElementTable& el = mesh.elements;
  const bool wrap = mesh.IsLongLat();

  // Root box: the node coordinates; on "LONG/LAT" meshes also the unwrapped corners of the
  // elements across the dateline, which reach beyond +-pi.
  SearchTreeNode root;
  if (nd.numNodes > 0) {
    root.xmin = root.xmax = nd.x[1];
    root.ymin = root.ymax = nd.y[1];
    root.zmin = root.zmax = nd.z[1];
    for (std::int32_t n = 2; n <= nd.numNodes; ++n) {
      root.xmin = std::min(root.xmin, nd.x[n]); root.xmax = std::max(root.xmax, nd.x[n]);
      root.ymin = std::min(root.ymin, nd.y[n]); root.ymax = std::max(root.ymax, nd.y[n]);
      root.zmin = std::min(root.zmin, nd.z[n]); root.zmax = std::max(root.zmax, nd.z[n]);
    }
    if (wrap) {
      Corners c;
      for (std::int32_t e = 1; e <= el.numElements; ++e) {
        GatherCorners(mesh, e, true, 0.0, 0.0, c);
        if (c.count == 0) continue;
        root.xmin = std::min(root.xmin, c.xmin);
        root.xmax = std::max(root.xmax, c.xmax);
      }
    }
  }
  tree.x0 = root.xmin;
  tree.y0 = root.ymin;
  root.xmax -= root.xmin; root.xmin = 0.0;
  root.ymax -= root.ymin; root.ymin = 0.0;
  root.elements.reserve(kSearchTreeLeafCapacity);
  const double minBoxSize = kMinRelativeBoxSize * std::max(root.xmax, root.ymax);
  // Leaves hold about 11 entries and an element lies in about 3 leaves, so there are about a
  // third as many tree nodes as elements; a little more is reserved so the array is rarely
  // moved (untouched reserve costs no memory).
  tree.nodes.reserve(static_cast<std::size_t>(el.numElements) / 2 + 16);
  tree.nodes.push_back(std::move(root));

  TreeBuilder builder(mesh, tree, wrap, minBoxSize);
  for (std::int32_t e = 1; e <= el.numElements; ++e) builder.InsertElement(e);
  // A layered 3-D mesh will insert the elements of its top layer here, as 2-D prisms.

  tree.descent.resize(tree.nodes.size());
  for (std::size_t i = 0; i < tree.nodes.size(); ++i)
    tree.descent[i] = tree.nodes[i].numElements < 0 ? tree.nodes[i].firstChild : -1;
}

const SearchTree2D& GetSearchTree2D(MeshData& mesh) {
  if (!mesh.searchTree) {
    auto tree = std::make_shared<SearchTree2D>();
    BuildSearchTree2D(mesh, *tree);
    mesh.searchTree = std::move(tree);
  }
  return *mesh.searchTree;
}

std::int32_t FindElementID2DSearchTree(const SearchTree2D& tree, double x, double y) {
  if (tree.nodes.empty() || tree.mesh == nullptr) return 0;
  if (tree.descent.size() != tree.nodes.size())
    throw MeshError("FindElementID2DSearchTree: Error in search tree");
  const bool wrap = tree.mesh->IsLongLat();
  const double px = x - tree.x0, py = y - tree.y0;
  std::int32_t e = FindRelative(tree, wrap, px, py);
  // Elements across the dateline are held with unwrapped longitudes, on whichever side their
  // first corner lies: a point missed at x may be there one turn to the east or the west.
  if (e == 0 && wrap) {
    e = FindRelative(tree, wrap, px + kTwoPi, py);
    if (e == 0) e = FindRelative(tree, wrap, px - kTwoPi, py);
  }
  return e;
}

bool PointInElement2D(std::int32_t numNodes, const double* x, const double* y, double px,
                      double py) {
  return PointInCorners(CornersOfNodeCount(numNodes), x, y, px, py);
}

double CalcPointValue2D(double px, double py, std::int32_t numNodes, const double* x,
                        const double* y, const double* values, double deleteValue) {
  const std::int32_t corners = CornersOfNodeCount(numNodes);
  if (corners == 3)
    return TriangleValue(px, py, x[0], y[0], x[1], y[1], x[2], y[2], values[0], values[1],
                         values[2], deleteValue);
  if (corners == 4) {
    // Split along the diagonal 1-3.
    if (PointInTriangle(x[0], y[0], x[1], y[1], x[2], y[2], px, py))
      return TriangleValue(px, py, x[0], y[0], x[1], y[1], x[2], y[2], values[0], values[1],
                           values[2], deleteValue);
    return TriangleValue(px, py, x[0], y[0], x[2], y[2], x[3], y[3], values[0], values[2],
                         values[3], deleteValue);
  }
  throw MeshError("CalcPointValue2D: Interpolation not possible for this type of element");
}
