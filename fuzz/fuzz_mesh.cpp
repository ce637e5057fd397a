// libFuzzer target for the mesh readers: the first byte chooses the format (.mesh, .2dm or
// Gmsh .msh), the rest is the file. A file that parses is then set up like a run does it (safety
// checks, validation, orientation, faces, geometry, sections). Every fault must be a MeshError;
// anything else (a crash, a sanitizer report, another exception) is a finding.
#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include "mesh/Domain.h"
#include "mesh/MeshGeometry.h"
#include "mesh/MeshReaders.h"
#include "mesh/ReaderGmsh.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  if (size < 1) return 0;
  const int format = data[0] % 3;
  const char* text = reinterpret_cast<const char*>(data + 1);
  ResetMeshTables();
  MeshData mesh;
  try {
    MeshReadReport report;
    if (format == 1)
      Parse2dmText(mesh, text, size - 1, "fuzz.2dm", MeshReadOptions{}, report);
    else if (format == 2)
      ParseGmshData(mesh, text, size - 1, "fuzz.msh", report);
    else
      ParseMeshText(mesh, text, size - 1, "fuzz.mesh");
    CheckMeshSafety(mesh);
    std::vector<std::string> lines;
    ValidateMesh(mesh, lines);
    OrientElements(mesh);
    std::vector<std::string> warnings;
    SetupMeshGeometry(mesh, warnings);
    (void)MeshInformationLines(mesh);
  } catch (const MeshError&) {
  }
  ResetMeshTables();
  return 0;
}
