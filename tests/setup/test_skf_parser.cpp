// Setup-file library: tree shape, parameter kinds, syntax errors with positions, hostile input
// limits, typed reads and the pending error, file loading and file-name resolution.
#include <gtest/gtest.h>

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "setup/SkfLibrary.h"
#include "support/TestSupport.h"

namespace {

struct Closer {
  void operator()(SkfFile* f) const { skfClose(f); }
};
using FilePtr = std::unique_ptr<SkfFile, Closer>;

FilePtr Load(const std::string& text, const char* name = "/runs/bay/setup.skf") {
  return FilePtr(skfLoadBuffer(text.data(), text.size(), name));
}

// First parameter of keyword `kw` in the block at dotted `path` below the first target.
SkfParam* Param(const SkfFile* f, std::vector<const char*> path, const char* kw, int num = 1) {
  SkfBlock* b = skfTargetByNum(f, 1);
  for (const char* s : path) b = skfSectionByNameNum(b, s, 1);
  return skfParamByNum(skfKeywordByNameNum(b, kw, 1), num);
}

std::string SyntaxMessage(const SkfFile* f, int* line = nullptr, int* col = nullptr) {
  std::string msg;
  int l = 0, c = 0;
  skfGetSyntaxErr(f, &l, &c, &msg);
  if (line != nullptr) *line = l;
  if (col != nullptr) *col = c;
  return msg;
}

TEST(SkfTree, BlocksKeywordsInstancesAndPaths) {
  const auto f = Load(
      "TesselHD {\n"                              // 1
      "  HYDRODYNAMIC_MODULE {\n"                 // 2
      "    TIME { step = 30.0 }\n"                // 3
      "    OUTPUT { a = 1 }\n"                    // 4
      "    OUTPUT\n    {\n b = 2; b = 3; a = 4\n }\n"  // 5..8
      "  }\n"
      "  x = 1\n  x = 2\n"
      "}\n"
      "Other { }\nTesselHD { }\n");
  ASSERT_EQ(skfPeekErrorGlb(), SKF_OK);
  ASSERT_EQ(skfGetNoTargets(f.get()), 3);
  EXPECT_EQ(skfGetInstance(skfTargetByNum(f.get(), 3)), 2);
  EXPECT_EQ(skfTargetByNameNum(f.get(), "TesselHD", 2), skfTargetByNum(f.get(), 3));
  EXPECT_EQ(skfTargetByNameNum(f.get(), "TesselHD", 3), nullptr);

  SkfBlock* root = skfTargetByNum(f.get(), 1);
  EXPECT_EQ(skfGetLevel(root), 0);
  EXPECT_EQ(skfGetParent(root), nullptr);
  SkfBlock* hd = skfSectionByNameNum(root, "HYDRODYNAMIC_MODULE", 1);
  ASSERT_NE(hd, nullptr);
  EXPECT_EQ(skfGetNoSections(hd), 3);
  SkfBlock* out2 = skfSectionByNameNum(hd, "OUTPUT", 2);
  ASSERT_EQ(out2, skfSectionByNum(hd, 3));
  EXPECT_EQ(skfGetParent(out2), hd);
  EXPECT_EQ(skfGetLevel(out2), 2);
  EXPECT_EQ(skfGetInstance(out2), 2);
  EXPECT_EQ(skfGetLine(out2), 5);
  EXPECT_EQ(skfGetNameGlb(out2), "TesselHD.HYDRODYNAMIC_MODULE.OUTPUT");
  // Keywords of a block are in file order, numbered per name.
  ASSERT_EQ(skfGetNoKeywords(out2), 3);
  EXPECT_EQ(skfGetKeywordName(skfKeywordByNum(out2, 3)), "a");
  SkfKeyword* b2 = skfKeywordByNameNum(out2, "b", 2);
  EXPECT_EQ(skfGetKeywordInstance(b2), 2);
  EXPECT_EQ(skfGetKeywordLine(b2), 7);
  EXPECT_EQ(skfGetKeywordBlock(b2), out2);
  EXPECT_EQ(skfGetInt(skfParamByNum(b2, 1)), 3);
  // Keywords of the root are not mixed with those of its sections.
  ASSERT_EQ(skfGetNoKeywords(root), 2);
  EXPECT_EQ(skfGetInt(skfParamByNum(skfKeywordByNameNum(root, "x", 2), 1)), 2);
  EXPECT_EQ(skfKeywordByNameNum(root, "x", 0), nullptr);
  EXPECT_EQ(skfKeywordByNameNum(root, "a", 1), nullptr);
  EXPECT_EQ(skfParamByNum(skfKeywordByNum(root, 1), 2), nullptr);
}

// Blocks with many children are searched through a name index; it must agree with file order.
TEST(SkfTree, ManyChildrenLookupMatchesFileOrder) {
  std::string text = "T {\n";
  for (int i = 0; i < 300; ++i) {
    const std::string n = std::to_string(i % 7);
    text += "k" + n + " = " + std::to_string(i) + "\nS" + n + " { v = " + std::to_string(i) + " }\n";
  }
  text += "}\n";
  for (int i = 0; i < 40; ++i) text += "A { }\nB { }\n";
  const auto f = Load(text);
  SkfBlock* t = skfTargetByNum(f.get(), 1);
  ASSERT_EQ(skfGetNoKeywords(t), 300);
  std::vector<int> seen(7, 0);
  for (int i = 0; i < 300; ++i) {
    const std::string n = std::to_string(i % 7);
    const int inst = ++seen[static_cast<std::size_t>(i % 7)];
    SkfKeyword* k = skfKeywordByNameNum(t, ("k" + n).c_str(), inst);
    ASSERT_EQ(k, skfKeywordByNum(t, i + 1));
    EXPECT_EQ(skfGetKeywordInstance(k), inst);
    SkfBlock* s = skfSectionByNameNum(t, ("S" + n).c_str(), inst);
    ASSERT_EQ(s, skfSectionByNum(t, i + 1));
    EXPECT_EQ(skfGetInstance(s), inst);
  }
  EXPECT_EQ(skfKeywordByNameNum(t, "k0", seen[0] + 1), nullptr);
  EXPECT_EQ(skfKeywordByNameNum(t, "k", 1), nullptr);
  EXPECT_EQ(skfTargetByNameNum(f.get(), "B", 40), skfTargetByNum(f.get(), 81));
  EXPECT_EQ(skfTargetByNameNum(f.get(), "B", 41), nullptr);
}

struct ParamCase {
  const char* literal;
  SkfParamType type;
  double number;     // Int, Double, Bool (1/0)
  const char* text;  // String, Filename: the value; unused otherwise
};

TEST(SkfParams, EveryKindParsesToItsValue) {
  const ParamCase cases[] = {
      {"12", SkfParamType::Int, 12, ""},
      {"-3", SkfParamType::Int, -3, ""},
      {"+4", SkfParamType::Int, 4, ""},
      {"2147483647", SkfParamType::Int, 2147483647.0, ""},
      {"-2147483648", SkfParamType::Int, -2147483648.0, ""},
      {"1.5", SkfParamType::Double, 1.5, ""},
      {"2e-3", SkfParamType::Double, 2e-3, ""},
      {"-.5", SkfParamType::Double, -0.5, ""},
      {"+.25", SkfParamType::Double, 0.25, ""},
      {"1.", SkfParamType::Double, 1.0, ""},
      {"1E+5", SkfParamType::Double, 1e5, ""},
      {"1e-400", SkfParamType::Double, 0.0, ""},
      {"-0.001e-400", SkfParamType::Double, -0.0, ""},
      {"4e-320", SkfParamType::Double, 4e-320, ""},
      {"true", SkfParamType::Bool, 1, ""},
      {"false", SkfParamType::Bool, 0, ""},
      {"\"Bay \\\"north\\\" \\\\ 2024\"", SkfParamType::String, 0, "Bay \"north\" \\ 2024"},
      {"\"C:\\runs\\a\"", SkfParamType::String, 0, "C:\\runs\\a"},
      {"\"\"", SkfParamType::String, 0, ""},
      {"\"# not // a comment\"", SkfParamType::String, 0, "# not // a comment"},
      {"\"Zürich\"", SkfParamType::String, 0, "Zürich"},
      {"<mesh/bay.mesh>", SkfParamType::Filename, 0, "mesh/bay.mesh"},
      {"<a b#c//d.txt>", SkfParamType::Filename, 0, "a b#c//d.txt"},
  };
  for (const ParamCase& c : cases) {
    SCOPED_TRACE(c.literal);
    const auto f = Load(std::string("T {\n  k = ") + c.literal + "   \n}\n", "setup.skf");
    ASSERT_EQ(skfPeekErrorGlb(), SKF_OK) << SyntaxMessage(f.get());
    SkfParam* p = Param(f.get(), {}, "k");
    ASSERT_NE(p, nullptr);
    EXPECT_EQ(skfGetParamType(p), c.type);
    EXPECT_EQ(skfGetParamText(p), c.literal);
    EXPECT_EQ(skfGetParamLine(p), 2);
    EXPECT_EQ(skfGetParamColumn(p), 7);
    switch (c.type) {
      case SkfParamType::Int:
        EXPECT_EQ(skfGetInt(p), static_cast<std::int32_t>(c.number));
        EXPECT_EQ(skfGetDouble(p), c.number);
        break;
      case SkfParamType::Double: EXPECT_DOUBLE_EQ(skfGetDouble(p), c.number); break;
      case SkfParamType::Bool: EXPECT_EQ(skfGetBool(p), c.number != 0); break;
      case SkfParamType::String: EXPECT_EQ(skfGetString(p), c.text); break;
      case SkfParamType::Filename: EXPECT_EQ(skfGetFilename(p), c.text); break;
    }
    EXPECT_EQ(skfPeekErrorGlb(), SKF_OK);
  }
}

TEST(SkfParams, KeywordEndsAndContinuationLines) {
  const auto f = Load(
      "\xEF\xBB\xBF# leading comment\r\n"
      "T\r\n{\r\n"
      "  CORIOLIS { type = 0 }\r\n"
      "  POINT_1 { x = 1.5; y = 2 }  // trailing comment\r\n"
      "  empty =\r\n"
      "  list = 1, 2,   # wrapped\r\n"
      "\r\n"
      "         // comment line inside the list\r\n"
      "         3, \"s\", <f>\r\n"
      "  last = 7}\r\n");
  ASSERT_EQ(skfPeekErrorGlb(), SKF_OK) << SyntaxMessage(f.get());
  SkfBlock* t = skfTargetByNum(f.get(), 1);
  EXPECT_EQ(skfGetInt(Param(f.get(), {"CORIOLIS"}, "type")), 0);
  EXPECT_EQ(skfGetDouble(Param(f.get(), {"POINT_1"}, "x")), 1.5);
  EXPECT_EQ(skfGetInt(Param(f.get(), {"POINT_1"}, "y")), 2);
  EXPECT_EQ(skfGetNoParams(skfKeywordByNameNum(t, "empty", 1)), 0);
  SkfKeyword* list = skfKeywordByNameNum(t, "list", 1);
  ASSERT_EQ(skfGetNoParams(list), 5);
  EXPECT_EQ(skfGetParamLine(skfParamByNum(list, 3)), 10);
  EXPECT_EQ(skfGetParamColumn(skfParamByNum(list, 3)), 10);
  EXPECT_EQ(skfGetString(skfParamByNum(list, 4)), "s");
  EXPECT_EQ(skfGetInt(Param(f.get(), {}, "last")), 7);
  EXPECT_EQ(skfGetLine(t), 2);
  EXPECT_EQ(skfGetNoKeywords(t), 3);
}

struct ErrorCase {
  std::string text;
  int line;
  int column;
  const char* fragment;
};

TEST(SkfSyntaxErrors, PositionAndMessage) {
  const ErrorCase cases[] = {
      {"T {\n  abc\n}\n", 3, 1, "expected '=' or '{' after name \"abc\""},
      {"T {\n  abc -\n}\n", 2, 7, "expected '=' or '{' after name \"abc\", found '-'"},
      {"T {\n  abc\n  = 1\n}\n", 3, 3, "on a later line"},
      {"T {\n  s = \"open\n}\n", 2, 7, "unterminated string"},
      {"T {\n  s = \"a\\\"\n}\n", 2, 7, "unterminated string"},
      {"T {\n  f = <open\n}\n", 2, 7, "unterminated file name"},
      {"T {\n  f = <>\n}\n", 2, 7, "empty file name"},
      {"A {\n  TIME {\n x = 1\n", 4, 1, "block \"TIME\" opened at line 2 is not closed"},
      {"T { }\n}\n", 2, 1, "unexpected '}'"},
      {"x = 1\n", 1, 1, "only blocks may stand at the top level"},
      {"T { } 12\n", 1, 7, "expected a block name, found \"12\""},
      {"T {\n k = 3000000000\n}", 2, 6, "integer 3000000000 is outside the 32-bit range"},
      {"T {\n k = -2147483649\n}", 2, 6, "outside the 32-bit range"},
      {"T {\n k = 1e999\n}", 2, 6, "outside the range of a double"},
      {"T { k = -12345.6e305 }", 1, 9, "outside the range of a double"},
      {"T { k = 1.5.2 }", 1, 9, "invalid number \"1.5.2\""},
      {"T { k = 12abc }", 1, 9, "invalid number \"12abc\""},
      {"T { k = 1e }", 1, 9, "invalid number"},
      {"T { k = - }", 1, 9, "invalid number"},
      {"T { k = nan }", 1, 9, "invalid parameter \"nan\""},
      {"T { k = inf }", 1, 9, "invalid parameter \"inf\""},
      {"T { k = True }", 1, 9, "invalid parameter \"True\""},
      {"T { k = word }", 1, 9, "invalid parameter \"word\""},
      {"T { k = 1 2 }", 1, 11, "expected ',' or the end of the keyword"},
      {"T { k = \"a\"b }", 1, 12, "found \"b\""},
      {"T { k = , 1 }", 1, 9, "expected a parameter, found ','"},
      {"T {\n k = 1, 2,\n}", 2, 10, "expected a parameter after ','"},
      {"T {\n k = 1,\n j = 2\n}", 2, 7, "expected a parameter after ','"},
      {"T {\n k = 1,", 2, 7, "expected a parameter after ','"},
      {"T { k = 1,; }", 1, 10, "expected a parameter after ','"},
      {"T { ; }", 1, 5, "expected a keyword, a block or '}', found ';'"},
      {"T { k = 1 / 2 }", 1, 11, "found '/'"},
      {"T { = 1 }", 1, 5, "found '='"},
      {"T { k\xC3\xA4 = 1 }", 1, 6, "non-ASCII character"},
      {"T { k = 1 \x07 }", 1, 11, "control character 0x07"},
      {"T { s = \"a\xFF\" }", 1, 11, "invalid UTF-8"},
      {"T { s = \"\xC0\xAF\" }", 1, 10, "invalid UTF-8"},     // overlong '/'
      {"T { s = \"\xED\xA0\x80\" }", 1, 10, "invalid UTF-8"}, // surrogate
      {"T { s = \"\xE2\x82\" }", 1, 10, "invalid UTF-8"},     // truncated
      {"T { f = <a\xFE> }", 1, 11, "invalid UTF-8"},
      {std::string("T { k = 1 }\n# x\0y\n", 18), 2, 4, "NUL byte in file"},
      {std::string("T { s = \"a\0\" }", 14), 1, 11, "NUL byte in file"},
      {std::string("T { k = 1\0 }", 12), 1, 10, "NUL byte in file"},
      {"\xEF\xBB\xBFT { k = ? }", 1, 9, "expected a parameter, found '?'"},
      {"T {\r\n  k = 1 2\r\n}", 2, 9, "expected ',' or the end"},
      {"T\n\n", 3, 1, "expected '{' after block name \"T\""},
  };
  for (const ErrorCase& c : cases) {
    SCOPED_TRACE(c.text);
    skfClearErrorGlb();
    const auto f = Load(c.text);
    ASSERT_NE(f, nullptr);
    EXPECT_EQ(skfPeekErrorGlb(), SKF_ERR_SYNTAX);
    EXPECT_EQ(skfGetNoTargets(f.get()), 0);
    int line = 0, col = 0;
    const std::string msg = SyntaxMessage(f.get(), &line, &col);
    EXPECT_EQ(msg.rfind("Syntax error: ", 0), 0u) << msg;
    EXPECT_NE(msg.find(c.fragment), std::string::npos) << msg;
    EXPECT_EQ(line, c.line) << msg;
    EXPECT_EQ(col, c.column) << msg;
  }
}

TEST(SkfLimits, NestingDepth) {
  auto nested = [](int depth) {
    std::string s;
    for (int i = 0; i < depth; ++i) s += "B {\n";
    s += "k = 1\n";
    for (int i = 0; i < depth; ++i) s += "}\n";
    return s;
  };
  const auto ok = Load(nested(kSkfMaxNesting));
  ASSERT_EQ(skfPeekErrorGlb(), SKF_OK);
  SkfBlock* b = skfTargetByNum(ok.get(), 1);
  while (skfGetNoSections(b) > 0) b = skfSectionByNum(b, 1);
  EXPECT_EQ(skfGetLevel(b), kSkfMaxNesting - 1);

  const auto deep = Load(nested(kSkfMaxNesting + 1));
  int line = 0;
  EXPECT_EQ(SyntaxMessage(deep.get(), &line), "Syntax error: blocks nested deeper than 64 levels");
  EXPECT_EQ(line, kSkfMaxNesting + 1);
  // Far deeper than any stack would take if the parser recursed.
  const auto hostile = Load(std::string(1000000, '{'));
  EXPECT_EQ(skfPeekErrorGlb(), SKF_ERR_SYNTAX);
  const auto hostileNamed = Load(nested(200000));
  EXPECT_NE(SyntaxMessage(hostileNamed.get()).find("nested deeper"), std::string::npos);
}

TEST(SkfLimits, LineLength) {
  auto withLine = [](std::size_t bytes, const std::string& tail) {
    std::string line = "  k = \"" + std::string(bytes - 8, 'x') + "\"";
    return "T {\n" + line + tail + "\n}\n";
  };
  const auto ok = Load(withLine(kSkfMaxLineBytes, ""));
  EXPECT_EQ(skfPeekErrorGlb(), SKF_OK) << SyntaxMessage(ok.get());
  for (const std::string tail : {"", " bad", " # comment"}) {
    const auto f = Load(withLine(kSkfMaxLineBytes + 1, tail));
    int line = 0, col = 0;
    EXPECT_EQ(SyntaxMessage(f.get(), &line, &col), "Syntax error: line longer than 1048576 bytes");
    EXPECT_EQ(line, 2);
    EXPECT_EQ(col, static_cast<int>(kSkfMaxLineBytes) + 1);
  }
  // A long final line without a line end.
  const auto last = Load("T { }" + std::string(kSkfMaxLineBytes, ' '));
  EXPECT_NE(SyntaxMessage(last.get()).find("line longer"), std::string::npos);
}

TEST(SkfReads, WrongTypesSetThePendingError) {
  const auto f = Load("T { i = 7; d = 2.5; big = 1e300; b = true; s = \"x\"; n = <m/a.b> }",
                      "/runs/bay/setup.skf");
  const SkfFile* h = f.get();
  struct Read {
    const char* kw;
    int (*read)(const SkfParam*);
    int error;
  };
  const Read reads[] = {
      {"d", [](const SkfParam* p) { return static_cast<int>(skfGetInt(p)); }, SKF_ERR_TYPE},
      {"b", [](const SkfParam* p) { return static_cast<int>(skfGetInt(p)); }, SKF_ERR_TYPE},
      {"i", [](const SkfParam* p) { return static_cast<int>(skfGetBool(p)); }, SKF_ERR_TYPE},
      {"s", [](const SkfParam* p) { return static_cast<int>(skfGetDouble(p)); }, SKF_ERR_TYPE},
      {"n", [](const SkfParam* p) { return static_cast<int>(skfGetString(p).size()); }, SKF_ERR_TYPE},
      {"i", [](const SkfParam* p) { return static_cast<int>(skfGetString(p).size()); }, SKF_ERR_TYPE},
      {"d", [](const SkfParam* p) { return static_cast<int>(skfGetFilename(p).size()); }, SKF_ERR_TYPE},
      {"big", [](const SkfParam* p) { return static_cast<int>(skfGetFloat(p)); }, SKF_ERR_RANGE},
      {"b", [](const SkfParam* p) { return static_cast<int>(skfGetFloat(p)); }, SKF_ERR_TYPE},
  };
  for (const Read& r : reads) {
    SCOPED_TRACE(r.kw);
    skfClearErrorGlb();
    EXPECT_EQ(r.read(Param(h, {}, r.kw)), 0);
    EXPECT_EQ(skfPeekErrorGlb(), r.error);
  }
  skfClearErrorGlb();
  EXPECT_EQ(skfGetFloat(Param(h, {}, "i")), 7.0f);
  EXPECT_EQ(skfGetFloat(Param(h, {}, "d")), 2.5f);
  EXPECT_EQ(skfGetFilename(Param(h, {}, "s")), "/runs/bay/x");
  EXPECT_EQ(skfGetFilename(Param(h, {}, "n")), "/runs/bay/m/a.b");
  EXPECT_EQ(skfGetResultFilenamePath(Param(h, {}, "n")), "/runs/bay/m/a.b");
  EXPECT_EQ(skfPeekErrorGlb(), SKF_OK);
}

TEST(SkfReads, NullHandlesAndReadMarks) {
  skfClearErrorGlb();
  EXPECT_EQ(skfGetNoTargets(nullptr), 0);
  EXPECT_EQ(skfPeekErrorGlb(), SKF_ERR_HANDLE);
  skfClearErrorGlb();
  EXPECT_EQ(skfGetInt(nullptr), 0);
  EXPECT_EQ(skfPeekErrorGlb(), SKF_ERR_HANDLE);
  skfClearErrorGlb();
  EXPECT_EQ(skfGetNameGlb(nullptr), "");
  EXPECT_EQ(skfKeywordByNameNum(nullptr, "a", 1), nullptr);
  EXPECT_EQ(skfPeekErrorGlb(), SKF_ERR_HANDLE);

  const auto f = Load("T { k = 1; S { } }");  // a successful load clears the pending error
  EXPECT_EQ(skfPeekErrorGlb(), SKF_OK);
  EXPECT_FALSE(skfGetSyntaxErr(f.get(), nullptr, nullptr, nullptr));
  SkfBlock* t = skfTargetByNum(f.get(), 1);
  SkfKeyword* k = skfKeywordByNum(t, 1);
  EXPECT_FALSE(skfIsRead(k));
  skfMarkRead(k);
  skfMarkRead(skfSectionByNum(t, 1));
  EXPECT_TRUE(skfIsRead(k));
  EXPECT_TRUE(skfIsRead(skfSectionByNum(t, 1)));
  EXPECT_FALSE(skfIsRead(t));
}

TEST(SkfFiles, LoadFromDiskAndResolveNames) {
  tavrintest::TempDir dir;
  const std::string path = dir.write("run/setup.skf", "T { mesh = <mesh/bay.mesh>; abs = </data/x> }\n");
  const FilePtr f(skfLoadFile(path.c_str(), -1));
  ASSERT_NE(f, nullptr);
  EXPECT_EQ(skfPeekErrorGlb(), SKF_OK);
  EXPECT_EQ(skfGetFileName(f.get()), path);
  EXPECT_EQ(skfGetFilename(Param(f.get(), {}, "mesh")), dir.path() + "/run/mesh/bay.mesh");
  EXPECT_EQ(skfGetFilename(Param(f.get(), {}, "abs")), "/data/x");

  for (const std::string& bad : {dir.file("missing.skf"), dir.path()}) {
    skfClearErrorGlb();
    EXPECT_EQ(skfLoadFile(bad.c_str(), -1), nullptr) << bad;
    EXPECT_EQ(skfPeekErrorGlb(), SKF_ERR_OPEN);
  }
  const FilePtr broken(skfLoadFile(dir.write("bad.skf", "T {").c_str(), -1));
  ASSERT_NE(broken, nullptr);
  EXPECT_EQ(skfPeekErrorGlb(), SKF_ERR_SYNTAX);

  const auto rel = Load("T { m = <a.mesh> }", "setup.skf");  // no folder: stays relative
  EXPECT_EQ(skfGetFilename(Param(rel.get(), {}, "m")), "a.mesh");
  const auto empty = Load("", "x.skf");
  EXPECT_EQ(skfPeekErrorGlb(), SKF_OK);
  EXPECT_EQ(skfGetNoTargets(empty.get()), 0);
}

TEST(SkfFiles, ResolvePath) {
  const struct {
    const char* folder;
    const char* name;
    const char* expected;
  } cases[] = {
      {"/runs/bay", "mesh/a.mesh", "/runs/bay/mesh/a.mesh"},
      {"/runs/bay/", "a", "/runs/bay/a"},
      {"/runs/bay", "./a", "/runs/bay/a"},
      {"/runs/bay", "../a", "/runs/bay/../a"},
      {"/runs/bay", "/abs/a", "/abs/a"},
      {"/", "a", "/a"},
      {"", "mesh/a", "mesh/a"},
      {".", "mesh/a", "mesh/a"},
      {"rel", "a", "rel/a"},
      {"/runs", "", ""},
  };
  for (const auto& c : cases) EXPECT_EQ(skfResolvePath(c.folder, c.name), c.expected) << c.name;
}

}  // namespace
