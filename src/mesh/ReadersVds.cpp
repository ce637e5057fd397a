// Placeholder until the data-file mesh readers land.
#include "mesh/MeshReaders.h"

namespace {
[[noreturn]] void NotYet(const std::string& path) { throw MeshError(path + ": reader not available"); }
}  // namespace

void ReadMeshVdsu(MeshData&, const std::string& path, MeshReadReport&) { NotYet(path); }
void ReadMeshBasicVds1(MeshData&, const std::string& path, MeshReadReport&) { NotYet(path); }
void ReadMeshBasicVds2(MeshData&, const std::string& path, const MeshReadOptions&, MeshReadReport&) { NotYet(path); }
void ReadMeshBasicVds3(MeshData&, const std::string& path, const MeshReadOptions&, MeshReadReport&) { NotYet(path); }
