// "DOMAIN": reads the mesh or meshes of the run into g_meshTable, adjusts the bed levels,
// validates the meshes, builds their geometry and writes the mesh information to the log.
#pragma once

#include <cstdint>
#include <string>

#include "mesh/MeshData.h"

struct DomainSettings {
  std::int32_t numDimensions = 2;  // "number_of_dimensions"
  std::int32_t numMeshes = 1;      // "number_of_meshes"
  std::int32_t numDomains = 16;    // "number_of_domains" (sub-domain reordering)
  std::int32_t typeOfReordering = 1;
};

// Reads "DOMAIN" (the current position must be the root target) and builds every mesh. Every
// fault is fatal with the routine's message.
void SetupSpaceDiscretization(DomainSettings& settings);

// The coordinate-type routine for a mesh whose file gave no projection text: reads
// "coordinate_type" (default `defaultType`) and, for "UTM..." texts, "zone". Sets
// mesh.projection; throws MeshError("Wrong UTM zone") for zones outside 1..60.
void ReadCoordinateType(MeshData& mesh, const std::string& defaultType, std::vector<std::string>& warnings);

// Bed-level adjustment: z = minimumDepth for nodes with a positive identifier and
// minimumDepth < z <= thresholdDepth ("datum_depth" is subtracted before, since the defaults
// of both limits are the highest bed level after it).
void AdjustBedLevels(MeshData& mesh, double minimumDepth, double thresholdDepth);
// Highest node bed level.
double HighestBedLevel(const MeshData& mesh);

// Clears the run's mesh and shape tables (tests, repeated set-ups in one process).
void ResetMeshTables();
