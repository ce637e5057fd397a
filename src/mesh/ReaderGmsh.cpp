// Placeholder until the Gmsh reader lands.
#include "mesh/MeshReaders.h"

void ReadMeshGmsh(MeshData&, const std::string& path, MeshReadReport&) { throw MeshError(path + ": reader not available"); }
