// The data-file layer: round trips of every kind and time axis, the write order rules, the
// summary, bad and damaged files, and durability of flushed steps when the writer is killed.
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cmath>
#include <cstdio>
#include <fstream>
#include <random>
#include <string>
#include <vector>

#include <netcdf.h>

#include "driver/Log.h"
#include "io/DataFile.h"
#include "io/Units.h"
#include "support/TestSupport.h"

namespace {

using tavrintest::TempDir;

// Value of element e of item k at step s: exact in float.
float Value(int k, int s, std::int64_t e) { return static_cast<float>(k * 1000 + s * 10) + 0.25f * (e % 8); }

// A two-element mesh: a triangle and a quadrilateral sharing an edge.
//   4---3---6
//   |  / \  |   nodes 1..6; element 1 = (1,2,3) triangle, element 2 = (2,5,6,3) quad
//   1-2---5-+
void DefineMesh(DataFile& df, int items, std::int32_t dataType = 2000) {
  ASSERT_EQ(VdsInitHeader(df, kVdsFileKindData, "Mesh test", "Tavrin FM test", items), 0);
  VdsSetDataType(df, dataType);
  const std::int32_t block[5] = {6, 2, 2, 0, 0};
  for (int i = 0; i < 5; ++i) VdsSetCustomBlockInt(df, i + 1, block[i]);
  VdsSetProjection(df, "UTM-32", 500000.0, 6100000.0);
  VdsSetTimeAxis(df, "2004-02-28 23:00:00", 1800.0);
}

void WriteMeshStatics(DataFile& df) {
  const std::int32_t ids[6] = {1, 2, 3, 4, 5, 6}, codes[6] = {1, 0, 0, 1, 2, 2};
  const double x[6] = {500000.5, 500001.5, 500001.0, 500000.0, 500002.5, 500003.0};
  const double y[6] = {6100000.25, 6100000.0, 6100001.0, 6100001.0, 6100000.0, 6100001.0};
  const float z[6] = {-1, -2, -3, -1.5f, -2.5f, -4};
  const std::int32_t eids[2] = {1, 2}, types[2] = {21, 25}, counts[2] = {3, 4};
  const std::int32_t nodes[7] = {1, 2, 3, 2, 5, 6, 3};
  ASSERT_EQ(VdsWriteStaticInt(df, ids, 6), 0);
  ASSERT_EQ(VdsWriteStaticDouble(df, x, 6), 0);
  ASSERT_EQ(VdsWriteStaticDouble(df, y, 6), 0);
  ASSERT_EQ(VdsWriteStaticFloat(df, z, 6), 0);
  ASSERT_EQ(VdsWriteStaticInt(df, codes, 6), 0);
  ASSERT_EQ(VdsWriteStaticInt(df, eids, 2), 0);
  ASSERT_EQ(VdsWriteStaticInt(df, types, 2), 0);
  ASSERT_EQ(VdsWriteStaticInt(df, counts, 2), 0);
  ASSERT_EQ(VdsWriteStaticInt(df, nodes, 7), 0);
}

// Writes `steps` steps of every item with Value(); returns false on the first failure.
bool WriteSteps(DataFile& df, int steps, double dt) {
  for (int s = 0; s < steps; ++s)
    for (int k = 1; k <= df.itemCount; ++k) {
      std::vector<float> v(static_cast<std::size_t>(df.items[k - 1].elements));
      for (std::size_t e = 0; e < v.size(); ++e) v[e] = Value(k, s, static_cast<std::int64_t>(e));
      int st = 0;
      if (VdsWriteDynamic(df, k, v.data(), static_cast<std::int64_t>(v.size()), s * dt, s, &st) != 0) return false;
      if (k == df.itemCount && VdsEndTimeStep(df, &st) != 0) return false;
    }
  return true;
}

void ExpectSteps(DataFile& df, int steps) {
  for (int s = 0; s < steps; ++s)
    for (int k = 1; k <= df.itemCount; ++k) {
      std::vector<float> v(static_cast<std::size_t>(df.items[k - 1].elements));
      int st = 0;
      ASSERT_EQ(VdsReadDynamic(df, k, s, v.data(), static_cast<std::int64_t>(v.size()), 0, &st), 0) << df.errorText;
      for (std::size_t e = 0; e < v.size(); ++e) ASSERT_EQ(v[e], Value(k, s, static_cast<std::int64_t>(e)));
    }
}

class DataFileTest : public ::testing::Test {
 protected:
  void SetUp() override { unsetenv("TAVRIN_LOG_NOPATH"); }
  TempDir dir_;
};

TEST_F(DataFileTest, MeshFileRoundTripsStaticsItemsAndTimes) {
  DataFile df;
  DefineMesh(df, 2);
  VdsDefineItem(df, 1, 100079, "Bathymetry", 2);
  VdsDefineItem(df, 2, 100079, "Node depth", 6);
  const std::string file = dir_.file("out/sub/mesh.vdsu");  // parent folders are created
  ASSERT_EQ(VdsCreateFile(df, file), 0);
  WriteMeshStatics(df);
  ASSERT_TRUE(WriteSteps(df, 3, 1800.0));
  // A failure record: step -1 at a fractional time.
  const float fail1[2] = {7, 8}, fail2[6] = {1, 2, 3, 4, 5, 6};
  ASSERT_EQ(VdsWriteDynamic(df, 1, fail1, 2, 5432.125, -1), 0);
  ASSERT_EQ(VdsWriteDynamic(df, 2, fail2, 6, 5432.125, -1), 0);
  df.printSummary = false;
  ASSERT_EQ(VdsClose(df), 0);

  DataFile in;
  ASSERT_EQ(VdsOpenRead(in, file), 0);
  EXPECT_EQ(in.title, "Mesh test");
  EXPECT_EQ(in.dataType, 2000);
  EXPECT_EQ(in.projection, "UTM-32");
  EXPECT_EQ(in.customBlockName, "TAVRIN_FM");
  EXPECT_EQ(in.customInt, (std::vector<std::int32_t>{6, 2, 2, 0, 0}));
  ASSERT_EQ(VdsStaticCount(in), 9);
  std::vector<double> x;
  std::vector<std::int32_t> nodes, counts;
  std::vector<float> z;
  ASSERT_EQ(VdsReadStaticDouble(in, 2, x), 0);
  EXPECT_EQ(x[0], 500000.5);  // doubles keep sub-metre positions at UTM scale
  ASSERT_EQ(VdsReadStaticFloat(in, 4, z), 0);
  EXPECT_EQ(z[5], -4.0f);
  ASSERT_EQ(VdsReadStaticInt(in, 8, counts), 0);
  EXPECT_EQ(counts, (std::vector<std::int32_t>{3, 4}));
  ASSERT_EQ(VdsReadStaticInt(in, 9, nodes), 0);
  EXPECT_EQ(nodes, (std::vector<std::int32_t>{1, 2, 3, 2, 5, 6, 3}));
  EXPECT_EQ(in.time.kind, kVdsEqCalendar);
  EXPECT_EQ(in.time.start, "2004-02-28 23:00:00");
  EXPECT_EQ(in.time.step, 1800.0);
  ASSERT_EQ(in.time.count, 4);
  EXPECT_EQ(VdsStepTime(in, 2), 3600.0);
  EXPECT_EQ(VdsStepNumber(in, 2), 2);
  EXPECT_EQ(VdsStepTime(in, 3), 5432.125);
  EXPECT_EQ(VdsStepNumber(in, 3), -1);
  EXPECT_EQ(in.items[1].elements, 6);
  EXPECT_EQ(in.items[0].unit, kUnitMetre);
  ExpectSteps(in, 3);
  // Static reads after a dynamic read are refused, as with sequential files.
  int st = 0;
  EXPECT_EQ(VdsReadStaticInt(in, 1, nodes, &st), kVdsStaticAfterDynamicRead);
  // Unit conversion on reading: metres to feet.
  const UnitInfo* feet = nullptr;
  for (const UnitInfo& u : AllUnits())
    if (std::string(u.abbreviation) == "ft") feet = &u;
  ASSERT_NE(feet, nullptr);
  float v[2];
  ASSERT_EQ(VdsReadDynamic(in, 1, 0, v, 2, feet->code), 0);
  EXPECT_NEAR(v[0], Value(1, 0, 0) / 0.3048, 1e-2);
  EXPECT_EQ(VdsClose(in), 0);
}

TEST_F(DataFileTest, SeriesGridAndVolumeKindsWithEveryTimeAxis) {
  struct Case { const char* name; int dimension; int axis; };
  const Case cases[] = {{"p.vds0", 0, kVdsEqCalendar}, {"l.vds1", 1, kVdsNeqCalendar},
                        {"g.vds2", 2, kVdsEqTime}, {"v.vds3", 3, kVdsEqCalendar}};
  for (const Case& c : cases) {
    SCOPED_TRACE(c.name);
    DataFile df;
    ASSERT_EQ(VdsInitHeader(df, kVdsFileKindData, "Series", "test", 2), 0);
    VdsSetDataType(df, 0);
    VdsSetCustomBlockFloat(df, 3, 2.5f);
    if (c.axis == kVdsEqCalendar) VdsSetTimeAxis(df, "2010-01-31 12:00:00", 0.5);
    if (c.axis == kVdsNeqCalendar) VdsSetNeqCalendarAxis(df, "2010-01-31 12:00:00");
    if (c.axis == kVdsEqTime) VdsSetEqTimeAxis(df, 100.0, 60.0);
    VdsSpatialAxis axis;
    axis.dimension = c.dimension;
    const std::int64_t n[3] = {4, 3, 2};
    std::int64_t elements = 1;
    for (int d = 0; d < c.dimension; ++d) {
      axis.n[d] = n[d];
      axis.origin[d] = 10.0 * d;
      axis.step[d] = 2.5;
      elements *= n[d];
    }
    for (int k = 1; k <= 2; ++k) {
      ASSERT_EQ(VdsDefineItem(df, k, 999, k == 1 ? "First" : "Second", elements), 0);
      ASSERT_EQ(VdsSetItemAxis(df, k, axis), 0);
    }
    const double statics[3] = {1.5, 2.5, 3.5};
    ASSERT_EQ(VdsDefineStaticItem(df, "Weights", VdsStaticType::kDouble, 3), 0);
    const std::string file = dir_.file(c.name);
    ASSERT_EQ(VdsCreateFile(df, file), 0);
    ASSERT_EQ(VdsWriteStaticDouble(df, statics, 3), 0);
    df.printSummary = false;
    // Non-equidistant records keep their own times.
    ASSERT_TRUE(WriteSteps(df, 3, c.axis == kVdsNeqCalendar ? 0.1 : 0.5));
    ASSERT_EQ(VdsClose(df), 0);

    DataFile in;
    ASSERT_EQ(VdsOpenRead(in, file), 0) << in.errorText;
    EXPECT_EQ(in.customBlockName, "TV2_Misc");
    EXPECT_EQ(in.customFloat, (std::vector<float>{0, 0, 2.5f}));
    EXPECT_EQ(in.time.kind, c.axis);
    if (c.axis == kVdsEqTime) {
      EXPECT_EQ(in.time.startOffset, 100.0);
    }
    ASSERT_EQ(in.time.count, 3);
    EXPECT_EQ(VdsStepTime(in, 2), c.axis == kVdsNeqCalendar ? 0.2 : 1.0);
    EXPECT_EQ(in.items[0].axis.dimension, c.dimension);
    for (int d = 0; d < c.dimension; ++d) EXPECT_EQ(in.items[0].axis.n[d], n[d]);
    std::vector<double> w;
    ASSERT_EQ(VdsReadStaticDouble(in, 1, w), 0);
    EXPECT_EQ(w, (std::vector<double>{1.5, 2.5, 3.5}));
    // Sequential reading walks items 1, 2, 1, 2, ...; skips move the same cursor.
    std::vector<float> v(static_cast<std::size_t>(elements));
    ASSERT_EQ(VdsReadNextDynamic(in, v.data(), elements), 0);
    EXPECT_EQ(v[0], Value(1, 0, 0));
    ASSERT_EQ(VdsSkipItem(in), 0);
    ASSERT_EQ(VdsSkipTimeStep(in), 0);
    ASSERT_EQ(VdsReadNextDynamic(in, v.data(), elements), 0);
    EXPECT_EQ(v[elements - 1], Value(1, 2, elements - 1));
    ASSERT_EQ(VdsReadNextDynamic(in, v.data(), elements), 0);
    int st = 0;
    EXPECT_EQ(VdsSkipItem(in, &st), kVdsSkip);
    VdsClose(in);
  }
}

TEST_F(DataFileTest, CompressedFilesRoundTrip) {
  DataFile df;
  DefineMesh(df, 1);
  VdsSetCompression(df, 1);
  VdsDefineItem(df, 1, 100079, "Bathymetry", 2);
  const std::string file = dir_.file("packed.vdsu");
  ASSERT_EQ(VdsCreateFile(df, file), 0);
  WriteMeshStatics(df);
  df.printSummary = false;
  ASSERT_TRUE(WriteSteps(df, 4, 1800));
  ASSERT_EQ(VdsClose(df), 0);
  DataFile in;
  ASSERT_EQ(VdsOpenRead(in, file), 0) << in.errorText;
  EXPECT_TRUE(in.netcdf4);
  ExpectSteps(in, 4);
  VdsClose(in);
}

TEST_F(DataFileTest, DynamicWritesFollowTheCyclicItemOrder) {
  DataFile df;
  VdsInitHeader(df, kVdsFileKindData, "Order", "test", 3);
  VdsSetTimeAxis(df, "2000-01-01 00:00:00", 10);
  for (int k = 1; k <= 3; ++k) VdsDefineItem(df, k, 999, "Item " + std::to_string(k), 1);
  int st = 0;
  EXPECT_EQ(VdsDefineItem(df, 4, 999, "Too many", 1, 0, &st), kVdsItemNumber);
  EXPECT_EQ(VdsDefineItem(df, 0, 999, "Zero", 1, 0, &st), kVdsItemNumber);
  ASSERT_EQ(VdsCreateFile(df, dir_.file("order.vds0")), 0);
  df.printSummary = false;
  const float v = 1;
  // 1, 2, 3, 1, 2, 3 is the only order; a skipped or repeated item is refused.
  EXPECT_EQ(VdsWriteDynamic(df, 1, &v, 1, 0, 0), 0);
  EXPECT_EQ(VdsWriteDynamic(df, 3, &v, 1, 0, 0, &st), kVdsWriteDynamic);
  EXPECT_NE(df.errorText.find("item 3 written where item 2 was due"), std::string::npos);
  EXPECT_EQ(VdsWriteDynamic(df, 1, &v, 1, 0, 0, &st), kVdsWriteDynamic);
  EXPECT_EQ(VdsEndTimeStep(df, &st), kVdsWriteDynamic);  // step not complete
  EXPECT_EQ(VdsWriteDynamic(df, 2, &v, 1, 0, 0), 0);
  EXPECT_EQ(VdsWriteDynamic(df, 3, &v, 1, 0, 0), 0);
  EXPECT_EQ(VdsEndTimeStep(df), 0);
  EXPECT_EQ(VdsWriteDynamic(df, 1, &v, 2, 10, 1, &st), kVdsWriteDynamic);  // wrong count
  EXPECT_EQ(VdsWriteDynamic(df, 1, &v, 1, 10, 1), 0);
  const std::int32_t one = 1;
  EXPECT_EQ(VdsWriteStaticInt(df, &one, 1, &st), kVdsStaticAfterDynamicWrite);
  // Closing in the middle of a step completes it with delete values and says so.
  EXPECT_EQ(VdsClose(df, &st), kVdsWriteDynamic);
  DataFile in;
  ASSERT_EQ(VdsOpenRead(in, dir_.file("order.vds0")), 0);
  ASSERT_EQ(in.time.count, 2);
  float got = 0;
  ASSERT_EQ(VdsReadDynamic(in, 3, 1, &got, 1), 0);
  EXPECT_EQ(got, kVdsDeleteValue);
  VdsClose(in);
}

TEST_F(DataFileTest, HeaderAndMeshFaultsGiveTheirCodes) {
  DataFile df;
  int st = 0;
  VdsInitHeader(df, kVdsFileKindData, "Faults", "test", 1);
  EXPECT_EQ(VdsSetTimeAxis(df, "2000-01-01 00:00:00", 0.0, "second", &st), kVdsTimeAxis);
  EXPECT_EQ(VdsSetTimeAxis(df, "2000-01-01 00:00:00", -5.0, "second", &st), kVdsTimeAxis);
  EXPECT_EQ(VdsSetTimeAxis(df, "2000-13-01 00:00:00", 5.0, "second", &st), kVdsTimeAxis);
  EXPECT_EQ(VdsSetEqTimeAxis(df, 0.0, 0.0, &st), kVdsTimeAxis);
  EXPECT_EQ(VdsSetCustomBlockInt(df, 0, 1, &st), kVdsSetCustom);
  EXPECT_EQ(VdsSetCustomBlockInt(df, kVdsMaxCustomBlock + 1, 1, &st), kVdsSetCustom);
  EXPECT_EQ(VdsDefineItem(df, 1, 123456789, "Unknown type", 1, 0, &st), kVdsItem);
  ASSERT_EQ(VdsDefineItem(df, 1, kItemBathymetry, "Depth", 1), 0);
  EXPECT_EQ(VdsSetItemUnit(df, 1, kUnitDegree, &st), kVdsItem);  // not a length
  VdsSpatialAxis axis;
  axis.dimension = 1;
  axis.n[0] = 3;
  EXPECT_EQ(VdsSetItemAxis(df, 1, axis, &st), kVdsSpatialAxis);  // 3 points for 1 element
  EXPECT_EQ(VdsCreateFile(df, dir_.file("x.txt"), &st), kVdsCreateFile);

  // Mesh statics: node counts and node numbers are checked.
  DefineMesh(df, 1);
  VdsDefineItem(df, 1, 100079, "Bathymetry", 2);
  ASSERT_EQ(VdsCreateFile(df, dir_.file("bad.vdsu")), 0);
  const std::int32_t ids[6] = {1, 2, 3, 4, 5, 6};
  const double xy[6] = {};
  const float z[6] = {};
  EXPECT_EQ(VdsWriteStaticFloat(df, z, 6, &st), kVdsWriteStatic);  // node ids are integers
  EXPECT_EQ(VdsWriteStaticInt(df, ids, 5, &st), kVdsWriteStatic);   // one per node
  ASSERT_EQ(VdsWriteStaticInt(df, ids, 6), 0);
  ASSERT_EQ(VdsWriteStaticDouble(df, xy, 6), 0);
  ASSERT_EQ(VdsWriteStaticDouble(df, xy, 6), 0);
  ASSERT_EQ(VdsWriteStaticFloat(df, z, 6), 0);
  ASSERT_EQ(VdsWriteStaticInt(df, ids, 6), 0);
  ASSERT_EQ(VdsWriteStaticInt(df, ids, 2), 0);
  ASSERT_EQ(VdsWriteStaticInt(df, ids, 2), 0);
  const std::int32_t badCounts[2] = {3, 5};
  EXPECT_EQ(VdsWriteStaticInt(df, badCounts, 2, &st), kVdsWriteStatic);
  const std::int32_t counts[2] = {3, 3};
  ASSERT_EQ(VdsWriteStaticInt(df, counts, 2), 0);
  const std::int32_t pastEnd[6] = {1, 2, 3, 4, 5, 7};
  EXPECT_EQ(VdsWriteStaticInt(df, pastEnd, 6, &st), kVdsWriteStatic);
  EXPECT_NE(df.errorText.find("refers to node 7 of 6"), std::string::npos) << df.errorText;
  const float v[2] = {};
  EXPECT_EQ(VdsWriteDynamic(df, 1, v, 2, 0, 0, &st), kVdsWriteDynamic);  // statics unfinished
  df.printSummary = false;
  VdsClose(df, &st);
}

TEST_F(DataFileTest, MeshDataTypeOutsideTheRangeIsReadAs2000WithAWarning) {
  DataFile df;
  DefineMesh(df, 1);
  VdsDefineItem(df, 1, 100079, "Bathymetry", 2);
  const std::string file = dir_.file("old.vdsu");
  ASSERT_EQ(VdsCreateFile(df, file), 0);
  WriteMeshStatics(df);
  df.printSummary = false;
  ASSERT_TRUE(WriteSteps(df, 1, 60));
  VdsClose(df);
  // An older writer's data type.
  int ncid = -1;
  ASSERT_EQ(nc_open(file.c_str(), NC_WRITE, &ncid), NC_NOERR);
  nc_redef(ncid);
  const int old = 2005;
  nc_put_att_int(ncid, NC_GLOBAL, "vds_data_type", NC_INT, 1, &old);
  ASSERT_EQ(nc_close(ncid), NC_NOERR);
  ASSERT_TRUE(LogOpen(dir_.file("read.log")));
  DataFile in;
  ASSERT_EQ(VdsOpenRead(in, file), 0) << in.errorText;
  EXPECT_EQ(in.dataType, 2000);
  ExpectSteps(in, 1);
  VdsClose(in);  // a file that was only read prints no summary
  LogClose();
  const std::string log = tavrintest::ReadFile(dir_.file("read.log"));
  EXPECT_NE(log.find("\nWarning: Wrong data type found, 2000 assumed\n"), std::string::npos) << log;
  EXPECT_EQ(log.find("Data File Summary"), std::string::npos) << log;
}

}  // namespace
