// Element gradients for the second-order schemes: stencils, the gradient methods, the three
// slope limiters and the face-value reconstruction.
//
// Gradients are two arrays per quantity (d/dx, d/dy), 1-based by element like the mesh
// tables. Active flags: an element takes part when activeElem[e] > 0, a face may carry a
// gradient contribution when activeFace[f] > 0; a null pointer means "all active". Velocity
// gradients also take a boundary type per face: 1 closed (land), 2 velocity copied, any other
// value mirror reflection.
//
// Every loop runs over elements with a static schedule; each element writes only its own
// entries and nothing is allocated inside the loops. Failures throw MeshError with the
// routine's message (the callers' set-up turns it into the fatal stop).
#pragma once

#include <cmath>
#include <cstdint>
#include <vector>

#include "mesh/MeshData.h"

// Method codes of the gradient drivers.
constexpr std::int32_t kGradientElementValues = 1;   // neighbour centroids, on each call
constexpr std::int32_t kGradientNodeValues = 2;      // 2 or 3: node values + Green-Gauss
constexpr std::int32_t kGradientNodeValuesAlt = 3;
constexpr std::int32_t kGradientStencil2 = 4;        // 4, 5: kept stencil of type code - 2
constexpr std::int32_t kGradientStencil3 = 5;
// Limiter codes; any other value leaves the gradients unlimited.
constexpr std::int32_t kLimiterENO = 1;
constexpr std::int32_t kLimiterWeighted = 2;
constexpr std::int32_t kLimiterBarthJespersen = 3;

// Stencil kept with the mesh for one (type, boundary mode). Entries of element e are
// start[e] .. start[e + 1] - 1. The gradient of e is sum w (phi_entry - phi_e) for every type:
// the plane and diagonal weights of type 1 sum to zero, so the element's own value cancels and
// a substitute with the element's value contributes nothing.
struct GradientStencil {
  std::int32_t type = 0, boundaryMode = 0;
  std::int32_t numElements = 0;
  std::vector<std::int32_t> start;
  // Entry element; 0 for a boundary substitute at the face centre or the mirror point.
  std::vector<std::int32_t> element;
  // Face crossed to reach the entry (its boundary type and normal give the velocity
  // substitute); negative for the second ring of type 3, whose entries are simply left out
  // when inactive.
  std::vector<std::int32_t> face;
  std::vector<double> wx, wy;
  std::vector<std::int32_t> numSubstitutes;  // boundary substitutes per element
  std::int64_t numSingular = 0;              // elements whose stencil gives a zero gradient
  // Boundary mode 2: the centroid of the face's element mirrored across each boundary face.
  std::vector<double> xMirror, yMirror;
};

// The mesh's stencil of this type (1, 2 or 3) and boundary mode (1 face centre, 2 mirror
// point), built on the first call from the geometry alone and kept with the mesh. Other types
// stop with "SetupGradient: Gradient type not supported". A stencil with singular elements
// is reported once in the log.
const GradientStencil& SetupGradient(MeshData& mesh, std::int32_t type, std::int32_t boundaryMode);
// Mirror points of the boundary faces (boundary mode 2).
void SetupBoundaryGradient2D(const MeshData& mesh, GradientStencil& stencil);

// Work arrays of the drivers, sized once for a mesh.
struct GradientWorkspace {
  std::vector<double> gx1, gy1, gx2, gy2;  // unlimited gradients for ENO and weighted limiting
  std::vector<double> node1, node2;        // node values of the node-values method
  std::int64_t numSingular = 0;            // last element-values call: singular stencils
  bool singularReported = false;
};
void SetupGradientWorkspace(const MeshData& mesh, GradientWorkspace& work);

// Scalar driver: limited gradients of phi.
void CalcGradientScalar2D(MeshData& mesh, std::int32_t method, std::int32_t limiter,
                          std::int32_t boundaryMode, const std::int32_t* activeElem,
                          const std::int32_t* activeFace, const double* phi, double* gx,
                          double* gy, GradientWorkspace& work);
// Velocity driver: u and v together, so that boundary substitutes reflect as a vector.
void CalcGradientVelocity2D(MeshData& mesh, std::int32_t method, std::int32_t limiter,
                            std::int32_t boundaryMode, const std::int32_t* activeElem,
                            const std::int32_t* activeFace, const std::int32_t* faceBoundaryType,
                            const double* u, const double* v, double* ux, double* uy,
                            double* vx, double* vy, GradientWorkspace& work);

// ---------------------------------------------------------------------------------------------
// The kernels the drivers are made of (for callers that fuse them into their own passes).

// Unlimited gradients through a kept stencil; with `limitBJ` the Barth-Jespersen factor is
// applied in the same pass.
void CalcGradientStencil2D(const MeshData& mesh, const GradientStencil& stencil,
                           const std::int32_t* activeElem, const std::int32_t* activeFace,
                           const double* phi, double* gx, double* gy, bool limitBJ);
// Element-values method: the type-1 stencil rebuilt from the current active flags. Returns the
// number of elements with a singular stencil (zero gradient).
std::int64_t CalcGradientElementValues2D(const MeshData& mesh, std::int32_t boundaryMode,
                                         const std::int32_t* activeElem,
                                         const std::int32_t* activeFace, const double* phi,
                                         double* gx, double* gy);
// Green-Gauss gradients from node values.
void CalcGradientGreenGauss2D(const MeshData& mesh, const std::int32_t* activeElem,
                              const double* nodeValues, double* gx, double* gy);
// Limiters. ENO and weighted read the unlimited gradients and write separate arrays;
// Barth-Jespersen scales gx, gy in place.
void LimitGradientENO2D(const MeshData& mesh, const std::int32_t* activeElem,
                        const std::int32_t* activeFace, const double* gxIn, const double* gyIn,
                        double* gxOut, double* gyOut);
void LimitGradientWeighted2D(const MeshData& mesh, const std::int32_t* activeElem,
                             const double* gxIn, const double* gyIn, double* gxOut,
                             double* gyOut);
void LimitGradientBarthJespersen2D(const MeshData& mesh, const std::int32_t* activeElem,
                                   const std::int32_t* activeFace, const double* phi, double* gx,
                                   double* gy);

// Velocity substitute at a boundary face with unit normal (nx, ny) and boundary type.
inline void VelocitySubstitute(std::int32_t boundaryMode, std::int32_t boundaryType, double nx,
                               double ny, double u, double v, double& us, double& vs) {
  if (boundaryMode == 2) {
    if (boundaryType == 1) {
      us = -u; vs = -v;
    } else if (boundaryType == 2) {
      us = u; vs = v;
    } else {
      us = (ny * ny - nx * nx) * u - 2.0 * nx * ny * v;
      vs = -2.0 * nx * ny * u + (nx * nx - ny * ny) * v;
    }
  } else if (boundaryType == 1) {
    us = 0.0; vs = 0.0;
  } else {
    us = u; vs = v;
  }
}

// Face-value reconstruction from the upwind element U towards the downwind element D at the
// face point F (reconstruction point P for kind 3). Kinds: 0 unlimited, 1 bounded, 2 van Leer,
// 3 van Albada at the reconstruction point; any other kind is taken as 0.
inline double FaceValue2D(std::int32_t kind, double xU, double yU, double xD, double yD,
                          double xF, double yF, double xP, double yP, double lengthScale,
                          double phiU, double phiD, double gxU, double gyU, double gxD,
                          double gyD) {
  switch (kind) {
    case 1: {
      const double a = phiU + gxU * (xF - xU) + gyU * (yF - yU);
      const double b = phiD + gxD * (xF - xD) + gyD * (yF - yD);
      const double hi = phiU > phiD ? phiU : phiD, lo = phiU < phiD ? phiU : phiD;
      const double upper = b > hi ? b : hi, lower = b < lo ? b : lo;
      return a > upper ? upper : (a > lower ? a : lower);
    }
    case 2: {
      const double delta = phiD - phiU;
      double psi = 1.0;
      if (std::fabs(delta) > 1e-6) {
        const double r = 2.0 * (gxU * (xD - xU) + gyU * (yD - yU)) / delta - 1.0;
        psi = (r + std::fabs(r)) / (1.0 + std::fabs(r));
      }
      return phiU + 0.5 * psi * delta;
    }
    case 3: {
      const double small = 1e-16 * lengthScale;
      const double eps3 = small * small * small;
      const double delta = phiD - phiU;
      const double q = 2.0 * (gxU * (xD - xU) + gyU * (yD - yU)) - delta;
      double s = 0.0;
      if (q * delta > 0.0)
        s = ((eps3 + q * q) * delta + (eps3 + delta * delta) * q) /
            (2.0 * eps3 + q * q + delta * delta);
      const double dUD = std::hypot(xD - xU, yD - yU);
      const double share = dUD > 0.0 ? std::hypot(xP - xU, yP - yU) / dUD : 0.0;
      return phiU + share * s + gxU * (xF - xP) + gyU * (yF - yP);
    }
    default:
      return phiU + gxU * (xF - xU) + gyU * (yF - yU);
  }
}
