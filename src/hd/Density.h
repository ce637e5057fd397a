// Density settings of the hydrodynamic module and the equation of state (one-atmosphere
// formula of sea water with an optional pressure correction). The formulas are plain inline
// functions on scalars so that CPU loops and, later, device kernels share them.
#pragma once

#include <cmath>
#include <cstdint>

struct DensitySettings {
  std::int32_t type = 0;                // 0 barotropic; 1 T and S; 2 T only; 3 S only
  double temperatureReference = 10.0;   // deg C
  double salinityReference = 13.2;      // PSU (32.0 is the default of types 1-3)
  double referenceDensity = 0.0;        // kg/m3, the equation of state at the references
  std::int32_t formula = 1;             // kept for the baroclinic forcing
  std::int32_t buoyancyType = 1;        // "type_of_buoyancy_calculation"
};

// Density at zero pressure, T in deg C and S in PSU (negative salinities taken as 0).
inline double DensityEOS(double t, double s) {
  if (s < 0.0) s = 0.0;
  const double rw = 999.842594 + t * (6.793952e-2 + t * (-9.095290e-3 + t * (1.001685e-4 +
                    t * (-1.120083e-6 + t * 6.536332e-9))));
  const double a = 8.24493e-1 + t * (-4.0899e-3 + t * (7.6438e-5 + t * (-8.2467e-7 +
                   t * 5.3875e-9)));
  const double b = -5.72466e-3 + t * (1.0227e-4 - t * 1.6546e-6);
  return rw + a * s + b * s * std::sqrt(s) + 4.8314e-4 * s * s;
}

// Secant bulk modulus K(S, T, p) of the pressure correction.
inline double DensityBulkModulus(double t, double s, double p) {
  if (s < 0.0) s = 0.0;
  const double s3 = s * std::sqrt(s);
  const double k0 = 190925.59375 +
                    (2098.925 - 30.41638 * t - 0.01852732 * t * t - 0.0001361629 * t * t * t) * t +
                    (1044.077 - 65.00517 * t + 1.55319 * t * t + 0.002326469 * t * t * t) * s +
                    (-55.87545 + 7.390729 * t - 0.1909078 * t * t) * s3;
  const double k1 = -4.721788 - 0.1028859 * t + 0.002512549 * t * t + 5.93991e-6 * t * t * t +
                    (0.1571896 + 0.002598241 * t + 7.267926e-5 * t * t) * s - 0.02042967 * s3;
  const double k2 = 0.0001045941 - 5.782165e-9 * t + 1.296821e-6 * t * t +
                    (-2.595994e-6 - 1.248266e-8 * t - 3.508914e-8 * t * t) * s;
  return k0 + (k1 + k2 * p) * p;
}

// Density under pressure p (same unit as K): compression makes water denser,
// rho = rho(S, T, 0) / (1 - p / K).
inline double DensityEOSPressure(double t, double s, double p) {
  return DensityEOS(t, s) / (1.0 - p / DensityBulkModulus(t, s, p));
}

// Reads "DENSITY" (the hydrodynamic module's section must be open). A setup file without the
// section keeps the barotropic defaults. A type outside 0..3 stops with "Type not supported for
// density".
void ReadDensitySettings(DensitySettings& settings);
// Sets the reference values and density of a type.
void SetDensityReference(DensitySettings& settings);

// Density field of elements 1..n from the temperature and salinity arrays (either may be null
// when the type does not use it).
void UpdateDensityField(const DensitySettings& settings, std::int32_t n, const double* t,
                        const double* s, double* rho);
