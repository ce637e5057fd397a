// Mesh file readers. Each fills the nodes and elements of a cleared MeshData record (and, where
// the file says so, its projection text, bed-level unit, dimension and layers) and throws
// MeshError with a message naming the file (and line, for text files) on any fault. Readers
// never validate topology beyond what memory safety needs (node numbers in range); the
// validation of the set-up follows.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "mesh/MeshData.h"

// What the "DOMAIN" section hands to the readers, and what they report back for the log.
struct MeshReadOptions {
  std::int32_t typeOfElement = 0;  // grids: element type to build (0: 25 for vds2, 33 for vds3)
  std::int32_t typeOfGrid = 1;     // vds2: 1 the file is the grid, 2 geometry from gridFile
  std::string gridFile;            // vds2 with typeOfGrid 2
  // .2dm: unit codes of x/y and of z, and the attribute value of dry elements (-1: none).
  std::int32_t unitXY = kUnitMetre;
  std::int32_t unitZ = kUnitMetre;
  std::int32_t elementAttribute = -1;
};

struct MeshReadReport {
  std::vector<std::string> warnings;               // written with Warning()
  std::vector<std::pair<std::string, std::string>> values;  // (label, value) log lines
};

// The part of `path` after the last "." of its file name, in lower case ("" when none).
std::string MeshFileExtension(const std::string& path);

// Reader by extension of `path` (after the last ".", lower case), as the "DOMAIN" table gives.
void ReadMeshFile(MeshData& mesh, const std::string& path, const MeshReadOptions& options,
                  MeshReadReport& report);

// The readers themselves (path = the file named in the setup file).
void ReadMeshText(MeshData& mesh, const std::string& path, MeshReadReport& report);      // .mesh
void ReadMeshVdsu(MeshData& mesh, const std::string& path, MeshReadReport& report);      // .vdsu
void ReadMeshBasicVds1(MeshData& mesh, const std::string& path, MeshReadReport& report); // .vds1/.dt1
void ReadMeshBasicVds2(MeshData& mesh, const std::string& path, const MeshReadOptions& options,
                       MeshReadReport& report);                                          // .vds2
void ReadMeshBasicVds3(MeshData& mesh, const std::string& path, const MeshReadOptions& options,
                       MeshReadReport& report);                                          // .vds3
void ReadMeshFem(MeshData& mesh, const std::string& path, MeshReadReport& report);       // .fem
void ReadMeshGeo(MeshData& mesh, const std::string& path, MeshReadReport& report);       // .geo
void ReadMesh2dm(MeshData& mesh, const std::string& path, const MeshReadOptions& options,
                 MeshReadReport& report);                                                // .2dm
void ReadMeshBasicADCIRC(MeshData& mesh, const std::string& path, MeshReadReport& report); // .14
void ReadMeshBasicQUODDY(MeshData& mesh, const std::string& path, MeshReadReport& report); // .bat
void ReadMeshGmsh(MeshData& mesh, const std::string& path, MeshReadReport& report);      // .msh
// .node/.topo/.ele with the base name of `path`.
void ReadMeshNodeTopo(MeshData& mesh, const std::string& path, MeshReadReport& report);

// Parses the .mesh text held in memory (the file reader and the fuzz target use it); `name`
// is used in messages.
void ParseMeshText(MeshData& mesh, const char* data, std::size_t size, const std::string& name);
// Same for .2dm text.
void Parse2dmText(MeshData& mesh, const char* data, std::size_t size, const std::string& name,
                  const MeshReadOptions& options, MeshReadReport& report);
