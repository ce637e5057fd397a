// Data files as files: the summary text, what standard tools read, damaged and hostile files,
// the stop messages, and durability of flushed steps when the writing process is killed.
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <random>
#include <string>
#include <vector>

#include "driver/Log.h"
#include "io/DataFile.h"
#include "io/Units.h"
#include "MeshFiles.h"
#include "support/TestSupport.h"

namespace {

using tavrintest::ReadFile;
using tavrintest::TempDir;

// A point series of two items with `steps` steps: item k at step s holds k * 100 + s.
void WriteSeries(const std::string& file, int steps, int compression = 0) {
  DataFile df;
  VdsInitHeader(df, kVdsFileKindData, "Gauges", "Tavrin FM 0.1.0", 2);
  VdsSetCompression(df, compression);
  VdsSetTimeAxis(df, "2004-01-01 00:00:00", 600);
  VdsDefineItem(df, 1, 100079, "Gauge 1: Bathymetry", 1);
  VdsDefineItem(df, 2, kItemUndefined, "Gauge 1: Count", 1);
  VdsCreateFile(df, file);
  df.printSummary = false;
  for (int s = 0; s < steps; ++s) {
    for (int k = 1; k <= 2; ++k) {
      const float v = static_cast<float>(k * 100 + s);
      VdsWriteDynamic(df, k, &v, 1, 600.0 * s, s);
    }
    VdsEndTimeStep(df);
  }
  VdsClose(df);
}

std::string Command(const std::string& cmd, int* rc = nullptr) {
  std::string out;
  FILE* p = popen((cmd + " 2>&1").c_str(), "r");
  if (p == nullptr) return out;
  char buf[4096];
  std::size_t n = 0;
  while ((n = fread(buf, 1, sizeof buf, p)) > 0) out.append(buf, n);
  const int status = pclose(p);
  if (rc != nullptr) *rc = WIFEXITED(status) ? WEXITSTATUS(status) : -1;
  return out;
}

TEST(DataFileSummary, ClosingAWrittenFileLogsItsSummary) {
  TempDir dir;
  setenv("TAVRIN_LOG_NOPATH", "1", 1);
  ASSERT_TRUE(LogOpen(dir.file("run.log")));
  DataFile df;
  VdsInitHeader(df, kVdsFileKindData, "Gauges", "Tavrin FM 0.1.0", 2);
  VdsSetTimeAxis(df, "2004-01-01 00:00:00", 600);
  VdsDefineItem(df, 1, 100079, "Gauge 1: Bathymetry", 1);
  VdsDefineItem(df, 2, kItemUndefined, "Gauge 1: Count", 1);
  VdsCreateFile(df, dir.file("series.vds0"));
  const float values[3][2] = {{-2.5f, 1}, {kVdsDeleteValue, 2}, {4.25f, NAN}};
  for (int s = 0; s < 3; ++s) {
    VdsWriteDynamic(df, 1, &values[s][0], 1, 600.0 * s, s);
    VdsWriteDynamic(df, 2, &values[s][1], 1, 600.0 * s, s);
    VdsEndTimeStep(df);
  }
  VdsClose(df);
  LogClose();
  unsetenv("TAVRIN_LOG_NOPATH");
  const std::string log = ReadFile(dir.file("run.log"));
  const std::string summary = log.substr(log.find("\n\n") + 2);
  const ItemTypeInfo* bathymetry = FindItemType(100079);
  const ItemTypeInfo* undefined = FindItemType(kItemUndefined);
  auto pad = [](std::string s, std::size_t w) { return s.append(w > s.size() ? w - s.size() : 0, ' '); };
  const std::string expected =
      "------------------------- Data File Summary --------------------------\n"
      "  Creator: Tavrin FM 0.1.0\n"
      "  File   : series.vds0\n"
      "  Title  : Gauges\n"
      "  Time axis  : equidistant calendar\n"
      "  Start date : 2004-01-01\n"
      "  Start time : 00:00:00\n"
      "  Sets       : 3\n"
      "  Interval   : 600\n"
      "  Unit       : second\n"
      "  Axis       : single value\n"
      "  Dynamic items:\n"
      "    Name                          Type                               Minimum       Maximum  Unit\n"
      "    Gauge 1: Bathymetry           " + pad(bathymetry->name, 28) +
      "          -2.5          4.25  " + FindUnit(bathymetry->defaultUnit)->abbreviation + "\n"
      "    Gauge 1: Count                " + pad(undefined->name, 28) +
      "             1             2  " + FindUnit(undefined->defaultUnit)->abbreviation + "\n"
      "----------------------------------------------------------------------\n";
  // Delete values and NaN are left out of the statistics.
  EXPECT_EQ(summary, expected);
}

TEST(DataFileTools, NcdumpReadsEveryKindAndTheMeshTopologyIsComplete) {
  TempDir dir;
  WriteSeries(dir.file("a.vds0"), 2);
  int rc = 0;
  std::string header = Command("ncdump -h " + dir.file("a.vds0"), &rc);
  ASSERT_EQ(rc, 0) << header;
  EXPECT_NE(header.find("time = UNLIMITED ; // (2 currently)"), std::string::npos) << header;
  EXPECT_NE(header.find("time:units = \"seconds since 2004-01-01 00:00:00\""), std::string::npos);
  EXPECT_NE(header.find(":vds_kind = \"vds0\""), std::string::npos);
  EXPECT_NE(header.find("item_1:long_name = \"Gauge 1: Bathymetry\""), std::string::npos);
  EXPECT_NE(header.find("item_1:units = \"m\""), std::string::npos);
  EXPECT_NE(header.find("item_1:vds_item_type = 100079"), std::string::npos);
  EXPECT_NE(Command("ncdump -k " + dir.file("a.vds0")).find("cdf5"), std::string::npos);
  // Line, grid and volume files: items on the shared equidistant axes.
  const char* shapes[] = {"float item_1(time, x)", "float item_1(time, y, x)", "float item_1(time, z, y, x)"};
  for (int dimension = 1; dimension <= 3; ++dimension) {
    const std::string file = dir.file("axis.vds" + std::to_string(dimension));
    DataFile df;
    VdsInitHeader(df, kVdsFileKindData, "Axis", "test", 1);
    VdsSetTimeAxis(df, "2004-01-01 00:00:00", 60);
    VdsSpatialAxis axis;
    axis.dimension = dimension;
    VdsDefineItem(df, 1, kItemUndefined, "Value", 1 << dimension);
    for (int d = 0; d < dimension; ++d) axis.n[d] = 2;
    ASSERT_EQ(VdsSetItemAxis(df, 1, axis), 0);
    ASSERT_EQ(VdsCreateFile(df, file), 0);
    std::vector<float> v(1u << dimension, 1.0f);
    VdsWriteDynamic(df, 1, v.data(), static_cast<std::int64_t>(v.size()), 0, 0);
    df.printSummary = false;
    VdsClose(df);
    header = Command("ncdump -h " + file, &rc);
    ASSERT_EQ(rc, 0) << header;
    EXPECT_NE(header.find(shapes[dimension - 1]), std::string::npos) << header;
    EXPECT_NE(header.find("double x(x)"), std::string::npos) << header;
  }

  // A mixed triangle/quadrilateral mesh file.
  DataFile df;
  const std::string mesh = dir.file("m.vdsu");
  const double x[5] = {0, 1, 0, 2, 2}, y[5] = {0, 0, 1, 0, 1};
  ASSERT_TRUE(tavrintest::CreateTwoElementMesh(df, mesh, x, y));
  const float v[2] = {1, 2};
  VdsWriteDynamic(df, 1, v, 2, 0, 0);
  VdsEndTimeStep(df);
  df.printSummary = false;
  VdsClose(df);
  header = Command("ncdump -h " + mesh, &rc);
  ASSERT_EQ(rc, 0) << header;
  for (const char* text :
       {":Conventions = \"CF-1.8 UGRID-1.0\"", "mesh:cf_role = \"mesh_topology\"",
        "mesh:topology_dimension = 2", "mesh:node_coordinates = \"mesh_node_x mesh_node_y\"",
        "mesh:face_node_connectivity = \"mesh_face_nodes\"", "mesh:face_dimension = \"nMesh_face\"",
        "mesh:face_coordinates = \"mesh_face_x mesh_face_y\"",
        "int mesh_face_nodes(nMesh_face, nMaxMesh_face_nodes)", "mesh_face_nodes:_FillValue = -1",
        "mesh_face_nodes:start_index = 1", "double mesh_node_x(nMesh_node)",
        "float item_1(time, nMesh_face)", "item_1:mesh = \"mesh\"", "item_1:location = \"face\"",
        "item_1:grid_mapping = \"crs\"", "crs:crs_wkt = \"PROJCRS[\\\"WGS 84 / UTM zone 32N\\\"",
        ":TAVRIN_FM = 5, 2, 2, 0, 0"})
    EXPECT_NE(header.find(text), std::string::npos) << text << "\n" << header;
  // The quadrilateral's face row holds four nodes, the triangle's is padded.
  const std::string data = Command("ncdump -v mesh_face_nodes,mesh_face_x " + mesh);
  EXPECT_NE(data.find("mesh_face_nodes =\n  1, 2, 3, _,\n  2, 4, 5, 3 ;"), std::string::npos) << data;
  EXPECT_NE(data.find("mesh_face_x = 0.333333333333333, 1.25 ;"), std::string::npos) << data;
}

TEST(DataFileDamage, BadFilesGiveOpenErrorsNeverACrash) {
  TempDir dir;
  DataFile df;
  int st = 0;
  EXPECT_EQ(VdsOpenRead(df, dir.file("missing.vdsu"), {}, &st), kVdsOpen);
  mkdir(dir.file("folder.vdsu").c_str(), 0755);
  EXPECT_EQ(VdsOpenRead(df, dir.file("folder.vdsu"), {}, &st), kVdsOpen);
  EXPECT_EQ(VdsOpenRead(df, dir.write("empty.vdsu", ""), {}, &st), kVdsOpen);
  EXPECT_EQ(VdsOpenRead(df, dir.write("text.vdsu", "TesselHD { }\nnot a data file\n"), {}, &st), kVdsOpen);
  // A series opened as a mesh file: wrong kind.
  WriteSeries(dir.file("s.vds0"), 3);
  std::rename(dir.file("s.vds0").c_str(), dir.file("s.vdsu").c_str());
  EXPECT_EQ(VdsOpenRead(df, dir.file("s.vdsu"), {}, &st), kVdsFileType);
  std::rename(dir.file("s.vdsu").c_str(), dir.file("s.vds0").c_str());
  // Requirements: item numbers and unit kinds.
  EXPECT_EQ(VdsOpenRead(df, dir.file("s.vds0"), {{3, 0}}, &st), kVdsItemNumber);
  const std::int32_t length = FindItemType(100079)->unitKind;
  EXPECT_EQ(VdsOpenRead(df, dir.file("s.vds0"), {{1, length}}, &st), kVdsOk);
  VdsClose(df);
  EXPECT_EQ(VdsOpenRead(df, dir.file("s.vds0"), {{2, length}}, &st), kVdsItem);
  EXPECT_NE(df.errorText.find("The Item type: 999 does not have the required unit type: "), std::string::npos)
      << df.errorText;
  // Out-of-range reads.
  ASSERT_EQ(VdsOpenRead(df, dir.file("s.vds0")), 0);
  float v[2];
  EXPECT_EQ(VdsReadDynamic(df, 3, 0, v, 1, 0, &st), kVdsItemNumber);
  EXPECT_EQ(VdsReadDynamic(df, 1, 3, v, 1, 0, &st), kVdsReadDynamic);
  EXPECT_EQ(VdsReadDynamic(df, 1, 0, v, 0, 0, &st), kVdsReadDynamic);  // no room
  EXPECT_EQ(VdsReadDynamic(df, 1, 0, v, 1, kUnitDegree, &st), kVdsReadDynamic);  // other kind
  // A file open for reading is never overwritten by a new result file.
  DataFile out;
  VdsInitHeader(out, kVdsFileKindData, "Overwrite", "test", 1);
  VdsSetTimeAxis(out, "2004-01-01 00:00:00", 600);
  VdsDefineItem(out, 1, kItemUndefined, "X", 1);
  EXPECT_EQ(VdsCreateFile(out, dir.file("s.vds0"), &st), kVdsCreateFile);
  VdsClose(df);
}

TEST(DataFileDamage, TruncatedFilesAreRefusedAtEveryCut) {
  TempDir dir;
  for (int compression = 0; compression <= 1; ++compression) {
    const std::string good = dir.file(compression ? "packed.vds0" : "plain.vds0");
    WriteSeries(good, 20, compression);
    const std::string bytes = ReadFile(good);
    std::mt19937 random(12345 + compression);
    std::uniform_int_distribution<std::size_t> cut(0, bytes.size() - 1);
    const std::string damaged = dir.file("cut.vds0");
    for (int i = 0; i < 100; ++i) {
      const std::size_t at = i < 4 ? bytes.size() - 1 - i : cut(random);
      std::ofstream(damaged, std::ios::binary | std::ios::trunc).write(bytes.data(), static_cast<std::streamsize>(at));
      DataFile df;
      int st = 0;
      if (VdsOpenRead(df, damaged, {}, &st) == kVdsOk) {
        // A file that opens must give back exactly what was written, or refuse the read.
        for (std::int64_t s = 0; s < df.time.count; ++s)
          for (int k = 1; k <= df.itemCount; ++k) {
            float v = 0;
            if (VdsReadDynamic(df, k, s, &v, 1, 0, &st) == kVdsOk) {
              ASSERT_EQ(v, static_cast<float>(k * 100 + s)) << "cut at " << at << " of " << bytes.size();
            }
          }
        VdsClose(df);
      } else {
        EXPECT_TRUE(st == kVdsOpen || st == kVdsFileType || st == kVdsTimeAxis || st == kVdsItem ||
                    st == kVdsGetCustom || st == kVdsStaticCount)
            << st;
      }
    }
  }
}

TEST(DataFileStops, FailuresWithoutStatusStopTheRun) {
  TempDir dir;
  EXPECT_EXIT(
      {
        DataFile df;
        VdsOpenRead(df, dir.file("nothing.vds0"));
      },
      ::testing::ExitedWithCode(1), "VDS open error on /");
  EXPECT_EXIT(
      {
        DataFile df;
        VdsInitHeader(df, kVdsFileKindData, "t", "c", 2);
        VdsDefineItem(df, 3, kItemUndefined, "x", 1);
      },
      ::testing::ExitedWithCode(1), "VDS Error: Invalid item number");
  EXPECT_EQ(VdsErrorMessage(999), "Unknown error: 999");
}

// A child writes steps and reports each flushed step through a pipe; the parent kills it with
// SIGKILL at a random moment. The file must open and hold every reported step, exactly.
TEST(DataFileDurability, KilledWriterLeavesEveryFlushedStep) {
  TempDir dir;
  std::mt19937 random(2024);
  std::uniform_int_distribution<int> wait(0, 25000);
  const std::int64_t elements = 20000;
  for (int round = 0; round < 30; ++round) {
    const std::string file = dir.file("live.vdsu");
    int fds[2];
    ASSERT_EQ(pipe(fds), 0);
    const pid_t pid = fork();
    ASSERT_GE(pid, 0);
    if (pid == 0) {
      close(fds[0]);
      DataFile df;
      VdsInitHeader(df, kVdsFileKindData, "Live", "test", 2);
      VdsSetDataType(df, 2000);
      const std::int32_t block[5] = {3, static_cast<std::int32_t>(elements), 2, 0, 0};
      for (int i = 0; i < 5; ++i) VdsSetCustomBlockInt(df, i + 1, block[i]);
      VdsSetTimeAxis(df, "2004-01-01 00:00:00", 1.5);
      VdsDefineItem(df, 1, kItemUndefined, "A", elements);
      VdsDefineItem(df, 2, kItemUndefined, "B", elements);
      int st = 0;
      if (VdsCreateFile(df, file, &st) != 0) _exit(3);
      const std::int32_t ids[3] = {1, 2, 3};
      const double xy[3] = {0, 1, 0};
      const float z[3] = {};
      std::vector<std::int32_t> eid(elements), type(elements, 21), count(elements, 3), nodes;
      for (std::int64_t e = 0; e < elements; ++e) {
        eid[e] = static_cast<std::int32_t>(e + 1);
        nodes.insert(nodes.end(), {1, 2, 3});
      }
      VdsWriteStaticInt(df, ids, 3);
      VdsWriteStaticDouble(df, xy, 3);
      VdsWriteStaticDouble(df, xy, 3);
      VdsWriteStaticFloat(df, z, 3);
      VdsWriteStaticInt(df, ids, 3);
      VdsWriteStaticInt(df, eid.data(), elements);
      VdsWriteStaticInt(df, type.data(), elements);
      VdsWriteStaticInt(df, count.data(), elements);
      VdsWriteStaticInt(df, nodes.data(), static_cast<std::int64_t>(nodes.size()));
      std::vector<float> v(elements);
      for (std::int32_t s = 0;; ++s) {
        for (int k = 1; k <= 2; ++k) {
          for (std::int64_t e = 0; e < elements; ++e) v[e] = static_cast<float>(s * 4 + k) + 0.5f * (e % 3);
          if (VdsWriteDynamic(df, k, v.data(), elements, 1.5 * s, s, &st) != 0) _exit(4);
        }
        if (VdsEndTimeStep(df, &st) != 0) _exit(5);
        if (write(fds[1], &s, sizeof s) != sizeof s) _exit(6);
      }
    }
    close(fds[1]);
    // Wait for the first flushed step, then a random while more.
    std::int32_t last = -1, s = 0;
    ASSERT_EQ(read(fds[0], &s, sizeof s), static_cast<ssize_t>(sizeof s));
    last = s;
    usleep(static_cast<useconds_t>(wait(random)));
    kill(pid, SIGKILL);
    while (read(fds[0], &s, sizeof s) == static_cast<ssize_t>(sizeof s)) last = s;
    close(fds[0]);
    int status = 0;
    waitpid(pid, &status, 0);
    ASSERT_TRUE(WIFSIGNALED(status)) << "writer stopped by itself: " << WEXITSTATUS(status);

    DataFile in;
    int st = 0;
    ASSERT_EQ(VdsOpenRead(in, file, {}, &st), 0) << "round " << round << ": " << in.errorText;
    ASSERT_GE(in.time.count, last + 1) << "round " << round;
    std::vector<float> v(elements);
    for (std::int64_t step = 0; step <= last; step += std::max<std::int64_t>(1, last / 5)) {
      EXPECT_EQ(VdsStepNumber(in, step), step);
      EXPECT_EQ(VdsStepTime(in, step), 1.5 * static_cast<double>(step));
      for (int k = 1; k <= 2; ++k) {
        ASSERT_EQ(VdsReadDynamic(in, k, step, v.data(), elements), 0);
        ASSERT_EQ(v[elements - 1], static_cast<float>(step * 4 + k) + 0.5f * ((elements - 1) % 3));
      }
    }
    VdsClose(in);
  }
}

TEST(FileUnits, CreateOpenAndCloseSideFiles) {
  TempDir dir;
  int st = 0;
  const int unit = FileUnitCreate(dir.file("side/points.txt"), false, &st);
  ASSERT_EQ(st, 0);
  std::fputs("1 2\n", FileUnitStream(unit));
  EXPECT_EQ(FileUnitClose(unit, &st), 0);
  EXPECT_EQ(FileUnitStream(unit), nullptr);
  const int again = FileUnitOpenRead(dir.file("side/points.txt"), &st);
  EXPECT_EQ(again, unit);  // units return to the pool
  FileUnitClose(again);
  EXPECT_EQ(FileUnitOpenRead(dir.file("none.txt"), &st), -1);
  EXPECT_EQ(FileUnitClose(12345, &st), -1);
  EXPECT_EXIT(FileUnitOpenRead(dir.path()), ::testing::ExitedWithCode(1), "Unable to open file /");
}

}  // namespace
