// Mesh set-up throughput: writes a .mesh file of a triangulated rectangle (250k, 1M and 4M
// triangles by default, or the sizes given as arguments) and times each phase of the set-up
// with 1 and 2 threads: reading, validation (safety checks, identifiers, unused nodes,
// orientation), faces (node-element lists and the face table), geometry (elements and faces),
// and the rest (shapes, sections, element-face lists). Memory is the heap the finished mesh
// holds (glibc mallinfo2 before and after) per element.
//
// The file goes to TAVRIN_BENCH_DIR (default: the current folder) and is removed afterwards.
#include <malloc.h>
#include <omp.h>

#include <chrono>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

#include "mesh/Domain.h"
#include "mesh/MeshGeometry.h"
#include "mesh/MeshReaders.h"

namespace {

using Clock = std::chrono::steady_clock;

double Seconds(Clock::time_point a, Clock::time_point b) {
  return std::chrono::duration<double>(b - a).count();
}

// nx x ny cells of two triangles each, nodes row by row with a little jitter so the geometry
// is not trivially regular; the outline nodes carry code 1, the left column code 2.
void WriteMesh(const std::string& file, long nx, long ny) {
  std::FILE* f = std::fopen(file.c_str(), "w");
  if (f == nullptr) {
    std::perror(file.c_str());
    std::exit(1);
  }
  const long nodes = (nx + 1) * (ny + 1);
  std::fprintf(f, "100079 1000 %ld NON-UTM\n", nodes);
  long id = 0;
  for (long j = 0; j <= ny; ++j)
    for (long i = 0; i <= nx; ++i) {
      const bool edge = i == 0 || j == 0 || i == nx || j == ny;
      const double jitter = edge ? 0.0 : 0.1 * std::sin(0.7 * double(i) + 1.3 * double(j));
      std::fprintf(f, "%ld %.3f %.3f %.3f %d\n", ++id, 10.0 * i + jitter, 10.0 * j - jitter,
                   -5.0 - 0.001 * double(i), i == 0 ? 2 : edge ? 1 : 0);
    }
  std::fprintf(f, "%ld 3 21\n", 2 * nx * ny);
  id = 0;
  for (long j = 0; j < ny; ++j)
    for (long i = 0; i < nx; ++i) {
      const long n1 = j * (nx + 1) + i + 1, n2 = n1 + 1, n3 = n2 + nx + 1, n4 = n1 + nx + 1;
      std::fprintf(f, "%ld %ld %ld %ld\n", ++id, n1, n2, n3);
      std::fprintf(f, "%ld %ld %ld %ld\n", ++id, n1, n3, n4);
    }
  std::fclose(f);
}

// Heap in use: small chunks in the arenas plus the large chunks malloc maps on their own.
std::size_t HeapInUse() {
  const struct mallinfo2 mi = mallinfo2();
  return mi.uordblks + mi.hblkhd;
}

struct Phases {
  double read = 0, validate = 0, faces = 0, geometry = 0, rest = 0;
  double Total() const { return read + validate + faces + geometry + rest; }
  double bytesPerElement = 0;
};

Phases SetUp(const std::string& file, long elements) {
  Phases p;
  ResetMeshTables();
  const std::size_t heap0 = HeapInUse();
  MeshData m;
  MeshReadReport report;
  auto t0 = Clock::now();
  ReadMeshText(m, file, report);
  auto t1 = Clock::now();
  CheckMeshSafety(m);
  std::vector<std::string> unused;
  ValidateMesh(m, unused);
  OrientElements(m);
  m.nodes.z0.assign(m.nodes.z.begin(), m.nodes.z.end());
  auto t2 = Clock::now();
  SetupShapeData(m);
  CreateNodeElementConnectivity(m);
  CalcFaces(m, 2);
  auto t3 = Clock::now();
  CalcNodeValues(m);
  auto t4 = Clock::now();
  SetupMeshSection(m);
  CreateElementFaceConnectivity(m);
  auto t5 = Clock::now();
  const std::size_t heap1 = HeapInUse();
  p.read = Seconds(t0, t1);
  p.validate = Seconds(t1, t2);
  p.faces = Seconds(t2, t3);
  p.geometry = Seconds(t3, t4);
  p.rest = Seconds(t4, t5);
  p.bytesPerElement = double(heap1 - heap0) / double(elements);
  if (m.faces.numFaces <= 0 || m.sections.size() != 2) {
    std::fprintf(stderr, "unexpected mesh: %d faces, %zu sections\n", m.faces.numFaces,
                 m.sections.size());
    std::exit(1);
  }
  return p;
}

}  // namespace

int main(int argc, char** argv) {
  std::vector<long> sizes;  // triangles
  for (int i = 1; i < argc; ++i) sizes.push_back(std::atol(argv[i]));
  if (sizes.empty()) sizes = {250000, 1000000, 4000000};
  const char* dir = std::getenv("TAVRIN_BENCH_DIR");
  const std::string file = std::string(dir != nullptr ? dir : ".") + "/bench_mesh.mesh";

  std::printf("%10s %7s %8s %8s %8s %8s %8s %8s %10s\n", "triangles", "threads", "read_s",
              "valid_s", "faces_s", "geom_s", "rest_s", "total_s", "bytes/el");
  for (const long n : sizes) {
    const long ny = static_cast<long>(std::sqrt(double(n) / 8.0));  // cells 4:1
    const long nx = n / (2 * ny);
    WriteMesh(file, nx, ny);
    for (const int threads : {1, 2}) {
      omp_set_num_threads(threads);
      Phases best;
      for (int rep = 0; rep < 3; ++rep) {  // best of three: the machine is shared
        const Phases p = SetUp(file, 2 * nx * ny);
        if (rep == 0 || p.Total() < best.Total()) best = p;
      }
      std::printf("%10ld %7d %8.3f %8.3f %8.3f %8.3f %8.3f %8.3f %10.0f\n", 2 * nx * ny, threads,
                  best.read, best.validate, best.faces, best.geometry, best.rest, best.Total(),
                  best.bytesPerElement);
      std::fflush(stdout);
    }
  }
  std::remove(file.c_str());
  return 0;
}
