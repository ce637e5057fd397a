// Completing a mesh after reading: validation, element orientation, reference elements, the
// face table, element and face geometry, connectivity, boundary sections and the log blocks.
// Every failure throws MeshError with the routine's message.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "mesh/MeshData.h"

// Checks that hold whatever "check_mesh" says (memory safety and usable geometry): node numbers
// of elements in range, node counts matching the type codes, finite coordinates and bed levels,
// no repeated node within an element, "LONG/LAT" latitudes within +-90 degrees (coordinates in
// radians). Throws on the first fault, naming the element or node.
void CheckMeshSafety(const MeshData& mesh);

// The validation of "check_mesh" > 0, in order: node identifiers, element identifiers, node
// numbers of elements, nodes used by no element. `unusedNodes` receives the log lines
// "Node not included in mesh: <n>" before the final "Nodes not included in mesh" error.
void ValidateMesh(const MeshData& mesh, std::vector<std::string>& unusedNodes);

// Turns clockwise 2-D elements counter-clockwise (corner order reversed, edge nodes following
// their edges); returns how many were turned. Zero-area elements stop with a message naming
// them. Uses the longitude wrap on "LONG/LAT" meshes.
std::int32_t OrientElements(MeshData& mesh);

// Reference elements: gives every element its shape id in g_shapes.
void SetupShapeData(MeshData& mesh);
// Dimension common to all elements.
std::int32_t GetMeshDimension(const MeshData& mesh);

// Node -> element lists (increasing element numbers).
void CreateNodeElementConnectivity(MeshData& mesh);
// Face table; selection 2 keeps every face, any other value the boundary faces only.
void CalcFaces(MeshData& mesh, int selection);
// Element and face geometry (node-level values of layered meshes come with the layers).
void CalcNodeValues(MeshData& mesh);
void CalcElementValues(MeshData& mesh);
void CalcFaceValues(MeshData& mesh);
// Element -> face lists: increasing face numbers, quadrilaterals in local face order.
void CreateElementFaceConnectivity(MeshData& mesh);
// Boundary sections from the node codes; returns false (no section) for the warning
// "SetupMeshSection: No boundary specified".
bool SetupMeshSection(MeshData& mesh);

// The 2-D set-up after reading and validation: shapes, faces, sections, geometry,
// connectivity. Warnings are appended to `warnings`.
void SetupMeshGeometry(MeshData& mesh, std::vector<std::string>& warnings);

// A log line of the mesh blocks: "  " + label padded to 27 characters + ": " + value.
std::string MeshLogLine(const std::string& label, const std::string& value);
// "Mesh information" and "Boundary information" blocks of a mesh, as log lines.
std::vector<std::string> MeshInformationLines(const MeshData& mesh, bool subdomain = false);
// "id = ..." block of a reference element; an id outside the table throws
// "PrintShapeData: Wrong shape id".
std::vector<std::string> ShapeDataLines(std::int32_t shapeId);
