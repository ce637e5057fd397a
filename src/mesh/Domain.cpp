#include "mesh/Domain.h"

#include <algorithm>
#include <cctype>
#include <cstdlib>

#include "driver/Log.h"
#include "driver/Termination.h"
#include "mesh/Cartography.h"
#include "mesh/MeshGeometry.h"
#include "mesh/MeshReaders.h"
#include "setup/SetupFile.h"

namespace {

bool StartsWith(const std::string& text, const char* prefix) {
  return text.rfind(prefix, 0) == 0;
}

void FlushWarnings(std::vector<std::string>& warnings) {
  for (const std::string& w : warnings) Warning(w);
  warnings.clear();
}

// Steps 3 to 9 for one mesh; the "Mesh" sub-section (if any) is the current position.
void ReadOneMesh(MeshData& mesh, const DomainSettings& settings) {
  std::vector<std::string> warnings;
  std::string fileName;
  SkfReadInputFile("file_name", fileName, "");
  if (fileName.empty()) throw MeshError("DOMAIN: \"file_name\" is empty: no mesh file given");
  mesh.fileName = fileName;

  // 3. The reader by extension.
  MeshReadOptions options;
  const std::string ext = MeshFileExtension(fileName);
  if (ext == "vds2") {
    SkfReadInt("type_of_element", options.typeOfElement, 25);
    SkfReadInt("type_of_grid", options.typeOfGrid, 1);
    if (options.typeOfGrid == 2) {
      SkfReadInputFile("filename_grid", options.gridFile, "");
      if (MeshFileExtension(options.gridFile) != "vds2") throw MeshError("Illegal input file");
    } else if (options.typeOfGrid != 1) {
      throw MeshError("Grid type not supported");
    }
  } else if (ext == "vds3") {
    SkfReadInt("type_of_element", options.typeOfElement, 33);
  } else if (ext == "2dm") {
    SkfReadInt("QUM_unit_XY", options.unitXY, kUnitMetre);
    SkfReadInt("QUM_unit_Z", options.unitZ, kUnitMetre);
    SkfReadInt("element_attribute", options.elementAttribute, -1);
  }
  MeshReadReport report;
  ReadMeshFile(mesh, fileName, options, report);
  for (const std::string& w : report.warnings) warnings.push_back(w);
  for (const auto& [label, value] : report.values) PrintLine(MeshLogLine(label, value));
  FlushWarnings(warnings);

  // 4. Projection, degrees to radians, validation.
  if (mesh.projection.empty()) ReadCoordinateType(mesh, "UTM-32", warnings);
  FlushWarnings(warnings);
  if (mesh.IsLongLat()) {
    NodeTable& nd = mesh.nodes;
    for (std::int32_t n = 1; n <= nd.numNodes; ++n) {
      nd.x[n] *= kDegreesToRadians;
      nd.y[n] *= kDegreesToRadians;
    }
  }
  std::int32_t checkMesh = 1;
  SkfReadInt("check_mesh", checkMesh, 1);
  CheckMeshSafety(mesh);
  if (checkMesh > 0) {
    std::vector<std::string> unused;
    try {
      ValidateMesh(mesh, unused);
    } catch (const MeshError&) {
      for (const std::string& line : unused) PrintLine(line);
      throw;
    }
  }

  // 5. Bed-level adjustment.
  if (mesh.dimension == 1 || mesh.dimension == 2) {
    double datum = 0.0;
    SkfReadDouble("datum_depth", datum, 0.0);
    for (std::int32_t n = 1; n <= mesh.nodes.numNodes; ++n) mesh.nodes.z[n] -= datum;
    const double zmax = HighestBedLevel(mesh);
    double minimumDepth = zmax, thresholdDepth = zmax;
    SkfReadDouble("minimum_depth", minimumDepth, zmax);
    SkfReadDouble("thresshold_depth", thresholdDepth, zmax);
    AdjustBedLevels(mesh, minimumDepth, thresholdDepth);
  }
  // 6. Reordering for sub-domains: the keywords are read; the mesh keeps the order as read
  // until the run is split into sub-domains.
  if (mesh.dimension == 2) {
    std::int32_t domains = settings.numDomains, reordering = settings.typeOfReordering;
    SkfReadInt("number_of_domains", domains, 16);
    SkfReadInt("type_of_reordering", reordering, 1);
  }
  // 7. The bed level as read and adjusted.
  mesh.nodes.z0.assign(mesh.nodes.z.begin(), mesh.nodes.z.end());

  // Orientation: clockwise elements are turned (one warning with the count).
  const std::int32_t turned = OrientElements(mesh);
  if (turned > 0)
    Warning(std::to_string(turned) + " element" + (turned == 1 ? " was" : "s were") +
            " given clockwise; their node order was reversed");

  // 9 (step 8, the layered mesh, follows below). Projection origin and conversions first.
  try {
    mesh.cartography = std::make_shared<Cartography>(mesh.projection);
  } catch (const MeshError& e) {
    throw MeshError(std::string("Bad call to VxCartGetOrigin: ") + e.what());
  }
  mesh.origin[0] = mesh.cartography->OriginX();
  mesh.origin[1] = mesh.cartography->OriginY();
  SetupMeshGeometry(mesh, warnings);
  FlushWarnings(warnings);
}

}  // namespace

void ReadCoordinateType(MeshData& mesh, const std::string& defaultType,
                        std::vector<std::string>& warnings) {
  std::string type;
  SkfReadString("coordinate_type", type, defaultType);
  if (StartsWith(type, "UTM")) {
    // "UTM-33" without "zone" means zone 33: the zone in the text is the default of "zone".
    std::int32_t textZone = 32;
    bool hasTextZone = false;
    const std::size_t digits = type.find_first_of("0123456789");
    if (digits != std::string::npos) {
      char* end = nullptr;
      const long z = std::strtol(type.c_str() + digits, &end, 10);
      if (end != nullptr && *end == '\0' && z >= -1000 && z <= 1000) {
        textZone = static_cast<std::int32_t>(z);
        hasTextZone = true;
      }
    }
    std::int32_t zone = textZone;
    const bool given = SkfReadInt("zone", zone, textZone) == 0;
    if (given && hasTextZone && zone != textZone)
      warnings.push_back("\"coordinate_type\" " + type + " and \"zone\" " + std::to_string(zone) +
                         " disagree; zone " + std::to_string(zone) + " is used");
    if (zone < 1 || zone > 60) throw MeshError("Wrong UTM zone");
    mesh.projection = "UTM-" + std::to_string(zone);
  } else if (StartsWith(type, "NON")) {
    mesh.projection = "NON-UTM";
  } else if (StartsWith(type, "GEO") || type == "LONG/LAT") {
    mesh.projection = "LONG/LAT";
  } else {
    mesh.projection = type;
  }
}

double HighestBedLevel(const MeshData& mesh) {
  double zmax = -1e300;
  for (std::int32_t n = 1; n <= mesh.nodes.numNodes; ++n) zmax = std::max(zmax, mesh.nodes.z[n]);
  return zmax;
}

void AdjustBedLevels(MeshData& mesh, double minimumDepth, double thresholdDepth) {
  NodeTable& nd = mesh.nodes;
  for (std::int32_t n = 1; n <= nd.numNodes; ++n) {
    double& z = nd.z[n];
    if (nd.id[n] > 0 && minimumDepth < z && z <= thresholdDepth) z = minimumDepth;
  }
}

void ResetMeshTables() {
  for (MeshData& m : g_meshTable.meshes) m = MeshData{};
  g_meshTable.numMeshes = 0;
  g_shapes.shapes.clear();
}

void SetupSpaceDiscretization(DomainSettings& settings) {
  SkfOpenSection("DOMAIN");
  SkfReadInt("number_of_dimensions", settings.numDimensions, 2);
  SkfReadInt("number_of_meshes", settings.numMeshes, 1);
  if (settings.numDimensions != 2 && settings.numDimensions != 3)
    FatalError("DOMAIN: \"number_of_dimensions\" must be 2 or 3 (" +
               std::to_string(settings.numDimensions) + ")");
  if (settings.numMeshes < 1)
    FatalError("DOMAIN: \"number_of_meshes\" must be at least 1 (" +
               std::to_string(settings.numMeshes) + ")");
  for (int i = 1; i <= settings.numMeshes; ++i) {
    const bool sub = settings.numMeshes > 1;
    if (sub) SkfOpenSectionInstance("Mesh", i);
    if (g_meshTable.numMeshes >= kMaxMeshes) FatalError("SetupSpaceDiscretization: Too many meshes");
    const int number = ++g_meshTable.numMeshes;
    MeshData& mesh = g_meshTable.meshes[number - 1];
    mesh = MeshData{};
    try {
      ReadOneMesh(mesh, settings);
    } catch (const MeshError& e) {
      FatalError(e.what());
    }
    mesh.number = number;
    // 8. Layered 3-D mesh.
    if (settings.numDimensions == 3) {
      if (g_meshTable.numMeshes >= kMaxMeshes)
        FatalError("SetupSpaceDiscretization: Too many meshes");
      ++g_meshTable.numMeshes;
      FatalError("DOMAIN: \"number_of_dimensions\" 3: layered 3-D meshes are not available in "
                 "this build");
    }
    if (sub) SkfCloseSection();
  }
  // 11. The mesh information of every mesh.
  for (int i = 0; i < g_meshTable.numMeshes; ++i) {
    PrintLine("");
    for (const std::string& line : MeshInformationLines(g_meshTable.meshes[i])) PrintLine(line);
  }
  SkfCloseSection();
}
