// Mesh readers for data files: the flexible-mesh file (.vdsu) holds a mesh as it stands; line,
// grid and volume files (.vds1/.dt1, .vds2, .vds3) are turned into a mesh of their points or
// cells (docs/file-formats.md, "Meshes from data files").
#include <limits.h>
#include <stdlib.h>
#include <unistd.h>

#include <cmath>
#include <cstdint>
#include <string>
#include <type_traits>
#include <vector>

#include "io/DataFile.h"
#include "mesh/MeshReaders.h"
#include "platform/System.h"

namespace {

constexpr std::int64_t kMaxMeshCount = INT32_MAX - 2;

// The data-file record, closed however the reader leaves.
struct OpenFile {
  DataFile df;
  OpenFile() = default;
  OpenFile(const OpenFile&) = delete;
  OpenFile& operator=(const OpenFile&) = delete;
  ~OpenFile() {
    int status = 0;
    VdsClose(df, &status);
  }
};

// The data-file layer's message for a failed call: the code's text and the detail.
std::string LayerText(int code, const DataFile& df) {
  std::string text = VdsErrorMessage(code);
  if (!df.errorText.empty()) text += ": " + df.errorText;
  return text;
}

// "<routine>: <message>: <file>[ (<detail>)]"
MeshError Failure(const std::string& routine, const std::string& message, const std::string& file,
                  const std::string& detail = "") {
  std::string text = routine + ": " + message + ": " + file;
  if (!detail.empty()) text += " (" + detail + ")";
  return MeshError(text);
}

std::string ToText(std::int64_t v) { return std::to_string(v); }

// ---------------------------------------------------------------------------------------------
// Flexible-mesh files

template <class T>
void ReadMeshStatic(DataFile& df, int number, std::vector<T>& values, std::int64_t expected,
                    const std::string& path) {
  int status = 0;
  int rc = kVdsOk;
  if constexpr (std::is_same_v<T, std::int32_t>) rc = VdsReadStaticInt(df, number, values, &status);
  else rc = VdsReadStaticDouble(df, number, values, &status);
  if (rc != kVdsOk) throw MeshError(path + ": " + LayerText(status, df));
  if (static_cast<std::int64_t>(values.size()) != expected)
    throw MeshError(path + ": static item " + std::to_string(number) + " (" + df.statics[number - 1].name +
                    ") holds " + ToText(static_cast<std::int64_t>(values.size())) + " values, " +
                    ToText(expected) + " expected");
}

// ---------------------------------------------------------------------------------------------
// Line files: the layer opens files by their kind's extension, so a .dt1 file is opened
// through a temporary link named .vds1 (kept until the file is closed).

class KindLink {
 public:
  KindLink() = default;
  KindLink(const KindLink&) = delete;
  KindLink& operator=(const KindLink&) = delete;
  ~KindLink() {
    if (!link_.empty()) ::unlink(link_.c_str());
    if (!dir_.empty()) ::rmdir(dir_.c_str());
  }
  // The name to open `path` by; "" when no link can be made.
  std::string For(const std::string& path, const char* extension) {
    const char* tmp = std::getenv("TMPDIR");
    std::string pattern = std::string(tmp != nullptr && tmp[0] != '\0' ? tmp : "/tmp") + "/tavrin-mesh-XXXXXX";
    if (::mkdtemp(pattern.data()) == nullptr) return "";
    dir_ = pattern;
    std::string target = path;
    if (target.empty() || target[0] != '/') {
      char cwd[PATH_MAX];
      if (::getcwd(cwd, sizeof cwd) == nullptr) return "";
      target = std::string(cwd) + "/" + target;
    }
    const std::string link = dir_ + "/" + PathLeaf(path) + extension;
    if (::symlink(target.c_str(), link.c_str()) != 0) return "";
    link_ = link;
    return link_;
  }

 private:
  std::string dir_, link_;
};

// Opens a line, grid or volume file. A file of another kind fails with `wrongKind`, any other
// failure of the layer with `failed`.
void OpenEquidistant(OpenFile& file, KindLink& link, const std::string& path, VdsKind kind,
                     const std::string& routine, const char* wrongKind, const char* failed) {
  std::string name = path;
  if (VdsKindFromName(path) == VdsKind::kUnknown && kind == VdsKind::kVds1) {
    name = link.For(path, ".vds1");
    if (name.empty()) throw Failure(routine, failed, path, "no link of kind vds1 can be made");
  }
  int status = 0;
  if (VdsOpenRead(file.df, name, {}, &status) != kVdsOk)
    throw Failure(routine, status == kVdsFileType ? wrongKind : failed, path, LayerText(status, file.df));
  if (file.df.kind != kind)
    throw Failure(routine, wrongKind, path,
                  std::string("a .") + VdsKindName(file.df.kind) + " file, a ." + VdsKindName(kind) + " file is needed");
}

// Item 1 of an open file must lie on an equidistant axis of `dimension` dimensions.
void CheckAxis(const DataFile& df, int dimension, const std::string& routine, const char* message,
               const std::string& path) {
  if (df.itemCount < 1) throw Failure(routine, "Wrong number of items in file", path, "the file holds no items");
  const VdsItem& it = df.items[0];
  if (it.axis.dimension != dimension)
    throw Failure(routine, message, path,
                  "item 1 lies on a " + std::to_string(it.axis.dimension) + "-D axis, a " +
                      std::to_string(dimension) + "-D one is needed");
  std::int64_t product = 1;
  for (int a = 0; a < dimension; ++a) {
    if (it.axis.n[a] < 1 || !(it.axis.step[a] > 0.0) || !std::isfinite(it.axis.step[a]) ||
        !std::isfinite(it.axis.origin[a]))
      throw Failure(routine, message, path, "the axis of item 1 is not a valid equidistant axis");
    if (it.axis.n[a] > it.elements / product)
      throw Failure(routine, message, path, "the axis of item 1 does not match its " + ToText(it.elements) + " values");
    product *= it.axis.n[a];
  }
  if (product != it.elements)
    throw Failure(routine, message, path, "the axis of item 1 does not match its " + ToText(it.elements) + " values");
  if (!std::isfinite(df.origin[0]) || !std::isfinite(df.origin[1]) || !std::isfinite(df.orientation))
    throw Failure(routine, message, path, "the origin or orientation is not finite");
}

// Values of item 1 at the first time step.
std::vector<float> ReadFirstStep(DataFile& df, const std::string& routine, const char* message,
                                 const std::string& path) {
  const VdsItem& it = df.items[0];
  if (df.time.count < 1) throw Failure(routine, message, path, "the file holds no time step");
  std::vector<float> values(static_cast<std::size_t>(it.elements));
  int status = 0;
  if (VdsReadDynamic(df, 1, 0, values.data(), it.elements, 0, &status) != kVdsOk)
    throw Failure(routine, message, path, LayerText(status, df));
  return values;
}

bool IsValue(const DataFile& df, float v) { return std::isfinite(v) && v != df.deleteValue; }

// ---------------------------------------------------------------------------------------------
// Grids and volumes

struct GridGeometry {
  int dimension = 2;
  std::int64_t n[3] = {1, 1, 1};  // cells along x, y, z
  double origin[3] = {0, 0, 0};   // axis origin: the centre of the first cell
  double step[3] = {1, 1, 1};
  double x0 = 0.0, y0 = 0.0;      // the file's origin, in projected coordinates
  double orientation = 0.0;       // degrees
  std::string projection;
  std::int32_t axisUnit = kUnitMetre;
};

GridGeometry GeometryOf(const DataFile& df, int dimension) {
  GridGeometry g;
  g.dimension = dimension;
  const VdsSpatialAxis& a = df.items[0].axis;
  for (int d = 0; d < dimension; ++d) {
    g.n[d] = a.n[d];
    g.origin[d] = a.origin[d];
    g.step[d] = a.step[d];
  }
  g.x0 = df.origin[0];
  g.y0 = df.origin[1];
  g.orientation = df.orientation;
  g.projection = df.projection;
  g.axisUnit = a.unit;
  return g;
}

void ReadGrid(MeshData& mesh, const std::string& path, const MeshReadOptions& options,
              MeshReadReport& report, int dimension) {
  const bool volume = dimension == 3;
  const std::string routine = volume ? "ReadMeshBasicVds3" : "ReadMeshBasicVds2";
  const VdsKind kind = volume ? VdsKind::kVds3 : VdsKind::kVds2;
  std::int32_t elementType = options.typeOfElement != 0 ? options.typeOfElement : (volume ? 33 : 25);
  if (volume ? elementType != 33 : (elementType != 25 && elementType != 21))
    throw Failure(routine, "Element type not supported", path,
                  "type " + std::to_string(elementType) + "; grids give " + (volume ? "33" : "21 or 25"));
  if (options.typeOfGrid != 1 && options.typeOfGrid != 2)
    throw Failure(routine, "Grid type not supported", path, "type " + std::to_string(options.typeOfGrid));

  // Geometry and values: one file, or the geometry from the grid file and the values from the
  // bathymetry file on the same number of cells.
  KindLink link;  // grids and volumes are opened by their own names; declared before the files
  OpenFile gridFile, valueFile;
  GridGeometry geometry;
  if (options.typeOfGrid == 2) {
    if (VdsKindFromName(options.gridFile) != kind)
      throw Failure(routine, "Illegal input file", options.gridFile,
                    std::string("the grid file must be a .") + VdsKindName(kind) + " file");
    OpenEquidistant(gridFile, link, options.gridFile, kind, routine, "Wrong grid file", "Wrong grid file");
    CheckAxis(gridFile.df, dimension, routine, "Wrong grid file", options.gridFile);
    geometry = GeometryOf(gridFile.df, dimension);
    OpenEquidistant(valueFile, link, path, kind, routine, "Wrong bathy file", "Wrong bathy file");
    CheckAxis(valueFile.df, dimension, routine, "Wrong bathy file", path);
    for (int d = 0; d < dimension; ++d)
      if (valueFile.df.items[0].axis.n[d] != geometry.n[d])
        throw Failure(routine, "Wrong bathy file", path, "its grid differs in size from " + options.gridFile);
  } else {
    OpenEquidistant(valueFile, link, path, kind, routine, "Wrong mesh file", "Error Reading data file");
    CheckAxis(valueFile.df, dimension, routine, "Wrong mesh file", path);
    geometry = GeometryOf(valueFile.df, dimension);
  }
  DataFile& df = valueFile.df;
  const std::vector<float> values =
      ReadFirstStep(df, routine, options.typeOfGrid == 2 ? "Wrong bathy file" : "Error Reading data file", path);

  float land = 0.0f;
  int status = 0;
  const bool hasLand = VdsGetCustomBlockFloat(df, 4, land, &status) == kVdsOk;
  if (!hasLand) report.warnings.push_back("zland not found i file, all point included");

  const std::int64_t nx = geometry.n[0], ny = geometry.n[1], nz = volume ? geometry.n[2] : 1;
  const std::int64_t cx = nx + 1, cy = ny + 1, cz = volume ? nz + 1 : 1;  // corners
  if (cx * cy > kMaxMeshCount || cx * cy * cz > kMaxMeshCount)
    throw Failure(routine, "Wrong mesh file", path, "the grid has too many corners for a mesh");
  auto cell = [&](std::int64_t i, std::int64_t j, std::int64_t k) { return i + nx * (j + ny * k); };
  std::vector<char> water(static_cast<std::size_t>(nx * ny * nz));
  std::int64_t numWater = 0;
  for (std::size_t c = 0; c < water.size(); ++c) {
    water[c] = IsValue(df, values[c]) && (!hasLand || values[c] < land);
    numWater += water[c];
  }
  if (numWater == 0)
    throw Failure(routine, "Input bathymetry consists of pure land values. Mesh cannot be generated.", path);
  auto isWater = [&](std::int64_t i, std::int64_t j, std::int64_t k) {
    return i >= 0 && i < nx && j >= 0 && j < ny && k >= 0 && k < nz && water[cell(i, j, k)] != 0;
  };

  // Corners of water cells become nodes, in grid order. Corner (I, J, K) (0-based) is shared by
  // the cells I-1..I, J-1..J, K-1..K.
  const int kRange = volume ? 2 : 1;
  std::vector<std::int32_t> nodeOf(static_cast<std::size_t>(cx * cy * cz), 0);
  std::int32_t numNodes = 0;
  for (std::int64_t K = 0; K < cz; ++K)
    for (std::int64_t J = 0; J < cy; ++J)
      for (std::int64_t I = 0; I < cx; ++I) {
        bool used = false;
        for (int dk = 0; dk < kRange && !used; ++dk)
          for (int dj = 0; dj < 2 && !used; ++dj)
            for (int di = 0; di < 2 && !used; ++di) used = isWater(I - di, J - dj, volume ? K - dk : 0);
        if (used) nodeOf[static_cast<std::size_t>(I + cx * (J + cy * K))] = ++numNodes;
      }

  const double theta = geometry.orientation * kDegreesToRadians;
  const double cs = std::cos(theta), sn = std::sin(theta);
  const std::int64_t numElements = elementType == 21 ? 2 * numWater : numWater;
  const std::int32_t perElement = NodesOfType(elementType);
  try {
    AllocateNodes(mesh.nodes, numNodes);
    for (std::int64_t K = 0; K < cz; ++K)
      for (std::int64_t J = 0; J < cy; ++J)
        for (std::int64_t I = 0; I < cx; ++I) {
          if (nodeOf[static_cast<std::size_t>(I + cx * (J + cy * K))] == 0) continue;
          const double u = geometry.origin[0] + (static_cast<double>(I) - 0.5) * geometry.step[0];
          const double v = geometry.origin[1] + (static_cast<double>(J) - 0.5) * geometry.step[1];
          const double x = geometry.x0 + u * cs + v * sn;
          const double y = geometry.y0 - u * sn + v * cs;
          double sum = 0.0;
          int wet = 0;
          bool boundary = false;
          for (int dk = 0; dk < kRange; ++dk)
            for (int dj = 0; dj < 2; ++dj)
              for (int di = 0; di < 2; ++di) {
                const std::int64_t i = I - di, j = J - dj, k = volume ? K - dk : 0;
                if (!isWater(i, j, k)) {
                  boundary = true;
                  continue;
                }
                sum += values[cell(i, j, k)];
                ++wet;
              }
          const double z = volume ? geometry.origin[2] + (static_cast<double>(K) - 0.5) * geometry.step[2]
                                  : sum / wet;
          const std::int32_t number = mesh.nodes.numNodes + 1;
          AddNode(mesh.nodes, number, x, y, z, boundary ? 1 : 0);
        }

    AllocateElementsBasic(mesh.elements, numElements, numElements * perElement);
    auto corner = [&](std::int64_t I, std::int64_t J, std::int64_t K) {
      return nodeOf[static_cast<std::size_t>(I + cx * (J + cy * K))];
    };
    std::int32_t id = 0;
    for (std::int64_t k = 0; k < nz; ++k)
      for (std::int64_t j = 0; j < ny; ++j)
        for (std::int64_t i = 0; i < nx; ++i) {
          if (!isWater(i, j, k)) continue;
          // Counter-clockwise seen from above: south-west, south-east, north-east, north-west.
          const std::int32_t sw = corner(i, j, k), se = corner(i + 1, j, k), ne = corner(i + 1, j + 1, k),
                             nw = corner(i, j + 1, k);
          if (elementType == 25) {
            const std::int32_t quad[4] = {sw, se, ne, nw};
            AddElement(mesh.elements, ++id, 25, 4, quad);
          } else if (elementType == 21) {
            const std::int32_t lower[3] = {sw, se, ne}, upper[3] = {sw, ne, nw};
            AddElement(mesh.elements, ++id, 21, 3, lower);
            AddElement(mesh.elements, ++id, 21, 3, upper);
          } else {
            const std::int32_t hexa[8] = {sw, se, ne, nw, corner(i, j, k + 1), corner(i + 1, j, k + 1),
                                          corner(i + 1, j + 1, k + 1), corner(i, j + 1, k + 1)};
            AddElement(mesh.elements, ++id, 33, 8, hexa);
          }
        }
  } catch (const MeshError& e) {
    throw Failure(routine, e.what(), path);
  }

  mesh.projection = geometry.projection;
  mesh.dimension = dimension;
  if (volume) {
    mesh.itemType = kBathymetryItemType;
    mesh.unitCode = geometry.axisUnit;
  } else {
    mesh.itemType = df.items[0].itemType;
    mesh.unitCode = df.items[0].unit;
  }
  report.values.emplace_back("Grid cells", std::to_string(nx * ny * nz));
  report.values.emplace_back("Water cells", std::to_string(numWater));
}

}  // namespace

void ReadMeshVdsu(MeshData& mesh, const std::string& path, MeshReadReport& report) {
  OpenFile file;
  DataFile& df = file.df;
  int status = 0;
  if (VdsOpenRead(df, path, {}, &status) != kVdsOk) throw MeshError(path + ": " + LayerText(status, df));
  if (df.kind != VdsKind::kVdsu) throw MeshError(path + ": not a flexible-mesh data file");

  // Sizes from the custom block.
  std::int32_t numNodes = 0, numElements = 0, dimension = 2, layers = 0, sigma = 0;
  if (VdsGetCustomBlockInt(df, 1, numNodes, &status) != kVdsOk ||
      VdsGetCustomBlockInt(df, 2, numElements, &status) != kVdsOk)
    throw MeshError(path + ": the custom block holds no numbers of nodes and elements");
  if (numNodes < 1 || numElements < 1)
    throw MeshError(path + ": the file holds " + ToText(numNodes) + " nodes and " + ToText(numElements) +
                    " elements");
  if (VdsGetCustomBlockInt(df, 3, dimension, &status) != kVdsOk) {
    report.warnings.push_back("ndim not found in file, ndim = 2 assumed");
    dimension = 2;
  }
  if (dimension < 1 || dimension > 3)
    throw MeshError(path + ": mesh dimension " + ToText(dimension) + " is not 1, 2 or 3");
  if (VdsGetCustomBlockInt(df, 4, layers, &status) != kVdsOk) {
    report.warnings.push_back("nlayers not found i file, nlayers = 0 assumed");
    layers = 0;
  }
  if (layers < 0) throw MeshError(path + ": negative number of layers " + ToText(layers));
  mesh.dimension = dimension;
  mesh.numLayers = layers;
  mesh.verticalKind = mesh.numSigmaLayers = mesh.numZLevels = 0;
  if (dimension >= 2) {
    if (VdsGetCustomBlockInt(df, 5, sigma, &status) != kVdsOk) {
      if (dimension == 3) report.warnings.push_back("nlayers_sigma not found in file");
      sigma = layers;
    }
    if (sigma < 0 || sigma > layers)
      throw MeshError(path + ": " + ToText(sigma) + " sigma layers of " + ToText(layers) + " layers");
    mesh.verticalKind = sigma != layers ? 2 : 1;
    mesh.numSigmaLayers = sigma;
    mesh.numZLevels = layers - sigma;
  }

  // The nine static items, each checked against the custom block before use.
  if (VdsStaticCount(df) < 9)
    throw MeshError(path + ": the file holds " + ToText(VdsStaticCount(df)) + " static items, 9 expected");
  std::vector<std::int32_t> ids, codes, elementIds, types, counts, connectivity;
  std::vector<double> x, y, z;
  ReadMeshStatic(df, 1, ids, numNodes, path);
  ReadMeshStatic(df, 2, x, numNodes, path);
  ReadMeshStatic(df, 3, y, numNodes, path);
  ReadMeshStatic(df, 4, z, numNodes, path);
  ReadMeshStatic(df, 5, codes, numNodes, path);
  ReadMeshStatic(df, 6, elementIds, numElements, path);
  ReadMeshStatic(df, 7, types, numElements, path);
  ReadMeshStatic(df, 8, counts, numElements, path);
  std::int64_t total = 0;
  for (std::int32_t e = 0; e < numElements; ++e) {
    const std::int32_t expected = NodesOfType(types[e]);
    if (counts[e] < 1 || (expected != 0 && counts[e] != expected))
      throw MeshError(path + ": element " + ToText(e + 1) + " of type " + ToText(types[e]) + " has " +
                      ToText(counts[e]) + " nodes" + (expected != 0 ? ", the type has " + ToText(expected) : ""));
    total += counts[e];
  }
  ReadMeshStatic(df, 9, connectivity, total, path);
  for (std::size_t k = 0; k < connectivity.size(); ++k)
    if (connectivity[k] < 1 || connectivity[k] > numNodes)
      throw MeshError(path + ": node list entry " + ToText(static_cast<std::int64_t>(k + 1)) + " refers to node " +
                      ToText(connectivity[k]) + " of " + ToText(numNodes));

  // Nodes go to the position their identifier names; element node lists refer to identifiers.
  std::vector<std::int32_t> fromFile(static_cast<std::size_t>(numNodes) + 1, 0);
  bool ordered = true;
  for (std::int32_t k = 0; k < numNodes && ordered; ++k) ordered = ids[k] == k + 1;
  if (ordered) {
    for (std::int32_t k = 1; k <= numNodes; ++k) fromFile[k] = k - 1;
  } else {
    std::vector<char> seen(static_cast<std::size_t>(numNodes) + 1, 0);
    for (std::int32_t k = 0; k < numNodes; ++k) {
      const std::int32_t id = ids[k];
      if (id < 1 || id > numNodes || seen[id])
        throw MeshError(path + ": node identifiers are not a permutation of 1.." + ToText(numNodes) + " (node " +
                        ToText(k + 1) + " has identifier " + ToText(id) + ")");
      seen[id] = 1;
      fromFile[id] = k;
    }
    report.warnings.push_back("Reordering of node information");
  }

  try {
    AllocateNodes(mesh.nodes, numNodes);
    for (std::int32_t n = 1; n <= numNodes; ++n) {
      const std::int32_t k = fromFile[n];
      AddNode(mesh.nodes, n, x[k], y[k], z[k], codes[k]);
    }
    AllocateElementsBasic(mesh.elements, numElements, total);
    std::size_t at = 0;
    for (std::int32_t e = 0; e < numElements; ++e) {
      AddElement(mesh.elements, elementIds[e], types[e], counts[e], connectivity.data() + at);
      at += static_cast<std::size_t>(counts[e]);
    }
  } catch (const MeshError& e) {
    throw MeshError(path + ": " + e.what());
  }

  mesh.projection = df.projection;
  const VdsStaticItem& bed = df.statics[3];
  mesh.itemType = bed.itemType != 999 && bed.itemType != 0 ? bed.itemType : kBathymetryItemType;
  mesh.unitCode = bed.unit != 0 ? bed.unit : kUnitMetre;
}

void ReadMeshBasicVds1(MeshData& mesh, const std::string& path, MeshReadReport&) {
  const std::string routine = "ReadMeshBasicVds1";
  KindLink link;  // declared first: it must outlive the open file
  OpenFile file;
  OpenEquidistant(file, link, path, VdsKind::kVds1, routine, "Wrong mesh file", "Error Reading data file");
  DataFile& df = file.df;
  CheckAxis(df, 1, routine, "Wrong mesh file", path);
  const VdsSpatialAxis& axis = df.items[0].axis;
  const std::int64_t n = axis.n[0];
  if (n < 2) throw Failure(routine, "Wrong mesh file", path, "a line needs at least two points");
  const std::vector<float> bed = ReadFirstStep(df, routine, "Error Reading data file", path);
  for (std::int64_t i = 0; i < n; ++i)
    if (!IsValue(df, bed[i]))
      throw Failure(routine, "Error Reading data file", path, "point " + ToText(i + 1) + " has no bed level");
  try {
    AllocateNodes(mesh.nodes, n);
    for (std::int64_t i = 0; i < n; ++i)
      AddNode(mesh.nodes, static_cast<std::int32_t>(i + 1), axis.origin[0] + static_cast<double>(i) * axis.step[0],
              0.0, bed[i], i == 0 || i == n - 1 ? 1 : 0);
    AllocateElementsBasic(mesh.elements, n - 1, 2 * (n - 1));
    for (std::int32_t e = 1; e < n; ++e) {
      const std::int32_t line[2] = {e, e + 1};
      AddElement(mesh.elements, e, 11, 2, line);
    }
  } catch (const MeshError& e) {
    throw Failure(routine, e.what(), path);
  }
  mesh.projection = "NON-UTM";
  mesh.dimension = 1;
  mesh.itemType = df.items[0].itemType;
  mesh.unitCode = df.items[0].unit;
}

void ReadMeshBasicVds2(MeshData& mesh, const std::string& path, const MeshReadOptions& options,
                       MeshReadReport& report) {
  ReadGrid(mesh, path, options, report, 2);
}

void ReadMeshBasicVds3(MeshData& mesh, const std::string& path, const MeshReadOptions& options,
                       MeshReadReport& report) {
  ReadGrid(mesh, path, options, report, 3);
}
