// Flooding and drying: the wet state of every element (0 dry, 1 wet, 2 flooded) with two depth
// thresholds and a hysteresis, the face-flooding pass that opens dry elements beside high water,
// and the volume added by clipping negative depths (for the mass budget).
#pragma once

#include <cstdint>

#include "mesh/MeshData.h"

constexpr std::int32_t kDry = 0;
constexpr std::int32_t kWet = 1;
constexpr std::int32_t kFlooded = 2;

struct FloodDrySettings {
  std::int32_t type = 0;          // 0 off; > 0 on
  double dryingDepth = 0.005;     // m: below it an element is dry
  double floodingDepth = 0.05;    // m: a neighbour must hold more to flood a dry element
  double massDepth = 0.1;         // m: above it an element is fully wet
  std::int32_t maxIterations = 10;
};

// Reads "FLOOD_AND_DRY" (the hydrodynamic module's section must be open); without the section,
// or with "type" 0, flooding and drying is off and the three depths are 0. Negative depths, a
// drying depth above the mass depth and fewer than 1 iteration stop with a message.
void ReadFloodDrySettings(FloodDrySettings& settings);

// The element arrays the check works on (1-based, elements 1..numElements).
struct FloodDryState {
  std::int32_t numElements = 0;
  std::int32_t* wet = nullptr;
  std::int32_t* wetOld = nullptr;
  double* h = nullptr;                 // total depth
  const double* d = nullptr;           // still-water depth (positive down)
  double* p = nullptr;                 // depth-integrated fluxes
  double* q = nullptr;
  double* volumeCorrection = nullptr;  // m3 added by clipping in the last check
};

// Initial classification after the initial conditions: h < drying depth: dry with
// h = max(0, h); else h < mass depth: flooded; else wet.
void ClassifyFloodDryInitial(const FloodDrySettings& settings, FloodDryState& state);

// The check after every sub-step: element states with the hysteresis and clipping, the serial
// face-flooding pass, fluxes set to zero where the state changed. Returns the number of non-dry
// elements (at least 1). With "type" 0 it only zeroes the volume corrections.
std::int32_t CheckFloodDryHD(const FloodDrySettings& settings, const MeshData& mesh,
                             FloodDryState& state);

// Sum of the volume corrections of the last check.
double SumVolumeCorrection(const FloodDryState& state);
