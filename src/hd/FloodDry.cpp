#include "hd/FloodDry.h"

#include <algorithm>
#include <string>

#include "driver/Termination.h"
#include "setup/SetupFile.h"

void ReadFloodDrySettings(FloodDrySettings& s) {
  s = FloodDrySettings{};
  int status = 0;
  SkfOpenSection("FLOOD_AND_DRY", &status);
  if (status == 0) SkfReadInt("type", s.type, 0);
  else s.type = 0;
  if (s.type == 0) {
    s.dryingDepth = s.floodingDepth = s.massDepth = 0.0;
  } else {
    SkfReadDouble("drying_depth", s.dryingDepth, 0.005);
    SkfReadDouble("flooding_depth", s.floodingDepth, 0.05);
    SkfReadDouble("mass_depth", s.massDepth, 0.1);
    SkfReadInt("maximum_number_of_iterations", s.maxIterations, 10);
    auto refuse = [](const std::string& what) { FatalError("FLOOD_AND_DRY: " + what); };
    if (s.type < 0) refuse("negative type " + std::to_string(s.type));
    if (s.dryingDepth < 0.0 || s.floodingDepth < 0.0 || s.massDepth < 0.0)
      refuse("depths must not be negative");
    if (s.dryingDepth > s.massDepth)
      refuse("drying_depth must not exceed mass_depth");
    if (s.maxIterations < 1) refuse("maximum_number_of_iterations < 1");
  }
  if (status == 0) SkfCloseSection();
}

void ClassifyFloodDryInitial(const FloodDrySettings& s, FloodDryState& st) {
  const double dry = s.dryingDepth, mass = s.massDepth;
#pragma omp parallel for schedule(static)
  for (std::int32_t e = 1; e <= st.numElements; ++e) {
    const double h = st.h[e];
    if (h < dry) {
      st.wet[e] = kDry;
      st.h[e] = std::max(0.0, h);
    } else {
      st.wet[e] = h < mass ? kFlooded : kWet;
    }
  }
}

std::int32_t CheckFloodDryHD(const FloodDrySettings& s, const MeshData& mesh, FloodDryState& st) {
  const std::int32_t ne = st.numElements;
  if (s.type <= 0) {
    std::fill(st.volumeCorrection + 1, st.volumeCorrection + ne + 1, 0.0);
    std::int32_t count = 0;
    for (std::int32_t e = 1; e <= ne; ++e) count += st.wet[e] != kDry;
    return std::max(count, 1);
  }
  const double dry = s.dryingDepth, mass = s.massDepth, flood = s.floodingDepth;
  const double* area = mesh.elements.area.data();
  // 1. Element states with the hysteresis; negative depths of drying elements clipped.
#pragma omp parallel for schedule(static)
  for (std::int32_t e = 1; e <= ne; ++e) {
    const std::int32_t old = st.wet[e];
    st.wetOld[e] = old;
    st.volumeCorrection[e] = 0.0;
    const double h = st.h[e];
    if (old == kDry) {
      st.wet[e] = h > mass ? kWet : h > dry ? kFlooded : kDry;
    } else if (h < dry) {
      st.wet[e] = kDry;
      if (h < 0.0) {
        st.volumeCorrection[e] = -h * area[e];
        st.h[e] = 0.0;
      }
    } else {
      st.wet[e] = h < mass ? kFlooded : kWet;
    }
  }
  // 2. Face flooding, serial in face order: a state changed by one face is seen by the next.
  const FaceTable& fc = mesh.faces;
  for (std::int32_t f = 1; f <= fc.numFaces; ++f) {
    const std::int32_t l = fc.left[f], r = fc.right[f];
    if (l == 0 || r == 0 || fc.id[f] < 1) continue;
    if (st.wet[l] != kDry && st.wet[r] == kDry && st.h[l] > flood &&
        st.h[l] - st.d[l] + st.d[r] > 0.0)
      st.wet[r] = kFlooded;
    if (st.wet[l] == kDry && st.wet[r] != kDry && st.h[r] > flood &&
        st.h[r] - st.d[r] + st.d[l] > 0.0)
      st.wet[l] = kFlooded;
  }
  // 3. Fluxes of every element whose state changed are set to zero, also from wet to flooded:
  // a flooded element carries mass only, and stale momentum must not keep pushing water.
  std::int32_t count = 0;
#pragma omp parallel for schedule(static) reduction(+ : count)
  for (std::int32_t e = 1; e <= ne; ++e) {
    if (st.wet[e] != st.wetOld[e]) {
      st.p[e] = 0.0;
      st.q[e] = 0.0;
    }
    count += st.wet[e] != kDry;
  }
  return std::max(count, 1);
}

double SumVolumeCorrection(const FloodDryState& st) {
  double sum = 0.0;
  for (std::int32_t e = 1; e <= st.numElements; ++e) sum += st.volumeCorrection[e];
  return sum;
}
