// Reader choice by the mesh file's extension.
#include "mesh/MeshReaders.h"

#include <cctype>

std::string MeshFileExtension(const std::string& path) {
  const std::size_t slash = path.find_last_of('/');
  const std::size_t dot = path.find_last_of('.');
  if (dot == std::string::npos || (slash != std::string::npos && dot < slash)) return "";
  std::string ext = path.substr(dot + 1);
  for (char& c : ext) c = static_cast<char>(std::tolower(static_cast<unsigned char>(c)));
  return ext;
}

void ReadMeshFile(MeshData& mesh, const std::string& path, const MeshReadOptions& options,
                  MeshReadReport& report) {
  const std::string ext = MeshFileExtension(path);
  if (ext == "mesh") return ReadMeshText(mesh, path, report);
  if (ext == "vdsu") return ReadMeshVdsu(mesh, path, report);
  if (ext == "vds1" || ext == "dt1") return ReadMeshBasicVds1(mesh, path, report);
  if (ext == "vds2") return ReadMeshBasicVds2(mesh, path, options, report);
  if (ext == "vds3") return ReadMeshBasicVds3(mesh, path, options, report);
  if (ext == "fem") return ReadMeshFem(mesh, path, report);
  if (ext == "geo") return ReadMeshGeo(mesh, path, report);
  if (ext == "2dm") return ReadMesh2dm(mesh, path, options, report);
  if (ext == "14") return ReadMeshBasicADCIRC(mesh, path, report);
  if (ext == "bat") return ReadMeshBasicQUODDY(mesh, path, report);
  if (ext == "msh") return ReadMeshGmsh(mesh, path, report);
  return ReadMeshNodeTopo(mesh, path, report);
}

