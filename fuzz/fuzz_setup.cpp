// libFuzzer target for the setup-file library: loads arbitrary bytes, walks the whole tree, reads
// every parameter with every typed reader, and checks the invariants of the loaded tree.
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <map>
#include <string>

#include "setup/SkfLibrary.h"

namespace {

void Check(bool ok, const char* what) {
  if (!ok) {
    std::fprintf(stderr, "invariant violated: %s\n", what);
    std::abort();
  }
}

// Reads `p` with every reader; readers of another type must set the pending error and return
// an empty value, readers of its own type must not set it.
void ReadParam(const SkfParam* p, int keywordLine) {
  const SkfParamType t = skfGetParamType(p);
  const int kinds = skfIsInt(p) + skfIsDouble(p) + skfIsBool(p) + skfIsString(p) + skfIsFilename(p);
  Check(kinds == 1, "a parameter has exactly one kind");
  Check(skfGetParamLine(p) >= keywordLine && skfGetParamColumn(p) >= 1, "parameter position");
  const std::string text = skfGetParamText(p);
  Check(!text.empty(), "parameter text is not empty");

  auto expect = [](bool wrongType, int wanted) {
    const int e = skfPeekErrorGlb();
    Check(wrongType ? e == SKF_ERR_TYPE : (e == SKF_OK || e == wanted), "pending error of a read");
    skfClearErrorGlb();
  };
  const bool number = t == SkfParamType::Int || t == SkfParamType::Double;
  const bool text_kind = t == SkfParamType::String || t == SkfParamType::Filename;

  const std::int32_t i = skfGetInt(p);
  expect(t != SkfParamType::Int, SKF_OK);
  if (t != SkfParamType::Int) Check(i == 0, "failed int read gives 0");
  const double d = skfGetDouble(p);
  expect(!number, SKF_OK);
  if (t == SkfParamType::Int) Check(d == static_cast<double>(i), "int read as double");
  const float fl = skfGetFloat(p);
  expect(!number, SKF_ERR_RANGE);
  (void)fl;
  const bool b = skfGetBool(p);
  expect(t != SkfParamType::Bool, SKF_OK);
  if (t == SkfParamType::Bool) Check(b == (text == "true"), "boolean value");
  const std::string s = skfGetString(p);
  expect(t != SkfParamType::String, SKF_OK);
  const std::string fn = skfGetFilename(p);
  expect(!text_kind, SKF_OK);
  const std::string rf = skfGetResultFilenamePath(p);
  expect(!text_kind, SKF_OK);
  Check(fn == rf, "result path resolves as file name");
  if (t == SkfParamType::String) Check(text.front() == '"' && text.back() == '"', "string text");
  if (t == SkfParamType::Filename) {
    Check(text.front() == '<' && text.back() == '>' && !fn.empty(), "file name text");
  }
  if (t == SkfParamType::Double) Check(text.find_first_of(".eE") != std::string::npos, "double text");
}

void WalkBlock(const SkfBlock* b, const SkfBlock* parent, int level, const std::string& parentPath) {
  Check(skfGetParent(b) == parent, "parent link");
  Check(skfGetLevel(b) == level, "level");
  Check(level < kSkfMaxNesting, "nesting limit");
  Check(skfGetLine(b) >= 1, "block line");
  const std::string path = parentPath.empty() ? skfGetName(b) : parentPath + "." + skfGetName(b);
  Check(skfGetNameGlb(b) == path, "dotted path");
  skfMarkRead(const_cast<SkfBlock*>(b));
  Check(skfIsRead(b), "read mark");

  std::map<std::string, int> seen;
  const int nk = skfGetNoKeywords(b);
  for (int k = 1; k <= nk; ++k) {
    SkfKeyword* kw = skfKeywordByNum(b, k);
    Check(kw != nullptr && skfGetKeywordBlock(kw) == b, "keyword block");
    const std::string name = skfGetKeywordName(kw);
    const int inst = ++seen[name];
    Check(skfGetKeywordInstance(kw) == inst, "keyword instance numbering");
    Check(skfKeywordByNameNum(b, name.c_str(), inst) == kw, "keyword lookup");
    const int line = skfGetKeywordLine(kw);
    const int np = skfGetNoParams(kw);
    for (int j = 1; j <= np; ++j) ReadParam(skfParamByNum(kw, j), line);
    Check(skfParamByNum(kw, np + 1) == nullptr, "parameter past the end");
  }
  Check(skfKeywordByNum(b, nk + 1) == nullptr, "keyword past the end");
  for (const auto& [name, count] : seen)
    Check(skfKeywordByNameNum(b, name.c_str(), count + 1) == nullptr, "keyword instance past the end");

  seen.clear();
  const int ns = skfGetNoSections(b);
  for (int s = 1; s <= ns; ++s) {
    SkfBlock* sec = skfSectionByNum(b, s);
    Check(sec != nullptr, "section by number");
    const std::string name = skfGetName(sec);
    const int inst = ++seen[name];
    Check(skfGetInstance(sec) == inst, "section instance numbering");
    Check(skfSectionByNameNum(b, name.c_str(), inst) == sec, "section lookup");
    WalkBlock(sec, b, level + 1, path);
  }
  Check(skfSectionByNum(b, ns + 1) == nullptr, "section past the end");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  skfClearErrorGlb();
  SkfFile* f = skfLoadBuffer(reinterpret_cast<const char*>(data), size, "/fuzz/run/setup.skf");
  Check(f != nullptr, "a buffer always loads");
  int line = 0, column = 0;
  std::string message;
  const bool failed = skfGetSyntaxErr(f, &line, &column, &message);
  if (failed) {
    Check(skfPeekErrorGlb() == SKF_ERR_SYNTAX, "syntax error is pending");
    Check(skfGetNoTargets(f) == 0, "a failed load has no targets");
    Check(line >= 1 && column >= 1, "error position");
    Check(static_cast<std::size_t>(column) <= kSkfMaxLineBytes + 1, "error column");
    Check(message.rfind("Syntax error: ", 0) == 0 && message.size() > 14, "error message");
  } else {
    Check(skfPeekErrorGlb() == SKF_OK, "a successful load clears the error");
  }
  std::map<std::string, int> seen;
  const int nt = skfGetNoTargets(f);
  for (int t = 1; t <= nt; ++t) {
    SkfBlock* b = skfTargetByNum(f, t);
    Check(b != nullptr, "target by number");
    const std::string name = skfGetName(b);
    const int inst = ++seen[name];
    Check(skfGetInstance(b) == inst, "target instance numbering");
    Check(skfTargetByNameNum(f, name.c_str(), inst) == b, "target lookup");
    WalkBlock(b, nullptr, 0, "");
  }
  Check(skfTargetByNum(f, nt + 1) == nullptr, "target past the end");
  skfClose(f);
  return 0;
}
