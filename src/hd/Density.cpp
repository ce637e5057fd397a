#include "hd/Density.h"

#include "driver/Termination.h"
#include "setup/SetupFile.h"

void SetDensityReference(DensitySettings& d) {
  if (d.type == 0) {
    d.temperatureReference = 10.0;
    d.salinityReference = 13.2;
  }
  d.referenceDensity = DensityEOS(d.temperatureReference, d.salinityReference);
}

void ReadDensitySettings(DensitySettings& d) {
  d = DensitySettings{};
  int status = 0;
  SkfOpenSection("DENSITY", &status);
  if (status != 0) {
    SetDensityReference(d);
    return;
  }
  SkfReadInt("type", d.type, 0);
  if (d.type < 0 || d.type > 3) FatalError("Type not supported for density");
  if (d.type > 0) {
    SkfReadDouble("temperature_reference", d.temperatureReference, 10.0);
    SkfReadDouble("salinity_reference", d.salinityReference, 32.0);
    SkfReadInt("formula", d.formula, 1);
  }
  SetDensityReference(d);
  if (d.type > 0) SkfReadInt("type_of_buoyancy_calculation", d.buoyancyType, 1);
  SkfCloseSection();
}

void UpdateDensityField(const DensitySettings& d, std::int32_t n, const double* t,
                        const double* s, double* rho) {
  const std::int32_t type = d.type;
  const double t0 = d.temperatureReference, s0 = d.salinityReference;
  if (type < 1 || type > 3) return;
#pragma omp parallel for schedule(static)
  for (std::int32_t e = 1; e <= n; ++e)
    rho[e] = DensityEOS(type == 3 ? t0 : t[e], type == 2 ? s0 : s[e]);
}
