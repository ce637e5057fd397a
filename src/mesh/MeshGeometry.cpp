#include "mesh/MeshGeometry.h"

#include <algorithm>
#include <cmath>
#include <map>
#include <new>

#include "driver/Log.h"
#include "platform/Memory.h"

namespace {


std::string Str(std::int64_t v) { return std::to_string(v); }

inline double TriangleArea(double x1, double y1, double x2, double y2, double x3, double y3) {
  return 0.5 * (x1 * (y2 - y3) + x2 * (y3 - y1) + x3 * (y1 - y2));
}

// Coordinates of `count` nodes of a node list; on "LONG/LAT" meshes longitudes are brought next
// to the first node's. `z` may be null.
inline void GatherNodes(const NodeTable& nd, const std::int32_t* nodes, std::int32_t count,
                        bool wrap, double* x, double* y, double* z) {
  for (std::int32_t k = 0; k < count; ++k) {
    const std::int32_t node = nodes[k];
    x[k] = nd.x[node];
    y[k] = nd.y[node];
    if (z != nullptr) z[k] = nd.z[node];
    if (wrap && k > 0) x[k] = WrapNear(x[k], x[0]);
  }
}

// Number of corner nodes of a 2-D element type (0 for other types).
inline std::int32_t Corners2D(std::int32_t type) {
  if (type >= 21 && type <= 24) return 3;
  if (type >= 25 && type <= 28) return 4;
  return 0;
}

// Corner coordinates of a 2-D element, longitudes next to the first node's on "LONG/LAT".
inline std::int32_t CornerCoordinates(const MeshData& m, std::int32_t e, double* x, double* y) {
  const ElementTable& el = m.elements;
  const std::int32_t n = Corners2D(el.type[e]);
  GatherNodes(m.nodes, &el.nodeList[el.nodeStart[e]], n, m.IsLongLat(), x, y, nullptr);
  return n;
}

double SignedArea(std::int32_t corners, const double* x, const double* y) {
  double a = TriangleArea(x[0], y[0], x[1], y[1], x[2], y[2]);
  if (corners == 4) a += TriangleArea(x[0], y[0], x[2], y[2], x[3], y[3]);
  return a;
}

}  // namespace

void CheckMeshSafety(const MeshData& m) {
  const NodeTable& nd = m.nodes;
  const ElementTable& el = m.elements;
  if (nd.numNodes <= 0) throw MeshError("The mesh has no nodes");
  if (el.numElements <= 0) throw MeshError("The mesh has no elements");
  for (std::int32_t n = 1; n <= nd.numNodes; ++n) {
    if (!std::isfinite(nd.x[n]) || !std::isfinite(nd.y[n]))
      throw MeshError("Node " + Str(n) + " has a coordinate that is not a finite number");
    if (!std::isfinite(nd.z[n]))
      throw MeshError("Node " + Str(n) + " has a bed level that is not a finite number");
    if (m.IsLongLat() && std::fabs(nd.y[n]) > 0.5 * kPi * (1.0 + 1e-12))
      throw MeshError("Node " + Str(n) + " has a latitude beyond 90 degrees (" +
                      FormatNumber(nd.y[n] * kRadiansToDegrees) + ")");
  }
  for (std::int32_t e = 1; e <= el.numElements; ++e) {
    const std::int32_t count = el.NumNodes(e);
    const std::int32_t need = NodesOfType(el.type[e]);
    if (need == 0)
      throw MeshError("Element " + Str(e) + " has the unknown type code " + Str(el.type[e]));
    if (count != need)
      throw MeshError("Element " + Str(e) + " has " + Str(count) + " nodes, its type " +
                      Str(el.type[e]) + " needs " + Str(need));
    for (std::int32_t k = 1; k <= count; ++k) {
      const std::int32_t node = el.Node(e, k);
      if (node > nd.numNodes)
        throw MeshError("Node in the element table is larger than the number of nodes (element " +
                        Str(e) + ", node " + Str(node) + ")");
      if (node < 1)
        throw MeshError("Node in the element table is lower than 1 (element " + Str(e) +
                        ", node " + Str(node) + ")");
      for (std::int32_t j = 1; j < k; ++j)
        if (el.Node(e, j) == node)
          throw MeshError("Element " + Str(e) + " uses node " + Str(node) + " twice");
    }
  }
}

void ValidateMesh(const MeshData& m, std::vector<std::string>& unusedNodes) {
  const NodeTable& nd = m.nodes;
  const ElementTable& el = m.elements;
  for (std::int32_t n = 1; n <= nd.numNodes; ++n)
    if (nd.id[n] != n)
      throw MeshError("The node indicices and IDs must be the same (node " + Str(n) +
                      " has the identifier " + Str(nd.id[n]) + ")");
  for (std::int32_t e = 1; e <= el.numElements; ++e)
    if (el.id[e] != e)
      throw MeshError("The element indicices and IDs must be the same (element " + Str(e) +
                      " has the identifier " + Str(el.id[e]) + ")");
  std::vector<char> used(static_cast<std::size_t>(nd.numNodes) + 1, 0);
  for (std::int32_t e = 1; e <= el.numElements; ++e)
    for (std::int32_t i = el.nodeStart[e]; i < el.nodeStart[e + 1]; ++i) {
      const std::int32_t node = el.nodeList[i];
      if (node > nd.numNodes)
        throw MeshError("Node in the element table is larger than the number of nodes (element " +
                        Str(e) + ", node " + Str(node) + ")");
      if (node < 1)
        throw MeshError("Node in the element table is lower than 1 (element " + Str(e) +
                        ", node " + Str(node) + ")");
      used[node] = 1;
    }
  const std::size_t before = unusedNodes.size();
  for (std::int32_t n = 1; n <= nd.numNodes; ++n)
    if (!used[n]) unusedNodes.push_back("Node not included in mesh: " + Str(n));
  if (unusedNodes.size() > before) throw MeshError("Nodes not included in mesh");
}

std::int32_t OrientElements(MeshData& m) {
  ElementTable& el = m.elements;
  std::int32_t turned = 0;
  double x[4], y[4];
  for (std::int32_t e = 1; e <= el.numElements; ++e) {
    const std::int32_t corners = CornerCoordinates(m, e, x, y);
    if (corners == 0) continue;
    const double area = SignedArea(corners, x, y);
    double scale = 0.0;  // squared longest edge, for a relative zero test
    for (std::int32_t k = 0; k < corners; ++k) {
      const std::int32_t j = (k + 1) % corners;
      scale = std::max(scale, (x[j] - x[k]) * (x[j] - x[k]) + (y[j] - y[k]) * (y[j] - y[k]));
    }
    if (!(std::fabs(area) > 1e-12 * scale))
      throw MeshError("Element " + Str(e) + " (identifier " + Str(el.id[e]) + ") has zero area");
    if (area > 0.0) continue;
    // Reverse: corners 1, n, n-1, .., 2; the edge node of new edge k is that of old edge n-k+1.
    std::int32_t* nodes = &el.nodeList[el.nodeStart[e]];
    std::reverse(nodes + 1, nodes + corners);
    const std::int32_t count = el.NumNodes(e);
    if (count >= 2 * corners) std::reverse(nodes + corners, nodes + 2 * corners);
    ++turned;
  }
  return turned;
}

void SetupShapeData(MeshData& m) {
  ElementTable& el = m.elements;
  std::vector<ShapeData>& table = g_shapes.shapes;
  std::int32_t lastType = -1, lastShape = 0;
  for (std::int32_t e = 1; e <= el.numElements; ++e) {
    if (el.type[e] != lastType) {
      ShapeData s;
      if (!ShapeOfType(el.type[e], s))
        throw MeshError("SetupShapeData: unknown element type " + Str(el.type[e]));
      std::int32_t found = 0;
      for (std::size_t i = 0; i < table.size(); ++i)
        if (table[i].dimension == s.dimension && table[i].kind == s.kind &&
            table[i].function == s.function)
          found = static_cast<std::int32_t>(i + 1);
      if (found == 0) {
        if (table.size() >= kMaxShapes) throw MeshError("SetupShapeData:Too many shapes");
        table.push_back(s);
        found = static_cast<std::int32_t>(table.size());
      }
      lastType = el.type[e];
      lastShape = found;
    }
    el.shape[e] = lastShape;
  }
}

std::int32_t GetMeshDimension(const MeshData& m) {
  const ElementTable& el = m.elements;
  std::int32_t dim = 0;
  for (std::int32_t e = 1; e <= el.numElements; ++e) {
    const std::int32_t d = g_shapes.shapes.at(el.shape[e] - 1).dimension;
    if (dim == 0) dim = d;
    else if (d != dim)
      throw MeshError("GetMeshDimension:Elements with different dimension detected in mesh");
  }
  return dim;
}

void CreateNodeElementConnectivity(MeshData& m) {
  NodeTable& nd = m.nodes;
  const ElementTable& el = m.elements;
  try {
    AllocateArray(nd.elemStart, static_cast<std::size_t>(nd.numNodes) + 2, 0);
    for (std::int32_t i = 1; i < el.nodeStart[el.numElements + 1]; ++i) ++nd.elemStart[el.nodeList[i] + 1];
    nd.elemStart[1] = 1;
    for (std::int32_t n = 1; n <= nd.numNodes; ++n) nd.elemStart[n + 1] += nd.elemStart[n];
    AllocateArray(nd.elemList, static_cast<std::size_t>(nd.elemStart[nd.numNodes + 1]), 0);
    std::vector<std::int32_t> fill(nd.elemStart.begin(), nd.elemStart.end());
    for (std::int32_t e = 1; e <= el.numElements; ++e)
      for (std::int32_t i = el.nodeStart[e]; i < el.nodeStart[e + 1]; ++i)
        nd.elemList[fill[el.nodeList[i]]++] = e;
  } catch (const std::bad_alloc&) {
    throw MeshError("CreateNodeElementConnectivity: Out of memory");
  }
}

namespace {

// True when element e holds every node of `face`.
inline bool ContainsAll(const ElementTable& el, std::int32_t e, const std::int32_t* face,
                        std::int32_t n) {
  const std::int32_t* begin = &el.nodeList[el.nodeStart[e]];
  const std::int32_t* end = &el.nodeList[0] + el.nodeStart[e + 1];
  for (std::int32_t k = 0; k < n; ++k)
    if (std::find(begin, end, face[k]) == end) return false;
  return true;
}

// Nodes of local face k of element e (zero entries skipped); returns their count.
inline std::int32_t LocalFaceNodes(const ElementTable& el, const ShapeData& s, std::int32_t e,
                                   std::int32_t k, std::int32_t* out) {
  std::int32_t n = 0;
  for (std::int32_t j = 1; j <= s.nodesPerFace; ++j) {
    const std::int32_t local = s.FaceNode(k, j);
    if (local != 0) out[n++] = el.nodeList[el.nodeStart[e] + local - 1];
  }
  return n;
}

struct TempFace {
  std::int32_t left, right, leftLocal, rightLocal, numNodes;
  std::int32_t nodes[4];
};

}  // namespace

void CalcFaces(MeshData& m, int selection) {
  const NodeTable& nd = m.nodes;
  const ElementTable& el = m.elements;
  if (nd.numNodes <= 0) throw MeshError("CalcFaces: Number of nodes are <= 0");
  if (el.numElements <= 0) throw MeshError("CalcFaces: Number of elements are <= 0");
  if (nd.elemStart.size() != static_cast<std::size_t>(nd.numNodes) + 2)
    CreateNodeElementConnectivity(m);

  std::vector<TempFace> faces;
  std::vector<std::int32_t> flagStart;
  std::vector<char> done;  // per (element, local face)
  std::int32_t numInternalFaces = 0;
  try {
    AllocateArray(flagStart, static_cast<std::size_t>(el.numElements) + 2, 0);
    std::int64_t totalLocal = 0;
    for (std::int32_t e = 1; e <= el.numElements; ++e) {
      flagStart[e] = static_cast<std::int32_t>(totalLocal);
      totalLocal += g_shapes.shapes[el.shape[e] - 1].numFaces;
    }
    flagStart[el.numElements + 1] = static_cast<std::int32_t>(totalLocal);
    AllocateArray(done, static_cast<std::size_t>(totalLocal), char{0});
    faces.reserve(static_cast<std::size_t>(totalLocal / 2 + totalLocal / 8 + 16));
    AdviseHugePages(faces.data(), faces.capacity() * sizeof(TempFace));
  } catch (const std::bad_alloc&) {
    throw MeshError("CalcFace: Out of memory");
  }

  std::int32_t faceNodes[4], other[4];
  for (std::int32_t e = 1; e <= el.numElements; ++e) {
    const ShapeData& s = g_shapes.shapes[el.shape[e] - 1];
    for (std::int32_t k = 1; k <= s.numFaces; ++k) {
      if (done[flagStart[e] + k - 1]) continue;
      const std::int32_t n = LocalFaceNodes(el, s, e, k, faceNodes);
      // Neighbour: the first other element of the first face node that holds every face node.
      std::int32_t neighbour = 0, extra = 0;
      const std::int32_t first = faceNodes[0];
      for (std::int32_t i = nd.elemStart[first]; i < nd.elemStart[first + 1]; ++i) {
        const std::int32_t c = nd.elemList[i];
        if (c == e || !ContainsAll(el, c, faceNodes, n)) continue;
        if (neighbour == 0) neighbour = c;
        else extra = c;
      }
      if (extra != 0) {
        std::string nodes;
        for (std::int32_t j = 0; j < n; ++j) nodes += (j ? "-" : "") + Str(faceNodes[j]);
        throw MeshError("The face of nodes " + nodes + " is shared by more than two elements (" +
                        Str(e) + ", " + Str(neighbour) + ", " + Str(extra) + ")");
      }
      TempFace f{e, 0, k, 0, n, {0, 0, 0, 0}};
      std::copy(faceNodes, faceNodes + n, f.nodes);
      if (neighbour != 0) {
        if (el.NumNodes(neighbour) == el.NumNodes(e) &&
            ContainsAll(el, neighbour, &el.nodeList[el.nodeStart[e]], el.NumNodes(e)))
          throw MeshError("Elements " + Str(e) + " and " + Str(neighbour) + " have the same nodes");
        const ShapeData& sn = g_shapes.shapes[el.shape[neighbour] - 1];
        std::int32_t local = 0;
        for (std::int32_t j = 1; j <= sn.numFaces && local == 0; ++j) {
          const std::int32_t cnt = LocalFaceNodes(el, sn, neighbour, j, other);
          if (cnt != n) continue;
          bool same = true;
          for (std::int32_t a = 0; a < n && same; ++a)
            same = std::find(other, other + cnt, faceNodes[a]) != other + cnt;
          if (same) local = j;
        }
        if (local == 0 || done[flagStart[neighbour] + local - 1])
          throw MeshError("FindFaceInElement:  Failed finding a neighbour element");
        done[flagStart[neighbour] + local - 1] = 1;
        f.right = neighbour;
        f.rightLocal = local;
      }
      done[flagStart[e] + k - 1] = 1;
      faces.push_back(f);
    }
    if (e == el.numInternal) numInternalFaces = static_cast<std::int32_t>(faces.size());
  }

  // Copy into the face table, keeping only boundary faces unless selection is 2.
  std::int64_t count = 0, nodeCount = 0;
  for (const TempFace& f : faces)
    if (selection == 2 || f.right == 0) { ++count; nodeCount += f.numNodes; }
  FaceTable& fc = m.faces;
  AllocateFaces(fc, std::max<std::int64_t>(count, 1), std::max<std::int64_t>(nodeCount, 1));
  std::int32_t num = 0, at = 1;
  for (std::size_t i = 0; i < faces.size(); ++i) {
    const TempFace& f = faces[i];
    if (selection != 2 && f.right != 0) continue;
    ++num;
    fc.id[num] = num;
    fc.left[num] = f.left;
    fc.right[num] = f.right;
    fc.leftLocal[num] = f.leftLocal;
    fc.rightLocal[num] = f.rightLocal;
    for (std::int32_t j = 0; j < f.numNodes; ++j) fc.nodeList[at++] = f.nodes[j];
    fc.nodeStart[num + 1] = at;
    if (static_cast<std::int32_t>(i) < numInternalFaces) fc.numInternal = num;
  }
  fc.numFaces = num;
}

void CalcElementValues(MeshData& m) {
  ElementTable& el = m.elements;
  const NodeTable& nd = m.nodes;
  const std::int32_t ne = el.numElements;
  try {
    for (auto* v : {&el.xc, &el.yc, &el.zc, &el.lengthScale, &el.area, &el.volume})
      AllocateArray(*v, static_cast<std::size_t>(ne) + 1, 0.0);
    AllocateArray(el.dNdx, 3 * (static_cast<std::size_t>(ne) + 1), 0.0);
    AllocateArray(el.dNdy, 3 * (static_cast<std::size_t>(ne) + 1), 0.0);
  } catch (const std::bad_alloc&) {
    throw MeshError("CalcElementValues: Out of memory");
  }
  const bool wrap = m.IsLongLat();
  const ShapeData* shapes = g_shapes.shapes.data();
#pragma omp parallel for schedule(static)
  for (std::int32_t e = 1; e <= ne; ++e) {
    const std::int32_t start = el.nodeStart[e];
    // The safety checks allow at most 8 nodes per element; the bound keeps unchecked meshes
    // inside the arrays.
    const std::int32_t count = std::min(el.nodeStart[e + 1] - start, 8);
    double x[8], y[8], z[8];
    GatherNodes(nd, &el.nodeList[start], count, wrap, x, y, z);
    const ShapeData& s = shapes[el.shape[e] - 1];
    if (s.dimension == 1 && count >= 2) {
      el.lengthScale[e] = std::hypot(x[1] - x[0], y[1] - y[0]);
    } else if (s.dimension == 2 && s.kind == 1) {
      const double a = TriangleArea(x[0], y[0], x[1], y[1], x[2], y[2]);
      el.area[e] = a;
      if (s.function == 1) {
        const double r = 1.0 / (2.0 * a);
        double* dx = &el.dNdx[3 * static_cast<std::size_t>(e)];
        double* dy = &el.dNdy[3 * static_cast<std::size_t>(e)];
        dx[0] = (y[1] - y[2]) * r; dx[1] = (y[2] - y[0]) * r; dx[2] = (y[0] - y[1]) * r;
        dy[0] = (x[2] - x[1]) * r; dy[1] = (x[0] - x[2]) * r; dy[2] = (x[1] - x[0]) * r;
      }
      const double e1 = (x[1] - x[0]) * (x[1] - x[0]) + (y[1] - y[0]) * (y[1] - y[0]);
      const double e2 = (x[2] - x[1]) * (x[2] - x[1]) + (y[2] - y[1]) * (y[2] - y[1]);
      const double e3 = (x[0] - x[2]) * (x[0] - x[2]) + (y[0] - y[2]) * (y[0] - y[2]);
      el.lengthScale[e] = std::sqrt(std::min({e1, e2, e3}));
    } else if (s.dimension == 2 && s.kind == 2) {
      el.area[e] = TriangleArea(x[0], y[0], x[1], y[1], x[2], y[2]) +
                   TriangleArea(x[0], y[0], x[2], y[2], x[3], y[3]);
      double shortest = 1e10;
      for (std::int32_t k = 1; k <= s.numEdges; ++k) {
        const std::int32_t a = s.EdgeNode(k, 1) - 1, b = s.EdgeNode(k, 2) - 1;
        shortest = std::min(shortest, std::hypot(x[b] - x[a], y[b] - y[a]));
      }
      el.lengthScale[e] = shortest;
    } else if (s.dimension == 3 && (s.kind == 2 || s.kind == 3)) {
      const std::int32_t base = s.kind == 2 ? 3 : 4;
      double h = 0.0;
      for (std::int32_t k = 0; k < base; ++k) h += z[k + base] - z[k];
      h /= base;
      double a = TriangleArea(x[0], y[0], x[1], y[1], x[2], y[2]);
      if (base == 4) a += TriangleArea(x[0], y[0], x[2], y[2], x[3], y[3]);
      el.volume[e] = h * a;
    }
    double sx = 0.0, sy = 0.0, sz = 0.0;
    for (std::int32_t k = 0; k < count; ++k) { sx += x[k]; sy += y[k]; sz += z[k]; }
    el.xc[e] = sx / count;
    el.yc[e] = sy / count;
    el.zc[e] = sz / count;
  }
}

void CalcFaceValues(MeshData& m) {
  FaceTable& fc = m.faces;
  const ElementTable& el = m.elements;
  const NodeTable& nd = m.nodes;
  const std::int32_t nf = fc.numFaces;
  try {
    for (auto* v : {&fc.xc, &fc.yc, &fc.zc, &fc.xr, &fc.yr, &fc.length, &fc.area, &fc.nx, &fc.ny,
                    &fc.nz, &fc.distLeft, &fc.distRight})
      AllocateArray(*v, static_cast<std::size_t>(nf) + 1, 0.0);
  } catch (const std::bad_alloc&) {
    throw MeshError("CalcFaceValues: Out of memory");
  }
  const bool wrap = m.IsLongLat();
  const ShapeData* shapes = g_shapes.shapes.data();
#pragma omp parallel for schedule(static)
  for (std::int32_t f = 1; f <= nf; ++f) {
    const std::int32_t start = fc.nodeStart[f];
    const std::int32_t count = fc.nodeStart[f + 1] - start;
    double x[4], y[4], z[4];
    GatherNodes(nd, &fc.nodeList[start], count, wrap, x, y, z);
    const std::int32_t left = fc.left[f], right = fc.right[f];
    const std::int32_t owner = left != 0 ? left : right;
    const ShapeData& s = shapes[el.shape[owner] - 1];
    double mx = 0.0, my = 0.0, mz = 0.0;
    for (std::int32_t k = 0; k < count; ++k) { mx += x[k]; my += y[k]; mz += z[k]; }
    mx /= count; my /= count; mz /= count;
    fc.xc[f] = mx; fc.yc[f] = my; fc.zc[f] = mz;
    if (s.dimension == 2 && count >= 2) {
      const double dx = x[1] - x[0], dy = y[1] - y[0];
      const double len = std::sqrt(dx * dx + dy * dy);
      fc.length[f] = len;
      fc.nx[f] = dy / len;
      fc.ny[f] = -dx / len;
    } else if (s.dimension == 3) {
      const std::int32_t local = left != 0 ? fc.leftLocal[f] : fc.rightLocal[f];
      if (local <= 2 && count >= 3) {
        auto cross = [&](int a, int b, int c, double* out) {
          const double ux = x[b] - x[a], uy = y[b] - y[a], uz = z[b] - z[a];
          const double vx = x[c] - x[a], vy = y[c] - y[a], vz = z[c] - z[a];
          out[0] = uy * vz - uz * vy; out[1] = uz * vx - ux * vz; out[2] = ux * vy - uy * vx;
        };
        double c1[3], c2[3] = {0, 0, 0};
        cross(0, 1, 2, c1);
        const double l1 = std::sqrt(c1[0] * c1[0] + c1[1] * c1[1] + c1[2] * c1[2]);
        double l2 = 0.0;
        if (count == 4) {
          cross(0, 2, 3, c2);
          l2 = std::sqrt(c2[0] * c2[0] + c2[1] * c2[1] + c2[2] * c2[2]);
        }
        fc.area[f] = 0.5 * (l1 + l2);
        if (l1 > 0.0) { fc.nx[f] = c1[0] / l1; fc.ny[f] = c1[1] / l1; fc.nz[f] = c1[2] / l1; }
      } else if (count == 4) {
        const double dx = x[1] - x[0], dy = y[1] - y[0];
        const double len = std::sqrt(dx * dx + dy * dy);
        fc.nx[f] = dy / len;
        fc.ny[f] = -dx / len;
        fc.area[f] = 0.5 * (std::fabs(z[2] - z[1]) + std::fabs(z[3] - z[0])) * len;
      }
    }
    // Centroids seen from the face's longitude.
    auto cx = [&](std::int32_t e) { return wrap ? WrapNear(el.xc[e], x[0]) : el.xc[e]; };
    if (left != 0) fc.distLeft[f] = std::hypot(cx(left) - mx, el.yc[left] - my);
    if (right != 0) fc.distRight[f] = std::hypot(cx(right) - mx, el.yc[right] - my);
    fc.xr[f] = mx;
    fc.yr[f] = my;
    if (s.dimension == 2 && left != 0 && right != 0 && count >= 2) {
      const double ax = x[0] - mx, ay = y[0] - my, bx = x[1] - mx, by = y[1] - my;
      const double px = cx(left) - mx, py = el.yc[left] - my;
      const double qx = cx(right) - mx, qy = el.yc[right] - my;
      const double det = (px - qx) * (ay - by) - (py - qy) * (ax - bx);
      const double c1 = ax * by - ay * bx, c2 = px * qy - py * qx;
      if (det != 0.0) {
        fc.xr[f] = mx + ((ax - bx) * c2 - (px - qx) * c1) / det;
        fc.yr[f] = my + ((ay - by) * c2 - (py - qy) * c1) / det;
      }
    }
  }
}

void CalcNodeValues(MeshData& m) {
  // Node-level values of layered meshes are computed with the layers; 2-D meshes have none.
  CalcElementValues(m);
  CalcFaceValues(m);
}

void CreateElementFaceConnectivity(MeshData& m) {
  ElementTable& el = m.elements;
  const FaceTable& fc = m.faces;
  const std::int32_t ne = el.numElements;
  try {
    AllocateArray(el.faceStart, static_cast<std::size_t>(ne) + 2, 0);
    el.faceStart[1] = 1;
    for (std::int32_t e = 1; e <= ne; ++e)
      el.faceStart[e + 1] = el.faceStart[e] + g_shapes.shapes[el.shape[e] - 1].numFaces;
    AllocateArray(el.faceList, static_cast<std::size_t>(el.faceStart[ne + 1]), 0);
    std::vector<std::int32_t> fill(el.faceStart.begin(), el.faceStart.end());
    for (std::int32_t f = 1; f <= fc.numFaces; ++f) {
      el.faceList[fill[fc.left[f]]++] = f;
      if (fc.right[f] != 0) el.faceList[fill[fc.right[f]]++] = f;
    }
    // Lists of elements that lost faces (boundary-only face tables) end at their fill mark.
    for (std::int32_t e = 1; e <= ne; ++e) {
      const ShapeData& s = g_shapes.shapes[el.shape[e] - 1];
      if (s.dimension != 2 || s.kind != 2 || fill[e] != el.faceStart[e + 1]) continue;
      std::int32_t ordered[4];
      for (std::int32_t k = 0; k < 4; ++k) {
        const std::int32_t f = el.faceList[el.faceStart[e] + k];
        const std::int32_t local = fc.left[f] == e ? fc.leftLocal[f] : fc.rightLocal[f];
        ordered[local - 1] = f;
      }
      std::copy(ordered, ordered + 4, &el.faceList[el.faceStart[e]]);
    }
  } catch (const std::bad_alloc&) {
    throw MeshError("CreateElementFaceConnectivity: Out of memory");
  }
}

bool SetupMeshSection(MeshData& m) {
  const NodeTable& nd = m.nodes;
  const ElementTable& el = m.elements;
  const FaceTable& fc = m.faces;
  m.sections.clear();
  // Codes present among the internal nodes.
  std::map<std::int32_t, std::int32_t> nodesPerCode;
  for (std::int32_t n = 1; n <= nd.numInternal; ++n) ++nodesPerCode[nd.code[n]];
  // One pass over the faces: the code each face qualifies for (0: none).
  std::vector<std::int32_t> faceCode;
  try {
    AllocateArray(faceCode, static_cast<std::size_t>(fc.numFaces) + 1, 0);
  } catch (const std::bad_alloc&) {
    throw MeshError("SetupMeshSection: Out of memory");
  }
  std::map<std::int32_t, std::int32_t> facesPerCode;
  for (std::int32_t f = 1; f <= fc.numFaces; ++f) {
    if (fc.NumNodes(f) < 2) continue;
    const std::int32_t l = fc.left[f], r = fc.right[f];
    const std::int32_t c1 = nd.code[fc.Node(f, 1)], c2 = nd.code[fc.Node(f, 2)];
    const bool posL = l != 0 && el.id[l] > 0, posR = r != 0 && el.id[r] > 0;
    std::int32_t code = 0;
    if (posL != posR && std::min(c1, c2) < 2) code = 1;
    else if (l != 0 && r == 0 && c2 >= 2 && c1 > 1) code = c2;
    else if (l != 0 && r != 0 && c1 < 0 && c1 == c2) code = c1;
    if (code != 0 && nodesPerCode.count(code) != 0) {
      faceCode[f] = code;
      ++facesPerCode[code];
    }
  }
  std::map<std::int32_t, std::size_t> sectionOfCode;
  for (const auto& [code, faces] : facesPerCode) {
    MeshSection s;
    s.number = static_cast<std::int32_t>(m.sections.size() + 1);
    s.code = code;
    s.faces.reserve(static_cast<std::size_t>(faces));
    sectionOfCode[code] = m.sections.size();
    m.sections.push_back(std::move(s));
  }
  for (std::int32_t f = 1; f <= fc.numFaces; ++f)
    if (faceCode[f] != 0) m.sections[sectionOfCode[faceCode[f]]].faces.push_back(f);
  // Points: the distinct nodes of each section's faces, in face order.
  std::vector<std::int32_t> seen(static_cast<std::size_t>(nd.numNodes) + 1, 0);
  for (MeshSection& s : m.sections)
    for (const std::int32_t f : s.faces)
      for (std::int32_t k = 1; k <= fc.NumNodes(f); ++k) {
        const std::int32_t node = fc.Node(f, k);
        if (seen[node] != s.number) {
          seen[node] = s.number;
          s.nodes.push_back(node);
        }
      }
  for (const MeshSection& s : m.sections)
    if (s.faces.empty()) throw MeshError("SetupSection2D: Number of faces is zero in section");
  m.hasSections = true;
  return !m.sections.empty();
}

void SetupMeshGeometry(MeshData& m, std::vector<std::string>& warnings) {
  SetupShapeData(m);
  m.dimension = GetMeshDimension(m);
  CreateNodeElementConnectivity(m);
  if (m.faces.numFaces == 0) CalcFaces(m, 2);
  if (!m.hasSections && !SetupMeshSection(m))
    warnings.push_back("SetupMeshSection: No boundary specified");
  CalcNodeValues(m);
  CreateElementFaceConnectivity(m);
}

std::string MeshLogLine(const std::string& label, const std::string& value) {
  std::string s = "  " + label;
  if (s.size() < 29) s.resize(29, ' ');
  return s + ": " + value;
}

namespace {

std::string Right(const std::string& text, std::size_t width) {
  return text.size() >= width ? text : std::string(width - text.size(), ' ') + text;
}

}  // namespace

std::vector<std::string> MeshInformationLines(const MeshData& m, bool subdomain) {
  std::vector<std::string> out;
  const char* dim = m.dimension == 3 ? "3D" : "2D";
  out.push_back(subdomain ? std::string("Mesh information - ") + dim + " (subdomain)"
                          : "Mesh information");
  out.push_back(MeshLogLine("Number of elements", Str(m.elements.numElements)));
  out.push_back(MeshLogLine("Number of elements (int.)", Str(m.elements.numInternal)));
  out.push_back(MeshLogLine("Number of faces", Str(m.faces.numFaces)));
  out.push_back(MeshLogLine("Number of faces (int.)", Str(m.faces.numInternal)));
  out.push_back(MeshLogLine("Number of nodes", Str(m.nodes.numNodes)));
  out.push_back(MeshLogLine("Number of nodes (int.)", Str(m.nodes.numInternal)));
  out.push_back(MeshLogLine("Number of sections", Str(static_cast<std::int64_t>(m.sections.size()))));
  double xmin = 0, xmax = 0, ymin = 0, ymax = 0, zmin = 0, zmax = 0;
  for (std::int32_t n = 1; n <= m.nodes.numNodes; ++n) {
    const double x = m.nodes.x[n], y = m.nodes.y[n], z = m.nodes.z[n];
    if (n == 1) { xmin = xmax = x; ymin = ymax = y; zmin = zmax = z; continue; }
    xmin = std::min(xmin, x); xmax = std::max(xmax, x);
    ymin = std::min(ymin, y); ymax = std::max(ymax, y);
    zmin = std::min(zmin, z); zmax = std::max(zmax, z);
  }
  const bool geo = m.IsLongLat();
  const double f = geo ? kRadiansToDegrees : 1.0;
  const std::string unit = geo ? " (degree)" : " (m)";
  out.push_back(MeshLogLine("Min x-coordinate" + unit, FormatNumber(xmin * f)));
  out.push_back(MeshLogLine("Max x-coordinate" + unit, FormatNumber(xmax * f)));
  out.push_back(MeshLogLine("Min y-coordinate" + unit, FormatNumber(ymin * f)));
  out.push_back(MeshLogLine("Max y-coordinate" + unit, FormatNumber(ymax * f)));
  out.push_back(MeshLogLine("Min z-coordinate (m)", FormatNumber(zmin)));
  out.push_back(MeshLogLine("Max z-coordinate (m)", FormatNumber(zmax)));
  out.push_back("");
  out.push_back(subdomain ? std::string("Boundary information - ") + dim + " (subdomain)"
                          : "Boundary information");
  out.push_back(std::string("  number                code") + "    number of points" +
                "     number of faces");
  for (const MeshSection& s : m.sections)
    out.push_back(Right(Str(s.number), 8) + Right(Str(s.code), 20) + Right(Str(s.NumPoints()), 20) +
                  Right(Str(s.NumFaces()), 20));
  return out;
}

std::vector<std::string> ShapeDataLines(std::int32_t shapeId) {
  if (shapeId < 1 || shapeId > static_cast<std::int32_t>(g_shapes.shapes.size()))
    throw MeshError("PrintShapeData: Wrong shape id");
  const ShapeData& s = g_shapes.shapes[shapeId - 1];
  return {"id = " + Str(shapeId),
          MeshLogLine("Dimensions", Str(s.dimension)),
          MeshLogLine("Type of element", Str(s.kind)),
          MeshLogLine("Type of function", Str(s.function)),
          MeshLogLine("Number of nodes", Str(s.numNodes)),
          MeshLogLine("Number of edges", Str(s.numEdges)),
          MeshLogLine("Number of edge nodes", Str(s.nodesPerEdge)),
          MeshLogLine("Number of faces", Str(s.numFaces)),
          MeshLogLine("Number of faces nodes", Str(s.nodesPerFace))};
}
