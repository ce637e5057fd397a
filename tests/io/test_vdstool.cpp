// vdstool in-process: CSV round trips, item and step selection, mesh dumps with element centres,
// the unit tables, help texts and bad input (exit code 1, a message, no file left behind).
#include <gtest/gtest.h>
#include <dirent.h>

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
      {"bad item spec", good, {"--item", "A:many:0"}, "--item"},
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
  // Only the inputs remain: no temporary file was left by any failure.
  for (const std::string& name : Listing(dir.path())) EXPECT_NE(name.find(".csv"), std::string::npos) << name;
}

}  // namespace
