// vdstool in-process: CSV round trips, item and step selection, mesh dumps with element centres,
// the unit tables, help texts and bad input (exit code 1, a message, no file left behind).
#include <gtest/gtest.h>
#include <dirent.h>

#include <cmath>
#include <cstdio>
#include <sstream>
#include <string>
#include <vector>

#include "io/DataFile.h"
#include "io/Units.h"
#include "io/VdsTool.h"
#include "MeshFiles.h"
#include "support/TestSupport.h"

namespace {

using tavrintest::TempDir;

struct ToolResult {
  int code;
  std::string out, err;
};

ToolResult Tool(std::vector<std::string> args) {
  args.insert(args.begin(), "vdstool");
  std::vector<char*> argv;
  for (std::string& a : args) argv.push_back(a.data());
  argv.push_back(nullptr);
  std::ostringstream out, err;
  const int code = VdsToolMain(static_cast<int>(args.size()), argv.data(), out, err);
  return {code, out.str(), err.str()};
}

std::vector<std::string> Listing(const std::string& folder) {
  std::vector<std::string> names;
  if (DIR* d = opendir(folder.c_str())) {
    while (dirent* e = readdir(d))
      if (e->d_name[0] != '.' || std::string(e->d_name).size() > 2) names.emplace_back(e->d_name);
    closedir(d);
  }
  return names;
}

TEST(VdsTool, FromCsvRoundTripsThroughInfoAndDump) {
  TempDir dir;
  const std::string csv = dir.write("levels.csv",
                                    "# gauge data\n"
                                    "time,level,flow\n"
                                    "0,1.5,10\n"
                                    "600,1.75,\n"
                                    "\n"
                                    "1200,2.125,12\n");
  const std::string out = dir.file("levels.vds0");
  ToolResult r = Tool({"from-csv", csv, out, "--start", "2004-02-28 23:50:00", "--item",
                       "Level:100079:1000", "--item", "Flow:999:0", "--title", "Gauge 7"});
  ASSERT_EQ(r.code, 0) << r.err;
  EXPECT_EQ(r.out.find("Data File Summary"), std::string::npos);  // no log text on the console

  DataFile df;
  ASSERT_EQ(VdsOpenRead(df, out), 0);
  EXPECT_EQ(df.title, "Gauge 7");
  EXPECT_EQ(df.time.kind, kVdsEqCalendar);
  EXPECT_EQ(df.time.step, 600.0);
  EXPECT_EQ(df.items[1].unit, 0);
  float v = 0;
  ASSERT_EQ(VdsReadDynamic(df, 2, 1, &v, 1), 0);
  EXPECT_EQ(v, df.deleteValue);  // empty field
  VdsClose(df);

  r = Tool({"dump", out});
  ASSERT_EQ(r.code, 0) << r.err;
  EXPECT_EQ(r.out,
            "time_s,date,Level,Flow\n"
            "0,2004-02-28 23:50:00,1.5,10\n"
            "600,2004-02-29 00:00:00,1.75,\n"
            "1200,2004-02-29 00:10:00,2.125,12\n");
  EXPECT_EQ(Tool({"to-csv", out, "--item", "2"}).out,
            "time_s,date,Flow\n0,2004-02-28 23:50:00,10\n600,2004-02-29 00:00:00,\n1200,2004-02-29 00:10:00,12\n");
  EXPECT_EQ(Tool({"dump", out, "--item", "Level", "--step", "-1"}).out,
            "time_s,date,Level\n1200,2004-02-29 00:10:00,2.125\n");

  r = Tool({"info", out});
  ASSERT_EQ(r.code, 0) << r.err;
  EXPECT_NE(r.out.find("Gauge 7"), std::string::npos) << r.out;
  EXPECT_NE(r.out.find("min 1.5, max 2.125"), std::string::npos) << r.out;
  EXPECT_EQ(Listing(dir.path()).size(), 2u);  // the CSV and the series: no temporary left
}

TEST(VdsTool, UnevenTimesAndDatesMakeANonEquidistantAxis) {
  TempDir dir;
  const std::string csv = dir.write("t.csv",
                                    "2010-01-01 00:00:00,1\n"
                                    "2010-01-01 00:00:30,2\n"
                                    "2010-01-01 01:00:00,3\n");
  const std::string out = dir.file("t.vds0");
  ASSERT_EQ(Tool({"from-csv", csv, out, "--start", "2010-01-01 00:00:00", "--item", "A:999:0"}).code, 0);
  DataFile df;
  ASSERT_EQ(VdsOpenRead(df, out), 0);
  EXPECT_EQ(df.time.kind, kVdsNeqCalendar);
  EXPECT_EQ(VdsStepTime(df, 2), 3600.0);
  VdsClose(df);
}

TEST(VdsTool, MeshDumpGivesElementCentres) {
  TempDir dir;
  DataFile df;
  const std::string file = dir.file("m.vdsu");
  const double x[5] = {0, 3, 0, 5, 5}, y[5] = {0, 0, 3, 0, 2};
  ASSERT_TRUE(tavrintest::CreateTwoElementMesh(df, file, x, y));
  df.printSummary = false;
  for (int s = 0; s < 2; ++s) {
    const float v[2] = {1.0f + s, 2.5f + s};
    VdsWriteDynamic(df, 1, v, 2, 60.0 * s, s);
    VdsEndTimeStep(df);
  }
  VdsClose(df);
  ToolResult r = Tool({"dump", file, "--step", "0"});
  ASSERT_EQ(r.code, 0) << r.err;
  EXPECT_EQ(r.out, "element,x,y,Depth\n1,1,1,1\n2,3.25,1.25,2.5\n");
  EXPECT_EQ(Tool({"dump", file}).out, "element,x,y,Depth\n1,1,1,2\n2,3.25,1.25,3.5\n");
  EXPECT_EQ(Tool({"dump", file, "--step", "2"}).code, 1);
}

TEST(VdsTool, UnitTablesAndHelp) {
  ToolResult r = Tool({"units"});
  ASSERT_EQ(r.code, 0);
  EXPECT_EQ(r.out.rfind("item_type,name,unit_kind,default_unit,default_unit_name\n", 0), 0u);
  EXPECT_NE(r.out.find("\n100079,Bathymetry,"), std::string::npos);
  r = Tool({"units", "--units"});
  EXPECT_NE(r.out.find("\n1000,meter,m,"), std::string::npos) << r.out;
  EXPECT_NE(r.out.find("\n2401,"), std::string::npos);
  for (const char* command : {"info", "dump", "to-csv", "from-csv", "units"}) {
    r = Tool({command, "--help"});
    EXPECT_EQ(r.code, 0) << command;
    EXPECT_NE(r.out.find("vdstool"), std::string::npos) << command;
  }
  EXPECT_EQ(Tool({"--help"}).code, 0);
  EXPECT_EQ(Tool({}).code, 1);
  EXPECT_EQ(Tool({"explode"}).code, 1);
}

TEST(VdsTool, BadInputFailsCleanly) {
  TempDir dir;
  const std::string good = dir.write("good.csv", "0,1\n60,2\n");
  const std::string out = dir.file("out.vds0");
  struct Case {
    const char* name;
    std::string csv;
    std::vector<std::string> options;
    const char* message;
  };
  const std::vector<Case> cases = {
      {"times not increasing", dir.write("a.csv", "0,1\n60,2\n60,3\n"), {"--item", "A:999:0"}, "line 3"},
      {"ragged row", dir.write("b.csv", "0,1,2\n60,2\n"), {"--item", "A:999:0", "--item", "B:999:0"}, "line 2"},
      {"text for a number", dir.write("c.csv", "0,1\n60,abc\n"), {"--item", "A:999:0"}, "line 2"},
      {"malformed --item", good, {"--item", "A:many:0"}, "--item"},
      {"unknown type", good, {"--item", "A:123456:0"}, "123456"},
      {"unit of the wrong kind", good, {"--item", "A:100079:2401"}, "2401"},
      {"missing file", dir.file("none.csv"), {"--item", "A:999:0"}, "none.csv"},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.name);
    std::vector<std::string> args = {"from-csv", c.csv, out, "--start", "2004-01-01 00:00:00"};
    args.insert(args.end(), c.options.begin(), c.options.end());
    const ToolResult r = Tool(args);
    EXPECT_EQ(r.code, 1);
    EXPECT_EQ(r.err.rfind("vdstool: ", 0), 0u) << r.err;
    EXPECT_NE(r.err.find(c.message), std::string::npos) << r.err;
    EXPECT_FALSE(tavrintest::FileExists(out));
    std::remove(out.c_str());
  }
  EXPECT_EQ(Tool({"from-csv", good, out, "--start", "2004-02-30 00:00:00", "--item", "A:999:0"}).code, 1);
  EXPECT_EQ(Tool({"info", dir.file("none.vdsu")}).code, 1);
  EXPECT_EQ(Tool({"dump", good}).code, 1);  // not a data file
  const std::string junk = dir.write("junk.csv.vds0", "not NetCDF");  // ".csv": kept by the check below
  const ToolResult r = Tool({"info", junk});
  EXPECT_EQ(r.code, 1);
  EXPECT_EQ(r.err.rfind("vdstool: " + junk + ": Unable to open VDS file", 0), 0u) << r.err;
  // Only the inputs remain: no temporary file was left by any failure.
  for (const std::string& name : Listing(dir.path())) EXPECT_NE(name.find(".csv"), std::string::npos) << name;
}


TEST(VdsTool, CsvVariantsAreReadAsWritten) {
  TempDir dir;
  const std::string out = dir.file("v.vds0");
  // Byte-order mark, CRLF line ends, a quoted header, blanks around fields, a name with a
  // colon and an item without a unit code (the item type's default unit).
  const std::string csv = dir.write(
      "v.csv", "\xEF\xBB\xBF\"time, s\",\"a\"\r\n 0 , 1 \r\n3600,2\r\n7200, \r\n");
  ToolResult r = Tool({"from-csv", csv, out, "--start", "2004-01-01", "--item", "Gauge 1: Depth:100079"});
  ASSERT_EQ(r.code, 0) << r.err;
  EXPECT_NE(r.out.find("equidistant calendar axis, step 3600 s"), std::string::npos) << r.out;
  EXPECT_EQ(Tool({"dump", out}).out,
            "time_s,date,Gauge 1: Depth\n0,2004-01-01 00:00:00,1\n3600,2004-01-01 01:00:00,2\n"
            "7200,2004-01-01 02:00:00,\n");
  DataFile df;
  ASSERT_EQ(VdsOpenRead(df, out), 0);
  EXPECT_EQ(df.items[0].unit, DefaultUnitOfItemType(100079));
  VdsClose(df);

  // The file starts at the first row's whole second; a fraction there keeps the times exact on
  // a non-equidistant axis, and decimal steps that are equal up to rounding stay equidistant.
  const std::string frac = dir.write("f.csv", "90.5,1\n91.5,2\n");
  ASSERT_EQ(Tool({"from-csv", frac, out, "--start", "2004-01-01 00:00:00", "--item", "A:999"}).code, 0);
  EXPECT_EQ(Tool({"dump", out}).out,
            "time_s,date,A\n0.5,2004-01-01 00:01:31,1\n1.5,2004-01-01 00:01:32,2\n");
  const std::string tenths = dir.write("d.csv", "0,1\n0.1,2\n0.2,3\n0.3,4\n");
  ASSERT_EQ(Tool({"from-csv", tenths, out, "--start", "2004-01-01", "--item", "A:999"}).code, 0);
  ASSERT_EQ(VdsOpenRead(df, out), 0);
  EXPECT_EQ(df.time.kind, kVdsEqCalendar);
  EXPECT_NEAR(df.time.step, 0.1, 1e-12);
  VdsClose(df);
  // Values print as the shortest text that reads back as the same float.
  const std::string values = dir.write("x.csv", "0,0.1\n1,-3.4028235e38\n2,1e-30\n");
  ASSERT_EQ(Tool({"from-csv", values, out, "--start", "2004-01-01", "--item", "A:999"}).code, 0);
  EXPECT_EQ(Tool({"dump", out}).out,
            "time_s,date,A\n0,2004-01-01 00:00:00,0.1\n1,2004-01-01 00:00:01,-3.4028235e+38\n"
            "2,2004-01-01 00:00:02,1e-30\n");
}

// A 2 x 2 grid series on an axis without calendar: one column per grid value, x fastest.
TEST(VdsTool, GridSeriesAreFlattenedOneColumnPerValue) {
  TempDir dir;
  const std::string file = dir.file("g.vds2");
  DataFile df;
  VdsInitHeader(df, kVdsFileKindData, "Grid", "test", 2);
  VdsSetEqTimeAxis(df, 100.0, 60.0);
  VdsSpatialAxis axis;
  axis.dimension = 2;
  axis.n[0] = axis.n[1] = 2;
  VdsDefineItem(df, 1, kItemUndefined, "H", 4);
  ASSERT_EQ(VdsSetItemAxis(df, 1, axis), 0);
  VdsDefineItem(df, 2, kItemUndefined, "Sum, total", 1);
  ASSERT_EQ(VdsCreateFile(df, file), 0);
  df.printSummary = false;
  for (int s = 0; s < 2; ++s) {
    const float h[4] = {1.0f + s, 2, kVdsDeleteValue, 4}, sum = 7;
    VdsWriteDynamic(df, 1, h, 4, 100.0 + 60.0 * s, s);
    VdsWriteDynamic(df, 2, &sum, 1, 100.0 + 60.0 * s, s);
    VdsEndTimeStep(df);
  }
  VdsClose(df);
  ToolResult r = Tool({"dump", file});
  ASSERT_EQ(r.code, 0) << r.err;
  EXPECT_EQ(r.out,
            "time_s,date,H[0],H[1],H[2],H[3],\"Sum, total\"\n100,,1,2,,4,7\n160,,2,2,,4,7\n");
  EXPECT_EQ(Tool({"dump", file, "--item", "Sum, total", "--item", "1", "--step", "-2"}).out,
            "time_s,date,\"Sum, total\",H[0],H[1],H[2],H[3]\n100,,7,1,2,,4\n");
  r = Tool({"info", file});
  ASSERT_EQ(r.code, 0) << r.err;
  EXPECT_NE(r.out.find("time axis: equidistant time (kind 1)"), std::string::npos) << r.out;
  EXPECT_NE(r.out.find("spatial axis: dimension 2, points 2 x 2"), std::string::npos) << r.out;
  EXPECT_NE(r.out.find("1 \"H\": item type 999"), std::string::npos) << r.out;
  EXPECT_NE(r.out.find("4 elements, instantaneous, min 1, max 4"), std::string::npos) << r.out;
}

// Ranges leave out delete values, NaN and infinities; an item with nothing left says so.
TEST(VdsTool, InfoRangesSkipMissingValues) {
  TempDir dir;
  const std::string file = dir.file("r.vds0");
  DataFile df;
  VdsInitHeader(df, kVdsFileKindData, "Ranges", "test", 2);
  VdsSetNeqCalendarAxis(df, "2004-01-01 00:00:00");
  VdsDefineItem(df, 1, kItemUndefined, "Mixed", 1);
  VdsDefineItem(df, 2, kItemUndefined, "Empty", 1);
  ASSERT_EQ(VdsCreateFile(df, file), 0);
  df.printSummary = false;
  const float mixed[5] = {std::nanf(""), -2.0f, kVdsDeleteValue, INFINITY, 5.0f};
  const double times[5] = {0, 10, 25, 70, 3600};
  for (int s = 0; s < 5; ++s) {
    VdsWriteDynamic(df, 1, &mixed[s], 1, times[s], s);
    VdsWriteDynamic(df, 2, &kVdsDeleteValue, 1, times[s], s);
    VdsEndTimeStep(df);
  }
  VdsClose(df);
  const ToolResult r = Tool({"info", file});
  ASSERT_EQ(r.code, 0) << r.err;
  EXPECT_NE(r.out.find("\"Mixed\": item type 999 (Undefined), unit 0"), std::string::npos) << r.out;
  EXPECT_NE(r.out.find("min -2, max 5\n"), std::string::npos) << r.out;
  EXPECT_NE(r.out.find("\"Empty\": item type 999 (Undefined), unit 0"), std::string::npos);
  EXPECT_NE(r.out.find("instantaneous, no values\n"), std::string::npos) << r.out;
  EXPECT_NE(r.out.find("steps: 5"), std::string::npos);
  EXPECT_NE(r.out.find("last step: t = 3600 s, 2004-01-01 01:00:00"), std::string::npos) << r.out;
}

TEST(VdsTool, MeshInfoAndMalformedMeshes) {
  TempDir dir;
  DataFile df;
  const std::string file = dir.file("m.vdsu");
  const double x[5] = {0, 3, 0, 5, 5}, y[5] = {0, 0, 3, 0, 2};
  ASSERT_TRUE(tavrintest::CreateTwoElementMesh(df, file, x, y));
  const float v[2] = {1, 2};
  VdsWriteDynamic(df, 1, v, 2, 0, 0);
  VdsEndTimeStep(df);
  VdsClose(df);
  const ToolResult r = Tool({"info", file});
  ASSERT_EQ(r.code, 0) << r.err;
  EXPECT_NE(r.out.find("kind: vdsu"), std::string::npos);
  EXPECT_NE(r.out.find("mesh: 5 nodes, 2 elements"), std::string::npos) << r.out;
  EXPECT_NE(r.out.find("custom block TAVRIN_FM (int32): 5 2 2 0 0"), std::string::npos) << r.out;
  EXPECT_NE(r.out.find("static items: 9"), std::string::npos);
  EXPECT_NE(r.out.find("double, 5 elements, min 0, max 5"), std::string::npos) << r.out;
  EXPECT_NE(r.out.find("int32, 7 elements, min 1, max 5"), std::string::npos) << r.out;
  // A mesh dump takes only per-element items, and only steps the file has.
  EXPECT_EQ(Tool({"dump", file, "--item", "Depth"}).out, "element,x,y,Depth\n1,1,1,1\n2,3.25,1.25,2\n");
  EXPECT_NE(Tool({"dump", file, "--step", "1"}).err.find("step 1 is outside"), std::string::npos);
}

TEST(VdsTool, DumpRejectsBadSelections) {
  TempDir dir;
  const std::string csv = dir.write("s.csv", "0,1,2\n60,3,4\n");
  const std::string file = dir.file("s.vds0");
  ASSERT_EQ(Tool({"from-csv", csv, file, "--start", "2004-01-01", "--item", "A:999:0", "--item",
                  "A:999:0"}).code, 0);
  struct Case {
    std::vector<std::string> args;
    const char* message;
  };
  const std::vector<Case> cases = {
      {{"dump", file, "--item", "B"}, "no item named \"B\""},
      {{"dump", file, "--item", "3"}, "no item number 3 (the file has 2 items)"},
      {{"dump", file, "--item", "0"}, "no item number 0"},
      {{"dump", file, "--item", "A"}, "2 items are named \"A\""},
      {{"dump", file, "--step", "2"}, "step 2 is outside the file's 2 steps"},
      {{"dump", file, "--step", "-3"}, "step -3 is outside"},
      {{"dump", file, "--step", "one"}, "--step needs an integer"},
      {{"dump", file, "--step"}, "option --step needs a value"},
      {{"dump", file, "--colour", "red"}, "unknown option --colour"},
      {{"dump", file, file}, "expected one data file"},
      {{"info"}, "expected one data file"},
      {{"help", "nothing"}, "unknown command"},
      {{"units", "--units", "--kinds"}, "not both"},
  };
  for (const Case& c : cases) {
    const ToolResult r = Tool(c.args);
    EXPECT_EQ(r.code, 1) << c.message;
    EXPECT_TRUE(r.out.empty()) << c.message << ": " << r.out;
    EXPECT_EQ(r.err.rfind("vdstool: ", 0), 0u) << r.err;
    EXPECT_NE(r.err.find(c.message), std::string::npos) << r.err;
  }
  EXPECT_EQ(Tool({"dump", file, "--item", "2", "--step=0"}).out, "time_s,date,A\n0,2004-01-01 00:00:00,2\n");
}

TEST(VdsTool, FromCsvRejectsBadTablesAndOutputs) {
  TempDir dir;
  const std::string good = dir.write("good.csv", "0,1\n60,2\n");
  const std::string out = dir.file("out.vds0");
  const std::vector<std::string> item = {"--item", "A:999:0"};
  struct Case {
    std::string csv, output;
    std::vector<std::string> options;
    const char* message;
  };
  const std::vector<Case> cases = {
      {dir.write("h.csv", "time,a,b\n0,1\n"), out, {"--start", "2004-01-01"}, "the header has 3 columns"},
      {dir.write("e.csv", "# nothing\n\n"), out, {"--start", "2004-01-01"}, "no data rows"},
      {dir.write("m.csv", "2004-01-01 00:00:00,1\n60,2\n"), out, {}, "line 2: the time \"60\" is not a date"},
      {dir.write("n.csv", "0,1\n2004-01-01 00:00:00,2\n"), out, {"--start", "2004-01-01"}, "line 2"},
      {dir.write("i.csv", "2004-01-01 00:00:00,1\n2004-13-01 00:00:00,2\n"), out, {}, "invalid date"},
      {dir.write("q.csv", "0,\"1\n"), out, {"--start", "2004-01-01"}, "unterminated quoted field"},
      {dir.write("r.csv", "0,1e39\n"), out, {"--start", "2004-01-01"}, "outside the range"},
      {dir.write("d.csv", "0,1\n-5,2\n"), out, {"--start", "2004-01-01"}, "strictly increase"},
      {good, out, {}, "--start is needed"},
      {good, out, {"--start", "2004-01-01 25:00:00"}, "--start \"2004-01-01 25:00:00\""},
      {good, dir.file("out.vds2"), {"--start", "2004-01-01"}, "must have the extension .vds0"},
      {good, dir.file("no/such/out.vds0"), {"--start", "2004-01-01"}, "does not exist"},
      {good, dir.path(), {"--start", "2004-01-01"}, "extension .vds0"},
  };
  for (const Case& c : cases) {
    std::vector<std::string> args = {"from-csv", c.csv, c.output};
    args.insert(args.end(), c.options.begin(), c.options.end());
    args.insert(args.end(), item.begin(), item.end());
    const ToolResult r = Tool(args);
    EXPECT_EQ(r.code, 1) << c.message;
    EXPECT_NE(r.err.find(c.message), std::string::npos) << r.err;
    EXPECT_FALSE(tavrintest::FileExists(c.output) && c.output != dir.path()) << c.message;
  }
  const std::vector<std::string> itemArguments = {"A", ":999:0", "A:999:99999", "A:999:x",
                                                  std::string(81, 'n') + ":999"};
  for (const std::string& argument : itemArguments) {
    const ToolResult r = Tool({"from-csv", good, out, "--start", "2004-01-01", "--item", argument});
    EXPECT_EQ(r.code, 1) << argument;
    EXPECT_NE(r.err.find("--item"), std::string::npos) << r.err;
  }
  // A failed run leaves an existing output untouched.
  ASSERT_EQ(Tool({"from-csv", good, out, "--start", "2004-01-01", "--item", "A:999:0"}).code, 0);
  const std::string before = tavrintest::ReadFile(out);
  const std::string bad = dir.write("bad.csv", "0,1\n0,2\n");
  EXPECT_EQ(Tool({"from-csv", bad, out, "--start", "2004-01-01", "--item", "A:999:0"}).code, 1);
  EXPECT_EQ(tavrintest::ReadFile(out), before);
  for (const std::string& name : Listing(dir.path())) EXPECT_EQ(name.find(".tmp"), std::string::npos) << name;
}

}  // namespace
