// Placeholder until the text readers land.
#include "mesh/MeshReaders.h"

namespace {
[[noreturn]] void NotYet(const std::string& path) { throw MeshError(path + ": reader not available"); }
}  // namespace

void ReadMeshFem(MeshData&, const std::string& path, MeshReadReport&) { NotYet(path); }
void ReadMeshGeo(MeshData&, const std::string& path, MeshReadReport&) { NotYet(path); }
void ReadMesh2dm(MeshData&, const std::string& path, const MeshReadOptions&, MeshReadReport&) { NotYet(path); }
void Parse2dmText(MeshData&, const char*, std::size_t, const std::string& name, const MeshReadOptions&, MeshReadReport&) { NotYet(name); }
void ReadMeshBasicADCIRC(MeshData&, const std::string& path, MeshReadReport&) { NotYet(path); }
void ReadMeshBasicQUODDY(MeshData&, const std::string& path, MeshReadReport&) { NotYet(path); }
void ReadMeshNodeTopo(MeshData&, const std::string& path, MeshReadReport&) { NotYet(path); }
