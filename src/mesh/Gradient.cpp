#include "mesh/Gradient.h"

#include <algorithm>
#include <limits>
#include <new>
#include <string>

#include "driver/Termination.h"
#include "mesh/Interpolation.h"
#include "platform/Memory.h"

namespace {

constexpr int kMaxStencil = 16;
constexpr int kMaxFirstRing = 4;
// A plane or normal-matrix determinant this small against the size of its terms is singular.
constexpr double kSingular = 1e-10;

// Plain minimum and maximum: std::fmin/fmax are library calls without fast-math.
inline double Min(double a, double b) { return b < a ? b : a; }
inline double Max(double a, double b) { return b > a ? b : a; }

inline bool Active(const std::int32_t* flags, std::int32_t i) {
  return flags == nullptr || flags[i] > 0;
}

inline std::int32_t Across(const std::int32_t* left, const std::int32_t* right, std::int32_t f,
                           std::int32_t e) {
  return left[f] == e ? right[f] : left[f];
}

// Raw views of the mesh arrays the kernels read.
struct View {
  std::int32_t ne = 0;
  const std::int32_t *faceStart, *faceList, *left, *right;
  const double *xc, *yc, *area, *fx, *fy, *nx, *ny, *len;
  const std::int32_t *faceNodeStart, *faceNodeList;
  bool wrap;
  explicit View(const MeshData& m)
      : ne(m.elements.numElements),
        faceStart(m.elements.faceStart.data()), faceList(m.elements.faceList.data()),
        left(m.faces.left.data()), right(m.faces.right.data()),
        xc(m.elements.xc.data()), yc(m.elements.yc.data()), area(m.elements.area.data()),
        fx(m.faces.xc.data()), fy(m.faces.yc.data()), nx(m.faces.nx.data()),
        ny(m.faces.ny.data()), len(m.faces.length.data()),
        faceNodeStart(m.faces.nodeStart.data()), faceNodeList(m.faces.nodeList.data()),
        wrap(m.IsLongLat()) {}
  // x of a point seen from element e's centroid (longitudes wrapped next to it).
  double Dx(double x, std::int32_t e) const {
    return (wrap ? WrapNear(x, xc[e]) : x) - xc[e];
  }
};

// Raw views of a kept stencil's arrays.
struct StencilView {
  const std::int32_t *start, *elem, *face, *subs;
  const double *wx, *wy;
  explicit StencilView(const GradientStencil& st)
      : start(st.start.data()), elem(st.element.data()), face(st.face.data()),
        subs(st.numSubstitutes.data()), wx(st.wx.data()), wy(st.wy.data()) {}
};

// Weights of the plane through 3 points or of the diagonal formula through 4 (points relative
// to the element centroid). False when the points are collinear or degenerate.
bool PlaneWeights(int n, const double* x, const double* y, double* wx, double* wy) {
  if (n == 3) {
    const double d = x[0] * (y[1] - y[2]) + x[1] * (y[2] - y[0]) + x[2] * (y[0] - y[1]);
    double scale = 0.0;
    for (int i = 0; i < 3; ++i) {
      const int j = (i + 1) % 3;
      scale += (x[j] - x[i]) * (x[j] - x[i]) + (y[j] - y[i]) * (y[j] - y[i]);
    }
    if (!(std::fabs(d) > kSingular * scale)) return false;
    const double r = 1.0 / d;
    wx[0] = (y[1] - y[2]) * r; wx[1] = (y[2] - y[0]) * r; wx[2] = (y[0] - y[1]) * r;
    wy[0] = (x[2] - x[1]) * r; wy[1] = (x[0] - x[2]) * r; wy[2] = (x[1] - x[0]) * r;
    return true;
  }
  if (n == 4) {
    const double ax = x[2] - x[0], ay = y[2] - y[0], bx = x[3] - x[1], by = y[3] - y[1];
    const double e = ay * bx - ax * by;
    if (!(std::fabs(e) > kSingular * std::hypot(ax, ay) * std::hypot(bx, by))) return false;
    const double r = 1.0 / e;
    wx[0] = by * r; wx[1] = -ay * r; wx[2] = -by * r; wx[3] = ay * r;
    wy[0] = -bx * r; wy[1] = ax * r; wy[2] = bx * r; wy[3] = -ax * r;
    return true;
  }
  return false;
}

// Inverse-distance-squared weighted least squares over n points relative to the centroid.
bool LeastSquaresWeights(int n, const double* x, const double* y, double* wx, double* wy) {
  double a = 0.0, b = 0.0, c = 0.0;
  for (int k = 0; k < n; ++k) {
    const double d2 = x[k] * x[k] + y[k] * y[k];
    if (!(d2 > 0.0)) return false;
    const double w = 1.0 / d2;
    a += w * x[k] * x[k];
    b += w * x[k] * y[k];
    c += w * y[k] * y[k];
  }
  const double det = a * c - b * b;
  if (!(det > kSingular * a * c)) return false;
  const double r = 1.0 / det;
  for (int k = 0; k < n; ++k) {
    const double w = r / (x[k] * x[k] + y[k] * y[k]);
    wx[k] = w * (c * x[k] - b * y[k]);
    wy[k] = w * (a * y[k] - b * x[k]);
  }
  return true;
}

// Boundary substitute point of element e at face f (relative to e's centroid).
inline void SubstitutePoint(const View& v, std::int32_t mode, std::int32_t e, std::int32_t f,
                            double& px, double& py) {
  const double xf = v.Dx(v.fx[f], e), yf = v.fy[f] - v.yc[e];
  if (mode == 2) {
    // The centroid (origin here) mirrored across the face line through f with normal n.
    const double n1 = v.nx[f], n2 = v.ny[f];
    const double t = ((-xf) * (-n2) + (-yf) * n1) / (n1 * n1 + n2 * n2);
    px = 2.0 * (-n2 * t + xf);
    py = 2.0 * (n1 * t + yf);
  } else {
    px = xf;
    py = yf;
  }
}

// Stencil points of element e from the geometry alone (every element and face taken as
// active). Returns the number of entries.
int GatherStencil(const View& v, std::int32_t type, std::int32_t mode, std::int32_t e,
                  std::int32_t* elem, std::int32_t* face, double* px, double* py,
                  std::int32_t& numSubs) {
  int n = 0;
  numSubs = 0;
  const std::int32_t f0 = v.faceStart[e], f1 = std::min(v.faceStart[e + 1], f0 + kMaxFirstRing);
  for (std::int32_t j = f0; j < f1; ++j) {
    const std::int32_t f = v.faceList[j];
    const std::int32_t other = Across(v.left, v.right, f, e);
    elem[n] = other;
    face[n] = f;
    if (other != 0) {
      px[n] = v.Dx(v.xc[other], e);
      py[n] = v.yc[other] - v.yc[e];
    } else {
      SubstitutePoint(v, mode, e, f, px[n], py[n]);
      ++numSubs;
    }
    ++n;
  }
  if (type != 3) return n;
  const int ring = n;
  for (int k = 0; k < ring && n < kMaxStencil; ++k) {
    const std::int32_t nb = elem[k];
    if (nb == 0) continue;
    for (std::int32_t j = v.faceStart[nb]; j < v.faceStart[nb + 1] && n < kMaxStencil; ++j) {
      const std::int32_t g = v.faceList[j];
      if (g == face[k]) continue;
      const std::int32_t other = Across(v.left, v.right, g, nb);
      if (other == 0 || other == e) continue;
      bool seen = false;
      for (int i = 0; i < n && !seen; ++i) seen = elem[i] == other;
      if (seen) continue;
      elem[n] = other;
      face[n] = -g;
      px[n] = v.Dx(v.xc[other], e);
      py[n] = v.yc[other] - v.yc[e];
      ++n;
    }
  }
  return n;
}

// Weights of a gathered stencil; false (zero gradient) when singular or, for type 1, when it
// has more substitutes than the plane can take.
bool StencilWeights(std::int32_t type, int n, std::int32_t numSubs, const double* px,
                    const double* py, double* wx, double* wy, bool& singular) {
  singular = false;
  if (type == 1) {
    if ((n != 3 && n != 4) || numSubs > n - 2) return false;
    singular = !PlaneWeights(n, px, py, wx, wy);
  } else {
    singular = n == 0 || !LeastSquaresWeights(n, px, py, wx, wy);
  }
  return !singular;
}

// Barth-Jespersen factor from the differences to the active face neighbours and their faces
// (collected by the gradient pass).
inline double BarthJespersenFromNeighbours(const View& v, std::int32_t e, std::int32_t numNb,
                                           const double* delta, const std::int32_t* faces,
                                           double gx, double gy) {
  double dmax = 0.0, dmin = 0.0;
  for (std::int32_t k = 0; k < numNb; ++k) {
    dmax = Max(dmax, delta[k]);
    dmin = Min(dmin, delta[k]);
  }
  double alpha = 1.0;
  for (std::int32_t k = 0; k < numNb; ++k) {
    const std::int32_t f = faces[k];
    const double d = gx * v.Dx(v.fx[f], e) + gy * (v.fy[f] - v.yc[e]);
    if (d > 1e-16) alpha = Min(alpha, Min(1.0, dmax / d));
    else if (d < -1e-16) alpha = Min(alpha, Min(1.0, dmin / d));
  }
  return alpha;
}

// Barth-Jespersen factor of element e for the gradient (gx, gy) of phi, walking its faces.
inline double BarthJespersenFactor(const View& v, const std::int32_t* ae, const std::int32_t* af,
                                   const double* phi, std::int32_t e, double gx, double gy) {
  double delta[kMaxFirstRing];
  std::int32_t faces[kMaxFirstRing], numNb = 0;
  const std::int32_t j1 = std::min(v.faceStart[e + 1], v.faceStart[e] + kMaxFirstRing);
  for (std::int32_t j = v.faceStart[e]; j < j1; ++j) {
    const std::int32_t f = v.faceList[j];
    const std::int32_t n = Across(v.left, v.right, f, e);
    if (n == 0 || !Active(ae, n) || !Active(af, f)) continue;
    delta[numNb] = phi[n] - phi[e];
    faces[numNb++] = f;
  }
  return BarthJespersenFromNeighbours(v, e, numNb, delta, faces, gx, gy);
}

void ReportSingular(std::int64_t count, const char* where) {
  Warning(std::string(where) + ": " + std::to_string(count) +
          " elements have a singular gradient stencil (collinear or coincident points); their "
          "gradients are set to zero");
}

void EnsureWorkspace(const MeshData& mesh, GradientWorkspace& work) {
  if (work.gx1.size() < static_cast<std::size_t>(mesh.elements.numElements) + 1 ||
      work.node1.size() < static_cast<std::size_t>(mesh.nodes.numNodes) + 1)
    SetupGradientWorkspace(mesh, work);
}

}  // namespace

void SetupBoundaryGradient2D(const MeshData& mesh, GradientStencil& st) {
  const View v(mesh);
  const std::int32_t nf = mesh.faces.numFaces;
  try {
    AllocateArray(st.xMirror, static_cast<std::size_t>(nf) + 1, 0.0);
    AllocateArray(st.yMirror, static_cast<std::size_t>(nf) + 1, 0.0);
  } catch (const std::bad_alloc&) {
    throw MeshError("SetupBoundaryGradient2D: Can't allocate memory");
  }
#pragma omp parallel for schedule(static)
  for (std::int32_t f = 1; f <= nf; ++f) {
    const std::int32_t e = v.left[f] != 0 ? v.left[f] : v.right[f];
    if (v.right[f] != 0 || e == 0) continue;
    double px, py;
    SubstitutePoint(v, 2, e, f, px, py);
    st.xMirror[f] = v.xc[e] + px;
    st.yMirror[f] = v.yc[e] + py;
  }
}

const GradientStencil& SetupGradient(MeshData& mesh, std::int32_t type,
                                     std::int32_t boundaryMode) {
  for (const auto& s : mesh.stencils)
    if (s->type == type && s->boundaryMode == boundaryMode) return *s;
  if (type < 1 || type > 3) throw MeshError("SetupGradient: Gradient type not supported");
  if (boundaryMode != 1 && boundaryMode != 2)
    throw MeshError("SetupGradient: Boundary mode not supported (" +
                    std::to_string(boundaryMode) + ")");
  const View v(mesh);
  const std::int32_t ne = v.ne;
  auto st = std::make_shared<GradientStencil>();
  st->type = type;
  st->boundaryMode = boundaryMode;
  st->numElements = ne;
  if (boundaryMode == 2) SetupBoundaryGradient2D(mesh, *st);
  try {
    AllocateArray(st->start, static_cast<std::size_t>(ne) + 2, 0);
    AllocateArray(st->numSubstitutes, static_cast<std::size_t>(ne) + 1, 0);
  } catch (const std::bad_alloc&) {
    throw MeshError("SetupGradient: Cannot allocate memory");
  }
  // Pass 1: entry counts; pass 2: entries and weights into their rows.
  std::int32_t* start = st->start.data();
#pragma omp parallel for schedule(static)
  for (std::int32_t e = 1; e <= ne; ++e) {
    std::int32_t elem[kMaxStencil], face[kMaxStencil], subs;
    double px[kMaxStencil], py[kMaxStencil];
    start[e + 1] = GatherStencil(v, type, boundaryMode, e, elem, face, px, py, subs);
  }
  start[1] = 0;
  for (std::int32_t e = 1; e <= ne; ++e) start[e + 1] += start[e];
  const std::size_t entries = static_cast<std::size_t>(start[ne + 1]);
  try {
    AllocateArray(st->element, entries, 0);
    AllocateArray(st->face, entries, 0);
    AllocateArray(st->wx, entries, 0.0);
    AllocateArray(st->wy, entries, 0.0);
  } catch (const std::bad_alloc&) {
    throw MeshError("SetupGradient: Cannot allocate memory");
  }
  std::int64_t singular = 0;
#pragma omp parallel for schedule(static) reduction(+ : singular)
  for (std::int32_t e = 1; e <= ne; ++e) {
    const std::int32_t at = start[e];
    double px[kMaxStencil], py[kMaxStencil];
    std::int32_t subs;
    const int n = GatherStencil(v, type, boundaryMode, e, &st->element[at], &st->face[at], px, py,
                                subs);
    st->numSubstitutes[e] = subs;
    bool isSingular;
    if (!StencilWeights(type, n, subs, px, py, &st->wx[at], &st->wy[at], isSingular)) {
      std::fill_n(&st->wx[at], n, 0.0);
      std::fill_n(&st->wy[at], n, 0.0);
      if (isSingular) ++singular;
    }
  }
  st->numSingular = singular;
  if (singular > 0) ReportSingular(singular, "SetupGradient");
  mesh.stencils.push_back(st);
  return *st;
}

void SetupGradientWorkspace(const MeshData& mesh, GradientWorkspace& work) {
  const std::size_t ne = static_cast<std::size_t>(mesh.elements.numElements) + 1;
  const std::size_t nn = static_cast<std::size_t>(mesh.nodes.numNodes) + 1;
  try {
    for (auto* a : {&work.gx1, &work.gy1, &work.gx2, &work.gy2}) AllocateArray(*a, ne, 0.0);
    for (auto* a : {&work.node1, &work.node2}) AllocateArray(*a, nn, 0.0);
  } catch (const std::bad_alloc&) {
    throw MeshError("SetupGradient: Can't allocate memory");
  }
}

void CalcGradientStencil2D(const MeshData& mesh, const GradientStencil& st,
                           const std::int32_t* ae, const std::int32_t* af, const double* phi,
                           double* gx, double* gy, bool limitBJ) {
  const View v(mesh);
  const StencilView sv(st);
  const std::int32_t *start = sv.start, *elem = sv.elem, *face = sv.face, *subs = sv.subs;
  const double *wx = sv.wx, *wy = sv.wy;
  const bool plane = st.type == 1;
#pragma omp parallel for schedule(static)
  for (std::int32_t e = 1; e <= v.ne; ++e) {
    if (!Active(ae, e)) {
      gx[e] = 0.0;
      gy[e] = 0.0;
      continue;
    }
    const double pe = phi[e];
    double sx = 0.0, sy = 0.0;
    std::int32_t dynamic = 0;
    // The active face neighbours met on the way (the first-ring entries), for the limiter.
    double nbDelta[kMaxFirstRing];
    std::int32_t nbFace[kMaxFirstRing], numNb = 0;
    const std::int32_t j1 = start[e + 1];
    for (std::int32_t j = start[e]; j < j1; ++j) {
      const std::int32_t n = elem[j];
      if (n == 0) continue;  // boundary substitute: the element's own value
      const std::int32_t f = face[j] < 0 ? -face[j] : face[j];
      if (!Active(ae, n) || !Active(af, f)) {
        dynamic += face[j] > 0;
        continue;
      }
      const double d = phi[n] - pe;
      sx += wx[j] * d;
      sy += wy[j] * d;
      if (face[j] > 0 && numNb < kMaxFirstRing) {
        nbDelta[numNb] = d;
        nbFace[numNb++] = f;
      }
    }
    if (plane && dynamic > 0 && subs[e] + dynamic > j1 - start[e] - 2) sx = sy = 0.0;
    if (limitBJ) {
      const double alpha = BarthJespersenFromNeighbours(v, e, numNb, nbDelta, nbFace, sx, sy);
      sx *= alpha;
      sy *= alpha;
    }
    gx[e] = sx;
    gy[e] = sy;
  }
}

namespace {

// Velocity gradients through a kept stencil, with the substitutes of the boundary faces and of
// inactive neighbours.
void CalcVelocityStencil2D(const MeshData& mesh, const GradientStencil& st,
                           const std::int32_t* ae, const std::int32_t* af,
                           const std::int32_t* btype, const double* u, const double* w,
                           double* ux, double* uy, double* vx, double* vy, bool limitBJ) {
  const View v(mesh);
  const StencilView sv(st);
  const std::int32_t *start = sv.start, *elem = sv.elem, *face = sv.face, *subs = sv.subs;
  const double *wx = sv.wx, *wy = sv.wy;
  const std::int32_t mode = st.boundaryMode;
  const bool plane = st.type == 1;
#pragma omp parallel for schedule(static)
  for (std::int32_t e = 1; e <= v.ne; ++e) {
    if (!Active(ae, e)) {
      ux[e] = uy[e] = vx[e] = vy[e] = 0.0;
      continue;
    }
    const double ue = u[e], ve = w[e];
    double sux = 0.0, suy = 0.0, svx = 0.0, svy = 0.0;
    std::int32_t dynamic = 0;
    double nbU[kMaxFirstRing], nbV[kMaxFirstRing];
    std::int32_t nbFace[kMaxFirstRing], numNb = 0;
    const std::int32_t j1 = start[e + 1];
    for (std::int32_t j = start[e]; j < j1; ++j) {
      const std::int32_t n = elem[j];
      const std::int32_t f = face[j] < 0 ? -face[j] : face[j];
      double du, dv;
      if (n != 0 && Active(ae, n) && Active(af, f)) {
        du = u[n] - ue;
        dv = w[n] - ve;
        if (face[j] > 0 && numNb < kMaxFirstRing) {
          nbU[numNb] = du;
          nbV[numNb] = dv;
          nbFace[numNb++] = f;
        }
      } else if (face[j] < 0) {
        continue;
      } else {
        dynamic += n != 0;
        double us, vs;
        VelocitySubstitute(mode, btype != nullptr ? btype[f] : 0, v.nx[f], v.ny[f], ue, ve, us,
                           vs);
        du = us - ue;
        dv = vs - ve;
      }
      sux += wx[j] * du; suy += wy[j] * du;
      svx += wx[j] * dv; svy += wy[j] * dv;
    }
    if (plane && dynamic > 0 && subs[e] + dynamic > j1 - start[e] - 2)
      sux = suy = svx = svy = 0.0;
    if (limitBJ) {
      const double au = BarthJespersenFromNeighbours(v, e, numNb, nbU, nbFace, sux, suy);
      const double av = BarthJespersenFromNeighbours(v, e, numNb, nbV, nbFace, svx, svy);
      sux *= au; suy *= au;
      svx *= av; svy *= av;
    }
    ux[e] = sux; uy[e] = suy; vx[e] = svx; vy[e] = svy;
  }
}

// Element-values method for one or two quantities (two: velocity with substitutes).
std::int64_t ElementValues2D(const MeshData& mesh, std::int32_t mode, const std::int32_t* ae,
                             const std::int32_t* af, const std::int32_t* btype, const double* p,
                             const double* q, double* px_, double* py_, double* qx_,
                             double* qy_) {
  const View v(mesh);
  std::int64_t singular = 0;
#pragma omp parallel for schedule(static) reduction(+ : singular)
  for (std::int32_t e = 1; e <= v.ne; ++e) {
    double gpx = 0.0, gpy = 0.0, gqx = 0.0, gqy = 0.0;
    const std::int32_t j0 = v.faceStart[e];
    const int n = v.faceStart[e + 1] - j0;
    if (Active(ae, e) && (n == 3 || n == 4)) {
      double x[4], y[4], dp[4], dq[4], wx[4], wy[4];
      int subs = 0;
      const double pe = p[e], qe = q != nullptr ? q[e] : 0.0;
      for (int k = 0; k < n; ++k) {
        const std::int32_t f = v.faceList[j0 + k];
        const std::int32_t other = Across(v.left, v.right, f, e);
        if (other != 0 && Active(ae, other) && Active(af, f)) {
          x[k] = v.Dx(v.xc[other], e);
          y[k] = v.yc[other] - v.yc[e];
          dp[k] = p[other] - pe;
          dq[k] = q != nullptr ? q[other] - qe : 0.0;
        } else {
          SubstitutePoint(v, mode, e, f, x[k], y[k]);
          ++subs;
          dp[k] = dq[k] = 0.0;
          if (q != nullptr) {
            double us, vs;
            VelocitySubstitute(mode, btype != nullptr ? btype[f] : 0, v.nx[f], v.ny[f], pe, qe,
                               us, vs);
            dp[k] = us - pe;
            dq[k] = vs - qe;
          }
        }
      }
      if (subs <= n - 2) {
        if (PlaneWeights(n, x, y, wx, wy)) {
          for (int k = 0; k < n; ++k) {
            gpx += wx[k] * dp[k]; gpy += wy[k] * dp[k];
            gqx += wx[k] * dq[k]; gqy += wy[k] * dq[k];
          }
        } else {
          ++singular;
        }
      }
    }
    px_[e] = gpx; py_[e] = gpy;
    if (q != nullptr) { qx_[e] = gqx; qy_[e] = gqy; }
  }
  return singular;
}

}  // namespace

std::int64_t CalcGradientElementValues2D(const MeshData& mesh, std::int32_t boundaryMode,
                                         const std::int32_t* ae, const std::int32_t* af,
                                         const double* phi, double* gx, double* gy) {
  return ElementValues2D(mesh, boundaryMode, ae, af, nullptr, phi, nullptr, gx, gy, nullptr,
                         nullptr);
}

void CalcGradientGreenGauss2D(const MeshData& mesh, const std::int32_t* ae,
                              const double* nodeValues, double* gx, double* gy) {
  const View v(mesh);
#pragma omp parallel for schedule(static)
  for (std::int32_t e = 1; e <= v.ne; ++e) {
    double sx = 0.0, sy = 0.0;
    if (Active(ae, e) && v.area[e] > 0.0) {
      for (std::int32_t j = v.faceStart[e]; j < v.faceStart[e + 1]; ++j) {
        const std::int32_t f = v.faceList[j];
        const std::int32_t a = v.faceNodeList[v.faceNodeStart[f]];
        const std::int32_t b = v.faceNodeList[v.faceNodeStart[f] + 1];
        const double s = (v.left[f] == e ? 0.5 : -0.5) * (nodeValues[a] + nodeValues[b]) * v.len[f];
        sx += s * v.nx[f];
        sy += s * v.ny[f];
      }
      sx /= v.area[e];
      sy /= v.area[e];
    }
    gx[e] = sx;
    gy[e] = sy;
  }
}

void LimitGradientENO2D(const MeshData& mesh, const std::int32_t* ae, const std::int32_t* af,
                        const double* gxIn, const double* gyIn, double* gxOut, double* gyOut) {
  const View v(mesh);
#pragma omp parallel for schedule(static)
  for (std::int32_t e = 1; e <= v.ne; ++e) {
    std::int32_t best = e;
    if (Active(ae, e)) {
      double bestSize = gxIn[e] * gxIn[e] + gyIn[e] * gyIn[e];
      for (std::int32_t j = v.faceStart[e]; j < v.faceStart[e + 1]; ++j) {
        const std::int32_t f = v.faceList[j];
        const std::int32_t n = Across(v.left, v.right, f, e);
        if (n == 0 || !Active(ae, n) || !Active(af, f)) continue;
        const double size = gxIn[n] * gxIn[n] + gyIn[n] * gyIn[n];
        if (size < bestSize) {
          bestSize = size;
          best = n;
        }
      }
    }
    gxOut[e] = gxIn[best];
    gyOut[e] = gyIn[best];
  }
}

void LimitGradientWeighted2D(const MeshData& mesh, const std::int32_t* ae, const double* gxIn,
                             const double* gyIn, double* gxOut, double* gyOut) {
  if (mesh.dimension == 3) throw MeshError("Simple limiter not implemented in 3D");
  const View v(mesh);
#pragma omp parallel for schedule(static)
  for (std::int32_t e = 1; e <= v.ne; ++e) {
    if (!Active(ae, e)) {
      gxOut[e] = gxIn[e];
      gyOut[e] = gyIn[e];
      continue;
    }
    double g[3] = {0.0, 0.0, 0.0}, cx[3], cy[3];
    const std::int32_t j0 = v.faceStart[e];
    for (int k = 0; k < 3; ++k) {
      const std::int32_t n =
          j0 + k < v.faceStart[e + 1] ? Across(v.left, v.right, v.faceList[j0 + k], e) : 0;
      const std::int32_t c = n != 0 ? n : e;
      cx[k] = gxIn[c];
      cy[k] = gyIn[c];
      if (n != 0) g[k] = 0.5 * (cx[k] * cx[k] + cy[k] * cy[k]);
    }
    const double s = g[0] * g[0] + g[1] * g[1] + g[2] * g[2] + 0.0003;
    const double w1 = g[1] * g[2] + 0.0001, w2 = g[0] * g[2] + 0.0001, w3 = g[0] * g[1] + 0.0001;
    gxOut[e] = (w1 * cx[0] + w2 * cx[1] + w3 * cx[2]) / s;
    gyOut[e] = (w1 * cy[0] + w2 * cy[1] + w3 * cy[2]) / s;
  }
}

void LimitGradientBarthJespersen2D(const MeshData& mesh, const std::int32_t* ae,
                                   const std::int32_t* af, const double* phi, double* gx,
                                   double* gy) {
  const View v(mesh);
#pragma omp parallel for schedule(static)
  for (std::int32_t e = 1; e <= v.ne; ++e) {
    if (!Active(ae, e)) continue;
    const double alpha = BarthJespersenFactor(v, ae, af, phi, e, gx[e], gy[e]);
    gx[e] *= alpha;
    gy[e] *= alpha;
  }
}

namespace {

void CheckDriverCodes(const char* driver, std::int32_t method, std::int32_t boundaryMode) {
  if (method < 1 || method > 6)
    throw MeshError(std::string(driver) + ": Gradient method not supported (" +
                    std::to_string(method) + ")");
  if (boundaryMode != 1 && boundaryMode != 2)
    throw MeshError(std::string(driver) + ": Boundary mode not supported (" +
                    std::to_string(boundaryMode) + ")");
}

void Limit(const MeshData& mesh, std::int32_t limiter, const std::int32_t* ae,
           const std::int32_t* af, const double* phi, const double* rawX, const double* rawY,
           double* gx, double* gy, bool fused) {
  if (limiter == kLimiterENO)
    LimitGradientENO2D(mesh, ae, af, rawX, rawY, gx, gy);
  else if (limiter == kLimiterWeighted)
    LimitGradientWeighted2D(mesh, ae, rawX, rawY, gx, gy);
  else if (limiter == kLimiterBarthJespersen && !fused)
    LimitGradientBarthJespersen2D(mesh, ae, af, phi, gx, gy);
}

void NoteSingular(GradientWorkspace& work, std::int64_t count) {
  work.numSingular = count;
  if (count > 0 && !work.singularReported) {
    work.singularReported = true;
    ReportSingular(count, "Element-values gradient");
  }
}

// Checks shared by the drivers; sizes the work arrays on first use. Returns whether the
// unlimited gradients go to the work arrays (ENO and weighted write separate outputs).
bool PrepareDriver(const char* driver, const MeshData& mesh, std::int32_t method,
                   std::int32_t limiter, std::int32_t boundaryMode, GradientWorkspace& work) {
  CheckDriverCodes(driver, method, boundaryMode);
  if (limiter == kLimiterWeighted && mesh.dimension == 3)
    throw MeshError("Simple limiter not implemented in 3D");
  EnsureWorkspace(mesh, work);
  return limiter == kLimiterENO || limiter == kLimiterWeighted;
}

}  // namespace

void CalcGradientScalar2D(MeshData& mesh, std::int32_t method, std::int32_t limiter,
                          std::int32_t boundaryMode, const std::int32_t* ae,
                          const std::int32_t* af, const double* phi, double* gx, double* gy,
                          GradientWorkspace& work) {
  const bool separate = PrepareDriver("CalcGradientScalar2D", mesh, method, limiter, boundaryMode, work);
  double* rx = separate ? work.gx1.data() : gx;
  double* ry = separate ? work.gy1.data() : gy;
  bool fused = false;
  if (method == kGradientElementValues) {
    NoteSingular(work, CalcGradientElementValues2D(mesh, boundaryMode, ae, af, phi, rx, ry));
  } else if (method == kGradientNodeValues || method == kGradientNodeValuesAlt) {
    if (ae != nullptr)
      CalcNodeValuesWetPL2D(mesh, phi, ae, work.node1.data());
    else
      CalcNodeValuesPL2D(mesh, phi, std::numeric_limits<double>::quiet_NaN(), 0,
                         work.node1.data());
    CalcGradientGreenGauss2D(mesh, ae, work.node1.data(), rx, ry);
  } else {
    const GradientStencil& st = SetupGradient(mesh, method - 2, boundaryMode);
    fused = limiter == kLimiterBarthJespersen;
    CalcGradientStencil2D(mesh, st, ae, af, phi, rx, ry, fused);
  }
  Limit(mesh, limiter, ae, af, phi, rx, ry, gx, gy, fused);
}

void CalcGradientVelocity2D(MeshData& mesh, std::int32_t method, std::int32_t limiter,
                            std::int32_t boundaryMode, const std::int32_t* ae,
                            const std::int32_t* af, const std::int32_t* btype, const double* u,
                            const double* v, double* ux, double* uy, double* vx, double* vy,
                            GradientWorkspace& work) {
  const bool separate = PrepareDriver("CalcGradientVelocity2D", mesh, method, limiter, boundaryMode, work);
  double* rux = separate ? work.gx1.data() : ux;
  double* ruy = separate ? work.gy1.data() : uy;
  double* rvx = separate ? work.gx2.data() : vx;
  double* rvy = separate ? work.gy2.data() : vy;
  bool fused = false;
  if (method == kGradientElementValues) {
    NoteSingular(work, ElementValues2D(mesh, boundaryMode, ae, af, btype, u, v, rux, ruy, rvx,
                                       rvy));
  } else if (method == kGradientNodeValues || method == kGradientNodeValuesAlt) {
    if (ae != nullptr) {
      CalcNodeValues2WetPL2D(mesh, u, v, ae, work.node1.data(), work.node2.data());
    } else {
      const double none = std::numeric_limits<double>::quiet_NaN();
      CalcNodeValuesPL2D(mesh, u, none, 0, work.node1.data());
      CalcNodeValuesPL2D(mesh, v, none, 0, work.node2.data());
    }
    CalcGradientGreenGauss2D(mesh, ae, work.node1.data(), rux, ruy);
    CalcGradientGreenGauss2D(mesh, ae, work.node2.data(), rvx, rvy);
  } else {
    const GradientStencil& st = SetupGradient(mesh, method - 2, boundaryMode);
    fused = limiter == kLimiterBarthJespersen;
    CalcVelocityStencil2D(mesh, st, ae, af, btype, u, v, rux, ruy, rvx, rvy, fused);
  }
  Limit(mesh, limiter, ae, af, u, rux, ruy, ux, uy, fused);
  Limit(mesh, limiter, ae, af, v, rvx, rvy, vx, vy, fused);
}
