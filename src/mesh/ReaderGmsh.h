// Gmsh mesh files (.msh): versions 2.2 and 4.1, ASCII and binary.
#pragma once

#include <cstddef>
#include <string>

#include "mesh/MeshReaders.h"

// Parses Gmsh mesh data held in memory (ReadMeshGmsh and the fuzz target use it); `name` is
// used in messages. Fills the nodes (boundary codes included) and the 2-D elements of `mesh`.
void ParseGmshData(MeshData& mesh, const char* data, std::size_t size, const std::string& name,
                   MeshReadReport& report);
