// Data-file throughput: a flexible-mesh result of 1,000,000 elements x 4 items x 50 steps
// (800 MB of values) written through the data-file layer (synchronised after every step, as a
// run writes it) against the same bytes written with plain write(2) to the same disk, and the
// time to read one item of one step back.
//
// The files go to TAVRIN_BENCH_DIR (default: the current folder) and are removed afterwards.
#include <benchmark/benchmark.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

#include "io/DataFile.h"
#include "io/Units.h"

namespace {

constexpr std::int64_t kElements = 1000000;
constexpr int kItems = 4;
constexpr int kSteps = 50;
constexpr std::int64_t kNodes = kElements / 2 + 1002;  // a strip of triangles

std::string BenchFile(const char* leaf) {
  const char* dir = std::getenv("TAVRIN_BENCH_DIR");
  return std::string(dir != nullptr ? dir : ".") + "/" + leaf;
}

std::vector<float>& Values() {
  static std::vector<float> v = [] {
    std::vector<float> out(static_cast<std::size_t>(kElements));
    for (std::int64_t e = 0; e < kElements; ++e) out[e] = 0.001f * static_cast<float>(e % 9973);
    return out;
  }();
  return v;
}

// The mesh of the file, built once outside the timed writes.
struct MeshArrays {
  std::vector<std::int32_t> ids, eids, types, counts, nodes;
  std::vector<double> x, y;
  std::vector<float> z;
};
const MeshArrays& Mesh() {
  static const MeshArrays mesh = [] {
    MeshArrays m;
    m.ids.resize(kNodes);
    m.eids.resize(kElements);
    m.types.assign(kElements, 21);
    m.counts.assign(kElements, 3);
    m.x.resize(kNodes);
    m.y.resize(kNodes);
    m.z.assign(kNodes, -5.0f);
    std::vector<std::int32_t>& ids = m.ids;
    std::vector<std::int32_t>& eids = m.eids;
    std::vector<std::int32_t>& nodes = m.nodes;
    std::vector<double>& x = m.x;
    std::vector<double>& y = m.y;
    const std::int64_t half = kNodes / 2;
    for (std::int64_t n = 0; n < kNodes; ++n) {
      ids[n] = static_cast<std::int32_t>(n + 1);
      x[n] = static_cast<double>(n % half);
      y[n] = static_cast<double>(n / half);
    }
    nodes.reserve(static_cast<std::size_t>(3 * kElements));
    for (std::int64_t e = 0; e < kElements; ++e) {
      eids[e] = static_cast<std::int32_t>(e + 1);
      const std::int32_t i = static_cast<std::int32_t>(e / 2 % (half - 1)) + 1;
      if (e % 2 == 0) nodes.insert(nodes.end(), {i, i + 1, static_cast<std::int32_t>(i + half)});
      else nodes.insert(nodes.end(), {i + 1, static_cast<std::int32_t>(i + 1 + half), static_cast<std::int32_t>(i + half)});
    }
    return m;
  }();
  return mesh;
}

// Both writers end with fsync, so the figures are the disk's, not the page cache's.
void SyncToDisk(const std::string& file) {
  const int fd = ::open(file.c_str(), O_RDONLY);
  if (fd >= 0) {
    ::fsync(fd);
    ::close(fd);
  }
}

// Writes the whole file; returns the bytes of the file.
double WriteMeshFile(const std::string& file) {
  DataFile df;
  VdsInitHeader(df, kVdsFileKindData, "Benchmark", "bench", kItems);
  VdsSetDataType(df, 2000);
  const std::int32_t block[5] = {static_cast<std::int32_t>(kNodes), static_cast<std::int32_t>(kElements), 2, 0, 0};
  for (int i = 0; i < 5; ++i) VdsSetCustomBlockInt(df, i + 1, block[i]);
  VdsSetProjection(df, "UTM-32", 0, 0);
  VdsSetTimeAxis(df, "2004-01-01 00:00:00", 600);
  for (int k = 1; k <= kItems; ++k) VdsDefineItem(df, k, kItemUndefined, "Item " + std::to_string(k), kElements);
  VdsCreateFile(df, file);
  df.printSummary = false;
  const MeshArrays& m = Mesh();
  VdsWriteStaticInt(df, m.ids.data(), kNodes);
  VdsWriteStaticDouble(df, m.x.data(), kNodes);
  VdsWriteStaticDouble(df, m.y.data(), kNodes);
  VdsWriteStaticFloat(df, m.z.data(), kNodes);
  VdsWriteStaticInt(df, m.ids.data(), kNodes);
  VdsWriteStaticInt(df, m.eids.data(), kElements);
  VdsWriteStaticInt(df, m.types.data(), kElements);
  VdsWriteStaticInt(df, m.counts.data(), kElements);
  VdsWriteStaticInt(df, m.nodes.data(), static_cast<std::int64_t>(m.nodes.size()));
  const std::vector<float>& v = Values();
  for (int s = 0; s < kSteps; ++s) {
    for (int k = 1; k <= kItems; ++k) VdsWriteDynamic(df, k, v.data(), kElements, 600.0 * s, s);
    VdsEndTimeStep(df);
  }
  VdsClose(df);
  SyncToDisk(file);
  struct stat st {};
  ::stat(file.c_str(), &st);
  return static_cast<double>(st.st_size);
}

void BM_WriteMeshFile(benchmark::State& state) {
  const std::string file = BenchFile("bench_write.vdsu");
  double bytes = 0;
  for (auto _ : state) bytes += WriteMeshFile(file);
  state.counters["MB_per_s"] = benchmark::Counter(bytes / 1e6, benchmark::Counter::kIsRate);
  state.counters["file_MB"] = bytes / 1e6 / static_cast<double>(state.iterations());
  std::remove(file.c_str());
}
BENCHMARK(BM_WriteMeshFile)->Unit(benchmark::kMillisecond)->Iterations(2)->UseRealTime();

// Size of the file the layer writes (header, mesh and records).
double MeshFileBytes() {
  static const double bytes = [] {
    const std::string file = BenchFile("bench_size.vdsu");
    WriteMeshFile(file);
    struct stat st {};
    ::stat(file.c_str(), &st);
    std::remove(file.c_str());
    return static_cast<double>(st.st_size);
  }();
  return bytes;
}

// The same number of bytes as the layer's file with write(2), in pieces of one item and step.
void BM_WritePlain(benchmark::State& state) {
  const std::string file = BenchFile("bench_write.raw");
  const std::vector<float>& v = Values();
  const int pieces = static_cast<int>(MeshFileBytes() / static_cast<double>(v.size() * sizeof(float)) + 0.5);
  double bytes = 0;
  for (auto _ : state) {
    const int fd = ::open(file.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0644);
    for (int s = 0; s < pieces; ++s) {
      for (int k = 0; k < 1; ++k) {
        const char* p = reinterpret_cast<const char*>(v.data());
        std::size_t left = v.size() * sizeof(float);
        while (left > 0) {
          const ssize_t n = ::write(fd, p, left);
          if (n <= 0) break;
          p += n;
          left -= static_cast<std::size_t>(n);
        }
        bytes += static_cast<double>(v.size() * sizeof(float));
      }
    }
    ::fsync(fd);
    ::close(fd);
  }
  state.counters["MB_per_s"] = benchmark::Counter(bytes / 1e6, benchmark::Counter::kIsRate);
  state.counters["file_MB"] = bytes / 1e6 / static_cast<double>(state.iterations());
  std::remove(file.c_str());
}
BENCHMARK(BM_WritePlain)->Unit(benchmark::kMillisecond)->Iterations(2)->UseRealTime();

// One item of one step from the middle of the file, opened once.
void BM_ReadOneItemStep(benchmark::State& state) {
  const std::string file = BenchFile("bench_read.vdsu");
  WriteMeshFile(file);
  DataFile df;
  VdsOpenRead(df, file);
  std::vector<float> v(static_cast<std::size_t>(kElements));
  int step = 0;
  for (auto _ : state) {
    VdsReadDynamic(df, 1 + step % kItems, (step * 7) % kSteps, v.data(), kElements);
    ++step;
    benchmark::DoNotOptimize(v.data());
  }
  VdsClose(df);
  std::remove(file.c_str());
}
BENCHMARK(BM_ReadOneItemStep)->Unit(benchmark::kMillisecond)->UseRealTime();

}  // namespace

BENCHMARK_MAIN();
